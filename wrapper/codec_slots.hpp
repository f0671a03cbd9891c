// Calling the slots of an instance's codec function table through their typed signatures, and
// the two ways the layer reads a property answer.
#pragma once

#include <cstdint>

#include <vorcal/wrapper.h>

namespace vorcal::wrapper {

enum Slot : int { kSlot0 = 0, kSlot1, kSlot2, kSlot3, kSlot4, kSlot5 };

static_assert(sizeof(CALVideoDecoderFunctions) == CAL_CODEC_FUNCTION_SLOTS * sizeof(CALCodecFunc));
static_assert(sizeof(CALAudioDecoderFunctions) == CAL_CODEC_FUNCTION_SLOTS * sizeof(CALCodecFunc));
static_assert(sizeof(CALImageDecoderFunctions) == CAL_CODEC_FUNCTION_SLOTS * sizeof(CALCodecFunc));
static_assert(sizeof(CALTextDecoderFunctions) == CAL_CODEC_FUNCTION_SLOTS * sizeof(CALCodecFunc));
static_assert(sizeof(CALVideoEncoderFunctions) == CAL_CODEC_FUNCTION_SLOTS * sizeof(CALCodecFunc));

// The slot as a function of type F; null when the codec left it empty.
template <typename F>
inline F SlotAs(const CALCodec *hCodec, Slot eSlot) noexcept
{
    return reinterpret_cast<F>(hCodec->m_Functions[eSlot]);
}

// Calls slot eSlot with the arguments given, or answers -1 when the slot is empty.
template <typename F, typename... Args>
inline int32_t CallSlot(const CALCodec *hCodec, Slot eSlot, Args... args) noexcept
{
    F pFunction = SlotAs<F>(hCodec, eSlot);
    return pFunction ? pFunction(args...) : -1;
}

// Video decoder: a property counts only when GetProperty returned 0 and the value matches. The
// instance's GetProperty slot is called directly, as vorCAL_VideoDecoderGetProperty would (the
// adaptation asks on every frame).
inline bool VideoPropertyAnswered(CALCodec *hCodec, uint32_t uProperty, uint32_t *puValue) noexcept
{
    *puValue = 0;
    return CallSlot<CALGetPropertyFunc>(hCodec, kSlot0, uProperty, puValue) == 0;
}

inline bool VideoPropertyIs(CALCodec *hCodec, uint32_t uProperty, uint32_t uValue) noexcept
{
    uint32_t uAnswer = 0;
    return VideoPropertyAnswered(hCodec, uProperty, &uAnswer) && uAnswer == uValue;
}

// Audio decoder: only the value is looked at; it starts at 0, so an unanswered query reads 0.
inline uint32_t AudioPropertyValue(CALCodec *hCodec, uint32_t uProperty) noexcept
{
    uint32_t uValue = 0;
    vorCAL_AudioDecoderGetProperty(hCodec, uProperty, &uValue);
    return uValue;
}

} // namespace vorcal::wrapper
