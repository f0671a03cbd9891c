#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <random>
#include <string>
#include <tuple>
#include <utility>
#include <vector>

#include <vorcal/video_tools.h>

#include "recording_sal.hpp"

using namespace vorcal::test; // HasPlainTrace, HasTrace, RecordingSal
using Bytes = std::vector<uint8_t>;

namespace {

constexpr uint32_t kMpeg4 = 0x20, kMpeg4b = 0xF1, kH263 = 0xC0, kH264 = 0xC1, kH263Family = 0xC2, kIntraOnly = 0xDB,
                   kMpeg12 = 0xF2, kWmv1 = 0x31564D57, kWmv2 = 0x32564D57, kMp43 = 0x3334504D, kWmv3 = 0x33564D57,
                   kWvc1 = 0x31435657;

// VC-1 sequence headers whose fourth byte enables B pictures (0x70), INTERPFRM (0x02) and
// RANGEREDFRM (0x80).
const uint8_t kSeqPlain[] = {0x4E, 0, 0, 0x00}, kSeqB[] = {0x4E, 0, 0, 0x10}, kSeqInterp[] = {0x4E, 0, 0, 0x02},
              kSeqRangeRed[] = {0x4E, 0, 0, 0x80}, kSeqAll[] = {0x4E, 0, 0, 0xF2};

// extra: the NAL length size for H.264, the sequence header for VC-1. minLen: the shortest prefix
// that gives intra and b (shorter ones give 0 and 0). valid: for the whole frame, with the type
// of the Invalid NAL Type trace, or 0 for none.
struct Case {
    uint32_t oti;
    Bytes frame;
    CALParam extra;
    size_t minLen;
    int intra, b, valid, badNalType = 0;
};

// Every prefix of each frame, each in an exactly-sized heap buffer so that ASan sees any read
// past the frame, and a negative length; the validity rule and its traces on the whole frame.
TEST(Classification, EveryPrefixOfEachRule)
{
    auto P = [](const uint8_t *seq) { return reinterpret_cast<CALParam>(seq); };
    const Case cases[] = {
        // vop_coding_type after the first 00 00 01 B6 that leaves a byte after the next (I, P, B
        // after other bytes, after a GOV header, after an overlapping start code, none, other OTI);
        // a frame beginning with a start code is valid up to the VOP start code and for C3.
        {kMpeg4, {0, 0, 1, 0xB6, 0x10, 0x00}, 0, 6, 1, 0, 1}, {kMpeg4, {0, 0, 1, 0xB6, 0x50, 0x00}, 0, 0, 0, 0, 1},
        {kMpeg4b, {0x12, 0, 0, 1, 0xB6, 0xBF, 0x00}, 0, 7, 0, 1, 1},
        {kMpeg4b, {0, 0, 1, 0xB3, 0x00, 0x10, 0, 0, 0, 1, 0xB6, 0x10, 0x00}, 0, 13, 1, 0, 1},
        {kMpeg4, {0, 0, 1, 0, 0, 1, 0xB6, 0x10, 0}, 0, 9, 1, 0, 1}, {kMpeg4, {0, 0, 1, 0xB0, 1, 0, 0, 0}, 0, 0, 0, 0, 1},
        {0x21, {0, 0, 1, 0xB6, 0x90, 0, 0, 0}, 0, 0, 0, 0, 1}, {kMpeg4, {0, 0, 1, 0xB7, 0, 0}, 0, 0, 0, 0, 0},
        {kMpeg4, {0, 0, 1, 0xC3, 0}, 0, 0, 0, 0, 1}, {kMpeg4, {0, 0, 1, 0xB6}, 0, 0, 0, 0, 0},
        // H.263 PTYPE (intra, inter, bad PSC), PLUSPTYPE with UFEP 001 (picture type in byte 7) or
        // 000 (byte 5). Validity needs 7 bytes.
        {kH263, {0, 0, 0x80, 0x02, 0x08}, 0, 5, 1, 0, 0}, {kH263, {0, 0, 0x80, 0x02, 0x0A}, 0, 0, 0, 0, 0},
        {kH263, {0, 0, 0x83, 0, 0, 0, 0}, 0, 5, 1, 0, 1}, {kH263, {0, 0, 0x84, 0, 0, 0, 0}, 0, 0, 0, 0, 0},
        {kH263, {0, 0, 0x80, 0x1C, 0x1C, 0x80, 0x00, 0x00}, 0, 8, 1, 0, 1},
        {kH263, {0, 0, 0x80, 0x1C, 0x1C, 0x80, 0x00, 0x10}, 0, 0, 0, 0, 1},
        {kH263, {0, 0, 0x80, 0x1C, 0x1C, 0x00}, 0, 6, 1, 0, 0}, {kH263, {0, 0, 0x80, 0x1C, 0x1C, 0x10}, 0, 0, 0, 0, 0},
        {kH263, {0, 0, 0x80, 0x1C, 0x1C, 0x40}, 0, 0, 0, 0, 0},
        // OTI 0xC2 answers bit 32 as it stands, for versions 0 and 1 only.
        {kH263Family, {0, 0, 0x84, 0x00, 0x80}, 0, 5, 1, 0, 1}, {kH263Family, {0, 0, 0x80, 0x00, 0x7F}, 0, 0, 0, 0, 1},
        {kH263Family, {0, 0, 0x88, 0x00, 0x80}, 0, 0, 0, 0, 1}, {kIntraOnly, {0x55}, 0, 1, 1, 0, 1},
        // picture_coding_type; other picture types are passed over.
        {kMpeg12, {0, 0, 1, 0, 0x00, 0x08, 0x00}, 0, 7, 1, 0, 1}, {kMpeg12, {0, 0, 1, 0, 0, 0x10, 0}, 0, 0, 0, 0, 1},
        {kMpeg12, {0, 0, 1, 0, 0, 0x10, 0xFF, 0, 0, 1, 0, 0, 0x08, 0xFF}, 0, 14, 1, 0, 1},
        {kWmv1, {0x3F}, 0, 1, 1, 0, 1}, {kWmv2, {0x40}, 0, 0, 0, 0, 1}, {kMp43, {0x00}, 0, 1, 1, 0, 1},
        // VC-1 PTYPE after INTERPFRM, FRMCNT and RANGEREDFRM; a 1-byte frame holds every bit read.
        // Without B pictures 0 is I and 1 P; with them 1 is P, 01 I and 00 B.
        {kWmv3, {0b00000000, 0}, P(kSeqPlain), 1, 1, 0, 1}, {kWvc1, {0b00100000, 0}, P(kSeqPlain), 0, 0, 0, 1},
        {kWmv3, {0b00100000, 0}, P(kSeqB), 0, 0, 0, 1}, {kWvc1, {0b00010000, 0, 0, 0}, P(kSeqB), 1, 1, 0, 1},
        {kWvc1, {0b00000000, 0}, P(kSeqB), 0, 0, 0, 1}, {kWmv3, {0b00010000, 0}, P(kSeqInterp), 0, 0, 0, 1},
        {kWvc1, {0b11101111, 0}, P(kSeqRangeRed), 1, 1, 0, 1}, {kWmv3, {0b00000100, 0}, P(kSeqAll), 1, 1, 0, 1},
        {kWvc1, {0b00001000}, P(kSeqAll), 0, 0, 0, 1}, {kWvc1, {0x00}, 0, 0, 0, 0, 1}, // no sequence header
        // H.264 start codes: a unit counts when more than 4 bytes follow its start code (IDR, P
        // slice, I slices of type 7 and 2, an I slice after a delimiter). Valid when the first
        // unit is a slice, SPS, PPS or filler data.
        {kH264, {0, 0, 0, 1, 0x65, 0x88, 0x84, 0x00, 0x10}, 4, 9, 1, 0, 1},
        {kH264, {0, 0, 0, 1, 0x41, 0x9A, 0, 0, 0}, 4, 0, 0, 0, 1}, {kH264, {0, 0, 0, 1, 0x41, 0x88, 0, 0, 0}, 4, 9, 1, 0, 1},
        {kH264, {0, 0, 1, 0x21, 0xB0, 0, 0, 0}, 4, 8, 1, 0, 1},
        {kH264, {0, 0, 0, 1, 9, 0xF0, 0, 0, 0, 1, 0x41, 0x88, 0, 0, 0}, 0, 15, 1, 0, 0, 9},
        {kH264, {0, 0, 1, 6, 5, 0x10}, 4, 0, 0, 0, 0, 6}, {kH264, {0, 0, 0, 1, 0x67, 0x42}, 4, 0, 0, 0, 1},
        {kH264, {0, 0, 1, 0x68, 0xCE, 0x38}, 4, 0, 0, 0, 1}, {kH264, {0, 0, 0, 1, 0x0C, 0xFF}, 4, 0, 0, 0, 1},
        // 5 bytes with a start code go to the length walk, where 00 00 01 65 points past the end.
        {kH264, {0, 0, 1, 0x65, 0x88}, 4, 0, 0, 0, 0},
        // Length prefixes of 4, 3, 2 and 1 bytes; sizes 0 and 5 are refused, far lengths end the walk.
        {kH264, {0, 0, 0, 5, 0x65, 0x88, 0x84, 0x00, 0x10}, 4, 9, 1, 0, 1},
        {kH264, {0, 0, 0, 2, 6, 5, 0, 0, 0, 5, 0x65, 0x88, 0x84, 0x00, 0x10}, 4, 15, 1, 0, 1},
        {kH264, {0, 0, 5, 0x25, 0, 0, 0, 0}, 3, 8, 1, 0, 1}, {kH264, {0, 6, 0x41, 0x88, 0, 0, 0, 0}, 2, 7, 1, 0, 1},
        {kH264, {3, 6, 5, 0x80, 5, 0x65, 0, 0, 0, 0}, 1, 10, 1, 0, 1}, {kH264, {0, 0, 0, 0x1C, 0x65, 0x88}, 4, 0, 0, 0, 1},
        {kH264, {0, 0, 0, 5, 0x65, 0x88, 0x84, 0x00, 0x10}, 0, 0, 0, 0, 1},
        {kH264, {0, 0, 0, 0, 5, 0x65, 0x88, 0x84, 0x00, 0x10}, 5, 0, 0, 0, 1},
        {kH264, {0xFF, 0xFF, 0xFF, 0xF0, 0x41, 0x9A, 0, 0, 0, 0}, 4, 0, 0, 0, 1},
    };
    const std::string badNal = "[CAL_Tools %d] Invalid NAL Type(%d).(%d)\n";
    for (const Case &c : cases) {
        const std::string frame = ::testing::PrintToString(c.frame);
        for (size_t n = 0; n <= c.frame.size(); ++n) {
            const Bytes f(c.frame.begin(), c.frame.begin() + long(n));
            const bool full = n >= c.minLen;
            EXPECT_EQ(vorCALTools_IsIDRFrame(c.oti, f.data(), int32_t(n), c.extra), full ? c.intra : 0) << frame << n;
            EXPECT_EQ(vorCALTools_IsBFrame(c.oti, f.data(), int32_t(n)), full ? c.b : 0) << frame << n;
        }
        // A negative length leaves nothing to read.
        EXPECT_EQ(vorCALTools_IsIDRFrame(c.oti, c.frame.data(), -1, c.extra), c.oti == kIntraOnly ? 1 : 0) << frame;
        EXPECT_EQ(vorCALTools_IsBFrame(c.oti, c.frame.data(), -1) + vorCALTools_IsBFrame(c.oti, nullptr, 100), 0);
        RecordingSal::Get().Reset();
        EXPECT_EQ(vorCALTools_IsValidVideo(c.oti, c.frame.data(), int32_t(c.frame.size())), c.valid) << frame;
        EXPECT_EQ(RecordingSal::Get().CountFormat(badNal), c.badNalType ? 1u : 0u) << frame;
        EXPECT_TRUE(c.badNalType == 0 ||
                    HasTrace(7, 0, badNal, "[CAL_Tools #] Invalid NAL Type(1).(" + std::to_string(c.badNalType) + ")\n"));
    }
}

// Traces, and frames with nothing to examine.
TEST(Classification, TracesAndRefusals)
{
    auto &sal = RecordingSal::Get();
    const uint8_t sc4[] = {0, 0, 0, 1, 0x65, 0x88, 0x84, 0x00, 0x10}, sc3[] = {0, 0, 1, 0x41};
    const char *idr = "[vorCAL_Tools] vorCAL_Tools_IsIDRFrame\n",
               *fmt4 = "[vorCAL_Tools ]StartCode(0x%x, 0x%x, 0x%x, 0x%x)\n",
               *fmt3 = "[vorCAL_Tools ]StartCode(0x%x, 0x%x, 0x%x)\n";
    const std::tuple<const uint8_t *, int32_t, const char *, const char *> startCodes[] = {
        {sc4, 9, fmt4, "[vorCAL_Tools ]StartCode(0x0, 0x0, 0x0, 0x1)\n"},
        {sc3, 4, fmt3, "[vorCAL_Tools ]StartCode(0x0, 0x0, 0x1)\n"},
        {sc4 + 4, 5, nullptr, nullptr}}; // no start code, no StartCode line
    for (auto [p, len, fmt, text] : startCodes) {
        sal.Reset();
        vorCALTools_IsIDRFrame(kH264, p, len, 4);
        EXPECT_TRUE(HasPlainTrace(idr, idr) && (fmt == nullptr || HasPlainTrace(fmt, text))) << len;
        EXPECT_EQ(sal.traces.size(), fmt ? 2u : 1u);
    }
    // Frames with nothing to examine: the intra test refuses a null or empty frame, the H.264
    // validity rule also one of 5 bytes or less, the VOP search one of 4 or less.
    const char *noFrame = "[_PTOOL_IsIntraFrame] pFrame(0x%x), iFrameSize(%d)\n",
               *badParam = "[CAL_Tools %d] CheckValidFrame Invalid Param.(0x%X, uiLen)\n";
    char text[2][96];
    int32_t remaining = 77;
    for (auto [p, len] : {std::pair<const uint8_t *, int32_t>{nullptr, 9}, {sc4, 0}, {sc4, 5}, {sc4, -1}}) {
        sal.Reset();
        const int intra = p != nullptr && len != 0;
        EXPECT_EQ(vorCALTools_IsIDRFrame(kIntraOnly, p, len, 4), intra);
        EXPECT_EQ(vorCALTools_IsValidVideo(kH264, p, len), 0);
        EXPECT_EQ(_PTOOL_FindVOP(p, len, &remaining), nullptr);
        std::snprintf(text[0], sizeof text[0], noFrame, unsigned(uintptr_t(p)), int(len));
        std::snprintf(text[1], sizeof text[1], "[CAL_Tools #] CheckValidFrame Invalid Param.(0x%X, uiLen)\n",
                      unsigned(uintptr_t(p)));
        EXPECT_TRUE((intra ? sal.CountFormat(noFrame) == 0 : HasTrace(2, 0, noFrame, text[0])) &&
                    HasTrace(7, 0, badParam, text[1])) << len;
    }
    const uint8_t vos[] = {0, 0, 1, 0xB0, 0x01, 0, 0, 1, 0xB6, 0x10, 0x20};
    EXPECT_EQ(_PTOOL_FindVOP(vos + 5, 4, &remaining), nullptr);
    EXPECT_EQ(remaining, 77); // untouched when nothing is found
    EXPECT_EQ((std::pair{_PTOOL_FindVOP(vos, 11, &remaining), remaining}), (std::pair{vos + 5, 6}));
}

// Which units the H.264 start-code scan visits, the VOP search and the B rule, written out byte
// by byte, against the library on random frames made of bytes that form many start codes and
// slice headers.
TEST(ScanEquivalence, RandomFramesAgainstByteWiseScans)
{
    auto h264 = [](const Bytes &f) {
        for (size_t p = 0; p + 6 <= f.size(); ++p) {
            const size_t s = f[p] || f[p + 1] ? 0 : f[p + 2] == 1 ? 3 : f[p + 2] == 0 && f[p + 3] == 1 ? 4 : 0;
            if (s == 0 || f.size() - p - s <= 4)
                continue;
            // The unit alone in a frame: the single-unit answers are pinned by the table above.
            const uint8_t unit[] = {0, 0, 1, f[p + s], f[p + s + 1], f[p + s + 2], f[p + s + 3], f[p + s + 4]};
            if (vorCALTools_IsIDRFrame(kH264, unit, sizeof unit, 0) == 1)
                return 1;
        }
        return 0;
    };
    const uint8_t kVop[] = {0, 0, 1, 0xB6};
    std::mt19937 rng(20261122);
    const uint8_t alphabet[] = {0x00, 0x00, 0x00, 0x01, 0x65, 0x41, 0x88, 0xB6, 0x10, 0x90, 0x9A, 0xFF};
    for (int iter = 0; iter < 4000; ++iter) {
        Bytes f = {0, 0, 1}; // a start-code frame, as the scan needs
        f.resize(3 + rng() % 21);
        std::generate(f.begin() + 3, f.end(), [&] { return alphabet[rng() % sizeof alphabet]; });
        const auto n = int32_t(f.size());
        ASSERT_EQ(vorCALTools_IsIDRFrame(kH264, f.data(), n, 0), h264(f)) << ::testing::PrintToString(f);
        const long at = std::search(f.begin(), f.end(), kVop, kVop + 4) - f.begin(); // first VOP start code
        int32_t remaining = -1;
        const uint8_t *vop = _PTOOL_FindVOP(f.data(), n, &remaining);
        ASSERT_EQ(vop ? vop - f.data() : -1, at + 5 <= n ? at : -1) << ::testing::PrintToString(f);
        ASSERT_EQ(remaining, vop ? n - at : -1);
        ASSERT_EQ(vorCALTools_IsBFrame(kMpeg4, f.data(), n), at + 6 <= n && f[size_t(at) + 4] >> 6 == 2 ? 1 : 0);
    }
}

} // namespace
