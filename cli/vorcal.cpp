// vorcal: command-line companion of the codec adaptation layer.
//
//   vorcal version                  the library's version strings
//   vorcal dump FILE [--extract DIR] the records of a frame dump file
//
// Exit codes: 0 success, 1 a file could not be read or is truncated, 2 usage error.
#include <algorithm>
#include <cerrno>
#include <cinttypes>
#include <cstdio>
#include <cstring>
#include <string>
#include <sys/stat.h>
#include <vector>

#include <vorcal/vorcal.h>

namespace {

constexpr int kExitOk = 0;
constexpr int kExitFailure = 1;
constexpr int kExitUsage = 2;
constexpr size_t kShownBytes = 16;

const char kUsage[] =
    "usage: vorcal <command> [arguments]\n"
    "\n"
    "commands:\n"
    "  version                     print the library's version strings\n"
    "  dump FILE [--extract DIR]   list the records of a frame dump file: index, offset,\n"
    "                              length and first bytes; --extract writes each record\n"
    "                              to DIR/record-NNNNNN.bin\n"
    "\n"
    "options:\n"
    "  -h, --help                  show this help\n";

int UsageError(const char *pMessage)
{
    std::fprintf(stderr, "vorcal: %s\n\n%s", pMessage, kUsage);
    return kExitUsage;
}

int Version()
{
    std::printf("%s\n%s\n", vorCAL_GetVersion(), vorCAL_GetVersionInfo());
    std::printf("version numbers: %d.%d.%d\n", static_cast<int>(vorCAL_GetVersionNum(0)),
                static_cast<int>(vorCAL_GetVersionNum(1)), static_cast<int>(vorCAL_GetVersionNum(2)));
    return kExitOk;
}

bool MakeDirectory(const std::string &dir)
{
    if (mkdir(dir.c_str(), 0777) == 0 || errno == EEXIST) {
        struct stat info {};
        return stat(dir.c_str(), &info) == 0 && S_ISDIR(info.st_mode);
    }
    return false;
}

bool WriteRecord(const std::string &dir, uint64_t uIndex, const std::vector<uint8_t> &bytes)
{
    char name[32];
    std::snprintf(name, sizeof name, "/record-%06" PRIu64 ".bin", uIndex);
    const std::string path = dir + name;
    FILE *pOut = std::fopen(path.c_str(), "wb");
    if (!pOut) {
        std::fprintf(stderr, "vorcal: cannot write %s: %s\n", path.c_str(), std::strerror(errno));
        return false;
    }
    const bool bOk = bytes.empty() || std::fwrite(bytes.data(), 1, bytes.size(), pOut) == bytes.size();
    return std::fclose(pOut) == 0 && bOk;
}

// Lists the records of a dump file: a 4-byte length in host byte order, then the payload.
int Dump(const std::string &path, const std::string &extractDir)
{
    FILE *pFile = std::fopen(path.c_str(), "rb");
    if (!pFile) {
        std::fprintf(stderr, "vorcal: cannot open %s: %s\n", path.c_str(), std::strerror(errno));
        return kExitFailure;
    }
    if (!extractDir.empty() && !MakeDirectory(extractDir)) {
        std::fprintf(stderr, "vorcal: cannot create directory %s\n", extractDir.c_str());
        std::fclose(pFile);
        return kExitFailure;
    }
    std::fseek(pFile, 0, SEEK_END);
    const uint64_t uFileSize = static_cast<uint64_t>(std::ftell(pFile));
    std::fseek(pFile, 0, SEEK_SET);

    std::printf("%-8s %-12s %-10s %s\n", "index", "offset", "length", "first bytes");
    uint64_t uOffset = 0;
    uint64_t uIndex = 0;
    int iStatus = kExitOk;
    std::vector<uint8_t> payload;
    while (uOffset < uFileSize) {
        if (uFileSize - uOffset < 4) {
            std::fprintf(stderr,
                         "vorcal: %s: truncated: record %" PRIu64 " at offset %" PRIu64
                         " has only %" PRIu64 " of the 4 bytes of its length\n",
                         path.c_str(), uIndex, uOffset, uFileSize - uOffset);
            iStatus = kExitFailure;
            break;
        }
        uint32_t uLength = 0;
        if (std::fread(&uLength, 1, 4, pFile) != 4) {
            std::fprintf(stderr, "vorcal: %s: read error at offset %" PRIu64 "\n", path.c_str(), uOffset);
            iStatus = kExitFailure;
            break;
        }
        const uint64_t uLeft = uFileSize - uOffset - 4;
        if (uLength > uLeft) {
            std::fprintf(stderr,
                         "vorcal: %s: truncated: record %" PRIu64 " at offset %" PRIu64 " has length %" PRIu32
                         " but only %" PRIu64 " bytes follow\n",
                         path.c_str(), uIndex, uOffset, uLength, uLeft);
            iStatus = kExitFailure;
            break;
        }
        // Read the whole payload only when it is to be written out.
        const size_t uRead = extractDir.empty() ? std::min<size_t>(uLength, kShownBytes) : uLength;
        payload.resize(uRead);
        if (uRead && std::fread(payload.data(), 1, uRead, pFile) != uRead) {
            std::fprintf(stderr, "vorcal: %s: read error at offset %" PRIu64 "\n", path.c_str(), uOffset + 4);
            iStatus = kExitFailure;
            break;
        }
        std::fseek(pFile, static_cast<long>(uOffset + 4 + uLength), SEEK_SET);

        std::printf("%-8" PRIu64 " %-12" PRIu64 " %-10" PRIu32, uIndex, uOffset, uLength);
        for (size_t i = 0; i < std::min<size_t>(payload.size(), kShownBytes); ++i)
            std::printf(" %02X", payload[i]);
        std::printf("%s\n", uLength > kShownBytes ? " ..." : "");
        if (!extractDir.empty() && !WriteRecord(extractDir, uIndex, payload)) {
            iStatus = kExitFailure;
            break;
        }
        uOffset += 4 + uint64_t{uLength};
        ++uIndex;
    }
    std::fclose(pFile);
    std::printf("%" PRIu64 " record%s, %" PRIu64 " bytes\n", uIndex, uIndex == 1 ? "" : "s", uOffset);
    return iStatus;
}

} // namespace

int main(int argc, char **argv)
{
    std::vector<std::string> args(argv + 1, argv + argc);
    for (const std::string &arg : args) {
        if (arg == "-h" || arg == "--help") {
            std::fputs(kUsage, stdout);
            return kExitOk;
        }
    }
    if (args.empty())
        return UsageError("no command given");
    const std::string command = args[0];
    if (command == "version") {
        if (args.size() != 1)
            return UsageError("version takes no arguments");
        return Version();
    }
    if (command == "dump") {
        std::string file;
        std::string extractDir;
        for (size_t i = 1; i < args.size(); ++i) {
            if (args[i] == "--extract") {
                if (i + 1 >= args.size())
                    return UsageError("--extract needs a directory");
                extractDir = args[++i];
            } else if (!args[i].empty() && args[i][0] == '-') {
                return UsageError(("unknown option " + args[i]).c_str());
            } else if (file.empty()) {
                file = args[i];
            } else {
                return UsageError("dump takes one file");
            }
        }
        if (file.empty())
            return UsageError("dump needs a file");
        return Dump(file, extractDir);
    }
    return UsageError(("unknown command " + command).c_str());
}
