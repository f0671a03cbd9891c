#include <gtest/gtest.h>

#include <tuple>

#include <vorcal/video_tools.h>

#include "avc_streams.hpp"

namespace {

using namespace vorcal::test;

int32_t Len(const Bytes &d) { return static_cast<int32_t>(d.size()); }

TEST(AvcFraming, CheckFormatAndFindStartCodeTables)
{
    const std::pair<Bytes, int32_t> formats[] = {
        {{}, 0}, {{0, 0, 1}, 0}, {{0, 0, 1, 0x67}, 2}, {{0, 0, 0, 1}, 2}, {{0, 0, 0, 0}, 1},
        {{0, 0, 2, 0}, 1}, {{0, 0, 0, 0x1C}, 1}, {{0x01, 0x42, 0xC0, 0x1E}, 1}, {{0, 1, 0, 0, 1}, 1}};
    for (const auto &[d, expected] : formats)
        EXPECT_EQ(vorCALTools_AVC_CheckFormat(d.data(), Len(d)), expected) << testing::PrintToString(d);
    // The 4-byte form is tested first at each offset and may end on the last byte; the 3-byte
    // form may not.
    const std::pair<Bytes, int32_t> searches[] = {
        {{0x41, 0, 0, 0, 1, 0x65}, 1}, {{0x41, 0, 0, 1, 0x65}, 1}, {{0, 0, 1}, -1},
        {{0x11, 0x22, 0, 0, 1}, -1}, {{0x11, 0, 0, 0, 1}, 1}, {{0, 0, 0, 0, 0, 1, 9}, 2}};
    for (const auto &[d, expected] : searches)
        EXPECT_EQ(vorCALTools_AVC_FindStartCode(d.data(), Len(d)), expected) << testing::PrintToString(d);
}

TEST(AvcFraming, NextNalEverySizeAndEveryWayOut)
{
    const Bytes five{0, 0, 0, 5, 1, 2, 3, 4, 5}, zeros(7, 0);
    const std::tuple<Bytes, int32_t, int32_t, int32_t> cases[] = {
        {Cat({five, {7}}), 0, 4, 9}, {five, 0, 4, -1}, {{0, 0, 2, 9, 9, 7}, 0, 3, 5},
        {{0, 2, 9, 9, 7}, 0, 2, 4}, {{9, 2, 9, 9, 7}, 1, 1, 4},
        {zeros, 0, 0, -1}, {zeros, 0, 5, -1},                  // refused sizes end every walk
        {{0xFF, 0xFF, 0xFF, 0xFE, 0, 0, 0, 0, 0}, 0, 4, -1}, // no wrap-around to a small offset
        {{0, 1, 0, 9}, -1, 2, -1}, {{0, 1, 0, 9}, 4, 2, -1}, {{0, 0, 0, 0, 0}, 3, 4, -1}};
    for (const auto &[d, pos, size, expected] : cases)
        EXPECT_EQ(_NEXT_NAL_(d.data(), Len(d), pos, size), expected) << testing::PrintToString(d) << " " << pos << " " << size;
}

TEST(AvcFraming, GetOneFrameEndsAtTheSliceWithANewKey)
{
    for (const auto &[keyA, keyB, code] : {std::tuple{0u, 1u, 4}, {0u, 1u, 3}, {3u, 3u, 4}, {7u, 7u, 3}}) {
        const Bytes first = AnnexB({kSps, kPps, Slice(0x65, keyA)}, code);
        const Bytes all = Cat({first, AnnexB({Slice(0x41, keyB)}, code)});
        EXPECT_EQ(vorCALTools_AVC_GetOneFrame(all.data(), Len(all)), keyA != keyB ? Len(first) : Len(all));
    }
    // A partition (type 2) with the same key stays; an auxiliary slice (type 19) with a new one ends it.
    auto retyped = [](Bytes u, uint8_t header) { u[0] = header; return u; };
    const Bytes first = AnnexB({Slice(0x65, 4)}), partition = AnnexB({retyped(Slice(0x41, 4), 0x22)});
    const Bytes parts = Cat({first, partition, AnnexB({retyped(Slice(0x41, 9), 0x13)})});
    EXPECT_EQ(vorCALTools_AVC_GetOneFrame(parts.data(), Len(parts)), Len(first) + Len(partition));
    // Four codes running into 32 zero bits give no valid key: the frame ends there.
    const Bytes noKey = AnnexB({kSps, Bytes{0x65, 0x00, 0x00, 0x00, 0x00, 0x00, 0x80}});
    EXPECT_EQ(vorCALTools_AVC_GetOneFrame(noKey.data(), Len(noKey)), 13);
    // Not start-code framed, too short or negative: the whole length.
    const Bytes lp = LengthPrefixed({kSps, Slice(0x65, 0), Slice(0x41, 1)}, 4), tiny{0, 0, 1, 0x65, 0x88};
    EXPECT_EQ(vorCALTools_AVC_GetOneFrame(lp.data(), Len(lp)), Len(lp));
    EXPECT_EQ(std::pair(vorCALTools_AVC_GetOneFrame(tiny.data(), 5), vorCALTools_AVC_GetOneFrame(tiny.data(), -3)), std::pair(5, -3));
}

} // namespace
