// The NEON variant: 16-byte vectors, 128-byte strides. On 32-bit ARM built with -mfpu=neon and
// used only when the CPU reports NEON; on AArch64 always.
#if defined(__aarch64__) || defined(__arm__)
#include <arm_neon.h>

#include "tools/scan/kernels.hpp"
#include "tools/scan/variants.hpp"

namespace vorcal::tools::scan {
namespace {

inline bool AnyNonZero(uint8x16_t v) noexcept
{
    const uint64x2_t w = vreinterpretq_u64_u8(v);
    return (vgetq_lane_u64(w, 0) | vgetq_lane_u64(w, 1)) != 0;
}

// Zero 16-bit lanes where v (even offsets) or w, v a byte further on (odd offsets), has a pair.
inline uint16x8_t PairLanes(uint8x16_t v, uint8x16_t w) noexcept
{
    return vminq_u16(vreinterpretq_u16_u8(v), vreinterpretq_u16_u8(w));
}

// NEON has no byte movemask: a block with any zero byte makes every position a candidate,
// which the byte check then sorts out (rare in coded slice data).
struct Neon {
    using Vec = uint8x16_t;
    static constexpr size_t kBlock = 16;
    static constexpr size_t kStride = 128;
    static constexpr bool kMasked = false;
    static Vec Load(const uint8_t *p) noexcept { return vld1q_u8(p); }
    static Vec LoadAligned(const uint8_t *p) noexcept { return vld1q_u8(p); }
    static uint64_t Candidates(Vec v) noexcept { return AnyNonZero(vceqq_u8(v, vdupq_n_u8(0))) ? 0xFFFFu : 0u; }
    static Vec LaneMask(Vec v) noexcept { return vandq_u8(v, vreinterpretq_u8_u16(vdupq_n_u16(0xFEFF))); }
    static Vec Min(Vec a, Vec b) noexcept { return vminq_u8(a, b); }
    static bool AnyZeroLane(Vec v) noexcept
    {
        return AnyNonZero(vreinterpretq_u8_u16(vceqq_u16(vreinterpretq_u16_u8(v), vdupq_n_u16(0))));
    }

    // 16-byte vectors at 0, 16, ... and at 1, 17, ...: the unsigned 16-bit minimum of all keeps a
    // zero lane exactly when one of them has a zero pair there.
    static constexpr size_t kGroup = 128;
    template <size_t kBytes>
    [[gnu::always_inline]] static bool CopyScreen(const uint8_t *s, uint8_t *d) noexcept
    {
        uint16x8_t low = vdupq_n_u16(0xFFFF);
#pragma GCC unroll 8
        for (size_t k = 0; k < kBytes; k += 16) {
            const uint8x16_t v = vld1q_u8(s + k);
            vst1q_u8(d + k, v);
            low = vminq_u16(low, PairLanes(v, vld1q_u8(s + k + 1)));
        }
        return AnyNonZero(vreinterpretq_u8_u16(vceqq_u16(low, vdupq_n_u16(0))));
    }
    // The vector with a zero pair, then its bytes.
    template <size_t kBytes>
    static size_t FirstPair(const uint8_t *s) noexcept
    {
        for (size_t b = 0; b < kBytes; b += 16) {
            const uint16x8_t lanes = PairLanes(vld1q_u8(s + b), vld1q_u8(s + b + 1));
            if (AnyNonZero(vreinterpretq_u8_u16(vceqq_u16(lanes, vdupq_n_u16(0)))))
                return b + FirstPairByBytes(s + b, 16);
        }
        return kBytes;
    }
    static void CopyTail(uint8_t *d, const uint8_t *s, size_t n) noexcept { CopyShort<16>(d, s, n); }
};

} // namespace

const StartCodeKernels kNeonKernels = KernelsOf<Neon>("neon");

} // namespace vorcal::tools::scan
#endif
