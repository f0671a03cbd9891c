// Chooses the start-code variant once, on first use: the widest one the CPU runs. The checks
// add no import to the library: on x86-64 the compiler's CPU builtins (cpuid, linked
// statically); on ARM what the target assumes.
#include <atomic>
#include <cstddef>
#include <cstdint>

#include "tools/scan/variants.hpp"
#include "tools/start_code.hpp"

namespace vorcal::tools {

namespace {

bool Always() noexcept
{
    return true;
}

#if defined(__x86_64__)
// The builtins also check that the operating system saves the AVX and AVX-512 register state.
bool HasAvx2() noexcept
{
    __builtin_cpu_init();
    return __builtin_cpu_supports("avx2") && __builtin_cpu_supports("bmi") && __builtin_cpu_supports("bmi2");
}

bool HasAvx512bw() noexcept
{
    __builtin_cpu_init();
    return __builtin_cpu_supports("avx512f") && __builtin_cpu_supports("avx512bw") && HasAvx2();
}

bool HasAvx512Vbmi() noexcept
{
    return HasAvx512bw() && __builtin_cpu_supports("avx512vbmi");
}
#endif

#if defined(__aarch64__) || defined(__arm__)
// The library asks the operating system nothing: NEON is used where the target assumes it (every
// AArch64 target, 32-bit targets built for NEON such as Android's armeabi-v7a).
bool HasNeon() noexcept
{
#if defined(__aarch64__) || defined(__ARM_NEON)
    return true;
#else
    return false;
#endif
}
#endif

constexpr StartCodeVariant kVariants[] = {
    {&scan::kPortableKernels, Always},
#if defined(__x86_64__)
    {&scan::kSse2Kernels, Always},
    {&scan::kAvx2Kernels, HasAvx2},
    {&scan::kAvx512Kernels, HasAvx512bw},
    {&scan::kAvx512VbmiKernels, HasAvx512Vbmi},
#endif
#if defined(__aarch64__) || defined(__arm__)
    {&scan::kNeonKernels, HasNeon},
#endif
};

const StartCodeKernels *Widest() noexcept
{
    for (size_t i = std::size(kVariants); i-- > 1;) {
        if (kVariants[i].pSupported())
            return kVariants[i].pKernels;
    }
    return kVariants[0].pKernels;
}

// Threads that meet on first use choose the same variant; a relaxed store suffices.
std::atomic<const StartCodeKernels *> g_pActive{nullptr};

// The first use, kept out of line so that the calls below stay a load and a jump.
[[gnu::noinline]] const StartCodeKernels &Choose() noexcept
{
    const StartCodeKernels *p = Widest();
    g_pActive.store(p, std::memory_order_relaxed);
    return *p;
}

inline const StartCodeKernels &Active() noexcept
{
    const StartCodeKernels *p = g_pActive.load(std::memory_order_relaxed);
    return p != nullptr ? *p : Choose();
}

} // namespace

std::span<const StartCodeVariant> StartCodeVariants() noexcept
{
    return kVariants;
}

const StartCodeKernels &ActiveStartCodeKernels() noexcept
{
    return Active();
}

void UseStartCodeKernels(const StartCodeKernels *pKernels) noexcept
{
    g_pActive.store(pKernels != nullptr ? pKernels : Widest(), std::memory_order_relaxed);
}

size_t FindStartCodePrefix(const uint8_t *pData, size_t uFrom, size_t uEnd) noexcept
{
    return Active().pFind(pData, uFrom, uEnd);
}

size_t FindStartCodePrefixCopy(const uint8_t *pData, size_t uFrom, size_t uEnd, uint8_t *pDst,
                               size_t uDstRoom) noexcept
{
    return Active().pFindCopy(pData, uFrom, uEnd, pDst, uDstRoom);
}

} // namespace vorcal::tools
