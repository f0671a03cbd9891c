// vorCALTools_AVC_ParseSPS on arbitrary data, as one SPS unit, start-code data or a record
// (the first byte decides). The data is an exact-size copy, so any read outside it is caught.
#include <cstdint>
#include <cstring>
#include <vector>

#include <vorcal/video_tools.h>

#define CHECK(x) ((x) ? void() : __builtin_trap())

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    const std::vector<uint8_t> data(pData, pData + uSize);
    CALAVCSPS s;
    std::memset(&s, 0x5A, sizeof s);
    const int32_t iResult = vorCALTools_AVC_ParseSPS(data.data(), static_cast<int32_t>(data.size()), &s);
    if (iResult != CAL_AVC_SPS_OK) {
        const CALAVCSPS zero{};
        CHECK(iResult >= CAL_AVC_SPS_ERR_TRUNCATED && iResult <= CAL_AVC_SPS_ERR_ARGUMENT);
        CHECK(std::memcmp(&s, &zero, sizeof s) == 0);
        return 0;
    }
    // What a parsed SPS always satisfies (ITU-T H.264 7.4.2.1.1).
    CHECK(s.uSPSId <= 31 && s.uChromaFormatIdc <= 3 && s.uPicOrderCntType <= 2 && s.uMaxNumRefFrames <= 16);
    CHECK(s.uBitDepthLuma >= 8 && s.uBitDepthLuma <= 14 && s.uBitDepthChroma >= 8 && s.uBitDepthChroma <= 14);
    CHECK(s.uLog2MaxFrameNum >= 4 && s.uLog2MaxFrameNum <= 16 && s.uFrameMbsOnly <= 1);
    CHECK(s.uCodedWidth % 16 == 0 && s.uCodedHeight % 16 == 0 && s.uWidth > 0 && s.uHeight > 0);
    CHECK(s.uCropLeft + s.uCropRight + s.uWidth == s.uCodedWidth && s.uCropTop + s.uCropBottom + s.uHeight == s.uCodedHeight);
    CHECK(s.uFrameMbsOnly == 0 || s.uMbAdaptiveFrameField == 0);
    CHECK(s.uSarNum <= 0xFFFF && s.uSarDen <= 0xFFFF && s.uColourPrimaries <= 255 && s.uVideoFullRange <= 1);
    return 0;
}
