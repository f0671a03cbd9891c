// Shared pieces of the H.264 framing tools: bounded byte access, start-code tests, the two
// start-code searches built on FindStartCodePrefix, and NAL length fields.
#pragma once

#include <cstddef>
#include <cstdint>

#include "tools/start_code.hpp"

namespace vorcal::tools::avc {

// ITU-T H.264 7.4.1 nal_unit_type values the tools tell apart.
inline constexpr uint32_t kNalSliceNonIdr = 1;
inline constexpr uint32_t kNalPartitionA = 2;
inline constexpr uint32_t kNalSliceIdr = 5;
inline constexpr uint32_t kNalSei = 6;
inline constexpr uint32_t kNalSps = 7;
inline constexpr uint32_t kNalPps = 8;
inline constexpr uint32_t kNalAuxSlice = 19;

inline constexpr uint8_t kForbiddenBit = 0x80;
inline constexpr uint8_t kTypeMask = 0x1F;

// Every start code the tools write.
inline constexpr uint8_t kStartCode[4] = {0, 0, 0, 1};

inline bool IsSlice(uint32_t uType) noexcept
{
    return uType == kNalSliceNonIdr || uType == kNalSliceIdr;
}
inline bool IsConfigUnit(uint32_t uType) noexcept
{
    return uType == kNalSei || uType == kNalSps || uType == kNalPps;
}

// The byte at i, or 0 outside [0, uLen): reads past the end yield zero bits.
inline uint8_t ByteAt(const uint8_t *p, int64_t uLen, int64_t i) noexcept
{
    return (i >= 0 && i < uLen) ? p[i] : 0;
}

// Length of the start code at i: 4 for 00 00 00 01 (tested first), 3 for 00 00 01, else 0.
inline int32_t StartCodeLengthAt(const uint8_t *p, int64_t iLen, int64_t i) noexcept
{
    if (ByteAt(p, iLen, i) != 0 || ByteAt(p, iLen, i + 1) != 0)
        return 0;
    const uint8_t c = ByteAt(p, iLen, i + 2);
    if (c == 1)
        return 3;
    return (c == 0 && ByteAt(p, iLen, i + 3) == 1) ? 4 : 0;
}

// Resolves the first prefix q (from FindStartCodePrefix over [uFrom, uEnd)) into a code start
// below uLimit: a zero byte before the prefix belongs to the code, as long as it is not before
// uFrom. -1 when q is past the bound.
inline int64_t ResolveCode(const uint8_t *p, size_t uFrom, size_t uLimit, size_t q, size_t uEnd) noexcept
{
    if (q >= uEnd)
        return -1;
    if (q > uFrom && p[q - 1] == 0)
        return static_cast<int64_t>(q - 1);
    return q < uLimit ? static_cast<int64_t>(q) : -1;
}

// End of the FindStartCodePrefix range that serves FindCode.
inline size_t CodeSearchEnd(size_t uLimit, size_t uLen) noexcept
{
    return uLimit + 3 < uLen ? uLimit + 3 : uLen;
}

// First offset i in [uFrom, uLimit) where 00 00 00 01 (tested first) or 00 00 01 begins, with
// every byte of the code below uLen; -1 when there is none. uLimit <= uLen - 3 keeps the
// 4-byte test inside the data.
inline int64_t FindCode(const uint8_t *p, size_t uFrom, size_t uLimit, size_t uLen) noexcept
{
    if (uFrom >= uLimit)
        return -1;
    const size_t uEnd = CodeSearchEnd(uLimit, uLen);
    return ResolveCode(p, uFrom, uLimit, FindStartCodePrefix(p, uFrom, uEnd), uEnd);
}

// A start code met by the primed shift-register scan: the index of its first zero byte and
// the index of the unit header after its 01.
struct ScannedCode {
    int64_t iPos;
    int64_t iHeader;
};

// The configuration-run scan from uFrom: a 32-bit register primed with FF and the three bytes
// at uFrom (zeros past the end), then fed one byte at a time but never the last byte of the
// data. A register of 00 00 00 01 is a 4-byte code; low 24 bits 00 00 01 a 3-byte code. The FF
// keeps a zero before uFrom out of the code. iPos is -1 when nothing is found.
inline ScannedCode ScanPrimed(const uint8_t *p, size_t uFrom, size_t uLen) noexcept
{
    if (uFrom + 2 < uLen && p[uFrom] == 0 && p[uFrom + 1] == 0 && p[uFrom + 2] == 1)
        return {static_cast<int64_t>(uFrom), static_cast<int64_t>(uFrom) + 3};
    if (uLen == 0)
        return {-1, -1};
    const size_t q = FindStartCodePrefix(p, uFrom + 1, uLen - 1);
    if (q >= uLen - 1)
        return {-1, -1};
    const size_t uPos = p[q - 1] == 0 ? q - 1 : q;
    return {static_cast<int64_t>(uPos), static_cast<int64_t>(q) + 3};
}

// A NAL length field of 1 to 4 bytes, big-endian; bytes past uLen read as zero.
inline uint32_t ReadNalLength(const uint8_t *p, int64_t iLen, int64_t iPos, int32_t iSize) noexcept
{
    uint32_t v = 0;
    for (int32_t k = 0; k < iSize; ++k)
        v = (v << 8) | ByteAt(p, iLen, iPos + k);
    return v;
}

// NAL length sizes the length-prefixed walks accept.
inline bool ValidNalLengthSize(int32_t iSize) noexcept
{
    return iSize >= 1 && iSize <= 4;
}

// _NEXT_NAL_: offset of the length field after the unit at iPos, or -1 when it would not lie
// inside the data. The sum is 64-bit, so a length field never wraps the walk around.
inline int32_t NextNal(const uint8_t *pBuf, int32_t iLen, int32_t iPos, int32_t iSize) noexcept
{
    if (pBuf == nullptr || !ValidNalLengthSize(iSize) || iPos < 0 || iPos >= iLen)
        return -1;
    const int64_t iNext = int64_t{iPos} + iSize + ReadNalLength(pBuf, iLen, iPos, iSize);
    return iNext < iLen ? static_cast<int32_t>(iNext) : -1;
}

// lengthSizeMinusOne + 1 of an AVC decoder configuration record (ISO/IEC 14496-15 5.3.3.1:
// configurationVersion 1, lengthSizeMinusOne in the low two bits of byte 4), or 0 when the data
// is not one. A parameter-set list (count, 16-bit length, SPS) may begin with 1 as well; its
// byte 3 is then the SPS header, which no level_idc equals.
inline int32_t ConfigRecordNalLengthSize(const uint8_t *p, int32_t iLen) noexcept
{
    constexpr int32_t kFixedPart = 7; // up to the first SPS length
    if (p == nullptr || iLen < kFixedPart || p[0] != 1 || (p[3] & (kForbiddenBit | kTypeMask)) == kNalSps)
        return 0;
    return (p[4] & 3) + 1;
}

} // namespace vorcal::tools::avc
