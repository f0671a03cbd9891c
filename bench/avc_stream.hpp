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

// The shape of a stream made to the statistics of real 1080p x264 output. Measured on x264
// (preset veryfast, 8 Mb/s, 30 frames/s, GOP 60, B-frames, 1 and 8 slices) over 120 frames of
// ffmpeg's testsrc2 pattern with temporal noise: I pictures 190-250 KB, P 32 KB, B 14-19 KB
// (34 KB a frame on average); 0.45 % zero bytes; outside the start codes about 54 zero pairs
// per MB, 11 of them escaped as 00 00 03; the slices of an 8-slice picture 17 B to 78 KB.
struct StreamShape {
    size_t bytes = size_t{32} << 20; // Annex B bytes at least
    int slices = 1;                  // slices per picture
    int codeLength = 4;              // 3 or 4: the start code in front of every unit
    uint32_t seed = 1;
    bool hevc = false;               // HEVC units (two-byte headers: VPS, SPS, PPS, SEI, IDR, TRAIL) of the same sizes
};

namespace detail {

// One escaped NAL unit of n payload bytes appended to out: uniform random bytes (CABAC data)
// with a zero pair planted about every 27 KB, three in ten of them followed by a byte <= 3
// (escaped), and a non-zero last byte (rbsp_stop_one_bit).
inline void AppendUnit(std::vector<uint8_t> &out, std::mt19937_64 &rng, uint16_t header, size_t n, bool twoByteHeader)
{
    constexpr size_t kPairSpacing = 55000; // uniform 0..kPairSpacing: 27.5 KB on average
    if (twoByteHeader)
        out.push_back(static_cast<uint8_t>(header >> 8));
    out.push_back(static_cast<uint8_t>(header));
    int zeros = 0;
    uint64_t word = 0;
    size_t plant = rng() % kPairSpacing;
    for (size_t i = 0; i < n; ++i) {
        if (i % 8 == 0)
            word = rng();
        auto b = static_cast<uint8_t>(word >> (8 * (i % 8)));
        if (i == plant || i == plant + 1) {
            b = 0;
        } else if (i == plant + 2) {
            b = b % 10 < 3 ? b % 4 : b;
            plant += 1 + rng() % kPairSpacing;
        }
        if (i + 1 == n)
            b |= 0x80;
        if (zeros >= 2 && b <= 3) {
            out.push_back(3);
            zeros = 0;
        }
        out.push_back(b);
        zeros = b == 0 ? zeros + 1 : 0;
    }
}

} // namespace detail

inline AvcStream MakeCodedStream(const StreamShape &shape)
{
    std::mt19937_64 rng(shape.seed);
    std::normal_distribution<double> spread(1.0, 0.3);
    AvcStream s;
    s.annexB.reserve(shape.bytes + (shape.bytes >> 4));
    s.lengthPrefixed.reserve(shape.bytes + (shape.bytes >> 4));
    std::vector<uint8_t> unit;
    for (size_t f = 0; s.annexB.size() < shape.bytes; ++f) {
        const size_t k = f % 60;
        const bool key = k == 0, bPicture = !key && k % 3 == 2;
        const double mean = key ? 220000 : (bPicture ? 17000 : 33000);
        const double v = spread(rng);
        const size_t bytes = static_cast<size_t>(mean * (v < 0.2 ? 0.2 : (v > 2.0 ? 2.0 : v)));
        // ITU-T H.264 headers, or H.265 ones (VPS first; IDR_W_RADL, TRAIL_R, TRAIL_N).
        const bool hevc = shape.hevc;
        std::vector<std::pair<uint16_t, size_t>> units;
        if (key) {
            if (hevc)
                units.push_back({0x4001, 24});
            units.push_back({static_cast<uint16_t>(hevc ? 0x4201 : 0x67), hevc ? 40 : 20});
            units.push_back({static_cast<uint16_t>(hevc ? 0x4401 : 0x68), 5});
            if (f == 0)
                units.push_back({static_cast<uint16_t>(hevc ? 0x4E01 : 0x06), 700});
        }
        // Uneven slices: weights from 0.25 to 1.75.
        std::vector<double> w(static_cast<size_t>(shape.slices));
        double sum = 0;
        for (double &x : w)
            sum += x = 0.25 + 1.5 * static_cast<double>(rng() % 1024) / 1024;
        const uint16_t slice = hevc ? (key ? 0x2601 : (bPicture ? 0x0001 : 0x0201)) : (key ? 0x65 : (bPicture ? 0x01 : 0x41));
        for (double x : w)
            units.push_back({slice, static_cast<size_t>(static_cast<double>(bytes) * x / sum) + 16});

        AvcFrame a{s.annexB.size(), 0, key}, l{s.lengthPrefixed.size(), 0, key};
        for (const auto &[header, n] : units) {
            unit.clear();
            detail::AppendUnit(unit, rng, header, n, hevc);
            if (shape.codeLength == 4)
                s.annexB.push_back(0);
            s.annexB.insert(s.annexB.end(), {0, 0, 1});
            s.annexB.insert(s.annexB.end(), unit.begin(), unit.end());
            const size_t u = unit.size();
            s.lengthPrefixed.insert(s.lengthPrefixed.end(), {static_cast<uint8_t>(u >> 24), static_cast<uint8_t>(u >> 16),
                                                             static_cast<uint8_t>(u >> 8), static_cast<uint8_t>(u)});
            s.lengthPrefixed.insert(s.lengthPrefixed.end(), unit.begin(), unit.end());
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
