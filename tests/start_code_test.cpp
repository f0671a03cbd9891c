// FindStartCodePrefix and its fused copy variant against a byte-by-byte reference, on random
// data with dense and sparse zero bytes, planted prefixes and every alignment. The search is
// internal to the library (hidden), so this test compiles it in.
#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <vector>

#include "tools/start_code.cpp"

namespace {

using namespace vorcal::tools;

TEST(FindStartCodePrefix, BothVariantsMatchReferenceOnRandomData)
{
    std::mt19937 rng(99);
    for (int round = 0; round < 5000; ++round) {
        // Zero bytes dense or sparse, a 01 often enough after them, and one planted prefix.
        const unsigned rarity = (round % 2 ? 8u : 100000u) >> (round % 3);
        std::vector<uint8_t> d(rng() % 400 + 3);
        for (auto &b : d) {
            const unsigned r = rng() % rarity;
            b = r == 0 ? 0 : (r == 1 ? 1 : static_cast<uint8_t>(rng() | 2));
        }
        const size_t at = rng() % (d.size() - 2), end = rng() % (d.size() + 1), from = rng() % (end + 3);
        d[at] = d[at + 1] = 0;
        d[at + 2] = 1;
        size_t ref = from;
        while (ref + 2 < end && !(d[ref] == 0 && d[ref + 1] == 0 && d[ref + 2] == 1))
            ++ref;
        ref = ref + 2 < end ? ref : end;
        ASSERT_EQ(FindStartCodePrefix(d.data(), from, end), ref) << round;
        // The copy variant: same result, the bytes before it copied, nothing at or past the room.
        if (from > end)
            continue;
        const size_t room = rng() % (end + 40);
        std::vector<uint8_t> dst(room + 16, 0xEE);
        ASSERT_EQ(FindStartCodePrefixCopy(d.data(), from, end, dst.data(), room), ref) << round;
        ASSERT_TRUE(std::equal(d.begin() + from, d.begin() + from + std::min(ref - from, room), dst.begin())) << round;
        ASSERT_EQ(std::vector<uint8_t>(dst.begin() + room, dst.end()), std::vector<uint8_t>(16, 0xEE)) << round;
    }
    for (uint8_t last : {1, 2}) { // a long zero run, with and without its 01
        std::vector<uint8_t> z(70, 0);
        z[69] = last;
        EXPECT_EQ(FindStartCodePrefix(z.data(), 0, z.size()), last == 1 ? 67u : 70u);
    }
}

TEST(FindStartCodePrefix, LargeFramesAcrossChunkAndBlockEdges)
{
    // Frames of several kilobytes reach the strided screen, the prefetch and the 4 KB chunks of
    // the copying search; prefixes are planted across a chunk edge, a block edge and the end.
    std::mt19937 rng(7);
    for (int round = 0; round < 300; ++round) {
        std::vector<uint8_t> d(4200 + rng() % 9000);
        for (auto &b : d)
            b = static_cast<uint8_t>(rng() | 2);
        const size_t edges[] = {4094, 4095, 4096, 128 * (rng() % (d.size() / 128 - 1)) + 127, d.size() - 3};
        const size_t at = edges[round % 5] - rng() % 2;
        d[at] = d[at + 1] = 0;
        d[at + 2] = 1;
        const size_t from = rng() % 3 == 0 ? 0 : rng() % at;
        ASSERT_EQ(FindStartCodePrefix(d.data(), from, d.size()), at) << round;
        std::vector<uint8_t> dst(d.size());
        ASSERT_EQ(FindStartCodePrefixCopy(d.data(), from, d.size(), dst.data(), dst.size()), at) << round;
        ASSERT_TRUE(std::equal(d.begin() + from, d.begin() + at, dst.begin())) << round;
    }
}

} // namespace
