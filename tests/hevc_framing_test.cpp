// HEVC framing on hand-built data: the format test, frame conversion for every NAL length size
// and each way it fails, the unit walks and names, hvcC records (empty arrays, several SPSs,
// lengths past the data), records built from parameter sets, the IRAP test and the run of
// parameter sets in front of the first slice.
#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <tuple>

#include "hevc_streams.hpp"

namespace {

using namespace vorcal::test;

int32_t Len(const Bytes &d) { return int32_t(d.size()); }

const Bytes kVps = Hevc(32, {0x0C, 0x01}), kSps = Hevc(33, {0x01, 0x01}), kPps = Hevc(34, {0xC1, 0x72}),
            kAud = Hevc(35, {0x50}), kSei = Hevc(39, {0x05, 0x80}), kSuffix = Hevc(40, {0x84, 0x80}),
            kIdr = Hevc(19, {0xAF, 0x11, 0x22}), kCra = Hevc(21, {0xAF}), kTrail = Hevc(1, {0xD0, 0x19}),
            kRasl = Hevc(8, {0x99});

TEST(HevcFraming, FormatTest)
{
    const std::pair<Bytes, int32_t> cases[] = {
        {{0, 0, 1}, 0},
        {AnnexB({kIdr}), 2},
        {AnnexB({kIdr}, 3), 2},
        {Cat({{0, 0, 0, 0, 0}, AnnexB({kIdr})}), 2},     // leading_zero_8bits
        {AnnexB({{0x80, 0x01, 0xAA}}), 1},               // forbidden_zero_bit set
        {AnnexB({{0x26, 0x00, 0xAA}}, 3), 1},            // nuh_temporal_id_plus1 0
        {{0, 0, 0, 1}, 1},                               // no room for the header
        {LengthPrefixed({kIdr}, 4), 1},
        // A 4-byte length of 256-383 begins like a start code; what follows must still read as a
        // header: IDR_N_LP (28 01) gives 00 28, of TID 0; IDR_W_RADL (26 01) gives 00 26, valid.
        {LengthPrefixed({Hevc(20, Bytes(254, 0x11))}, 4), 1},
        {LengthPrefixed({Hevc(19, Bytes(254, 0x11))}, 4), 2},
        {LengthPrefixed({Hevc(19, Bytes(382, 0x11))}, 4), 1}, // 00 00 01 80: forbidden_zero_bit
        {HvcC(Bytes(21, 0), {}), 1},
    };
    for (const auto &[d, expected] : cases)
        EXPECT_EQ(vorCALTools_HEVC_CheckFormat(d.data(), Len(d)), expected) << testing::PrintToString(d).substr(0, 60);
    EXPECT_EQ(vorCALTools_HEVC_CheckFormat(nullptr, 8), 0);
}

// Either way for every NAL length size, through exact and measured destinations; every smaller
// destination is refused without a byte written past it.
TEST(HevcFraming, ConversionEverySize)
{
    std::vector<Bytes> units = {kAud, kVps, kSps, kPps, kSei, kIdr, kSuffix};
    auto Framed = [&units](int32_t iSize) {
        Bytes out;
        for (const Bytes &u : units)
            out = Cat({out, iSize == 0 ? AnnexB({u}, u.size() % 2 ? 3 : 4) : LengthPrefixed({u}, iSize)});
        return out;
    };
    for (int32_t iSize = 1; iSize <= 4; ++iSize) {
        SCOPED_TRACE(iSize);
        if (iSize == 2) // from here on with a unit longer than a 1-byte field carries
            units.insert(units.end() - 1, Hevc(19, Bytes(300, 0x5A)));
        const Bytes annexB = Framed(0), lengths = Framed(iSize), fourByteCodes = [&] {
            Bytes out;
            for (const Bytes &u : units)
                out = Cat({out, AnnexB({u})});
            return out;
        }();
        for (const auto &[src, iFormat, expected] : {std::tuple{annexB, CAL_AVC_FORMAT_ANNEXB, lengths},
                                                     std::tuple{lengths, CAL_AVC_FORMAT_NAL, fourByteCodes}}) {
            const int32_t iFrom = Len(expected);
            EXPECT_EQ(vorCALTools_HEVC_ConvertFormat(nullptr, 0, src.data(), Len(src), iFormat, iSize), iFrom);
            for (int32_t iRoom = 0; iRoom <= iFrom; ++iRoom) {
                std::vector<uint8_t> dst(size_t(iRoom) + 1, 0xEE);
                const int32_t r = vorCALTools_HEVC_ConvertFormat(dst.data(), iRoom, src.data(), Len(src), iFormat, iSize);
                ASSERT_EQ(r, iRoom < iFrom ? CAL_HEVC_ERR_NO_ROOM : iFrom) << iRoom;
                ASSERT_EQ(dst.back(), 0xEE) << iRoom;
                if (r > 0) {
                    EXPECT_EQ(Bytes(dst.begin(), dst.begin() + r), expected);
                }
            }
        }
    }
}

TEST(HevcFraming, ConversionEdgesAndFailures)
{
    // Source, format, NAL length size, result, output.
    const Bytes zeros = {0, 0, 0};
    const std::tuple<const char *, Bytes, int32_t, int32_t, int32_t, Bytes> cases[] = {
        {"leading zero bytes and trailing zeros are not part of a unit",
         Cat({{0, 0, 0}, AnnexB({Cat({kIdr, zeros})}), AnnexB({kTrail}, 3), zeros}), 2, 2, 13, LengthPrefixed({kIdr, kTrail}, 2)},
        {"empty units are dropped", Cat({AnnexB({{}}, 3), AnnexB({kIdr})}), 2, 4, 9, LengthPrefixed({kIdr}, 4)},
        {"a start code in the last three bytes belongs to the unit", Cat({AnnexB({kIdr}), {0, 0, 1}}), 2, 4, 12,
         LengthPrefixed({Cat({kIdr, {0, 0, 1}})}, 4)},
        {"format 0: the format test decides", LengthPrefixed({kIdr, kCra}, 3), 0, 3, 16, AnnexB({kIdr, kCra})},
        {"a unit longer than a 1-byte field carries", AnnexB({Hevc(1, Bytes(254, 7))}), 2, 1, CAL_HEVC_ERR_TOO_LONG, {}},
        {"the longest it carries", AnnexB({Hevc(1, Bytes(253, 7))}), 2, 1, 256, LengthPrefixed({Hevc(1, Bytes(253, 7))}, 1)},
        {"not a start code first", Cat({{7}, AnnexB({kIdr})}), 2, 4, CAL_HEVC_ERR_MALFORMED, {}},
        {"a unit shorter than its header", AnnexB({kIdr, {0x26}}), 2, 4, CAL_HEVC_ERR_MALFORMED, {}},
        {"a length field past the data", Cat({LengthPrefixed({kIdr}, 2), {0x01, 0x00, 0x26, 0x01}}), 1, 2, CAL_HEVC_ERR_TRUNCATED, {}},
        {"trailing bytes too few for a length field", Cat({LengthPrefixed({kIdr}, 4), {0, 0}}), 1, 4, CAL_HEVC_ERR_TRUNCATED, {}},
        {"a length field of 1", Cat({LengthPrefixed({kIdr}, 1), {1, 0x26}}), 1, 1, CAL_HEVC_ERR_MALFORMED, {}},
        {"NAL length size 5", AnnexB({kIdr}), 2, 5, CAL_HEVC_ERR_ARGUMENT, {}},
        {"source format 3", AnnexB({kIdr}), 3, 4, CAL_HEVC_ERR_ARGUMENT, {}},
    };
    for (const auto &[what, src, iFormat, iSize, iResult, out] : cases) {
        Bytes dst(300, 0xEE);
        EXPECT_EQ(vorCALTools_HEVC_ConvertFormat(dst.data(), Len(dst), src.data(), Len(src), iFormat, iSize), iResult) << what;
        if (iResult >= 0) {
            EXPECT_EQ(Bytes(dst.begin(), dst.begin() + iResult), out) << what;
        }
    }
    EXPECT_EQ(vorCALTools_HEVC_ConvertFormat(nullptr, 0, kIdr.data(), 0, 2, 4), 0); // empty data
    EXPECT_EQ(vorCALTools_HEVC_ConvertFormat(nullptr, 0, nullptr, 0, 2, 4), CAL_HEVC_ERR_ARGUMENT);
}

// The walk gives each unit with its header fields and where its start code or length field is;
// it stops with the units before a break.
TEST(HevcFraming, WalksAndNames)
{
    const Bytes upper = Hevc(1, {0x33}, 63, 7);
    const Bytes annexB = Cat({AnnexB({kAud, kVps}, 3), AnnexB({upper}), {0, 0}, AnnexB({kIdr}, 3)});
    struct Step {
        uint32_t uType, uLayer, uTid;
        int32_t iStart, iUnit;
    };
    // The zero in front of 00 00 01 belongs to the start code; the one before it to no unit.
    const std::vector<Step> steps = {{35, 0, 1, 0, 3}, {32, 0, 1, 6, 4}, {1, 63, 7, 13, 3}, {19, 0, 1, 21, 5}};
    const Bytes lengths = LengthPrefixed({kAud, kVps, upper, kIdr}, 2);
    for (const auto &[data, iSize] : {std::pair{annexB, 0}, std::pair{lengths, 2}}) {
        CALHEVCNAL u{};
        for (size_t i = 0; i < steps.size(); ++i) {
            ASSERT_EQ(vorCALTools_HEVC_NextNAL(data.data(), Len(data), iSize, &u), 1) << iSize;
            EXPECT_EQ(std::tuple(u.uType, u.uLayerId, u.uTemporalIdPlus1, u.iLen), std::tuple(steps[i].uType, steps[i].uLayer, steps[i].uTid, steps[i].iUnit));
            if (iSize == 0) {
                EXPECT_EQ(u.iStart, steps[i].iStart);
            }
            EXPECT_EQ(Bytes(u.pUnit, u.pUnit + u.iLen), std::vector<Bytes>({kAud, kVps, upper, kIdr})[i]);
        }
        EXPECT_EQ(vorCALTools_HEVC_NextNAL(data.data(), Len(data), iSize, &u), 0);
    }
    int32_t r = 0;
    EXPECT_EQ(HevcUnits(Cat({lengths, {0, 9, 0x26}}), 2, &r).size(), 4u);
    EXPECT_EQ(r, CAL_HEVC_ERR_TRUNCATED);
    EXPECT_EQ(HevcUnits(Cat({annexB, AnnexB({{0x26}})}), 0, &r).size(), 4u);
    EXPECT_EQ(r, CAL_HEVC_ERR_MALFORMED);
    CALHEVCNAL u{};
    u.iNext = Len(annexB) + 1;
    EXPECT_EQ(vorCALTools_HEVC_NextNAL(annexB.data(), Len(annexB), 0, &u), CAL_HEVC_ERR_ARGUMENT);
    EXPECT_EQ(vorCALTools_HEVC_NextNAL(annexB.data(), Len(annexB), 5, &u), CAL_HEVC_ERR_ARGUMENT);
    const std::pair<uint32_t, const char *> names[] = {{0, "TRAIL_N"}, {10, "RSV_VCL_N10"}, {16, "BLA_W_LP"}, {21, "CRA_NUT"},
                                                       {23, "RSV_IRAP_VCL23"}, {31, "RSV_VCL31"}, {32, "VPS_NUT"},
                                                       {40, "SUFFIX_SEI_NUT"}, {47, "RSV_NVCL47"}, {63, "UNSPEC63"}};
    for (const auto &[uType, pName] : names)
        EXPECT_STREQ(vorCALTools_HEVC_NALTypeName(uType), pName);
    EXPECT_EQ(vorCALTools_HEVC_NALTypeName(64), nullptr);
}

// Records: arrays with no units, several SPSs, completeness per array, NAL length sizes 1 and 2,
// and a unit or array header running past the data.
TEST(HevcFraming, RecordsToStartCodes)
{
    const Bytes fixed = {0x22, 0x20, 0, 0, 0, 0x90, 0, 0, 0, 0, 0, 0x5D, 0xF0, 0x10, 0xFE, 0xFD, 0xFA, 0xF8, 0, 0, 0x1C};
    const Bytes sps2 = Hevc(33, {0x02, 0x02, 0x02});
    const Bytes record = HvcC(fixed, {{0xA0, {kVps}}, {0x21, {}}, {0xA1, {kSps, sps2}}, {0x22, {kPps}}, {0x27, {kSei}}});
    CALHEVCConfig c;
    ASSERT_EQ(vorCALTools_HEVC_ParseHvcC(record.data(), Len(record), &c), CAL_HEVC_OK);
    const std::vector<uint32_t> fields = {c.uConfigurationVersion, c.uProfileSpace, c.uTierFlag, c.uProfileIdc,
                                          c.uProfileCompatibilityFlags, c.uConstraintFlagsHigh, c.uConstraintFlagsLow,
                                          c.uLevelIdc, c.uMinSpatialSegmentationIdc, c.uParallelismType, c.uChromaFormatIdc,
                                          c.uBitDepthLuma, c.uBitDepthChroma, c.uAvgFrameRate, c.uConstantFrameRate,
                                          c.uNumTemporalLayers, c.uTemporalIdNested, c.uNALLengthSize, c.uNumOfArrays, c.uNumOfNalus};
    EXPECT_EQ(fields, std::vector<uint32_t>({1, 0, 1, 2, 0x20000000, 0x9000, 0, 0x5D, 0x10, 2, 1, 10, 8, 0, 0, 3, 1, 1, 5, 5}));
    const Bytes expected = AnnexB({kVps, kSps, sps2, kPps, kSei});
    EXPECT_EQ(vorCALTools_HEVC_HvcCToAnnexB(nullptr, 0, record.data(), Len(record)), Len(expected));
    Bytes dst(expected.size());
    EXPECT_EQ(vorCALTools_HEVC_HvcCToAnnexB(dst.data(), Len(dst) - 1, record.data(), Len(record)), CAL_HEVC_ERR_NO_ROOM);
    ASSERT_EQ(vorCALTools_HEVC_HvcCToAnnexB(dst.data(), Len(dst), record.data(), Len(record)), Len(expected));
    EXPECT_EQ(dst, expected);
    // The walk reports each unit's array completeness.
    CALHEVCNAL u{};
    std::vector<uint32_t> complete;
    while (vorCALTools_HEVC_NextHvcCNAL(record.data(), Len(record), &u) == 1)
        complete.push_back(u.uArrayComplete);
    EXPECT_EQ(complete, std::vector<uint32_t>({1, 1, 1, 0, 0}));
    // Every cut record is refused, and nothing is written: every length is checked first.
    for (size_t n = 1; n < record.size(); ++n) {
        const Bytes cut(record.begin(), record.begin() + std::ptrdiff_t(n));
        EXPECT_EQ(vorCALTools_HEVC_ParseHvcC(cut.data(), Len(cut), &c), CAL_HEVC_ERR_TRUNCATED) << n;
        EXPECT_EQ(c.uNumOfArrays, 0u);
        EXPECT_EQ(vorCALTools_HEVC_HvcCToAnnexB(nullptr, 0, cut.data(), Len(cut)), CAL_HEVC_ERR_TRUNCATED) << n;
    }
    const Bytes shortUnit = HvcC(fixed, {{0xA0, {{0x40}}}});
    EXPECT_EQ(vorCALTools_HEVC_ParseHvcC(shortUnit.data(), Len(shortUnit), &c), CAL_HEVC_ERR_MALFORMED);
    EXPECT_EQ(vorCALTools_HEVC_ParseHvcC(record.data(), Len(record), nullptr), CAL_HEVC_ERR_ARGUMENT);
}

// Records built from parameter sets: the fixed part from the first SPS that parses (a real one:
// main_64x48), arrays VPS, SPS, PPS (prefix SEI on request) with duplicates dropped, units
// after the first slice ignored.
TEST(HevcFraming, RecordsFromParameterSets)
{
    const std::vector<Bytes> ps = HevcUnits(ReadHevcFixture("main_64x48.hevc"));
    ASSERT_GE(ps.size(), 4u);
    const Bytes &vps = ps[0], &sps = ps[1], &pps = ps[2];
    const Bytes data = Cat({AnnexB({kAud, sps, kSei, vps, pps, sps, pps}), AnnexB({kIdr, Hevc(34, {0x55})}, 3)});
    const std::tuple<uint32_t, int32_t, std::vector<std::pair<uint8_t, std::vector<Bytes>>>> cases[] = {
        {0, 4, {{32, {vps}}, {33, {sps}}, {34, {pps}}}},
        {CAL_HEVC_HVCC_COMPLETE, 2, {{0xA0, {vps}}, {0xA1, {sps}}, {0xA2, {pps}}}},
        {CAL_HEVC_HVCC_COMPLETE | CAL_HEVC_HVCC_WITH_SEI, 1, {{0xA0, {vps}}, {0xA1, {sps}}, {0xA2, {pps}}, {0xA7, {kSei}}}},
    };
    const Bytes reference = ReadHevcFixture("main_64x48.hvcc");
    for (const auto &[uFlags, iSize, arrays] : cases) {
        Bytes fixed(reference.begin() + 1, reference.begin() + 22);
        fixed.back() = uint8_t((fixed.back() & 0xFC) | (iSize - 1));
        const Bytes expected = HvcC(fixed, arrays);
        Bytes dst(expected.size());
        EXPECT_EQ(vorCALTools_HEVC_MakeHvcC(nullptr, 0, data.data(), Len(data), iSize, uFlags), Len(expected));
        EXPECT_EQ(vorCALTools_HEVC_MakeHvcC(dst.data(), Len(dst) - 1, data.data(), Len(data), iSize, uFlags), CAL_HEVC_ERR_NO_ROOM);
        ASSERT_EQ(vorCALTools_HEVC_MakeHvcC(dst.data(), Len(dst), data.data(), Len(data), iSize, uFlags), Len(expected));
        EXPECT_EQ(dst, expected) << uFlags;
    }
    const std::pair<Bytes, int32_t> failures[] = {
        {AnnexB({vps, pps}), CAL_HEVC_ERR_NOT_FOUND},
        {AnnexB({kIdr, sps}), CAL_HEVC_ERR_NOT_FOUND},               // after the first slice
        {AnnexB({Bytes(sps.begin(), sps.begin() + 6), sps}), CAL_HEVC_ERR_TRUNCATED}, // the first SPS decides
        {Cat({{9}, AnnexB({sps})}), CAL_HEVC_ERR_MALFORMED},
        {AnnexB({Hevc(32, Bytes(70000, 0x11)), sps}), CAL_HEVC_ERR_TOO_LONG},
    };
    for (const auto &[d, iResult] : failures)
        EXPECT_EQ(vorCALTools_HEVC_MakeHvcC(nullptr, 0, d.data(), Len(d), 4, 0), iResult);
    EXPECT_EQ(vorCALTools_HEVC_MakeHvcC(nullptr, 0, data.data(), Len(data), 0, 0), CAL_HEVC_ERR_ARGUMENT);
}

// IRAP test and parameter-set run, in both framings.
TEST(HevcFraming, IrapAndConfigRun)
{
    const std::tuple<const char *, std::vector<Bytes>, int32_t, int32_t, int32_t> cases[] = {
        // units, IRAP, run start unit (-1 none), run end unit
        {"IDR after parameter sets", {kAud, kVps, kSps, kPps, kSei, kIdr, kSuffix}, 1, 0, 5},
        {"CRA, parameter sets only", {kVps, kSps, kPps, kCra}, 1, 0, 3},
        {"run after other units", {Hevc(36), kSei, kTrail}, 0, 1, 2},
        {"a suffix SEI stays in the run", {kSps, kSuffix, kPps, kTrail}, 0, 0, 3},
        {"slice first", {kTrail, kVps, kRasl}, 0, -1, 0},
        {"no slice: the run goes to the end", {kVps, kSps}, 0, 0, 2},
        {"every IRAP type", {Hevc(16), Hevc(17), Hevc(18), Hevc(20), Hevc(22), Hevc(23)}, 1, -1, 0},
        {"reserved types around them", {Hevc(15), Hevc(24)}, 0, -1, 0},
        {"an IRAP header no decoder takes", {kSps, {0xA6, 0x01, 0xAF}, Hevc(19, {0xAF}, 0, 0), kTrail}, 0, 0, 3},
    };
    for (const auto &[what, units, iIrap, iFirst, iEnd] : cases) {
        for (int32_t iSize : {0, 1, 4}) {
            Bytes data;
            std::vector<int32_t> starts;
            for (const Bytes &u : units) {
                starts.push_back(Len(data));
                data = Cat({data, iSize == 0 ? AnnexB({u}) : LengthPrefixed({u}, iSize)});
            }
            starts.push_back(Len(data));
            EXPECT_EQ(vorCALTools_HEVC_IsIRAP(data.data(), Len(data), iSize), iIrap) << what << " " << iSize;
            int32_t iRun = -1;
            const uint8_t *p = vorCALTools_HEVC_GetConfigStream(data.data(), Len(data), iSize, &iRun);
            EXPECT_EQ(p ? int32_t(p - data.data()) : -1, iFirst < 0 ? -1 : starts[size_t(iFirst)]) << what << " " << iSize;
            EXPECT_EQ(iRun, iFirst < 0 ? 0 : starts[size_t(iEnd)] - starts[size_t(iFirst)]) << what << " " << iSize;
        }
    }
    // A frame that breaks before its first slice has no run; one that breaks after an IRAP slice
    // still holds it.
    const Bytes broken = Cat({LengthPrefixed({kSps, kIdr}, 2), {0, 50, 0x26}});
    int32_t iRun = -1;
    EXPECT_EQ(vorCALTools_HEVC_GetConfigStream(broken.data(), Len(broken) - 9, 2, &iRun), nullptr);
    EXPECT_EQ(iRun, 0);
    EXPECT_EQ(vorCALTools_HEVC_IsIRAP(broken.data(), Len(broken), 2), 1);
    EXPECT_EQ(vorCALTools_HEVC_IsIRAP(broken.data(), Len(broken), 5), 0);
}

} // namespace
