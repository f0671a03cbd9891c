// H.264 conversions between start-code framing (ITU-T H.264 Annex B) and length-prefixed NAL
// units, parameter-set containers (ISO/IEC 14496-15 configuration record or the compact list)
// to start codes and back, and the SEI/SPS/PPS run in front of the first slice of a frame.
#include <cstring>

#include <vorcal/video_tools.h>

#include "core/sal.hpp"
#include "tools/avc_convert.hpp"
#include "tools/avc_nal.hpp"

namespace vorcal::tools::avc {
namespace {

inline void PutBE32(uint8_t *p, uint32_t v) noexcept
{
    p[0] = static_cast<uint8_t>(v >> 24);
    p[1] = static_cast<uint8_t>(v >> 16);
    p[2] = static_cast<uint8_t>(v >> 8);
    p[3] = static_cast<uint8_t>(v);
}

inline void PutBE16(uint8_t *p, uint32_t v) noexcept
{
    p[0] = static_cast<uint8_t>(v >> 8);
    p[1] = static_cast<uint8_t>(v);
}

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

// Length-prefixed units (size 1-4) to 4-byte start codes. Trailing bytes too few for another
// length field are dropped. kMeasure counts the bytes without writing or tracing (pDst unused).
template <bool kMeasure>
int64_t LengthToAnnexB(uint8_t *pDst, int64_t iDstSize, const uint8_t *pSrc, int32_t iSrcLen, int32_t iSize) noexcept
{
    if (!ValidNalLengthSize(iSize))
        return -1;
    if (iSrcLen <= iSize)
        return 0;
    // With 4-byte fields every unit keeps its place: one copy of as much as the destination
    // holds, then the walk turns each field into a start code.
    const bool bInPlace = iSize == 4;
    if constexpr (!kMeasure) {
        if (bInPlace && iDstSize > 0)
            memcpy(pDst, pSrc, static_cast<size_t>(iSrcLen < iDstSize ? iSrcLen : iDstSize));
    }
    int64_t iRemaining = iSrcLen;
    int64_t iPos = 0;
    int64_t iWritten = 0;
    do {
        const uint32_t uUnit = ReadNalLength(pSrc, iSrcLen, iPos, iSize);
        iPos += iSize;
        iRemaining -= iSize;
        if (uUnit > iRemaining) {
            if constexpr (!kMeasure)
                VORCAL_TRACE(kTraceH264Tools, 0, "[CAL_Tools %d] vorCALTools_AVC_ConvertFormat Error(%d, %d)\n",
                             __LINE__, static_cast<int>(iRemaining), static_cast<int>(uUnit));
            return -1;
        }
        if constexpr (!kMeasure) {
            if (iWritten + 4 + uUnit > iDstSize)
                return -1;
            memcpy(pDst + iWritten, kStartCode, 4);
            if (!bInPlace)
                memcpy(pDst + iWritten + 4, pSrc + iPos, uUnit);
        }
        iWritten += 4 + int64_t{uUnit};
        iPos += uUnit;
        iRemaining -= uUnit;
    } while (iRemaining > iSize);
    return iWritten;
}

// Start codes to 4-byte length prefixes. Each unit runs to the next start code that
// vorCALTools_AVC_FindStartCode finds after the current one; the search and the copy of the
// unit are one pass. With bSlicesOnly only coded slices are written. kMeasure counts the bytes
// without writing or tracing (pDst unused).
template <bool kMeasure>
int64_t AnnexBToLength(uint8_t *pDst, int64_t iDstSize, const uint8_t *pSrc, int32_t iSrcLen, bool bSlicesOnly) noexcept
{
    const size_t uLen = iSrcLen > 0 ? static_cast<size_t>(iSrcLen) : 0;
    size_t uPos = 0;
    int64_t iWritten = 0;
    do {
        const int32_t iCode = StartCodeLengthAt(pSrc, iSrcLen, static_cast<int64_t>(uPos));
        if (iCode == 0)
            return -1;
        // A start code lies wholly inside the data, so uLen >= 3 from here on.
        const size_t uBody = uPos + static_cast<size_t>(iCode);
        if (bSlicesOnly && !IsSlice(ByteAt(pSrc, iSrcLen, static_cast<int64_t>(uBody)) & kTypeMask)) {
            const int64_t iNext = FindCode(pSrc, uBody + 1, uLen - 3, uLen);
            if (iNext < 0) {
                if constexpr (!kMeasure)
                    VORCAL_TRACE_PLAIN("[vorCAL_Tools %d] No correct Frame.\n", __LINE__);
                return -1;
            }
            uPos = static_cast<size_t>(iNext);
            continue;
        }
        size_t q = 0;
        size_t uRoom = 0;
        if constexpr (kMeasure) {
            q = FindStartCodePrefix(pSrc, uBody, uLen);
        } else {
            if (iWritten + 4 > iDstSize)
                return -1;
            uRoom = static_cast<size_t>(iDstSize - iWritten - 4);
            q = FindStartCodePrefixCopy(pSrc, uBody, uLen, pDst + iWritten + 4, uRoom);
        }
        const int64_t iNext = ResolveCode(pSrc, uBody, uLen - 3, q, uLen);
        const size_t uUnitEnd = iNext < 0 ? uLen : static_cast<size_t>(iNext);
        const size_t uUnit = uUnitEnd - uBody;
        if constexpr (!kMeasure) {
            if (uUnit > uRoom)
                return -1;
            if (uUnitEnd > q) // a prefix too close to the end to count belongs to the unit
                memcpy(pDst + iWritten + 4 + (q - uBody), pSrc + q, uUnitEnd - q);
            PutBE32(pDst + iWritten, static_cast<uint32_t>(uUnit));
        }
        iWritten += 4 + static_cast<int64_t>(uUnit);
        uPos = uUnitEnd;
    } while (uPos < uLen);
    return iWritten;
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
    if (iSourceFormat == CAL_AVC_FORMAT_NAL)
        return LengthToAnnexB<kMeasure>(pDst, iRoom, pSrc, iSrcLen, iSize);
    return AnnexBToLength<kMeasure>(pDst, iRoom, pSrc, iSrcLen, bSlicesOnly);
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
        const int64_t iUnit = (ByteAt(pSrc, iSrcLen, iPos) << 8) | ByteAt(pSrc, iSrcLen, iPos + 1);
        if (4 + iUnit > iRoom)
            return false;
        uint8_t *pOut = pDst + (iDstSize - iRoom);
        memcpy(pOut, kStartCode, 4);
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
    auto b = [&](int64_t i) { return ByteAt(pSrc, iSrcLen, i); };
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
ScannedCode FindUnit(const uint8_t *pSrc, size_t uLen, size_t uFrom, uint32_t uType) noexcept
{
    for (;;) {
        const ScannedCode c = ScanPrimed(pSrc, uFrom, uLen);
        if (c.iPos < 0)
            return c;
        const uint8_t h = ByteAt(pSrc, static_cast<int64_t>(uLen), c.iHeader);
        if ((h & kForbiddenBit) == 0 && (h & kTypeMask) == uType)
            return c;
        uFrom = static_cast<size_t>(c.iHeader);
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
    const ScannedCode sps = FindUnit(pSrc, uLen, 0, kNalSps);
    if (sps.iPos < 0 || sps.iHeader >= iSrcLen)
        return 0;
    const ScannedCode pps = FindUnit(pSrc, uLen, static_cast<size_t>(sps.iHeader), kNalPps);
    if (pps.iPos < 0)
        return 0;
    const ScannedCode after = ScanPrimed(pSrc, static_cast<size_t>(pps.iHeader), uLen);
    const int64_t iSpsLen = pps.iPos - sps.iHeader;
    const int64_t iPpsLen = (after.iPos < 0 ? iSrcLen : after.iPos) - pps.iHeader;
    if (iSpsLen + iPpsLen + 6 > iDstSize || pDst == nullptr)
        return 0;
    pDst[0] = 1;
    PutBE16(pDst + 1, static_cast<uint32_t>(iSpsLen) & 0xFFFFu);
    memcpy(pDst + 3, pSrc + sps.iHeader, static_cast<size_t>(iSpsLen));
    uint8_t *pPps = pDst + 3 + iSpsLen;
    pPps[0] = 1;
    PutBE16(pPps + 1, static_cast<uint32_t>(iPpsLen) & 0xFFFFu);
    memcpy(pPps + 3, pSrc + pps.iHeader, static_cast<size_t>(iPpsLen));
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
    if (pData == nullptr || !ValidNalLengthSize(iSize))
        return nullptr;
    int64_t iRun = -1;
    int32_t iPos = 0;
    for (;;) {
        const uint8_t h = ByteAt(pData, iLen, int64_t{iPos} + iSize);
        if (h & kForbiddenBit)
            return nullptr;
        const uint32_t t = h & kTypeMask;
        if (IsSlice(t))
            return iRun < 0 ? nullptr : Run(pData, iRun, iPos, piConfigLen);
        if (IsConfigUnit(t) && iRun < 0)
            iRun = iPos;
        if (int64_t{iPos} >= int64_t{iLen} - 1)
            return nullptr;
        iPos = NextNal(pData, iLen, iPos, iSize);
        if (iPos < 0)
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
        const ScannedCode c = ScanPrimed(pData, uFrom, uLen);
        if (c.iPos < 0)
            return iRun < 0 ? nullptr : Run(pData, iRun, iLen, piConfigLen);
        const uint8_t h = ByteAt(pData, iLen, c.iHeader);
        if ((h & kForbiddenBit) == 0) {
            const uint32_t t = h & kTypeMask;
            if (IsSlice(t))
                return iRun < 0 ? nullptr : Run(pData, iRun, c.iPos, piConfigLen);
            if (IsConfigUnit(t) && iRun < 0)
                iRun = c.iPos;
        }
        if (c.iHeader >= int64_t{iLen} - 1)
            return nullptr;
        uFrom = static_cast<size_t>(c.iHeader);
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
