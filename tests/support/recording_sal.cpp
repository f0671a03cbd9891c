#include "recording_sal.hpp"

#include <cctype>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <unistd.h>

namespace vorcal::test {

namespace {

std::string VFormat(const char *pFormat, va_list args)
{
    va_list copy;
    va_copy(copy, args);
    const int n = std::vsnprintf(nullptr, 0, pFormat, copy);
    va_end(copy);
    std::string text(n > 0 ? static_cast<size_t>(n) : 0, '\0');
    if (n > 0)
        std::vsnprintf(text.data(), text.size() + 1, pFormat, args);
    return text;
}

void *TableAlloc(uint32_t uSize) { return RecordingSal::Get().Alloc(uSize); }
void TableFree(void *pBlock) { RecordingSal::Get().Free(pBlock); }

SALFile TableOpen(const char *pPath, uint32_t uMode)
{
    RecordingSal &sal = RecordingSal::Get();
    sal.openPaths.emplace_back(pPath ? pPath : "");
    sal.openModes.push_back(uMode);
    if (sal.failOpen || !pPath)
        return 0;
    FILE *pFile = std::fopen(pPath, "wb");
    return reinterpret_cast<SALFile>(pFile);
}

int32_t TableClose(SALFile hFile)
{
    RecordingSal &sal = RecordingSal::Get();
    sal.closedFiles.push_back(hFile);
    if (hFile)
        std::fclose(reinterpret_cast<FILE *>(hFile));
    return sal.closeResult;
}

int32_t TableWrite(SALFile hFile, const void *pData, uint32_t uSize)
{
    RecordingSal &sal = RecordingSal::Get();
    WriteRecord record;
    record.hFile = hFile;
    if (uSize)
        record.bytes.assign(static_cast<const uint8_t *>(pData), static_cast<const uint8_t *>(pData) + uSize);
    sal.writes.push_back(record);
    if (hFile && uSize) {
        std::fwrite(pData, 1, uSize, reinterpret_cast<FILE *>(hFile));
        std::fflush(reinterpret_cast<FILE *>(hFile));
    }
    return static_cast<int32_t>(uSize);
}

void TablePlainTrace(const char *pFormat, ...)
{
    va_list args;
    va_start(args, pFormat);
    TraceRecord record;
    record.bPlain = true;
    record.format = pFormat;
    record.text = VFormat(pFormat, args);
    va_end(args);
    RecordingSal::Get().traces.push_back(record);
}

SALMemoryTable g_memoryTable = {TableAlloc, nullptr, TableFree};
SALFileTable g_fileTable = {TableOpen, TableClose, nullptr, TableWrite};
SALTraceTable g_traceTable = {TablePlainTrace};

} // namespace

RecordingSal &RecordingSal::Get()
{
    static RecordingSal instance;
    return instance;
}

void RecordingSal::Reset()
{
    std::string dir = tempDir_;
    *this = RecordingSal();
    tempDir_ = dir;
}

void RecordingSal::FailAllocation(uint32_t n)
{
    failAt_ = n;
    sinceArm_ = 0;
}

void *RecordingSal::Alloc(uint32_t uSize)
{
    ++allocCount;
    allocSizes.push_back(uSize);
    if (failAt_ != 0 && ++sinceArm_ == failAt_) {
        failAt_ = 0;
        ++failedAllocs;
        return nullptr;
    }
    if (failAll) {
        ++failedAllocs;
        return nullptr;
    }
    void *pBlock = std::malloc(uSize ? uSize : 1);
    liveBlocks[pBlock] = uSize;
    return pBlock;
}

void RecordingSal::Free(void *pBlock)
{
    ++freeCount;
    auto it = liveBlocks.find(pBlock);
    if (it == liveBlocks.end()) {
        ++badFrees;
        return;
    }
    liveBlocks.erase(it);
    std::free(pBlock);
}

std::vector<TraceRecord> RecordingSal::TracesWithFormat(const std::string &fmt) const
{
    std::vector<TraceRecord> found;
    for (const TraceRecord &record : traces) {
        if (record.format == fmt)
            found.push_back(record);
    }
    return found;
}

std::string RecordingSal::TempDir()
{
    if (tempDir_.empty()) {
        char pattern[] = "/tmp/vorcal-test-XXXXXX";
        const char *pDir = mkdtemp(pattern);
        tempDir_ = pDir ? pDir : "/tmp";
    }
    return tempDir_;
}

std::vector<uint8_t> RecordingSal::ReadFile(const std::string &path)
{
    std::vector<uint8_t> bytes;
    FILE *pFile = std::fopen(path.c_str(), "rb");
    if (!pFile)
        return bytes;
    uint8_t buffer[4096];
    size_t n;
    while ((n = std::fread(buffer, 1, sizeof buffer, pFile)) > 0)
        bytes.insert(bytes.end(), buffer, buffer + n);
    std::fclose(pFile);
    return bytes;
}

bool MatchesWithLine(const std::string &text, const std::string &expected)
{
    const size_t uHash = expected.find('#');
    if (uHash == std::string::npos)
        return text == expected;
    if (text.compare(0, uHash, expected, 0, uHash) != 0)
        return false;
    size_t i = uHash;
    while (i < text.size() && std::isdigit(static_cast<unsigned char>(text[i])))
        ++i;
    if (i == uHash)
        return false;
    return text.compare(i, std::string::npos, expected, uHash + 1, std::string::npos) == 0;
}

bool HasTrace(int32_t iCategory, int32_t iLevel, const std::string &format, const std::string &expected)
{
    size_t n = 0;
    for (const TraceRecord &record : RecordingSal::Get().traces) {
        if (!record.bPlain && record.format == format && record.iCategory == iCategory &&
            record.iLevel == iLevel && MatchesWithLine(record.text, expected))
            ++n;
    }
    return n == 1;
}

bool HasPlainTrace(const std::string &format, const std::string &expected)
{
    size_t n = 0;
    for (const TraceRecord &record : RecordingSal::Get().traces) {
        if (record.bPlain && record.format == format && MatchesWithLine(record.text, expected))
            ++n;
    }
    return n == 1;
}

} // namespace vorcal::test

extern "C" {

SALMemoryTable *g_vorSALMemoryTable = &vorcal::test::g_memoryTable;
SALFileTable *g_vorSALFileTable = &vorcal::test::g_fileTable;
SALTraceTable *g_vorSALTraceTable = &vorcal::test::g_traceTable;

void vorSAL_TraceCat(int32_t iCategory, int32_t iLevel, const char *pFormat, ...)
{
    va_list args;
    va_start(args, pFormat);
    vorcal::test::TraceRecord record;
    record.iCategory = iCategory;
    record.iLevel = iLevel;
    record.format = pFormat;
    record.text = vorcal::test::VFormat(pFormat, args);
    va_end(args);
    vorcal::test::RecordingSal::Get().traces.push_back(record);
}

} // extern "C"
