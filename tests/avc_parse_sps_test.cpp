// vorCALTools_AVC_ParseSPS: real x264 streams of every profile (tests/data/h264, made by
// fixtures-h264-profiles.sh) against ffprobe and ffmpeg's trace_headers, from start codes and
// from the MP4 record; hand-built SPSs for what x264 never sends and for every error.
#include <gtest/gtest.h>

#include <array>
#include <bit>
#include <cstring>
#include <fstream>
#include <functional>
#include <map>
#include <numeric>
#include <string>

#include <vorcal/video_tools.h>

#include "avc_streams.hpp"
#include "recording_sal.hpp"

namespace {

using namespace vorcal::test;
using Writes = std::function<void(BitWriter &)>;
using Record = std::array<uint32_t, sizeof(CALAVCSPS) / 4>;

int32_t Parse(const Bytes &d, CALAVCSPS &s)
{
    std::memset(&s, 0xA5, sizeof s);
    return vorCALTools_AVC_ParseSPS(d.data(), int32_t(d.size()), &s);
}

// An SPS unit (constraints 0, level 31): `head` from seq_parameter_set_id to the
// pic_order_cnt_type fields, then 3 reference frames, 40 x 30 macroblocks of frame coding and
// `tail` from frame_cropping_flag on (no cropping and no VUI when empty).
Bytes Sps(uint32_t uProfile, const Writes &head, const Writes &tail = {})
{
    BitWriter w;
    w.Put(0x67, 8).Put(uProfile, 8).Put(0, 8).Put(31, 8);
    head(w);
    w.PutUE(3).PutBit(0).PutUE(39).PutUE(29).PutBit(1).PutBit(1);
    tail ? tail(w) : void(w.PutBit(0).PutBit(0));
    return BitWriter::Escape(w.Trailing().Bytes());
}

// seq_parameter_set_id 0, log2_max_frame_num_minus4 0, pic_order_cnt_type 2.
void Plain(BitWriter &w)
{
    w.PutUE(0).PutUE(0).PutUE(2);
}

// High-profile head: 8-bit depths and a scaling matrix whose present lists carry these deltas.
Writes High(uint32_t uChroma, const std::map<uint32_t, std::vector<int32_t>> &lists)
{
    return [=](BitWriter &w) {
        w.PutUE(0).PutUE(uChroma).Put(0, uChroma == 3).PutUE(0).PutUE(0).PutBit(0).PutBit(1);
        for (uint32_t i = 0; i < (uChroma == 3 ? 12u : 8u); ++i) {
            const auto it = lists.find(i);
            w.PutBit(it != lists.end());
            for (int32_t d : it != lists.end() ? it->second : std::vector<int32_t>{})
                w.PutSE(d);
        }
        w.PutUE(0).PutUE(2);
    };
}

// Explicit lists (16 or 64 deltas), lists flagged default (nextScale 0 at once: one delta) and
// lists cut short (nextScale 0 after three deltas: the last scale repeats, nothing more is read).
// A list read one delta too many or too few shifts every later field.
TEST(ParseSPS, ScalingListsAreReadToTheirEnd)
{
    const std::vector<int32_t> k16(16, 1), k64(64, 1), kDefault{-8}, kCutShort{2, 3, -13};
    Bytes cut = Sps(100, High(1, {{6, k64}}));
    cut.resize(20);
    const std::tuple<const char *, Bytes, int32_t> cases[] = {
        {"explicit", Sps(100, High(1, {{0, k16}, {3, k16}, {6, k64}, {7, k64}})), 0},
        {"default", Sps(100, High(1, {{0, kDefault}, {6, kDefault}})), 0},
        {"cut short", Sps(100, High(1, {{2, kCutShort}, {7, kCutShort}})), 0},
        {"4:4:4", Sps(244, High(3, {{5, k16}, {8, kCutShort}, {10, kDefault}, {11, k64}})), 0},
        {"delta_scale 200", Sps(100, High(1, {{0, {1, 200}}})), CAL_AVC_SPS_ERR_MALFORMED},
        {"cut inside", cut, CAL_AVC_SPS_ERR_TRUNCATED},
    };
    for (const auto &[name, unit, iResult] : cases) {
        CALAVCSPS s;
        EXPECT_EQ(Parse(unit, s), iResult) << name;
        EXPECT_EQ(std::tuple(s.uScalingMatrixPresent, s.uMaxNumRefFrames, s.uWidth, s.uHeight),
                  iResult ? std::tuple(0u, 0u, 0u, 0u) : std::tuple(1u, 3u, 640u, 480u)) << name;
    }
}

// Input forms, fields x264 never codes, and errors (after which the record is all zero).
TEST(ParseSPS, FormsFieldsAndErrors)
{
    const Bytes unit = Sps(66, Plain), pps{0x68, 0xCE, 0x38, 0x80};
    const Bytes record = Cat({{1, 66, 0, 31, 0xFF, 0xE1, 0, uint8_t(unit.size())}, unit, {1, 0, 4}, pps});
    auto vui = [](const Writes &w) { return Sps(66, Plain, [w](BitWriter &b) { w(b.PutBit(0).PutBit(1)); }); };
    // {seq_parameter_set_id, log2 frame_num, pic_order_cnt_type, SAR, max_dec_frame_buffering, width}
    using Fields = std::array<uint32_t, 7>;
    const Fields kPlain{0, 4, 2, 0, 0, 0, 640}, kZero{};
    const std::tuple<const char *, Bytes, int32_t, Fields> cases[] = {
        {"unit", unit, 0, kPlain},
        {"3-byte start codes, SEI first", AnnexB({kSei, unit, pps}, 3), 0, kPlain},
        {"bytes before the start code", Cat({{0x09, 0x10}, AnnexB({unit})}), 0, kPlain},
        {"configuration record", record, 0, kPlain},
        {"pic_order_cnt_type 1", Sps(77, [](BitWriter &w) {
             w.PutUE(7).PutUE(12).PutUE(1).PutBit(0).PutSE(-5).PutSE(70000).PutUE(3).PutSE(1).PutSE(-2).PutSE(300);
         }), 0, {7, 16, 1, 0, 0, 0, 640}},
        // aspect_ratio_idc 14 (4:3); NAL and VCL HRD parameters with two CPBs each.
        {"VUI with two HRDs", vui([](BitWriter &w) {
             w.PutBit(1).Put(14, 8).Put(0, 4);
             for (int k = 0; k < 2; ++k) {
                 w.PutBit(1).PutUE(1).Put(0x46, 8);
                 for (int i = 0; i < 2; ++i)
                     w.PutUE(0x12345).PutUE(0x7FFFFFFF).PutBit(i);
                 w.Put(23, 5).Put(23, 5).Put(23, 5).Put(24, 5);
             }
             w.PutBit(0).PutBit(1).PutBit(1).PutBit(1).PutUE(2).PutUE(1).PutUE(16).PutUE(16).PutUE(3).PutUE(5);
         }), 0, {0, 4, 2, 4, 3, 5, 640}},
        {"reserved aspect_ratio_idc", vui([](BitWriter &w) { w.PutBit(1).Put(17, 8).Put(0, 8); }), 0, kPlain},
        {"record cut inside the SPS", Bytes(record.begin(), record.begin() + 12), CAL_AVC_SPS_ERR_TRUNCATED, kZero},
        {"record without SPS", {1, 66, 0, 31, 0xFF, 0xE0, 1, 0, 4}, CAL_AVC_SPS_ERR_NOT_FOUND, kZero},
        {"only a PPS", AnnexB({pps}), CAL_AVC_SPS_ERR_NOT_FOUND, kZero},
        {"forbidden bit", AnnexB({Cat({{0xE7}, Bytes(unit.begin() + 1, unit.end())})}), CAL_AVC_SPS_ERR_NOT_FOUND, kZero},
        {"cut after level_idc", Bytes(unit.begin(), unit.begin() + 4), CAL_AVC_SPS_ERR_TRUNCATED, kZero},
        {"cut inside the VUI", vui([](BitWriter &w) { w.PutBit(1).Put(255, 8).Put(4, 16); }), CAL_AVC_SPS_ERR_TRUNCATED, kZero},
        {"seq_parameter_set_id 32", Sps(66, [](BitWriter &w) { w.PutUE(32).PutUE(0).PutUE(2); }), CAL_AVC_SPS_ERR_MALFORMED, kZero},
        {"pic_order_cnt_type 3", Sps(66, [](BitWriter &w) { w.PutUE(0).PutUE(0).PutUE(3); }), CAL_AVC_SPS_ERR_MALFORMED, kZero},
        {"33 leading zeros", Sps(66, [](BitWriter &w) { w.PutUE(0).PutUE(0).Put(0, 16).Put(0, 17).Put(3, 2); }), CAL_AVC_SPS_ERR_MALFORMED, kZero},
        {"bit depth 15", Sps(110, [](BitWriter &w) { w.PutUE(0).PutUE(1).PutUE(7).PutUE(0).Put(0, 2); Plain(w); }),
         CAL_AVC_SPS_ERR_MALFORMED, kZero},
        {"cropped away", Sps(66, Plain, [](BitWriter &w) { w.PutBit(1).PutUE(160).PutUE(160).PutUE(0).PutUE(0).PutBit(0); }),
         CAL_AVC_SPS_ERR_MALFORMED, kZero},
        {"33 CPBs", vui([](BitWriter &w) { w.Put(0, 5).PutBit(1).PutUE(32); }), CAL_AVC_SPS_ERR_MALFORMED, kZero},
    };
    for (const auto &[name, data, iResult, expected] : cases) {
        CALAVCSPS s;
        EXPECT_EQ(Parse(data, s), iResult) << name;
        EXPECT_EQ((Fields{s.uSPSId, s.uLog2MaxFrameNum, s.uPicOrderCntType, s.uSarNum, s.uSarDen, s.uMaxDecFrameBuffering, s.uWidth}),
                  expected) << name;
        const Record r = std::bit_cast<Record>(s);
        EXPECT_TRUE(iResult == 0 || std::accumulate(r.begin(), r.end(), 0ull) == 0) << name;
    }
    CALAVCSPS s;
    EXPECT_EQ(vorCALTools_AVC_ParseSPS(unit.data(), int32_t(unit.size()), nullptr), CAL_AVC_SPS_ERR_ARGUMENT);
    EXPECT_EQ(vorCALTools_AVC_ParseSPS(nullptr, 4, &s), CAL_AVC_SPS_ERR_ARGUMENT);
    EXPECT_EQ(vorCALTools_AVC_ParseSPS(unit.data(), 0, &s), CAL_AVC_SPS_ERR_ARGUMENT);
}

class Profiles : public testing::TestWithParam<const char *> {};

// ffprobe's stream report ("key=value") and every SPS syntax element as ffmpeg read it
// ("sps.NAME=value"; absent ones take their inferred values).
TEST_P(Profiles, MatchFfprobeFromStartCodesAndRecord)
{
    const std::string base = std::string(VORCAL_TEST_DATA_DIR) + "/h264/" + GetParam();
    std::map<std::string, std::string> m;
    std::ifstream in(base + ".probe");
    for (std::string line; std::getline(in, line);)
        m.emplace(line.substr(0, line.find('=')), line.substr(line.find('=') + 1));
    auto n = [&m](const std::string &key, uint32_t uAbsent = 0) {
        return m.count("sps." + key) ? uint32_t(std::stoul(m["sps." + key])) : uAbsent;
    };
    CALAVCSPS s, fromRecord;
    ASSERT_EQ(Parse(RecordingSal::ReadFile(base + ".h264"), s), 0) << base;
    ASSERT_EQ(Parse(RecordingSal::ReadFile(base + ".avcc"), fromRecord), 0);
    EXPECT_EQ(std::bit_cast<Record>(s), std::bit_cast<Record>(fromRecord));

    const std::map<uint32_t, std::string> kProfiles = {{66, "Baseline"}, {77, "Main"}, {100, "High"}, {110, "High 10"},
                                                       {122, "High 4:2:2"}, {244, "High 4:4:4 Predictive"}};
    const std::map<uint32_t, std::string> kColour = {{1, "bt709"}, {2, "unknown"}};
    const char *kChroma[] = {"gray", "420p", "422p", "444p"};
    const uint32_t uGcd = std::gcd(s.uTimeScale, 2 * s.uNumUnitsInTick);
    auto str = [](uint32_t v) { return std::to_string(v); };
    const std::array<std::string, 14> got = {
        ((s.uConstraintFlags & 0x40) && s.uProfileIdc == 66 ? "Constrained " : "") + kProfiles.at(s.uProfileIdc),
        str(s.uLevelIdc), str(s.uWidth), str(s.uHeight),
        (s.uVideoFullRange ? "yuvj" : "yuv") + std::string(kChroma[s.uChromaFormatIdc]) +
            (s.uBitDepthLuma > 8 ? str(s.uBitDepthLuma) + "le" : ""),
        str(s.uBitDepthLuma), s.uFrameMbsOnly ? "progressive" : "tt", str(s.uSarNum) + ":" + str(s.uSarDen),
        s.uVideoFullRange ? "pc" : "unknown", kColour.at(s.uColourPrimaries), kColour.at(s.uTransferCharacteristics),
        kColour.at(s.uMatrixCoefficients), str(s.uTimeScale / uGcd) + "/" + str(2 * s.uNumUnitsInTick / uGcd),
        str(s.uMaxNumReorderFrames)};
    EXPECT_EQ(got, (std::array<std::string, 14>{m["profile"], m["level"], m["width"], m["height"], m["pix_fmt"],
                                                m["bits_per_raw_sample"], m["field_order"], m["sample_aspect_ratio"],
                                                m["color_range"], m["color_primaries"], m["color_transfer"],
                                                m["color_space"], m["r_frame_rate"], m["has_b_frames"]}));

    uint32_t uFlags = n("reserved_zero_2bits");
    for (uint32_t k = 0; k < 6; ++k)
        uFlags |= n("constraint_set" + str(k) + "_flag") << (7 - k);
    EXPECT_EQ(std::bit_cast<Record>(s),
              (Record{n("profile_idc"), uFlags, n("level_idc"), n("seq_parameter_set_id"), n("chroma_format_idc", 1),
                      n("separate_colour_plane_flag"), n("bit_depth_luma_minus8") + 8, n("bit_depth_chroma_minus8") + 8,
                      n("seq_scaling_matrix_present_flag"), n("log2_max_frame_num_minus4") + 4, n("pic_order_cnt_type"),
                      n("max_num_ref_frames"), n("frame_mbs_only_flag"), n("mb_adaptive_frame_field_flag"),
                      (n("pic_width_in_mbs_minus1") + 1) * 16,
                      (n("pic_height_in_map_units_minus1") + 1) * 16 * (2 - n("frame_mbs_only_flag")),
                      s.uCropLeft, s.uCropRight, s.uCropTop, s.uCropBottom, s.uWidth, s.uHeight, s.uSarNum, s.uSarDen,
                      n("video_full_range_flag"), n("colour_primaries", 2), n("transfer_characteristics", 2),
                      n("matrix_coefficients", 2), n("num_units_in_tick"), n("time_scale"), n("fixed_frame_rate_flag"),
                      n("max_num_reorder_frames"), n("max_dec_frame_buffering")}));
    // The cropping ffprobe's size leaves of the coded frame, on the sides the SPS names.
    EXPECT_EQ((std::array<uint32_t, 6>{s.uCropLeft + s.uCropRight + s.uWidth, s.uCropTop + s.uCropBottom + s.uHeight,
                                       s.uCropLeft > 0, s.uCropRight > 0, s.uCropTop > 0, s.uCropBottom > 0}),
              (std::array<uint32_t, 6>{s.uCodedWidth, s.uCodedHeight, n("frame_crop_left_offset") > 0,
                                       n("frame_crop_right_offset") > 0, n("frame_crop_top_offset") > 0,
                                       n("frame_crop_bottom_offset") > 0}));
}

INSTANTIATE_TEST_SUITE_P(X264, Profiles,
                         testing::Values("baseline_64x48", "main_64x48", "high_64x48", "high10_64x48", "high422_62x46",
                                         "high444_62x46", "interlaced_64x40", "cqm_64x48", "sar_64x48", "extsar_64x48",
                                         "odd_1918x1078", "fullrange_64x48"));

} // namespace
