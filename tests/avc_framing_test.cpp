#include <gtest/gtest.h>

#include <random>

#include <vorcal/video_tools.h>

#include "avc_streams.hpp"
#include "recording_sal.hpp"

namespace {

using namespace vorcal::test;

struct FormatCase {
    Bytes data;
    int32_t expected;
};

class CheckFormat : public testing::TestWithParam<FormatCase> {};

TEST_P(CheckFormat, Table)
{
    const FormatCase &c = GetParam();
    EXPECT_EQ(vorCALTools_AVC_CheckFormat(c.data.data(), static_cast<int32_t>(c.data.size())), c.expected);
}

INSTANTIATE_TEST_SUITE_P(
    Framings, CheckFormat,
    testing::Values(FormatCase{{}, 0}, FormatCase{{0, 0, 1}, 0}, FormatCase{{0, 0, 1, 0x67}, 2},
                    FormatCase{{0, 0, 0, 1}, 2}, FormatCase{{0, 0, 0, 0}, 1}, FormatCase{{0, 0, 2, 0}, 1},
                    FormatCase{{0, 0, 0, 0x1C}, 1}, FormatCase{{0x01, 0x42, 0xC0, 0x1E}, 1},
                    FormatCase{{0, 1, 0, 0, 1}, 1}));

// The search as the framing defines it: at each offset below length - 3 the 4-byte form first.
int32_t ReferenceFindStartCode(const Bytes &d)
{
    const int32_t n = static_cast<int32_t>(d.size());
    for (int32_t i = 0; i < n - 3; ++i) {
        if (d[i] == 0 && d[i + 1] == 0 && d[i + 2] == 0 && d[i + 3] == 1)
            return i;
        if (d[i] == 0 && d[i + 1] == 0 && d[i + 2] == 1)
            return i;
    }
    return -1;
}

struct SearchCase {
    Bytes data;
    int32_t expected;
};

class FindStartCode : public testing::TestWithParam<SearchCase> {};

TEST_P(FindStartCode, Table)
{
    const SearchCase &c = GetParam();
    EXPECT_EQ(vorCALTools_AVC_FindStartCode(c.data.data(), static_cast<int32_t>(c.data.size())), c.expected);
}

INSTANTIATE_TEST_SUITE_P(
    Offsets, FindStartCode,
    testing::Values(SearchCase{{0x41, 0, 0, 0, 1, 0x65}, 1}, SearchCase{{0x41, 0, 0, 1, 0x65}, 1},
                    SearchCase{{0, 0, 1}, -1}, SearchCase{{0x11, 0x22, 0, 0, 1}, -1},
                    // The 4-byte form may end on the last byte; the 3-byte form may not.
                    SearchCase{{0x11, 0, 0, 0, 1}, 1}, SearchCase{{0, 0, 0, 0, 0, 1, 9}, 2},
                    SearchCase{{0, 0, 1, 0x65}, 0}, SearchCase{{0, 0, 2, 0, 0, 2, 0}, -1}));

TEST(FindStartCode, MatchesReferenceOnRandomData)
{
    std::mt19937 rng(7);
    for (int round = 0; round < 5000; ++round) {
        Bytes d(rng() % 80);
        for (auto &b : d)
            b = static_cast<uint8_t>(rng() % 3 == 0 ? rng() % 2 : rng());
        ASSERT_EQ(vorCALTools_AVC_FindStartCode(d.data(), static_cast<int32_t>(d.size())), ReferenceFindStartCode(d));
    }
}

struct NextNalCase {
    Bytes data;
    int32_t pos;
    int32_t size;
    int32_t expected;
};

class NextNal : public testing::TestWithParam<NextNalCase> {};

TEST_P(NextNal, Table)
{
    const NextNalCase &c = GetParam();
    EXPECT_EQ(_NEXT_NAL_(c.data.data(), static_cast<int32_t>(c.data.size()), c.pos, c.size), c.expected);
}

const Bytes kFive{0, 0, 0, 5, 1, 2, 3, 4, 5};
INSTANTIATE_TEST_SUITE_P(
    Sizes, NextNal,
    testing::Values(NextNalCase{Cat({kFive, {7}}), 0, 4, 9}, NextNalCase{kFive, 0, 4, -1},
                    NextNalCase{{0, 0, 2, 9, 9, 7}, 0, 3, 5}, NextNalCase{{0, 2, 9, 9, 7}, 0, 2, 4},
                    NextNalCase{{2, 9, 9, 7}, 0, 1, 3}, NextNalCase{{9, 2, 9, 9, 7}, 1, 1, 4},
                    // Refused sizes end every walk.
                    NextNalCase{{0, 0, 0, 0, 0, 0, 0}, 0, 0, -1}, NextNalCase{{0, 0, 0, 0, 0, 0, 0}, 0, 5, -1},
                    NextNalCase{{0, 0, 0, 0, 0, 0, 0}, 0, -2, -1},
                    // A huge length never wraps around to a small offset.
                    NextNalCase{{0xFF, 0xFF, 0xFF, 0xFE, 0, 0, 0, 0, 0}, 0, 4, -1},
                    NextNalCase{{0x7F, 0xFF, 0xFF, 0xFF, 0, 0, 0}, 0, 4, -1},
                    // Positions outside the data, and a length field cut by the end.
                    NextNalCase{{0, 1, 0, 9}, -1, 2, -1}, NextNalCase{{0, 1, 0, 9}, 4, 2, -1},
                    NextNalCase{{0, 0, 0, 0, 0}, 3, 4, -1}));

// GetOneFrame on SPS, PPS, IDR slice with key A, slice with key B.
struct OneFrameCase {
    uint32_t keyA;
    uint32_t keyB;
    int codeLength;
};

class GetOneFrame : public testing::TestWithParam<OneFrameCase> {};

TEST_P(GetOneFrame, EndsAtTheSliceWithANewKey)
{
    const OneFrameCase &c = GetParam();
    const Bytes first = AnnexB({kSps, kPps, Slice(0x65, c.keyA)}, {c.codeLength});
    const Bytes all = Cat({first, AnnexB({Slice(0x41, c.keyB)}, {c.codeLength})});
    const int32_t n = static_cast<int32_t>(all.size());
    EXPECT_EQ(vorCALTools_AVC_GetOneFrame(all.data(), n), c.keyA != c.keyB ? static_cast<int32_t>(first.size()) : n);
}

INSTANTIATE_TEST_SUITE_P(Keys, GetOneFrame,
                         testing::Values(OneFrameCase{0, 1, 4}, OneFrameCase{0, 1, 3}, OneFrameCase{3, 3, 4},
                                         OneFrameCase{5, 2, 3}, OneFrameCase{7, 7, 3}));

TEST(GetOneFrame, PartitionsAndAuxiliarySlicesCount)
{
    Bytes partition = Slice(0x41, 4);
    partition[0] = 0x22; // nal_unit_type 2
    Bytes aux = Slice(0x41, 9);
    aux[0] = 0x13; // nal_unit_type 19
    const Bytes first = AnnexB({Slice(0x65, 4)});
    const Bytes a = Cat({first, AnnexB({partition, aux})});
    // The partition carries the same key; the auxiliary slice starts the next picture.
    EXPECT_EQ(vorCALTools_AVC_GetOneFrame(a.data(), static_cast<int32_t>(a.size())),
              static_cast<int32_t>(first.size() + 4 + partition.size()));
}

TEST(GetOneFrame, NoValidCodeEndsAtOnce)
{
    // A slice whose four codes run into 32 zero bits: key 0xFFFFFFFF ends the frame there.
    const Bytes a = AnnexB({kSps, Bytes{0x65, 0x00, 0x00, 0x00, 0x00, 0x00, 0x80}});
    EXPECT_EQ(vorCALTools_AVC_GetOneFrame(a.data(), static_cast<int32_t>(a.size())), 13);
}

TEST(GetOneFrame, WholeLengthCases)
{
    const Bytes lengthPrefixed = LengthPrefixed({kSps, Slice(0x65, 0), Slice(0x41, 1)}, 4);
    EXPECT_EQ(vorCALTools_AVC_GetOneFrame(lengthPrefixed.data(), static_cast<int32_t>(lengthPrefixed.size())),
              static_cast<int32_t>(lengthPrefixed.size()));
    const Bytes shortOne{0, 0, 1, 0x65, 0x88};
    EXPECT_EQ(vorCALTools_AVC_GetOneFrame(shortOne.data(), 5), 5);
    EXPECT_EQ(vorCALTools_AVC_GetOneFrame(shortOne.data(), -3), -3);
}

} // namespace
