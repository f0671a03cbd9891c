// Decoder configuration of MPEG-4 Visual (visual object sequence, video object, video object
// layer; ISO/IEC 14496-2 6.2.2-6.2.3), H.263 short-header pictures (ITU-T H.263 5.1) and
// VC-1 extra data. All reads go through the header bit reader, which supplies zero bits past
// the end of the data.
#include <array>
#include <bit>
#include <cstdint>

#include <vorcal/video_tools.h>

#include "tools/bit_reader.hpp"

namespace vorcal::tools::mpeg4v {
namespace {

constexpr uint32_t kOtherProfile = 255;

struct ProfileLevel {
    uint8_t uIndication;
    uint8_t uProfile;
    uint8_t uLevel;
};

// profile_and_level_indication (ISO/IEC 14496-2 Table G-1) for Simple and Simple Scalable.
constexpr std::array<ProfileLevel, 9> kProfileLevels{{
    {0x01, 0, 1},
    {0x02, 0, 2},
    {0x03, 0, 3},
    {0x04, 0, 4},
    {0x05, 0, 5},
    {0x08, 0, 0},
    {0x09, 0, 0},
    {0x11, 1, 1},
    {0x12, 1, 2},
}};

struct PictureSize {
    uint16_t uWidth;
    uint16_t uHeight;
};

// ITU-T H.263 Table 1 by source format. 0 is forbidden, 6 reserved and 7 the extended PTYPE:
// none has a size, so all three report 0 x 0.
constexpr std::array<PictureSize, 8> kSourceFormatSizes{{
    {0, 0},
    {128, 96},    // sub-QCIF
    {176, 144},   // QCIF
    {352, 288},   // CIF
    {704, 576},   // 4CIF
    {1408, 1152}, // 16CIF
    {0, 0},
    {0, 0},
}};
static_assert(kSourceFormatSizes[2].uWidth == 176 && kSourceFormatSizes[5].uHeight == 1152);

constexpr uint32_t kSourceFormatExtended = 7;
constexpr uint32_t kSourceFormatCustom = 6;

constexpr uint32_t kCodeVideoObjectFirst = 0x100;
constexpr uint32_t kCodeVideoObjectLast = 0x11F;
constexpr uint32_t kCodeVolFirst = 0x120;
constexpr uint32_t kCodeVolLast = 0x12F;
constexpr uint32_t kCodeVosStart = 0x1B0;
constexpr uint32_t kCodeVosEnd = 0x1B1;
// Pseudo codes for the H.263 short header markers (22 bits each).
constexpr uint32_t kCodeShortStart = 0x10000;
constexpr uint32_t kCodeShortEnd = 0x10001;

// The code held in the reader's cache (the last four bytes loaded, whatever the bit position),
// or 0 when there is none.
uint32_t CodeInCache(uint32_t uCache)
{
    if ((uCache & 0xFFFFFC00u) == 0x00008000u)
        return kCodeShortStart; // short_video_start_marker, ISO/IEC 14496-2 6.2.5.2
    if ((uCache & 0xFFFFFC00u) == 0x0000FC00u)
        return kCodeShortEnd; // short_video_end_marker
    if ((uCache >> 8) == 1)
        return 0x100 + (uCache & 0xFF);
    return 0;
}

void SetProfileLevel(uint32_t uIndication, CALMPEG4DSIInfo &info)
{
    info.uProfile = kOtherProfile;
    info.uLevel = kOtherProfile;
    for (const ProfileLevel &entry : kProfileLevels) {
        if (entry.uIndication == uIndication) {
            info.uProfile = entry.uProfile;
            info.uLevel = entry.uLevel;
        }
    }
}

// video_object_layer() up to video_object_layer_height (ISO/IEC 14496-2 6.2.3), read as for a
// rectangular layer; the reader stands just after the start code.
void ParseVideoObjectLayer(CALToolsBS &bs, CALMPEG4DSIInfo &info)
{
    const uint32_t c = bs::Peek(bs);
    uint32_t uAspectRatioInfo;
    uint32_t uSkip;
    if (c & (1u << 22)) { // is_object_layer_identifier: verid (4) and priority (3) follow
        uAspectRatioInfo = (c >> 11) & 0xF;
        uSkip = 21;
    } else {
        uAspectRatioInfo = (c >> 18) & 0xF;
        uSkip = 14;
    }
    if (uAspectRatioInfo == 15) // extended_PAR: par_width, par_height
        bs::Skip(bs, 16);
    bs::Skip(bs, uSkip);
    if (bs::ReadBit(bs)) { // vol_control_parameters
        const uint32_t uControl = bs::Read(bs, 4); // chroma_format, low_delay, vbv_parameters
        if (uControl & 1)
            bs::Skip(bs, 79); // first/latter half of bit rate, buffer size, occupancy + markers
    }
    // video_object_layer_shape, marker, vop_time_increment_resolution, marker, fixed_vop_rate
    const uint32_t v = bs::Read(bs, 21);
    const uint32_t uResolution = (v >> 2) & 0xFFFF;
    // fixed_vop_time_increment takes as many bits as resolution - 1 needs, at least one. A
    // (forbidden) resolution of 0 wraps to 32 bits, which the reader reads exactly.
    const auto uIncrementBits = static_cast<uint32_t>(std::bit_width((uResolution - 1) | 1u));
    if (v & 1)
        bs::Skip(bs, uIncrementBits);
    bs::Skip(bs, 1); // marker_bit
    info.uWidth = bs::Read(bs, 13);
    bs::Skip(bs, 1); // marker_bit
    info.uHeight = bs::Read(bs, 13);
}

// ITU-T H.263 5.1.3-5.1.5 after the 22-bit picture start code: TR, PTYPE and, for source
// format 7, PLUSPTYPE up to the custom picture format.
void ParseShortHeader(CALToolsBS &bs, CALMPEG4DSIInfo &info)
{
    bs::Skip(bs, 8);  // temporal_reference
    bs::Read(bs, 2);  // marker_bit, zero_bit
    bs::Skip(bs, 3);  // split_screen, document_camera, full_picture_freeze_release
    const uint32_t uSourceFormat = bs::Read(bs, 3);
    info.uSourceFormat = uSourceFormat;
    if (uSourceFormat != kSourceFormatExtended) {
        info.uWidth = kSourceFormatSizes[uSourceFormat].uWidth;
        info.uHeight = kSourceFormatSizes[uSourceFormat].uHeight;
        return;
    }
    const uint32_t uUfep = bs::Read(bs, 3);
    if (uUfep != 1) {
        bs::Skip(bs, 10); // MPPTYPE, CPM
        info.uWidth = 0;
        info.uHeight = 0;
        return;
    }
    const uint32_t uExtendedFormat = bs::Read(bs, 3);
    bs::Read(bs, 1);   // custom PCF
    bs::Skip(bs, 14);  // rest of OPPTYPE
    bs::Skip(bs, 10);  // MPPTYPE, CPM
    if (uExtendedFormat != kSourceFormatCustom) {
        info.uWidth = kSourceFormatSizes[uExtendedFormat].uWidth;
        info.uHeight = kSourceFormatSizes[uExtendedFormat].uHeight;
        return;
    }
    bs::Read(bs, 4); // pixel aspect ratio code
    const uint32_t uWidthIndication = bs::Read(bs, 9);
    bs::Skip(bs, 1); // "1" to prevent start code emulation
    const uint32_t uHeightIndication = bs::Read(bs, 9);
    info.uWidth = (uWidthIndication + 1) * 4;
    info.uHeight = uHeightIndication * 4;
}

uint32_t GetDsiInfo(const uint8_t *pDSI, uint32_t uLen, CALMPEG4DSIInfo *pInfo)
{
    if (uLen == 0)
        return 1;
    if (pInfo == nullptr)
        return 0;
    CALMPEG4DSIInfo &info = *pInfo;
    CALToolsBS bs;
    bs::Init(bs, pDSI, uLen);
    bool bAfterVideoObject = false;
    for (;;) {
        uint32_t uCode;
        while ((uCode = CodeInCache(bs.uCache)) == 0) {
            if (bs::Load(bs))
                return 0;
        }
        // A layer is parsed only right after a video object start code; elsewhere its start code
        // is passed over like any other.
        const bool bLayer = bAfterVideoObject && uCode >= kCodeVolFirst && uCode <= kCodeVolLast;
        bAfterVideoObject = false;
        if (bLayer) {
            bs::SkipBytes(bs, 4);
            ParseVideoObjectLayer(bs, info);
        } else if (uCode == kCodeVosStart) {
            bs::SkipBytes(bs, 4);
            SetProfileLevel(bs::Read(bs, 8), info);
        } else if (uCode == kCodeVosEnd) {
            bs::SkipBytes(bs, 4);
            return 0;
        } else if (uCode >= kCodeVideoObjectFirst && uCode <= kCodeVideoObjectLast) {
            bs::SkipBytes(bs, 4);
            bAfterVideoObject = true;
        } else if (uCode == kCodeShortStart) {
            bs::Skip(bs, 22);
            ParseShortHeader(bs, info);
        } else if (uCode == kCodeShortEnd) {
            bs::Skip(bs, 22);
            return 0;
        } else {
            bs::Skip(bs, 8);
        }
    }
}

uint32_t GetVc1Profile(const uint8_t *pExtra, uint32_t uLen, uint32_t *puProfile)
{
    if (pExtra == nullptr || uLen == 0 || puProfile == nullptr)
        return 1;
    CALToolsBS bs;
    bs::Init(bs, pExtra, uLen);
    *puProfile = bs::Read(bs, 2); // PROFILE, SMPTE 421M Annex J
    return 0;
}

} // namespace
} // namespace vorcal::tools::mpeg4v

extern "C" uint32_t vorCALTools_MPEG4V_GetDSIInfo(const uint8_t *pDSI, uint32_t uLen, CALMPEG4DSIInfo *pInfo)
{
    return vorcal::tools::mpeg4v::GetDsiInfo(pDSI, uLen, pInfo);
}

extern "C" uint32_t vorCALTools_VC1_GetExtraDataInfo(const uint8_t *pExtra, uint32_t uLen, uint32_t *puProfile)
{
    return vorcal::tools::mpeg4v::GetVc1Profile(pExtra, uLen, puProfile);
}
