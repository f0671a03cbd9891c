// Parse-only decoder stream headers: ADTS with and without CRC at every sampling index and
// channel configuration, ADIF programs the channel map accepts and refuses, headerless streams.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <string>
#include <tuple>
#include <vector>

#include <vorcal/aacparse.h>

#include "adts_header.hpp"

namespace {

using vorcal::test::BitWriter;
using vorcal::test::kAdtsRates;

constexpr uint32_t kLongBands[16] = {41, 41, 47, 49, 49, 51, 47, 47, 43, 43, 43, 40};
constexpr uint32_t kShortBands[16] = {12, 12, 12, 14, 14, 14, 15, 15, 15, 15, 15, 15};

// The reader fetches four bytes at a time and never checks an end: every buffer gets slack.
std::vector<uint8_t> WithSlack(std::vector<uint8_t> bytes)
{
    bytes.resize(bytes.size() + 8, 0);
    return bytes;
}

// Resets hhDecoder as the detection entry does (a null frame stops right after the reset).
VrAACDecoder_OnlyParsing &FreshState()
{
    VrAACSBRInfo(nullptr, 0, nullptr, nullptr, nullptr, nullptr, nullptr);
    return hhDecoder;
}

// Rate, channels, frame samples, SBR, aligned and header bits from VrAACDecInitOnlyParsing.
using Init = std::tuple<uint32_t, uint32_t, uint32_t, uint32_t, uint32_t, uint32_t>;
Init RunInit(const std::vector<uint8_t> &buf, uint32_t rate = 0, uint32_t channels = 0)
{
    Init r{rate, channels, 77, 77, 77, 77};
    auto &[a, b, c, d, e, f] = r;
    EXPECT_EQ(VrAACDecInitOnlyParsing(&FreshState(), buf.data(), &a, &b, &c, &d, &e, &f), 0);
    return r;
}

std::vector<uint8_t> Adts(uint32_t index, uint32_t channels, bool crc, uint32_t frameLength,
                          uint32_t id = 0)
{
    BitWriter w;
    w.Put(0xFFF, 12).Put(id, 1).Put(0, 2).Put(!crc, 1).Put(1, 2).Put(index, 4).Put(0, 1);
    w.Put(channels, 3);
    w.Put(0, 4).Put(frameLength, 13).Put(0x7FF, 11).Put(0, 2).Put(0xBEEF, crc ? 16 : 0);
    return WithSlack(w.Bytes());
}

TEST(AacHeader, AdtsAtEveryIndexAndChannelConfiguration)
{
    for (uint32_t index = 0; index < 16; ++index)
        for (uint32_t channels = 0; channels < 8; ++channels)
            for (bool crc : {false, true}) {
                SCOPED_TRACE(testing::Message()
                             << "index " << index << " channels " << channels << " crc " << crc);
                const std::vector<uint8_t> frame = Adts(index, channels, crc, 100 + channels);
                std::vector<uint32_t> o(5, 1);
                ASSERT_EQ(VrAACSBRInfo(frame.data(), 0, &o[0], &o[1], &o[2], &o[3], &o[4]), 0u);
                const uint32_t bits = crc ? 72 : 56;
                const uint32_t rate = index < 12 ? kAdtsRates[index] : 0;
                EXPECT_EQ(o, (std::vector<uint32_t>{rate, channels, 0, bits, bits}));
                // Band layout of the rate row: long bands end at 1024, eight short windows at 128
                // each.
                const VrAACDecoder_OnlyParsing &d = hhDecoder;
                const uint32_t longBands = kLongBands[index], shortBands = kShortBands[index];
                ASSERT_EQ(std::make_tuple(d.uADTS, d.uADIF, d.MCInfo.uSampleRateIdx,
                                          d.ADTS.uFrameLength, d.LongInfo.uBandsPerWindow,
                                          d.ShortInfo.uBandsPerBlock),
                          std::make_tuple(1u, 0u, index, 100 + channels, longBands,
                                          8 * shortBands));
                for (uint32_t w = 1; w <= 8 && kShortBands[index]; ++w)
                    ASSERT_EQ(d.ShortInfo.uBlockBandTops[w * kShortBands[index] - 1], 128 * w);
                EXPECT_TRUE(!longBands || d.LongInfo.uBlockBandTops[longBands - 1] == 1024);
            }
}

TEST(AacHeader, DocumentedHeadersResyncRefusalsAndHeaderless)
{
    EXPECT_EQ(RunInit(WithSlack({0xFF, 0xF1, 0x50, 0x80, 0x02, 0x1F, 0xFC})),
              Init(44100, 2, 2048, 0, 56, 56));
    EXPECT_EQ(std::tie(hhDecoder.uMPEG4, hhDecoder.MCInfo.uProfile, hhDecoder.ADTS.uFrameLength),
              std::tuple(1u, 1u, 16u));
    EXPECT_EQ(RunInit(WithSlack({0xFF, 0xF0, 0x50, 0x80, 0x02, 0x1F, 0xFC, 0x12, 0x34})),
              Init(44100, 2, 2048, 0, 72, 72));
    EXPECT_EQ(RunInit(Adts(4, 0, false, 0x1FF, 1)), Init(44100, 0, 0, 0, 56, 56));
    EXPECT_EQ(hhDecoder.uMPEG4, 0u);

    // One byte of garbage is skipped; two are not.
    for (uint32_t skip : {1u, 2u}) {
        std::vector<uint8_t> shifted = Adts(4, 2, false, 0x1FF);
        shifted.insert(shifted.begin(), skip, 0);
        VrInitBits_OnlyParsing(&FreshState().Bits, shifted.data());
        const int32_t result = get_adts_headerOnlyParsing(&hhDecoder);
        EXPECT_EQ((std::tuple{result, hhDecoder.Bits.uProcessedBits}),
                  skip == 1 ? std::tuple(0, 64u) : std::tuple(-1, 8u)); // stopped a byte on
    }

    // The detection entry needs the sync word (and a buffer) and writes nothing without it.
    std::vector<uint32_t> o = {11, 12, 13, 14, 15};
    const std::vector<uint8_t> noSync = WithSlack({0xFF, 0xE1});
    EXPECT_EQ(VrAACSBRInfo(noSync.data(), 16, &o[0], &o[1], &o[2], &o[3], &o[4]), 9u);
    EXPECT_EQ(VrAACSBRInfo(nullptr, 16, &o[0], &o[1], &o[2], &o[3], &o[4]), 9u);
    EXPECT_EQ(o, (std::vector<uint32_t>{11, 12, 13, 14, 15}));
    // Headerless: the caller's values stand, the rate picks the band tables.
    const std::vector<uint8_t> raw = WithSlack({0x21, 0x10, 0x05, 0x00});
    EXPECT_EQ(RunInit(raw, 44100, 1), Init(44100, 1, 1024, 0, 0, 0));
    EXPECT_EQ(hhDecoder.LongInfo.puBandTops, VrTBL_sfb_48_1024_OnlyParsing);
    EXPECT_EQ(hhDecoder.Bits.pCurrent, raw.data());
    RunInit(raw, 22050, 2);
    EXPECT_EQ(hhDecoder.LongInfo.puBandTops, VrTBL_sfb_24_1024_OnlyParsing);
    EXPECT_EQ(get_samplerate_idxOnlyParsing(7350), 4u); // unknown rates take index 4
}

// A program_config_element at sampling index 3 in a small notation, one token per element:
// fS2 / fC1 a front single channel or channel pair element with tag 2 or 1, sS / bC side and
// back elements, L an LFE, A associated data, c4 a coupling element with tag 4, M / T / X the
// mono, stereo and matrix mixdowns, #5 the element_instance_tag (default 0).
void PutPce(BitWriter &w, const std::string &s)
{
    std::vector<uint32_t> lists[3], cc; // front, side, back: is_cpe << 4 | tag
    const auto count = [&](char c) { return uint32_t(std::count(s.begin(), s.end(), c)); };
    for (size_t i = 0; i < s.size(); ++i) {
        const std::string at = s.substr(i + 1);
        if (s[i] == 'f' || s[i] == 's' || s[i] == 'b')
            lists[s[i] == 'f' ? 0 : s[i] == 's' ? 1 : 2].push_back((at[0] == 'C' ? 16 : 0) |
                                                                   std::stoul(at.substr(1)));
        else if (s[i] == 'c')
            cc.push_back(std::stoul(at));
    }
    w.Put(s[0] == '#' ? std::stoul(s.substr(1)) : 0, 4).Put(1, 2).Put(3, 4);
    for (const auto &list : lists)
        w.Put(uint32_t(list.size()), 4);
    w.Put(count('L'), 2).Put(count('A'), 3).Put(uint32_t(cc.size()), 4);
    w.Put(count('M'), 1).Put(1, 4 * count('M')).Put(count('T'), 1).Put(2, 4 * count('T'));
    w.Put(count('X'), 1).Put(3, 3 * count('X'));
    for (const auto &list : lists)
        for (uint32_t e : list)
            w.Put(e, 5);
    w.Put(0, 4 * (count('L') + count('A')));
    for (uint32_t t : cc)
        w.Put(16 | t, 5);
    w.Align().Put(3, 8).PutBytes({'p', 'c', 'e'}); // comment_field_data
}

// Also reports the bits of the header and its program config elements.
std::vector<uint8_t> Adif(const std::vector<std::string> &pces, bool constantRate, bool copyright,
                          uint32_t &bits)
{
    BitWriter w;
    w.PutBytes({'A', 'D', 'I', 'F'}).Put(copyright, 1);
    if (copyright)
        w.PutBytes({'c', 'o', 'p', 'y', 'r', 'i', 'g', 'h', 't'});
    w.Put(0, 2).Put(!constantRate, 1).Put(128000, 23).Put(uint32_t(pces.size() - 1), 4);
    for (const std::string &p : pces) {
        w.Put(0xABCDE, constantRate ? 20 : 0); // adif_buffer_fullness
        PutPce(w, p);
    }
    bits = uint32_t(w.BitCount());
    w.PutBytes({0xAA, 0x55}); // start of the raw data
    return WithSlack(w.Bytes());
}

TEST(AacHeader, AdifProgramsAcceptedOrRefused)
{
    const struct {
        std::vector<std::string> pces;
        uint32_t channels; // 0xFFFFFFFF: refused
    } cases[] = {{{"#5fS2"}, 1},     {{"fC1"}, 2},      {{"fS0fS1"}, 2},   {{"fC1AAc4c9"}, 4},
                 {{"fC1", "#7fC0fC1"}, 2},               {{"fC0fC1"}, ~0u}, {{"fS0fC1"}, ~0u},
                 {{"fS2sS3"}, ~0u},  {{"fS2bC3"}, ~0u}, {{"fC1L"}, ~0u},   {{"fC1M"}, ~0u},
                 {{"fC1T"}, ~0u},    {{"fC1X"}, ~0u}};
    for (const auto &c : cases)
        for (int variant = 0; variant < 4; ++variant) {
            SCOPED_TRACE(testing::Message() << c.pces[0] << " variant " << variant);
            uint32_t bits = 0;
            const std::vector<uint8_t> adif = Adif(c.pces, variant & 1, variant & 2, bits);
            EXPECT_EQ(RunInit(adif, 8000, 1),
                      Init(48000, c.channels, c.channels << 10, 0, bits, bits));
            const VrAACDecoder_OnlyParsing &d = hhDecoder;
            EXPECT_EQ(std::make_tuple(d.uADIF, d.iSelectedTag, d.uImplicitConfig,
                                      d.ADIF.uBitstreamType, d.ADIF.uBitrate),
                      std::make_tuple(1u, c.pces[0][0] == '#' ? 5 : 0, c.channels == ~0u ? 1u : 0u,
                                      variant & 1 ? 0u : 1u, 128000u));
            EXPECT_STREQ(reinterpret_cast<const char *>(d.ADIF.uCopyrightId),
                         variant & 2 ? "copyright" : "");
            VrInitBits_OnlyParsing(&FreshState().Bits, adif.data());
            EXPECT_EQ(VrGet_ADIF_Header_OnlyParsing(&hhDecoder), c.channels == ~0u ? -1 : 1);
        }
}

// The right channel of a pair reads the left channel's ics_info exactly when common_window is
// set, under a program ("fC1") and under the implicit configuration; an element that no
// program channel carries marks channel 0 with -1 (common_window) or 0.
TEST(AacChannelMap, CommonWindowSharesTheLeftWindowInfo)
{
    VrAACDecoder_OnlyParsing &d = hhDecoder;
    for (uint32_t common : {0u, 1u}) {
        SCOPED_TRACE(common);
        uint32_t bits = 0;
        RunInit(Adif({"fC1"}, true, false, bits), 8000, 1);
        EXPECT_EQ(chn_configOnlyParsing(&d, 1, 1, common, &d.MCInfo), 0);
        EXPECT_EQ(d.MCInfo.Channel[1].iWindowInfoChannel, common ? 0 : 1);
        EXPECT_EQ(chn_configOnlyParsing(&d, 1, 2, common, &d.MCInfo), -1);
        EXPECT_EQ(d.MCInfo.Channel[0].iWindowInfoChannel, common ? -1 : 0);
        RunInit(WithSlack({0, 0}), 44100, 2); // headerless
        EXPECT_EQ(chn_configOnlyParsing(&d, 1, 0, common, &d.MCInfo), 0);
        EXPECT_EQ(d.MCInfo.Channel[1].iWindowInfoChannel, common ? 0 : 1);
    }
}

} // namespace
