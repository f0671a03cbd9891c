// Writes every silence frame the library produces as a decodable file, for the real-decoder
// check tests/data/check-silence-with-ffmpeg.sh. Disabled: it runs only when asked for, with
// VORCAL_SILENCE_DIR naming the output directory.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include <vorcal/audio_tools.h>

#include "audio_instance.hpp"
#include "mute_test_util.hpp"
#include "recording_sal.hpp"

using namespace vorcal::test;

namespace {

constexpr int kRepeats = 20; // frames per file, so that decoders get past their start-up

void WriteRepeated(const std::string &path, const std::string &magic, const std::vector<uint8_t> &frame)
{
    FILE *pFile = std::fopen(path.c_str(), "wb");
    ASSERT_NE(pFile, nullptr) << path;
    std::fwrite(magic.data(), 1, magic.size(), pFile);
    for (int i = 0; i < kRepeats; ++i)
        std::fwrite(frame.data(), 1, frame.size(), pFile);
    std::fclose(pFile);
}

TEST(SilenceExport, DISABLED_WriteFiles)
{
    const char *pDir = std::getenv("VORCAL_SILENCE_DIR");
    ASSERT_NE(pDir, nullptr) << "set VORCAL_SILENCE_DIR";
    const std::string dir = pDir;
    RecordingSal::Get().Reset();

    // AAC modes 0-4 behind ADTS; the SBR modes (2-4) take output rates up to 48000 Hz.
    const uint32_t kChannels[5] = {1, 2, 1, 2, 1};
    for (int32_t iMode = 0; iMode < 5; ++iMode) {
        const std::vector<uint32_t> rates = iMode < 2
                                                ? std::vector<uint32_t>{8000, 16000, 22050, 32000, 44100, 48000, 96000}
                                                : std::vector<uint32_t>{8000, 16000, 22050, 24000, 32000, 44100, 48000};
        for (uint32_t uRate : rates) {
            uint8_t *pFrame = nullptr;
            uint32_t uLen = 0;
            ASSERT_EQ(AAC_MuteFrame(&pFrame, &uLen, 0, uRate, kChannels[iMode], 1, iMode), 0);
            WriteRepeated(dir + "/aac-mode" + std::to_string(iMode) + "-" + std::to_string(uRate) + ".aac", "",
                          TakeFrame(pFrame, uLen));
        }
    }

    // AMR storage format files (RFC 4867 5.1 magic numbers).
    const struct {
        const char *pName;
        const char *pMagic;
        int32_t (*pGenerate)(uint8_t **, uint32_t *, uint32_t);
        uint32_t uFrameTypes;
        uint32_t uOTI;
    } kAmr[] = {{"amrnb", "#!AMR\n", AMRNB_MuteFrame, 8, CAL_OTI_AMR_NB},
                {"amrwb", "#!AMR-WB\n", AMRWB_MuteFrame, 9, CAL_OTI_AMR_WB}};
    for (const auto &amr : kAmr) {
        for (uint32_t uFT = 0; uFT < amr.uFrameTypes; ++uFT) {
            uint8_t *pFrame = nullptr;
            uint32_t uLen = 0;
            ASSERT_EQ(amr.pGenerate(&pFrame, &uLen, uFT), 0);
            WriteRepeated(dir + "/" + amr.pName + "-ft" + std::to_string(uFT) + ".amr", amr.pMagic,
                          TakeFrame(pFrame, uLen));
        }
        // The one-byte "no data" frame that vorCALTools_GetSilenceFrame hands out for AMR.
        AudioInstance codec(amr.uOTI);
        const uint8_t *pFrame = nullptr;
        uint32_t uLen = 0;
        ASSERT_EQ(vorCALTools_GetSilenceFrame(codec.get(), 8000, 1, 0, 0, &pFrame, &uLen), 0);
        WriteRepeated(dir + "/" + amr.pName + "-nodata.amr", amr.pMagic, std::vector<uint8_t>(pFrame, pFrame + uLen));
    }
    EXPECT_TRUE(RecordingSal::Get().liveBlocks.empty());
}

} // namespace
