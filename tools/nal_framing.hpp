// The codec-neutral NAL framing that the H.264 and HEVC tools and the frame classification share:
// byte access that reads zeros past the end, big-endian fields, start codes (ITU-T H.264 and
// H.265 Annex B), the start-code searches built on the scan kernels of tools/scan, and the walk
// over length-prefixed units (ISO/IEC 14496-15). Every search and walk here answers a position
// or kNotFound; the exported tools turn kNotFound into their own documented results.
#pragma once

#include <cstddef>
#include <cstdint>

#include "tools/start_code.hpp"

namespace vorcal::tools::nal {

// The one "not found" of the searches and walks below: no offset into a buffer equals it.
inline constexpr size_t kNotFound = SIZE_MAX;

// Every start code the tools write.
inline constexpr uint8_t kStartCode[4] = {0, 0, 0, 1};

// The byte at i, or 0 outside [0, iLen): reads past the end yield zero bits.
inline uint8_t ByteAt(const uint8_t *p, int64_t iLen, int64_t i) noexcept
{
    return (i >= 0 && i < iLen) ? p[i] : 0;
}

// A big-endian field of iBytes (1 to 4) bytes at iPos; bytes past iLen read as zero.
inline uint32_t ReadBE(const uint8_t *p, int64_t iLen, int64_t iPos, int32_t iBytes) noexcept
{
    uint32_t v = 0;
    for (int32_t k = 0; k < iBytes; ++k)
        v = (v << 8) | ByteAt(p, iLen, iPos + k);
    return v;
}

// Writes the low iBytes (1 to 4) bytes of v, most significant first.
inline void WriteBE(uint8_t *p, uint32_t v, int32_t iBytes) noexcept
{
    for (int32_t k = iBytes; k-- > 0; v >>= 8)
        p[k] = static_cast<uint8_t>(v);
}

// The largest unit a length field of iBytes (1 to 4) bytes can carry.
inline constexpr uint64_t MaxUnitForField(int32_t iBytes) noexcept
{
    return (uint64_t{1} << (8 * iBytes)) - 1;
}

// Length of the start code at i: 4 for 00 00 00 01 (tested first), 3 for 00 00 01, else 0.
// Bytes past iLen read as zero, so a code must lie wholly inside the data.
inline int32_t StartCodeLengthAt(const uint8_t *p, int64_t iLen, int64_t i) noexcept
{
    if (ByteAt(p, iLen, i) != 0 || ByteAt(p, iLen, i + 1) != 0)
        return 0;
    const uint8_t c = ByteAt(p, iLen, i + 2);
    if (c == 1)
        return 3;
    return (c == 0 && ByteAt(p, iLen, i + 3) == 1) ? 4 : 0;
}

// The first 00 00 01 that begins at or after uFrom and lies wholly below uEnd.
inline size_t FindPrefix(const uint8_t *p, size_t uFrom, size_t uEnd) noexcept
{
    const size_t q = FindStartCodePrefix(p, uFrom, uEnd);
    return q < uEnd ? q : kNotFound;
}

// FindPrefix fused with a copy of the bytes in front of the prefix found (of all of
// [uFrom, uEnd) when there is none) to pDst, as far as they fit in uDstRoom.
inline size_t FindPrefixCopy(const uint8_t *p, size_t uFrom, size_t uEnd, uint8_t *pDst, size_t uDstRoom) noexcept
{
    const size_t q = FindStartCodePrefixCopy(p, uFrom, uEnd, pDst, uDstRoom);
    return q < uEnd ? q : kNotFound;
}

// The first 00 00 01 uCode that begins at an offset from uFirst to uLast; the caller guarantees
// uLast + 3 < the data length, so the code byte lies inside.
inline size_t FindPrefixWith(const uint8_t *p, size_t uFirst, size_t uLast, uint8_t uCode) noexcept
{
    const size_t uEnd = uLast + 3;
    for (size_t uFrom = uFirst;;) {
        const size_t i = FindPrefix(p, uFrom, uEnd);
        if (i == kNotFound || p[i + 3] == uCode)
            return i;
        // 00 00 01 xx: neither xx's offset nor the 01's can start another prefix.
        uFrom = i + 3;
    }
}

// Resolves the prefix q, found by FindPrefix over [uFrom, uEnd), into the start of its code below
// uLimit: a zero byte directly before the prefix belongs to the code (the 4-byte form), as long
// as it is not before uFrom.
inline size_t ResolveCode(const uint8_t *p, size_t uFrom, size_t uLimit, size_t q) noexcept
{
    if (q == kNotFound)
        return kNotFound;
    if (q > uFrom && p[q - 1] == 0)
        return q - 1;
    return q < uLimit ? q : kNotFound;
}

// The first offset i in [uFrom, uLimit) where 00 00 00 01 (tested first) or 00 00 01 begins,
// with every byte of the code below uLen. uLimit <= uLen - 3 keeps the 4-byte test inside.
inline size_t FindCode(const uint8_t *p, size_t uFrom, size_t uLimit, size_t uLen) noexcept
{
    if (uFrom >= uLimit)
        return kNotFound;
    const size_t uEnd = uLimit + 3 < uLen ? uLimit + 3 : uLen;
    return ResolveCode(p, uFrom, uLimit, FindPrefix(p, uFrom, uEnd));
}

// A start code met by the primed shift-register scan: the index of its first zero byte and the
// index of the unit header after its 01; uPos is kNotFound when there is none.
struct ScannedCode {
    size_t uPos;
    size_t uHeader;
};

// The configuration-run scan from uFrom: a 32-bit register primed with FF and the three bytes
// at uFrom (zeros past the end), then fed one byte at a time but never the last byte of the
// data. A register of 00 00 00 01 is a 4-byte code; low 24 bits 00 00 01 a 3-byte code. The FF
// keeps a zero before uFrom out of the code.
inline ScannedCode ScanPrimed(const uint8_t *p, size_t uFrom, size_t uLen) noexcept
{
    if (uFrom + 2 < uLen && p[uFrom] == 0 && p[uFrom + 1] == 0 && p[uFrom + 2] == 1)
        return {uFrom, uFrom + 3};
    if (uLen == 0)
        return {kNotFound, kNotFound};
    const size_t q = FindPrefix(p, uFrom + 1, uLen - 1);
    if (q == kNotFound)
        return {kNotFound, kNotFound};
    return {p[q - 1] == 0 ? q - 1 : q, q + 3};
}

// NAL length sizes the length-prefixed walks accept.
inline bool ValidLengthSize(int32_t iSize) noexcept
{
    return iSize >= 1 && iSize <= 4;
}

// The length field that follows the unit whose field is at uPos, or kNotFound when it would not
// begin inside the data. The sum is 64-bit, so a length field never wraps the walk around.
inline size_t NextLengthField(const uint8_t *p, size_t uLen, size_t uPos, int32_t iSize) noexcept
{
    const uint64_t uNext = uint64_t{uPos} + static_cast<uint64_t>(iSize) + ReadBE(p, int64_t(uLen), int64_t(uPos), iSize);
    return uNext < uLen ? static_cast<size_t>(uNext) : kNotFound;
}

} // namespace vorcal::tools::nal
