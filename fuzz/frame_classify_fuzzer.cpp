// Frame classification on arbitrary frames. Input: one byte picks the codec, one byte the NAL
// length size (H.264), four bytes the sequence header (WMV3/WVC1), the rest is the frame.
#include <cstddef>
#include <cstdint>

#include <vorcal/video_tools.h>

#include "fuzz_sal.hpp"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    static constexpr uint32_t kCodecs[] = {0x20,       0xF1,       0xC0,       0xC1,       0xC2,       0xDB, 0xF2,
                                           0x31564D57, 0x32564D57, 0x3334504D, 0x33564D57, 0x31435657, 0x40, 0};
    vorcal::fuzz::Input in(pData, uSize);
    const uint32_t uOTI = kCodecs[in.Byte() % (sizeof kCodecs / sizeof kCodecs[0])];
    CALParam uExtra = in.Byte() % 6; // NAL length size
    if (uOTI == 0x33564D57 || uOTI == 0x31435657)
        uExtra = in.RestSize() >= 4 ? reinterpret_cast<CALParam>(in.Rest()) : 0;
    in.U32();
    const uint8_t *pFrame = in.RestSize() ? in.Rest() : nullptr;
    const auto iLen = static_cast<int32_t>(in.RestSize());
    const int32_t iIntra = vorCALTools_IsIDRFrame(uOTI, pFrame, iLen, uExtra);
    const int32_t iB = vorCALTools_IsBFrame(uOTI, pFrame, iLen);
    if (((iIntra | iB | vorCALTools_IsValidVideo(uOTI, pFrame, iLen)) & ~1) || (iIntra && iB))
        __builtin_trap(); // answers are 0 or 1, and a first VOP is not both I and B
    int32_t iRemaining = -1;
    const uint8_t *pVop = _PTOOL_FindVOP(pFrame, iLen, &iRemaining);
    if (pVop == nullptr ? iRemaining != -1 : pVop[3] != 0xB6 || iRemaining != iLen - (pVop - pFrame))
        __builtin_trap();
    return 0;
}
