// Real encoder output (tests/data/video, made by tests/data/fixtures-video.sh) against its
// sidecar: configuration size, profile and level, and per frame its picture type.
#include <gtest/gtest.h>

#include <array>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include <vorcal/video_tools.h>

#include "recording_sal.hpp"

namespace {

using Bytes = std::vector<uint8_t>;

TEST(VideoFixtures, MatchSidecars)
{
    const std::pair<const char *, uint32_t> streams[] = {
        {"mpeg4_bf2", 0x20}, {"mpeg4_xvid", 0xF1}, {"h263_qcif", 0xC0}, {"h263_cif", 0xC0},
        {"h263p_320", 0xC0}, {"mpeg2", 0xF2},      {"wmv1", 0x31564D57}, {"wmv2", 0x32564D57}};
    for (const auto &[name, oti] : streams) {
        SCOPED_TRACE(name);
        const std::string base = std::string(VORCAL_TEST_DATA_DIR) + "/video/" + name;
        const Bytes all = vorcal::test::RecordingSal::ReadFile(base + ".frames");
        const bool mpeg4 = oti == 0x20 || oti == 0xF1;
        uint32_t width = 0, height = 0, level = 255, profile = 255;
        size_t offset = 0, frames = 0, size = 0;
        std::ifstream sidecar(base + ".txt");
        for (std::string line; std::getline(sidecar, line);) { // the header lines precede the frames
            const std::string key = line.substr(0, line.find(' '));
            std::istringstream fields(line.substr(key.size()));
            char type = 0;
            if (key == "width" || key == "height")
                fields >> (key == "width" ? width : height);
            else if (line == "profile Simple Profile")
                profile = 0;
            else if (key == "level" && profile == 0)
                fields >> level;
            if (key != "frame" || !(fields >> size >> type))
                continue;
            ASSERT_LE(offset + size, all.size());
            const Bytes frame(all.begin() + long(offset), all.begin() + long(offset + size)); // exactly sized
            if (frames++ == 0 && (mpeg4 || oti == 0xC0)) {
                // MPEG-4 Visual: the configuration record; H.263: the first picture header.
                const Bytes dsi = mpeg4 ? vorcal::test::RecordingSal::ReadFile(base + ".extradata") : frame;
                CALMPEG4DSIInfo i{};
                ASSERT_EQ(vorCALTools_MPEG4V_GetDSIInfo(dsi.data(), uint32_t(dsi.size()), &i), 0u);
                const uint32_t format = width == 176 ? 2 : width == 352 ? 3 : 7; // H.263 source format
                EXPECT_EQ((std::array{i.uProfile, i.uLevel, i.uSourceFormat, i.uWidth, i.uHeight}),
                          (mpeg4 ? std::array{profile, level, 0u, width, height}
                                 : std::array{0u, 0u, format, width, height}));
            }
            const auto len = int32_t(size);
            int32_t remaining = 0;
            const uint8_t *vop = _PTOOL_FindVOP(frame.data(), len, &remaining);
            // intra, B, valid, and for MPEG-4 Visual a VOP with the bytes from it to the end
            const std::array<int, 4> got{vorCALTools_IsIDRFrame(oti, frame.data(), len, 0),
                                         vorCALTools_IsBFrame(oti, frame.data(), len),
                                         vorCALTools_IsValidVideo(oti, frame.data(), len),
                                         mpeg4 && vop && remaining == len - (vop - frame.data())};
            EXPECT_EQ(got, (std::array<int, 4>{type == 'I', type == 'B' && mpeg4, 1, mpeg4})) << "frame at " << offset;
            offset += size;
        }
        EXPECT_GE(frames, 8u);
        EXPECT_EQ(offset, all.size());
    }
}

} // namespace
