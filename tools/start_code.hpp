// The one start-code search of the library: finds the prefix 00 00 01. Every tool that looks
// for H.264, MPEG-4 Visual or MPEG-1/2 start codes is built on it.
#pragma once

#include <cstddef>
#include <cstdint>

namespace vorcal::tools {

// Offset of the first 00 00 01 that begins at or after uFrom and lies wholly inside [0, uEnd),
// or uEnd when there is none.
size_t FindStartCodePrefix(const uint8_t *pData, size_t uFrom, size_t uEnd) noexcept;

// FindStartCodePrefix fused with a copy: returns the same offset r and copies the bytes
// [uFrom, r) to pDst (all of [uFrom, uEnd) when r is uEnd) as far as they fit in uDstRoom.
// Bytes of pDst beyond r - uFrom may be overwritten, never at or beyond uDstRoom.
size_t FindStartCodePrefixCopy(const uint8_t *pData, size_t uFrom, size_t uEnd, uint8_t *pDst,
                               size_t uDstRoom) noexcept;

} // namespace vorcal::tools
