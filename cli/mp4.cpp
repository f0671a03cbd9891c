#include "mp4.hpp"

#include <algorithm>
#include <array>
#include <cstring>

namespace vorcal::cli {

namespace {

// The 'moov' box is copied into memory; larger ones are refused.
constexpr uint64_t kMaxMoovBytes = uint64_t{256} << 20;

constexpr std::array<const char *, 13> kTopLevelTypes = {"ftyp", "moov", "mdat", "free", "skip", "wide", "pnot",
                                                         "moof", "styp", "sidx", "uuid", "pdin", "meta"};

bool TypeIs(const uint8_t *p, const char *pType)
{
    return std::memcmp(p, pType, 4) == 0;
}

uint32_t Be32(const uint8_t *p)
{
    return uint32_t{p[0]} << 24 | uint32_t{p[1]} << 16 | uint32_t{p[2]} << 8 | p[3];
}

// A box type as printable text: four characters, others shown as '?'.
std::string TypeText(const uint8_t *p)
{
    std::string text(4, '?');
    for (int i = 0; i < 4; ++i)
        if (p[i] >= 0x20 && p[i] < 0x7F)
            text[i] = static_cast<char>(p[i]);
    return text;
}

struct Box {
    const uint8_t *pType;
    size_t uStart; // first byte of the box header
    size_t uBegin; // first byte of the payload
    size_t uEnd;   // one past the last byte
};

// The child boxes of [uBegin, uEnd) of a buffer whose byte 0 lies at file offset uBase.
class Children {
public:
    Children(const std::vector<uint8_t> &buffer, size_t uBegin, size_t uEnd, uint64_t uBase)
        : buffer_(buffer), uPos_(uBegin), uEnd_(uEnd), uBase_(uBase)
    {
    }
    // false at the end, or with a failure when a box does not fit its parent.
    bool Next(Box &box, Failure &failure)
    {
        if (uPos_ >= uEnd_)
            return false;
        const size_t uLeft = uEnd_ - uPos_;
        const uint8_t *p = buffer_.data() + uPos_;
        if (uLeft < 8) {
            failure.Set(uBase_ + uPos_, Sprintf("truncated box header: %zu bytes left in the parent box", uLeft));
            return false;
        }
        uint64_t uSize = Be32(p);
        size_t uHeader = 8;
        if (uSize == 1) {
            if (uLeft < 16) {
                failure.Set(uBase_ + uPos_, "truncated 64-bit box size");
                return false;
            }
            uSize = uint64_t{Be32(p + 8)} << 32 | Be32(p + 12);
            uHeader = 16;
        } else if (uSize == 0) {
            uSize = uLeft; // to the end of the parent
        }
        if (uSize < uHeader || uSize > uLeft) {
            failure.Set(uBase_ + uPos_, Sprintf("box '%s' claims %llu bytes, its parent has %zu left",
                                               TypeText(p + 4).c_str(), static_cast<unsigned long long>(uSize),
                                               uLeft));
            return false;
        }
        box = {p + 4, uPos_, uPos_ + uHeader, uPos_ + static_cast<size_t>(uSize)};
        uPos_ = box.uEnd;
        return true;
    }

private:
    const std::vector<uint8_t> &buffer_;
    size_t uPos_;
    size_t uEnd_;
    uint64_t uBase_;
};

// An MPEG-4 descriptor length (ISO/IEC 14496-1 8.3.3): up to four bytes of seven bits.
bool DescriptorLength(const uint8_t *p, size_t uLeft, size_t &uUsed, uint32_t &uLength)
{
    uLength = 0;
    for (uUsed = 0; uUsed < 4 && uUsed < uLeft; ++uUsed) {
        uLength = uLength << 7 | (p[uUsed] & 0x7F);
        if (!(p[uUsed] & 0x80)) {
            ++uUsed;
            return true;
        }
    }
    return false;
}

// esds (ISO/IEC 14496-14 5.6): ES_Descriptor, DecoderConfigDescriptor, DecoderSpecificInfo.
bool ParseEsds(const uint8_t *p, size_t uSize, Mp4Track &track)
{
    if (uSize < 4)
        return false;
    p += 4; // version and flags
    uSize -= 4;
    size_t uUsed = 0;
    uint32_t uLength = 0;
    if (uSize < 1 || p[0] != 0x03 || !DescriptorLength(p + 1, uSize - 1, uUsed, uLength))
        return false;
    size_t uPos = 1 + uUsed;
    const size_t uEsEnd = std::min<size_t>(uSize, uPos + uLength);
    if (uPos + 3 > uEsEnd)
        return false;
    const uint8_t uFlags = p[uPos + 2];
    uPos += 3;
    if (uFlags & 0x80)
        uPos += 2; // dependsOn_ES_ID
    if (uFlags & 0x40) {
        if (uPos >= uEsEnd)
            return false;
        uPos += 1 + p[uPos]; // URL
    }
    if (uFlags & 0x20)
        uPos += 2; // OCR_ES_Id
    if (uPos + 1 >= uEsEnd || p[uPos] != 0x04 || !DescriptorLength(p + uPos + 1, uEsEnd - uPos - 1, uUsed, uLength))
        return false;
    uPos += 1 + uUsed;
    const size_t uDcdEnd = std::min<size_t>(uEsEnd, uPos + uLength);
    if (uPos + 13 > uDcdEnd)
        return false;
    track.uObjectType = p[uPos];
    uPos += 13;
    if (uPos + 1 < uDcdEnd && p[uPos] == 0x05 && DescriptorLength(p + uPos + 1, uDcdEnd - uPos - 1, uUsed, uLength)) {
        uPos += 1 + uUsed;
        const size_t uTake = std::min<size_t>(uLength, uDcdEnd - uPos);
        track.config.assign(p + uPos, p + uPos + uTake);
    }
    return true;
}

Codec CodecOfEntry(const uint8_t *pType)
{
    struct Entry {
        const char *pType;
        Codec codec;
    };
    static constexpr Entry kEntries[] = {
        {"avc1", Codec::H264},  {"avc3", Codec::H264},        {"hvc1", Codec::Hevc}, {"hev1", Codec::Hevc},
        {"mp4v", Codec::Mpeg4Visual}, {"s263", Codec::H263},  {"h263", Codec::H263}, {"mp4a", Codec::Aac},
        {"samr", Codec::AmrNb}, {"sawb", Codec::AmrWb},
    };
    for (const Entry &entry : kEntries)
        if (TypeIs(pType, entry.pType))
            return entry.codec;
    return Codec::Unknown;
}

} // namespace

bool LooksLikeIsoBmff(const uint8_t *pData, size_t uSize)
{
    if (uSize < 8)
        return false;
    const uint32_t uBoxSize = Be32(pData);
    if (uBoxSize != 0 && uBoxSize != 1 && uBoxSize < 8)
        return false;
    for (const char *pType : kTopLevelTypes)
        if (TypeIs(pData + 4, pType))
            return true;
    return false;
}

uint32_t Mp4File::U32(size_t uAt) const
{
    return Be32(moov_.data() + uAt);
}

uint64_t Mp4File::U64(size_t uAt) const
{
    return uint64_t{U32(uAt)} << 32 | U32(uAt + 4);
}

bool Mp4File::Open(Input &input, Failure &failure)
{
    uFileSize_ = input.Size();
    bool bHaveMoov = false;
    uint64_t uPos = 0;
    while (uPos < uFileSize_) {
        uint8_t header[16];
        const uint64_t uLeft = uFileSize_ - uPos;
        if (uLeft < 8) {
            failure.Set(uPos, Sprintf("truncated box header: the file ends %llu bytes after it starts",
                                     static_cast<unsigned long long>(uLeft)));
            return false;
        }
        if (!input.ReadAt(uPos, header, 8, failure))
            return false;
        uint64_t uSize = Be32(header);
        uint64_t uHeader = 8;
        if (uSize == 1) {
            if (uLeft < 16 || !input.ReadAt(uPos + 8, header + 8, 8, failure)) {
                failure.Set(uPos, "truncated 64-bit box size");
                return false;
            }
            uSize = uint64_t{Be32(header + 8)} << 32 | Be32(header + 12);
            uHeader = 16;
        } else if (uSize == 0) {
            uSize = uLeft;
        }
        const std::string type = TypeText(header + 4);
        if (uSize < uHeader) {
            failure.Set(uPos, Sprintf("box '%s' has an impossible size of %llu bytes", type.c_str(),
                                     static_cast<unsigned long long>(uSize)));
            return false;
        }
        if (uSize > uLeft) {
            failure.Set(uPos, Sprintf("truncated: box '%s' claims %llu bytes, the file has %llu left", type.c_str(),
                                     static_cast<unsigned long long>(uSize), static_cast<unsigned long long>(uLeft)));
            return false;
        }
        if (uPos == 0 && TypeIs(header + 4, "ftyp") && uSize >= 12 &&
            input.ReadAt(uPos + uHeader, header, 4, failure))
            std::memcpy(brand_, header, 4);
        if (TypeIs(header + 4, "moof") && !bFragmented_) {
            bFragmented_ = true;
            uFragmentAt_ = uPos;
        }
        if (TypeIs(header + 4, "moov") && !bHaveMoov) {
            if (uSize - uHeader > kMaxMoovBytes) {
                failure.Set(uPos, Sprintf("the 'moov' box holds %llu bytes, more than the %llu this tool reads",
                                         static_cast<unsigned long long>(uSize - uHeader),
                                         static_cast<unsigned long long>(kMaxMoovBytes)));
                return false;
            }
            moov_.resize(static_cast<size_t>(uSize - uHeader));
            uMoovOffset_ = uPos + uHeader;
            if (!input.ReadAt(uMoovOffset_, moov_.data(), moov_.size(), failure) || !ParseMoov(uMoovOffset_, failure))
                return false;
            bHaveMoov = true;
        }
        uPos += uSize;
    }
    if (!bHaveMoov) {
        failure.Set(uFileSize_, "no 'moov' box: the file is incomplete or not a movie");
        return false;
    }
    for (const Mp4Track &track : tracks_)
        if (!ValidateSamples(track, failure))
            return false;
    return true;
}

bool Mp4File::ParseMoov(uint64_t uFileOffset, Failure &failure)
{
    Children children(moov_, 0, moov_.size(), uFileOffset);
    Box box{};
    while (children.Next(box, failure)) {
        if (!TypeIs(box.pType, "trak"))
            continue;
        Mp4Track track;
        if (!ParseTrack(box.uBegin, box.uEnd, track, failure, 0))
            return false;
        tracks_.push_back(std::move(track));
    }
    return !failure.Failed();
}

bool Mp4File::ParseTrack(size_t uBegin, size_t uEnd, Mp4Track &track, Failure &failure, int iDepth)
{
    // trak > mdia > minf: anything nested deeper is not a track of this family.
    if (iDepth > 2) {
        failure.Set(uMoovOffset_ + uBegin, "'mdia' or 'minf' boxes nested inside themselves");
        return false;
    }
    Children children(moov_, uBegin, uEnd, uMoovOffset_);
    Box box{};
    while (children.Next(box, failure)) {
        const size_t uPayload = box.uEnd - box.uBegin;
        if (TypeIs(box.pType, "tkhd") && uPayload >= 84) {
            const bool bV1 = moov_[box.uBegin] == 1;
            track.uTrackId = U32(box.uBegin + (bV1 ? 20 : 12));
        } else if (TypeIs(box.pType, "mdia") || TypeIs(box.pType, "minf")) {
            if (!ParseTrack(box.uBegin, box.uEnd, track, failure, iDepth + 1))
                return false;
        } else if (TypeIs(box.pType, "mdhd") && uPayload >= 24) {
            const bool bV1 = moov_[box.uBegin] == 1;
            if (bV1 && uPayload >= 36) {
                track.uTimescale = U32(box.uBegin + 20);
                track.uDuration = U64(box.uBegin + 24);
            } else if (!bV1) {
                track.uTimescale = U32(box.uBegin + 12);
                track.uDuration = U32(box.uBegin + 16);
            }
        } else if (TypeIs(box.pType, "hdlr") && uPayload >= 12) {
            std::memcpy(track.handler, moov_.data() + box.uBegin + 8, 4);
        } else if (TypeIs(box.pType, "stbl")) {
            if (!ParseSampleTable(box.uBegin, box.uEnd, track, failure))
                return false;
        }
    }
    return !failure.Failed();
}

bool Mp4File::ParseSampleTable(size_t uBegin, size_t uEnd, Mp4Track &track, Failure &failure)
{
    Children children(moov_, uBegin, uEnd, uMoovOffset_);
    Box box{};
    bool bSizes = false, bChunks = false, bRuns = false;
    // A table of uCount entries of uEntryBits bits after uHeader bytes must fit its box.
    auto Fits = [&](const Box &b, size_t uHeader, uint64_t uCount, uint64_t uEntryBits) {
        const uint64_t uPayload = b.uEnd - b.uBegin;
        if (uPayload >= uHeader && (uCount * uEntryBits + 7) / 8 <= uPayload - uHeader)
            return true;
        failure.Set(uMoovOffset_ + b.uStart, Sprintf("'%s' lists %llu entries, its box holds %llu bytes",
                                                    TypeText(b.pType).c_str(), static_cast<unsigned long long>(uCount),
                                                    static_cast<unsigned long long>(uPayload)));
        return false;
    };
    while (children.Next(box, failure)) {
        const size_t uPayload = box.uEnd - box.uBegin;
        const uint32_t uCount = uPayload >= 8 ? U32(box.uBegin + 4) : 0;
        if (TypeIs(box.pType, "stsd")) {
            if (!ParseSampleEntry(box.uBegin, box.uEnd, track, failure))
                return false;
        } else if (TypeIs(box.pType, "stsz") || TypeIs(box.pType, "stz2")) {
            const bool bCompact = TypeIs(box.pType, "stz2");
            if (uPayload < 12) {
                failure.Set(uMoovOffset_ + box.uStart, "truncated sample size box");
                return false;
            }
            track.uFixedSize = bCompact ? 0 : U32(box.uBegin + 4);
            track.uSizeFieldBits = bCompact ? moov_[box.uBegin + 7] : 32;
            track.uSampleCount = U32(box.uBegin + 8);
            track.uSizes = box.uBegin + 12;
            if (bCompact && track.uSizeFieldBits != 4 && track.uSizeFieldBits != 8 && track.uSizeFieldBits != 16) {
                failure.Set(uMoovOffset_ + box.uStart, Sprintf("'stz2' field size %u is not 4, 8 or 16",
                                                              track.uSizeFieldBits));
                return false;
            }
            if (track.uFixedSize == 0 && !Fits(box, 12, track.uSampleCount, track.uSizeFieldBits))
                return false;
            // Samples do not overlap, so together they cannot be larger than the file.
            if (track.uFixedSize != 0 && uint64_t{track.uFixedSize} * track.uSampleCount > uFileSize_) {
                failure.Set(uMoovOffset_ + box.uStart,
                            Sprintf("'stsz' lists %u samples of %u bytes, more than the file holds", track.uSampleCount,
                                   track.uFixedSize));
                return false;
            }
            bSizes = true;
        } else if (TypeIs(box.pType, "stco") || TypeIs(box.pType, "co64")) {
            track.bChunk64 = TypeIs(box.pType, "co64");
            if (!Fits(box, 8, uCount, track.bChunk64 ? 64 : 32))
                return false;
            track.uChunkCount = uCount;
            track.uChunks = box.uBegin + 8;
            bChunks = true;
        } else if (TypeIs(box.pType, "stsc")) {
            if (!Fits(box, 8, uCount, 96))
                return false;
            track.uRunCount = uCount;
            track.uRuns = box.uBegin + 8;
            for (uint32_t i = 0; i < uCount; ++i) {
                const uint32_t uFirst = U32(track.uRuns + 12 * size_t{i});
                if (i == 0 ? uFirst != 1 : uFirst <= U32(track.uRuns + 12 * size_t{i - 1})) {
                    failure.Set(uMoovOffset_ + box.uStart,
                                Sprintf("'stsc' entry %u starts at chunk %u, out of order", i, uFirst));
                    return false;
                }
            }
            bRuns = true;
        } else if (TypeIs(box.pType, "stss")) {
            if (!Fits(box, 8, uCount, 32))
                return false;
            track.bHasSyncTable = true;
            track.uSyncCount = uCount;
            track.uSyncs = box.uBegin + 8;
        }
    }
    if (failure.Failed())
        return false;
    if (track.uSampleCount > 0 && !(bSizes && bChunks && bRuns)) {
        failure.Set(uMoovOffset_ + uBegin, Sprintf("track %u has %u samples but no '%s' box", track.uTrackId,
                                                  track.uSampleCount, !bChunks ? "stco" : "stsc"));
        return false;
    }
    return true;
}

bool Mp4File::ParseSampleEntry(size_t uBegin, size_t uEnd, Mp4Track &track, Failure &failure)
{
    if (uEnd - uBegin < 8) {
        failure.Set(uMoovOffset_ + uBegin, "truncated 'stsd' box");
        return false;
    }
    track.uEntryCount = U32(uBegin + 4);
    Children entries(moov_, uBegin + 8, uEnd, uMoovOffset_);
    Box entry{};
    if (!entries.Next(entry, failure))
        return !failure.Failed();
    std::memcpy(track.sampleEntry, entry.pType, 4);
    track.codec = CodecOfEntry(entry.pType);
    const size_t uPayload = entry.uEnd - entry.uBegin;
    const bool bVisual = std::memcmp(track.handler, "vide", 4) == 0 || KindOf(track.codec) == MediaKind::Video;
    size_t uChildren = 0;
    if (bVisual && uPayload >= 78) {
        track.uWidth = U32(entry.uBegin + 24) >> 16;
        track.uHeight = U32(entry.uBegin + 24) & 0xFFFF;
        uChildren = entry.uBegin + 78;
    } else if (!bVisual && uPayload >= 28) {
        // AudioSampleEntry; QuickTime sound descriptions of version 1 and 2 are longer.
        const uint32_t uVersion = U32(entry.uBegin + 8) >> 16;
        track.uChannels = U32(entry.uBegin + 16) >> 16;
        track.uSampleRate = U32(entry.uBegin + 24) >> 16;
        uChildren = entry.uBegin + 28;
        if (uVersion == 1 && uPayload >= 44) {
            uChildren = entry.uBegin + 44;
        } else if (uVersion == 2 && uPayload >= 64) {
            const uint64_t uBits = U64(entry.uBegin + 32);
            double dRate = 0;
            std::memcpy(&dRate, &uBits, sizeof dRate);
            track.uSampleRate = dRate >= 1 && dRate < 1e7 ? static_cast<uint32_t>(dRate) : 0;
            track.uChannels = U32(entry.uBegin + 40);
            uChildren = entry.uBegin + 64;
        }
    } else {
        return true; // a sample entry too short for its kind: no configuration
    }
    // The configuration boxes; QuickTime puts 'esds' inside a 'wave' box.
    std::vector<std::pair<size_t, size_t>> ranges = {{uChildren, entry.uEnd}};
    for (size_t r = 0; r < ranges.size() && r < 2; ++r) {
        Children children(moov_, ranges[r].first, ranges[r].second, uMoovOffset_);
        Box box{};
        Failure ignored; // configuration boxes are optional; a broken one only leaves facts out
        while (children.Next(box, ignored)) {
            const uint8_t *p = moov_.data() + box.uBegin;
            const size_t uSize = box.uEnd - box.uBegin;
            if (TypeIs(box.pType, "avcC") || TypeIs(box.pType, "hvcC")) {
                track.config.assign(p, p + uSize);
                if (TypeIs(box.pType, "avcC") && uSize >= 5)
                    track.uNalLengthSize = (p[4] & 3u) + 1;
                constexpr size_t kHvcCLengthSizeByte = 21; // lengthSizeMinusOne (ISO/IEC 14496-15 8.3.3.1)
                if (TypeIs(box.pType, "hvcC") && uSize > kHvcCLengthSizeByte)
                    track.uNalLengthSize = (p[kHvcCLengthSizeByte] & 3u) + 1;
            } else if (TypeIs(box.pType, "esds")) {
                ParseEsds(p, uSize, track);
            } else if (TypeIs(box.pType, "pasp") && uSize >= 8) {
                track.uSarNum = Be32(p);
                track.uSarDen = Be32(p + 4);
            } else if (TypeIs(box.pType, "damr") && uSize >= 9) {
                track.uAmrFramesPerSample = p[8];
            } else if (TypeIs(box.pType, "wave")) {
                ranges.emplace_back(box.uBegin, box.uEnd);
            }
        }
    }
    // mp4a carries other audio too (objectTypeIndication 0x40 and 0x66-0x68 are AAC).
    if (track.codec == Codec::Aac && track.uObjectType != 0 && track.uObjectType != 0x40 &&
        (track.uObjectType < 0x66 || track.uObjectType > 0x68))
        track.codec = Codec::Unknown;
    return true;
}

bool Mp4File::ValidateSamples(const Mp4Track &track, Failure &failure) const
{
    Cursor cursor(*this, track);
    Mp4Sample sample;
    while (cursor.Next(sample, failure)) {
        if (sample.uOffset > uFileSize_ || sample.uSize > uFileSize_ - sample.uOffset) {
            failure.Set(sample.uOffset, Sprintf("truncated: sample %u of track %u (%u bytes) ends beyond the end of "
                                               "the file (%llu bytes)",
                                               cursor.Index() - 1, track.uTrackId, sample.uSize,
                                               static_cast<unsigned long long>(uFileSize_)));
            return false;
        }
    }
    return !failure.Failed();
}

bool Mp4File::Cursor::Next(Mp4Sample &sample, Failure &failure)
{
    if (uIndex_ >= track_.uSampleCount)
        return false;
    while (uLeftInChunk_ == 0) {
        if (uChunk_ >= track_.uChunkCount) {
            failure.Set(file_.uMoovOffset_,
                        Sprintf("track %u: the chunk tables place only %u of the %u samples of 'stsz'",
                               track_.uTrackId, uIndex_, track_.uSampleCount));
            return false;
        }
        while (uRun_ + 1 < track_.uRunCount && file_.U32(track_.uRuns + 12 * size_t{uRun_ + 1}) <= uChunk_ + 1)
            ++uRun_;
        uLeftInChunk_ = file_.U32(track_.uRuns + 12 * size_t{uRun_} + 4);
        uNextOffset_ = track_.bChunk64 ? file_.U64(track_.uChunks + 8 * size_t{uChunk_})
                                       : file_.U32(track_.uChunks + 4 * size_t{uChunk_});
        ++uChunk_;
    }
    uint32_t uSize = track_.uFixedSize;
    if (uSize == 0) {
        switch (track_.uSizeFieldBits) {
        case 32: uSize = file_.U32(track_.uSizes + 4 * size_t{uIndex_}); break;
        case 16: uSize = uint32_t{file_.moov_[track_.uSizes + 2 * size_t{uIndex_}]} << 8 |
                         file_.moov_[track_.uSizes + 2 * size_t{uIndex_} + 1];
                 break;
        case 8: uSize = file_.moov_[track_.uSizes + uIndex_]; break;
        default: uSize = (file_.moov_[track_.uSizes + uIndex_ / 2] >> (uIndex_ % 2 ? 0 : 4)) & 0x0F; break;
        }
    }
    sample.uOffset = uNextOffset_;
    sample.uSize = uSize;
    sample.bSync = true;
    if (track_.bHasSyncTable) {
        while (uSync_ < track_.uSyncCount && file_.U32(track_.uSyncs + 4 * size_t{uSync_}) < uIndex_ + 1)
            ++uSync_;
        sample.bSync = uSync_ < track_.uSyncCount && file_.U32(track_.uSyncs + 4 * size_t{uSync_}) == uIndex_ + 1;
    }
    // Saturates instead of wrapping, so that a hostile offset stays beyond the end of the file.
    uNextOffset_ = uNextOffset_ > UINT64_MAX - uSize ? UINT64_MAX : uNextOffset_ + uSize;
    --uLeftInChunk_;
    ++uIndex_;
    return true;
}

} // namespace vorcal::cli
