// Internal pieces of the SBR parsers shared between the band-table and bitstream modules.
#pragma once

#include <cstdint>

#include <vorcal/aacparse.h>

namespace vorcal::aacparse::sbr {

// floor(num / fs + 1/2), the rounding of startMin and stopMin (ISO/IEC 14496-3 4.6.18.3.2.1).
// Exact in integers: the single-precision quotient plus one half never crosses an integer
// differently for num up to 2^23. A rate of 0 gives 0.
constexpr uint32_t RoundedRatio(uint32_t num, uint32_t fs)
{
    return fs == 0 ? 0 : static_cast<uint32_t>((2 * uint64_t{num} + fs) / (2 * uint64_t{fs}));
}

// Insertion sort of n band widths into ascending order.
constexpr void SortAscending(int32_t *v, int32_t n)
{
    for (int32_t i = 1; i < n; ++i) {
        const int32_t x = v[i];
        int32_t j = i;
        for (; j > 0 && v[j - 1] > x; --j)
            v[j] = v[j - 1];
        v[j] = x;
    }
}

// k0 and k2 from the header's bs_start_freq and bs_stop_freq at the state's rate.
int32_t StartBand(const VrSBRState_OnlyParsing &sbr);
int32_t StopBand(const VrSBRState_OnlyParsing &sbr, int32_t k0);
// Whether k2 - k0 stays within the widths allowed at the rate.
bool WithinBandLimit(uint32_t fs, int32_t k0, int32_t k2);
// The master, high, low and noise band tables; false (tables unusable) when they would leave
// the 64 QMF bands, have no high band left above bs_xover_band, or need more than 5 noise bands.
bool BuildBandTables(VrSBRState_OnlyParsing *pSbr, int32_t k0, int32_t k2);

// sbr_single_channel_element() with borders in units of uBorderUnit time slots; returns 2 for
// parametric stereo extended data, else 1.
int32_t ParseSingleChannel(VrBitReader_OnlyParsing *pBits, VrSBRState_OnlyParsing *pSbr,
                           uint32_t uBorderUnit);

// sbr_extension_dataOnlyParsing, also telling whether the band tables of the header in force
// could be built (false: band limits exceeded, no data parsed).
int32_t ExtensionData(VrBitReader_OnlyParsing *pBits, VrSBRState_OnlyParsing *pSbr,
                      uint32_t uElementId, bool &bTables);

} // namespace vorcal::aacparse::sbr
