// The whole H.264 sequence parameter set: ITU-T H.264 7.3.2.1.1 with its scaling lists
// (7.3.2.1.1.1) and the VUI of Annex E (E.1.1, HRD parameters E.1.2), read from one SPS NAL
// unit found in a single unit, start-code framed data or an AVC decoder configuration record.
#include <cstddef>
#include <cstdint>

#include <vorcal/video_tools.h>

#include "tools/avc_nal.hpp"
#include "tools/rbsp_reader.hpp"

namespace vorcal::tools::avc {
namespace {

// Profiles whose SPS carries chroma_format_idc, the bit depths and the scaling matrix.
bool HasChromaFields(uint32_t uProfileIdc) noexcept
{
    switch (uProfileIdc) {
    case 100: case 110: case 122: case 244: case 44: case 83: case 86: case 118: case 128:
    case 138: case 139: case 134: case 135:
        return true;
    default:
        return false;
    }
}

// scaling_list(), 7.3.2.1.1.1: only the bits matter here. Reading stops once nextScale is 0,
// at j = 0 (useDefaultScalingMatrixFlag) or later (the last scale repeats to the end).
void SkipScalingList(RbspReader &r, uint32_t uSize) noexcept
{
    int64_t iLast = 8;
    int64_t iNext = 8;
    for (uint32_t j = 0; j < uSize && iNext != 0 && !r.Failed(); ++j) {
        const int64_t iDelta = r.SE();
        r.Require(iDelta >= -128 && iDelta <= 127);
        iNext = (iLast + iDelta + 256) % 256;
        if (iNext != 0)
            iLast = iNext;
    }
}

// hrd_parameters(), E.1.2: read past.
void SkipHrd(RbspReader &r) noexcept
{
    const uint32_t uCpbCount = r.UE(31) + 1;
    r.Bits(8); // bit_rate_scale, cpb_size_scale
    for (uint32_t i = 0; i < uCpbCount && !r.Failed(); ++i) {
        r.UE(); // bit_rate_value_minus1
        r.UE(); // cpb_size_value_minus1
        r.Bit(); // cbr_flag
    }
    r.Bits(20); // four delay and offset lengths of 5 bits
}

// vui_parameters(), E.1.1.
void ParseVui(RbspReader &r, CALAVCSPS &s) noexcept
{
    if (r.Bit()) // aspect_ratio_info_present_flag
        ReadSampleAspectRatio(r, &s.uSarNum, &s.uSarDen);
    if (r.Bit()) // overscan_info_present_flag
        r.Bit(); // overscan_appropriate_flag
    if (r.Bit()) { // video_signal_type_present_flag
        r.Bits(3); // video_format
        s.uVideoFullRange = r.Bit();
        if (r.Bit()) { // colour_description_present_flag
            s.uColourPrimaries = r.Bits(8);
            s.uTransferCharacteristics = r.Bits(8);
            s.uMatrixCoefficients = r.Bits(8);
        }
    }
    if (r.Bit()) { // chroma_loc_info_present_flag
        r.UE();    // chroma_sample_loc_type_top_field
        r.UE();    // chroma_sample_loc_type_bottom_field
    }
    if (r.Bit()) { // timing_info_present_flag
        s.uNumUnitsInTick = r.Bits(32);
        s.uTimeScale = r.Bits(32);
        s.uFixedFrameRate = r.Bit();
    }
    const uint32_t uNalHrd = r.Bit();
    if (uNalHrd)
        SkipHrd(r);
    const uint32_t uVclHrd = r.Bit();
    if (uVclHrd)
        SkipHrd(r);
    if (uNalHrd || uVclHrd)
        r.Bit(); // low_delay_hrd_flag
    r.Bit();     // pic_struct_present_flag
    if (r.Bit()) { // bitstream_restriction_flag
        r.Bit();   // motion_vectors_over_pic_boundaries_flag
        r.UE();    // max_bytes_per_pic_denom
        r.UE();    // max_bits_per_mb_denom
        r.UE();    // log2_max_mv_length_horizontal
        r.UE();    // log2_max_mv_length_vertical
        s.uMaxNumReorderFrames = r.UE();
        s.uMaxDecFrameBuffering = r.UE();
    }
}

// Largest values of 7.4.2.1.1 (MaxDpbFrames is at most 16).
constexpr uint32_t kMaxSpsId = 31;
constexpr uint32_t kMaxBitDepthMinus8 = 6;
constexpr uint32_t kMaxLog2Minus4 = 12;
constexpr uint32_t kMaxPocCycle = 255;
constexpr uint32_t kMaxDpbFrames = 16;

// Frame size and cropping (7-18 to 7-22); false when they do not fit or crop everything away.
bool ApplySize(CALAVCSPS &s, uint32_t uWidthMbsMinus1, uint32_t uHeightMapUnitsMinus1, const uint32_t (&uCrop)[4]) noexcept
{
    const uint64_t uFieldFactor = 2 - uint64_t{s.uFrameMbsOnly};
    const uint64_t uWidth = (uint64_t{uWidthMbsMinus1} + 1) * 16;
    const uint64_t uHeight = (uint64_t{uHeightMapUnitsMinus1} + 1) * 16 * uFieldFactor;
    // ChromaArrayType 0 (monochrome or separate colour planes) crops in luma samples.
    const uint32_t uChromaArrayType = s.uSeparateColourPlane ? 0 : s.uChromaFormatIdc;
    const uint64_t uUnitX = (uChromaArrayType == 1 || uChromaArrayType == 2) ? 2 : 1;
    const uint64_t uUnitY = (uChromaArrayType == 1 ? 2 : 1) * uFieldFactor;
    const uint64_t uLeft = uCrop[0] * uUnitX, uRight = uCrop[1] * uUnitX;
    const uint64_t uTop = uCrop[2] * uUnitY, uBottom = uCrop[3] * uUnitY;
    if (uWidth > UINT32_MAX || uHeight > UINT32_MAX || uLeft + uRight >= uWidth || uTop + uBottom >= uHeight)
        return false;
    s.uCodedWidth = static_cast<uint32_t>(uWidth);
    s.uCodedHeight = static_cast<uint32_t>(uHeight);
    s.uCropLeft = static_cast<uint32_t>(uLeft);
    s.uCropRight = static_cast<uint32_t>(uRight);
    s.uCropTop = static_cast<uint32_t>(uTop);
    s.uCropBottom = static_cast<uint32_t>(uBottom);
    s.uWidth = static_cast<uint32_t>(uWidth - uLeft - uRight);
    s.uHeight = static_cast<uint32_t>(uHeight - uTop - uBottom);
    return true;
}

// seq_parameter_set_data(), the reader standing just after the NAL header byte.
int32_t ResultOf(const RbspReader &r) noexcept
{
    switch (r.Error()) {
    case RbspError::kTruncated:
        return CAL_AVC_SPS_ERR_TRUNCATED;
    case RbspError::kMalformed:
        return CAL_AVC_SPS_ERR_MALFORMED;
    default:
        return CAL_AVC_SPS_OK;
    }
}

int32_t ParseBody(RbspReader &r, CALAVCSPS &s) noexcept
{
    s.uProfileIdc = r.Bits(8);
    s.uConstraintFlags = r.Bits(8);
    s.uLevelIdc = r.Bits(8);
    s.uSPSId = r.UE(kMaxSpsId);
    s.uChromaFormatIdc = 1; // 4:2:0 and 8 bits when the profile does not code them
    s.uBitDepthLuma = s.uBitDepthChroma = 8;
    if (HasChromaFields(s.uProfileIdc)) {
        s.uChromaFormatIdc = r.UE(3);
        if (s.uChromaFormatIdc == 3)
            s.uSeparateColourPlane = r.Bit();
        s.uBitDepthLuma = 8 + r.UE(kMaxBitDepthMinus8);
        s.uBitDepthChroma = 8 + r.UE(kMaxBitDepthMinus8);
        r.Bit(); // qpprime_y_zero_transform_bypass_flag
        s.uScalingMatrixPresent = r.Bit();
        if (s.uScalingMatrixPresent) {
            const uint32_t uLists = s.uChromaFormatIdc != 3 ? 8 : 12;
            for (uint32_t i = 0; i < uLists && !r.Failed(); ++i)
                if (r.Bit()) // seq_scaling_list_present_flag[i]
                    SkipScalingList(r, i < 6 ? 16 : 64);
        }
    }
    s.uLog2MaxFrameNum = r.UE(kMaxLog2Minus4) + 4;
    s.uPicOrderCntType = r.UE(2);
    if (r.Failed())
        return ResultOf(r);
    if (s.uPicOrderCntType == 0) {
        r.UE(kMaxLog2Minus4); // log2_max_pic_order_cnt_lsb_minus4
    } else if (s.uPicOrderCntType == 1) {
        r.Bit(); // delta_pic_order_always_zero_flag
        r.SE();  // offset_for_non_ref_pic
        r.SE();  // offset_for_top_to_bottom_field
        const uint32_t uCycle = r.UE(kMaxPocCycle);
        for (uint32_t i = 0; i < uCycle && !r.Failed(); ++i)
            r.SE(); // offset_for_ref_frame[i]
    }
    s.uMaxNumRefFrames = r.UE(kMaxDpbFrames);
    r.Bit(); // gaps_in_frame_num_value_allowed_flag
    const uint32_t uWidthMbsMinus1 = r.UE();
    const uint32_t uHeightMapUnitsMinus1 = r.UE();
    s.uFrameMbsOnly = r.Bit();
    if (!s.uFrameMbsOnly)
        s.uMbAdaptiveFrameField = r.Bit();
    r.Bit(); // direct_8x8_inference_flag
    uint32_t uCrop[4] = {0, 0, 0, 0};
    if (r.Bit()) { // frame_cropping_flag
        for (uint32_t &uOffset : uCrop)
            uOffset = r.UE();
    }
    if (r.Bit()) // vui_parameters_present_flag
        ParseVui(r, s);
    if (r.Failed())
        return ResultOf(r);
    return ApplySize(s, uWidthMbsMinus1, uHeightMapUnitsMinus1, uCrop) ? CAL_AVC_SPS_OK : CAL_AVC_SPS_ERR_MALFORMED;
}

inline bool IsSpsHeader(uint8_t uHeader) noexcept
{
    return (uHeader & kForbiddenBit) == 0 && (uHeader & kTypeMask) == kNalSps;
}

struct Unit {
    const uint8_t *p = nullptr;
    size_t uLen = 0;
    int32_t iError = CAL_AVC_SPS_ERR_NOT_FOUND;
};

// The first SPS unit of an AVC decoder configuration record (ISO/IEC 14496-15 5.3.3.1):
// numOfSequenceParameterSets at byte 5, then a 16-bit length and the unit.
Unit SpsOfConfigRecord(const uint8_t *p, size_t uLen) noexcept
{
    if (uLen >= 6 && (p[5] & 0x1F) == 0)
        return {};
    if (uLen < 8)
        return {nullptr, 0, CAL_AVC_SPS_ERR_TRUNCATED};
    const size_t uUnit = (size_t{p[6]} << 8) | p[7];
    if (uLen - 8 < uUnit)
        return {nullptr, 0, CAL_AVC_SPS_ERR_TRUNCATED};
    if (uUnit == 0 || !IsSpsHeader(p[8]))
        return {};
    return {p + 8, uUnit, CAL_AVC_SPS_OK};
}

// The first unit of type 7 behind a start code, up to the next start code.
Unit SpsOfStartCodes(const uint8_t *p, size_t uLen) noexcept
{
    size_t uFrom = 0;
    for (;;) {
        const size_t q = nal::FindPrefix(p, uFrom, uLen);
        if (q == nal::kNotFound || q + 3 >= uLen)
            return {};
        const size_t uHeader = q + 3;
        if (IsSpsHeader(p[uHeader])) {
            const size_t uEnd = nal::FindPrefix(p, uHeader, uLen);
            return {p + uHeader, (uEnd == nal::kNotFound ? uLen : uEnd) - uHeader, CAL_AVC_SPS_OK};
        }
        uFrom = uHeader;
    }
}

int32_t ParseSPS(const uint8_t *pData, int32_t iLen, CALAVCSPS *pSPS) noexcept
{
    if (pSPS == nullptr)
        return CAL_AVC_SPS_ERR_ARGUMENT;
    *pSPS = CALAVCSPS{};
    if (pData == nullptr || iLen <= 0)
        return CAL_AVC_SPS_ERR_ARGUMENT;
    const size_t uLen = static_cast<size_t>(iLen);
    constexpr uint8_t kConfigurationVersion = 1;
    const Unit unit = IsSpsHeader(pData[0])                  ? Unit{pData, uLen, CAL_AVC_SPS_OK}
                      : pData[0] == kConfigurationVersion ? SpsOfConfigRecord(pData, uLen)
                                                             : SpsOfStartCodes(pData, uLen);
    if (unit.iError != CAL_AVC_SPS_OK)
        return unit.iError;
    CALAVCSPS sps{};
    sps.uColourPrimaries = sps.uTransferCharacteristics = sps.uMatrixCoefficients = 2; // unspecified
    RbspReader reader(unit.p + 1, unit.uLen - 1);
    const int32_t iResult = ParseBody(reader, sps);
    if (iResult == CAL_AVC_SPS_OK)
        *pSPS = sps;
    return iResult;
}

} // namespace
} // namespace vorcal::tools::avc

extern "C" int32_t vorCALTools_AVC_ParseSPS(const uint8_t *pData, int32_t iLen, CALAVCSPS *pSPS)
{
    return vorcal::tools::avc::ParseSPS(pData, iLen, pSPS);
}
