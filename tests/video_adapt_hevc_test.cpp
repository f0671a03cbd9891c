// The video decoder adaptation for HEVC (OTI 0x23) with a recording codec: what the codec's Init
// receives for properties 3, 82 and the stream-aware property, what its Decode receives for 81
// and 83, and whole sessions on the x265 clip against ffmpeg's hevc_mp4toannexb output.
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <tuple>

#include <vorcal/core.h>

#include "hevc_streams.hpp"
#include "recording_codec.hpp"
#include "recording_sal.hpp"

using namespace vorcal::test;

namespace {

// A value with this bit set is written by GetProperty, which then returns -1: it must not count.
constexpr uint32_t kNo = 0x80000000;
constexpr uint32_t HEVC = CAL_OTI_HEVC;
using Answers = std::vector<std::pair<uint32_t, uint32_t>>;
using Texts = std::vector<std::string>;

const Bytes kVps = Hevc(32, {0x0C}), kSps = Hevc(33, {0x01}), kPps = Hevc(34, {0xC1}), kAud = Hevc(35, {0x50}),
            kSei = Hevc(39, {0x05, 0x80}), kIdr = Hevc(19, {0xAF, 0x11, 0x22}), kTrail = Hevc(1, {0xD0, 0x19});

template <typename F>
Bytes Made(F make)
{
    Bytes out(size_t(std::max(0, make(nullptr, 0))));
    make(out.data(), int32_t(out.size()));
    return out;
}

class HevcAdaptTest : public ::testing::Test {
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
        ASSERT_EQ(vorCAL_RegisterCodec(hCAL, 2, 1, HEVC, &functions, sizeof functions), 1);
    }
    void TearDown() override
    {
        Open({}, false);
        vorCAL_ReleaseHandle(hCAL);
        EXPECT_TRUE(sal.liveBlocks.empty() && sal.badFrees == 0) << sal.liveBlocks.size() << " blocks leaked";
    }
    void Open(const Answers &answers, bool bNew = true)
    {
        if (hCodec) {
            vorCAL_VideoDecoderDeinit(hCodec);
            vorCAL_ReleaseCodec(hCodec);
            hCodec = nullptr;
        }
        codec.Reset();
        for (const auto &[uProperty, uValue] : answers)
            codec.Answer(uProperty, uValue & ~kNo, uValue & kNo ? -1 : 0);
        if (bNew) {
            ASSERT_NE(hCodec = vorCAL_GetCodec(hCAL, 2, 1, HEVC), nullptr);
        }
        sal.traces.clear();
    }
    int32_t Init(const Bytes &config, const Bytes &enhance = {}, uint32_t uNALSize = 4)
    {
        width = height = pitch = 0;
        return vorCAL_VideoDecoderInit(hCodec, HEVC, config.empty() ? nullptr : config.data(), int32_t(config.size()),
                                       enhance.empty() ? nullptr : enhance.data(), int32_t(enhance.size()), uNALSize,
                                       &width, &height, &pitch, 0x1234);
    }
    int32_t Decode(const Bytes &frame, CALParam uParam3 = 7)
    {
        word = 0;
        return vorCAL_VideoDecoderDecode(hCodec, frame.data(), int32_t(frame.size()), uParam3, 8, &word);
    }
    const Bytes &Received() const { return codec.Last(3)->data; }
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

// Init: the configuration in the framing property 82 asks for (through a temporary buffer of
// the size the conversion takes), the display size for property 3, the framing and length size
// of the stream-aware mode; Main-profile refusal (84) is never asked.
TEST_F(HevcAdaptTest, Init)
{
    const Bytes record = ReadHevcFixture("conf_1918x1078.hvcc"), stream = ReadHevcFixture("conf_1918x1078.hevc");
    const Bytes units = Made([&](uint8_t *d, int32_t n) { return vorCALTools_HEVC_HvcCToAnnexB(d, n, record.data(), int32_t(record.size())); });
    const Bytes built = Made([&](uint8_t *d, int32_t n) { return vorCALTools_HEVC_MakeHvcC(d, n, units.data(), int32_t(units.size()), 4, 0); });
    const Bytes garbage = {0x01, 0x02, 0x03, 0x04, 0x05};
    const std::string kNotConverted = "11/0 [CAL_Wrapper #] HEVC configuration not converted (-4)\n";
    // Answers, configuration, NAL length size given, what the codec receives (empty: the caller's
    // buffer), size, m_uH264NALSize, framing kept for Decode, traces.
    const std::tuple<Answers, Bytes, uint32_t, Bytes, uint32_t, uint32_t, uint32_t, Texts> cases[] = {
        {{{82, 2}, {3, 1}}, record, 4, units, 1918, 4, 0, {}},
        {{{82, 1}, {84, 1}}, units, 2, built, 0, 2, 0, {}},
        {{{82, 1}, {3, 1}}, record, 4, {}, 1918, 4, 0, {}},
        {{{82, 2}, {3, 1}}, stream, 4, {}, 1918, 4, 0, {}},
        {{{82, kNo | 1}, {3, kNo | 1}}, record, 4, {}, 0, 0, 0, {}},
        {{{82, 3}}, record, 2, {}, 0, 2, 0, {}},
        {{{CAL_PROP_TRUST_CONFIGURATION, 1}, {3, 1}}, record, 2, {}, 1918, 4, 1, {}},
        {{{CAL_PROP_TRUST_CONFIGURATION, 1}, {82, 2}}, record, 2, units, 0, 4, 1, {}},
        {{{CAL_PROP_TRUST_CONFIGURATION, 1}, {82, 1}}, stream, 2, built, 0, 2, 2, {}},
        {{{82, 2}}, garbage, 4, {}, 0, 4, 0, {kNotConverted}},
    };
    size_t uRow = 0;
    for (const auto &[answers, config, uNALSize, received, uWidth, uNALKept, uFraming, traces] : cases) {
        SCOPED_TRACE(uRow++);
        Open(answers);
        const size_t uAllocs = sal.allocSizes.size();
        ASSERT_EQ(Init(config, {}, uNALSize), 0);
        EXPECT_EQ(codec.Last(1)->data, received.empty() ? config : received);
        EXPECT_EQ(codec.Last(1)->args[1] == P(config.data()), received.empty());
        EXPECT_EQ(std::vector<uint32_t>(sal.allocSizes.begin() + long(uAllocs), sal.allocSizes.end()),
                  received.empty() ? std::vector<uint32_t>{} : std::vector<uint32_t>{uint32_t(received.size())});
        EXPECT_EQ(std::tuple(width, height, pitch), uWidth ? std::tuple(1918u, 1078u, 1918u) : std::tuple(0u, 0u, 0u));
        EXPECT_EQ(std::pair(hCodec->m_uH264NALSize, hCodec->m_uAMRFrameType), std::pair(uNALKept, uFraming));
        EXPECT_EQ(std::count(codec.propertyQueries.begin(), codec.propertyQueries.end(), 84u), 0);
        EXPECT_EQ(Traces(), traces);
    }
    // The enhancement configuration converts like a frame into the intermediate buffer; one that
    // does not convert reaches the codec as null with its length; no memory fails the Init.
    Open({{82, 1}});
    const Bytes enhance = AnnexB({kVps, kSps, kPps});
    ASSERT_EQ(Init(record, enhance), 0);
    EXPECT_EQ(codec.Last(1)->args[3], P(hCodec->m_pIntermediateFrame));
    EXPECT_EQ(codec.Last(1)->data2, LengthPrefixed({kVps, kSps, kPps}, 4));
    const Bytes broken = Cat({AnnexB({kSps}), {0, 0, 1, 0x40}});
    ASSERT_EQ(Init(record, broken), 0);
    EXPECT_EQ(std::pair(codec.Last(1)->args[3], codec.Last(1)->args[4]), std::pair(CALParam(0), CALParam(broken.size())));
    EXPECT_EQ(Traces(), Texts({"11/0 [CAL_Wrapper #] vorCALTools_HEVC_ConvertFormat failed\n"}));
    for (uint32_t n = 1; n <= 2; ++n) { // the temporary configuration, then the intermediate buffer
        Open({{82, 2}});
        sal.FailAllocation(n);
        EXPECT_EQ(Init(record, LengthPrefixed({kVps}, 4)), -1);
        EXPECT_EQ(codec.Count(1), 0u);
    }
}

// Decode: the parameter-set run and what precedes it removed (83 = 0), the framing converted
// (81) with 4-byte lengths out, frames the layer drops itself (1, result word 4); in the
// stream-aware mode the framing comes from the configuration.
TEST_F(HevcAdaptTest, Decode)
{
    const std::string kB = "16/4 [CAL_Wrapper #] ANNEX-B bitstream has SPSPPS. => => Discard SPSPPS\n";
    const std::string kN = "16/4 [CAL_Wrapper #] NAL bitstream has SPSPPS. => => Discard SPSPPS\n";
    const Bytes au = AnnexB({kAud, kVps, kSps, kPps, kSei, kIdr});
    // A sample whose first length (256) reads as a start code and a valid header.
    const Bytes longIdr = Hevc(19, Bytes(254, 0x11)), ambiguous = LengthPrefixed({longIdr, kTrail}, 4);
    const Bytes record = ReadHevcFixture("main_64x48.hvcc");
    // Answers, NAL length size, frame, what the codec receives (empty: dropped), traces.
    const std::tuple<Answers, uint32_t, Bytes, Bytes, Texts> cases[] = {
        {{{83, 0}}, 4, au, AnnexB({kIdr}), {kB}},
        {{{83, 0}}, 4, Cat({{0, 0}, AnnexB({Hevc(36), kSei, kTrail}, 3)}), AnnexB({kTrail}, 3), {kB}},
        {{{83, 0}}, 2, LengthPrefixed({kAud, kSps, kIdr, kTrail}, 2), LengthPrefixed({kIdr, kTrail}, 2), {kN}},
        {{{83, 0}}, 4, AnnexB({kVps, kSps, kPps}), {}, {kB, "16/0 [CAL_Wrapper #] InValid Frame Len (0)\n"}},
        {{{83, 0}}, 1, LengthPrefixed({kSps, {0x02, 0x01}}, 1), {}, {kN, "16/0 [CAL_Wrapper #] InValid Frame Len (3)\n"}},
        {{{83, 1}}, 4, au, au, {}},
        {{{81, 1}}, 2, au, LengthPrefixed({kAud, kVps, kSps, kPps, kSei, kIdr}, 4), {}},
        {{{81, 2}}, 3, LengthPrefixed({kIdr, kTrail}, 3), AnnexB({kIdr, kTrail}), {}},
        {{{81, 2}, {83, 0}}, 2, LengthPrefixed({kVps, kIdr}, 2), AnnexB({kIdr}), {kN}},
        {{{81, 1}}, 4, AnnexB({kIdr, {0x26}}), {}, {"11/0 [CAL_Wrapper #] vorCALTools_HEVC_ConvertFormat failed[7],iLen[14]\n"}},
        {{{81, 2}}, 0, LengthPrefixed({kIdr}, 4), {}, {"11/0 [CAL_Wrapper #] vorCALTools_HEVC_ConvertFormat failed[7],iLen[9]\n"}},
        // The format test takes the ambiguous sample for start codes: it passes unconverted.
        {{{81, 2}}, 4, ambiguous, ambiguous, {}},
    };
    size_t uRow = 0;
    for (const auto &[answers, uNALSize, in, out, traces] : cases) {
        SCOPED_TRACE(uRow++);
        Open(answers);
        hCodec->m_uH264NALSize = uNALSize; // as an Init with property 82 answered leaves it
        codec.results[3] = 9;
        EXPECT_EQ(Decode(in), out.empty() ? 1 : 9);
        EXPECT_EQ(word, out.empty() ? 4u : 0u);
        EXPECT_EQ(Traces(), traces);
        EXPECT_EQ(codec.Count(3), out.empty() ? 0u : 1u);
        EXPECT_EQ(out.empty() ? out : Received(), out);
    }
    // The stream-aware mode knows from the record that samples carry 4-byte lengths.
    Open({{CAL_PROP_TRUST_CONFIGURATION, 1}, {81, 2}});
    ASSERT_EQ(Init(record, {}, 2), 0);
    ASSERT_EQ(Decode(ambiguous), 0);
    EXPECT_EQ(Received(), AnnexB({longIdr, kTrail}));
}

// The x265 clip: its MP4 samples (hvcC record) to a codec that wants start codes and no in-band
// parameter sets get ffmpeg's hevc_mp4toannexb output of each sample from its first slice on,
// byte for byte; its Annex B packets to a codec that wants lengths get the samples' units from the
// first slice on (less the zero_byte ffmpeg's muxer kept at the end of a sample).
TEST_F(HevcAdaptTest, SessionsOnRealClip)
{
    const Bytes record = ReadHevcFixture("main_176x144.hvcc");
    const HevcReport samples = ReadHevcReport("main_176x144.nal"), filtered = ReadHevcReport("main_176x144.mp4toannexb.hevc"),
                     annexB = ReadHevcReport("main_176x144.hevc");
    ASSERT_EQ(samples.packets.size(), 12u);
    auto FromFirstSlice = [](const std::vector<Bytes> &units) {
        return std::vector<Bytes>(std::find_if(units.begin(), units.end(), [](const Bytes &u) { return (u[0] >> 1) <= 31; }), units.end());
    };
    const Bytes units = Made([&](uint8_t *d, int32_t n) { return vorCALTools_HEVC_HvcCToAnnexB(d, n, record.data(), int32_t(record.size())); });
    for (const uint32_t uTrust : {1u, 0u}) {
        SCOPED_TRACE(uTrust);
        Open({{CAL_PROP_TRUST_CONFIGURATION, uTrust}, {3, 1}, {82, 2}, {83, 0}, {81, 2}});
        ASSERT_EQ(Init(record), 0);
        EXPECT_EQ(std::pair(width, height), std::pair(176u, 144u));
        EXPECT_EQ(codec.Last(1)->data, units);
        size_t uUnconverted = 0;
        for (size_t k = 0; k < 12; ++k) {
            ASSERT_EQ(Decode(samples.packets[k]), 0) << k;
            const Bytes &f = filtered.packets[k];
            const std::vector<Bytes> slices = FromFirstSlice(HevcUnits(f));
            const size_t uSlice = size_t(std::search(f.begin(), f.end(), slices[0].begin(), slices[0].end()) - f.begin()) - 4;
            const bool bMatch = Received() == Bytes(f.begin() + long(uSlice), f.end());
            // Without the stream-aware mode, a sample whose first slice is 256-383 bytes long
            // begins, once AUD and SEI are cut, with 00 00 01 and a valid header: it passes as is.
            uUnconverted += !bMatch && Received()[2] == 1;
            EXPECT_TRUE(bMatch || uTrust == 0) << k;
        }
        EXPECT_EQ(uUnconverted, uTrust ? 0u : 1u);
    }
    Open({{82, 1}, {83, 0}, {81, 1}});
    ASSERT_EQ(Init(units), 0);
    const Bytes &built = codec.Last(1)->data;
    EXPECT_EQ(HevcUnits(Made([&](uint8_t *d, int32_t n) { return vorCALTools_HEVC_HvcCToAnnexB(d, n, built.data(), int32_t(built.size())); })),
              HevcUnits(units));
    for (size_t k = 0; k < 12; ++k) {
        ASSERT_EQ(Decode(annexB.packets[k]), 0) << k;
        std::vector<Bytes> expected = FromFirstSlice(HevcUnits(samples.packets[k], 4));
        expected.back().resize(k < 11 ? expected.back().size() - 1 : expected.back().size()); // the zero_byte
        EXPECT_EQ(HevcUnits(Received(), 4), expected) << k;
    }
}

} // namespace
