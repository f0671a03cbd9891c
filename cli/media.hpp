// Media inputs as streams of packets: the format is detected from the first bytes, then each
// stream yields its configuration and its frames (MP4 samples, access units of elementary
// streams, ADTS and AMR frames, or the records of a frame dump).
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "common.hpp"
#include "input.hpp"

namespace vorcal::cli {

struct Packet {
    uint64_t uOffset = 0; // file offset of the first byte (of the record, for dumps)
    std::vector<uint8_t> data;
    int iContainerSync = -1; // the container's sync flag ('stss'): 1, 0, or -1 when it has none
};

enum class ReadResult { Packet, End, Error };

class PacketReader {
public:
    virtual ~PacketReader() = default;
    virtual ReadResult Next(Packet &packet, Failure &failure) = 0;
};

struct StreamInfo {
    uint32_t uIndex = 0;
    Codec codec = Codec::Unknown;
    std::string sampleEntry;     // MP4 sample description ("avc1"); empty elsewhere
    uint32_t uTrackId = 0;
    uint32_t uObjectType = 0;    // 'esds' objectTypeIndication
    std::vector<uint8_t> config; // avcC or hvcC record, parameter sets, AudioSpecificConfig, VOL headers
    Framing framing = Framing::None;             // H.264 and HEVC
    bool bAdtsFrames = false;                    // AAC frames behind ADTS headers (else raw)
    uint32_t uNalLengthSize = 0;
    uint32_t uWidth = 0, uHeight = 0;        // as the container or stream header gives them
    uint32_t uSarNum = 0, uSarDen = 0;       // 'pasp'
    uint32_t uSampleRate = 0, uChannels = 0; // as the container or stream header gives them
    int64_t iFrameCount = -1;                // known before reading (MP4), else -1
    uint64_t uConfigOffset = 0;              // where the configuration was found
};

class MediaFile {
public:
    // Detects the format and reads what the streams' descriptions need: the box structure of
    // an MP4 (seekable files only), the first frame of an elementary stream, the first record
    // of a dump. bElseDump reads what matches no format as a dump.
    static std::unique_ptr<MediaFile> Open(std::unique_ptr<Input> input, Failure &failure, bool bElseDump = false);
    // Reads the input as a frame dump whatever it looks like.
    static std::unique_ptr<MediaFile> OpenDump(std::unique_ptr<Input> input, Failure &failure);
    ~MediaFile();

    Format GetFormat() const { return format_; }
    const std::vector<StreamInfo> &Streams() const { return streams_; }
    // The MP4 brand ('isom', 'qt  ', '3gp4', 'M4A '), else empty.
    const std::string &Brand() const { return brand_; }
    // A fact that did not stop the opening but makes the result partial (movie fragments).
    const Failure &Notice() const { return notice_; }

    // The packets of one stream in decoding order. Elementary streams and dumps have one
    // stream, read once, sequentially.
    std::unique_ptr<PacketReader> Packets(size_t uStream);

    struct Impl;

private:
    MediaFile() = default;
    Format format_ = Format::Dump;
    std::vector<StreamInfo> streams_;
    std::string brand_;
    Failure notice_;
    std::unique_ptr<Impl> impl_;
};

// Detects a format from the first bytes of an input (the whole input when it is shorter than
// the window); false when nothing matches.
bool DetectFormat(const uint8_t *pData, size_t uSize, bool bAtEnd, Format &format);

} // namespace vorcal::cli
