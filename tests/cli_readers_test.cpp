// The vorcal tool's readers: format detection, the ISO BMFF sample-table reader on hand-built
// and hostile movies, elementary streams and dumps read through a pipe that delivers a few bytes
// at a time, and the JSON writer's escaping.
#include <algorithm>
#include <array>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <functional>
#include <iterator>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "json.hpp"
#include "media.hpp"

namespace {

using namespace vorcal::cli;
using Bytes = std::vector<uint8_t>;

Bytes ReadFile(const std::string &name)
{
    std::ifstream in(std::string(VORCAL_TEST_DATA_DIR) + "/" + name, std::ios::binary);
    return Bytes(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

Bytes Be32(uint32_t v)
{
    return {static_cast<uint8_t>(v >> 24), static_cast<uint8_t>(v >> 16), static_cast<uint8_t>(v >> 8),
            static_cast<uint8_t>(v)};
}

Bytes Cat(std::initializer_list<Bytes> parts)
{
    Bytes out;
    for (const Bytes &part : parts)
        out.insert(out.end(), part.begin(), part.end());
    return out;
}

Bytes Box(const char *pType, const Bytes &payload)
{
    Bytes box(8 + payload.size());
    const Bytes size = Be32(static_cast<uint32_t>(box.size()));
    std::copy(size.begin(), size.end(), box.begin());
    std::copy(pType, pType + 4, box.begin() + 4);
    std::copy(payload.begin(), payload.end(), box.begin() + 8);
    return box;
}

// A full box's version and flags, then 32-bit fields.
Bytes Full(std::initializer_list<uint32_t> fields)
{
    Bytes out(4, 0);
    for (uint32_t v : fields)
        out = Cat({out, Be32(v)});
    return out;
}

struct Movie {
    std::vector<uint32_t> sizes = {5, 7, 6};
    std::vector<uint32_t> chunkOffsets; // default: one chunk at the mdat payload
    std::vector<std::array<uint32_t, 3>> runs = {{1, 3, 1}};
    std::vector<uint32_t> syncs = {1};
    uint32_t uFixedSize = 0;
    uint32_t uSampleCount = 0; // default: sizes.size()
    uint8_t uLengthSizeByte = 0xFF; // avcC byte 4: lengthSizeMinusOne in its low bits
};

// ftyp, moov (one avc1 track with avcC and the sample tables), mdat holding the samples.
Bytes BuildMovie(const Movie &m)
{
    const Bytes avcC = {1, 0x64, 0, 0x1F, m.uLengthSizeByte, 0xE1, 0, 4, 0x67, 0x64, 0, 0x1F, 1, 0, 1, 0x68};
    Bytes visual(78, 0);
    visual[7] = 1;                           // data_reference_index
    visual[24] = 0x01, visual[25] = 0x40;    // width 320
    visual[26] = 0x00, visual[27] = 0xF0;    // height 240
    const Bytes stsd = Box("stsd", Cat({Full({1}), Box("avc1", Cat({visual, Box("avcC", avcC)}))}));
    Bytes stszBody = Full({m.uFixedSize, m.uSampleCount ? m.uSampleCount : static_cast<uint32_t>(m.sizes.size())});
    if (!m.uFixedSize)
        for (uint32_t v : m.sizes)
            stszBody = Cat({stszBody, Be32(v)});
    Bytes stscBody = Full({static_cast<uint32_t>(m.runs.size())});
    for (const auto &run : m.runs)
        stscBody = Cat({stscBody, Be32(run[0]), Be32(run[1]), Be32(run[2])});
    Bytes stssBody = Full({static_cast<uint32_t>(m.syncs.size())});
    for (uint32_t v : m.syncs)
        stssBody = Cat({stssBody, Be32(v)});
    Bytes mdatBody;
    for (uint32_t v : m.sizes)
        mdatBody.insert(mdatBody.end(), v, static_cast<uint8_t>(v));
    const Bytes ftyp = Box("ftyp", Cat({{'i', 's', 'o', 'm'}, Be32(0), {'i', 's', 'o', 'm'}}));
    // The chunk offsets depend on the moov size: build twice.
    Bytes movie;
    uint32_t uMdat = 0;
    for (int pass = 0; pass < 2; ++pass) {
        std::vector<uint32_t> chunks = m.chunkOffsets.empty() ? std::vector<uint32_t>{uMdat} : m.chunkOffsets;
        Bytes stcoBody = Full({static_cast<uint32_t>(chunks.size())});
        for (uint32_t v : chunks)
            stcoBody = Cat({stcoBody, Be32(v)});
        const Bytes stbl = Box("stbl", Cat({stsd, Box("stsz", stszBody), Box("stsc", stscBody), Box("stco", stcoBody),
                                            Box("stss", stssBody)}));
        const Bytes mdia = Box("mdia", Cat({Box("mdhd", Full({0, 0, 90000, 0, 0})),
                                            Box("hdlr", Cat({Full({0}), {'v', 'i', 'd', 'e'}, Bytes(12, 0)})),
                                            Box("minf", stbl)}));
        const Bytes moov = Box("moov", Box("trak", Cat({Box("tkhd", Full({0, 0, 1, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0})),
                                                        mdia})));
        movie = Cat({ftyp, moov, Box("mdat", mdatBody)});
        uMdat = static_cast<uint32_t>(ftyp.size() + moov.size() + 8);
    }
    return movie;
}

// Opens the bytes as an input and reads every packet of every stream; the failure text, or ""
// when all went well. Packets are collected when a list is given.
std::string ReadAll(const Bytes &bytes, bool bSeekable = true, size_t uMaxRead = SIZE_MAX,
                    std::vector<Packet> *pPackets = nullptr, std::string *pNotice = nullptr)
{
    Failure failure;
    std::unique_ptr<MediaFile> file =
        MediaFile::Open(Input::FromMemory(bytes.data(), bytes.size(), bSeekable, uMaxRead), failure);
    if (!file)
        return failure.text.empty() ? "no failure text" : failure.text;
    if (pNotice)
        *pNotice = file->Notice().text;
    for (size_t i = 0; i < file->Streams().size(); ++i) {
        std::unique_ptr<PacketReader> reader = file->Packets(i);
        Packet packet;
        ReadResult r;
        while ((r = reader->Next(packet, failure)) == ReadResult::Packet)
            if (pPackets)
                pPackets->push_back(packet);
        if (r == ReadResult::Error)
            return failure.text.empty() ? "no failure text" : failure.text;
    }
    return "";
}

TEST(CliMp4, HandBuiltMovieGivesItsSamples)
{
    Movie m;
    m.sizes = {5, 7, 6, 4};
    m.runs = {{1, 3, 1}, {2, 1, 1}};
    m.syncs = {1, 4};
    m.chunkOffsets = {0, 0}; // same table size as below, to learn where mdat lands
    const size_t uMdat = BuildMovie(m).size() - 22;
    m.chunkOffsets = {static_cast<uint32_t>(uMdat), static_cast<uint32_t>(uMdat + 18)};
    m.uLengthSizeByte = 0xFD; // 2-byte NAL lengths
    std::vector<Packet> packets;
    ASSERT_EQ(ReadAll(BuildMovie(m), true, SIZE_MAX, &packets), "");
    Failure failure;
    const Bytes movie = BuildMovie(m);
    const auto file = MediaFile::Open(Input::FromMemory(movie.data(), movie.size()), failure);
    ASSERT_TRUE(file);
    EXPECT_EQ(file->Streams()[0].uNalLengthSize, 2u);
    EXPECT_EQ(file->Streams()[0].uWidth * 1000 + file->Streams()[0].uHeight, 320240u);
    ASSERT_EQ(packets.size(), 4u);
    const uint32_t kSizes[] = {5, 7, 6, 4};
    const int kSync[] = {1, 0, 0, 1};
    uint64_t uOffset = uMdat;
    for (size_t i = 0; i < 4; ++i) {
        EXPECT_EQ(packets[i].uOffset, uOffset) << i;
        EXPECT_EQ(packets[i].data, Bytes(kSizes[i], static_cast<uint8_t>(kSizes[i]))) << i;
        EXPECT_EQ(packets[i].iContainerSync, kSync[i]) << i;
        uOffset += kSizes[i];
    }
}

// Each case breaks one field of a good movie; the reader must stop with a message naming it.
struct Hostile {
    const char *pName;
    std::function<void(Movie &)> change;
    std::function<void(Bytes &)> patch;
    const char *pExpected;
};

// Overwrites 4 bytes at iAt counted from the first payload byte of the box (-8: its size).
void PatchBox(Bytes &b, const char *pType, ptrdiff_t iAt, uint32_t v)
{
    const auto it = std::search(b.begin(), b.end(), pType, pType + 4);
    ASSERT_NE(it, b.end()) << pType;
    const Bytes field = Be32(v);
    std::copy(field.begin(), field.end(), it + 4 + iAt);
}

class CliMp4Hostile : public ::testing::TestWithParam<Hostile> {};

TEST_P(CliMp4Hostile, StopsWithOneClearFailure)
{
    Movie m;
    if (GetParam().change)
        GetParam().change(m);
    Bytes movie = BuildMovie(m);
    if (GetParam().patch)
        GetParam().patch(movie);
    const std::string text = ReadAll(movie);
    EXPECT_NE(text.find(GetParam().pExpected), std::string::npos) << text;
    EXPECT_EQ(text.find('\n'), std::string::npos);
}

INSTANTIATE_TEST_SUITE_P(
    Cases, CliMp4Hostile,
    ::testing::Values(
        Hostile{"MoovLongerThanFile", nullptr, [](Bytes &b) { PatchBox(b, "moov", -8, 0x7FFFFFF0); },
                "truncated: box 'moov' claims"},
        Hostile{"ChildLongerThanParent", nullptr, [](Bytes &b) { PatchBox(b, "mdia", -8, 0x10000); },
                "box 'mdia' claims 65536 bytes, its parent has"},
        Hostile{"SizeBelowHeader", nullptr, [](Bytes &b) { PatchBox(b, "minf", -8, 4); }, "box 'minf' claims 4 bytes"},
        // Size 0 runs to the end of the parent: the boxes after 'stsz' disappear into it.
        Hostile{"ZeroSizeSwallowsTheRest", nullptr, [](Bytes &b) { PatchBox(b, "stsz", -8, 0); }, "no 'stco' box"},
        Hostile{"HugeFixedSampleCount", [](Movie &m) { m.uFixedSize = 1000, m.uSampleCount = 1000000; }, nullptr,
                "more than the file holds"},
        Hostile{"SizeTableBeyondBox", [](Movie &m) { m.uSampleCount = 0x40000000; }, nullptr,
                "'stsz' lists 1073741824 entries"},
        Hostile{"ChunkTableBeyondBox", nullptr, [](Bytes &b) { PatchBox(b, "stco", 4, 0x20000000); },
                "'stco' lists 536870912 entries"},
        Hostile{"RunsOutOfOrder", [](Movie &m) { m.runs = {{1, 1, 1}, {1, 2, 1}}; }, nullptr, "out of order"},
        Hostile{"FirstRunNotChunkOne", [](Movie &m) { m.runs = {{2, 3, 1}}; }, nullptr, "starts at chunk 2"},
        Hostile{"ChunkBeyondFile", [](Movie &m) { m.chunkOffsets = {0x7FFFFFFF}; }, nullptr,
                "beyond the end of the file"},
        Hostile{"TooFewChunks", [](Movie &m) { m.runs = {{1, 1, 1}}; }, nullptr, "place only 1 of the 3 samples"}),
    [](const auto &info) { return std::string(info.param.pName); });

TEST(CliMp4, StructuralRefusals)
{
    const Bytes ftyp = Box("ftyp", Bytes(8, 'x'));
    // mdia boxes nested inside each other far deeper than a track is.
    Bytes nested = Box("hdlr", Bytes(12, 0));
    for (int i = 0; i < 2000; ++i)
        nested = Box("mdia", nested);
    const struct {
        const char *pName;
        Bytes bytes;
        bool bSeekable;
        const char *pExpected;
    } kCases[] = {
        {"no moov", Cat({ftyp, Box("mdat", Bytes(100, 0))}), true, "no 'moov' box"},
        {"nested mdia", Cat({ftyp, Box("moov", Box("trak", nested))}), true, "nested inside themselves"},
        {"huge 64-bit size", Cat({ftyp, Be32(1), {'f', 'r', 'e', 'e'}, Be32(0x40000000), Be32(0), Bytes(8, 0)}), true,
         "claims 4611686018427387904 bytes"},
        {"truncated header", Cat({ftyp, Bytes{0, 0}}), true, "truncated box header"},
        {"pipe", BuildMovie(Movie{}), false, "give a file, not a pipe"},
        {"empty", Bytes{}, true, "the input is empty"},
        {"text", Bytes(100, 'a'), true, "unrecognised data"},
    };
    for (const auto &c : kCases) {
        const std::string text = ReadAll(c.bytes, c.bSeekable);
        EXPECT_NE(text.find(c.pExpected), std::string::npos) << c.pName << ": " << text;
    }
    // Movie fragments: the moov samples are read and the fragments are announced.
    std::string notice;
    EXPECT_EQ(ReadAll(Cat({BuildMovie(Movie{}), Box("moof", Bytes(16, 0))}), true, SIZE_MAX, nullptr, &notice), "");
    EXPECT_NE(notice.find("movie fragments ('moof') are not read"), std::string::npos);
}

TEST(CliDetect, FormatFromFirstBytes)
{
    const struct {
        Bytes bytes;
        bool bKnown;
        Format format;
    } kCases[] = {
        {Cat({Be32(24), {'f', 't', 'y', 'p'}}), true, Format::Mp4},
        {Cat({Be32(0), {'m', 'd', 'a', 't'}}), true, Format::Mp4},
        {{'#', '!', 'A', 'M', 'R', '\n', 0x3C}, true, Format::Amr},
        {{'#', '!', 'A', 'M', 'R', '-', 'W', 'B', '\n', 0x44}, true, Format::AmrWb},
        {{0, 0, 0, 1, 0x09, 0xF0, 0, 0, 0, 1, 0x67}, true, Format::AnnexB},
        {{0, 0, 1, 0x67, 0x42, 0, 0x1E, 0, 0, 1, 0x68}, true, Format::AnnexB},
        {{0, 0, 1, 0xB0, 0x01, 0, 0, 1, 0xB5}, true, Format::Mpeg4Visual},
        {{0, 0, 1, 0x00, 0, 0, 1, 0x20, 0x08}, true, Format::Mpeg4Visual},
        {{0, 0, 1, 0x20, 0x08, 0, 0, 1, 0xB6, 0x10}, true, Format::Mpeg4Visual}, // VOL first, a VOP later
        {{0, 0, 1, 0xB3, 0x14, 0, 0xF0}, true, Format::Mpeg12Video},
        {{0, 0, 1, 0x00, 0, 0x0F, 0, 0, 1, 0x01}, true, Format::Mpeg12Video},
        {{0, 0, 0x80, 0x02, 0x08}, true, Format::H263},
        {{0xFF, 0xF1, 0x50, 0x80, 0x01, 0x1F, 0xFC, 0, 0xFF, 0xF1}, true, Format::Adts},
        {Cat({{'I', 'D', '3', 4, 0, 0, 0, 0, 0, 2, 0, 0}, {0xFF, 0xF1, 0x50, 0x80, 0x00, 0xFF, 0xFC}}), true, Format::Adts},
        {{2, 0, 0, 0, 0xAA, 0xBB, 1, 0, 0, 0, 0xCC}, true, Format::Dump},
        {{2, 0, 0, 0, 0xAA}, false, Format::Dump}, // a dump cut short is no dump by its looks
        {{'h', 'e', 'l', 'l', 'o'}, false, Format::Dump},
        {{0xFF, 0xF1, 0x50, 0x80, 0x01, 0x1F, 0xFC, 0, 0x12, 0x34}, false, Format::Dump}, // no second sync
    };
    for (const auto &c : kCases) {
        Format format = Format::Dump;
        const bool bKnown = DetectFormat(c.bytes.data(), c.bytes.size(), true, format);
        EXPECT_EQ(bKnown, c.bKnown) << ::testing::PrintToString(c.bytes);
        if (bKnown && c.bKnown) {
            EXPECT_EQ(static_cast<int>(format), static_cast<int>(c.format)) << ::testing::PrintToString(c.bytes);
        }
    }
}

// A stream read through a pipe that delivers a few bytes at a time splits into exactly the
// frames that the file gives.
TEST(CliStreams, PipeDeliveringFewBytesGivesTheSameFrames)
{
    const char *kFiles[] = {"h264/main_320x180.h264", "video/mpeg2.frames", "video/h263_qcif.frames",
                            "samples/mpeg4_asp.m4v", "samples/amr_nb.amr", "audio/adts-44100-2ch.aac",
                            "heaac/bear_v1_implicit.aac"};
    for (const char *pName : kFiles) {
        const Bytes bytes = ReadFile(pName);
        std::vector<Packet> whole;
        ASSERT_EQ(ReadAll(bytes, true, SIZE_MAX, &whole), "") << pName;
        ASSERT_GT(whole.size(), 4u) << pName;
        for (size_t uMaxRead : {1, 7, 4093}) {
            std::vector<Packet> piped;
            ASSERT_EQ(ReadAll(bytes, false, uMaxRead, &piped), "") << pName;
            ASSERT_EQ(piped.size(), whole.size()) << pName << " " << uMaxRead;
            for (size_t i = 0; i < whole.size(); ++i) {
                EXPECT_EQ(piped[i].uOffset, whole[i].uOffset) << pName << " frame " << i;
                EXPECT_EQ(piped[i].data, whole[i].data) << pName << " frame " << i;
            }
        }
    }
}

TEST(CliStreams, Id3TagsAroundAdtsAreSkipped)
{
    const Bytes adts = ReadFile("audio/adts-44100-2ch.aac");
    // An ID3v2.4 tag of 20 bytes with a footer in front, an ID3v1 tag behind.
    const Bytes front = Cat({{'I', 'D', '3', 4, 0, 0x10, 0, 0, 0, 20}, Bytes(20, 'x'), Bytes(10, 'f')});
    const Bytes back = Cat({{'T', 'A', 'G'}, Bytes(125, ' ')});
    std::vector<Packet> plain, tagged;
    ASSERT_EQ(ReadAll(adts, true, SIZE_MAX, &plain), "");
    ASSERT_EQ(ReadAll(Cat({front, adts, back}), false, 5, &tagged), "");
    ASSERT_EQ(tagged.size(), plain.size());
    for (size_t i = 0; i < plain.size(); ++i) {
        EXPECT_EQ(tagged[i].uOffset, plain[i].uOffset + front.size()) << i;
        EXPECT_EQ(tagged[i].data, plain[i].data) << i;
    }
}

TEST(CliStreams, BrokenStreamsStopAtTheirOffset)
{
    const Bytes adts = ReadFile("audio/adts-44100-2ch.aac");
    auto FrameLength = [&](size_t p) { return (size_t{adts[p + 3] & 3u} << 11) | (size_t{adts[p + 4]} << 3) | (adts[p + 5] >> 5); };
    const size_t uTwo = FrameLength(0) + FrameLength(FrameLength(0));
    const Bytes amr = ReadFile("samples/amr_nb.amr");
    const struct {
        const char *pName;
        Bytes bytes;
        bool bSeekable;
        const char *pExpected;
    } kCases[] = {
        {"adts cut", Bytes(adts.begin(), adts.end() - 5), true, "truncated: the ADTS frame has"},
        {"adts garbage", Cat({Bytes(adts.begin(), adts.begin() + static_cast<ptrdiff_t>(uTwo)), Bytes(40, 0x11)}), true, "no ADTS frame here"},
        {"amr cut", Bytes(amr.begin(), amr.end() - 3), true, "truncated: frame type 7 has 32 bytes, 29 are left"},
        {"amr reserved type", Cat({Bytes(amr.begin(), amr.begin() + 38), {0x4C}}), true, "frame type 9"},
        {"dump lies on a pipe", {0xFF, 0xFF, 0xFF, 0xFF, 'A', 'B', 'C', 'D'}, false, "longer than 64 MiB"},
        {"dump record cut", {3, 0, 0, 0, 1, 2, 3, 10, 0, 0, 0, 1, 2}, false, "record 1 has length 10 but only 2"},
        {"dump length cut", {1, 0, 0, 0, 9, 2, 0}, false, "has only 2 of the 4 bytes of its length"},
    };
    for (const auto &c : kCases) {
        Failure failure;
        std::unique_ptr<Input> input = Input::FromMemory(c.bytes.data(), c.bytes.size(), c.bSeekable);
        std::unique_ptr<MediaFile> file = std::string(c.pName).rfind("dump", 0) == 0
                                              ? MediaFile::OpenDump(std::move(input), failure)
                                              : MediaFile::Open(std::move(input), failure);
        if (file) {
            std::unique_ptr<PacketReader> reader = file->Packets(0);
            Packet packet;
            while (reader->Next(packet, failure) == ReadResult::Packet) {
            }
        }
        EXPECT_NE(failure.text.find(c.pExpected), std::string::npos) << c.pName << ": " << failure.text;
        EXPECT_TRUE(failure.bHasOffset) << c.pName;
    }
}

TEST(CliJson, EscapesWhatJsonRequires)
{
    const struct {
        std::string in, out;
    } kCases[] = {
        {"plain", "\"plain\""},
        {"a\"b\\c", "\"a\\\"b\\\\c\""},
        {"tab\tnl\ncr\r", "\"tab\\tnl\\ncr\\r\""},
        {std::string("\x01\x1f\x7f", 3), "\"\\u0001\\u001f\\u007f\""},
        {std::string("\0", 1), "\"\\u0000\""},
        {"caf\xc3\xa9 \xe2\x82\xac \xf0\x9f\x8e\xb5", "\"caf\xc3\xa9 \xe2\x82\xac \xf0\x9f\x8e\xb5\""},
        {"bad \xff \xc3 \xe0\x80\x80 \xed\xa0\x80 \xf4\x90\x80\x80",
         "\"bad \\ufffd \\ufffd \\ufffd\\ufffd\\ufffd \\ufffd\\ufffd\\ufffd \\ufffd\\ufffd\\ufffd\\ufffd\""},
    };
    for (const auto &c : kCases) {
        std::FILE *pOut = std::tmpfile();
        JsonWriter::WriteEscaped(pOut, c.in);
        std::rewind(pOut);
        std::string got;
        for (int ch; (ch = std::fgetc(pOut)) != EOF;)
            got += static_cast<char>(ch);
        std::fclose(pOut);
        EXPECT_EQ(got, c.out);
    }
}

} // namespace
