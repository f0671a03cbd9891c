// sbr_extension_dataOnlyParsing on arbitrary payloads: up to four frames parsed in a row on
// one state (so time deltas build on earlier frames), over a copy padded with zeros since the
// parse-only reader has no end bound. Leading bytes pick the element id, the rate (any rate,
// 0 included, from a pick of 0xF0 up) and the time-rate byte.
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <vector>

#include <vorcal/aacparse.h>

#include "fuzz_sal.hpp"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const uint8_t uOptions = in.Byte(), uRatePick = in.Byte();
    const uint32_t uRate = uRatePick >= 0xF0 ? in.U32() : VrTBL_SampleRates_OnlyParsing[uRatePick % 12];
    // Longest payload: 5 envelopes of 64 bands of 19-bit codes and the rest, well under 4 KiB.
    std::vector<uint8_t> buffer(in.Rest(), in.Rest() + in.RestSize());
    buffer.resize(buffer.size() + 4096, 0);
    VrSBRState_OnlyParsing sbr;
    memset(&sbr, uOptions & 0x40 ? 0xFF : 0, sizeof sbr); // fields the init leaves alone
    sbrDecodeInitOnlyParsing(nullptr, &sbr, uRate);
    sbr.uTimeRate = (uOptions >> 5) & 1;
    VrBitReader_OnlyParsing reader{};
    VrInitBits_OnlyParsing(&reader, buffer.data());
    const uint32_t uFrames = 1 + ((uOptions >> 3) & 3), uElementId = (uOptions & 0x80) ? (uOptions & 7) : 0;
    for (uint32_t i = 0; i < uFrames && VrGetProcessedBits_OnlyParsing(&reader) / 8 < in.RestSize(); ++i) {
        const int32_t result = sbr_extension_dataOnlyParsing(&reader, &sbr, uElementId);
        // A result of 2 means a frame was parsed over freshly built tables.
        const bool tablesOk = sbr.uNumEnv <= VR_SBR_MAX_ENVELOPES && sbr.uNumMaster <= VR_SBR_MAX_BANDS &&
                              sbr.uNumHigh <= sbr.uNumMaster && sbr.uNumNoiseBands <= VR_SBR_MAX_NOISE_BANDS;
        if (result < 0 || result > 2 || (result == 2 && !tablesOk))
            __builtin_trap();
        VrByteAlign_OnlyParsing(&reader);
    }
    return 0;
}
