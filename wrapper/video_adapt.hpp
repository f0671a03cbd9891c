// The video decoder adaptation steps that vorCAL_VideoDecoderInit and vorCAL_VideoDecoderDecode
// run between their dump record and the codec call.
#pragma once

#include <cstdint>

#include <vorcal/wrapper.h>

namespace vorcal::wrapper {

// The arguments of the codec's Init as the layer will pass them.
struct VideoInitArgs {
    uint32_t uOTI;
    const uint8_t *pConfig;
    int32_t iConfigLen;
    const uint8_t *pConfigEnhance;
    int32_t iEnhLen;
    uint32_t uNALLengthSize;
    uint32_t *puWidth;
    uint32_t *puHeight;
    uint32_t *puPitch;
};

// What the layer decided before the codec's Init.
struct VideoInitPlan {
    bool bAnswered = false;             // the layer answers the call itself with iResult
    int32_t iResult = 0;
    uint8_t *pTemporaryConfig = nullptr; // freed after the codec's Init returns
};

// Reads sizes, refuses streams and converts the configuration; adapts args in place.
VideoInitPlan PrepareVideoInit(CALCodec *hCodec, VideoInitArgs &args) noexcept;

// One frame on its way to the codec's Decode.
struct VideoFrame {
    const uint8_t *pData;
    int32_t iLen;
};

// Removes in-band parameter sets, converts the framing and aligns MPEG-4 frames. Returns false
// when the layer drops the frame; *piResult and *puDecodeResult then hold the answer.
bool AdaptVideoFrame(CALCodec *hCodec, VideoFrame &frame, CALParam uParam3, uint32_t *puDecodeResult,
                     int32_t *piResult) noexcept;

} // namespace vorcal::wrapper
