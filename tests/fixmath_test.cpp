// Fixed-point library: the worked values bit-exact, then each function against a double
// reference over a sweep of its domain, within the error its table resolution implies.
#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <random>

#include <vorcal/fixmath.h>

namespace {

struct Pair {
    int32_t e, f;
};
Pair Log2Pair(int32_t x)
{
    Pair p{};
    Log2_exp(x, &p.e, &p.f);
    return p;
}
Pair DivPair(int32_t a, int32_t b)
{
    Pair p{-7, -7};
    Div_exp(a, b, &p.e, &p.f);
    return p;
}
Pair MulPair(int32_t e1, int32_t f1, int32_t e2, int32_t f2)
{
    Pair p{};
    Mul_exp(e1, f1, e2, f2, &p.e, &p.f);
    return p;
}
bool operator==(Pair a, Pair b) { return a.e == b.e && a.f == b.f; }
std::ostream &operator<<(std::ostream &os, Pair p) { return os << '(' << p.e << ", " << p.f << ')'; }

TEST(FixMathExact, WorkedValues)
{
    struct Case {
        const char *what;
        int32_t got, want;
    };
    const Case cases[] = {
        {"Div_s(3,2)", Div_s(3, 2), 49152},
        {"Div_s(100,3)", Div_s(100, 3), 1092266},
        {"Div_s(1,-4)", Div_s(1, -4), -8192},
        {"Div_s(-5,5)", Div_s(-5, 5), -32768},
        {"Div_s(0,5)", Div_s(0, 5), 0},
        {"Div_s(5,0)", Div_s(5, 0), 0},
        {"Div_s(-7,-7)", Div_s(-7, -7), 32768},
        {"Div_sl(0,9)", Div_sl(0, 9), 0},
        {"Div_sl(9,-9)", Div_sl(9, -9), -32768},
        {"Div_sl(1,100000)", Div_sl(1, 100000), 0},
        {"Div_l(1,65536)", Div_l(1, 65536), 0},
        {"Div_l(5,0)", Div_l(5, 0), 0},
        {"Div_l(-70000,70000)", Div_l(-70000, 70000), -32768},
        {"Div_l(3,2)", Div_l(3, 2), 49152},
        // |b| >= 2^30: 16 right shifts of b, one right shift of the dividend.
        {"Div_l(2^29,2^30)", Div_l(1 << 29, 1 << 30), 16384},
        {"Mul_l(max,max)", Mul_l(0x7FFFFFFF, 0x7FFFFFFF), 0x7FFFFFFF},
        {"Mul_l(max,-max)", Mul_l(0x7FFFFFFF, -0x7FFFFFFF), -0x7FFFFFFF},
        {"Mul_l(1.0,1.0)", Mul_l(32768, 32768), 32768},
        {"Mul_ls(max,32767)", Mul_ls(0x7FFFFFFF, 32767), 2147418110},
        {"Mul_ls(max,40000)", Mul_ls(0x7FFFFFFF, 40000), 0x7FFFFFFF},
        {"Mul_ls(-max,32767)", Mul_ls(-0x7FFFFFFF, 32767), -2147418112},
        {"Mul_ls(1.0,0.5)", Mul_ls(32768, 16384), 16384},
        {"Sqrt_s_exp(16384)", Sqrt_s_exp(16384), 23170},
        {"Sqrt_s_exp(100)", Sqrt_s_exp(100), 1810},
        {"Sqrt_s_exp(0)", Sqrt_s_exp(0), 0},
        {"Sqrt_l_exp(2^30)", Sqrt_l_exp(0x40000000), 0x5A820000},
        {"Sqrt_l_exp(2^29)", Sqrt_l_exp(0x20000000), 0x40000000},
        {"Sqrt_l_exp(-1)", Sqrt_l_exp(-1), 0},
        {"Sqrt(100)", Sqrt(100), 10},
        {"Sqrt(2^30-1)", Sqrt((1 << 30) - 1), 32767},
        {"Sqrt_s(32767)", Sqrt_s(32767), 181},
        {"Sqrt_s(9)", Sqrt_s(9), 3},
        {"Sqrt_s(0)", Sqrt_s(0), 0},
        {"Inv_sqrt(1)", Inv_sqrt(1), 1073709056},
        {"Inv_sqrt(4)", Inv_sqrt(4), 536854528},
        {"Inv_sqrt(2^30)", Inv_sqrt(1 << 30), 32767},
        {"Inv_sqrt(2^31-1)", Inv_sqrt(0x7FFFFFFF), 23170},
        {"Inv_sqrt(0)", Inv_sqrt(0), 0x3FFFFFFF},
        {"Inv_sqrt(-1)", Inv_sqrt(-1), 0x3FFFFFFF},
        {"Pow2(0,0)", Pow2(0, 0), 1},
        {"Pow2(10,16384)", Pow2(10, 16384), 1448},
        {"Pow2(-1,0)", Pow2(-1, 0), 1},
        {"Pow2(-2,0)", Pow2(-2, 0), 0},
        {"Pow2(30,0)", Pow2(30, 0), 0x40000000},
        {"Pow2(31,0)", Pow2(31, 0), 0},
        {"Pow2_s(0,0)", Pow2_s(0, 0), 32768},
        {"Pow2_s(-1,16384)", Pow2_s(-1, 16384), 23170},
        {"Pow2_s(-16,0)", Pow2_s(-16, 0), 1},
        {"Pow2_s(-17,0)", Pow2_s(-17, 0), 0},
        {"Pow2_s(16,0)", Pow2_s(16, 0), 0},
        {"Pow2_frac(-1)", Pow2_frac(-1), 16384},
        {"Pow2_frac(-15)", Pow2_frac(-15), 1},
        {"Pow2_frac(-16)", Pow2_frac(-16), 0},
        {"VorLog2(32768)", VorLog2(32768), 0},
        {"VorLog2(65536)", VorLog2(65536), 32768},
        {"VorLog2(98304)", VorLog2(98304), 51935},
        {"VorLog2(2)", VorLog2(2), -458752},
        {"VorLog2(1)", VorLog2(1), 0},
        {"Log2_ceil(1)", Log2_ceil(1), 0},
        {"Log2_ceil(0)", Log2_ceil(0), 0},
        {"Log2_ceil(1024)", Log2_ceil(1024), 10},
        {"Log2_ceil(1025)", Log2_ceil(1025), 11},
        {"Log2_ceil(2^20+1)", Log2_ceil((1 << 20) + 1), 20},
        {"Pow_mn(64,16,1,2)", Pow_mn(64, 16, 1, 2), 32},
        {"Pow_mn(32,8,1,3)", Pow_mn(32, 8, 1, 3), 13},
        {"Pow_mn(48,12,3,4)", Pow_mn(48, 12, 3, 4), 34},
        {"Pow_mn(q=0)", Pow_mn(48, 12, 3, 0), 0},
    };
    for (const Case &c : cases)
        EXPECT_EQ(c.got, c.want) << c.what;
}

TEST(FixMathExact, PairResults)
{
    EXPECT_EQ(DivPair(1, 3), (Pair{0, 10922}));
    EXPECT_EQ(DivPair(7, 2), (Pair{3, 16384}));
    EXPECT_EQ(DivPair(0, 0), (Pair{1, 0}));
    EXPECT_EQ(DivPair(5, 0), (Pair{0, 0}));
    EXPECT_EQ(DivPair(-1, 3), (Pair{0, 0}));
    EXPECT_EQ(DivPair(1, -3), (Pair{0, 0}));
    EXPECT_EQ(MulPair(1, 16384, 1, 16384), (Pair{2, 8192}));
    EXPECT_EQ(Log2Pair(3), (Pair{1, 19167}));
    EXPECT_EQ(Log2Pair(1000), (Pair{9, 31644}));
    EXPECT_EQ(Log2Pair(0x7FFFFFFF), (Pair{30, 32766}));
    EXPECT_EQ(Log2Pair(1), (Pair{0, 0}));
    EXPECT_EQ(Log2Pair(-5), (Pair{0, 0}));
}

// Integer square roots are exact over their domains.
TEST(FixMathSweep, IntegerSquareRootsExact)
{
    for (int32_t x = 1; x <= 32767; ++x)
        ASSERT_EQ(Sqrt_s(x), static_cast<int16_t>(std::floor(std::sqrt(double(x))))) << x;
    for (int64_t x = 1; x < (int64_t{1} << 30); x = x * 17 / 16 + 1) {
        const auto r = static_cast<int64_t>(std::floor(std::sqrt(double(x))));
        for (int64_t y : {x, r * r, r * r - 1, (r + 1) * (r + 1) - 1})
            if (y > 0 && y < (int64_t{1} << 30)) {
                ASSERT_EQ(Sqrt(int32_t(y)), int16_t(std::floor(std::sqrt(double(y))))) << y;
            }
    }
}

// The division family truncates toward zero; with a divisor in 16 bits it is exact.
TEST(FixMathSweep, Division)
{
    for (int32_t a = -32767; a <= 32767; a += 97)
        for (int32_t b = -32767; b <= 32767; b += 89) {
            if (b == 0)
                continue;
            const int32_t want = int32_t(int64_t{a} * 32768 / b);
            ASSERT_EQ(Div_s(a, b), want) << a << '/' << b;
            ASSERT_EQ(Div_sl(a, b), want) << a << '/' << b;
            ASSERT_EQ(Div_l(a, b), want) << a << '/' << b;
        }
    for (int32_t a = 0; a <= 32767; a += 7)
        for (int32_t b = 1; b <= 32767; b += 31) {
            const Pair p = DivPair(a, b);
            ASSERT_EQ(p, (a == b ? Pair{1, 0} : Pair{a / b, a % b * 32768 / b})) << a << '/' << b;
        }
    // Wide divisors are scaled into 15 bits: the quotient loses at most a few units.
    std::mt19937 rng(1234);
    for (int i = 0; i < 200000; ++i) {
        const int32_t b = int32_t(rng() >> (1 + rng() % 30)) | 1;
        const int64_t limit = std::min<int64_t>(int64_t{b} * 32767, INT32_MAX);
        const int32_t a = int32_t(rng() % uint64_t(limit));
        const double exact = double(a) * 32768.0 / b;
        ASSERT_NEAR(Div_l(a, b), exact, 3.0) << a << '/' << b;
        ASSERT_NEAR(Div_l(-a, b), -exact, 3.0) << a << '/' << b;
    }
}

TEST(FixMathSweep, Multiplication)
{
    std::mt19937 rng(99);
    for (int i = 0; i < 200000; ++i) {
        const int32_t a = int32_t(rng()), b = int32_t(rng() >> (rng() % 31));
        const double exact = double(a) * double(b) / 32768.0;
        const int32_t got = Mul_l(a, b);
        if (exact >= 0x7FFFFFFF - 4.0 * (1 << 16)) {
            ASSERT_GE(got, 0x7FFFFFFF - 8 * (1 << 16)) << a << '*' << b;
        } else if (exact <= -0x7FFFFFFF + 4.0 * (1 << 16)) {
            ASSERT_LE(got, -0x7FFFFFFF + 8 * (1 << 16)) << a << '*' << b;
        } else { // the split drops bit 0 of each operand
            ASSERT_NEAR(got, exact, 8.0 + 2.0 * (std::fabs(a) + std::fabs(b)) / 65536.0) << a << '*' << b;
        }

        const int32_t b16 = int16_t(b);
        const double exact16 = double(a) * b16 / 32768.0;
        const int32_t got16 = Mul_ls(a, b16);
        if (exact16 > 0x7FFFFFFF - 8.0) {
            ASSERT_GE(got16, 0x7FFFFFFF - 8) << a << '*' << b16;
        } else if (exact16 >= INT32_MIN + 8.0) {
            ASSERT_NEAR(got16, exact16, 3.0) << a << '*' << b16;
        }
    }
    for (int32_t e1 = 0; e1 < 40; e1 += 3)
        for (int32_t f1 = 0; f1 < 32768; f1 += 1001)
            for (int32_t e2 = 0; e2 < 3; ++e2)
                for (int32_t f2 = 0; f2 < 32768; f2 += 777) {
                    const Pair p = MulPair(e1, f1, e2, f2);
                    const double exact = (e1 + f1 / 32768.0) * (e2 + f2 / 32768.0);
                    ASSERT_TRUE(p.f >= 0 && p.f < 32768);
                    ASSERT_NEAR(p.e + p.f / 32768.0, exact, 2.0 / 32768.0) << e1 << ',' << f1 << ',' << e2 << ',' << f2;
                }
}

TEST(FixMathSweep, SquareRootsAgainstDouble)
{
    for (int32_t x = 1; x <= 32767; ++x)
        ASSERT_NEAR(Sqrt_s_exp(x), std::sqrt(x / 32768.0) * 32768.0, 3.0) << x;
    for (int64_t x = 1; x <= INT32_MAX; x = x * 33 / 32 + 1) {
        int n = 0;
        while (n + 2 <= 30 && (x << (n + 2)) <= INT32_MAX)
            n += 2;
        if ((x << n) <= 0x1FFFFFFF)
            n += 2; // keep y in 2^29..2^31
        const double y = double(x << (n & 30));
        ASSERT_NEAR(Sqrt_l_exp(int32_t(x)), std::sqrt(y / 2147483648.0) * 2147483648.0, 3.0 * 65536) << x;
        const double inv = 1073741824.0 / std::sqrt(double(x));
        ASSERT_NEAR(Inv_sqrt(int32_t(x)), inv, inv / 2048.0 + 1.0) << x; // first entry capped
    }
}

TEST(FixMathSweep, PowersOfTwoAgainstDouble)
{
    for (int32_t e = -2; e <= 31; ++e)
        for (int32_t f = 0; f < 32768; f += 37) {
            const double v = std::ldexp(std::exp2(f / 32768.0), e);
            if (e <= 30) {
                ASSERT_NEAR(Pow2(e, f), v, v / 8192.0 + 1.0) << e << ',' << f;
            } else {
                ASSERT_EQ(Pow2(e, f), 0);
            }
            const double vs = v * 32768.0;
            if (e >= -16 && e <= 15) {
                ASSERT_NEAR(Pow2_s(e, f), vs, vs / 8192.0 + 1.0) << e << ',' << f;
            }
        }
    for (int32_t x = -1; x >= -15; --x)
        EXPECT_EQ(Pow2_frac(x), int32_t(std::ldexp(32768.0, x)));
}

TEST(FixMathSweep, LogarithmsAgainstDouble)
{
    for (int64_t x = 2; x <= INT32_MAX; x = x * 65 / 64 + 1) {
        const double l = std::log2(double(x));
        ASSERT_NEAR(VorLog2(int32_t(x)), (l - 15.0) * 32768.0, 8.0) << x;
        const Pair p = Log2Pair(int32_t(x));
        ASSERT_EQ(p.e, int32_t(std::floor(l))) << x;
        ASSERT_NEAR(p.e + p.f / 32768.0, l, 8.0 / 32768.0) << x;
        const int32_t c = Log2_ceil(int32_t(x));
        const int32_t exact = int32_t(std::ceil(l));
        // Just above a power of two the table may not resolve the fraction yet.
        if (double(x) >= std::exp2(std::floor(l)) * (1.0 + 1.0 / 2048.0)) {
            ASSERT_EQ(c, exact) << x;
        } else {
            ASSERT_TRUE(c == exact || c == exact - 1) << x;
        }
    }
    for (int k = 0; k <= 30; ++k)
        EXPECT_EQ(Log2_ceil(1 << k), k);
}

// With n a power of two the exponent pair keeps a non-negative fraction, so the table is read
// within its range.
TEST(FixMathSweep, PowMnAgainstDouble)
{
    for (int32_t m = 1; m <= 1024; ++m)
        for (int32_t n = 1; n <= m; n *= 2)
            for (int32_t q = 1; q <= 8; ++q)
                for (int32_t p = 0; p <= q; ++p) {
                    const double v = n * std::pow(double(m) / n, double(p) / q);
                    ASSERT_NEAR(Pow_mn(m, n, p, q), v, v / 512.0 + 1.0) << m << ',' << n << ',' << p << '/' << q;
                }
}

// A negative fraction in the exponent pair (log2 m has the smaller fraction) reads the
// power-of-two table at its start: 3 x (8/3)^(1/2) comes out as 6, not 4.9.
TEST(FixMathExact, PowMnNegativeFractionReadsTableStart)
{
    EXPECT_EQ(Pow_mn(8, 3, 1, 2), 6);
    EXPECT_EQ(Pow2_s(1, -9584), Pow2_s(1, 656)); // index clamped, weight from the low ten bits
    EXPECT_EQ(Pow2_s(0, 40000), Pow2_s(0, 31744 + (40000 & 0x3FF))); // and at the end above 32767
}

} // namespace
