#include "media.hpp"

#include <algorithm>
#include <array>
#include <cstring>

#include <vorcal/audio_tools.h>
#include <vorcal/video_tools.h>

#include "mp4.hpp"

namespace vorcal::cli {

namespace {

constexpr size_t kDetectBytes = 65536;
constexpr size_t kReadChunk = 65536;

constexpr std::array<uint32_t, 13> kAdtsRates = {96000, 88200, 64000, 48000, 44100, 32000, 24000,
                                                 22050, 16000, 12000, 11025, 8000,  7350};
// Bytes after the header byte of each AMR frame type in storage files (RFC 4867 5.3); -1 marks
// types the format reserves.
constexpr std::array<int, 16> kAmrNbBytes = {12, 13, 15, 17, 19, 20, 26, 31, 5, -1, -1, -1, -1, -1, -1, 0};
constexpr std::array<int, 16> kAmrWbBytes = {17, 23, 32, 36, 40, 46, 50, 58, 60, 5, -1, -1, -1, -1, 0, 0};
constexpr char kAmrNbMagic[] = "#!AMR\n";
constexpr char kAmrWbMagic[] = "#!AMR-WB\n";

uint32_t HostU32(const uint8_t *p)
{
    uint32_t v;
    std::memcpy(&v, p, 4);
    return v;
}

// Bytes of an ID3v2 tag at p (ID3v2.4 3.1: ten header bytes, a synchsafe size, a footer when
// flagged), or 0 when there is none.
uint64_t Id3v2Size(const uint8_t *p, size_t uSize)
{
    if (uSize < 10 || std::memcmp(p, "ID3", 3) != 0 || p[3] == 0xFF || p[4] == 0xFF ||
        ((p[6] | p[7] | p[8] | p[9]) & 0x80))
        return 0;
    const uint64_t uBody = uint64_t{p[6]} << 21 | uint64_t{p[7]} << 14 | uint64_t{p[8]} << 7 | p[9];
    return 10 + uBody + ((p[5] & 0x10) ? 10 : 0);
}

bool IsAdtsHeader(const uint8_t *p, size_t uSize)
{
    return uSize >= 7 && p[0] == 0xFF && (p[1] & 0xF6) == 0xF0 && ((p[2] >> 2) & 0x0F) < 13 &&
           _GetAACFrameLength(p) >= ((p[1] & 1) ? 7u : 9u);
}

// The value of the first start code (the byte after 00 00 01) within the first bytes, allowing
// leading zero bytes; -1 when the data does not begin with one.
int FirstStartCode(const uint8_t *p, size_t uSize, size_t &uAt)
{
    size_t i = 0;
    while (i < uSize && i < 8 && p[i] == 0)
        ++i;
    if (i < 2 || i >= uSize || p[i] != 1 || i + 1 >= uSize)
        return -1;
    uAt = i - 2;
    return p[i + 1];
}

// The value of the next start code from uFrom, or -1.
int NextStartCode(const uint8_t *p, size_t uSize, size_t uFrom, size_t &uAt)
{
    for (size_t i = uFrom; i + 3 < uSize; ++i)
        if (p[i] == 0 && p[i + 1] == 0 && p[i + 2] == 1) {
            uAt = i;
            return p[i + 3];
        }
    return -1;
}

bool ContainsStartCode(const uint8_t *p, size_t uSize, int iValue)
{
    size_t uAt = 0;
    for (int v = NextStartCode(p, uSize, 0, uAt); v >= 0; v = NextStartCode(p, uSize, uAt + 3, uAt))
        if (v == iValue)
            return true;
    return false;
}

// An HEVC unit that may begin a stream (ITU-T H.265 7.3.1.2): a VPS, SPS, PPS, access unit
// delimiter, prefix SEI or IDR/CRA slice of the base layer with nuh_temporal_id_plus1 1-7. The
// second header byte then lies in 1-7, which no H.264 SPS (profile_idc), first slice (a
// first_mb_in_slice of 0 begins with a 1 bit) or PPS (pic_parameter_set_id 0 alike) puts there.
bool IsHevcStreamStart(const uint8_t *pHeader, size_t uLeft)
{
    if (uLeft < 2 || (pHeader[0] & 0x81) != 0 || pHeader[1] == 0 || pHeader[1] > 7)
        return false;
    const unsigned uType = pHeader[0] >> 1;
    return (uType >= CAL_HEVC_NAL_VPS && uType <= CAL_HEVC_NAL_AUD) || uType == CAL_HEVC_NAL_PREFIX_SEI ||
           (uType >= 19 && uType <= 21); // IDR_W_RADL, IDR_N_LP, CRA_NUT
}

// Classifies data that begins with a start code: MPEG-4 Visual headers and VOPs, MPEG-1/2
// sequence and GOP headers, HEVC NAL units, or H.264 NAL units (whose header byte never has bit
// 7 set).
bool DetectStartCodeFormat(const uint8_t *p, size_t uSize, Format &format)
{
    size_t uAt = 0;
    const int iFirst = FirstStartCode(p, uSize, uAt);
    if (iFirst < 0)
        return false;
    if (iFirst == 0xB0 || iFirst == 0xB5 || iFirst == 0xB6) {
        format = Format::Mpeg4Visual;
    } else if (iFirst == 0xB3 || iFirst == 0xB8) {
        format = Format::Mpeg12Video;
    } else if (iFirst == 0x00) {
        // A video object start is followed by its layer; a picture start by slices.
        size_t uNext = 0;
        const int iNext = NextStartCode(p, uSize, uAt + 3, uNext);
        format = iNext >= 0x20 && iNext <= 0x2F ? Format::Mpeg4Visual : Format::Mpeg12Video;
    } else if (IsHevcStreamStart(p + uAt + 3, uSize - uAt - 3)) {
        format = Format::HevcAnnexB;
    } else if (iFirst < 0x80 && ContainsStartCode(p, uSize, 0xB6)) {
        format = Format::Mpeg4Visual;
    } else if (iFirst < 0x80 && (iFirst & 0x1F) != 0) {
        format = Format::AnnexB;
    } else if (iFirst >= 0x20 && iFirst <= 0x2F) {
        format = Format::Mpeg4Visual; // a video object layer (H.264 has no NAL unit type 0)
    } else {
        return false;
    }
    return true;
}

// Records of a dump chain through the window: each length fits, and the chain either ends
// exactly at the end of the input or leaves the window with a plausible length.
bool LooksLikeDump(const uint8_t *p, size_t uSize, bool bAtEnd)
{
    size_t uPos = 0;
    size_t uRecords = 0;
    while (uPos + 4 <= uSize) {
        const uint32_t uLen = HostU32(p + uPos);
        if (uLen > kMaxFrameBytes)
            return false;
        // A record that leaves the window is believable after a whole one.
        if (uLen > uSize - uPos - 4)
            return !bAtEnd && uRecords > 0;
        uPos += 4 + size_t{uLen};
        ++uRecords;
    }
    return uRecords > 0 && (uPos == uSize || !bAtEnd);
}

// ---------------------------------------------------------------------------------------------
// A sliding window over a sequential input.
class Window {
public:
    explicit Window(Input &input) : input_(input) {}
    // At least uWant bytes from the window start, fewer only at the end of the input.
    bool Fill(size_t uWant, Failure &failure)
    {
        while (Size() < uWant && !bEnd_) {
            if (uStart_ > 0 && uStart_ >= uEnd_ / 2) {
                std::memmove(buffer_.data(), buffer_.data() + uStart_, uEnd_ - uStart_);
                uEnd_ -= uStart_;
                uStart_ = 0;
            }
            // The storage only grows; reads land behind what is held.
            const size_t uRoom = std::max(kReadChunk, uWant - Size());
            if (buffer_.size() < uEnd_ + uRoom)
                buffer_.resize(uEnd_ + uRoom);
            size_t uGot = 0;
            if (!input_.Read(buffer_.data() + uEnd_, buffer_.size() - uEnd_, uGot, failure))
                return false;
            uEnd_ += uGot;
            bEnd_ = uGot == 0;
        }
        return true;
    }
    const uint8_t *Data() const { return buffer_.data() + uStart_; }
    size_t Size() const { return uEnd_ - uStart_; }
    uint64_t Offset() const { return uOffset_; }
    bool AtEnd() const { return bEnd_; }
    void Take(size_t uCount, Packet &packet)
    {
        packet.uOffset = uOffset_;
        packet.data.assign(Data(), Data() + uCount);
        Consume(uCount);
    }
    void Consume(size_t uCount)
    {
        uStart_ += uCount;
        uOffset_ += uCount;
    }

private:
    Input &input_;
    std::vector<uint8_t> buffer_;
    size_t uStart_ = 0, uEnd_ = 0;
    uint64_t uOffset_ = 0;
    bool bEnd_ = false;
};

Failure FrameTooLarge(uint64_t uOffset)
{
    Failure failure;
    failure.Set(uOffset, Sprintf("a frame longer than %llu MiB: not a stream this tool reads",
                                static_cast<unsigned long long>(kMaxFrameBytes >> 20)));
    return failure;
}

// ---------------------------------------------------------------------------------------------
// Elementary streams split at start codes: H.264 access units (ITU-T H.264 7.4.1.2.3), HEVC
// access units (ITU-T H.265 7.4.2.4.4), MPEG-4 Visual VOPs with the headers in front of them,
// MPEG-1/2 pictures with their sequence and GOP headers, H.263 pictures at their picture start
// codes.
class StartCodeReader : public PacketReader {
public:
    StartCodeReader(Input &input, Format format) : window_(input), format_(format) {}

    ReadResult Next(Packet &packet, Failure &failure) override
    {
        if (!window_.Fill(1, failure))
            return ReadResult::Error;
        if (window_.Size() == 0)
            return ReadResult::End;
        bSeenPicture_ = false;
        size_t uScan = 0;
        for (;;) {
            if (window_.Size() > kMaxFrameBytes) {
                failure = FrameTooLarge(window_.Offset());
                return ReadResult::Error;
            }
            size_t uBoundary = 0;
            const int r = FindBoundary(uScan, uBoundary);
            if (r > 0) {
                window_.Take(uBoundary, packet);
                return ReadResult::Packet;
            }
            // r == 0: no boundary before the last few bytes; r < 0: a start code needs more bytes.
            if (window_.AtEnd()) {
                window_.Take(window_.Size(), packet);
                return ReadResult::Packet;
            }
            if (!window_.Fill(window_.Size() + kReadChunk, failure))
                return ReadResult::Error;
        }
    }

private:
    // Looks for the start of the next frame from uScan. 1 found (uBoundary set), 0 none in what
    // the window holds, -1 a start code at the end needs more bytes. uScan advances past what is
    // settled so that no byte is examined twice.
    int FindBoundary(size_t &uScan, size_t &uBoundary)
    {
        const uint8_t *p = window_.Data();
        const size_t n = window_.Size();
        // H.264 looks at first_mb_in_slice, HEVC at first_slice_segment_in_pic_flag.
        const size_t uNeed = format_ == Format::AnnexB ? 5 : format_ == Format::HevcAnnexB ? 6 : 4;
        for (; uScan + 3 <= n; ++uScan) {
            const size_t i = uScan;
            if (p[i] != 0 || p[i + 1] != 0)
                continue;
            if (format_ == Format::H263) {
                if ((p[i + 2] & 0xFC) != 0x80)
                    continue;
                if (i > 0 && bSeenPicture_) {
                    uBoundary = i;
                    return 1;
                }
                bSeenPicture_ = true;
                uScan += 2;
                continue;
            }
            if (p[i + 2] != 1)
                continue;
            if (i + uNeed > n)
                return window_.AtEnd() ? 0 : -1;
            if (StartsFrame(p + i + 3, n - i - 3)) {
                uBoundary = i;
                // H.264 and HEVC: zero bytes in front of a start code (its 4-byte form,
                // trailing_zero_8bits) go with the frame that follows, as a NAL unit never ends
                // in a zero byte. Other video keeps them: its data may end in zeros.
                const bool bNal = format_ == Format::AnnexB || format_ == Format::HevcAnnexB;
                while (bNal && uBoundary > 0 && p[uBoundary - 1] == 0)
                    --uBoundary;
                if (uBoundary > 0)
                    return 1;
            }
            uScan += 2;
        }
        return 0;
    }

    // Updates the frame state for the start code whose value is p[0]; true when it begins a
    // new frame.
    bool StartsFrame(const uint8_t *p, size_t uLeft)
    {
        const uint8_t v = p[0];
        switch (format_) {
        case Format::AnnexB: {
            const unsigned t = v & 0x1F;
            if (t == 1 || t == 5 || t == 2) {
                // first_mb_in_slice is ue(v): a leading 1 bit codes 0, the first slice of a picture.
                const bool bFirstSlice = uLeft > 1 && (p[1] & 0x80);
                const bool bNew = bSeenPicture_ && bFirstSlice;
                bSeenPicture_ = true;
                return bNew;
            }
            return bSeenPicture_ && (t == 6 || t == 7 || t == 8 || t == 9 || (t >= 14 && t <= 18));
        }
        case Format::HevcAnnexB: {
            const unsigned t = (v >> 1) & 0x3F;
            if (t <= 31) { // a slice segment: first_slice_segment_in_pic_flag begins a picture
                const bool bFirstSlice = uLeft > 2 && (p[2] & 0x80);
                const bool bNew = bSeenPicture_ && bFirstSlice;
                bSeenPicture_ = true;
                return bNew;
            }
            // VPS, SPS, PPS, AUD, prefix SEI and types 41-44 and 48-55 after the last slice of a
            // picture begin the next access unit.
            return bSeenPicture_ && (t == 32 || t == 33 || t == 34 || t == 35 || t == 39 || (t >= 41 && t <= 44) ||
                                     (t >= 48 && t <= 55));
        }
        case Format::Mpeg4Visual: {
            // After a VOP every start code begins the next frame, its headers included.
            const bool bNew = bSeenPicture_;
            if (v == 0xB6)
                bSeenPicture_ = true;
            return bNew;
        }
        default: { // MPEG-1/2: a picture, sequence or GOP header after a picture
            const bool bNew = bSeenPicture_ && (v == 0x00 || v == 0xB3 || v == 0xB8);
            if (v == 0x00)
                bSeenPicture_ = true;
            return bNew;
        }
        }
    }

    Window window_;
    Format format_;
    bool bSeenPicture_ = false;
};

// ADTS frames (ISO/IEC 14496-3 1.A.2), with ID3v2 tags skipped wherever they stand and a
// trailing ID3v1 tag ignored.
class AdtsReader : public PacketReader {
public:
    explicit AdtsReader(Input &input) : window_(input) {}
    ReadResult Next(Packet &packet, Failure &failure) override
    {
        for (;;) {
            if (!window_.Fill(10, failure))
                return ReadResult::Error;
            const uint8_t *p = window_.Data();
            size_t n = window_.Size();
            if (n == 0)
                return ReadResult::End;
            if (const uint64_t uTag = Id3v2Size(p, n)) {
                if (!SkipBytes(uTag, failure))
                    return ReadResult::Error;
                continue;
            }
            // An ID3v1 tag: the last 128 bytes, starting "TAG".
            if (n >= 3 && std::memcmp(p, "TAG", 3) == 0) {
                if (!window_.Fill(129, failure))
                    return ReadResult::Error;
                if (window_.Size() == 128 && window_.AtEnd()) {
                    window_.Consume(128);
                    return ReadResult::End;
                }
                p = window_.Data(); // the window may have moved
                n = window_.Size();
            }
            if (n < 7) {
                failure.Set(window_.Offset(), Sprintf("truncated ADTS header: %zu bytes left", n));
                return ReadResult::Error;
            }
            if (!IsAdtsHeader(p, n)) {
                failure.Set(window_.Offset(), Sprintf("no ADTS frame here (bytes %02X %02X %02X)", p[0], p[1], p[2]));
                return ReadResult::Error;
            }
            const size_t uLen = _GetAACFrameLength(p);
            if (!window_.Fill(uLen, failure))
                return ReadResult::Error;
            if (window_.Size() < uLen) {
                failure.Set(window_.Offset(), Sprintf("truncated: the ADTS frame has %zu bytes, %zu are left", uLen,
                                                     window_.Size()));
                return ReadResult::Error;
            }
            window_.Take(uLen, packet);
            return ReadResult::Packet;
        }
    }

private:
    bool SkipBytes(uint64_t uCount, Failure &failure)
    {
        while (uCount > 0) {
            if (!window_.Fill(1, failure))
                return false;
            if (window_.Size() == 0)
                return true;
            const size_t uStep = static_cast<size_t>(std::min<uint64_t>(uCount, window_.Size()));
            window_.Consume(uStep);
            uCount -= uStep;
        }
        return true;
    }
    Window window_;
};

// AMR and AMR-WB storage files (RFC 4867 5): a magic line, then frames of one header byte and
// the speech bits of its frame type.
class AmrReader : public PacketReader {
public:
    AmrReader(Input &input, bool bWideband) : window_(input), bWideband_(bWideband) {}
    ReadResult Next(Packet &packet, Failure &failure) override
    {
        if (!bMagicDone_) {
            const size_t uMagic = bWideband_ ? sizeof kAmrWbMagic - 1 : sizeof kAmrNbMagic - 1;
            if (!window_.Fill(uMagic, failure))
                return ReadResult::Error;
            window_.Consume(std::min(uMagic, window_.Size()));
            bMagicDone_ = true;
        }
        if (!window_.Fill(1, failure))
            return ReadResult::Error;
        if (window_.Size() == 0)
            return ReadResult::End;
        const uint8_t uHeader = window_.Data()[0];
        const unsigned uType = (uHeader >> 3) & 0x0F;
        const int iBytes = (bWideband_ ? kAmrWbBytes : kAmrNbBytes)[uType];
        if (iBytes < 0 || (uHeader & 0x83)) {
            failure.Set(window_.Offset(), Sprintf("not an AMR%s frame header: %02X (frame type %u)",
                                                 bWideband_ ? "-WB" : "", uHeader, uType));
            return ReadResult::Error;
        }
        const size_t uLen = 1 + static_cast<size_t>(iBytes);
        if (!window_.Fill(uLen, failure))
            return ReadResult::Error;
        if (window_.Size() < uLen) {
            failure.Set(window_.Offset(), Sprintf("truncated: frame type %u has %zu bytes, %zu are left", uType, uLen,
                                                 window_.Size()));
            return ReadResult::Error;
        }
        window_.Take(uLen, packet);
        return ReadResult::Packet;
    }

private:
    Window window_;
    bool bWideband_;
    bool bMagicDone_ = false;
};

// Frame dumps: records of a 4-byte length in host byte order and that many bytes. The payload
// is read as it arrives, so a length that lies allocates no more than the input holds.
class DumpReader : public PacketReader {
public:
    explicit DumpReader(Input &input) : input_(input) {}
    ReadResult Next(Packet &packet, Failure &failure) override
    {
        const uint64_t uAt = input_.Position();
        uint8_t length[4];
        size_t uGot = 0, uHave = 0;
        while (uHave < 4) {
            if (!input_.Read(length + uHave, 4 - uHave, uGot, failure))
                return ReadResult::Error;
            if (uGot == 0)
                break;
            uHave += uGot;
        }
        if (uHave == 0)
            return ReadResult::End;
        if (uHave < 4) {
            failure.Set(uAt, Sprintf("truncated: record %u has only %zu of the 4 bytes of its length", uRecord_, uHave));
            return ReadResult::Error;
        }
        const uint32_t uLen = HostU32(length);
        const uint64_t uLeft = input_.Seekable() ? input_.Size() - input_.Position() : UINT64_MAX;
        if (uLen > uLeft) {
            failure.Set(uAt, Sprintf("truncated: record %u has length %u but only %llu bytes follow", uRecord_, uLen,
                                    static_cast<unsigned long long>(uLeft)));
            return ReadResult::Error;
        }
        if (uLen > kMaxFrameBytes) {
            failure = FrameTooLarge(uAt);
            return ReadResult::Error;
        }
        packet.uOffset = uAt;
        packet.iContainerSync = -1;
        packet.data.clear();
        while (packet.data.size() < uLen) {
            const size_t uHad = packet.data.size();
            packet.data.resize(std::min<size_t>(uLen, uHad + kReadChunk));
            if (!input_.Read(packet.data.data() + uHad, packet.data.size() - uHad, uGot, failure))
                return ReadResult::Error;
            packet.data.resize(uHad + uGot);
            if (uGot == 0) {
                failure.Set(uAt, Sprintf("truncated: record %u has length %u but only %zu bytes follow", uRecord_, uLen,
                                        packet.data.size()));
                return ReadResult::Error;
            }
        }
        ++uRecord_;
        return ReadResult::Packet;
    }

private:
    Input &input_;
    uint32_t uRecord_ = 0;
};

// MP4 samples of one track, read at their offsets.
class Mp4Reader : public PacketReader {
public:
    Mp4Reader(Input &input, const Mp4File &file, const Mp4Track &track) : input_(input), cursor_(file, track) {}
    ReadResult Next(Packet &packet, Failure &failure) override
    {
        Mp4Sample sample;
        if (!cursor_.Next(sample, failure))
            return failure.Failed() ? ReadResult::Error : ReadResult::End;
        if (sample.uSize > kMaxFrameBytes) {
            failure = FrameTooLarge(sample.uOffset);
            return ReadResult::Error;
        }
        packet.uOffset = sample.uOffset;
        packet.iContainerSync = sample.bSync ? 1 : 0;
        packet.data.resize(sample.uSize);
        if (sample.uSize && !input_.ReadAt(sample.uOffset, packet.data.data(), sample.uSize, failure))
            return ReadResult::Error;
        return ReadResult::Packet;
    }

private:
    Input &input_;
    Mp4File::Cursor cursor_;
};

// A reader that first hands out a packet read ahead while the input was being described.
class PendingReader : public PacketReader {
public:
    PendingReader(std::unique_ptr<PacketReader> inner, Packet first, bool bHaveFirst)
        : inner_(std::move(inner)), first_(std::move(first)), bHaveFirst_(bHaveFirst)
    {
    }
    ReadResult Next(Packet &packet, Failure &failure) override
    {
        if (bHaveFirst_) {
            bHaveFirst_ = false;
            packet = std::move(first_);
            return ReadResult::Packet;
        }
        return inner_->Next(packet, failure);
    }

private:
    std::unique_ptr<PacketReader> inner_;
    Packet first_;
    bool bHaveFirst_;
};

// AMR-NB or AMR-WB when the bytes are one storage-format frame of either (RFC 4867 5.3: header
// byte with the quality bit set and zero padding, then the bytes of its frame type).
Codec AmrCodecOfFrame(const std::vector<uint8_t> &frame)
{
    if (frame.empty() || (frame[0] & 0x87) != 0x04)
        return Codec::Unknown;
    const unsigned uType = (frame[0] >> 3) & 0x0F;
    const int iSize = static_cast<int>(frame.size()) - 1;
    return kAmrNbBytes[uType] == iSize ? Codec::AmrNb : kAmrWbBytes[uType] == iSize ? Codec::AmrWb : Codec::Unknown;
}

// Best guess of the codec of a dump from its first record (the configuration) and its second.
void DescribeDump(StreamInfo &info, const Packet *pSecond)
{
    const std::vector<uint8_t> &c = info.config;
    size_t uAt = 0;
    const int iCode = FirstStartCode(c.data(), c.size(), uAt);
    CALHEVCConfig record;
    if (iCode >= 0 && IsHevcStreamStart(c.data() + uAt + 3, c.size() - uAt - 3)) {
        info.codec = Codec::Hevc;
        info.framing = Framing::AnnexB;
    } else if (iCode == 0xB0 || iCode == 0x00 || iCode == 0xB5) {
        info.codec = Codec::Mpeg4Visual;
    } else if (iCode == 0xB3) {
        info.codec = Codec::Mpeg2Video;
    } else if (iCode >= 0 && iCode < 0x80 && ((iCode & 0x1F) == 7 || (iCode & 0x1F) == 9 || (iCode & 0x1F) == 6)) {
        info.codec = Codec::H264;
        info.framing = Framing::AnnexB;
    } else if (c.size() >= 7 && c[0] == 1 && (c[5] & 0xE0) == 0xE0) {
        info.codec = Codec::H264;
        info.framing = Framing::LengthPrefixed;
        info.uNalLengthSize = (c[4] & 3u) + 1;
    } else if (c.size() <= INT32_MAX &&
               vorCALTools_HEVC_ParseHvcC(c.data(), static_cast<int32_t>(c.size()), &record) == CAL_HEVC_OK &&
               record.uConfigurationVersion == 1) {
        info.codec = Codec::Hevc;
        info.framing = Framing::LengthPrefixed;
        info.uNalLengthSize = record.uNALLengthSize;
    } else if (pSecond && IsAdtsHeader(pSecond->data.data(), pSecond->data.size())) {
        info.codec = Codec::Aac;
        info.bAdtsFrames = true;
    } else if (const Codec amr = pSecond ? AmrCodecOfFrame(pSecond->data) : Codec::Unknown; amr != Codec::Unknown) {
        info.codec = amr;
    } else if (c.size() >= 2 && c.size() <= 64 && (c[0] >> 3) >= 1) {
        info.codec = Codec::Aac; // an AudioSpecificConfig
    }
}

// What the first frame of an elementary stream tells about it.
void DescribeElementary(Format format, const Packet &first, StreamInfo &info)
{
    const std::vector<uint8_t> &d = first.data;
    const int32_t iLen = static_cast<int32_t>(d.size());
    info.uConfigOffset = first.uOffset;
    switch (format) {
    case Format::AnnexB: {
        info.codec = Codec::H264;
        info.framing = Framing::AnnexB;
        int32_t iRun = 0;
        if (const uint8_t *pRun = vorCALTools_AVC_ANNEXB_GetConfigStream(d.data(), iLen, &iRun)) {
            info.config.assign(pRun, pRun + iRun);
            info.uConfigOffset = first.uOffset + static_cast<uint64_t>(pRun - d.data());
        }
        break;
    }
    case Format::HevcAnnexB: {
        info.codec = Codec::Hevc;
        info.framing = Framing::AnnexB;
        int32_t iRun = 0;
        if (const uint8_t *pRun = vorCALTools_HEVC_GetConfigStream(d.data(), iLen, 0, &iRun)) {
            info.config.assign(pRun, pRun + iRun);
            info.uConfigOffset = first.uOffset + static_cast<uint64_t>(pRun - d.data());
        }
        break;
    }
    case Format::Mpeg4Visual: {
        info.codec = Codec::Mpeg4Visual;
        int32_t iRest = 0;
        const uint8_t *pVop = _PTOOL_FindVOP(d.data(), iLen, &iRest);
        info.config.assign(d.begin(), pVop ? d.begin() + (pVop - d.data()) : d.end());
        break;
    }
    case Format::Mpeg12Video: {
        size_t uAt = 0;
        int v = NextStartCode(d.data(), d.size(), 0, uAt);
        bool bExtension = false;
        for (; v >= 0 && v != 0x00 && v != 0xB8; v = NextStartCode(d.data(), d.size(), uAt + 3, uAt))
            bExtension |= v == 0xB5;
        info.codec = bExtension ? Codec::Mpeg2Video : Codec::Mpeg1Video;
        info.config.assign(d.begin(), v >= 0 ? d.begin() + static_cast<ptrdiff_t>(uAt) : d.end());
        break;
    }
    case Format::H263:
        info.codec = Codec::H263;
        break;
    case Format::Adts: {
        info.codec = Codec::Aac;
        info.bAdtsFrames = true;
        const unsigned uObjectType = (d[2] >> 6) + 1, uRateIndex = (d[2] >> 2) & 0x0F;
        const unsigned uChannelConfig = ((d[2] & 1u) << 2) | (d[3] >> 6);
        info.uSampleRate = uRateIndex < kAdtsRates.size() ? kAdtsRates[uRateIndex] : 0;
        info.uChannels = uChannelConfig == 7 ? 8 : uChannelConfig;
        // The AudioSpecificConfig an MP4 muxer would write for these frames.
        info.config = {static_cast<uint8_t>(uObjectType << 3 | uRateIndex >> 1),
                       static_cast<uint8_t>((uRateIndex & 1) << 7 | uChannelConfig << 3)};
        break;
    }
    case Format::Amr:
    case Format::AmrWb:
        info.codec = format == Format::Amr ? Codec::AmrNb : Codec::AmrWb;
        info.uSampleRate = format == Format::Amr ? 8000 : 16000;
        info.uChannels = 1;
        break;
    default:
        break;
    }
}

} // namespace

struct MediaFile::Impl {
    std::unique_ptr<Input> input;
    Mp4File mp4;
    std::unique_ptr<PacketReader> sequential; // the one reader of an elementary stream or dump
};

MediaFile::~MediaFile() = default;

bool DetectFormat(const uint8_t *p, size_t uSize, bool bAtEnd, Format &format)
{
    if (LooksLikeIsoBmff(p, uSize)) {
        format = Format::Mp4;
        return true;
    }
    if (uSize >= sizeof kAmrWbMagic - 1 && std::memcmp(p, kAmrWbMagic, sizeof kAmrWbMagic - 1) == 0) {
        format = Format::AmrWb;
        return true;
    }
    if (uSize >= sizeof kAmrNbMagic - 1 && std::memcmp(p, kAmrNbMagic, sizeof kAmrNbMagic - 1) == 0) {
        format = Format::Amr;
        return true;
    }
    const uint64_t uTag = Id3v2Size(p, uSize);
    if (uTag > 0 && (uTag >= uSize ? !bAtEnd : IsAdtsHeader(p + uTag, uSize - static_cast<size_t>(uTag)))) {
        format = Format::Adts;
        return true;
    }
    if (IsAdtsHeader(p, uSize)) {
        // The next frame must follow where this one says it ends.
        // The next frame must start where this one says it ends, when the window shows it.
        const size_t uNext = _GetAACFrameLength(p);
        if (uNext + 2 > uSize || (p[uNext] == 0xFF && (p[uNext + 1] & 0xF6) == 0xF0)) {
            format = Format::Adts;
            return true;
        }
    }
    if (uSize >= 3 && p[0] == 0 && p[1] == 0 && (p[2] & 0xFC) == 0x80) {
        format = Format::H263;
        return true;
    }
    if (DetectStartCodeFormat(p, uSize, format))
        return true;
    if (LooksLikeDump(p, uSize, bAtEnd)) {
        format = Format::Dump;
        return true;
    }
    return false;
}

std::unique_ptr<MediaFile> MediaFile::Open(std::unique_ptr<Input> input, Failure &failure, bool bElseDump)
{
    const auto head = input->Peek(kDetectBytes, failure);
    if (failure.Failed())
        return nullptr;
    if (head.empty()) {
        failure.Set(0, "the input is empty");
        return nullptr;
    }
    Format format{};
    if (!DetectFormat(head.data(), head.size(), head.size() < kDetectBytes, format)) {
        if (bElseDump)
            return OpenDump(std::move(input), failure);
        failure.Set(0, "unrecognised data: not MP4/MOV/3GP, H.264, HEVC, ADTS AAC, AMR, MPEG-4 Visual, H.263, "
                       "MPEG-1/2 video or a frame dump");
        return nullptr;
    }
    if (format == Format::Dump)
        return OpenDump(std::move(input), failure);

    std::unique_ptr<MediaFile> file(new MediaFile);
    file->format_ = format;
    file->impl_ = std::make_unique<Impl>();
    Impl &impl = *file->impl_;
    impl.input = std::move(input);
    Input &in = *impl.input;

    if (format == Format::Mp4) {
        if (!in.Seekable()) {
            failure.Set(0, "an MP4 file is read by seeking: give a file, not a pipe");
            return nullptr;
        }
        if (!impl.mp4.Open(in, failure))
            return nullptr;
        file->brand_ = impl.mp4.Brand();
        uint64_t uMoof = 0;
        if (impl.mp4.Fragmented(uMoof))
            file->notice_.Set(uMoof, "movie fragments ('moof') are not read yet: only the samples of the 'moov' "
                                     "box are listed");
        for (const Mp4Track &track : impl.mp4.Tracks()) {
            StreamInfo info;
            info.uIndex = static_cast<uint32_t>(file->streams_.size());
            info.codec = track.codec;
            info.sampleEntry = track.sampleEntry;
            info.uTrackId = track.uTrackId;
            info.uObjectType = track.uObjectType;
            info.config = track.config;
            info.uNalLengthSize = track.uNalLengthSize;
            const bool bNal = track.codec == Codec::H264 || track.codec == Codec::Hevc;
            info.framing = bNal ? Framing::LengthPrefixed : Framing::None;
            if (bNal && info.uNalLengthSize == 0)
                info.uNalLengthSize = 4;
            info.uWidth = track.uWidth;
            info.uHeight = track.uHeight;
            info.uSarNum = track.uSarNum;
            info.uSarDen = track.uSarDen;
            info.uSampleRate = track.uSampleRate;
            info.uChannels = track.uChannels;
            info.iFrameCount = track.uSampleCount;
            // mp4v also carries MPEG-2 (objectTypeIndication 0x60-0x65) and MPEG-1 video (0x6A).
            if (track.codec == Codec::Mpeg4Visual && track.uObjectType >= 0x60 && track.uObjectType <= 0x65)
                info.codec = Codec::Mpeg2Video;
            else if (track.codec == Codec::Mpeg4Visual && track.uObjectType == 0x6A)
                info.codec = Codec::Mpeg1Video;
            file->streams_.push_back(std::move(info));
        }
        if (file->streams_.empty()) {
            failure.Set(0, "the movie has no tracks");
            return nullptr;
        }
        return file;
    }

    // Elementary streams: the first frame describes the stream.
    std::unique_ptr<PacketReader> reader;
    switch (format) {
    case Format::Adts: reader = std::make_unique<AdtsReader>(in); break;
    case Format::Amr:
    case Format::AmrWb: reader = std::make_unique<AmrReader>(in, format == Format::AmrWb); break;
    default: reader = std::make_unique<StartCodeReader>(in, format); break;
    }
    Packet first;
    StreamInfo info;
    const ReadResult r = reader->Next(first, failure);
    if (r == ReadResult::Error)
        return nullptr;
    if (r == ReadResult::End) {
        failure.Set(in.Position(), "no frame in the stream");
        return nullptr;
    }
    DescribeElementary(format, first, info);
    file->streams_.push_back(std::move(info));
    impl.sequential = std::make_unique<PendingReader>(std::move(reader), std::move(first), true);
    return file;
}

std::unique_ptr<MediaFile> MediaFile::OpenDump(std::unique_ptr<Input> input, Failure &failure)
{
    std::unique_ptr<MediaFile> file(new MediaFile);
    file->format_ = Format::Dump;
    file->impl_ = std::make_unique<Impl>();
    Impl &impl = *file->impl_;
    impl.input = std::move(input);
    auto reader = std::make_unique<DumpReader>(*impl.input);
    Packet config, second;
    ReadResult r = reader->Next(config, failure);
    if (r == ReadResult::Error)
        return nullptr;
    if (r == ReadResult::End) {
        failure.Set(0, "the dump holds no record");
        return nullptr;
    }
    StreamInfo info;
    info.config = config.data;
    info.uConfigOffset = config.uOffset;
    r = reader->Next(second, failure);
    if (r == ReadResult::Error)
        return nullptr;
    DescribeDump(info, r == ReadResult::Packet ? &second : nullptr);
    file->streams_.push_back(std::move(info));
    impl.sequential = std::make_unique<PendingReader>(std::move(reader), std::move(second), r == ReadResult::Packet);
    return file;
}

std::unique_ptr<PacketReader> MediaFile::Packets(size_t uStream)
{
    if (format_ == Format::Mp4) {
        if (uStream >= impl_->mp4.Tracks().size())
            return nullptr;
        return std::make_unique<Mp4Reader>(*impl_->input, impl_->mp4, impl_->mp4.Tracks()[uStream]);
    }
    if (uStream != 0)
        return nullptr;
    return std::move(impl_->sequential);
}

} // namespace vorcal::cli
