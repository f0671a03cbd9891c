// Real x265 streams (tests/data/hevc, made by fixtures-hevc.sh): the SPS of every stream against
// ffprobe and ffmpeg's trace_headers, from start codes and from the MP4's hvcC record; the record
// built from the stream's parameter sets against the one ffmpeg's MP4 muxer wrote; the session
// stream's packets against its MP4 samples and ffmpeg's hevc_mp4toannexb output, unit for unit,
// with the IRAP test against the key flags.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <iterator>
#include <string>
#include <tuple>

#include "hevc_streams.hpp"

namespace {

using namespace vorcal::test;

int64_t Num(const std::map<std::string, std::string> &m, const std::string &key)
{
    const auto it = m.find(key);
    return it == m.end() ? -1 : std::stoll(it->second);
}

class SpsFixture : public testing::TestWithParam<const char *> {};

TEST_P(SpsFixture, MatchesTheProbeFromStartCodesAndFromTheRecord)
{
    const std::string name = GetParam();
    const auto probe = ReadProbe(name);
    const Bytes stream = ReadHevcFixture(name + ".hevc"), record = ReadHevcFixture(name + ".hvcc");
    ASSERT_GT(probe.size(), 20u) << name;
    auto sps = [&probe](const std::string &element) { return Num(probe, "sps." + element); };
    uint32_t uCompatibility = 0;
    for (int j = 0; j < 32; ++j)
        uCompatibility |= uint32_t(sps("general_profile_compatibility_flag[" + std::to_string(j) + "]")) << (31 - j);
    const int64_t iSubLayers = sps("sps_max_sub_layers_minus1") + 1, iChroma = sps("chroma_format_idc");
    const int64_t iSubWidth = iChroma == 1 || iChroma == 2 ? 2 : 1, iSubHeight = iChroma == 1 ? 2 : 1;
    auto window = [&](const char *side, int64_t iUnit) { return sps("conformance_window_flag") ? sps(std::string("conf_win_") + side + "_offset") * iUnit : 0; };
    auto colour = [&](const char *element) { return sps("colour_description_present_flag") == 1 ? sps(element) : 2; };
    const std::string sar = probe.at("sample_aspect_ratio");
    const std::string last = "[" + std::to_string(iSubLayers - 1) + "]";
    const std::map<std::string, const char *> kProfiles = {{"Main", "1"}, {"Main 10", "2"}, {"Rext", "4"}};
    for (const Bytes *src : {&stream, &record}) {
        CALHEVCSPS s;
        ASSERT_EQ(vorCALTools_HEVC_ParseSPS(src->data(), int32_t(src->size()), &s), CAL_HEVC_OK) << name;
        const std::vector<std::pair<int64_t, int64_t>> fields = {
            {s.uProfileSpace, sps("general_profile_space")}, {s.uTierFlag, sps("general_tier_flag")},
            {s.uProfileIdc, sps("general_profile_idc")}, {s.uProfileIdc, std::stoll(kProfiles.at(probe.at("profile")))},
            {s.uProfileCompatibilityFlags, uCompatibility}, {s.uLevelIdc, std::stoll(probe.at("level"))},
            {s.uConstraintFlagsHigh >> 12, sps("general_progressive_source_flag") * 8 + sps("general_interlaced_source_flag") * 4 +
                                               sps("general_non_packed_constraint_flag") * 2 + sps("general_frame_only_constraint_flag")},
            {s.uMaxSubLayers, iSubLayers}, {s.uTemporalIdNesting, sps("sps_temporal_id_nesting_flag")},
            {s.uSPSId, sps("sps_seq_parameter_set_id")}, {s.uChromaFormatIdc, iChroma},
            {s.uCodedWidth, sps("pic_width_in_luma_samples")}, {s.uCodedHeight, sps("pic_height_in_luma_samples")},
            {s.uCodedWidth, std::stoll(probe.at("coded_width"))}, {s.uCodedHeight, std::stoll(probe.at("coded_height"))},
            {s.uConfWinLeft, window("left", iSubWidth)}, {s.uConfWinRight, window("right", iSubWidth)},
            {s.uConfWinTop, window("top", iSubHeight)}, {s.uConfWinBottom, window("bottom", iSubHeight)},
            {s.uWidth, std::stoll(probe.at("width"))}, {s.uHeight, std::stoll(probe.at("height"))},
            {s.uBitDepthLuma, sps("bit_depth_luma_minus8") + 8}, {s.uBitDepthChroma, sps("bit_depth_chroma_minus8") + 8},
            {s.uLog2MaxPicOrderCntLsb, sps("log2_max_pic_order_cnt_lsb_minus4") + 4},
            {s.uMaxDecPicBuffering, sps("sps_max_dec_pic_buffering_minus1" + last) + 1},
            {s.uMaxNumReorderPics, sps("sps_max_num_reorder_pics" + last)}, {s.uMaxNumReorderPics, std::stoll(probe.at("has_b_frames"))},
            {s.uMaxLatencyIncreasePlus1, sps("sps_max_latency_increase_plus1" + last)},
            {s.uLog2MinCbSize, sps("log2_min_luma_coding_block_size_minus3") + 3},
            {s.uLog2CtbSize, sps("log2_min_luma_coding_block_size_minus3") + 3 + sps("log2_diff_max_min_luma_coding_block_size")},
            {s.uScalingListEnabled, sps("scaling_list_enabled_flag")}, {s.uNumShortTermRefPicSets, sps("num_short_term_ref_pic_sets")},
            {s.uLongTermRefPicsPresent, sps("long_term_ref_pics_present_flag")},
            {s.uSarNum, std::stoll(sar.substr(0, sar.find(':')))}, {s.uSarDen, std::stoll(sar.substr(sar.find(':') + 1))},
            {s.uVideoFullRange, std::max<int64_t>(0, sps("video_full_range_flag"))},
            {s.uColourPrimaries, colour("colour_primaries")}, {s.uTransferCharacteristics, colour("transfer_characteristics")},
            {s.uMatrixCoefficients, colour("matrix_coefficients")},
            {s.uNumUnitsInTick, sps("vui_num_units_in_tick")}, {s.uTimeScale, sps("vui_time_scale")},
            {s.uExtensionFlags, sps("sps_extension_present_flag") ? -1 : 0}};
        for (size_t i = 0; i < fields.size(); ++i)
            EXPECT_EQ(fields[i].first, fields[i].second) << name << " field " << i << (src == &record ? " (record)" : "");
    }
}

INSTANTIATE_TEST_SUITE_P(Streams, SpsFixture,
                         testing::Values("main_64x48", "main10_64x48", "rext422_62x46", "gray_62x46", "sar_64x48",
                                         "extsar_64x48", "conf_1918x1078", "main_176x144"));

// The record ffmpeg's MP4 muxer wrote (hev1: array_completeness 0) is the one built from the
// parameter sets in front of the first picture of the elementary stream, byte for byte, and its
// units are those parameter sets.
TEST_P(SpsFixture, RecordBuiltFromTheStreamIsTheMuxers)
{
    const std::string name = GetParam();
    const Bytes stream = ReadHevcFixture(name + ".hevc"), record = ReadHevcFixture(name + ".hvcc");
    const int32_t iNeeded = vorCALTools_HEVC_MakeHvcC(nullptr, 0, stream.data(), int32_t(stream.size()), 4, 0);
    ASSERT_GT(iNeeded, 23) << name;
    Bytes built(static_cast<size_t>(iNeeded));
    ASSERT_EQ(vorCALTools_HEVC_MakeHvcC(built.data(), iNeeded, stream.data(), int32_t(stream.size()), 4, 0), iNeeded);
    if (name == "main_176x144") {
        // The muxer wrote min_spatial_segmentation_idc 2 and parallelismType 1 (slices) for this
        // stream, whose SPS has no bitstream_restriction (trace_headers reads flag 0 too, and the
        // SPS ends right after it): the built record says 0 and 0 (unknown).
        ASSERT_EQ(built.size(), record.size());
        EXPECT_EQ(Bytes(record.begin() + 13, record.begin() + 16), Bytes({0xF0, 0x02, 0xFD}));
        EXPECT_EQ(Bytes(built.begin() + 13, built.begin() + 16), Bytes({0xF0, 0x00, 0xFC}));
        std::copy(record.begin() + 13, record.begin() + 16, built.begin() + 13);
    }
    EXPECT_EQ(built, record) << name;
    Bytes units(size_t(vorCALTools_HEVC_HvcCToAnnexB(nullptr, 0, record.data(), int32_t(record.size()))));
    ASSERT_EQ(vorCALTools_HEVC_HvcCToAnnexB(units.data(), int32_t(units.size()), record.data(), int32_t(record.size())),
              int32_t(units.size()));
    const std::vector<Bytes> all = HevcUnits(stream);
    std::vector<Bytes> sets;
    std::copy_if(all.begin(), all.end(), std::back_inserter(sets), [](const Bytes &u) { return (u[0] >> 1) >= 32 && (u[0] >> 1) <= 34; });
    sets.resize(3);
    EXPECT_EQ(HevcUnits(units), sets);
    CALHEVCConfig c;
    ASSERT_EQ(vorCALTools_HEVC_ParseHvcC(record.data(), int32_t(record.size()), &c), CAL_HEVC_OK);
    EXPECT_EQ(std::tuple(c.uNALLengthSize, c.uNumOfArrays, c.uNumOfNalus), std::tuple(4u, 3u, 3u));
}

// The session stream: B pictures, IDR and CRA pictures, two slices a picture, two sub-layers,
// AUD, SEI and parameter sets in front of every IRAP picture.
class Session : public testing::Test {
protected:
    const HevcReport annexB = ReadHevcReport("main_176x144.hevc"), samples = ReadHevcReport("main_176x144.nal"),
                     filtered = ReadHevcReport("main_176x144.mp4toannexb.hevc");
    void SetUp() override
    {
        ASSERT_EQ(annexB.packets.size(), 12u);
        ASSERT_EQ(samples.packets.size(), 12u);
        ASSERT_EQ(filtered.packets.size(), 12u);
    }
};

Bytes Convert(const Bytes &src, int32_t iFormat, int32_t iSize)
{
    const int32_t iNeeded = vorCALTools_HEVC_ConvertFormat(nullptr, 0, src.data(), int32_t(src.size()), iFormat, iSize);
    Bytes dst(size_t(std::max(iNeeded, 0)));
    const int32_t r = vorCALTools_HEVC_ConvertFormat(dst.data(), int32_t(dst.size()), src.data(), int32_t(src.size()), iFormat, iSize);
    EXPECT_EQ(r, iNeeded);
    return r < 0 ? Bytes{} : dst;
}

// ffmpeg's parser cut the elementary stream in front of each access unit's 00 00 01, so the
// zero_byte of the next start code ended the last unit of the packet before, and its MP4 muxer
// kept it there; ITU-T H.265 B.3 ends a unit before any 00 00 00, so the conversion drops it.
std::vector<Bytes> Trimmed(std::vector<Bytes> units)
{
    for (Bytes &u : units)
        while (!u.empty() && u.back() == 0)
            u.pop_back();
    return units;
}

TEST_F(Session, PacketsConvertToTheSamplesAndBackUnitForUnit)
{
    for (size_t k = 0; k < 12; ++k) {
        const Bytes &au = annexB.packets[k], &sample = samples.packets[k];
        EXPECT_EQ(vorCALTools_HEVC_CheckFormat(au.data(), int32_t(au.size())), CAL_AVC_FORMAT_ANNEXB);
        EXPECT_EQ(vorCALTools_HEVC_CheckFormat(sample.data(), int32_t(sample.size())), CAL_AVC_FORMAT_NAL);
        const Bytes lengths = Convert(au, 0, 4);
        EXPECT_EQ(HevcUnits(lengths, 4), Trimmed(HevcUnits(sample, 4))) << k;
        // ffmpeg's hevc_mp4toannexb output, byte for byte, except that it also put the record's
        // three parameter sets in front of the first slice of every IRAP picture.
        const Bytes converted = Convert(sample, 0, 4);
        if (!samples.keys[k]) {
            EXPECT_EQ(converted, filtered.packets[k]) << k;
        } else {
            std::vector<Bytes> expected = HevcUnits(filtered.packets[k]);
            const auto slice = std::find_if(expected.begin(), expected.end(), [](const Bytes &u) { return (u[0] >> 1) <= 31; });
            ASSERT_GE(slice - expected.begin(), 3);
            expected.erase(slice - 3, slice);
            EXPECT_EQ(HevcUnits(converted), expected) << k;
        }
        // The other length sizes; one byte carries units up to 255 bytes.
        const std::vector<Bytes> units = HevcUnits(au);
        const bool bLong = std::any_of(units.begin(), units.end(), [](const Bytes &u) { return u.size() > 255; });
        for (int32_t iSize : {1, 2, 3}) {
            const int32_t r = vorCALTools_HEVC_ConvertFormat(nullptr, 0, au.data(), int32_t(au.size()), CAL_AVC_FORMAT_ANNEXB, iSize);
            if (iSize == 1 && bLong)
                EXPECT_EQ(r, CAL_HEVC_ERR_TOO_LONG) << k;
            else
                EXPECT_EQ(Convert(Convert(au, CAL_AVC_FORMAT_ANNEXB, iSize), CAL_AVC_FORMAT_NAL, iSize), Convert(lengths, 0, 4)) << k;
        }
    }
}

TEST_F(Session, IrapFramesAreTheKeyFramesAndCarryTheParameterSets)
{
    size_t uKeys = 0;
    for (size_t k = 0; k < 12; ++k) {
        const Bytes &au = annexB.packets[k], &sample = samples.packets[k];
        uKeys += annexB.keys[k];
        EXPECT_EQ(vorCALTools_HEVC_IsIRAP(au.data(), int32_t(au.size()), 0), int32_t(annexB.keys[k])) << k;
        EXPECT_EQ(vorCALTools_HEVC_IsIRAP(sample.data(), int32_t(sample.size()), 4), int32_t(samples.keys[k])) << k;
        // Every picture has an AUD and a prefix SEI in front of its slices; the IRAP pictures
        // VPS, SPS, PPS and three SEI. Both framings give the same run.
        int32_t iRunB = -1, iRunN = -1;
        const uint8_t *pB = vorCALTools_HEVC_GetConfigStream(au.data(), int32_t(au.size()), 0, &iRunB);
        const uint8_t *pN = vorCALTools_HEVC_GetConfigStream(sample.data(), int32_t(sample.size()), 4, &iRunN);
        ASSERT_TRUE(pB == au.data() && pN == sample.data()) << k;
        const std::vector<Bytes> run = HevcUnits(Bytes(pB, pB + iRunB));
        EXPECT_EQ(run, HevcUnits(Bytes(pN, pN + iRunN), 4)) << k;
        std::vector<uint32_t> types;
        for (const Bytes &u : run)
            types.push_back(u[0] >> 1);
        const std::vector<uint32_t> kKey{35, 32, 33, 34, 39, 39, 39}, kOther{35, 39};
        EXPECT_EQ(types, annexB.keys[k] ? kKey : kOther) << k;
        // What follows the run begins with a slice.
        EXPECT_LE(au[iRunB + 4] >> 1, 31) << k;
    }
    EXPECT_EQ(uKeys, 2u);
}

// The Annex B stream made of an MP4: the record's units, then every sample converted.
// fixtures-hevc.sh decoded exactly these bytes of decode_128x96 with ffmpeg to the frames of the
// MP4 (every picture hash SEI verified) and wrote their sum (Sum) beside the frame MD5s.
Bytes AnnexBOfMp4(const std::string &name)
{
    const Bytes record = ReadHevcFixture(name + ".hvcc");
    Bytes out(size_t(vorCALTools_HEVC_HvcCToAnnexB(nullptr, 0, record.data(), int32_t(record.size()))));
    vorCALTools_HEVC_HvcCToAnnexB(out.data(), int32_t(out.size()), record.data(), int32_t(record.size()));
    for (const Bytes &s : ReadHevcReport(name + ".nal").packets)
        out = Cat({out, Convert(s, CAL_AVC_FORMAT_NAL, 4)});
    return out;
}

TEST(Decode, ConvertedMp4IsTheStreamFfmpegDecodedToTheSameFrames)
{
    const Bytes stream = AnnexBOfMp4("decode_128x96");
    std::ifstream in(std::string(VORCAL_TEST_DATA_DIR) + "/hevc/decode_128x96.decode.txt");
    std::string sum;
    size_t uFrames = 0;
    for (std::string line; std::getline(in, line);) {
        if (line.starts_with("annexb "))
            sum = line.substr(7);
        uFrames += line.starts_with("frame ");
    }
    EXPECT_EQ(Sum(stream), sum);
    EXPECT_EQ(uFrames, 12u);
    // The samples carry no parameter sets: the stream decodes only with the record's in front.
    const std::vector<Bytes> units = HevcUnits(stream);
    EXPECT_EQ(std::count_if(units.begin(), units.end(), [](const Bytes &u) { return (u[0] >> 1) >= 32 && (u[0] >> 1) <= 34; }), 3);
    EXPECT_EQ(units[0][0] >> 1, 32);
}

// Writes that stream for fixtures-hevc.sh (run with --gtest_also_run_disabled_tests; the path
// comes from HEVC_ANNEXB_OUT).
TEST(Decode, DISABLED_WriteConvertedMp4)
{
    const char *pPath = std::getenv("HEVC_ANNEXB_OUT");
    ASSERT_NE(pPath, nullptr);
    const Bytes stream = AnnexBOfMp4("decode_128x96");
    std::ofstream(pPath, std::ios::binary).write(reinterpret_cast<const char *>(stream.data()), std::streamsize(stream.size()));
    std::printf("annexb %s\n", Sum(stream).c_str());
}

} // namespace
