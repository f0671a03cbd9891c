#include "fuzz_sal.hpp"

#include <cstdarg>
#include <cstdio>
#include <cstdlib>

#include <vorcal/vorsal.h>

namespace vorcal::fuzz {

namespace {

uint32_t g_failAt = 0;
uint32_t g_sinceArm = 0;
size_t g_live = 0;

void *Alloc(uint32_t uSize)
{
    if (g_failAt != 0 && ++g_sinceArm == g_failAt) {
        g_failAt = 0;
        return nullptr;
    }
    ++g_live;
    return std::malloc(uSize ? uSize : 1);
}

void Free(void *pBlock)
{
    if (pBlock)
        --g_live;
    std::free(pBlock);
}

SALFile Open(const char *, uint32_t) { return 0; }
int32_t Close(SALFile) { return 0; }
int32_t Write(SALFile, const void *, uint32_t uSize) { return static_cast<int32_t>(uSize); }

void Format(const char *pFormat, va_list args)
{
    char line[512];
    std::vsnprintf(line, sizeof line, pFormat, args);
}

void PlainTrace(const char *pFormat, ...)
{
    va_list args;
    va_start(args, pFormat);
    Format(pFormat, args);
    va_end(args);
}

SALMemoryTable g_memory = {Alloc, nullptr, Free};
SALFileTable g_files = {Open, Close, nullptr, Write};
SALTraceTable g_trace = {PlainTrace};

} // namespace

void FailAllocation(uint32_t n)
{
    g_failAt = n;
    g_sinceArm = 0;
}

size_t LiveBlocks()
{
    return g_live;
}

} // namespace vorcal::fuzz

extern "C" {

SALMemoryTable *g_vorSALMemoryTable = &vorcal::fuzz::g_memory;
SALFileTable *g_vorSALFileTable = &vorcal::fuzz::g_files;
SALTraceTable *g_vorSALTraceTable = &vorcal::fuzz::g_trace;

void vorSAL_TraceCat(int32_t, int32_t, const char *pFormat, ...)
{
    va_list args;
    va_start(args, pFormat);
    vorcal::fuzz::Format(pFormat, args);
    va_end(args);
}

} // extern "C"
