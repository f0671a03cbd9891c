// The verbs of the vorcal tool and what they share: option parsing, opening inputs, writing
// outputs. Each verb takes its own argument vector (argv[0] is the verb) and returns an exit code.
#pragma once

#include <cstdint>
#include <cstdio>
#include <memory>
#include <string>
#include <vector>

#include <vorcal/video_tools.h>

#include "common.hpp"
#include "json.hpp"
#include "media.hpp"

namespace vorcal::cli {

int Main(int argc, char **argv, Console console);

int ProbeVerb(Console &console, int argc, char **argv);
int FramesVerb(Console &console, int argc, char **argv);
int ConvertVerb(Console &console, int argc, char **argv);
int ReplayVerb(Console &console, int argc, char **argv);
int SilenceVerb(Console &console, int argc, char **argv);
int DumpVerb(Console &console, int argc, char **argv);
int AacVerb(Console &console, int argc, char **argv);
int SpsVerb(Console &console, int argc, char **argv);

// The ffprobe-named picture facts of a full SPS parse (size, coded size, SAR, pix_fmt, colour
// description, bit depth), as probe reports them.
void DescribeFullSps(const CALAVCSPS &sps, Value &stream);
void DescribeFullSps(const CALHEVCSPS &sps, Value &stream);
// What vorCALTools_AVC_GetSPSInfo returned and reported.
Value SpsToolRecord(uint32_t uResult, const CALSPSInfo &tool);

// Lists (and with iDir >= 0 extracts into that directory) the records of a dump read front to
// back; the dump verb without its option parsing.
int ListDump(const Console &console, Input &input, const std::string &path, bool bJson, int iDir,
             const std::string &extractDir);

// Prints "vorcal: VERB: TEXT" and the verb's usage line on the error stream; returns 2.
int UsageError(const Console &console, const char *pVerb, const std::string &text);

// Seconds a FIFO may wait for its writer (--wait).
constexpr int kDefaultWaitSeconds = 10;

// Parses a whole decimal number within [uMin, uMax].
bool ParseNumber(const char *pText, uint64_t uMin, uint64_t uMax, uint64_t &uValue);

// Opens and describes an input, reporting any failure; null on failure. bElseDump reads what
// matches no format as a frame dump.
std::unique_ptr<MediaFile> OpenMedia(const Console &console, const std::string &path, int iWaitSeconds,
                                     bool bElseDump = false);

// An output file ("-" for standard output) that tracks write errors.
class Output {
public:
    bool Open(const Console &console, const std::string &path);
    ~Output();
    void Write(const void *p, size_t uSize);
    // A dump record: a 4-byte length in host byte order, then the bytes.
    void WriteRecord(const std::vector<uint8_t> &bytes);
    // Flushes and closes; false (reported) when any write failed.
    bool Close(const Console &console);
    uint64_t Bytes() const { return uBytes_; }

private:
    std::FILE *pFile_ = nullptr;
    std::string path_;
    bool bOwn_ = false;
    bool bError_ = false;
    uint64_t uBytes_ = 0;
};

// The first stream of the wanted kind, or iChosen when it is not negative; -1 when none fits.
int ChooseStream(const MediaFile &file, int iChosen, MediaKind kind);

// The bytes as "01 42 C0 1E ..." (at most uMax of them).
std::string HexBytes(const uint8_t *p, size_t uSize, size_t uMax);

} // namespace vorcal::cli
