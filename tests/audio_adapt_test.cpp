#include <gtest/gtest.h>

#include <string>
#include <vector>

#include <vorcal/audio_tools.h>
#include <vorcal/wrapper.h>

#include "mute_test_util.hpp"

using namespace vorcal::test;

namespace {

// Init with the first frame and configuration given; the four outputs come back in out.
int32_t Init(CALCodec *hCodec, std::vector<uint8_t> first, std::vector<uint8_t> config = {}, uint32_t *out = nullptr)
{
    uint32_t dummy[4] = {};
    out = out ? out : dummy;
    return vorCAL_AudioDecoderInit(hCodec, 0, config.empty() ? nullptr : config.data(), int32_t(config.size()),
                                   first.empty() ? nullptr : first.data(), uint32_t(first.size()), &out[0], &out[1],
                                   &out[2], &out[3], 0x55);
}

// The frame and length the codec's Decode received.
std::pair<CALParam, CALParam> Decode(CALCodec *hCodec, const uint8_t *pData, int32_t iLen)
{
    EXPECT_EQ(vorCAL_AudioDecoderDecode(hCodec, pData, iLen, 3, 4, 5, 6), 0);
    const CodecCall *pCall = RecordingCodec::Get().Last(3);
    return {pCall->args[0], pCall->args[1]};
}

// The first frame's type (header byte >> 3, unmasked) locks when property 113 answers 1 and it
// is in range; otherwise no silent frame, and every frame passes as it is.
TEST(AudioAdapt, FrameTypeLock)
{
    const std::string refused = "[vorCAL_Wrapper, %d] AMR %s FT = [%d]\n";
    const std::tuple<uint32_t, int64_t, std::vector<uint8_t>, uint32_t, std::string> cases[] = {
        // OTI, property 113 (-1: unanswered), first frame, silent frame length, trace
        {CAL_OTI_AMR_NB, 1, {0x3F, 0}, 32, "[vorCAL_Wrapper, #] AMR NB FT = [7]\n"},
        {CAL_OTI_AMR_WB, 1, {0x44}, 61, "[vorCAL_Wrapper, #] AMR WB FT = [8]\n"},
        {CAL_OTI_AMR_NB, 1, {0x44}, 0, "[vorCAL_Wrapper, #] AMR NB FT = [8]\n"},
        {CAL_OTI_AMR_WB, 1, {0x4C}, 0, "[vorCAL_Wrapper, #] AMR WB FT = [9]\n"},
        {CAL_OTI_AMR_NB, 1, {0xBC}, 0, "[vorCAL_Wrapper, #] AMR NB FT = [23]\n"}, // padding bit set
        {CAL_OTI_AMR_NB, -1, {0x3C}, 0, ""}, {CAL_OTI_AMR_WB, 2, {0x3C}, 0, ""},
        {CAL_OTI_AMR_NB, 1, {}, 0, ""},      {CAL_OTI_AAC, 1, {0x3C}, 0, ""},
    };
    for (const auto &[uOTI, iLock, first, uLockedLen, trace] : cases) {
        SCOPED_TRACE(trace);
        RecordingSal::Get().Reset();
        AudioInstance codec(uOTI);
        if (iLock >= 0)
            RecordingCodec::Get().Answer(CAL_PROP_AMR_FRAME_TYPE_LOCK, uint32_t(iLock));
        RecordingCodec::Get().results[1] = 42;
        EXPECT_EQ(Init(codec.get(), first), 42);
        EXPECT_EQ(codec->m_uSilenceFrameLen, uLockedLen);
        EXPECT_EQ(codec->m_uAMRFrameType, trace.empty() ? 0u : first[0] >> 3);
        EXPECT_TRUE(trace.empty()  ? RecordingSal::Get().CountFormat(refused) == 0
                    : uLockedLen ? HasNumberedTrace(1, trace)
                                 : HasTrace(11, 0, refused, trace));
        const uint8_t frame[] = {0x14, 1, 2};
        EXPECT_EQ(Decode(codec.get(), frame, 3) == std::make_pair(P(frame), CALParam{3}), uLockedLen == 0);
    }
    EXPECT_EQ(Init(nullptr, {}), -1);
    EXPECT_EQ(vorCAL_AudioDecoderDecode(nullptr, nullptr, 0, 0, 0, 0, 0), -1);
}

// Frames of the locked type and length pass; any other (the length decides first) reaches the
// codec as the silent frame. A later Init that reaches the lock step frees the old frame first,
// also when the new type is out of range or its frame cannot be allocated (no lock then); one
// that does not reach it leaves the fields alone.
TEST(AudioAdapt, SubstitutionAndLaterInit)
{
    RecordingSal::Get().Reset();
    AudioInstance codec(CAL_OTI_AMR_NB);
    RecordingCodec::Get().Answer(CAL_PROP_AMR_FRAME_TYPE_LOCK, 1);
    Init(codec.get(), {0x3C});
    ASSERT_EQ(codec->m_uSilenceFrameLen, 32u);
    const std::pair<CALParam, CALParam> silent = {P(codec->m_pSilenceFrame), CALParam{32}};
    std::vector<uint8_t> frames[4] = {{0x3C}, {0x3F}, {0x14}, {0xBC}}; // FT 7, 7 with Q and padding, 2, 23
    for (auto &f : frames)
        f.resize(33, 0xAA);
    const std::tuple<const uint8_t *, int32_t, bool> cases[] = {
        {frames[0].data(), 32, true},   {frames[1].data(), 32, true},  {frames[2].data(), 32, false},
        {frames[0].data(), 31, false},  {frames[0].data(), 33, false}, {frames[3].data(), 32, false},
        {frames[0].data(), -32, false}, {nullptr, 0, false},          {nullptr, 32, false}};
    for (const auto &[pData, iLen, bPasses] : cases) {
        const std::pair<CALParam, CALParam> passed = {P(pData), CALParam(iLen)};
        EXPECT_EQ(Decode(codec.get(), pData, iLen), bPasses ? passed : silent) << iLen;
    }
    EXPECT_EQ(frames[2][0], 0x14); // the caller's frame is not touched
    const CodecCall *pCall = RecordingCodec::Get().Last(3);
    EXPECT_EQ(std::vector<CALParam>(pCall->args.begin() + 2, pCall->args.end()),
              (std::vector<CALParam>{3, 4, 5, 6, 0x55})); // parameters and user data pass through

    Init(codec.get(), {0x14});
    uint8_t *pKept = codec->m_pSilenceFrame;
    EXPECT_EQ(codec->m_uSilenceFrameLen, 16u);
    EXPECT_EQ(RecordingSal::Get().liveBlocks.size(), 4u); // handle, entry, instance, one silent frame
    RecordingCodec::Get().Answer(CAL_PROP_AMR_FRAME_TYPE_LOCK, 0);
    Init(codec.get(), {0x0C});
    EXPECT_EQ(std::make_tuple(codec->m_pSilenceFrame, codec->m_uAMRFrameType), std::make_tuple(pKept, 2u));
    RecordingCodec::Get().Answer(CAL_PROP_AMR_FRAME_TYPE_LOCK, 1);
    Init(codec.get(), {0x44}); // out of range: the type is recorded and the earlier lock is off
    EXPECT_EQ(std::make_tuple(codec->m_pSilenceFrame, codec->m_uSilenceFrameLen, codec->m_uAMRFrameType),
              std::make_tuple(nullptr, 0u, 8u));
    EXPECT_EQ(Decode(codec.get(), frames[2].data(), 1), std::make_pair(P(frames[2].data()), CALParam{1}));
    Init(codec.get(), {0x14});
    RecordingSal::Get().FailAllocation(1);
    Init(codec.get(), {0x3C});
    EXPECT_EQ(codec->m_pSilenceFrame, nullptr);
    EXPECT_EQ(codec->m_uSilenceFrameLen, 0u);
    EXPECT_EQ(Decode(codec.get(), frames[2].data(), 1), std::make_pair(P(frames[2].data()), CALParam{1}));
    EXPECT_EQ(RecordingSal::Get().liveBlocks.size(), 3u);
}

// After the codec's Init, property 3 answered 1 overwrites the outputs from the DSI (AAC) or
// with narrowband speech values; the codec's result is returned either way.
TEST(AudioAdapt, StreamParameters)
{
    const std::vector<uint32_t> kCodecs = {11, 22, 33, 44}; // what the codec's Init writes
    const std::tuple<uint32_t, int64_t, std::vector<uint8_t>, std::vector<uint32_t>> cases[] = {
        {CAL_OTI_AAC, 1, {0x2B, 0x12}, {48000, 2, 16, 2048}}, {CAL_OTI_AAC, 1, {0x12, 0x10}, {44100, 2, 16, 1024}},
        {CAL_OTI_MPEG2_AAC, 1, {0x15, 0x88}, {8000, 1, 16, 1024}},
        {CAL_OTI_AAC_SBR, 1, {0x2E, 0x88}, {0, 1, 16, 2048}}, // index 13
        {CAL_OTI_AAC, 1, {0x2B}, {11, 22, 16, 1024}},         // one byte of DSI
        {CAL_OTI_AMR_NB, 1, {}, {8000, 1, 16, 160}}, {CAL_OTI_NB_SPEECH, 1, {0x12, 0x10}, {8000, 1, 16, 160}},
        {CAL_OTI_AMR_WB, 1, {}, {8000, 1, 16, 160}}, // narrowband values for wideband too
        {CAL_OTI_DRA, 1, {0x12, 0x10}, kCodecs},      {CAL_OTI_AMR_NB, 2, {}, kCodecs},
        {CAL_OTI_AAC, -1, {0x12, 0x10}, kCodecs},
    };
    for (const auto &[uOTI, iProperty3, config, expected] : cases) {
        SCOPED_TRACE(uOTI);
        AudioInstance codec(uOTI);
        RecordingCodec &rc = RecordingCodec::Get();
        if (iProperty3 >= 0)
            rc.Answer(CAL_PROP_STREAM_PARAMETERS, uint32_t(iProperty3));
        rc.writeOutputs = true;
        std::copy(kCodecs.begin(), kCodecs.end(), rc.outputs);
        rc.results[1] = -7;
        std::vector<uint32_t> out(4, 0);
        EXPECT_EQ(Init(codec.get(), {0x3C}, config, out.data()), -7);
        EXPECT_EQ(out, expected);
    }
}

} // namespace
