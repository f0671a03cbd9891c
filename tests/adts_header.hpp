// Expected ADTS headers written field by field (ISO/IEC 13818-7 6.2.1), independent of the library.
#pragma once

#include <cstdint>
#include <vector>

#include "bit_writer.hpp"

namespace vorcal::test {

// The sampling_frequency_index rates.
inline constexpr uint32_t kAdtsRates[12] = {96000, 88200, 64000, 48000, 44100, 32000,
                                            24000, 22050, 16000, 12000, 11025, 8000};

// ID 1, layer 0, no CRC, one raw data block.
inline std::vector<uint8_t> AdtsHeader(uint32_t uProfile, uint32_t uIndex, uint32_t uConfig, uint32_t uFrameLen,
                                       uint32_t uFullness)
{
    return BitWriter().Put(0xFFF9, 16).Put(uProfile, 2).Put(uIndex, 4).Put(0, 1).Put(uConfig, 3).Put(0, 4)
        .Put(uFrameLen, 13).Put(uFullness, 11).Put(0, 2).Bytes();
}

} // namespace vorcal::test
