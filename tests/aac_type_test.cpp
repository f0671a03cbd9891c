// AAC type detection: the result table, the ADTS header built around the raw frame and its
// buffer's lifetime. Real streams through the same header parser: aacparse_frame_test.
#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <tuple>
#include <vector>

#include <vorcal/aacparse.h>
#include <vorcal/audio_tools.h>
#include <vorcal/wrapper.h>

#include "recording_sal.hpp"

namespace {

using vorcal::test::RecordingSal;

const std::string kTypeFormat = "[CAL_Tools %d] vorCALTools_GetAACType() : %u, %u, %u, %u, %u\n";
const std::string kMakeAdtsFormat = "AAC_MakeADTS() : %u, %u, %u, %u\n";

// Detection runs on the header only: these bytes are never parsed.
const uint8_t kRawFrame[4] = {0x01, 0x18, 0x20, 0x07};

// Runs the type test on a fresh system layer (failing its nth allocation when asked) and
// updates oti from the instance.
uint32_t GetType(uint32_t &oti, int32_t rate, uint32_t channels, const uint8_t *frame = kRawFrame,
                 uint32_t len = 4, uint32_t failAllocation = 0)
{
    RecordingSal::Get().Reset();
    RecordingSal::Get().FailAllocation(failAllocation);
    CALCodec codec{};
    codec.m_uCodecObjectTypeIndication = oti;
    const uint32_t result = vorCALTools_GetAACType(&codec, rate, channels, frame, len);
    oti = codec.m_uCodecObjectTypeIndication;
    EXPECT_TRUE(RecordingSal::Get().liveBlocks.empty());
    return result;
}

TEST(AacType, ResultsInstanceAndTrace)
{
    // Instance OTI, rate, channels; result, OTI after, the rate and channels traced (null: no
    // detection). Three channels halve the rate; 5 is parametric stereo; 0 counts like 1.
    const struct { uint32_t oti, rate, channels, result, after; const char *trace; }
        cases[] = {
            {0xD0, 44100, 2, 0xD0, 0xD0, nullptr},    {0x40, 48000, 1, 0x40, 0x40, "48000, 1"},
            {0x41, 44100, 2, 0x40, 0x40, "44100, 2"}, {0x40, 44100, 3, 0x40, 0x40, "22050, 3"},
            {0x41, 96000, 5, 0x40, 0x40, "48000, 1"}, {0x40, 8000, 0, 0x40, 0x40, "8000, 0"},
            {0x41, 50000, 2, ~0u, 0x41, nullptr},     {0x40, 7350, 1, ~0u, 0x40, nullptr},
            {0x40, 192000, 2, ~0u, 0x40, nullptr},    {0x41, 8000, 3, ~0u, 0x41, nullptr}};
    for (const auto &c : cases) {
        SCOPED_TRACE(testing::Message() << c.oti << ' ' << c.rate << ' ' << c.channels);
        uint32_t oti = c.oti;
        EXPECT_EQ(GetType(oti, int32_t(c.rate), c.channels), c.result);
        const RecordingSal &sal = RecordingSal::Get();
        const bool aac = c.oti == 0x40 || c.oti == 0x41;
        const size_t headers = sal.CountFormat(kMakeAdtsFormat);
        EXPECT_EQ(std::make_tuple(oti, sal.allocCount, sal.freeCount, headers),
                  std::make_tuple(c.after, aac ? 1u : 0u, aac ? 1u : 0u, size_t{aac}));
        const std::string trace = "[CAL_Tools 562] vorCALTools_GetAACType() : " +
                                  std::string(c.trace ? c.trace : "") + ", 0, 56, 56\n";
        EXPECT_TRUE(c.trace ? vorcal::test::HasTrace(1, 1, kTypeFormat, trace)
                             : sal.CountFormat(kTypeFormat) == 0);
    }
    // The header built around the frame: MPEG-2, profile 2, frame length 4 + 7.
    uint32_t oti = 0x41;
    ASSERT_EQ(GetType(oti, 44100, 2), 0x40u);
    const VrAACDecoder_OnlyParsing &d = hhDecoder;
    EXPECT_EQ(std::make_tuple(d.uMPEG4, d.ADTS.uProfile, d.ADTS.uFrameLength,
                              RecordingSal::Get().allocSizes),
              std::make_tuple(0u, 2u, 11u, std::vector<uint32_t>{12}));
    // No instance, no frame, or no buffer for the header: nothing traced or changed.
    EXPECT_EQ(vorCALTools_GetAACType(nullptr, 44100, 2, kRawFrame, 4), ~0u);
    EXPECT_EQ(GetType(oti = 0x41, 44100, 2, nullptr), 0x41u);
    EXPECT_EQ(RecordingSal::Get().allocCount, 0u);
    EXPECT_EQ(GetType(oti, 44100, 2, kRawFrame, 4, 1), ~0u);
    EXPECT_EQ(std::make_pair(oti, RecordingSal::Get().traces.empty()), std::make_pair(0x41u, true));
}

} // namespace
