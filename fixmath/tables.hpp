// The interpolation tables of the fixed-point library, built at compile time from their
// defining formulas with integer arithmetic only (no floating point, even at compile time).
#pragma once

#include <array>
#include <cstdint>

namespace vorcal::fixmath {

namespace detail {

// Bitwise integer square root: floor(sqrt(v)).
constexpr uint64_t ISqrt(uint64_t v)
{
    uint64_t r = 0;
    uint64_t bit = uint64_t{1} << 62;
    while (bit > v)
        bit >>= 2;
    while (bit != 0) {
        if (v >= r + bit) {
            v -= r + bit;
            r = (r >> 1) + bit;
        } else {
            r >>= 1;
        }
        bit >>= 2;
    }
    return r;
}

// round(sqrt(num / den)) for positive num, den: floor(sqrt) rounded up when
// num / den >= (r + 1/2)^2, that is 4 num >= (2r + 1)^2 den.
constexpr int32_t RoundSqrt(uint64_t num, uint64_t den)
{
    const uint64_t r = ISqrt(num / den);
    const uint64_t twice = 2 * r + 1;
    return static_cast<int32_t>(4 * num >= twice * twice * den ? r + 1 : r);
}

// 2^(j/32) in Q30 for j = 0..32: five square roots of 2 give 2^(1/32), then powers. 64-bit
// arithmetic suffices (products stay below 2^62) and serves the 32-bit target alike.
constexpr int kPow2Q = 30;
constexpr std::array<uint64_t, 33> kPow2Q30 = [] {
    uint64_t root = uint64_t{2} << kPow2Q;
    for (int i = 0; i < 5; ++i)
        root = ISqrt(root << kPow2Q);
    std::array<uint64_t, 33> p{};
    p[0] = uint64_t{1} << kPow2Q;
    for (int j = 1; j <= 32; ++j)
        p[j] = (p[j - 1] * root + (uint64_t{1} << (kPow2Q - 1))) >> kPow2Q;
    return p;
}();

} // namespace detail

// t[j] = round(32768 sqrt((j + 16) / 64)) = round(sqrt(2^24 (j + 16))), last capped at 32767.
inline constexpr std::array<int16_t, 49> kSqrtTable = [] {
    std::array<int16_t, 49> t{};
    for (int j = 0; j < 49; ++j) {
        const int32_t v = detail::RoundSqrt((uint64_t{1} << 24) * uint64_t(j + 16), 1);
        t[j] = static_cast<int16_t>(v > 32767 ? 32767 : v);
    }
    return t;
}();

// u[j] = round(32768 / sqrt((j + 16) / 16)) = round(sqrt(2^34 / (j + 16))), first capped at 32767.
inline constexpr std::array<int16_t, 49> kInvSqrtTable = [] {
    std::array<int16_t, 49> u{};
    for (int j = 0; j < 49; ++j) {
        const int32_t v = detail::RoundSqrt(uint64_t{1} << 34, uint64_t(j + 16));
        u[j] = static_cast<int16_t>(v > 32767 ? 32767 : v);
    }
    return u;
}();

// p[j] = round(16384 2^(j / 32)), last capped at 32767.
inline constexpr std::array<int16_t, 33> kPow2Table = [] {
    std::array<int16_t, 33> p{};
    for (int j = 0; j < 33; ++j) {
        const auto v = static_cast<int32_t>(
            (detail::kPow2Q30[j] * 16384 + (uint64_t{1} << (detail::kPow2Q - 1))) >>
            detail::kPow2Q);
        p[j] = static_cast<int16_t>(v > 32767 ? 32767 : v);
    }
    return p;
}();

// About 32768 log2(1 + j / 32). CONTRACT: the values as the decoder has always listed them,
// not recomputed; the last entry is capped at 32767.
inline constexpr std::array<int16_t, 33> kLog2Table = {
    0,     1455,  2866,  4236,  5568,  6863,  8124,  9352,  10549, 11716, 12855,
    13967, 15054, 16117, 17156, 18172, 19167, 20142, 21097, 22033, 22951, 23852,
    24735, 25603, 26455, 27291, 28113, 28922, 29716, 30497, 31266, 32023, 32767};

static_assert(kSqrtTable[0] == 16384 && kSqrtTable[1] == 16888 && kSqrtTable[2] == 17378);
static_assert(kSqrtTable[47] == 32511 && kSqrtTable[48] == 32767);
static_assert(kInvSqrtTable[0] == 32767 && kInvSqrtTable[1] == 31790 && kInvSqrtTable[2] == 30894);
static_assert(kInvSqrtTable[47] == 16514 && kInvSqrtTable[48] == 16384);
static_assert(kPow2Table[0] == 16384 && kPow2Table[1] == 16743 && kPow2Table[2] == 17109);
static_assert(kPow2Table[31] == 32066 && kPow2Table[32] == 32767);
static_assert(kPow2Table[16] == 23170 && kSqrtTable[16] == 23170);

} // namespace vorcal::fixmath
