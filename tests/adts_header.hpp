// Expected ADTS headers, written field by field (ISO/IEC 13818-7 6.2.1) with the test bit writer.
#pragma once

#include <cstdint>
#include <vector>

#include "bit_writer.hpp"

namespace vorcal::test {

struct AdtsFields {
    uint32_t uProfile;
    uint32_t uFrequencyIndex;
    uint32_t uChannelConfiguration;
    uint32_t uFrameLength;
    uint32_t uBufferFullness;
};

inline std::vector<uint8_t> AdtsHeader(const AdtsFields &f)
{
    BitWriter w;
    w.Put(0xFFF, 12).Put(1, 1).Put(0, 2).Put(1, 1);                  // syncword, ID, layer, protection_absent
    w.Put(f.uProfile, 2).Put(f.uFrequencyIndex, 4).Put(0, 1);         // profile, index, private_bit
    w.Put(f.uChannelConfiguration, 3).Put(0, 4);                      // channels, original/home/copyright
    w.Put(f.uFrameLength, 13).Put(f.uBufferFullness, 11).Put(0, 2);   // length, fullness, raw blocks - 1
    return w.Bytes();
}

// The ADTS sampling_frequency_index rates.
inline constexpr uint32_t kAdtsRates[12] = {96000, 88200, 64000, 48000, 44100, 32000,
                                            24000, 22050, 16000, 12000, 11025, 8000};

} // namespace vorcal::test
