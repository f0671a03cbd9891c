// Whole H.264 sessions on an encoder-made Main-profile clip (tests/data/h264/main_320x180.*):
// its MP4 samples (4-byte lengths, parameter sets and SEI in front of each IDR) and the start-
// code output that ffmpeg's h264_mp4toannexb filter made from the same samples.
#include "video_adapt_fixture.hpp"

#include <algorithm>
#include <fstream>
#include <string>

using namespace vorcal::test;

namespace {

const std::string kClip = std::string(VORCAL_TEST_DATA_DIR) + "/h264/main_320x180";

struct Unit {
    size_t uStart;   // first byte of its start code or length field
    size_t uPayload; // its NAL header byte
    size_t uEnd;
    uint8_t Type(const Bytes &data) const { return data[uPayload] & 0x1F; }
};

bool IsSlice(uint8_t uType) { return uType == 1 || uType == 5; }

std::vector<Unit> SplitLengthPrefixed(const Bytes &data)
{
    std::vector<Unit> units;
    for (size_t p = 0; p + 4 < data.size();) {
        const size_t uLen = (size_t{data[p]} << 24) | (size_t{data[p + 1]} << 16) | (data[p + 2] << 8) | data[p + 3];
        units.push_back({p, p + 4, p + 4 + uLen});
        p += 4 + uLen;
    }
    return units;
}

std::vector<Unit> SplitAnnexB(const Bytes &data)
{
    std::vector<Unit> units;
    for (size_t p = 0; p + 3 <= data.size(); ++p) {
        if (data[p] != 0 || data[p + 1] != 0 || data[p + 2] != 1)
            continue;
        const size_t uStart = p > 0 && data[p - 1] == 0 ? p - 1 : p;
        if (!units.empty())
            units.back().uEnd = uStart;
        units.push_back({uStart, p + 3, data.size()});
    }
    return units;
}

// The samples of a file as its report lists them: "frame OFFSET SIZE ..." in decode order.
std::vector<Bytes> Samples(const Bytes &data, const std::string &reportPath)
{
    std::vector<Bytes> samples;
    std::ifstream report(reportPath);
    std::string word;
    size_t uOffset = 0, uSize = 0;
    while (report >> word) {
        if (word == "frame" && report >> uOffset >> uSize && uOffset + uSize <= data.size())
            samples.emplace_back(data.begin() + uOffset, data.begin() + uOffset + uSize);
    }
    return samples;
}

// The index of the first slice when SEI or parameter sets stand in front of it, else 0: where
// the frame begins that a codec asking for in-band parameter-set removal receives.
size_t FirstKeptUnit(const Bytes &data, const std::vector<Unit> &units)
{
    size_t uFirst = 0;
    bool bRun = false;
    while (uFirst < units.size() && !IsSlice(units[uFirst].Type(data))) {
        const uint8_t uType = units[uFirst].Type(data);
        bRun = bRun || uType == 6 || uType == 7 || uType == 8;
        ++uFirst;
    }
    return bRun ? uFirst : 0;
}

std::vector<Bytes> PayloadsWithoutRun(const Bytes &data, const std::vector<Unit> &units)
{
    std::vector<Bytes> payloads;
    for (size_t i = FirstKeptUnit(data, units); i < units.size(); ++i)
        payloads.emplace_back(data.begin() + units[i].uPayload, data.begin() + units[i].uEnd);
    return payloads;
}

class H264SessionTest : public VideoDecoderTest {
protected:
    Bytes avcC, samples, filtered;
    std::vector<Bytes> mp4Samples, annexBSamples;

    void SetUp() override
    {
        VideoDecoderTest::SetUp();
        avcC = RecordingSal::ReadFile(kClip + ".avcc");
        samples = RecordingSal::ReadFile(kClip + ".nal");
        filtered = RecordingSal::ReadFile(kClip + ".mp4toannexb.h264");
        ASSERT_FALSE(avcC.empty() || samples.empty() || filtered.empty()) << "fixtures missing: " << kClip;
        ASSERT_EQ(avcC[4] & 3, 3) << "the clip's samples carry 4-byte lengths";
        mp4Samples = Samples(samples, kClip + ".nal.txt");
        annexBSamples = Samples(filtered, kClip + ".mp4toannexb.h264.txt");
        ASSERT_EQ(mp4Samples.size(), annexBSamples.size());
        ASSERT_GT(mp4Samples.size(), 2u);
        Open(CAL_OTI_H264);
    }

    // The parameter sets of the record: SPS and PPS as start-code units and as a list.
    Bytes Sps() const { return Bytes(avcC.begin() + 8, avcC.begin() + 8 + ((avcC[6] << 8) | avcC[7])); }
    Bytes Pps() const
    {
        const size_t uAt = 8 + Sps().size() + 1;
        return Bytes(avcC.begin() + uAt + 2, avcC.begin() + uAt + 2 + ((avcC[uAt] << 8) | avcC[uAt + 1]));
    }
};

// MP4 samples in, a codec that wants start codes and no in-band parameter sets.
TEST_F(H264SessionTest, LengthPrefixedToAnnexB)
{
    Answer(CAL_PROP_H264_CONFIG_FORMAT, 2);
    Answer(CAL_PROP_H264_INBAND_PARAM_SETS, 0);
    Answer(CAL_PROP_H264_FRAME_FORMAT, 2);
    ASSERT_EQ(Init(CAL_OTI_H264, avcC, {}, (avcC[4] & 3) + 1u), 0);
    EXPECT_EQ(codec.Last(1)->data, AnnexB({Sps(), Pps()}));

    size_t uMisread = 0;
    for (size_t i = 0; i < mp4Samples.size(); ++i) {
        const Bytes &sample = mp4Samples[i];
        uint32_t uWord = 0;
        const int32_t iResult = Decode(sample, &uWord);
        // The format test takes a first length field of 0x100 to 0x1FF (00 00 01 xx) for a
        // start code: such a sample is handled as start-code framed, so it reaches the codec
        // unconverted or, when xx reads as an SEI or parameter-set header, is dropped.
        if (sample[0] == 0 && sample[1] == 0 && sample[2] == 1) {
            ++uMisread;
            EXPECT_TRUE((iResult == 1 && uWord == 4) || (iResult == 0 && Received() == sample)) << "sample " << i;
            continue;
        }
        ASSERT_EQ(iResult, 0) << "sample " << i;
        const Bytes &got = Received();
        const std::vector<Bytes> expected = PayloadsWithoutRun(annexBSamples[i], SplitAnnexB(annexBSamples[i]));
        EXPECT_EQ(PayloadsWithoutRun(got, SplitAnnexB(got)), expected) << "sample " << i;
        // Every start code the layer writes has 4 bytes.
        size_t uExpectedLen = 0;
        for (const Bytes &payload : expected)
            uExpectedLen += 4 + payload.size();
        EXPECT_EQ(got.size(), uExpectedLen) << "sample " << i;
    }
    EXPECT_LT(uMisread, mp4Samples.size() / 2);
}

// The filter's start-code output in, a codec that wants 4-byte lengths: it receives the MP4
// samples byte for byte, from their first slice on.
TEST_F(H264SessionTest, AnnexBToLengthPrefixed)
{
    Answer(CAL_PROP_STREAM_PARAMETERS, 1);
    Answer(CAL_PROP_H264_CONFIG_FORMAT, 1);
    Answer(CAL_PROP_H264_INBAND_PARAM_SETS, 0);
    Answer(CAL_PROP_H264_FRAME_FORMAT, 1);
    ASSERT_EQ(Init(CAL_OTI_H264, AnnexB({Sps(), Pps()}), {}, 4), 0);
    Bytes list = {1};
    list.insert(list.end(), avcC.begin() + 6, avcC.end());
    EXPECT_EQ(codec.Last(1)->data, list);
    // Coded size in macroblocks: 180 lines are 12 macroblock rows; cropping is not applied.
    EXPECT_EQ(width, 320u);
    EXPECT_EQ(height, 192u);
    EXPECT_EQ(pitch, 320u);

    const size_t uAllocs = sal.allocSizes.size();
    size_t uGrowths = 0, uLongest = 0;
    for (size_t i = 0; i < annexBSamples.size(); ++i) {
        uint32_t uWord = 0;
        ASSERT_EQ(Decode(annexBSamples[i], &uWord), 0) << "sample " << i;
        const Bytes &mp4 = mp4Samples[i];
        const std::vector<Unit> units = SplitLengthPrefixed(mp4);
        EXPECT_EQ(Received(), Bytes(mp4.begin() + units[FirstKeptUnit(mp4, units)].uStart, mp4.end()))
            << "sample " << i;
        // What was converted: the start-code frame from its first kept unit on.
        const std::vector<Unit> in = SplitAnnexB(annexBSamples[i]);
        const size_t uInLen = annexBSamples[i].size() - in[FirstKeptUnit(annexBSamples[i], in)].uStart;
        uGrowths += uInLen > uLongest;
        uLongest = std::max(uLongest, uInLen);
    }
    // The intermediate buffer is allocated only when a longer frame arrives.
    EXPECT_EQ(sal.allocSizes.size(), uAllocs + uGrowths);
    EXPECT_EQ(hCodec->m_iIntermediateFrameSize, static_cast<int32_t>(uLongest));
}

TEST_F(H264SessionTest, MainProfileRefusedFromStartCodeConfiguration)
{
    Answer(CAL_PROP_H264_NO_MAIN_PROFILE, 1);
    EXPECT_EQ(Init(CAL_OTI_H264, AnnexB({Sps(), Pps()})), 17);
    EXPECT_EQ(codec.Count(1), 0u);
    // The record is read as passed: without start codes no SPS is found, so nothing is refused.
    EXPECT_EQ(Init(CAL_OTI_H264, avcC), 0);
}

} // namespace
