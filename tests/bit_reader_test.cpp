#include <gtest/gtest.h>

#include <vorcal/video_tools.h>

#include "avc_streams.hpp"

namespace {

using namespace vorcal::test;

CALToolsBS Start(const Bytes &b)
{
    CALToolsBS bs{0, 0, 0, b.data(), 0, static_cast<uint32_t>(b.size())};
    for (int i = 0; i < 4; ++i)
        _LoadBS(&bs);
    return bs;
}

TEST(BitReader, WorkedExamplesAndNoOps)
{
    const Bytes b{0x67, 0x42, 0x00, 0x1E, 0x99, 0x0F, 0x12, 0x34};
    CALToolsBS bs = Start(b);
    EXPECT_EQ(_ReadNShiftBits(&bs, 0), 0u);
    EXPECT_EQ(_AlignBits(&bs), 0);
    EXPECT_EQ(_ShiftBytes(&bs, 0), 0);
    EXPECT_EQ(_ShiftBytes(&bs, -3), 0);
    EXPECT_EQ(_ReadNShiftBits(&bs, 8), 0x67u);
    EXPECT_EQ(bs.uCache, 0x42001E99u);
    _ShiftBits(&bs, 3);
    EXPECT_EQ(_AlignBits(&bs), 0);
    EXPECT_EQ(_ReadNShiftBits(&bs, 8), 0x00u); // the alignment skipped the rest of 0x42
    EXPECT_EQ(vorCALTools_ReadBigEndianValue24(b.data() + 3), 0x1E990Fu);
    EXPECT_EQ(vorCALTools_WriteBigEndianValue16(0x1234), 0x3412);
}

TEST(BitReader, EmulationPreventionOnlyPastIndexThree)
{
    const std::pair<Bytes, Bytes> cases[] = {
        {{0x00, 0x00, 0x03, 0x01}, {0x00, 0x00, 0x03, 0x01}}, {{0x11, 0x22, 0x33, 0x00, 0x00, 0x03, 0x01}, {0x11, 0x22, 0x33, 0x00, 0x00, 0x01}},
        // The test is on raw bytes: 00 00 03 03 keeps the second 03, 00 00 03 00 00 03 loses both.
        {{0x11, 0x22, 0x33, 0x00, 0x00, 0x03, 0x03, 0x44}, {0x11, 0x22, 0x33, 0x00, 0x00, 0x03, 0x44}},
        {{0x11, 0x22, 0x33, 0x00, 0x00, 0x03, 0x00, 0x00, 0x03, 0x05}, {0x11, 0x22, 0x33, 0x00, 0x00, 0x00, 0x00, 0x05}},
        // Index 3 is the last that stays, index 4 the first that can go.
        {{0x11, 0x00, 0x00, 0x03, 0x07}, {0x11, 0x00, 0x00, 0x03, 0x07}}, {{0x00, 0x00, 0x00, 0x00, 0x03, 0x07}, {0x00, 0x00, 0x00, 0x00, 0x07}}};
    for (const auto &[in, out] : cases) {
        const Bytes padded = Cat({in, Bytes(8, 0xAA)});
        CALToolsBS bs = Start(padded);
        for (uint8_t expected : out)
            EXPECT_EQ(_ReadNShiftBits(&bs, 8), expected) << testing::PrintToString(in);
    }
    // An escape as the last byte: its successor must not be fetched from outside.
    const Bytes b{0x11, 0x22, 0x33, 0x00, 0x00, 0x03};
    CALToolsBS bs = Start(b);
    EXPECT_EQ(_ShiftBytes(&bs, 2), 1);
    EXPECT_EQ(bs.uCache & 0xFFu, 0u);
}

TEST(ExpGolomb, LiteralCodesAndWriterRoundTripAtEveryBitPosition)
{
    // 1 -> 0, 010 -> 1, 011 -> 2, 00100 -> 3, 0001000 -> 7, packed: 1010 0110 0100 0001 000.
    const Bytes literal{0xA6, 0x41, 0x00, 0xFF, 0xFF};
    CALToolsBS bs = Start(literal);
    for (uint32_t expected : {0u, 1u, 2u, 3u, 7u})
        EXPECT_EQ(_GetUE_V(&bs), expected);
    // Codes up to 25 bits decode exactly at any bit position.
    for (uint32_t value : {0u, 5u, 255u, 4095u, 8190u}) {
        for (unsigned prefix = 0; prefix < 8; ++prefix) {
            const Bytes b = Cat({BitWriter().Put(0x5, prefix).PutUE(value).Put(0x3, 2).Align().Bytes(), {0xFF, 0xFF, 0xFF, 0xFF}});
            bs = Start(b);
            _ShiftBits(&bs, prefix);
            EXPECT_EQ(_GetUE_V(&bs), value) << prefix;
            EXPECT_EQ(_ReadNShiftBits(&bs, 2), 0x3u) << "the code alone was consumed";
        }
    }
    const Bytes zeros{0, 0, 0, 0, 0x80}; // 32 zero bits in view: no valid code, nothing consumed
    bs = Start(zeros);
    EXPECT_EQ(_GetUE_V(&bs), 0xFFFFFFFFu);
    _ShiftBits(&bs, 32);
    EXPECT_EQ(_ReadNShiftBits(&bs, 8), 0x80u);
}

TEST(BitReader, EndIsReportedByTheLoadOfTheLastByte)
{
    const Bytes b{1, 2, 3, 4, 5, 6};
    CALToolsBS bs = Start(b);
    EXPECT_EQ(_ShiftBytes(&bs, 2), 1);
    EXPECT_EQ(bs.uNextByte, 6u);
    EXPECT_EQ(bs.uCache, 0x03040506u); // its bits are still unread
    // Once the end is reached, skips and reads still report it, the bits still inside the
    // buffer keep their place and everything past the end reads as zeros.
    EXPECT_EQ(_ShiftBits(&bs, 16), 1);
    EXPECT_EQ(_ReadNShiftBits(&bs, 16), 0x0506u);
    EXPECT_EQ(_ReadNShiftBits(&bs, 16), 0x0000u);
    EXPECT_EQ(_ShiftBits(&bs, 0xFFFFFFFFu), 1); // a huge skip past the end returns at once
    EXPECT_EQ(_ShiftBytes(&bs, 0x7FFFFFFF), 1);
    EXPECT_EQ(_ReadNShiftBits(&bs, 8), 0u);
}

} // namespace
