// Real encoder output (tests/data/h264, made by tests/data/fixtures-h264.sh) against what
// ffprobe reported for it.
#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <iterator>
#include <sstream>
#include <string>

#include <vorcal/video_tools.h>

#include "avc_streams.hpp"

namespace {

using namespace vorcal::test;

struct Packet {
    size_t offset = 0;
    size_t size = 0;
    std::string type;
    bool key = false;
};

struct Report {
    uint32_t width = 0, height = 0, level = 0;
    std::string profile;
    std::vector<Packet> packets;
};

std::string Path(const std::string &name)
{
    return std::string(VORCAL_TEST_DATA_DIR) + "/h264/" + name;
}

Bytes ReadAll(const std::string &name)
{
    std::ifstream in(Path(name), std::ios::binary);
    return Bytes((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
}

Report ReadReport(const std::string &name)
{
    std::ifstream in(Path(name));
    Report r;
    std::string line;
    while (std::getline(in, line)) {
        std::istringstream f(line);
        std::string key;
        f >> key;
        if (key == "width")
            f >> r.width;
        else if (key == "height")
            f >> r.height;
        else if (key == "level")
            f >> r.level;
        else if (key == "profile")
            std::getline(f >> std::ws, r.profile);
        else if (key == "frame") {
            Packet p;
            int k = 0;
            f >> p.offset >> p.size >> p.type >> k;
            p.key = k != 0;
            r.packets.push_back(p);
        }
    }
    return r;
}

Bytes Slice(const Bytes &b, const Packet &p)
{
    return Bytes(b.begin() + std::ptrdiff_t(p.offset), b.begin() + std::ptrdiff_t(p.offset + p.size));
}

// Every 3-byte start code made a 4-byte one: framing compared up to start-code length.
Bytes FourByteCodes(const Bytes &b)
{
    Bytes out;
    for (size_t i = 0; i < b.size(); ++i) {
        if (i + 2 < b.size() && b[i] == 0 && b[i + 1] == 0 && b[i + 2] == 1 && (i == 0 || b[i - 1] != 0))
            out.push_back(0);
        out.push_back(b[i]);
    }
    return out;
}

Bytes Convert(const Bytes &src, int32_t size)
{
    Bytes dst(src.size() + 100);
    const int32_t r = vorCALTools_AVC_ConvertFormat(dst.data(), int32_t(dst.size()), src.data(), int32_t(src.size()), size);
    dst.resize(r > 0 ? size_t(r) : 0);
    return dst;
}

// A length-prefixed sample whose first length field is 00 00 01 xx (a unit of 256 to 511
// bytes) reads as start-code framing to vorCALTools_AVC_CheckFormat, so conversion without
// knowing the framing takes it the wrong way. Such samples are real (small B pictures).
bool ReadsAsStartCodes(const Bytes &sample)
{
    const bool bAnnexB = vorCALTools_AVC_CheckFormat(sample.data(), int32_t(sample.size())) == CAL_AVC_FORMAT_ANNEXB;
    if (bAnnexB) {
        const uint32_t first = vorCALTools_ReadBigEndianValue32(sample.data());
        EXPECT_TRUE(first == 1 || (first >= 0x100 && first < 0x200)) << first;
    }
    return bAnnexB;
}

struct Stream {
    const char *name;
    uint32_t profile;
};

class Fixture : public testing::TestWithParam<Stream> {
protected:
    void SetUp() override
    {
        const std::string n = GetParam().name;
        annexB = ReadAll(n + ".h264");
        samples = ReadAll(n + ".nal");
        avcc = ReadAll(n + ".avcc");
        annexBReport = ReadReport(n + ".h264.txt");
        sampleReport = ReadReport(n + ".nal.txt");
        ASSERT_FALSE(annexB.empty());
        ASSERT_EQ(annexBReport.packets.size(), sampleReport.packets.size());
        ASSERT_GE(annexBReport.packets.size(), 8u);
    }
    Bytes annexB, samples, avcc;
    Report annexBReport, sampleReport;
};

TEST_P(Fixture, SequenceParameterSetMatchesReport)
{
    const Report &r = annexBReport;
    const uint32_t codedW = (r.width + 15) / 16 * 16, codedH = (r.height + 15) / 16 * 16;
    const Bytes fromRecord = [&] {
        Bytes d(avcc.size() * 3 / 2 + 16);
        d.resize(size_t(vorCALTools_AVC_ConvertFormatPSs(d.data(), int32_t(d.size()), avcc.data(), int32_t(avcc.size()))));
        return d;
    }();
    for (const Bytes *src : {static_cast<const Bytes *>(&annexB), &fromRecord}) {
        CALSPSInfo info{};
        ASSERT_EQ(vorCALTools_AVC_GetSPSInfo(src->data(), int32_t(src->size()), &info), 0u);
        EXPECT_EQ(info.uProfile, GetParam().profile);
        EXPECT_EQ(info.uLevel, r.level);
        EXPECT_EQ(info.uWidth, codedW);
        EXPECT_EQ(info.uHeight, codedH);
        EXPECT_EQ(info.uCropping, codedH != r.height || codedW != r.width ? 1u : 0u);
        // 4:2:0 crop units are two lines.
        EXPECT_EQ(info.uCropBottom * 2, codedH - r.height);
    }
}

TEST_P(Fixture, ParameterSetsBothWays)
{
    // The record's SPS and PPS as start codes are the ones in front of the first picture.
    Bytes ps(avcc.size() * 3 / 2 + 16);
    ps.resize(size_t(vorCALTools_AVC_ConvertFormatPSs(ps.data(), int32_t(ps.size()), avcc.data(), int32_t(avcc.size()))));
    ASSERT_GT(ps.size(), 8u);
    const Bytes first = FourByteCodes(Slice(annexB, annexBReport.packets[0]));
    EXPECT_NE(std::search(first.begin(), first.end(), ps.begin(), ps.end()), first.end());
    // And back to the compact list: the record without its first five bytes and reserved bits.
    Bytes list(ps.size() * 3 / 2);
    list.resize(size_t(vorCALTools_AVC_ConvertFormatPSs(list.data(), int32_t(list.size()), ps.data(), int32_t(ps.size()))));
    ASSERT_EQ(list.size(), avcc.size() - 5);
    EXPECT_EQ(list[0], avcc[5] & 0x1F);
    EXPECT_TRUE(std::equal(list.begin() + 1, list.end(), avcc.begin() + 6));
}

TEST_P(Fixture, FramesConvertBothWays)
{
    size_t ambiguous = 0;
    for (size_t k = 0; k < annexBReport.packets.size(); ++k) {
        const Bytes au = Slice(annexB, annexBReport.packets[k]);
        const Bytes sample = Slice(samples, sampleReport.packets[k]);
        EXPECT_EQ(Convert(au, 4), sample) << "packet " << k;
        if (!ReadsAsStartCodes(sample)) {
            EXPECT_EQ(Convert(sample, 4), FourByteCodes(au)) << "packet " << k;
            EXPECT_EQ(Convert(Convert(au, 4), 4), FourByteCodes(au)) << "packet " << k;
        } else {
            ++ambiguous;
        }
        // Slices only: the key packets lose their parameter sets and SEI.
        Bytes slices(au.size() + 100);
        const int32_t n = vorCALTools_AVC_ConvertFormat_NoSPSPPS(slices.data(), int32_t(slices.size()), au.data(), int32_t(au.size()), 4);
        ASSERT_GT(n, 0) << k;
        EXPECT_EQ(n < int32_t(sample.size()), annexBReport.packets[k].key || k == 0 || GetParam().profile == 66) << k;
    }
    EXPECT_LT(ambiguous, annexBReport.packets.size() / 2);
}

TEST_P(Fixture, ConfigurationRunsOnKeyPackets)
{
    for (size_t k = 0; k < annexBReport.packets.size(); ++k) {
        const Bytes au = Slice(annexB, annexBReport.packets[k]);
        const Bytes sample = Slice(samples, sampleReport.packets[k]);
        int32_t runB = -1, runN = -1;
        const uint8_t *pB = vorCALTools_AVC_ANNEXB_GetConfigStream(au.data(), int32_t(au.size()), &runB);
        const uint8_t *pN = vorCALTools_AVC_NAL_GetConfigStream(sample.data(), int32_t(sample.size()), 4, &runN);
        // The encoder repeats SPS and PPS in front of every IDR picture and nowhere else.
        EXPECT_EQ(pB != nullptr, annexBReport.packets[k].key) << k;
        EXPECT_EQ(pN != nullptr, sampleReport.packets[k].key) << k;
        if (pB && pN) {
            // The same units in both framings.
            const Bytes runAnnexB(pB, pB + runB), runSample(pN, pN + runN);
            EXPECT_EQ(Convert(runSample, 4), FourByteCodes(runAnnexB)) << k;
            // What follows the run is the first slice.
            EXPECT_TRUE(((pB + runB)[3] & 0x1F) == 5 || ((pB + runB)[4] & 0x1F) == 5) << k;
        }
    }
}

TEST_P(Fixture, OneFrameEndsAtAPacketBoundarysFirstSlice)
{
    const auto &packets = annexBReport.packets;
    // Where the first slice of each packet starts: after its configuration run, or after an
    // access unit delimiter (00 00 00 01 09 xx) in front.
    std::vector<size_t> firstSlice;
    for (const Packet &p : packets) {
        const Bytes au = Slice(annexB, p);
        int32_t len = 0;
        const uint8_t *run = vorCALTools_AVC_ANNEXB_GetConfigStream(au.data(), int32_t(au.size()), &len);
        const size_t aud = (au[4] & 0x1F) == 9 ? 6 : 0;
        firstSlice.push_back(p.offset + (run ? size_t(run - au.data()) + size_t(len) : aud));
    }
    for (size_t k = 0; k + 1 < packets.size(); ++k) {
        const int32_t n = vorCALTools_AVC_GetOneFrame(annexB.data() + packets[k].offset,
                                                      int32_t(annexB.size() - packets[k].offset));
        const size_t end = packets[k].offset + size_t(n);
        if (GetParam().profile == 66) {
            // Every picture is a reference picture: frame_num moves on with each one.
            EXPECT_EQ(end, firstSlice[k + 1]) << k;
        } else {
            // A non-reference B picture shares frame_num with the picture after it, so the
            // search may run on; it still stops on a packet's first slice.
            EXPECT_NE(std::find(firstSlice.begin() + std::ptrdiff_t(k + 1), firstSlice.end(), end), firstSlice.end()) << k;
        }
    }
}

INSTANTIATE_TEST_SUITE_P(Streams, Fixture,
                         testing::Values(Stream{"baseline_176x144", 66}, Stream{"main_320x180", 77}),
                         [](const testing::TestParamInfo<Stream> &info) { return std::string(info.param.name); });

TEST(Mp4ToAnnexB, SamplesMatchTheFilterOutput)
{
    const Bytes samples = ReadAll("main_320x180.nal");
    const Bytes filtered = ReadAll("main_320x180.mp4toannexb.h264");
    const Report sr = ReadReport("main_320x180.nal.txt");
    const Report fr = ReadReport("main_320x180.mp4toannexb.h264.txt");
    ASSERT_EQ(sr.packets.size(), fr.packets.size());
    ASSERT_FALSE(sr.packets.empty());
    for (size_t k = 0; k < sr.packets.size(); ++k) {
        const Bytes sample = Slice(samples, sr.packets[k]);
        const Bytes filteredAu = Slice(filtered, fr.packets[k]);
        // Whatever the first length field looks like, the filter output converts to the sample.
        EXPECT_EQ(Convert(filteredAu, 4), sample) << k;
        if (!ReadsAsStartCodes(sample)) {
            EXPECT_EQ(Convert(sample, 4), FourByteCodes(filteredAu)) << k;
        }
        EXPECT_EQ(fr.packets[k].key, sr.packets[k].key);
    }
}

} // namespace
