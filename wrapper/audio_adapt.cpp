// Audio decoder adaptation: AMR frame-type lock and substitution, AAC and speech parameters.
#include "wrapper/audio_adapt.hpp"

#include <vorcal/audio_tools.h>

#include "core/sal.hpp"
#include "wrapper/codec_slots.hpp"

namespace vorcal::wrapper {
namespace {

constexpr uint32_t kAmrNbMaxFT = 7;
constexpr uint32_t kAmrWbMaxFT = 8;

bool IsAmr(uint32_t uOTI) noexcept
{
    return uOTI == CAL_OTI_AMR_NB || uOTI == CAL_OTI_AMR_WB;
}

// The storage-format header byte (RFC 4867 5.3) shifted right by 3. CONTRACT: unmasked, so a
// set padding bit yields a frame type above 15, which no template has.
uint32_t FrameTypeOf(const uint8_t *pFrame) noexcept
{
    return static_cast<uint32_t>(pFrame[0] >> 3);
}

void Store(uint32_t *pu, uint32_t uValue) noexcept
{
    if (pu)
        *pu = uValue;
}

// Drops the previous silent frame so that a failed build leaves no lock behind.
void DropSilenceFrame(CALCodec *hCodec) noexcept
{
    if (hCodec->m_pSilenceFrame)
        sal::Free(hCodec->m_pSilenceFrame);
    hCodec->m_pSilenceFrame = nullptr;
    hCodec->m_uSilenceFrameLen = 0;
}

} // namespace

// Without a first frame (null or empty) there is no frame type to read: no lock, the instance
// fields stay as they are.
void LockAMRFrameType(CALCodec *hCodec, const uint8_t *pFrame, uint32_t uFrameLen) noexcept
{
    const uint32_t uOTI = hCodec->m_uCodecObjectTypeIndication;
    if (!IsAmr(uOTI) || AudioPropertyValue(hCodec, CAL_PROP_AMR_FRAME_TYPE_LOCK) != 1)
        return;
    if (!pFrame || uFrameLen == 0)
        return;

    const uint32_t uFT = FrameTypeOf(pFrame);
    hCodec->m_uAMRFrameType = uFT;
    const bool bNarrow = uOTI == CAL_OTI_AMR_NB;
    // A new lock, or none, replaces the lock of an earlier Init.
    DropSilenceFrame(hCodec);
    if (uFT > (bNarrow ? kAmrNbMaxFT : kAmrWbMaxFT)) {
        VORCAL_TRACE(kTraceError, 0, "[vorCAL_Wrapper, %d] AMR %s FT = [%d]\n", __LINE__,
                     bNarrow ? "NB" : "WB", static_cast<int>(uFT));
        return;
    }
    if (bNarrow) {
        VORCAL_TRACE(kTraceAudio, 0, "[vorCAL_Wrapper, %d] AMR NB FT = [%d]\n", __LINE__,
                     static_cast<int>(uFT));
        AMRNB_MuteFrame(&hCodec->m_pSilenceFrame, &hCodec->m_uSilenceFrameLen, uFT);
    } else {
        VORCAL_TRACE(kTraceAudio, 0, "[vorCAL_Wrapper, %d] AMR WB FT = [%d]\n", __LINE__,
                     static_cast<int>(uFT));
        AMRWB_MuteFrame(&hCodec->m_pSilenceFrame, &hCodec->m_uSilenceFrameLen, uFT);
    }
}

// A configuration shorter than the two DSI bytes (or none) leaves rate and channel count as
// the codec wrote them and counts as plain AAC (no SBR): 1024 samples, 16 bits.
void FillAudioStreamParameters(CALCodec *hCodec, const uint8_t *pConfig, int32_t iConfigLen,
                               uint32_t *puSamplingRate, uint32_t *puNumOfChannels,
                               uint32_t *puBitsPerSample, uint32_t *puSamplesPerFrame) noexcept
{
    if (AudioPropertyValue(hCodec, CAL_PROP_STREAM_PARAMETERS) != 1)
        return;
    switch (hCodec->m_uCodecObjectTypeIndication) {
    case CAL_OTI_AAC:
    case CAL_OTI_AAC_SBR:
    case CAL_OTI_MPEG2_AAC: {
        uint32_t uSBR = 0;
        if (pConfig && iConfigLen >= 2) {
            uint32_t uRate = 0;
            uint32_t uChannels = 0;
            vorCALTools_AAC_ParseDSI(pConfig, &uRate, &uChannels, &uSBR);
            Store(puNumOfChannels, uChannels);
            Store(puSamplingRate, uSBR ? uRate * 2 : uRate);
        }
        Store(puSamplesPerFrame, uSBR ? 2048 : 1024);
        Store(puBitsPerSample, 16);
        break;
    }
    case CAL_OTI_AMR_NB:
    case CAL_OTI_NB_SPEECH:
    case CAL_OTI_AMR_WB:
        // CONTRACT: AMR-WB too gets the narrowband values (not 16000 Hz and 320 samples).
        Store(puSamplingRate, 8000);
        Store(puNumOfChannels, 1);
        Store(puBitsPerSample, 16);
        Store(puSamplesPerFrame, 160);
        break;
    default:
        break;
    }
}

// CONTRACT: the length is compared first, so a zero-length (or null) frame is never read and
// is replaced.
AudioFrame SubstituteAMRFrame(const CALCodec *hCodec, AudioFrame frame) noexcept
{
    if (!IsAmr(hCodec->m_uCodecObjectTypeIndication) || !hCodec->m_pSilenceFrame ||
        hCodec->m_uSilenceFrameLen == 0)
        return frame;
    const bool bFits = frame.iLen >= 0 &&
                       static_cast<uint32_t>(frame.iLen) == hCodec->m_uSilenceFrameLen &&
                       frame.pData && FrameTypeOf(frame.pData) == hCodec->m_uAMRFrameType;
    if (bFits)
        return frame;
    return AudioFrame{hCodec->m_pSilenceFrame, static_cast<int32_t>(hCodec->m_uSilenceFrameLen)};
}

} // namespace vorcal::wrapper
