// vorCAL_VideoDecoderDecode on 1080p-like H.264 streams (bench/avc_stream.hpp) with a codec
// that does nothing. First a table of interleaved rounds, streamed (32 MB of frames) and
// cache-hot (about 384 KB of frames, over and over):
//  - the wrapper's own cost when no conversion is asked (property 81 unanswered) and when the
//    frames already have the framing the codec asks for, against calling the codec's Decode
//    directly;
//  - the wrapper converting, against vorCALTools_AVC_ConvertFormat called directly into a
//    buffer of the same size and alignment.
// Then Google Benchmark cases: the same on a smaller stream, and the allocations of a session.
// The system layer's memory is 64-byte aligned, as libvorsal.so's. Flags: --rounds=N (21),
// --no-table, and Google Benchmark's own.
#include <benchmark/benchmark.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include <vorcal/core.h>
#include <vorcal/video_tools.h>
#include <vorcal/vorsal.h>
#include <vorcal/wrapper.h>

#include "avc_stream.hpp"
#include "rounds.hpp"

namespace {

// 64-byte aligned blocks, counted, on top of the bench's system layer.
uint64_t g_allocs = 0;
void *CountingAlloc(uint32_t uSize)
{
    ++g_allocs;
    void *p = nullptr;
    return posix_memalign(&p, 64, uSize ? uSize : 1) == 0 ? p : nullptr;
}
void CountingFree(void *pBlock) { free(pBlock); }
SALMemoryTable g_counting = {CountingAlloc, nullptr, CountingFree};

// The codec: answers property 82 (configuration framing) with 0, so that Init takes the NAL
// length size, and property 81 (frame framing) with kFrameFormat, or not at all when it is 0.
template <uint32_t kFrameFormat>
int32_t GetProperty(uint32_t uProperty, uint32_t *puValue)
{
    if (uProperty == CAL_PROP_H264_CONFIG_FORMAT) {
        *puValue = 0;
        return 0;
    }
    if (uProperty == CAL_PROP_H264_FRAME_FORMAT && kFrameFormat != 0) {
        *puValue = kFrameFormat;
        return 0;
    }
    return -1;
}
int32_t Init(uint32_t, const uint8_t *, int32_t, const uint8_t *, int32_t, uint32_t, uint32_t *, uint32_t *,
             uint32_t *, CALParam *)
{
    return 0;
}
int32_t Deinit(CALParam) { return 0; }
int32_t Decode(const uint8_t *pData, int32_t, CALParam, CALParam, uint32_t *, CALParam)
{
    benchmark::DoNotOptimize(pData);
    return 0;
}

struct Frame {
    const uint8_t *pData;
    int32_t iLen;
};

std::vector<Frame> FramesOf(const std::vector<uint8_t> &buffer, const std::vector<vorcal::bench::AvcFrame> &all,
                            size_t first = 0, size_t limit = SIZE_MAX)
{
    std::vector<Frame> frames;
    size_t bytes = 0;
    for (size_t i = first; i < all.size() && bytes + all[i].size <= limit; ++i) {
        frames.push_back({buffer.data() + all[i].offset, static_cast<int32_t>(all[i].size)});
        bytes += all[i].size;
    }
    return frames;
}

double BytesOf(const std::vector<Frame> &frames)
{
    double n = 0;
    for (const Frame &f : frames)
        n += f.iLen;
    return n;
}

// One instance of the do-nothing codec with the frame framing it asks for, Init done with NAL
// length size 4.
class Session {
public:
    explicit Session(uint32_t uFrameFormat)
    {
        if (g_vorSALMemoryTable != &g_counting)
            g_vorSALMemoryTable = &g_counting;
        hCAL_ = vorCAL_GetHandle(0, 1, 1);
        static const CALGetPropertyFunc kAnswers[] = {GetProperty<0>, GetProperty<1>, GetProperty<2>};
        const CALVideoDecoderFunctions functions = {kAnswers[uFrameFormat], Init, Deinit, ::Decode, nullptr, nullptr};
        vorCAL_RegisterCodec(hCAL_, 2, 1, CAL_OTI_H264, &functions, sizeof functions);
        hCodec_ = vorCAL_GetCodec(hCAL_, 2, 1, CAL_OTI_H264);
        uint32_t w = 0, h = 0, p = 0;
        vorCAL_VideoDecoderInit(hCodec_, CAL_OTI_H264, nullptr, 0, nullptr, 0, 4, &w, &h, &p, 0);
    }
    ~Session()
    {
        vorCAL_VideoDecoderDeinit(hCodec_);
        vorCAL_ReleaseCodec(hCodec_);
        vorCAL_ReleaseHandle(hCAL_);
    }
    Session(const Session &) = delete;
    Session &operator=(const Session &) = delete;

    void Decode(const Frame &frame)
    {
        uint32_t uResult = 0;
        vorCAL_VideoDecoderDecode(hCodec_, frame.pData, frame.iLen, 0, 0, &uResult);
    }
    CALCodec *Codec() const { return hCodec_; }

private:
    CALHandle *hCAL_ = nullptr;
    CALCodec *hCodec_ = nullptr;
};

// A 64-byte aligned buffer for the direct tool calls, as large as the wrapper's.
struct Aligned {
    void *p = nullptr;
    explicit Aligned(size_t n) { (void)posix_memalign(&p, 64, n); }
    ~Aligned() { free(p); }
    Aligned(const Aligned &) = delete;
    Aligned &operator=(const Aligned &) = delete;
    uint8_t *data() const { return static_cast<uint8_t *>(p); }
};

void RatioTable(int rounds)
{
    vorcal::bench::StreamShape shape;
    const vorcal::bench::AvcStream one = vorcal::bench::MakeCodedStream(shape);
    shape.slices = 8;
    const vorcal::bench::AvcStream eight = vorcal::bench::MakeCodedStream(shape);

    std::vector<std::unique_ptr<std::vector<Frame>>> frameSets;
    std::vector<std::unique_ptr<Session>> sessions;
    std::vector<std::unique_ptr<Aligned>> buffers;
    std::vector<vorcal::bench::RoundCase> cases;
    constexpr size_t kHot = 384 << 10;
    auto Frames = [&](const std::vector<uint8_t> &buffer, const std::vector<vorcal::bench::AvcFrame> &all, bool hot) {
        frameSets.push_back(std::make_unique<std::vector<Frame>>(FramesOf(buffer, all, hot ? 1 : 0, hot ? kHot : SIZE_MAX)));
        return frameSets.back().get();
    };
    auto Case = [&](std::string name, const std::vector<Frame> *pFrames, bool hot) {
        vorcal::bench::RoundCase c;
        c.name = name + (hot ? ", hot" : ", streamed");
        c.bytes = BytesOf(*pFrames);
        c.items = static_cast<double>(pFrames->size());
        c.passes = hot ? vorcal::bench::PassesFor(c.bytes) : 1;
        return c;
    };

    for (bool hot : {false, true}) {
        // The wrapper alone: no conversion asked, or the frames already as the codec wants them.
        for (uint32_t uFormat : {0u, 2u}) {
            const std::vector<Frame> *pFrames = Frames(one.annexB, one.annexBFrames, hot);
            sessions.push_back(std::make_unique<Session>(uFormat));
            Session *pSession = sessions.back().get();
            vorcal::bench::RoundCase c =
                Case(uFormat == 0 ? "Decode, no conversion asked" : "Decode, framing already wanted", pFrames, hot);
            c.subject = [pFrames, pSession] {
                for (const Frame &f : *pFrames)
                    pSession->Decode(f);
            };
            c.baseline = [pFrames] {
                uint32_t uResult = 0;
                CALVideoDecoderDecodeFunc volatile pDecode = Decode;
                for (const Frame &f : *pFrames)
                    pDecode(f.pData, f.iLen, 0, 0, &uResult, 0);
            };
            cases.push_back(std::move(c));
        }
        // The wrapper converting, against the tool called directly.
        for (const vorcal::bench::AvcStream *pStream : {&one, &eight}) {
            for (bool bToLengths : {true, false}) {
                const std::vector<Frame> *pFrames =
                    bToLengths ? Frames(pStream->annexB, pStream->annexBFrames, hot)
                               : Frames(pStream->lengthPrefixed, pStream->lengthFrames, hot);
                sessions.push_back(std::make_unique<Session>(bToLengths ? CAL_AVC_FORMAT_NAL : CAL_AVC_FORMAT_ANNEXB));
                Session *pSession = sessions.back().get();
                int32_t iLongest = 0;
                for (const Frame &f : *pFrames)
                    iLongest = f.iLen > iLongest ? f.iLen : iLongest;
                buffers.push_back(std::make_unique<Aligned>(static_cast<size_t>(iLongest) + 100));
                uint8_t *pDst = buffers.back()->data();
                vorcal::bench::RoundCase c =
                    Case(std::string(bToLengths ? "Decode Annex B -> lengths, " : "Decode lengths -> Annex B, ") +
                             (pStream == &one ? "1 slice" : "8 slices"),
                         pFrames, hot);
                c.subject = [pFrames, pSession] {
                    for (const Frame &f : *pFrames)
                        pSession->Decode(f);
                };
                c.baseline = [pFrames, pDst] {
                    for (const Frame &f : *pFrames)
                        benchmark::DoNotOptimize(vorCALTools_AVC_ConvertFormat(pDst, f.iLen + 100, f.pData, f.iLen, 4));
                };
                cases.push_back(std::move(c));
            }
        }
    }
    vorcal::bench::RunRounds(cases, rounds);
    vorcal::bench::PrintRounds(cases, "vorCAL_VideoDecoderDecode",
                               "the codec's Decode called directly (first two), vorCALTools_AVC_ConvertFormat "
                               "called directly (the others)");
    std::printf("\n");
}

// Google Benchmark cases on a smaller stream.
const std::vector<Frame> &SmallFrames(int iFraming)
{
    static const vorcal::bench::AvcStream stream = vorcal::bench::MakeAvcStream();
    static const std::vector<Frame> frames[2] = {FramesOf(stream.annexB, stream.annexBFrames),
                                                 FramesOf(stream.lengthPrefixed, stream.lengthFrames)};
    return frames[iFraming];
}

void Finish(benchmark::State &state, const std::vector<Frame> &frames)
{
    const auto uFrames = static_cast<int64_t>(frames.size());
    state.SetBytesProcessed(state.iterations() * static_cast<int64_t>(BytesOf(frames)));
    state.counters["per_frame"] = benchmark::Counter(static_cast<double>(state.iterations() * uFrames),
                                                     benchmark::Counter::kIsRate | benchmark::Counter::kInvert);
}

// Argument: 0 no conversion asked, 1 frames in the framing the codec asks for, 2 converted.
void BM_Decode(benchmark::State &state)
{
    const std::vector<Frame> &frames = SmallFrames(0);
    Session session(state.range(0) == 0 ? 0 : (state.range(0) == 1 ? CAL_AVC_FORMAT_ANNEXB : CAL_AVC_FORMAT_NAL));
    for (auto _ : state) {
        for (const Frame &f : frames)
            session.Decode(f);
    }
    Finish(state, frames);
}

// Allocations of a whole session: only frames longer than every earlier one allocate.
void BM_AllocationsPerSession(benchmark::State &state)
{
    uint64_t uFirst = 0, uRest = 0;
    const std::vector<Frame> &frames = SmallFrames(0);
    for (auto _ : state) {
        Session session(CAL_AVC_FORMAT_NAL);
        const uint64_t uStart = g_allocs;
        session.Decode(frames[0]);
        uFirst = g_allocs - uStart;
        for (size_t i = 1; i < frames.size(); ++i)
            session.Decode(frames[i]);
        uRest = g_allocs - uStart - uFirst;
    }
    state.counters["allocs_first_frame"] = static_cast<double>(uFirst);
    state.counters["allocs_later_frames"] = static_cast<double>(uRest);
}

BENCHMARK(BM_Decode)->Arg(0)->Arg(1)->Arg(2);
BENCHMARK(BM_AllocationsPerSession)->Iterations(3);

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
            std::fprintf(stderr, "video_adapt_bench: unknown argument %s\n", argv[i]);
            return 2;
        }
    }
    if (table)
        RatioTable(rounds);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
