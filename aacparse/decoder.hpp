// Internal helpers of the parse-only AAC decoder shared by its modules.
#pragma once

#include <cstdint>

#include <vorcal/aacparse.h>

namespace vorcal::aacparse {

// Rate in Hz of a sampling_frequency_index; 0 for the reserved and escape values 12-15.
inline uint32_t RateOf(uint32_t uIndex) noexcept
{
    return uIndex < 12 ? VrTBL_SampleRates_OnlyParsing[uIndex] : 0u;
}

// The samp_rate_infoOnlyParsing row of an index; anything past 15 gets an empty row.
inline const VrSampRateInfo_OnlyParsing &RateRow(uint32_t uIndex) noexcept
{
    return samp_rate_infoOnlyParsing[uIndex < 16 ? uIndex : 15];
}

inline uint32_t Bits(VrAACDecoder_OnlyParsing &dec, uint32_t n) noexcept
{
    return VrGetBits_OnlyParsing(&dec.Bits, n);
}

// Channel map operations (channel_map.cpp).
int32_t EnterMCInfo(VrAACDecoder_OnlyParsing &dec, VrMCInfo_OnlyParsing &map, const VrProgramConfig_OnlyParsing &pce);
int32_t CheckMCInfo(VrAACDecoder_OnlyParsing &dec, VrMCInfo_OnlyParsing &map, uint32_t uCopy);

// Window information (window_info.cpp).
void InfoInit(VrAACDecoder_OnlyParsing &dec, const VrSampRateInfo_OnlyParsing &row);

} // namespace vorcal::aacparse
