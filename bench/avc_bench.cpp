// H.264 framing tools on a synthetic 1080p-like stream (bench/avc_stream.hpp), each against a
// memcpy of the same frames in the same run.
#include <benchmark/benchmark.h>

#include <cstring>
#include <vector>

#include <vorcal/video_tools.h>

#include "avc_stream.hpp"

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

} // namespace
