// Frame classification on ~30 KB frames against memcpy of the same bytes: the H.264 intra test
// (start codes and 4-byte lengths, no intra slice so the whole frame is walked) and the VOP search
// (start code at the very end).
#include <benchmark/benchmark.h>

#include <cstring>
#include <random>
#include <vector>

#include <vorcal/video_tools.h>

namespace {

using Bytes = std::vector<uint8_t>;

constexpr size_t kFrameBytes = 30 * 1024;
constexpr size_t kSlices = 6;

// Escaped slice payload (ITU-T H.264 7.4.1): no 00 00 0x with x <= 3 inside.
Bytes Payload(std::mt19937 &rng, size_t n)
{
    Bytes out;
    int zeros = 0;
    while (out.size() < n) {
        const auto b = uint8_t(rng() % 4 == 0 ? 0 : rng());
        if (zeros >= 2 && b <= 3) {
            out.push_back(3);
            zeros = 0;
        }
        out.push_back(b);
        zeros = b == 0 ? zeros + 1 : 0;
    }
    if (out.back() == 0)
        out.back() = 0x80;
    return out;
}

// P slices: nal_unit_type 1, first_mb_in_slice 0, slice_type 5 (bits 1 00110).
struct H264Frames {
    Bytes annexB, lengthPrefixed;
    H264Frames()
    {
        std::mt19937 rng(7);
        for (size_t i = 0; i < kSlices; ++i) {
            Bytes nal = {0x41, 0x9A};
            const Bytes body = Payload(rng, kFrameBytes / kSlices - 6);
            nal.insert(nal.end(), body.begin(), body.end());
            annexB.insert(annexB.end(), {0, 0, 0, 1});
            annexB.insert(annexB.end(), nal.begin(), nal.end());
            const auto n = uint32_t(nal.size());
            lengthPrefixed.insert(lengthPrefixed.end(),
                                  {uint8_t(n >> 24), uint8_t(n >> 16), uint8_t(n >> 8), uint8_t(n)});
            lengthPrefixed.insert(lengthPrefixed.end(), nal.begin(), nal.end());
        }
    }
};

const H264Frames &Frames()
{
    static const H264Frames frames;
    return frames;
}

const Bytes &VopAtEnd()
{
    static const Bytes frame = [] {
        std::mt19937 rng(9);
        Bytes f = Payload(rng, kFrameBytes - 8);
        f.insert(f.end(), {0, 0, 1, 0xB6, 0x50, 0x00, 0x00, 0x00});
        return f;
    }();
    return frame;
}

void Memcpy(benchmark::State &state)
{
    const Bytes &src = Frames().annexB;
    Bytes dst(src.size());
    for (auto _ : state) {
        std::memcpy(dst.data(), src.data(), src.size());
        benchmark::DoNotOptimize(dst.data());
        benchmark::ClobberMemory();
    }
    state.SetBytesProcessed(int64_t(state.iterations()) * int64_t(src.size()));
}

void IntraH264StartCodes(benchmark::State &state)
{
    const Bytes &f = Frames().annexB;
    for (auto _ : state)
        benchmark::DoNotOptimize(vorCALTools_IsIDRFrame(0xC1, f.data(), int32_t(f.size()), 4));
    state.SetBytesProcessed(int64_t(state.iterations()) * int64_t(f.size()));
}

void IntraH264Lengths(benchmark::State &state)
{
    const Bytes &f = Frames().lengthPrefixed;
    for (auto _ : state)
        benchmark::DoNotOptimize(vorCALTools_IsIDRFrame(0xC1, f.data(), int32_t(f.size()), 4));
    state.SetBytesProcessed(int64_t(state.iterations()) * int64_t(f.size()));
}

void FindVop(benchmark::State &state)
{
    const Bytes &f = VopAtEnd();
    int32_t remaining = 0;
    for (auto _ : state)
        benchmark::DoNotOptimize(_PTOOL_FindVOP(f.data(), int32_t(f.size()), &remaining));
    state.SetBytesProcessed(int64_t(state.iterations()) * int64_t(f.size()));
}

} // namespace

BENCHMARK(Memcpy);
BENCHMARK(IntraH264StartCodes);
BENCHMARK(IntraH264Lengths);
BENCHMARK(FindVop);
