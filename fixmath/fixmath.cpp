// Fixed-point division, multiplication, square roots, powers of two and base-2 logarithms.
// Intermediate values are held in 64 bits and brought back to 16 or 32 bits exactly where the
// algorithms take a value "as signed 16-bit" or "in 32 bits", so the wrap-around of out-of-range
// inputs is the documented one and never undefined behaviour.
#include <cstddef>
#include <cstdint>

#include <vorcal/fixmath.h>

#include "fixmath/tables.hpp"

namespace vorcal::fixmath {
namespace {

constexpr int32_t To32(int64_t v) { return static_cast<int32_t>(static_cast<uint32_t>(v)); }
constexpr int32_t To16(int64_t v) { return static_cast<int16_t>(static_cast<uint16_t>(v)); }
// Negation in 32 bits (-INT32_MIN stays INT32_MIN).
constexpr int32_t Neg32(int32_t v) { return To32(-int64_t{v}); }

// Left shifts that make a positive x exceed 0x3FFFFFFF.
constexpr int Norm(int32_t x) { return __builtin_clz(static_cast<uint32_t>(x)) - 1; }

// L = t[i] 65536 - 2 (t[i] - t[i+1]) f, with i = (y >> 25) - base and f = (y >> 10) & 0x7FFF.
template <std::size_t N>
constexpr int32_t Interpolate(const std::array<int16_t, N> &t, int32_t y, int base)
{
    const int i = (y >> 25) - base;
    const int32_t f = (y >> 10) & 0x7FFF;
    return To32(int64_t{t[i]} * 65536 - 2 * (int64_t{t[i]} - t[i + 1]) * f);
}

// The division family shares its tail: the quotient of two magnitudes, the divisor scaled into
// 15 bits by c right shifts (c = 0 unless the member scales). CONTRACT: the integer part of
// the quotient is carried as a signed 16-bit number, truncations included.
enum class Remainder { k16, kSl, kL };

int32_t Quotient(int32_t a, int32_t b, int32_t A, int32_t B, Remainder kind, bool scale)
{
    if (B == 0)
        return 0; // only reachable from out-of-range 16-bit divisors such as -65536
    const int64_t sign = (a < 0) != (b < 0) ? -1 : 1;
    if (A == B)
        return To32(sign * 32768);
    int c = 0;
    int32_t Bs = B;
    if (scale)
        while (Bs > 32767) {
            Bs >>= 1;
            ++c;
        }
    // Scales a dividend by 2^(15 - c); for c = 16 that is one right shift.
    auto scaled = [c](int64_t v) {
        return c <= 15 ? To32(v * (int64_t{1} << (15 - c))) : To32(v >> (c - 15));
    };
    if (A < B)
        return To32(sign * (int64_t{scaled(A)} / Bs));
    const int64_t q = int64_t{A} / B;
    int32_t r = 0;
    switch (kind) {
    case Remainder::k16: r = To16(A - int64_t{To16(q)} * To16(B)); break;
    case Remainder::kSl: r = To16(To32(A - int64_t{B} * (q & 0xFFFF))); break;
    case Remainder::kL: r = To32(A - int64_t{B} * To16(q)); break;
    }
    return To32(sign * (int64_t{To16(q)} * 32768 + int64_t{scaled(r)} / Bs));
}

struct Split {
    int64_t h; // high part, Q15 integer bits
    int64_t g; // low 15 fraction bits
};

// Both parts carry the sign of x; 2m is formed without 32-bit wrap-around.
constexpr Split SplitQ15(int32_t x)
{
    if (x >= 0)
        return {x >> 16, (x >> 1) & 0x7FFF};
    const int64_t m = -(int64_t{x} >> 1);
    return {-((2 * m) >> 16), -(m & 0x7FFF)};
}

// 2^(e + f/32768) with the result scaled by 2^-s, rounded half up (s = 30 - e or 15 - e).
int32_t Pow2Shifted(int32_t s, int32_t f)
{
    if (s > 31 || s < 0)
        return 0;
    int32_t j = f >> 10;
    j = j < 0 ? 0 : (j > 31 ? 31 : j);
    const int64_t g = int64_t{f & 0x3FF} << 5;
    const int32_t L =
        To32(int64_t{kPow2Table[j]} * 65536 - 2 * g * (kPow2Table[j] - kPow2Table[j + 1]));
    if (s == 0)
        return L;
    return (L >> s) + ((L >> (s - 1)) & 1);
}

// The fraction of log2 of a positive x and its normalisation count.
struct Log2Parts {
    int n;
    int32_t L;
};
Log2Parts Log2Interpolate(int32_t x)
{
    const int n = Norm(x);
    return {n, Interpolate(kLog2Table, static_cast<int32_t>(static_cast<uint32_t>(x) << n), 32)};
}

} // namespace
} // namespace vorcal::fixmath

using namespace vorcal::fixmath;

extern "C" int32_t Div_s(int32_t a, int32_t b)
{
    if (a == 0 || b == 0)
        return 0;
    const int32_t A = a < 0 ? To16(-int64_t{a}) : a;
    const int32_t B = b < 0 ? To16(-int64_t{b}) : b;
    return Quotient(a, b, A, B, Remainder::k16, false);
}

extern "C" int32_t Div_sl(int32_t a, int32_t b)
{
    if (a == 0 || b == 0)
        return 0;
    const int32_t A = a < 0 ? To16(-int64_t{a}) : a;
    const int32_t B = b < 0 ? Neg32(b) : b;
    return Quotient(a, b, A, B, Remainder::kSl, false);
}

extern "C" int32_t Div_l(int32_t a, int32_t b)
{
    if (a == 0 || b == 0)
        return 0;
    const int32_t A = a < 0 ? Neg32(a) : a;
    const int32_t B = b < 0 ? Neg32(b) : b;
    return Quotient(a, b, A, B, Remainder::kL, true);
}

extern "C" void Div_exp(int32_t a, int32_t b, int32_t *piInt, int32_t *piFrac)
{
    *piInt = 0;
    if (a < 0 || b < 0) {
        *piFrac = 0;
        return;
    }
    if (a == b) {
        *piInt = 1;
        *piFrac = 0;
        return;
    }
    if (b == 0) { // CONTRACT: a > 0 over 0 reports (0, 0)
        *piFrac = 0;
        return;
    }
    int64_t rest = a;
    if (a > b) {
        const int32_t q = a / b;
        *piInt = q;
        rest = a - int64_t{To16(int64_t{q} * b)};
    }
    *piFrac = To32(rest * 32768 / b);
}

extern "C" int32_t Mul_l(int32_t a, int32_t b)
{
    const Split x = SplitQ15(a), y = SplitQ15(b);
    const int64_t P = x.h * y.h;
    if (P >= 32768)
        return 0x7FFFFFFF;
    if (P <= -32768)
        return -0x7FFFFFFF;
    const int64_t S = P * 32768 + x.h * y.g + x.g * y.h + ((x.g * y.g) >> 15);
    if (S > 0x1FFFFFFF)
        return 0x7FFFFFFF;
    if (S < -0x1FFFFFFF)
        return -0x7FFFFFFF;
    return To32(S * 4);
}

extern "C" int32_t Mul_ls(int32_t a, int32_t b)
{
    const Split x = SplitQ15(a);
    const int64_t S = int64_t{b} * x.h + ((int64_t{b} * x.g) >> 15);
    return S > 0x3FFFFFFF ? 0x7FFFFFFF : To32(S * 2);
}

extern "C" void Mul_exp(int32_t e1, int32_t f1, int32_t e2, int32_t f2, int32_t *piInt,
                        int32_t *piFrac)
{
    // CONTRACT: 32-bit arithmetic throughout, wrap-around included.
    const int32_t C = To32(int64_t{To32(int64_t{e1} * f2)} + To32(int64_t{f1} * e2));
    int32_t F = To32(int64_t{To32(int64_t{To32(int64_t{f1} * f2)} * 2) >> 16} + (C & 0x7FFF));
    int32_t E = To32(int64_t{To32(int64_t{e1} * e2)} + (To32(int64_t{C} * 2) >> 16));
    if (F >= 32768) {
        E = To32(int64_t{E} + (To32(int64_t{F} * 2) >> 16));
        F &= 0x7FFF;
    }
    *piInt = E;
    *piFrac = F;
}

extern "C" int16_t Sqrt_s_exp(int32_t x)
{
    if (x <= 0)
        return 0;
    if (x > 32767)
        x = 32767;
    int n = 0;
    if (x <= 16383) {
        while ((x << n) <= 16383)
            ++n;
        n &= ~1;
    }
    const int32_t y = x << n;
    const int j = (y >> 9) - 16;
    const int32_t g = (y & 0x1FF) << 6;
    const int16_t v =
        static_cast<int16_t>(kSqrtTable[j] - (((kSqrtTable[j] - kSqrtTable[j + 1]) * g) >> 15));
    return static_cast<int16_t>(v >> (n / 2));
}

extern "C" int32_t Sqrt_l_exp(int32_t x)
{
    if (x <= 0)
        return 0;
    const int n = Norm(x) & ~1;
    return Interpolate(kSqrtTable, static_cast<int32_t>(static_cast<uint32_t>(x) << n), 16);
}

namespace {

// Integer square root digit by digit over x, x >> 2, x >> 4, ... (each element cut to 16 bits
// when narrow).
int16_t DigitSqrt(int32_t x, bool narrow)
{
    if (x <= 0)
        return 0;
    int shift = 0;
    while (shift + 2 < 32 && (x >> (shift + 2)) != 0)
        shift += 2;
    int64_t r = 0;
    for (; shift >= 0; shift -= 2) {
        const int32_t element = narrow ? To16(x >> shift) : (x >> shift);
        const int64_t next = 2 * r + 1;
        r = element < next * next ? 2 * r : next;
    }
    return static_cast<int16_t>(static_cast<uint16_t>(r));
}

} // namespace

extern "C" int16_t Sqrt_s(int32_t x) { return DigitSqrt(x, true); }

extern "C" int16_t Sqrt(int32_t x) { return DigitSqrt(x, false); }

extern "C" int32_t Inv_sqrt(int32_t x)
{
    if (x <= 0)
        return 0x3FFFFFFF;
    int s = 16;
    int32_t y = x >> 1;
    if (x <= 0x3FFFFFFF) {
        const int n = Norm(x);
        const int k = 30 - n;
        s = (k >> 1) + 1;
        y = x << n;
        if ((k & 1) == 0)
            y >>= 1;
    }
    return Interpolate(kInvSqrtTable, y, 16) >> s;
}

extern "C" int32_t Pow2_frac(int32_t x)
{
    if (x >= 0 || x < -15)
        return 0;
    return 16384 >> (-x - 1);
}

extern "C" int32_t Pow2(int32_t e, int32_t f) { return Pow2Shifted(To32(int64_t{30} - e), f); }

extern "C" int32_t Pow2_s(int32_t e, int32_t f) { return Pow2Shifted(To32(int64_t{15} - e), f); }

extern "C" int32_t VorLog2(int32_t x)
{
    if (x <= 1)
        return 0;
    const Log2Parts parts = Log2Interpolate(x);
    return ((15 - parts.n) * 32768) | (parts.L >> 16);
}

extern "C" void Log2_exp(int32_t x, int32_t *piInt, int32_t *piFrac)
{
    if (x <= 1) {
        *piInt = 0;
        *piFrac = 0;
        return;
    }
    const Log2Parts parts = Log2Interpolate(x);
    *piInt = 30 - parts.n;
    *piFrac = parts.L >> 16;
}

extern "C" int32_t Log2_ceil(int32_t x)
{
    if (x <= 0)
        return 0;
    const Log2Parts parts = Log2Interpolate(x);
    return 30 - parts.n + ((static_cast<uint32_t>(parts.L) >> 16) != 0 ? 1 : 0);
}

extern "C" int32_t Pow_mn(int32_t m, int32_t n, int32_t p, int32_t q)
{
    if (q == 0)
        return 0;
    int32_t e1, f1, e2, f2, qi, qf, re, rf;
    Log2_exp(m, &e1, &f1);
    Log2_exp(n, &e2, &f2);
    Div_exp(p, q, &qi, &qf);
    // The difference pair has no borrow between its parts: the fraction may be negative, and so
    // may the product's. One is borrowed from the integer part so that the power of two reads its
    // table inside its range and stands for the same exponent (the product's fraction is at least
    // -32768).
    Mul_exp(e1 - e2, f1 - f2, qi, qf, &re, &rf);
    if (rf < 0) {
        re -= 1;
        rf += 32768;
    }
    return To32(int64_t{To32(int64_t{n} * Pow2_s(re, rf))} + 16384) >> 15;
}
