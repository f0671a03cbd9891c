// FindStartCodePrefix and its fused copy variant against a byte-by-byte reference, on random
// data with dense and sparse zero bytes and on every alignment. The search is internal to the
// library (hidden), so this test compiles it in.
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <random>
#include <vector>

#include "tools/start_code.cpp"

namespace {

using vorcal::tools::FindStartCodePrefix;
using vorcal::tools::FindStartCodePrefixCopy;

size_t Reference(const std::vector<uint8_t> &d, size_t from, size_t end)
{
    for (size_t i = from; i + 2 < end; ++i) {
        if (d[i] == 0 && d[i + 1] == 0 && d[i + 2] == 1)
            return i;
    }
    return end;
}

TEST(FindStartCodePrefix, LonePrefixAtEveryOffsetAndCutBeforeItsOne)
{
    for (size_t at = 0; at + 3 <= 100; ++at) {
        std::vector<uint8_t> d(100, 0xFF);
        d[at] = d[at + 1] = 0;
        d[at + 2] = 1;
        for (size_t from = 0; from < 100; from += 7)
            ASSERT_EQ(FindStartCodePrefix(d.data(), from, d.size()), Reference(d, from, d.size())) << at;
        ASSERT_EQ(FindStartCodePrefix(d.data(), 0, at + 2), at + 2);
    }
    std::vector<uint8_t> z(70, 0); // a long zero run, with and without its 01
    z[69] = 1;
    EXPECT_EQ(FindStartCodePrefix(z.data(), 0, z.size()), 67u);
    z[69] = 2;
    EXPECT_EQ(FindStartCodePrefix(z.data(), 0, z.size()), z.size());
}

TEST(FindStartCodePrefix, BothVariantsMatchReferenceOnRandomData)
{
    std::mt19937 rng(99);
    for (int round = 0; round < 3000; ++round) {
        // Zero bytes dense or sparse, and 01 often enough after them to plant prefixes.
        const unsigned rarity = std::array{3u, 20u, 300u, 100000u}[round % 4];
        std::vector<uint8_t> d(rng() % 400);
        for (auto &b : d) {
            const unsigned r = rng() % rarity;
            b = r == 0 ? 0 : (r == 1 ? 1 : static_cast<uint8_t>(rng() | 2));
        }
        const size_t end = rng() % (d.size() + 1);
        size_t from = rng() % (end + 3);
        ASSERT_EQ(FindStartCodePrefix(d.data(), from, end), Reference(d, from, end)) << round;
        from = std::min(from, end);
        // The copy variant: same result, the bytes before it copied, nothing past the room.
        const size_t room = rng() % (end + 40);
        std::vector<uint8_t> dst(room + 16, 0xEE);
        const size_t r = FindStartCodePrefixCopy(d.data(), from, end, dst.data(), room);
        ASSERT_EQ(r, Reference(d, from, end)) << round;
        const size_t n = r > from ? std::min(r - from, room) : 0;
        ASSERT_TRUE(std::equal(d.begin() + from, d.begin() + from + n, dst.begin())) << round;
        ASSERT_EQ(std::vector<uint8_t>(dst.begin() + room, dst.end()), std::vector<uint8_t>(16, 0xEE)) << round;
    }
}

} // namespace
