#include <gtest/gtest.h>

#include <string>
#include <vector>

#include <vorcal/audio_tools.h>

#include "mute_test_util.hpp"
#include "recording_sal.hpp"

using namespace vorcal::test;

namespace {

using Generator = int32_t (*)(uint8_t **, uint32_t *, uint32_t);

struct AmrKind {
    const char *pName;
    Generator pGenerate;
    std::vector<uint32_t> sizes;   // RFC 4867 frame sizes, header byte included
    std::vector<uint32_t> digests; // of the published templates
    int iInfoLine;
    int iErrorLine;
};

const AmrKind kNb = {"NB", AMRNB_MuteFrame, {13, 14, 16, 18, 20, 21, 27, 32},
                     {0x85608B38, 0x4AD2E25C, 0xC8C4BF28, 0x8F62BD0B, 0xD94FC280, 0x4BC46A81, 0x774D63E4,
                      0x034D93F7},
                     189, 252};
const AmrKind kWb = {"WB", AMRWB_MuteFrame, {18, 24, 33, 37, 41, 47, 51, 59, 61},
                     {0xAA5BC1CE, 0x54F8408F, 0xB077DA04, 0xF5DA0D2B, 0xFA4E59CC, 0x4ADC6DC0, 0x7F5111E8,
                      0x22E08E7C, 0x31A10D1E},
                     264, 380};

class AmrMute : public testing::TestWithParam<const AmrKind *> {
protected:
    void SetUp() override { RecordingSal::Get().Reset(); }
    void TearDown() override { EXPECT_TRUE(RecordingSal::Get().liveBlocks.empty()); }
};

TEST_P(AmrMute, EveryFrameTypeIsAWholeStorageFormatFrame)
{
    const AmrKind &kind = *GetParam();
    const std::string info = std::string("[AAC_Mute, %d] AMR") + kind.pName + " FT = %d, FrameLen = %d\n";
    for (uint32_t uFT = 0; uFT < kind.sizes.size(); ++uFT) {
        SCOPED_TRACE(uFT);
        RecordingSal::Get().Reset();
        uint8_t *pFrame = nullptr;
        uint32_t uLen = 0;
        ASSERT_EQ(kind.pGenerate(&pFrame, &uLen, uFT), 0);
        ASSERT_NE(pFrame, nullptr);
        EXPECT_EQ(RecordingSal::Get().allocSizes, std::vector<uint32_t>{kind.sizes[uFT]});
        const std::vector<uint8_t> frame = TakeFrame(pFrame, uLen);
        ASSERT_EQ(frame.size(), kind.sizes[uFT]);
        EXPECT_EQ(frame[0], (uFT << 3) | 0x04); // FT and Q = 1
        EXPECT_EQ(Fnv1a(frame.data(), frame.size()), kind.digests[uFT]);
        EXPECT_TRUE(HasTrace(1, 0, info,
                             "[AAC_Mute, " + std::to_string(kind.iInfoLine) + "] AMR" + kind.pName +
                                 " FT = " + std::to_string(uFT) + ", FrameLen = " + std::to_string(frame.size()) +
                                 "\n"));
    }
}

TEST_P(AmrMute, RefusedFrameTypesAllocateNothing)
{
    const AmrKind &kind = *GetParam();
    const std::string error = std::string("[AAC_Mute, %d] AMR") + kind.pName + "_MuteFrame Error\n";
    for (uint32_t uFT : {static_cast<uint32_t>(kind.sizes.size()), 15u, 0xFFFFFFFFu}) {
        RecordingSal::Get().Reset();
        uint8_t sentinel = 0;
        uint8_t *pFrame = &sentinel;
        uint32_t uLen = 77;
        EXPECT_EQ(kind.pGenerate(&pFrame, &uLen, uFT), -1);
        EXPECT_EQ(pFrame, &sentinel);
        EXPECT_EQ(uLen, 77u);
        EXPECT_EQ(RecordingSal::Get().allocCount, 0u);
        EXPECT_TRUE(HasTrace(11, 0, error,
                             "[AAC_Mute, " + std::to_string(kind.iErrorLine) + "] AMR" + kind.pName +
                                 "_MuteFrame Error\n"));
    }
    uint32_t uLen = 0;
    uint8_t *pFrame = nullptr;
    EXPECT_EQ(kind.pGenerate(nullptr, &uLen, 0), -1);
    EXPECT_EQ(kind.pGenerate(&pFrame, nullptr, 0), -1);
}

INSTANTIATE_TEST_SUITE_P(NarrowAndWide, AmrMute, testing::Values(&kNb, &kWb),
                         [](const auto &info) { return std::string(info.param->pName); });

TEST(AmrMuteExamples, FirstBytes)
{
    RecordingSal::Get().Reset();
    const struct {
        Generator pGenerate;
        uint32_t uFT;
        std::vector<uint8_t> start;
    } cases[] = {{AMRNB_MuteFrame, 7, {0x3C, 0x48, 0xF9, 0x1F}},
                 {AMRNB_MuteFrame, 0, {0x04, 0x63, 0x3C, 0xC7}},
                 {AMRWB_MuteFrame, 8, {0x44, 0x11, 0x00, 0x00}}};
    for (const auto &c : cases) {
        uint8_t *pFrame = nullptr;
        uint32_t uLen = 0;
        ASSERT_EQ(c.pGenerate(&pFrame, &uLen, c.uFT), 0);
        EXPECT_EQ(TakeFrame(pFrame, 4), c.start);
    }
}

class DraMute : public testing::Test {
protected:
    void SetUp() override { RecordingSal::Get().Reset(); }
    void TearDown() override { EXPECT_TRUE(RecordingSal::Get().liveBlocks.empty()); }
};

TEST_F(DraMute, StereoTemplatesPerRate)
{
    const struct {
        uint32_t uRate;
        std::vector<uint8_t> frame;
    } cases[] = {{48000, {0x7F, 0xFF, 0x00, 0x5C, 0x13, 0xA0, 0x00, 0x1F}},
                 {44100, {0x7F, 0xFF, 0x00, 0x5B, 0x93, 0xA0, 0x00, 0x1F}},
                 {32000, {0x7F, 0xFF, 0x00, 0x5B, 0x13, 0xA0, 0x00, 0x1F}}};
    for (const auto &c : cases) {
        uint8_t *pFrame = nullptr;
        uint32_t uLen = 0;
        ASSERT_EQ(DRA_MuteFrame(&pFrame, &uLen, c.uRate, 2), 0);
        EXPECT_EQ(TakeFrame(pFrame, uLen), c.frame);
    }
    EXPECT_EQ(RecordingSal::Get().allocSizes, (std::vector<uint32_t>{8, 8, 8}));
    EXPECT_TRUE(RecordingSal::Get().traces.empty());
}

TEST_F(DraMute, Refusals)
{
    const std::string channels = "DRA_MuteFrame() channel num is not support %d\n";
    const std::string noLen = "DRA_MuteFrame() uFrameLen is NULL\n";
    uint8_t sentinel = 0;
    uint8_t *pFrame = &sentinel;
    uint32_t uLen = 77;
    const struct {
        uint8_t **ppFrame;
        uint32_t *puLen;
        uint32_t uRate;
        uint32_t uChannels;
        std::string format; // the one trace expected, empty for none
        std::string text;
    } cases[] = {
        {&pFrame, &uLen, 44100, 1, channels, "DRA_MuteFrame() channel num is not support 1\n"},
        {&pFrame, &uLen, 48000, 6, channels, "DRA_MuteFrame() channel num is not support 6\n"},
        {&pFrame, &uLen, 22050, 2, "", ""},
        {&pFrame, &uLen, 96000, 2, "", ""},
        {&pFrame, nullptr, 44100, 2, noLen, noLen},
        {nullptr, &uLen, 44100, 2, "", ""},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.uRate);
        RecordingSal::Get().Reset();
        EXPECT_EQ(DRA_MuteFrame(c.ppFrame, c.puLen, c.uRate, c.uChannels), -1);
        EXPECT_EQ(pFrame, &sentinel);
        EXPECT_EQ(uLen, 77u);
        EXPECT_EQ(RecordingSal::Get().allocCount, 0u);
        if (c.format.empty())
            EXPECT_TRUE(RecordingSal::Get().traces.empty());
        else
            EXPECT_TRUE(HasTrace(11, 0, c.format, c.text));
    }
}

} // namespace
