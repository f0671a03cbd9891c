// vorCALTools_HEVC_ParseSPS on arbitrary data, as one SPS unit, start-code data or an hvcC record
// (the first byte decides). The data is an exact-size copy, so any read outside it is caught.
#include <cstdint>
#include <cstring>
#include <vector>

#include <vorcal/video_tools.h>

#define CHECK(x) ((x) ? void() : __builtin_trap())

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    const std::vector<uint8_t> data(pData, pData + uSize);
    CALHEVCSPS s;
    std::memset(&s, 0x5A, sizeof s);
    const int32_t iResult = vorCALTools_HEVC_ParseSPS(data.data(), static_cast<int32_t>(data.size()), &s);
    if (iResult != CAL_HEVC_OK) {
        const CALHEVCSPS zero{};
        CHECK(iResult >= CAL_HEVC_ERR_TRUNCATED && iResult <= CAL_HEVC_ERR_ARGUMENT);
        CHECK(std::memcmp(&s, &zero, sizeof s) == 0);
        return 0;
    }
    // What a parsed SPS always satisfies (ITU-T H.265 7.4.3.2.1, E.3.1).
    CHECK(s.uSPSId <= 15 && s.uChromaFormatIdc <= 3 && s.uMaxSubLayers >= 1 && s.uMaxSubLayers <= 7);
    CHECK(s.uBitDepthLuma >= 8 && s.uBitDepthLuma <= 16 && s.uBitDepthChroma >= 8 && s.uBitDepthChroma <= 16);
    CHECK(s.uLog2MaxPicOrderCntLsb >= 4 && s.uLog2MaxPicOrderCntLsb <= 16 && s.uLog2CtbSize <= 6);
    CHECK(s.uLog2MinCbSize >= 3 && s.uLog2MinCbSize <= s.uLog2CtbSize && s.uCodedWidth % (1u << s.uLog2MinCbSize) == 0);
    CHECK(s.uWidth > 0 && s.uHeight > 0 && s.uConfWinLeft + s.uConfWinRight + s.uWidth == s.uCodedWidth &&
          s.uConfWinTop + s.uConfWinBottom + s.uHeight == s.uCodedHeight);
    CHECK(s.uMaxNumReorderPics < s.uMaxDecPicBuffering && s.uMaxDecPicBuffering <= 16);
    CHECK(s.uNumShortTermRefPicSets <= 64 && s.uNumLongTermRefPicsSps <= 32 && s.uMinSpatialSegmentationIdc <= 4095);
    CHECK(s.uSarNum <= 0xFFFF && s.uSarDen <= 0xFFFF && s.uColourPrimaries <= 255 && s.uVideoFullRange <= 1);
    CHECK(s.uExtensionFlags <= 0xFF && s.uSeparateColourPlane <= (s.uChromaFormatIdc == 3 ? 1u : 0u));
    return 0;
}
