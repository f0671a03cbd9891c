#include <gtest/gtest.h>

#include <string>
#include <vector>

#include <vorcal/audio_tools.h>

#include "adts_header.hpp"
#include "audio_instance.hpp"
#include "mute_test_util.hpp"
#include "recording_codec.hpp"
#include "recording_sal.hpp"

using namespace vorcal::test;

namespace {

constexpr uint32_t kModeSizes[5] = {11, 17, 22, 31, 24};
constexpr uint32_t kModeDigests[5] = {0x81044C79, 0xC56A0CBA, 0xD69C5840, 0x7EC008AE, 0x6509E72F};

int32_t IndexOf(int64_t iRate)
{
    for (int32_t i = 0; i < 12; ++i) {
        if (kAdtsRates[i] == iRate)
            return i;
    }
    return -1;
}

// The silence-frame header: profile 2, buffer fullness 0x7CF.
std::vector<uint8_t> SilenceHeader(uint32_t uIndex, uint32_t uChannelConfiguration, uint32_t uRawLen)
{
    return AdtsHeader(AdtsFields{2, uIndex, uChannelConfiguration, (uRawLen + 7) & 0x1FFF, 0x7CF});
}

TEST(SampleRateIndex, ExactRatesOnly)
{
    for (int32_t i = 0; i < 12; ++i) {
        const int32_t iRate = static_cast<int32_t>(kAdtsRates[i]);
        EXPECT_EQ(mute_get_samplerate_idx(iRate), i);
        EXPECT_EQ(mute_get_samplerate_idx(iRate + 1), -1);
        EXPECT_EQ(mute_get_samplerate_idx(iRate - 1), -1);
    }
    for (int32_t iRate : {0, -1, 7350, 50000, 192000, -96000})
        EXPECT_EQ(mute_get_samplerate_idx(iRate), -1) << iRate;
}

// Every rate, mode and channel count against the header written field by field.
TEST(MakeAdts, EveryRateModeAndChannelCount)
{
    std::vector<int32_t> rates(std::begin(kAdtsRates), std::end(kAdtsRates));
    rates.insert(rates.end(), {7350, 7999, 50000, 96001, 176400, 192000, 0, -44100});
    for (int32_t iRate : rates) {
        for (int32_t iMode = -1; iMode <= 5; ++iMode) {
            for (uint32_t uChannels = 0; uChannels <= 9; ++uChannels) {
                SCOPED_TRACE(testing::Message() << iRate << " Hz, mode " << iMode << ", " << uChannels << " ch");
                const int32_t iIndex = IndexOf(iMode > 1 ? iRate / 2 : iRate);
                const bool bRefused = iRate < 8000 || iRate > 96000 || iIndex < 0 ||
                                      ((iMode == 0 || iMode == 2) && uChannels == 2);
                uint8_t header[7] = {};
                EXPECT_EQ(AAC_MakeADTS(header, iRate, uChannels, iMode, 100), bRefused ? -1 : 0);
                if (bRefused) {
                    EXPECT_EQ(header[0], 0xFF); // written before the checks
                    continue;
                }
                const uint32_t uConfig = iMode == 4 ? 1 : (uChannels & 7);
                EXPECT_EQ(std::vector<uint8_t>(header, header + 7),
                          SilenceHeader(static_cast<uint32_t>(iIndex), uConfig, 100));
            }
        }
    }
}

TEST(MakeAdts, AddsIntoTheBytesAndTraces)
{
    RecordingSal::Get().Reset();
    uint8_t header[7] = {1, 1, 1, 1, 1, 1, 1};
    ASSERT_EQ(AAC_MakeADTS(header, 44100, 2, 1, 17), 0);
    // FF F9 90 80 03 1F 3C, each byte one more (modulo 256).
    EXPECT_EQ(std::vector<uint8_t>(header, header + 7),
              (std::vector<uint8_t>{0x00, 0xFA, 0x91, 0x81, 0x04, 0x20, 0x3D}));
    EXPECT_TRUE(HasTrace(1, 2, "AAC_MakeADTS() : %u, %u, %u, %u\n", "AAC_MakeADTS() : 44100, 2, 1, 17\n"));

    // The 13-bit frame_length wraps: raw 8185 gives length 8192, written as 0.
    uint8_t wrapped[7] = {};
    ASSERT_EQ(AAC_MakeADTS(wrapped, 44100, 2, 1, 8185), 0);
    EXPECT_EQ(std::vector<uint8_t>(wrapped, wrapped + 7), SilenceHeader(4, 2, 8185));
    EXPECT_EQ(_GetAACFrameLength(wrapped), 0u);
}

class AacMute : public testing::Test {
protected:
    void SetUp() override { RecordingSal::Get().Reset(); }
    void TearDown() override { EXPECT_TRUE(RecordingSal::Get().liveBlocks.empty()); }
};

TEST_F(AacMute, EveryModeWithAndWithoutHeader)
{
    for (int32_t iMode = 0; iMode < 5; ++iMode) {
        for (uint32_t uChannels : {1u, 2u}) {
            for (uint32_t uRate : {8000u, 22050u, 44100u, 48000u}) {
                const bool bStereoInMono = (iMode == 0 || iMode == 2) && uChannels == 2;
                SCOPED_TRACE(testing::Message() << "mode " << iMode << ", " << uChannels << " ch, " << uRate);
                const uint32_t uSize = kModeSizes[iMode];

                uint8_t *pFrame = nullptr;
                uint32_t uLen = 0;
                ASSERT_EQ(AAC_MuteFrame(&pFrame, &uLen, 0, uRate, uChannels, 0, iMode), 0);
                const std::vector<uint8_t> raw = TakeFrame(pFrame, uLen);
                ASSERT_EQ(raw.size(), uSize);
                EXPECT_EQ(Fnv1a(raw.data(), raw.size()), kModeDigests[iMode]);

                pFrame = nullptr;
                const int32_t iResult = AAC_MuteFrame(&pFrame, &uLen, 0, uRate, uChannels, 1, iMode);
                if (bStereoInMono) {
                    EXPECT_EQ(iResult, -1);
                    EXPECT_EQ(pFrame, nullptr);
                    EXPECT_EQ(uLen, uSize); // the template length stays behind
                    continue;
                }
                ASSERT_EQ(iResult, 0);
                std::vector<uint8_t> expected =
                    SilenceHeader(static_cast<uint32_t>(IndexOf(uRate)), iMode == 4 ? 1 : uChannels, uSize);
                expected.insert(expected.end(), raw.begin(), raw.end());
                EXPECT_EQ(TakeFrame(pFrame, uLen), expected);
            }
        }
    }
}

TEST_F(AacMute, Refusals)
{
    const struct {
        uint32_t uRate;
        uint32_t bADTS;
        int32_t iMode;
        int32_t iResult;
    } cases[] = {
        {7999, 0, 0, -1},  {96001, 0, 1, -1}, {7350, 0, 0, -1}, {7350, 1, 0, -1}, {50000, 1, 0, -1},
        {50000, 0, 0, 0},  {44100, 0, -1, -1}, {44100, 0, 5, -1}, {96000, 1, 2, -1}, {96000, 0, 2, 0},
        {64000, 1, 3, -1}, {48000, 1, 3, 0},  {96000, 1, 0, 0},  {8000, 1, 4, 0},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(testing::Message() << c.uRate << " Hz, ADTS " << c.bADTS << ", mode " << c.iMode);
        uint8_t *pFrame = nullptr;
        uint32_t uLen = 0;
        EXPECT_EQ(AAC_MuteFrame(&pFrame, &uLen, 0, c.uRate, 1, c.bADTS, c.iMode), c.iResult);
        if (c.iResult == 0)
            TakeFrame(pFrame, uLen);
        else
            EXPECT_EQ(pFrame, nullptr);
    }
    uint32_t uLen = 0;
    uint8_t *pFrame = nullptr;
    EXPECT_EQ(AAC_MuteFrame(nullptr, &uLen, 0, 44100, 1, 0, 0), -1);
    EXPECT_EQ(AAC_MuteFrame(&pFrame, nullptr, 0, 44100, 1, 0, 0), -1);
}

// Every generator: a failed allocation returns -1 and stores nothing.
TEST_F(AacMute, AllocationFailureInEveryGenerator)
{
    using Call = int32_t (*)(uint8_t **, uint32_t *);
    const Call calls[] = {
        [](uint8_t **pp, uint32_t *pu) { return AAC_MuteFrame(pp, pu, 0, 44100, 2, 0, 1); },
        [](uint8_t **pp, uint32_t *pu) { return AAC_MuteFrame(pp, pu, 0, 22050, 1, 1, 2); },
        [](uint8_t **pp, uint32_t *pu) { return AMRNB_MuteFrame(pp, pu, 3); },
        [](uint8_t **pp, uint32_t *pu) { return AMRWB_MuteFrame(pp, pu, 8); },
        [](uint8_t **pp, uint32_t *pu) { return DRA_MuteFrame(pp, pu, 48000, 2); },
    };
    for (Call call : calls) {
        RecordingSal::Get().FailAllocation(1);
        uint8_t sentinel = 0;
        uint8_t *pFrame = &sentinel;
        uint32_t uLen = 77;
        EXPECT_EQ(call(&pFrame, &uLen), -1);
        EXPECT_EQ(pFrame, &sentinel);
        EXPECT_EQ(uLen, 77u);
        EXPECT_EQ(RecordingSal::Get().failedAllocs, 1u);
        RecordingSal::Get().failedAllocs = 0;
    }
}

class SilenceFrame : public testing::Test {
protected:
    void SetUp() override { RecordingSal::Get().Reset(); }
    void TearDown() override { EXPECT_TRUE(RecordingSal::Get().liveBlocks.empty()); }

    int32_t Get(CALCodec *hCodec, uint32_t uRate, uint32_t uChannels, uint32_t bADTS)
    {
        pFrame = reinterpret_cast<const uint8_t *>(&sentinel);
        uLen = 77;
        return vorCALTools_GetSilenceFrame(hCodec, uRate, uChannels, 0, bADTS, &pFrame, &uLen);
    }
    std::vector<uint8_t> Bytes() const { return std::vector<uint8_t>(pFrame, pFrame + uLen); }

    uint8_t sentinel = 0;
    const uint8_t *pFrame = nullptr;
    uint32_t uLen = 0;
};

TEST_F(SilenceFrame, NullInstance)
{
    EXPECT_EQ(Get(nullptr, 44100, 1, 0), 1);
    EXPECT_EQ(pFrame, &sentinel);
    EXPECT_EQ(uLen, 77u);
    EXPECT_TRUE(HasTrace(11, 0, "[CAL_Tools %d] vorCALTools_GetSilenceFrame() : Codec Handle is NULL....\n",
                         "[CAL_Tools 594] vorCALTools_GetSilenceFrame() : Codec Handle is NULL....\n"));
}

TEST_F(SilenceFrame, AacIsCachedAndHandedOutAgain)
{
    AudioInstance codec(CAL_OTI_AAC);
    RecordingCodec::Get().Answer(CAL_PROP_AAC_SILENCE_FRAMES, 1);
    ASSERT_EQ(Get(codec.get(), 44100, 1, 0), 0);
    EXPECT_EQ(pFrame, codec->m_pSilenceFrame);
    EXPECT_EQ(uLen, 11u);
    const std::vector<uint8_t> first = Bytes();

    // Rate, channel count and header flag no longer matter, not even a bad channel count.
    for (uint32_t uChannels : {2u, 7u}) {
        ASSERT_EQ(Get(codec.get(), 8000, uChannels, 1), 0);
        EXPECT_EQ(Bytes(), first);
    }
    EXPECT_EQ(RecordingSal::Get().allocSizes.back(), 11u);
    // The property is asked on every call; a 0 answer withholds even the cached frame.
    EXPECT_EQ(RecordingCodec::Get().propertyQueries, (std::vector<uint32_t>{114, 114, 114}));
    RecordingCodec::Get().Answer(CAL_PROP_AAC_SILENCE_FRAMES, 0);
    EXPECT_EQ(Get(codec.get(), 44100, 1, 0), 16);
    EXPECT_EQ(pFrame, nullptr);
    EXPECT_EQ(uLen, 0u);
}

TEST_F(SilenceFrame, Property114)
{
    const struct {
        const char *pName;
        bool bAnswer;
        uint32_t uValue;
        int32_t iGetPropertyResult;
        int32_t iResult;
    } cases[] = {
        {"unanswered", false, 0, 0, 16},
        {"answered 0", true, 0, 0, 16},
        {"answered 1", true, 1, 0, 0},
        {"non-zero value, failing result", true, 5, -1, 0}, // only the value counts
    };
    for (uint32_t uOTI : {CAL_OTI_AAC, CAL_OTI_AAC_SBR}) {
        for (const auto &c : cases) {
            SCOPED_TRACE(testing::Message() << c.pName << ", OTI " << uOTI);
            AudioInstance codec(uOTI);
            if (c.bAnswer)
                RecordingCodec::Get().Answer(CAL_PROP_AAC_SILENCE_FRAMES, c.uValue, c.iGetPropertyResult);
            EXPECT_EQ(Get(codec.get(), 44100, 2, 0), c.iResult);
            if (c.iResult == 16) {
                EXPECT_EQ(pFrame, nullptr);
                EXPECT_EQ(uLen, 0u);
                EXPECT_EQ(codec->m_pSilenceFrame, nullptr);
            }
            const CodecCall *pCall = RecordingCodec::Get().Last(0);
            ASSERT_NE(pCall, nullptr);
            EXPECT_EQ(pCall->args.size(), 2u); // property and value word, no user data
        }
    }
}

TEST_F(SilenceFrame, ModesByOtiAndChannels)
{
    const struct {
        uint32_t uOTI;
        uint32_t uRate;
        uint32_t uChannels;
        uint32_t bADTS;
        int32_t iResult;
        std::vector<uint8_t> header; // empty: no header
        uint32_t uRawLen;
    } cases[] = {
        {CAL_OTI_AAC, 44100, 1, 0, 0, {}, 11},
        {CAL_OTI_AAC, 44100, 2, 1, 0, {0xFF, 0xF9, 0x90, 0x80, 0x03, 0x1F, 0x3C}, 17},
        {CAL_OTI_AAC_SBR, 22050, 1, 1, 0, {0xFF, 0xF9, 0x9C, 0x40, 0x03, 0xBF, 0x3C}, 22},
        {CAL_OTI_AAC_SBR, 24000, 2, 0, 0, {}, 31},
        {CAL_OTI_AAC_SBR, 96000, 1, 1, -1, {}, 0}, // the doubled rate is out of range
        {CAL_OTI_AAC_SBR, 96000, 1, 0, 0, {}, 22},
        {CAL_OTI_AAC, 44100, 0, 0, 1, {}, 0},
        {CAL_OTI_AAC, 44100, 3, 1, 1, {}, 0},
        {CAL_OTI_AAC_SBR, 44100, 0, 0, -1, {}, 0},
        {CAL_OTI_AAC_SBR, 44100, 6, 0, -1, {}, 0},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(testing::Message() << "OTI " << c.uOTI << ", " << c.uRate << " Hz, " << c.uChannels
                                        << " ch, ADTS " << c.bADTS);
        AudioInstance codec(c.uOTI);
        RecordingCodec::Get().Answer(CAL_PROP_AAC_SILENCE_FRAMES, 1);
        EXPECT_EQ(Get(codec.get(), c.uRate, c.uChannels, c.bADTS), c.iResult);
        if (c.iResult != 0) {
            EXPECT_EQ(codec->m_pSilenceFrame, nullptr);
            EXPECT_EQ(codec->m_uSilenceFrameLen, 0u);
            continue;
        }
        ASSERT_EQ(uLen, c.header.size() + c.uRawLen);
        EXPECT_EQ(std::vector<uint8_t>(pFrame, pFrame + c.header.size()), c.header);
    }
}

TEST_F(SilenceFrame, AmrIsOneStaticByte)
{
    for (uint32_t uOTI : {CAL_OTI_AMR_NB, CAL_OTI_AMR_WB}) {
        AudioInstance codec(uOTI);
        // The locked AMR frame in the cache is not what this call hands out.
        ASSERT_EQ(AMRNB_MuteFrame(&codec->m_pSilenceFrame, &codec->m_uSilenceFrameLen, 7), 0);
        EXPECT_EQ(Get(codec.get(), 8000, 1, 1), 0);
        ASSERT_EQ(uLen, 1u);
        EXPECT_EQ(pFrame[0], 0x7C);
        EXPECT_NE(pFrame, codec->m_pSilenceFrame);
        EXPECT_EQ(codec->m_uSilenceFrameLen, 32u);
        EXPECT_TRUE(RecordingCodec::Get().propertyQueries.empty());
    }
}

TEST_F(SilenceFrame, DraIsCached)
{
    AudioInstance codec(CAL_OTI_DRA);
    EXPECT_EQ(Get(codec.get(), 44100, 1, 0), -1);
    EXPECT_EQ(codec->m_pSilenceFrame, nullptr);
    EXPECT_EQ(Get(codec.get(), 22050, 2, 0), -1);
    ASSERT_EQ(Get(codec.get(), 44100, 2, 0), 0);
    EXPECT_EQ(Bytes(), (std::vector<uint8_t>{0x7F, 0xFF, 0x00, 0x5B, 0x93, 0xA0, 0x00, 0x1F}));
    ASSERT_EQ(Get(codec.get(), 32000, 5, 0), 0);
    EXPECT_EQ(pFrame[3], 0x5B);
    EXPECT_EQ(pFrame[4], 0x93);
    EXPECT_TRUE(RecordingCodec::Get().propertyQueries.empty());
}

TEST_F(SilenceFrame, OtherCodecsHaveNone)
{
    for (uint32_t uOTI : {CAL_OTI_MPEG2_AAC, CAL_OTI_NB_SPEECH, CAL_OTI_H264, 0u}) {
        AudioInstance codec(uOTI);
        RecordingCodec::Get().Answer(CAL_PROP_AAC_SILENCE_FRAMES, 1);
        EXPECT_EQ(Get(codec.get(), 44100, 2, 1), 16) << uOTI;
        EXPECT_EQ(pFrame, nullptr);
        EXPECT_EQ(uLen, 0u);
    }
}

// A failed build caches nothing, so the next call builds again; release frees the cache.
TEST_F(SilenceFrame, AllocationFailureLeavesTheCacheEmpty)
{
    for (uint32_t uOTI : {CAL_OTI_AAC, CAL_OTI_AAC_SBR, CAL_OTI_DRA}) {
        SCOPED_TRACE(uOTI);
        AudioInstance codec(uOTI);
        RecordingCodec::Get().Answer(CAL_PROP_AAC_SILENCE_FRAMES, 1);
        RecordingSal::Get().FailAllocation(1);
        EXPECT_EQ(Get(codec.get(), 44100, 2, 1), -1);
        EXPECT_EQ(pFrame, &sentinel);
        EXPECT_EQ(codec->m_pSilenceFrame, nullptr);
        EXPECT_EQ(codec->m_uSilenceFrameLen, 0u);
        EXPECT_EQ(Get(codec.get(), 44100, 2, 1), 0);
        EXPECT_EQ(pFrame, codec->m_pSilenceFrame);
    }
}

} // namespace
