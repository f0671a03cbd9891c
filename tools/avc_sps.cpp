// The first sequence parameter set of start-code framed H.264 data (ITU-T H.264 7.3.2.1.1):
// profile, level, picture size in macroblocks, reference frames, cropping and the VUI aspect
// ratio. Fields are written as they are parsed, so an early return leaves the later ones.
#include <vorcal/video_tools.h>

#include "tools/avc_nal.hpp"
#include "tools/bit_reader.hpp"

namespace vorcal::tools::avc {
namespace {

enum SpsResult : uint32_t { kSpsParsed = 0, kSpsTooShort = 1, kSpsForbiddenBit = 2, kSpsNotFound = 3 };

// ue(v) values that follow one another and are dropped. 0xFFFFFFFF means 32 zero bits in view
// and nothing consumed, so every further read would give the same: the loop stops there, which
// keeps a huge count on a truncated SPS from spinning.
void SkipUE(CALToolsBS &r, uint32_t uCount) noexcept
{
    for (uint32_t k = 0; k < uCount; ++k) {
        if (bs::ReadUE(r) == 0xFFFFFFFFu)
            return;
    }
}

// The aspect class of the VUI: aspect_ratio_idc is dropped and two 16-bit values are always
// read in the places of sar_width and sar_height (whatever aspect_ratio_idc says): 2 for 4:3,
// 4 for 16:16 in their low bytes, 1 otherwise.
uint32_t AspectClass(CALToolsBS &r) noexcept
{
    bs::Read(r, 8);
    const uint32_t uW = bs::Read(r, 16) & 0xFFu;
    const uint32_t uH = bs::Read(r, 16) & 0xFFu;
    if (uW == 4 && uH == 3)
        return 2;
    if (uW == 0x10 && uH == 0x10)
        return 4;
    return 1;
}

// Parses the SPS body; the reader stands just after the NAL header byte.
uint32_t ParseSps(CALToolsBS &r, CALSPSInfo &info) noexcept
{
    // profile_idc, then level_idc after the constraint-flags byte; the reader then stands at
    // seq_parameter_set_id.
    // Single loads (not a byte skip, which stops at the end of the data) keep level_idc right
    // in an SPS cut just after it.
    info.uProfile = r.uCache >> 24;
    bs::Load(r);
    bs::Load(r);
    info.uLevel = r.uCache >> 24;
    bs::Load(r);
    // seq_parameter_set_id, log2_max_frame_num_minus4. The profile-dependent fields (chroma
    // format and the ones after it) are not read, whatever profile_idc is.
    SkipUE(r, 2);
    const int32_t iPocType = static_cast<int32_t>(bs::ReadUE(r));
    if (iPocType > 2)
        return kSpsNotFound;
    if (iPocType == 0) {
        SkipUE(r, 1); // log2_max_pic_order_cnt_lsb_minus4
    } else if (iPocType == 1) {
        bs::ReadBit(r); // delta_pic_order_always_zero_flag
        // offset_for_non_ref_pic, offset_for_top_to_bottom_field: se(v), same length as ue(v).
        SkipUE(r, 2);
        const int32_t iCycle = static_cast<int32_t>(bs::ReadUE(r));
        if (iCycle > 0)
            SkipUE(r, static_cast<uint32_t>(iCycle)); // offset_for_ref_frame[]
    }
    info.uRefFrames = bs::ReadUE(r);
    bs::ReadBit(r); // gaps_in_frame_num_value_allowed_flag
    info.uWidth = (bs::ReadUE(r) + 1) * 16;
    info.uHeight = (bs::ReadUE(r) + 1) * 16;
    if (bs::ReadBit(r) == 0) // frame_mbs_only_flag
        bs::ReadBit(r);      // mb_adaptive_frame_field_flag
    bs::ReadBit(r);          // direct_8x8_inference_flag
    info.uCropping = bs::ReadBit(r);
    if (info.uCropping) {
        info.uCropLeft = bs::ReadUE(r);
        info.uCropRight = bs::ReadUE(r);
        info.uCropTop = bs::ReadUE(r);
        info.uCropBottom = bs::ReadUE(r);
    } else {
        info.uCropLeft = info.uCropRight = info.uCropTop = info.uCropBottom = 0;
    }
    if (bs::ReadBit(r) == 0) // vui_parameters_present_flag
        return kSpsParsed;
    info.uAspectClass = bs::ReadBit(r) == 0 ? 1 : AspectClass(r);
    return kSpsParsed;
}

uint32_t GetSPSInfo(const uint8_t *pData, int32_t iLen, CALSPSInfo *pInfo) noexcept
{
    if (iLen <= 4 || pData == nullptr)
        return kSpsTooShort;
    CALSPSInfo scratch{};
    CALSPSInfo &info = pInfo ? *pInfo : scratch;
    // The data is taken to begin with a start code: 4 bytes for 00 00 00 01, else any 3.
    int32_t iSkip = nal::StartCodeLengthAt(pData, iLen, 0) == 4 ? 4 : 3;
    const uint8_t *pUnit = pData;
    int32_t iRemaining = iLen;
    for (;;) {
        pUnit += iSkip;
        iRemaining -= iSkip;
        CALToolsBS r;
        bs::Init(r, pUnit, static_cast<uint32_t>(iRemaining));
        if (bs::ReadBit(r))
            return kSpsForbiddenBit;
        bs::Skip(r, 2); // nal_ref_idc
        if (bs::Read(r, 5) == kNalSps)
            return ParseSps(r, info);
        const int32_t o = vorCALTools_AVC_FindStartCode(pUnit, iRemaining);
        if (o <= 0)
            return kSpsNotFound;
        iRemaining -= o;
        if (iRemaining <= 4)
            return kSpsTooShort;
        pUnit += o;
        iSkip = nal::StartCodeLengthAt(pUnit, iRemaining, 0) == 4 ? 4 : 3;
    }
}

} // namespace
} // namespace vorcal::tools::avc

extern "C" uint32_t vorCALTools_AVC_GetSPSInfo(const uint8_t *pData, int32_t iLen, CALSPSInfo *pInfo)
{
    return vorcal::tools::avc::GetSPSInfo(pData, iLen, pInfo);
}
