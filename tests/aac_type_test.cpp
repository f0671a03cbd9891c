// AAC type detection: the failure table, the ADTS header built around the raw frame, the
// detection buffer's lifetime, and real encoder-made ADTS streams.
#include <gtest/gtest.h>

#include <cstdint>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include <vorcal/aacparse.h>
#include <vorcal/audio_tools.h>
#include <vorcal/wrapper.h>

#include "recording_sal.hpp"

namespace {

using vorcal::test::HasTrace;
using vorcal::test::RecordingSal;

const std::string kTypeFormat = "[CAL_Tools %d] vorCALTools_GetAACType() : %u, %u, %u, %u, %u\n";
const std::string kMakeAdtsFormat = "AAC_MakeADTS() : %u, %u, %u, %u\n";

// A single channel element of silence: id_syn_ele SCE, then ID_END (any bytes would do: the
// detection stops at the header).
const std::vector<uint8_t> kRawFrame = {0x01, 0x18, 0x20, 0x07};

class AacType : public ::testing::Test {
protected:
    void SetUp() override { RecordingSal::Get().Reset(); }
    CALCodec Instance(uint32_t oti)
    {
        CALCodec c{};
        c.m_uCodecObjectTypeIndication = oti;
        return c;
    }
};

struct TypeCase {
    const char *name;
    uint32_t oti;
    int32_t rate;
    uint32_t channels;
    uint32_t result;
    uint32_t otiAfter;
    const char *trace; // detection trace, or null when detection does not run
};

class AacTypeTable : public AacType, public ::testing::WithParamInterface<TypeCase> {};

TEST_P(AacTypeTable, ResultInstanceAndTrace)
{
    const TypeCase &c = GetParam();
    CALCodec codec = Instance(c.oti);
    EXPECT_EQ(vorCALTools_GetAACType(&codec, c.rate, c.channels, kRawFrame.data(), 4), c.result);
    EXPECT_EQ(codec.m_uCodecObjectTypeIndication, c.otiAfter);
    const RecordingSal &sal = RecordingSal::Get();
    EXPECT_EQ(sal.allocCount, sal.freeCount);
    EXPECT_TRUE(sal.liveBlocks.empty());
    if (c.trace) {
        EXPECT_TRUE(HasTrace(1, 1, kTypeFormat, c.trace));
    } else {
        EXPECT_EQ(sal.CountFormat(kTypeFormat), 0u);
    }
    const bool aac = c.oti == 0x40 || c.oti == 0x41;
    EXPECT_EQ(sal.allocCount, aac ? 1u : 0u);
    EXPECT_EQ(sal.CountFormat(kMakeAdtsFormat), aac ? 1u : 0u);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, AacTypeTable,
    ::testing::Values(
        TypeCase{"NotAac", 0xD0, 44100, 2, 0xD0, 0xD0, nullptr},
        TypeCase{"AacStaysAac", 0x40, 48000, 1, 0x40, 0x40, "[CAL_Tools 562] vorCALTools_GetAACType() : 48000, 1, 0, 56, 56\n"},
        TypeCase{"SbrBecomesAac", 0x41, 44100, 2, 0x40, 0x40, "[CAL_Tools 562] vorCALTools_GetAACType() : 44100, 2, 0, 56, 56\n"},
        TypeCase{"ThreeChannelsHalveTheRate", 0x40, 44100, 3, 0x40, 0x40, "[CAL_Tools 562] vorCALTools_GetAACType() : 22050, 3, 0, 56, 56\n"},
        TypeCase{"FiveChannelsParametricStereo", 0x41, 96000, 5, 0x40, 0x40, "[CAL_Tools 562] vorCALTools_GetAACType() : 48000, 1, 0, 56, 56\n"},
        TypeCase{"NoChannelsLikeModeOne", 0x40, 8000, 0, 0x40, 0x40, "[CAL_Tools 562] vorCALTools_GetAACType() : 8000, 0, 0, 56, 56\n"},
        TypeCase{"RateNotInTheTable", 0x41, 50000, 2, 0xFFFFFFFF, 0x41, nullptr},
        TypeCase{"RateBelowRange", 0x40, 7350, 1, 0xFFFFFFFF, 0x40, nullptr},
        TypeCase{"RateAboveRange", 0x40, 192000, 2, 0xFFFFFFFF, 0x40, nullptr},
        TypeCase{"HalvedRateNotInTheTable", 0x41, 8000, 3, 0xFFFFFFFF, 0x41, nullptr}),
    [](const auto &info) { return std::string(info.param.name); });

TEST_F(AacType, HeaderWrapsTheFrame)
{
    CALCodec codec = Instance(0x41);
    ASSERT_EQ(vorCALTools_GetAACType(&codec, 44100, 2, kRawFrame.data(), 4), 0x40u);
    // FF F9 90 80 ..: MPEG-2, profile 2, index 4, two channels, frame length 4 + 7.
    const VrAACDecoder_OnlyParsing &d = hhDecoder;
    EXPECT_EQ(d.ADTS.uId, 1u);
    EXPECT_EQ(d.uMPEG4, 0u);
    EXPECT_EQ(d.ADTS.uProfile, 2u);
    EXPECT_EQ(d.ADTS.uSampleRateIdx, 4u);
    EXPECT_EQ(d.ADTS.uChannelConfig, 2u);
    EXPECT_EQ(d.ADTS.uFrameLength, 11u);
    EXPECT_EQ(d.ADTS.uBufferFullness, 0x7CFu);
    ASSERT_EQ(RecordingSal::Get().allocSizes.size(), 1u);
    EXPECT_EQ(RecordingSal::Get().allocSizes[0], 12u);
}

TEST_F(AacType, ShortFramesArePaddedForTheHeaderParse)
{
    for (uint32_t len : {0u, 1u, 2u}) {
        SCOPED_TRACE(len);
        RecordingSal::Get().Reset();
        CALCodec codec = Instance(0x40);
        const uint8_t bytes[2] = {0xFF, 0xF1}; // sync-like bytes must not be read as a header
        EXPECT_EQ(vorCALTools_GetAACType(&codec, 32000, 1, bytes, len), 0x40u);
        ASSERT_EQ(RecordingSal::Get().allocSizes.size(), 1u);
        EXPECT_EQ(RecordingSal::Get().allocSizes[0], 10u);
        EXPECT_EQ(hhDecoder.ADTS.uFrameLength, len + 7);
        EXPECT_TRUE(RecordingSal::Get().liveBlocks.empty());
    }
}

TEST_F(AacType, NullInstanceFrameAndAllocationFailure)
{
    EXPECT_EQ(vorCALTools_GetAACType(nullptr, 44100, 2, kRawFrame.data(), 4), 0xFFFFFFFFu);
    CALCodec codec = Instance(0x41);
    EXPECT_EQ(vorCALTools_GetAACType(&codec, 44100, 2, nullptr, 4), 0x41u);
    EXPECT_EQ(RecordingSal::Get().allocCount, 0u);

    RecordingSal::Get().FailAllocation(1);
    EXPECT_EQ(vorCALTools_GetAACType(&codec, 44100, 2, kRawFrame.data(), 4), 0xFFFFFFFFu);
    EXPECT_EQ(codec.m_uCodecObjectTypeIndication, 0x41u);
    EXPECT_EQ(RecordingSal::Get().CountFormat(kTypeFormat), 0u);
    EXPECT_TRUE(RecordingSal::Get().traces.empty());
}

// ------------------------------------------------------------------------------------------
// Encoder-made ADTS streams (tests/data/fixtures-aac.sh): every frame through the detection
// entry and, stripped of its header, through the type test.
//
// The AAC silence templates of the SBR modes 2-4 carry real SBR extension payloads; once the
// raw data block parsers run behind the header, they are the end-to-end SBR/PS checks here.

struct Fixture {
    const char *file;
    uint32_t rate;
    uint32_t channels;
};

class AacFixtures : public AacType, public ::testing::WithParamInterface<Fixture> {};

TEST_P(AacFixtures, EveryFrame)
{
    const Fixture &f = GetParam();
    std::ifstream in(std::string(VORCAL_TEST_DATA_DIR) + "/aac/" + f.file, std::ios::binary);
    ASSERT_TRUE(in) << f.file;
    const std::vector<uint8_t> stream((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    size_t pos = 0, frames = 0;
    while (pos + 7 <= stream.size()) {
        SCOPED_TRACE(testing::Message() << "frame " << frames << " at " << pos);
        const uint8_t *h = &stream[pos];
        const uint32_t length = (uint32_t{h[3]} & 3) << 11 | uint32_t{h[4]} << 3 | h[5] >> 5;
        const uint32_t headerBytes = (h[1] & 1) ? 7 : 9;
        ASSERT_GE(length, headerBytes);
        ASSERT_LE(pos + length, stream.size());
        std::vector<uint8_t> frame(h, h + length);
        frame.resize(length + 4, 0); // slack behind a frame as short as its header

        uint32_t rate = 0, channels = 0, sbr = 1, aligned = 0, header = 0;
        ASSERT_EQ(VrAACSBRInfo(frame.data(), length, &rate, &channels, &sbr, &aligned, &header), 0u);
        EXPECT_EQ(rate, f.rate);
        EXPECT_EQ(channels, f.channels);
        EXPECT_EQ(sbr, 0u);
        EXPECT_EQ(header, headerBytes * 8);
        EXPECT_EQ(aligned, header);
        EXPECT_EQ(hhDecoder.ADTS.uFrameLength, length);
        EXPECT_EQ(hhDecoder.ADTS.uProfile, 1u); // AAC LC

        RecordingSal::Get().Reset();
        CALCodec codec{};
        codec.m_uCodecObjectTypeIndication = 0x41;
        EXPECT_EQ(vorCALTools_GetAACType(&codec, static_cast<int32_t>(f.rate), f.channels, h + headerBytes,
                                         length - headerBytes),
                  0x40u);
        EXPECT_TRUE(HasTrace(1, 1, kTypeFormat,
                             "[CAL_Tools 562] vorCALTools_GetAACType() : " + std::to_string(f.rate) + ", " +
                                 std::to_string(f.channels) + ", 0, 56, 56\n"));
        EXPECT_TRUE(RecordingSal::Get().liveBlocks.empty());
        pos += length;
        ++frames;
    }
    EXPECT_EQ(pos, stream.size());
    EXPECT_GE(frames, 4u);
}

INSTANTIATE_TEST_SUITE_P(Streams, AacFixtures,
                         ::testing::Values(Fixture{"sine_44100_1ch.aac", 44100, 1},
                                           Fixture{"sine_44100_2ch.aac", 44100, 2},
                                           Fixture{"sine_48000_2ch.aac", 48000, 2},
                                           Fixture{"sine_22050_1ch.aac", 22050, 1},
                                           Fixture{"sine_8000_2ch.aac", 8000, 2}));

} // namespace
