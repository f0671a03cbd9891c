// A small ISO BMFF (ISO/IEC 14496-12) sample-table reader for MP4, MOV, 3GP and M4A files: the
// tracks of the 'moov' box with their first sample description and the position, size and sync
// flag of every sample. Only the 'moov' box is held in memory; sample tables are walked in place,
// so nothing grows with a sample count that the file does not back with bytes.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "common.hpp"
#include "input.hpp"

namespace vorcal::cli {

// Box types that may start a file of this family.
bool LooksLikeIsoBmff(const uint8_t *pData, size_t uSize);

struct Mp4Sample {
    uint64_t uOffset = 0;
    uint32_t uSize = 0;
    bool bSync = true;
};

struct Mp4Track {
    uint32_t uTrackId = 0;
    char handler[5] = {};     // 'vide', 'soun', ...
    char sampleEntry[5] = {}; // 'avc1', 'mp4a', ...
    Codec codec = Codec::Unknown;
    uint32_t uEntryCount = 0;  // sample descriptions in 'stsd'; the first one is read
    uint32_t uObjectType = 0;  // objectTypeIndication of 'esds'
    std::vector<uint8_t> config; // avcC or hvcC record, AudioSpecificConfig, MPEG-4 Visual headers
    uint32_t uNalLengthSize = 0;
    uint32_t uWidth = 0, uHeight = 0;   // visual sample entry
    uint32_t uSarNum = 0, uSarDen = 0;  // 'pasp'
    uint32_t uSampleRate = 0, uChannels = 0; // audio sample entry
    uint32_t uAmrFramesPerSample = 0;   // 'damr'
    uint32_t uTimescale = 0;
    uint64_t uDuration = 0;
    uint32_t uSampleCount = 0;

    // Sample tables: offsets into the moov copy, validated when the file was opened.
    uint32_t uFixedSize = 0, uSizeFieldBits = 32;
    size_t uSizes = 0;
    uint32_t uChunkCount = 0;
    bool bChunk64 = false;
    size_t uChunks = 0;
    uint32_t uRunCount = 0;
    size_t uRuns = 0;
    bool bHasSyncTable = false;
    uint32_t uSyncCount = 0;
    size_t uSyncs = 0;
};

class Mp4File {
public:
    // Reads the box structure and the 'moov' box of a seekable input and checks that every
    // sample lies inside the file. A file with movie fragments opens; Fragmented() says so.
    bool Open(Input &input, Failure &failure);

    const std::vector<Mp4Track> &Tracks() const { return tracks_; }
    const char *Brand() const { return brand_; }
    // Offset of the first 'moof' box, when there is one.
    bool Fragmented(uint64_t &uAt) const
    {
        uAt = uFragmentAt_;
        return bFragmented_;
    }

    // Walks the samples of one track in decoding order.
    class Cursor {
    public:
        Cursor(const Mp4File &file, const Mp4Track &track) : file_(file), track_(track) {}
        // The next sample; false after the last one, or with a failure when the tables run dry.
        bool Next(Mp4Sample &sample, Failure &failure);
        uint32_t Index() const { return uIndex_; }

    private:
        const Mp4File &file_;
        const Mp4Track &track_;
        uint32_t uIndex_ = 0;
        uint32_t uChunk_ = 0;       // chunk of the next sample
        uint32_t uLeftInChunk_ = 0; // samples still to come from it
        uint32_t uRun_ = 0;         // 'stsc' entry in force
        uint32_t uSync_ = 0;        // next 'stss' entry
        uint64_t uNextOffset_ = 0;
    };

private:
    uint32_t U32(size_t uAt) const;
    uint64_t U64(size_t uAt) const;
    bool ParseMoov(uint64_t uFileOffset, Failure &failure);
    bool ParseTrack(size_t uBegin, size_t uEnd, Mp4Track &track, Failure &failure, int iDepth);
    bool ParseSampleTable(size_t uBegin, size_t uEnd, Mp4Track &track, Failure &failure);
    bool ParseSampleEntry(size_t uBegin, size_t uEnd, Mp4Track &track, Failure &failure);
    bool ValidateSamples(const Mp4Track &track, Failure &failure) const;

    std::vector<uint8_t> moov_;
    uint64_t uMoovOffset_ = 0; // file offset of moov_[0]
    uint64_t uFileSize_ = 0;
    std::vector<Mp4Track> tracks_;
    char brand_[5] = {};
    bool bFragmented_ = false;
    uint64_t uFragmentAt_ = 0;
};

} // namespace vorcal::cli
