// The parse-only bit reader's operations as inline functions: the exported reader calls them,
// and so do the element parsers, whose inner loops would otherwise pay a PLT call per field.
#pragma once

#include <array>
#include <cstdint>
#include <cstring>

#include <vorcal/aacparse.h>

namespace vorcal::aacparse::bits {

// Entry k is 2^k - 1.
inline constexpr std::array<uint32_t, 33> kMask = [] {
    std::array<uint32_t, 33> mask{};
    for (uint32_t k = 0; k < 32; ++k)
        mask[k] = (1u << k) - 1u;
    mask[32] = 0xFFFFFFFFu;
    return mask;
}();
static_assert(kMask[0] == 0 && kMask[1] == 1 && kMask[25] == 0x1FFFFFF && kMask[32] == 0xFFFFFFFF);

inline void Advance(VrBitReader_OnlyParsing &b, uint32_t n) noexcept
{
    const uint32_t uTotal = b.uBitPos + n;
    b.pCurrent += uTotal >> 3;
    b.uBitPos = uTotal & 7;
    b.uProcessedBits += n;
}

// The next n bits from the big-endian word at the current byte. CONTRACT: 0 when the shift
// count 32 - p - n leaves 0..31 (n = 0 at position 0, or n beyond the word).
inline uint32_t Show(const VrBitReader_OnlyParsing &b, uint32_t n) noexcept
{
    const uint8_t *p = b.pCurrent;
    const uint32_t uWord =
        (uint32_t{p[0]} << 24) | (uint32_t{p[1]} << 16) | (uint32_t{p[2]} << 8) | p[3];
    const uint32_t uKept = uWord & kMask[32 - b.uBitPos];
    const int64_t iShift = int64_t{32} - b.uBitPos - n;
    return (iShift < 0 || iShift > 31) ? 0u : uKept >> iShift;
}

// Show for 1 <= n <= 25, which is always exact: one unaligned big-endian load and two shifts.
inline uint32_t ShowShort(const VrBitReader_OnlyParsing &b, uint32_t n) noexcept
{
    uint32_t uWord;
    std::memcpy(&uWord, b.pCurrent, 4);
#if defined(__BYTE_ORDER__) && __BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__
    uWord = __builtin_bswap32(uWord);
#endif
    return (uWord << b.uBitPos) >> (32 - n);
}

inline uint32_t Get(VrBitReader_OnlyParsing &b, uint32_t n) noexcept
{
    const uint32_t uValue = Show(b, n);
    Advance(b, n);
    return uValue;
}

// Get for 1 <= n <= 25.
inline uint32_t GetShort(VrBitReader_OnlyParsing &b, uint32_t n) noexcept
{
    const uint32_t uValue = ShowShort(b, n);
    Advance(b, n);
    return uValue;
}

// Eight bits from two bytes at the bit position, the top n of them; the advance is exact for any n.
inline uint32_t GetFast(VrBitReader_OnlyParsing &b, uint32_t n) noexcept
{
    const uint32_t p = b.uBitPos;
    const uint32_t uEight =
        ((uint32_t{b.pCurrent[0]} << p) & 0xFF) | ((uint32_t{b.pCurrent[1]} << p) >> 8);
    const uint32_t uValue = n < 32 ? (uEight << n) >> 8 : 0u;
    Advance(b, n);
    return uValue;
}

inline uint32_t Get1(VrBitReader_OnlyParsing &b) noexcept
{
    const uint32_t uBit = ((uint32_t{b.pCurrent[0]} << b.uBitPos) & 0xFF) >> 7;
    Advance(b, 1);
    return uBit;
}

inline int32_t ByteAlign(VrBitReader_OnlyParsing &b) noexcept
{
    int32_t iSkipped = 0;
    while (b.uBitPos != 0) {
        Get1(b);
        ++iSkipped;
    }
    return iSkipped;
}

} // namespace vorcal::aacparse::bits
