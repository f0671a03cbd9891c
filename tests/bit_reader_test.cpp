#include <gtest/gtest.h>

#include <vector>

#include <vorcal/video_tools.h>

#include "bit_writer.hpp"
#include "recording_sal.hpp"

namespace {

using Bytes = std::vector<uint8_t>;
using vorcal::test::BitWriter;

CALToolsBS Start(const Bytes &b)
{
    CALToolsBS bs{};
    bs.pBuffer = b.data();
    bs.uLength = static_cast<uint32_t>(b.size());
    for (int i = 0; i < 4; ++i)
        _LoadBS(&bs);
    _AlignBits(&bs);
    return bs;
}

TEST(BitReader, InitialisationAndFirstByte)
{
    const Bytes b{0x67, 0x42, 0x00, 0x1E, 0x99};
    CALToolsBS bs = Start(b);
    EXPECT_EQ(bs.uNextByte, 4u);
    EXPECT_EQ(_ReadNShiftBits(&bs, 8), 0x67u);
    EXPECT_EQ(bs.uCache, 0x42001E99u);
}

struct EscapeCase {
    Bytes in;
    Bytes expected; // first bytes seen through the reader
};

class EmulationPrevention : public testing::TestWithParam<EscapeCase> {};

TEST_P(EmulationPrevention, RemovedOnlyPastIndexThree)
{
    const EscapeCase &c = GetParam();
    Bytes padded = c.in;
    padded.resize(padded.size() + 8, 0xAA);
    CALToolsBS bs = Start(padded);
    for (size_t i = 0; i < c.expected.size(); ++i)
        EXPECT_EQ(_ReadNShiftBits(&bs, 8), c.expected[i]) << "byte " << i;
}

INSTANTIATE_TEST_SUITE_P(
    Table, EmulationPrevention,
    testing::Values(EscapeCase{{0x00, 0x00, 0x03, 0x01}, {0x00, 0x00, 0x03, 0x01}},
                    EscapeCase{{0x11, 0x22, 0x33, 0x00, 0x00, 0x03, 0x01}, {0x11, 0x22, 0x33, 0x00, 0x00, 0x01}},
                    // The test is on raw bytes: 00 00 03 03 keeps the second 03 ...
                    EscapeCase{{0x11, 0x22, 0x33, 0x00, 0x00, 0x03, 0x03, 0x44}, {0x11, 0x22, 0x33, 0x00, 0x00, 0x03, 0x44}},
                    // ... and 00 00 03 00 00 03 loses both.
                    EscapeCase{{0x11, 0x22, 0x33, 0x00, 0x00, 0x03, 0x00, 0x00, 0x03, 0x05},
                               {0x11, 0x22, 0x33, 0x00, 0x00, 0x00, 0x00, 0x05}},
                    // An escape at index 4 is the first one that can go.
                    EscapeCase{{0x00, 0x00, 0x00, 0x00, 0x03, 0x07}, {0x00, 0x00, 0x00, 0x00, 0x07}}));

struct UECase {
    uint32_t value;
    unsigned prefixBits; // bits consumed before the code, to test every bit position
};

class ExpGolomb : public testing::TestWithParam<UECase> {};

TEST_P(ExpGolomb, DecodesWhatTheWriterCoded)
{
    const UECase &c = GetParam();
    BitWriter w;
    w.Put(0x5, c.prefixBits).PutUE(c.value).Put(0x3, 2).Align();
    Bytes b = w.Bytes();
    b.resize(b.size() + 4, 0xFF);
    CALToolsBS bs = Start(b);
    _ShiftBits(&bs, c.prefixBits);
    EXPECT_EQ(_GetUE_V(&bs), c.value);
    EXPECT_EQ(_ReadNShiftBits(&bs, 2), 0x3u); // exactly the code was consumed
}

INSTANTIATE_TEST_SUITE_P(Codes, ExpGolomb,
                         testing::Values(UECase{0, 0}, UECase{1, 0}, UECase{2, 3}, UECase{3, 7}, UECase{7, 5},
                                         UECase{255, 1}, UECase{8190, 7}, UECase{4095, 6}));

TEST(ExpGolomb, LiteralCodes)
{
    // 1 -> 0, 010 -> 1, 011 -> 2, 00100 -> 3, 0001000 -> 7, packed: 1010 0110 0100 0001 000.
    const Bytes b{0xA6, 0x41, 0x00, 0xFF, 0xFF};
    CALToolsBS bs = Start(b);
    for (uint32_t expected : {0u, 1u, 2u, 3u, 7u})
        EXPECT_EQ(_GetUE_V(&bs), expected);
}

TEST(ExpGolomb, ThirtyTwoZeroBitsConsumeNothing)
{
    const Bytes b{0, 0, 0, 0, 0x80};
    CALToolsBS bs = Start(b);
    const CALToolsBS before = bs;
    EXPECT_EQ(_GetUE_V(&bs), 0xFFFFFFFFu);
    EXPECT_EQ(bs.uCache, before.uCache);
    EXPECT_EQ(bs.uBitPos, before.uBitPos);
    EXPECT_EQ(bs.uNextByte, before.uNextByte);
}

TEST(BitReader, NoOpsAndAlignment)
{
    const Bytes b{0xF0, 0x0F, 0xAA, 0x55, 0x12, 0x34};
    CALToolsBS bs = Start(b);
    EXPECT_EQ(_ReadNShiftBits(&bs, 0), 0u);
    EXPECT_EQ(_AlignBits(&bs), 0);
    EXPECT_EQ(_ShiftBytes(&bs, 0), 0);
    EXPECT_EQ(_ShiftBytes(&bs, -3), 0);
    EXPECT_EQ(bs.uNextByte, 4u);
    EXPECT_EQ(bs.uBitPos, 0u);
    _ShiftBits(&bs, 3);
    EXPECT_EQ(_AlignBits(&bs), 0);
    EXPECT_EQ(bs.uBitPos, 0u);
    EXPECT_EQ(_ReadNShiftBits(&bs, 8), 0x0Fu);
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

TEST(BitReader, EscapeInTheLastPositionReadsNothingBeyond)
{
    // The 03 is the last byte: the reader must not fetch its successor from outside.
    const Bytes b{0x11, 0x22, 0x33, 0x00, 0x00, 0x03};
    CALToolsBS bs = Start(b);
    _ShiftBytes(&bs, 2);
    EXPECT_EQ(_LoadBS(&bs), 1);
    EXPECT_EQ(bs.uCache & 0xFFu, 0u);
}

TEST(BitReader, ShortAndEmptyBuffers)
{
    for (size_t n = 0; n < 4; ++n) {
        const Bytes b(n, 0xFF);
        CALToolsBS bs{};
        bs.pBuffer = n ? b.data() : nullptr;
        bs.uLength = static_cast<uint32_t>(n);
        int32_t iLast = 0;
        for (int i = 0; i < 4; ++i)
            iLast = _LoadBS(&bs);
        EXPECT_EQ(iLast, 1) << n;
        EXPECT_EQ(_ReadNShiftBits(&bs, 32), n == 0 ? 0u : (0xFFFFFFFFu << (32 - 8 * n))) << n;
    }
}

TEST(BigEndian, Fields)
{
    const uint8_t p[4] = {0x01, 0x02, 0x03, 0x84};
    EXPECT_EQ(vorCALTools_ReadBigEndianValue16(p), 0x0102u);
    EXPECT_EQ(vorCALTools_ReadBigEndianValue24(p), 0x010203u);
    EXPECT_EQ(vorCALTools_ReadBigEndianValue32(p), 0x01020384u);
    EXPECT_EQ(vorCALTools_WriteBigEndianValue16(0x1234), 0x3412);
    EXPECT_EQ(_CountLeadingZeros32(0), 32u);
    EXPECT_EQ(_CountLeadingZeros32(1), 31u);
    EXPECT_EQ(_CountLeadingZeros32(0x80000000u), 0u);
}

} // namespace
