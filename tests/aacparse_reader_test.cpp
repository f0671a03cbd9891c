// Parse-only bit reader: the exactness limits of the wide, narrow and single-bit reads, the
// advance arithmetic that lets a narrow read act as a skip, and the one-slot bookmark.
#include <gtest/gtest.h>

#include <cstdint>
#include <random>
#include <vector>

#include <vorcal/aacparse.h>

#include "bit_writer.hpp"

namespace {

using vorcal::test::BitWriter;

struct Reader {
    explicit Reader(std::vector<uint8_t> bytes) : data(std::move(bytes))
    {
        data.resize(data.size() + 8, 0); // the reader fetches up to four bytes ahead
        VrInitBits_OnlyParsing(&bits, data.data());
    }
    uint32_t Offset() const { return static_cast<uint32_t>(bits.pCurrent - data.data()); }
    std::vector<uint8_t> data;
    VrBitReader_OnlyParsing bits{};
};

TEST(AacReader, TwelveBitsOfAnAdtsSyncWord)
{
    Reader r({0xFF, 0xF1, 0x50, 0x80});
    EXPECT_EQ(VrGetBits_OnlyParsing(&r.bits, 12), 0xFFFu);
    EXPECT_EQ(r.Offset(), 1u);
    EXPECT_EQ(r.bits.uBitPos, 4u);
    EXPECT_EQ(VrGetProcessedBits_OnlyParsing(&r.bits), 12u);
    EXPECT_EQ(VrShowBits_OnlyParsing(&r.bits, 4), 0x1u);
    EXPECT_EQ(VrGet1Bit_OnlyParsing(&r.bits), 0u);
}

TEST(AacReader, ZeroBitsReadNothing)
{
    Reader r({0xA5, 0x5A});
    EXPECT_EQ(VrGetBits_OnlyParsing(&r.bits, 0), 0u);
    EXPECT_EQ(r.Offset(), 0u);
    EXPECT_EQ(r.bits.uBitPos, 0u);
    EXPECT_EQ(r.bits.uProcessedBits, 0u);
}

// At bit position p, a wide read of 32 - p bits is the last exact one; one bit more yields 0
// (shift count out of range) but still advances: 25 bits are exact at position 7, 26 are not.
class AacReaderWideLimit : public ::testing::TestWithParam<uint32_t> {};

TEST_P(AacReaderWideLimit, ExactUpToThirtyTwoMinusPosition)
{
    const uint32_t p = GetParam();
    const std::vector<uint8_t> bytes = {0xC3, 0x5A, 0x96, 0xE1, 0x7F, 0x0F};
    Reader r(bytes);
    VrFlushBits_OnlyParsing(&r.bits, p);
    const uint64_t word = 0xC35A96E1; // the four bytes at offset 0
    const uint32_t exact = 32 - p;
    const uint32_t expected = static_cast<uint32_t>(word & ((uint64_t{1} << exact) - 1));
    EXPECT_EQ(VrShowBits_OnlyParsing(&r.bits, exact), expected);
    EXPECT_EQ(VrShowBits_OnlyParsing(&r.bits, 25), expected >> (exact - 25));
    EXPECT_EQ(VrShowBits_OnlyParsing(&r.bits, exact + 1), 0u);

    EXPECT_EQ(VrGetBits_OnlyParsing(&r.bits, exact + 1), 0u);
    EXPECT_EQ(r.bits.uProcessedBits, 33u);
    EXPECT_EQ(r.Offset(), 4u);
    EXPECT_EQ(r.bits.uBitPos, 1u);
}

INSTANTIATE_TEST_SUITE_P(BitPositions, AacReaderWideLimit, ::testing::Range(0u, 8u));

TEST(AacReader, NarrowReadCombinesTwoBytes)
{
    Reader r({0b10110101, 0b11001010});
    VrFlushBits_OnlyParsing(&r.bits, 5);
    // Last three bits of the first byte (101), first five of the second (11001).
    EXPECT_EQ(VrGetBitsFast_OnlyParsing(&r.bits, 8), 0b10111001u);
    EXPECT_EQ(r.Offset(), 1u);
    EXPECT_EQ(r.bits.uBitPos, 5u);
}

TEST(AacReader, NarrowReadSkipsNineteenBitsExactly)
{
    Reader r({0xFF, 0x00, 0xF3, 0xFF});
    VrFlushBits_OnlyParsing(&r.bits, 3);
    VrGetBitsFast_OnlyParsing(&r.bits, 19);
    EXPECT_EQ(r.bits.uProcessedBits, 22u);
    EXPECT_EQ(r.Offset(), 2u);
    EXPECT_EQ(r.bits.uBitPos, 6u);
    EXPECT_EQ(VrGetBits_OnlyParsing(&r.bits, 6), 0b111111u);
}

// Seeded random field widths written with the test writer and read back with every read kind
// within its exact range.
TEST(AacReader, RandomFieldsRoundTrip)
{
    for (uint32_t seed = 1; seed <= 20; ++seed) {
        SCOPED_TRACE(seed);
        std::mt19937 rng(seed);
        BitWriter w;
        std::vector<std::pair<uint32_t, uint32_t>> fields; // width, value
        for (int i = 0; i < 200; ++i) {
            const uint32_t n = 1 + rng() % 25;
            const uint32_t v = rng() & ((n == 32) ? 0xFFFFFFFFu : ((1u << n) - 1));
            fields.emplace_back(n, v);
            w.Put(v, n);
        }
        Reader r(w.Bytes());
        uint32_t total = 0;
        for (size_t i = 0; i < fields.size(); ++i) {
            const auto [n, v] = fields[i];
            uint32_t got;
            if (n == 1 && i % 2)
                got = VrGet1Bit_OnlyParsing(&r.bits);
            else if (n <= 8 && i % 3 == 0)
                got = VrGetBitsFast_OnlyParsing(&r.bits, n);
            else
                got = VrGetBits_OnlyParsing(&r.bits, n);
            ASSERT_EQ(got, v) << "field " << i << " of " << n << " bits";
            total += n;
            ASSERT_EQ(VrGetProcessedBits_OnlyParsing(&r.bits), total);
            ASSERT_EQ(r.Offset(), total / 8);
            ASSERT_EQ(r.bits.uBitPos, total % 8);
        }
    }
}

TEST(AacReader, ByteAlignCountsSkippedBits)
{
    Reader r({0xFF, 0xFF});
    VrFlushBits_OnlyParsing(&r.bits, 3);
    EXPECT_EQ(VrByteAlign_OnlyParsing(&r.bits), 5);
    EXPECT_EQ(r.bits.uProcessedBits, 8u);
    EXPECT_EQ(r.Offset(), 1u);
    EXPECT_EQ(VrByteAlign_OnlyParsing(&r.bits), 0);
    EXPECT_EQ(r.bits.uProcessedBits, 8u);
}

TEST(AacReader, BookmarkRestoresPositionAndCount)
{
    Reader r({0x12, 0x34, 0x56, 0x78, 0x9A, 0xBC, 0xDE});
    VrFlushBits_OnlyParsing(&r.bits, 5);
    VrBookMark_OnlyParsing(&r.bits, 1);
    EXPECT_EQ(r.bits.uBookmarkSet, 1u);
    VrGetBits_OnlyParsing(&r.bits, 32);
    VrBookMark_OnlyParsing(&r.bits, 0);
    EXPECT_EQ(r.Offset(), 0u);
    EXPECT_EQ(r.bits.uBitPos, 5u);
    EXPECT_EQ(r.bits.uProcessedBits, 5u);
    EXPECT_EQ(r.bits.uBookmarkSet, 0u);

    // A second save overwrites the slot; initialisation keeps it, so a restore after a fresh
    // start still returns to the last save.
    VrFlushBits_OnlyParsing(&r.bits, 10);
    VrBookMark_OnlyParsing(&r.bits, 1);
    VrInitBits_OnlyParsing(&r.bits, r.data.data() + 3);
    EXPECT_EQ(r.bits.uBookmarkSet, 0u);
    VrBookMark_OnlyParsing(&r.bits, 0);
    EXPECT_EQ(r.Offset(), 1u);
    EXPECT_EQ(r.bits.uBitPos, 7u);
    EXPECT_EQ(r.bits.uProcessedBits, 15u);
}

} // namespace
