// The audio tools that act on a codec instance: the silence frame each instance caches for
// vorCALTools_GetSilenceFrame, and the OTI that vorCALTools_GetAACType records. The frames and
// the detection themselves are bitstream tools (tools/).
#include <array>

#include <vorcal/audio_tools.h>

#include "core/sal.hpp"
#include "tools/aac_type.hpp"
#include "tools/mute_frame.hpp"
#include "wrapper/codec_slots.hpp"

namespace vorcal::wrapper {
namespace {

// AMR storage-format header of frame type 15 (no data) with Q = 1: the AMR-NB and AMR-WB silence.
constexpr std::array<uint8_t, 1> kAmrNoData = {0x7C};

constexpr int32_t kNoSilenceFrame = 16;
constexpr uint32_t kTypeFailed = 0xFFFFFFFF;

// Result 16 with the outputs cleared.
int32_t NoSilenceFrame(const uint8_t **ppFrame, uint32_t *puFrameLen) noexcept
{
    *ppFrame = nullptr;
    *puFrameLen = 0;
    return kNoSilenceFrame;
}

// Fills an empty cache with an AAC frame of the mode for uChannels (modes[0] mono, modes[1]
// stereo); a failed build leaves the cache empty so that the next call tries again.
int32_t FillAacCache(CALCodec *hCodec, const std::array<int32_t, 2> &modes, int32_t iBadChannels,
                     uint32_t uSamplingRate, uint32_t uChannels, uint32_t uReserved,
                     uint32_t bADTS) noexcept
{
    if (hCodec->m_pSilenceFrame)
        return 0;
    if (uChannels != 1 && uChannels != 2)
        return iBadChannels;
    uint8_t *pFrame = nullptr;
    uint32_t uLen = 0;
    const int32_t iResult = tools::mute::AacMuteFrame(&pFrame, &uLen, uReserved, uSamplingRate,
                                                      uChannels, bADTS, modes[uChannels - 1]);
    if (iResult != 0)
        return iResult;
    hCodec->m_pSilenceFrame = pFrame;
    hCodec->m_uSilenceFrameLen = uLen;
    return 0;
}

int32_t FillDraCache(CALCodec *hCodec, uint32_t uSamplingRate, uint32_t uChannels) noexcept
{
    if (hCodec->m_pSilenceFrame)
        return 0;
    uint8_t *pFrame = nullptr;
    uint32_t uLen = 0;
    if (tools::mute::DraMuteFrame(&pFrame, &uLen, uSamplingRate, uChannels) != 0)
        return -1;
    hCodec->m_pSilenceFrame = pFrame;
    hCodec->m_uSilenceFrameLen = uLen;
    return 0;
}

int32_t GetSilenceFrame(CALCodec *hCodec, uint32_t uSamplingRate, uint32_t uChannels,
                        uint32_t uReserved, uint32_t bADTS, const uint8_t **ppFrame,
                        uint32_t *puFrameLen) noexcept
{
    if (!hCodec) {
        // CONTRACT: result 1 and a fixed source line (594) in the trace.
        VORCAL_TRACE(kTraceError, 0,
                     "[CAL_Tools %d] vorCALTools_GetSilenceFrame() : Codec Handle is NULL....\n",
                     594);
        return 1;
    }
    const uint32_t uOTI = hCodec->m_uCodecObjectTypeIndication;
    // Asked on every call, also with a frame cached. An unanswered query reads 0: no frames.
    if ((uOTI == CAL_OTI_AAC || uOTI == CAL_OTI_AAC_SBR) &&
        AudioPropertyValue(hCodec, CAL_PROP_AAC_SILENCE_FRAMES) == 0)
        return NoSilenceFrame(ppFrame, puFrameLen);

    int32_t iResult = 0;
    switch (uOTI) {
    case CAL_OTI_AAC:
        // CONTRACT: a channel count other than 1 or 2 answers 1 here, -1 for AAC with SBR.
        iResult = FillAacCache(hCodec, {0, 1}, 1, uSamplingRate, uChannels, uReserved, bADTS);
        break;
    case CAL_OTI_AAC_SBR:
        iResult = FillAacCache(hCodec, {2, 3}, -1, uSamplingRate, uChannels, uReserved, bADTS);
        break;
    case CAL_OTI_AMR_NB:
    case CAL_OTI_AMR_WB:
        // Static, never cached: the instance's cache may hold the locked AMR frame instead.
        *ppFrame = kAmrNoData.data();
        *puFrameLen = kAmrNoData.size();
        return 0;
    case CAL_OTI_DRA:
        iResult = FillDraCache(hCodec, uSamplingRate, uChannels);
        break;
    default:
        return NoSilenceFrame(ppFrame, puFrameLen);
    }
    if (iResult != 0)
        return iResult;
    *ppFrame = hCodec->m_pSilenceFrame;
    *puFrameLen = hCodec->m_uSilenceFrameLen;
    return 0;
}

uint32_t GetAACType(CALCodec *hCodec, int32_t iSamplingRate, uint32_t uChannels,
                    const uint8_t *pFrame, uint32_t uFrameLen) noexcept
{
    if (!hCodec)
        return kTypeFailed;
    const uint32_t uOti = hCodec->m_uCodecObjectTypeIndication;
    if ((uOti != CAL_OTI_AAC && uOti != CAL_OTI_AAC_SBR) || !pFrame)
        return uOti;
    uint32_t uSBR = 0;
    if (!tools::aac::DetectSbr(iSamplingRate, uChannels, pFrame, uFrameLen, uSBR))
        return kTypeFailed;
    // CONTRACT: VrAACSBRInfo never reports SBR, so an instance created as 0x41 becomes 0x40.
    hCodec->m_uCodecObjectTypeIndication = uSBR ? CAL_OTI_AAC_SBR : CAL_OTI_AAC;
    return hCodec->m_uCodecObjectTypeIndication;
}

} // namespace
} // namespace vorcal::wrapper

using namespace vorcal::wrapper;

extern "C" int32_t vorCALTools_GetSilenceFrame(CALCodec *hCodec, uint32_t uSamplingRate,
                                               uint32_t uChannels, uint32_t uReserved,
                                               uint32_t bADTS, const uint8_t **ppFrame,
                                               uint32_t *puFrameLen)
{
    return GetSilenceFrame(hCodec, uSamplingRate, uChannels, uReserved, bADTS, ppFrame, puFrameLen);
}

extern "C" uint32_t vorCALTools_GetAACType(CALCodec *hCodec, int32_t uSamplingRate,
                                           uint32_t uChannels, const uint8_t *pFrame,
                                           uint32_t uFrameLen)
{
    return GetAACType(hCodec, uSamplingRate, uChannels, pFrame, uFrameLen);
}
