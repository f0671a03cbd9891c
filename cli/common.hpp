// What every part of the vorcal tool shares: exit codes, the failure record that readers fill,
// the console the verbs write to, and the names of codecs and formats.
#pragma once

#include <cstdint>
#include <cstdio>
#include <string>
#include <string_view>

namespace vorcal::cli {

constexpr int kExitOk = 0;
constexpr int kExitData = 1;  // truncated, malformed or unreadable input, a frame that failed
constexpr int kExitUsage = 2; // bad command line

// Frames and records above this size are refused before anything is allocated for them.
constexpr uint64_t kMaxFrameBytes = uint64_t{64} << 20;

// What went wrong and where; printed as one line "vorcal: FILE: offset N: TEXT".
struct Failure {
    bool bHasOffset = false;
    uint64_t uOffset = 0;
    std::string text;

    void Set(uint64_t uAt, std::string message)
    {
        bHasOffset = true;
        uOffset = uAt;
        text = std::move(message);
    }
    void SetNoOffset(std::string message)
    {
        bHasOffset = false;
        text = std::move(message);
    }
    bool Failed() const { return !text.empty(); }
};

// Where a verb writes: its results to out, its errors (one line each) to err.
struct Console {
    std::FILE *pOut = stdout;
    std::FILE *pErr = stderr;
    bool bVerbose = false;
};

// "vorcal: NAME: offset N: TEXT" (the offset part only when the failure has one).
void Report(const Console &console, std::string_view name, const Failure &failure);
// "vorcal: NAME: TEXT".
void Report(const Console &console, std::string_view name, std::string_view text);

// printf into a std::string.
std::string Sprintf(const char *pFormat, ...) __attribute__((format(printf, 1, 2)));

enum class MediaKind : uint8_t { Unknown, Video, Audio };

enum class Codec : uint8_t { Unknown, H264, Hevc, Mpeg4Visual, H263, Mpeg1Video, Mpeg2Video, Aac, AmrNb, AmrWb };

// The input's layout, detected from its first bytes.
enum class Format : uint8_t { Mp4, AnnexB, HevcAnnexB, Adts, Amr, AmrWb, Mpeg4Visual, H263, Mpeg12Video, Dump };

// How H.264 and HEVC NAL units are delimited in the frames of a stream.
enum class Framing : uint8_t { None, AnnexB, LengthPrefixed };

// ffprobe's codec_name.
const char *CodecName(Codec codec);
MediaKind KindOf(Codec codec);
// Short description of a format, for the text output.
const char *FormatName(Format format);

} // namespace vorcal::cli
