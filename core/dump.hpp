// Dump records: a 4-byte length in host byte order followed by the bytes exactly as passed.
#pragma once

#include <cstdint>

#include <vorcal/core.h>

namespace vorcal::core {

inline constexpr uint32_t kVideoDumpSlot = 0;
inline constexpr uint32_t kAudioDumpSlot = 1;

// True when hCAL is the live handle and its dump slot uSlot holds an open file.
bool IsDumpOpen(const CALHandle *hCAL, uint32_t uSlot) noexcept;

// Writes one record to an open slot. Nothing is written for a null payload with a non-zero
// length or for a negative length, so that a file never holds half a record.
void WriteDumpRecord(const CALHandle *hCAL, uint32_t uSlot, const uint8_t *pData, int32_t iLen) noexcept;

} // namespace vorcal::core
