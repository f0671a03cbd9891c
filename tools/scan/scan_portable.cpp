// The portable variant: 8-byte words, for CPUs without a vector unit the library knows.
#include <cstring>

#include "tools/scan/kernels.hpp"
#include "tools/scan/variants.hpp"

namespace vorcal::tools::scan {
namespace {

constexpr uint64_t kOnes = 0x0101010101010101ull;

// Non-zero when a byte of w is zero.
inline uint64_t HasZero(uint64_t w) noexcept
{
    return (w - kOnes) & ~w & (kOnes << 7);
}

// Non-zero when a 16-bit lane of w is zero.
inline uint64_t HasZeroLane16(uint64_t w) noexcept
{
    constexpr uint64_t kLanes = 0x0001000100010001ull;
    return (w - kLanes) & ~w & (kLanes << 15);
}

// A word at a time, a candidate wherever it holds a zero byte; no stride screen.
struct Portable {
    using Vec = uint64_t;
    static constexpr size_t kBlock = 8;
    static constexpr size_t kStride = 0;
    static constexpr bool kMasked = false;
    static Vec Load(const uint8_t *p) noexcept
    {
        Vec w;
        memcpy(&w, p, sizeof w);
        return w;
    }
    static uint64_t Candidates(Vec w) noexcept { return HasZero(w) != 0 ? 0xFFu : 0u; }
    // Never called (no stride screen); declared for the generic code.
    static Vec LoadAligned(const uint8_t *p) noexcept { return Load(p); }
    static Vec LaneMask(Vec w) noexcept { return w; }
    static Vec Min(Vec a, Vec) noexcept { return a; }
    static bool AnyZeroLane(Vec) noexcept { return true; }

    // Words at 0, 8, ... and at 1, 9, ...: a 16-bit lane of either that is zero is a zero pair.
    static constexpr size_t kGroup = 64;
    template <size_t kBytes>
    [[gnu::always_inline]] static bool CopyScreen(const uint8_t *s, uint8_t *d) noexcept
    {
        uint64_t any = 0;
#pragma GCC unroll 8
        for (size_t k = 0; k < kBytes; k += 8) {
            const Vec w = Load(s + k);
            memcpy(d + k, &w, sizeof w);
            any |= HasZeroLane16(w) | HasZeroLane16(Load(s + k + 1));
        }
        return any != 0;
    }
    template <size_t kBytes>
    static size_t FirstPair(const uint8_t *s) noexcept
    {
        return FirstPairByBytes(s, kBytes);
    }
    static void CopyTail(uint8_t *d, const uint8_t *s, size_t n) noexcept { CopyShort<8>(d, s, n); }
};

} // namespace

const StartCodeKernels kPortableKernels = KernelsOf<Portable>("portable");

} // namespace vorcal::tools::scan
