#include <gtest/gtest.h>

#include <string>
#include <vector>

#include <vorcal/audio_tools.h>
#include <vorcal/wrapper.h>

#include "audio_instance.hpp"
#include "recording_codec.hpp"
#include "recording_sal.hpp"

using namespace vorcal::test;

namespace {

constexpr uint32_t kAmrNbSizes[8] = {13, 14, 16, 18, 20, 21, 27, 32};
constexpr uint32_t kAmrWbSizes[9] = {18, 24, 33, 37, 41, 47, 51, 59, 61};

const std::string kLockedNb = "[vorCAL_Wrapper, %d] AMR NB FT = [%d]\n";
const std::string kLockedWb = "[vorCAL_Wrapper, %d] AMR WB FT = [%d]\n";
const std::string kRefused = "[vorCAL_Wrapper, %d] AMR %s FT = [%d]\n";

class AudioAdapt : public testing::Test {
protected:
    void SetUp() override { RecordingSal::Get().Reset(); }
    void TearDown() override { EXPECT_TRUE(RecordingSal::Get().liveBlocks.empty()); }

    static int32_t Init(CALCodec *hCodec, std::vector<uint8_t> first, std::vector<uint8_t> config = {})
    {
        uint32_t out[4] = {};
        return vorCAL_AudioDecoderInit(hCodec, 0, config.data(), static_cast<int32_t>(config.size()), first.data(),
                                       static_cast<uint32_t>(first.size()), &out[0], &out[1], &out[2], &out[3],
                                       0x55);
    }
    // The frame and length the codec's Decode received.
    static std::pair<CALParam, CALParam> Decode(CALCodec *hCodec, const uint8_t *pData, int32_t iLen)
    {
        EXPECT_EQ(vorCAL_AudioDecoderDecode(hCodec, pData, iLen, 3, 4, 5, 6), 0);
        const CodecCall *pCall = RecordingCodec::Get().Last(3);
        return {pCall->args[0], pCall->args[1]};
    }
};

// Every valid frame type locks; the silent frame matches it in type and length.
TEST_F(AudioAdapt, EveryFrameTypeLocks)
{
    for (uint32_t uOTI : {CAL_OTI_AMR_NB, CAL_OTI_AMR_WB}) {
        const bool bNarrow = uOTI == CAL_OTI_AMR_NB;
        const uint32_t *pSizes = bNarrow ? kAmrNbSizes : kAmrWbSizes;
        for (uint32_t uFT = 0; uFT < (bNarrow ? 8u : 9u); ++uFT) {
            SCOPED_TRACE(testing::Message() << uOTI << " FT " << uFT);
            RecordingSal::Get().Reset();
            AudioInstance codec(uOTI);
            RecordingCodec::Get().Answer(CAL_PROP_AMR_FRAME_TYPE_LOCK, 1);
            Init(codec.get(), {static_cast<uint8_t>((uFT << 3) | 4), 0});
            EXPECT_EQ(codec->m_uAMRFrameType, uFT);
            ASSERT_NE(codec->m_pSilenceFrame, nullptr);
            EXPECT_EQ(codec->m_uSilenceFrameLen, pSizes[uFT]);
            EXPECT_EQ(codec->m_pSilenceFrame[0] >> 3, static_cast<int>(uFT));
            EXPECT_TRUE(HasTrace(1, 0, bNarrow ? kLockedNb : kLockedWb,
                                 std::string("[vorCAL_Wrapper, #] AMR ") + (bNarrow ? "NB" : "WB") + " FT = [" +
                                     std::to_string(uFT) + "]\n"));
        }
    }
}

TEST_F(AudioAdapt, NoLock)
{
    const struct {
        const char *pName;
        uint32_t uOTI;
        bool bAnswer;
        uint32_t uValue;
        std::vector<uint8_t> first;
        uint32_t uFrameType; // m_uAMRFrameType afterwards
        const char *pRefusal; // category-11 text, or null
    } cases[] = {
        {"NB FT 8", CAL_OTI_AMR_NB, true, 1, {0x44}, 8, "[vorCAL_Wrapper, #] AMR NB FT = [8]\n"},
        {"WB FT 9", CAL_OTI_AMR_WB, true, 1, {0x4C}, 9, "[vorCAL_Wrapper, #] AMR WB FT = [9]\n"},
        {"padding bit set", CAL_OTI_AMR_NB, true, 1, {0xBC}, 23, "[vorCAL_Wrapper, #] AMR NB FT = [23]\n"},
        {"no data FT 15", CAL_OTI_AMR_WB, true, 1, {0x7C}, 15, "[vorCAL_Wrapper, #] AMR WB FT = [15]\n"},
        {"property unanswered", CAL_OTI_AMR_NB, false, 0, {0x3C}, 0, nullptr},
        {"property 0", CAL_OTI_AMR_NB, true, 0, {0x3C}, 0, nullptr},
        {"property 2", CAL_OTI_AMR_WB, true, 2, {0x3C}, 0, nullptr},
        {"no first frame", CAL_OTI_AMR_NB, true, 1, {}, 0, nullptr},
        {"AAC", CAL_OTI_AAC, true, 1, {0x3C}, 0, nullptr},
        {"narrowband speech", CAL_OTI_NB_SPEECH, true, 1, {0x3C}, 0, nullptr},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.pName);
        RecordingSal::Get().Reset();
        AudioInstance codec(c.uOTI);
        if (c.bAnswer)
            RecordingCodec::Get().Answer(CAL_PROP_AMR_FRAME_TYPE_LOCK, c.uValue);
        RecordingCodec::Get().results[1] = 42;
        EXPECT_EQ(Init(codec.get(), c.first), 42);
        EXPECT_EQ(codec->m_uAMRFrameType, c.uFrameType);
        EXPECT_EQ(codec->m_pSilenceFrame, nullptr);
        EXPECT_EQ(codec->m_uSilenceFrameLen, 0u);
        if (c.pRefusal)
            EXPECT_TRUE(HasTrace(11, 0, kRefused, c.pRefusal));
        else
            EXPECT_EQ(RecordingSal::Get().CountFormat(kRefused), 0u);

        // Frames pass as they are, also empty ones.
        const uint8_t frame[] = {0x14, 1, 2};
        EXPECT_EQ(Decode(codec.get(), frame, 3), std::make_pair(P(frame), CALParam{3}));
        EXPECT_EQ(Decode(codec.get(), nullptr, 0), std::make_pair(CALParam{0}, CALParam{0}));
    }
}

TEST_F(AudioAdapt, LockedStreamSubstitution)
{
    AudioInstance codec(CAL_OTI_AMR_NB);
    RecordingCodec::Get().Answer(CAL_PROP_AMR_FRAME_TYPE_LOCK, 1);
    Init(codec.get(), {0x3C});
    ASSERT_EQ(codec->m_uSilenceFrameLen, 32u);
    const std::pair<CALParam, CALParam> silent = {P(codec->m_pSilenceFrame), CALParam{32}};

    std::vector<uint8_t> ft7(32, 0xAA);
    ft7[0] = 0x3C;
    std::vector<uint8_t> ft7Flags = ft7;
    ft7Flags[0] = 0x3F; // Q and padding bits do not change the type
    std::vector<uint8_t> ft2(32, 0xAA);
    ft2[0] = 0x14;
    std::vector<uint8_t> padded = ft7;
    padded[0] = 0xBC; // type 23 unmasked
    const struct {
        const char *pName;
        const uint8_t *pData;
        int32_t iLen;
        bool bPasses;
    } cases[] = {
        {"locked type and length", ft7.data(), 32, true},
        {"quality and padding bits", ft7Flags.data(), 32, true},
        {"other type", ft2.data(), 32, false},
        {"locked type, shorter", ft7.data(), 31, false},
        {"locked type, longer", ft7.data(), 33, false},
        {"top bit set", padded.data(), 32, false},
        {"empty", nullptr, 0, false},
        {"negative length", ft7.data(), -32, false},
        {"null with the silent length", nullptr, 32, false},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.pName);
        const auto expected = c.bPasses ? std::make_pair(P(c.pData), static_cast<CALParam>(c.iLen)) : silent;
        EXPECT_EQ(Decode(codec.get(), c.pData, c.iLen), expected);
    }
    EXPECT_EQ(ft2[0], 0x14); // the caller's frame is not touched
    const CodecCall *pCall = RecordingCodec::Get().Last(3);
    EXPECT_EQ(std::vector<CALParam>(pCall->args.begin() + 2, pCall->args.end()),
              (std::vector<CALParam>{3, 4, 5, 6, 0x55}));
}

// A later Init that builds a new silent frame frees the old one; one that does not lock leaves it.
TEST_F(AudioAdapt, LaterInit)
{
    AudioInstance codec(CAL_OTI_AMR_WB);
    RecordingCodec::Get().Answer(CAL_PROP_AMR_FRAME_TYPE_LOCK, 1);
    Init(codec.get(), {0x04});
    Init(codec.get(), {0x44});
    EXPECT_EQ(codec->m_uAMRFrameType, 8u);
    EXPECT_EQ(codec->m_uSilenceFrameLen, 61u);
    EXPECT_EQ(RecordingSal::Get().liveBlocks.count(codec->m_pSilenceFrame), 1u);
    EXPECT_EQ(RecordingSal::Get().liveBlocks.size(), 4u); // handle, entry, instance, silent frame

    uint8_t *pKept = codec->m_pSilenceFrame;
    RecordingCodec::Get().Answer(CAL_PROP_AMR_FRAME_TYPE_LOCK, 0);
    Init(codec.get(), {0x0C});
    EXPECT_EQ(codec->m_pSilenceFrame, pKept);
    EXPECT_EQ(codec->m_uAMRFrameType, 8u);

    // Out of range: the type is recorded, the earlier frame stays.
    RecordingCodec::Get().Answer(CAL_PROP_AMR_FRAME_TYPE_LOCK, 1);
    Init(codec.get(), {0x4C});
    EXPECT_EQ(codec->m_uAMRFrameType, 9u);
    EXPECT_EQ(codec->m_pSilenceFrame, pKept);
}

TEST_F(AudioAdapt, AllocationFailureLeavesNoLock)
{
    AudioInstance codec(CAL_OTI_AMR_NB);
    RecordingCodec::Get().Answer(CAL_PROP_AMR_FRAME_TYPE_LOCK, 1);
    RecordingSal::Get().FailAllocation(1);
    Init(codec.get(), {0x3C});
    EXPECT_EQ(codec->m_pSilenceFrame, nullptr);
    EXPECT_EQ(codec->m_uSilenceFrameLen, 0u);

    // With a frame from an earlier Init: it is freed first, so the lock is off afterwards.
    Init(codec.get(), {0x14});
    ASSERT_NE(codec->m_pSilenceFrame, nullptr);
    RecordingSal::Get().FailAllocation(1);
    Init(codec.get(), {0x3C});
    EXPECT_EQ(codec->m_pSilenceFrame, nullptr);
    EXPECT_EQ(codec->m_uSilenceFrameLen, 0u);
    const uint8_t frame[] = {0x14};
    EXPECT_EQ(Decode(codec.get(), frame, 1), std::make_pair(P(frame), CALParam{1}));
}

TEST_F(AudioAdapt, NullInstance)
{
    uint32_t out[4] = {};
    EXPECT_EQ(vorCAL_AudioDecoderInit(nullptr, 0, nullptr, 0, nullptr, 0, &out[0], &out[1], &out[2], &out[3], 0),
              -1);
    EXPECT_EQ(vorCAL_AudioDecoderDecode(nullptr, nullptr, 0, 0, 0, 0, 0), -1);
}

TEST_F(AudioAdapt, StreamParameters)
{
    const std::vector<uint32_t> kCodecs = {11, 22, 33, 44}; // what the codec's Init writes
    const struct {
        const char *pName;
        uint32_t uOTI;
        uint32_t uProperty3; // 99: unanswered
        std::vector<uint8_t> config;
        std::vector<uint32_t> out; // rate, channels, bits, samples
    } cases[] = {
        {"SBR 24000", CAL_OTI_AAC, 1, {0x2B, 0x12}, {48000, 2, 16, 2048}},
        {"LC 44100", CAL_OTI_AAC, 1, {0x12, 0x10}, {44100, 2, 16, 1024}},
        {"SBR object type on 0x41", CAL_OTI_AAC_SBR, 1, {0x2B, 0x92}, {44100, 2, 16, 2048}},
        {"MPEG-2 AAC mono 8000", CAL_OTI_MPEG2_AAC, 1, {0x15, 0x88}, {8000, 1, 16, 1024}},
        {"index 13", CAL_OTI_AAC, 1, {0x16, 0x88}, {0, 1, 16, 1024}},
        {"SBR at index 13", CAL_OTI_AAC, 1, {0x2E, 0x88}, {0, 1, 16, 2048}},
        {"one byte of DSI", CAL_OTI_AAC, 1, {0x2B}, {11, 22, 16, 1024}},
        {"no DSI", CAL_OTI_AAC, 1, {}, {11, 22, 16, 1024}},
        {"AMR-NB", CAL_OTI_AMR_NB, 1, {}, {8000, 1, 16, 160}},
        {"narrowband speech", CAL_OTI_NB_SPEECH, 1, {0x12, 0x10}, {8000, 1, 16, 160}},
        {"AMR-WB keeps narrowband values", CAL_OTI_AMR_WB, 1, {}, {8000, 1, 16, 160}},
        {"DRA", CAL_OTI_DRA, 1, {0x12, 0x10}, kCodecs},
        {"property 0", CAL_OTI_AAC, 0, {0x12, 0x10}, kCodecs},
        {"property 2", CAL_OTI_AMR_NB, 2, {}, kCodecs},
        {"property unanswered", CAL_OTI_AAC, 99, {0x12, 0x10}, kCodecs},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.pName);
        AudioInstance codec(c.uOTI);
        RecordingCodec &rc = RecordingCodec::Get();
        if (c.uProperty3 != 99)
            rc.Answer(CAL_PROP_STREAM_PARAMETERS, c.uProperty3);
        rc.writeOutputs = true;
        std::copy(kCodecs.begin(), kCodecs.end(), rc.outputs);
        rc.results[1] = -7;
        std::vector<uint32_t> out(4, 0);
        const uint8_t first[] = {0x3C};
        EXPECT_EQ(vorCAL_AudioDecoderInit(codec.get(), 0, c.config.empty() ? nullptr : c.config.data(),
                                          static_cast<int32_t>(c.config.size()), first, 1, &out[0], &out[1],
                                          &out[2], &out[3], 0),
                  -7);
        EXPECT_EQ(out, c.out);
    }
}

} // namespace
