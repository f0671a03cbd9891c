// vorCALTools_HEVC_ParseSPS on hand-built SPSs, for what x265 never sends (sub-layer profiles,
// scaling lists, predicted reference picture sets, long-term references, PCM, HRD with sub-picture
// parameters, extension flags) and for every error; the real streams are in hevc_fixtures_test.
// Each SPS is written field by field after ITU-T H.265 7.3.2.2.1; a field read out of step shows
// in the values after it, up to the extension flags at the very end.
#include <gtest/gtest.h>

#include <cstring>
#include <functional>
#include <tuple>

#include "hevc_streams.hpp"

namespace {

using namespace vorcal::test;

// profile_tier_level(1, n): Main 10, high tier, level 153, progressive and frame-only; sub-layer
// i has its profile when i is even and its level when i is odd.
void ProfileTierLevel(BitWriter &w, uint32_t n)
{
    w.Put(0, 2).PutBit(1).Put(2, 5).Put(0x20000000, 32).Put(0x9000, 16).Put(0x00000001, 32).Put(153, 8);
    for (uint32_t i = 0; i < n; ++i)
        w.PutBit(i % 2 == 0).PutBit(i % 2 == 1);
    for (uint32_t i = n; n > 0 && i < 8; ++i)
        w.Put(0, 2);
    for (uint32_t i = 0; i < n; ++i)
        i % 2 == 0 ? w.Put(0x42, 8).Put(0x60000000, 32).Put(0xFFFF, 16).Put(0, 32) : w.Put(90, 8);
}

// scaling_list_data(): lists predicted (with the largest delta allowed) and coded in turn.
void ScalingLists(BitWriter &w)
{
    for (uint32_t uSize = 0; uSize < 4; ++uSize) {
        for (uint32_t m = 0; m < 6; m += uSize == 3 ? 3 : 1) {
            if ((uSize + m) % 2 == 0) {
                w.PutBit(0).PutUE(uSize == 3 ? m / 3 : m);
                continue;
            }
            w.PutBit(1);
            if (uSize > 1)
                w.PutSE(247 - int32_t(uSize));
            for (int i = 0; i < (uSize == 0 ? 16 : 64); ++i)
                w.PutSE(i % 5 == 0 ? -128 : 127 - i);
        }
    }
}

void ExplicitRps(BitWriter &w, bool bFirst, const std::vector<uint32_t> &negMinus1, const std::vector<uint32_t> &posMinus1)
{
    if (!bFirst)
        w.PutBit(0); // inter_ref_pic_set_prediction_flag
    w.PutUE(uint32_t(negMinus1.size())).PutUE(uint32_t(posMinus1.size()));
    for (uint32_t d : negMinus1)
        w.PutUE(d).PutBit(1);
    for (uint32_t d : posMinus1)
        w.PutUE(d).PutBit(0);
}

// A predicted set: delta_rps_sign, abs_delta_rps_minus1, then {used_by_curr_pic_flag,
// use_delta_flag} for each picture of the set before and for itself; use_delta_flag is written
// only when used_by_curr_pic_flag is 0.
void PredictedRps(BitWriter &w, uint32_t uSign, uint32_t uAbsMinus1, const std::vector<std::pair<int, int>> &flags)
{
    w.PutBit(1).PutBit(uSign).PutUE(uAbsMinus1);
    for (const auto &[used, useDelta] : flags) {
        w.PutBit(used);
        if (!used)
            w.PutBit(useDelta);
    }
}

// The short-term sets of the rich SPS, with the pictures the derivation of 7-61 and 7-62 gives:
// set 0 {-1, -2 | +1}; set 1 = set 0 moved by -1 with the second picture's delta used and the
// set's own delta dropped: {-2, -3} (the +1 lands on 0 and goes); set 2 = set 1 moved by +3:
// {| +1, +3}; set 3 = set 2 moved by -1: {-1 | +2}; set 4 empty; set 5 = set 4 moved by +5: {| +5}.
// A parser that counted the flags instead of the pictures would read set 2 a flag too long.
void ShortTermSets(BitWriter &w)
{
    ExplicitRps(w, true, {0, 0}, {0});
    PredictedRps(w, 1, 0, {{1, 1}, {0, 1}, {1, 1}, {0, 0}});
    PredictedRps(w, 0, 2, {{1, 1}, {1, 1}, {1, 1}});
    PredictedRps(w, 1, 0, {{1, 1}, {1, 1}, {1, 1}});
    ExplicitRps(w, false, {}, {});
    PredictedRps(w, 0, 4, {{1, 1}});
}

// hrd_parameters(1, 2) with NAL and VCL parameters and sub-picture parameters: sub-layer 0 has
// a fixed rate and two CPBs, sub-layer 1 low delay (one CPB, no count), sub-layer 2 a fixed rate
// within the CVS and one CPB.
void Hrd(BitWriter &w)
{
    w.PutBit(1).PutBit(1).PutBit(1).Put(23, 8).Put(4, 5).PutBit(1).Put(5, 5).Put(3, 4).Put(4, 4).Put(2, 4);
    w.Put(23, 5).Put(23, 5).Put(5, 5);
    auto Cpbs = [&w](int n) {
        for (int k = 0; k < 2 * n; ++k) // NAL then VCL
            w.PutUE(1000 + k).PutUE(2000).PutUE(3).PutUE(4).PutBit(k % 2);
    };
    w.PutBit(1).PutUE(0).PutUE(1);
    Cpbs(2);
    w.PutBit(0).PutBit(0).PutBit(1);
    Cpbs(1);
    w.PutBit(0).PutBit(1).PutUE(3).PutUE(0);
    Cpbs(1);
}

struct Shape {
    uint32_t uSubLayersMinus1 = 2, uChroma = 1, uSeparate = 0, uWidth = 1920, uHeight = 1080;
    std::array<uint32_t, 4> window{0, 3, 1, 4};
    bool bRich = true; // scaling lists, PCM, the short-term sets, long-term pictures, the full VUI, extensions
};

// The SPS of a shape; a tail, when given, replaces everything after the coding block sizes.
Bytes Sps(const Shape &s, const std::function<void(BitWriter &)> &tail = {})
{
    BitWriter w;
    w.Put(0x4201, 16).Put(5, 4).Put(s.uSubLayersMinus1, 3).PutBit(1);
    ProfileTierLevel(w, s.uSubLayersMinus1);
    w.PutUE(7).PutUE(s.uChroma);
    if (s.uChroma == 3)
        w.PutBit(s.uSeparate);
    w.PutUE(s.uWidth).PutUE(s.uHeight).PutBit(1);
    for (uint32_t o : s.window)
        w.PutUE(o);
    w.PutUE(2).PutUE(2).PutUE(4).PutBit(1); // 10-bit luma and chroma, log2_max_pic_order_cnt_lsb 8
    for (uint32_t i = 0; i <= s.uSubLayersMinus1; ++i)
        w.PutUE(i + 3).PutUE(i).PutUE(i + 1);
    w.PutUE(0).PutUE(3).PutUE(0).PutUE(3).PutUE(1).PutUE(2); // 8x8 to 64x64 coding blocks
    if (tail) {
        tail(w);
        return BitWriter::Escape(w.Trailing().Bytes());
    }
    if (!s.bRich) {
        w.PutBit(0).PutBit(0).PutBit(1).PutBit(0).PutUE(0).PutBit(0).PutBit(1).PutBit(1).PutBit(0).PutBit(0);
        return BitWriter::Escape(w.Trailing().Bytes());
    }
    w.PutBit(1).PutBit(1);
    ScalingLists(w);
    w.PutBit(1).PutBit(1).PutBit(1).Put(7, 4).Put(5, 4).PutUE(1).PutUE(1).PutBit(0); // AMP, SAO, PCM
    w.PutUE(6);
    ShortTermSets(w);
    w.PutBit(1).PutUE(2).Put(0xA5, 8).PutBit(1).Put(0x5A, 8).PutBit(0); // two long-term pictures
    w.PutBit(1).PutBit(1).PutBit(1);                                     // temporal MVP, smoothing, VUI
    w.PutBit(1).Put(255, 8).Put(7, 16).Put(5, 16).PutBit(1).PutBit(1);   // Extended_SAR 7:5, overscan
    w.PutBit(1).Put(5, 3).PutBit(1).PutBit(1).Put(9, 8).Put(16, 8).Put(9, 8); // full range, BT.2020 PQ
    w.PutBit(1).PutUE(1).PutUE(1).Put(0, 3).PutBit(1).PutUE(1).PutUE(2).PutUE(3).PutUE(4);
    w.PutBit(1).Put(1001, 32).Put(60000, 32).PutBit(1).PutUE(0).PutBit(1);
    Hrd(w);
    w.PutBit(1).Put(7, 3).PutUE(100).PutUE(2).PutUE(1).PutUE(15).PutUE(15); // bitstream_restriction
    w.PutBit(1).Put(0x95, 8);                                                 // range and SCC, 4 bits 0101
    return BitWriter::Escape(w.Trailing().Bytes());
}

int32_t Parse(const Bytes &d, CALHEVCSPS &s)
{
    std::memset(&s, 0xA5, sizeof s);
    return vorCALTools_HEVC_ParseSPS(d.data(), int32_t(d.size()), &s);
}

TEST(HevcParseSps, EverySyntaxStructureOnTheWayToTheExtensionFlags)
{
    const Bytes sps = Sps({});
    ASSERT_GT(std::count(sps.begin(), sps.end(), 3), 2) << "emulation prevention not exercised";
    CALHEVCSPS s;
    ASSERT_EQ(Parse(sps, s), CAL_HEVC_OK);
    const std::vector<std::pair<uint32_t, uint32_t>> fields = {
        {s.uProfileSpace, 0}, {s.uTierFlag, 1}, {s.uProfileIdc, 2}, {s.uProfileCompatibilityFlags, 0x20000000},
        {s.uConstraintFlagsHigh, 0x9000}, {s.uConstraintFlagsLow, 1}, {s.uLevelIdc, 153},
        {s.uVPSId, 5}, {s.uMaxSubLayers, 3}, {s.uTemporalIdNesting, 1}, {s.uSPSId, 7},
        {s.uChromaFormatIdc, 1}, {s.uSeparateColourPlane, 0}, {s.uCodedWidth, 1920}, {s.uCodedHeight, 1080},
        {s.uConfWinLeft, 0}, {s.uConfWinRight, 6}, {s.uConfWinTop, 2}, {s.uConfWinBottom, 8},
        {s.uWidth, 1914}, {s.uHeight, 1070}, {s.uBitDepthLuma, 10}, {s.uBitDepthChroma, 10},
        {s.uLog2MaxPicOrderCntLsb, 8}, {s.uMaxDecPicBuffering, 6}, {s.uMaxNumReorderPics, 2},
        {s.uMaxLatencyIncreasePlus1, 3}, {s.uLog2MinCbSize, 3}, {s.uLog2CtbSize, 6},
        {s.uScalingListEnabled, 1}, {s.uNumShortTermRefPicSets, 6}, {s.uLongTermRefPicsPresent, 1},
        {s.uNumLongTermRefPicsSps, 2}, {s.uSarNum, 7}, {s.uSarDen, 5}, {s.uVideoFullRange, 1},
        {s.uColourPrimaries, 9}, {s.uTransferCharacteristics, 16}, {s.uMatrixCoefficients, 9},
        {s.uNumUnitsInTick, 1001}, {s.uTimeScale, 60000}, {s.uMinSpatialSegmentationIdc, 100},
        {s.uExtensionFlags, 0x59}};
    for (size_t i = 0; i < fields.size(); ++i)
        EXPECT_EQ(fields[i].first, fields[i].second) << "field " << i;
    // Every cut before the extension flags is reported as such, and nothing is kept.
    const CALHEVCSPS zero{};
    for (size_t n = 1; n + 1 < sps.size(); ++n) {
        const int32_t r = Parse(Bytes(sps.begin(), sps.begin() + std::ptrdiff_t(n)), s);
        EXPECT_EQ(r, n == 1 ? CAL_HEVC_ERR_NOT_FOUND : CAL_HEVC_ERR_TRUNCATED) << n;
        EXPECT_EQ(std::memcmp(&s, &zero, sizeof s), 0) << n;
    }
}

// Shapes the rich SPS does not take, with the window in their own chroma units (Table 6-1).
TEST(HevcParseSps, ChromaFormatsAndDefaults)
{
    const std::tuple<Shape, uint32_t, uint32_t, uint32_t, uint32_t> cases[] = {
        {{0, 1, 0, 64, 48, {1, 1, 1, 1}, false}, 60, 44, 1, 1}, // 4:2:0: two samples a unit both ways
        {{0, 2, 0, 64, 48, {1, 1, 1, 1}, false}, 60, 46, 1, 2},  // 4:2:2: two across, one down
        {{0, 3, 0, 64, 48, {1, 1, 1, 1}, false}, 62, 46, 1, 3},  // 4:4:4
        {{0, 3, 1, 64, 48, {1, 1, 1, 1}, false}, 62, 46, 1, 3},  // separate colour planes: luma units
        {{0, 0, 0, 64, 48, {1, 1, 1, 1}, false}, 62, 46, 1, 0},  // monochrome
        {{6, 1, 0, 64, 48, {0, 0, 0, 0}, false}, 64, 48, 7, 1},  // seven sub-layers
    };
    for (const auto &[shape, uWidth, uHeight, uSubLayers, uChroma] : cases) {
        CALHEVCSPS s;
        ASSERT_EQ(Parse(Sps(shape), s), CAL_HEVC_OK) << shape.uChroma;
        EXPECT_EQ(std::tuple(s.uWidth, s.uHeight, s.uMaxSubLayers, s.uChromaFormatIdc, s.uSeparateColourPlane),
                  std::tuple(uWidth, uHeight, uSubLayers, uChroma, shape.uSeparate));
        // Without VUI: no aspect ratio, video range and colours unspecified, no timing.
        EXPECT_EQ(std::tuple(s.uSarNum, s.uSarDen, s.uVideoFullRange, s.uColourPrimaries, s.uMatrixCoefficients, s.uTimeScale),
                  std::tuple(0u, 0u, 0u, 2u, 2u, 0u));
    }
}

// Where the SPS is found: one unit, start codes (the first base-layer SPS), an hvcC record.
TEST(HevcParseSps, FoundInAUnitStartCodesOrARecord)
{
    const Bytes a = Sps({0, 1, 0, 64, 48, {0, 0, 0, 0}, false}), b = Sps({});
    const Bytes cut = [&b] {
        Bytes r = HvcC(Bytes(21, 0), {{0xA1, {b}}});
        r.pop_back();
        return r;
    }();
    Bytes upper = b;
    upper[1] |= 1 << 3; // nuh_layer_id 1
    const std::tuple<Bytes, int32_t, uint32_t> cases[] = {
        {a, CAL_HEVC_OK, 64},
        {AnnexB({Hevc(35), Hevc(32), upper, b, a}), CAL_HEVC_OK, 1920},
        {Cat({{0x12, 0x34}, AnnexB({Hevc(35), a}, 3), {0, 0}}), CAL_HEVC_OK, 64},
        {HvcC(Bytes(21, 0), {{0xA0, {Hevc(32)}}, {0xA1, {}}, {0x21, {upper, b, a}}}), CAL_HEVC_OK, 1920},
        {upper, CAL_HEVC_ERR_NOT_FOUND, 0},
        {AnnexB({Hevc(32), Hevc(34)}), CAL_HEVC_ERR_NOT_FOUND, 0},
        {HvcC(Bytes(21, 0), {{0xA0, {Hevc(32)}}, {0xA2, {}}}), CAL_HEVC_ERR_NOT_FOUND, 0},
        {cut, CAL_HEVC_ERR_TRUNCATED, 0},
        {{}, CAL_HEVC_ERR_ARGUMENT, 0},
    };
    for (const auto &[data, iResult, uWidth] : cases) {
        CALHEVCSPS s;
        EXPECT_EQ(Parse(data, s), iResult) << testing::PrintToString(data).substr(0, 60);
        EXPECT_EQ(s.uCodedWidth, uWidth);
    }
    EXPECT_EQ(vorCALTools_HEVC_ParseSPS(a.data(), int32_t(a.size()), nullptr), CAL_HEVC_ERR_ARGUMENT);
    EXPECT_EQ(vorCALTools_HEVC_ParseSPS(nullptr, 5, nullptr), CAL_HEVC_ERR_ARGUMENT);
}

// Values outside their range in 7.4.3.2.1, Annex E and Annex A: malformed, nothing kept.
TEST(HevcParseSps, FieldsOutOfRange)
{
    // No scaling lists, AMP, SAO or PCM; then the sets; then no long-term pictures, VUI or extensions.
    auto WithSets = [](std::function<void(BitWriter &)> sets) {
        return [sets](BitWriter &w) {
            w.PutBit(0).PutBit(0).PutBit(0).PutBit(0);
            sets(w);
            w.PutBit(0).PutBit(0).PutBit(0).PutBit(0).PutBit(0);
        };
    };
    const std::pair<const char *, Bytes> cases[] = {
        {"seven sub-layers plus one", [] { Shape s; s.uSubLayersMinus1 = 7; s.bRich = false; return Sps(s); }()},
        {"chroma_format_idc 4", Sps({0, 4, 0, 64, 48, {0, 0, 0, 0}, false})},
        {"width not a whole number of 8x8 blocks", Sps({0, 1, 0, 60, 48, {0, 0, 0, 0}, false})},
        {"window as wide as the picture", Sps({0, 1, 0, 64, 48, {16, 16, 0, 0}, false})},
        {"height 0", Sps({0, 1, 0, 64, 0, {0, 0, 0, 0}, false})},
        {"65 short-term sets", Sps({}, WithSets([](BitWriter &w) { w.PutUE(65); }))},
        {"17 pictures in a set", Sps({}, WithSets([](BitWriter &w) {
             w.PutUE(1);
             ExplicitRps(w, true, std::vector<uint32_t>(9, 0), std::vector<uint32_t>(8, 0));
         }))},
    };
    for (const auto &[what, data] : cases) {
        CALHEVCSPS s;
        EXPECT_EQ(Parse(data, s), CAL_HEVC_ERR_MALFORMED) << what;
        EXPECT_EQ(s.uCodedWidth, 0u) << what;
    }
    // The same sets with one picture fewer parse.
    CALHEVCSPS s;
    const Bytes sixteen = Sps({}, WithSets([](BitWriter &w) {
        w.PutUE(1);
        ExplicitRps(w, true, std::vector<uint32_t>(8, 0), std::vector<uint32_t>(8, 0));
    }));
    EXPECT_EQ(Parse(sixteen, s), CAL_HEVC_OK);
}

} // namespace
