// vorCAL_VideoDecoderDecode on a 1080p-like H.264 stream with a codec that does nothing: the
// wrapper's own cost per frame when no conversion is asked, the conversion throughput against
// vorCALTools_AVC_ConvertFormat called directly, and the allocations after the first frame.
// Baseline: memcpy of the same frames in the same run.
#include <benchmark/benchmark.h>

#include <cstdint>
#include <cstring>
#include <vector>

#include <vorcal/core.h>
#include <vorcal/video_tools.h>
#include <vorcal/vorsal.h>
#include <vorcal/wrapper.h>

#include "avc_stream.hpp"

namespace {

// Counts allocations on top of the bench's system layer.
SALMemoryTable *g_pInner = nullptr;
uint64_t g_allocs = 0;
void *CountingAlloc(uint32_t uSize)
{
    ++g_allocs;
    return g_pInner->Alloc(uSize);
}
void CountingFree(void *pBlock) { g_pInner->Free(pBlock); }
SALMemoryTable g_counting = {CountingAlloc, nullptr, CountingFree};

uint32_t g_frameFormat = 0; // answer to property 81; 0 leaves it unanswered

int32_t GetProperty(uint32_t uProperty, uint32_t *puValue)
{
    if (uProperty == CAL_PROP_H264_CONFIG_FORMAT || (uProperty == CAL_PROP_H264_FRAME_FORMAT && g_frameFormat)) {
        *puValue = uProperty == CAL_PROP_H264_CONFIG_FORMAT ? 0 : g_frameFormat;
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

// The frames of the synthetic stream in one framing (0 start codes, 1 4-byte lengths).
const std::vector<Frame> &Frames(int iFraming = 0)
{
    static const vorcal::bench::AvcStream stream = vorcal::bench::MakeAvcStream();
    static const std::vector<Frame> frames[2] = {
        [] {
            std::vector<Frame> v;
            for (const auto &f : stream.annexBFrames)
                v.push_back({stream.annexB.data() + f.offset, static_cast<int32_t>(f.size)});
            return v;
        }(),
        [] {
            std::vector<Frame> v;
            for (const auto &f : stream.lengthFrames)
                v.push_back({stream.lengthPrefixed.data() + f.offset, static_cast<int32_t>(f.size)});
            return v;
        }()};
    return frames[iFraming];
}

int64_t StreamBytes(int iFraming = 0)
{
    int64_t n = 0;
    for (const Frame &frame : Frames(iFraming))
        n += frame.iLen;
    return n;
}

int32_t LongestFrame()
{
    int32_t iMax = 0;
    for (int iFraming = 0; iFraming < 2; ++iFraming)
        for (const Frame &frame : Frames(iFraming))
            iMax = frame.iLen > iMax ? frame.iLen : iMax;
    return iMax;
}

// One instance of the do-nothing codec, Init done with NAL length size 4.
struct Session {
    CALHandle *hCAL = nullptr;
    CALCodec *hCodec = nullptr;

    explicit Session(uint32_t uFrameFormat)
    {
        g_frameFormat = uFrameFormat;
        if (!g_pInner) {
            g_pInner = g_vorSALMemoryTable;
            g_vorSALMemoryTable = &g_counting;
        }
        hCAL = vorCAL_GetHandle(0, 1, 1);
        const CALVideoDecoderFunctions functions = {GetProperty, Init, Deinit, Decode, nullptr, nullptr};
        vorCAL_RegisterCodec(hCAL, 2, 1, CAL_OTI_H264, &functions, sizeof functions);
        hCodec = vorCAL_GetCodec(hCAL, 2, 1, CAL_OTI_H264);
        uint32_t w = 0, h = 0, p = 0;
        vorCAL_VideoDecoderInit(hCodec, CAL_OTI_H264, nullptr, 0, nullptr, 0, 4, &w, &h, &p, 0);
    }
    ~Session()
    {
        vorCAL_VideoDecoderDeinit(hCodec);
        vorCAL_ReleaseCodec(hCodec);
        vorCAL_ReleaseHandle(hCAL);
    }
    void DecodeAll(int iFraming = 0)
    {
        uint32_t uResult = 0;
        for (const Frame &frame : Frames(iFraming))
            vorCAL_VideoDecoderDecode(hCodec, frame.pData, frame.iLen, 0, 0, &uResult);
    }
};

void Finish(benchmark::State &state, int iFraming = 0)
{
    const auto uFrames = static_cast<int64_t>(Frames(iFraming).size());
    state.SetBytesProcessed(state.iterations() * StreamBytes(iFraming));
    state.SetItemsProcessed(state.iterations() * uFrames);
    state.counters["per_frame"] = benchmark::Counter(static_cast<double>(state.iterations() * uFrames),
                                                     benchmark::Counter::kIsRate | benchmark::Counter::kInvert);
}

// Arguments: 0 start-code frames (converted to 4-byte lengths), 1 length-prefixed frames
// (converted to start codes).
void BM_Memcpy(benchmark::State &state)
{
    const int iFraming = static_cast<int>(state.range(0));
    std::vector<uint8_t> buffer(static_cast<size_t>(LongestFrame()));
    for (auto _ : state) {
        for (const Frame &frame : Frames(iFraming)) {
            std::memcpy(buffer.data(), frame.pData, static_cast<size_t>(frame.iLen));
            benchmark::ClobberMemory();
        }
    }
    Finish(state, iFraming);
}

// Frames in the framing the codec wants: two property queries and the format test per frame.
void BM_DecodeNoConversion(benchmark::State &state)
{
    const int iFraming = static_cast<int>(state.range(0));
    Session session(iFraming == 0 ? CAL_AVC_FORMAT_ANNEXB : CAL_AVC_FORMAT_NAL);
    for (auto _ : state)
        session.DecodeAll(iFraming);
    Finish(state, iFraming);
}

void BM_DecodeConvert(benchmark::State &state)
{
    const int iFraming = static_cast<int>(state.range(0));
    Session session(iFraming == 0 ? CAL_AVC_FORMAT_NAL : CAL_AVC_FORMAT_ANNEXB);
    session.DecodeAll(iFraming); // the buffer reaches its final size
    const uint64_t uBefore = g_allocs;
    for (auto _ : state)
        session.DecodeAll(iFraming);
    state.counters["allocs_after_first_pass"] = static_cast<double>(g_allocs - uBefore);
    Finish(state, iFraming);
}

void BM_ConvertDirect(benchmark::State &state)
{
    const int iFraming = static_cast<int>(state.range(0));
    std::vector<uint8_t> buffer(static_cast<size_t>(LongestFrame()) + 100);
    for (auto _ : state) {
        for (const Frame &frame : Frames(iFraming))
            benchmark::DoNotOptimize(
                vorCALTools_AVC_ConvertFormat(buffer.data(), frame.iLen + 100, frame.pData, frame.iLen, 4));
    }
    Finish(state, iFraming);
}

// Allocations of a whole session: only frames longer than every earlier one allocate.
void BM_AllocationsPerSession(benchmark::State &state)
{
    uint64_t uFirst = 0, uRest = 0;
    for (auto _ : state) {
        Session session(CAL_AVC_FORMAT_NAL);
        const std::vector<Frame> &frames = Frames(0);
        uint32_t uResult = 0;
        const uint64_t uStart = g_allocs;
        vorCAL_VideoDecoderDecode(session.hCodec, frames[0].pData, frames[0].iLen, 0, 0, &uResult);
        uFirst = g_allocs - uStart;
        for (size_t i = 1; i < frames.size(); ++i)
            vorCAL_VideoDecoderDecode(session.hCodec, frames[i].pData, frames[i].iLen, 0, 0, &uResult);
        uRest = g_allocs - uStart - uFirst;
    }
    state.counters["allocs_first_frame"] = static_cast<double>(uFirst);
    state.counters["allocs_later_frames"] = static_cast<double>(uRest);
}

BENCHMARK(BM_Memcpy)->Arg(0)->Arg(1);
BENCHMARK(BM_DecodeNoConversion)->Arg(0)->Arg(1);
BENCHMARK(BM_DecodeConvert)->Arg(0)->Arg(1);
BENCHMARK(BM_ConvertDirect)->Arg(0)->Arg(1);
BENCHMARK(BM_AllocationsPerSession)->Iterations(3);

} // namespace
