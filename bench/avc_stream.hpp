// A synthetic H.264 stream for benchmarks, about 1080p-like: a key picture every 30 (SPS,
// PPS, SEI and IDR slices), P and B pictures in between, 1 to 8 NAL units per frame, slice
// payload random and emulation-free (00 00 0x, x <= 3, escaped as ITU-T H.264 7.4.1 requires).
// Both framings of the same units are produced. Header-only so that every benchmark can use it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <random>
#include <vector>

#include "tests/support/bit_writer.hpp"

namespace vorcal::bench {

struct AvcFrame {
    size_t offset; // into the stream buffer
    size_t size;
    bool key;
};

struct AvcStream {
    std::vector<uint8_t> annexB;         // encoder style: 00 00 00 01 for the first unit, 00 00 01 after
    std::vector<AvcFrame> annexBFrames;
    std::vector<uint8_t> lengthPrefixed; // 4-byte big-endian lengths
    std::vector<AvcFrame> lengthFrames;
    size_t units = 0;
};

namespace detail {

// One NAL unit: header byte, then n payload bytes escaped, ending in a non-zero byte (the
// rbsp_stop_one_bit).
inline std::vector<uint8_t> Unit(std::mt19937 &rng, uint8_t header, size_t n)
{
    std::vector<uint8_t> rbsp(n);
    for (auto &b : rbsp)
        b = static_cast<uint8_t>(rng());
    if (!rbsp.empty())
        rbsp.back() = 0x80;
    std::vector<uint8_t> unit{header};
    const std::vector<uint8_t> escaped = test::BitWriter::Escape(rbsp);
    unit.insert(unit.end(), escaped.begin(), escaped.end());
    return unit;
}

} // namespace detail

// frames pictures with a mean size around meanBytes; the same seed gives the same stream.
inline AvcStream MakeAvcStream(size_t frames = 90, uint32_t seed = 1, size_t meanBytes = 30000)
{
    std::mt19937 rng(seed);
    AvcStream s;
    // Relative picture sizes: I about 4x, P 1x, B 0.4x of a P picture; GOP of 30 with I P B B.
    const double kPShare = static_cast<double>(meanBytes) / (4.0 / 30 + 9.0 / 30 + 0.4 * 20 / 30);
    for (size_t f = 0; f < frames; ++f) {
        const bool key = f % 30 == 0;
        const bool bPicture = !key && f % 3 != 1;
        std::vector<std::vector<uint8_t>> units;
        if (key) {
            units.push_back(detail::Unit(rng, 0x67, 12 + rng() % 12)); // SPS
            units.push_back(detail::Unit(rng, 0x68, 4 + rng() % 4));   // PPS
            units.push_back(detail::Unit(rng, 0x06, 20 + rng() % 600)); // SEI
        }
        const double scale = key ? 4.0 : (bPicture ? 0.4 : 1.0);
        std::normal_distribution<double> spread(1.0, 0.25);
        const double v = spread(rng);
        const size_t bytes = static_cast<size_t>(kPShare * scale * (v < 0.2 ? 0.2 : v));
        const size_t slices = 1 + rng() % (key ? 5 : 8 - units.size());
        for (size_t i = 0; i < slices; ++i)
            units.push_back(detail::Unit(rng, key ? 0x65 : (bPicture ? 0x01 : 0x41), bytes / slices));

        AvcFrame a{s.annexB.size(), 0, key}, l{s.lengthPrefixed.size(), 0, key};
        for (size_t i = 0; i < units.size(); ++i) {
            const auto &u = units[i];
            if (i == 0)
                s.annexB.push_back(0);
            s.annexB.insert(s.annexB.end(), {0, 0, 1});
            s.annexB.insert(s.annexB.end(), u.begin(), u.end());
            const size_t n = u.size();
            s.lengthPrefixed.insert(s.lengthPrefixed.end(), {static_cast<uint8_t>(n >> 24), static_cast<uint8_t>(n >> 16),
                                                             static_cast<uint8_t>(n >> 8), static_cast<uint8_t>(n)});
            s.lengthPrefixed.insert(s.lengthPrefixed.end(), u.begin(), u.end());
        }
        s.units += units.size();
        a.size = s.annexB.size() - a.offset;
        l.size = s.lengthPrefixed.size() - l.offset;
        s.annexBFrames.push_back(a);
        s.lengthFrames.push_back(l);
    }
    return s;
}

} // namespace vorcal::bench
