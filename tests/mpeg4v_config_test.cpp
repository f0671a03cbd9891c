#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <bit>
#include <vector>

#include <vorcal/video_tools.h>

#include "bit_writer.hpp"

using vorcal::test::BitWriter;
using Bytes = std::vector<uint8_t>;

namespace {

constexpr uint32_t U = 77;              // a field the walk leaves untouched
using Result = std::array<uint32_t, 6>; // result, profile, level, source format, width, height
using Case = std::pair<Bytes, Result>;  // configuration data and the walk's result for it

// The walk on an exactly-sized heap copy of the first n bytes, so that ASan sees any read past it.
Result Walk(const Bytes &dsi, size_t n = SIZE_MAX)
{
    const Bytes copy(dsi.begin(), dsi.begin() + long(std::min(n, dsi.size())));
    CALMPEG4DSIInfo i{U, U, U, U, U};
    // A braced list is evaluated in order: the walk runs before the fields are read.
    return {vorCALTools_MPEG4V_GetDSIInfo(copy.data(), uint32_t(copy.size()), &i), i.uProfile, i.uLevel,
            i.uSourceFormat, i.uWidth, i.uHeight};
}

Bytes operator+(Bytes a, const Bytes &b)
{
    a.insert(a.end(), b.begin(), b.end());
    return a;
}

const Bytes kVos = {0, 0, 1, 0xB0, 0x03}, kVisualObject = {0, 0, 1, 0xB5, 0x09}, kVo = {0, 0, 1, 0x00},
            kVolCode = {0, 0, 1, 0x20}, kTail = {0x5A, 0x5A, 0x5A, 0x5A, 0x5A, 0x5A, 0x5A, 0x5A};

// The optional fields of a layer: is_object_layer_identifier, aspect_ratio_info, control (0 no
// vol_control_parameters, 1 without VBV parameters, 2 with them), vop_time_increment_resolution,
// fixed_vop_rate, and the picture size.
struct Vol {
    uint32_t layerId = 0, aspect = 1, control = 0, resolution = 30000, fixedRate = 0, width = 352, height = 288;
};

// video_object_layer() from after its start code to the end of its byte (ISO/IEC 14496-2 6.2.3).
Bytes VolBody(const Vol &v)
{
    BitWriter w;
    w.Put(0, 1).Put(0x01, 8).Put(v.layerId, 1); // random_accessible_vol, type, is_object_layer_identifier
    if (v.layerId)
        w.Put(2, 4).Put(1, 3);
    w.Put(v.aspect, 4);
    if (v.aspect == 15)
        w.Put(12, 8).Put(11, 8); // par_width, par_height
    w.Put(v.control != 0, 1);
    if (v.control != 0)
        w.Put(1, 2).Put(1, 1).Put(v.control == 2, 1); // chroma_format, low_delay, vbv_parameters
    if (v.control == 2) // VBV bit rate, buffer size and occupancy with their markers: 79 bits, all ones
        w.Put(0x7FFFFFFF, 31).Put(0x7FFFFFFF, 31).Put(0x1FFFF, 17);
    w.Put(0, 2).Put(1, 1).Put(v.resolution, 16).Put(1, 1).Put(v.fixedRate, 1);
    if (v.fixedRate) // fixed_vop_time_increment, all ones
        w.Put(0xFFFF, unsigned(std::bit_width((v.resolution - 1) | 1u)));
    return w.Put(1, 1).Put(v.width, 13).Put(1, 1).Put(v.height, 13).Put(1, 1).Put(0b010, 3).Align().Bytes();
}

// An H.263 picture header (PSC, TR, PTYPE and, for source format 7, PLUSPTYPE and CPFMT) and the
// walk's result for it.
Case Picture(uint32_t width, uint32_t height, uint32_t format, uint32_t ufep = 1, uint32_t extFormat = 6,
             uint32_t widthInd = 79, uint32_t heightInd = 60)
{
    BitWriter w;
    w.Put(0x20, 22).Put(0x55, 8).Put(0b10, 2).Put(0, 3).Put(format, 3);
    if (format == 7 && ufep == 1)
        w.Put(ufep, 3).Put(extFormat, 3).Put(0, 1).Put(0b00000000001000, 14); // UFEP, OPPTYPE
    else if (format == 7)
        w.Put(ufep, 3);
    w.Put(0, 6).Put(0b001, 3).Put(0, 1); // MPPTYPE and CPM, or PTYPE's rest and PQUANT
    if (format == 7 && ufep == 1 && extFormat == 6)
        w.Put(1, 4).Put(widthInd, 9).Put(1, 1).Put(heightInd, 9); // CPFMT
    return {w.Put(8, 5).Align().Bytes(), {0, U, U, format, width, height}};
}

// Each configuration in full, and every prefix of it: the walk stays inside the data and only
// empty data answers 1.
TEST(GetDSIInfo, Walk)
{
    auto vos = [](uint8_t indication, uint32_t profile, uint32_t level) {
        return Case{Bytes{0, 0, 1, 0xB0, indication} + kVisualObject + kTail, {0, profile, level, U, U, U}};
    };
    auto layer = [](const Vol &v) {
        return Case{kVos + kVisualObject + kVo + kVolCode + VolBody(v) + kTail, {0, 0, 3, U, v.width, v.height}};
    };
    const Bytes vol = kVolCode + VolBody({}), qcif = VolBody({.width = 176, .height = 144});
    const Case cases[] = {
        // profile_and_level_indication
        vos(0x01, 0, 1), vos(0x02, 0, 2), vos(0x03, 0, 3), vos(0x04, 0, 4), vos(0x05, 0, 5), vos(0x08, 0, 0),
        vos(0x09, 0, 0), vos(0x11, 1, 1), vos(0x12, 1, 2), vos(0x00, 255, 255), vos(0xF5, 255, 255),
        // The optional layer fields in front of the picture size, one at a time and all together.
        layer({}), layer({.layerId = true}), layer({.aspect = 15}), layer({.control = 1}), layer({.control = 2}),
        layer({.resolution = 1, .fixedRate = true}), layer({.resolution = 2, .fixedRate = true}),
        layer({.resolution = 65535, .fixedRate = true, .width = 1920, .height = 1080}),
        layer({true, 15, 2, 30000, true, 8191, 2}),
        // Data that ends right after the size fields still gives them, although the reader
        // reported the end a few bytes before.
        {kVos + kVo + kVolCode + VolBody({true, 15, 2, 25, true, 720, 576}), {0, 0, 3, U, 720, 576}},
        // Which headers the walk acts on, and where it stops.
        {kVos + vol + kTail, {0, 0, 3, U, U, U}},                                        // layer without object
        {kVo + Bytes{0, 0, 1, 0xB2, 'x'} + vol + kTail, {0, U, U, U, U, U}},             // user data between
        {Bytes{0xFF, 0x12} + kVo + vol + kTail, {0, U, U, U, 352, 288}},                 // garbage first
        {kVos + Bytes{0, 0, 1, 0xB1, 0, 0, 1, 0xB0, 0xF0} + kVo + vol, {0, 0, 3, U, U, U}}, // sequence end
        {kVos + kVo + vol + Bytes{0, 0, 1, 0xB0, 0x12} + kVo + kVolCode + qcif + kTail, {0, 1, 2, U, 176, 144}},
        {{0, 0, 1, 0, 0, 0, 1, 0x20, 0x00, 0x00, 0x03, 0x00, 0x00, 0x03}, {0, U, U, U, 0, 0}}, // all-zero layer
        {{}, {1, U, U, U, U, U}},
        // H.263 picture headers: source formats, PLUSPTYPE with custom and table sizes, the end marker.
        {Bytes{0x12, 0x34, 0, 0, 0x80, 0x02, 0x08} + kTail, {0, U, U, 2, 176, 144}},
        Picture(0, 0, 0), Picture(128, 96, 1), Picture(176, 144, 2), Picture(352, 288, 3), Picture(704, 576, 4),
        Picture(1408, 1152, 5), Picture(0, 0, 6), Picture(320, 240, 7), Picture(2048, 2044, 7, 1, 6, 511, 511),
        Picture(176, 144, 7, 1, 2), Picture(0, 0, 7, 1, 7), Picture(0, 0, 7, 0),
        {Picture(176, 144, 2).first + Bytes{0, 0, 0xFE, 0x00} + Picture(352, 288, 3).first, {0, U, U, 2, 176, 144}},
    };
    for (const auto &[data, expected] : cases) {
        for (size_t n = 0; n < data.size(); ++n)
            EXPECT_EQ(Walk(data, n)[0], n == 0 ? 1u : 0u) << ::testing::PrintToString(data) << n;
        EXPECT_EQ(Walk(data), expected) << ::testing::PrintToString(data);
    }
    CALMPEG4DSIInfo info{U, U, U, U, U};
    EXPECT_EQ((std::pair{vorCALTools_MPEG4V_GetDSIInfo(nullptr, 16, &info), info.uWidth}), (std::pair{0u, U}));
}

TEST(VC1GetExtraDataInfo, Profile)
{
    const uint8_t extra[] = {0x4E, 0xC0};
    uint32_t a = U, b = U, c = U;
    auto get = vorCALTools_VC1_GetExtraDataInfo;
    EXPECT_EQ((std::array{get(extra, 1, &a), get(extra + 1, 1, &b), a, b, get(nullptr, 4, &c), get(extra, 0, &c),
                          get(extra, 1, nullptr), c}),
              (std::array{0u, 0u, 1u, 3u, 1u, 1u, 1u, U})); // 1 for null or empty data and a null out pointer
}

} // namespace
