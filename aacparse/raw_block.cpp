// The syntactic elements of a raw data block (ISO/IEC 13818-7 8.2, ISO/IEC 14496-3 4.4.2.1):
// single channel, channel pair and LFE channel elements, fill elements with their extension
// payloads, data stream elements; and the small tables of the channel streams.
#include <cstring>

#include "aacparse/decoder.hpp"
#include "aacparse/reader.hpp"

extern "C" constexpr uint8_t sgn_maskOnlyParsing[3] = {0x2, 0x4, 0x8};
extern "C" constexpr uint16_t neg_maskOnlyParsing[3] = {0xFFFC, 0xFFF8, 0xFFF0};
// pred_max_bands per sampling_frequency_index: the bands main profile prediction may cover.
extern "C" constexpr uint32_t VrTBL_pred_max_bands_OnlyParsing[12] = {33, 33, 38, 40, 40, 40,
                                                                      41, 41, 37, 37, 37, 34};

namespace vorcal::aacparse {
namespace {

static_assert(sgn_maskOnlyParsing[2] == 0x8 && (neg_maskOnlyParsing[0] | 0x3) == 0xFFFF &&
              (neg_maskOnlyParsing[1] | 0x7) == 0xFFFF && (neg_maskOnlyParsing[2] | 0xF) == 0xFFFF);

using bits::Get;

constexpr int16_t kNoExponent = -100;
constexpr uint32_t kExtFillData = 1; // extension_type EXT_FILL_DATA
constexpr uint32_t kFillBytes = 268; // fill_byte count of the longest payload (15 + 255 - 1 - 1)

// Clears what a channel element sets: the per-band values and the spectral lines.
void ClearChannel(VrAACDecoder_OnlyParsing &dec, uint32_t ch)
{
    std::memset(dec.iScaleFactors[ch], 0, sizeof dec.iScaleFactors[ch]);
    std::memset(dec.iBandExponents[ch], 0, sizeof dec.iBandExponents[ch]);
    std::memset(dec.iSpectrum[ch], 0, sizeof dec.iSpectrum[ch]);
}

uint32_t WindowInfoChannel(const VrMCInfo_OnlyParsing &map, uint32_t ch)
{
    const int32_t w = map.Channel[ch].iWindowInfoChannel;
    return w >= 0 && w < VR_AAC_CHANNELS_OnlyParsing ? static_cast<uint32_t>(w) : ch;
}

// The channel of a single channel or LFE element, or -1.
int32_t SingleChannel(VrAACDecoder_OnlyParsing &dec, VrMCInfo_OnlyParsing &map, bool bValues)
{
    dec.iElementExponent = kNoExponent;
    const uint32_t uTag = Get(dec.Bits, 4);
    const int32_t ch = ChannelConfig(dec, kIdSCE, uTag, 0, map);
    if (ch < 0 || ch >= VR_AAC_CHANNELS_OnlyParsing)
        return -1;
    const auto c = static_cast<uint32_t>(ch);
    if (bValues)
        ClearChannel(dec, c);
    return Ics(dec, dec.ICS[c], 0, c, c, WindowInfoChannel(map, c), bValues) ? ch : -2;
}

} // namespace

uint32_t SingleChannelElement(VrAACDecoder_OnlyParsing &dec, VrMCInfo_OnlyParsing &map,
                              bool bValues)
{
    const int32_t ch = SingleChannel(dec, map, bValues);
    return ch >= 0 ? 0 : ch == -1 ? 3 : 4;
}

uint32_t LfeChannelElement(VrAACDecoder_OnlyParsing &dec, VrMCInfo_OnlyParsing &map, bool bValues)
{
    return SingleChannel(dec, map, bValues) >= 0 ? 1 : 0xFFFFFFFFu;
}

uint32_t ChannelPairElement(VrAACDecoder_OnlyParsing &dec, VrMCInfo_OnlyParsing &map, bool bValues)
{
    VrBitReader_OnlyParsing &b = dec.Bits;
    dec.iElementExponent = kNoExponent;
    const uint32_t uTag = Get(b, 4);
    const uint32_t uCommonWindow = bits::Get1(b);
    const int32_t iLeft = ChannelConfig(dec, kIdCPE, uTag, uCommonWindow, map);
    if (iLeft < 0 || iLeft >= VR_AAC_CHANNELS_OnlyParsing)
        return 5;
    const auto l = static_cast<uint32_t>(iLeft);
    const int32_t iRight = map.Channel[l].iPartner;
    if (iRight < 0 || iRight >= VR_AAC_CHANNELS_OnlyParsing || iRight == iLeft)
        return 5;
    const auto r = static_cast<uint32_t>(iRight);
    if (uCommonWindow) {
        VrICS_OnlyParsing &left = dec.ICS[l], &right = dec.ICS[r];
        if (!IcsInfo(dec, left))
            return 6;
        right.uWindowSequence = left.uWindowSequence;
        right.uWindowShape = left.uWindowShape;
        right.uMaxSfb = left.uMaxSfb;
        std::memcpy(right.uGroupEnds, left.uGroupEnds, sizeof right.uGroupEnds);
        if (MsMask(dec, left) == 0)
            std::memset(dec.uMSMask, 0, sizeof dec.uMSMask);
    } else {
        std::memset(dec.uMSMask, 0, sizeof dec.uMSMask);
    }
    if (bValues) {
        ClearChannel(dec, l);
        ClearChannel(dec, r);
    }
    if (!Ics(dec, dec.ICS[l], uCommonWindow, l, l, WindowInfoChannel(map, l), bValues))
        return 7;
    if (!Ics(dec, dec.ICS[r], uCommonWindow, r, l, WindowInfoChannel(map, r), bValues))
        return 8;
    return 0;
}

uint32_t FillElement(VrAACDecoder_OnlyParsing &dec, uint8_t *pBuffer, PayloadHook hook,
                     void *pContext)
{
    uint32_t uCount = Get(dec.Bits, 4);
    if (uCount == 15)
        uCount += Get(dec.Bits, 8) - 1; // esc_count
    uint32_t uResult = 0;
    while (uCount > 0) {
        if (hook)
            hook(pContext, dec, uCount);
        uResult = ExtensionPayload(dec, uCount, pBuffer);
        uCount -= uResult;
    }
    return uResult;
}

uint32_t ExtensionPayload(VrAACDecoder_OnlyParsing &dec, uint32_t uCount, uint8_t *pBuffer)
{
    VrBitReader_OnlyParsing &b = dec.Bits;
    const uint32_t uBytes = uCount ? uCount - 1 : 0;
    // CONTRACT: every other type, SBR data included, is stepped over unread.
    if (Get(b, 4) != kExtFillData) {
        bits::Advance(b, 4 + 8 * uBytes);
        return uCount;
    }
    Get(b, 4); // fill_nibble
    for (uint32_t i = 0; i < uBytes; ++i) {
        const auto uByte = static_cast<uint8_t>(Get(b, 8));
        if (pBuffer && i < kFillBytes)
            pBuffer[i] = uByte;
    }
    return uCount;
}

uint32_t DataStreamElement(VrAACDecoder_OnlyParsing &dec, uint32_t &uTag, uint32_t &uCount,
                           uint8_t *pBuffer)
{
    VrBitReader_OnlyParsing &b = dec.Bits;
    uTag = Get(b, 4);
    const uint32_t uAlign = bits::Get1(b);
    uint32_t uLast = uCount = Get(b, 8);
    if (uCount == 255)
        uCount += uLast = Get(b, 8); // esc_count
    if (uAlign)
        bits::ByteAlign(b);
    for (uint32_t i = 0; i < uCount; ++i) {
        uLast = Get(b, 8);
        if (pBuffer)
            pBuffer[i] = static_cast<uint8_t>(uLast);
    }
    return uLast;
}

} // namespace vorcal::aacparse

using namespace vorcal::aacparse;

extern "C" uint32_t single_channel_elementOnlyParsing(VrAACDecoder_OnlyParsing *pDec,
                                                      VrMCInfo_OnlyParsing *pMap)
{
    return SingleChannelElement(*pDec, *pMap);
}

extern "C" uint32_t channel_pair_elementOnlyParsing(VrAACDecoder_OnlyParsing *pDec,
                                                    VrMCInfo_OnlyParsing *pMap)
{
    return ChannelPairElement(*pDec, *pMap);
}

extern "C" uint32_t lfe_channel_elementOnlyParsing(VrAACDecoder_OnlyParsing *pDec,
                                                   VrMCInfo_OnlyParsing *pMap)
{
    return LfeChannelElement(*pDec, *pMap);
}

extern "C" uint32_t getfillOnlyParsing(VrAACDecoder_OnlyParsing *pDec, uint8_t *pBuffer)
{
    return FillElement(*pDec, pBuffer);
}

extern "C" uint32_t extension_payloadOnlyParsing(VrAACDecoder_OnlyParsing *pDec, uint32_t uCount,
                                                 uint8_t *pBuffer)
{
    return ExtensionPayload(*pDec, uCount, pBuffer);
}

extern "C" uint32_t getdataOnlyParsing(VrAACDecoder_OnlyParsing *pDec, uint32_t *puTag,
                                       uint32_t *puCount, uint8_t *pBuffer)
{
    uint32_t uTag = 0, uCount = 0;
    const uint32_t uLast = DataStreamElement(*pDec, uTag, uCount, pBuffer);
    if (puTag)
        *puTag = uTag;
    if (puCount)
        *puCount = uCount;
    return uLast;
}

extern "C" uint32_t pred_max_bandsOnlyParsing(VrAACDecoder_OnlyParsing *pDec)
{
    const uint32_t uIndex = pDec->MCInfo.uSampleRateIdx;
    return uIndex < 12 ? VrTBL_pred_max_bands_OnlyParsing[uIndex] : 0;
}
