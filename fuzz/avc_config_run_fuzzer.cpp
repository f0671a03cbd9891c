// Configuration-run searches, vorCALTools_AVC_GetOneFrame and _NEXT_NAL_ walks with every NAL
// length size, on exact-size data. Byte 0 picks the NAL length size; the rest is the data.
#include <cstdint>
#include <vector>

#include <vorcal/video_tools.h>

#include "fuzz_sal.hpp"

#define CHECK(x) ((x) ? void() : __builtin_trap())

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const int32_t iSize = static_cast<int32_t>(in.Byte() % 8) - 1; // -1 .. 6
    const std::vector<uint8_t> d(in.Rest(), in.Rest() + in.RestSize());
    const int32_t iLen = static_cast<int32_t>(d.size());
    int32_t iRun[2] = {-5, -5};
    const uint8_t *p[2] = {vorCALTools_AVC_ANNEXB_GetConfigStream(d.data(), iLen, &iRun[0]),
                           vorCALTools_AVC_NAL_GetConfigStream(d.data(), iLen, iSize, &iRun[1])};
    for (int i = 0; i < 2; ++i)
        CHECK(p[i] ? p[i] >= d.data() && iRun[i] >= 0 && p[i] + iRun[i] <= d.data() + d.size() : iRun[i] == 0);
    CHECK(static_cast<uint32_t>(vorCALTools_AVC_GetOneFrame(d.data(), iLen)) <= static_cast<uint32_t>(iLen)); // 0 .. iLen
    // Every walk moves forward and ends.
    for (int32_t s = -1; s <= 6; ++s) {
        for (int32_t iPos = 0, iNext; iPos >= 0; iPos = iNext) {
            iNext = _NEXT_NAL_(d.data(), iLen, iPos, s);
            CHECK(iNext == -1 || (iNext > iPos && iNext < iLen));
        }
    }
    return 0;
}
