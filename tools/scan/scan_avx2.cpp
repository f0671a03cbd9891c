// The AVX2 variant: 32-byte vectors, 128-byte strides. Built with -mavx2 -mbmi -mbmi2; used
// only when the CPU reports all three.
#if defined(__x86_64__)
#include <immintrin.h>

#include "tools/scan/kernels.hpp"
#include "tools/scan/variants.hpp"

namespace vorcal::tools::scan {
namespace {

inline uint64_t ZeroMask(__m256i v) noexcept
{
    return static_cast<uint32_t>(_mm256_movemask_epi8(_mm256_cmpeq_epi8(v, _mm256_setzero_si256())));
}
inline uint64_t OneMask(__m256i v) noexcept
{
    return static_cast<uint32_t>(_mm256_movemask_epi8(_mm256_cmpeq_epi8(v, _mm256_set1_epi8(1))));
}

// Two bits (byte 2m and 2m + 1) for each zero 16-bit lane m.
inline uint32_t ZeroLanes(__m256i v) noexcept
{
    return static_cast<uint32_t>(_mm256_movemask_epi8(_mm256_cmpeq_epi16(v, _mm256_setzero_si256())));
}

struct Avx2 {
    using Vec = __m256i;
    static constexpr size_t kBlock = 32;
    static constexpr size_t kStride = 128;
    static constexpr bool kMasked = false;
    static Vec Load(const uint8_t *p) noexcept { return _mm256_loadu_si256(reinterpret_cast<const Vec *>(p)); }
    static Vec LoadAligned(const uint8_t *p) noexcept { return _mm256_load_si256(reinterpret_cast<const Vec *>(p)); }
    static uint64_t Candidates(Vec v) noexcept
    {
        const uint64_t z = ZeroMask(v);
        return z & ((z >> 1) | 0x80000000u) & ((OneMask(v) >> 2) | 0xC0000000u);
    }
    static Vec LaneMask(Vec v) noexcept { return _mm256_and_si256(v, _mm256_set1_epi16(static_cast<short>(0xFEFF))); }
    static Vec Min(Vec a, Vec b) noexcept { return _mm256_min_epu8(a, b); }
    static bool AnyZeroLane(Vec v) noexcept
    {
        return _mm256_movemask_epi8(_mm256_cmpeq_epi16(v, _mm256_setzero_si256())) != 0;
    }

    // 32-byte vectors at 0, 32, ... and at 1, 33, ...: the unsigned 16-bit minimum of all keeps a
    // zero lane exactly when one of them has a zero pair there.
    static constexpr size_t kGroup = 256;
    template <size_t kBytes>
    [[gnu::always_inline]] static bool CopyScreen(const uint8_t *s, uint8_t *d) noexcept
    {
        Vec low = _mm256_set1_epi8(-1);
#pragma GCC unroll 8
        for (size_t k = 0; k < kBytes; k += 32) {
            const Vec v = Load(s + k);
            _mm256_storeu_si256(reinterpret_cast<Vec *>(d + k), v);
            low = _mm256_min_epu16(low, _mm256_min_epu16(v, Load(s + k + 1)));
        }
        return AnyZeroLane(low);
    }
    // Zero 16-bit lanes at even offsets, and a byte further on at odd ones.
    template <size_t kBytes>
    static size_t FirstPair(const uint8_t *s) noexcept
    {
        for (size_t b = 0; b < kBytes; b += 32) {
            const uint32_t e = ZeroLanes(Load(s + b)), o = ZeroLanes(Load(s + b + 1));
            if ((e | o) != 0) {
                const size_t pe = e != 0 ? LowestBit(e) : 32, po = o != 0 ? LowestBit(o) + 1 : 32;
                return b + (pe < po ? pe : po);
            }
        }
        return kBytes;
    }
    static void CopyTail(uint8_t *d, const uint8_t *s, size_t n) noexcept { CopyShort<32>(d, s, n); }
};

} // namespace

const StartCodeKernels kAvx2Kernels = KernelsOf<Avx2>("avx2");

} // namespace vorcal::tools::scan
#endif
