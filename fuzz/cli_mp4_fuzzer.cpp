// The vorcal tool's ISO BMFF reader: box structure, sample descriptions and sample tables of a
// hostile movie, every sample read, and what the tool's facts make of configurations and frames.
// Input: the file.
#include <cstdint>

#include "facts.hpp"
#include "media.hpp"
#include "mp4.hpp"

#include "fuzz_sal.hpp"

#define CHECK(x) ((x) ? void() : __builtin_trap())

using namespace vorcal::cli;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    if (!LooksLikeIsoBmff(pData, uSize))
        return 0;
    Failure failure;
    std::unique_ptr<MediaFile> file = MediaFile::Open(Input::FromMemory(pData, uSize), failure);
    CHECK(file || failure.Failed());
    if (!file)
        return 0;
    for (const StreamInfo &info : file->Streams()) {
        if (info.codec == Codec::H264)
            ExamineAvc(info);
        else if (info.codec == Codec::Hevc)
            ExamineHevc(info);
        else if (info.codec == Codec::Aac)
            ExamineAacConfig(info);
        std::unique_ptr<PacketReader> reader = file->Packets(info.uIndex);
        Packet packet;
        bool bFirst = true;
        while (reader->Next(packet, failure) == ReadResult::Packet) {
            // Every sample lies inside the file.
            CHECK(packet.uOffset <= uSize && packet.data.size() <= uSize - packet.uOffset);
            if (bFirst && KindOf(info.codec) == MediaKind::Video)
                ExamineVisual(info, packet.data);
            bFirst = false;
            ClassifyFrame(info, packet);
        }
    }
    return 0;
}
