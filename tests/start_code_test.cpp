// FindStartCodePrefix and its fused copy variant against a byte-by-byte reference, on random
// data with dense and sparse zero bytes and on every alignment. The search is internal to the
// library (hidden), so this test compiles it in.
#include <gtest/gtest.h>

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

// Random bytes where a zero appears with about 1/zeroRarity chance and a 1 after two zeros
// often enough to plant prefixes.
std::vector<uint8_t> RandomBytes(std::mt19937 &rng, size_t n, unsigned zeroRarity)
{
    std::vector<uint8_t> d(n);
    for (auto &b : d) {
        const unsigned r = rng() % zeroRarity;
        b = r == 0 ? 0 : (r == 1 ? 1 : static_cast<uint8_t>(rng() | 2));
    }
    return d;
}

TEST(FindStartCodePrefix, MatchesReferenceOnRandomData)
{
    std::mt19937 rng(1234);
    for (unsigned rarity : {3u, 8u, 64u, 100000u}) {
        for (int round = 0; round < 300; ++round) {
            const auto d = RandomBytes(rng, rng() % 300, rarity);
            const size_t end = d.empty() ? 0 : rng() % (d.size() + 1);
            const size_t from = rng() % (end + 3);
            ASSERT_EQ(FindStartCodePrefix(d.data(), from, end), Reference(d, from, end))
                << "rarity " << rarity << " size " << d.size() << " from " << from << " end " << end;
        }
    }
}

TEST(FindStartCodePrefix, EveryPositionAndBlockEdge)
{
    // A lone prefix at every offset of a 100-byte buffer, searched from every start.
    for (size_t at = 0; at + 3 <= 100; ++at) {
        std::vector<uint8_t> d(100, 0xFF);
        d[at] = 0;
        d[at + 1] = 0;
        d[at + 2] = 1;
        for (size_t from = 0; from < 100; from += 7)
            ASSERT_EQ(FindStartCodePrefix(d.data(), from, d.size()), Reference(d, from, d.size())) << at;
        // Cut just before the 01: not wholly inside.
        ASSERT_EQ(FindStartCodePrefix(d.data(), 0, at + 2), at + 2);
    }
    // Runs of zeros (00 00 00 ... 01) and zero pairs without a 01.
    std::vector<uint8_t> z(70, 0);
    z[69] = 1;
    EXPECT_EQ(FindStartCodePrefix(z.data(), 0, z.size()), 67u);
    z[69] = 2;
    EXPECT_EQ(FindStartCodePrefix(z.data(), 0, z.size()), z.size());
}

TEST(FindStartCodePrefixCopy, SameResultAndBytesWithinRoom)
{
    std::mt19937 rng(99);
    for (int round = 0; round < 2000; ++round) {
        const auto d = RandomBytes(rng, rng() % 400, round % 2 ? 300 : 20);
        const size_t from = d.empty() ? 0 : rng() % d.size();
        const size_t room = rng() % (d.size() + 40);
        std::vector<uint8_t> dst(room + 16, 0xEE); // guard bytes after the room
        const size_t r = FindStartCodePrefixCopy(d.data(), from, d.size(), dst.data(), room);
        ASSERT_EQ(r, Reference(d, from, d.size()));
        const size_t stop = r < d.size() ? r : d.size();
        const size_t n = stop > from ? std::min(stop - from, room) : 0;
        ASSERT_TRUE(std::equal(d.begin() + from, d.begin() + from + n, dst.begin())) << round;
        for (size_t k = room; k < dst.size(); ++k)
            ASSERT_EQ(dst[k], 0xEE) << "wrote past the room at " << k;
    }
}

} // namespace
