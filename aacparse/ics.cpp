// individual_channel_stream() and its parts (ISO/IEC 13818-7 8.3, ISO/IEC 14496-3 4.4.2.7):
// ics_info, section_data, scale_factor_data, pulse_data, tns_data, spectral_data with its
// escape sequences, the M/S mask of a channel pair. Values are kept in the decoder state; the
// bits are walked exactly as a decoder must.
#include <cstring>

#include "aacparse/decoder.hpp"
#include "aacparse/huffman.hpp"
#include "aacparse/reader.hpp"

namespace vorcal::aacparse {
namespace {

using bits::Get1;
// Every field read here but the escape's N + 4 bits is 1 to 9 bits wide.
inline uint32_t Get(VrBitReader_OnlyParsing &b, uint32_t n) { return bits::GetShort(b, n); }

constexpr uint32_t kEightShort = VR_EIGHT_SHORT_SEQUENCE_OnlyParsing;
constexpr uint32_t kMaxBands = VR_AAC_MAX_BANDS_OnlyParsing;
constexpr uint32_t kMaxSections = VR_AAC_MAX_SECTIONS_OnlyParsing;
constexpr uint32_t kLines = VR_AAC_FRAME_LINES_OnlyParsing;
// Codebook numbers (ISO/IEC 14496-3 Table 4.150) and the one the M/S mask turns a noise band
// into when it repeats the first channel's noise.
constexpr uint32_t kZeroBook = 0, kEscBook = 11, kReservedBook = 12, kNoiseBook = 13,
                   kIntensityBook2 = 14, kIntensityBook = 15, kNoiseRepeatBook = 113;
constexpr int32_t kNoiseOffset = 90; // NOISE_OFFSET of 4.6.13.3

const VrWindowInfo_OnlyParsing *InfoOf(const VrAACDecoder_OnlyParsing &dec,
                                       const VrICS_OnlyParsing &ics)
{
    const VrWindowInfo_OnlyParsing *p = dec.pWindowInfo[ics.uWindowSequence & 3];
    return p && p->uBandsPerWindow ? p : nullptr;
}

// Window groups of an ics_info: one for long windows, else up to the group that ends at window 8.
uint32_t GroupCount(const VrICS_OnlyParsing &ics)
{
    if (ics.uWindowSequence != kEightShort)
        return 1;
    uint32_t g = 0;
    while (g + 1 < VR_AAC_MAX_WINDOWS_OnlyParsing && ics.uGroupEnds[g] < 8)
        ++g;
    return g + 1;
}

// The codebook and band range of each section, group by group, band indices over the block
// (group g, band k is g x bands per window + k).
template <typename Visit>
bool WalkSections(const VrICS_OnlyParsing &ics, const VrICS_OnlyParsing &wics,
                  uint32_t uBandsPerWindow, Visit &&visit)
{
    const uint32_t uSections = ics.uSections < kMaxSections ? ics.uSections : kMaxSections;
    const uint32_t uGroups = GroupCount(wics);
    uint32_t i = 0;
    for (uint32_t g = 0; g < uGroups; ++g) {
        uint32_t k = g * uBandsPerWindow;
        const uint32_t uGroupEnd = k + wics.uMaxSfb;
        while (k < uGroupEnd && i < uSections) {
            const uint32_t uEnd =
                ics.Section[i].uEndBand < kMaxBands ? ics.Section[i].uEndBand : kMaxBands;
            if (!visit(i, ics.Section[i].uCodebook, k, uEnd))
                return false;
            ++i;
            k = uEnd > k ? uEnd : k;
        }
    }
    return true;
}

// A bit offset from the reader's byte for inner loops, written back by Sync: one register
// instead of the reader's three fields.
struct Cursor {
    VrBitReader_OnlyParsing &b;
    const uint8_t *p;
    uint32_t uBit, uStart;
    explicit Cursor(VrBitReader_OnlyParsing &r)
        : b(r), p(r.pCurrent), uBit(r.uBitPos), uStart(r.uBitPos) {}
    // The next n bits, 1 <= n <= 25.
    uint32_t Peek(uint32_t n) const
    {
        uint32_t uWord;
        std::memcpy(&uWord, p + (uBit >> 3), 4);
#if defined(__BYTE_ORDER__) && __BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__
        uWord = __builtin_bswap32(uWord);
#endif
        return (uWord << (uBit & 7)) >> (32 - n);
    }
    void Sync()
    {
        bits::Advance(b, uBit - uStart);
        p = b.pCurrent;
        uBit = uStart = b.uBitPos;
    }
};

int32_t ScalefactorDiff(Cursor &c)
{
    const uint32_t uPeek = c.Peek(19);
    // Level 0 directly (most differences have codes of up to 6 bits), else the level search.
    const int32_t v =
        static_cast<int32_t>(uPeek >> 13) - static_cast<int32_t>(MaxVal_sclOnlyParsing[0]);
    const int32_t i0 = static_cast<int32_t>(CBsize_sclOnlyParsing[0]) + v; // in level 0 if v <= 0
    const huffman::ScalefactorHit hit =
        v <= 0 ? huffman::ScalefactorHit{bookscl0OnlyParsing[i0],
                                         huffman::kScalefactorLength0[static_cast<uint32_t>(i0)]}
               : huffman::FindScalefactor(huffman::kScalefactor, uPeek);
    c.uBit += hit.uLength;
    return static_cast<int32_t>(hit.uIndex) - 60;
}

// The escape sequence of a value of +-16 on a local reader (see Escape).
int32_t EscapeOn(VrBitReader_OnlyParsing &b, int32_t iValue)
{
    uint32_t n = 0;
    // CONTRACT: more than 8 ones of escape_prefix is invalid but read as it comes.
    while (Get1(b))
        ++n;
    const uint32_t uWidth = n + 4;
    uint32_t uWord = 0;
    if (uWidth > 16) {
        const uint32_t uHigh = bits::Get(b, uWidth - 16);
        uWord = (uHigh << 16) | bits::Get(b, 16);
    } else {
        uWord = bits::Get(b, uWidth);
    }
    const uint32_t uMagnitude = (uWidth < 32 ? 1u << uWidth : 0u) + uWord;
    return static_cast<int32_t>(iValue < 0 ? 0u - uMagnitude : uMagnitude);
}

// Codewords of codebook kBook (1-11) for uCount lines: quadruples for codebooks 1-4, pairs for
// 5-11; a sign bit per nonzero value in the unsigned books; escapes in codebook 11. One 24-bit
// peek holds a codeword (at most 16 bits) and its sign bits (at most 4); the reader works on a
// local copy. Without kStore only the bits are walked.
template <uint32_t kBook, bool kStore>
void DecodeLines(VrAACDecoder_OnlyParsing &dec, int16_t *piOut, uint32_t uCount)
{
    constexpr uint32_t kDim = kBook <= 4 ? 4 : 2;
    constexpr bool kSigned = kBook == 1 || kBook == 2 || kBook == 5 || kBook == 6;
    VrBitReader_OnlyParsing b = dec.Bits;
    const huffman::SpectralRow row = huffman::RowOf(kBook);
    if constexpr (!kStore) {
        // The walk keeps one bit offset from the reader's byte and updates the reader at the end
        // (and around escapes, which read through it).
        const uint8_t *p = b.pCurrent;
        uint32_t uBit = b.uBitPos, uSynced = b.uBitPos;
        for (uint32_t j = 0; j + kDim <= uCount; j += kDim) {
            uint32_t uWord;
            std::memcpy(&uWord, p + (uBit >> 3), 4);
#if defined(__BYTE_ORDER__) && __BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__
            uWord = __builtin_bswap32(uWord);
#endif
            const huffman::SpectralHit hit =
                huffman::FindSpectral(row, (uWord << (uBit & 7)) >> 16);
            uBit += hit.uLength;
            if constexpr (!kSigned) { // a sign bit for each nonzero byte of the entry
                uint32_t uQuad;
                std::memcpy(&uQuad, hit.pEntry->iValue, 4);
                const uint32_t uNonzero =
                    ((((uQuad & 0x7F7F7F7Fu) + 0x7F7F7F7Fu) | uQuad) & 0x80808080u) >> 7;
                uBit += (uNonzero * 0x01010101u) >> 24; // the byte sum
            }
            if constexpr (kBook == kEscBook) {
                if (hit.pEntry->iValue[0] == 16 || hit.pEntry->iValue[1] == 16) {
                    bits::Advance(b, uBit - uSynced);
                    for (uint32_t d = 0; d < 2; ++d)
                        if (hit.pEntry->iValue[d] == 16)
                            EscapeOn(b, 16);
                    p = b.pCurrent;
                    uBit = uSynced = b.uBitPos;
                }
            }
        }
        bits::Advance(b, uBit - uSynced);
        dec.Bits = b;
        return;
    }
    for (uint32_t j = 0; j + kDim <= uCount; j += kDim) {
        const uint32_t uPeek = bits::ShowShort(b, 24);
        const huffman::SpectralHit hit = huffman::FindSpectral(row, uPeek >> 8);
        uint32_t uLength = hit.uLength;
        int32_t v[kDim];
        for (uint32_t d = 0; d < kDim; ++d)
            v[d] = hit.pEntry->iValue[d];
        if constexpr (!kSigned) {
            uint32_t uSigns = 0;
            for (uint32_t d = 0; d < kDim; ++d)
                uSigns += v[d] != 0;
            uLength += uSigns;
            for (uint32_t d = 0; d < kDim; ++d)
                if (v[d] != 0 && ((uPeek >> (24 - uLength + --uSigns)) & 1))
                    v[d] = -v[d];
        }
        bits::Advance(b, uLength);
        if constexpr (kBook == kEscBook)
            for (uint32_t d = 0; d < kDim; ++d)
                if (v[d] == 16 || v[d] == -16)
                    v[d] = EscapeOn(b, v[d]);
        for (uint32_t d = 0; d < kDim; ++d)
            piOut[j + d] = static_cast<int16_t>(v[d]);
    }
    dec.Bits = b;
}

template <bool kStore>
void DecodeSection(VrAACDecoder_OnlyParsing &dec, uint32_t uBook, int16_t *piOut, uint32_t uCount)
{
    using Decode = void (*)(VrAACDecoder_OnlyParsing &, int16_t *, uint32_t);
    static constexpr Decode kDecode[12] = {
        nullptr,
        DecodeLines<1, kStore>,  DecodeLines<2, kStore>,  DecodeLines<3, kStore>,
        DecodeLines<4, kStore>,  DecodeLines<5, kStore>,  DecodeLines<6, kStore>,
        DecodeLines<7, kStore>,  DecodeLines<8, kStore>,  DecodeLines<9, kStore>,
        DecodeLines<10, kStore>, DecodeLines<11, kStore>,
    };
    kDecode[uBook](dec, piOut, uCount);
}

// Group lengths, offsets and the band tops of each group (widths times the group length) of
// an EIGHT_SHORT_SEQUENCE, into the short window information.
void ExpandGroups(VrAACDecoder_OnlyParsing &dec, const VrICS_OnlyParsing &wics)
{
    VrWindowInfo_OnlyParsing &info = dec.ShortInfo;
    const uint32_t nb = info.uBandsPerWindow < 16 ? info.uBandsPerWindow : 16;
    const uint32_t uGroups = GroupCount(wics);
    uint32_t uStart = 0;
    for (uint32_t g = 0; g < uGroups; ++g) {
        const uint32_t uEnd = wics.uGroupEnds[g] > uStart && wics.uGroupEnds[g] <= 8
                                  ? wics.uGroupEnds[g]
                                  : uStart + 1;
        const uint32_t uLen = uEnd - uStart;
        info.uGroupLengths[g] = static_cast<uint16_t>(uLen);
        info.uGroupOffsets[g] = 128 * uStart;
        uint32_t uTop = 128 * uStart;
        for (uint32_t k = 0; k < nb; ++k) {
            uTop += (info.puShortBandWidths ? info.puShortBandWidths[k] : 0) * uLen;
            info.uBlockBandTops[g * nb + k] = static_cast<uint16_t>(uTop < kLines ? uTop : kLines);
        }
        uStart = uEnd;
    }
    info.uGroups = uGroups;
}

} // namespace

uint32_t IcsInfo(VrAACDecoder_OnlyParsing &dec, VrICS_OnlyParsing &ics)
{
    VrBitReader_OnlyParsing &b = dec.Bits;
    Get1(b); // ics_reserved_bit
    ics.uWindowSequence = Get(b, 2);
    ics.uWindowShape = static_cast<uint8_t>(Get1(b));
    if (!InfoOf(dec, ics))
        return 0;
    std::memset(ics.uGroupEnds, 0, sizeof ics.uGroupEnds);
    if (ics.uWindowSequence == kEightShort) {
        ics.uMaxSfb = Get(b, 4);
        // scale_factor_grouping: 1 joins a window to its predecessor
        const uint32_t uGrouping = Get(b, 7);
        uint32_t g = 0;
        for (uint32_t w = 1; w < 8; ++w)
            if (((uGrouping >> (7 - w)) & 1) == 0)
                ics.uGroupEnds[g++] = static_cast<uint8_t>(w);
        ics.uGroupEnds[g] = 8;
        return 1;
    }
    ics.uMaxSfb = Get(b, 6);
    ics.uGroupEnds[0] = 1;
    // Profile 3 has no predictor_data_present bit.
    if (dec.MCInfo.uProfile != 3 && Get1(b)) {
        if (Get1(b))     // predictor_reset
            Get(b, 5);   // predictor_reset_group_number
        const uint32_t uIndex = dec.MCInfo.uSampleRateIdx;
        const uint32_t uPredBands = VrTBL_pred_max_bands_OnlyParsing[uIndex < 12 ? uIndex : 0];
        const uint32_t uBands =
            uIndex < 12 ? (ics.uMaxSfb < uPredBands ? ics.uMaxSfb : uPredBands) : 0;
        bits::Advance(b, uBands); // prediction_used
    }
    return 1;
}

void SectionData(VrAACDecoder_OnlyParsing &dec, VrICS_OnlyParsing &ics,
                 const VrICS_OnlyParsing &wics)
{
    VrBitReader_OnlyParsing &b = dec.Bits;
    std::memset(ics.uBandCodebook, kZeroBook, sizeof ics.uBandCodebook);
    ics.uSections = 0;
    const VrWindowInfo_OnlyParsing *pInfo = InfoOf(dec, wics);
    if (!pInfo || wics.uMaxSfb > pInfo->uBandsPerWindow || pInfo->uBandsPerWindow > kMaxBands)
        return;
    const uint32_t nb = pInfo->uBandsPerWindow, uBits = pInfo->uSectionBits,
                   uEsc = (1u << uBits) - 1;
    const uint32_t uGroups = GroupCount(wics);
    uint32_t n = 0;
    for (uint32_t g = 0; g < uGroups; ++g) {
        if ((g + 1) * nb > kMaxBands)
            return;
        for (uint32_t k = 0; k < wics.uMaxSfb;) {
            if (n == kMaxSections)
                return; // more sections than any window layout allows
            const uint32_t uBook = Get(b, 4);
            uint32_t uLen = 0, uIncr;
            while ((uIncr = Get(b, uBits)) == uEsc)
                uLen += uEsc;
            uLen += uIncr;
            if (uLen > wics.uMaxSfb - k)
                return; // the section runs past max_sfb
            const uint32_t uFirst = g * nb + k;
            std::memset(ics.uBandCodebook + uFirst, static_cast<int>(uBook), uLen);
            ics.Section[n++] = {uBook, uFirst + uLen};
            k += uLen;
        }
    }
    ics.uSections = n;
}

uint32_t ScaleFactorData(VrAACDecoder_OnlyParsing &dec, VrICS_OnlyParsing &ics,
                         const VrICS_OnlyParsing &wics, uint32_t uChannel, uint32_t uGlobalGain)
{
    if (ics.uSections == 0)
        return 1;
    const VrWindowInfo_OnlyParsing *pInfo = InfoOf(dec, wics);
    if (!pInfo || uChannel >= VR_AAC_CHANNELS_OnlyParsing)
        return 0;
    VrBitReader_OnlyParsing &b = dec.Bits;
    int16_t *piFactor = dec.iScaleFactors[uChannel];
    int16_t *piSign = dec.iBandExponents[uChannel];
    int32_t iFactor = static_cast<int32_t>(uGlobalGain), iPosition = 0;
    int32_t iNoise = static_cast<int32_t>(uGlobalGain) - kNoiseOffset;
    bool bFirstNoise = true;
    Cursor c(b);
    auto read = [&](uint32_t i, uint32_t uBook, uint32_t uFirst, uint32_t uEnd) {
        switch (uBook) {
        case kZeroBook:
            for (uint32_t band = uFirst; band < uEnd; ++band)
                piFactor[band] = 0;
            return true;
        case kReservedBook:
            return uFirst == uEnd;
        case kNoiseBook:
        case kNoiseRepeatBook:
            for (uint32_t band = uFirst; band < uEnd; ++band) {
                if (bFirstNoise) {
                    iNoise += static_cast<int32_t>(c.Peek(9)) - 256;
                    c.uBit += 9;
                } else {
                    iNoise += ScalefactorDiff(c);
                }
                bFirstNoise = false;
                piFactor[band] = static_cast<int16_t>(iNoise);
                if (dec.uMSMask[band]) { // the same noise as the first channel of the pair
                    dec.uMSMask[band] = 0;
                    ics.Section[i].uCodebook = kNoiseRepeatBook;
                }
            }
            return true;
        case kIntensityBook2:
        case kIntensityBook:
            for (uint32_t band = uFirst; band < uEnd; ++band) {
                iPosition += ScalefactorDiff(c);
                piFactor[band] = static_cast<int16_t>(iPosition);
                piSign[band] = dec.uMSMask[band] ? -1 : 1; // M/S inverts the intensity sign
                dec.uMSMask[band] = 0;
            }
            return true;
        default:
            for (uint32_t band = uFirst; band < uEnd; ++band) {
                iFactor += ScalefactorDiff(c);
                if (iFactor < 0 || iFactor > 255)
                    return false;
                piFactor[band] = static_cast<int16_t>(iFactor);
            }
            return true;
        }
    };
    const bool bDone = WalkSections(ics, wics, pInfo->uBandsPerWindow, read);
    c.Sync();
    return bDone ? 1 : 0;
}

uint32_t SpectralData(VrAACDecoder_OnlyParsing &dec, VrICS_OnlyParsing &ics,
                      const VrICS_OnlyParsing &wics, uint32_t uChannel, uint32_t uFirstChannel,
                      bool bValues)
{
    const VrWindowInfo_OnlyParsing *pInfo = InfoOf(dec, wics);
    if (!pInfo || uChannel >= VR_AAC_CHANNELS_OnlyParsing)
        return 1;
    const uint32_t uFirst = uFirstChannel < VR_AAC_CHANNELS_OnlyParsing ? uFirstChannel : uChannel;
    int16_t *piLines = dec.iSpectrum[uChannel];
    const uint16_t *puTops = pInfo->uBlockBandTops;
    auto read = [&](uint32_t, uint32_t uBook, uint32_t uBand, uint32_t uEnd) {
        if (uEnd <= uBand || uBook == kZeroBook || uBook == kIntensityBook ||
            uBook == kIntensityBook2 || uBook == kReservedBook ||
            (uBook > kIntensityBook && uBook != kNoiseRepeatBook))
            return true; // an empty section, or one without spectral data
        const uint32_t uLo = uBand == 0 ? 0 : puTops[uBand - 1];
        const uint32_t uHi = puTops[uEnd - 1] < kLines ? puTops[uEnd - 1] : kLines;
        if (uHi <= uLo)
            return true;
        if (uBook <= kEscBook) {
            if (bValues)
                DecodeSection<true>(dec, uBook, piLines + uLo, uHi - uLo);
            else
                DecodeSection<false>(dec, uBook, piLines + uLo, uHi - uLo);
            return true;
        }
        if (!bValues)
            return true; // noise bands carry no spectral bits
        for (uint32_t band = uBand; band < uEnd; ++band) {
            const uint32_t lo = band == 0 ? 0 : puTops[band - 1];
            const uint32_t hi = puTops[band] < kLines ? puTops[band] : kLines;
            if (hi <= lo)
                continue;
            int16_t iExponent = 0;
            if (uBook == kNoiseBook) {
                dec.iNoiseSeeds[uChannel][band] = dec.iRandomSeed;
                RandVector(piLines + lo, iExponent, static_cast<int32_t>(hi - lo), dec.iRandomSeed);
            } else {
                int32_t iSeed = dec.iNoiseSeeds[uFirst][band];
                RandVector(piLines + lo, iExponent, static_cast<int32_t>(hi - lo), iSeed);
            }
            dec.iBandExponents[uChannel][band] = iExponent;
        }
        return true;
    };
    WalkSections(ics, wics, pInfo->uBandsPerWindow, read);
    if (dec.uPulsePresent && bValues)
        ApplyPulses(dec, uChannel, dec.Pulse);
    return 1;
}

int32_t Escape(VrAACDecoder_OnlyParsing &dec, int32_t iValue)
{
    return iValue == 16 || iValue == -16 ? EscapeOn(dec.Bits, iValue) : iValue;
}

uint32_t MsMask(VrAACDecoder_OnlyParsing &dec, const VrICS_OnlyParsing &ics)
{
    const uint32_t uPresent = Get(dec.Bits, 2);
    const VrWindowInfo_OnlyParsing *pInfo = InfoOf(dec, ics);
    if ((uPresent != 1 && uPresent != 2) || !pInfo)
        return uPresent;
    const uint32_t nb = pInfo->uBandsPerWindow, uGroups = GroupCount(ics);
    for (uint32_t g = 0; g < uGroups; ++g)
        for (uint32_t k = 0; k < nb && g * nb + k < kMaxBands; ++k)
            dec.uMSMask[g * nb + k] =
                static_cast<uint8_t>(uPresent == 2 ? 1 : k < ics.uMaxSfb ? Get1(dec.Bits) : 0);
    return uPresent;
}

uint32_t PulseData(VrAACDecoder_OnlyParsing &dec, VrPulseInfo_OnlyParsing &pulse)
{
    VrBitReader_OnlyParsing &b = dec.Bits;
    pulse.uPulses = Get(b, 2);
    const uint32_t uStart = Get(b, 6), uBands = dec.LongInfo.uBandsPerWindow;
    pulse.uStartSfb = uStart < uBands ? uStart : uBands;
    uint32_t uLast = 0;
    for (uint32_t i = 0; i <= pulse.uPulses; ++i) {
        pulse.uOffset[i] = Get(b, 5);
        pulse.uAmp[i] = uLast = Get(b, 4);
    }
    return uLast;
}

void ApplyPulses(VrAACDecoder_OnlyParsing &dec, uint32_t uChannel,
                 const VrPulseInfo_OnlyParsing &pulse)
{
    const VrWindowInfo_OnlyParsing &info = dec.LongInfo;
    if (uChannel >= VR_AAC_CHANNELS_OnlyParsing || !info.puBandTops)
        return;
    const uint32_t uSfb =
        pulse.uStartSfb < info.uBandsPerWindow ? pulse.uStartSfb : info.uBandsPerWindow;
    uint32_t k = uSfb == 0 ? 0 : info.puBandTops[uSfb - 1];
    for (uint32_t i = 0; i <= pulse.uPulses && i < VR_AAC_MAX_PULSES_OnlyParsing; ++i) {
        k += pulse.uOffset[i];
        if (k >= kLines)
            return;
        int16_t &v = dec.iSpectrum[uChannel][k];
        const auto iAmp = static_cast<int32_t>(pulse.uAmp[i]);
        v = static_cast<int16_t>(v > 0 ? v + iAmp : v - iAmp);
    }
}

void TnsData(VrAACDecoder_OnlyParsing &dec, const VrICS_OnlyParsing &ics,
             VrTNSInfo_OnlyParsing &tns)
{
    VrBitReader_OnlyParsing &b = dec.Bits;
    const bool bShort = ics.uWindowSequence == kEightShort;
    const uint32_t uWindows = bShort ? 8 : 1;
    for (uint32_t w = 0; w < uWindows; ++w) {
        VrTNSWindow_OnlyParsing &win = tns.Window[w];
        win.uFilters = Get(b, bShort ? 1 : 2);
        if (win.uFilters)
            win.uCoefRes = Get1(b);
        for (uint32_t f = 0; f < win.uFilters; ++f) {
            VrTNSFilter_OnlyParsing &flt = win.Filter[f];
            flt.uLength = Get(b, bShort ? 4 : 6);
            flt.uOrder = Get(b, bShort ? 3 : 5);
            if (!flt.uOrder)
                continue;
            flt.uDirection = Get1(b);
            flt.uCoefCompress = Get1(b);
            const uint32_t uBits = win.uCoefRes + 3 - flt.uCoefCompress; // 2 to 4
            for (uint32_t j = 0; j < flt.uOrder; ++j) {
                const uint32_t c = Get(b, uBits);
                const bool bNegative = (c & sgn_maskOnlyParsing[uBits - 2]) != 0;
                flt.iCoef[j] =
                    static_cast<int16_t>(bNegative ? c | neg_maskOnlyParsing[uBits - 2] : c);
            }
        }
    }
    for (uint32_t w = uWindows; w < VR_AAC_MAX_WINDOWS_OnlyParsing; ++w)
        tns.Window[w].uFilters = 0;
}

void ClearTns(VrTNSInfo_OnlyParsing &tns)
{
    for (VrTNSWindow_OnlyParsing &win : tns.Window)
        win.uFilters = 0;
}

uint32_t Ics(VrAACDecoder_OnlyParsing &dec, VrICS_OnlyParsing &ics, uint32_t uCommonWindow,
             uint32_t uChannel, uint32_t uFirstChannel, uint32_t uWindowInfoChannel, bool bValues)
{
    if (uChannel >= VR_AAC_CHANNELS_OnlyParsing)
        return 0;
    VrBitReader_OnlyParsing &b = dec.Bits;
    // With common_window the ics_info is that of the window-info channel, else the stream's own.
    const VrICS_OnlyParsing &wics =
        uCommonWindow && uWindowInfoChannel < VR_AAC_CHANNELS_OnlyParsing
            ? dec.ICS[uWindowInfoChannel]
            : ics;
    const uint32_t uGlobalGain = Get(b, 8);
    if (!uCommonWindow && !IcsInfo(dec, ics))
        return 0;
    SectionData(dec, ics, wics);
    if (ics.uSections == 0 && wics.uMaxSfb > 0)
        return 0;
    if (wics.uWindowSequence == kEightShort)
        ExpandGroups(dec, wics);
    if (!ScaleFactorData(dec, ics, wics, uChannel, uGlobalGain))
        return 0;
    dec.uPulsePresent = Get1(b);
    if (dec.uPulsePresent) {
        if (wics.uWindowSequence == kEightShort)
            return 0; // pulse_data is not allowed in short windows
        PulseData(dec, dec.Pulse);
    }
    if (Get1(b)) // tns_data_present
        TnsData(dec, wics, dec.TNS[uChannel]);
    else
        ClearTns(dec.TNS[uChannel]);
    if (Get1(b)) // gain_control_data_present: gain control is not supported
        return 0;
    SpectralData(dec, ics, wics, uChannel, uFirstChannel, bValues);
    return 1;
}

} // namespace vorcal::aacparse

using namespace vorcal::aacparse;

namespace {

const VrICS_OnlyParsing &WindowIcs(const VrAACDecoder_OnlyParsing *pDec,
                                   const VrICS_OnlyParsing *pICS, uint32_t uChannel)
{
    return uChannel < VR_AAC_CHANNELS_OnlyParsing ? pDec->ICS[uChannel] : *pICS;
}

} // namespace

extern "C" uint32_t geticsOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrICS_OnlyParsing *pICS,
                                      uint32_t uCommonWindow, uint32_t uChannel,
                                      uint32_t uFirstChannel, uint32_t uWindowInfoChannel)
{
    return Ics(*pDec, *pICS, uCommonWindow, uChannel, uFirstChannel, uWindowInfoChannel);
}

extern "C" uint32_t get_ics_infoOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrICS_OnlyParsing *pICS,
                                            uint32_t, uint32_t, uint32_t)
{
    return IcsInfo(*pDec, *pICS);
}

extern "C" uint32_t section_dataOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrICS_OnlyParsing *pICS,
                                            uint32_t, uint32_t uWindowInfoChannel)
{
    SectionData(*pDec, *pICS, WindowIcs(pDec, pICS, uWindowInfoChannel));
    return 0;
}

extern "C" uint32_t scale_factor_dataOnlyParsing(VrAACDecoder_OnlyParsing *pDec,
                                                 VrICS_OnlyParsing *pICS, uint32_t uChannel,
                                                 uint32_t uGlobalGain)
{
    return ScaleFactorData(*pDec, *pICS, *pICS, uChannel, uGlobalGain);
}

extern "C" uint32_t spectral_dataOnlyParsing(VrAACDecoder_OnlyParsing *pDec,
                                             VrICS_OnlyParsing *pICS, uint32_t uChannel,
                                             uint32_t uFirstChannel)
{
    return SpectralData(*pDec, *pICS, *pICS, uChannel, uFirstChannel);
}

extern "C" uint32_t getmaskOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrICS_OnlyParsing *pICS,
                                       uint32_t)
{
    return MsMask(*pDec, *pICS);
}

extern "C" uint32_t get_pulse_ncOnlyParsing(VrAACDecoder_OnlyParsing *pDec,
                                            VrPulseInfo_OnlyParsing *pPulse)
{
    return PulseData(*pDec, *pPulse);
}

extern "C" uint32_t pulse_ncOnlyParsing(VrAACDecoder_OnlyParsing *pDec, uint32_t uChannel,
                                        const VrPulseInfo_OnlyParsing *pPulse)
{
    ApplyPulses(*pDec, uChannel, *pPulse);
    return 0;
}

extern "C" uint32_t get_tnsOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrICS_OnlyParsing *pICS,
                                       VrTNSInfo_OnlyParsing *pTNS)
{
    TnsData(*pDec, *pICS, *pTNS);
    return 1;
}

extern "C" uint32_t clr_tnsOnlyParsing(VrICS_OnlyParsing *, VrTNSInfo_OnlyParsing *pTNS)
{
    ClearTns(*pTNS);
    return 0;
}

extern "C" uint32_t getescapeOnlyParsing(VrAACDecoder_OnlyParsing *pDec, int32_t iValue)
{
    return static_cast<uint32_t>(Escape(*pDec, iValue));
}
