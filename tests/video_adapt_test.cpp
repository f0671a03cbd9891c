// vorCAL_VideoDecoderInit and vorCAL_VideoDecoderDecode with a recording codec: what the codec
// receives for each property answer, the refusals, the intermediate buffer, and whole H.264
// sessions on an encoder-made clip.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <fstream>
#include <string>
#include <tuple>

#include <vorcal/core.h>

#include "avc_streams.hpp"
#include "recording_codec.hpp"
#include "recording_sal.hpp"

using namespace vorcal::test;

namespace {

// A value with this bit set is written by GetProperty, which then returns -1: it must not count.
constexpr uint32_t kNo = 0x80000000;
using Answers = std::vector<std::pair<uint32_t, uint32_t>>;
using Texts = std::vector<std::string>;

const Bytes kIDR = {0x65, 0x88, 0x84, 0x00, 0x10, 0x2F}, kSlice = {0x41, 0x9A, 0x12, 0x34}, kAUD = {0x09, 0xF0};
const Bytes kBroken = {0, 0, 0, 0xFF, 0x65, 0x88}; // a length field beyond the data
constexpr uint32_t H264 = CAL_OTI_H264, MP4V = CAL_OTI_MPEG4_VISUAL, H263 = CAL_OTI_H263;

// ITU-T H.264 7.3.2.1.1 with level_idc 30, pic_order_cnt_type 2, no cropping and no VUI.
Bytes MakeSPS(uint8_t uProfile, uint32_t uWidth, uint32_t uHeight)
{
    return BitWriter::Escape(BitWriter().Put(0x67, 8).Put(uProfile, 8).Put(0, 8).Put(30, 8).PutUE(0).PutUE(0).PutUE(2).PutUE(1)
                                 .PutBit(0).PutUE(uWidth / 16 - 1).PutUE(uHeight / 16 - 1).Put(0xC, 4).Trailing().Bytes());
}

// AVC decoder configuration record (ISO/IEC 14496-15 5.3.3.1): 4-byte lengths, one SPS, one PPS.
Bytes AvcC(const Bytes &sps, const Bytes &pps)
{
    return Cat({{1, sps[1], sps[2], sps[3], 0xFF, 0xE1, 0, uint8_t(sps.size())}, sps, {1, 0, uint8_t(pps.size())}, pps});
}

// MPEG-4 Visual: visual object sequence with profile_and_level_indication, a video object and a
// rectangular layer (ISO/IEC 14496-2 6.2.3).
Bytes MPEG4DSI(uint8_t uIndication, uint32_t uWidth = 352, uint32_t uHeight = 288)
{
    return BitWriter().PutBytes({0, 0, 1, 0xB0, uIndication, 0, 0, 1, 0xB5, 0x09, 0, 0, 1, 0x00, 0, 0, 1, 0x20})
        .PutBit(0).Put(1, 8).PutBit(0).Put(1, 4).PutBit(0).Put(0, 2).PutBit(1).Put(30000, 16).PutBit(1).PutBit(0)
        .PutBit(1).Put(uWidth, 13).PutBit(1).Put(uHeight, 13).PutBit(1).Align().PutBytes({0x12, 0x34}).Bytes();
}

Bytes Fixture(const std::string &name)
{
    return RecordingSal::ReadFile(std::string(VORCAL_TEST_DATA_DIR) + "/h264/" + name);
}

// H.263 picture header with PLUSPTYPE (source format 7), UFEP 001 and QCIF.
const Bytes kH263Extended = BitWriter().Put(0x20, 22).Put(0, 8).Put(2, 2).Put(0, 3).Put(7, 3).Put(1, 3).Put(2, 3)
                                .Put(0, 25).Align().PutBytes({0x55, 0x55}).Bytes();

// One instance at a time of a recording decoder registered for H.264, MPEG-4 Visual and H.263;
// every test ends with no block of the system layer left.
class VideoAdaptTest : public ::testing::Test {
protected:
    RecordingSal &sal = RecordingSal::Get();
    RecordingCodec &codec = RecordingCodec::Get();
    CALHandle *hCAL = nullptr;
    CALCodec *hCodec = nullptr;
    uint32_t width = 0, height = 0, pitch = 0, word = 0;

    void SetUp() override
    {
        sal.Reset();
        hCAL = vorCAL_GetHandle(0, 1, 1);
        const CALVideoDecoderFunctions functions = RecordingCodec::VideoDecoder();
        for (uint32_t uOTI : {H264, MP4V, H263})
            ASSERT_EQ(vorCAL_RegisterCodec(hCAL, 2, 1, uOTI, &functions, sizeof functions), 1);
    }
    void TearDown() override
    {
        Open(0);
        vorCAL_ReleaseHandle(hCAL);
        EXPECT_TRUE(sal.liveBlocks.empty() && sal.badFrees == 0) << sal.liveBlocks.size() << " blocks leaked";
    }
    // Releases the instance and opens a fresh one for uOTI (none for 0) with these answers.
    void Open(uint32_t uOTI, const Answers &answers = {})
    {
        if (hCodec) {
            vorCAL_VideoDecoderDeinit(hCodec);
            vorCAL_ReleaseCodec(hCodec);
        }
        codec.Reset();
        for (const auto &[uProperty, uValue] : answers)
            codec.Answer(uProperty, uValue & ~kNo, uValue & kNo ? -1 : 0);
        ASSERT_TRUE((hCodec = uOTI ? vorCAL_GetCodec(hCAL, 2, 1, uOTI) : nullptr) || !uOTI);
        sal.traces.clear();
    }
    int32_t Init(uint32_t uOTI, const Bytes &config, const Bytes &enhance = {}, uint32_t uNALSize = 4)
    {
        return vorCAL_VideoDecoderInit(hCodec, uOTI, config.empty() ? nullptr : config.data(), int32_t(config.size()),
                                       enhance.empty() ? nullptr : enhance.data(), int32_t(enhance.size()), uNALSize,
                                       &width, &height, &pitch, 0x1234);
    }
    int32_t Decode(const Bytes &frame, CALParam uParam3 = 7)
    {
        word = 0;
        return vorCAL_VideoDecoderDecode(hCodec, frame.data(), int32_t(frame.size()), uParam3, 8, &word);
    }
    const Bytes &Received() const { return codec.Last(3)->data; }
    // The layer's traces so far as "category/level text", '#' for the line number; then forgets all.
    Texts Traces()
    {
        Texts texts;
        for (const TraceRecord &t : sal.traces)
            if (t.text.starts_with("[CAL_Wrapper "))
                texts.push_back(std::to_string(t.iCategory) + "/" + std::to_string(t.iLevel) + " [CAL_Wrapper #" +
                                t.text.substr(t.text.find(']')));
        sal.traces.clear();
        return texts;
    }
};

// Property 82: the framing of the configuration the codec's Init receives, converted through a
// temporary buffer of 3/2 of the input; any answered value sets the NAL length size for Decode.
TEST_F(VideoAdaptTest, H264ConfigurationFraming)
{
    const Bytes annexB = AnnexB({kSps, kPps}), avcC = AvcC(kSps, kPps), list = Cat({{1}, Bytes(avcC.begin() + 6, avcC.end())});
    const std::tuple<uint32_t, const Bytes &, const Bytes &> cases[] = {
        {2, avcC, annexB}, {2, annexB, annexB}, {1, annexB, list}, {3, avcC, avcC}, {kNo | 2, avcC, avcC}};
    for (const auto &[u82, in, out] : cases) { // out is in itself when kept
        SCOPED_TRACE(u82);
        Open(H264, {{82, u82}});
        const size_t uAllocs = sal.allocSizes.size();
        ASSERT_EQ(Init(H264, in, {}, 2), 0);
        const bool bConverted = &in != &out;
        EXPECT_EQ(codec.Last(1)->data, out); // the recorded bytes span the length passed
        EXPECT_EQ(codec.Last(1)->args[1] == P(in.data()), !bConverted);
        EXPECT_EQ(std::vector<uint32_t>(sal.allocSizes.begin() + uAllocs, sal.allocSizes.end()),
                  bConverted ? std::vector<uint32_t>{uint32_t(in.size() * 3 / 2)} : std::vector<uint32_t>{});
        EXPECT_EQ(hCodec->m_uH264NALSize, u82 & kNo ? 0u : 2u);
    }
}

// The enhancement configuration is converted into the intermediate buffer; a failed conversion
// passes null with the length unchanged. Each allocation of an Init that converts both
// configurations fails in turn: -1 before the codec is called, user data untouched, and the buffer
// an earlier Init left freed. A failed codec Init frees the buffer.
TEST_F(VideoAdaptTest, H264EnhancementConfiguration)
{
    const Bytes config = AnnexB({kSps, kPps}), enhance = LengthPrefixed({kSps, kPps}, 4);
    Open(H264, {{82, 2}});
    ASSERT_EQ(Init(H264, config, enhance), 0);
    EXPECT_EQ(codec.Last(1)->args[3], P(hCodec->m_pIntermediateFrame));
    EXPECT_EQ(codec.Last(1)->data2, config);
    char text[160]; // pointers are traced as their low 32 bits
    const unsigned uBuffer = unsigned(reinterpret_cast<uintptr_t>(hCodec->m_pIntermediateFrame));
    snprintf(text, sizeof text, "16/0 [CAL_Wrapper #] vorCALTools_AVC_CheckFormat pConfigEnhance = 0x%x, "
             "m_pIntermediateFrame = 0x%x, m_uH264NALSize = 4\n", uBuffer, uBuffer);
    const std::string len = std::to_string(config.size());
    EXPECT_EQ(Traces(), Texts({"16/0 [CAL_Wrapper #] vorCALTools_AVC_CheckFormat iEnhLen = " + len + ", iNewDataLen = " + len + "\n",
                             text}));
    ASSERT_EQ(Init(H264, config, kBroken), 0);
    EXPECT_EQ(codec.Last(1)->args[3], 0u);
    EXPECT_EQ(codec.Last(1)->args[4], kBroken.size());
    EXPECT_EQ(Traces(), Texts({"11/0 [CAL_Wrapper #] vorCALTools_AVC_CheckFormat failed\n"}));
    for (uint32_t n = 1; n <= 3; ++n) { // the temporary configuration, the grown buffer, then none
        SCOPED_TRACE(n);
        ASSERT_EQ(Init(H264, config, LengthPrefixed({kSps}, 4)), 0);
        const size_t uInits = codec.Count(1), uLive = sal.liveBlocks.size();
        hCodec->m_uUserData = 0x55;
        sal.FailAllocation(n);
        EXPECT_EQ(Init(H264, AvcC(kSps, kPps), enhance), n < 3 ? -1 : 0);
        EXPECT_EQ(codec.Count(1), uInits + (n == 3));
        EXPECT_EQ(hCodec->m_uUserData, n < 3 ? 0x55u : 0x1234u);
        EXPECT_EQ(sal.liveBlocks.size(), uLive - (n < 3)); // the old buffer freed, a grown one only after a success
    }
    codec.results[1] = 5;
    EXPECT_EQ(Init(H264, config, enhance), 5);
    EXPECT_EQ(hCodec->m_pIntermediateFrame, nullptr);
    EXPECT_EQ(hCodec->m_iIntermediateFrameSize, 0);
}

// Picture size (property 3), written only when asked and through non-null pointers, and the
// refusals, which answer 17 without calling the codec.
TEST_F(VideoAdaptTest, InitSizeAndRefusals)
{
    const Bytes sps = MakeSPS(66, 640, 480), main = AnnexB({MakeSPS(77, 320, 240), kPps});
    const std::tuple<uint32_t, Bytes, Answers, uint32_t, uint32_t, std::string> cases[] = {
        {H264, AnnexB({kSei, sps, kPps}), {{3, 1}, {84, 1}}, 640, 480, ""},
        {H264, AnnexB({sps, kPps}), {{3, kNo | 1}}, 0, 0, ""},
        {H264, AvcC(sps, kPps), {{3, 1}}, 0, 0, ""}, // the size is read from start-code framing only
        // The stream-aware mode: the display size, also from a record (field-coded, cropped).
        {H264, Fixture("interlaced_64x40.h264"), {{CAL_PROP_TRUST_CONFIGURATION, 1}, {3, 1}}, 64, 40, ""},
        {H264, Fixture("interlaced_64x40.avcc"), {{CAL_PROP_TRUST_CONFIGURATION, 1}, {3, 1}}, 64, 40, ""},
        // Any other answer: the documented parser, which reads High profile's fields as Baseline's.
        {H264, Fixture("interlaced_64x40.h264"), {{CAL_PROP_TRUST_CONFIGURATION, 2}, {3, 1}}, 16, 80, ""},
        {H264, main, {{3, 1}, {84, 1}}, 320, 240, "H.264 Error(Profile[77], Level[30])!!! H.264 codec can't support profile[Main Profile]\n"},
        {H264, AnnexB({MakeSPS(100, 320, 240), kPps}), {{84, 1}}, 0, 0, ""},
        {H264, main, {{84, 0}}, 0, 0, ""},
        {H264, main, {{84, kNo | 1}}, 0, 0, ""},
        {MP4V, MPEG4DSI(0x03, 176, 144), {{101, 1}, {3, 1}}, 176, 144,
         "MPEG4 Error(Profile[0], Level[3])!!! MPEG4 codec can't support Level 3.\n"},
        {MP4V, MPEG4DSI(0x03), {{101, kNo | 1}, {103, 1}, {3, 0}}, 0, 0, ""},
        {MP4V, MPEG4DSI(0x02), {{101, 1}, {103, 1}}, 0, 0, ""},
        {MP4V, MPEG4DSI(0xF5), {{103, 1}}, 0, 0, "MPEG4 Error(Profile[255], Level[255])!!! MPEG4 codec can't support Level 3.\n"},
        {MP4V, MPEG4DSI(0xF5), {{101, 1}, {103, 0}}, 0, 0, ""},
        {MP4V, {}, {{101, 1}, {103, 1}}, 0, 0, ""}, // nothing parsed: profile and level read 0
        {H263, kH263Extended, {{160, 1}}, 0, 0, "H.263 Error(Type[7])!!! H.263 codec can't support H.263 Extended P Type\n"},
        {H263, kH263Extended, {{160, kNo | 1}, {101, 1}}, 0, 0, ""},
        {H263, MPEG4DSI(0x03), {{101, 1}, {160, 1}}, 0, 0, ""}, // levels are an MPEG-4 Visual matter
    };
    size_t uRow = 0;
    for (const auto &[uOTI, config, answers, uWidth, uHeight, error] : cases) {
        SCOPED_TRACE(uRow++);
        Open(uOTI, answers);
        hCodec->m_uUserData = 0x55;
        width = height = pitch = 0;
        EXPECT_EQ(Init(uOTI, config), error.empty() ? 0 : 17);
        EXPECT_EQ(codec.Count(1), error.empty() ? 1u : 0u);
        EXPECT_EQ(hCodec->m_uUserData, error.empty() ? 0x1234u : 0x55u);
        EXPECT_EQ(std::vector<uint32_t>({width, height, pitch}), std::vector<uint32_t>({uWidth, uHeight, uWidth}));
        EXPECT_EQ(Traces(), error.empty() ? Texts{} : Texts{"11/0 [CAL_Wrapper #] " + error});
        EXPECT_EQ(vorCAL_VideoDecoderInit(hCodec, uOTI, config.data(), int32_t(config.size()), nullptr, 0, 4, nullptr,
                                          nullptr, nullptr, 0), error.empty() ? 0 : 17);
    }
}

// What the codec's Decode receives: parameter-set removal (property 83), framing (81), the VOP
// start (97); frames the layer drops itself answer 1 with result word 4.
TEST_F(VideoAdaptTest, DecodeAdaptsFrames)
{
    const std::string kB = "16/4 [CAL_Wrapper #] ANNEX-B bitstream has SPSPPS. => => Discard SPSPPS\n";
    const std::string kN = "16/4 [CAL_Wrapper #] NAL bitstream has SPSPPS. => => Discard SPSPPS\n";
    const Bytes au = AnnexB({kSps, kPps, kIDR}), vol = {0, 0, 1, 0xB0, 0x01, 0, 0, 1, 0xB6, 0x10, 0x20}, both = Cat({vol, au});
    const std::tuple<uint32_t, uint32_t, Answers, Bytes, Bytes, Texts> cases[] = {
        {H264, 4, {{83, 0}}, au, AnnexB({kIDR}), {kB}},
        {H264, 4, {{83, 0}}, AnnexB({kSei, kSps, kPps, kIDR}, 3), AnnexB({kIDR}, 3), {kB}},
        {H264, 4, {{83, 0}}, AnnexB({kAUD, kSps, kPps, kIDR}), AnnexB({kIDR}), {kB}}, // dropped with the run
        {H264, 4, {{83, 0}}, AnnexB({kSps, kPps}), {}, {kB, "16/0 [CAL_Wrapper #] InValid Frame Len (0)\n"}},
        {H264, 4, {{83, 0}}, LengthPrefixed({kSei, kSps, kPps, kIDR, kSlice}, 4), LengthPrefixed({kIDR, kSlice}, 4), {kN}},
        {H264, 2, {{83, 0}}, LengthPrefixed({kSps, kPps, {0x65, 0x88}}, 2), LengthPrefixed({{0x65, 0x88}}, 2), {kN}},
        {H264, 2, {{83, 0}}, LengthPrefixed({kSps, kPps, {0x65}}, 2), {}, {kN, "16/0 [CAL_Wrapper #] InValid Frame Len (3)\n"}},
        {H264, 4, {{83, 1}}, au, au, {}},
        {H264, 4, {{83, kNo}}, au, au, {}},
        {H264, 2, {{81, 1}}, au, LengthPrefixed({kSps, kPps, kIDR}, 4), {}},
        {H264, 2, {{81, 2}}, LengthPrefixed({kSps, kIDR}, 2), AnnexB({kSps, kIDR}), {}},
        {H264, 4, {{81, 2}}, AnnexB({kIDR}, 3), AnnexB({kIDR}, 3), {}},
        {H264, 4, {{81, 3}}, LengthPrefixed({kIDR}, 4), LengthPrefixed({kIDR}, 4), {}},
        {H264, 4, {{81, kNo | 1}}, au, au, {}},
        {H264, 3, {{83, 0}, {81, 2}}, LengthPrefixed({kSps, kPps, kIDR}, 3), AnnexB({kIDR}), {kN}},
        {H264, 4, {{81, 2}}, kBroken, {}, {"11/0 [CAL_Wrapper #] vorCALTools_AVC_ConvertFormat failed[7],iLen[6]\n"}},
        {MP4V, 4, {{97, 1}}, vol, Bytes(vol.begin() + 5, vol.end()), {}},
        {MP4V, 4, {{97, 1}}, {0, 0, 1, 0xB3, 1, 2, 3}, {0, 0, 1, 0xB3, 1, 2, 3}, {}},
        {MP4V, 4, {{97, kNo | 1}}, vol, vol, {}},
        {H263, 4, {{81, 1}, {83, 0}, {97, 1}}, both, both, {}}, // other OTIs pass unchanged
    };
    size_t uRow = 0;
    for (const auto &[uOTI, uNALSize, answers, in, out, traces] : cases) { // out empty: dropped
        SCOPED_TRACE(uRow++);
        Open(uOTI, answers);
        hCodec->m_uH264NALSize = uNALSize; // as an Init with property 82 answered leaves it
        codec.results[3] = 9;
        EXPECT_EQ(Decode(in), out.empty() ? 1 : 9);
        EXPECT_EQ(word, out.empty() ? 4u : 0u);
        EXPECT_EQ(Traces(), traces);
        EXPECT_EQ(codec.Count(3), out.empty() ? 0u : 1u);
        EXPECT_EQ(out.empty() ? out : Received(), out); // the recorded bytes span the length passed
    }
}

// The intermediate buffer: made on the first conversion with 100 bytes of headroom, grown (the
// old one freed first) only for a longer frame, reused otherwise; a failed allocation drops the
// frame and leaves no buffer. A frame the layer cannot read (null data, negative length) reaches
// the codec as given, while an empty one is examined; a null result word is never written.
TEST_F(VideoAdaptTest, IntermediateBufferAndUnreadableFrames)
{
    Open(H264, {{82, 0}, {83, 0}, {81, 1}});
    ASSERT_EQ(Init(H264, {}), 0);
    const Bytes small = AnnexB({kIDR}), large = AnnexB({kSlice, kIDR}), larger = AnnexB({kSlice, kIDR, kSlice});
    const size_t uAllocs = sal.allocSizes.size();
    sal.FailAllocation(1);
    EXPECT_EQ(Decode(small), 1);
    EXPECT_EQ(word, 4u);
    for (const Bytes *pFrame : {&small, &large, &small, &large})
        ASSERT_EQ(Decode(*pFrame), 0);
    EXPECT_EQ(codec.Last(3)->args[0], P(hCodec->m_pIntermediateFrame));
    EXPECT_EQ(Received(), LengthPrefixed({kSlice, kIDR}, 4));
    const uint32_t uSmall = uint32_t(small.size()) + 100, uLarge = uint32_t(large.size()) + 100;
    EXPECT_EQ(std::vector<uint32_t>(sal.allocSizes.begin() + uAllocs, sal.allocSizes.end()), std::vector<uint32_t>({uSmall, uSmall, uLarge}));
    sal.FailAllocation(1);
    EXPECT_EQ(vorCAL_VideoDecoderDecode(hCodec, larger.data(), int32_t(larger.size()), 7, 8, nullptr), 1);
    EXPECT_EQ(hCodec->m_pIntermediateFrame, nullptr);
    EXPECT_EQ(Decode(larger), 0);
    EXPECT_EQ(Received(), LengthPrefixed({kSlice, kIDR, kSlice}, 4));

    EXPECT_EQ(vorCAL_VideoDecoderDecode(hCodec, nullptr, 12, 0, 0, &word), 0);
    EXPECT_EQ(vorCAL_VideoDecoderDecode(hCodec, kIDR.data(), -5, 0, 0, &word), 0);
    EXPECT_EQ(codec.Last(3)->args[1], CALParam(-5));
    EXPECT_EQ(vorCAL_VideoDecoderDecode(hCodec, kIDR.data(), 0, 3, 0, &word), 1);
    EXPECT_EQ(Traces(), Texts({"11/0 [CAL_Wrapper #] vorCALTools_AVC_ConvertFormat failed[3],iLen[0]\n"}));
}

// The samples of a clip file as its report lists them ("frame OFFSET SIZE"), in decode order.
std::vector<Bytes> Samples(const std::string &path)
{
    const Bytes data = RecordingSal::ReadFile(path);
    std::ifstream report(path + ".txt");
    std::vector<Bytes> samples;
    for (std::string word; report >> word;)
        if (size_t uAt = 0, uSize = 0; word == "frame" && report >> uAt >> uSize && uAt + uSize <= data.size())
            samples.emplace_back(data.begin() + uAt, data.begin() + uAt + uSize);
    return samples;
}

// What a codec that asked for parameter-set removal receives of an MP4 sample (4-byte lengths) in
// either framing: the units from its first slice on (SEI or parameter sets precede the IDRs).
Bytes Kept(const Bytes &d, bool bStartCodes)
{
    Bytes out;
    bool bSlice = false;
    for (size_t p = 0, n = 0; p + 4 < d.size(); p += 4 + n) {
        n = (size_t{d[p]} << 24) | (d[p + 1] << 16) | (d[p + 2] << 8) | d[p + 3];
        bSlice = bSlice || (d[p + 4] & 0x1F) == 1 || (d[p + 4] & 0x1F) == 5;
        if (bSlice) // start code or length field, then the unit
            out = Cat({out, bStartCodes ? Bytes{0, 0, 0, 1} : Bytes(d.begin() + p, d.begin() + p + 4),
                       Bytes(d.begin() + p + 4, d.begin() + std::min(d.size(), p + 4 + n))});
    }
    return out;
}

// Whole sessions on an encoder-made Main-profile clip: its MP4 samples (SEI and parameter sets
// before each IDR) and the start-code output an independent converter made of them.
TEST_F(VideoAdaptTest, H264SessionsOnRealClip)
{
    const std::string clip = std::string(VORCAL_TEST_DATA_DIR) + "/h264/main_320x180";
    const Bytes avcC = RecordingSal::ReadFile(clip + ".avcc");
    const std::vector<Bytes> mp4 = Samples(clip + ".nal"), annexB = Samples(clip + ".mp4toannexb.h264");
    ASSERT_TRUE(avcC.size() > 8 && avcC[4] == 0xFF && mp4.size() > 2 && mp4.size() == annexB.size()) << clip;
    const size_t uSPS = (avcC[6] << 8) | avcC[7];
    const Bytes config = AnnexB({Bytes(avcC.begin() + 8, avcC.begin() + 8 + uSPS), Bytes(avcC.begin() + 11 + uSPS, avcC.end())});
    Bytes dump;
    // A record: a host-order 32-bit length (little-endian here; every record is under 64 KiB), the bytes.
    auto Record = [&dump](const Bytes &b) { dump = Cat({dump, {uint8_t(b.size()), uint8_t(b.size() >> 8), 0, 0}, b}); };

    // MP4 samples in; the codec wants start codes (4 bytes each) and no in-band parameter sets.
    // Dump slot 0 records the input as given, also of samples converted or dropped.
    const std::string path = sal.TempDir() + "/video_session.dump";
    ASSERT_NE(vorCAL_DumpFrames(hCAL, path.c_str(), 0), 0u);
    Open(H264, {{82, 2}, {83, 0}, {81, 2}});
    ASSERT_EQ(Init(H264, avcC), 0);
    Record(avcC);
    for (const Bytes &sample : mp4) {
        const int32_t iResult = Decode(sample);
        Record(sample);
        // Known quirk: the format test takes a first length of 0x100 to 0x1FF (00 00 01 xx) for a
        // start code, so such a sample reaches the codec unconverted or, when xx reads as an SEI or
        // parameter-set header, is dropped.
        if (sample[0] == 0 && sample[1] == 0 && sample[2] == 1) {
            EXPECT_TRUE((iResult == 1 && word == 4) || (iResult == 0 && Received() == sample));
        } else {
            EXPECT_EQ(iResult == 0 ? Received() : Bytes{}, Kept(sample, true));
        }
    }
    vorCAL_DumpFrames(hCAL, nullptr, 0);
    EXPECT_EQ(RecordingSal::ReadFile(path), dump);

    // The converter's start-code output in; the codec wants 4-byte lengths (and the picture size)
    // and receives the MP4 samples byte for byte from their first kept unit on.
    Open(H264, {{3, 1}, {82, 1}, {83, 0}, {81, 1}});
    ASSERT_EQ(Init(H264, config), 0);
    // Coded size: 180 lines are 12 macroblock rows; cropping is not applied.
    EXPECT_EQ(std::vector<uint32_t>({width, height, pitch}), std::vector<uint32_t>({320, 192, 320}));
    for (size_t i = 0; i < mp4.size(); ++i)
        EXPECT_EQ(Decode(annexB[i]) == 0 ? Received() : Bytes{}, Kept(mp4[i], false)) << i;
}

// The units of start-code framed data; zero bytes before a start code belong to it.
std::vector<Bytes> Units(const Bytes &d)
{
    const Bytes code{0, 0, 1};
    std::vector<Bytes> units;
    for (auto p = std::search(d.begin(), d.end(), code.begin(), code.end()); p != d.end();) {
        const auto q = std::search(p + 3, d.end(), code.begin(), code.end());
        units.emplace_back(p + 3, q);
        while (!units.back().empty() && units.back().back() == 0)
            units.back().pop_back();
        p = q;
    }
    return units;
}

// The stream-aware mode (property 0x1000 answered 1) on MP4 samples of which 18 of 24 begin
// with a first length of 256-511 (00 00 01 xx). Knowing from the record that they carry 4-byte
// lengths (the 2 passed to Init do not count), the layer gives a codec that wants start codes
// and no parameter sets what ffmpeg's h264_mp4toannexb made of each sample, unit for unit, from
// the first slice on, and the display size. Without the answer the documented format test takes
// those 18 for start-code framing and they reach the codec unconverted.
TEST_F(VideoAdaptTest, StreamAwareModeOnRealClip)
{
    const std::string clip = std::string(VORCAL_TEST_DATA_DIR) + "/h264/trust_160x96";
    const Bytes avcC = RecordingSal::ReadFile(clip + ".avcc");
    const std::vector<Bytes> mp4 = Samples(clip + ".nal"), annexB = Samples(clip + ".mp4toannexb.h264");
    ASSERT_TRUE(mp4.size() == 24 && annexB.size() == 24) << clip;
    for (const uint32_t uTrust : {1u, 0u, kNo | 1}) {
        SCOPED_TRACE(uTrust);
        Open(H264, {{CAL_PROP_TRUST_CONFIGURATION, uTrust}, {3, 1}, {82, 2}, {83, 0}, {81, 2}});
        width = height = 0;
        ASSERT_EQ(Init(H264, avcC, {}, uTrust == 1 ? 2 : 4), 0);
        EXPECT_EQ(std::pair(width, height), uTrust == 1 ? std::pair(160u, 96u) : std::pair(0u, 0u));
        size_t uUnconverted = 0, uDropped = 0;
        for (size_t i = 0; i < mp4.size(); ++i) {
            const int32_t iResult = Decode(mp4[i]);
            uUnconverted += iResult == 0 && Received() == mp4[i];
            uDropped += iResult == 1 && word == 4;
            if (uTrust != 1)
                continue;
            const std::vector<Bytes> units = Units(annexB[i]);
            const auto slice = std::find_if(units.begin(), units.end(), [](const Bytes &u) { return (u[0] & 0x1F) == 1 || (u[0] & 0x1F) == 5; });
            ASSERT_EQ(iResult, 0) << i;
            EXPECT_EQ(Units(Received()), std::vector<Bytes>(slice, units.end())) << i;
        }
        // Without the mode, three of the 18 are even dropped: their 00 00 01 xx reads as a start
        // code and an SEI or parameter-set header, and nothing after it as a slice.
        EXPECT_EQ(std::pair(uUnconverted, uDropped), uTrust == 1 ? std::pair(size_t{0}, size_t{0}) : std::pair(size_t{15}, size_t{3}));
    }
}

// Conversions the documented destination (input + 100 bytes) cannot hold: the buffer grows to
// the converted size plus the headroom and the frame arrives whole, and the next such frame
// reuses it; a frame that fits exactly grows nothing. An allocation failure in the retry drops
// the frame and leaves no buffer.
TEST_F(VideoAdaptTest, BufferGrowsForFramesTheHeadroomCannotHold)
{
    const Bytes picture = Fixture("slices_208x192.h264");
    const std::vector<Bytes> units = Units(picture), small(101, Bytes{0x41, 0x9A, 0x12}), hundred(small.begin(), small.end() - 1);
    auto Framed = [](const std::vector<Bytes> &us, int iSize) { // iSize 3: start codes of 3 bytes, -4: of 4
        Bytes out;
        for (const Bytes &u : us)
            out = Cat({out, iSize == 3 ? AnnexB({u}, 3) : iSize == -4 ? AnnexB({u}) : LengthPrefixed({u}, iSize)});
        return out;
    };
    // The picture: SPS, PPS, SEI and 156 single-macroblock slices, all but two behind 3-byte codes.
    ASSERT_EQ(units.size(), 159u);
    const std::tuple<Bytes, uint32_t, uint32_t, Bytes> cases[] = {
        {picture, 4, 1, Framed(units, 4)},                  // 157 bytes longer
        {Framed(small, 3), 4, 1, Framed(small, 4)},         // 101 bytes longer
        {Framed(small, 2), 2, 2, Framed(small, -4)},        // 202 bytes longer
        {Framed(hundred, 3), 4, 1, Framed(hundred, 4)},     // 100 bytes longer: fits
    };
    for (const auto &[in, uNALSize, uWanted, out] : cases) {
        SCOPED_TRACE(in.size());
        Open(H264, {{81, uWanted}});
        hCodec->m_uH264NALSize = uNALSize;
        const size_t uAllocs = sal.allocSizes.size();
        for (int k = 0; k < 2; ++k) {
            ASSERT_EQ(Decode(in), 0);
            EXPECT_EQ(Received(), out);
        }
        const uint32_t uIn = uint32_t(in.size()) + 100, uOut = uint32_t(out.size()) + 100;
        const std::vector<uint32_t> grown{uIn, uOut}, kept{uIn};
        EXPECT_EQ(std::vector<uint32_t>(sal.allocSizes.begin() + long(uAllocs), sal.allocSizes.end()),
                  out.size() > in.size() + 100 ? grown : kept);
        EXPECT_EQ(Traces(), Texts{});
    }
    Open(H264, {{81, 1}});
    hCodec->m_uH264NALSize = 4;
    sal.FailAllocation(2);
    EXPECT_EQ(Decode(picture), 1);
    EXPECT_EQ(std::tuple(word, codec.Count(3), hCodec->m_pIntermediateFrame), std::tuple(4u, size_t{0}, nullptr));
    EXPECT_EQ(Traces(), Texts{});
    ASSERT_EQ(Decode(picture), 0);
    EXPECT_EQ(Received(), Framed(units, 4));
}

} // namespace
