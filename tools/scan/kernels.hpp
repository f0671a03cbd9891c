// The start-code search and its fused copy, written once over an instruction-set
// layer T and instantiated by each variant's translation unit (tools/scan/scan_*.cpp), which is
// compiled for that instruction set. Everything here has internal linkage, so that the linker
// can never pick a copy compiled for a wider set for code that runs on a narrower one.
//
// The search screens aligned strides and then blocks with vector compares, and only positions
// that can begin 00 00 01 are checked byte by byte. The fused copy loads each group of bytes
// once, stores it to the destination and screens it for a zero pair (00 00, which every prefix
// begins with and coded slice data seldom holds); only a group with one is searched closer. No
// load or store ever leaves the caller's buffers: tails are done with masked or overlapping
// accesses.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>

#include "tools/start_code.hpp"

namespace vorcal::tools::scan {
namespace {

// T, the instruction-set layer:
//   Vec, kBlock          a vector of kBlock bytes; Load (any address), LoadAligned (a multiple
//                        of kBlock, which lets SSE2 fold the load into the compare)
//   Candidates(v)        bit k set when position k of the block may begin 00 00 01; positions
//                        whose prefix would reach into the next block are kept on their zeros
//   kStride, LaneMask, Min, AnyZeroLane   the stride screen below (kStride 0: none)
//   kMasked, TailCandidates(p, n)  (kMasked only) Candidates of the positions below n - 2 of the
//                        n <= kBlock + 1 bytes at p, without reading past them
//   kGroup               bytes of the main step of the fused copy, a multiple of 64
//   CopyScreen<k>(s, d)  k = 64 or kGroup: copies k bytes and tells whether a zero pair (00 00)
//                        begins at one of them; reads one byte more (the pair's second byte)
//   FirstPair<k>(s)      the offset of the first zero pair beginning in the k bytes at s, when
//                        CopyScreen saw one; reads one byte more
//   CopyTail(d, s, n)    copies n <= 64 bytes

constexpr size_t kNone = SIZE_MAX;

// Prefetch distance of the strided search: the hardware prefetcher alone leaves it waiting on
// the outer caches; 2 KB ahead keeps enough lines in flight. The fused copy, which stores as
// much as it loads, runs faster without (streamed and cache-hot alike).
constexpr size_t kPrefetch = 2048;

inline bool PrefixAt(const uint8_t *p) noexcept
{
    return p[0] == 0 && p[1] == 0 && p[2] == 1;
}

inline size_t LowestBit(uint64_t m) noexcept
{
    return static_cast<size_t>(__builtin_ctzll(m));
}

// Byte-wise minimum of kCount aligned blocks from block kFirst of p on, as a tree.
template <class T, size_t kFirst, size_t kCount>
inline typename T::Vec MinOfBlocks(const uint8_t *p) noexcept
{
    if constexpr (kCount == 1)
        return T::LoadAligned(p + kFirst * T::kBlock);
    else
        return T::Min(MinOfBlocks<T, kFirst, kCount / 2>(p),
                      MinOfBlocks<T, kFirst + kCount / 2, kCount - kCount / 2>(p));
}

// First candidate of the block at p that really begins a prefix, or kBlock. The block plus
// two bytes must be readable.
template <class T>
inline size_t CheckCandidates(const uint8_t *p, uint64_t m) noexcept
{
    for (; m != 0; m &= m - 1) {
        const size_t k = LowestBit(m);
        if (PrefixAt(p + k))
            return k;
    }
    return T::kBlock;
}

// First prefix beginning in the block at p, or kBlock.
template <class T>
inline size_t ScanBlock(const uint8_t *p) noexcept
{
    const uint64_t m = T::Candidates(T::Load(p));
    return m != 0 ? CheckCandidates<T>(p, m) : T::kBlock;
}

// Stride screen: a prefix at an even offset of the stride makes a 16-bit lane 00 00, at an
// odd offset the next lane holds 00 01; both are "lane AND FE FF is zero". A byte-wise minimum
// over the blocks keeps every such lane at zero (and seldom makes others zero, which the
// blocks then drop); the AND is monotonic, so it is applied once to the minimum. A prefix at
// the last offset has its 00 01 outside the stride and is tested apart. p is aligned to
// kBlock; reads p[0..kStride]. True when the stride needs a closer look.
template <class T>
inline bool StrideMayHoldPrefix(const uint8_t *p) noexcept
{
    return T::AnyZeroLane(T::LaneMask(MinOfBlocks<T, 0, T::kStride / T::kBlock>(p))) ||
           (p[T::kStride - 1] | p[T::kStride]) == 0;
}

// First prefix beginning in the aligned stride at p, or kStride; reads p[0..kStride + 2).
template <class T>
inline size_t ScanStride(const uint8_t *p) noexcept
{
    if (!StrideMayHoldPrefix<T>(p))
        return T::kStride;
    for (size_t b = 0; b < T::kStride; b += T::kBlock) {
        const size_t k = ScanBlock<T>(p + b);
        if (k != T::kBlock)
            return b + k;
    }
    return T::kStride;
}

// The search from i while whole strides, then whole blocks, fit below uStop; lines up to uEnd
// are prefetched. Returns the prefix found or kNone; i is left at the first position not yet
// examined.
template <class T>
inline size_t ScanWhole(const uint8_t *pData, size_t &i, size_t uStop, size_t uEnd) noexcept
{
    if constexpr (T::kStride != 0) {
        static_assert(T::kStride % T::kBlock == 0 && T::kStride / T::kBlock >= 2, "a stride is whole blocks");
        if (i + T::kBlock + T::kStride <= uStop) {
            // The strides begin at a block boundary; an unaligned first block covers the way there.
            const size_t uMisaligned = reinterpret_cast<uintptr_t>(pData + i) % T::kBlock;
            if (uMisaligned != 0) {
                const size_t k = ScanBlock<T>(pData + i);
                if (k != T::kBlock)
                    return i + k;
                i += T::kBlock - uMisaligned;
            }
            // Strides with a prefetch while the line fetched stays inside the data, then without.
            const size_t uAheadStop = uEnd >= kPrefetch + T::kStride ? uEnd - kPrefetch : 0;
            const size_t uPrefetchStop = uAheadStop < uStop ? uAheadStop : uStop;
            for (; i + T::kStride <= uPrefetchStop; i += T::kStride) {
#pragma GCC unroll 4
                for (size_t uLine = 0; uLine < T::kStride; uLine += 64)
                    __builtin_prefetch(pData + i + kPrefetch + uLine);
                const size_t s = ScanStride<T>(pData + i);
                if (s != T::kStride)
                    return i + s;
            }
            for (; i + T::kStride <= uStop; i += T::kStride) {
                const size_t s = ScanStride<T>(pData + i);
                if (s != T::kStride)
                    return i + s;
            }
        }
    }
    for (; i + T::kBlock <= uStop; i += T::kBlock) {
        const size_t k = ScanBlock<T>(pData + i);
        if (k != T::kBlock)
            return i + k;
    }
    return kNone;
}

// FindStartCodePrefix.
template <class T>
size_t Find(const uint8_t *pData, size_t uFrom, size_t uEnd) noexcept
{
    if (uEnd < 3 || uFrom >= uEnd - 2)
        return uEnd;
    const size_t uLast = uEnd - 2; // a prefix begins below uLast
    size_t i = uFrom;
    const size_t r = ScanWhole<T>(pData, i, uLast, uEnd);
    if (r != kNone)
        return r;
    if (i >= uLast)
        return uEnd;
    // Fewer than kBlock positions are left.
    if constexpr (T::kMasked) {
        const size_t k = CheckCandidates<T>(pData + i, T::TailCandidates(pData + i, uEnd - i));
        return k != T::kBlock ? i + k : uEnd;
    } else {
        // A last block ending with the data; the positions it repeats held no prefix.
        if (uLast - uFrom >= T::kBlock) {
            const size_t b = uLast - T::kBlock;
            const size_t k = ScanBlock<T>(pData + b);
            return k != T::kBlock ? b + k : uEnd;
        }
        for (; i < uLast; ++i) {
            if (PrefixAt(pData + i))
                return i;
        }
        return uEnd;
    }
}

// The copying search over the bytes from uFrom on, copied to pDst.
template <class T>
struct CopySearch {
    const uint8_t *pData;
    size_t uFrom, uEnd;
    uint8_t *pDst;

    // Copies the kBytes at offset b and returns the first prefix beginning in them (or right
    // after them), or kNone. Only a screen that sees a zero pair leads to a closer look: the
    // first pair begins a prefix when 01 follows it, the next pair when 00 01 does (a 4-byte
    // start code); else (an escaped 00 00 03, a zero run) the search goes on after it.
    template <size_t kBytes>
    [[gnu::always_inline]] size_t Step(size_t b) const noexcept
    {
        const uint8_t *s = pData + uFrom + b;
        if (!T::template CopyScreen<kBytes>(s, pDst + b))
            return kNone;
        const size_t q = uFrom + b + T::template FirstPair<kBytes>(s);
        if (q + 2 < uEnd && pData[q + 2] <= 1) {
            if (pData[q + 2] == 1)
                return q;
            if (q + 3 < uEnd && pData[q + 3] == 1)
                return q + 1;
        }
        const size_t uWindow = uFrom + b + kBytes + 2;
        const size_t r = Find<T>(pData, q + 1, uWindow < uEnd ? uWindow : uEnd);
        return r < uFrom + b + kBytes ? r : kNone;
    }
};

// FindStartCodePrefixCopy in one pass: each group of bytes is loaded once, stored and screened
// for a zero pair. The first n = min(uEnd - uFrom, room) bytes are copied; the screens look at
// the pairs beginning in them while the pair's second byte lies inside the data, and a prefix
// beginning after them is found by the plain search.
template <class T>
size_t FindCopy(const uint8_t *pData, size_t uFrom, size_t uEnd, uint8_t *pDst, size_t uRoom) noexcept
{
    if (uFrom >= uEnd)
        return uEnd;
    const size_t uLen = uEnd - uFrom;
    const size_t n = uLen < uRoom ? uLen : uRoom;
    const size_t uScreened = n < uLen ? n : uLen - 1;
    const CopySearch<T> c{pData, uFrom, uEnd, pDst};
    size_t i = 0;
    if (uScreened >= T::kGroup + 64) {
        // An unaligned first block, then groups from a 64-byte boundary of the source on; the
        // two overlap, and a pair seen twice is the same pair.
        if (const size_t uHead = (64 - reinterpret_cast<uintptr_t>(pData + uFrom) % 64) % 64; uHead != 0) {
            if (const size_t q = c.template Step<64>(0); q != kNone)
                return q;
            i = uHead;
        }
        for (; i + T::kGroup <= uScreened; i += T::kGroup) {
            if (const size_t q = c.template Step<T::kGroup>(i); q != kNone)
                return q;
        }
    }
    for (; i + 64 <= uScreened; i += 64) {
        if (const size_t q = c.template Step<64>(i); q != kNone)
            return q;
    }
    // At most 64 bytes are left to copy.
    T::CopyTail(pDst + i, pData + uFrom + i, n - i);
    return Find<T>(pData, uFrom + i, uEnd);
}

// The first zero pair beginning in [0, uBytes) of s, when a screen has seen one; uBytes when none.
inline size_t FirstPairByBytes(const uint8_t *s, size_t uBytes) noexcept
{
    for (size_t k = 0; k < uBytes; ++k) {
        if ((s[k] | s[k + 1]) == 0)
            return k;
    }
    return uBytes;
}

// The variant's table entry.
template <class T>
constexpr StartCodeKernels KernelsOf(const char *pName) noexcept
{
    return {pName, &Find<T>, &FindCopy<T>};
}

// Copies n bytes with accesses of kVec bytes (the last one overlapping), or of the next
// narrower size when n is below kVec; for layers without masked stores.
template <size_t kVec>
inline void CopyShort(uint8_t *pDst, const uint8_t *pSrc, size_t n) noexcept
{
    if constexpr (kVec > 1) {
        if (n >= kVec) {
            for (size_t i = 0; i + kVec < n; i += kVec)
                memcpy(pDst + i, pSrc + i, kVec);
            memcpy(pDst + n - kVec, pSrc + n - kVec, kVec);
            return;
        }
        CopyShort<kVec / 2>(pDst, pSrc, n);
    } else if (n != 0) {
        pDst[0] = pSrc[0];
    }
}

} // namespace
} // namespace vorcal::tools::scan
