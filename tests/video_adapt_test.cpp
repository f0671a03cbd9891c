// vorCAL_VideoDecoderInit and vorCAL_VideoDecoderDecode with a recording codec: what the codec
// receives for each property answer, the refusals, the intermediate buffer and the dump records.
#include "video_adapt_fixture.hpp"

#include <string>

#include <vorcal/video_tools.h>

using namespace vorcal::test;

namespace {

const Bytes kSPS = MakeSPS(66, 640, 480);

// ---- H.264 Init: configuration framing ------------------------------------------------------

struct ConfigCase {
    const char *name;
    uint32_t uWanted;  // answer to property 82
    Bytes config;
    Bytes expected;    // what the codec's Init receives
    bool bConverted;   // through the temporary buffer
};

class H264ConfigTest : public VideoDecoderTest, public ::testing::WithParamInterface<ConfigCase> {};

TEST_P(H264ConfigTest, CodecReceivesWantedFraming)
{
    const ConfigCase &c = GetParam();
    Open(CAL_OTI_H264);
    Answer(CAL_PROP_H264_CONFIG_FORMAT, c.uWanted);
    ASSERT_EQ(Init(CAL_OTI_H264, c.config, {}, 2), 0);
    const CodecCall *pInit = codec.Last(1);
    ASSERT_NE(pInit, nullptr);
    EXPECT_EQ(pInit->data, c.expected);
    EXPECT_EQ(pInit->args[2], c.expected.size());
    EXPECT_EQ(pInit->userDataAtCall, 0x1234u);
    if (c.bConverted) {
        ASSERT_EQ(sal.allocSizes.size(), baseAllocs + 1);
        EXPECT_EQ(sal.allocSizes.back(), c.config.size() * 3 / 2);
    } else {
        EXPECT_EQ(sal.allocSizes.size(), baseAllocs);
        EXPECT_EQ(pInit->args[1], P(c.config.data())); // the caller's own buffer
    }
    // 82 answered with any value makes Decode use the NAL length size given to Init.
    EXPECT_EQ(hCodec->m_uH264NALSize, c.uWanted == kUnanswered ? 0u : 2u);
    EXPECT_EQ(sal.liveBlocks.size(), baseLive);
}

const Bytes kAnnexBConfig = AnnexB({kSPS, kPps});
const Bytes kParamList = [] {
    Bytes list = {1, 0, static_cast<uint8_t>(kSPS.size())};
    list.insert(list.end(), kSPS.begin(), kSPS.end());
    list.insert(list.end(), {1, 0, static_cast<uint8_t>(kPps.size())});
    list.insert(list.end(), kPps.begin(), kPps.end());
    return list;
}();

INSTANTIATE_TEST_SUITE_P(
    Framings, H264ConfigTest,
    ::testing::Values(ConfigCase{"RecordToAnnexB", 2, AvcC(kSPS, kPps), kAnnexBConfig, true},
                      ConfigCase{"AnnexBKept", 2, kAnnexBConfig, kAnnexBConfig, false},
                      ConfigCase{"AnnexBToList", 1, kAnnexBConfig, kParamList, true},
                      ConfigCase{"RecordKept", 1, AvcC(kSPS, kPps), AvcC(kSPS, kPps), false},
                      ConfigCase{"OtherValueKept", 3, AvcC(kSPS, kPps), AvcC(kSPS, kPps), false},
                      ConfigCase{"UnansweredKept", kUnanswered, AvcC(kSPS, kPps), AvcC(kSPS, kPps), false}),
    [](const auto &info) { return std::string(info.param.name); });

// ---- H.264 Init: enhancement configuration --------------------------------------------------

TEST_F(VideoDecoderTest, EnhancementConvertedIntoIntermediateBuffer)
{
    Open(CAL_OTI_H264);
    Answer(CAL_PROP_H264_CONFIG_FORMAT, 2);
    const Bytes enhance = LengthPrefixed({kSPS, kPps}, 4);
    ASSERT_EQ(Init(CAL_OTI_H264, kAnnexBConfig, enhance), 0);
    const CodecCall *pInit = codec.Last(1);
    EXPECT_EQ(pInit->args[3], P(hCodec->m_pIntermediateFrame));
    EXPECT_EQ(pInit->data2, kAnnexBConfig);
    EXPECT_EQ(hCodec->m_iIntermediateFrameSize, static_cast<int32_t>(enhance.size()));
    EXPECT_EQ(sal.allocSizes.back(), enhance.size() + 100);
    const std::string n = std::to_string(kAnnexBConfig.size());
    EXPECT_TRUE(HasTrace(16, 0, "[CAL_Wrapper %d] vorCALTools_AVC_CheckFormat iEnhLen = %d, iNewDataLen = %d\n",
                         "[CAL_Wrapper #] vorCALTools_AVC_CheckFormat iEnhLen = " + n + ", iNewDataLen = " + n + "\n"));
    char pointers[128];
    const unsigned uBuffer = static_cast<unsigned>(reinterpret_cast<uintptr_t>(hCodec->m_pIntermediateFrame));
    snprintf(pointers, sizeof pointers, "pConfigEnhance = 0x%x, m_pIntermediateFrame = 0x%x, m_uH264NALSize = 4\n",
             uBuffer, uBuffer);
    EXPECT_TRUE(HasTrace(16, 0,
                         "[CAL_Wrapper %d] vorCALTools_AVC_CheckFormat pConfigEnhance = 0x%x, "
                         "m_pIntermediateFrame = 0x%x, m_uH264NALSize = %d\n",
                         std::string("[CAL_Wrapper #] vorCALTools_AVC_CheckFormat ") + pointers));
}

TEST_F(VideoDecoderTest, FailedEnhancementConversionPassesNullWithLengthUnchanged)
{
    Open(CAL_OTI_H264);
    Answer(CAL_PROP_H264_CONFIG_FORMAT, 2);
    const Bytes enhance = {0, 0, 0, 0xFF, 0x65, 0x88}; // length field beyond the data
    ASSERT_EQ(Init(CAL_OTI_H264, kAnnexBConfig, enhance), 0);
    EXPECT_EQ(codec.Last(1)->args[3], 0u);
    EXPECT_EQ(codec.Last(1)->args[4], enhance.size());
    EXPECT_TRUE(HasTrace(11, 0, "[CAL_Wrapper %d] vorCALTools_AVC_CheckFormat failed\n",
                         "[CAL_Wrapper #] vorCALTools_AVC_CheckFormat failed\n"));
    EXPECT_EQ(sal.CountFormat("[CAL_Wrapper %d] vorCALTools_AVC_CheckFormat iEnhLen = %d, iNewDataLen = %d\n"), 0u);
}

TEST_F(VideoDecoderTest, FailedCodecInitFreesIntermediateBuffer)
{
    Open(CAL_OTI_H264);
    Answer(CAL_PROP_H264_CONFIG_FORMAT, 2);
    codec.results[1] = 5;
    EXPECT_EQ(Init(CAL_OTI_H264, AvcC(kSPS, kPps), LengthPrefixed({kSPS}, 4)), 5);
    EXPECT_EQ(hCodec->m_pIntermediateFrame, nullptr);
    EXPECT_EQ(hCodec->m_iIntermediateFrameSize, 0);
    EXPECT_EQ(sal.liveBlocks.size(), baseLive); // temporary and intermediate buffers gone
}

// Each allocation of an Init that converts both configurations fails in turn; the buffer an
// earlier Init left goes as after a failed codec Init.
TEST_F(VideoDecoderTest, InitAllocationFailureReturnsMinusOneWithoutCallingCodec)
{
    Open(CAL_OTI_H264);
    Answer(CAL_PROP_H264_CONFIG_FORMAT, 2);
    const Bytes enhance = LengthPrefixed({kSPS}, 4);
    ASSERT_EQ(Init(CAL_OTI_H264, kAnnexBConfig, enhance, 4, 0x99), 0);
    for (uint32_t n = 1; n <= 2; ++n) {
        codec.Reset();
        Answer(CAL_PROP_H264_CONFIG_FORMAT, 2);
        ASSERT_EQ(Init(CAL_OTI_H264, kAnnexBConfig, enhance), 0);
        hCodec->m_uUserData = 0x55;
        sal.FailAllocation(n);
        EXPECT_EQ(Init(CAL_OTI_H264, AvcC(kSPS, kPps), LengthPrefixed({kSPS, kPps}, 4)), -1) << n;
        EXPECT_EQ(codec.Count(1), 1u);
        EXPECT_EQ(hCodec->m_uUserData, 0x55u);
        EXPECT_EQ(hCodec->m_pIntermediateFrame, nullptr);
        EXPECT_EQ(sal.liveBlocks.size(), baseLive) << n;
    }
    EXPECT_EQ(Init(CAL_OTI_H264, AvcC(kSPS, kPps), LengthPrefixed({kSPS}, 4)), 0);
}

// ---- H.264 Init: picture size and Main-profile refusal --------------------------------------

struct ProfileCase {
    uint8_t uProfile;
    uint32_t u84;      // answer to property 84
    bool bRefused;
};

class H264ProfileTest : public VideoDecoderTest, public ::testing::WithParamInterface<ProfileCase> {};

TEST_P(H264ProfileTest, MainProfileRefusedOnlyWhenAsked)
{
    const ProfileCase &c = GetParam();
    Open(CAL_OTI_H264);
    Answer(CAL_PROP_H264_NO_MAIN_PROFILE, c.u84);
    hCodec->m_uUserData = 0x55;
    const int32_t iResult = Init(CAL_OTI_H264, AnnexB({MakeSPS(c.uProfile, 320, 240), kPps}));
    const std::string msg = "[CAL_Wrapper %d] H.264 Error(Profile[%u], Level[%u])!!! H.264 codec can't support "
                            "profile[Main Profile]\n";
    if (c.bRefused) {
        EXPECT_EQ(iResult, 17);
        EXPECT_EQ(codec.Count(1), 0u);
        EXPECT_EQ(hCodec->m_uUserData, 0x55u);
        EXPECT_TRUE(HasTrace(11, 0, msg,
                             "[CAL_Wrapper #] H.264 Error(Profile[77], Level[30])!!! H.264 codec can't support "
                             "profile[Main Profile]\n"));
    } else {
        EXPECT_EQ(iResult, 0);
        EXPECT_EQ(codec.Count(1), 1u);
        EXPECT_EQ(sal.CountFormat(msg), 0u);
    }
}

INSTANTIATE_TEST_SUITE_P(Profiles, H264ProfileTest,
                         ::testing::Values(ProfileCase{77, 1, true}, ProfileCase{66, 1, false},
                                           ProfileCase{100, 1, false}, ProfileCase{77, 0, false},
                                           ProfileCase{77, kUnanswered, false}));

TEST_F(VideoDecoderTest, H264SizeFromSequenceParameterSet)
{
    Open(CAL_OTI_H264);
    struct {
        uint32_t u3;
        Bytes config;
        uint32_t uWidth, uHeight;
    } cases[] = {
        {1, AnnexB({kSei, kSPS, kPps}), 640, 480},
        {0, AnnexB({kSPS, kPps}), 0, 0},
        {kUnanswered, AnnexB({kSPS, kPps}), 0, 0},
        {1, AvcC(kSPS, kPps), 0, 0}, // the size is read from start-code framing only
    };
    for (const auto &c : cases) {
        codec.Reset();
        Answer(CAL_PROP_STREAM_PARAMETERS, c.u3);
        width = height = pitch = 0;
        ASSERT_EQ(Init(CAL_OTI_H264, c.config), 0);
        EXPECT_EQ(width, c.uWidth);
        EXPECT_EQ(height, c.uHeight);
        EXPECT_EQ(pitch, c.uWidth);
    }
}

// ---- MPEG-4 Visual and H.263 Init -----------------------------------------------------------

// Visual object sequence with profile_and_level_indication, then a video object and a layer of
// uWidth x uHeight (ISO/IEC 14496-2 6.2.3).
Bytes MPEG4DSI(uint8_t uIndication, uint32_t uWidth = 352, uint32_t uHeight = 288)
{
    BitWriter w;
    w.PutBytes({0, 0, 1, 0xB0, uIndication, 0, 0, 1, 0xB5, 0x09, 0, 0, 1, 0x00, 0, 0, 1, 0x20});
    w.PutBit(0).Put(1, 8).PutBit(0).Put(1, 4); // random_accessible_vol, type, is_ol_id, aspect
    w.PutBit(0).Put(0, 2).PutBit(1);            // vol_control_parameters, shape, marker
    w.Put(30000, 16).PutBit(1).PutBit(0);        // vop_time_increment_resolution, marker, fixed
    w.PutBit(1).Put(uWidth, 13).PutBit(1).Put(uHeight, 13).PutBit(1).Align();
    w.PutBytes({0x12, 0x34});
    return w.Bytes();
}

// H.263 picture header with PLUSPTYPE (source format 7), UFEP 001 and the QCIF format.
Bytes H263ExtendedPType()
{
    BitWriter w;
    w.Put(0x20, 22).Put(0, 8).Put(2, 2).Put(0, 3).Put(7, 3).Put(1, 3).Put(2, 3);
    w.Put(0, 25).Align().PutBytes({0x55, 0x55});
    return w.Bytes();
}

struct MPEG4Case {
    const char *name;
    uint32_t uOTI;
    Bytes dsi;
    std::vector<std::pair<uint32_t, uint32_t>> answers;
    int32_t iResult;
    std::string trace; // expected category-11 line ('#' for the line number), empty for none
};

class MPEG4InitTest : public VideoDecoderTest, public ::testing::WithParamInterface<MPEG4Case> {};

TEST_P(MPEG4InitTest, Refusals)
{
    const MPEG4Case &c = GetParam();
    Open(c.uOTI);
    for (const auto &[uProperty, uValue] : c.answers)
        Answer(uProperty, uValue);
    EXPECT_EQ(Init(c.uOTI, c.dsi), c.iResult);
    EXPECT_EQ(codec.Count(1), c.iResult == 17 ? 0u : 1u);
    size_t uErrors = 0;
    for (const TraceRecord &t : sal.traces)
        uErrors += t.iCategory == 11;
    EXPECT_EQ(uErrors, c.trace.empty() ? 0u : 1u);
    if (!c.trace.empty()) {
        const bool bH263 = c.uOTI == CAL_OTI_H263;
        EXPECT_TRUE(HasTrace(11, 0,
                             bH263 ? "[CAL_Wrapper %d] H.263 Error(Type[%d])!!! H.263 codec can't support H.263 "
                                     "Extended P Type\n"
                                   : "[CAL_Wrapper %d] MPEG4 Error(Profile[%u], Level[%u])!!! MPEG4 codec can't "
                                     "support Level 3.\n",
                             c.trace));
    }
}

const std::string kLevel3 = "[CAL_Wrapper #] MPEG4 Error(Profile[0], Level[3])!!! MPEG4 codec can't support Level 3.\n";
const std::string kUnknown =
    "[CAL_Wrapper #] MPEG4 Error(Profile[255], Level[255])!!! MPEG4 codec can't support Level 3.\n";
const std::string kExtended =
    "[CAL_Wrapper #] H.263 Error(Type[7])!!! H.263 codec can't support H.263 Extended P Type\n";

INSTANTIATE_TEST_SUITE_P(
    Streams, MPEG4InitTest,
    ::testing::Values(MPEG4Case{"Level3Refused", 0x20, MPEG4DSI(0x03), {{101, 1}}, 17, kLevel3},
                      MPEG4Case{"Level3Unasked", 0x20, MPEG4DSI(0x03), {{101, kUnanswered}, {103, 1}}, 0, ""},
                      MPEG4Case{"Level2Passes", 0x20, MPEG4DSI(0x02), {{101, 1}, {103, 1}}, 0, ""},
                      MPEG4Case{"UnknownRefused", 0x20, MPEG4DSI(0xF5), {{103, 1}}, 17, kUnknown},
                      MPEG4Case{"UnknownUnasked", 0x20, MPEG4DSI(0xF5), {{101, 1}, {103, 0}}, 0, ""},
                      // An empty DSI leaves the cleared record: profile 0, level 0.
                      MPEG4Case{"EmptyPasses", 0x20, {}, {{101, 1}, {103, 1}}, 0, ""},
                      MPEG4Case{"H263Refused", 0xC0, H263ExtendedPType(), {{160, 1}}, 17, kExtended},
                      MPEG4Case{"H263Unasked", 0xC0, H263ExtendedPType(), {{160, 0}, {101, 1}}, 0, ""},
                      MPEG4Case{"H263LevelNotAsked", 0xC0, MPEG4DSI(0x03), {{101, 1}, {160, 1}}, 0, ""}),
    [](const auto &info) { return std::string(info.param.name); });

TEST_F(VideoDecoderTest, MPEG4SizeOnlyWhenAsked)
{
    Open(CAL_OTI_MPEG4_VISUAL);
    Answer(CAL_PROP_STREAM_PARAMETERS, 1);
    ASSERT_EQ(Init(CAL_OTI_MPEG4_VISUAL, MPEG4DSI(0x03, 176, 144)), 0);
    EXPECT_EQ(width, 176u);
    EXPECT_EQ(height, 144u);
    EXPECT_EQ(pitch, 176u);
    Answer(CAL_PROP_STREAM_PARAMETERS, 0);
    ASSERT_EQ(Init(CAL_OTI_MPEG4_VISUAL, MPEG4DSI(0x03, 352, 288)), 0);
    EXPECT_EQ(width, 176u);
}

// ---- H.264 Decode ---------------------------------------------------------------------------

struct FrameCase {
    const char *name;
    uint32_t uNALSize;  // given to Init (property 82 answered 0)
    uint32_t u83, u81;  // answers
    Bytes frame;
    Bytes expected;     // empty: dropped with result word 4
    const char *framing; // name in the parameter-set trace, or null for none
};

class H264FrameTest : public VideoDecoderTest, public ::testing::WithParamInterface<FrameCase> {};

TEST_P(H264FrameTest, CodecReceivesAdaptedFrame)
{
    const FrameCase &c = GetParam();
    Open(CAL_OTI_H264);
    InitNALSize(c.uNALSize);
    Answer(CAL_PROP_H264_INBAND_PARAM_SETS, c.u83);
    Answer(CAL_PROP_H264_FRAME_FORMAT, c.u81);
    codec.results[3] = 9;
    uint32_t uWord = 0;
    const int32_t iResult = Decode(c.frame, &uWord);
    if (c.expected.empty()) {
        EXPECT_EQ(iResult, 1);
        EXPECT_EQ(uWord, 4u);
        EXPECT_EQ(codec.Count(3), 0u);
    } else {
        EXPECT_EQ(iResult, 9);
        EXPECT_EQ(Received(), c.expected);
        EXPECT_EQ(codec.Last(3)->args[1], c.expected.size());
    }
    const std::string discard = "[CAL_Wrapper %d] %s bitstream has SPSPPS. => => Discard SPSPPS\n";
    if (c.framing)
        EXPECT_TRUE(HasTrace(16, 4, discard,
                             std::string("[CAL_Wrapper #] ") + c.framing + " bitstream has SPSPPS. => => Discard SPSPPS\n"));
    else
        EXPECT_EQ(sal.CountFormat(discard), 0u);
}

const Bytes kAnnexBAU = AnnexB({kSPS, kPps, kIDR});

INSTANTIATE_TEST_SUITE_P(
    Frames, H264FrameTest,
    ::testing::Values(
        FrameCase{"AnnexBParameterSetsRemoved", 4, 0, kUnanswered, kAnnexBAU, AnnexB({kIDR}), "ANNEX-B"},
        FrameCase{"ThreeByteStartCodes", 4, 0, kUnanswered, AnnexB({kSei, kSPS, kPps, kIDR}, {3}), AnnexB({kIDR}, {3}),
                  "ANNEX-B"},
        FrameCase{"LeadingUnitsGoWithTheRun", 4, 0, kUnanswered, AnnexB({kAUD, kSPS, kPps, kIDR}), AnnexB({kIDR}),
                  "ANNEX-B"},
        FrameCase{"OnlyParameterSetsDropped", 4, 0, kUnanswered, AnnexB({kSPS, kPps}), {}, "ANNEX-B"},
        FrameCase{"Size4Removed", 4, 0, kUnanswered, LengthPrefixed({kSei, kSPS, kPps, kIDR, kSlice}, 4),
                  LengthPrefixed({kIDR, kSlice}, 4), "NAL"},
        FrameCase{"Size2Removed", 2, 0, kUnanswered, LengthPrefixed({kSPS, kPps, kIDR}, 2), LengthPrefixed({kIDR}, 2), "NAL"},
        FrameCase{"Size1Removed", 1, 0, kUnanswered, LengthPrefixed({kSPS, kPps, kIDR}, 1), LengthPrefixed({kIDR}, 1), "NAL"},
        FrameCase{"FourBytesLeftPass", 2, 0, kUnanswered, LengthPrefixed({kSPS, kPps, {0x65, 0x88}}, 2),
                  LengthPrefixed({{0x65, 0x88}}, 2), "NAL"},
        FrameCase{"ThreeBytesLeftDropped", 2, 0, kUnanswered, LengthPrefixed({kSPS, kPps, {0x65}}, 2), {}, "NAL"},
        FrameCase{"NoRunUnchanged", 4, 0, kUnanswered, AnnexB({kIDR}), AnnexB({kIDR}), nullptr},
        FrameCase{"83AnsweredOneKeeps", 4, 1, kUnanswered, kAnnexBAU, kAnnexBAU, nullptr},
        FrameCase{"83UnansweredKeeps", 4, kUnanswered, kUnanswered, kAnnexBAU, kAnnexBAU, nullptr},
        FrameCase{"AnnexBToPrefixed", 2, kUnanswered, 1, kAnnexBAU, LengthPrefixed({kSPS, kPps, kIDR}, 4), nullptr},
        FrameCase{"PrefixedToAnnexB", 2, kUnanswered, 2, LengthPrefixed({kSPS, kIDR}, 2), AnnexB({kSPS, kIDR}), nullptr},
        FrameCase{"SameFramingKept", 4, kUnanswered, 2, AnnexB({kIDR}, {3}), AnnexB({kIDR}, {3}), nullptr},
        FrameCase{"OtherValueKept", 4, kUnanswered, 3, LengthPrefixed({kIDR}, 4), LengthPrefixed({kIDR}, 4), nullptr},
        FrameCase{"RemovedThenAnnexB", 3, 0, 2, LengthPrefixed({kSPS, kPps, kIDR}, 3), AnnexB({kIDR}), "NAL"},
        FrameCase{"RemovedThenPrefixed", 4, 0, 1, kAnnexBAU, LengthPrefixed({kIDR}, 4), "ANNEX-B"},
        FrameCase{"ConversionFails", 4, kUnanswered, 2, {0, 0, 0, 0xFF, 0x65, 0x88}, {}, nullptr}),
    [](const auto &info) { return std::string(info.param.name); });

TEST_F(VideoDecoderTest, InvalidLengthAndConversionFailureMessages)
{
    Open(CAL_OTI_H264);
    InitNALSize(4);
    Answer(CAL_PROP_H264_INBAND_PARAM_SETS, 0);
    Answer(CAL_PROP_H264_FRAME_FORMAT, 2);
    uint32_t uWord = 0;
    EXPECT_EQ(Decode(AnnexB({kSPS, kPps}), &uWord), 1);
    EXPECT_TRUE(HasTrace(16, 0, "[CAL_Wrapper %d] InValid Frame Len (%d)\n", "[CAL_Wrapper #] InValid Frame Len (0)\n"));
    codec.Answer(CAL_PROP_H264_INBAND_PARAM_SETS, 1);
    EXPECT_EQ(Decode({0, 0, 0, 0xFF, 0x65, 0x88}, &uWord, 0x2A), 1);
    EXPECT_TRUE(HasTrace(11, 0, "[CAL_Wrapper %d] vorCALTools_AVC_ConvertFormat failed[%d],iLen[%d]\n",
                         "[CAL_Wrapper #] vorCALTools_AVC_ConvertFormat failed[42],iLen[6]\n"));
    // Dropping never writes through a null result word.
    EXPECT_EQ(Decode({0, 0, 0, 0xFF, 0x65, 0x88}, nullptr), 1);
    EXPECT_EQ(codec.Count(3), 0u);
}

TEST_F(VideoDecoderTest, IntermediateBufferGrowsAndIsReused)
{
    Open(CAL_OTI_H264);
    InitNALSize(4);
    Answer(CAL_PROP_H264_FRAME_FORMAT, 1);
    uint32_t uWord = 0;
    const Bytes small = AnnexB({kIDR});
    const Bytes large = AnnexB({kSPS, kPps, kIDR, kSlice});
    const size_t uBase = sal.allocSizes.size();
    const size_t uFrees = sal.freeCount;

    ASSERT_EQ(Decode(small, &uWord), 0);
    EXPECT_EQ(sal.allocSizes.size(), uBase + 1);
    EXPECT_EQ(sal.allocSizes.back(), small.size() + 100);
    ASSERT_EQ(Decode(large, &uWord), 0);
    EXPECT_EQ(sal.allocSizes.size(), uBase + 2);
    EXPECT_EQ(sal.allocSizes.back(), large.size() + 100);
    EXPECT_EQ(sal.freeCount, uFrees + 1);
    const uint8_t *pBuffer = hCodec->m_pIntermediateFrame;
    for (const Bytes &frame : {small, large, small}) {
        ASSERT_EQ(Decode(frame, &uWord), 0);
        EXPECT_EQ(codec.Last(3)->args[0], P(pBuffer));
        EXPECT_EQ(Received().size(), frame.size()); // 4-byte start codes become 4-byte lengths
    }
    EXPECT_EQ(sal.allocSizes.size(), uBase + 2);
    EXPECT_EQ(hCodec->m_iIntermediateFrameSize, static_cast<int32_t>(large.size()));
}

TEST_F(VideoDecoderTest, DecodeAllocationFailureDropsFrame)
{
    Open(CAL_OTI_H264);
    InitNALSize(4);
    Answer(CAL_PROP_H264_FRAME_FORMAT, 1);
    uint32_t uWord = 0;
    sal.FailAllocation(1);
    EXPECT_EQ(Decode(kAnnexBAU, &uWord), 1);
    EXPECT_EQ(uWord, 4u);
    EXPECT_EQ(codec.Count(3), 0u);
    EXPECT_EQ(hCodec->m_pIntermediateFrame, nullptr);
    // A grown buffer that cannot be replaced leaves none behind; the next frame succeeds.
    ASSERT_EQ(Decode(AnnexB({kIDR}), &uWord), 0);
    sal.FailAllocation(1);
    EXPECT_EQ(Decode(kAnnexBAU, &uWord), 1);
    EXPECT_EQ(hCodec->m_iIntermediateFrameSize, 0);
    EXPECT_EQ(Decode(kAnnexBAU, &uWord), 0);
    EXPECT_EQ(Received(), LengthPrefixed({kSPS, kPps, kIDR}, 4));
}

// ---- MPEG-4 Visual and other OTIs in Decode ------------------------------------------------

TEST_F(VideoDecoderTest, MPEG4FrameStartsAtVOP)
{
    Open(CAL_OTI_MPEG4_VISUAL);
    const Bytes frame = {0, 0, 1, 0xB0, 0x01, 0, 0, 1, 0xB6, 0x10, 0x20};
    const Bytes noVOP = {0, 0, 1, 0xB3, 0x01, 0x02, 0x03};
    uint32_t uWord = 0;
    struct {
        uint32_t u97;
        const Bytes &in;
        Bytes expected;
    } cases[] = {{1, frame, Bytes(frame.begin() + 5, frame.end())}, {1, noVOP, noVOP}, {0, frame, frame},
                 {kUnanswered, frame, frame}};
    for (const auto &c : cases) {
        Answer(CAL_PROP_MPEG4_VOP_START, c.u97);
        ASSERT_EQ(Decode(c.in, &uWord), 0);
        EXPECT_EQ(Received(), c.expected);
    }
}

TEST_F(VideoDecoderTest, OtherCodecsPassUnchanged)
{
    Open(CAL_OTI_H263);
    for (uint32_t uProperty : {81u, 83u, 97u})
        Answer(uProperty, uProperty == 83 ? 0 : 1);
    uint32_t uWord = 0;
    ASSERT_EQ(Decode(kAnnexBAU, &uWord), 0);
    EXPECT_EQ(codec.Last(3)->args[0], P(kAnnexBAU.data()));
    EXPECT_TRUE(codec.propertyQueries.empty());
}

// ---- Dump records and null instance ---------------------------------------------------------

TEST_F(VideoDecoderTest, DumpRecordsHoldInputBeforeAdaptation)
{
    Open(CAL_OTI_H264);
    const std::string path = sal.TempDir() + "/video_adapt.dump";
    ASSERT_NE(vorCAL_DumpFrames(hCAL, path.c_str(), 0), 0u);
    Answer(CAL_PROP_H264_CONFIG_FORMAT, 2);
    Answer(CAL_PROP_H264_INBAND_PARAM_SETS, 0);
    Answer(CAL_PROP_H264_FRAME_FORMAT, 1);
    const Bytes config = AvcC(kSPS, kPps);
    ASSERT_EQ(Init(CAL_OTI_H264, config), 0);
    uint32_t uWord = 0;
    ASSERT_EQ(Decode(kAnnexBAU, &uWord), 0);
    ASSERT_EQ(Decode({}, &uWord), 0);
    vorCAL_DumpFrames(hCAL, nullptr, 0);

    Bytes expected;
    for (const Bytes *pRecord : {&config, &kAnnexBAU}) {
        const uint32_t uLen = static_cast<uint32_t>(pRecord->size());
        expected.insert(expected.end(), reinterpret_cast<const uint8_t *>(&uLen),
                        reinterpret_cast<const uint8_t *>(&uLen) + 4);
        expected.insert(expected.end(), pRecord->begin(), pRecord->end());
    }
    expected.insert(expected.end(), 4, 0);
    EXPECT_EQ(RecordingSal::ReadFile(path), expected);
}

TEST_F(VideoDecoderTest, NullInstanceAndUnreadableFrames)
{
    uint32_t uWord = 0;
    EXPECT_EQ(vorCAL_VideoDecoderInit(nullptr, CAL_OTI_H264, nullptr, 0, nullptr, 0, 4, nullptr, nullptr, nullptr, 0),
              -1);
    EXPECT_EQ(vorCAL_VideoDecoderDecode(nullptr, nullptr, 0, 0, 0, &uWord), -1);
    Open(CAL_OTI_H264);
    Answer(CAL_PROP_H264_INBAND_PARAM_SETS, 0);
    Answer(CAL_PROP_H264_FRAME_FORMAT, 2);
    // Null data or a negative length reach the codec as given; the layer reads nothing.
    EXPECT_EQ(vorCAL_VideoDecoderDecode(hCodec, nullptr, 12, 0, 0, &uWord), 0);
    EXPECT_EQ(vorCAL_VideoDecoderDecode(hCodec, kAnnexBAU.data(), -5, 0, 0, &uWord), 0);
    EXPECT_EQ(codec.Count(3), 2u);
    EXPECT_EQ(codec.Last(3)->args[1], static_cast<CALParam>(-5));
    // An empty frame is examined: once a buffer exists, its conversion fails as documented.
    InitNALSize(4);
    const uint8_t byte = 0;
    ASSERT_EQ(Decode(LengthPrefixed({kIDR}, 4), &uWord), 0);
    EXPECT_EQ(vorCAL_VideoDecoderDecode(hCodec, &byte, 0, 3, 0, &uWord), 1);
    EXPECT_TRUE(HasTrace(11, 0, "[CAL_Wrapper %d] vorCALTools_AVC_ConvertFormat failed[%d],iLen[%d]\n",
                         "[CAL_Wrapper #] vorCALTools_AVC_ConvertFormat failed[3],iLen[0]\n"));
    // A null configuration and null size pointers are not read or written.
    Answer(CAL_PROP_STREAM_PARAMETERS, 1);
    Answer(CAL_PROP_H264_NO_MAIN_PROFILE, 1);
    Answer(CAL_PROP_H264_CONFIG_FORMAT, 2);
    EXPECT_EQ(vorCAL_VideoDecoderInit(hCodec, CAL_OTI_H264, nullptr, 30, nullptr, 30, 4, nullptr, nullptr, nullptr, 0),
              0);
    EXPECT_EQ(codec.Last(1)->args[1], 0u);
}

} // namespace
