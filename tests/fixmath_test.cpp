// Fixed-point library: the worked values bit-exact (one table per family), then each family
// against a double reference over a sweep of its domain, within the error its tables allow.
#include <gtest/gtest.h>

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdint>
#include <initializer_list>
#include <random>
#include <tuple>
#include <utility>

#include <vorcal/fixmath.h>

namespace {

using Pair = std::pair<int32_t, int32_t>;
Pair DivPair(int32_t a, int32_t b) { Pair p{-7, -7}; Div_exp(a, b, &p.first, &p.second); return p; }
Pair Log2Pair(int32_t x) { Pair p{-7, -7}; Log2_exp(x, &p.first, &p.second); return p; }
Pair MulPair(int32_t e1, int32_t f1, int32_t e2, int32_t f2) { Pair p{-7, -7}; Mul_exp(e1, f1, e2, f2, &p.first, &p.second); return p; }

// Rows of {computed, expected}; a failure names the family and the row.
template <typename T> void Rows(const char *family, std::initializer_list<std::pair<T, T>> rows)
{
    for (size_t i = 0; i < rows.size(); ++i)
        EXPECT_EQ(rows.begin()[i].first, rows.begin()[i].second) << family << " row " << i;
}

TEST(FixMath, WorkedValues)
{
    // Div_l with |b| >= 2^30 shifts the dividend right by one.
    Rows<int32_t>("division", {{Div_s(3, 2), 49152}, {Div_s(100, 3), 1092266}, {Div_s(1, -4), -8192}, {Div_s(-5, 5), -32768},
        {Div_s(0, 5), 0}, {Div_s(5, 0), 0}, {Div_s(-7, -7), 32768}, {Div_sl(0, 9), 0}, {Div_sl(9, -9), -32768},
        {Div_sl(1, 100000), 0}, {Div_l(1, 65536), 0}, {Div_l(5, 0), 0}, {Div_l(-70000, 70000), -32768},
        {Div_l(3, 2), 49152}, {Div_l(1 << 29, 1 << 30), 16384}});
    Rows<int32_t>("multiplication", {{Mul_l(0x7FFFFFFF, 0x7FFFFFFF), 0x7FFFFFFF}, {Mul_l(0x7FFFFFFF, -0x7FFFFFFF), -0x7FFFFFFF},
        {Mul_l(32768, 32768), 32768}, {Mul_ls(0x7FFFFFFF, 32767), 2147418110}, {Mul_ls(0x7FFFFFFF, 40000), 0x7FFFFFFF},
        {Mul_ls(-0x7FFFFFFF, 32767), -2147418112}, {Mul_ls(32768, 16384), 16384}});
    Rows<int32_t>("square roots", {{Sqrt_s_exp(16384), 23170}, {Sqrt_s_exp(100), 1810}, {Sqrt_s_exp(0), 0},
        {Sqrt_l_exp(0x40000000), 0x5A820000}, {Sqrt_l_exp(0x20000000), 0x40000000}, {Sqrt_l_exp(-1), 0}, {Sqrt(100), 10},
        {Sqrt((1 << 30) - 1), 32767}, {Sqrt_s(32767), 181}, {Sqrt_s(9), 3}, {Sqrt_s(0), 0}, {Inv_sqrt(1), 1073709056},
        {Inv_sqrt(4), 536854528}, {Inv_sqrt(1 << 30), 32767}, {Inv_sqrt(0x7FFFFFFF), 23170}, {Inv_sqrt(0), 0x3FFFFFFF},
        {Inv_sqrt(-1), 0x3FFFFFFF}});
    // A fraction outside 0..32767 clamps the table index; the weight stays the low ten bits.
    Rows<int32_t>("powers of two", {{Pow2(0, 0), 1}, {Pow2(10, 16384), 1448}, {Pow2(-1, 0), 1}, {Pow2(-2, 0), 0},
        {Pow2(30, 0), 0x40000000}, {Pow2(31, 0), 0}, {Pow2_s(0, 0), 32768}, {Pow2_s(-1, 16384), 23170}, {Pow2_s(-16, 0), 1},
        {Pow2_s(-17, 0), 0}, {Pow2_s(16, 0), 0}, {Pow2_frac(-1), 16384}, {Pow2_frac(-15), 1}, {Pow2_frac(-16), 0},
        {Pow2_s(1, -9584), Pow2_s(1, 656)}, {Pow2_s(0, 40000), Pow2_s(0, 31744 + (40000 & 0x3FF))}});
    // Pow_mn borrows one from the integer part of a negative fraction: 3 (8/3)^(1/2) = 4.899 gives 5
    // (with the table read at its start it gave 6).
    Rows<int32_t>("logarithms and Pow_mn", {{VorLog2(32768), 0}, {VorLog2(65536), 32768}, {VorLog2(98304), 51935},
        {VorLog2(2), -458752}, {VorLog2(1), 0}, {Log2_ceil(1), 0}, {Log2_ceil(0), 0}, {Log2_ceil(1024), 10},
        {Log2_ceil(1025), 11}, {Log2_ceil((1 << 20) + 1), 20}, {Pow_mn(64, 16, 1, 2), 32}, {Pow_mn(32, 8, 1, 3), 13},
        {Pow_mn(48, 12, 3, 4), 34}, {Pow_mn(48, 12, 3, 0), 0}, {Pow_mn(8, 3, 1, 2), 5}});
    Rows<Pair>("pairs", {{DivPair(1, 3), {0, 10922}}, {DivPair(7, 2), {3, 16384}}, {DivPair(0, 0), {1, 0}},
        {DivPair(5, 0), {0, 0}}, {DivPair(-1, 3), {0, 0}}, {DivPair(1, -3), {0, 0}}, {MulPair(1, 16384, 1, 16384), {2, 8192}},
        {Log2Pair(3), {1, 19167}}, {Log2Pair(1000), {9, 31644}}, {Log2Pair(0x7FFFFFFF), {30, 32766}}, {Log2Pair(1), {0, 0}},
        {Log2Pair(-5), {0, 0}}});
}

TEST(FixMath, AgainstExactAndDoubleReferences)
{
    // 16-bit operands: every divider truncates toward zero exactly.
    for (int32_t a = -32767; a <= 32767; a += 97)
        for (int32_t b = -32767; b <= 32767; b += 89) {
            const int32_t want = int32_t(int64_t{a} * 32768 / b);
            ASSERT_EQ(std::make_tuple(Div_s(a, b), Div_sl(a, b), Div_l(a, b)), std::make_tuple(want, want, want))
                << a << '/' << b;
            const Pair pair = a == b ? Pair{1, 0} : Pair{a / b, a % b * 32768 / b};
            ASSERT_TRUE(a < 0 || b < 0 || DivPair(a, b) == pair) << a << '/' << b;
        }
    std::mt19937 rng(1234);
    for (int i = 0; i < 50000; ++i) {
        // Wide divisors are scaled into 15 bits: the quotient loses at most a few units.
        const int32_t b = int32_t(rng() >> (1 + rng() % 30)) | 1;
        const int32_t a = int32_t(rng() % uint64_t(std::min<int64_t>(int64_t{b} * 32767, INT32_MAX)));
        ASSERT_NEAR(Div_l(a, b), double(a) * 32768.0 / b, 3.0) << a << '/' << b;
        ASSERT_NEAR(Div_l(-a, b), -double(a) * 32768.0 / b, 3.0) << a << '/' << b;
        // The split drops bit 0 of each operand; the tolerance near saturation covers that too.
        const int32_t x = int32_t(rng()), y = int32_t(rng() >> (rng() % 31)), y16 = int16_t(y);
        const double exact = double(x) * y / 32768.0, exact16 = double(x) * y16 / 32768.0;
        const bool saturating = std::fabs(exact) >= 2147483647.0 - 4.0 * 65536;
        ASSERT_NEAR(Mul_l(x, y), std::clamp(exact, -2147483647.0, 2147483647.0),
                    saturating ? 8.0 * 65536 : 8.0 + 2.0 * (std::fabs(x) + std::fabs(y)) / 65536.0) << x << '*' << y;
        const int32_t got16 = Mul_ls(x, y16); // saturates upward only
        ASSERT_TRUE(exact16 < INT32_MIN + 8.0 || std::fabs(got16 - std::min(exact16, 2147483647.0)) <= 3.0 + 5.0 * (exact16 > 2147483639.0))
            << x << '*' << y16 << " gives " << got16;
    }
    for (int32_t x = 1; x <= 32767; ++x) {
        ASSERT_EQ(Sqrt_s(x), int16_t(std::floor(std::sqrt(double(x))))) << x;
        ASSERT_NEAR(Sqrt_s_exp(x), std::sqrt(x / 32768.0) * 32768.0, 3.0) << x;
    }
    for (int64_t x = 2; x <= INT32_MAX; x = x * 65 / 64 + 1) {
        const int n = (std::countl_zero(uint32_t(x)) - 1) & ~1; // the even shift that puts x into 2^29..2^31
        ASSERT_NEAR(Sqrt_l_exp(int32_t(x)), std::sqrt(double(x << n) * 2147483648.0), 3.0 * 65536) << x;
        ASSERT_NEAR(Inv_sqrt(int32_t(x)), 1073741824.0 / std::sqrt(x), 524288.0 / std::sqrt(x) + 1) << x;
        const double l = std::log2(double(x));
        ASSERT_NEAR(VorLog2(int32_t(x)), (l - 15.0) * 32768.0, 8.0) << x;
        const Pair p = Log2Pair(int32_t(x));
        ASSERT_NEAR(p.first + p.second / 32768.0, l, 8.0 / 32768.0) << x;
        // Just above a power of two the table may not resolve the fraction yet.
        const int32_t c = Log2_ceil(int32_t(x)), up = int32_t(std::ceil(l));
        ASSERT_TRUE(c == up || (c == up - 1 && double(x) < std::exp2(std::floor(l)) * (1.0 + 1.0 / 2048.0))) << x;
    }
    for (int k = 0; k <= 30; ++k)
        EXPECT_EQ(Log2_ceil(1 << k), k);
    for (int32_t e = -2; e <= 31; ++e)
        for (int32_t f = 0; f < 32768; f += 37) {
            const double v = std::ldexp(std::exp2(f / 32768.0), e);
            ASSERT_NEAR(Pow2(e, f), e <= 30 ? v : 0.0, e <= 30 ? v / 8192.0 + 1.0 : 0.0) << e << ',' << f;
            ASSERT_NEAR(Pow2_s(e, f), e >= -16 && e <= 15 ? v * 32768.0 : 0.0, e <= 15 ? v * 4.0 + 1.0 : 0.0) << e << ',' << f;
        }
    // Any n: a negative fraction of the exponent pair borrows from its integer part.
    for (int32_t m = 1; m <= 1024; m += 3)
        for (int32_t n = 1; n <= m; n = n * 3 / 2 + 1)
            for (int32_t q = 1; q <= 8; ++q)
                for (int32_t p = 0; p <= q; ++p) {
                    const double v = n * std::pow(double(m) / n, double(p) / q);
                    ASSERT_NEAR(Pow_mn(m, n, p, q), v, v / 512.0 + 1.0) << m << ',' << n << ',' << p << '/' << q;
                }
}

} // namespace
