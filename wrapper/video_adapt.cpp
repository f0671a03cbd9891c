// Video decoder adaptation: the layer's own work for H.264, MPEG-4 Visual and H.263 streams.
#include "wrapper/video_adapt.hpp"

namespace vorcal::wrapper {

VideoInitPlan PrepareVideoInit(CALCodec * /*hCodec*/, VideoInitArgs & /*args*/) noexcept
{
    return {};
}

bool AdaptVideoFrame(CALCodec * /*hCodec*/, VideoFrame & /*frame*/, CALParam /*uParam3*/,
                     uint32_t * /*puDecodeResult*/, int32_t * /*piResult*/) noexcept
{
    return true;
}

} // namespace vorcal::wrapper
