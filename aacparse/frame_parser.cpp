// The whole-frame parser: walks every raw_data_block of an ADTS frame or of a raw access unit
// (ISO/IEC 14496-3 1.6.2.1 AudioSpecificConfig) to its ID_END on a parser's own decoder state,
// finds SBR and parametric stereo in fill elements, and checks that the syntax ends exactly
// where the frame does.
//
// Bounds. The element parsers read through the unchecked reader, so the frame is copied into
// the parser's buffer, followed by zero bytes; the walk checks the position before every
// element and stops with CAL_AAC_PARSE_OVERRUN once it is past the frame. Within one element
// the reader can get past the end only so far: the ones of an escape prefix (and of sect_len
// pieces) come from the frame, so the escape's N + 4 bits reach at most one frame length
// beyond it; after that only zeros are read, and the largest element (a channel pair: two
// streams of at most 1024 lines, sections, scale factors and TNS) reads under 5 KB of them.
// A data stream element reads at most 512 bytes, a fill element 270, a program config element
// 310. kSlack covers the longest frame and these with room to spare. The SBR parser reads a
// copy of its payload with its own zero tail.
#include <cstring>

#include "aacparse/decoder.hpp"
#include "aacparse/reader.hpp"
#include "aacparse/sbr_internal.hpp"
#include "core/sal.hpp"

namespace {

constexpr uint32_t kMaxFrame = 8191; // aac_frame_length is 13 bits; longer access units are refused
constexpr uint32_t kSlack = 16384;         // zero bytes behind the frame (see above)
constexpr uint32_t kSbrTail = 1024; // zero bytes behind an SBR payload copy: an sbr_extension_data
                                    // of one channel reads fewer than 7000 bits whatever its bits
constexpr uint32_t kMaxPayload = 15 + 255 - 1; // bytes of one fill element's payloads

} // namespace

struct CALAACParser {
    VrAACDecoder_OnlyParsing dec;
    VrSBRState_OnlyParsing sbr;
    uint16_t uShortWidths[16];      // the short band widths of this parser's rate
    uint32_t uBandIndex;            // sampling_frequency_index the window information was built for
    uint32_t uSbrRate;              // core rate the SBR state was started with (0: not yet)
    bool bRaw;                      // frames are raw access units of an AudioSpecificConfig
    bool bUsable;                   // that AudioSpecificConfig describes a stream this parser reads
    bool bExplicitSBR;              // SBR / parametric stereo signalled in the AudioSpecificConfig
    bool bExplicitPS;
    uint32_t uAscRate;              // core rate and channels of the AudioSpecificConfig
    uint32_t uAscChannels;
    uint32_t uFrameDirty;           // bytes of aFrame that may be non-zero
    uint32_t uSbrDirty;             // bytes of aSbr that may be non-zero
    uint8_t aFill[kMaxPayload - 1]; // fill data of the fill element being read
    uint8_t aData[510];             // data_stream_element bytes
    uint8_t aSbr[kMaxPayload + 1 + kSbrTail];
    uint8_t aFrame[kMaxFrame + kSlack];
};

namespace vorcal::aacparse {
namespace {

enum Result : int32_t {
    kOk = CAL_AAC_PARSE_OK,
    kBadInput = CAL_AAC_PARSE_BAD_INPUT,
    kShort = CAL_AAC_PARSE_SHORT,
    kRefused = CAL_AAC_PARSE_REFUSED,
    kOverrun = CAL_AAC_PARSE_OVERRUN,
    kLeftover = CAL_AAC_PARSE_LEFTOVER,
};

constexpr uint32_t kExtSbrData = 13, kExtSbrDataCrc = 14; // extension_type of SBR payloads

// Puts n bytes at the start of a zero-tailed buffer and zeros what an earlier, longer copy left.
void Place(uint8_t *pDst, uint32_t &uDirty, const uint8_t *pSrc, uint32_t n)
{
    std::memcpy(pDst, pSrc, n);
    if (uDirty > n)
        std::memset(pDst + n, 0, uDirty - n);
    uDirty = n;
}

// Window information for the current sampling_frequency_index, with this parser's own short
// band widths (never the shared table).
void EnsureBands(CALAACParser &p)
{
    const uint32_t uIndex = p.dec.MCInfo.uSampleRateIdx;
    if (uIndex == p.uBandIndex)
        return;
    InfoInit(p.dec, RateRow(uIndex), p.uShortWidths);
    p.uBandIndex = uIndex;
}

void StartSbr(CALAACParser &p, uint32_t uRate)
{
    if (uRate == p.uSbrRate)
        return;
    sbrDecodeInitOnlyParsing(nullptr, &p.sbr, uRate);
    p.uSbrRate = uRate;
}

struct Walk {
    CALAACParser &p;
    CALAACFrameInfo &info;
    uint32_t uEndBits;            // bits of the frame
    uint32_t uLastChannel = kIdEND; // id_syn_ele of the last channel element (the SBR data's owner)
    bool bSbr = false;
    bool bPs = false;
    bool bEnd = false;            // an ID_END was read

    bool Past() const { return p.dec.Bits.uProcessedBits > uEndBits; }
};

// Before each extension payload: SBR payloads go to the SBR parser on a copy of their count
// bytes; the fill element then steps over the payload by its count as for any other type.
void SbrPayload(void *pContext, VrAACDecoder_OnlyParsing &dec, uint32_t uCount)
{
    Walk &w = *static_cast<Walk *>(pContext);
    CALAACParser &p = w.p;
    const uint32_t uType = bits::Show(dec.Bits, 4);
    if ((uType != kExtSbrData && uType != kExtSbrDataCrc) || uCount > kMaxPayload)
        return;
    const uint32_t uBitPos = dec.Bits.uBitPos;
    const uint32_t uEnd = uBitPos + 8 * uCount; // payload end, in bits from the copy's start
    const uint32_t uBytes = (uEnd + 7) / 8;
    Place(p.aSbr, p.uSbrDirty, dec.Bits.pCurrent, uBytes);
    if (uEnd % 8)
        // Clears the next element's bits.
        p.aSbr[uBytes - 1] &= static_cast<uint8_t>(0xFF00u >> (uEnd % 8));
    VrBitReader_OnlyParsing reader;
    VrInitBits_OnlyParsing(&reader, p.aSbr);
    bits::Advance(reader, uBitPos);
    bool bTables = false;
    const int32_t iResult = sbr::ExtensionData(&reader, &p.sbr, w.uLastChannel, bTables);
    // Without a header in force the SBR data cannot be read, so nothing in it counts.
    if (p.sbr.uHeaderCount > 0 && bTables) {
        w.bSbr = true;
        w.bPs = w.bPs || iResult == 2;
    }
}

// One raw_data_block() up to and including the byte alignment after its ID_END. The state is
// this parser's own and nobody reads its values, so the channel streams are walked without
// storing spectral lines or generating noise.
Result RawDataBlock(Walk &w)
{
    VrAACDecoder_OnlyParsing &dec = w.p.dec;
    VrBitReader_OnlyParsing &b = dec.Bits;
    // The implicit channel configuration is rebuilt by every block; a program config element
    // keeps its map.
    ResetMCInfo(dec, dec.MCInfo);
    dec.uImplicitCPE = 0;
    for (;;) {
        if (w.Past())
            return kOverrun;
        const uint32_t uId = bits::Get(b, 3);
        ++w.info.auElements[uId];
        bool bOk = true;
        uint32_t uTag = 0, uCount = 0;
        switch (uId) {
        case kIdSCE:
            bOk = SingleChannelElement(dec, dec.MCInfo, false) == 0;
            w.uLastChannel = uId;
            break;
        case kIdCPE:
            bOk = ChannelPairElement(dec, dec.MCInfo, false) == 0;
            w.uLastChannel = uId;
            break;
        case kIdLFE:
            bOk = LfeChannelElement(dec, dec.MCInfo, false) == 1;
            w.uLastChannel = uId;
            break;
        case kIdCCE:
            bOk = false; // coupling channel elements have no parser
            break;
        case kIdDSE:
            DataStreamElement(dec, uTag, uCount, w.p.aData);
            break;
        case kIdPCE:
            bOk = ProgramConfig(dec) >= 0;
            EnsureBands(w.p); // its sampling_frequency_index becomes the current one
            break;
        case kIdFIL:
            FillElement(dec, w.p.aFill, SbrPayload, &w);
            break;
        default: // kIdEND
            w.info.uBits = b.uProcessedBits;
            w.bEnd = true;
            bits::ByteAlign(b);
            return w.Past() ? kOverrun : kOk;
        }
        if (w.Past())
            return kOverrun;
        if (!bOk)
            return kRefused;
    }
}

// The frame's end after the last block: exact, short of it, or beyond.
Result EndOfFrame(const Walk &w)
{
    const uint32_t uBits = w.p.dec.Bits.uProcessedBits;
    return uBits > w.uEndBits ? kOverrun : uBits < w.uEndBits ? kLeftover : kOk;
}

// adts_frame(): header, the raw_data_block_position words of a protected frame with several
// blocks, then each block and, in that case, its CRC word (ISO/IEC 13818-7 6.2).
Result AdtsFrame(CALAACParser &p, const uint8_t *pFrame, uint32_t uLen, CALAACFrameInfo &info,
                 Walk &w)
{
    if (uLen < 2 || !aac::IsAdtsSync(pFrame))
        return kBadInput;
    VrAACDecoder_OnlyParsing &dec = p.dec;
    const bool bCrc = (pFrame[1] & 1) == 0;
    const uint32_t uHeaderBytes = bCrc ? 9 : 7;
    Place(p.aFrame, p.uFrameDirty, pFrame, uLen < uHeaderBytes ? uLen : uHeaderBytes);
    VrInitBits_OnlyParsing(&dec.Bits, p.aFrame);
    if (AdtsHeader(dec) != 0)
        return kBadInput;
    const VrADTSHeader_OnlyParsing &h = dec.ADTS;
    info.uSampleRate = aac::RateOfIndex(h.uSampleRateIdx);
    info.uChannels = h.uChannelConfig;
    info.uFrameBytes = h.uFrameLength;
    if (uLen < uHeaderBytes || uLen < h.uFrameLength)
        return kShort;
    const uint32_t uBytes = h.uFrameLength > uHeaderBytes ? h.uFrameLength : uHeaderBytes;
    Place(p.aFrame, p.uFrameDirty, pFrame, uBytes); // the reader's position stays valid
    w.uEndBits = 8 * h.uFrameLength;
    EnsureBands(p);
    StartSbr(p, info.uSampleRate);
    const bool bBlockCrc = bCrc && h.uRawDataBlocks > 0;
    if (bBlockCrc)
        // raw_data_block_position; the header read crc_check.
        bits::Advance(dec.Bits, 16 * h.uRawDataBlocks);
    for (uint32_t i = 0; i <= h.uRawDataBlocks; ++i) {
        const Result r = RawDataBlock(w);
        if (r != kOk)
            return r;
        if (bBlockCrc)
            bits::Advance(dec.Bits, 16);
    }
    return EndOfFrame(w);
}

Result RawFrame(CALAACParser &p, const uint8_t *pFrame, uint32_t uLen, CALAACFrameInfo &info,
                Walk &w)
{
    info.uFrameBytes = uLen;
    if (!p.bUsable || uLen > kMaxFrame)
        return kBadInput;
    Place(p.aFrame, p.uFrameDirty, pFrame, uLen);
    VrInitBits_OnlyParsing(&p.dec.Bits, p.aFrame);
    w.uEndBits = 8 * uLen;
    EnsureBands(p);
    const Result r = RawDataBlock(w);
    return r != kOk ? r : EndOfFrame(w);
}

// AudioSpecificConfig (ISO/IEC 14496-3 1.6.2.1) with GASpecificConfig (4.4.1): the core object
// type must be AAC Main or LC with 1024-sample frames; object types 5 and 29 and the 0x2B7 /
// 0x548 sync extensions signal SBR and parametric stereo.
bool AudioSpecificConfig(CALAACParser &p, const uint8_t *pASC, uint32_t uLen)
{
    if (uLen == 0 || uLen > kMaxFrame)
        return false;
    Place(p.aFrame, p.uFrameDirty, pASC, uLen);
    VrAACDecoder_OnlyParsing &dec = p.dec;
    VrBitReader_OnlyParsing &b = dec.Bits;
    VrInitBits_OnlyParsing(&b, p.aFrame);
    const uint32_t uTotal = 8 * uLen;
    auto left = [&] { return b.uProcessedBits < uTotal ? uTotal - b.uProcessedBits : 0; };
    auto objectType = [&] {
        const uint32_t t = bits::Get(b, 5);
        return t == 31 ? 32 + bits::Get(b, 6) : t;
    };
    // sampling_frequency_index, or the explicit 24-bit rate when it is one of the twelve.
    auto rateIndex = [&](uint32_t &uIndex) {
        uIndex = bits::Get(b, 4);
        if (uIndex == 15) {
            const uint32_t uRate = bits::Get(b, 24);
            const int32_t iIndex = aac::IndexOfRate(uRate);
            uIndex = iIndex < 0 ? get_samplerate_idxOnlyParsing(uRate) : uint32_t(iIndex);
            return iIndex >= 0;
        }
        return uIndex < aac::kSampleRates.size();
    };
    uint32_t uType = objectType(), uIndex = 0, uExtIndex = 0;
    if (!rateIndex(uIndex))
        return false;
    const uint32_t uConfig = bits::Get(b, 4);
    p.uAscRate = aac::RateOfIndex(uIndex);
    p.uAscChannels = uConfig;
    if (uType == 5 || uType == 29) {
        p.bExplicitSBR = true;
        p.bExplicitPS = uType == 29;
        rateIndex(uExtIndex);
        uType = objectType();
    }
    if ((uType != 1 && uType != 2) || uConfig > 7)
        return false;
    if (bits::Get1(b)) // frameLengthFlag: 960-sample frames have other band tables
        return false;
    if (bits::Get1(b)) // dependsOnCoreCoder
        bits::Get(b, 14); // coreCoderDelay
    const uint32_t uExtensionFlag = bits::Get1(b);
    dec.MCInfo.uProfile = uType - 1;
    dec.MCInfo.uSampleRateIdx = uIndex;
    if (uConfig == 0) {
        if (ProgramConfig(dec) < 0)
            return false;
        p.uAscChannels = dec.MCInfo.uChannels;
        if (dec.MCInfo.uSampleRateIdx != uIndex)
            return false;
    }
    if (uExtensionFlag)
        bits::Get1(b); // extensionFlag3
    if (!p.bExplicitSBR && left() >= 16 && bits::Get(b, 11) == 0x2B7 && objectType() == 5 &&
        bits::Get1(b)) {
        p.bExplicitSBR = true;
        rateIndex(uExtIndex);
        if (left() >= 12 && bits::Get(b, 11) == 0x548)
            p.bExplicitPS = bits::Get1(b) != 0;
    }
    EnsureBands(p);
    StartSbr(p, p.uAscRate);
    return true;
}

CALAACParser *Create(const uint8_t *pASC, int32_t iASCLen)
{
    auto *p = static_cast<CALAACParser *>(sal::Alloc(sizeof(CALAACParser)));
    if (!p)
        return nullptr;
    std::memset(p, 0, sizeof *p);
    ResetDecoder(p->dec);
    p->dec.pWindowInfo[VR_ONLY_LONG_SEQUENCE_OnlyParsing] = &p->dec.LongInfo;
    p->dec.pWindowInfo[VR_LONG_START_SEQUENCE_OnlyParsing] = &p->dec.LongInfo;
    p->dec.pWindowInfo[VR_EIGHT_SHORT_SEQUENCE_OnlyParsing] = &p->dec.ShortInfo;
    p->dec.pWindowInfo[VR_LONG_STOP_SEQUENCE_OnlyParsing] = &p->dec.LongInfo;
    p->uBandIndex = 0xFFFFFFFFu;
    if (pASC) {
        p->bRaw = true;
        p->bUsable = iASCLen > 0 && AudioSpecificConfig(*p, pASC, static_cast<uint32_t>(iASCLen));
    }
    return p;
}

int32_t ParseFrame(CALAACParser *p, const uint8_t *pFrame, int32_t iLen, CALAACFrameInfo *pInfo)
{
    if (!pInfo)
        return kBadInput;
    CALAACFrameInfo &info = *pInfo;
    std::memset(&info, 0, sizeof info);
    if (!p)
        return kBadInput;
    if (p->bRaw) {
        info.uSampleRate = p->uAscRate;
        info.uChannels = p->uAscChannels;
    }
    Walk w{*p, info, 0};
    Result r = kBadInput;
    if (pFrame && iLen > 0)
        r = p->bRaw ? RawFrame(*p, pFrame, static_cast<uint32_t>(iLen), info, w)
                    : AdtsFrame(*p, pFrame, static_cast<uint32_t>(iLen), info, w);
    if (!w.bEnd || (r != kOk && r != kLeftover))
        info.uBits = p->dec.Bits.uProcessedBits;
    if (!p->bRaw && info.uChannels == 0 && !p->dec.uImplicitConfig)
        info.uChannels = p->dec.MCInfo.uChannels; // channel_configuration 0: the program's channels
    info.uSBR = (p->bExplicitSBR || w.bSbr) ? 1 : 0;
    info.uPS = (p->bExplicitPS || w.bPs) ? 1 : 0;
    info.uOutSampleRate = info.uSBR ? 2 * info.uSampleRate : info.uSampleRate;
    info.uOutChannels = info.uPS ? 2 : info.uChannels;
    return r;
}

} // namespace
} // namespace vorcal::aacparse

extern "C" CALAACParser *vorCALTools_AAC_CreateParser(const uint8_t *pASC, int32_t iASCLen)
{
    return vorcal::aacparse::Create(pASC, iASCLen);
}

extern "C" int32_t vorCALTools_AAC_ParseFrame(CALAACParser *hParser, const uint8_t *pFrame,
                                              int32_t iLen, CALAACFrameInfo *pInfo)
{
    return vorcal::aacparse::ParseFrame(hParser, pFrame, iLen, pInfo);
}

extern "C" void vorCALTools_AAC_DestroyParser(CALAACParser *hParser)
{
    if (hParser)
        vorcal::sal::Free(hParser);
}
