// The codec instance's intermediate frame buffer (the converted H.264 data it owns).
#pragma once

#include <vorcal/wrapper.h>

#include "core/sal.hpp"

namespace vorcal::wrapper {

// Frees the buffer and clears pointer and size. CONTRACT: the buffer goes only when both its
// pointer and its size are set; a pointer with size 0 is left alone.
inline void ReleaseIntermediate(CALCodec *hCodec) noexcept
{
    if (hCodec->m_pIntermediateFrame && hCodec->m_iIntermediateFrameSize != 0) {
        sal::Free(hCodec->m_pIntermediateFrame);
        hCodec->m_pIntermediateFrame = nullptr;
        hCodec->m_iIntermediateFrameSize = 0;
    }
}

} // namespace vorcal::wrapper
