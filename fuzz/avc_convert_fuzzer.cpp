// Framing tests and every conversion with hostile destination sizes. The destination is
// allocated with exactly the size passed, so a write beyond it is caught by the sanitizer.
// Input: NAL length size selector, 4-byte destination size selector, then the source.
#include <cstdint>
#include <cstdlib>
#include <vector>

#include <vorcal/video_tools.h>

#include "fuzz_sal.hpp"

namespace {

void Check(bool ok)
{
    if (!ok)
        __builtin_trap();
}

using Convert = int32_t (*)(uint8_t *, int32_t, const uint8_t *, int32_t, int32_t);

int32_t PSs(uint8_t *d, int32_t n, const uint8_t *s, int32_t len, int32_t)
{
    return vorCALTools_AVC_ConvertFormatPSs(d, n, s, len);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const int32_t iNalSize = static_cast<int32_t>(in.Byte() % 8) - 1; // -1 .. 6
    const uint32_t uDstSel = in.U32();
    const std::vector<uint8_t> src(in.Rest(), in.Rest() + in.RestSize());
    const int32_t iLen = static_cast<int32_t>(src.size());

    const int32_t iFormat = vorCALTools_AVC_CheckFormat(src.data(), iLen);
    Check(iFormat >= 0 && iFormat <= 2);
    const int32_t iCode = vorCALTools_AVC_FindStartCode(src.data(), iLen);
    Check(iCode == -1 || (iCode >= 0 && iCode < iLen - 3));

    // Destination sizes: negative, tiny, around the source length, or generous.
    int32_t iDst;
    switch (uDstSel >> 30) {
    case 0: iDst = -static_cast<int32_t>(uDstSel & 0xFF); break;
    case 1: iDst = static_cast<int32_t>(uDstSel % 16); break;
    case 2: iDst = iLen + static_cast<int32_t>(uDstSel % 64) - 32; break;
    default: iDst = iLen * 2 + 100; break;
    }
    const size_t uAlloc = iDst > 0 ? static_cast<size_t>(iDst) : 0;
    for (Convert f : {Convert{vorCALTools_AVC_ConvertFormat}, Convert{vorCALTools_AVC_ConvertFormat_NoSPSPPS}, Convert{PSs}}) {
        uint8_t *pDst = static_cast<uint8_t *>(std::malloc(uAlloc ? uAlloc : 1));
        const int32_t r = f(uAlloc ? pDst : nullptr, iDst, src.data(), iLen, iNalSize);
        Check(r >= -1 && r <= (iDst > 0 ? iDst : 0));
        // A frame that converted to length prefixes converts back to the same number of units.
        if (f != PSs && r > 4 && iFormat != 1) {
            std::vector<uint8_t> back(static_cast<size_t>(r) + 100);
            const int32_t rb = vorCALTools_AVC_ConvertFormat(back.data(), static_cast<int32_t>(back.size()), pDst, r, 4);
            Check(rb <= r || vorCALTools_AVC_CheckFormat(pDst, r) != 1);
        }
        std::free(pDst);
    }
    return 0;
}
