// Writes every silence frame the library produces as a decodable file, for the real-decoder
// check tests/data/check-silence-with-ffmpeg.sh. Disabled: it runs only when asked for, with
// VORCAL_SILENCE_DIR naming the output directory.
#include <gtest/gtest.h>

#include <cstdlib>
#include <fstream>
#include <string>

#include <vorcal/audio_tools.h>

#include "mute_test_util.hpp"

using namespace vorcal::test;

TEST(SilenceExport, DISABLED_WriteFiles)
{
    const char *pDir = std::getenv("VORCAL_SILENCE_DIR");
    ASSERT_NE(pDir, nullptr) << "set VORCAL_SILENCE_DIR";
    RecordingSal::Get().Reset();
    // Twenty frames per file, so that decoders get past their start-up.
    const auto write = [&](const std::string &name, const std::string &magic, const uint8_t *pFrame, uint32_t uLen) {
        std::ofstream out(std::string(pDir) + "/" + name, std::ios::binary);
        out << magic;
        for (int i = 0; i < 20; ++i)
            out.write(reinterpret_cast<const char *>(pFrame), uLen);
        EXPECT_TRUE(out.good()) << name;
    };
    uint8_t *pFrame = nullptr;
    uint32_t uLen = 0;
    // AAC modes 0-4 behind ADTS; the SBR modes (2-4) take output rates up to 48000 Hz.
    for (int32_t iMode = 0; iMode < 5; ++iMode) {
        for (uint32_t uRate : {8000u, 16000u, 22050u, 32000u, 44100u, 48000u, iMode < 2 ? 96000u : 24000u}) {
            ASSERT_EQ(AAC_MuteFrame(&pFrame, &uLen, 0, uRate, iMode % 2 + 1, 1, iMode), 0);
            write("aac-mode" + std::to_string(iMode) + "-" + std::to_string(uRate) + ".aac", "", pFrame, uLen);
            TakeFrame(pFrame, uLen);
        }
    }
    // AMR storage format files (RFC 4867 5.1 magic numbers), every frame type and the one-byte
    // "no data" frame that vorCALTools_GetSilenceFrame hands out for AMR.
    for (const bool bWide : {false, true}) {
        const std::string name = bWide ? "amrwb" : "amrnb", magic = bWide ? "#!AMR-WB\n" : "#!AMR\n";
        for (uint32_t uFT = 0; (bWide ? AMRWB_MuteFrame : AMRNB_MuteFrame)(&pFrame, &uLen, uFT) == 0; ++uFT) {
            write(name + "-ft" + std::to_string(uFT) + ".amr", magic, pFrame, uLen);
            TakeFrame(pFrame, uLen);
        }
        AudioInstance codec(bWide ? CAL_OTI_AMR_WB : CAL_OTI_AMR_NB);
        const uint8_t *pNoData = nullptr;
        ASSERT_EQ(vorCALTools_GetSilenceFrame(codec.get(), 8000, 1, 0, 0, &pNoData, &uLen), 0);
        write(name + "-nodata.amr", magic, pNoData, uLen);
    }
}
