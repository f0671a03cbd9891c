// AAC type detection: the result table, the ADTS header built around the raw frame and its
// buffer's lifetime, and encoder-made ADTS streams.
#include <gtest/gtest.h>

#include <cstdint>
#include <fstream>
#include <iterator>
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
uint32_t GetType(uint32_t &oti, int32_t rate, uint32_t channels, const uint8_t *frame = kRawFrame, uint32_t len = 4,
                 uint32_t failAllocation = 0)
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
    // Instance OTI, rate, channels; result, OTI after, the rate and channels traced (null: no detection).
    const struct { uint32_t oti; int32_t rate; uint32_t channels, result, otiAfter; const char *traced; } cases[] = {
        {0xD0, 44100, 2, 0xD0, 0xD0, nullptr}, {0x40, 48000, 1, 0x40, 0x40, "48000, 1"}, {0x41, 44100, 2, 0x40, 0x40, "44100, 2"},
        {0x40, 44100, 3, 0x40, 0x40, "22050, 3"},                                    // three channels halve the rate
        {0x41, 96000, 5, 0x40, 0x40, "48000, 1"}, {0x40, 8000, 0, 0x40, 0x40, "8000, 0"}, // 5: parametric stereo; 0 like 1
        {0x41, 50000, 2, ~0u, 0x41, nullptr}, {0x40, 7350, 1, ~0u, 0x40, nullptr}, {0x40, 192000, 2, ~0u, 0x40, nullptr},
        {0x41, 8000, 3, ~0u, 0x41, nullptr}};
    for (const auto &c : cases) {
        SCOPED_TRACE(testing::Message() << c.oti << ' ' << c.rate << ' ' << c.channels);
        uint32_t oti = c.oti;
        EXPECT_EQ(GetType(oti, c.rate, c.channels), c.result);
        const RecordingSal &sal = RecordingSal::Get();
        const bool aac = c.oti == 0x40 || c.oti == 0x41;
        EXPECT_EQ(std::make_tuple(oti, sal.allocCount, sal.freeCount, sal.CountFormat(kMakeAdtsFormat)),
                  std::make_tuple(c.otiAfter, aac ? 1u : 0u, aac ? 1u : 0u, aac ? size_t{1} : size_t{0}));
        const std::string trace = "[CAL_Tools 562] vorCALTools_GetAACType() : " + std::string(c.traced ? c.traced : "") + ", 0, 56, 56\n";
        EXPECT_TRUE(c.traced ? vorcal::test::HasTrace(1, 1, kTypeFormat, trace) : sal.CountFormat(kTypeFormat) == 0);
    }
    // The header built around the frame: MPEG-2, profile 2, frame length 4 + 7.
    uint32_t oti = 0x41;
    ASSERT_EQ(GetType(oti, 44100, 2), 0x40u);
    EXPECT_EQ(std::make_tuple(hhDecoder.uMPEG4, hhDecoder.ADTS.uProfile, hhDecoder.ADTS.uFrameLength, RecordingSal::Get().allocSizes),
              std::make_tuple(0u, 2u, 11u, std::vector<uint32_t>{12}));
    // No instance, no frame, or no buffer for the header: nothing traced or changed.
    EXPECT_EQ(vorCALTools_GetAACType(nullptr, 44100, 2, kRawFrame, 4), ~0u);
    EXPECT_EQ(GetType(oti = 0x41, 44100, 2, nullptr), 0x41u);
    EXPECT_EQ(RecordingSal::Get().allocCount, 0u);
    EXPECT_EQ(GetType(oti, 44100, 2, kRawFrame, 4, 1), ~0u);
    EXPECT_EQ(std::make_pair(oti, RecordingSal::Get().traces.empty()), std::make_pair(0x41u, true));
}

// Encoder-made ADTS streams (tests/data/fixtures-aac.sh): every frame through the detection entry.
// The AAC silence templates of the SBR modes 2-4 carry real SBR extension payloads; once the
// raw data block parsers run behind the header, they are the end-to-end SBR/PS checks here.
TEST(AacType, EncoderMadeStreams)
{
    for (const auto &[file, rate, channels] : {std::tuple("sine_44100_1ch.aac", 44100u, 1u), std::tuple("sine_44100_2ch.aac", 44100u, 2u),
                                                std::tuple("sine_48000_2ch.aac", 48000u, 2u), std::tuple("sine_22050_1ch.aac", 22050u, 1u),
                                                std::tuple("sine_8000_2ch.aac", 8000u, 2u)}) {
        std::ifstream in(std::string(VORCAL_TEST_DATA_DIR) + "/aac/" + file, std::ios::binary);
        const std::vector<uint8_t> stream((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
        size_t pos = 0;
        while (pos + 7 <= stream.size()) {
            SCOPED_TRACE(testing::Message() << file << " frame at " << pos);
            const uint8_t *h = &stream[pos];
            const uint32_t length = (uint32_t{h[3]} & 3) << 11 | uint32_t{h[4]} << 3 | h[5] >> 5;
            const uint32_t headerBytes = (h[1] & 1) ? 7 : 9;
            ASSERT_TRUE(length >= headerBytes && pos + length <= stream.size()) << length;
            std::vector<uint8_t> frame(h, h + length);
            frame.resize(length + 4, 0); // slack behind a frame as short as its header
            std::vector<uint32_t> o(5, 1);
            ASSERT_EQ(VrAACSBRInfo(frame.data(), length, &o[0], &o[1], &o[2], &o[3], &o[4]), 0u);
            EXPECT_EQ(o, (std::vector<uint32_t>{rate, channels, 0, headerBytes * 8, headerBytes * 8}));
            EXPECT_EQ(std::make_pair(hhDecoder.ADTS.uFrameLength, hhDecoder.ADTS.uProfile), std::make_pair(length, 1u));
            pos += length;
        }
        EXPECT_TRUE(pos == stream.size() && pos > 4 * 7) << file;
    }
}

} // namespace
