/*
 * vorcal/fixmath.h - fixed-point arithmetic on 32-bit integers (division, multiplication,
 * square roots, powers of two and base-2 logarithms). Every function is pure.
 */
#ifndef VORCAL_FIXMATH_H
#define VORCAL_FIXMATH_H

#include <stdint.h>

#ifndef VORCAL_API
#if defined(__GNUC__)
#define VORCAL_API __attribute__((visibility("default")))
#else
#define VORCAL_API
#endif
#endif

#ifdef __cplusplus
extern "C" {
#endif

#ifdef __cplusplus
}
#endif

#endif /* VORCAL_FIXMATH_H */
