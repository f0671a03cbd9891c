/*
 * vorcal/export.h - the attributes every public header uses: VORCAL_API marks what the
 * library exports, VORCAL_PRINTF lets the compiler check trace formats.
 */
#ifndef VORCAL_EXPORT_H
#define VORCAL_EXPORT_H

#if defined(__GNUC__)
#define VORCAL_API __attribute__((visibility("default")))
#define VORCAL_PRINTF(fmt, args) __attribute__((format(printf, fmt, args)))
#else
#define VORCAL_API
#define VORCAL_PRINTF(fmt, args)
#endif

#endif /* VORCAL_EXPORT_H */
