/*
 * vorcal/vorsal.h - the system abstraction layer that libvorcal imports.
 *
 * The host process defines the three table pointers and vorSAL_TraceCat
 * (libvorsal.so is the bundled default; a host or a test may link its own)
 * and fills them before it calls the library. The library reads each table
 * pointer afresh at every use and calls only the slots documented below.
 */
#ifndef VORCAL_VORSAL_H
#define VORCAL_VORSAL_H

#include <stdint.h>

#include <vorcal/export.h>


#ifdef __cplusplus
extern "C" {
#endif

#ifndef VORCAL_CALPARAM_DEFINED
#define VORCAL_CALPARAM_DEFINED
/* A pointer-sized value passed through unchanged (user data, file handles, pass-through arguments). */
typedef uintptr_t CALParam;
#endif

/* A file handle of the file table; 0 means no file. */
typedef CALParam SALFile;

/* g_vorSALMemoryTable: slot 0 allocates (null when no memory is left), slot 2 frees. The H.264
 * conversions of the video decoder write into a block of this table: blocks that start on a
 * 64-byte boundary, as libvorsal.so returns them, let them store whole cache lines. */
typedef struct SALMemoryTable {
    void *(*Alloc)(uint32_t uSize);
    void *pReserved1;
    void (*Free)(void *pBlock);
} SALMemoryTable;

/* g_vorSALFileTable: the library opens files only with mode 6 (write, create) for frame dumps. */
typedef struct SALFileTable {
    SALFile (*Open)(const char *pPath, uint32_t uMode);
    int32_t (*Close)(SALFile hFile);
    void *pReserved2;
    int32_t (*Write)(SALFile hFile, const void *pData, uint32_t uSize);
} SALFileTable;

/* g_vorSALTraceTable: slot 0 is the plain, unfiltered trace. */
typedef struct SALTraceTable {
    void (*Trace)(const char *pFormat, ...) VORCAL_PRINTF(1, 2);
} SALTraceTable;

/* The mode value the library passes to SALFileTable.Open: open for writing, creating the file. */
#define SAL_FILE_MODE_WRITE 6u

extern VORCAL_API SALMemoryTable *g_vorSALMemoryTable;
extern VORCAL_API SALFileTable *g_vorSALFileTable;
extern VORCAL_API SALTraceTable *g_vorSALTraceTable;

/* Categorised trace: the host decides by category and level whether the line is emitted. */
VORCAL_API void vorSAL_TraceCat(int32_t iCategory, int32_t iLevel, const char *pFormat, ...)
    VORCAL_PRINTF(3, 4);

#ifdef __cplusplus
}
#endif

#endif /* VORCAL_VORSAL_H */
