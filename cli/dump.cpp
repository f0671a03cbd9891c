// vorcal dump: the records of a frame dump, read front to back from a file, standard input, a
// pipe or a FIFO, annotated, and optionally extracted one file per record.
#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <getopt.h>
#include <sys/stat.h>
#include <unistd.h>

#include <vorcal/audio_tools.h>
#include <vorcal/video_tools.h>

#include "verbs.hpp"

namespace vorcal::cli {

namespace {

enum DumpOption { kOptJson = 1000, kOptExtract, kOptWait };

constexpr size_t kShownBytes = 16;
constexpr size_t kLookBytes = 64; // what the annotation looks at

// What a record looks like from its first bytes.
struct Annotation {
    const char *pFraming = "other";
    int iNalType = -1;
};

Annotation Annotate(const uint8_t *p, size_t uHave, uint32_t uLength, bool bFirst)
{
    Annotation a;
    const int32_t iFormat = vorCALTools_AVC_CheckFormat(p, static_cast<int32_t>(uHave));
    if (iFormat == CAL_AVC_FORMAT_ANNEXB) {
        a.pFraming = "annexb";
        const size_t uHeader = p[2] == 1 ? 3 : 4;
        if (uHeader < uHave)
            a.iNalType = p[uHeader] & 0x1F;
    } else if (bFirst && uHave >= 7 && p[0] == 1 && (p[5] & 0xE0) == 0xE0) {
        a.pFraming = "avcC";
    } else if (uHave >= 7 && p[0] == 0xFF && (p[1] & 0xF6) == 0xF0 && _GetAACFrameLength(p) == uLength) {
        a.pFraming = "adts";
    } else if (uHave >= 5) {
        const uint32_t uFirst = vorCALTools_ReadBigEndianValue32(p);
        if (uFirst > 0 && uFirst <= uLength - 4 && !(p[4] & 0x80)) {
            a.pFraming = "length";
            a.iNalType = p[4] & 0x1F;
        }
    }
    return a;
}

// The extraction directory: created when missing, opened without following a symbolic link.
int OpenDirectory(const Console &console, const std::string &dir)
{
    struct stat info {};
    if (lstat(dir.c_str(), &info) == 0 && S_ISLNK(info.st_mode)) {
        Report(console, dir, "is a symbolic link: not followed");
        return -1;
    }
    if (mkdir(dir.c_str(), 0777) != 0 && errno != EEXIST) {
        Report(console, dir, Sprintf("cannot create the directory: %s", std::strerror(errno)));
        return -1;
    }
    // O_NOFOLLOW also refuses a link put in place after the check above.
    const int iFd = open(dir.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
    if (iFd < 0)
        Report(console, dir, Sprintf("cannot use the directory: %s", std::strerror(errno)));
    return iFd;
}

} // namespace

int DumpVerb(Console &console, int argc, char **argv)
{
    static const option kOptions[] = {{"json", no_argument, nullptr, kOptJson},
                                      {"extract", required_argument, nullptr, kOptExtract},
                                      {"wait", required_argument, nullptr, kOptWait},
                                      {nullptr, 0, nullptr, 0}};
    bool bJson = false;
    std::string extractDir;
    uint64_t uWait = kDefaultWaitSeconds;
    for (int c; (c = getopt_long(argc, argv, "", kOptions, nullptr)) != -1;) {
        if (c == kOptJson)
            bJson = true;
        else if (c == kOptExtract && *optarg)
            extractDir = optarg;
        else if (c == kOptWait && ParseNumber(optarg, 0, 86400, uWait))
            continue;
        else
            return UsageError(console, "dump", Sprintf("bad option %s", argv[optind - 1]));
    }
    if (argc - optind != 1)
        return UsageError(console, "dump", "needs one file (or - for standard input)");
    const std::string path = argv[optind];
    Failure failure;
    std::unique_ptr<Input> input = Input::Open(path, static_cast<int>(uWait), failure);
    if (!input) {
        Report(console, path, failure);
        return kExitData;
    }
    int iDir = -1;
    if (!extractDir.empty() && (iDir = OpenDirectory(console, extractDir)) < 0)
        return kExitData;
    const int iStatus = ListDump(console, *input, path, bJson, iDir, extractDir);
    if (iDir >= 0)
        close(iDir);
    return iStatus;
}

int ListDump(const Console &console, Input &input, const std::string &path, bool bJson, int iDir,
             const std::string &extractDir)
{
    Failure failure;
    if (!bJson)
        std::fprintf(console.pOut, "%-8s %-12s %-10s %-13s %-7s %-4s %s\n", "index", "offset", "length", "kind",
                     "framing", "nal", "first bytes");
    Value records = Value::Array();
    uint64_t uIndex = 0;
    int iStatus = kExitOk;
    std::vector<uint8_t> chunk(65536);
    for (;;) {
        const uint64_t uOffset = input.Position();
        uint8_t length[4];
        size_t uHave = 0, uGot = 0;
        bool bOk = true;
        while (uHave < 4 && (bOk = input.Read(length + uHave, 4 - uHave, uGot, failure)) && uGot)
            uHave += uGot;
        if (!bOk)
            break;
        if (uHave == 0)
            break;
        if (uHave < 4) {
            failure.Set(uOffset, Sprintf("truncated: record %llu has only %zu of the 4 bytes of its length",
                                        static_cast<unsigned long long>(uIndex), uHave));
            break;
        }
        uint32_t uLength = 0;
        std::memcpy(&uLength, length, 4);
        if (input.Seekable() && uLength > input.Size() - input.Position()) {
            failure.Set(uOffset, Sprintf("truncated: record %llu has length %u but only %llu bytes follow",
                                        static_cast<unsigned long long>(uIndex), uLength,
                                        static_cast<unsigned long long>(input.Size() - input.Position())));
            break;
        }
        // The first bytes for the listing, then the rest streamed to the extracted file or skipped.
        const size_t uLook = std::min<size_t>(uLength, kLookBytes);
        uint8_t head[kLookBytes];
        size_t uHead = 0;
        while (uHead < uLook && (bOk = input.Read(head + uHead, uLook - uHead, uGot, failure)) && uGot)
            uHead += uGot;
        int iOut = -1;
        if (bOk && iDir >= 0) {
            const std::string name = Sprintf("record-%06llu.bin", static_cast<unsigned long long>(uIndex));
            iOut = openat(iDir, name.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0644);
            if (iOut < 0) {
                Report(console, extractDir + "/" + name,
                       errno == EEXIST ? std::string("exists: not overwritten")
                                       : Sprintf("cannot create: %s", std::strerror(errno)));
                iStatus = kExitData;
                break;
            }
        }
        uint64_t uDone = uHead;
        bool bWriteOk = iOut < 0 || write(iOut, head, uHead) == static_cast<ssize_t>(uHead);
        while (bOk && uDone < uLength && uHead == uLook) {
            if (iOut < 0) {
                uint64_t uSkipped = 0;
                bOk = input.Skip(uLength - uDone, uSkipped, failure);
                uDone += uSkipped;
                break;
            }
            bOk = input.Read(chunk.data(), static_cast<size_t>(std::min<uint64_t>(chunk.size(), uLength - uDone)), uGot,
                              failure);
            if (!bOk || uGot == 0)
                break;
            bWriteOk = bWriteOk && write(iOut, chunk.data(), uGot) == static_cast<ssize_t>(uGot);
            uDone += uGot;
        }
        if (iOut >= 0)
            bWriteOk = close(iOut) == 0 && bWriteOk;
        if (!bOk)
            break;
        if (uDone < uLength) {
            failure.Set(uOffset, Sprintf("truncated: record %llu has length %u but only %llu bytes follow",
                                        static_cast<unsigned long long>(uIndex), uLength,
                                        static_cast<unsigned long long>(uDone)));
            break;
        }
        if (!bWriteOk) {
            Report(console, extractDir, Sprintf("write error on record %llu", static_cast<unsigned long long>(uIndex)));
            iStatus = kExitData;
            break;
        }
        const Annotation a = Annotate(head, uHead, uLength, uIndex == 0);
        const char *pKind = uIndex == 0 ? "configuration" : "frame";
        const std::string shown =
            HexBytes(head, std::min<size_t>(uHead, kShownBytes), kShownBytes) + (uLength > kShownBytes ? " ..." : "");
        if (bJson) {
            Value record = Value::Object();
            record.Add("index", uIndex).Add("offset", uOffset).Add("size", uLength).Add("kind", pKind);
            record.Add("framing", a.pFraming);
            if (a.iNalType >= 0)
                record.Add("nal_unit_type", a.iNalType);
            record.Add("first_bytes", HexBytes(head, std::min<size_t>(uHead, kShownBytes), kShownBytes));
            records.Push(std::move(record));
        } else {
            std::fprintf(console.pOut, "%-8llu %-12llu %-10u %-13s %-7s %-4s %s\n", static_cast<unsigned long long>(uIndex),
                         static_cast<unsigned long long>(uOffset), uLength, pKind, a.pFraming,
                         a.iNalType >= 0 ? std::to_string(a.iNalType).c_str() : "-", shown.c_str());
        }
        ++uIndex;
    }
    const uint64_t uBytes = input.Position();
    if (bJson) {
        JsonWriter writer(console.pOut);
        Value root = Value::Object();
        root.Add("records", std::move(records)).Add("nb_records", uIndex).Add("bytes", uBytes);
        root.Write(writer);
    } else {
        std::fprintf(console.pOut, "%llu record%s, %llu bytes\n", static_cast<unsigned long long>(uIndex),
                     uIndex == 1 ? "" : "s", static_cast<unsigned long long>(uBytes));
    }
    if (failure.Failed()) {
        Report(console, path, failure);
        iStatus = kExitData;
    }
    return iStatus;
}

} // namespace vorcal::cli
