// HEVC frame conversion, walks, IRAP test and parameter-set run on exact-size data, with hostile
// destination sizes. The destination is allocated with exactly the size passed, so a write
// beyond it is caught by the sanitizer. Input: a byte picking the NAL length size and the source
// format, 4 bytes picking the destination size, then the frame.
#include <array>
#include <cstdint>
#include <vector>

#include <vorcal/video_tools.h>

#include "fuzz_sal.hpp"

#define CHECK(x) ((x) ? void() : __builtin_trap())

namespace {

using Bytes = std::vector<uint8_t>;

// Empty data still has an address (a vector's may be null, which the tools refuse).
const uint8_t *Ptr(const Bytes &d)
{
    static const uint8_t kNothing = 0;
    return d.empty() ? &kNothing : d.data();
}

// The units of a walk, and how it ended.
std::vector<Bytes> Walk(const Bytes &d, int32_t iSize, int32_t &iEnd)
{
    std::vector<Bytes> units;
    CALHEVCNAL u{};
    int32_t iPrevious = -1;
    while ((iEnd = vorCALTools_HEVC_NextNAL(Ptr(d), int32_t(d.size()), iSize, &u)) == 1) {
        CHECK(u.iLen >= 2 && u.pUnit >= Ptr(d) + u.iStart && u.pUnit + u.iLen <= Ptr(d) + d.size() && u.iStart > iPrevious);
        iPrevious = u.iStart;
        units.emplace_back(u.pUnit, u.pUnit + u.iLen);
    }
    return units;
}

Bytes Convert(const Bytes &src, int32_t iFormat, int32_t iSize, int32_t &r)
{
    r = vorCALTools_HEVC_ConvertFormat(nullptr, 0, Ptr(src), int32_t(src.size()), iFormat, iSize);
    Bytes dst(r > 0 ? size_t(r) : 0);
    if (r > 0)
        CHECK(vorCALTools_HEVC_ConvertFormat(dst.data(), r, Ptr(src), int32_t(src.size()), iFormat, iSize) == r);
    return dst;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const uint8_t uSel = in.Byte();
    const int32_t iSize = int32_t(uSel % 7) - 1; // -1 .. 5
    const int32_t iFormat = int32_t((uSel >> 3) % 4); // 0 .. 3
    const uint32_t uDst = in.U32();
    const Bytes src(in.Rest(), in.Rest() + in.RestSize());
    const int32_t iLen = int32_t(src.size());

    const int32_t iCheck = vorCALTools_HEVC_CheckFormat(src.data(), iLen);
    CHECK(iCheck >= 0 && iCheck <= 2);
    // Any destination: never beyond it; the result is the measured size or a failure.
    const int32_t iNeeded = vorCALTools_HEVC_ConvertFormat(nullptr, 0, src.data(), iLen, iFormat, iSize);
    const int32_t iDst = std::array{-int32_t(uDst & 0xFF), int32_t(uDst % 16), iNeeded + int32_t(uDst % 8) - 4, iLen * 2 + 100}[uDst >> 30];
    Bytes dst(iDst > 0 ? size_t(iDst) : 0);
    const int32_t r = vorCALTools_HEVC_ConvertFormat(dst.empty() ? nullptr : dst.data(), iDst, src.data(), iLen, iFormat, iSize);
    // (A destination too small may be found before a broken unit further on.)
    if (!dst.empty())
        CHECK(r == (iNeeded >= 0 && iNeeded > iDst ? CAL_HEVC_ERR_NO_ROOM : iNeeded) || (iNeeded < 0 && r == CAL_HEVC_ERR_NO_ROOM));

    // Start codes to lengths and back keep every unit the walk finds, and the walk of the
    // length-prefixed result finds the same.
    for (int32_t s = 1; s <= 4; ++s) {
        int32_t iEnd = 0, r1 = 0, r2 = 0, iEnd2 = 0;
        const std::vector<Bytes> units = Walk(src, 0, iEnd);
        const Bytes lengths = Convert(src, CAL_AVC_FORMAT_ANNEXB, s, r1);
        CHECK((r1 >= 0) == (iEnd == 0) || r1 == CAL_HEVC_ERR_TOO_LONG);
        if (r1 < 0)
            continue;
        CHECK(Walk(lengths, s, iEnd2) == units && iEnd2 == 0);
        const Bytes back = Convert(lengths, CAL_AVC_FORMAT_NAL, s, r2);
        CHECK(r2 >= 0 && Walk(back, 0, iEnd2) == units && iEnd2 == 0);
    }
    int32_t iEnd = 0;
    Walk(src, iSize, iEnd);
    CHECK(iEnd <= 0);
    const int32_t iIrap = vorCALTools_HEVC_IsIRAP(src.data(), iLen, iSize);
    CHECK(iIrap == 0 || iIrap == 1);
    int32_t iRun = -5;
    const uint8_t *p = vorCALTools_HEVC_GetConfigStream(src.data(), iLen, iSize, &iRun);
    CHECK(p ? p >= src.data() && iRun > 0 && p + iRun <= src.data() + src.size() : iRun == 0);
    return 0;
}
