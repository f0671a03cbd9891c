// The default system layer libvorsal.so, loaded privately (the test's own recording layer serves
// libvorcal): memory, dump files and the VORSAL_TRACE filter of vorSAL_TraceCat.
#include <dlfcn.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <string>

#include <gtest/gtest.h>

#include <vorcal/vorsal.h>

#include "recording_sal.hpp"

namespace {

struct DefaultLayer {
    void *hLib = nullptr;
    SALMemoryTable *pMemory = nullptr;
    SALFileTable *pFiles = nullptr;
    SALTraceTable *pTrace = nullptr;
    void (*TraceCat)(int32_t, int32_t, const char *, ...) = nullptr;

    DefaultLayer()
    {
        hLib = dlopen(VORSAL_LIBRARY, RTLD_NOW | RTLD_LOCAL);
        if (!hLib)
            return;
        pMemory = *static_cast<SALMemoryTable **>(dlsym(hLib, "g_vorSALMemoryTable"));
        pFiles = *static_cast<SALFileTable **>(dlsym(hLib, "g_vorSALFileTable"));
        pTrace = *static_cast<SALTraceTable **>(dlsym(hLib, "g_vorSALTraceTable"));
        TraceCat = reinterpret_cast<void (*)(int32_t, int32_t, const char *, ...)>(dlsym(hLib, "vorSAL_TraceCat"));
    }
};

// Runs fn with standard error sent to a file and returns what was written.
template <typename F>
std::string CaptureStderr(F fn)
{
    const std::string path = vorcal::test::RecordingSal::Get().TempDir() + "/stderr.txt";
    std::fflush(stderr);
    const int saved = dup(2);
    FILE *pFile = std::fopen(path.c_str(), "w");
    dup2(fileno(pFile), 2);
    fn();
    std::fflush(stderr);
    dup2(saved, 2);
    close(saved);
    std::fclose(pFile);
    const auto bytes = vorcal::test::RecordingSal::ReadFile(path);
    return std::string(bytes.begin(), bytes.end());
}

TEST(DefaultSystemLayer, FiltersTracesByCategoryAndLevel)
{
    // The filter is read once, at the first trace.
    setenv("VORSAL_TRACE", "1:2, 16:4,0", 1);
    DefaultLayer layer;
    ASSERT_NE(layer.hLib, nullptr) << dlerror();
    const std::string out = CaptureStderr([&] {
        layer.TraceCat(1, 2, "audio %d\n", 12);
        layer.TraceCat(1, 3, "audio too verbose\n");
        layer.TraceCat(16, 4, "frame line %s", "no newline");
        layer.TraceCat(11, 0, "errors are off here\n");
        layer.pTrace->Trace("plain %u\n", 5u);
    });
    EXPECT_NE(out.find("audio 12\n"), std::string::npos);
    EXPECT_EQ(out.find("too verbose"), std::string::npos);
    EXPECT_NE(out.find("frame line no newline\n"), std::string::npos);
    EXPECT_EQ(out.find("errors are off"), std::string::npos);
    EXPECT_NE(out.find("plain 5\n"), std::string::npos);
}

TEST(DefaultSystemLayer, MemoryAndDumpFiles)
{
    DefaultLayer layer;
    ASSERT_NE(layer.hLib, nullptr) << dlerror();
    void *p = layer.pMemory->Alloc(0); // a zero-byte request still gives a block
    EXPECT_NE(p, nullptr);
    layer.pMemory->Free(p);
    for (uint32_t uSize : {1u, 17u, 100u, 30100u, 1u << 20}) { // every block starts a cache line
        void *pBlock = layer.pMemory->Alloc(uSize);
        EXPECT_EQ(reinterpret_cast<uintptr_t>(pBlock) % 64, 0u) << uSize;
        layer.pMemory->Free(pBlock);
    }

    const std::string path = vorcal::test::RecordingSal::Get().TempDir() + "/default.dump";
    EXPECT_EQ(layer.pFiles->Open(path.c_str(), 1), 0u); // only mode 6 is known
    const SALFile hFile = layer.pFiles->Open(path.c_str(), SAL_FILE_MODE_WRITE);
    ASSERT_NE(hFile, 0u);
    EXPECT_EQ(layer.pFiles->Write(hFile, "abc", 3), 3);
    EXPECT_EQ(layer.pFiles->Close(hFile), 0);
    // Mode 6 truncates an existing file.
    const SALFile hAgain = layer.pFiles->Open(path.c_str(), SAL_FILE_MODE_WRITE);
    layer.pFiles->Write(hAgain, "z", 1);
    layer.pFiles->Close(hAgain);
    EXPECT_EQ(vorcal::test::RecordingSal::ReadFile(path), std::vector<uint8_t>{'z'});
}

} // namespace
