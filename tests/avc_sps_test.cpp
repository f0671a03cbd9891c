#include <gtest/gtest.h>

#include <tuple>

#include <vorcal/video_tools.h>

#include "avc_streams.hpp"

namespace {

using namespace vorcal::test;

constexpr uint32_t kUntouched = 0xA5A5A5A5u;

struct SpsFields {
    uint32_t profile = 66, constraints = 0xC0, level = 30;
    uint32_t spsId = 0, log2MaxFrameNumMinus4 = 0;
    uint32_t pocType = 0;
    int32_t pocCycle[3] = {0, 0, 0}; // offsets for type 1
    uint32_t pocCycleLength = 0;
    uint32_t refFrames = 1;
    uint32_t widthMbsMinus1 = 39, heightMapUnitsMinus1 = 29;
    uint32_t frameMbsOnly = 1;
    uint32_t crop[4] = {0, 0, 0, 0};
    bool cropping = false;
    bool vui = false;
    bool aspectInfo = false;
    uint32_t aspectIdc = 255, sarW = 0, sarH = 0;
};

// The SPS unit (header byte 0x67, emulation prevention applied) for these fields.
Bytes BuildSps(const SpsFields &f)
{
    BitWriter w;
    w.Put(f.profile, 8).Put(f.constraints, 8).Put(f.level, 8);
    w.PutUE(f.spsId).PutUE(f.log2MaxFrameNumMinus4).PutUE(f.pocType);
    if (f.pocType == 0) {
        w.PutUE(2);
    } else if (f.pocType == 1) {
        w.PutBit(0).PutSE(-3).PutSE(5).PutUE(f.pocCycleLength);
        for (uint32_t i = 0; i < f.pocCycleLength; ++i)
            w.PutSE(f.pocCycle[i % 3]);
    }
    w.PutUE(f.refFrames).PutBit(0).PutUE(f.widthMbsMinus1).PutUE(f.heightMapUnitsMinus1).PutBit(f.frameMbsOnly);
    if (!f.frameMbsOnly)
        w.PutBit(1);
    w.PutBit(1).PutBit(f.cropping);
    if (f.cropping) {
        for (uint32_t c : f.crop)
            w.PutUE(c);
    }
    w.PutBit(f.vui);
    if (f.vui) {
        w.PutBit(f.aspectInfo);
        if (f.aspectInfo) {
            w.Put(f.aspectIdc, 8);
            if (f.aspectIdc == 255)
                w.Put(f.sarW, 16).Put(f.sarH, 16);
        }
        w.PutBit(0).PutBit(0).PutBit(0).PutBit(0).PutBit(0).PutBit(0).PutBit(0); // remaining VUI flags
    }
    w.Trailing();
    return Cat({{0x67}, BitWriter::Escape(w.Bytes())});
}

struct SpsCase {
    const char *name;
    SpsFields fields;
    uint32_t result;
    CALSPSInfo expected; // kUntouched where the field must keep its old value
};

CALSPSInfo Info(uint32_t p, uint32_t l, uint32_t w, uint32_t h, uint32_t ref, uint32_t crop, uint32_t cl, uint32_t cr,
                uint32_t ct, uint32_t cb, uint32_t aspect)
{
    return CALSPSInfo{p, l, w, h, ref, crop, cl, cr, ct, cb, aspect};
}

SpsFields With(void (*edit)(SpsFields &))
{
    SpsFields f;
    edit(f);
    return f;
}

class GetSPSInfo : public testing::TestWithParam<SpsCase> {};

auto Fields(const CALSPSInfo &i)
{
    return std::tuple(i.uProfile, i.uLevel, i.uWidth, i.uHeight, i.uRefFrames, i.uCropping, i.uCropLeft, i.uCropRight,
                      i.uCropTop, i.uCropBottom, i.uAspectClass);
}

CALSPSInfo Untouched()
{
    return Info(kUntouched, kUntouched, kUntouched, kUntouched, kUntouched, kUntouched, kUntouched, kUntouched,
                kUntouched, kUntouched, kUntouched);
}

TEST_P(GetSPSInfo, Fields)
{
    const SpsCase &c = GetParam();
    const Bytes data = Cat({AnnexB({BuildSps(c.fields)}), AnnexB({kPps})});
    CALSPSInfo info = Untouched();
    EXPECT_EQ(vorCALTools_AVC_GetSPSInfo(data.data(), static_cast<int32_t>(data.size()), &info), c.result);
    EXPECT_EQ(Fields(info), Fields(c.expected));
}

const uint32_t U = kUntouched;

INSTANTIATE_TEST_SUITE_P(
    Sps, GetSPSInfo,
    testing::Values(
        SpsCase{"baseline640x480", SpsFields{}, 0, Info(66, 30, 640, 480, 1, 0, 0, 0, 0, 0, U)},
        SpsCase{"pocType1", With([](SpsFields &f) { f.pocType = 1; f.pocCycleLength = 3; f.pocCycle[1] = -7; f.refFrames = 4; }),
                0, Info(66, 30, 640, 480, 4, 0, 0, 0, 0, 0, U)},
        SpsCase{"pocType2", With([](SpsFields &f) { f.pocType = 2; f.refFrames = 3; }), 0,
                Info(66, 30, 640, 480, 3, 0, 0, 0, 0, 0, U)},
        SpsCase{"pocType3", With([](SpsFields &f) { f.pocType = 3; }), 3, Info(66, 30, U, U, U, U, U, U, U, U, U)},
        SpsCase{"cropping1080", With([](SpsFields &f) { f.profile = 77; f.level = 40; f.widthMbsMinus1 = 119; f.heightMapUnitsMinus1 = 67; f.cropping = true; f.crop[3] = 4; }),
                0, Info(77, 40, 1920, 1088, 1, 1, 0, 0, 0, 4, U)},
        // Field coding: mb_adaptive_frame_field_flag is read; the height stays one field's.
        SpsCase{"fields", With([](SpsFields &f) { f.frameMbsOnly = 0; f.heightMapUnitsMinus1 = 17; }), 0,
                Info(66, 30, 640, 288, 1, 0, 0, 0, 0, 0, U)},
        SpsCase{"vuiNoAspect", With([](SpsFields &f) { f.vui = true; }), 0, Info(66, 30, 640, 480, 1, 0, 0, 0, 0, 0, 1)},
        SpsCase{"vuiSar4to3", With([](SpsFields &f) { f.vui = f.aspectInfo = true; f.sarW = 4; f.sarH = 3; }), 0,
                Info(66, 30, 640, 480, 1, 0, 0, 0, 0, 0, 2)},
        SpsCase{"vuiSar16to16", With([](SpsFields &f) { f.vui = f.aspectInfo = true; f.sarW = 0x110; f.sarH = 0x10; }), 0,
                Info(66, 30, 640, 480, 1, 0, 0, 0, 0, 0, 4)},
        // aspect_ratio_idc 1 carries no SAR: the two 16-bit reads take what follows.
        SpsCase{"vuiAspectIdcOnly", With([](SpsFields &f) { f.vui = f.aspectInfo = true; f.aspectIdc = 1; }), 0,
                Info(66, 30, 640, 480, 1, 0, 0, 0, 0, 0, 1)},
        // High profile: the chroma fields are not read, so this layout (written without them)
        // parses exactly like Baseline.
        SpsCase{"highProfileSameLayout", With([](SpsFields &f) { f.profile = 100; f.level = 51; }), 0,
                Info(100, 51, 640, 480, 1, 0, 0, 0, 0, 0, U)},
        // Constraint byte and level 0, then six zero bits: 67 42 00 00 03 0x, the escape at
        // unit index 4 (the first index the reader removes).
        SpsCase{"escapeAfterLevel", With([](SpsFields &f) { f.constraints = 0; f.level = 0; f.spsId = 100; }), 0,
                Info(66, 0, 640, 480, 1, 0, 0, 0, 0, 0, U)}),
    [](const testing::TestParamInfo<SpsCase> &info) { return info.param.name; });

struct SearchCase {
    const char *name;
    Bytes data;
    uint32_t result;
};

class SpsSearch : public testing::TestWithParam<SearchCase> {};

TEST_P(SpsSearch, Results)
{
    const SearchCase &c = GetParam();
    CALSPSInfo info = Untouched();
    EXPECT_EQ(vorCALTools_AVC_GetSPSInfo(c.data.data(), static_cast<int32_t>(c.data.size()), &info), c.result);
    if (c.result == 0) {
        EXPECT_EQ(info.uProfile, 66u);
        EXPECT_EQ(info.uLevel, 30u);
        EXPECT_EQ(info.uWidth, 640u);
    }
}

const Bytes kSps640 = BuildSps(SpsFields{});

INSTANTIATE_TEST_SUITE_P(
    Search, SpsSearch,
    testing::Values(SearchCase{"length4", {0, 0, 0, 1}, 1},
                    SearchCase{"fourByteCode", AnnexB({kSps640}), 0},
                    SearchCase{"threeByteCode", AnnexB({kSps640}, {3}), 0},
                    SearchCase{"anyFirstThreeBytesPassedOver", Cat({{0xAB, 0xCD, 0xEF}, kSps640}), 0},
                    SearchCase{"seiFirst", AnnexB({kSei, kSps640}), 0},
                    SearchCase{"forbiddenBit", AnnexB({{0xE7, 0x42, 0xC0, 0x1E}}), 2},
                    SearchCase{"onlyPps", AnnexB({{0x68, 0xCE, 0x38, 0x80, 0x11}}), 3},
                    SearchCase{"configurationRecord", {0x01, 0x42, 0xC0, 0x1E, 0xFF, 0xE1, 0x00, 0x04, 0x67, 0x42, 0xC0, 0x1E, 0x01, 0x00, 0x02, 0x68, 0xCE}, 3},
                    // After the next start code only 4 bytes remain.
                    SearchCase{"fewBytesAfterCode", Cat({AnnexB({kSei}), {0, 0, 0, 1}}), 1}),
    [](const testing::TestParamInfo<SearchCase> &info) { return info.param.name; });

TEST(GetSPSInfo, TruncatedAtEveryLength)
{
    // Every prefix of a VUI-carrying SPS: always a result code, never a read beyond the data,
    // and profile and level right as soon as they are inside it.
    SpsFields f;
    f.pocType = 1;
    f.pocCycleLength = 3;
    f.cropping = true;
    f.vui = f.aspectInfo = true;
    f.sarW = 4;
    f.sarH = 3;
    const Bytes all = AnnexB({kSei, BuildSps(f)});
    for (size_t n = 0; n <= all.size(); ++n) {
        const Bytes cut(all.begin(), all.begin() + static_cast<std::ptrdiff_t>(n));
        CALSPSInfo info = Untouched();
        const uint32_t r = vorCALTools_AVC_GetSPSInfo(cut.data(), static_cast<int32_t>(n), &info);
        EXPECT_LE(r, 3u);
        if (r == 0 && n >= 4 + kSei.size() + 4 + 4) {
            EXPECT_EQ(info.uProfile, 66u) << n;
            EXPECT_EQ(info.uLevel, 30u) << n;
        }
    }
    CALSPSInfo info = Untouched();
    EXPECT_EQ(vorCALTools_AVC_GetSPSInfo(all.data(), static_cast<int32_t>(all.size()), &info), 0u);
    EXPECT_EQ(info.uAspectClass, 2u);
}

TEST(GetSPSInfo, HugeCycleOnTruncatedDataEnds)
{
    // num_ref_frames_in_pic_order_cnt_cycle near 2^31 with nothing behind it.
    BitWriter w;
    w.Put(66, 8).Put(0, 8).Put(30, 8).PutUE(0).PutUE(0).PutUE(1).PutBit(0).PutUE(0).PutUE(0).PutUE(0x7FFFFFF0u);
    const Bytes data = Cat({{0, 0, 0, 1, 0x67}, w.Bytes()});
    CALSPSInfo info = Untouched();
    EXPECT_EQ(vorCALTools_AVC_GetSPSInfo(data.data(), static_cast<int32_t>(data.size()), &info), 0u);
    EXPECT_EQ(info.uProfile, 66u);
}

} // namespace
