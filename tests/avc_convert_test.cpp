#include <gtest/gtest.h>

#include <optional>
#include <random>
#include <tuple>

#include <vorcal/video_tools.h>

#include "avc_streams.hpp"
#include "recording_sal.hpp"

namespace {

using namespace vorcal::test;
using Fn = int32_t (*)(uint8_t *, int32_t, const uint8_t *, int32_t, int32_t);
using Span = std::pair<int64_t, int32_t>; // offset of a configuration run (-1: none), its length

int32_t PSs(uint8_t *d, int32_t n, const uint8_t *s, int32_t len, int32_t) { return vorCALTools_AVC_ConvertFormatPSs(d, n, s, len); }

// Converts into exactly dstSize bytes followed by guard bytes that must stay untouched.
std::pair<int32_t, Bytes> Into(Fn f, const Bytes &src, size_t dstSize, int32_t size = 4)
{
    Bytes dst(dstSize + 8, 0xEE);
    const int32_t r = f(dst.data(), int32_t(dstSize), src.data(), int32_t(src.size()), size);
    EXPECT_EQ(Bytes(dst.begin() + std::ptrdiff_t(dstSize), dst.end()), Bytes(8, 0xEE)) << "written past the destination";
    dst.resize(r > 0 ? size_t(r) : 0);
    return {r, dst};
}

TEST(ConvertFormat, Table)
{
    const Bytes units{0, 0, 1, 0x67, 0xAA, 0, 0, 0, 1, 0x68, 0xBB, 0, 0, 1, 0x65, 0xCC};
    const Bytes unitsOut{0, 0, 0, 2, 0x67, 0xAA, 0, 0, 0, 2, 0x68, 0xBB, 0, 0, 0, 2, 0x65, 0xCC};
    const Bytes twoOut{0, 0, 0, 1, 0x65, 0x88, 0, 0, 0, 1, 0x41};
    const std::tuple<Bytes, int32_t, int32_t, Bytes> cases[] = {
        {{0, 0, 0, 2, 0x65, 0x88, 0, 0, 0, 1, 0x41}, 4, 11, twoOut}, {{0, 0, 2, 0x65, 0x88, 0, 0, 1, 0x41}, 3, 11, twoOut},
        {{0, 2, 0x65, 0x88}, 2, 6, {0, 0, 0, 1, 0x65, 0x88}}, {{2, 0x65, 0x88, 1, 0x41}, 1, 11, twoOut},
        {{2, 0x65, 0x88, 1, 0x41}, 0, -1, {}}, {{0, 0, 0, 0, 2, 0x65, 0x88}, 5, -1, {}}, // refused sizes
        {{0, 0, 0, 5}, 4, 0, {}}, {{0, 0, 5}, 4, -1, {}},
        // Trailing bytes too few for another field are dropped.
        {{0, 0, 0, 2, 0x41, 0x42, 0, 0, 9}, 4, 6, {0, 0, 0, 1, 0x41, 0x42}},
        // Length fields 00 00 | 00 01 look like a start code: the data goes the other way.
        {{0, 0, 0, 1, 0x41}, 2, 5, {0, 0, 0, 1, 0x41}},
        {units, 4, 18, unitsOut}, {units, 9, 18, unitsOut}, {{0, 0, 2, 0x65, 0, 0, 1, 0x41}, 4, -1, {}},
        {{0, 0, 1}, 0, 4, {0, 0, 0, 0}}, {{0, 0, 1}, 4, -1, {}}};
    for (const auto &[src, size, result, out] : cases)
        EXPECT_EQ(Into(vorCALTools_AVC_ConvertFormat, src, src.size() + 100, size), std::pair(result, out)) << testing::PrintToString(src);
    // Towards start codes, every destination size short of the result fails.
    for (int size = 1; size <= 4; ++size) {
        const Bytes src = LengthPrefixed({kSps, kPps, Bytes(size == 1 ? 200 : 700, 0x77)}, size);
        const Bytes full = AnnexB({kSps, kPps, Bytes(size == 1 ? 200 : 700, 0x77)});
        for (size_t d = 0; d <= full.size(); ++d)
            ASSERT_EQ(Into(vorCALTools_AVC_ConvertFormat, src, d, size).first, d < full.size() ? -1 : int32_t(full.size())) << d;
    }
}

TEST(ConvertFormat, TracesAndSlicesOnly)
{
    RecordingSal::Get().Reset();
    Bytes src{0, 0, 0, 2, 0x65, 0x88, 0, 0, 1, 0}; // a good unit, then a length of 256 with 10 bytes left
    src.resize(20, 0x55);
    EXPECT_EQ(Into(vorCALTools_AVC_ConvertFormat, src, 200).first, -1);
    EXPECT_TRUE(HasTrace(2, 0, "[CAL_Tools %d] vorCALTools_AVC_ConvertFormat Error(%d, %d)\n",
                         "[CAL_Tools #] vorCALTools_AVC_ConvertFormat Error(10, 256)\n"));
    RecordingSal::Get().Reset();
    const Bytes idr = Slice(0x65, 0);
    EXPECT_EQ(Into(vorCALTools_AVC_ConvertFormat_NoSPSPPS, Cat({AnnexB({kSps}), AnnexB({kPps, idr}, 3)}), 200).second,
              LengthPrefixed({idr}, 4));
    EXPECT_EQ(RecordingSal::Get().traces.size(), 0u);
    EXPECT_EQ(Into(vorCALTools_AVC_ConvertFormat_NoSPSPPS, AnnexB({kSps, idr, kPps}), 200).first, -1);
    EXPECT_TRUE(HasPlainTrace("[vorCAL_Tools %d] No correct Frame.\n", "[vorCAL_Tools #] No correct Frame.\n"));
    // Towards start codes every unit stays.
    EXPECT_EQ(Into(vorCALTools_AVC_ConvertFormat_NoSPSPPS, LengthPrefixed({kSps, kPps, idr}, 2), 200, 2).second,
              AnnexB({kSps, kPps, idr}));
}

// Random start-code streams: 3- and 4-byte codes, units of 0 to 300 bytes rich in zero bytes,
// some streams cut anywhere.
Bytes RandomAnnexB(std::mt19937 &rng)
{
    Bytes s;
    for (int u = 1 + int(rng() % 6); u > 0; --u) {
        s = Cat({s, rng() % 2 ? Bytes{0, 0, 0, 1} : Bytes{0, 0, 1}, {std::array<uint8_t, 6>{0x65, 0x41, 0x67, 0x68, 0x06, 0x09}[rng() % 6]}});
        for (size_t len = rng() % 4 == 0 ? rng() % 4 : rng() % 300; len > 0; --len)
            s.push_back(uint8_t(rng() % 5 == 0 ? rng() % 3 : rng()));
    }
    if (rng() % 4 == 0)
        s.resize(rng() % (s.size() + 1));
    return s;
}

// Towards length prefixes, from the framing rules alone: a unit runs to the next start code
// that begins at least 4 bytes before the end.
std::optional<Bytes> ReferenceToLength(const Bytes &s, bool slicesOnly)
{
    const size_t n = s.size();
    auto codeAt = [&](size_t i) -> size_t {
        if (i + 3 < n && !s[i] && !s[i + 1] && !s[i + 2] && s[i + 3] == 1)
            return 4;
        return i + 2 < n && !s[i] && !s[i + 1] && s[i + 2] == 1 ? 3 : 0;
    };
    auto nextCode = [&](size_t i) {
        while (i + 3 < n && !codeAt(i))
            ++i;
        return i + 3 < n ? i : n;
    };
    if (n == 0)
        return std::nullopt;
    Bytes out;
    for (size_t pos = 0; pos < n;) {
        if (!codeAt(pos))
            return std::nullopt;
        const size_t body = pos + codeAt(pos), type = body < n ? s[body] & 0x1F : 0;
        if (slicesOnly && type != 1 && type != 5) {
            if ((pos = nextCode(body + 1)) == n)
                return std::nullopt;
            continue;
        }
        pos = nextCode(body);
        out = Cat({out, LengthPrefixed({Bytes(s.begin() + std::ptrdiff_t(body), s.begin() + std::ptrdiff_t(pos))}, 4)});
    }
    return out;
}

TEST(ConvertFormat, MatchesReferenceOnRandomStreamsWithExactDestinations)
{
    std::mt19937 rng(2026);
    for (int round = 0; round < 1500; ++round) {
        const Bytes src = RandomAnnexB(rng);
        for (bool slicesOnly : {false, true}) {
            const std::optional<Bytes> ref = ReferenceToLength(src, slicesOnly);
            const Fn f = slicesOnly ? vorCALTools_AVC_ConvertFormat_NoSPSPPS : vorCALTools_AVC_ConvertFormat;
            ASSERT_EQ(Into(f, src, src.size() + 100, 0), ref ? std::pair(int32_t(ref->size()), *ref) : std::pair(-1, Bytes{})) << round;
            if (ref && !ref->empty()) {
                ASSERT_EQ(Into(f, src, ref->size() - 1, 0).first, -1) << round;
                ASSERT_EQ(Into(f, src, ref->size(), 0).second, *ref) << round;
            }
        }
    }
}

TEST(ConvertFormatPSs, Table)
{
    const Bytes record{0x01, 0x42, 0xC0, 0x1E, 0xFF, 0xE1, 0x00, 0x04, 0x67, 0x42, 0xC0, 0x1E, 0x01, 0x00, 0x02, 0x68, 0xCE};
    const Bytes annexB = AnnexB({{0x67, 0x42, 0xC0, 0x1E}, {0x68, 0xCE}}), list = Cat({{0x01}, Bytes(record.begin() + 6, record.end())});
    const std::tuple<Bytes, int32_t, Bytes> cases[] = {
        {record, 64, annexB}, {list, 64, annexB},
        // Two SPS in a list (byte 1 is 0 here: the SPS length's high byte); a list without PPS.
        {{0x02, 0, 1, 0x67, 0, 1, 0x67, 0x01, 0, 1, 0x68}, 64, AnnexB({{0x67}, {0x67}, {0x68}})},
        {{0x01, 0, 2, 0x67, 0x42, 0x00}, 64, AnnexB({{0x67, 0x42}})},
        // Copying stops once 4 bytes or fewer are left; an entry that would overflow gives 0.
        {record, 12, AnnexB({{0x67, 0x42, 0xC0, 0x1E}})}, {record, 14, annexB}, {record, 13, {}}, {record, 7, {}},
        // A record that claims more than it holds: the missing bytes read as zeros.
        {Bytes(record.begin(), record.end() - 1), 64, AnnexB({{0x67, 0x42, 0xC0, 0x1E}, {0x68, 0x00}})},
        {annexB, 64, list}, {annexB, 11, {}},
        // Units in front of the SPS are passed over; units between SPS and PPS join the SPS.
        {Cat({AnnexB({kSei, {0x67, 0x42}, kSei}, 3), AnnexB({{0x68, 0xCE}, {0x65, 1}})}), 64,
         Cat({{0x01, 0x00, 0x0B, 0x67, 0x42, 0, 0, 1}, kSei, {0x01, 0x00, 0x02, 0x68, 0xCE}})},
        {AnnexB({{0xE7, 1}, {0x67, 2}, {0x68, 3}}), 64, {0x01, 0x00, 0x02, 0x67, 0x02, 0x01, 0x00, 0x02, 0x68, 0x03}},
        {AnnexB({{0x67, 2}, {0x65, 3}}), 64, {}}, {{0, 0, 1}, 64, {}}};
    for (const auto &[src, dstSize, out] : cases) {
        RecordingSal::Get().Reset();
        EXPECT_EQ(Into(PSs, src, size_t(dstSize)), std::pair(int32_t(out.size()), out)) << testing::PrintToString(src);
        EXPECT_TRUE(HasPlainTrace("[vorCAL_Tools %d] vorCALTools_AVC_ConvertFormatPSs\n", "[vorCAL_Tools #] vorCALTools_AVC_ConvertFormatPSs\n"));
        if (vorCALTools_AVC_CheckFormat(src.data(), int32_t(src.size())) == 2) {
            EXPECT_TRUE(HasPlainTrace("[vorCAL_Tools %d] vorCALTools_AVC_ConvertFormatPSs ANNEXB\n",
                                      "[vorCAL_Tools #] vorCALTools_AVC_ConvertFormatPSs ANNEXB\n"));
            EXPECT_TRUE(HasTrace(2, 0, "[CAL_Tools %d] H.264 ANNEXB Type Conversion\n", "[CAL_Tools #] H.264 ANNEXB Type Conversion\n"));
        }
    }
}

Span AnnexBRun(const Bytes &d)
{
    int32_t len = -7;
    const uint8_t *p = vorCALTools_AVC_ANNEXB_GetConfigStream(d.data(), int32_t(d.size()), &len);
    return {p ? p - d.data() : -1, len};
}

// The configuration-run search over a literal 32-bit shift register primed with FF, which never
// shifts in the last byte.
Span ReferenceAnnexBRun(const Bytes &d)
{
    const int64_t n = int64_t(d.size());
    auto b = [&](int64_t i) -> uint32_t { return i < n ? d[size_t(i)] : 0; };
    int64_t run = -1, from = 0;
    while (n > 3) {
        uint32_t reg = 0xFF000000u | b(from) << 16 | b(from + 1) << 8 | b(from + 2);
        int64_t last = from + 2;
        while ((reg & 0xFFFFFF) != 1 && last + 1 < n - 1)
            reg = reg << 8 | d[size_t(++last)];
        if ((reg & 0xFFFFFF) != 1)
            return run < 0 ? Span{-1, 0} : Span{run, int32_t(n - run)};
        const int64_t pos = last - (reg == 1 ? 3 : 2), header = last + 1;
        const uint32_t h = b(header), type = h & 0x1F;
        if (!(h & 0x80) && (type == 1 || type == 5))
            return run < 0 ? Span{-1, 0} : Span{run, int32_t(pos - run)};
        if (!(h & 0x80) && type >= 6 && type <= 8 && run < 0)
            run = pos;
        if (header >= n - 1)
            break;
        from = header;
    }
    return {-1, 0};
}

TEST(ConfigStream, AnnexBExamplesAndLiteralRegisterScan)
{
    const int32_t psLength = int32_t(8 + kSps.size() + kPps.size());
    EXPECT_EQ(AnnexBRun(AnnexB({kSps, kPps, Slice(0x65, 0)})), Span(0, psLength));
    EXPECT_EQ(AnnexBRun(AnnexB({kSps, kPps})), Span(0, psLength)); // no slice: the run goes to the end
    EXPECT_EQ(AnnexBRun(AnnexB({Slice(0x65, 0), kSps})), Span(-1, 0));
    std::mt19937 rng(5);
    for (int round = 0; round < 4000; ++round) {
        const Bytes d = RandomAnnexB(rng);
        // Every cut of short streams, for the priming at the very end.
        for (size_t n = d.size() < 40 ? 0 : d.size(); n <= d.size(); ++n) {
            const Bytes cut(d.begin(), d.begin() + std::ptrdiff_t(n));
            ASSERT_EQ(AnnexBRun(cut), ReferenceAnnexBRun(cut)) << round << " cut " << n;
        }
    }
}

TEST(ConfigStream, LengthPrefixedEverySize)
{
    auto nalRun = [](const Bytes &d, int size) {
        int32_t len = -7;
        const uint8_t *p = vorCALTools_AVC_NAL_GetConfigStream(d.data(), int32_t(d.size()), size, &len);
        return Span{p ? p - d.data() : -1, len};
    };
    for (int size : {1, 2, 3, 4}) {
        const Bytes head = LengthPrefixed({kSei, kSps, kPps}, size), aud = LengthPrefixed({{0x09, 0x10}}, size);
        const Bytes all = Cat({head, LengthPrefixed({Slice(0x41, 1)}, size)});
        EXPECT_EQ(nalRun(all, size), Span(0, int32_t(head.size()))) << size;
        EXPECT_EQ(nalRun(Cat({aud, all}), size), Span(int64_t(aud.size()), int32_t(head.size()))) << size;
        EXPECT_EQ(nalRun(head, size), Span(0, int32_t(head.size()))) << size; // no slice: to the end
        EXPECT_EQ(nalRun(LengthPrefixed({Slice(0x41, 1), kSps}, size), size), Span(-1, 0)) << size;
        EXPECT_EQ(nalRun(LengthPrefixed({{0xE7, 1}, kSps}, size), size), Span(-1, 0)) << size;
        for (size_t n = 0; n <= all.size(); ++n) { // cut anywhere: never a run beyond the data
            const auto [at, len] = nalRun(Bytes(all.begin(), all.begin() + std::ptrdiff_t(n)), size);
            ASSERT_LE(at + len, int64_t(n));
        }
    }
    for (int size : {0, 5, -1})
        EXPECT_EQ(nalRun(LengthPrefixed({kSps, Slice(0x41, 1)}, 4), size), Span(-1, 0)) << size;
}

} // namespace
