/*
 * vorcal/aacparse.h - the parse-only AAC decoder: bit reader, state record, stream headers,
 * SBR extension parsing and the detection entry VrAACSBRInfo.
 */
#ifndef VORCAL_AACPARSE_H
#define VORCAL_AACPARSE_H

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

#endif /* VORCAL_AACPARSE_H */
