#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

#include <vorcal/audio_tools.h>

#include "mute_test_util.hpp"

using namespace vorcal::test;

namespace {

// FNV-1a, 32 bits: the digests were taken from the templates' published hex.
uint32_t Fnv1a(const std::vector<uint8_t> &bytes)
{
    uint32_t h = 0x811C9DC5u;
    for (uint8_t b : bytes)
        h = (h ^ b) * 0x01000193u;
    return h;
}

using Call = int32_t (*)(uint8_t **, uint32_t *, uint32_t);
const Call kAac = [](uint8_t **pp, uint32_t *pu, uint32_t u) { return AAC_MuteFrame(pp, pu, 0, 8000, 1, 0, int(u)); };
const Call kDra = [](uint8_t **pp, uint32_t *pu, uint32_t u) { return DRA_MuteFrame(pp, pu, u, 2); };
const Call kNb = AMRNB_MuteFrame, kWb = AMRWB_MuteFrame;

// Every template (AAC modes, AMR frame types, DRA rates) makes one allocation of its size, which
// may fail with nothing stored; the AMR frames trace type and length.
TEST(MuteFrames, EveryTemplateIsByteExact)
{
    const struct {
        Call call;
        uint32_t uArg, uSize, uDigest;
    } cases[] = {
        {kAac, 0, 11, 0x81044C79}, {kAac, 1, 17, 0xC56A0CBA}, {kAac, 2, 22, 0xD69C5840}, {kAac, 3, 31, 0x7EC008AE},
        {kAac, 4, 24, 0x6509E72F}, {kNb, 0, 13, 0x85608B38},  {kNb, 1, 14, 0x4AD2E25C},  {kNb, 2, 16, 0xC8C4BF28},
        {kNb, 3, 18, 0x8F62BD0B},  {kNb, 4, 20, 0xD94FC280},  {kNb, 5, 21, 0x4BC46A81},  {kNb, 6, 27, 0x774D63E4},
        {kNb, 7, 32, 0x034D93F7},  {kWb, 0, 18, 0xAA5BC1CE},  {kWb, 1, 24, 0x54F8408F},  {kWb, 2, 33, 0xB077DA04},
        {kWb, 3, 37, 0xF5DA0D2B},  {kWb, 4, 41, 0xFA4E59CC},  {kWb, 5, 47, 0x4ADC6DC0},  {kWb, 6, 51, 0x7F5111E8},
        {kWb, 7, 59, 0x22E08E7C},  {kWb, 8, 61, 0x31A10D1E},  {kDra, 48000, 8, 0x5F535CA1},
        {kDra, 44100, 8, 0x151E53A8}, {kDra, 32000, 8, 0x448A9128}, // 7F FF 00 5B 93 A0 00 1F at 44100
    };
    RecordingSal &sal = RecordingSal::Get();
    for (const auto &c : cases) {
        SCOPED_TRACE(testing::Message() << c.uArg << ", " << c.uSize << " bytes");
        sal.Reset();
        uint8_t sentinel = 0, *pFrame = &sentinel;
        uint32_t uLen = 0;
        sal.FailAllocation(1);
        EXPECT_EQ(c.call(&pFrame, &uLen, c.uArg), -1);
        EXPECT_EQ(pFrame, &sentinel);
        sal.Reset();
        ASSERT_EQ(c.call(&pFrame, &uLen, c.uArg), 0);
        EXPECT_EQ(sal.allocSizes, std::vector<uint32_t>{c.uSize});
        EXPECT_EQ(Fnv1a(TakeFrame(pFrame, uLen)), c.uDigest);
        const std::string amr = c.call == kNb ? "[AAC_Mute, 189] AMRNB" : "[AAC_Mute, 264] AMRWB";
        EXPECT_TRUE((c.call != kNb && c.call != kWb) ||
                    HasNumberedTrace(1, amr + " FT = " + std::to_string(c.uArg) + ", FrameLen = " +
                                            std::to_string(c.uSize) + "\n"));
    }
}

// Refused calls allocate nothing, leave the outputs alone and leave one trace, or none.
TEST(MuteFrames, Refusals)
{
    uint8_t sentinel = 0, *pFrame = &sentinel;
    uint32_t uLen = 77;
    const std::pair<std::function<int32_t()>, std::string> cases[] = {
        {[&] { return AMRNB_MuteFrame(&pFrame, &uLen, 8); }, "[AAC_Mute, 252] AMRNB_MuteFrame Error\n"},
        {[&] { return AMRWB_MuteFrame(&pFrame, &uLen, 9); }, "[AAC_Mute, 380] AMRWB_MuteFrame Error\n"},
        {[&] { return AMRNB_MuteFrame(nullptr, &uLen, 0); }, ""},
        {[&] { return AMRWB_MuteFrame(&pFrame, nullptr, 0); }, ""},
        {[&] { return DRA_MuteFrame(&pFrame, &uLen, 44100, 1); }, "DRA_MuteFrame() channel num is not support 1\n"},
        {[&] { return DRA_MuteFrame(&pFrame, &uLen, 22050, 2); }, ""},
        {[&] { return DRA_MuteFrame(&pFrame, nullptr, 44100, 2); }, "DRA_MuteFrame() uFrameLen is NULL\n"},
        {[&] { return DRA_MuteFrame(nullptr, &uLen, 44100, 2); }, ""},
    };
    for (const auto &[call, text] : cases) {
        SCOPED_TRACE(text);
        RecordingSal::Get().Reset();
        EXPECT_EQ(call(), -1);
        EXPECT_EQ(std::make_pair(pFrame, uLen), std::make_pair(&sentinel, 77u));
        EXPECT_EQ(RecordingSal::Get().allocCount, 0u);
        EXPECT_TRUE(text.empty() ? RecordingSal::Get().traces.empty() : HasNumberedTrace(11, text));
    }
}

} // namespace
