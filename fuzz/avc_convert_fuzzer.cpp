// Framing tests and every conversion with hostile destination sizes. The destination is
// allocated with exactly the size passed, so a write beyond it is caught by the sanitizer.
// Input: NAL length size selector, 4-byte destination size selector, then the source.
#include <array>
#include <cstdint>
#include <vector>

#include <vorcal/video_tools.h>

#include "fuzz_sal.hpp"

#define CHECK(x) ((x) ? void() : __builtin_trap())

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const int32_t iNalSize = static_cast<int32_t>(in.Byte() % 8) - 1; // -1 .. 6
    const uint32_t uSel = in.U32();
    const std::vector<uint8_t> src(in.Rest(), in.Rest() + in.RestSize());
    const int32_t iLen = static_cast<int32_t>(src.size());
    const int32_t iFormat = vorCALTools_AVC_CheckFormat(src.data(), iLen), iCode = vorCALTools_AVC_FindStartCode(src.data(), iLen);
    CHECK(iFormat >= 0 && iFormat <= 2 && (iCode == -1 || (iCode >= 0 && iCode < iLen - 3)));
    // Destination sizes: negative, tiny, around the source length, or generous.
    const int32_t iDst = std::array{-static_cast<int32_t>(uSel & 0xFF), static_cast<int32_t>(uSel % 16),
                                    iLen + static_cast<int32_t>(uSel % 64) - 32, iLen * 2 + 100}[uSel >> 30];
    auto PSs = [](uint8_t *d, int32_t n, const uint8_t *s, int32_t len, int32_t) { return vorCALTools_AVC_ConvertFormatPSs(d, n, s, len); };
    for (auto f : {vorCALTools_AVC_ConvertFormat, vorCALTools_AVC_ConvertFormat_NoSPSPPS, +PSs}) {
        std::vector<uint8_t> dst(iDst > 0 ? static_cast<size_t>(iDst) : 0);
        const int32_t r = f(dst.empty() ? nullptr : dst.data(), iDst, src.data(), iLen, iNalSize);
        CHECK(r >= -1 && r <= (iDst > 0 ? iDst : 0));
    }
    return 0;
}
