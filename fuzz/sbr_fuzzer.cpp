// sbr_extension_dataOnlyParsing on arbitrary payloads: up to four frames parsed in a row on
// one state (so time deltas build on earlier frames), over a copy padded with zeros since the
// parse-only reader has no end bound. Leading bytes pick the element id, the rate and the
// time-rate byte.
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <vector>

#include <vorcal/aacparse.h>

#include "fuzz_sal.hpp"

namespace {

constexpr uint32_t kRates[] = {96000, 88200, 64000, 48000, 44100, 32000, 24000, 22050, 16000, 12000, 11025, 8000};
// Longest SCE payload: 5 envelopes of 64 bands of 19-bit codes and the rest, well under this.
constexpr size_t kSlack = 4096;

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const uint8_t uOptions = in.Byte();
    const uint8_t uRatePick = in.Byte();
    uint32_t uRate = kRates[uRatePick % 12];
    if (uRatePick >= 0xF0)
        uRate = in.U32(); // any rate, 0 included
    const uint32_t uElementId = (uOptions & 0x80) ? (uOptions & 7) : 0;

    std::vector<uint8_t> buffer(in.RestSize() + kSlack, 0);
    if (in.RestSize() != 0)
        memcpy(buffer.data(), in.Rest(), in.RestSize());

    VrSBRState_OnlyParsing sbr;
    memset(&sbr, uOptions & 0x40 ? 0xFF : 0, sizeof sbr);
    sbrDecodeInitOnlyParsing(nullptr, &sbr, uRate);
    sbr.uTimeRate = (uOptions >> 5) & 1;

    VrBitReader_OnlyParsing reader{};
    VrInitBits_OnlyParsing(&reader, buffer.data());
    const uint32_t uFrames = 1 + ((uOptions >> 3) & 3);
    for (uint32_t i = 0; i < uFrames && VrGetProcessedBits_OnlyParsing(&reader) / 8 < in.RestSize(); ++i) {
        const int32_t result = sbr_extension_dataOnlyParsing(&reader, &sbr, uElementId);
        if (result < 0 || result > 2)
            __builtin_trap();
        // A result of 2 means a frame was parsed over freshly built tables.
        if (result == 2 && (sbr.uNumEnv > VR_SBR_MAX_ENVELOPES || sbr.uNumMaster > VR_SBR_MAX_BANDS ||
                            sbr.uNumHigh > sbr.uNumMaster || sbr.uNumNoiseBands > VR_SBR_MAX_NOISE_BANDS))
            __builtin_trap();
        VrByteAlign_OnlyParsing(&reader);
    }
    return 0;
}
