// Parse-only bit reader: the exactness limits of the wide, narrow and single-bit reads, the
// advance arithmetic that lets a narrow read act as a skip, and the one-slot bookmark.
#include <gtest/gtest.h>

#include <cstdint>
#include <tuple>
#include <vector>

#include <vorcal/aacparse.h>

namespace {

// Byte offset, bit position and processed bits of a reader over data.
std::tuple<long, uint32_t, uint32_t> At(const VrBitReader_OnlyParsing &r, const std::vector<uint8_t> &data)
{
    return {long(r.pCurrent - data.data()), r.uBitPos, r.uProcessedBits};
}

TEST(AacReader, ExactnessLimitsAndBookmark)
{
    std::vector<uint8_t> d = {0xC3, 0x5A, 0x96, 0xE1, 0x7F, 0x0F, 0, 0, 0, 0, 0, 0};
    VrBitReader_OnlyParsing r{};
    // At bit position p a wide read of 32 - p bits is the last exact one; one bit more yields 0
    // (shift count out of range) but still advances.
    for (uint32_t p = 0; p < 8; ++p) {
        VrInitBits_OnlyParsing(&r, d.data());
        VrFlushBits_OnlyParsing(&r, p);
        const uint32_t exact = 32 - p, expected = uint32_t(0xC35A96E1ull & ((uint64_t{1} << exact) - 1));
        EXPECT_EQ((std::tuple{VrShowBits_OnlyParsing(&r, exact), VrShowBits_OnlyParsing(&r, 25),
                              VrGetBits_OnlyParsing(&r, exact + 1), VrGetBits_OnlyParsing(&r, 0)}), // in order
                  std::make_tuple(expected, expected >> (exact - 25), 0u, 0u)) << p;
        EXPECT_EQ(At(r, d), std::make_tuple(4L, 1u, 33u)) << p;
    }
    // A narrow read spans two bytes; beyond 8 bits it still advances exactly, as a skip.
    VrInitBits_OnlyParsing(&r, d.data());
    VrFlushBits_OnlyParsing(&r, 5);
    EXPECT_EQ(VrGetBitsFast_OnlyParsing(&r, 8), 0b01101011u); // 011 and 01011
    VrGetBitsFast_OnlyParsing(&r, 19);
    EXPECT_EQ((std::tuple{VrGetBits_OnlyParsing(&r, 6), VrByteAlign_OnlyParsing(&r), VrByteAlign_OnlyParsing(&r),
                          VrGetBitsFast_OnlyParsing(&r, 4), VrGet1Bit_OnlyParsing(&r)}),
              std::make_tuple(0b011111u, 2, 0, 0u, 1u)); // the top of 0x7F, two bits to the boundary, 0x0F
    EXPECT_EQ(At(r, d), std::make_tuple(5L, 5u, 45u));
    // The bookmark restores position and count. A second save overwrites the slot;
    // initialisation keeps it, so a restore after a fresh start returns to the last save.
    VrInitBits_OnlyParsing(&r, d.data());
    VrFlushBits_OnlyParsing(&r, 5);
    VrBookMark_OnlyParsing(&r, 1);
    EXPECT_EQ(r.uBookmarkSet, 1u);
    VrGetBits_OnlyParsing(&r, 32);
    VrBookMark_OnlyParsing(&r, 0);
    EXPECT_EQ(std::tuple_cat(At(r, d), std::make_tuple(r.uBookmarkSet)), std::make_tuple(0L, 5u, 5u, 0u));
    VrFlushBits_OnlyParsing(&r, 10);
    VrBookMark_OnlyParsing(&r, 1);
    VrInitBits_OnlyParsing(&r, d.data() + 3);
    EXPECT_EQ(r.uBookmarkSet, 0u);
    VrBookMark_OnlyParsing(&r, 0);
    EXPECT_EQ(At(r, d), std::make_tuple(1L, 7u, 15u));
}

} // namespace
