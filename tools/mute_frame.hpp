// The silence-frame generators and their shared allocation step.
#pragma once

#include <cstdint>
#include <span>

namespace vorcal::tools::mute {

// Allocates header + body, copies both and stores buffer and length. When the allocation
// fails nothing is stored and the result is -1; else 0.
int32_t AllocateFrame(std::span<const uint8_t> header, std::span<const uint8_t> body,
                      uint8_t **ppFrame, uint32_t *puFrameLen) noexcept;

int32_t AacMuteFrame(uint8_t **ppFrame, uint32_t *puFrameLen, uint32_t uReserved,
                     uint32_t uSamplingRate, uint32_t uChannels, uint32_t bADTS,
                     int32_t iMode) noexcept;
int32_t AmrNbMuteFrame(uint8_t **ppFrame, uint32_t *puFrameLen, uint32_t uFT) noexcept;
int32_t AmrWbMuteFrame(uint8_t **ppFrame, uint32_t *puFrameLen, uint32_t uFT) noexcept;
int32_t DraMuteFrame(uint8_t **ppFrame, uint32_t *puFrameLen, uint32_t uSamplingRate,
                     uint32_t uChannels) noexcept;

} // namespace vorcal::tools::mute
