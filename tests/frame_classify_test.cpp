#include <gtest/gtest.h>

#include <cstring>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include <vorcal/video_tools.h>

#include "bit_writer.hpp"
#include "recording_sal.hpp"

using vorcal::test::BitWriter;
using vorcal::test::HasPlainTrace;
using vorcal::test::HasTrace;
using vorcal::test::RecordingSal;
using Bytes = std::vector<uint8_t>;

namespace {

constexpr uint32_t kMpeg4 = 0x20, kMpeg4b = 0xF1, kH263 = 0xC0, kH264 = 0xC1, kH263Family = 0xC2,
                   kIntraOnly = 0xDB, kMpeg12 = 0xF2;
constexpr uint32_t kWmv1 = 0x31564D57, kWmv2 = 0x32564D57, kMp43 = 0x3334504D, kWmv3 = 0x33564D57,
                   kWvc1 = 0x31435657;

// A heap copy of exactly the first n bytes, so that ASan sees any read past the frame.
struct ExactCopy {
    ExactCopy(const Bytes &bytes, size_t n) : p(new uint8_t[n])
    {
        if (n != 0)
            std::memcpy(p.get(), bytes.data(), n);
    }
    std::unique_ptr<uint8_t[]> p;
};

Bytes Pad(Bytes bytes, size_t n = 8)
{
    bytes.insert(bytes.end(), n, 0x00);
    return bytes;
}

// An H.263 picture header (ITU-T H.263 5.1.1-5.1.4) for the given source format and PTYPE bit 9.
Bytes H263Header(uint32_t uSourceFormat, uint32_t uInter)
{
    BitWriter w;
    w.Put(0x20, 22).Put(0, 8);            // PSC, TR
    w.Put(0b10, 2).Put(0, 3);             // marker, zero, split/doc/freeze
    w.Put(uSourceFormat, 3).Put(uInter, 1); // source format, picture coding type
    w.Put(0, 4).Put(0, 5).Put(0, 1).Put(0, 4);
    return w.Align().Bytes();
}

// PLUSPTYPE picture header: UFEP, OPPTYPE (when UFEP is 1), MPPTYPE picture type code.
Bytes H263PlusHeader(uint32_t uUfep, uint32_t uPictureType)
{
    BitWriter w;
    w.Put(0x20, 22).Put(0, 8).Put(0b10, 2).Put(0, 3).Put(7, 3); // PSC, TR, PTYPE, source format 7
    w.Put(uUfep, 3);
    if (uUfep == 1)
        w.Put(6, 3).Put(0, 15); // OPPTYPE: custom format, options off
    w.Put(uPictureType, 3).Put(0, 3).Put(0b001, 3);
    return Pad(w.Align().Bytes());
}

// A start-code framed slice NAL unit with first_mb_in_slice 0 and the given slice_type.
Bytes H264Slice(uint8_t uHeader, uint32_t uSliceType, Bytes prefix = {0, 0, 0, 1})
{
    BitWriter w;
    w.PutUE(0).PutUE(uSliceType).PutUE(0).Put(0xFFFFFFFF, 32);
    Bytes out = prefix;
    out.push_back(uHeader);
    for (uint8_t b : w.Align().Bytes())
        out.push_back(b);
    return out;
}

Bytes Concat(std::initializer_list<Bytes> parts)
{
    Bytes out;
    for (const Bytes &part : parts)
        out.insert(out.end(), part.begin(), part.end());
    return out;
}

struct IntraCase {
    const char *name;
    uint32_t oti;
    Bytes frame;
    CALParam extra; // NAL length size for H.264
    int intra;
    size_t minLen;  // shortest prefix that already gives `intra`; shorter prefixes give 0
};

std::ostream &operator<<(std::ostream &os, const IntraCase &c)
{
    return os << c.name;
}

class IntraTest : public ::testing::TestWithParam<IntraCase> {};

// Every prefix of the frame, in an exactly-sized buffer: shorter than minLen answers 0.
TEST_P(IntraTest, EveryPrefix)
{
    const IntraCase &c = GetParam();
    for (size_t n = 0; n <= c.frame.size(); ++n) {
        ExactCopy copy(c.frame, n);
        const int expected = n >= c.minLen ? c.intra : 0;
        EXPECT_EQ(vorCALTools_IsIDRFrame(c.oti, copy.p.get(), int32_t(n), c.extra), expected) << "length " << n;
    }
}

const Bytes kGovThenIVop = {0, 0, 1, 0xB3, 0x00, 0x10, 0x00, 0x00, 0x00, 0x01, 0xB6, 0x10, 0x00};

INSTANTIATE_TEST_SUITE_P(
    Rules, IntraTest,
    ::testing::Values(
        // ISO/IEC 14496-2: vop_coding_type in the two bits after 00 00 01 B6.
        IntraCase{"Mpeg4IVop", kMpeg4, {0, 0, 1, 0xB6, 0x10, 0x00}, 0, 1, 6},
        IntraCase{"Mpeg4PVop", kMpeg4, Pad({0, 0, 1, 0xB6, 0x50}), 0, 0, 0},
        IntraCase{"Mpeg4BVop", kMpeg4b, Pad({0, 0, 1, 0xB6, 0x90}), 0, 0, 0},
        IntraCase{"Mpeg4AfterGov", kMpeg4, kGovThenIVop, 0, 1, 13},
        IntraCase{"Mpeg4SecondOtiLeadingGarbage", kMpeg4b, {0x12, 0, 0, 1, 0xB6, 0x3F, 0x00}, 0, 1, 7},
        IntraCase{"Mpeg4NoVop", kMpeg4, Pad({0, 0, 1, 0xB0, 0x01}), 0, 0, 0},
        // ITU-T H.263 PTYPE.
        IntraCase{"H263QcifIntra", kH263, {0, 0, 0x80, 0x02, 0x08}, 0, 1, 5},
        IntraCase{"H263QcifInter", kH263, Pad({0, 0, 0x80, 0x02, 0x0A}), 0, 0, 0},
        IntraCase{"H263BuiltCif", kH263, H263Header(3, 0), 0, 1, 5},
        IntraCase{"H263BadPsc", kH263, Pad({0, 0, 0x84, 0x02, 0x08}), 0, 0, 0},
        IntraCase{"H263PlusUfep1Intra", kH263, Pad({0, 0, 0x80, 0x1C, 0x1C, 0x80, 0x00, 0x00}), 0, 1, 8},
        IntraCase{"H263PlusUfep1Inter", kH263, Pad({0, 0, 0x80, 0x1C, 0x1C, 0x80, 0x00, 0x04}), 0, 0, 0},
        IntraCase{"H263PlusUfep0Intra", kH263, Pad({0, 0, 0x80, 0x1C, 0x1C, 0x00}), 0, 1, 6},
        IntraCase{"H263PlusUfep0Inter", kH263, Pad({0, 0, 0x80, 0x1C, 0x1C, 0x10}), 0, 0, 0},
        IntraCase{"H263PlusBuiltUfep1I", kH263, H263PlusHeader(1, 0), 0, 1, 8},
        IntraCase{"H263PlusBuiltUfep1P", kH263, H263PlusHeader(1, 1), 0, 0, 0},
        IntraCase{"H263PlusBuiltUfep0P", kH263, H263PlusHeader(0, 1), 0, 0, 0},
        // OTI 0xC2: the answer is bit 32 of the frame as it stands (not a picture type).
        IntraCase{"H263FamilyBit32Set", kH263Family, {0, 0, 0x84, 0x00, 0x80}, 0, 1, 5},
        IntraCase{"H263FamilyBit32Clear", kH263Family, Pad({0, 0, 0x80, 0x00, 0x7F}), 0, 0, 0},
        IntraCase{"H263FamilyVersion2", kH263Family, Pad({0, 0, 0x88, 0x00, 0x80}), 0, 0, 0},
        IntraCase{"IntraOnly", kIntraOnly, {0x55}, 0, 1, 1},
        // ISO/IEC 13818-2 picture_coding_type; other picture types are passed over.
        IntraCase{"Mpeg2I", kMpeg12, {0, 0, 1, 0, 0x00, 0x08, 0x00}, 0, 1, 7},
        IntraCase{"Mpeg2P", kMpeg12, Pad({0, 0, 1, 0, 0x00, 0x10, 0x00}), 0, 0, 0},
        IntraCase{"Mpeg2SeqHeaderThenI", kMpeg12, {0, 0, 1, 0xB3, 0x14, 0, 0, 1, 0, 0x00, 0x0F, 0xFF}, 0, 1, 12},
        IntraCase{"Mpeg2PThenI", kMpeg12, {0, 0, 1, 0, 0x00, 0x10, 0xFF, 0, 0, 1, 0, 0x00, 0x08, 0xFF}, 0, 1, 14},
        IntraCase{"Wmv1Intra", kWmv1, {0x3F}, 0, 1, 1},
        IntraCase{"Wmv2Inter", kWmv2, {0x40}, 0, 0, 0},
        IntraCase{"Mp43Intra", kMp43, {0x00, 0xFF}, 0, 1, 1},
        IntraCase{"UnknownOti", 0x21, {0, 0, 1, 0xB6, 0x10, 0, 0, 0}, 0, 0, 0},
        // ITU-T H.264, start codes.
        IntraCase{"H264IdrStartCode", kH264, {0, 0, 0, 1, 0x65, 0x88, 0x84, 0x00, 0x10}, 4, 1, 9},
        IntraCase{"H264PSlice", kH264, {0, 0, 0, 1, 0x41, 0x9A, 0, 0, 0}, 4, 0, 0},
        IntraCase{"H264ISliceType7", kH264, {0, 0, 0, 1, 0x41, 0x88, 0x00, 0x00, 0x00}, 4, 1, 9},
        IntraCase{"H264ISliceType2", kH264, H264Slice(0x21, 2, {0, 0, 1}), 4, 1, 8},
        IntraCase{"H264ISliceAfterParamSets", kH264,
                  Concat({{0, 0, 0, 1, 0x67, 0x42, 0, 0x1E}, {0, 0, 1, 0x68, 0xCE, 0x38, 0x80}, H264Slice(0x41, 7)}), 4, 1,
                  24},
        IntraCase{"H264IdrAfterAud", kH264, {0, 0, 1, 9, 0xF0, 0, 0, 1, 0x65, 0, 0, 0, 0}, 0, 1, 13},
        IntraCase{"H264NoSlice", kH264, Pad({0, 0, 0, 1, 0x67, 0x42, 0x00, 0x1E}), 4, 0, 0},
        // ITU-T H.264, length prefixes; sizes 0 and above 4 are refused.
        IntraCase{"H264IdrLen4", kH264, {0, 0, 0, 5, 0x65, 0x88, 0x84, 0x00, 0x10}, 4, 1, 9},
        IntraCase{"H264SeiThenIdrLen4", kH264, {0, 0, 0, 2, 0x06, 0x05, 0, 0, 0, 5, 0x65, 0x88, 0x84, 0x00, 0x10}, 4, 1,
                  15},
        IntraCase{"H264ISliceLen2", kH264, {0, 6, 0x41, 0x88, 0, 0, 0, 0}, 2, 1, 7},
        IntraCase{"H264IdrLen3", kH264, {0, 0, 5, 0x25, 0, 0, 0, 0}, 3, 1, 8},
        IntraCase{"H264IdrLen1", kH264, {3, 0x06, 0x05, 0x80, 5, 0x65, 0, 0, 0, 0}, 1, 1, 10},
        IntraCase{"H264Size0Refused", kH264, {0, 0, 0, 5, 0x65, 0x88, 0x84, 0x00, 0x10}, 0, 0, 0},
        IntraCase{"H264Size5Refused", kH264, {0, 0, 0, 0, 5, 0x65, 0x88, 0x84, 0x00, 0x10}, 5, 0, 0},
        IntraCase{"H264LengthBeyondEnd", kH264, {0xFF, 0xFF, 0xFF, 0xF0, 0x41, 0x9A, 0, 0, 0, 0}, 4, 0, 0},
        // A 5-byte start-code frame goes to the length-prefixed walk, whose length field
        // 00 00 01 65 points beyond the frame.
        IntraCase{"H264FiveByteStartCode", kH264, {0, 0, 1, 0x65, 0x88}, 4, 0, 0}),
    [](const auto &info) { return std::string(info.param.name); });

// VC-1 simple/main profile: PTYPE after INTERPFRM, FRMCNT and RANGEREDFRM, steered by the
// fourth sequence-header byte.
struct Vc1Case {
    uint8_t seqByte3;
    uint8_t frameByte0;
    int intra;
};

class Vc1IntraTest : public ::testing::TestWithParam<Vc1Case> {};

TEST_P(Vc1IntraTest, PictureType)
{
    const Vc1Case &c = GetParam();
    const uint8_t seq[4] = {0x4E, 0x00, 0x00, c.seqByte3};
    for (uint32_t oti : {kWmv3, kWvc1}) {
        for (size_t n : {1u, 4u}) { // a 1-byte frame still holds every bit read
            Bytes frame(n, 0x00);
            frame[0] = c.frameByte0;
            ExactCopy copy(frame, n);
            EXPECT_EQ(vorCALTools_IsIDRFrame(oti, copy.p.get(), int32_t(n), reinterpret_cast<CALParam>(seq)), c.intra)
                << std::hex << oti << " length " << n;
        }
    }
}

INSTANTIATE_TEST_SUITE_P(Headers, Vc1IntraTest,
                         ::testing::Values(Vc1Case{0x00, 0b00000000, 1},  // FRMCNT 00, PTYPE 0: I
                                           Vc1Case{0x00, 0b00100000, 0},  // PTYPE 1: P
                                           Vc1Case{0x10, 0b00100000, 0},  // B allowed, PTYPE 1: P
                                           Vc1Case{0x10, 0b00010000, 1},  // PTYPE 01: I
                                           Vc1Case{0x10, 0b00000000, 0},  // PTYPE 00: B
                                           Vc1Case{0x02, 0b10000000, 1},  // INTERPFRM 1, PTYPE 0
                                           Vc1Case{0x02, 0b00010000, 0},  // INTERPFRM 0, PTYPE 1
                                           Vc1Case{0x80, 0b11110000, 0},  // FRMCNT 11, RANGEREDFRM 1, PTYPE 1
                                           Vc1Case{0x80, 0b11101111, 1},  // FRMCNT 11, RANGEREDFRM 1, PTYPE 0
                                           Vc1Case{0xF2, 0b00000100, 1},  // all flags, PTYPE 01
                                           Vc1Case{0xF2, 0b00001000, 0})); // all flags, PTYPE 1

TEST(IsIDRFrame, Vc1WithoutSequenceHeaderIsNotIntra)
{
    const uint8_t frame[] = {0x00};
    EXPECT_EQ(vorCALTools_IsIDRFrame(kWvc1, frame, 1, 0), 0);
    EXPECT_EQ(vorCALTools_IsIDRFrame(kWmv3, frame, 1, 0), 0);
}

TEST(IsIDRFrame, Traces)
{
    auto &sal = RecordingSal::Get();
    const uint8_t sc4[] = {0, 0, 0, 1, 0x65, 0x88, 0x84, 0x00, 0x10};
    const uint8_t sc3[] = {0, 0, 1, 0x41};

    sal.Reset();
    EXPECT_EQ(vorCALTools_IsIDRFrame(kH264, sc4, sizeof sc4, 4), 1);
    EXPECT_TRUE(HasPlainTrace("[vorCAL_Tools] vorCAL_Tools_IsIDRFrame\n", "[vorCAL_Tools] vorCAL_Tools_IsIDRFrame\n"));
    EXPECT_TRUE(HasPlainTrace("[vorCAL_Tools ]StartCode(0x%x, 0x%x, 0x%x, 0x%x)\n",
                              "[vorCAL_Tools ]StartCode(0x0, 0x0, 0x0, 0x1)\n"));
    EXPECT_EQ(sal.traces.size(), 2u);

    sal.Reset();
    EXPECT_EQ(vorCALTools_IsIDRFrame(kH264, sc3, sizeof sc3, 4), 0);
    EXPECT_TRUE(HasPlainTrace("[vorCAL_Tools ]StartCode(0x%x, 0x%x, 0x%x)\n", "[vorCAL_Tools ]StartCode(0x0, 0x0, 0x1)\n"));

    sal.Reset();
    EXPECT_EQ(vorCALTools_IsIDRFrame(kH264, sc4 + 4, 5, 4), 0); // not a start code: no StartCode line
    EXPECT_EQ(sal.traces.size(), 1u);

    for (auto [frame, len] : {std::pair<const uint8_t *, int32_t>{nullptr, 9}, {sc4, 0}}) {
        sal.Reset();
        EXPECT_EQ(vorCALTools_IsIDRFrame(kIntraOnly, frame, len, 4), 0);
        char expected[96];
        std::snprintf(expected, sizeof expected, "[_PTOOL_IsIntraFrame] pFrame(0x%x), iFrameSize(%d)\n",
                      static_cast<unsigned>(reinterpret_cast<uintptr_t>(frame)), int(len));
        EXPECT_TRUE(HasTrace(2, 0, "[_PTOOL_IsIntraFrame] pFrame(0x%x), iFrameSize(%d)\n", expected));
        EXPECT_EQ(sal.traces.size(), 2u);
    }
}

// The H.264 start-code scan, written out byte by byte as the rule reads, against the library on
// random frames drawn from bytes that form many start codes and slice headers.
int ReferenceH264StartCodeScan(const Bytes &f)
{
    const int64_t len = int64_t(f.size());
    for (int64_t p = 0; p <= len - 6; ++p) {
        int64_t s = 0;
        if (f[p] == 0 && f[p + 1] == 0 && f[p + 2] == 0 && f[p + 3] == 1)
            s = 4;
        else if (f[p] == 0 && f[p + 1] == 0 && f[p + 2] == 1)
            s = 3;
        if (s == 0 || len - p - s <= 4)
            continue;
        const uint8_t type = f[p + s] & 0x1F;
        if (type == 5)
            return 1;
        if (type == 1) {
            // The slice check reads through the exported header bit reader; this test is about
            // which units the scan visits.
            CALToolsBS bs{};
            bs.pBuffer = &f[p + s + 1];
            bs.uLength = 4;
            for (int i = 0; i < 4; ++i)
                _LoadBS(&bs);
            _GetUE_V(&bs); // first_mb_in_slice
            const uint32_t sliceType = _GetUE_V(&bs);
            if (sliceType == 2 || sliceType == 7)
                return 1;
        }
    }
    return 0;
}

int ReferenceFindVop(const Bytes &f)
{
    for (int64_t i = 0; i <= int64_t(f.size()) - 5; ++i)
        if (f[i] == 0 && f[i + 1] == 0 && f[i + 2] == 1 && f[i + 3] == 0xB6)
            return int(i);
    return -1;
}

TEST(ScanEquivalence, RandomFramesAgainstByteWiseScans)
{
    const uint32_t seed = 20261122;
    std::mt19937 rng(seed);
    const uint8_t alphabet[] = {0x00, 0x00, 0x00, 0x01, 0x65, 0x41, 0x88, 0xB6, 0x10, 0x90, 0x9A, 0xFF};
    for (int iter = 0; iter < 4000; ++iter) {
        Bytes f(rng() % 24);
        for (uint8_t &b : f)
            b = alphabet[rng() % sizeof alphabet];
        if (f.size() > 5) { // make it a start-code frame, as the scan needs
            f[0] = f[1] = 0;
            f[2] = 1;
        }
        ExactCopy copy(f, f.size());
        const auto n = int32_t(f.size());
        if (f.size() > 5) {
            ASSERT_EQ(vorCALTools_IsIDRFrame(kH264, copy.p.get(), n, 0), ReferenceH264StartCodeScan(f))
                << "seed " << seed << " iteration " << iter << " " << ::testing::PrintToString(f);
        }
        int32_t remaining = -1;
        const uint8_t *vop = _PTOOL_FindVOP(copy.p.get(), n, &remaining);
        const int expected = f.size() > 4 ? ReferenceFindVop(f) : -1;
        ASSERT_EQ(vop ? int(vop - copy.p.get()) : -1, expected) << "seed " << seed << " iteration " << iter;
        if (vop) {
            ASSERT_EQ(remaining, n - expected);
        }
        const int expectedType = f.size() > 5 && expected >= 0 && expected <= n - 6 ? f[expected + 4] >> 6 : -1;
        ASSERT_EQ(vorCALTools_IsBFrame(kMpeg4, copy.p.get(), n), expectedType == 2 ? 1 : 0) << iter;
    }
}

struct BCase {
    uint32_t oti;
    Bytes frame;
    int b;
};

TEST(IsBFrame, Rules)
{
    const BCase cases[] = {
        {kMpeg4, {0, 0, 1, 0xB6, 0x90, 0x00}, 1},
        {kMpeg4b, {0, 0, 1, 0xB6, 0xBF, 0x00}, 1},
        {kMpeg4, {0, 0, 1, 0xB6, 0x10, 0x00}, 0},
        {kMpeg4, {0, 0, 1, 0xB6, 0x50, 0x00}, 0},
        {kMpeg4, {0, 0, 1, 0xB6, 0xD0, 0x00}, 0}, // S-VOP
        {kMpeg4, {0, 0, 1, 0xB6, 0x90}, 0},       // 5 bytes: too short
        {kMpeg4, {0, 0, 1, 0xB3, 0, 0, 0, 0, 1, 0xB6, 0x80, 0x00}, 1},
        {kH263, {0, 0, 1, 0xB6, 0x90, 0x00}, 0},
        {kMpeg12, {0, 0, 1, 0xB6, 0x90, 0x00}, 0},
    };
    for (const BCase &c : cases) {
        ExactCopy copy(c.frame, c.frame.size());
        EXPECT_EQ(vorCALTools_IsBFrame(c.oti, copy.p.get(), int32_t(c.frame.size())), c.b)
            << std::hex << c.oti << " " << c.frame.size();
    }
    EXPECT_EQ(vorCALTools_IsBFrame(kMpeg4, nullptr, 100), 0);
}

struct ValidCase {
    const char *name;
    uint32_t oti;
    Bytes frame;
    int valid;
    int invalidNalType; // -1: no Invalid NAL Type trace
};

std::ostream &operator<<(std::ostream &os, const ValidCase &c)
{
    return os << c.name;
}

class ValidTest : public ::testing::TestWithParam<ValidCase> {};

TEST_P(ValidTest, Rule)
{
    const ValidCase &c = GetParam();
    RecordingSal::Get().Reset();
    ExactCopy copy(c.frame, c.frame.size());
    EXPECT_EQ(vorCALTools_IsValidVideo(c.oti, copy.p.get(), int32_t(c.frame.size())), c.valid);
    const std::string fmt = "[CAL_Tools %d] Invalid NAL Type(%d).(%d)\n";
    if (c.invalidNalType >= 0) {
        EXPECT_TRUE(HasTrace(7, 0, fmt, "[CAL_Tools #] Invalid NAL Type(1).(" + std::to_string(c.invalidNalType) + ")\n"));
    } else {
        EXPECT_EQ(RecordingSal::Get().CountFormat(fmt), 0u);
    }
}

INSTANTIATE_TEST_SUITE_P(
    Rules, ValidTest,
    ::testing::Values(ValidCase{"Mpeg4Vop", kMpeg4, {0, 0, 1, 0xB6, 0x10}, 1, -1},
                      ValidCase{"Mpeg4Vos", kMpeg4b, {0, 0, 1, 0xB0, 0x01}, 1, -1},
                      ValidCase{"Mpeg4B7", kMpeg4, {0, 0, 1, 0xB7, 0x00}, 0, -1},
                      ValidCase{"Mpeg4C3", kMpeg4, {0, 0, 1, 0xC3, 0x00}, 1, -1},
                      ValidCase{"Mpeg4C4", kMpeg4, {0, 0, 1, 0xC4, 0x00}, 0, -1},
                      ValidCase{"Mpeg4NoStartCode", kMpeg4, {0x12, 0x34, 0x56, 0x78, 0x9A}, 1, -1},
                      ValidCase{"Mpeg4FourBytes", kMpeg4, {0, 0, 1, 0xB6}, 0, -1},
                      ValidCase{"H263Psc", kH263, {0, 0, 0x83, 0, 0, 0, 0}, 1, -1},
                      ValidCase{"H263BadPsc", kH263, {0, 0, 0x84, 0, 0, 0, 0}, 0, -1},
                      ValidCase{"H263SixBytes", kH263, {0, 0, 0x80, 0, 0, 0}, 0, -1},
                      ValidCase{"H264Aud", kH264, {0, 0, 0, 1, 0x09, 0xF0}, 0, 9},
                      ValidCase{"H264Sei3", kH264, {0, 0, 1, 0x06, 0x05, 0x10}, 0, 6},
                      ValidCase{"H264Sps", kH264, {0, 0, 0, 1, 0x67, 0x42}, 1, -1},
                      ValidCase{"H264Pps3", kH264, {0, 0, 1, 0x68, 0xCE, 0x38}, 1, -1},
                      ValidCase{"H264Idr", kH264, {0, 0, 1, 0x65, 0x88, 0x84}, 1, -1},
                      ValidCase{"H264Filler", kH264, {0, 0, 0, 1, 0x0C, 0xFF}, 1, -1},
                      ValidCase{"H264NonIdr", kH264, {0, 0, 0, 1, 0x41, 0x9A}, 1, -1},
                      ValidCase{"H264LengthPrefixed", kH264, {0, 0, 0, 0x1C, 0x65, 0x88}, 1, -1},
                      ValidCase{"OtherOti", kMpeg12, {0xFF}, 1, -1},
                      ValidCase{"Wmv1", kWmv1, {}, 1, -1}),
    [](const auto &info) { return std::string(info.param.name); });

TEST(IsValidVideo, H264InvalidParameters)
{
    const uint8_t frame[] = {0, 0, 0, 1, 0x65};
    const std::string fmt = "[CAL_Tools %d] CheckValidFrame Invalid Param.(0x%X, uiLen)\n";
    for (auto [p, len] : {std::pair<const uint8_t *, int32_t>{nullptr, 100}, {frame, 5}, {frame, -1}}) {
        RecordingSal::Get().Reset();
        EXPECT_EQ(vorCALTools_IsValidVideo(kH264, p, len), 0);
        char expected[96];
        std::snprintf(expected, sizeof expected, "[CAL_Tools #] CheckValidFrame Invalid Param.(0x%X, uiLen)\n",
                      static_cast<unsigned>(reinterpret_cast<uintptr_t>(p)));
        EXPECT_TRUE(HasTrace(7, 0, fmt, expected)) << len;
    }
}

// A negative length leaves nothing to read: every rule answers as for a frame too short for it.
TEST(Classification, NegativeLengthReadsNothing)
{
    const uint8_t frame[] = {0, 0, 0, 1, 0x65, 0x88, 0x84, 0x00, 0x10};
    const uint8_t seq[4] = {0, 0, 0, 0};
    for (uint32_t oti : {kMpeg4, kMpeg4b, kH263, kH264, kH263Family, kIntraOnly, kMpeg12, kWmv1, kWmv3}) {
        const CALParam extra = oti == kWmv3 ? reinterpret_cast<CALParam>(seq) : 4;
        EXPECT_EQ(vorCALTools_IsIDRFrame(oti, frame, -1, extra), oti == kIntraOnly ? 1 : 0) << std::hex << oti;
        EXPECT_EQ(vorCALTools_IsBFrame(oti, frame, -1), 0);
        const bool checked = oti == kMpeg4 || oti == kMpeg4b || oti == kH263 || oti == kH264;
        EXPECT_EQ(vorCALTools_IsValidVideo(oti, frame, -1), checked ? 0 : 1) << std::hex << oti;
    }
    int32_t remaining = 5;
    EXPECT_EQ(_PTOOL_FindVOP(frame, INT32_MIN, &remaining), nullptr);
}

TEST(FindVOP, Examples)
{
    const Bytes withVos = {0, 0, 1, 0xB0, 0x01, 0, 0, 1, 0xB6, 0x10, 0x20};
    ExactCopy copy(withVos, withVos.size());
    int32_t remaining = -1;
    EXPECT_EQ(_PTOOL_FindVOP(copy.p.get(), 11, &remaining), copy.p.get() + 5);
    EXPECT_EQ(remaining, 6);

    // The code must begin at offset length - 5 or earlier.
    remaining = 77;
    EXPECT_EQ(_PTOOL_FindVOP(copy.p.get(), 9, &remaining), nullptr);
    EXPECT_EQ(_PTOOL_FindVOP(copy.p.get(), 10, &remaining), copy.p.get() + 5);
    EXPECT_EQ(remaining, 5);

    remaining = 77;
    const uint8_t vopOnly[] = {0, 0, 1, 0xB6};
    EXPECT_EQ(_PTOOL_FindVOP(vopOnly, 4, &remaining), nullptr);
    EXPECT_EQ(_PTOOL_FindVOP(nullptr, 100, &remaining), nullptr);
    EXPECT_EQ(remaining, 77); // untouched when nothing is found
}

} // namespace
