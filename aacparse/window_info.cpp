// Window information records: the band layout of long and short windows at one sampling rate
// (ISO/IEC 13818-7 8.3.3 swb_offset, window grouping) for the raw data block parsers.
#include "aacparse/decoder.hpp"

namespace vorcal::aacparse {

void InfoInit(VrAACDecoder_OnlyParsing &dec, const VrSampRateInfo_OnlyParsing &row, uint16_t (&uWidths)[16])
{
    // Clamped so that a foreign row cannot index past the records.
    const uint32_t uLongBands = row.uLongBands < VR_AAC_MAX_BANDS_OnlyParsing ? row.uLongBands : VR_AAC_MAX_BANDS_OnlyParsing;
    const uint32_t uShortBands = row.uShortBands < 16 ? row.uShortBands : 16;

    VrWindowInfo_OnlyParsing &lw = dec.LongInfo;
    lw.uLongFlag = 1;
    lw.uWindowsPerBlock = 1;
    lw.uBinsPerBlock = 1024;
    lw.uBinsPerWindow = 1024;
    lw.uBandsPerWindow = uLongBands;
    lw.uBandsPerBlock = uLongBands;
    lw.uSectionBits = 5;
    lw.puBandTops = row.puLongTops;
    lw.puShortBandWidths = nullptr;
    for (uint32_t k = 0; k < uLongBands; ++k)
        lw.uBlockBandTops[k] = row.puLongTops[k];
    lw.uGroups = 1;
    lw.uGroupLengths[0] = 1;

    uint16_t uPrev = 0;
    for (uint32_t k = 0; k < 16; ++k) {
        const uint16_t uTop = k < uShortBands ? row.puShortTops[k] : uPrev;
        uWidths[k] = static_cast<uint16_t>(uTop - uPrev);
        uPrev = uTop;
    }

    VrWindowInfo_OnlyParsing &sw = dec.ShortInfo;
    sw.uLongFlag = 0;
    sw.uWindowsPerBlock = 8;
    sw.uBinsPerBlock = 1024;
    sw.uBinsPerWindow = 128;
    sw.uBandsPerWindow = uShortBands;
    sw.uBandsPerBlock = 8 * uShortBands;
    sw.uSectionBits = 3;
    sw.puBandTops = row.puShortTops;
    sw.puShortBandWidths = uWidths;
    for (uint32_t w = 0; w < 8; ++w) {
        for (uint32_t k = 0; k < uShortBands; ++k)
            sw.uBlockBandTops[w * uShortBands + k] = static_cast<uint16_t>(128 * w + row.puShortTops[k]);
    }
    // Short-window groups come from scale_factor_grouping of each ics_info.
}

} // namespace vorcal::aacparse

using namespace vorcal::aacparse;

extern "C" void huffbookinitOnlyParsing(VrAACDecoder_OnlyParsing *pDec)
{
    InfoInit(*pDec, RateRow(pDec->MCInfo.uSampleRateIdx));
}

extern "C" void infoinitOnlyParsing(VrAACDecoder_OnlyParsing *pDec, const VrSampRateInfo_OnlyParsing *pRow)
{
    InfoInit(*pDec, *pRow);
}
