// AAC type detection on the bitstream alone; the codec instance's OTI is the wrapper's part.
#pragma once

#include <cstdint>

namespace vorcal::tools::aac {

// Wraps one raw data block in an ADTS header (AAC_MakeADTS mode uChannels - 1) and asks the
// parse-only decoder whether it carries SBR. False when the header cannot be built or the
// buffer cannot be allocated.
bool DetectSbr(int32_t iSamplingRate, uint32_t uChannels, const uint8_t *pFrame, uint32_t uFrameLen,
               uint32_t &uSBR) noexcept;

} // namespace vorcal::tools::aac
