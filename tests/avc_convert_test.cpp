#include <gtest/gtest.h>

#include <functional>
#include <optional>
#include <random>

#include <vorcal/video_tools.h>

#include "avc_streams.hpp"
#include "recording_sal.hpp"

namespace {

using namespace vorcal::test;

constexpr int32_t kFail = -1;

// Runs a conversion into a destination of exactly dstSize bytes followed by guard bytes, and
// checks that nothing past dstSize was written.
template <typename F>
std::pair<int32_t, Bytes> Into(F convert, const Bytes &src, int32_t dstSize)
{
    Bytes dst(static_cast<size_t>(dstSize) + 8, 0xEE);
    const int32_t r = convert(dst.data(), dstSize, src.data(), static_cast<int32_t>(src.size()));
    for (size_t k = static_cast<size_t>(dstSize); k < dst.size(); ++k)
        EXPECT_EQ(dst[k], 0xEE) << "byte " << k << " written past the destination";
    dst.resize(r > 0 ? static_cast<size_t>(r) : 0);
    return {r, dst};
}

using ConvertFn = std::function<int32_t(uint8_t *, int32_t, const uint8_t *, int32_t)>;

ConvertFn Convert(int32_t size)
{
    return [size](uint8_t *d, int32_t n, const uint8_t *s, int32_t len) {
        return vorCALTools_AVC_ConvertFormat(d, n, s, len, size);
    };
}
ConvertFn ConvertSlices(int32_t size)
{
    return [size](uint8_t *d, int32_t n, const uint8_t *s, int32_t len) {
        return vorCALTools_AVC_ConvertFormat_NoSPSPPS(d, n, s, len, size);
    };
}
int32_t ConvertPSs(uint8_t *d, int32_t n, const uint8_t *s, int32_t len)
{
    return vorCALTools_AVC_ConvertFormatPSs(d, n, s, len);
}

struct ConvertCase {
    const char *name;
    Bytes src;
    int32_t size;
    int32_t expected;
    Bytes out;
};

class ConvertFormat : public testing::TestWithParam<ConvertCase> {};

TEST_P(ConvertFormat, Table)
{
    const ConvertCase &c = GetParam();
    const auto [r, out] = Into(Convert(c.size), c.src, static_cast<int32_t>(c.src.size()) + 100);
    EXPECT_EQ(r, c.expected);
    if (c.expected > 0) {
        EXPECT_EQ(out, c.out);
    }
}

const Bytes k3Units{0, 0, 1, 0x67, 0xAA, 0, 0, 0, 1, 0x68, 0xBB, 0, 0, 1, 0x65, 0xCC};
const Bytes k3UnitsOut{0, 0, 0, 2, 0x67, 0xAA, 0, 0, 0, 2, 0x68, 0xBB, 0, 0, 0, 2, 0x65, 0xCC};

INSTANTIATE_TEST_SUITE_P(
    Cases, ConvertFormat,
    testing::Values(
        ConvertCase{"size4", {0, 0, 0, 2, 0x65, 0x88, 0, 0, 0, 1, 0x41}, 4, 11, {0, 0, 0, 1, 0x65, 0x88, 0, 0, 0, 1, 0x41}},
        ConvertCase{"size3", {0, 0, 2, 0x65, 0x88, 0, 0, 1, 0x41}, 3, 11, {0, 0, 0, 1, 0x65, 0x88, 0, 0, 0, 1, 0x41}},
        ConvertCase{"size2", {0, 2, 0x65, 0x88}, 2, 6, {0, 0, 0, 1, 0x65, 0x88}},
        ConvertCase{"size1", {2, 0x65, 0x88, 1, 0x41}, 1, 11, {0, 0, 0, 1, 0x65, 0x88, 0, 0, 0, 1, 0x41}},
        ConvertCase{"size0Refused", {2, 0x65, 0x88, 1, 0x41}, 0, kFail, {}},
        ConvertCase{"size5Refused", {0, 0, 0, 0, 2, 0x65, 0x88}, 5, kFail, {}},
        ConvertCase{"onlyALengthField", {0, 0, 0, 5}, 4, 0, {}},
        ConvertCase{"shorterThanTheField", {0, 0, 5}, 4, kFail, {}},
        // Trailing bytes too few for another field are dropped; a zero-length unit is kept.
        ConvertCase{"trailingDropped", {0, 0, 0, 2, 0x41, 0x42, 0, 0, 9}, 4, 6, {0, 0, 0, 1, 0x41, 0x42}},
        ConvertCase{"zeroLengthUnit", {0, 0, 0, 0, 0, 0, 0, 1, 0x41}, 4, 9, {0, 0, 0, 1, 0, 0, 0, 1, 0x41}},
        // Length fields 00 00 | 00 01 look like a start code: the data goes the other way.
        ConvertCase{"lengthsThatLookLikeACode", {0, 0, 0, 1, 0x41}, 2, 5, {0, 0, 0, 1, 0x41}},
        ConvertCase{"annexB", k3Units, 4, 18, k3UnitsOut},
        ConvertCase{"annexBAnySize", k3Units, 9, 18, k3UnitsOut},
        ConvertCase{"annexBBadFirstCode", {0, 0, 2, 0x65, 0, 0, 1, 0x41}, 4, kFail, {}},
        ConvertCase{"annexBShort", {0, 0, 1}, 0, 4, {0, 0, 0, 0}},
        ConvertCase{"annexBTooShortForSize", {0, 0, 1}, 4, kFail, {}},
        // A zero byte in front of 00 00 01 belongs to the next code, not to the unit.
        ConvertCase{"trailingZeroMoves", {0, 0, 1, 0x65, 0x11, 0, 0, 0, 1, 0x41}, 4, 11, {0, 0, 0, 2, 0x65, 0x11, 0, 0, 0, 1, 0x41}},
        // 00 00 01 too close to the end to count stays in the unit.
        ConvertCase{"codeAtTheEnd", {0, 0, 1, 0x65, 0x11, 0, 0, 1}, 4, 9, {0, 0, 0, 5, 0x65, 0x11, 0, 0, 1}},
        ConvertCase{"emptyUnits", {0, 0, 1, 0, 0, 1, 0x41}, 4, 9, {0, 0, 0, 0, 0, 0, 0, 1, 0x41}}),
    [](const testing::TestParamInfo<ConvertCase> &info) { return info.param.name; });

TEST(ConvertFormat, LengthFieldBeyondTheDataTraces)
{
    RecordingSal::Get().Reset();
    // A good unit, then a length field of 0x100 with 10 bytes after it.
    Bytes src{0, 0, 0, 2, 0x65, 0x88, 0, 0, 1, 0};
    src.resize(20, 0x55);
    const auto [r, out] = Into(Convert(4), src, 200);
    EXPECT_EQ(r, kFail);
    EXPECT_TRUE(HasTrace(2, 0, "[CAL_Tools %d] vorCALTools_AVC_ConvertFormat Error(%d, %d)\n",
                         "[CAL_Tools #] vorCALTools_AVC_ConvertFormat Error(10, 256)\n"));
}

TEST(ConvertFormat, SlicesOnly)
{
    RecordingSal::Get().Reset();
    const Bytes idr = Slice(0x65, 0);
    const auto [r, out] = Into(ConvertSlices(4), AnnexB({kSps, kPps, idr}, {4, 3}), 200);
    EXPECT_EQ(r, static_cast<int32_t>(4 + idr.size()));
    EXPECT_EQ(out, LengthPrefixed({idr}, 4));
    EXPECT_EQ(RecordingSal::Get().traces.size(), 0u);

    const auto [r2, out2] = Into(ConvertSlices(4), AnnexB({kSps, idr, kPps}), 200);
    EXPECT_EQ(r2, kFail);
    EXPECT_TRUE(HasPlainTrace("[vorCAL_Tools %d] No correct Frame.\n", "[vorCAL_Tools #] No correct Frame.\n"));

    // Towards start codes every unit stays.
    const Bytes lp = LengthPrefixed({kSps, kPps, idr}, 2);
    const auto [r3, out3] = Into(ConvertSlices(2), lp, 200);
    EXPECT_EQ(out3, AnnexB({kSps, kPps, idr}));
}

// A plain conversion in the other direction, written from the framing rules: each unit runs
// to the next 00 00 00 01 / 00 00 01 that begins at least 4 bytes before the end.
std::optional<Bytes> ReferenceToLength(const Bytes &s, bool slicesOnly)
{
    const size_t n = s.size();
    auto codeAt = [&](size_t i) -> size_t {
        if (i + 3 < n && s[i] == 0 && s[i + 1] == 0 && s[i + 2] == 0 && s[i + 3] == 1)
            return 4;
        return (i + 2 < n && s[i] == 0 && s[i + 1] == 0 && s[i + 2] == 1) ? 3 : 0;
    };
    auto nextCode = [&](size_t from) -> size_t {
        for (size_t i = from; i + 3 < n; ++i) {
            if (codeAt(i))
                return i;
        }
        return n;
    };
    Bytes out;
    size_t pos = 0;
    do {
        const size_t c = codeAt(pos);
        if (c == 0)
            return std::nullopt;
        const size_t body = pos + c;
        const uint8_t type = body < n ? s[body] & 0x1F : 0;
        if (slicesOnly && type != 1 && type != 5) {
            pos = nextCode(body + 1);
            if (pos == n)
                return std::nullopt;
            continue;
        }
        const size_t end = nextCode(body);
        const size_t len = end - body;
        out.insert(out.end(), {uint8_t(len >> 24), uint8_t(len >> 16), uint8_t(len >> 8), uint8_t(len)});
        out.insert(out.end(), s.begin() + static_cast<std::ptrdiff_t>(body), s.begin() + static_cast<std::ptrdiff_t>(end));
        pos = end;
    } while (pos < n);
    return out;
}

// Random start-code streams: 3- and 4-byte codes, units of 0 to 300 bytes with zero bytes,
// stray 00 00 02 and 00 00 01 near the end, some streams cut anywhere.
Bytes RandomAnnexB(std::mt19937 &rng)
{
    Bytes s;
    const int units = 1 + static_cast<int>(rng() % 6);
    for (int u = 0; u < units; ++u) {
        if (rng() % 2)
            s.push_back(0);
        s.insert(s.end(), {0, 0, 1});
        static constexpr uint8_t kTypes[] = {0x65, 0x41, 0x67, 0x68, 0x06, 0x09};
        s.push_back(kTypes[rng() % 6]);
        const size_t len = rng() % 4 == 0 ? rng() % 4 : rng() % 300;
        for (size_t i = 0; i < len; ++i)
            s.push_back(static_cast<uint8_t>(rng() % 5 == 0 ? rng() % 3 : rng()));
    }
    if (rng() % 4 == 0)
        s.resize(rng() % (s.size() + 1));
    return s;
}

TEST(ConvertFormat, MatchesReferenceOnRandomStreamsAndEveryDestinationSize)
{
    std::mt19937 rng(2026);
    for (int round = 0; round < 1500; ++round) {
        const Bytes src = RandomAnnexB(rng);
        for (bool slicesOnly : {false, true}) {
            const std::optional<Bytes> ref = ReferenceToLength(src, slicesOnly);
            auto f = slicesOnly ? ConvertSlices(0) : Convert(0);
            const auto [r, out] = Into(f, src, static_cast<int32_t>(src.size()) + 100);
            ASSERT_EQ(r, ref ? static_cast<int32_t>(ref->size()) : kFail) << round;
            if (!ref)
                continue;
            ASSERT_EQ(out, *ref) << round;
            // One byte short fails; exactly enough succeeds; nothing past the size is touched.
            if (!ref->empty()) {
                ASSERT_EQ(Into(f, src, static_cast<int32_t>(ref->size()) - 1).first, kFail);
            }
            ASSERT_EQ(Into(f, src, static_cast<int32_t>(ref->size())).second, *ref);
        }
    }
}

TEST(ConvertFormat, LengthPrefixedDestinationSizes)
{
    for (int size = 1; size <= 4; ++size) {
        const Bytes src = size == 1 ? LengthPrefixed({kSps, kPps, Bytes(200, 0x77)}, size)
                                    : LengthPrefixed({kSps, kPps, Bytes(700, 0x77)}, size);
        const Bytes full = size == 1 ? AnnexB({kSps, kPps, Bytes(200, 0x77)}) : AnnexB({kSps, kPps, Bytes(700, 0x77)});
        for (int32_t d = 0; d <= static_cast<int32_t>(full.size()); ++d) {
            const auto [r, out] = Into(Convert(size), src, d);
            ASSERT_EQ(r, d < static_cast<int32_t>(full.size()) ? kFail : static_cast<int32_t>(full.size())) << size << " " << d;
        }
    }
}

struct PSsCase {
    const char *name;
    Bytes src;
    int32_t dstSize;
    Bytes out; // empty: result 0
};

class ConvertFormatPSs : public testing::TestWithParam<PSsCase> {};

TEST_P(ConvertFormatPSs, Table)
{
    RecordingSal::Get().Reset();
    const PSsCase &c = GetParam();
    const auto [r, out] = Into(ConvertPSs, c.src, c.dstSize);
    EXPECT_EQ(r, static_cast<int32_t>(c.out.size()));
    EXPECT_EQ(out, c.out);
    EXPECT_TRUE(HasPlainTrace("[vorCAL_Tools %d] vorCALTools_AVC_ConvertFormatPSs\n",
                              "[vorCAL_Tools #] vorCALTools_AVC_ConvertFormatPSs\n"));
}

const Bytes kRecord{0x01, 0x42, 0xC0, 0x1E, 0xFF, 0xE1, 0x00, 0x04, 0x67, 0x42, 0xC0, 0x1E, 0x01, 0x00, 0x02, 0x68, 0xCE};
const Bytes kRecordOut{0, 0, 0, 1, 0x67, 0x42, 0xC0, 0x1E, 0, 0, 0, 1, 0x68, 0xCE};
const Bytes kList{0x01, 0x00, 0x04, 0x67, 0x42, 0xC0, 0x1E, 0x01, 0x00, 0x02, 0x68, 0xCE};

INSTANTIATE_TEST_SUITE_P(
    Containers, ConvertFormatPSs,
    testing::Values(
        PSsCase{"record", kRecord, 64, kRecordOut}, PSsCase{"list", kList, 64, kRecordOut},
        // Two SPS in a list (byte 1 is 0 here: the SPS length's high byte).
        PSsCase{"listTwoSps", {0x02, 0, 1, 0x67, 0, 1, 0x67, 0x01, 0, 1, 0x68}, 64,
                {0, 0, 0, 1, 0x67, 0, 0, 0, 1, 0x67, 0, 0, 0, 1, 0x68}},
        PSsCase{"listNoPps", {0x01, 0, 2, 0x67, 0x42, 0x00}, 64, {0, 0, 0, 1, 0x67, 0x42}},
        // Room runs out: copying stops once 4 bytes or fewer are left; overflow gives 0.
        PSsCase{"roomStopsAfterSps", kRecord, 12, {0, 0, 0, 1, 0x67, 0x42, 0xC0, 0x1E}},
        PSsCase{"exactFit", kRecord, 14, kRecordOut}, PSsCase{"ppsOverflows", kRecord, 13, {}},
        PSsCase{"spsOverflows", kRecord, 7, {}},
        // A record that claims more than it holds: the missing bytes read as zeros.
        PSsCase{"recordCut", {0x01, 0x42, 0xC0, 0x1E, 0xFF, 0xE1, 0x00, 0x04, 0x67, 0x42, 0xC0, 0x1E, 0x01, 0x00, 0x02, 0x68}, 64,
                {0, 0, 0, 1, 0x67, 0x42, 0xC0, 0x1E, 0, 0, 0, 1, 0x68, 0x00}},
        PSsCase{"annexB", {0, 0, 0, 1, 0x67, 0x42, 0xC0, 0x1E, 0, 0, 0, 1, 0x68, 0xCE}, 64, kList},
        // Units in front of the SPS are passed over; units between SPS and PPS join the SPS.
        PSsCase{"annexBSeiBetween", Cat({AnnexB({kSei, {0x67, 0x42}, kSei}, {3}), AnnexB({{0x68, 0xCE}, {0x65, 1}})}), 64,
                Cat({{0x01, 0x00, 0x0B, 0x67, 0x42, 0, 0, 1}, kSei, {0x01, 0x00, 0x02, 0x68, 0xCE}})},
        PSsCase{"annexBForbiddenBitSkipped", AnnexB({{0xE7, 1}, {0x67, 2}, {0x68, 3}}), 64,
                {0x01, 0x00, 0x02, 0x67, 0x02, 0x01, 0x00, 0x02, 0x68, 0x03}},
        PSsCase{"annexBNoPps", AnnexB({{0x67, 2}, {0x65, 3}}), 64, {}},
        PSsCase{"annexBOverflow", {0, 0, 0, 1, 0x67, 0x42, 0xC0, 0x1E, 0, 0, 0, 1, 0x68, 0xCE}, 11, {}},
        PSsCase{"short", {0, 0, 1}, 64, {}}),
    [](const testing::TestParamInfo<PSsCase> &info) { return info.param.name; });

TEST(ConvertFormatPSs, AnnexBTraces)
{
    RecordingSal::Get().Reset();
    Into(ConvertPSs, AnnexB({{0x67, 2}, {0x68, 3}}), 64);
    EXPECT_TRUE(HasPlainTrace("[vorCAL_Tools %d] vorCALTools_AVC_ConvertFormatPSs ANNEXB\n",
                              "[vorCAL_Tools #] vorCALTools_AVC_ConvertFormatPSs ANNEXB\n"));
    EXPECT_TRUE(HasTrace(2, 0, "[CAL_Tools %d] H.264 ANNEXB Type Conversion\n", "[CAL_Tools #] H.264 ANNEXB Type Conversion\n"));
}

// The configuration-run scan as a literal 32-bit shift register, primed with FF.
struct Found {
    int64_t pos = -1;
    int64_t header = -1;
};
Found ReferenceScan(const Bytes &d, size_t from)
{
    const size_t n = d.size();
    auto b = [&](size_t i) -> uint32_t { return i < n ? d[i] : 0; };
    uint32_t reg = 0xFF000000u | (b(from) << 16) | (b(from + 1) << 8) | b(from + 2);
    size_t last = from + 2;
    for (;;) {
        if (reg == 1)
            return {int64_t(last) - 3, int64_t(last) + 1};
        if ((reg & 0xFFFFFF) == 1)
            return {int64_t(last) - 2, int64_t(last) + 1};
        if (last + 1 >= n - 1 || n == 0)
            return {};
        reg = (reg << 8) | d[++last];
    }
}

std::pair<int64_t, int32_t> ReferenceAnnexBRun(const Bytes &d)
{
    if (d.size() <= 3)
        return {-1, 0};
    int64_t run = -1;
    size_t from = 0;
    for (;;) {
        const Found f = ReferenceScan(d, from);
        if (f.pos < 0)
            return run < 0 ? std::pair<int64_t, int32_t>{-1, 0} : std::pair<int64_t, int32_t>{run, int32_t(d.size() - run)};
        const uint8_t h = size_t(f.header) < d.size() ? d[f.header] : 0;
        if (!(h & 0x80)) {
            const int t = h & 0x1F;
            if (t == 1 || t == 5)
                return run < 0 ? std::pair<int64_t, int32_t>{-1, 0} : std::pair<int64_t, int32_t>{run, int32_t(f.pos - run)};
            if ((t == 6 || t == 7 || t == 8) && run < 0)
                run = f.pos;
        }
        if (f.header >= int64_t(d.size()) - 1)
            return {-1, 0};
        from = size_t(f.header);
    }
}

std::pair<int64_t, int32_t> AnnexBRun(const Bytes &d)
{
    int32_t len = -7;
    const uint8_t *p = vorCALTools_AVC_ANNEXB_GetConfigStream(d.data(), int32_t(d.size()), &len);
    return {p ? p - d.data() : -1, len};
}

TEST(AnnexBConfigStream, Examples)
{
    const Bytes spsPpsIdr = AnnexB({kSps, kPps, Slice(0x65, 0)});
    EXPECT_EQ(AnnexBRun(spsPpsIdr), (std::pair<int64_t, int32_t>{0, int32_t(8 + kSps.size() + kPps.size())}));
    EXPECT_EQ(AnnexBRun(AnnexB({Slice(0x65, 0), kSps})), (std::pair<int64_t, int32_t>{-1, 0}));
    // No slice: the run goes to the end.
    EXPECT_EQ(AnnexBRun(AnnexB({kSps, kPps})), (std::pair<int64_t, int32_t>{0, int32_t(8 + kSps.size() + kPps.size())}));
}

TEST(AnnexBConfigStream, MatchesLiteralRegisterScan)
{
    std::mt19937 rng(5);
    for (int round = 0; round < 4000; ++round) {
        const Bytes d = RandomAnnexB(rng);
        ASSERT_EQ(AnnexBRun(d), ReferenceAnnexBRun(d)) << round;
        // Every truncation of short streams, for the priming at the very end.
        if (d.size() < 40) {
            for (size_t n = 0; n < d.size(); ++n) {
                const Bytes cut(d.begin(), d.begin() + std::ptrdiff_t(n));
                ASSERT_EQ(AnnexBRun(cut), ReferenceAnnexBRun(cut)) << round << " cut " << n;
            }
        }
    }
}

class NalConfigStream : public testing::TestWithParam<int> {};

std::pair<int64_t, int32_t> NalRun(const Bytes &d, int size)
{
    int32_t len = -7;
    const uint8_t *p = vorCALTools_AVC_NAL_GetConfigStream(d.data(), int32_t(d.size()), size, &len);
    return {p ? p - d.data() : -1, len};
}

TEST_P(NalConfigStream, EverySize)
{
    const int size = GetParam();
    const Bytes slice = Slice(0x41, 1);
    const Bytes head = LengthPrefixed({kSei, kSps, kPps}, size);
    EXPECT_EQ(NalRun(Cat({head, LengthPrefixed({slice}, size)}), size), (std::pair<int64_t, int32_t>{0, int32_t(head.size())}));
    // An access unit delimiter in front: the run starts at the SEI.
    const Bytes aud = LengthPrefixed({{0x09, 0x10}}, size);
    EXPECT_EQ(NalRun(Cat({aud, head, LengthPrefixed({slice}, size)}), size),
              (std::pair<int64_t, int32_t>{int64_t(aud.size()), int32_t(head.size())}));
    EXPECT_EQ(NalRun(LengthPrefixed({slice, kSps}, size), size), (std::pair<int64_t, int32_t>{-1, 0}));
    EXPECT_EQ(NalRun(LengthPrefixed({{0xE7, 1}, slice}, size), size), (std::pair<int64_t, int32_t>{-1, 0}));
    // No slice: the run ends with the data.
    EXPECT_EQ(NalRun(head, size), (std::pair<int64_t, int32_t>{0, int32_t(head.size())}));
    // Truncated anywhere: never a run beyond the data.
    const Bytes all = Cat({head, LengthPrefixed({slice}, size)});
    for (size_t n = 0; n <= all.size(); ++n) {
        const Bytes cut(all.begin(), all.begin() + std::ptrdiff_t(n));
        const auto [at, len] = NalRun(cut, size);
        ASSERT_LE(at + len, int64_t(n));
    }
}

INSTANTIATE_TEST_SUITE_P(Sizes, NalConfigStream, testing::Values(1, 2, 3, 4));

TEST(NalConfigStream, RefusedSizes)
{
    const Bytes d = LengthPrefixed({kSps, Slice(0x41, 1)}, 4);
    for (int size : {0, 5, -1})
        EXPECT_EQ(NalRun(d, size), (std::pair<int64_t, int32_t>{-1, 0})) << size;
}

} // namespace
