// The command line: global options, the verb table with each verb's help, and the helpers the
// verbs share.
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <getopt.h>
#include <unistd.h>

#include <vorcal/core.h>

#include "verbs.hpp"

namespace vorcal::cli {

namespace {

struct Verb {
    const char *pName;
    const char *pSummary;
    const char *pUsage; // the full help: usage line first
    int (*pRun)(Console &, int, char **);
};

int VersionVerb(Console &console, int argc, char **);

constexpr Verb kVerbs[] = {
    {"probe", "what the layer's tools find in each stream",
     "usage: vorcal probe [--json] [--wait S] FILE...\n"
     "Per stream: codec, framing and NAL length size, profile and level, picture size (and what\n"
     "vorCALTools_AVC_GetSPSInfo reports beside it; HEVC's from vorCALTools_HEVC_ParseSPS), SAR,\n"
     "bit depth, chroma format; for AAC the object type, core and output rate and channels, SBR\n"
     "and PS and how each is signalled; the AMR frame types; the frame count. Keys follow\n"
     "ffprobe's names where the fact is the same.\n"
     "  --json     one object {\"streams\": [...]}\n"
     "  --wait S   seconds a FIFO may wait for its writer (default 10)\n",
     ProbeVerb},
    {"frames", "one line per frame with the layer's classification",
     "usage: vorcal frames [--json] [--stream N] [--wait S] FILE\n"
     "Per frame: index, offset, size, picture type, NAL unit types (H.264; HEVC by their Table 7-1\n"
     "names), what vorCALTools_IsIDRFrame (key) and vorCALTools_IsBFrame (B) answer (HEVC: key is\n"
     "vorCALTools_HEVC_IsIRAP), and for H.264 and HEVC the answer of the format test\n"
     "(vorCALTools_AVC_CheckFormat, vorCALTools_HEVC_CheckFormat) and whether it names the frame's\n"
     "real framing.\n"
     "  --json       {\"frames\": [...]}\n"
     "  --stream N   the stream to list (default: the first video stream)\n",
     FramesVerb},
    {"convert", "H.264 or HEVC through the video decoder wrapper, written as a codec receives it",
     "usage: vorcal convert [--json] IN OUT --to annexb|length [--nal-length N] [--strip-ps]\n"
     "                      [--trust-config] [--stream N]\n"
     "Runs IN's configuration and frames through vorCAL_VideoDecoderInit and\n"
     "vorCAL_VideoDecoderDecode with a codec that asks for the chosen framing, and writes what it\n"
     "receives: an Annex B stream with the configuration in front (annexb), or a frame dump of\n"
     "length-prefixed frames with the configuration as first record (length). OUT may be -.\n"
     "  --nal-length N   NAL length size of IN's frames (default: from the avcC or hvcC record,\n"
     "                   else 4)\n"
     "  --strip-ps       the codec asks for parameter sets inside frames to be removed\n"
     "  --trust-config   the codec asks for the stream-aware adaptation (property 0x1000)\n"
     "Frames the layer drops are reported on standard error with their index (exit 1).\n",
     ConvertVerb},
    {"replay", "a dump (or any input) through the layer, frame by frame",
     "usage: vorcal replay [--json] INPUT [--codec h264|hevc|mpeg4|h263|aac|amrnb|amrwb]\n"
     "                     [--wants annexb|length] [--strip-ps] [--lock-amr] [-o OUT] [options]\n"
     "Feeds the configuration (a dump's first record) and the frames to a recording codec\n"
     "through the layer and shows what the codec receives: passed, converted, stripped, moved to\n"
     "the VOP, dropped, or substituted by a silent frame.\n"
     "  --codec C            the codec (needed when a dump does not tell)\n"
     "  --wants F            H.264/HEVC framing the codec asks for (properties 81 and 82)\n"
     "  --nal-length N       NAL length size passed to Init (default: avcC or hvcC, else 4)\n"
     "  --strip-ps           property 83 = 0: remove parameter sets inside frames\n"
     "  --trust-config       property 0x1000 = 1: stream-aware H.264/HEVC adaptation\n"
     "  --no-main            property 84 = 1: refuse H.264 Main profile\n"
     "  --vop-start          property 97 = 1: MPEG-4 frames start at their VOP\n"
     "  --no-level3          property 101 = 1: refuse MPEG-4 Visual level 3\n"
     "  --no-unknown-profile property 103 = 1: refuse unrecognised MPEG-4 profiles\n"
     "  --no-h263-plus       property 160 = 1: refuse H.263 with extended PTYPE\n"
     "  --lock-amr           property 113 = 1: lock the AMR frame type of the first frame\n"
     "  --params             property 3 = 1: the layer fills size or audio parameters\n"
     "  -o OUT               write what the codec received as a frame dump\n",
     ReplayVerb},
    {"silence", "a file of the layer's silence frames",
     "usage: vorcal silence --codec aac|he-aac|he-aacv2|amrnb|amrwb|dra [--rate R] [--channels C]\n"
     "                      [--ft N] [--frames N] [--json] -o FILE\n"
     "Writes N of the layer's silence frames as a file players open: ADTS for AAC (R is the\n"
     "output rate; HE-AAC frames carry R/2 in their header), AMR storage format with its magic\n"
     "for AMR, raw frames for DRA. Defaults: 44100 Hz (DRA 48000), 2 channels (AAC 1 with\n"
     "he-aacv2 decoding to 2), frame type 7 (AMR-NB) or 8 (AMR-WB), 50 frames. FILE may be -.\n",
     SilenceVerb},
    {"dump", "the records of a frame dump",
     "usage: vorcal dump [--json] [--extract DIR] [--wait S] FILE|-\n"
     "Lists the records of a dump written by vorCAL_DumpFrames: index, offset, length, whether it\n"
     "is the configuration (the first record) or a frame, the framing it shows and its first NAL\n"
     "unit type, and its first bytes. Reads files, standard input (-), pipes and FIFOs front to\n"
     "back. --extract writes record N to DIR/record-NNNNNN.bin; it never follows a symbolic link\n"
     "and never overwrites a file.\n",
     DumpVerb},
    {"aac", "the whole-frame AAC parser over every frame",
     "usage: vorcal aac [--frames] [--json] [--stream N] [--wait S] FILE\n"
     "Runs vorCALTools_AAC_ParseFrame over every frame of the AAC stream (ADTS frames, or raw\n"
     "frames with the stream's AudioSpecificConfig) and sums up: object type, core and output rate\n"
     "and channels, SBR and PS and how each is signalled, frames, bytes, how many parsed to their\n"
     "exact end, and the count of each result. Exit status 1 when any frame does not.\n"
     "  --frames     one line per frame: offset, bytes, bits used, elements by id, SBR, PS, result\n"
     "  --json       {\"stream\": {...}} (with --frames also \"frames\": [...])\n"
     "  --stream N   the stream to parse (default: the first audio stream)\n",
     AacVerb},
    {"sps", "the full SPS parse and the documented SPS tool side by side",
     "usage: vorcal sps [--json] [--stream N] [--wait S] FILE|HEX\n"
     "Parses the first sequence parameter set with vorCALTools_AVC_ParseSPS and shows every field\n"
     "beside what vorCALTools_AVC_GetSPSInfo reports for it; an HEVC SPS with\n"
     "vorCALTools_HEVC_ParseSPS alone. FILE is any input the tool reads (the SPS of the\n"
     "configuration, else of the first frame that carries one), or a file holding an SPS NAL unit,\n"
     "start-code framed bytes or an avcC or hvcC record; HEX is such bytes as hex digits (spaces\n"
     "and colons allowed), for example\n"
     "  vorcal sps 67:42:c0:0c:d9:02:c4:ec:04:40:00:00:03:00:40:00:00:0c:83:c5:0a:92\n"
     "  --json       one object: ffprobe's names for the picture facts, \"sps\" and \"sps_tool\"\n"
     "  --stream N   the stream to read (default: the first video stream)\n",
     SpsVerb},
    {"version", "the library's version strings", "usage: vorcal version (or vorcal --version)\n", VersionVerb},
};

const char kGeneralUsage[] = "usage: vorcal [-v] VERB [options] [arguments]\n";

void PrintGeneralHelp(std::FILE *pOut)
{
    std::fprintf(pOut, "%s\nverbs:\n", kGeneralUsage);
    for (const Verb &verb : kVerbs)
        std::fprintf(pOut, "  %-9s %s\n", verb.pName, verb.pSummary);
    std::fprintf(pOut, "\n"
                       "options:\n"
                       "  -v, --verbose   show the layer's trace lines on standard error (VORSAL_TRACE=all)\n"
                       "  --version       the library's version strings\n"
                       "  -h, --help      this help; vorcal help VERB shows a verb's options\n"
                       "\n"
                       "Exit status: 0 success, 1 a data error (unreadable, truncated or malformed input, a\n"
                       "refused stream or a dropped frame), 2 a usage error.\n");
}

const Verb *FindVerb(const char *pName)
{
    for (const Verb &verb : kVerbs)
        if (std::strcmp(verb.pName, pName) == 0)
            return &verb;
    return nullptr;
}

int VersionVerb(Console &console, int argc, char **)
{
    if (argc > 1)
        return UsageError(console, "version", "takes no arguments");
    std::fprintf(console.pOut, "%s\n%s\n", vorCAL_GetVersion(), vorCAL_GetVersionInfo());
    std::fprintf(console.pOut, "version numbers: %d.%d.%d\n", static_cast<int>(vorCAL_GetVersionNum(0)),
                 static_cast<int>(vorCAL_GetVersionNum(1)), static_cast<int>(vorCAL_GetVersionNum(2)));
    return kExitOk;
}

} // namespace

int UsageError(const Console &console, const char *pVerb, const std::string &text)
{
    std::fprintf(console.pErr, "vorcal: %s: %s\n", pVerb, text.c_str());
    if (const Verb *pVerbEntry = FindVerb(pVerb)) {
        const char *pEnd = std::strchr(pVerbEntry->pUsage, '\n');
        std::fprintf(console.pErr, "%.*s\n", static_cast<int>(pEnd - pVerbEntry->pUsage), pVerbEntry->pUsage);
    }
    return kExitUsage;
}

bool ParseNumber(const char *pText, uint64_t uMin, uint64_t uMax, uint64_t &uValue)
{
    if (!pText || *pText < '0' || *pText > '9')
        return false;
    errno = 0;
    char *pEnd = nullptr;
    const unsigned long long v = std::strtoull(pText, &pEnd, 10);
    if (errno || *pEnd || v < uMin || v > uMax)
        return false;
    uValue = v;
    return true;
}

std::unique_ptr<MediaFile> OpenMedia(const Console &console, const std::string &path, int iWaitSeconds,
                                     bool bElseDump)
{
    Failure failure;
    std::unique_ptr<Input> input = Input::Open(path, iWaitSeconds, failure);
    std::unique_ptr<MediaFile> file;
    if (input)
        file = MediaFile::Open(std::move(input), failure, bElseDump);
    if (!file)
        Report(console, path, failure);
    return file;
}

bool Output::Open(const Console &console, const std::string &path)
{
    path_ = path;
    if (path == "-") {
        pFile_ = console.pOut;
        return true;
    }
    const int iFd = open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0644);
    pFile_ = iFd >= 0 ? fdopen(iFd, "wb") : nullptr;
    if (!pFile_) {
        Report(console, path, std::strerror(errno));
        if (iFd >= 0)
            close(iFd);
        return false;
    }
    bOwn_ = true;
    return true;
}

Output::~Output()
{
    if (bOwn_ && pFile_)
        std::fclose(pFile_);
}

void Output::Write(const void *p, size_t uSize)
{
    if (uSize && std::fwrite(p, 1, uSize, pFile_) != uSize)
        bError_ = true;
    uBytes_ += uSize;
}

void Output::WriteRecord(const std::vector<uint8_t> &bytes)
{
    const uint32_t uLen = static_cast<uint32_t>(bytes.size());
    Write(&uLen, sizeof uLen);
    Write(bytes.data(), bytes.size());
}

bool Output::Close(const Console &console)
{
    bool bOk = !bError_ && std::fflush(pFile_) == 0;
    if (bOwn_) {
        bOk = std::fclose(pFile_) == 0 && bOk;
        pFile_ = nullptr;
    }
    if (!bOk)
        Report(console, path_, "write error");
    return bOk;
}

int ChooseStream(const MediaFile &file, int iChosen, MediaKind kind)
{
    const auto &streams = file.Streams();
    if (iChosen >= 0)
        return iChosen < static_cast<int>(streams.size()) ? iChosen : -1;
    for (const StreamInfo &info : streams)
        if (KindOf(info.codec) == kind)
            return static_cast<int>(info.uIndex);
    return streams.empty() ? -1 : 0;
}

std::string HexBytes(const uint8_t *p, size_t uSize, size_t uMax)
{
    std::string text;
    for (size_t i = 0; i < uSize && i < uMax; ++i)
        text += Sprintf(i ? " %02X" : "%02X", p[i]);
    if (uSize > uMax)
        text += " ...";
    return text;
}

int Main(int argc, char **argv, Console console)
{
    // Global options come before the verb.
    int i = 1;
    for (; i < argc && argv[i][0] == '-' && argv[i][1] != '\0'; ++i) {
        const std::string arg = argv[i];
        if (arg == "-v" || arg == "--verbose") {
            console.bVerbose = true;
        } else if (arg == "-h" || arg == "--help") {
            PrintGeneralHelp(console.pOut);
            return kExitOk;
        } else if (arg == "--version") {
            return VersionVerb(console, 1, argv);
        } else {
            std::fprintf(console.pErr, "vorcal: unknown option %s\n%s", arg.c_str(), kGeneralUsage);
            return kExitUsage;
        }
    }
    // The default system layer prints the layer's traces by VORSAL_TRACE: all of them with -v,
    // none otherwise, unless the caller chose.
    if (const char *pTrace = std::getenv("VORSAL_TRACE"); !pTrace || !*pTrace)
        setenv("VORSAL_TRACE", console.bVerbose ? "all" : "none", 1);
    if (i >= argc) {
        std::fprintf(console.pErr, "vorcal: no verb given\n");
        PrintGeneralHelp(console.pErr);
        return kExitUsage;
    }
    if (std::strcmp(argv[i], "help") == 0) {
        if (i + 1 >= argc) {
            PrintGeneralHelp(console.pOut);
            return kExitOk;
        }
        const Verb *pVerb = FindVerb(argv[i + 1]);
        if (!pVerb) {
            std::fprintf(console.pErr, "vorcal: help: no verb %s\n", argv[i + 1]);
            return kExitUsage;
        }
        std::fputs(pVerb->pUsage, console.pOut);
        return kExitOk;
    }
    const Verb *pVerb = FindVerb(argv[i]);
    if (!pVerb) {
        std::fprintf(console.pErr, "vorcal: unknown verb %s\n%s", argv[i], kGeneralUsage);
        return kExitUsage;
    }
    for (int k = i + 1; k < argc; ++k)
        if (std::strcmp(argv[k], "--help") == 0 || std::strcmp(argv[k], "-h") == 0) {
            std::fputs(pVerb->pUsage, console.pOut);
            return kExitOk;
        }
    optind = 0; // getopt_long starts afresh for each verb
    opterr = 0; // the verbs report unknown options themselves
    return pVerb->pRun(console, argc - i, argv + i);
}

} // namespace vorcal::cli
