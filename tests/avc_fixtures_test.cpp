// Real encoder output (tests/data/h264, made by tests/data/fixtures-h264.sh) against the stream
// reports stored beside it: picture size, level and each packet's offset, size and key flag.
#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <iterator>
#include <sstream>
#include <string>
#include <tuple>

#include <vorcal/video_tools.h>

#include "avc_streams.hpp"

namespace {

using namespace vorcal::test;

Bytes ReadAll(const std::string &name)
{
    std::ifstream in(std::string(VORCAL_TEST_DATA_DIR) + "/h264/" + name, std::ios::binary);
    return Bytes((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
}

struct Stream {
    uint32_t width = 0, height = 0, level = 0;
    std::vector<std::pair<Bytes, bool>> packets; // bytes, key flag
};

Stream Load(const std::string &name)
{
    const Bytes all = ReadAll(name);
    std::ifstream in(std::string(VORCAL_TEST_DATA_DIR) + "/h264/" + name + ".txt");
    Stream s;
    for (std::string line, key, type; std::getline(in, line);) {
        std::istringstream f(line);
        size_t at = 0, size = 0;
        bool bKey = false;
        if (f >> key && key == "frame" && f >> at >> size >> type >> bKey && at + size <= all.size())
            s.packets.emplace_back(Bytes(all.begin() + std::ptrdiff_t(at), all.begin() + std::ptrdiff_t(at + size)), bKey);
        for (const auto &[field, value] : {std::pair{"width", &s.width}, {"height", &s.height}, {"level", &s.level}})
            if (key == field)
                f >> *value;
    }
    return s;
}

using Fn = int32_t (*)(uint8_t *, int32_t, const uint8_t *, int32_t, int32_t);
int32_t PSs(uint8_t *d, int32_t n, const uint8_t *s, int32_t len, int32_t) { return vorCALTools_AVC_ConvertFormatPSs(d, n, s, len); }

// Into a destination of the size the video adaptation gives: source + 100 bytes for frames,
// 3/2 of the source for parameter sets.
Bytes Convert(const Bytes &src, Fn f = vorCALTools_AVC_ConvertFormat)
{
    Bytes dst(f == PSs ? src.size() * 3 / 2 : src.size() + 100);
    dst.resize(size_t(std::max(0, f(dst.data(), int32_t(dst.size()), src.data(), int32_t(src.size()), 4))));
    return dst;
}

// A start-code stream; the same packets as length-prefixed samples, with their configuration
// record; the profile.
class Fixture : public testing::TestWithParam<std::tuple<std::string, std::string, uint32_t>> {
protected:
    const Stream annexB = Load(std::get<0>(GetParam())), samples = Load(std::get<1>(GetParam()) + ".nal");
    const Bytes avcc = ReadAll(std::get<1>(GetParam()) + ".avcc");
    const uint32_t profile = std::get<2>(GetParam());
    void SetUp() override { ASSERT_TRUE(annexB.packets.size() >= 8 && annexB.packets.size() == samples.packets.size()); }
};

TEST_P(Fixture, ParameterSetsMatchTheReportAndConvertBothWays)
{
    const Bytes ps = Convert(avcc, PSs), stream = ReadAll(std::get<0>(GetParam()));
    const uint32_t codedW = (annexB.width + 15) / 16 * 16, codedH = (annexB.height + 15) / 16 * 16;
    for (const Bytes *src : {&stream, &ps}) {
        CALSPSInfo i{};
        ASSERT_EQ(vorCALTools_AVC_GetSPSInfo(src->data(), int32_t(src->size()), &i), 0u);
        EXPECT_EQ(std::tuple(i.uProfile, i.uLevel, i.uWidth, i.uHeight, i.uCropping, i.uCropBottom * 2),
                  std::tuple(profile, annexB.level, codedW, codedH, uint32_t(codedH != annexB.height), codedH - annexB.height));
    }
    // The record's SPS and PPS are the ones in front of the first picture; and back to the
    // compact list, which is the record without its first five bytes and reserved bits.
    const Bytes &first = samples.packets[0].first, psUnits = Convert(ps);
    EXPECT_NE(std::search(first.begin(), first.end(), psUnits.begin(), psUnits.end()), first.end());
    EXPECT_EQ(Convert(ps, PSs), Cat({{uint8_t(avcc[5] & 0x1F)}, Bytes(avcc.begin() + 6, avcc.end())}));
}

TEST_P(Fixture, PacketsConvertAndCarryConfigurationRunsOnlyWhenKey)
{
    size_t ambiguous = 0;
    for (size_t k = 0; k < annexB.packets.size(); ++k) {
        const auto &[au, key] = annexB.packets[k];
        const Bytes &sample = samples.packets[k].first;
        EXPECT_EQ(Convert(au), sample) << k;
        // A sample whose first length field is 00 00 01 xx (a unit of 256 to 511 bytes, real in
        // small B pictures) reads as start-code framing and converts the wrong way.
        const bool bAmbiguous = vorCALTools_AVC_CheckFormat(sample.data(), int32_t(sample.size())) == 2;
        ambiguous += bAmbiguous;
        EXPECT_TRUE(bAmbiguous || Convert(Convert(sample)) == sample) << k;
        // Slices only: the key packets (and all Baseline ones, with SEI) lose units.
        const size_t slices = Convert(au, vorCALTools_AVC_ConvertFormat_NoSPSPPS).size();
        EXPECT_TRUE(slices > 0 && (slices < sample.size()) == (key || profile == 66)) << k;
        // The encoder repeats SPS and PPS in front of every IDR picture and nowhere else.
        int32_t runB = -1, runN = -1;
        const uint8_t *pB = vorCALTools_AVC_ANNEXB_GetConfigStream(au.data(), int32_t(au.size()), &runB);
        const uint8_t *pN = vorCALTools_AVC_NAL_GetConfigStream(sample.data(), int32_t(sample.size()), 4, &runN);
        EXPECT_EQ(std::pair(pB != nullptr, pN != nullptr), std::pair(key, samples.packets[k].second)) << k;
        EXPECT_TRUE(!pB || !pN || Convert(Bytes(pB, pB + runB)) == Bytes(pN, pN + runN)) << k;
    }
    EXPECT_LT(ambiguous, annexB.packets.size() / 2);
}

// The third stream is the main one remuxed to start codes by another tool: its packets convert to
// the same samples whatever their first length field looks like.
INSTANTIATE_TEST_SUITE_P(Streams, Fixture,
                         testing::Values(std::tuple("baseline_176x144.h264", "baseline_176x144", 66u),
                                         std::tuple("main_320x180.h264", "main_320x180", 77u),
                                         std::tuple("main_320x180.mp4toannexb.h264", "main_320x180", 77u)));

} // namespace
