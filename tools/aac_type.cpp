// AAC type detection: wraps one raw data block in an ADTS header and asks the parse-only
// decoder whether it carries SBR.
#include <cstring>

#include <vorcal/aacparse.h>
#include <vorcal/audio_tools.h>
#include <vorcal/wrapper.h>

#include "core/sal.hpp"

namespace vorcal::tools {
namespace {

constexpr uint32_t kFailed = 0xFFFFFFFF;
constexpr uint32_t kAdtsBytes = 7;
// VrAACSBRInfo reads 10 bytes of a header without CRC: frames under 2 bytes get extra zeros.
constexpr uint32_t kMinDetectBytes = 10;

} // namespace

uint32_t GetAACType(CALCodec *hCodec, int32_t iSamplingRate, uint32_t uChannels, const uint8_t *pFrame,
                    uint32_t uFrameLen)
{
    if (!hCodec)
        return kFailed;
    const uint32_t uOti = hCodec->m_uCodecObjectTypeIndication;
    if ((uOti != CAL_OTI_AAC && uOti != CAL_OTI_AAC_SBR) || !pFrame)
        return uOti;
    if (uFrameLen > UINT32_MAX - (kAdtsBytes + 1))
        return kFailed; // no buffer of that size can exist
    uint32_t uSize = uFrameLen + kAdtsBytes + 1;
    if (uSize < kMinDetectBytes)
        uSize = kMinDetectBytes;
    auto *pBuf = static_cast<uint8_t *>(sal::Alloc(uSize));
    if (!pBuf)
        return kFailed;
    std::memset(pBuf, 0, uSize);
    if (AAC_MakeADTS(pBuf, iSamplingRate, uChannels, static_cast<int32_t>(uChannels - 1), uFrameLen) != 0) {
        sal::Free(pBuf);
        return kFailed;
    }
    std::memcpy(pBuf + kAdtsBytes, pFrame, uFrameLen);
    uint32_t uRate = 0, uChannelConfig = 0, uSBR = 0, uBitsAligned = 0, uHeaderBits = 0;
    VrAACSBRInfo(pBuf, uSize, &uRate, &uChannelConfig, &uSBR, &uBitsAligned, &uHeaderBits);
    sal::Free(pBuf);
    VORCAL_TRACE(kTraceAudio, 1, "[CAL_Tools %d] vorCALTools_GetAACType() : %u, %u, %u, %u, %u\n", 562, uRate,
                 uChannelConfig, uSBR, uBitsAligned, uHeaderBits);
    hCodec->m_uCodecObjectTypeIndication = uSBR ? CAL_OTI_AAC_SBR : CAL_OTI_AAC;
    return hCodec->m_uCodecObjectTypeIndication;
}

} // namespace vorcal::tools

extern "C" uint32_t vorCALTools_GetAACType(CALCodec *hCodec, int32_t uSamplingRate, uint32_t uChannels,
                                           const uint8_t *pFrame, uint32_t uFrameLen)
{
    return vorcal::tools::GetAACType(hCodec, uSamplingRate, uChannels, pFrame, uFrameLen);
}
