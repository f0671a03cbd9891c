// VC-1 extra data and the VC-1 intra rule: the input's first four bytes serve as the sequence
// header (and as the extra data), the rest as the frame; the input length picks WMV3 or WVC1.
#include <cstddef>
#include <cstdint>

#include <vorcal/video_tools.h>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    uint32_t uProfile = 99;
    const uint32_t uResult = vorCALTools_VC1_GetExtraDataInfo(pData, static_cast<uint32_t>(uSize), &uProfile);
    if (uResult != (uSize == 0 ? 1u : 0u) || (uResult == 0 && uProfile != uint32_t(pData[0] >> 6)))
        __builtin_trap();
    const uint32_t uFourCC = uSize & 1 ? 0x33564D57u : 0x31435657u;
    if (uSize >= 4 && (vorCALTools_IsIDRFrame(uFourCC, uSize > 4 ? pData + 4 : nullptr, static_cast<int32_t>(uSize - 4),
                                              reinterpret_cast<CALParam>(pData)) & ~1))
        __builtin_trap();
    return 0;
}
