// Huffman decoding of spectral and scale factor codewords through the level tables
// (bookOnlyParsing, booksclOnlyParsing): the level is found by comparing the next 6 + k bits
// with each level's largest code, the entry by the distance from it. Level 0 is a direct table
// whose code lengths follow from the entry index, by codebook.
#pragma once

#include <array>
#include <cstdint>

#include <vorcal/aacparse.h>

namespace vorcal::aacparse::huffman {

struct Codeword {
    uint8_t uLength;
    uint32_t uCode;
};

// Code lengths of the level-0 entries: runs of {first index past the run, length}.
struct Run {
    uint8_t uBelow;
    uint8_t uLength;
};
// By codebook 1-11 (row 0 unused); 1: above 31 five bits, else one; 2: below 8 three, below 12
// four, below 26 five, else six; and so on for each codebook of ISO/IEC 13818-7.
inline constexpr Run kSpectralRuns[12][4] = {
    {},
    {{32, 1}, {64, 5}},
    {{8, 3}, {12, 4}, {26, 5}, {64, 6}},
    {{32, 1}, {48, 4}, {52, 5}, {64, 6}},
    {{40, 4}, {64, 5}},
    {{32, 1}, {48, 4}, {64, 5}},
    {{36, 4}, {64, 6}},
    {{32, 1}, {48, 3}, {52, 4}, {64, 6}},
    {{8, 3}, {28, 4}, {42, 5}, {64, 6}},
    {{32, 1}, {48, 3}, {52, 4}, {64, 6}},
    {{12, 4}, {28, 5}, {64, 6}},
    {{8, 4}, {20, 5}, {64, 6}},
};
// The scale factor codebook: below 32 one bit, below 40 three, below 52 four, below 56 five,
// else six.
inline constexpr Run kScalefactorRuns[5] = {{32, 1}, {40, 3}, {52, 4}, {56, 5}, {64, 6}};

template <std::size_t N>
constexpr std::array<uint8_t, 64> Lengths(const Run (&runs)[N])
{
    std::array<uint8_t, 64> out{};
    uint32_t i = 0;
    for (const Run &r : runs)
        for (; i < r.uBelow; ++i)
            out[i] = r.uLength;
    return out;
}

inline constexpr auto kSpectralLength0 = [] {
    std::array<std::array<uint8_t, 64>, 12> out{};
    for (int cb = 1; cb < 12; ++cb)
        out[cb] = Lengths(kSpectralRuns[cb]);
    return out;
}();
inline constexpr auto kScalefactorLength0 = Lengths(kScalefactorRuns);

struct SpectralHit {
    const VrSpectralEntry_OnlyParsing *pEntry;
    uint32_t uLength;
};

// The level tables as a parameter, so that the compile-time checks can name the constexpr
// definitions (a constexpr function reading the extern declarations would not be constant).
struct SpectralLevels {
    const VrSpectralEntry_OnlyParsing *const (&book)[13][VR_AAC_SPECTRAL_LEVELS_OnlyParsing];
    const uint8_t (&size)[13][VR_AAC_SPECTRAL_LEVELS_OnlyParsing];
    const uint16_t (&max)[13][VR_AAC_SPECTRAL_LEVELS_OnlyParsing];
};
struct ScalefactorLevels {
    const uint8_t *const (&book)[VR_AAC_SCALEFACTOR_LEVELS_OnlyParsing];
    const uint32_t (&size)[VR_AAC_SCALEFACTOR_LEVELS_OnlyParsing];
    const uint32_t (&max)[VR_AAC_SCALEFACTOR_LEVELS_OnlyParsing];
};

// The entry and code length of the codeword at the top of uPeek16 (the next 16 bits) in
// codebook uBook (1-11). Every 16-bit value ends at some level: the codes are complete, so the
// last level's largest code is 0xFFFF.
constexpr SpectralHit FindSpectral(const SpectralLevels &t, uint32_t uBook, uint32_t uPeek16) noexcept
{
    int32_t v = static_cast<int32_t>(uPeek16 >> 10) - t.max[uBook][0];
    if (v <= 0) {
        const int32_t i = t.size[uBook][0] + v;
        return {&t.book[uBook][0][i], kSpectralLength0[uBook][static_cast<uint32_t>(i)]};
    }
    uint32_t k = 1;
    while ((v = static_cast<int32_t>(uPeek16 >> (10 - k)) - t.max[uBook][k]) > 0)
        ++k;
    return {&t.book[uBook][k][t.size[uBook][k] + v], 6 + k};
}

// The same search on one codebook's row of the tables, fetched once for a run of codewords.
struct SpectralRow {
    const VrSpectralEntry_OnlyParsing *const *book;
    const uint8_t *size;
    const uint16_t *max;
    const uint8_t *length0;
};
inline SpectralRow RowOf(uint32_t uBook) noexcept
{
    return {bookOnlyParsing[uBook], CBsizeOnlyParsing[uBook], MaxValOnlyParsing[uBook], kSpectralLength0[uBook].data()};
}
inline SpectralHit FindSpectral(const SpectralRow &r, uint32_t uPeek16) noexcept
{
    int32_t v = static_cast<int32_t>(uPeek16 >> 10) - r.max[0];
    if (v <= 0) {
        const int32_t i = r.size[0] + v;
        return {&r.book[0][i], r.length0[i]};
    }
    uint32_t k = 1;
    while ((v = static_cast<int32_t>(uPeek16 >> (10 - k)) - r.max[k]) > 0)
        ++k;
    return {&r.book[k][r.size[k] + v], 6 + k};
}

struct ScalefactorHit {
    uint32_t uIndex; // 0-120, 60 for a difference of 0
    uint32_t uLength;
};

// The scale factor index and code length of the codeword at the top of uPeek19.
constexpr ScalefactorHit FindScalefactor(const ScalefactorLevels &t, uint32_t uPeek19) noexcept
{
    int32_t v = static_cast<int32_t>(uPeek19 >> 13) - static_cast<int32_t>(t.max[0]);
    if (v <= 0) {
        const int32_t i = static_cast<int32_t>(t.size[0]) + v;
        return {t.book[0][i], kScalefactorLength0[static_cast<uint32_t>(i)]};
    }
    uint32_t k = 1;
    while ((v = static_cast<int32_t>(uPeek19 >> (13 - k)) - static_cast<int32_t>(t.max[k])) > 0)
        ++k;
    return {t.book[k][static_cast<int32_t>(t.size[k]) + v], 6 + k};
}

inline constexpr SpectralLevels kSpectral{bookOnlyParsing, CBsizeOnlyParsing, MaxValOnlyParsing};
inline constexpr ScalefactorLevels kScalefactor{booksclOnlyParsing, CBsize_sclOnlyParsing, MaxVal_sclOnlyParsing};

} // namespace vorcal::aacparse::huffman
