// The MPEG-4 Visual / H.263 configuration walk on arbitrary data: it must stay inside the data,
// end, report 1 only for empty data, and write sizes that its fields can hold.
#include <cstddef>
#include <cstdint>

#include <vorcal/video_tools.h>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    constexpr uint32_t kUnset = 0xA5A5A5A5u;
    CALMPEG4DSIInfo info{kUnset, kUnset, kUnset, kUnset, kUnset};
    if (vorCALTools_MPEG4V_GetDSIInfo(pData, static_cast<uint32_t>(uSize), &info) != (uSize == 0 ? 1u : 0u) ||
        (info.uWidth != kUnset && info.uWidth > 8191u) || (info.uSourceFormat != kUnset && info.uSourceFormat > 7u))
        __builtin_trap();
    return 0;
}
