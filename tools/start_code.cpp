// Start-code search: aligned 128-byte strides and then blocks are screened with vector compares
// (AVX2, SSE2 or NEON, chosen at compile time) or 8-byte words, and only positions that can
// begin 00 00 01 are checked byte by byte. The copying variant searches a chunk at a time and
// copies it with memcpy while it is still in the first-level cache.
#include "tools/start_code.hpp"

#include <bit>
#include <cstdint>
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

// The per-architecture layer: a block type Vec of kBlock bytes with Load (any address) and
// LoadAligned (a multiple of kBlock, which lets SSE2 fold the load into the compare), the
// candidate mask of one block (bit k when position k may begin a prefix; positions whose
// prefix would reach into the next block are kept on their zero bytes alone), and for the
// stride screen below LaneMask, Min and AnyZeroLane.
#if defined(__AVX2__)
using Vec = __m256i;
constexpr size_t kBlock = 32;
inline Vec Load(const uint8_t *p) noexcept { return _mm256_loadu_si256(reinterpret_cast<const Vec *>(p)); }
inline Vec LoadAligned(const uint8_t *p) noexcept { return _mm256_load_si256(reinterpret_cast<const Vec *>(p)); }
inline uint32_t Candidates(Vec v) noexcept
{
    const uint32_t z = static_cast<uint32_t>(_mm256_movemask_epi8(_mm256_cmpeq_epi8(v, _mm256_setzero_si256())));
    const uint32_t o = static_cast<uint32_t>(_mm256_movemask_epi8(_mm256_cmpeq_epi8(v, _mm256_set1_epi8(1))));
    return z & ((z >> 1) | 0x80000000u) & ((o >> 2) | 0xC0000000u);
}
inline Vec LaneMask(Vec v) noexcept { return _mm256_and_si256(v, _mm256_set1_epi16(static_cast<short>(0xFEFF))); }
inline Vec Min(Vec a, Vec b) noexcept { return _mm256_min_epu8(a, b); }
inline bool AnyZeroLane(Vec v) noexcept { return _mm256_movemask_epi8(_mm256_cmpeq_epi16(v, _mm256_setzero_si256())) != 0; }
constexpr size_t kStride = 128;
#elif defined(__SSE2__)
using Vec = __m128i;
constexpr size_t kBlock = 16;
inline Vec Load(const uint8_t *p) noexcept { return _mm_loadu_si128(reinterpret_cast<const Vec *>(p)); }
inline Vec LoadAligned(const uint8_t *p) noexcept { return _mm_load_si128(reinterpret_cast<const Vec *>(p)); }
inline uint32_t Candidates(Vec v) noexcept
{
    const uint32_t z = static_cast<uint32_t>(_mm_movemask_epi8(_mm_cmpeq_epi8(v, _mm_setzero_si128())));
    const uint32_t o = static_cast<uint32_t>(_mm_movemask_epi8(_mm_cmpeq_epi8(v, _mm_set1_epi8(1))));
    return z & ((z >> 1) | 0x8000u) & ((o >> 2) | 0xC000u);
}
inline Vec LaneMask(Vec v) noexcept { return _mm_and_si128(v, _mm_set1_epi16(static_cast<short>(0xFEFF))); }
inline Vec Min(Vec a, Vec b) noexcept { return _mm_min_epu8(a, b); }
inline bool AnyZeroLane(Vec v) noexcept { return _mm_movemask_epi8(_mm_cmpeq_epi16(v, _mm_setzero_si128())) != 0; }
constexpr size_t kStride = 128;
#elif defined(__ARM_NEON)
// NEON has no byte movemask: a block with any zero byte makes every position a candidate,
// which the byte check then sorts out (rare in coded slice data).
using Vec = uint8x16_t;
constexpr size_t kBlock = 16;
inline Vec Load(const uint8_t *p) noexcept { return vld1q_u8(p); }
inline Vec LoadAligned(const uint8_t *p) noexcept { return vld1q_u8(p); }
inline bool AnyNonZero(uint8x16_t v) noexcept
{
    const uint64x2_t w = vreinterpretq_u64_u8(v);
    return (vgetq_lane_u64(w, 0) | vgetq_lane_u64(w, 1)) != 0;
}
inline uint32_t Candidates(Vec v) noexcept { return AnyNonZero(vceqq_u8(v, vdupq_n_u8(0))) ? 0xFFFFu : 0u; }
inline Vec LaneMask(Vec v) noexcept { return vandq_u8(v, vreinterpretq_u8_u16(vdupq_n_u16(0xFEFF))); }
inline Vec Min(Vec a, Vec b) noexcept { return vminq_u8(a, b); }
inline bool AnyZeroLane(Vec v) noexcept
{
    return AnyNonZero(vreinterpretq_u8_u16(vceqq_u16(vreinterpretq_u16_u8(v), vdupq_n_u16(0))));
}
constexpr size_t kStride = 128;
#else
// Portable: an 8-byte word, a candidate wherever it holds a zero byte; no stride screen.
using Vec = uint64_t;
constexpr size_t kBlock = 8;
inline Vec Load(const uint8_t *p) noexcept
{
    Vec w;
    memcpy(&w, p, sizeof w);
    return w;
}
inline uint32_t Candidates(Vec w) noexcept
{
    const uint64_t kOnes = 0x0101010101010101ull;
    return ((w - kOnes) & ~w & (kOnes << 7)) != 0 ? 0xFFu : 0u;
}
// Never called (no stride screen); declared for the generic code.
[[maybe_unused]] inline Vec LoadAligned(const uint8_t *p) noexcept { return Load(p); }
[[maybe_unused]] inline Vec LaneMask(Vec w) noexcept { return w; }
[[maybe_unused]] inline Vec Min(Vec a, Vec) noexcept { return a; }
[[maybe_unused]] inline bool AnyZeroLane(Vec) noexcept { return true; }
constexpr size_t kStride = 0;
#endif

static_assert(kStride == 0 || (kStride % kBlock == 0 && kStride / kBlock >= 2), "a stride is whole blocks");

// First candidate of the block at p that really begins a prefix, or kBlock. The block plus
// two bytes must be readable.
inline size_t CheckCandidates(const uint8_t *p, uint32_t m) noexcept
{
    for (; m != 0; m &= m - 1) {
        const size_t k = static_cast<size_t>(std::countr_zero(m));
        if (PrefixAt(p + k))
            return k;
    }
    return kBlock;
}

// First prefix beginning in the block at p, or kBlock.
inline size_t ScanBlock(const uint8_t *p) noexcept
{
    const uint32_t m = Candidates(Load(p));
    return m != 0 ? CheckCandidates(p, m) : kBlock;
}

// Byte-wise minimum of kCount aligned blocks from block kFirst of p on, as a tree.
template <size_t kFirst, size_t kCount>
inline Vec MinOfBlocks(const uint8_t *p) noexcept
{
    if constexpr (kCount == 1)
        return LoadAligned(p + kFirst * kBlock);
    else
        return Min(MinOfBlocks<kFirst, kCount / 2>(p), MinOfBlocks<kFirst + kCount / 2, kCount - kCount / 2>(p));
}

// Stride screen: a prefix at an even offset of the stride makes a 16-bit lane 00 00, at an
// odd offset the next lane holds 00 01; both are "lane AND FE FF is zero". A byte-wise minimum
// over the blocks keeps every such lane at zero (and seldom makes others zero, which the
// blocks then drop); the AND is monotonic, so it is applied once to the minimum. A prefix at
// the last offset has its 00 01 outside the stride and is tested apart. p is aligned to
// kBlock; reads p[0..kStride]. True when the stride needs a closer look.
inline bool StrideMayHoldPrefix(const uint8_t *p) noexcept
{
    if constexpr (kStride == 0)
        return true;
    else
        return AnyZeroLane(LaneMask(MinOfBlocks<0, kStride / kBlock>(p))) || (p[kStride - 1] | p[kStride]) == 0;
}

// First prefix beginning in the stride at p, or kStride. The stride plus two bytes must be
// readable.
[[maybe_unused]] inline size_t FindInStride(const uint8_t *p) noexcept
{
    for (size_t b = 0; b < kStride; b += kBlock) {
        const size_t k = ScanBlock(p + b);
        if (k != kBlock)
            return b + k;
    }
    return kStride;
}

// Prefetch distance of the stride loop: the hardware prefetcher alone leaves the loop waiting
// on the outer caches; 2 KB ahead keeps enough lines in flight.
constexpr size_t kPrefetch = 2048;

// First prefix beginning in the aligned stride at p, or kStride; reads p[0..kStride + 2).
inline size_t ScanStride(const uint8_t *p) noexcept
{
    return StrideMayHoldPrefix(p) ? FindInStride(p) : kStride;
}

// The search from i while whole strides, then whole blocks, fit below uStop; lines up to
// uDataEnd (the end of the caller's data) are prefetched. Returns the prefix found or uEnd; i
// is left at the first position not yet examined.
inline size_t ScanWhole(const uint8_t *pData, size_t &i, size_t uStop, size_t uEnd, size_t uDataEnd) noexcept
{
    if constexpr (kStride != 0) {
        if (i + kBlock + kStride <= uStop) {
            // The strides begin at a block boundary; an unaligned first block covers the way there.
            const size_t uMisaligned = reinterpret_cast<uintptr_t>(pData + i) % kBlock;
            if (uMisaligned != 0) {
                const size_t k = ScanBlock(pData + i);
                if (k != kBlock)
                    return i + k;
                i += kBlock - uMisaligned;
            }
            // Strides with a prefetch while the line fetched stays inside the data, then without.
            const size_t uAheadStop = uDataEnd >= kPrefetch + kStride ? uDataEnd - kPrefetch : 0;
            const size_t uPrefetchStop = uAheadStop < uStop ? uAheadStop : uStop;
            for (; i + kStride <= uPrefetchStop; i += kStride) {
                __builtin_prefetch(pData + i + kPrefetch);
                __builtin_prefetch(pData + i + kPrefetch + 64);
                const size_t s = ScanStride(pData + i);
                if (s != kStride)
                    return i + s;
            }
            for (; i + kStride <= uStop; i += kStride) {
                const size_t s = ScanStride(pData + i);
                if (s != kStride)
                    return i + s;
            }
        }
    }
    for (; i + kBlock <= uStop; i += kBlock) {
        const size_t k = ScanBlock(pData + i);
        if (k != kBlock)
            return i + k;
    }
    return uEnd;
}

// FindStartCodePrefix, prefetching up to uDataEnd >= uEnd.
size_t Find(const uint8_t *pData, size_t uFrom, size_t uEnd, size_t uDataEnd) noexcept
{
    if (uEnd < 3 || uFrom >= uEnd - 2)
        return uEnd;
    const size_t uLast = uEnd - 2; // a prefix begins below uLast
    size_t i = uFrom;
    const size_t r = ScanWhole(pData, i, uLast, uEnd, uDataEnd);
    if (r != uEnd)
        return r;
    for (; i < uLast; ++i) {
        if (PrefixAt(pData + i))
            return i;
    }
    return uEnd;
}

// Bytes searched before each memcpy of the copying variant: small enough to stay in L1.
constexpr size_t kCopyChunk = 4096;

} // namespace

size_t FindStartCodePrefix(const uint8_t *pData, size_t uFrom, size_t uEnd) noexcept
{
    return Find(pData, uFrom, uEnd, uEnd);
}

size_t FindStartCodePrefixCopy(const uint8_t *pData, size_t uFrom, size_t uEnd, uint8_t *pDst,
                               size_t uDstRoom) noexcept
{
    for (size_t i = uFrom; i < uEnd;) {
        const size_t uDone = i - uFrom;
        if (uDone >= uDstRoom)
            return Find(pData, i, uEnd, uEnd);
        // Chunks end on stride boundaries, so that the searches after the first are whole
        // strides; prefixes beginning below uChunkEnd lie wholly below uScanEnd.
        const size_t uChunkEnd = uEnd - i > kCopyChunk
            ? i + kCopyChunk - reinterpret_cast<uintptr_t>(pData + i + kCopyChunk) % (kStride != 0 ? kStride : 1)
            : uEnd;
        const size_t uScanEnd = uEnd - uChunkEnd > 2 ? uChunkEnd + 2 : uEnd;
        const size_t r = Find(pData, i, uScanEnd, uEnd);
        const size_t uStop = r < uScanEnd ? r : uChunkEnd;
        const size_t uRoom = uDstRoom - uDone;
        memcpy(pDst + uDone, pData + i, uStop - i < uRoom ? uStop - i : uRoom);
        if (r < uScanEnd)
            return r;
        i = uChunkEnd;
    }
    return uEnd;
}

} // namespace vorcal::tools
