// Start-code search: whole blocks are screened with vector compares (AVX2, SSE2 or NEON,
// chosen at compile time) or 8-byte words, and only positions that can begin 00 00 01 are
// checked byte by byte.
#include "tools/start_code.hpp"

#include <bit>
#include <cstring>

#if defined(__AVX2__) || defined(__SSE2__)
#include <immintrin.h>
#elif defined(__ARM_NEON)
#include <arm_neon.h>
#endif

namespace vorcal::tools {

namespace {

inline bool PrefixAt(const uint8_t *p) noexcept
{
    return p[0] == 0 && p[1] == 0 && p[2] == 1;
}

// Candidate mask of one block: bit k when position k may begin a prefix. Positions whose
// prefix would reach into the next block are kept as candidates on their zero bytes alone.
#if defined(__AVX2__)
constexpr size_t kBlock = 32;
using Mask = uint32_t;
inline Mask Candidates(__m256i v) noexcept
{
    const Mask z = static_cast<Mask>(_mm256_movemask_epi8(_mm256_cmpeq_epi8(v, _mm256_setzero_si256())));
    const Mask o = static_cast<Mask>(_mm256_movemask_epi8(_mm256_cmpeq_epi8(v, _mm256_set1_epi8(1))));
    return z & ((z >> 1) | 0x80000000u) & ((o >> 2) | 0xC0000000u);
}
inline Mask BlockCandidates(const uint8_t *p) noexcept
{
    return Candidates(_mm256_loadu_si256(reinterpret_cast<const __m256i *>(p)));
}
inline Mask BlockCandidatesCopy(const uint8_t *p, uint8_t *q) noexcept
{
    const __m256i v = _mm256_loadu_si256(reinterpret_cast<const __m256i *>(p));
    _mm256_storeu_si256(reinterpret_cast<__m256i *>(q), v);
    return Candidates(v);
}
#elif defined(__SSE2__)
constexpr size_t kBlock = 16;
using Mask = uint32_t;
inline Mask Candidates(__m128i v) noexcept
{
    const Mask z = static_cast<Mask>(_mm_movemask_epi8(_mm_cmpeq_epi8(v, _mm_setzero_si128())));
    const Mask o = static_cast<Mask>(_mm_movemask_epi8(_mm_cmpeq_epi8(v, _mm_set1_epi8(1))));
    return z & ((z >> 1) | 0x8000u) & ((o >> 2) | 0xC000u);
}
inline Mask BlockCandidates(const uint8_t *p) noexcept
{
    return Candidates(_mm_loadu_si128(reinterpret_cast<const __m128i *>(p)));
}
inline Mask BlockCandidatesCopy(const uint8_t *p, uint8_t *q) noexcept
{
    const __m128i v = _mm_loadu_si128(reinterpret_cast<const __m128i *>(p));
    _mm_storeu_si128(reinterpret_cast<__m128i *>(q), v);
    return Candidates(v);
}
#elif defined(__ARM_NEON)
// NEON has no byte movemask: a block with any zero byte makes every position a candidate,
// which the byte check then sorts out (rare in coded slice data).
constexpr size_t kBlock = 16;
using Mask = uint32_t;
inline Mask Candidates(uint8x16_t v) noexcept
{
    const uint64x2_t z = vreinterpretq_u64_u8(vceqq_u8(v, vdupq_n_u8(0)));
    return (vgetq_lane_u64(z, 0) | vgetq_lane_u64(z, 1)) != 0 ? 0xFFFFu : 0u;
}
inline Mask BlockCandidates(const uint8_t *p) noexcept
{
    return Candidates(vld1q_u8(p));
}
inline Mask BlockCandidatesCopy(const uint8_t *p, uint8_t *q) noexcept
{
    const uint8x16_t v = vld1q_u8(p);
    vst1q_u8(q, v);
    return Candidates(v);
}
#else
// Portable: an 8-byte word; a candidate wherever the word holds a zero byte.
constexpr size_t kBlock = 8;
using Mask = uint32_t;
inline Mask Candidates(uint64_t w) noexcept
{
    const uint64_t kOnes = 0x0101010101010101ull;
    return ((w - kOnes) & ~w & (kOnes << 7)) != 0 ? 0xFFu : 0u;
}
inline Mask BlockCandidates(const uint8_t *p) noexcept
{
    uint64_t w;
    memcpy(&w, p, sizeof w);
    return Candidates(w);
}
inline Mask BlockCandidatesCopy(const uint8_t *p, uint8_t *q) noexcept
{
    uint64_t w;
    memcpy(&w, p, sizeof w);
    memcpy(q, &w, sizeof w);
    return Candidates(w);
}
#endif

// First candidate of the block at p that really begins a prefix, or kBlock. The block plus
// two bytes must be readable.
inline size_t CheckCandidates(const uint8_t *p, Mask m) noexcept
{
    for (; m != 0; m &= m - 1) {
        const size_t k = static_cast<size_t>(std::countr_zero(m));
        if (PrefixAt(p + k))
            return k;
    }
    return kBlock;
}

// Stride screening: a prefix needs two zero bytes in a row, rare in coded data, so whole
// 64-byte strides are tested for a zero pair (bytes k and k + 1, compares on the stride and on
// the stride shifted by one byte) before any position is looked at. Reads p[0..64].
#if defined(__AVX2__)
constexpr size_t kStride = 64;
// As the SSE2 screen below: lanes AND FE FF, a byte-wise minimum, and the last offset apart.
template <bool kCopy>
inline __m256i MaskedBlock(const uint8_t *p, uint8_t *q, size_t k) noexcept
{
    const __m256i v = _mm256_loadu_si256(reinterpret_cast<const __m256i *>(p + k));
    if constexpr (kCopy)
        _mm256_storeu_si256(reinterpret_cast<__m256i *>(q + k), v);
    return _mm256_and_si256(v, _mm256_set1_epi16(static_cast<short>(0xFEFF)));
}
template <bool kCopy>
inline bool StrideScan(const uint8_t *p, uint8_t *q) noexcept
{
    const __m256i m = _mm256_min_epu8(MaskedBlock<kCopy>(p, q, 0), MaskedBlock<kCopy>(p, q, 32));
    return _mm256_movemask_epi8(_mm256_cmpeq_epi16(m, _mm256_setzero_si256())) != 0 || (p[63] | p[64]) == 0;
}
inline bool StrideHasZeroPair(const uint8_t *p) noexcept
{
    return StrideScan<false>(p, nullptr);
}
inline bool StrideHasZeroPairCopy(const uint8_t *p, uint8_t *q) noexcept
{
    return StrideScan<true>(p, q);
}
#elif defined(__SSE2__)
constexpr size_t kStride = 64;
// A prefix at an even offset of the stride makes a 16-bit lane 00 00; at an odd offset the
// next lane holds 00 01. Both are "lane AND FE FF is zero"; a byte-wise minimum over the four
// blocks keeps every such lane at zero (and seldom makes others zero, which the exact check
// then drops). A prefix at the last offset has its 00 01 outside the stride: tested apart.
template <bool kCopy>
inline __m128i MaskedBlock(const uint8_t *p, uint8_t *q, size_t k) noexcept
{
    const __m128i v = _mm_loadu_si128(reinterpret_cast<const __m128i *>(p + k));
    if constexpr (kCopy)
        _mm_storeu_si128(reinterpret_cast<__m128i *>(q + k), v);
    return _mm_and_si128(v, _mm_set1_epi16(static_cast<short>(0xFEFF)));
}
template <bool kCopy>
inline bool StrideScan(const uint8_t *p, uint8_t *q) noexcept
{
    const __m128i a = _mm_min_epu8(MaskedBlock<kCopy>(p, q, 0), MaskedBlock<kCopy>(p, q, 16));
    const __m128i b = _mm_min_epu8(MaskedBlock<kCopy>(p, q, 32), MaskedBlock<kCopy>(p, q, 48));
    return _mm_movemask_epi8(_mm_cmpeq_epi16(_mm_min_epu8(a, b), _mm_setzero_si128())) != 0 || (p[63] | p[64]) == 0;
}
inline bool StrideHasZeroPair(const uint8_t *p) noexcept
{
    return StrideScan<false>(p, nullptr);
}
inline bool StrideHasZeroPairCopy(const uint8_t *p, uint8_t *q) noexcept
{
    return StrideScan<true>(p, q);
}
#elif defined(__ARM_NEON)
constexpr size_t kStride = 64;
inline uint8x16_t ZeroPairs16(const uint8_t *p) noexcept
{
    const uint8x16_t z = vdupq_n_u8(0);
    return vandq_u8(vceqq_u8(vld1q_u8(p), z), vceqq_u8(vld1q_u8(p + 1), z));
}
inline bool StrideHasZeroPair(const uint8_t *p) noexcept
{
    const uint8x16_t a = vorrq_u8(vorrq_u8(ZeroPairs16(p), ZeroPairs16(p + 16)),
                                  vorrq_u8(ZeroPairs16(p + 32), ZeroPairs16(p + 48)));
    const uint64x2_t w = vreinterpretq_u64_u8(a);
    return (vgetq_lane_u64(w, 0) | vgetq_lane_u64(w, 1)) != 0;
}
inline bool StrideHasZeroPairCopy(const uint8_t *p, uint8_t *q) noexcept
{
    for (size_t k = 0; k < 64; k += 16)
        vst1q_u8(q + k, vld1q_u8(p + k));
    return StrideHasZeroPair(p);
}
#else
// Portable: the blocks alone (8-byte words).
constexpr size_t kStride = 0;
inline bool StrideHasZeroPair(const uint8_t *) noexcept
{
    return true;
}
inline bool StrideHasZeroPairCopy(const uint8_t *, uint8_t *) noexcept
{
    return true;
}
#endif

// First prefix beginning in the stride at p (blocks, then candidates), or kStride. The stride
// plus two bytes must be readable.
inline size_t FindInStride(const uint8_t *p) noexcept
{
    for (size_t b = 0; b < kStride; b += kBlock) {
        const Mask m = BlockCandidates(p + b);
        if (m != 0) {
            const size_t k = CheckCandidates(p + b, m);
            if (k != kBlock)
                return b + k;
        }
    }
    return kStride;
}

} // namespace

size_t FindStartCodePrefix(const uint8_t *pData, size_t uFrom, size_t uEnd) noexcept
{
    if (uEnd < 3 || uFrom >= uEnd - 2)
        return uEnd;
    const size_t uLast = uEnd - 2; // a prefix begins below uLast
    size_t i = uFrom;
    if constexpr (kStride != 0) {
        for (; i + kStride <= uLast; i += kStride) {
            if (StrideHasZeroPair(pData + i)) {
                const size_t k = FindInStride(pData + i);
                if (k != kStride)
                    return i + k;
            }
        }
    }
    for (; i + kBlock <= uLast; i += kBlock) {
        const Mask m = BlockCandidates(pData + i);
        if (m != 0) {
            const size_t k = CheckCandidates(pData + i, m);
            if (k != kBlock)
                return i + k;
        }
    }
    for (; i < uLast; ++i) {
        if (PrefixAt(pData + i))
            return i;
    }
    return uEnd;
}

size_t FindStartCodePrefixCopy(const uint8_t *pData, size_t uFrom, size_t uEnd, uint8_t *pDst,
                               size_t uDstRoom) noexcept
{
    size_t i = uFrom;
    if (uEnd >= 3 && uFrom < uEnd - 2) {
        const size_t uLast = uEnd - 2;
        if constexpr (kStride != 0) {
            // Whole strides while both the source and the room allow.
            const size_t uStop = uDstRoom < uLast - uFrom ? uFrom + uDstRoom : uLast;
            for (; i + kStride <= uStop; i += kStride) {
                if (StrideHasZeroPairCopy(pData + i, pDst + (i - uFrom))) {
                    const size_t k = FindInStride(pData + i);
                    if (k != kStride)
                        return i + k;
                }
            }
        }
        for (; i + kBlock <= uLast && i - uFrom + kBlock <= uDstRoom; i += kBlock) {
            const Mask m = BlockCandidatesCopy(pData + i, pDst + (i - uFrom));
            if (m != 0) {
                const size_t k = CheckCandidates(pData + i, m);
                if (k != kBlock)
                    return i + k;
            }
        }
    }
    // The tail (or a destination too short for whole blocks): plain search, then one copy.
    const size_t r = FindStartCodePrefix(pData, i, uEnd);
    const size_t uStop = r < uEnd ? r : uEnd;
    if (uStop > i && i - uFrom < uDstRoom) {
        const size_t n = uStop - i;
        const size_t uRoom = uDstRoom - (i - uFrom);
        memcpy(pDst + (i - uFrom), pData + i, n < uRoom ? n : uRoom);
    }
    return r;
}

} // namespace vorcal::tools
