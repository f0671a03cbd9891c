// AudioSpecificConfig reading and the ADTS header (ISO/IEC 13818-7 6.2, ISO/IEC 14496-3
// 1.6.2.1 and 1.A.2.2): header size, header from a DSI, frame_length, one-frame recognition.
#include <vorcal/audio_tools.h>

#include "aacparse/syntax.hpp"

namespace vorcal::tools::aac {
namespace {

using vorcal::aac::IsAdtsSync;
using vorcal::aac::kAdtsHeaderSize;

constexpr uint32_t kSbrObjectType = 5;

struct Dsi {
    uint32_t uObjectType;
    uint32_t uFrequencyIndex;
    uint32_t uChannelConfiguration;
};

// audioObjectType (5), samplingFrequencyIndex (4), channelConfiguration (4). CONTRACT: the
// escape forms (object type 31, index 15 with an explicit rate) are not read.
Dsi ReadDsi(const uint8_t *pDSI) noexcept
{
    return Dsi{static_cast<uint32_t>(pDSI[0] >> 3),
               static_cast<uint32_t>(((pDSI[0] & 7u) << 1) | (pDSI[1] >> 7)),
               static_cast<uint32_t>((pDSI[1] >> 3) & 0x0Fu)};
}

int32_t ParseDsi(const uint8_t *pDSI, uint32_t *puSamplingRate, uint32_t *puChannels,
                 uint32_t *puSBR) noexcept
{
    const Dsi dsi = ReadDsi(pDSI);
    // CONTRACT: the channel count is the configuration number, not a count of channels.
    *puChannels = dsi.uChannelConfiguration;
    *puSamplingRate = vorcal::aac::RateOfIndex(dsi.uFrequencyIndex);
    *puSBR = dsi.uObjectType == kSbrObjectType ? 1 : 0;
    return 0;
}

int32_t MakeHeader(const uint8_t *pDSI, int32_t iRawLen, uint8_t *pHeader) noexcept
{
    const Dsi dsi = ReadDsi(pDSI);
    const uint32_t uFrameLen = static_cast<uint32_t>(iRawLen) + kAdtsHeaderSize;
    pHeader[0] = 0xFF;
    pHeader[1] = 0xF9; // syncword end, ID 1 (MPEG-2), layer 0, protection_absent 1
    // CONTRACT: profile 1 (AAC LC) whatever the DSI's object type; the index passes unchecked
    // (12-15 too).
    pHeader[2] = static_cast<uint8_t>(0x40 | (dsi.uFrequencyIndex << 2) |
                                      ((dsi.uChannelConfiguration >> 2) & 1));
    pHeader[3] =
        static_cast<uint8_t>(((dsi.uChannelConfiguration & 3) << 6) | ((uFrameLen >> 11) & 3));
    pHeader[4] = static_cast<uint8_t>(uFrameLen >> 3);
    pHeader[5] = static_cast<uint8_t>(((uFrameLen & 7) << 5) | 0x1F);
    pHeader[6] = 0xFC; // buffer fullness 0x7FF (variable bit rate), one raw data block
    return 0;
}

uint32_t FrameLength(const uint8_t *pHeader) noexcept
{
    return ((pHeader[3] & 3u) << 11) + (static_cast<uint32_t>(pHeader[4]) << 3) + (pHeader[5] >> 5);
}

// CONTRACT: only the twelve sync bits are examined, not ID or layer; the buffer must be the
// whole frame.
int32_t IsAdtsFrame(int32_t iLen, const uint8_t *pBuf) noexcept
{
    if (iLen < static_cast<int32_t>(kAdtsHeaderSize))
        return 0;
    if (!IsAdtsSync(pBuf))
        return 0;
    if (FrameLength(pBuf) != static_cast<uint32_t>(iLen))
        return 0;
    return (pBuf[1] & 1) ? 7 : 9; // protection_absent 0: a 16-bit CRC follows
}

} // namespace
} // namespace vorcal::tools::aac

using namespace vorcal::tools;

extern "C" int32_t vorCALTools_AAC_ParseDSI(const uint8_t *pDSI, uint32_t *puSamplingRate,
                                            uint32_t *puChannels, uint32_t *puSBR)
{
    return aac::ParseDsi(pDSI, puSamplingRate, puChannels, puSBR);
}

// CONTRACT: 7 even though a header with CRC is 9 bytes long.
extern "C" int32_t vorCALTools_Get_ADTS_HeaderSize(void)
{
    return static_cast<int32_t>(vorcal::aac::kAdtsHeaderSize);
}

extern "C" int32_t vorCALTools_Make_ADTS_Header(const uint8_t *pDSI, int32_t uFrameLen,
                                                uint8_t *pHeader)
{
    return aac::MakeHeader(pDSI, uFrameLen, pHeader);
}

extern "C" uint32_t _GetAACFrameLength(const uint8_t *pHeader)
{
    return aac::FrameLength(pHeader);
}

extern "C" int32_t vorCALTools_AAC_isADTSAAC(int32_t uLen, const uint8_t *pBuf)
{
    return aac::IsAdtsFrame(uLen, pBuf);
}
