// Start and stop band tables of SBR (ISO/IEC 14496-3 4.6.18.3.2.1).
#include <cstdint>

#include <vorcal/aacparse.h>

#include "aacparse/sbr_internal.hpp"
#include "aacparse/syntax.hpp"

// Offsets added to startMin, by bs_start_freq. Rows 0-5: 16, 22.05, 24, 32, 44.1-64 and above
// 64 kHz; row 6 serves time grids of single QMF slots at any rate.
extern "C" constexpr int8_t qmf_channel_offsetOnlyParsing[7][16] = {
    {-8, -7, -6, -5, -4, -3, -2, -1, 0, 1, 2, 3, 4, 5, 6, 7},
    {-5, -4, -3, -2, -1, 0, 1, 2, 3, 4, 5, 6, 7, 9, 11, 13},
    {-5, -3, -2, -1, 0, 1, 2, 3, 4, 5, 6, 7, 9, 11, 13, 16},
    {-6, -4, -2, -1, 0, 1, 2, 3, 4, 5, 6, 7, 9, 11, 13, 16},
    {-4, -2, -1, 0, 1, 2, 3, 4, 5, 6, 7, 9, 11, 13, 16, 20},
    {-2, -1, 0, 1, 2, 3, 4, 5, 6, 7, 9, 11, 13, 16, 20, 24},
    {0, 1, 2, 3, 4, 5, 6, 7, 9, 11, 13, 16, 20, 24, 28, 33},
};

// Row per sampling_frequency_index: round(stopMin (64 / stopMin)^(i / 13)), i = 0..13.
extern "C" constexpr uint8_t stopDk_t_tableOnlyParsing[12][14] = {
    {13, 15, 17, 19, 21, 24, 27, 31, 35, 39, 44, 50, 57, 64}, // 96000
    {15, 17, 19, 21, 23, 26, 29, 33, 37, 41, 46, 51, 57, 64}, // 88200
    {20, 22, 24, 26, 29, 31, 34, 37, 41, 45, 49, 54, 59, 64}, // 64000
    {21, 23, 25, 27, 30, 32, 35, 38, 42, 45, 49, 54, 59, 64}, // 48000
    {23, 25, 27, 29, 32, 34, 37, 40, 43, 47, 51, 55, 59, 64}, // 44100
    {32, 34, 36, 38, 40, 42, 44, 46, 49, 52, 55, 58, 61, 64}, // 32000
    {32, 34, 36, 38, 40, 42, 44, 46, 49, 52, 55, 58, 61, 64}, // 24000
    {35, 37, 38, 40, 42, 44, 46, 48, 51, 53, 56, 58, 61, 64}, // 22050
    {48, 49, 50, 51, 52, 54, 55, 56, 57, 59, 60, 61, 63, 64}, // 16000
    {64, 64, 64, 64, 64, 64, 64, 64, 64, 64, 64, 64, 64, 64}, // 12000
    {70, 70, 69, 69, 68, 68, 67, 67, 66, 66, 65, 65, 64, 64}, // 11025
    {96, 93, 90, 87, 85, 82, 80, 77, 75, 73, 70, 68, 66, 64}, // 8000
};

namespace vorcal::aacparse::sbr {
namespace {

constexpr uint32_t StopMin(uint32_t fs)
{
    return RoundedRatio(fs < 32000 ? 768000 : fs < 64000 ? 1024000 : 1280000, fs);
}
constexpr uint32_t StartMin(uint32_t fs)
{
    return RoundedRatio(fs < 32000 ? 384000 : fs < 64000 ? 512000 : 640000, fs);
}

#if defined(__SIZEOF_INT128__)
// The stop-band rows are checked where the compiler has 128-bit integers (64-bit hosts); the
// 32-bit target compiles the same table.
// round(s (64 / s)^(i / 13)) exactly: the r with (2r - 1)^13 <= 2^13 s^(13-i) 64^i < (2r + 1)^13.
constexpr bool StopRowMatches(uint32_t row)
{
    __extension__ typedef unsigned __int128 U128;
    const uint32_t s = StopMin(aac::kSampleRates[row]);
    for (uint32_t i = 0; i < 14; ++i) {
        U128 v = U128{1} << 13;
        for (uint32_t j = 0; j < 13 - i; ++j)
            v *= s;
        for (uint32_t j = 0; j < i; ++j)
            v *= 64;
        const U128 r = stopDk_t_tableOnlyParsing[row][i];
        U128 lo = 1, hi = 1;
        for (int j = 0; j < 13; ++j) {
            lo *= 2 * r - 1;
            hi *= 2 * r + 1;
        }
        if (!(lo <= v && v < hi))
            return false;
    }
    return true;
}

constexpr bool AllStopRowsMatch()
{
    for (uint32_t row = 0; row < aac::kSampleRates.size(); ++row)
        if (!StopRowMatches(row))
            return false;
    return true;
}
static_assert(AllStopRowsMatch());
#endif
static_assert(StopMin(96000) == 13 && StopMin(44100) == 23 && StopMin(8000) == 96);

} // namespace

int32_t StartBand(const VrSBRState_OnlyParsing &sbr)
{
    const uint32_t fs = sbr.uSampleRate;
    int row = 4;
    if (sbr.uTimeRate == 0)
        row = 6;
    else if (fs == 16000)
        row = 0;
    else if (fs == 22050)
        row = 1;
    else if (fs == 24000)
        row = 2;
    else if (fs == 32000)
        row = 3;
    else if (fs > 64000)
        row = 5;
    return static_cast<uint8_t>(StartMin(fs) +
                                qmf_channel_offsetOnlyParsing[row][sbr.uStartFreq & 15]);
}

int32_t StopBand(const VrSBRState_OnlyParsing &sbr, int32_t k0)
{
    const uint32_t uStop = sbr.uStopFreq & 15;
    if (uStop >= 14) {
        const int32_t k2 = (uStop == 15 ? 3 : 2) * k0;
        return k2 > 64 ? 64 : k2;
    }
    const uint8_t *row = stopDk_t_tableOnlyParsing[get_samplerate_idxOnlyParsing(sbr.uSampleRate)];
    int32_t diff[13];
    for (int i = 0; i < 13; ++i)
        diff[i] = row[i + 1] - row[i];
    SortAscending(diff, 13);
    int32_t k2 = static_cast<int32_t>(StopMin(sbr.uSampleRate));
    for (uint32_t i = 0; i < uStop; ++i)
        k2 += diff[i];
    return k2;
}

bool WithinBandLimit(uint32_t fs, int32_t k0, int32_t k2)
{
    const int32_t limit = fs >= 48000 ? 32 : fs > 32000 ? 45 : 48;
    return k2 - k0 <= limit;
}

} // namespace vorcal::aacparse::sbr
