#include <gtest/gtest.h>

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
    const Bytes units{0, 0, 1, 0x67, 0xAA, 0, 0, 0, 1, 0x68, 0xBB, 0, 0, 1, 0x65, 0xCC}, unitsOut{0, 0, 0, 2, 0x67, 0xAA, 0, 0, 0, 2, 0x68, 0xBB, 0, 0, 0, 2, 0x65, 0xCC};
    const Bytes twoOut{0, 0, 0, 1, 0x65, 0x88, 0, 0, 0, 1, 0x41};
    // Source, NAL length size, result, output; the destination has room for the output and
    // 100 bytes more, or exactly as much, or one byte less.
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
    for (const auto &[src, size, result, out] : cases) {
        const Fn f = vorCALTools_AVC_ConvertFormat;
        EXPECT_EQ(Into(f, src, out.size() + 100, size), std::pair(result, out)) << testing::PrintToString(src);
        EXPECT_TRUE(result <= 0 || (Into(f, src, out.size(), size).first == result && Into(f, src, out.size() - 1, size).first == -1))
            << "exact room and one byte less for " << testing::PrintToString(src);
    }
    RecordingSal::Get().Reset();
    // A good unit, then a length field of 256 with 10 bytes after it.
    EXPECT_EQ(Into(vorCALTools_AVC_ConvertFormat, Cat({{0, 0, 0, 2, 0x65, 0x88, 0, 0, 1, 0}, Bytes(10, 0x55)}), 200).first, -1);
    EXPECT_TRUE(HasTrace(2, 0, "[CAL_Tools %d] vorCALTools_AVC_ConvertFormat Error(%d, %d)\n",
                         "[CAL_Tools #] vorCALTools_AVC_ConvertFormat Error(10, 256)\n"));
    EXPECT_EQ(Into(vorCALTools_AVC_ConvertFormat_NoSPSPPS, AnnexB({kSps, {0x65, 0x88}, kPps}), 200).first, -1);
    EXPECT_TRUE(HasPlainTrace("[vorCAL_Tools %d] No correct Frame.\n", "[vorCAL_Tools #] No correct Frame.\n"));
    // Towards start codes every unit stays.
    EXPECT_EQ(Into(vorCALTools_AVC_ConvertFormat_NoSPSPPS, LengthPrefixed({kSps, kPps, {0x65, 0x88}}, 2), 200, 2).second,
              AnnexB({kSps, kPps, {0x65, 0x88}}));
}

// Random start-code streams: 3- and 4-byte codes, units (IDR, slice, SPS, PPS, SEI, delimiter) of
// 0 to 300 bytes rich in zero bytes, some streams cut anywhere.
Bytes RandomAnnexB(std::mt19937 &rng)
{
    Bytes s;
    for (int u = 1 + int(rng() % 6); u > 0; --u) {
        s = Cat({s, rng() % 2 ? Bytes{0, 0, 0, 1} : Bytes{0, 0, 1}, {uint8_t("\x65\x41\x67\x68\x06\x09"[rng() % 6])}});
        for (size_t len = rng() % 4 == 0 ? rng() % 4 : rng() % 300; len > 0; --len)
            s.push_back(uint8_t(rng() % 5 == 0 ? rng() % 3 : rng()));
    }
    s.resize(rng() % 4 ? s.size() : rng() % (s.size() + 1));
    return s;
}

// Towards length prefixes, from the framing rules alone: a unit runs to the next start code
// that begins at least 4 bytes before the end. Empty: the conversion fails.
Bytes ReferenceToLength(const Bytes &s, bool slicesOnly)
{
    const size_t n = s.size();
    auto codeAt = [&](size_t i) -> size_t {
        return i + 2 < n && !s[i] && !s[i + 1] ? (s[i + 2] == 1 ? 3 : i + 3 < n && !s[i + 2] && s[i + 3] == 1 ? 4 : 0) : 0;
    };
    auto nextCode = [&](size_t i) {
        while (i + 3 < n && !codeAt(i))
            ++i;
        return i + 3 < n ? i : n;
    };
    Bytes out;
    for (size_t pos = 0; pos < n;) {
        const size_t body = pos + codeAt(pos), type = body < n ? s[body] & 0x1F : 0;
        const bool skipped = slicesOnly && type != 1 && type != 5;
        if (body == pos || ((pos = nextCode(body + skipped)) == n && skipped))
            return {};
        if (!skipped)
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
            const Bytes ref = ReferenceToLength(src, slicesOnly);
            const Fn f = slicesOnly ? vorCALTools_AVC_ConvertFormat_NoSPSPPS : vorCALTools_AVC_ConvertFormat;
            ASSERT_EQ(Into(f, src, src.size() + 100, 0), std::pair(ref.empty() ? -1 : int32_t(ref.size()), ref)) << round;
            // Exactly enough room succeeds; one byte less fails.
            ASSERT_TRUE(ref.empty() || (Into(f, src, ref.size(), 0).second == ref && Into(f, src, ref.size() - 1, 0).first == -1)) << round;
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
        {{0, 0, 1}, 64, {}}, {AnnexB({{0x67, 2}, {0x65, 3}}), 64, {}}};
    for (const auto &[src, dstSize, out] : cases) {
        RecordingSal::Get().Reset();
        EXPECT_EQ(Into(PSs, src, size_t(dstSize)), std::pair(int32_t(out.size()), out)) << testing::PrintToString(src);
        EXPECT_TRUE(HasPlainTrace("[vorCAL_Tools %d] vorCALTools_AVC_ConvertFormatPSs\n", "[vorCAL_Tools #] vorCALTools_AVC_ConvertFormatPSs\n"));
    }
    EXPECT_TRUE(HasPlainTrace("[vorCAL_Tools %d] vorCALTools_AVC_ConvertFormatPSs ANNEXB\n", "[vorCAL_Tools #] vorCALTools_AVC_ConvertFormatPSs ANNEXB\n"));
    EXPECT_TRUE(HasTrace(2, 0, "[CAL_Tools %d] H.264 ANNEXB Type Conversion\n", "[CAL_Tools #] H.264 ANNEXB Type Conversion\n"));
}

// len by reference: read after the call that fills it.
Span Found(const Bytes &d, const uint8_t *p, const int32_t &len) { return {p ? p - d.data() : -1, len}; }

TEST(ConfigStream, BothFramings)
{
    const int32_t ps = int32_t(8 + kSps.size() + kPps.size());
    const std::pair<Bytes, Span> cases[] = {
        {AnnexB({kSps, kPps, Slice(0x65, 0)}), {0, ps}}, {AnnexB({kSps, kPps}), {0, ps}}, // no slice: to the end
        {AnnexB({Slice(0x65, 0), kSps}), {-1, 0}}, {{0, 0, 1}, {-1, 0}},
        {AnnexB({kSei, kPps, {0x41, 0x9A}}, 3), {0, 16}}, {AnnexB({{0x09, 0x10}, {0xE7, 1}, kSps, {0x65, 0x88}}), {12, 13}},
        // The scan never shifts in the last byte; a unit header there ends the search with nothing.
        {Cat({AnnexB({kSps}), {0, 0, 1}}), {0, 16}}, {Cat({AnnexB({kSps}), {0, 0, 1, 0x06}}), {-1, 0}}};
    for (const auto &[d, expected] : cases) {
        int32_t len = -7;
        EXPECT_EQ(Found(d, vorCALTools_AVC_ANNEXB_GetConfigStream(d.data(), int32_t(d.size()), &len), len), expected) << testing::PrintToString(d);
    }
    auto nalRun = [](const Bytes &d, int size) {
        int32_t len = -7;
        return Found(d, vorCALTools_AVC_NAL_GetConfigStream(d.data(), int32_t(d.size()), size, &len), len);
    };
    for (int size : {1, 2, 3, 4}) {
        const Bytes head = LengthPrefixed({kSei, kSps, kPps}, size), aud = LengthPrefixed({{0x09, 0x10}}, size);
        const Bytes all = Cat({head, LengthPrefixed({Slice(0x41, 1)}, size)});
        EXPECT_EQ(nalRun(all, size), Span(0, int32_t(head.size()))) << size;
        EXPECT_EQ(nalRun(Cat({aud, all}), size), Span(int64_t(aud.size()), int32_t(head.size()))) << size;
        EXPECT_EQ(nalRun(head, size), Span(0, int32_t(head.size()))) << size; // no slice: to the end
        EXPECT_EQ(nalRun(LengthPrefixed({Slice(0x41, 1), kSps}, size), size), Span(-1, 0)) << size;
        EXPECT_EQ(nalRun(LengthPrefixed({{0xE7, 1}, kSps}, size), size), Span(-1, 0)) << size;
    }
    for (int size : {0, 5, -1})
        EXPECT_EQ(nalRun(LengthPrefixed({kSps, Slice(0x41, 1)}, 4), size), Span(-1, 0)) << size;
}

} // namespace
