// Frame classification on arbitrary frames. Input: one byte picks the codec, one byte the NAL
// length size (H.264), four bytes the sequence header (WMV3/WVC1), the rest is the frame.
#include <array>
#include <cstddef>
#include <cstdint>

#include <vorcal/video_tools.h>

#include "fuzz_sal.hpp"

namespace {

constexpr std::array<uint32_t, 15> kCodecs = {0x20,       0xF1,       0xC0,       0xC1,      0xC2,
                                              0xDB,       0xF2,       0x31564D57, 0x32564D57, 0x3334504D,
                                              0x33564D57, 0x31435657, 0x40,       0,          0xFFFFFFFF};

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const uint32_t uOTI = kCodecs[in.Byte() % kCodecs.size()];
    const uint32_t uNalSize = in.Byte() % 6;
    const uint8_t *pSeqHeader = in.Rest();
    const bool bHasSeqHeader = in.RestSize() >= 4;
    in.U32();
    const uint8_t *pFrame = in.RestSize() ? in.Rest() : nullptr;
    const auto iLen = static_cast<int32_t>(in.RestSize());

    const CALParam uExtra = (uOTI == 0x33564D57 || uOTI == 0x31435657)
                                ? (bHasSeqHeader ? reinterpret_cast<CALParam>(pSeqHeader) : 0)
                                : uNalSize;
    const int32_t iIntra = vorCALTools_IsIDRFrame(uOTI, pFrame, iLen, uExtra);
    const int32_t iB = vorCALTools_IsBFrame(uOTI, pFrame, iLen);
    const int32_t iValid = vorCALTools_IsValidVideo(uOTI, pFrame, iLen);
    if ((iIntra | iB | iValid) & ~1)
        __builtin_trap();
    if (iIntra && iB) // a frame's first VOP is either I or B
        __builtin_trap();

    int32_t iRemaining = -1;
    const uint8_t *pVop = _PTOOL_FindVOP(pFrame, iLen, &iRemaining);
    if (pVop != nullptr) {
        if (pVop < pFrame || pVop + 4 > pFrame + iLen || iRemaining != iLen - (pVop - pFrame))
            __builtin_trap();
        if (pVop[0] != 0 || pVop[1] != 0 || pVop[2] != 1 || pVop[3] != 0xB6)
            __builtin_trap();
    } else if (iRemaining != -1) {
        __builtin_trap();
    }
    return 0;
}
