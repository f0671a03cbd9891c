// HEVC parameter sets: the whole SPS up to its extension flags (ITU-T H.265 7.3.2.2.1 with
// profile_tier_level 7.3.3, scaling_list_data 7.3.4, st_ref_pic_set 7.3.7 and the VUI and HRD
// parameters of Annex E), and the start of the VPS and PPS, read through the RBSP reader that
// drops emulation-prevention bytes. vorCALTools_HEVC_ParseSPS finds the SPS in one unit,
// start-code framed data or an hvcC record.
#include <cstddef>
#include <cstdint>

#include <vorcal/video_tools.h>

#include "tools/hevc_nal.hpp"
#include "tools/hevc_ps.hpp"
#include "tools/rbsp_reader.hpp"

namespace vorcal::tools::hevc {
namespace {

// Largest values of 7.4.3.2.1 and Annex A: 7 sub-layers, 16 SPS ids, 16 pictures in the DPB,
// 64 short-term and 32 long-term reference sets.
constexpr uint32_t kMaxSubLayersMinus1 = 6;
constexpr uint32_t kMaxSpsId = 15;
constexpr uint32_t kMaxBitDepthMinus8 = 8;
constexpr uint32_t kMaxLog2PocLsbMinus4 = 12;
constexpr uint32_t kMaxDpbSize = 16;
constexpr uint32_t kMaxLog2CtbSize = 6;
constexpr uint32_t kMaxShortTermRefPicSets = 64;
constexpr uint32_t kMaxLongTermRefPicsSps = 32;
constexpr uint32_t kMaxDeltaPocMinus1 = 32767;
constexpr uint32_t kMaxMinSpatialSegmentation = 4095;

int32_t ResultOf(const RbspReader &r) noexcept
{
    switch (r.Error()) {
    case RbspError::kTruncated:
        return CAL_HEVC_ERR_TRUNCATED;
    case RbspError::kMalformed:
        return CAL_HEVC_ERR_MALFORMED;
    default:
        return CAL_HEVC_OK;
    }
}

// The general part of profile_tier_level(1, maxNumSubLayersMinus1); the sub-layer parts are
// read past.
struct Ptl {
    uint32_t uSpace, uTier, uIdc, uCompatibility, uConstraintHigh, uConstraintLow, uLevel;
};

Ptl ReadProfileTierLevel(RbspReader &r, uint32_t uMaxSubLayersMinus1) noexcept
{
    Ptl ptl{};
    const uint32_t uFirst = r.Bits(8);
    ptl.uSpace = uFirst >> 6;
    ptl.uTier = (uFirst >> 5) & 1;
    ptl.uIdc = uFirst & 0x1F;
    ptl.uCompatibility = r.Bits(32);
    // progressive, interlaced, non-packed and frame-only flags, 43 constraint or reserved bits,
    // general_inbld_flag: the 48 bits the hvcC record carries as they are.
    ptl.uConstraintHigh = r.Bits(16);
    ptl.uConstraintLow = r.Bits(32);
    ptl.uLevel = r.Bits(8);
    bool bProfilePresent[kMaxSubLayersMinus1] = {};
    bool bLevelPresent[kMaxSubLayersMinus1] = {};
    for (uint32_t i = 0; i < uMaxSubLayersMinus1; ++i) {
        bProfilePresent[i] = r.Bit();
        bLevelPresent[i] = r.Bit();
    }
    if (uMaxSubLayersMinus1 > 0)
        r.Skip(2 * (8 - uint64_t{uMaxSubLayersMinus1})); // reserved_zero_2bits
    constexpr uint32_t kSubLayerProfileBits = 88;
    for (uint32_t i = 0; i < uMaxSubLayersMinus1; ++i) {
        if (bProfilePresent[i])
            r.Skip(kSubLayerProfileBits);
        if (bLevelPresent[i])
            r.Bits(8); // sub_layer_level_idc
    }
    return ptl;
}

// scaling_list_data(), 7.3.4: only the bits matter here.
void SkipScalingListData(RbspReader &r) noexcept
{
    for (uint32_t uSizeId = 0; uSizeId < 4; ++uSizeId) {
        for (uint32_t uMatrixId = 0; uMatrixId < 6 && !r.Failed(); uMatrixId += uSizeId == 3 ? 3 : 1) {
            if (!r.Bit()) { // scaling_list_pred_mode_flag
                r.UE(uSizeId == 3 ? uMatrixId / 3 : uMatrixId); // scaling_list_pred_matrix_id_delta
                continue;
            }
            const uint32_t uCoefs = uSizeId == 0 ? 16 : 64;
            if (uSizeId > 1) {
                const int64_t iDc = r.SE(); // scaling_list_dc_coef_minus8
                r.Require(iDc >= -7 && iDc <= 247);
            }
            for (uint32_t i = 0; i < uCoefs && !r.Failed(); ++i) {
                const int64_t iDelta = r.SE(); // scaling_list_delta_coef
                r.Require(iDelta >= -128 && iDelta <= 127);
            }
        }
    }
}

// The pictures of one short-term reference picture set (7.4.8): DeltaPocS0 and DeltaPocS1.
// A set predicted from the one before it can hold one picture more than that one, so the
// arrays have room for kMaxDpbSize + 1 before the count is checked.
struct ShortTermRps {
    uint32_t uNegative = 0, uPositive = 0;
    int32_t iS0[kMaxDpbSize + 1] = {}, iS1[kMaxDpbSize + 1] = {};
};

// delta_poc_s0_minus1, delta_poc_s1_minus1 or abs_delta_rps_minus1, plus 1: a value out of range
// marks the SPS malformed and counts as the largest, so that no sum can overflow.
int32_t DeltaPoc(RbspReader &r) noexcept
{
    const uint32_t v = r.UE(kMaxDeltaPocMinus1);
    return static_cast<int32_t>(v < kMaxDeltaPocMinus1 ? v : kMaxDeltaPocMinus1) + 1;
}

// st_ref_pic_set(stRpsIdx) in the SPS, where the reference set of inter prediction is always the
// set before (delta_idx_minus1 is in slice headers only); the derivation of 7-61 and 7-62.
void ReadShortTermRps(RbspReader &r, uint32_t uIdx, const ShortTermRps &prev, ShortTermRps &cur) noexcept
{
    cur = ShortTermRps{};
    if (uIdx != 0 && r.Bit()) { // inter_ref_pic_set_prediction_flag
        const uint32_t uSign = r.Bit();
        const int32_t iAbs = DeltaPoc(r);
        const int32_t iDeltaRps = uSign ? -iAbs : iAbs;
        const uint32_t uRefPocs = prev.uNegative + prev.uPositive; // NumDeltaPocs[RefRpsIdx]
        bool bUseDelta[kMaxDpbSize + 1] = {};
        for (uint32_t j = 0; j <= uRefPocs; ++j) {
            const bool bUsed = r.Bit(); // used_by_curr_pic_flag
            bUseDelta[j] = bUsed || r.Bit(); // use_delta_flag, 1 when absent
        }
        uint32_t i = 0;
        for (uint32_t j = prev.uPositive; j-- > 0;) {
            const int32_t d = prev.iS1[j] + iDeltaRps;
            if (d < 0 && bUseDelta[prev.uNegative + j])
                cur.iS0[i++] = d;
        }
        if (iDeltaRps < 0 && bUseDelta[uRefPocs])
            cur.iS0[i++] = iDeltaRps;
        for (uint32_t j = 0; j < prev.uNegative && i <= kMaxDpbSize; ++j) {
            const int32_t d = prev.iS0[j] + iDeltaRps;
            if (d < 0 && bUseDelta[j])
                cur.iS0[i++] = d;
        }
        cur.uNegative = i;
        i = 0;
        for (uint32_t j = prev.uNegative; j-- > 0;) {
            const int32_t d = prev.iS0[j] + iDeltaRps;
            if (d > 0 && bUseDelta[j])
                cur.iS1[i++] = d;
        }
        if (iDeltaRps > 0 && bUseDelta[uRefPocs])
            cur.iS1[i++] = iDeltaRps;
        for (uint32_t j = 0; j < prev.uPositive && i <= kMaxDpbSize; ++j) {
            const int32_t d = prev.iS1[j] + iDeltaRps;
            if (d > 0 && bUseDelta[prev.uNegative + j])
                cur.iS1[i++] = d;
        }
        cur.uPositive = i;
    } else {
        cur.uNegative = r.UE(kMaxDpbSize);
        cur.uPositive = r.UE(kMaxDpbSize - (cur.uNegative < kMaxDpbSize ? cur.uNegative : kMaxDpbSize));
        if (r.Failed())
            return;
        int32_t iPoc = 0;
        for (uint32_t i = 0; i < cur.uNegative; ++i) {
            iPoc -= DeltaPoc(r); // delta_poc_s0_minus1
            cur.iS0[i] = iPoc;
            r.Bit(); // used_by_curr_pic_s0_flag
        }
        iPoc = 0;
        for (uint32_t i = 0; i < cur.uPositive; ++i) {
            iPoc += DeltaPoc(r); // delta_poc_s1_minus1
            cur.iS1[i] = iPoc;
            r.Bit(); // used_by_curr_pic_s1_flag
        }
    }
    r.Require(cur.uNegative + cur.uPositive <= kMaxDpbSize);
}

// sub_layer_hrd_parameters(), E.2.3: read past.
void SkipSubLayerHrd(RbspReader &r, uint32_t uCpbCount, bool bSubPic) noexcept
{
    for (uint32_t i = 0; i < uCpbCount && !r.Failed(); ++i) {
        r.UE(); // bit_rate_value_minus1
        r.UE(); // cpb_size_value_minus1
        if (bSubPic) {
            r.UE(); // cpb_size_du_value_minus1
            r.UE(); // bit_rate_du_value_minus1
        }
        r.Bit(); // cbr_flag
    }
}

// hrd_parameters(1, maxNumSubLayersMinus1), E.2.2: read past.
void SkipHrd(RbspReader &r, uint32_t uMaxSubLayersMinus1) noexcept
{
    const bool bNal = r.Bit(), bVcl = r.Bit();
    bool bSubPic = false;
    if (bNal || bVcl) {
        bSubPic = r.Bit();
        if (bSubPic)
            r.Bits(8 + 5 + 1 + 5); // tick_divisor_minus2 .. dpb_output_delay_du_length_minus1
        r.Bits(8);                 // bit_rate_scale, cpb_size_scale
        if (bSubPic)
            r.Bits(4); // cpb_size_du_scale
        r.Bits(15);    // three delay lengths of 5 bits
    }
    constexpr uint32_t kMaxElementalDuration = 2047;
    constexpr uint32_t kMaxCpbCountMinus1 = 31;
    for (uint32_t i = 0; i <= uMaxSubLayersMinus1 && !r.Failed(); ++i) {
        const bool bFixedGeneral = r.Bit();
        const bool bFixedWithinCvs = bFixedGeneral || r.Bit(); // 1 when absent
        bool bLowDelay = false;
        if (bFixedWithinCvs)
            r.UE(kMaxElementalDuration); // elemental_duration_in_tc_minus1
        else
            bLowDelay = r.Bit();
        const uint32_t uCpbCount = bLowDelay ? 1 : r.UE(kMaxCpbCountMinus1) + 1;
        if (bNal)
            SkipSubLayerHrd(r, uCpbCount, bSubPic);
        if (bVcl)
            SkipSubLayerHrd(r, uCpbCount, bSubPic);
    }
}

// vui_parameters(), E.2.1.
void ReadVui(RbspReader &r, CALHEVCSPS &s, uint32_t uMaxSubLayersMinus1) noexcept
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
    constexpr uint32_t kMaxChromaLocType = 5;
    if (r.Bit()) { // chroma_loc_info_present_flag
        r.UE(kMaxChromaLocType);
        r.UE(kMaxChromaLocType);
    }
    r.Bits(3);     // neutral_chroma_indication_flag, field_seq_flag, frame_field_info_present_flag
    if (r.Bit()) { // default_display_window_flag
        for (int i = 0; i < 4; ++i)
            r.UE(); // def_disp_win_*_offset
    }
    if (r.Bit()) { // vui_timing_info_present_flag
        s.uNumUnitsInTick = r.Bits(32);
        s.uTimeScale = r.Bits(32);
        if (r.Bit()) // vui_poc_proportional_to_timing_flag
            r.UE();  // vui_num_ticks_poc_diff_one_minus1
        if (r.Bit()) // vui_hrd_parameters_present_flag
            SkipHrd(r, uMaxSubLayersMinus1);
    }
    if (r.Bit()) { // bitstream_restriction_flag
        r.Bits(3); // tiles_fixed_structure, motion_vectors_over_pic_boundaries, restricted_ref_pic_lists
        s.uMinSpatialSegmentationIdc = r.UE(kMaxMinSpatialSegmentation);
        r.UE(); // max_bytes_per_pic_denom
        r.UE(); // max_bits_per_min_cu_denom
        r.UE(); // log2_max_mv_length_horizontal
        r.UE(); // log2_max_mv_length_vertical
    }
}

// Picture size and conformance window (7-1, 7-2, Table 6-1); false when the window leaves no
// picture or the size is not a whole number of minimum coding blocks.
bool ApplySize(CALHEVCSPS &s, const uint32_t (&uWindow)[4]) noexcept
{
    const uint32_t uChromaArrayType = s.uSeparateColourPlane ? 0 : s.uChromaFormatIdc;
    const uint64_t uSubWidthC = (uChromaArrayType == 1 || uChromaArrayType == 2) ? 2 : 1;
    const uint64_t uSubHeightC = uChromaArrayType == 1 ? 2 : 1;
    const uint64_t uLeft = uWindow[0] * uSubWidthC, uRight = uWindow[1] * uSubWidthC;
    const uint64_t uTop = uWindow[2] * uSubHeightC, uBottom = uWindow[3] * uSubHeightC;
    const uint32_t uMinCb = 1u << s.uLog2MinCbSize;
    if (s.uCodedWidth == 0 || s.uCodedHeight == 0 || s.uCodedWidth % uMinCb != 0 || s.uCodedHeight % uMinCb != 0 ||
        uLeft + uRight >= s.uCodedWidth || uTop + uBottom >= s.uCodedHeight)
        return false;
    s.uConfWinLeft = static_cast<uint32_t>(uLeft);
    s.uConfWinRight = static_cast<uint32_t>(uRight);
    s.uConfWinTop = static_cast<uint32_t>(uTop);
    s.uConfWinBottom = static_cast<uint32_t>(uBottom);
    s.uWidth = static_cast<uint32_t>(s.uCodedWidth - uLeft - uRight);
    s.uHeight = static_cast<uint32_t>(s.uCodedHeight - uTop - uBottom);
    return true;
}

// seq_parameter_set_rbsp(), the reader standing just after the NAL unit header.
int32_t ParseSpsBody(RbspReader &r, CALHEVCSPS &s) noexcept
{
    s.uVPSId = r.Bits(4);
    const uint32_t uMaxSubLayersMinus1 = r.Bits(3);
    r.Require(uMaxSubLayersMinus1 <= kMaxSubLayersMinus1);
    s.uMaxSubLayers = uMaxSubLayersMinus1 + 1;
    s.uTemporalIdNesting = r.Bit();
    if (r.Failed())
        return ResultOf(r);
    const Ptl ptl = ReadProfileTierLevel(r, uMaxSubLayersMinus1);
    s.uProfileSpace = ptl.uSpace;
    s.uTierFlag = ptl.uTier;
    s.uProfileIdc = ptl.uIdc;
    s.uProfileCompatibilityFlags = ptl.uCompatibility;
    s.uConstraintFlagsHigh = ptl.uConstraintHigh;
    s.uConstraintFlagsLow = ptl.uConstraintLow;
    s.uLevelIdc = ptl.uLevel;
    s.uSPSId = r.UE(kMaxSpsId);
    s.uChromaFormatIdc = r.UE(3);
    if (s.uChromaFormatIdc == 3)
        s.uSeparateColourPlane = r.Bit();
    s.uCodedWidth = r.UE();
    s.uCodedHeight = r.UE();
    uint32_t uWindow[4] = {0, 0, 0, 0};
    if (r.Bit()) { // conformance_window_flag
        for (uint32_t &uOffset : uWindow)
            uOffset = r.UE();
    }
    s.uBitDepthLuma = r.UE(kMaxBitDepthMinus8) + 8;
    s.uBitDepthChroma = r.UE(kMaxBitDepthMinus8) + 8;
    s.uLog2MaxPicOrderCntLsb = r.UE(kMaxLog2PocLsbMinus4) + 4;
    const bool bOrderingForAll = r.Bit(); // sps_sub_layer_ordering_info_present_flag
    for (uint32_t i = bOrderingForAll ? 0 : uMaxSubLayersMinus1; i <= uMaxSubLayersMinus1 && !r.Failed(); ++i) {
        s.uMaxDecPicBuffering = r.UE(kMaxDpbSize - 1) + 1;
        s.uMaxNumReorderPics = r.UE(s.uMaxDecPicBuffering - 1);
        s.uMaxLatencyIncreasePlus1 = r.UE();
    }
    s.uLog2MinCbSize = r.UE(kMaxLog2CtbSize - 3) + 3;
    s.uLog2CtbSize = s.uLog2MinCbSize + r.UE(kMaxLog2CtbSize - 3);
    r.Require(s.uLog2CtbSize <= kMaxLog2CtbSize);
    r.UE(); // log2_min_luma_transform_block_size_minus2
    r.UE(); // log2_diff_max_min_luma_transform_block_size
    r.UE(); // max_transform_hierarchy_depth_inter
    r.UE(); // max_transform_hierarchy_depth_intra
    s.uScalingListEnabled = r.Bit();
    if (s.uScalingListEnabled && r.Bit()) // sps_scaling_list_data_present_flag
        SkipScalingListData(r);
    r.Bits(2); // amp_enabled_flag, sample_adaptive_offset_enabled_flag
    if (r.Bit()) { // pcm_enabled_flag
        r.Bits(8); // pcm_sample_bit_depth_luma_minus1, pcm_sample_bit_depth_chroma_minus1
        r.UE();    // log2_min_pcm_luma_coding_block_size_minus3
        r.UE();    // log2_diff_max_min_pcm_luma_coding_block_size
        r.Bit();   // pcm_loop_filter_disabled_flag
    }
    s.uNumShortTermRefPicSets = r.UE(kMaxShortTermRefPicSets);
    ShortTermRps sets[2];
    for (uint32_t i = 0; i < s.uNumShortTermRefPicSets && !r.Failed(); ++i)
        ReadShortTermRps(r, i, sets[(i + 1) & 1], sets[i & 1]);
    s.uLongTermRefPicsPresent = r.Bit();
    if (s.uLongTermRefPicsPresent) {
        s.uNumLongTermRefPicsSps = r.UE(kMaxLongTermRefPicsSps);
        for (uint32_t i = 0; i < s.uNumLongTermRefPicsSps && !r.Failed(); ++i)
            r.Bits(s.uLog2MaxPicOrderCntLsb + 1); // lt_ref_pic_poc_lsb_sps, used_by_curr_pic_lt_sps_flag
    }
    r.Bits(2); // sps_temporal_mvp_enabled_flag, strong_intra_smoothing_enabled_flag
    if (r.Bit()) // vui_parameters_present_flag
        ReadVui(r, s, uMaxSubLayersMinus1);
    if (r.Bit()) { // sps_extension_present_flag
        const uint32_t uFlags = r.Bits(8); // range, multilayer, 3d, scc, sps_extension_4bits
        s.uExtensionFlags = ((uFlags >> 7) & 1) | ((uFlags >> 5) & 2) | ((uFlags >> 3) & 4) | ((uFlags >> 1) & 8) |
                            ((uFlags & 0xF) << 4);
    }
    if (r.Failed())
        return ResultOf(r);
    return ApplySize(s, uWindow) ? CAL_HEVC_OK : CAL_HEVC_ERR_MALFORMED;
}

bool IsBaseLayerSps(const uint8_t *pUnit) noexcept
{
    return ValidHeader(pUnit[0], pUnit[1]) && NalType(pUnit[0]) == kNalSps && LayerId(pUnit[0], pUnit[1]) == 0;
}

struct Found {
    const uint8_t *p = nullptr;
    size_t uLen = 0;
    int32_t iResult = CAL_HEVC_ERR_NOT_FOUND;
};

// The first base-layer SPS of an hvcC record.
Found SpsOfRecord(const uint8_t *p, size_t uLen) noexcept
{
    CALHEVCNAL u{};
    for (int32_t r; (r = StepRecord(p, uLen, u)) != 0;) {
        if (r < 0)
            return {nullptr, 0, r};
        if (IsBaseLayerSps(u.pUnit))
            return {u.pUnit, static_cast<size_t>(u.iLen), CAL_HEVC_OK};
    }
    return {};
}

// The first base-layer SPS behind a start code anywhere in the data, up to the next start code
// (zero bytes in front of it are not part of the unit).
Found SpsOfStartCodes(const uint8_t *p, size_t uLen) noexcept
{
    for (size_t uFrom = 0;;) {
        const size_t q = nal::FindPrefix(p, uFrom, uLen);
        if (q == nal::kNotFound || q + 3 + kHeaderBytes > uLen)
            return {};
        const size_t uBody = q + 3;
        if (IsBaseLayerSps(p + uBody)) {
            const size_t uNext = nal::FindPrefix(p, uBody, uLen);
            size_t uEnd = uNext == nal::kNotFound ? uLen : uNext;
            while (uEnd > uBody && p[uEnd - 1] == 0)
                --uEnd;
            return {p + uBody, uEnd - uBody, CAL_HEVC_OK};
        }
        uFrom = uBody;
    }
}

int32_t ParseSPS(const uint8_t *pData, int32_t iLen, CALHEVCSPS *pSPS) noexcept
{
    if (pSPS == nullptr)
        return CAL_HEVC_ERR_ARGUMENT;
    *pSPS = CALHEVCSPS{};
    if (pData == nullptr || iLen <= 0)
        return CAL_HEVC_ERR_ARGUMENT;
    const size_t uLen = static_cast<size_t>(iLen);
    Found unit;
    if (uLen >= kHeaderBytes && NalType(pData[0]) == kNalSps)
        unit = IsBaseLayerSps(pData) ? Found{pData, uLen, CAL_HEVC_OK} : Found{};
    else if (pData[0] == kConfigurationVersion)
        unit = SpsOfRecord(pData, uLen);
    else
        unit = SpsOfStartCodes(pData, uLen);
    if (unit.iResult != CAL_HEVC_OK)
        return unit.iResult;
    CALHEVCSPS sps{};
    const int32_t iResult = ParseSpsUnit(unit.p, unit.uLen, sps);
    if (iResult == CAL_HEVC_OK)
        *pSPS = sps;
    return iResult;
}

} // namespace

int32_t ParseSpsUnit(const uint8_t *pUnit, size_t uLen, CALHEVCSPS &sps) noexcept
{
    sps = CALHEVCSPS{};
    if (uLen < kHeaderBytes)
        return CAL_HEVC_ERR_TRUNCATED;
    sps.uColourPrimaries = sps.uTransferCharacteristics = sps.uMatrixCoefficients = 2; // unspecified
    RbspReader r(pUnit + kHeaderBytes, uLen - kHeaderBytes);
    const int32_t iResult = ParseSpsBody(r, sps);
    if (iResult != CAL_HEVC_OK)
        sps = CALHEVCSPS{};
    return iResult;
}

int32_t ParseVpsUnit(const uint8_t *pUnit, size_t uLen, VpsSummary &vps) noexcept
{
    vps = VpsSummary{};
    if (uLen < kHeaderBytes)
        return CAL_HEVC_ERR_TRUNCATED;
    RbspReader r(pUnit + kHeaderBytes, uLen - kHeaderBytes);
    r.Bits(4 + 1 + 1 + 6); // vps_video_parameter_set_id, base layer flags, vps_max_layers_minus1
    const uint32_t uMaxSubLayersMinus1 = r.Bits(3);
    r.Require(uMaxSubLayersMinus1 <= kMaxSubLayersMinus1);
    vps.uTemporalIdNesting = r.Bit();
    r.Bits(16); // vps_reserved_0xffff_16bits
    if (r.Failed())
        return ResultOf(r);
    const Ptl ptl = ReadProfileTierLevel(r, uMaxSubLayersMinus1);
    vps.uMaxSubLayers = uMaxSubLayersMinus1 + 1;
    vps.uTierFlag = ptl.uTier;
    vps.uLevelIdc = ptl.uLevel;
    return ResultOf(r);
}

int32_t ParsePpsUnit(const uint8_t *pUnit, size_t uLen, PpsParallelism &pps) noexcept
{
    pps = PpsParallelism{};
    if (uLen < kHeaderBytes)
        return CAL_HEVC_ERR_TRUNCATED;
    RbspReader r(pUnit + kHeaderBytes, uLen - kHeaderBytes);
    constexpr uint32_t kMaxPpsId = 63, kMaxRefIdxDefault = 14;
    r.UE(kMaxPpsId);  // pps_pic_parameter_set_id
    r.UE(kMaxSpsId);  // pps_seq_parameter_set_id
    r.Bits(2 + 3 + 2); // dependent slices, output flag, num_extra_slice_header_bits, sign hiding, cabac init
    r.UE(kMaxRefIdxDefault); // num_ref_idx_l0_default_active_minus1
    r.UE(kMaxRefIdxDefault); // num_ref_idx_l1_default_active_minus1
    r.SE();                  // init_qp_minus26
    r.Bits(2);               // constrained_intra_pred_flag, transform_skip_enabled_flag
    if (r.Bit())             // cu_qp_delta_enabled_flag
        r.UE();              // diff_cu_qp_delta_depth
    r.SE();                  // pps_cb_qp_offset
    r.SE();                  // pps_cr_qp_offset
    r.Bits(4); // slice chroma qp offsets, weighted_pred, weighted_bipred, transquant_bypass
    pps.bTiles = r.Bit();
    pps.bWavefront = r.Bit();
    return ResultOf(r);
}

} // namespace vorcal::tools::hevc

extern "C" int32_t vorCALTools_HEVC_ParseSPS(const uint8_t *pData, int32_t iLen, CALHEVCSPS *pSPS)
{
    return vorcal::tools::hevc::ParseSPS(pData, iLen, pSPS);
}
