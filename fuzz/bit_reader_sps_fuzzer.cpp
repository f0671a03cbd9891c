// vorCALTools_AVC_GetSPSInfo on arbitrary data, and the header bit reader on the same data under
// an operation sequence taken from its last bytes (byte 0 gives the count). The data is an
// exact-size copy, so any load outside it is caught.
#include <algorithm>
#include <cstdint>
#include <vector>

#include <vorcal/video_tools.h>

#include "fuzz_sal.hpp"

#define CHECK(x) ((x) ? void() : __builtin_trap())

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const size_t uOps = in.Byte() % 64;
    const std::vector<uint8_t> data(in.Rest(), in.Rest() + in.RestSize());
    const int32_t iLen = static_cast<int32_t>(data.size());
    CALSPSInfo info{};
    // A negative length is "too short".
    CHECK(vorCALTools_AVC_GetSPSInfo(data.data(), iLen, &info) <= 3 && vorCALTools_AVC_GetSPSInfo(data.data(), -iLen - 1, &info) == 1);
    CALToolsBS bs{0, 0, 0, data.data(), 0, static_cast<uint32_t>(iLen)};
    for (int i = 0; i < 4; ++i)
        _LoadBS(&bs);
    for (size_t k = 1; k <= std::min(uOps, data.size()); ++k) {
        const uint32_t op = data[data.size() - k], n = op >> 3, uPeek = _ReadBitsMSB(&bs);
        switch (op & 7) {
        case 0: CHECK(_ReadNShiftBits(&bs, n) == (n == 0 ? 0 : uPeek >> (32 - n))); break;
        case 1: CHECK(_GetUE_V(&bs) != 0xFFFFFFFFu || uPeek != 0 || _ReadBitsMSB(&bs) == 0); break;
        case 2: _ShiftBits(&bs, n); break;
        case 3: _AlignBits(&bs); break;
        case 4: CHECK(_ShiftBytes(&bs, static_cast<int32_t>(n) - 4) == 0 || bs.uNextByte >= bs.uLength); break;
        default: CHECK(_LoadBS(&bs) == (bs.uNextByte >= bs.uLength ? 1 : 0)); break;
        }
        CHECK(bs.uBitPos < 8);
    }
    return 0;
}
