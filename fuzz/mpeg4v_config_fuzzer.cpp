// The MPEG-4 Visual / H.263 configuration walk on arbitrary data: it must stay inside the data,
// end, and report 1 only for empty data.
#include <cstddef>
#include <cstdint>
#include <cstring>

#include <vorcal/video_tools.h>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    CALMPEG4DSIInfo info;
    std::memset(&info, 0xA5, sizeof info);
    const uint32_t uResult = vorCALTools_MPEG4V_GetDSIInfo(pData, static_cast<uint32_t>(uSize), &info);
    if (uResult != (uSize == 0 ? 1u : 0u))
        __builtin_trap();
    // Sizes come from 13-bit fields, the H.263 table or 9-bit custom indications.
    if (info.uWidth != 0xA5A5A5A5u && info.uWidth > 8191u)
        __builtin_trap();
    if (info.uSourceFormat != 0xA5A5A5A5u && info.uSourceFormat > 7u)
        __builtin_trap();
    return 0;
}
