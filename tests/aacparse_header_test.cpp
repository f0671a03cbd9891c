// Parse-only decoder stream headers: ADTS with and without CRC at every sampling index and
// channel configuration, ADIF with program config elements the channel map accepts and
// refuses, headerless streams, the channel map itself, the band layout and the noise generator.
#include <gtest/gtest.h>

#include <bit>
#include <algorithm>
#include <cstdint>
#include <string>
#include <tuple>
#include <vector>

#include <vorcal/aacparse.h>

#include "bit_writer.hpp"

namespace {

using vorcal::test::BitWriter;

constexpr uint32_t kRates[16] = {96000, 88200, 64000, 48000, 44100, 32000, 24000, 22050,
                                 16000, 12000, 11025, 8000,  0,     0,     0,     0};
constexpr uint32_t kLongBands[16] = {41, 41, 47, 49, 49, 51, 47, 47, 43, 43, 43, 40, 0, 0, 0, 0};
constexpr uint32_t kShortBands[16] = {12, 12, 12, 14, 14, 14, 15, 15, 15, 15, 15, 15, 0, 0, 0, 0};

// The reader fetches four bytes at a time and never checks an end: every buffer gets slack.
std::vector<uint8_t> WithSlack(std::vector<uint8_t> bytes)
{
    bytes.resize(bytes.size() + 8, 0);
    return bytes;
}

struct Adts {
    uint32_t id = 0, profile = 1, index = 4, channels = 2, frameLength = 0x1FF, fullness = 0x7FF;
    bool crc = false;
};

std::vector<uint8_t> AdtsBytes(const Adts &a)
{
    BitWriter w;
    w.Put(0xFFF, 12).Put(a.id, 1).Put(0, 2).Put(a.crc ? 0 : 1, 1);
    w.Put(a.profile, 2).Put(a.index, 4).Put(0, 1).Put(a.channels, 3).Put(0, 1).Put(0, 1);
    w.Put(0, 1).Put(0, 1).Put(a.frameLength, 13).Put(a.fullness, 11).Put(0, 2);
    if (a.crc)
        w.Put(0xBEEF, 16);
    return WithSlack(w.Bytes());
}

// Resets hhDecoder as the detection entry does (a null frame stops right after the reset).
VrAACDecoder_OnlyParsing &FreshState()
{
    VrAACSBRInfo(nullptr, 0, nullptr, nullptr, nullptr, nullptr, nullptr);
    return hhDecoder;
}

struct InitResult {
    uint32_t rate, channels, frameSamples, sbr, aligned, header;
    bool operator==(const InitResult &) const = default;
};

std::ostream &operator<<(std::ostream &os, const InitResult &r)
{
    return os << "rate " << r.rate << " channels " << r.channels << " samples " << r.frameSamples << " sbr "
              << r.sbr << " bits " << r.aligned << '/' << r.header;
}

InitResult Init(const std::vector<uint8_t> &buf, uint32_t rate = 0, uint32_t channels = 0)
{
    InitResult r{rate, channels, 77, 77, 77, 77};
    EXPECT_EQ(VrAACDecInitOnlyParsing(&FreshState(), buf.data(), &r.rate, &r.channels, &r.frameSamples, &r.sbr,
                                      &r.aligned, &r.header),
              0);
    return r;
}

class AdtsEveryIndex : public ::testing::TestWithParam<std::tuple<uint32_t, bool>> {};

TEST_P(AdtsEveryIndex, RateChannelsAndBits)
{
    const auto [index, crc] = GetParam();
    for (uint32_t channels = 0; channels < 8; ++channels) {
        SCOPED_TRACE(channels);
        Adts a;
        a.index = index;
        a.channels = channels;
        a.crc = crc;
        a.frameLength = 100 + channels;
        const std::vector<uint8_t> frame = AdtsBytes(a);
        uint32_t o[5] = {1, 1, 1, 1, 1};
        ASSERT_EQ(VrAACSBRInfo(frame.data(), 0, &o[0], &o[1], &o[2], &o[3], &o[4]), 0u);
        const uint32_t bits = crc ? 72 : 56;
        EXPECT_EQ(std::vector<uint32_t>(o, o + 5), (std::vector<uint32_t>{kRates[index], channels, 0, bits, bits}));
        const VrAACDecoder_OnlyParsing &d = hhDecoder;
        EXPECT_EQ(d.uADTS * 10 + d.uADIF, 10u);
        EXPECT_EQ(d.MCInfo.uSampleRateIdx, index);
        EXPECT_EQ(d.ADTS.uProtectionAbsent, crc ? 0u : 1u);
        EXPECT_EQ(d.ADTS.uFrameLength, 100 + channels);
        EXPECT_EQ(d.ADTS.uBufferFullness, 0x7FFu);
        EXPECT_EQ(d.LongInfo.uBandsPerWindow, kLongBands[index]);
        EXPECT_EQ(d.ShortInfo.uBandsPerBlock, 8 * kShortBands[index]);
        EXPECT_EQ(d.pWindowInfo[VR_EIGHT_SHORT_SEQUENCE_OnlyParsing], &d.ShortInfo);
    }
}

INSTANTIATE_TEST_SUITE_P(IndexAndCrc, AdtsEveryIndex,
                         ::testing::Combine(::testing::Range(0u, 16u), ::testing::Bool()));

TEST(AacHeader, DocumentedAdtsHeaders)
{
    EXPECT_EQ(Init(WithSlack({0xFF, 0xF1, 0x50, 0x80, 0x02, 0x1F, 0xFC})), (InitResult{44100, 2, 2048, 0, 56, 56}));
    EXPECT_EQ(hhDecoder.uMPEG4, 1u);
    EXPECT_EQ(hhDecoder.MCInfo.uProfile, 1u);
    EXPECT_EQ(hhDecoder.ADTS.uFrameLength, 16u);
    EXPECT_EQ(Init(WithSlack({0xFF, 0xF0, 0x50, 0x80, 0x02, 0x1F, 0xFC, 0x12, 0x34})),
              (InitResult{44100, 2, 2048, 0, 72, 72}));
    Adts mpeg2;
    mpeg2.id = 1;
    mpeg2.channels = 0;
    EXPECT_EQ(Init(AdtsBytes(mpeg2)), (InitResult{44100, 0, 0, 0, 56, 56}));
    EXPECT_EQ(hhDecoder.uMPEG4, 0u);
}

TEST(AacHeader, DetectionRefusesWithoutSyncAndWritesNothing)
{
    const std::vector<std::vector<uint8_t>> inputs = {
        WithSlack({'A', 'D', 'I', 'F'}), WithSlack({0xFF, 0xE1, 0x50, 0x80}), WithSlack({0xFE, 0xF1})};
    for (size_t i = 0; i <= inputs.size(); ++i) {
        SCOPED_TRACE(i);
        const uint8_t *p = i < inputs.size() ? inputs[i].data() : nullptr;
        uint32_t o[5] = {11, 12, 13, 14, 15};
        EXPECT_EQ(VrAACSBRInfo(p, 16, &o[0], &o[1], &o[2], &o[3], &o[4]), 9u);
        EXPECT_EQ(std::vector<uint32_t>(o, o + 5), (std::vector<uint32_t>{11, 12, 13, 14, 15}));
    }
}

TEST(AacHeader, ResetGivesDefaultsAndForgetsThePreviousFrame)
{
    Adts first;
    first.index = 11;
    first.crc = true;
    first.id = 1;
    Init(AdtsBytes(first));
    chn_configOnlyParsing(&hhDecoder, 1, 3, 1, &hhDecoder.MCInfo);
    ASSERT_EQ(hhDecoder.uImplicitCPE, 1u);

    const VrAACDecoder_OnlyParsing &d = FreshState();
    EXPECT_EQ(hDecoder, &hhDecoder);
    EXPECT_EQ(d.uMPEG4, 1u);
    EXPECT_EQ(d.iSelectedTag, -1);
    EXPECT_EQ(d.MCInfo.uSampleRateIdx, 4u);
    EXPECT_EQ(d.MCInfo.uProfile, 1u);
    EXPECT_EQ(d.uImplicitConfig, 1u);
    EXPECT_EQ(d.uImplicitCPE, 0u);
    EXPECT_EQ(d.uResetOne[0] + d.uResetOne[1], 2u);
    EXPECT_EQ(d.MCInfo.uChannels + d.MCInfo.Channel[0].uPresent + d.ADTS.uId + d.uADTS, 0u);
}

TEST(AacHeader, AdtsParserResynchronisesOnceAByteLater)
{
    std::vector<uint8_t> shifted = {0x00};
    const std::vector<uint8_t> h = AdtsBytes(Adts{});
    shifted.insert(shifted.end(), h.begin(), h.end());
    VrAACDecoder_OnlyParsing &d = FreshState();
    VrInitBits_OnlyParsing(&d.Bits, shifted.data());
    EXPECT_EQ(get_adts_headerOnlyParsing(&d), 0);
    EXPECT_EQ(d.Bits.uProcessedBits, 64u);
    EXPECT_EQ(d.ADTS.uChannelConfig, 2u);

    shifted.insert(shifted.begin(), 0x00);
    VrInitBits_OnlyParsing(&d.Bits, shifted.data());
    EXPECT_EQ(get_adts_headerOnlyParsing(&d), -1);
    EXPECT_EQ(d.Bits.pCurrent, shifted.data() + 1);
}

TEST(AacHeader, HeaderlessKeepsCallerValues)
{
    const std::vector<uint8_t> raw = WithSlack({0x21, 0x10, 0x05, 0x00});
    EXPECT_EQ(Init(raw, 44100, 1), (InitResult{44100, 1, 1024, 0, 0, 0}));
    EXPECT_EQ(hhDecoder.LongInfo.puBandTops, VrTBL_sfb_48_1024_OnlyParsing);
    EXPECT_EQ(hhDecoder.ShortInfo.puBandTops, VrTBL_sfb_48_128_OnlyParsing);
    EXPECT_EQ(hhDecoder.Bits.pCurrent, raw.data());
    Init(raw, 22050, 2);
    EXPECT_EQ(hhDecoder.LongInfo.puBandTops, VrTBL_sfb_24_1024_OnlyParsing);
}

TEST(AacHeader, SampleRateIndexOfEveryRate)
{
    for (uint32_t i = 0; i < 12; ++i)
        EXPECT_EQ(get_samplerate_idxOnlyParsing(kRates[i]), i) << kRates[i];
    for (uint32_t rate : {0u, 7350u, 44101u, 192000u, 0xFFFFFFFFu})
        EXPECT_EQ(get_samplerate_idxOnlyParsing(rate), 4u) << rate;
}

// ------------------------------------------------------------------------------------------
// ADIF and program config elements.

// A program_config_element in a small notation, one token per element: fS2 / fC1 a front
// single channel or channel pair element with tag 2 or 1, sS / bC side and back elements, L an
// LFE, A an associated data element, c4 a coupling element with tag 4, M / T / X the mono,
// stereo and matrix mixdowns, #5 the element_instance_tag (default 0). Sampling index 3.
void PutPce(BitWriter &w, const std::string &notation)
{
    uint32_t tag = 0, lfe = 0, assoc = 0;
    std::vector<uint32_t> lists[3], cc; // front, side, back: is_cpe << 4 | tag
    bool mixdown[3] = {};
    for (size_t i = 0; i < notation.size(); ++i) {
        const char c = notation[i];
        const auto number = [&](size_t at) { return static_cast<uint32_t>(std::stoul(notation.substr(at))); };
        if (c == 'f' || c == 's' || c == 'b')
            lists[c == 'f' ? 0 : c == 's' ? 1 : 2].push_back((notation[i + 1] == 'C' ? 16 : 0) | number(i + 2));
        else if (c == 'c')
            cc.push_back(number(i + 1));
        else if (c == '#')
            tag = number(i + 1);
        lfe += c == 'L';
        assoc += c == 'A';
        mixdown[0] |= c == 'M';
        mixdown[1] |= c == 'T';
        mixdown[2] |= c == 'X';
    }
    w.Put(tag, 4).Put(1, 2).Put(3, 4);
    for (const auto &list : lists)
        w.Put(static_cast<uint32_t>(list.size()), 4);
    w.Put(lfe, 2).Put(assoc, 3).Put(static_cast<uint32_t>(cc.size()), 4);
    w.Put(mixdown[0], 1);
    if (mixdown[0])
        w.Put(1, 4);
    w.Put(mixdown[1], 1);
    if (mixdown[1])
        w.Put(2, 4);
    w.Put(mixdown[2], 1);
    if (mixdown[2])
        w.Put(1, 2).Put(1, 1);
    for (const auto &list : lists)
        for (uint32_t e : list)
            w.Put(e >> 4, 1).Put(e & 15, 4);
    for (uint32_t i = 0; i < lfe + assoc; ++i)
        w.Put(i, 4);
    for (uint32_t t : cc)
        w.Put(1, 1).Put(t, 4);
    w.Align().Put(3, 8).PutBytes({'p', 'c', 'e'}); // comment_field_data
}

std::vector<uint8_t> Adif(const std::vector<std::string> &pces, bool constantRate = false, bool copyright = false,
                          size_t *pBits = nullptr)
{
    BitWriter w;
    w.PutBytes({'A', 'D', 'I', 'F'}).Put(copyright, 1);
    if (copyright)
        w.PutBytes({'c', 'o', 'p', 'y', 'r', 'i', 'g', 'h', 't'});
    w.Put(0, 1).Put(0, 1).Put(constantRate ? 0 : 1, 1).Put(128000, 23);
    w.Put(static_cast<uint32_t>(pces.size() - 1), 4);
    for (const std::string &p : pces) {
        if (constantRate)
            w.Put(0xABCDE, 20); // adif_buffer_fullness
        PutPce(w, p);
    }
    if (pBits)
        *pBits = w.BitCount();
    w.PutBytes({0xAA, 0x55}); // start of the raw data
    return WithSlack(w.Bytes());
}

struct AdifCase {
    const char *name;
    std::vector<std::string> pces;
    uint32_t channels;  // reported channel value (0xFFFFFFFF: refused)
    int32_t adifResult; // of VrGet_ADIF_Header_OnlyParsing
};

class AdifPrograms : public ::testing::TestWithParam<AdifCase> {};

TEST_P(AdifPrograms, ChannelMapAcceptsOrRefuses)
{
    const AdifCase &c = GetParam();
    for (int variant = 0; variant < 4; ++variant) {
        const bool constantRate = variant & 1, copyright = variant & 2;
        SCOPED_TRACE(variant);
        size_t bits = 0;
        const std::vector<uint8_t> adif = Adif(c.pces, constantRate, copyright, &bits);
        const uint32_t expectedBits = static_cast<uint32_t>(bits);
        EXPECT_EQ(Init(adif, 8000, 1), (InitResult{48000, c.channels, c.channels << 10, 0, expectedBits, expectedBits}));
        const VrAACDecoder_OnlyParsing &d = hhDecoder;
        EXPECT_EQ(d.uADIF, 1u);
        EXPECT_EQ(d.iSelectedTag, c.pces[0].find("#5") == 0 ? 5 : 0);
        EXPECT_EQ(d.uImplicitConfig, c.adifResult > 0 ? 0u : 1u);
        EXPECT_EQ(d.ADIF.uBitstreamType, constantRate ? 0u : 1u);
        EXPECT_EQ(d.ADIF.uBitrate, 128000u);
        EXPECT_STREQ(reinterpret_cast<const char *>(d.ADIF.uAdifId), "ADIF");
        EXPECT_STREQ(reinterpret_cast<const char *>(d.ADIF.uCopyrightId), copyright ? "copyright" : "");
        EXPECT_EQ(d.LongInfo.puBandTops, VrTBL_sfb_48_1024_OnlyParsing);

        VrAACDecoder_OnlyParsing &again = FreshState();
        VrInitBits_OnlyParsing(&again.Bits, adif.data());
        EXPECT_EQ(VrGet_ADIF_Header_OnlyParsing(&again), c.adifResult);
    }
}

INSTANTIATE_TEST_SUITE_P(Programs, AdifPrograms,
                         ::testing::Values(AdifCase{"FrontSce", {"#5fS2"}, 1, 1},
                                           AdifCase{"FrontCpe", {"fC1"}, 2, 1},
                                           AdifCase{"TwoFrontSce", {"fS0fS1"}, 2, 1},
                                           AdifCase{"CouplingCounts", {"fC1AAc4c9"}, 4, 1},
                                           AdifCase{"SecondProgramSkipped", {"fC1", "#7fC0fC1"}, 2, 1},
                                           AdifCase{"TwoFrontCpe", {"fC0fC1"}, 0xFFFFFFFF, -1},
                                           AdifCase{"SceThenCpe", {"fS0fC1"}, 0xFFFFFFFF, -1},
                                           AdifCase{"Side", {"fS2sS3"}, 0xFFFFFFFF, -1},
                                           AdifCase{"Back", {"fS2bC3"}, 0xFFFFFFFF, -1},
                                           AdifCase{"Lfe", {"fC1L"}, 0xFFFFFFFF, -1},
                                           AdifCase{"MonoMixdown", {"fC1M"}, 0xFFFFFFFF, -1},
                                           AdifCase{"StereoMixdown", {"fC1T"}, 0xFFFFFFFF, -1},
                                           AdifCase{"MatrixMixdown", {"fC1X"}, 0xFFFFFFFF, -1}),
                         [](const auto &info) { return std::string(info.param.name); });

TEST(AacChannelMap, ProgramElementsFindTheirChannels)
{
    Init(Adif({"#3fS6fS9"}));
    VrAACDecoder_OnlyParsing &d = hhDecoder;
    VrMCInfo_OnlyParsing &m = d.MCInfo;
    EXPECT_EQ(m.Channel[0].uTag * 100 + m.Channel[1].uTag, 609u);
    EXPECT_EQ(m.Channel[0].uPairFlag + m.Channel[1].uPairFlag, 0u);
    EXPECT_EQ(chn_configOnlyParsing(&d, 0, 9, 0, &m), 1);
    EXPECT_EQ(chn_configOnlyParsing(&d, 0, 6, 0, &m), 0);
    EXPECT_EQ(chn_configOnlyParsing(&d, 1, 6, 0, &m), -1); // a pair with an SCE's tag
    EXPECT_EQ(m.iCouplingTags[VR_AAC_COUPLING_TAGS_OnlyParsing - 1], -1);
    EXPECT_EQ(m.Channel[0].iWindowInfoChannel, 0);
    EXPECT_EQ(chn_configOnlyParsing(&d, 0, 1, 1, &m), -1);
    EXPECT_EQ(m.Channel[0].iWindowInfoChannel, -1);

    // The saved attributes agree until a present channel changes its pairing.
    EXPECT_EQ(VrCheck_MC_Info_OnlyParsing(&d, &m, 0), 1);
    m.Channel[1].iPartner = 5;
    EXPECT_EQ(VrCheck_MC_Info_OnlyParsing(&d, &m, 0), 0);
    EXPECT_EQ(VrCheck_MC_Info_OnlyParsing(&d, &m, 1), 1);
    EXPECT_EQ(VrCheck_MC_Info_OnlyParsing(&d, &m, 0), 1);
    m.Channel[1].uPresent = 0;
    EXPECT_EQ(VrCheck_MC_Info_OnlyParsing(&d, &m, 0), 0);

    reset_mc_infoOnlyParsing(&d, &m); // leaves an entered program alone
    EXPECT_EQ(m.uChannels, 2u);

    Init(Adif({"fC4"}));
    EXPECT_EQ(m.Channel[0].uLeftFlag * 10 + m.Channel[1].uLeftFlag, 10u);
    EXPECT_EQ(m.Channel[0].iPartner * 10 + m.Channel[1].iPartner, 10);
    EXPECT_EQ(chn_configOnlyParsing(&d, 1, 4, 1, &m), 0);
    EXPECT_EQ(m.Channel[1].iWindowInfoChannel, 0); // common_window: the left channel's ics_info
    EXPECT_EQ(chn_configOnlyParsing(&d, 1, 4, 0, &m), 0);
    EXPECT_EQ(m.Channel[1].iWindowInfoChannel, 1);
}

struct ImplicitCase {
    const char *name;
    std::vector<uint32_t> ids;     // id_syn_ele of successive elements
    std::vector<int32_t> results;
    uint32_t frontSce;
};

class ImplicitConfig : public ::testing::TestWithParam<ImplicitCase> {};

TEST_P(ImplicitConfig, ElementsTakeTheNextChannels)
{
    const ImplicitCase &c = GetParam();
    VrAACDecoder_OnlyParsing &d = FreshState();
    for (size_t i = 0; i < c.ids.size(); ++i)
        EXPECT_EQ(chn_configOnlyParsing(&d, c.ids[i], static_cast<uint32_t>(i), 1, &d.MCInfo), c.results[i]) << i;
    EXPECT_EQ(d.MCInfo.uFrontSCE, c.frontSce);
    reset_mc_infoOnlyParsing(&d, &d.MCInfo);
    EXPECT_EQ(d.MCInfo.uChannels, 0u);
    EXPECT_EQ(d.MCInfo.uFrontSCE, 0u);
    EXPECT_EQ(d.MCInfo.Channel[0].uPresent + d.MCInfo.Channel[1].uPresent, 0u);
}

INSTANTIATE_TEST_SUITE_P(
    Elements, ImplicitConfig,
    ::testing::Values(ImplicitCase{"TwoSce", {0, 0, 0}, {0, 1, -1}, 2},
                      ImplicitCase{"Cpe", {1, 0}, {0, -1}, 0},
                      ImplicitCase{"SceThenCpe", {0, 1}, {0, -1}, 1},
                      ImplicitCase{"CouplingTakesNoChannel", {2, 5, 0, 2}, {0, 0, 0, 0}, 1}),
    [](const auto &info) { return std::string(info.param.name); });

TEST(AacChannelMap, ImplicitPairRecords)
{
    VrAACDecoder_OnlyParsing &d = FreshState();
    ASSERT_EQ(chn_configOnlyParsing(&d, 1, 12, 1, &d.MCInfo), 0);
    EXPECT_EQ(d.uImplicitCPE, 1u);
    const VrChannelInfo_OnlyParsing &l = d.MCInfo.Channel[0], &r = d.MCInfo.Channel[1];
    EXPECT_EQ(l.uTag + r.uTag, 24u);
    EXPECT_EQ(l.uLeftFlag * 10 + r.uLeftFlag, 10u);
    EXPECT_EQ(l.iPartner * 10 + r.iPartner, 10);
    EXPECT_EQ(r.iWindowInfoChannel, 0);
    EXPECT_EQ(r.uCommonWindow, 1u);
}

// ------------------------------------------------------------------------------------------
// Band layout.

class BandLayout : public ::testing::TestWithParam<uint32_t> {};

TEST_P(BandLayout, WindowRecordsFollowTheRateRow)
{
    const uint32_t index = GetParam();
    VrAACDecoder_OnlyParsing &d = FreshState();
    d.MCInfo.uSampleRateIdx = index;
    huffbookinitOnlyParsing(&d);
    const VrSampRateInfo_OnlyParsing &row = samp_rate_infoOnlyParsing[index];
    EXPECT_EQ(row.uSampleRate, kRates[index]);
    ASSERT_EQ(d.LongInfo.uBandsPerBlock, kLongBands[index]);
    ASSERT_EQ(d.ShortInfo.uBandsPerWindow, kShortBands[index]);
    EXPECT_EQ(d.LongInfo.uSectionBits, 5u);
    EXPECT_EQ(d.ShortInfo.uSectionBits, 3u);
    EXPECT_EQ(d.ShortInfo.puShortBandWidths, sfbwidth128OnlyParsing);
    EXPECT_EQ(d.LongInfo.puShortBandWidths, nullptr);
    if (kLongBands[index]) {
        EXPECT_EQ(d.LongInfo.uBlockBandTops[kLongBands[index] - 1], 1024u);
    }

    uint32_t sum = 0;
    for (uint32_t k = 0; k < 16; ++k)
        sum += sfbwidth128OnlyParsing[k];
    EXPECT_EQ(sum, kShortBands[index] ? 128u : 0u);
    const uint32_t n = kShortBands[index];
    for (uint32_t w = 0; w < 8 && n; ++w) {
        uint32_t top = 128 * w;
        for (uint32_t k = 0; k < n; ++k) {
            top += sfbwidth128OnlyParsing[k];
            ASSERT_EQ(d.ShortInfo.uBlockBandTops[w * n + k], top) << "window " << w << " band " << k;
        }
    }
}

INSTANTIATE_TEST_SUITE_P(Indices, BandLayout, ::testing::Range(0u, 16u));

// ------------------------------------------------------------------------------------------
// Perceptual noise substitution.

int32_t ReferenceExponent(const std::vector<int16_t> &v)
{
    int32_t e = -100;
    for (int16_t s : v) {
        const uint32_t m = static_cast<uint16_t>(s < 0 ? -(s + 1) : s);
        e = std::max(e, s == 0 ? -15 : static_cast<int32_t>(std::bit_width(m)) - 30);
    }
    return e;
}

TEST(AacNoise, BandsHaveUnitEnergyAndAdvanceTheSeed)
{
    for (int32_t seed0 : {0, 1, 0x12345678, -7}) {
        for (int32_t length = 4; length <= 96; length += 4) {
            SCOPED_TRACE(testing::Message() << "seed " << seed0 << " length " << length);
            std::vector<int16_t> v(length);
            int16_t exponent = 0;
            int32_t seed = seed0;
            gen_rand_vectorOnlyParsing(v.data(), &exponent, length, &seed);
            uint32_t expectedSeed = static_cast<uint32_t>(seed0);
            for (int32_t i = 0; i < length; ++i)
                expectedSeed = expectedSeed * 1664525u + 1013904223u;
            EXPECT_EQ(static_cast<uint32_t>(seed), expectedSeed);
            double energy = 0;
            for (int16_t s : v)
                energy += static_cast<double>(s) * s;
            // Normalised to 2^18 (a Q9 unit vector), within the rounding of 16-bit samples.
            EXPECT_NEAR(energy / 262144.0, 1.0, 0.03);
            EXPECT_EQ(exponent, ReferenceExponent(v));
        }
    }
}

TEST(AacNoise, EmptyBandOnlySetsTheExponent)
{
    int16_t exponent = 0;
    int32_t seed = 99;
    int16_t sample = 1234;
    gen_rand_vectorOnlyParsing(&sample, &exponent, 0, &seed);
    EXPECT_EQ(exponent, -100);
    EXPECT_EQ(seed, 99);
    EXPECT_EQ(sample, 1234);
}

} // namespace
