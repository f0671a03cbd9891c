// The frame conversion of vorCALTools_AVC_ConvertFormat with the source framing given by the
// caller, and the size it needs: what the video decoder wrapper uses when it knows the framing
// from the configuration, or when the documented destination turns out too small.
#pragma once

#include <cstdint>

namespace vorcal::tools::avc {

// vorCALTools_AVC_ConvertFormat for a source whose framing is iSourceFormat (CAL_AVC_FORMAT_NAL:
// length-prefixed; anything else: start codes) instead of the format test's answer.
int32_t ConvertFrame(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc, int32_t iSrcLen, int32_t iNALLengthSize,
                     int32_t iSourceFormat) noexcept;

// The bytes ConvertFrame writes for this source given room enough, or -1 when it fails for
// another reason. Reads the source once and traces nothing.
int64_t ConvertedSize(const uint8_t *pSrc, int32_t iSrcLen, int32_t iNALLengthSize, int32_t iSourceFormat) noexcept;

} // namespace vorcal::tools::avc
