// Access to the host's system layer (vorSAL): the only way the library allocates memory,
// writes files and traces. CONTRACT: the table pointers are read afresh at every use, never
// cached, and only the documented slots are called.
#pragma once

#include <cstdint>

#include <vorcal/vorsal.h>

namespace vorcal::sal {

// One block from slot 0 of the memory table; null when the host has no memory (or no table).
inline void *Alloc(uint32_t uSize) noexcept
{
    SALMemoryTable *pTable = g_vorSALMemoryTable;
    return (pTable && pTable->Alloc) ? pTable->Alloc(uSize) : nullptr;
}

// Returns a block through slot 2 of the memory table.
inline void Free(void *pBlock) noexcept
{
    SALMemoryTable *pTable = g_vorSALMemoryTable;
    if (pTable && pTable->Free)
        pTable->Free(pBlock);
}

inline SALFile OpenFile(const char *pPath, uint32_t uMode) noexcept
{
    SALFileTable *pTable = g_vorSALFileTable;
    return (pTable && pTable->Open) ? pTable->Open(pPath, uMode) : 0;
}

inline int32_t CloseFile(SALFile hFile) noexcept
{
    SALFileTable *pTable = g_vorSALFileTable;
    return (pTable && pTable->Close) ? pTable->Close(hFile) : 0;
}

inline void WriteFile(SALFile hFile, const void *pData, uint32_t uSize) noexcept
{
    SALFileTable *pTable = g_vorSALFileTable;
    if (pTable && pTable->Write)
        pTable->Write(hFile, pData, uSize);
}

// The %X/%x argument for a pointer or user-data value: its low 32 bits, so that the format
// strings stay as they are and the call is well defined on 64-bit hosts.
inline unsigned int Hex32(const void *p) noexcept
{
    return static_cast<unsigned int>(reinterpret_cast<uintptr_t>(p));
}
inline unsigned int Hex32(uintptr_t v) noexcept
{
    return static_cast<unsigned int>(v);
}

} // namespace vorcal::sal

// Plain trace through slot 0 of the trace table (no category, no level). A macro so that the
// compiler checks the format against its arguments.
#define VORCAL_TRACE_PLAIN(...)                                          \
    do {                                                                 \
        SALTraceTable *pTraceTable_ = g_vorSALTraceTable;                \
        if (pTraceTable_ && pTraceTable_->Trace)                         \
            pTraceTable_->Trace(__VA_ARGS__);                            \
    } while (0)

// Categorised trace; the host filters by category and level.
#define VORCAL_TRACE(iCategory, iLevel, ...) vorSAL_TraceCat((iCategory), (iLevel), __VA_ARGS__)

namespace vorcal {

// Trace categories.
inline constexpr int32_t kTraceAudio = 1;
inline constexpr int32_t kTraceH264Tools = 2;
inline constexpr int32_t kTraceText = 7;
inline constexpr int32_t kTraceError = 11;
inline constexpr int32_t kTraceH264Adapt = 16;

} // namespace vorcal
