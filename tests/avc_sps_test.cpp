#include <gtest/gtest.h>

#include <array>
#include <bit>
#include <tuple>

#include <vorcal/video_tools.h>

#include "avc_streams.hpp"

namespace {

using namespace vorcal::test;
using Info = std::array<uint32_t, 11>; // CALSPSInfo field by field
constexpr uint32_t U = 0xA5A5A5A5u;     // a field the call must not write

struct Sps {
    uint32_t profile = 66, level = 30, spsId = 0, pocType = 0, cycle = 0, refFrames = 1, heightMinus1 = 29, frameMbsOnly = 1, cropBottom = 0;
    bool cropping = false, vui = false, aspectInfo = false;
    uint32_t aspectIdc = 255, sarW = 0, sarH = 0, constraints = 0xC0;
};

// The SPS unit (header 0x67, emulation prevention applied), 640 pixels wide.
Bytes Build(const Sps &f)
{
    BitWriter w;
    w.Put(f.profile, 8).Put(f.constraints, 8).Put(f.level, 8).PutUE(f.spsId).PutUE(0).PutUE(f.pocType);
    if (f.pocType == 0)
        w.PutUE(2);
    if (f.pocType == 1) {
        w.PutBit(0).PutSE(-3).PutSE(5).PutUE(f.cycle);
        for (uint32_t i = 0; i < f.cycle && i < 3; ++i)
            w.PutSE(-7 * int32_t(i));
    }
    w.PutUE(f.refFrames).PutBit(0).PutUE(39).PutUE(f.heightMinus1).PutBit(f.frameMbsOnly).Put(1, f.frameMbsOnly ? 0 : 1).PutBit(1).PutBit(f.cropping);
    if (f.cropping)
        w.PutUE(0).PutUE(0).PutUE(0).PutUE(f.cropBottom);
    if (w.PutBit(f.vui); f.vui) {
        if (w.PutBit(f.aspectInfo); f.aspectInfo)
            w.Put(f.aspectIdc, 8);
        if (f.aspectInfo && f.aspectIdc == 255)
            w.Put(f.sarW, 16).Put(f.sarH, 16);
        w.Put(0, 7); // the VUI flags after the aspect ratio
    }
    return Cat({{0x67}, BitWriter::Escape(w.Trailing().Bytes())});
}

std::pair<uint32_t, Info> Parse(const Bytes &d)
{
    CALSPSInfo info{U, U, U, U, U, U, U, U, U, U, U};
    const uint32_t r = vorCALTools_AVC_GetSPSInfo(d.data(), static_cast<int32_t>(d.size()), &info);
    return {r, std::bit_cast<Info>(info)};
}

TEST(GetSPSInfo, Table)
{
    const Info none{U, U, U, U, U, U, U, U, U, U, U}, vga{66, 30, 640, 480, 1, 0, 0, 0, 0, 0, U};
    auto sps = [](const Sps &f) { return AnnexB({Build(f), kPps}); };
    const std::tuple<const char *, Bytes, uint32_t, Info> cases[] = {
        {"baseline", sps({}), 0, vga}, {"pocType3", sps({.pocType = 3}), 3, {66, 30, U, U, U, U, U, U, U, U, U}},
        {"pocType1", sps({.pocType = 1, .cycle = 3, .refFrames = 4}), 0, {66, 30, 640, 480, 4, 0, 0, 0, 0, 0, U}},
        {"pocType2", sps({.pocType = 2, .refFrames = 3}), 0, {66, 30, 640, 480, 3, 0, 0, 0, 0, 0, U}},
        {"cropping", sps({.profile = 77, .level = 40, .heightMinus1 = 67, .cropBottom = 4, .cropping = true}), 0, {77, 40, 640, 1088, 1, 1, 0, 0, 0, 4, U}},
        // mb_adaptive_frame_field_flag is read; the height stays one field's.
        {"fields", sps({.heightMinus1 = 17, .frameMbsOnly = 0}), 0, {66, 30, 640, 288, 1, 0, 0, 0, 0, 0, U}},
        {"vuiNoAspect", sps({.vui = true}), 0, {66, 30, 640, 480, 1, 0, 0, 0, 0, 0, 1}},
        {"sar4to3", sps({.vui = true, .aspectInfo = true, .sarW = 4, .sarH = 3}), 0, {66, 30, 640, 480, 1, 0, 0, 0, 0, 0, 2}},
        {"sar16to16", sps({.vui = true, .aspectInfo = true, .sarW = 0x110, .sarH = 0x10}), 0, {66, 30, 640, 480, 1, 0, 0, 0, 0, 0, 4}},
        // aspect_ratio_idc 1 carries no SAR: the two 16-bit reads take what follows.
        {"aspectIdcOnly", sps({.vui = true, .aspectInfo = true, .aspectIdc = 1}), 0, {66, 30, 640, 480, 1, 0, 0, 0, 0, 0, 1}},
        // High profile: the chroma fields are not read, so this layout parses like Baseline.
        {"high", sps({.profile = 100, .level = 51}), 0, {100, 51, 640, 480, 1, 0, 0, 0, 0, 0, U}},
        // 67 42 00 00 03 0x: the escape at unit index 4 is the first the reader removes.
        {"escapeAfterLevel", sps({.level = 0, .spsId = 100, .constraints = 0}), 0, {66, 0, 640, 480, 1, 0, 0, 0, 0, 0, U}},
        {"threeByteCode", AnnexB({Build({})}, 3), 0, vga}, {"anyFirstThreeBytes", Cat({{0xAB, 0xCD, 0xEF}, Build({})}), 0, vga},
        {"seiFirst", AnnexB({kSei, Build({})}), 0, vga}, {"length4", {0, 0, 0, 1}, 1, none},
        {"forbiddenBit", AnnexB({{0xE7, 0x42, 0xC0, 0x1E}}), 2, none}, {"onlyPps", AnnexB({{0x68, 0xCE, 0x38, 0x80, 0x11}}), 3, none},
        {"record", {0x01, 0x42, 0xC0, 0x1E, 0xFF, 0xE1, 0x00, 0x04, 0x67, 0x42, 0xC0, 0x1E, 0x01, 0x00, 0x02, 0x68, 0xCE}, 3, none},
        {"fewBytesAfterCode", Cat({AnnexB({kSei}), {0, 0, 0, 1}}), 1, none}};
    for (const auto &[name, data, result, expected] : cases)
        EXPECT_EQ(Parse(data), std::pair(result, expected)) << name;
    // A huge pic_order_cnt cycle count with little data behind it ends; what follows is open.
    const auto [r, info] = Parse(AnnexB({Build({.pocType = 1, .cycle = 0x7FFFFFF0u})}));
    EXPECT_EQ(std::pair(r, info[0]), std::pair(0u, 66u));
}

} // namespace
