// Facts of the AAC stream syntax that the parse-only decoder and the audio tools share: the
// sampling rates of sampling_frequency_index 0-11 (ISO/IEC 14496-3 1.6.3.4), which
// VrTBL_SampleRates_OnlyParsing exports, and the ADTS syncword and header size (ISO/IEC 13818-7
// 6.2). Index 12 (7350 Hz) and the escape value 15 are not known to the library.
#pragma once

#include <array>
#include <cstdint>

namespace vorcal::aac {

inline constexpr std::array<uint32_t, 12> kSampleRates = {
    96000, 88200, 64000, 48000, 44100, 32000, 24000, 22050, 16000, 12000, 11025, 8000};

// The rate of an index, 0 Hz for the indices the table does not hold (12-15 and beyond).
constexpr uint32_t RateOfIndex(uint32_t uIndex) noexcept
{
    return uIndex < kSampleRates.size() ? kSampleRates[uIndex] : 0;
}

// The index of a rate of the table, exact rates only (no rounding to a nearby one); else -1.
constexpr int32_t IndexOfRate(uint32_t uRate) noexcept
{
    for (std::size_t i = 0; i < kSampleRates.size(); ++i)
        if (kSampleRates[i] == uRate)
            return static_cast<int32_t>(i);
    return -1;
}
static_assert(IndexOfRate(96000) == 0 && IndexOfRate(44100) == 4 && IndexOfRate(8000) == 11);
static_assert(IndexOfRate(7350) == -1 && RateOfIndex(12) == 0);

// syncword of adts_fixed_header().
inline constexpr uint32_t kAdtsSyncword = 0xFFF;
// Length of an ADTS header without CRC.
inline constexpr uint32_t kAdtsHeaderSize = 7;

// The syncword in the first two bytes: 0xFF and a second byte with its top four bits set. ID
// and layer are not examined.
constexpr bool IsAdtsSync(const uint8_t *p) noexcept
{
    return p[0] == 0xFF && (p[1] & 0xF0) == 0xF0;
}

} // namespace vorcal::aac
