// vorCALTools_AAC_ParseFrame on arbitrary bytes. The first byte picks the framing:
//  even: ADTS. The rest is walked frame by frame as an engine would (on by uFrameBytes, a byte
//        on after a refusal), each call on an exact-size copy of what is left;
//  odd:  raw access units. The AudioSpecificConfig is the next 1 + (byte >> 1) % 8 bytes, the
//        rest access units behind 2-byte big-endian lengths, each in an exact-size copy.
// Bit 6 of the first byte fails the parser's allocation first. Every result is one of the six,
// the frame information is consistent, and the parser frees what it took.
#include <cstddef>
#include <cstdint>
#include <vector>

#include <vorcal/aacparse.h>

#include "fuzz_sal.hpp"

namespace {

void TrapUnless(bool ok) { if (!ok) __builtin_trap(); }

void Check(int32_t r, const CALAACFrameInfo &info, size_t len)
{
    TrapUnless(r >= 0 && r <= 5);
    TrapUnless(info.uOutSampleRate == (info.uSBR ? 2 * info.uSampleRate : info.uSampleRate));
    TrapUnless(info.uOutChannels == (info.uPS ? 2 : info.uChannels) && info.uSBR <= 1 && info.uPS <= 1);
    uint32_t elements = 0;
    for (uint32_t n : info.auElements)
        elements += n;
    TrapUnless(r == 1 || elements * 3 <= info.uBits);
    if (r == 0 || r == 5)
        TrapUnless(info.uFrameBytes <= len && info.auElements[7] >= 1 && (info.uBits + 7) / 8 <= info.uFrameBytes);
    if (r == 2)
        TrapUnless(info.uFrameBytes > len || len < 9);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const uint8_t mode = in.Byte();
    const size_t live = vorcal::fuzz::LiveBlocks();
    std::vector<uint8_t> asc;
    if (mode & 1)
        for (size_t n = 1 + (mode >> 1) % 8; n > 0; --n)
            asc.push_back(in.Byte());
    if (mode & 0x40) {
        vorcal::fuzz::FailAllocation(1);
        TrapUnless(vorCALTools_AAC_CreateParser(asc.data(), int32_t(asc.size())) == nullptr);
    }
    CALAACParser *p = vorCALTools_AAC_CreateParser(mode & 1 ? asc.data() : nullptr, int32_t(asc.size()));
    TrapUnless(p != nullptr);
    CALAACFrameInfo info;
    if (mode & 1) {
        while (in.RestSize() >= 2) {
            size_t len = size_t(in.Byte()) << 8;
            len |= in.Byte();
            len = len < in.RestSize() ? len : in.RestSize();
            const std::vector<uint8_t> unit(in.Rest(), in.Rest() + len);
            for (size_t i = 0; i < len; ++i)
                in.Byte();
            const int32_t r = vorCALTools_AAC_ParseFrame(p, unit.data(), int32_t(unit.size()), &info);
            Check(r, info, unit.size());
            TrapUnless(info.uFrameBytes == unit.size() || unit.empty());
        }
    } else {
        const uint8_t *pRest = in.Rest();
        for (size_t pos = 0, size = in.RestSize(); pos < size;) {
            const std::vector<uint8_t> frame(pRest + pos, pRest + size);
            const int32_t r = vorCALTools_AAC_ParseFrame(p, frame.data(), int32_t(frame.size()), &info);
            Check(r, info, frame.size());
            pos += r == 1 || r == 2 || info.uFrameBytes == 0 ? 1 : info.uFrameBytes;
        }
    }
    vorCALTools_AAC_DestroyParser(p);
    TrapUnless(vorcal::fuzz::LiveBlocks() == live);
    return 0;
}
