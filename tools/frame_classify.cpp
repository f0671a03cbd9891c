// Frame classification without decoding: intra (IDR) test, B-VOP test, validity test per codec,
// and the search for the first MPEG-4 Visual VOP. Codecs are named by their object type
// indication or by a four-character code read as a little-endian 32-bit number.
//
// Every rule reads only bytes inside the frame. A frame too short for the fixed bytes a rule
// reads answers 0 (not intra, not B, not valid) unless a shorter length has its own answer.
#include <cstddef>
#include <cstdint>

#include <vorcal/video_tools.h>
#include <vorcal/wrapper.h>

#include "core/sal.hpp"
#include "tools/avc_nal.hpp"
#include "tools/bit_reader.hpp"
#include "tools/nal_framing.hpp"

namespace vorcal::tools::classify {
namespace {

constexpr uint8_t kVopStartCode = 0xB6;     // ISO/IEC 14496-2 6.2.5
constexpr uint8_t kPictureStartCode = 0x00; // ISO/IEC 13818-2 6.2.3

bool IsMpeg4Visual(uint32_t uOTI)
{
    return uOTI == CAL_OTI_MPEG4_VISUAL || uOTI == CAL_OTI_MPEG4_VISUAL_2;
}

// The two bits of vop_coding_type after the first VOP start code among offsets 0..length-6,
// or -1 when there is none (ISO/IEC 14496-2 6.2.5: 0 I, 1 P, 2 B, 3 S).
int FirstVopCodingType(const uint8_t *pFrame, int32_t iLen)
{
    if (pFrame == nullptr || iLen <= 5)
        return -1;
    const size_t i = nal::FindPrefixWith(pFrame, 0, size_t(iLen) - 6, kVopStartCode);
    return i == nal::kNotFound ? -1 : pFrame[i + 4] >> 6;
}

// H.263 (ITU-T H.263 5.1.1-5.1.4): 22-bit PSC, then PTYPE; source format 7 is PLUSPTYPE.
int IsIntraH263(const uint8_t *p, int32_t iLen)
{
    if (iLen <= 2)
        return 0;
    if (p[0] != 0 || p[1] != 0 || (p[2] & 0xF0) != 0x80 || (p[2] & 0x0C) != 0)
        return 0;
    if (iLen < 5)
        return 0;
    const uint32_t uSourceFormat = (p[4] >> 2) & 7;
    if (uSourceFormat != 7)
        return (p[4] & 0x02) == 0 ? 1 : 0; // PTYPE bit 9, picture coding type
    // PLUSPTYPE: UFEP takes bits 38-40 of the frame.
    if (iLen < 6)
        return 0;
    if ((p[4] & 0x03) == 0 && (p[5] & 0x80) != 0) {
        // UFEP 001: OPPTYPE (18 bits) precedes MPPTYPE, whose picture type code is bits 59-61.
        if (iLen < 8)
            return 0;
        return (p[7] & 0x1C) == 0 ? 1 : 0;
    }
    // UFEP 000: MPPTYPE follows at once, picture type code in bits 41-43.
    return (p[5] & 0x70) == 0 ? 1 : 0;
}

// OTI 0xC2: a 17-bit picture start code and a 5-bit version 0 or 1. The result is bit 32 of the
// frame as it stands. That bit is the last bit of the 3-bit picture size field that follows
// the 8-bit temporal reference, not a picture type, so a 1 here does not reliably mean intra;
// the answer is kept as this bit because engines already depend on it.
int IsIntraH263Family(const uint8_t *p, int32_t iLen)
{
    if (iLen <= 2)
        return 0;
    if (p[0] != 0 || p[1] != 0 || (p[2] & 0xF0) != 0x80 || ((p[2] & 0x0C) >> 2) > 1)
        return 0;
    if (iLen < 5)
        return 0;
    return p[4] >> 7;
}

// MPEG-1/2 picture header (ISO/IEC 13818-2 6.2.3): temporal_reference (10 bits), then
// picture_coding_type (3 bits) in bits 3-5 of the second byte after the start code; 1 is I.
int IsIntraMpeg12(const uint8_t *p, int32_t iLen)
{
    if (iLen <= 6)
        return 0;
    const size_t uLast = size_t(iLen) - 7;
    for (size_t i = nal::FindPrefixWith(p, 0, uLast, kPictureStartCode); i != nal::kNotFound;
         i = nal::FindPrefixWith(p, i + 4, uLast, kPictureStartCode)) {
        if (((p[i + 5] >> 3) & 7) == 1)
            return 1;
    }
    return 0;
}

// VC-1 simple/main profile picture header (SMPTE 421M 7.1.1): INTERPFRM, FRMCNT, RANGEREDFRM,
// PTYPE. uSeqByte3 is the fourth byte of the 4-byte sequence header: FINTERPFLAG 0x02,
// MAXBFRAMES 0x70, RANGERED 0x80. Returns 0 I, 1 P, 2 B. Reads at most 6 bits of byte 0; the
// reader supplies zero bits past the end.
uint32_t Vc1PictureType(const uint8_t *pFrame, int32_t iLen, uint8_t uSeqByte3)
{
    // Four unconditional loads, so that a frame shorter than 4 bytes still has its bits at the
    // top of the cache.
    CALToolsBS bs;
    bs::Init(bs, pFrame, iLen > 0 ? uint32_t(iLen) : 0u);
    if (uSeqByte3 & 0x02)
        bs::Skip(bs, 1); // INTERPFRM
    bs::Skip(bs, 2);     // FRMCNT
    if (uSeqByte3 & 0x80)
        bs::Skip(bs, 1); // RANGEREDFRM
    if ((uSeqByte3 & 0x70) == 0)
        return bs::ReadBit(bs) ? 1u : 0u;
    if (bs::ReadBit(bs))
        return 1;
    return bs::ReadBit(bs) ? 0u : 2u;
}

// Slice check: first_mb_in_slice and slice_type from the 4 bytes after the NAL header byte;
// slice_type 2 or 7 is I (ITU-T H.264 7.4.3). The caller guarantees the 4 bytes are inside.
bool IsISlice(const uint8_t *pAfterHeader)
{
    CALToolsBS bs;
    bs::Init(bs, pAfterHeader, 4);
    bs::ReadUE(bs); // first_mb_in_slice
    const uint32_t uSliceType = bs::ReadUE(bs);
    return uSliceType == 2 || uSliceType == 7;
}

// 1 when the NAL unit whose header is at pHeader is an IDR slice or an I slice, else 0.
// More than 4 bytes follow the header byte's position (checked by the caller).
bool IsIntraNal(const uint8_t *pHeader)
{
    const uint32_t uType = avc::NalType(pHeader[0]);
    return uType == avc::kNalSliceIdr || (uType == avc::kNalSliceNonIdr && IsISlice(pHeader + 1));
}

// Start-code framed H.264. A start code at offset p (0..length-6, 00 00 00 01 tested before
// 00 00 01) counts when more than 4 bytes follow it, i.e. its NAL header lies at or before
// length-5. A 4-byte code and the 00 00 01 inside it share that header, so scanning the 3-byte
// prefixes whose header is in range visits exactly the same units.
int IsIntraH264StartCodes(const uint8_t *p, int32_t iLen)
{
    if (iLen < 8)
        return 0;
    const size_t uEnd = size_t(iLen) - 5; // prefix offsets 0..length-8
    for (size_t uFrom = 0;;) {
        const size_t i = nal::FindPrefix(p, uFrom, uEnd);
        if (i == nal::kNotFound)
            return 0;
        if (IsIntraNal(p + i + 3))
            return 1;
        uFrom = i + 3;
    }
}

// Length-prefixed H.264 with NAL length size 1 to 4; sizes 0 and above 4 are refused. The walk
// goes on while a whole length field and at least one byte after it lie inside the frame, so a
// length field pointing beyond the frame ends it.
int IsIntraH264LengthPrefixed(const uint8_t *p, int32_t iLen, CALParam uSize)
{
    if (uSize == 0 || uSize > 4)
        return 0;
    const int32_t iSize = int32_t(uSize);
    if (int64_t(iLen) - iSize <= 0)
        return 0;
    const size_t uLen = size_t(iLen);
    const size_t uEnd = uLen - size_t(iSize); // last offset + 1 at which a length field fits
    for (size_t uOffset = 0;;) {
        if (uLen - uOffset - size_t(iSize) > 4 && IsIntraNal(p + uOffset + iSize))
            return 1;
        uOffset = nal::NextLengthField(p, uLen, uOffset, iSize);
        if (uOffset == nal::kNotFound || uOffset >= uEnd)
            return 0;
    }
}

// ITU-T H.264 intra test: any IDR slice, or a non-IDR slice whose slice_type is I.
int IsIntraH264(const uint8_t *p, int32_t iLen, CALParam uNalLengthSize)
{
    bool bStartCode = false;
    if (iLen > 4 && nal::StartCodeLengthAt(p, iLen, 0) != 0) {
        bStartCode = true;
        VORCAL_TRACE_PLAIN("[vorCAL_Tools ]StartCode(0x%x, 0x%x, 0x%x, 0x%x)\n", 0u, 0u, unsigned(p[2]),
                           unsigned(p[3]));
    } else if (iLen == 4 && nal::StartCodeLengthAt(p, iLen, 0) == 3) {
        bStartCode = true;
        VORCAL_TRACE_PLAIN("[vorCAL_Tools ]StartCode(0x%x, 0x%x, 0x%x)\n", 0u, 0u, unsigned(p[2]));
    }
    // A start-code frame of 4 or 5 bytes falls through to the length-prefixed walk.
    if (bStartCode && iLen > 5)
        return IsIntraH264StartCodes(p, iLen);
    return IsIntraH264LengthPrefixed(p, iLen, uNalLengthSize);
}

int IsIntraFrame(uint32_t uOTI, const uint8_t *p, int32_t iLen, CALParam uExtra)
{
    VORCAL_TRACE_PLAIN("[vorCAL_Tools] vorCAL_Tools_IsIDRFrame\n");
    if (p == nullptr || iLen == 0) {
        VORCAL_TRACE(kTraceH264Tools, 0, "[_PTOOL_IsIntraFrame] pFrame(0x%x), iFrameSize(%d)\n", sal::Hex32(p),
                     int(iLen));
        return 0;
    }
    switch (uOTI) {
    case CAL_OTI_MPEG4_VISUAL:
    case CAL_OTI_MPEG4_VISUAL_2:
        return FirstVopCodingType(p, iLen) == 0 ? 1 : 0;
    case CAL_OTI_H263:
        return IsIntraH263(p, iLen);
    case CAL_OTI_H264:
        return IsIntraH264(p, iLen, uExtra);
    case CAL_OTI_H263_FAMILY:
        return IsIntraH263Family(p, iLen);
    case CAL_OTI_INTRA_ONLY:
        return 1;
    case CAL_OTI_MPEG12_VIDEO:
        return IsIntraMpeg12(p, iLen);
    case CAL_OTI_WMV1:
    case CAL_OTI_WMV2:
    case CAL_OTI_MP43:
        // The first two bits of the picture header are the picture type: 00 is intra.
        return iLen > 0 && (p[0] & 0xC0) == 0 ? 1 : 0;
    case CAL_OTI_WMV3:
    case CAL_OTI_WVC1: {
        const auto *pSeqHeader = reinterpret_cast<const uint8_t *>(uExtra);
        if (pSeqHeader == nullptr || iLen < 0)
            return 0;
        return Vc1PictureType(p, iLen, pSeqHeader[3]) == 0 ? 1 : 0;
    }
    default:
        return 0;
    }
}

// ITU-T H.264 validity: the first unit of a start-code frame must be a slice, SPS, PPS or
// filler data. A negative length is refused like a short one: no byte of it may be read.
int IsValidH264(const uint8_t *p, int32_t iLen)
{
    if (p == nullptr || uint32_t(iLen) <= 5 || iLen < 0) {
        VORCAL_TRACE(kTraceText, 0, "[CAL_Tools %d] CheckValidFrame Invalid Param.(0x%X, uiLen)\n", __LINE__,
                     sal::Hex32(p));
        return 0;
    }
    const int32_t iCode = nal::StartCodeLengthAt(p, iLen, 0);
    if (iCode == 0)
        return 1;
    const uint32_t uType = avc::NalType(p[iCode]);
    switch (uType) {
    case avc::kNalSliceNonIdr:
    case avc::kNalSliceIdr:
    case avc::kNalSps:
    case avc::kNalPps:
    case avc::kNalFiller:
        return 1;
    default:
        VORCAL_TRACE(kTraceText, 0, "[CAL_Tools %d] Invalid NAL Type(%d).(%d)\n", __LINE__, 1, int(uType));
        return 0;
    }
}

int IsValidFrame(uint32_t uOTI, const uint8_t *p, int32_t iLen)
{
    if (IsMpeg4Visual(uOTI)) {
        if (p == nullptr || iLen <= 4)
            return 0;
        if (p[0] != 0 || p[1] != 0 || p[2] != 1)
            return 1;
        // Start codes up to the VOP start code, and 0xC3, may open an MPEG-4 Visual frame.
        return (p[3] <= kVopStartCode || p[3] == 0xC3) ? 1 : 0;
    }
    if (uOTI == CAL_OTI_H263) {
        if (p == nullptr || iLen <= 6)
            return 0;
        return (p[0] == 0 && p[1] == 0 && (p[2] & 0xFC) == 0x80) ? 1 : 0;
    }
    if (uOTI == CAL_OTI_H264)
        return IsValidH264(p, iLen);
    return 1;
}

const uint8_t *FindVop(const uint8_t *p, int32_t iLen, int32_t *piRemaining)
{
    if (p == nullptr || iLen <= 4)
        return nullptr;
    const size_t i = nal::FindPrefixWith(p, 0, size_t(iLen) - 5, kVopStartCode);
    if (i == nal::kNotFound)
        return nullptr;
    if (piRemaining != nullptr)
        *piRemaining = iLen - int32_t(i);
    return p + i;
}

} // namespace
} // namespace vorcal::tools::classify

namespace classify = vorcal::tools::classify;

extern "C" int32_t vorCALTools_IsIDRFrame(uint32_t uOTI, const uint8_t *pFrame, int32_t iFrameLen, CALParam uExtra)
{
    return classify::IsIntraFrame(uOTI, pFrame, iFrameLen, uExtra);
}

extern "C" int32_t vorCALTools_IsBFrame(uint32_t uOTI, const uint8_t *pFrame, int32_t iFrameLen)
{
    if (!classify::IsMpeg4Visual(uOTI))
        return 0;
    return classify::FirstVopCodingType(pFrame, iFrameLen) == 2 ? 1 : 0;
}

extern "C" int32_t vorCALTools_IsValidVideo(uint32_t uOTI, const uint8_t *pFrame, int32_t iFrameLen)
{
    return classify::IsValidFrame(uOTI, pFrame, iFrameLen);
}

extern "C" const uint8_t *_PTOOL_FindVOP(const uint8_t *pData, int32_t iLen, int32_t *piRemaining)
{
    return classify::FindVop(pData, iLen, piRemaining);
}
