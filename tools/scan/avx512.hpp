// The AVX-512 layer of the start-code kernels: 64-byte vectors with mask registers, 256-byte
// strides, masked loads and stores for every tail. Included by the AVX-512BW variant and, with
// kVbmi, by the AVX-512VBMI one; each translation unit is compiled for its own set.
#pragma once

#include <immintrin.h>

#include "tools/scan/kernels.hpp"

namespace vorcal::tools::scan {
namespace {

inline uint64_t ZeroMask(__m512i v) noexcept
{
    return _mm512_testn_epi8_mask(v, v);
}
inline uint64_t OneMask(__m512i v) noexcept
{
    return _mm512_cmpeq_epi8_mask(v, _mm512_set1_epi8(1));
}
// The low n < 64 bits.
inline uint64_t LowBits(size_t n) noexcept
{
    return _bzhi_u64(~uint64_t{0}, static_cast<unsigned>(n));
}

// Byte indexes 1..64 of a two-vector permutation: the vector shifted by one byte, the next
// vector's first byte at its end.
inline __m512i NextBytes() noexcept
{
    return _mm512_set_epi8(64, 63, 62, 61, 60, 59, 58, 57, 56, 55, 54, 53, 52, 51, 50, 49, 48, 47, 46, 45, 44, 43,
                           42, 41, 40, 39, 38, 37, 36, 35, 34, 33, 32, 31, 30, 29, 28, 27, 26, 25, 24, 23, 22, 21,
                           20, 19, 18, 17, 16, 15, 14, 13, 12, 11, 10, 9, 8, 7, 6, 5, 4, 3, 2, 1);
}

template <bool kVbmi>
struct Avx512 {
    using Vec = __m512i;
    static constexpr size_t kBlock = 64;
    static constexpr size_t kStride = 256;
    static constexpr bool kMasked = true;
    static Vec Load(const uint8_t *p) noexcept { return _mm512_loadu_si512(p); }
    static Vec LoadAligned(const uint8_t *p) noexcept { return _mm512_load_si512(p); }
    static uint64_t Candidates(Vec v) noexcept
    {
        const uint64_t z = ZeroMask(v);
        return z & ((z >> 1) | (uint64_t{1} << 63)) & ((OneMask(v) >> 2) | (uint64_t{3} << 62));
    }
    static Vec LaneMask(Vec v) noexcept { return _mm512_and_si512(v, _mm512_set1_epi16(static_cast<short>(0xFEFF))); }
    static Vec Min(Vec a, Vec b) noexcept { return _mm512_min_epu8(a, b); }
    static bool AnyZeroLane(Vec v) noexcept { return _mm512_testn_epi16_mask(v, v) != 0; }
    // Positions below n - 2 of the n <= kBlock + 1 bytes at p; the bytes past 64 (or past n)
    // load as zero, their zero bits are dropped and no 01 is seen there, so the last two
    // positions are kept on their zeros alone for the byte check.
    static uint64_t TailCandidates(const uint8_t *p, size_t n) noexcept
    {
        const uint64_t k = n >= kBlock ? ~uint64_t{0} : LowBits(n);
        const Vec v = _mm512_maskz_loadu_epi8(k, p);
        const uint64_t z = ZeroMask(v) & k;
        return z & ((z >> 1) | (uint64_t{1} << 63)) & ((OneMask(v) >> 2) | (uint64_t{3} << 62)) & LowBits(n - 2);
    }

    // Each vector and the same shifted by one byte (the next vector's first byte at its end):
    // the unsigned 16-bit minimum of all keeps a zero lane exactly where a zero pair begins. The
    // shifted vectors come from a two-vector byte permutation with VBMI, else from loads.
    static constexpr size_t kGroup = 256;
    template <size_t kBytes>
    [[gnu::always_inline]] static bool CopyScreen(const uint8_t *s, uint8_t *d) noexcept
    {
        constexpr size_t kVectors = kBytes / 64;
        Vec v[kVectors];
#pragma GCC unroll 4
        for (size_t k = 0; k < kVectors; ++k) {
            v[k] = Load(s + 64 * k);
            _mm512_storeu_si512(d + 64 * k, v[k]);
        }
        Vec low = _mm512_min_epu16(v[kVectors - 1], Load(s + kBytes - 63));
#pragma GCC unroll 3
        for (size_t k = 0; k + 1 < kVectors; ++k) {
            Vec w;
            if constexpr (kVbmi)
                w = _mm512_permutex2var_epi8(v[k], NextBytes(), v[k + 1]);
            else
                w = Load(s + 64 * k + 1);
            low = _mm512_min_epu16(low, _mm512_min_epu16(v[k], w));
        }
        return AnyZeroLane(low);
    }
    // Zero 16-bit lanes of a vector (pairs at even offsets) and of the one a byte further on
    // (odd offsets).
    template <size_t kBytes>
    static size_t FirstPair(const uint8_t *s) noexcept
    {
        for (size_t b = 0; b < kBytes; b += 64) {
            const uint64_t e = _mm512_testn_epi16_mask(Load(s + b), Load(s + b));
            const uint64_t o = _mm512_testn_epi16_mask(Load(s + b + 1), Load(s + b + 1));
            if ((e | o) != 0) {
                const size_t pe = e != 0 ? 2 * LowestBit(e) : 64, po = o != 0 ? 2 * LowestBit(o) + 1 : 64;
                return b + (pe < po ? pe : po);
            }
        }
        return kBytes;
    }
    // One masked load and store.
    static void CopyTail(uint8_t *d, const uint8_t *s, size_t n) noexcept
    {
        const uint64_t k = n >= 64 ? ~uint64_t{0} : LowBits(n);
        _mm512_mask_storeu_epi8(d, k, _mm512_maskz_loadu_epi8(k, s));
    }
};

} // namespace
} // namespace vorcal::tools::scan
