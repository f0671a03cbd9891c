// The forwarding wrappers: slot, argument order, user data, traces and null instances.
#include <functional>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include <vorcal/wrapper.h>

#include "recording_codec.hpp"
#include "recording_sal.hpp"

using vorcal::test::CodecCall;
using vorcal::test::HasTrace;
using vorcal::test::P;
using vorcal::test::RecordingCodec;
using vorcal::test::RecordingSal;

namespace {

enum Kind { kVideo, kAudio, kImage, kText, kEncoder };

class WrapperTest : public ::testing::Test {
protected:
    void SetUp() override
    {
        RecordingSal::Get().Reset();
        RecordingCodec::Get().Reset();
        hCAL = vorCAL_GetHandle(0, 1, 1);
        const CALVideoDecoderFunctions v = RecordingCodec::VideoDecoder();
        const CALAudioDecoderFunctions a = RecordingCodec::AudioDecoder();
        const CALImageDecoderFunctions i = RecordingCodec::ImageDecoder();
        const CALTextDecoderFunctions t = RecordingCodec::TextDecoder();
        const CALVideoEncoderFunctions e = RecordingCodec::VideoEncoder();
        vorCAL_RegisterCodec(hCAL, kVideo, 0, 0x99, &v, sizeof v);
        vorCAL_RegisterCodec(hCAL, kAudio, 0, 0x99, &a, sizeof a);
        vorCAL_RegisterCodec(hCAL, kImage, 0, 0x99, &i, sizeof i);
        vorCAL_RegisterCodec(hCAL, kText, 0, 0x99, &t, sizeof t);
        vorCAL_RegisterCodec(hCAL, kEncoder, 0, 0x99, &e, sizeof e);
        for (int k = kVideo; k <= kEncoder; ++k)
            codec[k] = vorCAL_GetCodec(hCAL, k, 0, 0x99);
    }
    void TearDown() override
    {
        for (CALCodec *c : codec)
            vorCAL_ReleaseCodec(c);
        vorCAL_ReleaseHandle(hCAL);
        EXPECT_TRUE(RecordingSal::Get().liveBlocks.empty());
        EXPECT_EQ(RecordingSal::Get().badFrees, 0u);
    }
    const CodecCall &Only()
    {
        EXPECT_EQ(RecordingCodec::Get().calls.size(), 1u);
        return RecordingCodec::Get().calls.back();
    }

    CALHandle *hCAL = nullptr;
    CALCodec *codec[5] = {};
};

// One forwarding case: which wrapper, the slot it must call and the arguments the slot must see
// (UD stands for the instance's user data, set to 0x5151 before the call).
struct ForwardCase {
    const char *name;
    Kind kind;
    int slot;
    int32_t result;
    std::function<int32_t(CALCodec *)> call;
    std::vector<CALParam> expected;
};

constexpr CALParam UD = 0x5151;

TEST_F(WrapperTest, EachWrapperCallsItsSlotWithTheArgumentsInOrder)
{
    uint32_t value = 0;
    const uint8_t bytes[3] = {7, 8, 9};
    const std::vector<ForwardCase> cases = {
        {"VideoDecoderGetProperty", kVideo, 0, -1, [&](CALCodec *c) { return vorCAL_VideoDecoderGetProperty(c, 81, &value); }, {81, P(&value)}},
        {"VideoDecoderGetOutput", kVideo, 4, 11, [](CALCodec *c) { return vorCAL_VideoDecoderGetOutput(c, 1, 2, 3, 4); }, {1, 2, 3, 4, UD}},
        {"VideoDecoderReset", kVideo, 5, 12, [](CALCodec *c) { return vorCAL_VideoDecoderReset(c); }, {UD}},
        {"VideoDecoderDeinit", kVideo, 2, 13, [](CALCodec *c) { return vorCAL_VideoDecoderDeinit(c); }, {UD}},
        {"AudioDecoderGetProperty", kAudio, 0, -1, [&](CALCodec *c) { return vorCAL_AudioDecoderGetProperty(c, 113, &value); }, {113, P(&value)}},
        {"AudioDecoderDecode", kAudio, 3, 14, [&](CALCodec *c) { return vorCAL_AudioDecoderDecode(c, bytes, 3, 3, 4, 5, 6); }, {P(bytes), 3, 3, 4, 5, 6, UD}},
        {"AudioDecoderReset", kAudio, 4, 15, [](CALCodec *c) { return vorCAL_AudioDecoderReset(c); }, {UD}},
        {"AudioDecoderDeinit", kAudio, 2, 16, [](CALCodec *c) { return vorCAL_AudioDecoderDeinit(c); }, {UD}},
        {"ImageDecoderGetProperty", kImage, 0, -1, [&](CALCodec *c) { return vorCAL_ImageDecoderGetProperty(c, 5, &value); }, {5, P(&value)}},
        {"ImageDecoderDecode", kImage, 2, 17, [](CALCodec *c) { return vorCAL_ImageDecoderDecode(c, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10); }, {1, 2, 3, 4, 5, 6, 7, 8, 9, 10, UD}},
        {"TextDecoderDecode", kText, 3, 18, [&](CALCodec *c) { return vorCAL_TextDecoderDecode(c, bytes, 2, 3, 4, 5); }, {P(bytes), 2, 3, 4, 5, UD}},
        {"TextDecoderGetOutput", kText, 4, 19, [](CALCodec *c) { return vorCAL_TextDecoderGetOutput(c, 1); }, {1, UD}},
        {"TextDecoderDeinit", kText, 2, 20, [](CALCodec *c) { return vorCAL_TextDecoderDeinit(c); }, {UD}},
        {"VideoEncoderGetProperty", kEncoder, 0, -1, [&](CALCodec *c) { return vorCAL_VideoEncoderGetProperty(c, 6, &value); }, {6, P(&value)}},
        {"VideoEncoderEncode", kEncoder, 3, 21, [](CALCodec *c) { return vorCAL_VideoEncoderEncode(c, 1, 2, 3, 4, 5, 6); }, {1, 2, 3, 4, 5, 6, UD}},
        {"VideoEncoderSkip", kEncoder, 4, 22, [](CALCodec *c) { return vorCAL_VideoEncoderSkip(c, 1, 2); }, {1, 2, UD}},
        {"VideoEncoderDeinit", kEncoder, 2, 23, [](CALCodec *c) { return vorCAL_VideoEncoderDeinit(c); }, {UD}},
    };
    for (const ForwardCase &c : cases) {
        SCOPED_TRACE(c.name);
        RecordingCodec::Get().Reset();
        RecordingCodec::Get().results[c.slot] = c.result;
        codec[c.kind]->m_uUserData = UD;
        // GetProperty answers -1 for unknown properties: the wrapper returns the codec's result.
        EXPECT_EQ(c.call(codec[c.kind]), c.result);
        const CodecCall &call = Only();
        EXPECT_EQ(call.iSlot, c.slot);
        EXPECT_EQ(call.args, c.expected);
        // A null instance answers -1 and calls nothing.
        RecordingCodec::Get().Reset();
        EXPECT_EQ(c.call(nullptr), -1);
        EXPECT_TRUE(RecordingCodec::Get().calls.empty());
    }
}

TEST_F(WrapperTest, InitLikeWrappersStoreUserDataAndPassItsAddress)
{
    RecordingCodec &rc = RecordingCodec::Get();
    rc.writeUserData = true;
    rc.userDataToWrite = 0x77;
    CALCodec *enc = codec[kEncoder];
    EXPECT_EQ(vorCAL_VideoEncoderInit(enc, 1, 2, 3, 4, 5, 6, 7, 8, 9, 0x55), 0);
    const CodecCall &init = Only();
    EXPECT_EQ(init.iSlot, 1);
    EXPECT_EQ(init.args, (std::vector<CALParam>{1, 2, 3, 4, 5, 6, 7, 8, 9, P(&enc->m_uUserData)}));
    EXPECT_EQ(init.userDataAtCall, 0x55u);
    rc.calls.clear();
    vorCAL_VideoEncoderEncode(enc, 0, 0, 0, 0, 0, 0);
    EXPECT_EQ(Only().args.back(), 0x77u);

    rc.calls.clear();
    CALCodec *img = codec[kImage];
    vorCAL_ImageDecoderGetHeader(img, 1, 2, 3, 4, 5, 6, 7, 0x66);
    EXPECT_EQ(Only().args, (std::vector<CALParam>{1, 2, 3, 4, 5, 6, 7, P(&img->m_uUserData)}));
    EXPECT_EQ(Only().userDataAtCall, 0x66u);
    EXPECT_EQ(img->m_uUserData, 0x77u);

    rc.calls.clear();
    CALCodec *txt = codec[kText];
    vorCAL_TextDecoderInit(txt, 1, 2, 3, 0x44);
    EXPECT_EQ(Only().args, (std::vector<CALParam>{1, 2, 3, P(&txt->m_uUserData)}));
    EXPECT_EQ(Only().userDataAtCall, 0x44u);

    // Null instances of the Init-like wrappers.
    EXPECT_EQ(vorCAL_VideoEncoderInit(nullptr, 1, 2, 3, 4, 5, 6, 7, 8, 9, 0), -1);
    EXPECT_EQ(vorCAL_ImageDecoderGetHeader(nullptr, 1, 2, 3, 4, 5, 6, 7, 0), -1);
    EXPECT_EQ(vorCAL_TextDecoderInit(nullptr, 1, 2, 3, 0), -1);
}

TEST_F(WrapperTest, GetPropertyPassesExactlyTwoArguments)
{
    RecordingCodec::Get().Answer(81, 2);
    uint32_t value = 0;
    EXPECT_EQ(vorCAL_VideoDecoderGetProperty(codec[kVideo], 81, &value), 0);
    EXPECT_EQ(value, 2u);
    EXPECT_EQ(Only().args.size(), 2u);
}

TEST_F(WrapperTest, TextDecoderTraces)
{
    RecordingCodec::Get().results[1] = 3;
    EXPECT_EQ(vorCAL_TextDecoderInit(codec[kText], 0, 0, 0, 0), 3);
    EXPECT_TRUE(HasTrace(7, 0, "vorCAL_TextDecoderInit %d]", "vorCAL_TextDecoderInit #]"));

    const uint8_t *data = reinterpret_cast<const uint8_t *>(uintptr_t{0x12345678});
    RecordingSal::Get().traces.clear();
    vorCAL_TextDecoderDecode(codec[kText], data, 0, 0, 0, 0);
    EXPECT_TRUE(HasTrace(7, 4, "(vorCAL_TextDecoderDecode %d) pData=0x%X, iLen=%d\n",
                         "(vorCAL_TextDecoderDecode #) pData=0x12345678, iLen=0\n"));

    // Of the null-instance answers only the text GetOutput traces.
    RecordingSal::Get().traces.clear();
    EXPECT_EQ(vorCAL_TextDecoderDecode(nullptr, data, 1, 0, 0, 0), -1);
    EXPECT_EQ(vorCAL_VideoDecoderReset(nullptr), -1);
    EXPECT_TRUE(RecordingSal::Get().traces.empty());
    EXPECT_EQ(vorCAL_TextDecoderGetOutput(nullptr, 1), -1);
    EXPECT_TRUE(HasTrace(7, 0, "vorCAL_TextDecoderGetOutput %d]", "vorCAL_TextDecoderGetOutput #]"));
    EXPECT_EQ(RecordingSal::Get().traces.size(), 1u);
}

TEST_F(WrapperTest, VideoDeinitFreesTheIntermediateBufferOnlyWithASize)
{
    CALCodec *c = codec[kVideo];
    uint8_t *buffer = static_cast<uint8_t *>(RecordingSal::Get().Alloc(110));
    c->m_pIntermediateFrame = buffer;
    c->m_iIntermediateFrameSize = 0;
    vorCAL_VideoDecoderDeinit(c);
    EXPECT_EQ(c->m_pIntermediateFrame, buffer); // a zero size keeps the buffer
    EXPECT_EQ(RecordingSal::Get().freeCount, 0u);

    c->m_iIntermediateFrameSize = 10;
    vorCAL_VideoDecoderDeinit(c);
    EXPECT_EQ(c->m_pIntermediateFrame, nullptr);
    EXPECT_EQ(c->m_iIntermediateFrameSize, 0);
    EXPECT_EQ(RecordingSal::Get().freeCount, 1u);
    EXPECT_EQ(RecordingCodec::Get().Count(2), 2u);
}

TEST_F(WrapperTest, VideoDecoderForwardsStreamsItDoesNotAdapt)
{
    CALCodec *c = codec[kVideo]; // OTI 0x99: no adaptation applies
    RecordingCodec &rc = RecordingCodec::Get();
    rc.writeUserData = true;
    rc.userDataToWrite = 0xABC;
    rc.results[1] = 0;
    const uint8_t config[] = {0, 0, 0, 1, 0x67};
    const uint8_t enh[] = {9};
    uint32_t w = 0, h = 0, p = 0;
    EXPECT_EQ(vorCAL_VideoDecoderInit(c, 0x99, config, 5, enh, 1, 4, &w, &h, &p, 0x33), 0);
    const CodecCall &init = *rc.Last(1);
    EXPECT_EQ(init.args, (std::vector<CALParam>{0x99, P(config), 5, P(enh), 1, 4, P(&w), P(&h), P(&p),
                                                P(&c->m_uUserData)}));
    EXPECT_EQ(init.userDataAtCall, 0x33u);

    uint32_t word = 0;
    rc.results[3] = 9;
    EXPECT_EQ(vorCAL_VideoDecoderDecode(c, config, 5, 0x10, 0x20, &word), 9);
    EXPECT_EQ(rc.Last(3)->args, (std::vector<CALParam>{P(config), 5, 0x10, 0x20, P(&word), 0xABC}));
    EXPECT_EQ(vorCAL_VideoDecoderInit(nullptr, 0x99, config, 5, nullptr, 0, 4, &w, &h, &p, 0), -1);
    EXPECT_EQ(vorCAL_VideoDecoderDecode(nullptr, config, 5, 0, 0, &word), -1);
}

TEST_F(WrapperTest, AudioDecoderForwardsAndTracesItsUserData)
{
    CALCodec *c = codec[kAudio];
    RecordingCodec &rc = RecordingCodec::Get();
    rc.writeUserData = true;
    rc.userDataToWrite = 0xBEEF;
    rc.results[1] = 5;
    const uint8_t dsi[] = {0x12, 0x10};
    const uint8_t frame[] = {0x3C, 1};
    uint32_t rate = 1, ch = 2, bits = 3, spf = 4;
    EXPECT_EQ(vorCAL_AudioDecoderInit(c, 0x42, dsi, 2, frame, 2, &rate, &ch, &bits, &spf, 0x11), 5);
    const CodecCall &init = *rc.Last(1);
    EXPECT_EQ(init.args, (std::vector<CALParam>{0x42, P(dsi), 2, P(frame), 2, P(&rate), P(&ch), P(&bits),
                                                P(&spf), P(&c->m_uUserData)}));
    EXPECT_EQ(init.userDataAtCall, 0x11u);
    char expected[96];
    std::snprintf(expected, sizeof expected, "[vorCAL_AudioDecoderInit] UserData(0x%X)(0x%X)\n", 0xBEEFu,
                  static_cast<unsigned>(reinterpret_cast<uintptr_t>(&c->m_uUserData)));
    EXPECT_TRUE(vorcal::test::HasPlainTrace("[vorCAL_AudioDecoderInit] UserData(0x%X)(0x%X)\n", expected));
    // Other OTIs get no stream parameters from the layer.
    EXPECT_EQ(rate, 1u);
    EXPECT_EQ(spf, 4u);
    EXPECT_EQ(vorCAL_AudioDecoderInit(nullptr, 0, dsi, 2, frame, 2, &rate, &ch, &bits, &spf, 0), -1);
}

TEST_F(WrapperTest, EmptySlotsAnswerMinusOne)
{
    CALHandle *h = hCAL;
    CALVideoDecoderFunctions partial = RecordingCodec::VideoDecoder();
    partial.Reset = nullptr;
    partial.GetOutput = nullptr;
    vorCAL_RegisterCodec(h, 9, 0, 1, &partial, sizeof partial);
    CALCodec *c = vorCAL_GetCodec(h, 9, 0, 1);
    EXPECT_EQ(vorCAL_VideoDecoderReset(c), -1);
    EXPECT_EQ(vorCAL_VideoDecoderGetOutput(c, 0, 0, 0, 0), -1);
    EXPECT_TRUE(RecordingCodec::Get().calls.empty());
    vorCAL_ReleaseCodec(c);
}

} // namespace
