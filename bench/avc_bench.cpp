// H.264 and HEVC framing tools against memcpy of the same frames in the same run. First a table
// of interleaved rounds on streams made to the statistics of real 1080p x264 output
// (bench/avc_stream.hpp; the HEVC streams have the same unit sizes behind two-byte headers):
// streamed (32 MB of frames, each converted to its own place in an equally large destination, so
// both sides stream through memory) and cache-hot (the frames of about 384 KB converted over and
// over), 1 and 8 slices a picture, 3- and 4-byte start codes.
// Then the Google Benchmark cases on a smaller synthetic stream. Flags: --rounds=N (21),
// --no-table, and Google Benchmark's own.
#include <benchmark/benchmark.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include <vorcal/video_tools.h>

#include "avc_stream.hpp"
#include "rounds.hpp"

namespace {

using vorcal::bench::AvcFrame;
using vorcal::bench::AvcStream;

const AvcStream &Stream()
{
    static const AvcStream s = vorcal::bench::MakeAvcStream();
    return s;
}

std::vector<uint8_t> &Scratch()
{
    static std::vector<uint8_t> d(1 << 20);
    return d;
}

template <typename F>
void PerFrame(benchmark::State &state, const std::vector<uint8_t> &buf, const std::vector<AvcFrame> &frames, F f)
{
    uint8_t *dst = Scratch().data();
    for (auto _ : state) {
        for (const AvcFrame &fr : frames)
            benchmark::DoNotOptimize(f(dst, buf.data() + fr.offset, static_cast<int32_t>(fr.size)));
        benchmark::ClobberMemory();
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * static_cast<int64_t>(buf.size()));
}

void BM_Memcpy_AnnexBFrames(benchmark::State &state)
{
    PerFrame(state, Stream().annexB, Stream().annexBFrames, [](uint8_t *d, const uint8_t *s, int32_t n) {
        memcpy(d, s, static_cast<size_t>(n));
        return n;
    });
}

void BM_AnnexBToLengthPrefixed(benchmark::State &state)
{
    PerFrame(state, Stream().annexB, Stream().annexBFrames, [](uint8_t *d, const uint8_t *s, int32_t n) {
        return vorCALTools_AVC_ConvertFormat(d, n + 100, s, n, 4);
    });
}

void BM_Memcpy_LengthPrefixedFrames(benchmark::State &state)
{
    PerFrame(state, Stream().lengthPrefixed, Stream().lengthFrames, [](uint8_t *d, const uint8_t *s, int32_t n) {
        memcpy(d, s, static_cast<size_t>(n));
        return n;
    });
}

void BM_LengthPrefixedToAnnexB(benchmark::State &state)
{
    PerFrame(state, Stream().lengthPrefixed, Stream().lengthFrames, [](uint8_t *d, const uint8_t *s, int32_t n) {
        return vorCALTools_AVC_ConvertFormat(d, n + 100, s, n, 4);
    });
}

// Every start code of every frame, one vorCALTools_AVC_FindStartCode call per unit.
void BM_FindStartCode_AllUnits(benchmark::State &state)
{
    PerFrame(state, Stream().annexB, Stream().annexBFrames, [](uint8_t *, const uint8_t *s, int32_t n) {
        int32_t pos = 0, found = 0;
        for (;;) {
            const int32_t o = vorCALTools_AVC_FindStartCode(s + pos, n - pos);
            if (o < 0)
                return found;
            ++found;
            pos += o + 3;
        }
    });
}

// The configuration-run searches as the decoder adaptation calls them on every frame.
void BM_AnnexBConfigRun_Frames(benchmark::State &state)
{
    PerFrame(state, Stream().annexB, Stream().annexBFrames, [](uint8_t *, const uint8_t *s, int32_t n) {
        int32_t len = 0;
        return vorCALTools_AVC_ANNEXB_GetConfigStream(s, n, &len) != nullptr ? len : 0;
    });
}

void BM_NalConfigRun_Frames(benchmark::State &state)
{
    PerFrame(state, Stream().lengthPrefixed, Stream().lengthFrames, [](uint8_t *, const uint8_t *s, int32_t n) {
        int32_t len = 0;
        return vorCALTools_AVC_NAL_GetConfigStream(s, n, 4, &len) != nullptr ? len : 0;
    });
}

// The configuration-run scan over whole frames: each key frame's slices turned into filler
// units (type 12), so the scan runs to the end of the frame.
void BM_AnnexBConfigRun_ScanToEnd(benchmark::State &state)
{
    static const std::vector<uint8_t> noSlices = [] {
        std::vector<uint8_t> b = Stream().annexB;
        for (size_t i = 3; i < b.size(); ++i) {
            if (b[i - 1] == 1 && b[i - 2] == 0 && b[i - 3] == 0 && ((b[i] & 0x1F) == 1 || (b[i] & 0x1F) == 5))
                b[i] = 0x0C;
        }
        return b;
    }();
    PerFrame(state, noSlices, Stream().annexBFrames, [](uint8_t *, const uint8_t *s, int32_t n) {
        int32_t len = 0;
        return vorCALTools_AVC_ANNEXB_GetConfigStream(s, n, &len) != nullptr ? len : 0;
    });
}

BENCHMARK(BM_Memcpy_AnnexBFrames);
BENCHMARK(BM_AnnexBToLengthPrefixed);
BENCHMARK(BM_Memcpy_LengthPrefixedFrames);
BENCHMARK(BM_LengthPrefixedToAnnexB);
BENCHMARK(BM_FindStartCode_AllUnits);
BENCHMARK(BM_AnnexBConfigRun_Frames);
BENCHMARK(BM_NalConfigRun_Frames);
BENCHMARK(BM_AnnexBConfigRun_ScanToEnd);

// Zero pairs outside start codes and escaped ones (00 00 03), per MB of the Annex B stream.
void PrintStreamStatistics(const char *pName, const AvcStream &s)
{
    size_t pairs = 0, escaped = 0;
    const std::vector<uint8_t> &b = s.annexB;
    for (size_t i = 0; i + 2 < b.size(); ++i) {
        if (b[i] == 0 && b[i + 1] == 0 && b[i + 2] != 1 && (i + 3 >= b.size() || b[i + 2] != 0 || b[i + 3] != 1)) {
            ++pairs;
            escaped += b[i + 2] == 3;
            ++i;
        }
    }
    const double mb = static_cast<double>(b.size()) / (1 << 20);
    std::printf("%-28s %6.1f MB, %5zu frames of %5.1f KB on average, %6zu units, %5.1f zero pairs/MB (%4.1f escaped)\n",
                pName, mb, s.annexBFrames.size(), static_cast<double>(b.size()) / 1024 / s.annexBFrames.size(), s.units,
                pairs / mb, escaped / mb);
}

// The frames of one pass and where each one's output goes: its own place, 64-byte aligned like
// a block of the default system layer, with the 100 bytes of headroom the decoder adaptation gives.
struct Pass {
    const uint8_t *pSource;
    std::vector<AvcFrame> frames;
    std::vector<size_t> out;
    size_t bytes = 0;

    Pass(const std::vector<uint8_t> &source, const std::vector<AvcFrame> &all, size_t first, size_t limit)
        : pSource(source.data())
    {
        size_t o = 0;
        for (size_t i = first; i < all.size() && bytes + all[i].size <= limit; ++i) {
            frames.push_back(all[i]);
            out.push_back(o);
            o = (o + all[i].size + 100 + 63) / 64 * 64;
            bytes += all[i].size;
        }
    }
    size_t OutBytes() const { return out.empty() ? 0 : out.back() + frames.back().size + 100; }
};

struct Destination {
    std::unique_ptr<uint8_t[]> block;
    uint8_t *p = nullptr;
    explicit Destination(size_t n) : block(new uint8_t[n + 64]), p(block.get() + (64 - reinterpret_cast<uintptr_t>(block.get()) % 64) % 64)
    {
        memset(p, 0, n);
    }
};

// The conversion one case of the table measures: H.264 or HEVC (4-byte lengths out), from a frame
// of n bytes into pDst with the headroom of the decoder adaptation.
using ConvertFn = int32_t (*)(uint8_t *pDst, const uint8_t *pSrc, int32_t n);

int32_t ConvertAvc(uint8_t *pDst, const uint8_t *pSrc, int32_t n)
{
    return vorCALTools_AVC_ConvertFormat(pDst, n + 100, pSrc, n, 4);
}

int32_t ConvertHevcAnnexB(uint8_t *pDst, const uint8_t *pSrc, int32_t n)
{
    return vorCALTools_HEVC_ConvertFormat(pDst, n + 100, pSrc, n, CAL_AVC_FORMAT_ANNEXB, 4);
}

int32_t ConvertHevcLengths(uint8_t *pDst, const uint8_t *pSrc, int32_t n)
{
    return vorCALTools_HEVC_ConvertFormat(pDst, n + 100, pSrc, n, CAL_AVC_FORMAT_NAL, 4);
}

void RatioTable(int rounds)
{
    struct Shape {
        std::string name;
        int slices, code;
        bool hevc;
        AvcStream stream;
    };
    std::vector<std::unique_ptr<Shape>> shapes;
    for (bool hevc : {false, true})
        for (int slices : {1, 8})
            for (int code : {4, 3}) {
                vorcal::bench::StreamShape shape;
                shape.slices = slices;
                shape.codeLength = code;
                shape.hevc = hevc;
                auto p = std::make_unique<Shape>(Shape{std::string(hevc ? "HEVC " : "") + (slices == 1 ? "1 slice" : "8 slices") +
                                                           (code == 4 ? ", 4-byte codes" : ", 3-byte codes"),
                                                       slices, code, hevc, vorcal::bench::MakeCodedStream(shape)});
                PrintStreamStatistics(p->name.c_str(), p->stream);
                shapes.push_back(std::move(p));
            }

    constexpr size_t kStreamed = size_t{64} << 20, kHot = 384 << 10;
    std::vector<std::unique_ptr<Pass>> passes;
    std::vector<std::unique_ptr<Destination>> destinations;
    std::vector<vorcal::bench::RoundCase> cases;
    auto Add = [&](std::string name, const std::vector<uint8_t> &source, const std::vector<AvcFrame> &frames, bool hot,
                   ConvertFn convert) {
        passes.push_back(std::make_unique<Pass>(source, frames, hot ? 1 : 0, hot ? kHot : kStreamed));
        const Pass &pass = *passes.back();
        destinations.push_back(std::make_unique<Destination>(pass.OutBytes()));
        uint8_t *pDst = destinations.back()->p;
        vorcal::bench::RoundCase c;
        c.name = name + (hot ? ", hot" : ", streamed");
        c.bytes = static_cast<double>(pass.bytes);
        c.items = static_cast<double>(pass.frames.size());
        c.passes = hot ? vorcal::bench::PassesFor(c.bytes) : 1;
        c.subject = [&pass, pDst, convert] {
            for (size_t i = 0; i < pass.frames.size(); ++i) {
                const auto n = static_cast<int32_t>(pass.frames[i].size);
                benchmark::DoNotOptimize(convert(pDst + pass.out[i], pass.pSource + pass.frames[i].offset, n));
            }
            benchmark::ClobberMemory();
        };
        c.baseline = [&pass, pDst] {
            for (size_t i = 0; i < pass.frames.size(); ++i)
                memcpy(pDst + pass.out[i], pass.pSource + pass.frames[i].offset, pass.frames[i].size);
            benchmark::ClobberMemory();
        };
        cases.push_back(std::move(c));
    };
    for (bool hot : {false, true}) {
        for (const auto &shape : shapes)
            Add("Annex B -> lengths, " + shape->name, shape->stream.annexB, shape->stream.annexBFrames, hot,
                shape->hevc ? ConvertHevcAnnexB : ConvertAvc);
        for (const auto &shape : shapes) {
            if (shape->code == 4)
                Add(std::string("lengths -> Annex B, ") + (shape->hevc ? "HEVC " : "") + (shape->slices == 1 ? "1 slice" : "8 slices"),
                    shape->stream.lengthPrefixed, shape->stream.lengthFrames, hot, shape->hevc ? ConvertHevcLengths : ConvertAvc);
        }
    }
    vorcal::bench::RunRounds(cases, rounds);
    vorcal::bench::PrintRounds(cases, "vorCALTools_AVC_ConvertFormat / vorCALTools_HEVC_ConvertFormat",
                               "memcpy of the same frames");
    std::printf("\n");
}

} // namespace

int main(int argc, char **argv)
{
    benchmark::Initialize(&argc, argv);
    int rounds = 21;
    bool table = true;
    for (int i = 1; i < argc; ++i) {
        if (strncmp(argv[i], "--rounds=", 9) == 0 && atoi(argv[i] + 9) > 0) {
            rounds = atoi(argv[i] + 9);
        } else if (strcmp(argv[i], "--no-table") == 0) {
            table = false;
        } else {
            std::fprintf(stderr, "avc_bench: unknown argument %s\n", argv[i]);
            return 2;
        }
    }
#if defined(__x86_64__)
    __builtin_cpu_init();
    std::printf("CPU: SSE2 yes, AVX2 %s, AVX-512BW %s\n", __builtin_cpu_supports("avx2") ? "yes" : "no",
                __builtin_cpu_supports("avx512bw") ? "yes" : "no");
#endif
    if (table)
        RatioTable(rounds);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
