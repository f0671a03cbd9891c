// SBR extension parsing: hand-built sbr_extension_data() payloads, written field by field with
// the codebooks of aacparse/data/sbr_huffman.tsv, parsed back (a misread field shifts what
// follows, so the consumed bit count is checked throughout). The decoding trees are checked
// against the same codebooks by their generator (test generated_tables).
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <map>
#include <memory>
#include <sstream>
#include <string>
#include <tuple>
#include <vector>

#include <vorcal/aacparse.h>
#include <vorcal/audio_tools.h>
#include <vorcal/vorsal.h>

#include "aac_writer.hpp"
#include "adts_header.hpp"

namespace {

using namespace vorcal::test;
using Fields = std::vector<std::pair<uint32_t, unsigned>>; // value, width
using Codebook = std::map<int, Code>;                      // value -> codeword, length
using V = std::vector<int>;

const std::map<std::string, Codebook> &Codebooks()
{
    static const auto books = [] {
        std::map<std::string, Codebook> out;
        std::string table, hex;
        int index = 0, value = 0, length = 0;
        for (const std::string &line : TableLines("sbr_huffman.tsv"))
            if (std::istringstream row(line); row >> table >> index >> value >> length >> hex)
                out[table][value] = CodeOf(hex, length);
        return out;
    }();
    return books;
}

void PutFields(BitWriter &w, const Fields &fields)
{
    for (auto [value, bits] : fields)
        w.Put(value, bits);
}
void PutCodes(BitWriter &w, const char *table, const std::vector<int> &values)
{
    for (int value : values)
        w.Put(Codebooks().at(table).at(value).first, Codebooks().at(table).at(value).second);
}

// Result and bits consumed, parsed from a zero-padded copy (the reader has no end bound).
std::pair<int32_t, uint32_t> Parse(const BitWriter &w, VrSBRState_OnlyParsing &sbr,
                                   uint32_t elementId)
{
    std::vector<uint8_t> bytes = w.Bytes();
    bytes.resize(bytes.size() + 64, 0);
    VrBitReader_OnlyParsing reader{};
    VrInitBits_OnlyParsing(&reader, bytes.data());
    const int32_t result = sbr_extension_dataOnlyParsing(&reader, &sbr, elementId);
    return {result, VrGetProcessedBits_OnlyParsing(&reader)};
}
template <typename T>
std::vector<int> Row(const T *values, int n)
{
    return std::vector<int>(values, values + n);
}
std::pair<int32_t, uint32_t> All(int32_t result, const BitWriter &w)
{
    return {result, uint32_t(w.BitCount())};
}

using Parser = std::unique_ptr<CALAACParser, decltype(&vorCALTools_AAC_DestroyParser)>;
Parser NewParser()
{
    return Parser(vorCALTools_AAC_CreateParser(nullptr, 0), vorCALTools_AAC_DestroyParser);
}

VrSBRState_OnlyParsing Fresh(uint32_t rate)
{
    VrSBRState_OnlyParsing s{};
    sbrDecodeInitOnlyParsing(nullptr, &s, rate);
    return s;
}

// Extension type 13 (SBR, 14 with CRC) and an sbr_header with bs_extra_1 and no bs_extra_2.
void PutHeader(BitWriter &w, uint32_t ampRes, uint32_t start, uint32_t stop, uint32_t xover,
               uint32_t freqScale, uint32_t alterScale, uint32_t noiseBands, uint32_t type = 13)
{
    w.Put(type, 4).Put(0x3FF, type == 14 ? 10 : 0).Put(1, 1); // bs_sbr_crc_bits, bs_header_flag
    w.Put(ampRes, 1).Put(start, 4).Put(stop, 4).Put(xover, 3).Put(0, 2).Put(1, 1).Put(0, 1);
    w.Put(freqScale, 2).Put(alterScale, 1).Put(noiseBands, 2);
}

// 44100 Hz, bs_start_freq 5, bs_stop_freq 0, linear bands without alteration, bs_noise_bands 3:
// k0 = 12 + 2 = 14, k2 = 23; eight bands of width 1, the last widened by the one band left:
// master 14..21, 23; low 14 16 18 20 23; noise bands round(3 log2(23/14)) = 2: 14 18 23.
constexpr uint32_t kRate = 44100;
constexpr int kHigh = 8, kLow = 4, kNoiseBands = 2;
void PutLinearHeader(BitWriter &w, uint32_t ampRes = 1) { PutHeader(w, ampRes, 5, 0, 0, 0, 0, 3); }

TEST(SbrBands, LinearAndLogarithmicTables)
{
    BitWriter w;
    // bs_xover_band 1: the high table starts at kx = 15 and has seven bands, an odd count, so
    // the low table takes high borders 0, 1, 3, 5, 7 (2k - 1); round(3 log2(23/15)) = 2 noise
    // bands over the four low ones.
    PutHeader(w, 1, 5, 0, 1, 0, 0, 3);
    VrSBRState_OnlyParsing sbr = Fresh(kRate);
    EXPECT_EQ(Parse(w, sbr, 2), All(0, w)); // another element: tables built, no data read
    EXPECT_EQ(std::make_tuple(Row(sbr.uMaster, 9), Row(sbr.uHigh, 8), Row(sbr.uLow, 5),
                              Row(sbr.uNoiseTable, 3)),
              std::make_tuple(V{14, 15, 16, 17, 18, 19, 20, 21, 23},
                              V{15, 16, 17, 18, 19, 20, 21, 23}, V{15, 16, 18, 20, 23},
                              V{15, 18, 23}));
    EXPECT_EQ(V({sbr.uNumMaster, sbr.uNumHigh, sbr.uNumLow, sbr.uNumNoiseBands}), (V{8, 7, 4, 2}));
    // Two regions: k0 = 12, k2 = 55 (ratio 4.58 >= 2.2449), k1 = 24; region 0 has
    // 2 round(12 log2(2) / 2) = 12 bands (bs_freq_scale 1), region 1 2 round(12 log2(55/24) / 2.6)
    // = 12 (bs_alter_scale 1). round(12 2^(k/12)) gives 13 twice: one empty band, sorted first.
    BitWriter twoRegions;
    PutHeader(twoRegions, 1, 3, 11, 0, 1, 1, 0);
    sbr = Fresh(kRate);
    EXPECT_EQ(Parse(twoRegions, sbr, 2).first, 0);
    // Region 0 ends at k1 exactly; bs_noise_bands 0 gives 1 noise band.
    EXPECT_EQ(V({sbr.uNumMaster, sbr.uMaster[0], sbr.uMaster[1], sbr.uMaster[12], sbr.uMaster[24],
                 sbr.uNumNoiseBands}),
              (V{24, 12, 12, 24, 55, 1}));
}

int EnvelopeValue(int env, int band) { return 20 + 2 * env + 3 * band; }
int NoiseValue(int floor, int band) { return 4 + floor - 2 * band + 2 * band * band; }

// One grid per frame class, with frequency-coded envelopes and noise floors whose values the
// test chooses, harmonics, and parametric stereo extended data.
TEST(SbrFrame, EveryFrameClass)
{
    // The grid from bs_frame_class on as written; per envelope the frequency resolution as
    // stored; the borders in QMF time slots (border unit 2); 1.5 dB steps (7-bit start values and
    // trees).
    const struct { const char *name; Fields grid; V freqRes, borders, noiseBorders; bool fine; }
        cases[] = {
        // FIXFIX with one envelope uses 1.5 dB steps although bs_amp_res is 1.
        {"FixFix1", {{0, 2}, {0, 2}, {1, 1}}, {1}, {0, 32}, {0, 32}, true},
        // Code 3 gives 5 envelopes, spaced NINT(16 / 5) = 3 slots.
        {"FixFix5", {{0, 2}, {3, 2}, {1, 1}}, {1, 1, 1, 1, 1}, {0, 6, 12, 18, 24, 32}, {0, 12, 32},
         false},
        // bs_var_bord_1 2, relative borders 2 and 4 counted back from 18, pointer 2 of 2 bits;
        // frequency resolutions are sent last envelope first.
        {"FixVar", {{1, 2}, {2, 2}, {2, 2}, {0, 2}, {1, 2}, {2, 2}, {1, 1}, {0, 1}, {0, 1}},
         {0, 0, 1}, {0, 24, 32, 36}, {0, 32, 36}, false},
        // bs_var_bord_0 1, one relative border 6, pointer 0 of 2 bits.
        {"VarFix", {{2, 2}, {1, 2}, {1, 2}, {2, 2}, {0, 2}, {1, 1}, {0, 1}}, {1, 0}, {2, 14, 32},
         {2, 14, 32}, false},
        // 3 + 3 relative borders would give 7 envelopes: limited to 5, pointer of Log2_ceil(6) = 3
        // bits.
        {"VarVar", {{3, 2}, {3, 2}, {1, 2}, {3, 2}, {3, 2}, {0, 2}, {0, 2}, {0, 2}, {1, 2}, {1, 2},
                    {1, 2}, {1, 3}, {0, 1}, {1, 1}, {0, 1}, {1, 1}, {0, 1}},
         {0, 1, 0, 1, 0}, {6, 10, 14, 18, 26, 34}, {6, 26, 34}, false}};
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        const int numEnv = int(c.freqRes.size()), numNoise = numEnv > 1 ? 2 : 1;
        BitWriter w;
        PutLinearHeader(w);
        w.Put(1, 1).Put(0xA, 4); // bs_data_extra and its reserved bits
        PutFields(w, c.grid);
        // Along frequency; bs_invf_mode 2, 1.
        w.Put(0, numEnv + numNoise).Put(0b1001, 2 * kNoiseBands);
        const char *book = c.fine ? "f_huffman_env_1_5dB" : "f_huffman_env_3_0dB";
        for (int env = 0; env < numEnv; ++env) {
            w.Put(uint32_t(EnvelopeValue(env, 0)), c.fine ? 7 : 6);
            PutCodes(w, book, V((c.freqRes[env] ? kHigh : kLow) - 1, 3));
        }
        for (int n = 0; n < numNoise; ++n) { // two noise bands
            w.Put(uint32_t(NoiseValue(n, 0)), 5);
            PutCodes(w, "f_huffman_env_3_0dB", {NoiseValue(n, 1) - NoiseValue(n, 0)});
        }
        w.Put(1, 1).Put(0b10110011, kHigh);         // bs_add_harmonic
        w.Put(1, 1).Put(15, 4).Put(3, 8).Put(2, 2); // 18 bytes of extended data, id 2
        VrSBRState_OnlyParsing sbr = Fresh(kRate);
        EXPECT_EQ(Parse(w, sbr, 0), All(2, w));
        EXPECT_EQ(sbr.uExtensionId, 2);
        ASSERT_EQ(std::make_pair(int(sbr.uNumEnv), int(sbr.uNumNoise)),
                  std::make_pair(numEnv, numNoise));
        EXPECT_EQ(std::make_tuple(Row(sbr.uFreqRes, numEnv), Row(sbr.uBorders, numEnv + 1),
                                  Row(sbr.uNoiseBorders, numNoise + 1), Row(sbr.uInvfMode, 2),
                                  Row(sbr.uAddHarmonic, kHigh)),
                  std::make_tuple(c.freqRes, c.borders, c.noiseBorders, V{2, 1},
                                  V{1, 0, 1, 1, 0, 0, 1, 1}));
        for (int env = 0; env < numEnv; ++env)
            for (int k = 0; k < (c.freqRes[env] ? kHigh : kLow); ++k)
                EXPECT_EQ(sbr.iEnvelope[env][k], EnvelopeValue(env, k)) << env << ',' << k;
        for (int n = 0; n < numNoise; ++n)
            EXPECT_EQ(Row(sbr.iNoise[n], 2), (V{NoiseValue(n, 0), NoiseValue(n, 1)})) << n;
    }
}

// Time-direction deltas build on the previous envelope, and the first envelope of a frame on
// the last one of the frame before, through the band map between resolutions: with
// bs_xover_band 1 there are seven high bands 15..21, 23 and four low ones 15 16 18 20 23.
// A low band k starts where high band 2k - 1 does; a high band builds on the low band that
// holds its start (high bands 0-6 on low bands 0 1 1 2 2 3 3).
TEST(SbrFrame, TimeDeltasAcrossResolutions)
{
    VrSBRState_OnlyParsing sbr = Fresh(kRate);
    // Frame 1, bs_amp_res 0 (1.5 dB steps): VARFIX with four envelopes of resolution low, high,
    // low, high; envelope 0 and both noise floors along frequency, the rest in time.
    BitWriter w;
    PutHeader(w, 0, 5, 0, 1, 0, 0, 3);
    w.Put(0, 1).Put(2, 2).Put(0, 2).Put(3, 2).Put(0, 6).Put(0, 3).Put(0b0101, 4);
    w.Put(0b0111, 4).Put(0, 2).Put(0, 2 * kNoiseBands).Put(30, 7);
    PutCodes(w, "f_huffman_env_1_5dB", {1, 2, 3});           // 30 31 33 36
    PutCodes(w, "t_huffman_env_1_5dB", {0, 1, 2, 3, 4, 5, 6}); // 30 32 33 36 37 41 42
    PutCodes(w, "t_huffman_env_1_5dB", std::vector<int>(4 + 7, 0));
    w.Put(10, 5);
    PutCodes(w, "f_huffman_env_3_0dB", {5}); // 10, 15
    w.Put(7, 5);
    PutCodes(w, "f_huffman_env_3_0dB", {15}); // 7, 22
    w.Put(0, 2); // no harmonics, no extended data
    EXPECT_EQ(Parse(w, sbr, 0), All(1, w));
    EXPECT_EQ(std::make_tuple(Row(sbr.iEnvelope[1], 7), Row(sbr.iEnvelope[2], 4),
                              Row(sbr.iEnvelope[3], 7)),
              std::make_tuple(V{30, 32, 33, 36, 37, 41, 42}, V{30, 32, 36, 41},
                              V{30, 32, 32, 36, 36, 41, 41}));

    // Frame 2, no header: FIXFIX, one low-resolution envelope in time over the last (high) one
    // of frame 1, noise in time over the last floor.
    BitWriter w2;
    w2.Put(13, 4).Put(0, 7).Put(0b11, 2).Put(0, 2 * kNoiseBands);
    PutCodes(w2, "t_huffman_env_1_5dB", {1, 1, 1, 1});
    PutCodes(w2, "t_huffman_noise_3_0dB", {1, -1});
    w2.Put(0, 2);
    EXPECT_EQ(Parse(w2, sbr, 0), All(1, w2));
    EXPECT_EQ(sbr.uHeaderCount, 1u);
    EXPECT_EQ(std::make_pair(Row(sbr.iEnvelope[0], 4), Row(sbr.iNoise[0], 2)),
              std::make_pair(V{31, 33, 37, 42}, V{8, 21}));
}

// Results by extended data, CRC, element and band width. Widths k2 - k0 above 32 (from 48 kHz),
// 45 (above 32 kHz) or 48 end the call with 1 before any frame data, so a parametric stereo
// tail that would give 2 is not reached.
TEST(SbrExtension, ResultsByExtendedDataElementAndBandLimit)
{
    const Fields ps = {{1, 1}, {1, 4}, {2, 2}}; // extended data of 1 byte, bs_extension_id 2
    // The extension type, the element, the fields after bs_add_harmonic_flag, k2 - k0, the result
    // and bs_extension_id (id, -1: left as it was).
    const struct { uint32_t rate, start, stop, type, element; Fields tail; int width, result, id; }
        cases[] = {
        {kRate, 5, 0, 13, 0, {{0, 1}}, 9, 1, -1}, {kRate, 5, 0, 13, 0, {{1, 1}, {0, 4}}, 9, 1, -1},
        {kRate, 5, 0, 13, 0, ps, 9, 2, 2}, {kRate, 5, 0, 13, 0, {{1, 1}, {4, 4}, {1, 2}}, 9, 1, 1},
        {kRate, 5, 0, 13, 0, {{1, 1}, {15, 4}, {0, 8}, {2, 2}}, 9, 2, 2}, // escaped size
        {kRate, 5, 0, 14, 0, ps, 9, 2, 2},                                 // CRC
        {kRate, 5, 0, 13, 1, {}, 9, 1, -1}, // channel pair: not parsed
        {kRate, 5, 0, 13, 2, {}, 9, 0, -1}, {kRate, 5, 0, 13, 3, {}, 9, 0, -1},
        {48000, 5, 9, 13, 0, ps, 32, 2, 2}, {48000, 4, 9, 13, 0, ps, 33, 1, -1},  // 13..45, 12..45
        {44100, 1, 11, 13, 0, ps, 45, 2, 2}, {44100, 0, 11, 13, 0, ps, 47, 1, -1}, // 10..55, 8..55
        {32000, 0, 11, 13, 0, ps, 48, 2, 2}, {32000, 0, 12, 13, 0, ps, 51, 1, -1}, // 10..58, 10..61
        {44100, 4, 15, 13, 0, ps, 26, 2, 2}, {22050, 0, 14, 13, 0, ps, 12, 2, 2}}; // 3 k0, 2 k0
    for (const auto &c : cases) {
        SCOPED_TRACE(testing::Message()
                     << c.rate << ' ' << c.start << ' ' << c.stop << " element " << c.element);
        BitWriter w;
        PutHeader(w, 1, c.start, c.stop, 0, 0, 0, 0, c.type);
        const uint32_t headerBits = uint32_t(w.BitCount());
        VrSBRState_OnlyParsing probe = Fresh(c.rate);
        const bool refused = Parse(w, probe, 2).first == 1;
        EXPECT_TRUE(refused || probe.uMaster[probe.uNumMaster] - probe.uMaster[0] == c.width);
        if (c.element == 0) { // FIXFIX, one low-resolution envelope (1.5 dB), zero deltas
            const int low = refused ? 1 : probe.uNumLow, noise = refused ? 1 : probe.uNumNoiseBands;
            w.Put(0, 8).Put(0, 2 * noise).Put(0, 7);
            PutCodes(w, "f_huffman_env_1_5dB", V(low - 1, 0));
            w.Put(0, 5);
            PutCodes(w, "f_huffman_env_3_0dB", V(noise - 1, 0));
            w.Put(0, 1); // bs_add_harmonic_flag
            PutFields(w, c.tail);
        }
        VrSBRState_OnlyParsing sbr = Fresh(c.rate);
        sbr.uExtensionId = 0x55;
        EXPECT_EQ(Parse(w, sbr, c.element),
                  std::make_pair(c.result, refused ? headerBits : uint32_t(w.BitCount())));
        EXPECT_EQ(sbr.uExtensionId, c.id < 0 ? 0x55 : c.id);
    }
}

// ISO/IEC 14496-3 4.6.18.3.2.1 in double precision: the master frequency band table, and how
// close the nearest of its rounded quantities (band counts, band borders) came to a half.
std::pair<std::vector<int>, double> DoubleMaster(int k0, int k2, int freqScale, int alterScale)
{
    double margin = 1.0;
    auto nint = [&margin](double x) {
        margin = std::min(margin, std::fabs(x - std::floor(x) - 0.5));
        return int(std::floor(x + 0.5));
    };
    std::vector<int> table = {k0};
    if (freqScale == 0) {
        const int dk = alterScale ? 2 : 1;
        const int n = alterScale ? 2 * nint((k2 - k0) / 4.0) : 2 * ((k2 - k0) / 2);
        std::vector<int> d(size_t(std::max(n, 0)), dk);
        int diff = k2 - (k0 + n * dk);
        const int incr = diff > 0 ? -1 : 1;
        for (int k = diff > 0 ? n - 1 : 0; diff != 0; k += incr, diff += incr)
            d[size_t(k)] -= incr;
        for (int v : d)
            table.push_back(table.back() + v);
        return {table, margin};
    }
    const int bands = freqScale == 1 ? 12 : freqScale == 2 ? 10 : 8;
    const bool twoRegions = double(k2) / k0 > 2.2449;
    const int k1 = twoRegions ? 2 * k0 : k2;
    auto widths = [&](int lo, int hi, double warp) {
        const int n = 2 * nint(bands * std::log(double(hi) / lo) / (2 * std::log(2.0) * warp));
        auto border = [&](int k) { return nint(lo * std::pow(double(hi) / lo, double(k) / n)); };
        std::vector<int> d;
        for (int k = 0; k < n; ++k)
            d.push_back(border(k + 1) - border(k));
        std::sort(d.begin(), d.end());
        return d;
    };
    const std::vector<int> d0 = widths(k0, k1, 1.0);
    std::vector<int> d1 = twoRegions ? widths(k1, k2, alterScale ? 1.3 : 1.0) : std::vector<int>{};
    if (!d0.empty() && !d1.empty() && d1[0] < d0.back()) {
        const int change = d0.back() - d1[0];
        d1[0] += change;
        d1.back() -= change;
        std::sort(d1.begin(), d1.end());
    }
    for (const auto &d : {d0, d1})
        for (int v : d)
            table.push_back(table.back() + v);
    return {table, margin};
}

// Every rate and header combination (bs_start_freq, bs_stop_freq, bs_freq_scale, bs_alter_scale)
// within the band limits. The fixed-point tables equal the double-precision ones except where a
// rounded quantity lies within 0.001 of a half and the Q15 arithmetic lands on its other side:
// 8 combinations (6 distinct tables), e.g. k0 11, k2 37 (12 log2(37/22) / 2 = 4.50013) and
// 23 (47/23)^(3/10) = 28.49961.
TEST(SbrBands, MasterTablesAgainstDoublePrecision)
{
    int tables = 0, differ = 0;
    for (uint32_t rate : kAdtsRates)
        for (uint32_t start = 0; start < 16; ++start)
            for (uint32_t stop = 0; stop < 16; ++stop)
                for (uint32_t scale = 0; scale < 4; ++scale)
                    for (uint32_t alter = 0; alter < 2; ++alter) {
                        BitWriter w;
                        PutHeader(w, 1, start, stop, 0, scale, alter, 2);
                        VrSBRState_OnlyParsing sbr = Fresh(rate);
                        if (Parse(w, sbr, 2).first != 0)
                            continue; // beyond the band limits
                        ++tables;
                        const auto [want, margin] = DoubleMaster(
                            sbr.uMaster[0], sbr.uMaster[sbr.uNumMaster], int(scale), int(alter));
                        if (Row(sbr.uMaster, sbr.uNumMaster + 1) == want)
                            continue;
                        ++differ;
                        EXPECT_LT(margin, 0.001) << rate << " Hz, header " << start << ' '
                                                 << stop << ' ' << scale << ' ' << alter;
                    }
    EXPECT_EQ(std::make_pair(tables, differ), std::make_pair(18922, 8));
}

// A minimal single channel element (max_sfb 0) or channel pair, a fill element with one SBR
// payload (padded to its byte count, which countDelta changes), ID_END, behind an ADTS header at
// 44100 Hz. Single channel SBR data: FIXFIX with one low-resolution envelope and zero deltas,
// optionally with 1 byte of parametric stereo extended data.
struct SbrCase { const char *name; bool header; uint32_t start, stop; bool ps, pair; int countDelta;
                 uint32_t sbr, psFound; };
std::vector<uint8_t> SbrFrame(const SbrCase &c)
{
    BitWriter payload;
    if (c.header)
        PutHeader(payload, 1, c.start, c.stop, 0, 0, 0, 3);
    else
        payload.Put(13, 4).Put(0, 1);
    if (!c.pair) {
        payload.Put(0, 1).Put(0, 5).Put(0, 2).Put(0, 2 * kNoiseBands).Put(40, 7);
        PutCodes(payload, "f_huffman_env_1_5dB", V(kLow - 1, 0));
        payload.Put(9, 5);
        PutCodes(payload, "f_huffman_env_3_0dB", V(kNoiseBands - 1, 0));
        payload.Put(0, 1).Put(c.ps, 1);
        payload.Put(1, c.ps ? 4 : 0).Put(2, c.ps ? 2 : 0).Put(0x2A, c.ps ? 6 : 0);
    }
    payload.Align();
    const auto count = uint32_t(int(payload.Bytes().size()) + c.countDelta);
    std::vector<uint8_t> bytes = payload.Bytes();
    bytes.resize(count, 0);
    BitWriter raw;
    raw.Put(c.pair ? 1 : 0, 3).Put(0, 4).Put(0, c.pair ? 1 : 0);
    for (int ch = 0; ch < (c.pair ? 2 : 1); ++ch)
        raw.Put(80, 8).Put(0, 11).Put(0, 3); // global_gain, long ics_info with max_sfb 0, no tools
    raw.Put(6, 3).Put(count < 15 ? count : 15, 4).Put(count - 14, count < 15 ? 0 : 8);
    raw.PutBytes(bytes).Put(7, 3).Align();
    const auto len = uint32_t(raw.Bytes().size() + 7);
    BitWriter adts;
    adts.Put(0xFFF1, 16).Put(1, 2).Put(4, 4).Put(0, 1).Put(c.pair ? 2 : 1, 3).Put(0, 4);
    adts.Put(len, 13).Put(0x7FF, 11).Put(0, 2);
    return adts.PutBytes(raw.Bytes()).Bytes();
}

// SBR and parametric stereo found by the whole-frame parser in hand-built frames, frame after
// frame on one parser: an SBR header stays in force across frames; the fill element's count,
// not what the SBR parser read, decides where the walk resumes.
TEST(SbrFrame, FoundByTheWholeFrameParser)
{
    const SbrCase cases[] = {
        {"no header yet", false, 0, 0, true, false, 0, 0, 0}, // the data cannot be read without one
        {"header and parametric stereo", true, 5, 0, true, false, 0, 1, 1},
        {"header in force", false, 0, 0, false, false, 0, 1, 0},
        {"fill bytes after the SBR data", false, 0, 0, true, false, 3, 1, 1},
        {"count short of the extended data", false, 0, 0, true, false, -2, 1, 0},
        {"bands beyond the limit", true, 0, 11, false, false, 0, 0, 0},
        {"channel pair", true, 5, 0, false, true, 2, 1, 0},
    };
    const Parser parser = NewParser();
    for (const SbrCase &c : cases) {
        SCOPED_TRACE(c.name);
        const std::vector<uint8_t> frame = SbrFrame(c);
        CALAACFrameInfo info;
        const auto len = int32_t(frame.size());
        EXPECT_EQ(vorCALTools_AAC_ParseFrame(parser.get(), frame.data(), len, &info), 0);
        EXPECT_EQ(std::make_tuple(info.uSBR, info.uPS, info.uOutSampleRate, info.uOutChannels,
                                  info.auElements[6]),
                  std::make_tuple(c.sbr, c.psFound, kRate << c.sbr,
                                  c.psFound ? 2u : c.pair ? 2u : 1u, 1u));
    }
}

// The ADTS silence templates carry real SBR payloads inside a fill element (modes 2-4, 4 with
// parametric stereo). The whole-frame parser walks each to its end and finds SBR and
// parametric stereo in them.
TEST(SbrFrame, SilenceTemplates)
{
    for (int32_t mode = 0; mode <= 4; ++mode) {
        SCOPED_TRACE(mode);
        const bool pair = mode == 1 || mode == 3, sbr = mode >= 2, ps = mode == 4;
        uint8_t *pFrame = nullptr;
        uint32_t len = 0;
        ASSERT_EQ(AAC_MuteFrame(&pFrame, &len, 0, 44100, pair ? 2 : 1, 1, mode), 0);
        std::vector<uint8_t> frame(pFrame, pFrame + len);
        g_vorSALMemoryTable->Free(pFrame);
        const Parser parser = NewParser();
        CALAACFrameInfo info;
        ASSERT_EQ(vorCALTools_AAC_ParseFrame(parser.get(), frame.data(), int32_t(len), &info), 0);
        // The header carries the caller's rate as the core rate in every mode.
        EXPECT_EQ(std::make_tuple(info.uSampleRate, info.uOutSampleRate, info.uSBR, info.uPS,
                                  info.uOutChannels, (info.uBits + 7) / 8),
                  std::make_tuple(44100u, 44100u << sbr, uint32_t(sbr), uint32_t(ps),
                                  pair || ps ? 2u : 1u, len));
    }
}

} // namespace
