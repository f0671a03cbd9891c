// The scanning and copying core of the frame conversions between start-code framing and
// length-prefixed NAL units, shared by the H.264 and HEVC tools: one pass over the source, the
// start-code search fused with the copy of each unit, and with 4-byte fields on both sides one
// copy of the whole frame patched field by field. Each codec states its rules; the core reports
// what went wrong and the codec turns that into its own results and traces.
#pragma once

#include <cstring>

#include "tools/nal_framing.hpp"

namespace vorcal::tools::nal {

enum class ConvertError : uint8_t {
    kNone,
    kLengthBeyondData, // a length field larger than the bytes that follow it
    kTrailingBytes,    // strict rules: bytes after the last unit too few for a length field
    kShortUnit,        // a unit shorter than the rules' minimum
    kNoStartCode,      // start-code input where a unit does not begin with a start code
    kNoNextUnit,       // a unit the rules skip, with no start code after it
    kUnitTooLong,      // a unit longer than the output length field can carry
    kNoRoom,           // the destination cannot hold the result
};

struct Converted {
    int64_t iBytes = 0; // bytes written, or counted when measuring
    ConvertError eError = ConvertError::kNone;
    int64_t iRemaining = 0; // kLengthBeyondData: the bytes after the field
    uint32_t uUnit = 0;     // kLengthBeyondData: the length read

    static Converted Fail(ConvertError e, int64_t iRemaining = 0, uint32_t uUnit = 0) noexcept
    {
        return {0, e, iRemaining, uUnit};
    }
    bool Ok() const noexcept { return eError == ConvertError::kNone; }
};

// Length-prefixed units to units behind 4-byte start codes.
struct LengthRules {
    int32_t iFieldSize; // 1 to 4, checked by the caller
    // Strict: every byte belongs to a unit of at least uMinUnit bytes. Otherwise a source no
    // longer than one field gives nothing, and trailing bytes no more than a field are dropped.
    bool bStrict;
    uint32_t uMinUnit;
};

// Units behind start codes to units behind big-endian length fields.
struct StartCodeRules {
    int32_t iFieldSize;  // 1 to 4 bytes of each length field written
    bool bLeadingZeros;  // zero bytes may precede the first start code (leading_zero_8bits)
    bool bTrimZeros;     // zero bytes at the end of a unit are trailing_zero_8bits; empty units are dropped
    uint32_t uMinUnit;   // a shorter unit that is kept fails
    bool (*pKeep)(uint8_t uHeader) noexcept; // null keeps every unit; else refused units are skipped
};

// kMeasure counts the bytes without writing (pDst unused).
template <bool kMeasure>
Converted LengthToStartCodes(uint8_t *pDst, int64_t iDstSize, const uint8_t *pSrc, int32_t iSrcLen,
                             const LengthRules &rules) noexcept
{
    const int32_t iSize = rules.iFieldSize;
    if (rules.bStrict ? iSrcLen <= 0 : iSrcLen <= iSize)
        return {};
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
        if (iRemaining < iSize)
            return Converted::Fail(ConvertError::kTrailingBytes);
        const uint32_t uUnit = ReadBE(pSrc, iSrcLen, iPos, iSize);
        iPos += iSize;
        iRemaining -= iSize;
        if (uUnit > iRemaining)
            return Converted::Fail(ConvertError::kLengthBeyondData, iRemaining, uUnit);
        if (uUnit < rules.uMinUnit)
            return Converted::Fail(ConvertError::kShortUnit);
        if constexpr (!kMeasure) {
            if (iWritten + 4 + uUnit > iDstSize)
                return Converted::Fail(ConvertError::kNoRoom);
            memcpy(pDst + iWritten, kStartCode, 4);
            if (!bInPlace)
                memcpy(pDst + iWritten + 4, pSrc + iPos, uUnit);
        }
        iWritten += 4 + int64_t{uUnit};
        iPos += uUnit;
        iRemaining -= uUnit;
    } while (rules.bStrict ? iRemaining > 0 : iRemaining > iSize);
    return {iWritten};
}

// Each unit runs to the next start code FindCode would find after its own (a zero byte in front
// of 00 00 01 belongs to that code), or to the end; the search and the copy of the unit are one
// pass. kMeasure counts the bytes without writing (pDst unused).
template <bool kMeasure>
Converted StartCodesToLength(uint8_t *pDst, int64_t iDstSize, const uint8_t *pSrc, int32_t iSrcLen,
                             const StartCodeRules &rules) noexcept
{
    const size_t uLen = iSrcLen > 0 ? static_cast<size_t>(iSrcLen) : 0;
    const int32_t iField = rules.iFieldSize;
    const uint64_t uMaxUnit = MaxUnitForField(iField);
    size_t uPos = 0;
    if (rules.bLeadingZeros) {
        while (uPos + 3 < uLen && pSrc[uPos] == 0 && pSrc[uPos + 1] == 0 && pSrc[uPos + 2] == 0 && pSrc[uPos + 3] == 0)
            ++uPos;
    }
    int64_t iWritten = 0;
    do {
        const int32_t iCode = StartCodeLengthAt(pSrc, iSrcLen, static_cast<int64_t>(uPos));
        if (iCode == 0)
            return Converted::Fail(ConvertError::kNoStartCode);
        // A start code lies wholly inside the data, so uLen >= 3 from here on.
        const size_t uBody = uPos + static_cast<size_t>(iCode);
        if (rules.pKeep != nullptr && !rules.pKeep(ByteAt(pSrc, iSrcLen, static_cast<int64_t>(uBody)))) {
            const size_t uNext = FindCode(pSrc, uBody + 1, uLen - 3, uLen);
            if (uNext == kNotFound)
                return Converted::Fail(ConvertError::kNoNextUnit);
            uPos = uNext;
            continue;
        }
        size_t q = 0;
        size_t uRoom = 0;
        uint8_t *pOut = pDst;
        if constexpr (kMeasure) {
            q = FindPrefix(pSrc, uBody, uLen);
        } else {
            // With no room left the unit is still found: an empty one needs none.
            if (iWritten + iField < iDstSize) {
                pOut = pDst + iWritten + iField;
                uRoom = static_cast<size_t>(iDstSize - iWritten - iField);
            }
            q = FindPrefixCopy(pSrc, uBody, uLen, pOut, uRoom);
        }
        const size_t uNext = ResolveCode(pSrc, uBody, uLen - 3, q);
        const size_t uCodeStart = uNext == kNotFound ? uLen : uNext;
        size_t uUnitEnd = uCodeStart;
        if (rules.bTrimZeros) {
            while (uUnitEnd > uBody && pSrc[uUnitEnd - 1] == 0)
                --uUnitEnd;
        }
        const size_t uUnit = uUnitEnd - uBody;
        uPos = uCodeStart;
        if (uUnit == 0 && rules.bTrimZeros)
            continue;
        if (uUnit < rules.uMinUnit)
            return Converted::Fail(ConvertError::kShortUnit);
        if (uUnit > uMaxUnit)
            return Converted::Fail(ConvertError::kUnitTooLong);
        if constexpr (!kMeasure) {
            if (iWritten + iField + static_cast<int64_t>(uUnit) > iDstSize)
                return Converted::Fail(ConvertError::kNoRoom);
            const size_t uCopied = q == kNotFound ? uLen : q;
            if (uUnitEnd > uCopied) // a prefix too close to the end to count belongs to the unit
                memcpy(pOut + (uCopied - uBody), pSrc + uCopied, uUnitEnd - uCopied);
            WriteBE(pDst + iWritten, static_cast<uint32_t>(uUnit), iField);
        }
        iWritten += iField + static_cast<int64_t>(uUnit);
    } while (uPos < uLen);
    return {iWritten};
}

} // namespace vorcal::tools::nal
