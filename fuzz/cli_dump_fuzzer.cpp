// The vorcal tool's sequential readers: frame dumps listed as the dump verb does, and whatever
// format the input is detected as (elementary streams, ADTS, AMR, dumps) read packet by packet,
// through a pipe that delivers a chosen number of bytes per read.
// Input: one byte choosing the read size, then the stream.
#include <cstdint>
#include <cstdio>

#include "facts.hpp"
#include "media.hpp"
#include "verbs.hpp"

#include "fuzz_sal.hpp"

#define CHECK(x) ((x) ? void() : __builtin_trap())

using namespace vorcal::cli;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    static std::FILE *pNull = std::fopen("/dev/null", "w");
    if (uSize < 1)
        return 0;
    const size_t uMaxRead = (pData[0] & 0x7F) + 1;
    const bool bSeekable = pData[0] & 0x80;
    const uint8_t *pStream = pData + 1;
    const size_t uStream = uSize - 1;

    const Console console{pNull, pNull, false};
    std::unique_ptr<Input> input = Input::FromMemory(pStream, uStream, bSeekable, uMaxRead);
    const int iStatus = ListDump(console, *input, "fuzz", (pData[0] & 1) != 0, -1, "");
    CHECK(iStatus == kExitOk || iStatus == kExitData);

    Failure failure;
    std::unique_ptr<MediaFile> file =
        MediaFile::Open(Input::FromMemory(pStream, uStream, bSeekable, uMaxRead), failure, true);
    if (!file || file->GetFormat() == Format::Mp4)
        return 0;
    const StreamInfo &info = file->Streams()[0];
    std::unique_ptr<PacketReader> reader = file->Packets(0);
    Packet packet;
    uint64_t uEnd = 0;
    while (reader->Next(packet, failure) == ReadResult::Packet) {
        // Packets follow one another inside the input.
        CHECK(packet.uOffset >= uEnd && packet.uOffset <= uStream && packet.data.size() <= uStream - packet.uOffset);
        uEnd = packet.uOffset + packet.data.size();
        ClassifyFrame(info, packet);
    }
    return 0;
}
