// The whole-frame AAC parser over real fixture frames, against a memcpy of the same frames in
// the same run: a 128 kbps AAC-LC stereo stream (every coding tool on) and the HE-AAC clip.
// Cache-hot (one stream, parsed again and again) and streamed (the frames repeated over 8 MB).
// per_frame is the time per frame; bytes_per_second counts frame bytes.
#include <benchmark/benchmark.h>

#include <cstring>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include <vorcal/aacparse.h>

namespace {

struct Stream {
    std::vector<uint8_t> bytes;
    std::vector<std::pair<size_t, size_t>> frames; // offset, size
};

Stream Load(const char *name, size_t repeatTo = 0)
{
    std::ifstream in(std::string(VORCAL_TEST_DATA_DIR "/") + name, std::ios::binary);
    const std::vector<uint8_t> once((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    Stream s;
    do
        s.bytes.insert(s.bytes.end(), once.begin(), once.end());
    while (s.bytes.size() < repeatTo);
    for (size_t pos = 0, len = 0; pos + 7 <= s.bytes.size(); pos += len) {
        len = ((s.bytes[pos + 3] & 3u) << 11) | (s.bytes[pos + 4] << 3) | (s.bytes[pos + 5] >> 5);
        s.frames.emplace_back(pos, len);
    }
    return s;
}

const Stream &Stereo() { static const Stream s = Load("aac/tools_44100_2ch.aac"); return s; }
const Stream &HeAac() { static const Stream s = Load("heaac/bear_v1_implicit.aac"); return s; }
const Stream &StereoStreamed() { static const Stream s = Load("aac/tools_44100_2ch.aac", 8 << 20); return s; }

template <typename F>
void PerFrame(benchmark::State &state, const Stream &s, F f)
{
    size_t bytes = 0;
    for (const auto &fr : s.frames)
        bytes += fr.second;
    for (auto _ : state) {
        for (const auto &[offset, size] : s.frames)
            benchmark::DoNotOptimize(f(s.bytes.data() + offset, static_cast<int32_t>(size)));
        benchmark::ClobberMemory();
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * bytes));
    state.counters["per_frame"] = benchmark::Counter(static_cast<double>(s.frames.size()),
                                                     benchmark::Counter::kIsIterationInvariantRate | benchmark::Counter::kInvert);
}

void Memcpy(benchmark::State &state, const Stream &s)
{
    static uint8_t scratch[8192];
    PerFrame(state, s, [](const uint8_t *p, int32_t n) {
        std::memcpy(scratch, p, static_cast<size_t>(n));
        return n;
    });
}

void Parse(benchmark::State &state, const Stream &s)
{
    CALAACParser *parser = vorCALTools_AAC_CreateParser(nullptr, 0);
    CALAACFrameInfo info;
    PerFrame(state, s, [&](const uint8_t *p, int32_t n) {
        const int32_t r = vorCALTools_AAC_ParseFrame(parser, p, n, &info);
        if (r != 0)
            state.SkipWithError("frame not parsed to its end");
        return r;
    });
    vorCALTools_AAC_DestroyParser(parser);
}

void BM_Memcpy_Stereo128k(benchmark::State &state) { Memcpy(state, Stereo()); }
void BM_ParseFrame_Stereo128k(benchmark::State &state) { Parse(state, Stereo()); }
void BM_Memcpy_HeAac(benchmark::State &state) { Memcpy(state, HeAac()); }
void BM_ParseFrame_HeAac(benchmark::State &state) { Parse(state, HeAac()); }
void BM_Memcpy_Stereo128k_Streamed(benchmark::State &state) { Memcpy(state, StereoStreamed()); }
void BM_ParseFrame_Stereo128k_Streamed(benchmark::State &state) { Parse(state, StereoStreamed()); }

BENCHMARK(BM_Memcpy_Stereo128k);
BENCHMARK(BM_ParseFrame_Stereo128k);
BENCHMARK(BM_Memcpy_HeAac);
BENCHMARK(BM_ParseFrame_HeAac);
BENCHMARK(BM_Memcpy_Stereo128k_Streamed);
BENCHMARK(BM_ParseFrame_Stereo128k_Streamed);

} // namespace
