#include <gtest/gtest.h>

#include <fstream>
#include <sstream>
#include <string>
#include <tuple>
#include <vector>

#include <vorcal/audio_tools.h>

#include "adts_header.hpp"
#include "bit_writer.hpp"

using vorcal::test::AdtsFields;
using vorcal::test::AdtsHeader;
using vorcal::test::BitWriter;
using vorcal::test::kAdtsRates;

namespace {

// AudioSpecificConfig: audioObjectType, samplingFrequencyIndex, channelConfiguration, then
// frameLengthFlag, dependsOnCoreCoder, extensionFlag.
std::vector<uint8_t> Dsi(uint32_t uObjectType, uint32_t uIndex, uint32_t uChannels)
{
    return BitWriter().Put(uObjectType, 5).Put(uIndex, 4).Put(uChannels, 4).Put(0, 3).Bytes();
}

class DsiByIndexAndChannels : public testing::TestWithParam<std::tuple<uint32_t, uint32_t>> {};

TEST_P(DsiByIndexAndChannels, ParsesAndBuildsTheAdtsHeader)
{
    const auto [uIndex, uChannels] = GetParam();
    const uint32_t uRate = uIndex < 12 ? kAdtsRates[uIndex] : 0; // 12-15 are not known
    for (uint32_t uObjectType : {1u, 2u, 5u, 29u}) {
        SCOPED_TRACE(uObjectType);
        const std::vector<uint8_t> dsi = Dsi(uObjectType, uIndex, uChannels);
        uint32_t uGotRate = 1, uGotChannels = 99, uSBR = 99;
        EXPECT_EQ(vorCALTools_AAC_ParseDSI(dsi.data(), &uGotRate, &uGotChannels, &uSBR), 0);
        EXPECT_EQ(uGotRate, uRate);
        EXPECT_EQ(uGotChannels, uChannels);
        EXPECT_EQ(uSBR, uObjectType == 5 ? 1u : 0u);

        // Profile 1 and fullness 0x7FF whatever the object type; the index passes unchecked and
        // the channel configuration keeps its low three bits.
        std::vector<uint8_t> frame(7 + 100, 0xA5);
        EXPECT_EQ(vorCALTools_Make_ADTS_Header(dsi.data(), 100, frame.data()), 0);
        const std::vector<uint8_t> expected = AdtsHeader(AdtsFields{1, uIndex, uChannels & 7, 107, 0x7FF});
        EXPECT_EQ(std::vector<uint8_t>(frame.begin(), frame.begin() + 7), expected);
        EXPECT_EQ(_GetAACFrameLength(frame.data()), 107u);
        EXPECT_EQ(vorCALTools_AAC_isADTSAAC(107, frame.data()), 7);
    }
}

INSTANTIATE_TEST_SUITE_P(AllIndicesAndConfigurations, DsiByIndexAndChannels,
                         testing::Combine(testing::Range(0u, 16u), testing::Range(0u, 16u)));

TEST(AacDsi, DocumentedExamples)
{
    const uint8_t lc[] = {0x12, 0x10};
    const uint8_t sbr[] = {0x2B, 0x92};
    uint32_t uRate = 0, uChannels = 0, uSBR = 0;
    vorCALTools_AAC_ParseDSI(lc, &uRate, &uChannels, &uSBR);
    EXPECT_EQ(std::make_tuple(uRate, uChannels, uSBR), std::make_tuple(44100u, 2u, 0u));
    vorCALTools_AAC_ParseDSI(sbr, &uRate, &uChannels, &uSBR);
    EXPECT_EQ(std::make_tuple(uRate, uChannels, uSBR), std::make_tuple(22050u, 2u, 1u));

    uint8_t header[7] = {};
    vorCALTools_Make_ADTS_Header(lc, 11, header);
    EXPECT_EQ(std::vector<uint8_t>(header, header + 7),
              (std::vector<uint8_t>{0xFF, 0xF9, 0x50, 0x80, 0x02, 0x5F, 0xFC}));
    EXPECT_EQ(vorCALTools_Get_ADTS_HeaderSize(), 7);
}

// frame_length is 13 bits: raw lengths from 2041 on reach byte 3, beyond 8184 they wrap.
TEST(AdtsHeader, FrameLengthField)
{
    const uint8_t dsi[] = {0x12, 0x10};
    const struct {
        int32_t iRaw;
        uint32_t uField;
    } cases[] = {{0, 7}, {11, 18}, {2040, 2047}, {2041, 2048}, {4089, 4096}, {8184, 8191}, {8185, 0}, {8200, 15}};
    for (const auto &c : cases) {
        SCOPED_TRACE(c.iRaw);
        uint8_t header[7];
        vorCALTools_Make_ADTS_Header(dsi, c.iRaw, header);
        EXPECT_EQ(_GetAACFrameLength(header), c.uField);
        EXPECT_EQ(header[3] & 0xC0, 0x80); // channel configuration 2 untouched by the length
        EXPECT_EQ(header[5] & 0x1F, 0x1F);
    }
}

TEST(AdtsRecognition, OneWholeFrameOnly)
{
    std::vector<uint8_t> frame = {0xFF, 0xF9, 0x50, 0x80, 0x02, 0x5F, 0xFC};
    frame.resize(18, 0);
    const auto with = [&](size_t i, uint8_t b) {
        std::vector<uint8_t> copy = frame;
        copy[i] = b;
        return copy;
    };
    const struct {
        const char *pName;
        std::vector<uint8_t> bytes;
        int32_t iLen;
        int32_t iResult;
    } cases[] = {
        {"exact", frame, 18, 7},
        {"one byte more", frame, 19, 0},
        {"one byte less", frame, 17, 0},
        {"CRC present", with(1, 0xF8), 18, 9},
        {"ID and layer ignored", with(1, 0xF6), 18, 9},
        {"sync bits of byte 1", with(1, 0xE9), 18, 0},
        {"sync byte 0", with(0, 0xFE), 18, 0},
        {"shorter than a header", frame, 6, 0},
        {"negative length", frame, -1, 0},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.pName);
        EXPECT_EQ(vorCALTools_AAC_isADTSAAC(c.iLen, c.bytes.data()), c.iResult);
    }
    // A whole header claiming its own 7 bytes, no payload.
    const std::vector<uint8_t> bare = AdtsHeader(AdtsFields{1, 4, 2, 7, 0x7FF});
    EXPECT_EQ(vorCALTools_AAC_isADTSAAC(7, bare.data()), 7);
}

std::vector<uint8_t> ReadFile(const std::string &path)
{
    std::ifstream in(path, std::ios::binary);
    return std::vector<uint8_t>(std::istreambuf_iterator<char>(in), {});
}

// Streams from a real encoder, described by their ffprobe sidecar.
TEST(AdtsFixtures, EveryFrameIsRecognised)
{
    const std::string dir = std::string(VORCAL_TEST_DATA_DIR) + "/audio/";
    std::ifstream sidecar(dir + "adts.txt");
    ASSERT_TRUE(sidecar) << "missing " << dir << "adts.txt";
    std::string line;
    int iFiles = 0;
    while (std::getline(sidecar, line)) {
        if (line.empty() || line[0] == '#')
            continue;
        std::istringstream fields(line);
        std::string name;
        uint32_t uRate = 0, uChannels = 0, uFrames = 0;
        fields >> name >> uRate >> uChannels >> uFrames;
        SCOPED_TRACE(name);
        const std::vector<uint8_t> stream = ReadFile(dir + name);
        ASSERT_FALSE(stream.empty());
        ++iFiles;

        uint32_t uCount = 0;
        size_t pos = 0;
        while (pos < stream.size()) {
            const uint8_t *p = stream.data() + pos;
            ASSERT_GE(stream.size() - pos, 7u);
            const uint32_t uLen = _GetAACFrameLength(p);
            ASSERT_GE(uLen, 7u);
            ASSERT_LE(pos + uLen, stream.size());
            EXPECT_EQ(vorCALTools_AAC_isADTSAAC(static_cast<int32_t>(uLen), p), 7);
            EXPECT_EQ(vorCALTools_AAC_isADTSAAC(static_cast<int32_t>(uLen) + 1, p), 0);

            // The DSI of the header's fields gives the same header, apart from ID (MPEG-4 here).
            const uint32_t uIndex = (p[2] >> 2) & 0x0F;
            const uint32_t uConfig = ((p[2] & 1u) << 2) | (p[3] >> 6);
            EXPECT_EQ(uIndex < 12 ? kAdtsRates[uIndex] : 0, uRate);
            EXPECT_EQ(uConfig, uChannels);
            uint8_t header[7];
            const std::vector<uint8_t> dsi = Dsi((p[2] >> 6) + 1u, uIndex, uConfig);
            vorCALTools_Make_ADTS_Header(dsi.data(), static_cast<int32_t>(uLen - 7), header);
            EXPECT_EQ(std::vector<uint8_t>(header + 2, header + 7), std::vector<uint8_t>(p + 2, p + 7));
            pos += uLen;
            ++uCount;
        }
        EXPECT_EQ(uCount, uFrames);
    }
    EXPECT_EQ(iFiles, 20);
}

} // namespace
