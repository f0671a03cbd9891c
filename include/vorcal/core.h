/*
 * vorcal/core.h - the CAL handle, the codec registry, frame dumping and version information.
 *
 * The engine serialises every call of this header: the handle, its count, the registry and
 * the dump slots are plain process-wide data without a lock.
 */
#ifndef VORCAL_CORE_H
#define VORCAL_CORE_H

#include <stdint.h>
#include <vorcal/vorsal.h>

#ifdef __cplusplus
extern "C" {
#endif

/* CALParam, the pointer-sized pass-through value, comes from vorcal/vorsal.h. */

/* One slot of a codec function table; each slot is called through the signature of its kind
 * (see vorcal/wrapper.h). */
typedef void (*CALCodecFunc)(void);

/* Number of slots in a codec function table. */
#define CAL_CODEC_FUNCTION_SLOTS 6

/* Number of dump slots of the handle. */
#define CAL_DUMP_SLOTS 4

/* Most entries the registry holds. */
#define CAL_MAX_CODEC_ENTRIES 100

/* One registered codec: its three keys and its function table. */
typedef struct CALCodecEntry {
    struct CALCodecEntry *pNext;
    uint16_t uMediaType;                 /* low 16 bits of eMediaType */
    uint16_t uCodecMode;                 /* low 16 bits of eMode */
    uint32_t uCodecObjectTypeIndication; /* all 32 bits */
    CALCodecFunc Functions[CAL_CODEC_FUNCTION_SLOTS];
} CALCodecEntry;

/* The process-wide handle. */
typedef struct CALHandle {
    uint32_t m_uRefCount;
    SALFile m_hDumpFile[CAL_DUMP_SLOTS]; /* 0 = closed */
    CALCodecEntry *m_pCodecList;
} CALHandle;

struct CALCodec;

/* Returns the handle (created on first use, counted on every later call), or null when the
 * version is not 1.1 or the handle cannot be allocated. uReserved is ignored. */
VORCAL_API CALHandle *vorCAL_GetHandle(uint32_t uReserved, uint32_t uMajor, uint32_t uMinor);

/* Drops one reference; the last one frees the registry, closes the dump files and the handle. */
VORCAL_API void vorCAL_ReleaseHandle(CALHandle *hCAL);

/* Registers (or replaces in place) a codec table of at most six slots under the three keys.
 * Returns 1 when registered, 0 when refused (no memory, registry full). */
VORCAL_API int32_t vorCAL_RegisterCodec(CALHandle *hCAL, uint32_t eMediaType, uint32_t eMode,
                                        uint32_t uCodecObjectTypeIndication,
                                        const void *pFunctions, uint32_t uFunctionsSize);

/* Creates a codec instance from the entry registered for the keys, or returns null. */
VORCAL_API struct CALCodec *vorCAL_GetCodec(CALHandle *hCAL, uint32_t eMediaType, uint32_t eMode,
                                            uint32_t uCodecObjectTypeIndication);

/* Frees a codec instance and its cached silence frame (not the codec, not the H.264 buffer). */
VORCAL_API void vorCAL_ReleaseCodec(struct CALCodec *hCodec);

/* Closes dump slot uSlot (0-3) and, when pPath is not null, opens pPath there. Returns the new
 * file handle, or with a null path the close result (0 when nothing was closed). A slot number
 * outside 0-3 touches nothing and returns 0. */
VORCAL_API CALParam vorCAL_DumpFrames(CALHandle *hCAL, const char *pPath, uint32_t uSlot);

/* "0x00000001.0x00000001.0x00000002." */
VORCAL_API const char *vorCAL_GetVersion(void);

/* The long version string with the build date. */
VORCAL_API const char *vorCAL_GetVersionInfo(void);

/* Major (0), minor (1) and patch (2) version numbers; 0 for any other index. */
VORCAL_API int32_t vorCAL_GetVersionNum(uint32_t uIndex);

/* Registry list operations, used by the core. */

/* A new zeroed entry, or null. */
VORCAL_API CALCodecEntry *_CE_New(void);

/* Links pNew (0), replaces the entry with the same keys in place and frees pNew (1), or
 * refuses a new key when 100 entries are held (-1, list unchanged). */
VORCAL_API int32_t _CE_Add(CALCodecEntry **ppHead, CALCodecEntry *pNew);

/* The entry with these three keys among the first 100, or null. */
VORCAL_API CALCodecEntry *_CE_Find(CALCodecEntry *pHead, uint16_t uMediaType, uint16_t uCodecMode,
                                   uint32_t uCodecObjectTypeIndication);

/* Frees every entry of the list. */
VORCAL_API void _CE_FreeListAll(CALCodecEntry *pHead);

#ifdef __cplusplus
}
#endif

#endif /* VORCAL_CORE_H */
