// H.264 conversions between start-code framing (ITU-T H.264 Annex B) and length-prefixed NAL
// units, parameter-set containers (ISO/IEC 14496-15 configuration record or the compact list)
// to start codes and back, and the SEI/SPS/PPS run in front of the first slice of a frame.
#include <cstring>

#include <vorcal/video_tools.h>

#include "core/sal.hpp"
#include "tools/avc_convert.hpp"
#include "tools/avc_nal.hpp"
#include "tools/nal_convert.hpp"

namespace vorcal::tools::avc {
namespace {

// Copies n bytes from src[iFrom] on; the part beyond iLen is zero-filled.
void CopyPadded(uint8_t *pDst, const uint8_t *pSrc, int64_t iLen, int64_t iFrom, int64_t n) noexcept
{
    int64_t iAvail = iLen - iFrom;
    iAvail = iAvail < 0 ? 0 : (iAvail > n ? n : iAvail);
    if (iAvail > 0)
        memcpy(pDst, pSrc + iFrom, static_cast<size_t>(iAvail));
    if (n > iAvail)
        memset(pDst + iAvail, 0, static_cast<size_t>(n - iAvail));
}

bool KeepSlice(uint8_t uHeader) noexcept
{
    return IsSlice(NalType(uHeader));
}

// Length fields of any size 1-4 to 4-byte start codes; trailing bytes too few for another
// length field are dropped. Start codes to 4-byte lengths, each unit running to the next start
// code vorCALTools_AVC_FindStartCode finds after its own; with bSlicesOnly only coded slices are
// written. kMeasure counts the bytes without writing or tracing (pDst unused).
template <bool kMeasure>
int64_t ConvertUnits(uint8_t *pDst, int64_t iRoom, const uint8_t *pSrc, int32_t iSrcLen, int32_t iSize,
                     int32_t iSourceFormat, bool bSlicesOnly) noexcept
{
    nal::Converted r;
    if (iSourceFormat == CAL_AVC_FORMAT_NAL) {
        if (!nal::ValidLengthSize(iSize))
            return -1;
        r = nal::LengthToStartCodes<kMeasure>(pDst, iRoom, pSrc, iSrcLen, {iSize, false, 0});
    } else {
        r = nal::StartCodesToLength<kMeasure>(pDst, iRoom, pSrc, iSrcLen,
                                              {4, false, false, 0, bSlicesOnly ? KeepSlice : nullptr});
    }
    if constexpr (!kMeasure) {
        if (r.eError == nal::ConvertError::kLengthBeyondData)
            VORCAL_TRACE(kTraceH264Tools, 0, "[CAL_Tools %d] vorCALTools_AVC_ConvertFormat Error(%d, %d)\n", __LINE__,
                         static_cast<int>(r.iRemaining), static_cast<int>(r.uUnit));
        else if (r.eError == nal::ConvertError::kNoNextUnit)
            VORCAL_TRACE_PLAIN("[vorCAL_Tools %d] No correct Frame.\n", __LINE__);
    }
    return r.Ok() ? r.iBytes : -1;
}

// The conversion from a source of the framing given; results fit 32 bits whenever they fit the
// destination, and the measuring pass reports sizes beyond.
template <bool kMeasure>
int64_t Convert(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc, int32_t iSrcLen, int32_t iSize,
                int32_t iSourceFormat, bool bSlicesOnly) noexcept
{
    if (iSrcLen < iSize || pSrc == nullptr)
        return -1;
    const int64_t iRoom = (pDst != nullptr && iDstSize > 0) ? iDstSize : 0;
    return ConvertUnits<kMeasure>(pDst, iRoom, pSrc, iSrcLen, iSize, iSourceFormat, bSlicesOnly);
}

int32_t ConvertFormat(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc, int32_t iSrcLen,
                      int32_t iSize, bool bSlicesOnly) noexcept
{
    return static_cast<int32_t>(Convert<false>(pDst, iDstSize, pSrc, iSrcLen, iSize,
                                               vorCALTools_AVC_CheckFormat(pSrc, iSrcLen), bSlicesOnly));
}

// Container to start codes: copies one entry (16-bit length, unit) as 00 00 00 01 and the
// unit. False when it would not fit the room left.
struct EntryCopier {
    uint8_t *pDst;
    int64_t iDstSize;
    const uint8_t *pSrc;
    int64_t iSrcLen;
    int64_t iPos;
    int64_t iRoom;

    bool Copy() noexcept
    {
        const int64_t iUnit = nal::ReadBE(pSrc, iSrcLen, iPos, 2);
        if (4 + iUnit > iRoom)
            return false;
        uint8_t *pOut = pDst + (iDstSize - iRoom);
        memcpy(pOut, nal::kStartCode, 4);
        CopyPadded(pOut + 4, pSrc, iSrcLen, iPos + 2, iUnit);
        iPos += 2 + iUnit;
        iRoom -= 4 + iUnit;
        return true;
    }
    // Copies up to uCount entries, stopping once the room is 4 bytes or less.
    bool CopyEntries(uint32_t uCount) noexcept
    {
        for (uint32_t k = 0; k < uCount; ++k) {
            if (!Copy())
                return false;
            if (iRoom <= 4)
                break;
        }
        return true;
    }
};

int32_t ContainerToAnnexB(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc, int32_t iSrcLen) noexcept
{
    auto b = [&](int64_t i) { return nal::ByteAt(pSrc, iSrcLen, i); };
    // A configuration record repeats AVCProfileIndication as the SPS's profile_idc (byte 9);
    // a list has the SPS count at byte 0 and, with one SPS, its NAL header at byte 3.
    const bool bRecord = b(1) != 0 && (b(3) & kTypeMask) != kNalSps && b(9) == b(1) && iSrcLen >= 16;
    const uint32_t uSpsCount = bRecord ? (b(5) & 0x1Fu) : b(0);
    EntryCopier copier{pDst, iDstSize, pSrc, iSrcLen, bRecord ? 6 : 1, iDstSize};
    if (uSpsCount > 0 && iDstSize > 4 && !copier.CopyEntries(uSpsCount))
        return 0;
    const uint32_t uPpsCount = b(copier.iPos);
    if (uPpsCount == 0 || copier.iRoom <= 4)
        return static_cast<int32_t>(iDstSize - copier.iRoom);
    ++copier.iPos;
    if (!copier.CopyEntries(uPpsCount))
        return 0;
    return static_cast<int32_t>(iDstSize - copier.iRoom);
}

// The first unit from uFrom on (primed scan, resuming at each header) whose header has
// forbidden_zero_bit clear and type uType.
nal::ScannedCode FindUnit(const uint8_t *pSrc, size_t uLen, size_t uFrom, uint32_t uType) noexcept
{
    for (;;) {
        const nal::ScannedCode c = nal::ScanPrimed(pSrc, uFrom, uLen);
        if (c.uPos == nal::kNotFound)
            return c;
        const uint8_t h = nal::ByteAt(pSrc, static_cast<int64_t>(uLen), static_cast<int64_t>(c.uHeader));
        if ((h & kForbiddenBit) == 0 && NalType(h) == uType)
            return c;
        uFrom = c.uHeader;
    }
}

// Start codes to a parameter-set list: 01, SPS length, SPS (with whatever lies between it and
// the PPS), 01, PPS length, PPS.
int32_t AnnexBToList(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc, int32_t iSrcLen) noexcept
{
    VORCAL_TRACE_PLAIN("[vorCAL_Tools %d] vorCALTools_AVC_ConvertFormatPSs ANNEXB\n", __LINE__);
    VORCAL_TRACE(kTraceH264Tools, 0, "[CAL_Tools %d] H.264 ANNEXB Type Conversion\n", __LINE__);
    if (iSrcLen <= 3)
        return 0;
    const size_t uLen = static_cast<size_t>(iSrcLen);
    const nal::ScannedCode sps = FindUnit(pSrc, uLen, 0, kNalSps);
    if (sps.uPos == nal::kNotFound || sps.uHeader >= uLen)
        return 0;
    const nal::ScannedCode pps = FindUnit(pSrc, uLen, sps.uHeader, kNalPps);
    if (pps.uPos == nal::kNotFound)
        return 0;
    const nal::ScannedCode after = nal::ScanPrimed(pSrc, pps.uHeader, uLen);
    const int64_t iSpsLen = static_cast<int64_t>(pps.uPos - sps.uHeader);
    const int64_t iPpsLen = static_cast<int64_t>((after.uPos == nal::kNotFound ? uLen : after.uPos) - pps.uHeader);
    if (iSpsLen + iPpsLen + 6 > iDstSize || pDst == nullptr)
        return 0;
    pDst[0] = 1;
    nal::WriteBE(pDst + 1, static_cast<uint32_t>(iSpsLen) & 0xFFFFu, 2);
    memcpy(pDst + 3, pSrc + sps.uHeader, static_cast<size_t>(iSpsLen));
    uint8_t *pPps = pDst + 3 + iSpsLen;
    pPps[0] = 1;
    nal::WriteBE(pPps + 1, static_cast<uint32_t>(iPpsLen) & 0xFFFFu, 2);
    memcpy(pPps + 3, pSrc + pps.uHeader, static_cast<size_t>(iPpsLen));
    return static_cast<int32_t>(iSpsLen + iPpsLen + 6);
}

int32_t ConvertFormatPSs(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc, int32_t iSrcLen) noexcept
{
    VORCAL_TRACE_PLAIN("[vorCAL_Tools %d] vorCALTools_AVC_ConvertFormatPSs\n", __LINE__);
    if (pDst == nullptr)
        iDstSize = 0;
    switch (vorCALTools_AVC_CheckFormat(pSrc, iSrcLen)) {
    case CAL_AVC_FORMAT_NAL:
        return ContainerToAnnexB(pDst, iDstSize, pSrc, iSrcLen);
    case CAL_AVC_FORMAT_ANNEXB:
        return AnnexBToList(pDst, iDstSize, pSrc, iSrcLen);
    default:
        return 0;
    }
}

inline const uint8_t *Run(const uint8_t *pData, int64_t iStart, int64_t iEnd, int32_t *piConfigLen) noexcept
{
    if (piConfigLen)
        *piConfigLen = static_cast<int32_t>(iEnd - iStart);
    return pData + iStart;
}

const uint8_t *NalConfigStream(const uint8_t *pData, int32_t iLen, int32_t iSize, int32_t *piConfigLen) noexcept
{
    if (piConfigLen)
        *piConfigLen = 0;
    if (pData == nullptr || !nal::ValidLengthSize(iSize))
        return nullptr;
    int64_t iRun = -1;
    size_t uPos = 0;
    for (;;) {
        const uint8_t h = nal::ByteAt(pData, iLen, static_cast<int64_t>(uPos) + iSize);
        if (h & kForbiddenBit)
            return nullptr;
        const uint32_t t = NalType(h);
        if (IsSlice(t))
            return iRun < 0 ? nullptr : Run(pData, iRun, static_cast<int64_t>(uPos), piConfigLen);
        if (IsConfigUnit(t) && iRun < 0)
            iRun = static_cast<int64_t>(uPos);
        if (static_cast<int64_t>(uPos) >= int64_t{iLen} - 1)
            return nullptr;
        uPos = nal::NextLengthField(pData, static_cast<size_t>(iLen), uPos, iSize);
        if (uPos == nal::kNotFound)
            return iRun < 0 ? nullptr : Run(pData, iRun, iLen, piConfigLen);
    }
}

const uint8_t *AnnexBConfigStream(const uint8_t *pData, int32_t iLen, int32_t *piConfigLen) noexcept
{
    if (piConfigLen)
        *piConfigLen = 0;
    if (iLen <= 3 || pData == nullptr)
        return nullptr;
    const size_t uLen = static_cast<size_t>(iLen);
    int64_t iRun = -1;
    size_t uFrom = 0;
    for (;;) {
        const nal::ScannedCode c = nal::ScanPrimed(pData, uFrom, uLen);
        if (c.uPos == nal::kNotFound)
            return iRun < 0 ? nullptr : Run(pData, iRun, iLen, piConfigLen);
        const uint8_t h = nal::ByteAt(pData, iLen, static_cast<int64_t>(c.uHeader));
        if ((h & kForbiddenBit) == 0) {
            const uint32_t t = NalType(h);
            if (IsSlice(t))
                return iRun < 0 ? nullptr : Run(pData, iRun, static_cast<int64_t>(c.uPos), piConfigLen);
            if (IsConfigUnit(t) && iRun < 0)
                iRun = static_cast<int64_t>(c.uPos);
        }
        if (static_cast<int64_t>(c.uHeader) >= int64_t{iLen} - 1)
            return nullptr;
        uFrom = c.uHeader;
    }
}

} // namespace

int32_t ConvertFrame(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc, int32_t iSrcLen, int32_t iNALLengthSize,
                     int32_t iSourceFormat) noexcept
{
    return static_cast<int32_t>(Convert<false>(pDst, iDstSize, pSrc, iSrcLen, iNALLengthSize, iSourceFormat, false));
}

int64_t ConvertedSize(const uint8_t *pSrc, int32_t iSrcLen, int32_t iNALLengthSize, int32_t iSourceFormat) noexcept
{
    return Convert<true>(nullptr, 0, pSrc, iSrcLen, iNALLengthSize, iSourceFormat, false);
}

} // namespace vorcal::tools::avc

namespace avc = vorcal::tools::avc;

extern "C" int32_t vorCALTools_AVC_ConvertFormat(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc,
                                                 int32_t iSrcLen, int32_t iNALLengthSize)
{
    return avc::ConvertFormat(pDst, iDstSize, pSrc, iSrcLen, iNALLengthSize, false);
}

extern "C" int32_t vorCALTools_AVC_ConvertFormat_NoSPSPPS(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc,
                                                          int32_t iSrcLen, int32_t iNALLengthSize)
{
    return avc::ConvertFormat(pDst, iDstSize, pSrc, iSrcLen, iNALLengthSize, true);
}

extern "C" int32_t vorCALTools_AVC_ConvertFormatPSs(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc,
                                                    int32_t iSrcLen)
{
    return avc::ConvertFormatPSs(pDst, iDstSize, pSrc, iSrcLen);
}

extern "C" const uint8_t *vorCALTools_AVC_NAL_GetConfigStream(const uint8_t *pData, int32_t iLen,
                                                              int32_t iNALLengthSize, int32_t *piConfigLen)
{
    return avc::NalConfigStream(pData, iLen, iNALLengthSize, piConfigLen);
}

extern "C" const uint8_t *vorCALTools_AVC_ANNEXB_GetConfigStream(const uint8_t *pData, int32_t iLen,
                                                                 int32_t *piConfigLen)
{
    return avc::AnnexBConfigStream(pData, iLen, piConfigLen);
}
