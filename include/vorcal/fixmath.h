/*
 * vorcal/fixmath.h - fixed-point arithmetic on 32-bit integers (division, multiplication,
 * square roots, powers of two and base-2 logarithms). Every function is pure.
 *
 * Formats: Q15 (32768 is 1.0, an integer part may sit above it), Q30, Q31, and the
 * integer-fraction pair (e, f) standing for e + f / 32768.
 *
 * Inputs outside a function's domain never trap; the values they give are listed with the
 * function.
 */
#ifndef VORCAL_FIXMATH_H
#define VORCAL_FIXMATH_H

#include <stdint.h>

#include <vorcal/export.h>

#ifdef __cplusplus
extern "C" {
#endif

/* a / b in Q15 for 16-bit a, b; the integer part of the quotient is kept as a signed 16-bit
 * number. 0 when either is 0, +-32768 for equal magnitudes. A b whose 16-bit magnitude is 0
 * (b = -65536 and the like) gives 0. */
VORCAL_API int32_t Div_s(int32_t a, int32_t b);
/* a / b in Q15 for a 16-bit a and a 32-bit b. */
VORCAL_API int32_t Div_sl(int32_t a, int32_t b);
/* a / b in Q15 for 32-bit a and b. A |b| above 32767 is scaled down by c right shifts and the
 * dividend up by 15 - c left shifts; for |b| >= 2^30 (c = 16) the dividend shifts right by 1. */
VORCAL_API int32_t Div_l(int32_t a, int32_t b);
/* a / b as an integer-fraction pair. Negative a or b gives (0, 0); a == b gives (1, 0),
 * a = b = 0 included; b = 0 with a > 0 gives (0, 0). */
VORCAL_API void Div_exp(int32_t a, int32_t b, int32_t *piInt, int32_t *piFrac);
/* a * b in Q15, saturated to 0x7FFFFFFF and 0x80000001 (-0x7FFFFFFF). Operands are split into
 * 16-bit halves without 32-bit wrap-around, so -0x7FFFFFFF saturates like +0x7FFFFFFF. */
VORCAL_API int32_t Mul_l(int32_t a, int32_t b);
/* a * b in Q15 for a 16-bit Q15 b, saturated upward to 0x7FFFFFFF only. */
VORCAL_API int32_t Mul_ls(int32_t a, int32_t b);
/* The product of the pairs (e1, f1) and (e2, f2). */
VORCAL_API void Mul_exp(int32_t e1, int32_t f1, int32_t e2, int32_t f2, int32_t *piInt, int32_t *piFrac);
/* sqrt(x) in Q15 for a Q15 x in 1..32767; x <= 0 gives 0, x above 32767 gives the value at
 * 32767. */
VORCAL_API int16_t Sqrt_s_exp(int32_t x);
/* The square root, in Q31, of x normalised by an even left shift n (not reported: sqrt(x) is
 * the result / 2^(n/2)). x <= 0 gives 0. */
VORCAL_API int32_t Sqrt_l_exp(int32_t x);
/* floor(sqrt(x)) for x in 1..32767, digit by digit on 16-bit values; x <= 0 gives 0. */
VORCAL_API int16_t Sqrt_s(int32_t x);
/* floor(sqrt(x)) for x in 1..2^30 - 1; x <= 0 gives 0, larger x the root cut to 16 bits. */
VORCAL_API int16_t Sqrt(int32_t x);
/* 1 / sqrt(x) in Q30; x <= 0 gives 0x3FFFFFFF. */
VORCAL_API int32_t Inv_sqrt(int32_t x);
/* 2^x in Q15 for x in -1..-15; x below -15 and x >= 0 give 0. */
VORCAL_API int32_t Pow2_frac(int32_t x);
/* 2^(e + f/32768) rounded to an integer; 0 for e above 30 or below -1. The fraction selects
 * the power-of-two table entry by f >> 10: a negative f reads the table at its start, f above
 * 32767 at its end (the interpolation weight is always the low ten bits of f). */
VORCAL_API int32_t Pow2(int32_t e, int32_t f);
/* 2^(e + f/32768) in Q15, rounded; 0 for e above 15 or below -16. f as for Pow2. */
VORCAL_API int32_t Pow2_s(int32_t e, int32_t f);
/* log2(x) in Q15 for a Q15 x; x <= 1 gives 0. */
VORCAL_API int32_t VorLog2(int32_t x);
/* log2(x) for an integer x as a pair; x <= 1 gives (0, 0). */
VORCAL_API void Log2_exp(int32_t x, int32_t *piInt, int32_t *piFrac);
/* The smallest k with 2^k >= x as far as the logarithm table resolves it (2^20 + 1 gives 20);
 * x <= 0 gives 0. */
VORCAL_API int32_t Log2_ceil(int32_t x);
/* n * (m / n)^(p / q) rounded. q = 0 gives 0. When the exponent pair ends with a negative
 * fraction (m < n), the power-of-two table is read at its start, as for Pow2_s. */
VORCAL_API int32_t Pow_mn(int32_t m, int32_t n, int32_t p, int32_t q);

#ifdef __cplusplus
}
#endif

#endif /* VORCAL_FIXMATH_H */
