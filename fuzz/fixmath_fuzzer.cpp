// Every fixed-point function on arbitrary 32-bit inputs: no undefined behaviour, and the
// invariants that hold over the whole input range.
#include <cstddef>
#include <cstdint>

#include <vorcal/fixmath.h>

#include "fuzz_sal.hpp"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    while (in.RestSize() >= 16) {
        const auto a = int32_t(in.U32()), b = int32_t(in.U32()), c = int32_t(in.U32()), d = int32_t(in.U32());
        int32_t e = 0, f = 0;
        Div_s(a, b), Div_sl(a, b), Div_l(a, b), Div_exp(a, b, &e, &f), Mul_l(a, b), Mul_ls(a, b);
        Mul_exp(a, b, c, d, &e, &f), Sqrt_s_exp(a), Sqrt_l_exp(a), Inv_sqrt(a), Sqrt_s(a), Pow2_frac(a);
        Pow2(a, b), Pow2_s(a, b), VorLog2(a), Log2_ceil(a), Pow_mn(a, b, c, d), Log2_exp(a, &e, &f);
        if (a > 1 && (f < 0 || f > 32767))
            __builtin_trap();
        const int16_t r = Sqrt(a);
        if (a > 0 && a < (1 << 30) && !(int64_t{r} * r <= a && int64_t{r + 1} * (r + 1) > a))
            __builtin_trap();
    }
    return 0;
}
