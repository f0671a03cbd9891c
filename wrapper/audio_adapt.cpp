// Audio decoder adaptation: AMR frame-type lock and substitution, AAC and speech parameters.
#include "wrapper/audio_adapt.hpp"

namespace vorcal::wrapper {

void LockAMRFrameType(CALCodec * /*hCodec*/, const uint8_t * /*pFrame*/, uint32_t /*uFrameLen*/) noexcept
{
}

void FillAudioStreamParameters(CALCodec * /*hCodec*/, const uint8_t * /*pConfig*/, int32_t /*iConfigLen*/,
                               uint32_t * /*puSamplingRate*/, uint32_t * /*puNumOfChannels*/,
                               uint32_t * /*puBitsPerSample*/, uint32_t * /*puSamplesPerFrame*/) noexcept
{
}

AudioFrame SubstituteAMRFrame(const CALCodec * /*hCodec*/, AudioFrame frame) noexcept
{
    return frame;
}

} // namespace vorcal::wrapper
