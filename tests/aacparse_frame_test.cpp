// The whole-frame AAC parser: hand-built frames for each result and framing, AudioSpecificConfig
// signalling, and real streams as the main oracle (every frame of every ffmpeg fixture parses
// to its exact end; the real HE-AAC clip is found to carry SBR in both of its forms).
#include <gtest/gtest.h>

#include <array>
#include <cstdint>
#include <cstring>
#include <fstream>
#include <iterator>
#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include <vorcal/aacparse.h>

#include "aac_writer.hpp"
#include "recording_sal.hpp"

namespace {

using namespace vorcal::test;
using Counts = std::array<uint32_t, 8>;
using Parser = std::unique_ptr<CALAACParser, decltype(&vorCALTools_AAC_DestroyParser)>;

Parser Make(const std::vector<uint8_t> *asc = nullptr)
{
    static const uint8_t kNone = 0; // an empty AudioSpecificConfig still selects raw access units
    return Parser(vorCALTools_AAC_CreateParser(asc ? (asc->empty() ? &kNone : asc->data()) : nullptr,
                                               asc ? int32_t(asc->size()) : 0),
                  vorCALTools_AAC_DestroyParser);
}

std::vector<uint8_t> ReadFile(const std::string &name)
{
    std::ifstream in(std::string(VORCAL_TEST_DATA_DIR "/") + name, std::ios::binary);
    return std::vector<uint8_t>((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
}
std::istringstream ReadText(const std::string &name)
{
    const std::vector<uint8_t> bytes = ReadFile(name);
    return std::istringstream(std::string(bytes.begin(), bytes.end()));
}

// ADTS frames of a stream, split by their 13-bit aac_frame_length.
std::vector<std::vector<uint8_t>> AdtsFrames(const std::vector<uint8_t> &s)
{
    std::vector<std::vector<uint8_t>> out;
    for (size_t pos = 0, len = 0; pos + 7 <= s.size(); pos += len) {
        len = ((s[pos + 3] & 3u) << 11) | (s[pos + 4] << 3) | (s[pos + 5] >> 5);
        out.emplace_back(s.begin() + long(pos), s.begin() + long(std::min(pos + len, s.size())));
    }
    return out;
}

// An ADTS header (profile LC) in front of raw data blocks, with the raw_data_block_position
// words and per-block CRC words when protected and several blocks are given.
std::vector<uint8_t> Adts(const std::vector<std::vector<uint8_t>> &blocks, uint32_t index = 4, uint32_t config = 1,
                          bool crc = false, int lengthDelta = 0)
{
    const bool blockCrc = crc && blocks.size() > 1;
    size_t len = (crc ? 9 : 7) + (blockCrc ? 2 * (blocks.size() - 1) + 2 * blocks.size() : 0);
    for (const auto &b : blocks)
        len += b.size();
    BitWriter w;
    w.Put(0xFFF, 12).Put(0, 1).Put(0, 2).Put(!crc, 1).Put(1, 2).Put(index, 4).Put(0, 1).Put(config, 3).Put(0, 4);
    w.Put(uint32_t(int(len) + lengthDelta), 13).Put(0x7FF, 11).Put(uint32_t(blocks.size() - 1), 2);
    w.Put(0xABCD, blockCrc ? 16 * uint32_t(blocks.size() - 1) : 0).Put(0x1234, crc ? 16 : 0);
    std::vector<uint8_t> out = w.Bytes();
    for (const auto &b : blocks) {
        out.insert(out.end(), b.begin(), b.end());
        if (blockCrc)
            out.insert(out.end(), {0x55, 0xAA});
    }
    return out;
}

// Elements of a raw data block: a single channel element with max_sfb 0, a channel pair of two,
// a coupling channel element id, a fill element, a program config element with one front
// channel pair; each block closes with ID_END and the byte alignment.
BitWriter &Sce(BitWriter &w, uint32_t tag = 0) { w.Put(0, 3).Put(tag, 4).Put(80, 8); PutLongInfo(w, 0); PutNoTools(w); return w; }
BitWriter &Cpe(BitWriter &w)
{
    w.Put(1, 3).Put(0, 4).Put(0, 1);
    for (int ch = 0; ch < 2; ++ch) {
        w.Put(80, 8);
        PutLongInfo(w, 0);
        PutNoTools(w);
    }
    return w;
}
std::vector<uint8_t> End(BitWriter &w) { return w.Put(7, 3).Align().Bytes(); }
std::vector<uint8_t> Mono() { BitWriter w; return End(Sce(w)); }

struct FrameCase {
    std::string name;
    std::vector<uint8_t> frame;
    int32_t result;
    Counts elements;
    int32_t bits = -1; // -1: every bit of the frame before its last byte's padding
};

void Check(CALAACParser *p, const FrameCase &c, uint32_t rate, uint32_t channels)
{
    SCOPED_TRACE(c.name);
    CALAACFrameInfo info;
    std::memset(&info, 0x5A, sizeof info);
    EXPECT_EQ(vorCALTools_AAC_ParseFrame(p, c.frame.data(), int32_t(c.frame.size()), &info), c.result);
    EXPECT_EQ(Counts(std::to_array(info.auElements)), c.elements);
    if (c.bits >= 0) {
        EXPECT_EQ(info.uBits, uint32_t(c.bits));
    }
    if (c.result == 0 || c.result == 5) {
        EXPECT_EQ(std::make_tuple(info.uSampleRate, info.uChannels, info.uOutSampleRate, info.uOutChannels, info.uSBR, info.uPS),
                  std::make_tuple(rate, channels, rate, channels, 0u, 0u));
    }
}

TEST(AacFrame, AdtsResults)
{
    const std::vector<uint8_t> mono = Mono();
    BitWriter pair, threeSce, coupling, dataFill, pce, overrun;
    const std::vector<uint8_t> stereo = End(Cpe(pair));
    const std::vector<uint8_t> third = End(Sce(Sce(Sce(threeSce), 1), 2));
    coupling.Put(2, 3).Put(0, 16);
    dataFill.Put(4, 3).Put(1, 4).Put(0, 1).Put(255, 8).Put(10, 8).PutBytes(std::vector<uint8_t>(265, 0xC3));
    dataFill.Put(6, 3).Put(15, 4).Put(0, 8).Put(1, 4).Put(0, 4).PutBytes(std::vector<uint8_t>(13, 0xA5));
    // channel_configuration 0: a program config element with one front channel pair first.
    pce.Put(5, 3).Put(0, 4).Put(1, 2).Put(4, 4).Put(1, 4).Put(0, 20).Put(0b10000, 5).Align().Put(0, 8);
    const std::vector<uint8_t> programAndPair = End(Cpe(pce));
    const Counts kMono = {1, 0, 0, 0, 0, 0, 0, 1}, kStereo = {0, 1, 0, 0, 0, 0, 0, 1};
    std::vector<uint8_t> leftover = Adts({mono}, 4, 1, false, 1);
    leftover.push_back(0); // a zero byte inside aac_frame_length after the alignment
    const FrameCase cases[] = {
        // A single channel element of 29 bits and ID_END: 32 bits. uBits ends after the last ID_END.
        {"mono", Adts({mono}), 0, kMono, 56 + 32},
        {"stereo", Adts({stereo}, 3, 2), 0, kStereo, 56 + 55},
        {"protected", Adts({mono}, 4, 1, true), 0, kMono, 72 + 32},
        {"two blocks", Adts({mono, mono}), 0, {2, 0, 0, 0, 0, 0, 0, 2}, 56 + 32 + 32},
        // raw_data_block_position and crc_check in the header, a CRC word after each block.
        {"two protected blocks", Adts({mono, mono}, 4, 1, true), 0, {2, 0, 0, 0, 0, 0, 0, 2}, 72 + 16 + 32 + 16 + 32},
        {"program config element", Adts({programAndPair}, 4, 0), 0, {0, 1, 0, 0, 0, 1, 0, 1}},
        {"data and fill elements", Adts({End(Sce(dataFill))}), 0, {1, 0, 0, 0, 1, 0, 1, 1}},
        {"leftover", leftover, 5, kMono, 56 + 32},
        {"short", Adts({mono}, 4, 1, false, 1), 2, {}, 56},
        {"overrun", Adts({mono}, 4, 1, false, -1), 4, {1, 0, 0, 0, 0, 0, 0, 0}, 56 + 29},
        {"length below the header", Adts({mono}, 4, 1, false, -int(mono.size()) - 2), 4, {}},
        {"third channel", Adts({third}, 4, 1), 3, {3, 0, 0, 0, 0, 0, 0, 0}},
        {"coupling channel element", Adts({coupling.Bytes()}), 3, {0, 0, 1, 0, 0, 0, 0, 0}, 56 + 3},
        {"no sync word", {0xFF, 0xE1, 0x50, 0x80, 0x02, 0x1F, 0xFC}, 1, {}},
        {"one byte", {0xFF}, 1, {}},
    };
    for (const FrameCase &c : cases) {
        Parser p = Make();
        Check(p.get(), c, c.name == "stereo" ? 48000 : 44100, c.name == "stereo" || c.name == "program config element" ? 2 : 1);
    }
    // Bad arguments.
    Parser p = Make();
    CALAACFrameInfo info;
    const std::vector<uint8_t> frame = Adts({mono});
    EXPECT_EQ(vorCALTools_AAC_ParseFrame(nullptr, frame.data(), int32_t(frame.size()), &info), 1);
    EXPECT_EQ(vorCALTools_AAC_ParseFrame(p.get(), nullptr, 9, &info), 1);
    EXPECT_EQ(vorCALTools_AAC_ParseFrame(p.get(), frame.data(), 0, &info), 1);
    EXPECT_EQ(vorCALTools_AAC_ParseFrame(p.get(), frame.data(), int32_t(frame.size()), nullptr), 1);
}

struct AscCase {
    std::string name;
    std::vector<uint8_t> asc;
    int32_t result; // of a mono frame
    uint32_t rate, channels, sbr, ps;
};

BitWriter Asc(uint32_t type, uint32_t index, uint32_t config)
{
    BitWriter w;
    w.Put(type < 31 ? type : 31, 5).Put(type < 31 ? 0 : type - 32, type < 31 ? 0 : 6).Put(index, 4).Put(config, 4);
    return w;
}
// GASpecificConfig: frameLengthFlag, dependsOnCoreCoder, extensionFlag.
BitWriter Ga(BitWriter w, uint32_t frameLength = 0) { w.Put(frameLength, 1).Put(0, 2); return w; }

TEST(AacFrame, AudioSpecificConfigSignalling)
{
    BitWriter pce = Ga(Asc(2, 3, 0));
    pce.Put(0, 4).Put(1, 2).Put(3, 4).Put(1, 4).Put(0, 20).Put(0b00001, 5).Align().Put(0, 8);
    const AscCase cases[] = {
        {"AAC LC", Asc(2, 4, 1).Put(0, 3).Bytes(), 0, 44100, 1, 0, 0},
        {"AAC Main, explicit rate", BitWriter().Put(1, 5).Put(15, 4).Put(48000, 24).Put(1, 4).Put(0, 3).Bytes(), 0, 48000, 1, 0, 0},
        {"object type 5", {0x2B, 0x92, 0x08, 0x00}, 0, 22050, 2, 1, 0},
        {"object type 29", Ga(Asc(29, 7, 1).Put(4, 4).Put(2, 5)).Bytes(), 0, 22050, 1, 1, 1},
        {"sync extensions", Ga(Asc(2, 6, 1)).Put(0x2B7, 11).Put(5, 5).Put(1, 1).Put(3, 4).Put(0x548, 11).Put(1, 1).Bytes(), 0, 24000, 1, 1, 1},
        {"sync extension, SBR absent", Ga(Asc(2, 6, 1)).Put(0x2B7, 11).Put(5, 5).Put(0, 1).Put(0, 12).Bytes(), 0, 24000, 1, 0, 0},
        {"program config element", pce.Bytes(), 3, 48000, 1, 0, 0}, // tag 1 only: the SCE of tag 0 is refused
        {"960-sample frames", Ga(Asc(2, 4, 1), 1).Bytes(), 1, 44100, 1, 0, 0},
        {"object type 42", Asc(42, 4, 1).Put(0, 3).Bytes(), 1, 44100, 1, 0, 0},
        {"rate outside the table", BitWriter().Put(2, 5).Put(15, 4).Put(44000, 24).Put(1, 4).Put(0, 3).Bytes(), 1, 0, 0, 0, 0},
        {"reserved channel configuration", Asc(2, 4, 9).Put(0, 3).Bytes(), 1, 44100, 9, 0, 0},
        {"empty", {}, 1, 0, 0, 0, 0},
    };
    const std::vector<uint8_t> mono = Mono();
    for (const AscCase &c : cases) {
        SCOPED_TRACE(c.name);
        Parser p = Make(&c.asc);
        CALAACFrameInfo info;
        EXPECT_EQ(vorCALTools_AAC_ParseFrame(p.get(), mono.data(), int32_t(mono.size()), &info), c.result);
        EXPECT_EQ(std::make_tuple(info.uSampleRate, info.uChannels, info.uSBR, info.uPS, info.uFrameBytes),
                  std::make_tuple(c.rate, c.channels, c.sbr, c.ps, uint32_t(mono.size())));
        EXPECT_EQ(std::make_pair(info.uOutSampleRate, info.uOutChannels), std::make_pair(c.rate << c.sbr, c.ps ? 2 : c.channels));
    }
    // Raw access units longer than any frame are refused.
    const std::vector<uint8_t> lc = Asc(2, 4, 1).Put(0, 3).Bytes();
    Parser p = Make(&lc);
    std::vector<uint8_t> big(8192, 0);
    CALAACFrameInfo info;
    EXPECT_EQ(vorCALTools_AAC_ParseFrame(p.get(), big.data(), int32_t(big.size()), &info), 1);
}

// file, sample rate, channels, frames (ffprobe) of the ffmpeg fixtures; the 5.1 stream has
// more channels than the channel map holds and is refused frame by frame.
std::vector<std::tuple<std::string, uint32_t, uint32_t, size_t>> Fixtures()
{
    std::vector<std::tuple<std::string, uint32_t, uint32_t, size_t>> out;
    for (const char *sidecar : {"audio/adts.txt", "aac/aacparse.txt"}) {
        std::istringstream lines = ReadText(sidecar);
        std::string line, name;
        uint32_t rate = 0, channels = 0;
        size_t frames = 0;
        while (std::getline(lines, line))
            if (std::istringstream row(line); line[0] != '#' && row >> name >> rate >> channels >> frames)
                out.emplace_back(std::string(sidecar).substr(0, std::string(sidecar).find('/') + 1) + name, rate, channels, frames);
    }
    for (auto [rate, channels] : {std::pair{22050u, 1u}, {44100, 1}, {44100, 2}, {48000, 2}, {8000, 2}})
        out.emplace_back("aac/sine_" + std::to_string(rate) + "_" + std::to_string(channels) + "ch.aac", rate, channels, 0);
    return out;
}

// One allocation per parser (none per frame), freed at destroy; a failed one gives no parser.
TEST(AacFrame, EveryFrameOfTheFfmpegStreams)
{
    RecordingSal &sal = RecordingSal::Get();
    sal.Reset();
    sal.FailAllocation(1);
    EXPECT_EQ(vorCALTools_AAC_CreateParser(nullptr, 0), nullptr);
    vorCALTools_AAC_DestroyParser(nullptr);
    const std::vector<uint8_t> eightKHz = AdtsFrames(ReadFile("audio/adts-8000-2ch.aac"))[1];
    size_t total = 0;
    for (const auto &[file, rate, channels, count] : Fixtures()) {
        SCOPED_TRACE(file);
        const std::vector<std::vector<uint8_t>> frames = AdtsFrames(ReadFile(file));
        ASSERT_FALSE(frames.empty());
        EXPECT_TRUE(count == 0 || frames.size() == count);
        Parser p = Make();
        const uint32_t allocs = sal.allocCount;
        const int32_t expected = channels > 2 ? 3 : 0;
        const Counts elements = {channels == 1, channels == 2, 0, 0, 0, 0, 0, 1};
        for (size_t i = 0; i < frames.size(); ++i) {
            // The detection entry rewrites the shared short band widths between frames; the
            // parser keeps its own.
            VrAACSBRInfo(eightKHz.data(), uint32_t(eightKHz.size()), nullptr, nullptr, nullptr, nullptr, nullptr);
            CALAACFrameInfo info;
            ASSERT_EQ(vorCALTools_AAC_ParseFrame(p.get(), frames[i].data(), int32_t(frames[i].size()), &info), expected) << i;
            ASSERT_EQ(std::make_tuple(info.uSampleRate, info.uChannels, info.uFrameBytes, info.uSBR, info.uPS),
                      std::make_tuple(rate, channels, uint32_t(frames[i].size()), 0u, 0u)) << i;
            if (expected == 0) {
                ASSERT_EQ((info.uBits + 7) / 8, info.uFrameBytes) << i;
                info.auElements[6] = 0; // the encoder pads some frames with fill elements
                ASSERT_EQ(Counts(std::to_array(info.auElements)), elements) << i;
            }
        }
        EXPECT_EQ(std::make_pair(sal.allocCount, sal.liveBlocks.size()), std::make_pair(allocs, size_t(1)));
        total += frames.size();
    }
    EXPECT_EQ(std::make_tuple(total, sal.liveBlocks.size(), sal.badFrees), std::make_tuple(size_t(301), size_t(0), 0u));
}

// The real HE-AAC v1 clip: ADTS with implicit signalling, and the MP4's access units with the
// AudioSpecificConfig of object type 5.
TEST(AacFrame, RealHeAacInBothForms)
{
    const std::vector<std::vector<uint8_t>> adts = AdtsFrames(ReadFile("heaac/bear_v1_implicit.aac"));
    const std::vector<uint8_t> mp4 = ReadFile("heaac/bear_v1_aot5.mp4"), asc = ReadFile("heaac/bear_v1_aot5.asc");
    std::vector<std::vector<uint8_t>> units;
    std::istringstream packets = ReadText("aac/bear_v1_aot5.mp4.txt");
    std::string word;
    for (size_t pos = 0, size = 0; packets >> word >> pos >> size;)
        units.emplace_back(mp4.begin() + long(pos), mp4.begin() + long(pos + size));
    ASSERT_EQ(std::make_pair(adts.size(), units.size()), std::make_pair(size_t(62), size_t(62)));
    for (bool raw : {false, true}) {
        SCOPED_TRACE(raw ? "MP4" : "ADTS");
        Parser p = Make(raw ? &asc : nullptr);
        for (size_t i = 0; i < units.size(); ++i) {
            const std::vector<uint8_t> &f = raw ? units[i] : adts[i];
            CALAACFrameInfo info;
            ASSERT_EQ(vorCALTools_AAC_ParseFrame(p.get(), f.data(), int32_t(f.size()), &info), 0) << i;
            ASSERT_EQ(std::make_tuple(info.uSampleRate, info.uOutSampleRate, info.uChannels, info.uOutChannels, info.uSBR, info.uPS),
                      std::make_tuple(22050u, 44100u, 2u, 2u, 1u, 0u)) << i;
            ASSERT_EQ(std::make_tuple((info.uBits + 7) / 8, info.auElements[1], info.auElements[7]), std::make_tuple(uint32_t(f.size()), 1u, 1u));
            ASSERT_GE(info.auElements[6], 1u) << i;
        }
    }
}

// Cut frames, each in a buffer of exactly its size (the sanitizers see any read beyond): an ADTS
// frame shorter than its header says is short (2); a raw access unit runs past its end (4).
TEST(AacFrame, CutFramesStayInsideTheirBuffers)
{
    const std::vector<uint8_t> lc = {0x12, 0x10}, asc = ReadFile("heaac/bear_v1_aot5.asc");
    for (const char *file : {"aac/tools_44100_2ch.aac", "heaac/bear_v1_implicit.aac"}) {
        const std::vector<uint8_t> frame = AdtsFrames(ReadFile(file))[3];
        Parser adts = Make(), raw = Make(file[0] == 'a' ? &lc : &asc);
        for (size_t n = 1; n < frame.size(); ++n) {
            SCOPED_TRACE(testing::Message() << file << " cut to " << n);
            const std::vector<uint8_t> cut(frame.begin(), frame.begin() + long(n));
            const std::vector<uint8_t> unit(frame.begin() + 7, frame.begin() + long(std::max<size_t>(n, 8)));
            CALAACFrameInfo info;
            ASSERT_EQ(vorCALTools_AAC_ParseFrame(adts.get(), cut.data(), int32_t(n), &info), n < 2 ? 1 : 2);
            ASSERT_EQ(vorCALTools_AAC_ParseFrame(raw.get(), unit.data(), int32_t(unit.size()), &info), 4);
        }
    }
}

} // namespace
