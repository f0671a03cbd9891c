// Configuration-run searches, vorCALTools_AVC_GetOneFrame and _NEXT_NAL_ walks with every NAL
// length size, on exact-size data. Byte 0 picks the NAL length size; the rest is the data.
#include <cstdint>
#include <vector>

#include <vorcal/video_tools.h>

#include "fuzz_sal.hpp"

namespace {

void Check(bool ok)
{
    if (!ok)
        __builtin_trap();
}

void CheckRun(const uint8_t *p, int32_t iRun, const std::vector<uint8_t> &d)
{
    if (p == nullptr) {
        Check(iRun == 0);
        return;
    }
    Check(p >= d.data() && iRun >= 0 && p + iRun <= d.data() + d.size());
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const int32_t iSize = static_cast<int32_t>(in.Byte() % 8) - 1; // -1 .. 6
    const std::vector<uint8_t> d(in.Rest(), in.Rest() + in.RestSize());
    const int32_t iLen = static_cast<int32_t>(d.size());

    int32_t iRun = -5;
    const uint8_t *p = vorCALTools_AVC_ANNEXB_GetConfigStream(d.data(), iLen, &iRun);
    CheckRun(p, iRun, d);
    iRun = -5;
    p = vorCALTools_AVC_NAL_GetConfigStream(d.data(), iLen, iSize, &iRun);
    CheckRun(p, iRun, d);

    const int32_t iFrame = vorCALTools_AVC_GetOneFrame(d.data(), iLen);
    Check(iFrame >= 0 && iFrame <= iLen);

    // Every walk moves forward and ends.
    for (int32_t s = -1; s <= 6; ++s) {
        int32_t iPos = 0;
        while (iPos >= 0) {
            const int32_t iNext = _NEXT_NAL_(d.data(), iLen, iPos, s);
            Check(iNext == -1 || (iNext > iPos && iNext < iLen));
            iPos = iNext;
        }
    }
    return 0;
}
