// The default system layer: memory from the C library in 64-byte aligned blocks, dump files
// through stdio, traces to stderr.
//
// VORSAL_TRACE chooses what vorSAL_TraceCat prints: "all", or a comma-separated list of
// CATEGORY (every level) and CATEGORY:MAXLEVEL entries. Category 0 stands for the plain trace
// of slot 0. Unset: category 11 at level 0 (errors and refusals).
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include <vorcal/vorsal.h>

namespace {

constexpr int kMaxCategory = 63;

struct TraceFilter {
    bool bParsed = false;
    int aMaxLevel[kMaxCategory + 1]; // -1: category silent
};

TraceFilter g_filter;

void ParseFilter(TraceFilter &filter)
{
    for (int &iLevel : filter.aMaxLevel)
        iLevel = -1;
    filter.bParsed = true;
    const char *pSpec = std::getenv("VORSAL_TRACE");
    if (!pSpec) {
        filter.aMaxLevel[11] = 0;
        return;
    }
    if (std::strcmp(pSpec, "all") == 0) {
        for (int &iLevel : filter.aMaxLevel)
            iLevel = 0x7FFFFFFF;
        return;
    }
    const char *p = pSpec;
    while (*p) {
        char *pEnd = nullptr;
        const long lCategory = std::strtol(p, &pEnd, 10);
        if (pEnd == p)
            break;
        long lLevel = 0x7FFFFFFF;
        p = pEnd;
        if (*p == ':') {
            lLevel = std::strtol(p + 1, &pEnd, 10);
            p = pEnd;
        }
        if (lCategory >= 0 && lCategory <= kMaxCategory)
            filter.aMaxLevel[lCategory] = static_cast<int>(lLevel);
        while (*p == ',' || *p == ' ')
            ++p;
    }
}

bool Enabled(int32_t iCategory, int32_t iLevel)
{
    if (!g_filter.bParsed)
        ParseFilter(g_filter);
    return iCategory >= 0 && iCategory <= kMaxCategory && iLevel >= 0 &&
           iLevel <= g_filter.aMaxLevel[iCategory];
}

void VPrint(int32_t iCategory, int32_t iLevel, const char *pFormat, va_list args)
{
    std::fprintf(stderr, "[vorsal %d/%d] ", static_cast<int>(iCategory), static_cast<int>(iLevel));
    std::vfprintf(stderr, pFormat, args);
    const size_t uLen = std::strlen(pFormat);
    if (uLen == 0 || pFormat[uLen - 1] != '\n')
        std::fputc('\n', stderr);
}

// Blocks start on a 64-byte boundary (a cache line), so that the layer's H.264 conversions into
// its intermediate buffer can store whole lines.
constexpr size_t kBlockAlignment = 64;

void *MemAlloc(uint32_t uSize)
{
    void *pBlock = nullptr;
    return posix_memalign(&pBlock, kBlockAlignment, uSize ? uSize : 1) == 0 ? pBlock : nullptr;
}

void MemFree(void *pBlock)
{
    std::free(pBlock);
}

SALFile FileOpen(const char *pPath, uint32_t uMode)
{
    if (!pPath || uMode != SAL_FILE_MODE_WRITE)
        return 0;
    return reinterpret_cast<SALFile>(std::fopen(pPath, "wb"));
}

int32_t FileClose(SALFile hFile)
{
    return hFile ? std::fclose(reinterpret_cast<FILE *>(hFile)) : -1;
}

int32_t FileWrite(SALFile hFile, const void *pData, uint32_t uSize)
{
    if (!hFile || (!pData && uSize))
        return -1;
    return static_cast<int32_t>(std::fwrite(pData, 1, uSize, reinterpret_cast<FILE *>(hFile)));
}

void PlainTrace(const char *pFormat, ...)
{
    if (!Enabled(0, 0))
        return;
    va_list args;
    va_start(args, pFormat);
    VPrint(0, 0, pFormat, args);
    va_end(args);
}

// CONTRACT: slot 1 of the memory table and slot 2 of the file table are reserved: null.
SALMemoryTable g_memoryTable = {MemAlloc, nullptr, MemFree};
SALFileTable g_fileTable = {FileOpen, FileClose, nullptr, FileWrite};
SALTraceTable g_traceTable = {PlainTrace};

} // namespace

extern "C" {

SALMemoryTable *g_vorSALMemoryTable = &g_memoryTable;
SALFileTable *g_vorSALFileTable = &g_fileTable;
SALTraceTable *g_vorSALTraceTable = &g_traceTable;

void vorSAL_TraceCat(int32_t iCategory, int32_t iLevel, const char *pFormat, ...)
{
    if (!pFormat || !Enabled(iCategory, iLevel))
        return;
    va_list args;
    va_start(args, pFormat);
    VPrint(iCategory, iLevel, pFormat, args);
    va_end(args);
}

} // extern "C"
