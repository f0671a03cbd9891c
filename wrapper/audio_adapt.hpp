// The audio decoder adaptation steps that vorCAL_AudioDecoderInit and vorCAL_AudioDecoderDecode
// run around the codec call.
#pragma once

#include <cstdint>

#include <vorcal/wrapper.h>

namespace vorcal::wrapper {

// Before the codec's Init: the AMR frame-type lock (builds the instance's silent frame).
void LockAMRFrameType(CALCodec *hCodec, const uint8_t *pFrame, uint32_t uFrameLen) noexcept;

// After the codec's Init: the AAC and speech stream parameters when property 3 answers 1.
void FillAudioStreamParameters(CALCodec *hCodec, const uint8_t *pConfig, int32_t iConfigLen,
                               uint32_t *puSamplingRate, uint32_t *puNumOfChannels,
                               uint32_t *puBitsPerSample, uint32_t *puSamplesPerFrame) noexcept;

// One frame on its way to the codec's Decode.
struct AudioFrame {
    const uint8_t *pData;
    int32_t iLen;
};

// Replaces a frame of a locked AMR stream by the silent frame when type or length differ.
AudioFrame SubstituteAMRFrame(const CALCodec *hCodec, AudioFrame frame) noexcept;

} // namespace vorcal::wrapper
