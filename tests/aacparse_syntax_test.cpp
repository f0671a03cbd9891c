// Raw data block syntax of the parse-only decoder: channel elements written field by field with
// the codebooks of tests/data (tests/aac_writer.hpp) and parsed back. A misread field shifts
// everything after it, so the consumed bit count is checked with the values.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include <vorcal/aacparse.h>

#include "aac_writer.hpp"

namespace {

using namespace vorcal::test;
using Dec = VrAACDecoder_OnlyParsing;

// hhDecoder reset and initialised headerless at a rate (band tables ready), reading w's bits.
struct Parse {
    std::vector<uint8_t> bytes;
    Dec &dec = hhDecoder;
    explicit Parse(const BitWriter &w, uint32_t rate = 48000) : bytes(w.Bytes())
    {
        bytes.resize(bytes.size() + 64, 0); // the reader has no end bound
        static const uint8_t kZero[8] = {};
        uint32_t r = rate, c = 2, f, s, a, h;
        VrAACSBRInfo(nullptr, 0, nullptr, nullptr, nullptr, nullptr, nullptr);
        VrAACDecInitOnlyParsing(&dec, kZero, &r, &c, &f, &s, &a, &h);
        VrInitBits_OnlyParsing(&dec.Bits, bytes.data());
    }
    uint32_t Bits() const { return dec.Bits.uProcessedBits; }
    std::vector<int> Lines(int ch, size_t n) const { return std::vector<int>(dec.iSpectrum[ch], dec.iSpectrum[ch] + n); }
};

// Long-window bands at 48 kHz that cover n lines.
unsigned BandsFor(size_t n)
{
    unsigned b = 0;
    while (VrTBL_sfb_48_1024_OnlyParsing[b] < n)
        ++b;
    return b + 1;
}

// A single channel element of one long window: one section of codebook cb over the lines
// (zero-padded to a band end), scale factor differences 0.
BitWriter Sce(int cb, std::vector<int> &lines, unsigned tag = 0)
{
    const unsigned bands = BandsFor(lines.size());
    lines.resize(VrTBL_sfb_48_1024_OnlyParsing[bands - 1], 0);
    BitWriter w;
    w.Put(tag, 4).Put(100, 8);
    PutLongInfo(w, bands);
    PutSections(w, {{unsigned(cb), bands}});
    PutZeroScalefactors(w, bands);
    PutNoTools(w);
    PutLines(w, cb, lines);
    return w;
}

// Every index of every codebook in order; in the unsigned books every other nonzero value is
// negative; in codebook 11 the 16s become escapes of growing length, 9 leading ones included.
TEST(AacSpectral, EveryCodebookWithSignsAndEscapes)
{
    const int escapes[] = {16, 17, 31, 32, 100, 1000, 8191, -8192, 16383};
    for (int cb = 1; cb <= 11; ++cb) {
        SCOPED_TRACE(cb);
        std::vector<int> lines;
        int flip = 0, esc = 0;
        for (const auto &[key, values] : AacCodebooks::Get().values)
            for (int v : key.first != cb ? std::vector<int>{} : values) {
                if (!SignedBook(cb) && v != 0 && (flip++ & 1))
                    v = -v;
                lines.push_back(v == 16 || v == -16 ? escapes[esc++ % std::size(escapes)] : v);
            }
        const BitWriter w = Sce(cb, lines);
        Parse p(w);
        EXPECT_EQ(single_channel_elementOnlyParsing(&p.dec, &p.dec.MCInfo), 0u);
        EXPECT_EQ(p.Bits(), w.BitCount());
        EXPECT_EQ(p.Lines(0, lines.size()), lines);
    }
    // Any number of ones: 20 of them make 24 bits, read in two pieces; other values read nothing.
    BitWriter w;
    w.Put(0xFFFFF, 20).PutBit(0).Put(0xABCDE1, 24);
    Parse p(w);
    EXPECT_EQ(getescapeOnlyParsing(&p.dec, 5), 5u);
    EXPECT_EQ(int32_t(getescapeOnlyParsing(&p.dec, -16)), -((1 << 24) + 0xABCDE1));
    EXPECT_EQ(p.Bits(), 45u);
}

// A program config element with one front single channel element of tag 1 (sampling index 3).
void PutPce(BitWriter &w)
{
    w.Put(0, 4).Put(1, 2).Put(3, 4).Put(1, 4).Put(0, 4 + 4 + 2 + 3 + 4 + 3).Put(1, 5);
    w.Align().Put(0, 8);
}

struct ElementCase {
    std::string name;
    std::function<void(BitWriter &)> write;
    std::function<uint32_t(Dec &)> run;
    uint32_t result;
    int bits;                             // -1: everything written
    std::function<void(const Dec &)> check = nullptr;
};

uint32_t RunSce(Dec &d) { return single_channel_elementOnlyParsing(&d, &d.MCInfo); }
uint32_t RunCpe(Dec &d) { return channel_pair_elementOnlyParsing(&d, &d.MCInfo); }
uint32_t RunLfe(Dec &d) { return lfe_channel_elementOnlyParsing(&d, &d.MCInfo); }
uint32_t AfterPce(Dec &d, uint32_t (*run)(Dec &)) { VrGet_ProgamConfig_OnlyParsing(&d); return run(d); }

// An individual channel stream of one long window, max_sfb 1, one codebook 1 band of zeros:
// the fields up to the tools, then the spectral data.
void PutSmallHead(BitWriter &w, bool info = true)
{
    w.Put(90, 8);
    if (info)
        PutLongInfo(w, 1);
    PutSections(w, {{1, 1}});
    PutZeroScalefactors(w, 1);
}
void PutZeroBand(BitWriter &w) { PutLines(w, 1, std::vector<int>(4)); }
void PutSmallIcs(BitWriter &w, bool info = true)
{
    PutSmallHead(w, info);
    PutNoTools(w);
    PutZeroBand(w);
}

TEST(AacSyntax, ElementResultsAndEdgeCases)
{
    std::vector<uint8_t> dataBytes(265);
    for (size_t i = 0; i < dataBytes.size(); ++i)
        dataBytes[i] = uint8_t(i * 7 + 1);
    static uint8_t buffer[512];
    static uint32_t tag, count;
    const ElementCase cases[] = {
        // Under a program config element an unknown tag is refused before anything else is read.
        {"SCE unknown tag", [](BitWriter &w) { PutPce(w); w.Put(2, 4).Put(0xFFFF, 16); },
         [](Dec &d) { return AfterPce(d, RunSce); }, 3, 48 + 4},
        {"LFE", [](BitWriter &w) { w.Put(0, 4); PutSmallIcs(w); }, RunLfe, 1, -1},
        {"LFE unknown tag", [](BitWriter &w) { PutPce(w); w.Put(3, 4); }, [](Dec &d) { return AfterPce(d, RunLfe); }, 0xFFFFFFFF, -1},
        // common_window with ms_mask_present 2: every band of the window is M/S, no mask bits.
        {"CPE ms_mask_present 2", [](BitWriter &w) { PutLongInfo(w.Put(0, 4).Put(1, 1), 1); PutSmallIcs(w.Put(2, 2), false); PutSmallIcs(w, false); },
         RunCpe, 0, -1, [](const Dec &d) { EXPECT_EQ(std::count(d.uMSMask, d.uMSMask + 49, 1) + std::count(d.uMSMask + 49, d.uMSMask + 128, 0), 128); }},
        // ms_mask_present 1 in two window groups: max_sfb (2) bits per group, the rest cleared.
        {"CPE short windows ms_mask_present 1",
         [](BitWriter &w) {
             w.Put(0, 4).Put(1, 1);
             PutShortInfo(w, 2, 0b1110111); // windows 0-3 and 4-7
             w.Put(1, 2).Put(0b10, 2).Put(0b01, 2);
             for (int ch = 0; ch < 2; ++ch) {
                 w.Put(90, 8);
                 PutSections(w, {{1, 2}}, 3);
                 PutSections(w, {{0, 2}}, 3);
                 PutZeroScalefactors(w, 2);
                 PutNoTools(w);
                 PutLines(w, 1, std::vector<int>(32)); // two 4-line bands of a 4-window group
             }
         },
         RunCpe, 0, -1,
         [](const Dec &d) {
             EXPECT_EQ(std::vector<int>(d.uMSMask, d.uMSMask + 16), (std::vector<int>{1, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 1}));
             EXPECT_EQ(std::make_pair(d.ShortInfo.uGroups, d.ShortInfo.uGroupLengths[0]), std::make_pair(2u, uint16_t(4)));
             EXPECT_EQ(d.ICS[1].Section[1].uEndBand, 14u + 2); // group 1 starts at band 14 (48 kHz)
         }},
        {"CPE second pair", [](BitWriter &w) { w.Put(0, 4).Put(0, 1); }, [](Dec &d) { d.MCInfo.uChannels = 2; return RunCpe(d); }, 5, 5},
        {"CPE first stream fails", [](BitWriter &w) { w.Put(0, 4).Put(0, 1).Put(0, 8); PutLongInfo(w, 63); }, RunCpe, 7, -1},
        {"CPE second stream fails",
         [](BitWriter &w) { w.Put(0, 4).Put(0, 1); PutSmallIcs(w); w.Put(0, 8); PutLongInfo(w, 50); },
         RunCpe, 8, -1},
        // A rate with no band information: ics_info fails.
        {"CPE without bands", [](BitWriter &w) { w.Put(0, 4).Put(1, 1).Put(0, 4); },
         [](Dec &d) { d.MCInfo.uSampleRateIdx = 13; huffbookinitOnlyParsing(&d); return RunCpe(d); }, 6, -1},
        // sect_len 31 then 3: one section of 34 bands, then codebook 0 to max_sfb 40.
        {"sect_len 31 + 3",
         [](BitWriter &w) {
             PutLongInfo(w.Put(0, 4).Put(100, 8), 40);
             PutSections(w, {{1, 34}, {0, 6}});
             PutNoTools(PutZeros(w, 34)); // 34 scale factor differences of 0
             PutLines(w, 1, std::vector<int>(VrTBL_sfb_48_1024_OnlyParsing[33]));
         },
         RunSce, 0, -1,
         [](const Dec &d) {
             EXPECT_EQ(std::make_tuple(d.ICS[0].uSections, d.ICS[0].Section[0].uEndBand, d.ICS[0].Section[1].uEndBand),
                       std::make_tuple(2u, 34u, 40u));
             EXPECT_EQ(std::make_pair(d.ICS[0].uBandCodebook[33], d.ICS[0].uBandCodebook[34]), std::make_pair(uint8_t(1), uint8_t(0)));
         }},
        {"section past max_sfb", [](BitWriter &w) { w.Put(0, 4).Put(0, 8); PutLongInfo(w, 2); PutSections(w, {{1, 3}}); }, RunSce, 4, -1},
        {"max_sfb beyond the bands", [](BitWriter &w) { w.Put(0, 4).Put(0, 8); PutLongInfo(w, 50); }, RunSce, 4, -1},
        {"reserved codebook", [](BitWriter &w) { w.Put(0, 4).Put(0, 8); PutLongInfo(w, 1); PutSections(w, {{12, 1}}); }, RunSce, 4, -1},
        {"scale factor above 255",
         [](BitWriter &w) { w.Put(0, 4).Put(250, 8); PutLongInfo(w, 1); PutSections(w, {{1, 1}}); PutScalefactorDiff(w, 6); },
         RunSce, 4, -1},
        {"pulse data in short windows",
         [](BitWriter &w) { w.Put(0, 4).Put(0, 8); PutShortInfo(w, 0, 0x7F); w.Put(1, 1); }, RunSce, 4, -1},
        {"gain control", [](BitWriter &w) { w.Put(0, 4); PutSmallHead(w); w.Put(0b001, 3); }, RunSce, 4, -1},
        // pulse_data: two pulses from band 2 (line 8), offsets 3 and 2, amplitudes 5 and 15.
        {"pulses",
         [](BitWriter &w) {
             PutLongInfo(w.Put(0, 4).Put(100, 8), 4);
             PutSections(w, {{5, 4}});
             w.Put(0, 4).Put(1, 1).Put(1, 2).Put(2, 6).Put(3, 5).Put(5, 4).Put(2, 5).Put(15, 4).Put(0, 2);
             PutLines(w, 5, {0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, -3, 0, 2, 0, 0});
         },
         RunSce, 0, -1, [](const Dec &d) { EXPECT_EQ(std::vector<int>(d.iSpectrum[0] + 8, d.iSpectrum[0] + 14), (std::vector<int>{0, 0, 0, -8, 0, 17})); }},
        // tns_data of a long window: two filters, coef_res 1 (4 bits), compressed to 3 bits in the second.
        {"TNS",
         [](BitWriter &w) {
             PutSmallHead(w.Put(0, 4));
             w.Put(0, 1).Put(1, 1).Put(2, 2).Put(1, 1);
             w.Put(20, 6).Put(3, 5).Put(1, 1).Put(0, 1).Put(0x7, 4).Put(0x8, 4).Put(0xF, 4);
             w.Put(10, 6).Put(2, 5).Put(0, 1).Put(1, 1).Put(0x3, 3).Put(0x4, 3);
             PutZeroBand(w.Put(0, 1));
         },
         RunSce, 0, -1,
         [](const Dec &d) {
             const VrTNSWindow_OnlyParsing &t = d.TNS[0].Window[0];
             EXPECT_EQ(std::make_tuple(t.uFilters, t.Filter[0].uLength, t.Filter[0].uDirection, t.Filter[1].uCoefCompress),
                       std::make_tuple(2u, 20u, 1u, 1u));
             EXPECT_EQ((std::vector<int>{t.Filter[0].iCoef[0], t.Filter[0].iCoef[1], t.Filter[0].iCoef[2], t.Filter[1].iCoef[0], t.Filter[1].iCoef[1]}),
                       (std::vector<int>{7, -8, -1, 3, -4}));
         }},
        // Main profile prediction: predictor_reset with its group, then min(max_sfb, 40) bits.
        {"predictor data", [](BitWriter &w) { w.Put(0, 1).Put(0, 2).Put(0, 1).Put(45, 6).Put(1, 1).Put(1, 1).Put(7, 5); PutZeros(w, 40); },
         [](Dec &d) { return get_ics_infoOnlyParsing(&d, &d.ICS[0], 0, 0, 0); }, 1, -1},
        // fill_element: count 15 and esc_count 0 make 14 bytes; an SBR payload is skipped whole.
        {"fill 15 + 0", [](BitWriter &w) { w.Put(15, 4).Put(0, 8).Put(13, 4).Put(0xABC, 12).PutBytes(std::vector<uint8_t>(12, 0xFF)); },
         [](Dec &d) { return getfillOnlyParsing(&d, buffer); }, 14, 4 + 8 + 8 * 14},
        {"fill data", [](BitWriter &w) { w.Put(4, 4).Put(1, 4).Put(0, 4).PutBytes({9, 8, 7}); },
         [](Dec &d) { return getfillOnlyParsing(&d, buffer); }, 4, -1,
         [](const Dec &) { EXPECT_EQ(std::vector<int>(buffer, buffer + 3), (std::vector<int>{9, 8, 7})); }},
        // data_stream_element: count 255 and esc_count 10 copy 265 bytes after the alignment.
        {"data stream 255 + 10", [&](BitWriter &w) { w.Put(3, 4).Put(1, 1).Put(255, 8).Put(10, 8).Align().PutBytes(dataBytes); },
         [](Dec &d) { return getdataOnlyParsing(&d, &tag, &count, buffer); }, dataBytes.back(), -1,
         [&](const Dec &) {
             EXPECT_EQ(std::make_pair(tag, count), std::make_pair(3u, 265u));
             EXPECT_EQ(std::vector<uint8_t>(buffer, buffer + 265), dataBytes);
         }},
    };
    for (const ElementCase &c : cases) {
        SCOPED_TRACE(c.name);
        BitWriter w;
        c.write(w);
        Parse p(w);
        EXPECT_EQ(c.run(p.dec), c.result);
        EXPECT_EQ(p.Bits(), c.bits < 0 ? w.BitCount() : size_t(c.bits));
        if (c.check)
            c.check(p.dec);
    }
}

// Scale factor data by codebook: the one-bit code, noise energy (9 raw bits first, then
// differences), intensity positions, and what the M/S mask does to noise and intensity bands.
TEST(AacSyntax, ScaleFactorsNoiseAndIntensity)
{
    BitWriter w;
    PutScalefactorDiff(w, 0);
    PutScalefactorDiff(w, -7);
    w.Put(256 + 5, 9);
    PutScalefactorDiff(w, -2);
    PutScalefactorDiff(w, 60);
    PutScalefactorDiff(w, -60);
    Parse p(w);
    VrICS_OnlyParsing &ics = p.dec.ICS[0];
    ics.uWindowSequence = 0;
    ics.uMaxSfb = 6;
    ics.uSections = 3;
    ics.Section[0] = {1, 2};
    ics.Section[1] = {13, 4};
    ics.Section[2] = {15, 6};
    p.dec.uMSMask[3] = p.dec.uMSMask[5] = 1;
    EXPECT_EQ(scale_factor_dataOnlyParsing(&p.dec, &ics, 0, 100), 1u);
    EXPECT_EQ(p.Bits(), w.BitCount());
    EXPECT_EQ(std::vector<int>(p.dec.iScaleFactors[0], p.dec.iScaleFactors[0] + 6), (std::vector<int>{100, 93, 15, 13, 60, 0}));
    EXPECT_EQ(std::make_tuple(ics.Section[1].uCodebook, p.dec.uMSMask[3], p.dec.uMSMask[5], p.dec.iBandExponents[0][5]),
              std::make_tuple(113u, uint8_t(0), uint8_t(0), int16_t(-1)));
    // The one-bit code alone.
    ics.uSections = 1;
    ics.Section[0] = {1, 1};
    ics.uMaxSfb = 1;
    VrInitBits_OnlyParsing(&p.dec.Bits, p.bytes.data());
    EXPECT_EQ(scale_factor_dataOnlyParsing(&p.dec, &ics, 0, 77), 1u);
    EXPECT_EQ(std::make_pair(p.Bits(), int(p.dec.iScaleFactors[0][0])), std::make_pair(1u, 77));
}

} // namespace
