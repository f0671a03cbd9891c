// VC-1 extra data and the VC-1 intra rule: the input's first four bytes serve as the sequence
// header (and as the extra data), the rest as the frame.
#include <cstddef>
#include <cstdint>
#include <initializer_list>

#include <vorcal/video_tools.h>

#include "fuzz_sal.hpp"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    uint32_t uProfile = 99;
    const uint32_t uResult = vorCALTools_VC1_GetExtraDataInfo(pData, static_cast<uint32_t>(uSize), &uProfile);
    if (uResult != (uSize == 0 ? 1u : 0u) || (uResult == 0 && uProfile != uint32_t(pData[0] >> 6)))
        __builtin_trap();
    if (uSize < 4)
        return 0;
    vorcal::fuzz::Input in(pData, uSize);
    in.U32();
    const uint8_t *pFrame = in.RestSize() ? in.Rest() : nullptr;
    const auto iLen = static_cast<int32_t>(in.RestSize());
    for (uint32_t uFourCC : {0x33564D57u, 0x31435657u}) {
        const int32_t iIntra = vorCALTools_IsIDRFrame(uFourCC, pFrame, iLen, reinterpret_cast<CALParam>(pData));
        if (iIntra & ~1)
            __builtin_trap();
    }
    return 0;
}
