// Frame dumping: the four dump slots of the handle and the records the decoder wrappers write.
#include <cstring>
#include <string>

#include <gtest/gtest.h>

#include <vorcal/core.h>
#include <vorcal/wrapper.h>

#include "recording_codec.hpp"
#include "recording_sal.hpp"

using vorcal::test::RecordingCodec;
using vorcal::test::RecordingSal;

namespace {

class DumpTest : public ::testing::Test {
protected:
    void SetUp() override
    {
        RecordingSal::Get().Reset();
        RecordingCodec::Get().Reset();
        hCAL = vorCAL_GetHandle(0, 1, 1);
        const CALVideoDecoderFunctions video = RecordingCodec::VideoDecoder();
        const CALAudioDecoderFunctions audio = RecordingCodec::AudioDecoder();
        ASSERT_EQ(vorCAL_RegisterCodec(hCAL, 1, 0, 0x31564D57, &video, sizeof video), 1);
        ASSERT_EQ(vorCAL_RegisterCodec(hCAL, 2, 0, 0x55, &audio, sizeof audio), 1);
        hVideo = vorCAL_GetCodec(hCAL, 1, 0, 0x31564D57);
        hAudio = vorCAL_GetCodec(hCAL, 2, 0, 0x55);
    }
    void TearDown() override
    {
        vorCAL_ReleaseCodec(hVideo);
        vorCAL_ReleaseCodec(hAudio);
        vorCAL_ReleaseHandle(hCAL);
        EXPECT_TRUE(RecordingSal::Get().liveBlocks.empty());
    }
    std::string Path(const char *name) { return RecordingSal::Get().TempDir() + "/" + name; }
    static std::vector<uint8_t> Record(std::vector<uint8_t> payload)
    {
        const uint32_t n = static_cast<uint32_t>(payload.size());
        std::vector<uint8_t> out(4);
        std::memcpy(out.data(), &n, 4); // host byte order
        out.insert(out.end(), payload.begin(), payload.end());
        return out;
    }
    static std::vector<uint8_t> Concat(std::initializer_list<std::vector<uint8_t>> parts)
    {
        std::vector<uint8_t> out;
        for (const auto &p : parts)
            out.insert(out.end(), p.begin(), p.end());
        return out;
    }

    CALHandle *hCAL = nullptr;
    CALCodec *hVideo = nullptr;
    CALCodec *hAudio = nullptr;
};

// An instance used after the last vorCAL_ReleaseHandle: the handle and its dump slots are gone,
// so its wrappers write no record (and read no freed memory: ASan watches in the sanitizer run)
// and otherwise work as before.
TEST_F(DumpTest, InstancesOutlivingTheHandleSkipDumping)
{
    ASSERT_NE(vorCAL_DumpFrames(hCAL, Path("late_video.dump").c_str(), 0), 0u);
    ASSERT_NE(vorCAL_DumpFrames(hCAL, Path("late_audio.dump").c_str(), 1), 0u);
    vorCAL_ReleaseHandle(hCAL);
    const size_t uWrites = RecordingSal::Get().writes.size();
    const uint8_t frame[4] = {1, 2, 3, 4};
    uint32_t word = 0;
    EXPECT_EQ(vorCAL_AudioDecoderInit(hAudio, 0, frame, 4, frame, 4, nullptr, nullptr, nullptr, nullptr, 0), 0);
    EXPECT_EQ(vorCAL_AudioDecoderDecode(hAudio, frame, 4, 0, 0, 0, 0), 0);
    EXPECT_EQ(vorCAL_VideoDecoderInit(hVideo, 0x31564D57, frame, 4, nullptr, 0, 4, nullptr, nullptr, nullptr, 0), 0);
    EXPECT_EQ(vorCAL_VideoDecoderDecode(hVideo, frame, 4, 0, 0, &word), 0);
    EXPECT_EQ(RecordingSal::Get().writes.size(), uWrites);
    EXPECT_EQ(RecordingCodec::Get().Count(3), 2u);
    EXPECT_EQ(RecordingCodec::Get().Last(3)->data, std::vector<uint8_t>(frame, frame + 4));
}

TEST_F(DumpTest, VideoFramesAreLengthPrefixedRecords)
{
    const std::string path = Path("video.dump");
    const CALParam hFile = vorCAL_DumpFrames(hCAL, path.c_str(), 0);
    EXPECT_NE(hFile, 0u);
    EXPECT_EQ(RecordingSal::Get().openModes, std::vector<uint32_t>{6u});
    std::vector<uint8_t> frame(10);
    for (size_t i = 0; i < frame.size(); ++i)
        frame[i] = static_cast<uint8_t>(0xA0 + i);
    uint32_t word = 0;
    vorCAL_VideoDecoderDecode(hVideo, frame.data(), 10, 0, 0, &word);
    vorCAL_VideoDecoderDecode(hVideo, frame.data(), 0, 0, 0, &word);
    // Each record is two writes: the length, then the payload.
    ASSERT_EQ(RecordingSal::Get().writes.size(), 4u);
    EXPECT_EQ(RecordingSal::Get().writes[0].bytes.size(), 4u);
    EXPECT_EQ(RecordingSal::Get().writes[1].bytes, frame);
    EXPECT_EQ(RecordingSal::ReadFile(path), Concat({Record(frame), Record({})}));
    EXPECT_EQ(RecordingSal::ReadFile(path).size(), 4u + 10u + 4u);
}

TEST_F(DumpTest, InitRecordsTheConfigurationOrTracesItsAbsence)
{
    const std::string path = Path("init.dump");
    vorCAL_DumpFrames(hCAL, path.c_str(), 0);
    const uint8_t config[] = {1, 2, 3};
    uint32_t w, h, p;
    vorCAL_VideoDecoderInit(hVideo, 0x31564D57, config, 3, nullptr, 0, 4, &w, &h, &p, 0);
    const std::string fmt = "[CAL_Wrapper %d] pConfig is NULL\n";
    EXPECT_EQ(RecordingSal::Get().CountFormat(fmt), 0u);
    vorCAL_VideoDecoderInit(hVideo, 0x31564D57, nullptr, 3, nullptr, 0, 4, &w, &h, &p, 0);
    vorCAL_VideoDecoderInit(hVideo, 0x31564D57, config, 0, nullptr, 0, 4, &w, &h, &p, 0);
    EXPECT_EQ(RecordingSal::Get().CountFormat(fmt), 2u);
    EXPECT_TRUE(vorcal::test::MatchesWithLine(RecordingSal::Get().TracesWithFormat(fmt)[0].text,
                                              "[CAL_Wrapper #] pConfig is NULL\n"));
    EXPECT_EQ(RecordingSal::Get().TracesWithFormat(fmt)[0].iCategory, 11);
    EXPECT_EQ(RecordingSal::ReadFile(path), Record({1, 2, 3}));

    // With slot 0 closed nothing is traced.
    vorCAL_DumpFrames(hCAL, nullptr, 0);
    RecordingSal::Get().traces.clear();
    vorCAL_VideoDecoderInit(hVideo, 0x31564D57, nullptr, 0, nullptr, 0, 4, &w, &h, &p, 0);
    EXPECT_EQ(RecordingSal::Get().CountFormat(fmt), 0u);
}

TEST_F(DumpTest, AudioUsesSlotOneAndRecordsFramesAsPassed)
{
    const std::string videoPath = Path("v.dump"), audioPath = Path("a.dump");
    vorCAL_DumpFrames(hCAL, videoPath.c_str(), 0);
    vorCAL_DumpFrames(hCAL, audioPath.c_str(), 1);
    const uint8_t dsi[] = {0x12, 0x10};
    const uint8_t frame[] = {0x21, 0x15, 0x93};
    uint32_t a, b, c, d;
    vorCAL_AudioDecoderInit(hAudio, 0, dsi, 2, frame, 3, &a, &b, &c, &d, 0);
    vorCAL_AudioDecoderDecode(hAudio, frame, 3, 0, 0, 0, 0);
    EXPECT_EQ(RecordingSal::ReadFile(audioPath), Concat({Record({0x12, 0x10}), Record({0x21, 0x15, 0x93})}));
    EXPECT_TRUE(RecordingSal::ReadFile(videoPath).empty());
}

TEST_F(DumpTest, RetargetCloseAndRelease)
{
    const std::string first = Path("first.dump"), second = Path("second.dump");
    EXPECT_EQ(vorCAL_DumpFrames(hCAL, nullptr, 1), 0u); // closing a closed slot
    EXPECT_TRUE(RecordingSal::Get().closedFiles.empty());

    const CALParam h1 = vorCAL_DumpFrames(hCAL, first.c_str(), 0);
    uint8_t byte = 0x42;
    uint32_t word;
    vorCAL_VideoDecoderDecode(hVideo, &byte, 1, 0, 0, &word);
    const CALParam h2 = vorCAL_DumpFrames(hCAL, second.c_str(), 0);
    EXPECT_EQ(RecordingSal::Get().closedFiles, std::vector<SALFile>{h1});
    byte = 0x43;
    vorCAL_VideoDecoderDecode(hVideo, &byte, 1, 0, 0, &word);
    EXPECT_EQ(RecordingSal::ReadFile(first), Record({0x42}));
    EXPECT_EQ(RecordingSal::ReadFile(second), Record({0x43}));

    // A null path returns the close result.
    RecordingSal::Get().closeResult = 77;
    EXPECT_EQ(vorCAL_DumpFrames(hCAL, nullptr, 0), 77u);
    EXPECT_EQ(hCAL->m_hDumpFile[0], 0u);

    // Slots outside 0..3 touch nothing.
    RecordingSal::Get().openPaths.clear();
    EXPECT_EQ(vorCAL_DumpFrames(hCAL, first.c_str(), 4), 0u);
    EXPECT_EQ(vorCAL_DumpFrames(hCAL, first.c_str(), 0xFFFFFFFF), 0u);
    EXPECT_TRUE(RecordingSal::Get().openPaths.empty());

    // The last release closes every open slot, 0 to 3 in order.
    const CALParam s3 = vorCAL_DumpFrames(hCAL, Path("s3").c_str(), 3);
    const CALParam s2 = vorCAL_DumpFrames(hCAL, Path("s2").c_str(), 2);
    RecordingSal::Get().closedFiles.clear();
    vorCAL_ReleaseCodec(hVideo);
    vorCAL_ReleaseCodec(hAudio);
    hVideo = hAudio = nullptr;
    vorCAL_ReleaseHandle(hCAL);
    (void)h2;
    EXPECT_EQ(RecordingSal::Get().closedFiles, (std::vector<SALFile>{s2, s3}));
    hCAL = nullptr;
}

TEST_F(DumpTest, FailedOpenLeavesDumpingOff)
{
    RecordingSal::Get().failOpen = true;
    EXPECT_EQ(vorCAL_DumpFrames(hCAL, Path("x").c_str(), 0), 0u);
    uint8_t byte = 1;
    uint32_t word = 0;
    EXPECT_EQ(vorCAL_VideoDecoderDecode(hVideo, &byte, 1, 0, 0, &word), 0);
    EXPECT_TRUE(RecordingSal::Get().writes.empty());
    EXPECT_EQ(RecordingCodec::Get().Count(3), 1u); // decoding proceeds
}

TEST_F(DumpTest, NullPayloadWithALengthWritesNoHalfRecord)
{
    vorCAL_DumpFrames(hCAL, Path("n").c_str(), 0);
    uint32_t word;
    vorCAL_VideoDecoderDecode(hVideo, nullptr, 5, 0, 0, &word);
    vorCAL_VideoDecoderDecode(hVideo, nullptr, 0, 0, 0, &word);
    ASSERT_EQ(RecordingSal::Get().writes.size(), 2u); // only the empty record
    EXPECT_TRUE(RecordingSal::Get().writes[1].bytes.empty());
}

} // namespace
