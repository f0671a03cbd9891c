// A recording system layer for tests: defines the g_vorSAL* tables and vorSAL_TraceCat,
// records every trace, counts allocations and frees, can fail the Nth allocation, and writes
// dump files for real so that their bytes can be read back.
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include <vorcal/vorsal.h>

namespace vorcal::test {

struct TraceRecord {
    bool bPlain = false; // slot 0 of the trace table (no category, no level)
    int32_t iCategory = 0;
    int32_t iLevel = 0;
    std::string format;
    std::string text;    // the formatted line
};

struct WriteRecord {
    SALFile hFile = 0;
    std::vector<uint8_t> bytes;
};

class RecordingSal {
public:
    static RecordingSal &Get();

    // Forgets every record, frees nothing, disarms failures.
    void Reset();

    // Memory.
    uint32_t allocCount = 0;
    uint32_t freeCount = 0;
    uint32_t failedAllocs = 0;
    std::vector<uint32_t> allocSizes;       // every request, in order
    std::map<void *, uint32_t> liveBlocks;  // blocks not yet freed
    uint32_t badFrees = 0;                  // frees of unknown pointers
    // The nth allocation from now (1-based) fails; 0 disarms.
    void FailAllocation(uint32_t n);
    // Every allocation fails while set.
    bool failAll = false;

    // Files.
    bool failOpen = false;
    int32_t closeResult = 0;
    std::vector<std::string> openPaths;
    std::vector<uint32_t> openModes;
    std::vector<SALFile> closedFiles;
    std::vector<WriteRecord> writes;

    // Traces.
    std::vector<TraceRecord> traces;
    // Traces whose format string equals fmt.
    std::vector<TraceRecord> TracesWithFormat(const std::string &fmt) const;
    size_t CountFormat(const std::string &fmt) const { return TracesWithFormat(fmt).size(); }

    // A private temporary directory for this process (created on first use).
    std::string TempDir();
    // Reads a whole file.
    static std::vector<uint8_t> ReadFile(const std::string &path);

    // Internal: called by the tables.
    void *Alloc(uint32_t uSize);
    void Free(void *pBlock);

private:
    uint32_t failAt_ = 0;
    uint32_t sinceArm_ = 0;
    std::string tempDir_;
};

// True when text equals expected with its first '#' standing for a decimal source-line number.
bool MatchesWithLine(const std::string &text, const std::string &expected);

// True when exactly one recorded trace has this category, level and format, and its text
// matches expected ('#' for the line number).
bool HasTrace(int32_t iCategory, int32_t iLevel, const std::string &format, const std::string &expected);

// The same for a plain trace.
bool HasPlainTrace(const std::string &format, const std::string &expected);

} // namespace vorcal::test
