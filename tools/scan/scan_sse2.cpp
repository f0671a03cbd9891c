// The SSE2 variant (the x86-64 baseline): 16-byte vectors, 128-byte strides.
#if defined(__x86_64__)
#include <emmintrin.h>

#include "tools/scan/kernels.hpp"
#include "tools/scan/variants.hpp"

namespace vorcal::tools::scan {
namespace {

inline uint64_t ZeroMask(__m128i v) noexcept
{
    return static_cast<uint32_t>(_mm_movemask_epi8(_mm_cmpeq_epi8(v, _mm_setzero_si128())));
}
inline uint64_t OneMask(__m128i v) noexcept
{
    return static_cast<uint32_t>(_mm_movemask_epi8(_mm_cmpeq_epi8(v, _mm_set1_epi8(1))));
}

// Two bits (byte 2m and 2m + 1) for each zero 16-bit lane m.
inline uint32_t ZeroLanes(__m128i v) noexcept
{
    return static_cast<uint32_t>(_mm_movemask_epi8(_mm_cmpeq_epi16(v, _mm_setzero_si128())));
}

struct Sse2 {
    using Vec = __m128i;
    static constexpr size_t kBlock = 16;
    static constexpr size_t kStride = 128;
    static constexpr bool kMasked = false;
    static Vec Load(const uint8_t *p) noexcept { return _mm_loadu_si128(reinterpret_cast<const Vec *>(p)); }
    static Vec LoadAligned(const uint8_t *p) noexcept { return _mm_load_si128(reinterpret_cast<const Vec *>(p)); }
    static uint64_t Candidates(Vec v) noexcept
    {
        const uint64_t z = ZeroMask(v);
        return z & ((z >> 1) | 0x8000u) & ((OneMask(v) >> 2) | 0xC000u);
    }
    static Vec LaneMask(Vec v) noexcept { return _mm_and_si128(v, _mm_set1_epi16(static_cast<short>(0xFEFF))); }
    static Vec Min(Vec a, Vec b) noexcept { return _mm_min_epu8(a, b); }
    static bool AnyZeroLane(Vec v) noexcept { return _mm_movemask_epi8(_mm_cmpeq_epi16(v, _mm_setzero_si128())) != 0; }

    // 16-byte vectors at 0, 16, ... and at 1, 17, ...: a zero 16-bit lane of either is a zero pair.
    static constexpr size_t kGroup = 128;
    template <size_t kBytes>
    [[gnu::always_inline]] static bool CopyScreen(const uint8_t *s, uint8_t *d) noexcept
    {
        const Vec zero = _mm_setzero_si128();
        Vec any = zero;
#pragma GCC unroll 8
        for (size_t k = 0; k < kBytes; k += 16) {
            const Vec v = Load(s + k);
            _mm_storeu_si128(reinterpret_cast<Vec *>(d + k), v);
            any = _mm_or_si128(any, _mm_or_si128(_mm_cmpeq_epi16(v, zero), _mm_cmpeq_epi16(Load(s + k + 1), zero)));
        }
        return _mm_movemask_epi8(any) != 0;
    }
    // Zero 16-bit lanes at even offsets, and a byte further on at odd ones.
    template <size_t kBytes>
    static size_t FirstPair(const uint8_t *s) noexcept
    {
        for (size_t b = 0; b < kBytes; b += 16) {
            const uint32_t e = ZeroLanes(Load(s + b)), o = ZeroLanes(Load(s + b + 1));
            if ((e | o) != 0) {
                const size_t pe = e != 0 ? LowestBit(e) : 16, po = o != 0 ? LowestBit(o) + 1 : 16;
                return b + (pe < po ? pe : po);
            }
        }
        return kBytes;
    }
    static void CopyTail(uint8_t *d, const uint8_t *s, size_t n) noexcept { CopyShort<16>(d, s, n); }
};

} // namespace

const StartCodeKernels kSse2Kernels = KernelsOf<Sse2>("sse2");

} // namespace vorcal::tools::scan
#endif
