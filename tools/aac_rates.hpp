// The sampling rates of ADTS sampling_frequency_index 0-11 (ISO/IEC 14496-3 1.6.3.4). Index 12
// (7350 Hz) and the escape value 15 are not known to the library.
#pragma once

#include <array>
#include <cstdint>

namespace vorcal::tools::aac {

inline constexpr std::array<uint32_t, 12> kSampleRates = {96000, 88200, 64000, 48000, 44100, 32000,
                                                          24000, 22050, 16000, 12000, 11025, 8000};
static_assert(kSampleRates.front() == 96000 && kSampleRates.back() == 8000);

// The rate of an index, 0 Hz for the indices the table does not hold (12-15).
constexpr uint32_t RateOfIndex(uint32_t uIndex) noexcept
{
    return uIndex < kSampleRates.size() ? kSampleRates[uIndex] : 0;
}

// Length of an ADTS header without CRC.
inline constexpr uint32_t kAdtsHeaderSize = 7;

} // namespace vorcal::tools::aac
