// The one start-code search of the library: finds the prefix 00 00 01. Every tool that looks
// for H.264, MPEG-4 Visual or MPEG-1/2 start codes is built on it. The work is done by one of
// several variants (portable, SSE2, AVX2, AVX-512BW, AVX-512VBMI, NEON), chosen once at run time
// for the CPU.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

namespace vorcal::tools {

// Offset of the first 00 00 01 that begins at or after uFrom and lies wholly inside [0, uEnd),
// or uEnd when there is none.
size_t FindStartCodePrefix(const uint8_t *pData, size_t uFrom, size_t uEnd) noexcept;

// FindStartCodePrefix fused with a copy: returns the same offset r and copies the bytes
// [uFrom, r) to pDst (all of [uFrom, uEnd) when r is uEnd) as far as they fit in uDstRoom.
// Bytes of pDst beyond r - uFrom may be overwritten, never at or beyond uDstRoom.
size_t FindStartCodePrefixCopy(const uint8_t *pData, size_t uFrom, size_t uEnd, uint8_t *pDst,
                               size_t uDstRoom) noexcept;

// One variant: the two operations above for one instruction set.
struct StartCodeKernels {
    const char *pName;
    size_t (*pFind)(const uint8_t *pData, size_t uFrom, size_t uEnd) noexcept;
    size_t (*pFindCopy)(const uint8_t *pData, size_t uFrom, size_t uEnd, uint8_t *pDst, size_t uDstRoom) noexcept;
};

struct StartCodeVariant {
    const StartCodeKernels *pKernels;
    bool (*pSupported)() noexcept; // true when this CPU runs the variant
};

// Every variant built into the library, portable first and widest last.
std::span<const StartCodeVariant> StartCodeVariants() noexcept;

// The variant in use: the widest one the CPU supports, chosen on first use.
const StartCodeKernels &ActiveStartCodeKernels() noexcept;

// Makes pKernels the variant in use (tests force each in turn); null goes back to the widest
// supported one.
void UseStartCodeKernels(const StartCodeKernels *pKernels) noexcept;

} // namespace vorcal::tools
