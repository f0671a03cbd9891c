// Replays a fuzz corpus without libFuzzer: every file named on the command line, or every file
// of every directory named, is passed once to LLVMFuzzerTestOneInput.
#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize);

namespace {

void RunFile(const std::filesystem::path &path, unsigned &uCount)
{
    std::ifstream in(path, std::ios::binary);
    std::vector<uint8_t> bytes((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    LLVMFuzzerTestOneInput(bytes.data(), bytes.size());
    ++uCount;
}

} // namespace

int main(int argc, char **argv)
{
    unsigned uCount = 0;
    // The empty input always runs.
    LLVMFuzzerTestOneInput(nullptr, 0);
    for (int i = 1; i < argc; ++i) {
        const std::filesystem::path path(argv[i]);
        std::error_code error;
        if (std::filesystem::is_directory(path, error)) {
            std::vector<std::filesystem::path> files;
            for (const auto &entry : std::filesystem::directory_iterator(path))
                if (entry.is_regular_file())
                    files.push_back(entry.path());
            std::sort(files.begin(), files.end());
            for (const auto &file : files)
                RunFile(file, uCount);
        } else if (std::filesystem::is_regular_file(path, error)) {
            RunFile(path, uCount);
        }
    }
    std::printf("replayed %u inputs\n", uCount);
    return 0;
}
