#include <gtest/gtest.h>

#include <algorithm>
#include <tuple>
#include <vector>

#include <vorcal/audio_tools.h>

#include "adts_header.hpp"
#include "mute_test_util.hpp"

using namespace vorcal::test;

namespace {

int32_t IndexOf(int32_t iRate)
{
    const auto *p = std::find(std::begin(kAdtsRates), std::end(kAdtsRates), static_cast<uint32_t>(iRate));
    return p == std::end(kAdtsRates) || iRate < 0 ? -1 : static_cast<int32_t>(p - kAdtsRates);
}

// Exact rates only; the SBR modes (2-4) halve the rate; the mono templates (0, 2) refuse 2
// channels; mode 4 writes configuration 1; profile 2, fullness 0x7CF, 13-bit frame_length.
TEST(MakeAdts, EveryRateModeAndChannelCount)
{
    std::vector<int32_t> rates(std::begin(kAdtsRates), std::end(kAdtsRates));
    rates.insert(rates.end(), {7350, 7999, 44101, 50000, 96001, -44100});
    for (int32_t iRate : rates) {
        EXPECT_EQ(mute_get_samplerate_idx(iRate), IndexOf(iRate)) << iRate;
        for (int32_t iMode = -1; iMode <= 5; ++iMode) {
            for (uint32_t uChannels = 0; uChannels <= 9; ++uChannels) {
                SCOPED_TRACE(testing::Message() << iRate << " Hz, mode " << iMode << ", " << uChannels << " ch");
                const uint32_t uRaw = uChannels * 1023; // 9207 wraps
                const int32_t iIndex = IndexOf(iMode > 1 ? iRate / 2 : iRate);
                const bool bRefused =
                    iRate < 8000 || iRate > 96000 || iIndex < 0 || ((iMode == 0 || iMode == 2) && uChannels == 2);
                std::vector<uint8_t> header(7, 0);
                EXPECT_EQ(AAC_MakeADTS(header.data(), iRate, uChannels, iMode, uRaw), bRefused ? -1 : 0);
                EXPECT_EQ(header[0], 0xFF);
                if (!bRefused) {
                    EXPECT_EQ(header, AdtsHeader(2, static_cast<uint32_t>(iIndex), iMode == 4 ? 1 : uChannels & 7,
                                                 (uRaw + 7) & 0x1FFF, 0x7CF));
                }
            }
        }
    }
    // Each field is added into its byte (modulo 256).
    RecordingSal::Get().Reset();
    std::vector<uint8_t> header(7, 1);
    ASSERT_EQ(AAC_MakeADTS(header.data(), 44100, 2, 1, 17), 0);
    EXPECT_EQ(header, (std::vector<uint8_t>{0x00, 0xFA, 0x91, 0x81, 0x04, 0x20, 0x3D})); // FF F9 90 80 03 1F 3C + 1
    EXPECT_TRUE(HasTrace(1, 2, "AAC_MakeADTS() : %u, %u, %u, %u\n", "AAC_MakeADTS() : 44100, 2, 1, 17\n"));
}

// The rate range is checked before the header; the SBR modes double the rate for the header,
// so with one they accept up to 48000 Hz. A refused header leaves the template length behind.
TEST(AacMute, RatesModesAndRefusals)
{
    const std::tuple<uint32_t, uint32_t, uint32_t, int32_t, int32_t, uint32_t> cases[] = {
        // rate, channels, ADTS, mode, result, length
        {7999, 1, 0, 0, -1, 0},  {96001, 1, 0, 1, -1, 0}, {7350, 1, 1, 0, -1, 0},  {50000, 1, 1, 0, -1, 11},
        {50000, 1, 0, 0, 0, 11}, {44100, 1, 0, -1, -1, 0}, {44100, 1, 0, 5, -1, 0}, {96000, 1, 1, 2, -1, 22},
        {96000, 1, 0, 2, 0, 22}, {96000, 2, 1, 1, 0, 24}, {48000, 2, 1, 3, 0, 38}, {8000, 2, 1, 4, 0, 31},
        {22050, 2, 1, 2, -1, 22}, // stereo in a mono template
    };
    for (const auto &[uRate, uChannels, bADTS, iMode, iResult, uExpectedLen] : cases) {
        SCOPED_TRACE(testing::Message() << uRate << " Hz, " << uChannels << " ch, ADTS " << bADTS << " mode " << iMode);
        uint8_t *pFrame = nullptr;
        uint32_t uLen = 0;
        EXPECT_EQ(AAC_MuteFrame(&pFrame, &uLen, 0, uRate, uChannels, bADTS, iMode), iResult);
        EXPECT_EQ(uLen, uExpectedLen);
        EXPECT_EQ(pFrame == nullptr, iResult != 0);
        if (pFrame)
            TakeFrame(pFrame, uLen);
    }
    uint32_t uLen = 0;
    EXPECT_EQ(AAC_MuteFrame(nullptr, &uLen, 0, 44100, 1, 0, 0), -1);
}

// vorCALTools_GetSilenceFrame's outputs; a sentinel shows they were left alone.
const uint8_t kUntouched = 0;
const uint8_t *g_pFrame = nullptr;
uint32_t g_uLen = 0;

int32_t Get(CALCodec *hCodec, uint32_t uRate, uint32_t uChannels, uint32_t bADTS)
{
    g_pFrame = &kUntouched;
    g_uLen = 77;
    return vorCALTools_GetSilenceFrame(hCodec, uRate, uChannels, 0, bADTS, &g_pFrame, &g_uLen);
}

std::vector<uint8_t> Bytes(size_t n = 99)
{
    return std::vector<uint8_t>(g_pFrame, g_pFrame + std::min<size_t>(n, g_uLen));
}

// Property 114 (AAC only) withholds frames when its value is 0, unanswered too: 16 clears the
// outputs. Other refusals leave them alone and cache nothing.
TEST(SilenceFrame, ByCodecAndProperty114)
{
    constexpr int64_t kNo = -1; // property unanswered
    const std::vector<uint8_t> dra = {0x7F, 0xFF, 0x00, 0x5B, 0x93, 0xA0, 0x00, 0x1F};
    using Case = std::tuple<uint32_t, int64_t, uint32_t, uint32_t, uint32_t, int32_t, std::vector<uint8_t>, uint32_t>;
    const Case cases[] = {
        // OTI, property 114, rate, channels, ADTS, result, first bytes, length (77: untouched)
        {CAL_OTI_AAC, 1, 44100, 1, 0, 0, {0x00}, 11},
        {CAL_OTI_AAC, 1, 44100, 2, 1, 0, {0xFF, 0xF9, 0x90, 0x80, 0x03, 0x1F, 0x3C, 0x21}, 24},
        {CAL_OTI_AAC_SBR, 1, 22050, 1, 1, 0, {0xFF, 0xF9, 0x9C, 0x40, 0x03, 0xBF, 0x3C, 0x00}, 29},
        {CAL_OTI_AAC_SBR, 1, 24000, 2, 0, 0, {0x21}, 31}, {CAL_OTI_AAC_SBR, 1, 96000, 1, 0, 0, {0x00}, 22},
        {CAL_OTI_AAC_SBR, 1, 96000, 1, 1, -1, {}, 77}, {CAL_OTI_AAC, 1, 44100, 3, 1, 1, {}, 77},
        {CAL_OTI_AAC_SBR, 1, 44100, 0, 0, -1, {}, 77}, {CAL_OTI_AAC, kNo, 44100, 1, 0, 16, {}, 0},
        {CAL_OTI_AAC_SBR, 0, 44100, 1, 0, 16, {}, 0},  {CAL_OTI_DRA, kNo, 44100, 2, 1, 0, dra, 8},
        {CAL_OTI_DRA, 1, 44100, 1, 0, -1, {}, 77},     {CAL_OTI_AMR_NB, 0, 44100, 2, 1, 0, {0x7C}, 1},
        {CAL_OTI_AMR_WB, kNo, 0, 0, 0, 0, {0x7C}, 1},  {CAL_OTI_MPEG2_AAC, 1, 44100, 2, 1, 16, {}, 0},
    };
    for (const auto &[uOTI, iAnswer, uRate, uChannels, bADTS, iResult, start, uExpectedLen] : cases) {
        SCOPED_TRACE(testing::Message() << uOTI << ", " << uRate << " Hz, " << uChannels << " ch, ADTS " << bADTS);
        AudioInstance codec(uOTI);
        if (iAnswer != kNo)
            RecordingCodec::Get().Answer(CAL_PROP_AAC_SILENCE_FRAMES, uint32_t(iAnswer));
        EXPECT_EQ(Get(codec.get(), uRate, uChannels, bADTS), iResult);
        EXPECT_EQ(g_uLen, uExpectedLen);
        EXPECT_EQ(Bytes(start.size()), start);
        EXPECT_EQ(g_pFrame == &kUntouched, uExpectedLen == 77);
        EXPECT_EQ(g_pFrame == nullptr, iResult == 16);
        // AAC and DRA frames are cached in the instance; the AMR byte is static.
        EXPECT_EQ(g_pFrame && g_pFrame == codec->m_pSilenceFrame, iResult == 0 && g_uLen > 1);
    }
}

// Once cached, rate, channel count and header flag no longer matter; property 114 is asked on
// every call (only the value counts) and 0 withholds even the cached frame. A failed build
// caches nothing, so the next call builds again. A locked AMR frame in the cache is not used.
TEST(SilenceFrame, CacheAndAllocationFailure)
{
    RecordingSal::Get().Reset();
    EXPECT_EQ(Get(nullptr, 44100, 1, 0), 1);
    EXPECT_EQ(std::make_pair(g_pFrame, g_uLen), std::make_pair(&kUntouched, 77u));
    EXPECT_TRUE(HasNumberedTrace(11, "[CAL_Tools 594] vorCALTools_GetSilenceFrame() : Codec Handle is NULL....\n"));
    for (uint32_t uOTI : {CAL_OTI_AAC, CAL_OTI_AAC_SBR, CAL_OTI_DRA}) {
        SCOPED_TRACE(uOTI);
        AudioInstance codec(uOTI);
        RecordingCodec::Get().Answer(CAL_PROP_AAC_SILENCE_FRAMES, 5, -1);
        RecordingSal::Get().FailAllocation(1);
        EXPECT_EQ(Get(codec.get(), 44100, 2, 1), -1);
        EXPECT_EQ(std::make_pair(g_pFrame, codec->m_pSilenceFrame), std::make_pair(&kUntouched, (uint8_t *)nullptr));
        ASSERT_EQ(Get(codec.get(), 44100, 2, 1), 0);
        const std::vector<uint8_t> first = Bytes();
        ASSERT_EQ(Get(codec.get(), 32000, 7, 0), 0);
        EXPECT_EQ(std::make_pair(g_pFrame, Bytes()), std::make_pair((const uint8_t *)codec->m_pSilenceFrame, first));
        if (uOTI == CAL_OTI_DRA)
            continue;
        EXPECT_EQ(RecordingCodec::Get().propertyQueries, (std::vector<uint32_t>{114, 114, 114}));
        EXPECT_EQ(RecordingCodec::Get().Last(0)->args.size(), 2u); // property and value word
        RecordingCodec::Get().Answer(CAL_PROP_AAC_SILENCE_FRAMES, 0);
        EXPECT_EQ(Get(codec.get(), 44100, 2, 1), 16);
    }
    AudioInstance amr(CAL_OTI_AMR_NB);
    ASSERT_EQ(AMRNB_MuteFrame(&amr->m_pSilenceFrame, &amr->m_uSilenceFrameLen, 7), 0);
    ASSERT_EQ(Get(amr.get(), 8000, 1, 1), 0);
    EXPECT_EQ(Bytes(), std::vector<uint8_t>{0x7C});
}

} // namespace
