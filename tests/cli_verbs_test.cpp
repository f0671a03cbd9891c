// The vorcal tool's verbs end to end on the bundled samples and the real-stream fixtures: what
// probe and frames report against what ffprobe recorded in the sidecars (H.264, HEVC, MPEG-4,
// H.263, MPEG-2, AAC, AMR), what convert, replay and silence write, dump listing and extraction,
// and the command line's usage errors.
#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <map>
#include <iterator>
#include <sstream>
#include <string>
#include <sys/stat.h>
#include <unistd.h>
#include <vector>

#include <gtest/gtest.h>

#include "bit_writer.hpp"
#include "hevc_streams.hpp"
#include "json_reader.hpp"
#include "verbs.hpp"

namespace {

using vorcal::test::Json;
using Bytes = std::vector<uint8_t>;

std::string Data(const std::string &name)
{
    return std::string(VORCAL_TEST_DATA_DIR) + "/" + name;
}

Bytes ReadBytes(const std::string &path)
{
    std::ifstream in(path, std::ios::binary);
    return Bytes(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

std::string ReadText(const std::string &path)
{
    const Bytes bytes = ReadBytes(path);
    return std::string(bytes.begin(), bytes.end());
}

struct Outcome {
    int iStatus = -1;
    std::string out, err;
    Json json;
    size_t ErrLines() const { return static_cast<size_t>(std::count(err.begin(), err.end(), '\n')); }
};

std::string Slurp(std::FILE *pFile)
{
    std::rewind(pFile);
    std::string text;
    for (int c; (c = std::fgetc(pFile)) != EOF;)
        text += static_cast<char>(c);
    std::fclose(pFile);
    return text;
}

// Runs the tool in this process; with --json among the arguments the output must parse.
Outcome Vorcal(std::vector<std::string> args)
{
    args.insert(args.begin(), "vorcal");
    std::vector<char *> argv;
    for (std::string &arg : args)
        argv.push_back(arg.data());
    argv.push_back(nullptr);
    vorcal::cli::Console console{std::tmpfile(), std::tmpfile(), false};
    Outcome run;
    run.iStatus = vorcal::cli::Main(static_cast<int>(args.size()), argv.data(), console);
    run.out = Slurp(console.pOut);
    run.err = Slurp(console.pErr);
    if (std::find(args.begin(), args.end(), "--json") != args.end()) {
        EXPECT_TRUE(Json::Parse(run.out, run.json)) << "not JSON:\n" << run.out;
    }
    return run;
}

class TempDir {
public:
    TempDir()
    {
        char name[] = "/tmp/vorcal-cli-XXXXXX";
        path_ = mkdtemp(name);
    }
    ~TempDir() { std::system(("rm -rf '" + path_ + "'").c_str()); }
    std::string operator/(const std::string &name) const { return path_ + "/" + name; }

private:
    std::string path_;
};

// The records of a dump file.
std::vector<Bytes> Records(const std::string &path)
{
    const Bytes bytes = ReadBytes(path);
    std::vector<Bytes> records;
    for (size_t p = 0; p + 4 <= bytes.size();) {
        uint32_t uLen = 0;
        std::memcpy(&uLen, bytes.data() + p, 4);
        records.emplace_back(bytes.begin() + static_cast<ptrdiff_t>(p + 4),
                             bytes.begin() + static_cast<ptrdiff_t>(p + 4 + uLen));
        p += 4 + uLen;
    }
    return records;
}

// ---- probe against ffprobe ----------------------------------------------------------------

struct ProbeCase {
    const char *pFile;
    const char *pSidecar; // ffprobe JSON in tests/data/samples
    std::vector<std::string> keys;
};

class CliProbe : public ::testing::TestWithParam<ProbeCase> {};

TEST_P(CliProbe, MatchesFfprobe)
{
    const ProbeCase &c = GetParam();
    const Outcome run = Vorcal({"probe", "--json", Data(c.pFile)});
    ASSERT_EQ(run.iStatus, 0) << run.err;
    Json ref;
    ASSERT_TRUE(Json::Parse(ReadText(Data(std::string("samples/") + c.pSidecar)), ref));
    const Json &ours = run.json["streams"][0], &theirs = ref["streams"][0];
    for (const std::string &key : c.keys) {
        ASSERT_TRUE(theirs.Has(key)) << key;
        EXPECT_EQ(ours[key].Scalar(), theirs[key].Scalar()) << key;
    }
    const Json &count = theirs.Has("nb_frames") ? theirs["nb_frames"] : theirs["nb_read_packets"];
    EXPECT_EQ(ours["nb_frames"].Scalar(), count.Scalar());
}

const std::vector<std::string> kVideoKeys = {"codec_type", "codec_name", "profile", "level", "width", "height"};
const std::vector<std::string> kAudioKeys = {"codec_type", "codec_name", "profile", "sample_rate", "channels"};

INSTANTIATE_TEST_SUITE_P(
    Samples, CliProbe,
    ::testing::Values(
        ProbeCase{"samples/h264_high.mp4", "h264_high.mp4.json",
                  {"codec_name", "profile", "level", "width", "height", "pix_fmt", "sample_aspect_ratio"}},
        ProbeCase{"samples/h264_misread.mp4", "h264_misread.mp4.json", kVideoKeys},
        ProbeCase{"samples/mpeg4_asp.m4v", "mpeg4_asp.m4v.json", kVideoKeys},
        ProbeCase{"samples/aac_lc.m4a", "aac_lc.m4a.json", kAudioKeys},
        ProbeCase{"heaac/bear_v1_aot5.mp4", "heaac_aot5.json", kAudioKeys},
        // Implicit SBR: only the frames tell that the output rate is twice the header's.
        ProbeCase{"heaac/bear_v1_implicit.aac", "heaac_implicit.json", kAudioKeys},
        ProbeCase{"samples/amr_nb.amr", "amr_nb.amr.json", {"codec_type", "codec_name", "sample_rate", "channels"}}),
    [](const auto &info) {
        std::string name = info.param.pSidecar;
        return name.substr(0, name.find('.'));
    });

// The older fixtures' sidecars: "key value" lines.
std::map<std::string, std::string> TextSidecar(const std::string &path)
{
    std::map<std::string, std::string> facts;
    std::istringstream in(ReadText(path));
    for (std::string line; std::getline(in, line);)
        if (const size_t space = line.find(' '); space != std::string::npos && line.rfind("frame ", 0) != 0)
            facts.emplace(line.substr(0, space), line.substr(space + 1));
    return facts;
}

TEST(CliProbe, MatchesTheFixtureSidecars)
{
    const struct {
        const char *pFile, *pSidecar;
        std::vector<std::string> keys;
    } kCases[] = {
        {"h264/baseline_176x144.h264", "h264/baseline_176x144.h264.txt", {"width", "height", "profile", "level"}},
        // Cropped from a coded height of 192.
        {"h264/main_320x180.h264", "h264/main_320x180.h264.txt", {"width", "height", "profile", "level"}},
        {"video/h263_qcif.frames", "video/h263_qcif.txt", {"codec", "width", "height"}},
        {"video/h263p_320.frames", "video/h263p_320.txt", {"codec", "width", "height"}},
        {"video/mpeg2.frames", "video/mpeg2.txt", {"codec", "width", "height", "profile", "level"}},
    };
    for (const auto &c : kCases) {
        const Outcome run = Vorcal({"probe", "--json", Data(c.pFile)});
        ASSERT_EQ(run.iStatus, 0) << c.pFile << run.err;
        const auto facts = TextSidecar(Data(c.pSidecar));
        const Json &stream = run.json["streams"][0];
        for (const std::string &key : c.keys) {
            EXPECT_EQ(stream[key == "codec" ? "codec_name" : key].Scalar(), facts.at(key)) << c.pFile << " " << key;
        }
        if (facts.count("frames")) {
            EXPECT_EQ(stream["nb_frames"].Scalar(), facts.at("frames")) << c.pFile;
        }
    }
    // ADTS at every rate: "<file> <rate> <channels> <frames>" lines.
    std::istringstream in(ReadText(Data("audio/adts.txt")));
    int iFiles = 0;
    for (std::string file, rate, channels, frames; in >> file >> rate >> channels >> frames;) {
        if (file[0] == '#') {
            std::getline(in, file);
            continue;
        }
        const Outcome run = Vorcal({"probe", "--json", Data("audio/" + file)});
        const Json &stream = run.json["streams"][0];
        EXPECT_EQ(stream["sample_rate"].Scalar() + " " + stream["channels"].Scalar() + " " + stream["nb_frames"].Scalar(),
                  rate + " " + channels + " " + frames)
            << file;
        ++iFiles;
    }
    EXPECT_EQ(iFiles, 20);
}

// The H.264 profile fixtures' sidecars: ffprobe's "key=value" stream lines, then every syntax
// element of the first SPS as "sps.NAME=V".
std::map<std::string, std::string> KeyValueSidecar(const std::string &path)
{
    std::map<std::string, std::string> facts;
    std::istringstream in(ReadText(path));
    for (std::string line; std::getline(in, line);)
        if (const size_t eq = line.find('='); eq != std::string::npos)
            facts.emplace(line.substr(0, eq), line.substr(eq + 1));
    return facts;
}

std::vector<std::string> ProfileFixtures()
{
    std::vector<std::string> names;
    for (const auto &entry : std::filesystem::directory_iterator(Data("h264")))
        if (entry.path().extension() == ".probe")
            names.push_back(entry.path().stem().string());
    std::sort(names.begin(), names.end());
    return names;
}

TEST(CliProbe, MatchesTheProfileFixtures)
{
    const std::vector<std::string> names = ProfileFixtures();
    ASSERT_GE(names.size(), 13u);
    for (const std::string &name : names) {
        const Outcome run = Vorcal({"probe", "--json", Data("h264/" + name + ".h264")});
        ASSERT_EQ(run.iStatus, 0) << name << run.err;
        const auto facts = KeyValueSidecar(Data("h264/" + name + ".probe"));
        const Json &stream = run.json["streams"][0];
        EXPECT_EQ(stream["size_source"].text, "sps") << name;
        for (const char *pKey : {"profile", "level", "width", "height", "pix_fmt", "sample_aspect_ratio", "color_space",
                                 "color_transfer", "color_primaries", "bits_per_raw_sample"}) {
            EXPECT_EQ(stream[pKey].Scalar(), facts.at(pKey)) << name << " " << pKey;
        }
        // A range the SPS leaves open is not reported; ffprobe calls it unknown.
        EXPECT_EQ(stream.Has("color_range") ? stream["color_range"].text : "unknown", facts.at("color_range")) << name;
    }
}

// Every box boundary of real movies, as a truncation point: probe stops with exit 1 and one line
// naming the file and an offset.
std::vector<size_t> BoxBoundaries(const Bytes &b, size_t uBegin, size_t uEnd)
{
    static const std::vector<std::string> kContainers = {"moov", "trak", "mdia", "minf", "stbl", "edts", "dinf"};
    std::vector<size_t> cuts;
    for (size_t p = uBegin; p + 8 <= uEnd;) {
        const size_t uSize = (size_t{b[p]} << 24) | (size_t{b[p + 1]} << 16) | (size_t{b[p + 2]} << 8) | b[p + 3];
        if (uSize < 8 || p + uSize > uEnd)
            break;
        cuts.push_back(p);
        cuts.push_back(p + 8);
        const std::string type(b.begin() + static_cast<ptrdiff_t>(p + 4), b.begin() + static_cast<ptrdiff_t>(p + 8));
        if (std::find(kContainers.begin(), kContainers.end(), type) != kContainers.end()) {
            const std::vector<size_t> inner = BoxBoundaries(b, p + 8, p + uSize);
            cuts.insert(cuts.end(), inner.begin(), inner.end());
        }
        p += uSize;
    }
    return cuts;
}

TEST(CliProbe, MoviesCutAtEveryBoxBoundaryFailInOneLine)
{
    TempDir dir;
    for (const char *pName : {"samples/h264_high.mp4", "samples/aac_lc.m4a", "heaac/bear_v1_aot5.mp4"}) {
        const Bytes movie = ReadBytes(Data(pName));
        const std::vector<size_t> cuts = BoxBoundaries(movie, 0, movie.size());
        EXPECT_GT(cuts.size(), 20u) << pName;
        for (size_t uCut : cuts) {
            std::ofstream(dir / "cut.mp4", std::ios::binary)
                .write(reinterpret_cast<const char *>(movie.data()), static_cast<std::streamsize>(uCut));
            const Outcome run = Vorcal({"probe", dir / "cut.mp4"});
            EXPECT_EQ(run.iStatus, 1) << pName << " cut at " << uCut;
            EXPECT_EQ(run.ErrLines(), 1u) << pName << " cut at " << uCut << ": " << run.err;
            EXPECT_NE(run.err.find(uCut ? ": offset " : "the input is empty"), std::string::npos) << run.err;
        }
    }
}

// ---- frames against ffprobe's packets -----------------------------------------------------

TEST(CliFrames, MatchFfprobePackets)
{
    const struct {
        const char *pFile, *pSidecar;
        const char *pKeyField; // our field that must equal ffprobe's K flag
    } kCases[] = {
        {"samples/h264_high.mp4", "h264_high.mp4.json", "key"},
        {"samples/h264_high.mp4", "h264_high.mp4.json", "sync"},
        {"samples/h264_misread.mp4", "h264_misread.mp4.json", "sync"},
        {"samples/mpeg4_asp.m4v", "mpeg4_asp.m4v.json", "key"},
        {"samples/aac_lc.m4a", "aac_lc.m4a.json", "key"},
        {"samples/amr_nb.amr", "amr_nb.amr.json", "key"},
        {"heaac/bear_v1_implicit.aac", "heaac_implicit.json", "key"},
    };
    for (const auto &c : kCases) {
        const Outcome run = Vorcal({"frames", "--json", Data(c.pFile)});
        ASSERT_EQ(run.iStatus, 0) << c.pFile << run.err;
        Json ref;
        ASSERT_TRUE(Json::Parse(ReadText(Data(std::string("samples/") + c.pSidecar)), ref));
        const Json &frames = run.json["frames"], &packets = ref["packets"];
        ASSERT_EQ(frames.items.size(), packets.items.size()) << c.pFile;
        for (size_t i = 0; i < packets.items.size(); ++i) {
            const Json &f = frames[i], &p = packets[i];
            EXPECT_EQ(f["offset"].Scalar() + " " + f["size"].Scalar(), p["pos"].Scalar() + " " + p["size"].Scalar())
                << c.pFile << " frame " << i;
            EXPECT_EQ(f[c.pKeyField].Int(), p["flags"].text[0] == 'K' ? 1 : 0) << c.pFile << " frame " << i;
        }
    }
}

TEST(CliFrames, FormatTestMisreadsExactlyTheSamplesThatLookLikeStartCodes)
{
    std::vector<int64_t> misread;
    std::istringstream in(ReadText(Data("samples/h264_misread.txt")));
    for (std::string word, value; in >> word >> value;)
        if (word == "misread")
            misread.push_back(std::stoll(value));
    ASSERT_FALSE(misread.empty());
    for (const char *pFile : {"samples/h264_misread.mp4", "samples/h264_high.mp4"}) {
        const Outcome run = Vorcal({"frames", "--json", Data(pFile)});
        std::vector<int64_t> wrong;
        for (const Json &frame : run.json["frames"].items)
            if (!frame["format_agrees"].b)
                wrong.push_back(frame["index"].Int());
        EXPECT_EQ(wrong, std::string(pFile).find("misread") != std::string::npos ? misread : std::vector<int64_t>{})
            << pFile;
    }
}

TEST(CliFrames, AnnexBStreamsMatchTheirSidecars)
{
    for (const char *pName : {"h264/baseline_176x144.h264", "h264/main_320x180.h264"}) {
        const Outcome run = Vorcal({"frames", "--json", Data(pName)});
        std::istringstream in(ReadText(Data(std::string(pName) + ".txt")));
        size_t i = 0;
        for (std::string line; std::getline(in, line);) {
            if (line.rfind("frame ", 0) != 0)
                continue;
            const Json &f = run.json["frames"][i++];
            EXPECT_EQ("frame " + f["offset"].Scalar() + " " + f["size"].Scalar() + " " + f["pict_type"].text + " " +
                          f["key"].Scalar(),
                      line)
                << pName;
        }
        EXPECT_EQ(i, run.json["frames"].items.size()) << pName;
    }
    // The other video fixtures: "frame SIZE PICT_TYPE KEY" lines.
    for (const char *pName : {"video/mpeg2", "video/h263_qcif", "video/h263_cif", "video/h263p_320"}) {
        const Outcome run = Vorcal({"frames", "--json", Data(std::string(pName) + ".frames")});
        std::istringstream in(ReadText(Data(std::string(pName) + ".txt")));
        size_t i = 0;
        for (std::string line; std::getline(in, line);) {
            if (line.rfind("frame ", 0) != 0)
                continue;
            const Json &f = run.json["frames"][i++];
            EXPECT_EQ(line.substr(0, line.rfind(' ')), "frame " + f["size"].Scalar() + " " + f["pict_type"].text)
                << pName << " frame " << i - 1;
        }
        EXPECT_EQ(i, run.json["frames"].items.size()) << pName;
    }
}

// ---- convert and replay ---------------------------------------------------------------------

TEST(CliConvert, AnnexBOfTheMp4KeepsEveryPicture)
{
    TempDir dir;
    const Outcome convert = Vorcal({"convert", Data("samples/h264_high.mp4"), dir / "out.h264", "--to", "annexb"});
    ASSERT_EQ(convert.iStatus, 0) << convert.err;
    const Bytes out = ReadBytes(dir / "out.h264");
    ASSERT_GE(out.size(), 5u);
    EXPECT_EQ(Bytes(out.begin(), out.begin() + 5), (Bytes{0, 0, 0, 1, 0x67})); // the configuration in front
    const Outcome mp4 = Vorcal({"frames", "--json", Data("samples/h264_high.mp4")});
    const Outcome annexb = Vorcal({"frames", "--json", dir / "out.h264"});
    ASSERT_EQ(annexb.json["frames"].items.size(), 12u);
    for (size_t i = 0; i < 12; ++i) {
        const Json &a = mp4.json["frames"][i], &b = annexb.json["frames"][i];
        EXPECT_EQ(b["pict_type"].text + b["key"].Scalar(), a["pict_type"].text + a["key"].Scalar()) << i;
        // Every slice arrives; the first picture also carries the configuration.
        std::vector<std::string> slicesA, slicesB;
        for (const Json &t : a["nal_unit_types"].items)
            if (t.Int() == 1 || t.Int() == 5)
                slicesA.push_back(t.text);
        for (const Json &t : b["nal_unit_types"].items)
            if (t.Int() == 1 || t.Int() == 5)
                slicesB.push_back(t.text);
        EXPECT_EQ(slicesB, slicesA) << i;
    }
    EXPECT_EQ(annexb.json["frames"][0]["nal_unit_types"][0].Int(), 7);
}

TEST(CliConvert, LengthPrefixedDumpAndStrippedParameterSets)
{
    TempDir dir;
    // Length-prefixed in, length-prefixed out: the avcC record and every sample pass unchanged.
    ASSERT_EQ(Vorcal({"convert", Data("samples/h264_high.mp4"), dir / "len.dump", "--to", "length"}).iStatus, 0);
    const std::vector<Bytes> records = Records(dir / "len.dump");
    ASSERT_EQ(records.size(), 13u);
    const Bytes mp4 = ReadBytes(Data("samples/h264_high.mp4"));
    const Outcome frames = Vorcal({"frames", "--json", Data("samples/h264_high.mp4")});
    for (size_t i = 0; i < 12; ++i) {
        const Json &f = frames.json["frames"][i];
        const auto from = mp4.begin() + static_cast<ptrdiff_t>(f["offset"].Int());
        EXPECT_EQ(records[i + 1], Bytes(from, from + f["size"].Int())) << i;
    }
    const Outcome dump = Vorcal({"dump", "--json", dir / "len.dump"});
    EXPECT_EQ(dump.json["records"][0]["framing"].text, "avcC");
    EXPECT_EQ(dump.json["records"][1]["framing"].text + dump.json["records"][1]["nal_unit_type"].Scalar(), "length6");

    // Annex B in with --strip-ps: the second IDR picture loses its SPS and PPS.
    ASSERT_EQ(Vorcal({"convert", Data("h264/main_320x180.h264"), dir / "s.h264", "--to", "annexb", "--strip-ps"}).iStatus, 0);
    const Outcome stripped = Vorcal({"frames", "--json", dir / "s.h264"});
    std::string types;
    for (const Json &t : stripped.json["frames"][8]["nal_unit_types"].items)
        types += t.text;
    EXPECT_EQ(types, "55");

    const Outcome wrong = Vorcal({"convert", Data("samples/aac_lc.m4a"), dir / "x", "--to", "annexb"});
    EXPECT_EQ(wrong.iStatus, 1);
    EXPECT_EQ(wrong.ErrLines(), 1u) << wrong.err;
}

// The samples of h264_misread.mp4 whose first NAL length reads as a start code: the documented
// adaptation passes them unconverted, the stream-aware one (--trust-config) converts every one.
// A correct conversion is the samples' 4-byte lengths turned into 4-byte start codes, with the
// avcC record's parameter sets in front; its decoded frames are the MD5s in h264_misread.txt.
TEST(CliConvert, TrustedConfigurationConvertsTheMisreadSamples)
{
    const std::string mp4Path = Data("samples/h264_misread.mp4");
    const Bytes mp4 = ReadBytes(mp4Path);
    auto AnnexB = [](const uint8_t *p, size_t uSize) {
        Bytes out;
        for (size_t i = 0; i + 4 <= uSize;) {
            const size_t uLen = size_t{p[i]} << 24 | size_t{p[i + 1]} << 16 | size_t{p[i + 2]} << 8 | p[i + 3];
            out.insert(out.end(), {0, 0, 0, 1});
            out.insert(out.end(), p + i + 4, p + i + 4 + uLen);
            i += 4 + uLen;
        }
        return out;
    };
    // The avcC record (ISO/IEC 14496-15 5.3.3.1.2): SPS and PPS counts, each set behind a 2-byte length.
    const uint8_t *pAvcC = &*std::search(mp4.begin(), mp4.end(), std::begin("avcC"), std::end("avcC") - 1) + 4;
    size_t p = 5;
    Bytes expected;
    auto TakeSets = [&](size_t uCount) {
        for (; uCount > 0; --uCount) {
            const size_t uLen = size_t{pAvcC[p]} << 8 | pAvcC[p + 1];
            expected.insert(expected.end(), {0, 0, 0, 1});
            expected.insert(expected.end(), pAvcC + p + 2, pAvcC + p + 2 + uLen);
            p += 2 + uLen;
        }
    };
    TakeSets(pAvcC[p++] & 0x1Fu);
    TakeSets(pAvcC[p++]);
    const size_t uConfigBytes = expected.size();
    const Outcome frames = Vorcal({"frames", "--json", mp4Path});
    std::vector<Bytes> samples;
    for (const Json &f : frames.json["frames"].items) {
        samples.push_back(AnnexB(mp4.data() + f["offset"].Int(), static_cast<size_t>(f["size"].Int())));
        expected.insert(expected.end(), samples.back().begin(), samples.back().end());
    }
    ASSERT_EQ(samples.size(), 12u);

    TempDir dir;
    const Outcome convert = Vorcal({"convert", mp4Path, dir / "trusted.h264", "--to", "annexb", "--trust-config"});
    ASSERT_EQ(convert.iStatus, 0) << convert.err;
    const Bytes trusted = ReadBytes(dir / "trusted.h264");
    EXPECT_EQ(Bytes(trusted.begin(), trusted.begin() + static_cast<ptrdiff_t>(std::min(uConfigBytes, trusted.size()))),
              Bytes(expected.begin(), expected.begin() + static_cast<ptrdiff_t>(uConfigBytes)));
    EXPECT_TRUE(trusted == expected) << "the converted stream differs from the samples with start codes";

    // Frame by frame, as the codec received them: the documented mode differs exactly at the
    // misread samples.
    std::vector<size_t> misread;
    std::istringstream in(ReadText(Data("samples/h264_misread.txt")));
    for (std::string word, value; in >> word >> value;)
        if (word == "misread")
            misread.push_back(std::stoul(value));
    for (const bool bTrust : {false, true}) {
        std::vector<std::string> args = {"replay", "--json", mp4Path, "--wants", "annexb", "-o", dir / "received.dump"};
        if (bTrust)
            args.push_back("--trust-config");
        ASSERT_EQ(Vorcal(args).iStatus, 0);
        const std::vector<Bytes> records = Records(dir / "received.dump");
        ASSERT_EQ(records.size(), 13u);
        std::vector<size_t> wrong;
        for (size_t i = 0; i < 12; ++i)
            if (records[i + 1] != samples[i])
                wrong.push_back(i);
        EXPECT_EQ(wrong, bTrust ? std::vector<size_t>{} : misread) << (bTrust ? "--trust-config" : "documented");
    }
}

TEST(CliReplay, ShowsWhatTheCodecReceives)
{
    TempDir dir;
    // AMR lock: the ten frames of type 2 become the silent frame of type 7 (the sample's own frames).
    const Outcome locked = Vorcal({"replay", "--json", Data("samples/amr_nb.amr"), "--lock-amr", "-o", dir / "amr.dump"});
    ASSERT_EQ(locked.iStatus, 0) << locked.err;
    const std::vector<Bytes> records = Records(dir / "amr.dump");
    ASSERT_EQ(records.size(), 51u);
    for (size_t i = 0; i < 50; ++i) {
        const bool bSubstituted = i >= 20 && i < 30;
        EXPECT_EQ(locked.json["frames"][i]["received"].text, bSubstituted ? "substituted" : "passed") << i;
        EXPECT_EQ(records[i + 1], records[1]) << i;
    }
    const Outcome unlocked = Vorcal({"replay", "--json", Data("samples/amr_nb.amr")});
    EXPECT_EQ(unlocked.json["frames"][25]["received"].text, "passed");

    // What the layer's documented adaptation does to misread samples: they pass unconverted.
    std::vector<int64_t> misread, passed;
    std::istringstream in(ReadText(Data("samples/h264_misread.txt")));
    for (std::string word, value; in >> word >> value;)
        if (word == "misread")
            misread.push_back(std::stoll(value));
    const Outcome h264 = Vorcal({"replay", "--json", Data("samples/h264_misread.mp4"), "--wants", "annexb"});
    for (const Json &frame : h264.json["frames"].items)
        if (frame["received"].text != "converted")
            passed.push_back(frame["index"].Int());
    EXPECT_EQ(passed, misread);

    const struct {
        std::vector<std::string> args;
        int iStatus;
        std::string init; // "key=value" of the init record
        int64_t iFrame;
        std::string received;
    } kCases[] = {
        {{Data("samples/aac_lc.m4a"), "--params"}, 0, "samples_per_frame=1024", 0, "passed"},
        {{Data("samples/aac_lc.m4a"), "--params"}, 0, "sample_rate=44100", 44, "passed"},
        {{Data("heaac/bear_v1_aot5.mp4"), "--params"}, 0, "samples_per_frame=2048", 0, "passed"},
        {{Data("heaac/bear_v1_aot5.mp4"), "--params"}, 0, "sample_rate=44100", 0, "passed"},
        {{Data("samples/mpeg4_asp.m4v"), "--vop-start"}, 0, "result=0", 0, "moved to VOP"},
        {{Data("samples/mpeg4_asp.m4v"), "--vop-start"}, 0, "result=0", 1, "passed"},
        {{Data("h264/main_320x180.h264"), "--no-main"}, 1, "received=refused", -1, ""},
        {{Data("h264/main_320x180.h264"), "--wants", "length", "--params"}, 0, "height=192", 8, "converted"},
        {{Data("h264/main_320x180.h264"), "--strip-ps"}, 0, "received=passed", 8, "stripped"},
    };
    for (const auto &c : kCases) {
        std::vector<std::string> args = {"replay", "--json"};
        args.insert(args.end(), c.args.begin(), c.args.end());
        const Outcome run = Vorcal(args);
        EXPECT_EQ(run.iStatus, c.iStatus) << c.args[0] << run.err;
        const std::string key = c.init.substr(0, c.init.find('='));
        EXPECT_EQ(key + "=" + run.json["init"][key].Scalar(), c.init) << c.args[0];
        if (c.iFrame >= 0) {
            EXPECT_EQ(run.json["frames"][static_cast<size_t>(c.iFrame)]["received"].text, c.received) << c.args[0];
        } else {
            EXPECT_TRUE(run.json["frames"].items.empty());
        }
    }
}

// ---- silence ---------------------------------------------------------------------------------

TEST(CliSilence, WritesPlayableFiles)
{
    TempDir dir;
    const struct {
        std::vector<std::string> args;
        std::string magic;
        size_t uFrame;
        std::vector<uint8_t> first;
        std::string codec, rate;
    } kCases[] = {
        {{"--codec", "aac"}, "", 24, {0xFF, 0xF9, 0x90, 0x80, 0x03, 0x1F, 0x3C, 0x21}, "aac", "44100"},
        {{"--codec", "aac", "--channels", "1", "--rate", "8000"}, "", 18, {0xFF, 0xF9, 0xAC, 0x40}, "aac", "8000"},
        // HE-AAC frames carry the core rate (half the output) in their header.
        // probe finds the SBR data in the frames and reports the output rate, as ffprobe does.
        {{"--codec", "he-aac", "--channels", "1"}, "", 29, {0xFF, 0xF9, 0x9C, 0x40, 0x03, 0xBF, 0x3C}, "aac", "44100"},
        {{"--codec", "he-aacv2"}, "", 31, {0xFF, 0xF9, 0x9C, 0x40, 0x03, 0xFF, 0x3C}, "aac", "44100"},
        {{"--codec", "amrnb", "--ft", "0"}, "#!AMR\n", 13, {0x04, 0x63, 0x3C, 0xC7}, "amr_nb", "8000"},
        {{"--codec", "amrwb"}, "#!AMR-WB\n", 61, {0x44, 0x11, 0x00, 0x00}, "amr_wb", "16000"},
        {{"--codec", "dra", "--rate", "44100"}, "", 8, {0x7F, 0xFF, 0x00, 0x5B, 0x93, 0xA0, 0x00, 0x1F}, "", ""},
    };
    for (const auto &c : kCases) {
        std::vector<std::string> args = {"silence", "--frames", "7", "-o", dir / "s"};
        args.insert(args.end(), c.args.begin(), c.args.end());
        ASSERT_EQ(Vorcal(args).iStatus, 0) << c.args[1];
        const Bytes out = ReadBytes(dir / "s");
        ASSERT_EQ(out.size(), c.magic.size() + 7 * c.uFrame) << c.args[1];
        EXPECT_EQ(std::string(out.begin(), out.begin() + static_cast<ptrdiff_t>(c.magic.size())), c.magic);
        EXPECT_EQ(Bytes(out.begin() + static_cast<ptrdiff_t>(c.magic.size()),
                        out.begin() + static_cast<ptrdiff_t>(c.magic.size() + c.first.size())),
                  c.first)
            << c.args[1];
        if (c.codec.empty())
            continue;
        const Outcome probe = Vorcal({"probe", "--json", dir / "s"});
        const Json &stream = probe.json["streams"][0];
        EXPECT_EQ(stream["codec_name"].text + " " + stream["sample_rate"].text + " " + stream["nb_frames"].text,
                  c.codec + " " + c.rate + " 7")
            << c.args[1];
    }
    const struct {
        std::vector<std::string> args;
        int iStatus;
    } kRefused[] = {
        {{"--codec", "aac", "--rate", "50000"}, 1}, {{"--codec", "amrnb", "--ft", "8"}, 1},
        {{"--codec", "dra", "--channels", "1"}, 1}, {{"--codec", "aac", "--channels", "3"}, 2},
        {{"--codec", "he-aacv2", "--channels", "1"}, 2}, {{"--codec", "mp3"}, 2},
    };
    for (const auto &c : kRefused) {
        std::vector<std::string> args = {"silence", "-o", dir / "r"};
        args.insert(args.end(), c.args.begin(), c.args.end());
        const Outcome run = Vorcal(args);
        EXPECT_EQ(run.iStatus, c.iStatus) << c.args[1] << " " << c.args.back();
        EXPECT_GE(run.ErrLines(), 1u);
        EXPECT_EQ(access((dir / "r").c_str(), F_OK), -1) << "nothing written for a refusal";
    }
}

// ---- dump --------------------------------------------------------------------------------------

TEST(CliDump, ExtractsWithoutFollowingOrOverwriting)
{
    TempDir dir;
    ASSERT_EQ(Vorcal({"convert", Data("samples/h264_high.mp4"), dir / "d.dump", "--to", "length"}).iStatus, 0);
    const std::vector<Bytes> records = Records(dir / "d.dump");
    ASSERT_EQ(Vorcal({"dump", dir / "d.dump", "--extract", dir / "x"}).iStatus, 0);
    for (size_t i = 0; i < records.size(); ++i) {
        char name[48];
        std::snprintf(name, sizeof name, "x/record-%06zu.bin", i);
        EXPECT_EQ(ReadBytes(dir / name), records[i]) << name;
    }
    // A second extraction finds the files there and stops at the first.
    const Outcome again = Vorcal({"dump", dir / "d.dump", "--extract", dir / "x"});
    EXPECT_EQ(again.iStatus, 1);
    EXPECT_NE(again.err.find("record-000000.bin: exists: not overwritten"), std::string::npos) << again.err;
    // A symbolic link in place of a record, or as the directory, is not followed.
    mkdir((dir / "y").c_str(), 0755);
    std::ofstream(dir / "target") << "keep";
    ASSERT_EQ(symlink((dir / "target").c_str(), (dir / "y/record-000000.bin").c_str()), 0);
    EXPECT_EQ(Vorcal({"dump", dir / "d.dump", "--extract", dir / "y"}).iStatus, 1);
    ASSERT_EQ(symlink((dir / "y").c_str(), (dir / "link").c_str()), 0);
    const Outcome linked = Vorcal({"dump", dir / "d.dump", "--extract", dir / "link"});
    EXPECT_EQ(linked.iStatus, 1);
    EXPECT_NE(linked.err.find("is a symbolic link: not followed"), std::string::npos) << linked.err;
    EXPECT_EQ(ReadText(dir / "target"), "keep");

    // A truncated dump lists what is whole and names the broken record in one line.
    Bytes cut = ReadBytes(dir / "d.dump");
    cut.resize(cut.size() - 10);
    std::ofstream(dir / "cut.dump", std::ios::binary).write(reinterpret_cast<const char *>(cut.data()),
                                                              static_cast<std::streamsize>(cut.size()));
    const Outcome truncated = Vorcal({"dump", "--json", dir / "cut.dump"});
    EXPECT_EQ(truncated.iStatus, 1);
    EXPECT_EQ(truncated.ErrLines(), 1u);
    EXPECT_NE(truncated.err.find("truncated: record 12 has length"), std::string::npos) << truncated.err;
    EXPECT_EQ(truncated.json["nb_records"].Int(), 12);
}

// ---- sps against ffmpeg's reading of the same SPS ------------------------------------------

// Our field, the syntax element the sidecar names, what is added to it, and our value when the
// SPS does not carry it.
struct SpsField {
    const char *pOurs, *pTrace;
    int iAdd, iAbsent;
};

constexpr SpsField kSpsFields[] = {
    {"profile_idc", "profile_idc", 0, -1},
    {"level_idc", "level_idc", 0, -1},
    {"seq_parameter_set_id", "seq_parameter_set_id", 0, -1},
    {"chroma_format_idc", "chroma_format_idc", 0, 1},
    {"bit_depth_luma", "bit_depth_luma_minus8", 8, 8},
    {"bit_depth_chroma", "bit_depth_chroma_minus8", 8, 8},
    {"seq_scaling_matrix_present_flag", "seq_scaling_matrix_present_flag", 0, 0},
    {"log2_max_frame_num", "log2_max_frame_num_minus4", 4, -1},
    {"pic_order_cnt_type", "pic_order_cnt_type", 0, -1},
    {"max_num_ref_frames", "max_num_ref_frames", 0, -1},
    {"frame_mbs_only_flag", "frame_mbs_only_flag", 0, -1},
    {"mb_adaptive_frame_field_flag", "mb_adaptive_frame_field_flag", 0, 0},
    {"video_full_range_flag", "video_full_range_flag", 0, 0},
    {"colour_primaries", "colour_primaries", 0, 2},
    {"transfer_characteristics", "transfer_characteristics", 0, 2},
    {"matrix_coefficients", "matrix_coefficients", 0, 2},
    {"num_units_in_tick", "num_units_in_tick", 0, 0},
    {"time_scale", "time_scale", 0, 0},
    {"fixed_frame_rate_flag", "fixed_frame_rate_flag", 0, 0},
    {"max_num_reorder_frames", "max_num_reorder_frames", 0, 0},
    {"max_dec_frame_buffering", "max_dec_frame_buffering", 0, 0},
};

TEST(CliSps, MatchesTheSyntaxElementsOfTheProfileFixtures)
{
    for (const std::string &name : ProfileFixtures()) {
        const auto facts = KeyValueSidecar(Data("h264/" + name + ".probe"));
        auto Trace = [&](const std::string &key, int iAbsent, int iAdd = 0) {
            const auto it = facts.find("sps." + key);
            return it == facts.end() ? int64_t{iAbsent} : std::stoll(it->second) + iAdd;
        };
        // The stream, its decoder configuration record, and the SPS as hex with colons.
        const Outcome stream = Vorcal({"sps", "--json", Data("h264/" + name + ".h264")});
        ASSERT_EQ(stream.iStatus, 0) << name << stream.err;
        std::string hex = stream.json["sps_bytes"].text;
        std::replace(hex.begin(), hex.end(), ' ', ':');
        for (const std::string &input : {Data("h264/" + name + ".h264"), Data("h264/" + name + ".avcc"), hex}) {
            if (access(input.c_str(), F_OK) != 0 && input != hex)
                continue; // a stream without a record
            const Outcome run = Vorcal({"sps", "--json", input});
            ASSERT_EQ(run.iStatus, 0) << input << run.err;
            const Json &sps = run.json["sps"];
            for (const SpsField &field : kSpsFields) {
                EXPECT_EQ(sps[field.pOurs].Int(), Trace(field.pTrace, field.iAbsent, field.iAdd))
                    << input << " " << field.pOurs;
            }
            int64_t iFlags = 0;
            for (int i = 0; i < 6; ++i)
                iFlags |= Trace("constraint_set" + std::to_string(i) + "_flag", 0) << (7 - i);
            EXPECT_EQ(sps["constraint_set_flags"].Int(), iFlags) << input;
            EXPECT_EQ(sps["coded_width"].Int(), (Trace("pic_width_in_mbs_minus1", -1) + 1) * 16) << input;
            EXPECT_EQ(sps["coded_height"].Int(),
                      (Trace("pic_height_in_map_units_minus1", -1) + 1) * 16 * (2 - Trace("frame_mbs_only_flag", -1)))
                << input;
            EXPECT_EQ(sps["width"].Scalar() + "x" + sps["height"].Scalar() + " " + sps["sar_num"].Scalar() + ":" +
                          sps["sar_den"].Scalar(),
                      facts.at("width") + "x" + facts.at("height") + " " + facts.at("sample_aspect_ratio"))
                << input;
            EXPECT_EQ(run.json["pix_fmt"].text, facts.at("pix_fmt")) << input;
            // The documented tool on the same unit, beside it: its coded width is its own reading.
            EXPECT_EQ(run.json["sps_tool"]["profile_idc"].Int(), Trace("profile_idc", -1)) << input;
        }
    }
}

TEST(CliSps, HostileInputsEndInOneLine)
{
    TempDir dir;
    std::ofstream(dir / "long.bin", std::ios::binary) << std::string(100000, '\x11');
    std::ofstream(dir / "empty.bin", std::ios::binary);
    const Bytes sps = {0x67, 0x42, 0xC0, 0x0C, 0xD9, 0x02, 0xC4, 0xEC, 0x04, 0x40, 0x00,
                       0x00, 0x03, 0x00, 0x40, 0x00, 0x00, 0x0C, 0x83, 0xC5, 0x0A, 0x92};
    std::ofstream(dir / "raw.sps", std::ios::binary).write(reinterpret_cast<const char *>(sps.data()), 22);
    const struct {
        std::vector<std::string> args;
        int iStatus;
        std::string text;
    } kCases[] = {
        {{"sps"}, 2, "needs one file or hex string"},
        {{"sps", "67", "68"}, 2, "needs one file or hex string"},
        {{"sps", "--stream", "x", "67"}, 2, "bad option"},
        {{"sps", "67 64 0"}, 1, "as hex an odd number of digits (5)"},
        {{"sps", "00 00 01 68 ce 38 80"}, 1, "no SPS NAL unit in the hex bytes (7 bytes)"},
        {{"sps", "01 64 00 0a ff e1 00 40 67"}, 1, "no SPS NAL unit in the hex bytes"}, // the record's SPS runs out
        {{"sps", "67"}, 1, "the full SPS parse failed: truncated"},
        {{"sps", "00:00:00:01:67:64"}, 1, "the full SPS parse failed: truncated"},
        {{"sps", "6764000a00"}, 1, "the full SPS parse failed"},
        {{"sps", "not-hex-and-no-file"}, 1, "No such file or directory"},
        {{"sps", dir / "long.bin"}, 1, "too long for parameter-set bytes"},
        {{"sps", dir / "empty.bin"}, 1, "the input is empty"},
        {{"sps", Data("samples/aac_lc.m4a")}, 1, "stream 0 is aac"},
        {{"sps", "--stream", "3", Data("samples/h264_high.mp4")}, 1, "no stream 3"},
        {{"sps", Data("samples/h264_high.mp4")}, 0, "High, level 13, 320x240 (coded 320x240), SAR 1:1, yuv420p"},
        {{"sps", dir / "raw.sps"}, 0, "SPS from the file (SPS NAL unit), 22 bytes"},
    };
    for (const auto &c : kCases) {
        const Outcome run = Vorcal(c.args);
        EXPECT_EQ(run.iStatus, c.iStatus) << ::testing::PrintToString(c.args) << run.err;
        EXPECT_NE((c.iStatus ? run.err : run.out).find(c.text), std::string::npos)
            << ::testing::PrintToString(c.args) << "\n" << run.err;
        if (c.iStatus == 1) {
            EXPECT_EQ(run.ErrLines(), 1u) << run.err;
        }
    }
    // Every cut and every flipped byte of a real SPS: a record or one line of error, never more.
    for (const char *pRecord : {"h264/fullrange_64x48.avcc", "hevc/main10_64x48.hvcc"}) {
        const Outcome ref = Vorcal({"sps", "--json", Data(pRecord)});
        std::string hex = ref.json["sps_bytes"].text;
        hex.erase(std::remove(hex.begin(), hex.end(), ' '), hex.end());
        for (size_t uCut = 2; uCut < hex.size(); uCut += 2) {
            const Outcome run = Vorcal({"sps", hex.substr(0, uCut)});
            EXPECT_EQ(run.ErrLines(), run.iStatus == 1 ? 1u : 0u) << hex.substr(0, uCut) << run.err;
            EXPECT_TRUE(run.iStatus == 0 || run.iStatus == 1) << hex.substr(0, uCut);
            if (uCut < 20) {
                EXPECT_EQ(run.iStatus, 1) << hex.substr(0, uCut);
            }
            std::string flipped = hex;
            flipped[uCut] = flipped[uCut] == 'f' ? '0' : 'f';
            const Outcome bad = Vorcal({"sps", flipped});
            EXPECT_EQ(bad.ErrLines(), bad.iStatus == 1 ? 1u : 0u) << flipped << bad.err;
        }
    }
}

// ---- aac against ffprobe -------------------------------------------------------------------------

TEST(CliAac, SummariesMatchFfprobe)
{
    TempDir dir;
    // Silence files of the layer: ffprobe reports HE-AAC 44100 Hz 2 ch and HE-AACv2 44100 Hz 2 ch.
    ASSERT_EQ(Vorcal({"silence", "--codec", "he-aac", "--frames", "9", "-o", dir / "he.aac"}).iStatus, 0);
    ASSERT_EQ(Vorcal({"silence", "--codec", "he-aacv2", "--frames", "9", "-o", dir / "v2.aac"}).iStatus, 0);
    const struct {
        std::string file;
        const char *pSidecar; // ffprobe JSON in tests/data/samples, else the values below
        std::string summary;  // profile sample_rate channels sbr ps core_sample_rate core_channels
        std::string frames;   // nb_frames parsed_to_end, when there is no sidecar
    } kCases[] = {
        {Data("heaac/bear_v1_implicit.aac"), "heaac_implicit.json", "HE-AAC 44100 2 implicit none 22050 2", ""},
        {Data("heaac/bear_v1_aot5.mp4"), "heaac_aot5.json", "HE-AAC 44100 2 explicit none 22050 2", ""},
        {Data("samples/aac_lc.m4a"), "aac_lc.m4a.json", "LC 44100 2 none none 44100 2", ""},
        {Data("aac/tools_44100_2ch.aac"), nullptr, "LC 44100 2 none none 44100 2", "45 45"},
        {Data("aac/main_44100_2ch.aac"), nullptr, "Main 44100 2 none none 44100 2", "19 19"},
        {dir / "he.aac", nullptr, "HE-AAC 44100 2 implicit none 22050 2", "9 9"},
        {dir / "v2.aac", nullptr, "HE-AACv2 44100 2 implicit implicit 22050 1", "9 9"},
    };
    for (const auto &c : kCases) {
        const Outcome run = Vorcal({"aac", "--json", "--frames", c.file});
        ASSERT_EQ(run.iStatus, 0) << c.file << run.err;
        const Json &s = run.json["stream"];
        EXPECT_EQ(s["profile"].text + " " + s["sample_rate"].text + " " + s["channels"].Scalar() + " " + s["sbr"].text +
                      " " + s["ps"].text + " " + s["core_sample_rate"].Scalar() + " " + s["core_channels"].Scalar(),
                  c.summary)
            << c.file;
        EXPECT_EQ(s["parsed_to_end"].Scalar(), s["nb_frames"].text) << c.file;
        if (!c.pSidecar) {
            EXPECT_EQ(s["nb_frames"].text + " " + s["parsed_to_end"].Scalar(), c.frames) << c.file;
            continue;
        }
        Json ref;
        ASSERT_TRUE(Json::Parse(ReadText(Data(std::string("samples/") + c.pSidecar)), ref));
        const Json &packets = ref["packets"];
        ASSERT_EQ(run.json["frames"].items.size(), packets.items.size()) << c.file;
        int64_t iBytes = 0;
        for (size_t i = 0; i < packets.items.size(); ++i) {
            const Json &f = run.json["frames"][i];
            EXPECT_EQ(f["size"].Scalar(), packets[i]["size"].Scalar()) << c.file << " frame " << i;
            // Parsed to its end: what is left after the last ID_END is byte padding.
            EXPECT_EQ((f["bits"].Int() + 7) / 8, f["frame_bytes"].Int()) << c.file << " frame " << i;
            EXPECT_EQ(f["elements"]["END"].Int(), 1) << c.file << " frame " << i;
            EXPECT_EQ(f["sbr"].Int(), s["sbr"].text == "none" ? 0 : 1) << c.file << " frame " << i;
            iBytes += f["size"].Int();
        }
        EXPECT_EQ(s["bytes"].Int(), iBytes) << c.file;
    }
}

// A configuration in front of raw frames tells SBR and PS explicitly (object type 5, or the
// sync extensions behind an AAC-LC configuration), or rules SBR out; without one, the frames tell.
TEST(CliAac, ExplicitSignallingOfTheConfiguration)
{
    // The HE-AAC clip's raw frames (core 22050 Hz stereo, SBR in every frame) in a dump.
    const Bytes movie = ReadBytes(Data("heaac/bear_v1_aot5.mp4"));
    const Outcome frames = Vorcal({"frames", "--json", Data("heaac/bear_v1_aot5.mp4")});
    ASSERT_FALSE(frames.json["frames"].items.empty());
    auto LcConfig = [](int iSync) { // AAC-LC, 22050 Hz, 2 channels; then sync extensions
        vorcal::test::BitWriter bits;
        bits.Put(2, 5).Put(7, 4).Put(2, 4).Put(0, 3);
        if (iSync >= 0)
            bits.Put(0x2B7, 11).Put(5, 5).Put(iSync > 0, 1);
        if (iSync > 0)
            bits.Put(4, 4); // 44100 Hz
        if (iSync > 1)
            bits.Put(0x548, 11).Put(1, 1);
        return bits.Align().Bytes();
    };
    const struct {
        Bytes config;
        std::string expected; // profile sample_rate channels sbr ps
    } kCases[] = {
        {ReadBytes(Data("heaac/bear_v1_aot5.asc")), "HE-AAC 44100 2 explicit none"},
        {LcConfig(-1), "HE-AAC 44100 2 implicit none"},
        {LcConfig(1), "HE-AAC 44100 2 explicit none"},
        {LcConfig(2), "HE-AACv2 44100 2 explicit explicit"},
        {LcConfig(0), "LC 22050 2 none none"},
    };
    TempDir dir;
    for (const auto &c : kCases) {
        {
            std::ofstream out(dir / "heaac.dump", std::ios::binary);
            auto Record = [&](const uint8_t *p, size_t uSize) {
                const uint32_t uLen = static_cast<uint32_t>(uSize);
                out.write(reinterpret_cast<const char *>(&uLen), 4).write(reinterpret_cast<const char *>(p), uLen);
            };
            Record(c.config.data(), c.config.size());
            for (const Json &f : frames.json["frames"].items)
                Record(movie.data() + f["offset"].Int(), static_cast<size_t>(f["size"].Int()));
        }
        const Outcome run = Vorcal({"aac", "--json", dir / "heaac.dump"});
        EXPECT_EQ(run.iStatus, 0) << run.err;
        const Json &s = run.json["stream"];
        EXPECT_EQ(s["profile"].text + " " + s["sample_rate"].text + " " + s["channels"].Scalar() + " " + s["sbr"].text +
                      " " + s["ps"].text,
                  c.expected)
            << ::testing::PrintToString(c.config);
    }
}

TEST(CliAac, FramesThatDoNotParseToTheirEndEndInOneLine)
{
    TempDir dir;
    // Every payload byte of a real ADTS stream scrambled, headers kept; then the same stream cut
    // inside its last frame.
    Bytes adts = ReadBytes(Data("aac/tools_44100_2ch.aac"));
    uint32_t uSeed = 1;
    for (size_t p = 0; p + 7 <= adts.size();) {
        const size_t uLen = (size_t{adts[p + 3] & 3u} << 11) | (size_t{adts[p + 4]} << 3) | (adts[p + 5] >> 5);
        for (size_t i = p + 9; i < p + uLen && i < adts.size(); ++i)
            adts[i] = static_cast<uint8_t>((uSeed = uSeed * 1103515245u + 12345u) >> 24);
        p += uLen;
    }
    std::ofstream(dir / "scrambled.aac", std::ios::binary)
        .write(reinterpret_cast<const char *>(adts.data()), static_cast<std::streamsize>(adts.size()));
    const Bytes clean = ReadBytes(Data("aac/tools_44100_2ch.aac"));
    std::ofstream(dir / "cut.aac", std::ios::binary)
        .write(reinterpret_cast<const char *>(clean.data()), static_cast<std::streamsize>(clean.size() - 50));
    const struct {
        std::vector<std::string> args;
        int iStatus;
        std::string text;
    } kCases[] = {
        {{"aac", dir / "scrambled.aac"}, 1, "offset 0: frame 0: "},
        {{"aac", dir / "scrambled.aac"}, 1, "45 of 45 frames did not parse to their end"},
        {{"aac", dir / "cut.aac"}, 1, "truncated"},
        {{"aac", Data("aac/surround_48000_6ch.aac")}, 1, "frame 0: refused; 13 of 13"},
        {{"aac", Data("samples/h264_high.mp4")}, 1, "stream 0 is h264, not AAC"},
        {{"aac", "--stream", "1", Data("samples/aac_lc.m4a")}, 1, "no stream 1"},
        {{"aac", Data("samples/amr_nb.amr")}, 1, "stream 0 is amr_nb, not AAC"},
        {{"aac"}, 2, "needs one file"},
        {{"aac", "--bogus", "x"}, 2, "bad option"},
    };
    for (const auto &c : kCases) {
        const Outcome run = Vorcal(c.args);
        EXPECT_EQ(run.iStatus, c.iStatus) << ::testing::PrintToString(c.args) << run.err;
        EXPECT_NE(run.err.find(c.text), std::string::npos) << ::testing::PrintToString(c.args) << "\n" << run.err;
        if (c.iStatus == 1) {
            EXPECT_EQ(run.ErrLines(), 1u) << run.err;
        }
    }
    const Outcome json = Vorcal({"aac", "--json", Data("aac/surround_48000_6ch.aac")});
    EXPECT_EQ(json.json["stream"]["results"]["refused"].Int(), 13);
}

// ---- HEVC ------------------------------------------------------------------------------------

std::vector<std::string> HevcFixtures()
{
    std::vector<std::string> names;
    for (const auto &entry : std::filesystem::directory_iterator(Data("hevc")))
        if (entry.path().extension() == ".probe")
            names.push_back(entry.path().stem().string());
    std::sort(names.begin(), names.end());
    return names;
}

// The units of an hvcC record.
std::vector<Bytes> RecordUnits(const Bytes &record)
{
    std::vector<Bytes> units;
    CALHEVCNAL u{};
    while (vorCALTools_HEVC_NextHvcCNAL(record.data(), static_cast<int32_t>(record.size()), &u) == 1)
        units.emplace_back(u.pUnit, u.pUnit + u.iLen);
    return units;
}

TEST(CliHevc, ProbeAndSpsMatchTheFixtureSidecars)
{
    const std::vector<std::string> names = HevcFixtures();
    ASSERT_GE(names.size(), 8u);
    for (const std::string &name : names) {
        const auto facts = vorcal::test::ReadProbe(name);
        // The elementary stream through probe, its record through sps.
        const Outcome probe = Vorcal({"probe", "--json", Data("hevc/" + name + ".hevc")});
        const Outcome sps = Vorcal({"sps", "--json", Data("hevc/" + name + ".hvcc")});
        ASSERT_EQ(probe.iStatus + sps.iStatus, 0) << name << probe.err << sps.err;
        const Json &stream = probe.json["streams"][0];
        EXPECT_EQ(stream["codec_name"].text + " " + stream["framing"].text, "hevc annexb") << name;
        for (const char *pKey : {"profile", "level", "width", "height", "coded_width", "coded_height", "pix_fmt",
                                 "sample_aspect_ratio", "color_range", "color_space", "color_transfer",
                                 "color_primaries"}) {
            EXPECT_EQ(stream[pKey].Scalar(), facts.at(pKey)) << name << " " << pKey;
            EXPECT_EQ(sps.json[pKey].Scalar(), facts.at(pKey)) << name << " " << pKey;
        }
        const Json &s = sps.json["sps"];
        auto Trace = [&](const char *pName) { return std::stoll(facts.at(std::string("sps.") + pName)); };
        EXPECT_EQ(s["general_profile_idc"].Int(), Trace("general_profile_idc")) << name;
        EXPECT_EQ(s["coded_width"].Int(), Trace("pic_width_in_luma_samples")) << name;
        EXPECT_EQ(s["bit_depth_chroma"].Int(), Trace("bit_depth_chroma_minus8") + 8) << name;
        EXPECT_EQ(s["log2_max_pic_order_cnt_lsb"].Int(), Trace("log2_max_pic_order_cnt_lsb_minus4") + 4) << name;
    }
    // The MP4s: the sample entry, the record's length size, the report's header lines.
    for (const char *pName : {"main_176x144", "decode_128x96"}) {
        const Outcome run = Vorcal({"probe", "--json", Data(std::string("hevc/") + pName + ".mp4")});
        ASSERT_EQ(run.iStatus, 0) << run.err;
        const auto report = TextSidecar(Data(std::string("hevc/") + pName + ".nal.txt"));
        const Json &stream = run.json["streams"][0];
        EXPECT_EQ(stream["codec_tag_string"].text, std::string(pName) == "main_176x144" ? "hev1" : "hvc1");
        EXPECT_EQ(stream["framing"].text + " " + stream["nal_length_size"].Scalar(), "length-prefixed 4");
        EXPECT_EQ(stream["extradata_size"].Int(),
                  static_cast<int64_t>(ReadBytes(Data(std::string("hevc/") + pName + ".hvcc")).size()));
        for (const char *pKey : {"width", "height", "profile", "level"}) {
            EXPECT_EQ(stream[pKey].Scalar(), report.at(pKey)) << pName << " " << pKey;
        }
        EXPECT_EQ(stream["nb_frames"].Scalar(), report.at("frames")) << pName;
    }
}

// The reports' "frame OFFSET SIZE PICT_TYPE KEY" lines. Those of the MP4s have offsets into the
// samples concatenated (S.nal), so only sizes count there. ffmpeg's parser leaves the zero_byte
// of an access unit's start code at the end of the packet before; the tool gives it to the
// access unit it begins (ITU-T H.265 B.2), which then starts a byte earlier.
TEST(CliHevc, FramesMatchFfprobePackets)
{
    for (const char *pFile : {"hevc/main_176x144.hevc", "hevc/main_176x144.mp4", "hevc/decode_128x96.mp4"}) {
        const std::string file = pFile;
        const bool bMp4 = file.ends_with(".mp4");
        const Outcome run = Vorcal({"frames", "--json", Data(file)});
        ASSERT_EQ(run.iStatus, 0) << file << run.err;
        std::istringstream in(ReadText(Data(bMp4 ? file.substr(0, file.size() - 4) + ".nal.txt" : file + ".txt")));
        size_t i = 0;
        int64_t iEnd = 0;
        for (std::string word, type; in >> word;) {
            int64_t iAt = 0, iSize = 0, iKey = 0;
            if (word != "frame" || !(in >> iAt >> iSize >> type >> iKey)) {
                std::getline(in, word);
                continue;
            }
            const Json &f = run.json["frames"][i++];
            EXPECT_EQ(f["pict_type"].text + f["key"].Scalar(), type + std::to_string(iKey)) << file << " " << i - 1;
            if (bMp4) {
                EXPECT_EQ(f["size"].Int(), iSize) << file << " " << i - 1;
                EXPECT_EQ(f["sync"].Int(), iKey) << file << " " << i - 1;
            } else {
                EXPECT_TRUE(f["offset"].Int() == iAt || f["offset"].Int() == iAt - 1) << file << " " << i - 1;
                iEnd = f["offset"].Int() + f["size"].Int();
            }
            EXPECT_EQ(f["format_agrees"].Scalar(), "true") << file << " " << i - 1;
        }
        EXPECT_EQ(i, run.json["frames"].items.size()) << file;
        if (!bMp4) {
            EXPECT_EQ(iEnd, static_cast<int64_t>(ReadBytes(Data(file)).size()));
        }
    }
    // The walk by Table 7-1 names: an IRAP access unit of the session stream.
    const Outcome run = Vorcal({"frames", Data("hevc/main_176x144.hevc")});
    EXPECT_NE(run.out.find("AUD_NUT,VPS_NUT,SPS_NUT,PPS_NUT,PREFIX_SEI_NUT,PREFIX_SEI_NUT,PREFIX_SEI_NUT,"
                           "CRA_NUT,CRA_NUT,SUFFIX_SEI_NUT\n"),
              std::string::npos)
        << run.out;
}

TEST(CliHevc, ConvertWritesTheFiltersUnitsAndTheStreamThatDecodedToTheMp4sFrames)
{
    TempDir dir;
    // hev1: the record's units, then every sample behind start codes: ffmpeg's hevc_mp4toannexb
    // output unit for unit, less the copies of the record it puts in front of each IRAP slice.
    ASSERT_EQ(Vorcal({"convert", Data("hevc/main_176x144.mp4"), dir / "m.hevc", "--to", "annexb"}).iStatus, 0);
    const std::vector<Bytes> record = RecordUnits(ReadBytes(Data("hevc/main_176x144.hvcc")));
    const std::vector<Bytes> filtered = vorcal::test::HevcUnits(ReadBytes(Data("hevc/main_176x144.mp4toannexb.hevc")));
    ASSERT_EQ(record.size(), 3u);
    std::vector<Bytes> expected = record;
    size_t uCopies = 0;
    auto Irap = [](const Bytes &u) {
        return (u[0] >> 1) >= CAL_HEVC_NAL_BLA_W_LP && (u[0] >> 1) <= CAL_HEVC_NAL_RSV_IRAP_VCL23;
    };
    for (size_t i = 0; i < filtered.size(); ++i) {
        const auto at = filtered.begin() + static_cast<ptrdiff_t>(i);
        if (i + 3 < filtered.size() && std::equal(record.begin(), record.end(), at) && Irap(filtered[i + 3])) {
            i += 2;
            ++uCopies;
            continue;
        }
        expected.push_back(filtered[i]);
    }
    EXPECT_EQ(uCopies, 2u);
    EXPECT_EQ(vorcal::test::HevcUnits(ReadBytes(dir / "m.hevc")), expected);

    // hvc1: the very stream fixtures-hevc.sh decoded with ffmpeg to the MP4's frames.
    ASSERT_EQ(Vorcal({"convert", Data("hevc/decode_128x96.mp4"), dir / "d.hevc", "--to", "annexb"}).iStatus, 0);
    std::istringstream decode(ReadText(Data("hevc/decode_128x96.decode.txt")));
    std::string sum;
    for (std::string line; std::getline(decode, line);)
        if (line.starts_with("annexb "))
            sum = line.substr(7);
    EXPECT_EQ(vorcal::test::Sum(ReadBytes(dir / "d.hevc")), sum);

    // The elementary stream to a dump of length-prefixed frames behind an hvcC record, and with
    // the in-band parameter sets cut: the dump reads back as the same pictures.
    const Outcome convert =
        Vorcal({"convert", Data("hevc/main_176x144.hevc"), dir / "m.dump", "--to", "length", "--strip-ps"});
    ASSERT_EQ(convert.iStatus, 0) << convert.err;
    const Outcome es = Vorcal({"frames", "--json", Data("hevc/main_176x144.hevc")});
    const Outcome dump = Vorcal({"frames", "--json", dir / "m.dump"});
    ASSERT_EQ(dump.iStatus, 0) << dump.err;
    ASSERT_EQ(dump.json["frames"].items.size(), 12u);
    for (size_t i = 0; i < 12; ++i) {
        const Json &a = es.json["frames"][i], &b = dump.json["frames"][i];
        EXPECT_EQ(b["pict_type"].text + b["key"].Scalar(), a["pict_type"].text + a["key"].Scalar()) << i;
        EXPECT_LE(b["nal_unit_types"][0].Int(), 31) << i << " " << b["nal_unit_names"][0].text; // a slice first
    }
}

// ---- the command line ----------------------------------------------------------------------

TEST(CliUsage, ExitCodesAndMessages)
{
    const struct {
        std::vector<std::string> args;
        int iStatus;
        const char *pText; // in standard error, or in standard output for status 0
    } kCases[] = {
        {{}, 2, "no verb given"},
        {{"frobnicate"}, 2, "unknown verb frobnicate"},
        {{"--frob"}, 2, "unknown option --frob"},
        {{"probe"}, 2, "usage: vorcal probe"},
        {{"probe", "--bogus", "x"}, 2, "bad option --bogus"},
        {{"frames", "a", "b"}, 2, "needs one file"},
        {{"convert", "a", "b"}, 2, "needs --to"},
        {{"convert", "a", "b", "--to", "mp4"}, 2, "bad option"},
        {{"replay", "x", "--to", "annexb"}, 2, "bad option"},
        {{"dump", "--wait", "x", "f"}, 2, "bad option"},
        {{"help", "nosuch"}, 2, "no verb nosuch"},
        {{"help", "convert"}, 0, "usage: vorcal convert"},
        {{"silence", "--help"}, 0, "usage: vorcal silence"},
        {{"--help"}, 0, "verbs:"},
        {{"--version"}, 0, "0x00000001.0x00000001.0x00000002."},
        {{"probe", "/nonexistent/file"}, 1, "vorcal: /nonexistent/file: No such file or directory"},
        {{"dump", "/"}, 1, "vorcal: /: is a directory"},
    };
    for (const auto &c : kCases) {
        const Outcome run = Vorcal(c.args);
        EXPECT_EQ(run.iStatus, c.iStatus) << ::testing::PrintToString(c.args);
        const std::string &where = c.iStatus == 0 ? run.out : run.err;
        EXPECT_NE(where.find(c.pText), std::string::npos) << ::testing::PrintToString(c.args) << "\n" << where;
        if (c.iStatus == 1) {
            EXPECT_EQ(run.ErrLines(), 1u) << run.err;
        }
    }
}

} // namespace
