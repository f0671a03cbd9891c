// Rate tables of the parse-only decoder: sampling_frequency_index rates and the lookup of a
// rate's index, the per-rate band layout rows, the short band widths and the noise scale of
// perceptual noise substitution.
#include <cstddef>
#include <iterator>

#include "aacparse/decoder.hpp"
#include "aacparse/syntax.hpp"

namespace {

using vorcal::aac::kSampleRates;

// The row of sampling_frequency_index uIndex with its long and short band tables.
template <std::size_t L, std::size_t S>
constexpr VrSampRateInfo_OnlyParsing Row(uint32_t uIndex, const uint16_t (&long_)[L],
                                         const uint16_t (&short_)[S])
{
    return {kSampleRates[uIndex], static_cast<uint32_t>(L), long_, static_cast<uint32_t>(S),
            short_};
}

// floor(sqrt(x)).
constexpr uint32_t ISqrt(uint32_t x)
{
    uint32_t r = 0;
    while (uint64_t{r + 1} * (r + 1) <= x)
        ++r;
    return r;
}

} // namespace

extern "C" constexpr uint32_t VrTBL_SampleRates_OnlyParsing[12] = {
    kSampleRates[0], kSampleRates[1], kSampleRates[2], kSampleRates[3],
    kSampleRates[4], kSampleRates[5], kSampleRates[6], kSampleRates[7],
    kSampleRates[8], kSampleRates[9], kSampleRates[10], kSampleRates[11]};
static_assert(std::size(VrTBL_SampleRates_OnlyParsing) == kSampleRates.size());

// CONTRACT: every rate outside the table, 7350 Hz included, answers index 4 (44100 Hz).
extern "C" uint32_t get_samplerate_idxOnlyParsing(uint32_t uSampleRate)
{
    const int32_t iIndex = vorcal::aac::IndexOfRate(uSampleRate);
    return iIndex < 0 ? 4 : static_cast<uint32_t>(iIndex);
}

// Tables are shared between rates as in ISO/IEC 14496-3 4.5.4; rows 12-15 have no bands.
extern "C" constexpr VrSampRateInfo_OnlyParsing samp_rate_infoOnlyParsing[16] = {
    Row(0, VrTBL_sfb_96_1024_OnlyParsing, VrTBL_sfb_96_128_OnlyParsing), // 96000
    Row(1, VrTBL_sfb_96_1024_OnlyParsing, VrTBL_sfb_96_128_OnlyParsing), // 88200
    Row(2, VrTBL_sfb_64_1024_OnlyParsing, VrTBL_sfb_64_128_OnlyParsing), // 64000
    Row(3, VrTBL_sfb_48_1024_OnlyParsing, VrTBL_sfb_48_128_OnlyParsing), // 48000
    Row(4, VrTBL_sfb_48_1024_OnlyParsing, VrTBL_sfb_48_128_OnlyParsing), // 44100
    Row(5, VrTBL_sfb_32_1024_OnlyParsing, VrTBL_sfb_48_128_OnlyParsing), // 32000
    Row(6, VrTBL_sfb_24_1024_OnlyParsing, VrTBL_sfb_24_128_OnlyParsing), // 24000
    Row(7, VrTBL_sfb_24_1024_OnlyParsing, VrTBL_sfb_24_128_OnlyParsing), // 22050
    Row(8, VrTBL_sfb_16_1024_OnlyParsing, VrTBL_sfb_16_128_OnlyParsing), // 16000
    Row(9, VrTBL_sfb_16_1024_OnlyParsing, VrTBL_sfb_16_128_OnlyParsing), // 12000
    Row(10, VrTBL_sfb_16_1024_OnlyParsing, VrTBL_sfb_16_128_OnlyParsing), // 11025
    Row(11, VrTBL_sfb_8_1024_OnlyParsing, VrTBL_sfb_8_128_OnlyParsing), // 8000
    {}, {}, {}, {},
};

namespace {

constexpr bool RowsMatch()
{
    constexpr uint32_t kLong[12] = {41, 41, 47, 49, 49, 51, 47, 47, 43, 43, 43, 40};
    constexpr uint32_t kShort[12] = {12, 12, 12, 14, 14, 14, 15, 15, 15, 15, 15, 15};
    for (int i = 0; i < 12; ++i) {
        const VrSampRateInfo_OnlyParsing &r = samp_rate_infoOnlyParsing[i];
        if (r.uLongBands != kLong[i] || r.uShortBands != kShort[i])
            return false;
    }
    for (int i = 12; i < 16; ++i) {
        const VrSampRateInfo_OnlyParsing &r = samp_rate_infoOnlyParsing[i];
        if (r.uSampleRate || r.uLongBands || r.puLongTops || r.uShortBands || r.puShortTops)
            return false;
    }
    return true;
}
static_assert(RowsMatch());

} // namespace

// C linkage from its declaration in aacparse.h.
uint16_t sfbwidth128OnlyParsing[16] = {};

// Band width w = 4k gets floor(32767 / sqrt(k)): w samples of at most that magnitude have an
// energy (sum of sample^2 / 4) of at most 32767^2 < 2^30, and each sample fits 16 bits.
extern "C" constexpr uint16_t norm_tblOnlyParsing[24] = {
    32767, 23169, 18918, 16383, 14653, 13377, 12384, 11584, 10922, 10361, 9879, 9459,
    9087,  8757,  8460,  8191,  7947,  7723,  7517,  7326,  7150,  6985,  6832, 6688,
};

namespace {

constexpr bool NormMatches()
{
    for (uint32_t k = 1; k <= 24; ++k) {
        if (norm_tblOnlyParsing[k - 1] != ISqrt(32767u * 32767u / k))
            return false;
    }
    return true;
}
static_assert(NormMatches());

} // namespace
