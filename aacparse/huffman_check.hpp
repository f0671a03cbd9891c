// Compile-time checks of the Huffman level tables against the codebooks they were made from:
// the codes are complete (Kraft sum 1), every level holds exactly the codes of its length, and
// every codeword, followed by zeros or by ones, decodes through the levels (the decoders' own
// search) to its own length and values. An index outside a level fails the constant evaluation.
#pragma once

#include <cstddef>
#include <cstdint>

#include "aacparse/huffman.hpp"

namespace vorcal::aacparse::huffman {

// The quantised values of a spectral codebook index (ISO/IEC 13818-7 index decompositions).
constexpr void Decompose(uint32_t uBook, int32_t i, int32_t (&v)[4])
{
    v[0] = v[1] = v[2] = v[3] = 0;
    if (uBook <= 4) {
        const int32_t d = uBook <= 2 ? 1 : 0; // codebooks 1 and 2 are signed, -1..1
        v[0] = i / 27 - d;
        v[1] = i / 9 % 3 - d;
        v[2] = i / 3 % 3 - d;
        v[3] = i % 3 - d;
    } else if (uBook <= 6) {
        v[0] = i / 9 - 4;
        v[1] = i % 9 - 4;
    } else {
        const int32_t mod = uBook <= 8 ? 8 : uBook <= 10 ? 13 : 17;
        v[0] = i / mod;
        v[1] = i % mod;
    }
}

// Lengths from 1 to uLongest bits whose Kraft sum is exactly 1; per length the code count.
template <std::size_t N>
constexpr bool Complete(const Codeword (&codes)[N], uint32_t uLongest, uint32_t (&count)[20])
{
    uint64_t uSum = 0;
    for (const Codeword &c : codes) {
        if (c.uLength < 1 || c.uLength > uLongest || (c.uCode >> c.uLength) != 0)
            return false;
        uSum += uint64_t{1} << (uLongest - c.uLength);
        ++count[c.uLength];
    }
    return uSum == uint64_t{1} << uLongest;
}

template <std::size_t N>
constexpr bool CodebookDecodes(const SpectralLevels &t, uint32_t uBook, const Codeword (&codes)[N])
{
    uint32_t count[20] = {};
    if (!Complete(codes, 16, count))
        return false;
    uint32_t uSlots = 0;
    for (uint32_t len = 1; len <= 6; ++len)
        uSlots += count[len] << (6 - len);
    if (t.size[uBook][0] + 1u != uSlots || t.max[uBook][0] + 1u != uSlots)
        return false;
    for (uint32_t k = 1; k < VR_AAC_SPECTRAL_LEVELS_OnlyParsing; ++k) {
        const bool empty = t.book[uBook][k] == nullptr;
        if (empty != (count[6 + k] == 0) || (!empty && t.size[uBook][k] + 1u != count[6 + k]))
            return false;
    }
    const uint32_t uDim = uBook <= 4 ? 4 : 2;
    for (std::size_t i = 0; i < N; ++i) {
        const uint32_t uFree = 16 - codes[i].uLength;
        for (uint32_t uTail : {0u, (1u << uFree) - 1}) {
            const SpectralHit hit = FindSpectral(t, uBook, (codes[i].uCode << uFree) | uTail);
            int32_t v[4];
            Decompose(uBook, static_cast<int32_t>(i), v);
            if (hit.uLength != codes[i].uLength)
                return false;
            for (uint32_t j = 0; j < 4; ++j)
                if (hit.pEntry->iValue[j] != (j < uDim ? v[j] : 0))
                    return false;
        }
    }
    return true;
}

template <std::size_t N>
constexpr bool ScalefactorCodebookDecodes(const ScalefactorLevels &t, const Codeword (&codes)[N])
{
    uint32_t count[20] = {};
    if (N != 121 || !Complete(codes, 19, count))
        return false;
    uint32_t uSlots = 0;
    for (uint32_t len = 1; len <= 6; ++len)
        uSlots += count[len] << (6 - len);
    if (t.size[0] + 1 != uSlots || t.max[0] + 1 != uSlots)
        return false;
    for (uint32_t k = 1; k < VR_AAC_SCALEFACTOR_LEVELS_OnlyParsing; ++k)
        if (t.size[k] + 1 != count[6 + k])
            return false;
    for (std::size_t i = 0; i < N; ++i) {
        const uint32_t uFree = 19 - codes[i].uLength;
        for (uint32_t uTail : {0u, (1u << uFree) - 1}) {
            const ScalefactorHit hit = FindScalefactor(t, (codes[i].uCode << uFree) | uTail);
            if (hit.uIndex != i || hit.uLength != codes[i].uLength)
                return false;
        }
    }
    return true;
}

} // namespace vorcal::aacparse::huffman
