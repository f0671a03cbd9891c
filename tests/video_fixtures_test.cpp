// Real encoder output (tests/data/video, made by tests/data/fixtures-video.sh) against what
// ffprobe reported for it: configuration sizes, profile and level, and per frame intra and B.
#include <gtest/gtest.h>

#include <fstream>
#include <iterator>
#include <sstream>
#include <string>
#include <vector>

#include <vorcal/video_tools.h>

namespace {

using Bytes = std::vector<uint8_t>;

enum class Kind { Mpeg4, H263, Mpeg2, Wmv };

struct Stream {
    const char *name;
    Kind kind;
    uint32_t oti;
};

struct Sidecar {
    uint32_t width = 0, height = 0;
    std::string profile;
    int level = -1;
    struct Frame {
        size_t size;
        char pictType;
    };
    std::vector<Frame> frames;
};

std::string DataPath(const std::string &name)
{
    return std::string(VORCAL_TEST_DATA_DIR) + "/video/" + name;
}

Bytes ReadAll(const std::string &path)
{
    std::ifstream in(path, std::ios::binary);
    return Bytes((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
}

Sidecar ReadSidecar(const std::string &path)
{
    Sidecar s;
    std::ifstream in(path);
    std::string line;
    while (std::getline(in, line)) {
        std::istringstream fields(line);
        std::string key;
        fields >> key;
        if (key == "width")
            fields >> s.width;
        else if (key == "height")
            fields >> s.height;
        else if (key == "level")
            fields >> s.level;
        else if (key == "profile")
            std::getline(fields >> std::ws, s.profile);
        else if (key == "frame") {
            Sidecar::Frame f{};
            fields >> f.size >> f.pictType;
            s.frames.push_back(f);
        }
    }
    return s;
}

class VideoFixture : public ::testing::TestWithParam<Stream> {};

TEST_P(VideoFixture, MatchesSidecar)
{
    const Stream &stream = GetParam();
    const Sidecar side = ReadSidecar(DataPath(std::string(stream.name) + ".txt"));
    const Bytes all = ReadAll(DataPath(std::string(stream.name) + ".frames"));
    ASSERT_GE(side.frames.size(), 8u);

    // Frames, each in an exactly-sized heap buffer.
    std::vector<Bytes> frames;
    size_t offset = 0;
    for (const Sidecar::Frame &f : side.frames) {
        ASSERT_LE(offset + f.size, all.size());
        frames.emplace_back(all.begin() + long(offset), all.begin() + long(offset + f.size));
        offset += f.size;
    }
    ASSERT_EQ(offset, all.size());

    CALMPEG4DSIInfo info{};
    if (stream.kind == Kind::Mpeg4) {
        const Bytes dsi = ReadAll(DataPath(std::string(stream.name) + ".extradata"));
        ASSERT_EQ(vorCALTools_MPEG4V_GetDSIInfo(dsi.data(), uint32_t(dsi.size()), &info), 0u);
        EXPECT_EQ(info.uWidth, side.width);
        EXPECT_EQ(info.uHeight, side.height);
        if (side.profile == "Simple Profile") {
            EXPECT_EQ(info.uProfile, 0u);
            EXPECT_EQ(int(info.uLevel), side.level);
        } else {
            EXPECT_EQ(info.uProfile, 255u) << side.profile;
            EXPECT_EQ(info.uLevel, 255u);
        }
    } else if (stream.kind == Kind::H263) {
        const Bytes &first = frames.front();
        ASSERT_EQ(vorCALTools_MPEG4V_GetDSIInfo(first.data(), uint32_t(first.size()), &info), 0u);
        EXPECT_EQ(info.uWidth, side.width);
        EXPECT_EQ(info.uHeight, side.height);
        const uint32_t format = side.width == 176 ? 2 : side.width == 352 ? 3 : 7;
        EXPECT_EQ(info.uSourceFormat, format);
    }

    for (size_t i = 0; i < frames.size(); ++i) {
        const Bytes &frame = frames[i];
        const auto len = int32_t(frame.size());
        const char type = side.frames[i].pictType;
        EXPECT_EQ(vorCALTools_IsIDRFrame(stream.oti, frame.data(), len, 0), type == 'I' ? 1 : 0)
            << "frame " << i << " type " << type;
        EXPECT_EQ(vorCALTools_IsBFrame(stream.oti, frame.data(), len), type == 'B' && stream.kind == Kind::Mpeg4)
            << "frame " << i;
        EXPECT_EQ(vorCALTools_IsValidVideo(stream.oti, frame.data(), len), 1) << "frame " << i;
        if (stream.kind == Kind::Mpeg4) {
            int32_t remaining = 0;
            const uint8_t *vop = _PTOOL_FindVOP(frame.data(), len, &remaining);
            ASSERT_NE(vop, nullptr) << "frame " << i;
            EXPECT_EQ(remaining, len - int32_t(vop - frame.data()));
        }
    }
}

INSTANTIATE_TEST_SUITE_P(Streams, VideoFixture,
                         ::testing::Values(Stream{"mpeg4_bf2", Kind::Mpeg4, 0x20},
                                           Stream{"mpeg4_xvid", Kind::Mpeg4, 0xF1},
                                           Stream{"h263_qcif", Kind::H263, 0xC0},
                                           Stream{"h263_cif", Kind::H263, 0xC0},
                                           Stream{"h263p_320", Kind::H263, 0xC0},
                                           Stream{"mpeg2", Kind::Mpeg2, 0xF2},
                                           Stream{"wmv1", Kind::Wmv, 0x31564D57},
                                           Stream{"wmv2", Kind::Wmv, 0x32564D57}),
                         [](const auto &info) { return std::string(info.param.name); });

} // namespace
