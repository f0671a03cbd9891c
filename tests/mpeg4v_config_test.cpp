#include <gtest/gtest.h>

#include <cstring>
#include <memory>
#include <tuple>
#include <vector>

#include <vorcal/video_tools.h>

#include "bit_writer.hpp"

using vorcal::test::BitWriter;
using Bytes = std::vector<uint8_t>;

// Beside the record's own (global) namespace, so that gtest finds them.
static bool operator==(const CALMPEG4DSIInfo &a, const CALMPEG4DSIInfo &b)
{
    return std::memcmp(&a, &b, sizeof a) == 0;
}

static std::ostream &operator<<(std::ostream &os, const CALMPEG4DSIInfo &i)
{
    return os << "{profile " << i.uProfile << ", level " << i.uLevel << ", format " << i.uSourceFormat << ", "
              << i.uWidth << "x" << i.uHeight << "}";
}

namespace {

constexpr uint32_t kUntouched = 77;

CALMPEG4DSIInfo Preset()
{
    return {kUntouched, kUntouched, kUntouched, kUntouched, kUntouched};
}

// Runs the walk on an exactly-sized heap copy, so that ASan sees any read past the DSI.
std::pair<uint32_t, CALMPEG4DSIInfo> Walk(const Bytes &dsi, size_t n = SIZE_MAX)
{
    n = std::min(n, dsi.size());
    std::unique_ptr<uint8_t[]> copy(new uint8_t[n]);
    if (n != 0)
        std::memcpy(copy.get(), dsi.data(), n);
    CALMPEG4DSIInfo info = Preset();
    const uint32_t result = vorCALTools_MPEG4V_GetDSIInfo(copy.get(), uint32_t(n), &info);
    return {result, info};
}

Bytes Concat(std::initializer_list<Bytes> parts)
{
    Bytes out;
    for (const Bytes &part : parts)
        out.insert(out.end(), part.begin(), part.end());
    return out;
}

const Bytes kVosSimpleL3 = {0, 0, 1, 0xB0, 0x03};
const Bytes kVisualObject = {0, 0, 1, 0xB5, 0x09};
const Bytes kVideoObject = {0, 0, 1, 0x00};
const Bytes kVolStart = {0, 0, 1, 0x20};
const Bytes kTail = {0x5A, 0x5A, 0x5A, 0x5A, 0x5A, 0x5A, 0x5A, 0x5A};

struct Vol {
    bool objectLayerId = false;
    uint32_t aspectRatioInfo = 1;
    int controlParameters = 0; // 0 absent, 1 without VBV parameters, 2 with them
    uint32_t resolution = 30000;
    bool fixedRate = false;
    uint32_t width = 352;
    uint32_t height = 288;
};

// video_object_layer() after its start code, ISO/IEC 14496-2 6.2.3, rectangular shape.
Bytes VolBody(const Vol &v)
{
    BitWriter w;
    w.Put(0, 1).Put(0x01, 8);            // random_accessible_vol, video_object_type_indication
    w.Put(v.objectLayerId, 1);
    if (v.objectLayerId)
        w.Put(2, 4).Put(1, 3);           // video_object_layer_verid, _priority
    w.Put(v.aspectRatioInfo, 4);
    if (v.aspectRatioInfo == 15)
        w.Put(12, 8).Put(11, 8);         // par_width, par_height
    w.Put(v.controlParameters != 0, 1);
    if (v.controlParameters != 0) {
        w.Put(1, 2).Put(1, 1).Put(v.controlParameters == 2, 1); // chroma_format, low_delay, vbv_parameters
        if (v.controlParameters == 2) {
            w.Put(0x7FFF, 15).Put(1, 1).Put(0x7FFF, 15).Put(1, 1); // bit rate halves
            w.Put(0x7FFF, 15).Put(1, 1).Put(7, 3);                 // buffer size halves
            w.Put(0x7FF, 11).Put(1, 1).Put(0x7FFF, 15).Put(1, 1);  // occupancy halves
        }
    }
    w.Put(0, 2).Put(1, 1).Put(v.resolution, 16).Put(1, 1).Put(v.fixedRate, 1);
    if (v.fixedRate) {
        unsigned bits = 1;
        while ((1u << bits) < v.resolution)
            ++bits;
        w.Put(v.resolution - 1, bits);   // fixed_vop_time_increment, all ones where possible
    }
    w.Put(1, 1).Put(v.width, 13).Put(1, 1).Put(v.height, 13).Put(1, 1);
    w.Put(0, 1).Put(1, 1).Put(0, 1);     // interlaced, obmc_disable, sprite_enable
    return w.Align().Bytes();
}

Bytes SimpleDsi(const Vol &v)
{
    return Concat({kVosSimpleL3, kVisualObject, kVideoObject, kVolStart, VolBody(v), kTail});
}

// profile_and_level_indication -> profile, level.
class ProfileLevelTest : public ::testing::TestWithParam<std::tuple<uint8_t, uint32_t, uint32_t>> {};

TEST_P(ProfileLevelTest, Mapping)
{
    const auto [indication, profile, level] = GetParam();
    const auto [result, info] = Walk(Concat({{0, 0, 1, 0xB0, indication}, kVisualObject, kTail}));
    EXPECT_EQ(result, 0u);
    EXPECT_EQ(info.uProfile, profile);
    EXPECT_EQ(info.uLevel, level);
    EXPECT_EQ(info.uWidth, kUntouched);
}

INSTANTIATE_TEST_SUITE_P(Indications, ProfileLevelTest,
                         ::testing::Values(std::make_tuple(0x01, 0u, 1u), std::make_tuple(0x02, 0u, 2u),
                                           std::make_tuple(0x03, 0u, 3u), std::make_tuple(0x04, 0u, 4u),
                                           std::make_tuple(0x05, 0u, 5u), std::make_tuple(0x08, 0u, 0u),
                                           std::make_tuple(0x09, 0u, 0u), std::make_tuple(0x11, 1u, 1u),
                                           std::make_tuple(0x12, 1u, 2u), std::make_tuple(0x00, 255u, 255u),
                                           std::make_tuple(0x06, 255u, 255u), std::make_tuple(0x10, 255u, 255u),
                                           std::make_tuple(0xF0, 255u, 255u), std::make_tuple(0xF5, 255u, 255u)));

// Every combination of the optional VOL fields in front of the picture size.
class VolTest : public ::testing::TestWithParam<std::tuple<bool, uint32_t, int, std::pair<uint32_t, bool>,
                                                           std::pair<uint32_t, uint32_t>>> {};

TEST_P(VolTest, PictureSize)
{
    const auto [oli, ari, control, rate, size] = GetParam();
    Vol v;
    v.objectLayerId = oli;
    v.aspectRatioInfo = ari;
    v.controlParameters = control;
    v.resolution = rate.first;
    v.fixedRate = rate.second;
    v.width = size.first;
    v.height = size.second;
    const auto [result, info] = Walk(SimpleDsi(v));
    EXPECT_EQ(result, 0u);
    EXPECT_EQ(info, (CALMPEG4DSIInfo{0, 3, kUntouched, size.first, size.second}));
}

INSTANTIATE_TEST_SUITE_P(
    Fields, VolTest,
    ::testing::Combine(::testing::Bool(), ::testing::Values(1u, 15u), ::testing::Values(0, 1, 2),
                       ::testing::Values(std::make_pair(1u, true), std::make_pair(2u, true),
                                         std::make_pair(25u, false), std::make_pair(30000u, true),
                                         std::make_pair(65535u, true)),
                       ::testing::Values(std::make_pair(352u, 288u), std::make_pair(176u, 144u),
                                         std::make_pair(1920u, 1080u), std::make_pair(8191u, 2u))));

TEST(GetDSIInfo, EmptyOrNull)
{
    CALMPEG4DSIInfo info = Preset();
    const uint8_t byte = 0;
    EXPECT_EQ(vorCALTools_MPEG4V_GetDSIInfo(&byte, 0, &info), 1u);
    EXPECT_EQ(vorCALTools_MPEG4V_GetDSIInfo(nullptr, 0, &info), 1u);
    EXPECT_EQ(vorCALTools_MPEG4V_GetDSIInfo(nullptr, 16, &info), 0u);
    EXPECT_EQ(info, Preset());
}

// Which headers the walk acts on, and in what order.
TEST(GetDSIInfo, HeaderWalk)
{
    const Bytes vol = VolBody(Vol{});
    struct Case {
        const char *name;
        Bytes dsi;
        CALMPEG4DSIInfo expected;
    } cases[] = {
        {"TypicalSimpleProfile", SimpleDsi(Vol{}), {0, 3, kUntouched, 352, 288}},
        {"LayerWithoutVideoObject", Concat({kVosSimpleL3, kVolStart, vol, kTail}), {0, 3, kUntouched, kUntouched, kUntouched}},
        {"UserDataBetweenObjectAndLayer",
         Concat({kVideoObject, {0, 0, 1, 0xB2, 'x'}, kVolStart, vol, kTail}),
         Preset()},
        {"LayerAfterGarbage", Concat({{0xFF, 0x12}, kVideoObject, kVolStart, vol, kTail}),
         {kUntouched, kUntouched, kUntouched, 352, 288}},
        {"SequenceEndStopsTheWalk",
         Concat({kVosSimpleL3, {0, 0, 1, 0xB1}, {0, 0, 1, 0xB0, 0xF0}, kVideoObject, kVolStart, vol, kTail}),
         {0, 3, kUntouched, kUntouched, kUntouched}},
        {"LaterHeadersOverwrite",
         Concat({kVosSimpleL3, kVideoObject, kVolStart, vol, {0, 0, 1, 0xB0, 0x12}, kVideoObject, kVolStart,
                 VolBody(Vol{false, 1, 0, 30000, false, 176, 144}), kTail}),
         {1, 2, kUntouched, 176, 144}},
    };
    for (const Case &c : cases) {
        const auto [result, info] = Walk(c.dsi);
        EXPECT_EQ(result, 0u) << c.name;
        EXPECT_EQ(info, c.expected) << c.name;
    }
}

// An H.263 short-header picture (ITU-T H.263 5.1), optionally with PLUSPTYPE.
struct Short {
    uint32_t sourceFormat;
    uint32_t ufep = 1;
    uint32_t extendedFormat = 6;
    uint32_t widthIndication = 79;
    uint32_t heightIndication = 60;
};

Bytes ShortHeader(const Short &s)
{
    BitWriter w;
    w.Put(0x20, 22).Put(0x55, 8);         // short_video_start_marker / PSC, temporal_reference
    w.Put(0b10, 2).Put(0, 3).Put(s.sourceFormat, 3);
    if (s.sourceFormat != 7) {
        w.Put(0, 1).Put(0, 4).Put(8, 5).Put(0, 1).Put(0, 1); // coding type, options, PQUANT, CPM, PEI
    } else {
        w.Put(s.ufep, 3);
        if (s.ufep == 1)
            w.Put(s.extendedFormat, 3).Put(0, 1).Put(0b00000000001000, 14); // OPPTYPE
        w.Put(0, 3).Put(0, 3).Put(0b001, 3).Put(0, 1);                    // MPPTYPE, CPM
        if (s.ufep == 1 && s.extendedFormat == 6)
            w.Put(1, 4).Put(s.widthIndication, 9).Put(1, 1).Put(s.heightIndication, 9); // CPFMT
        w.Put(8, 5);                                                      // PQUANT
    }
    return Concat({w.Align().Bytes(), kTail});
}

TEST(GetDSIInfo, ShortHeader)
{
    struct Case {
        Short header;
        uint32_t width, height;
    } cases[] = {
        {{0}, 0, 0},
        {{1}, 128, 96},
        {{2}, 176, 144},
        {{3}, 352, 288},
        {{4}, 704, 576},
        {{5}, 1408, 1152},
        {{6}, 0, 0}, // reserved source format: no size
        {{7, 1, 6, 79, 60}, 320, 240},
        {{7, 1, 6, 0, 1}, 4, 4},
        {{7, 1, 6, 511, 511}, 2048, 2044},
        {{7, 1, 2}, 176, 144},
        {{7, 1, 5}, 1408, 1152},
        {{7, 1, 7}, 0, 0},
        {{7, 0}, 0, 0},
        {{7, 3}, 0, 0},
    };
    for (const Case &c : cases) {
        const auto [result, info] = Walk(Concat({{0x12, 0x34}, ShortHeader(c.header)}));
        EXPECT_EQ(result, 0u);
        EXPECT_EQ(info, (CALMPEG4DSIInfo{kUntouched, kUntouched, c.header.sourceFormat, c.width, c.height}))
            << c.header.sourceFormat << "/" << c.header.ufep << "/" << c.header.extendedFormat;
    }
    // The literal picture header 00 00 80 02 08: QCIF.
    EXPECT_EQ(Walk(Concat({{0, 0, 0x80, 0x02, 0x08}, kTail})).second,
              (CALMPEG4DSIInfo{kUntouched, kUntouched, 2, 176, 144}));
    // The end marker stops the walk before a second picture.
    const auto [result, info] = Walk(Concat({ShortHeader({2}), {0, 0, 0xFC, 0x00}, ShortHeader({3})}));
    EXPECT_EQ(result, 0u);
    EXPECT_EQ(info.uWidth, 176u);
}

// Every prefix of real-looking configurations, each in an exactly-sized buffer: the walk stays
// inside, and the full data gives the full answer.
TEST(GetDSIInfo, EveryPrefix)
{
    const Bytes inputs[] = {
        SimpleDsi(Vol{true, 15, 2, 30000, true, 720, 576}),
        Concat({kVosSimpleL3, kVideoObject, kVolStart}),
        ShortHeader({7, 1, 6, 79, 60}),
        {0, 0, 1, 0, 0, 0, 1, 0x20, 0x00, 0x00, 0x03, 0x00, 0x00, 0x03},
    };
    for (const Bytes &dsi : inputs) {
        for (size_t n = 0; n <= dsi.size(); ++n) {
            const auto [result, info] = Walk(dsi, n);
            EXPECT_EQ(result, n == 0 ? 1u : 0u) << n;
        }
    }
    EXPECT_EQ(Walk(inputs[0]).second, (CALMPEG4DSIInfo{0, 3, kUntouched, 720, 576}));
    EXPECT_EQ(Walk(inputs[2]).second, (CALMPEG4DSIInfo{kUntouched, kUntouched, 7, 320, 240}));
}

TEST(VC1GetExtraDataInfo, Profile)
{
    const std::pair<uint8_t, uint32_t> cases[] = {{0x4E, 1}, {0xC0, 3}, {0x00, 0}, {0xBF, 2}};
    for (auto [byte0, profile] : cases) {
        const uint8_t extra[] = {byte0};
        uint32_t out = kUntouched;
        EXPECT_EQ(vorCALTools_VC1_GetExtraDataInfo(extra, 1, &out), 0u);
        EXPECT_EQ(out, profile);
    }
    uint32_t out = kUntouched;
    const uint8_t extra[] = {0xC0};
    EXPECT_EQ(vorCALTools_VC1_GetExtraDataInfo(nullptr, 4, &out), 1u);
    EXPECT_EQ(vorCALTools_VC1_GetExtraDataInfo(extra, 0, &out), 1u);
    EXPECT_EQ(vorCALTools_VC1_GetExtraDataInfo(extra, 1, nullptr), 1u);
    EXPECT_EQ(out, kUntouched);
}

} // namespace
