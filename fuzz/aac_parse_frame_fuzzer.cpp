// vorCALTools_AAC_ParseFrame on arbitrary bytes. The first byte picks the framing:
//  even: ADTS. The rest is walked frame by frame as an engine would (on by uFrameBytes, a byte
//        on after a refusal), each call on an exact-size copy of what is left;
//  odd:  raw access units. The AudioSpecificConfig is the next 1 + (byte >> 1) % 8 bytes, the
//        rest access units behind 2-byte big-endian lengths, each in an exact-size copy.
// Bit 6 of the first byte fails the parser's allocation first. Every result is one of the six,
// the frame information is consistent, and the parser frees what it took. Bit 5 also walks each
// ADTS frame with the exported element parsers on hhDecoder, which store every value (spectral
// lines, noise, pulses), behind the slack they need (twice the frame and 16 KB of zeros).
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

void WalkWithValues(const uint8_t *pFrame, size_t uLen)
{
    std::vector<uint8_t> buf(pFrame, pFrame + uLen);
    buf.resize(2 * uLen + 16384, 0);
    uint32_t rate = 0, channels = 0, samples, sbr, aligned, header;
    VrAACSBRInfo(nullptr, 0, nullptr, nullptr, nullptr, nullptr, nullptr);
    VrAACDecInitOnlyParsing(hDecoder, buf.data(), &rate, &channels, &samples, &sbr, &aligned, &header);
    VrAACDecoder_OnlyParsing *d = hDecoder;
    static uint8_t scratch[512];
    uint32_t tag, count, ok = 1;
    while (ok && VrGetProcessedBits_OnlyParsing(&d->Bits) <= 8 * uLen) {
        switch (VrGetBits_OnlyParsing(&d->Bits, 3)) {
        case 0: ok = single_channel_elementOnlyParsing(d, &d->MCInfo) == 0; break;
        case 1: ok = channel_pair_elementOnlyParsing(d, &d->MCInfo) == 0; break;
        case 3: ok = lfe_channel_elementOnlyParsing(d, &d->MCInfo) == 1; break;
        case 4: getdataOnlyParsing(d, &tag, &count, scratch); break;
        case 5: ok = VrGet_ProgamConfig_OnlyParsing(d) >= 0; huffbookinitOnlyParsing(d); break;
        case 6: getfillOnlyParsing(d, scratch); break;
        default: ok = 0; break; // coupling element or ID_END
        }
    }
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
            if ((mode & 0x20) && r != 1 && r != 2)
                WalkWithValues(frame.data(), info.uFrameBytes);
            pos += r == 1 || r == 2 || info.uFrameBytes == 0 ? 1 : info.uFrameBytes;
        }
    }
    vorCALTools_AAC_DestroyParser(p);
    TrapUnless(vorcal::fuzz::LiveBlocks() == live);
    return 0;
}
