// vorCAL_AudioDecoderInit and vorCAL_AudioDecoderDecode: dump record, adaptation, codec call.
#include <vorcal/wrapper.h>

#include "core/dump.hpp"
#include "core/sal.hpp"
#include "wrapper/audio_adapt.hpp"
#include "wrapper/codec_slots.hpp"

using namespace vorcal;
using namespace vorcal::wrapper;

extern "C" int32_t vorCAL_AudioDecoderInit(CALCodec *hCodec, CALParam uParam1, const uint8_t *pConfig,
                                           int32_t iConfigLen, const uint8_t *pFrame, uint32_t uFrameLen,
                                           uint32_t *puSamplingRate, uint32_t *puNumOfChannels,
                                           uint32_t *puBitsPerSample, uint32_t *puSamplesPerFrame,
                                           CALParam uUserData)
{
    if (!hCodec)
        return -1;

    core::WriteDumpRecord(hCodec->m_hCAL, core::kAudioDumpSlot, pConfig, iConfigLen);
    hCodec->m_uUserData = uUserData;
    LockAMRFrameType(hCodec, pFrame, uFrameLen);

    const int32_t iResult = CallSlot<CALAudioDecoderInitFunc>(
        hCodec, kSlot1, uParam1, pConfig, iConfigLen, pFrame, uFrameLen, puSamplingRate, puNumOfChannels,
        puBitsPerSample, puSamplesPerFrame, &hCodec->m_uUserData);

    VORCAL_TRACE_PLAIN("[vorCAL_AudioDecoderInit] UserData(0x%X)(0x%X)\n", sal::Hex32(hCodec->m_uUserData),
                       sal::Hex32(&hCodec->m_uUserData));

    FillAudioStreamParameters(hCodec, pConfig, iConfigLen, puSamplingRate, puNumOfChannels, puBitsPerSample,
                              puSamplesPerFrame);
    return iResult;
}

extern "C" int32_t vorCAL_AudioDecoderDecode(CALCodec *hCodec, const uint8_t *pData, int32_t iLen,
                                             CALParam uParam3, CALParam uParam4, CALParam uParam5,
                                             CALParam uParam6)
{
    if (!hCodec)
        return -1;

    // The record holds the frame as the engine passed it, before any substitution.
    core::WriteDumpRecord(hCodec->m_hCAL, core::kAudioDumpSlot, pData, iLen);

    const AudioFrame frame = SubstituteAMRFrame(hCodec, AudioFrame{pData, iLen});
    return CallSlot<CALAudioDecoderDecodeFunc>(hCodec, kSlot3, frame.pData, frame.iLen, uParam3, uParam4,
                                               uParam5, uParam6, hCodec->m_uUserData);
}
