// Helpers shared by the silence-frame tests: a digest of frame bytes and an owned frame.
#pragma once

#include <cstdint>
#include <vector>

#include <vorcal/vorsal.h>

namespace vorcal::test {

// FNV-1a, 32 bits: the digests of the templates were taken from their published hex.
inline uint32_t Fnv1a(const uint8_t *p, size_t n)
{
    uint32_t h = 0x811C9DC5u;
    for (size_t i = 0; i < n; ++i)
        h = (h ^ p[i]) * 0x01000193u;
    return h;
}

// Copies a generated frame and returns it to the memory table.
inline std::vector<uint8_t> TakeFrame(uint8_t *pFrame, uint32_t uLen)
{
    std::vector<uint8_t> bytes(pFrame, pFrame + uLen);
    g_vorSALMemoryTable->Free(pFrame);
    return bytes;
}

} // namespace vorcal::test
