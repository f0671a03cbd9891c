#include <gtest/gtest.h>

#include <fstream>
#include <string>
#include <tuple>
#include <vector>

#include <vorcal/audio_tools.h>

#include "adts_header.hpp"

using namespace vorcal::test;

namespace {

// AudioSpecificConfig: audioObjectType, samplingFrequencyIndex, channelConfiguration, three flags.
std::vector<uint8_t> Dsi(uint32_t uObjectType, uint32_t uIndex, uint32_t uConfig)
{
    return BitWriter().Put(uObjectType, 5).Put(uIndex, 4).Put(uConfig, 4).Put(0, 3).Bytes();
}

// Indices 12-15 read as 0 Hz and pass into the header unchecked; the header has profile 1 and
// fullness 0x7FF whatever the object type, and keeps 3 bits of the configuration.
TEST(AacDsi, EveryIndexConfigurationAndObjectType)
{
    for (uint32_t u = 0; u < 16 * 16 * 3; ++u) {
        const uint32_t uIndex = u % 16, uConfig = u / 16 % 16, uObjectType = u < 256 ? 2 : u < 512 ? 5 : 29;
        SCOPED_TRACE(testing::Message() << uIndex << " " << uConfig << " " << uObjectType);
        const std::vector<uint8_t> dsi = Dsi(uObjectType, uIndex, uConfig);
        uint32_t uRate = 1, uChannels = 99, uSBR = 99;
        EXPECT_EQ(vorCALTools_AAC_ParseDSI(dsi.data(), &uRate, &uChannels, &uSBR), 0);
        EXPECT_EQ(std::tie(uRate, uChannels, uSBR),
                  std::make_tuple(uIndex < 12 ? kAdtsRates[uIndex] : 0u, uConfig, uObjectType == 5 ? 1u : 0u));
        std::vector<uint8_t> header(7, 0xA5);
        EXPECT_EQ(vorCALTools_Make_ADTS_Header(dsi.data(), 100, header.data()), 0);
        EXPECT_EQ(header, AdtsHeader(1, uIndex, uConfig & 7, 107, 0x7FF));
    }
    const uint8_t sbr[] = {0x2B, 0x92};
    uint32_t uRate = 0, uChannels = 0, uSBR = 0;
    vorCALTools_AAC_ParseDSI(sbr, &uRate, &uChannels, &uSBR);
    EXPECT_EQ(std::tie(uRate, uChannels, uSBR), std::make_tuple(22050u, 2u, 1u));
}

// frame_length is 13 bits: from raw length 2041 it reaches byte 3, beyond 8184 it wraps.
TEST(AdtsHeader, FrameLengthAndRecognition)
{
    const uint8_t lc[] = {0x12, 0x10}; // 44100 Hz, configuration 2
    for (const auto &[iRaw, uField] : {std::pair{11, 18u}, {2040, 2047u}, {2041, 2048u}, {8184, 8191u}, {8185, 0u}}) {
        std::vector<uint8_t> header(7);
        vorCALTools_Make_ADTS_Header(lc, iRaw, header.data());
        EXPECT_EQ(header, AdtsHeader(1, 4, 2, uField, 0x7FF)) << iRaw;
        EXPECT_EQ(_GetAACFrameLength(header.data()), uField);
    }
    EXPECT_EQ(AdtsHeader(1, 4, 2, 18, 0x7FF), (std::vector<uint8_t>{0xFF, 0xF9, 0x50, 0x80, 0x02, 0x5F, 0xFC}));
    EXPECT_EQ(vorCALTools_Get_ADTS_HeaderSize(), 7);

    // One whole frame only; the sync bits alone decide, not ID or layer.
    std::vector<uint8_t> frame = AdtsHeader(1, 4, 2, 18, 0x7FF), bare = AdtsHeader(1, 4, 2, 7, 0x7FF);
    frame.resize(18, 0);
    const auto with = [&](size_t i, uint8_t b) {
        std::vector<uint8_t> copy = frame;
        copy[i] = b;
        return copy;
    };
    const std::tuple<std::vector<uint8_t>, int32_t, int32_t> cases[] = {
        {frame, 18, 7},          {frame, 19, 0},          {frame, 17, 0}, {with(1, 0xF8), 18, 9}, // CRC
        {with(1, 0xF6), 18, 9},  {with(1, 0xE9), 18, 0},  {with(0, 0xFE), 18, 0},
        {bare, 7, 7},            {bare, 6, 0},            {frame, -1, 0},
    };
    for (const auto &[bytes, iLen, iResult] : cases)
        EXPECT_EQ(vorCALTools_AAC_isADTSAAC(iLen, bytes.data()), iResult) << iLen << " " << int(bytes[1]);
}

// Streams from a real encoder with their ffprobe frame counts: every frame is recognised, and
// the header built from its own fields equals it from byte 2 on (ID differs: MPEG-4 there).
TEST(AdtsFixtures, EveryFrameIsRecognised)
{
    const std::string dir = std::string(VORCAL_TEST_DATA_DIR) + "/audio/";
    std::ifstream sidecar(dir + "adts.txt");
    std::string name;
    uint32_t uRate = 0, uChannels = 0, uFrames = 0, uFiles = 0;
    for (sidecar.ignore(1000, '\n'); sidecar >> name >> uRate >> uChannels >> uFrames; ++uFiles) {
        std::ifstream in(dir + name, std::ios::binary);
        const std::vector<uint8_t> stream(std::istreambuf_iterator<char>(in), {});
        uint32_t uCount = 0;
        for (size_t pos = 0; pos < stream.size(); ++uCount) {
            const uint8_t *p = stream.data() + pos;
            const uint32_t uLen = stream.size() - pos >= 7 ? _GetAACFrameLength(p) : 0;
            ASSERT_TRUE(uLen >= 7 && pos + uLen <= stream.size()) << name << " at " << pos;
            EXPECT_EQ(vorCALTools_AAC_isADTSAAC(static_cast<int32_t>(uLen), p), 7);
            uint8_t header[7];
            const uint32_t uConfig = ((p[2] & 1u) << 2) | (p[3] >> 6);
            vorCALTools_Make_ADTS_Header(Dsi((p[2] >> 6) + 1u, (p[2] >> 2) & 0x0F, uConfig).data(),
                                         static_cast<int32_t>(uLen - 7), header);
            EXPECT_EQ(std::vector<uint8_t>(header + 2, header + 7), std::vector<uint8_t>(p + 2, p + 7)) << name;
            EXPECT_EQ(uConfig, uChannels);
            pos += uLen;
        }
        EXPECT_EQ(uCount, uFrames) << name;
    }
    EXPECT_EQ(uFiles, 20u);
}

} // namespace
