// The header bit reader under arbitrary operation sequences, and vorCALTools_AVC_GetSPSInfo on
// arbitrary data. Byte 0 selects a mode; the rest is the data (or operations, then data). The
// data is an exact-size copy, so any load outside it is caught.
#include <cstdint>
#include <vector>

#include <vorcal/video_tools.h>

#include "fuzz_sal.hpp"

#define CHECK(x) ((x) ? void() : __builtin_trap())

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const uint8_t uMode = in.Byte();
    std::vector<uint8_t> ops(uMode & 1 ? in.Byte() % 64 : 0);
    for (uint8_t &op : ops)
        op = in.Byte();
    const std::vector<uint8_t> data(in.Rest(), in.Rest() + in.RestSize());
    CALSPSInfo info{};
    if (!(uMode & 1)) // a negative length is "too short"
        CHECK(vorCALTools_AVC_GetSPSInfo(data.data(), static_cast<int32_t>(data.size()), &info) <= 3 &&
              vorCALTools_AVC_GetSPSInfo(data.data(), -static_cast<int32_t>(data.size()) - 1, &info) == 1);
    CALToolsBS bs{};
    bs.pBuffer = data.data();
    bs.uLength = static_cast<uint32_t>(data.size());
    for (int i = 0; i < 4; ++i)
        _LoadBS(&bs);
    for (uint8_t op : ops) {
        const uint32_t n = op >> 3, uPeek = _ReadBitsMSB(&bs);
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
