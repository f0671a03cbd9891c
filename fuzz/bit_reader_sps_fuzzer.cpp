// The header bit reader under arbitrary operation sequences, and vorCALTools_AVC_GetSPSInfo on
// arbitrary data. Byte 0 selects a mode; the rest is the data (or operations, then data).
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

void RunReader(vorcal::fuzz::Input &in)
{
    const size_t uOps = in.Byte() % 64;
    std::vector<uint8_t> ops;
    for (size_t i = 0; i < uOps; ++i)
        ops.push_back(in.Byte());
    // The buffer is an exact-size copy, so any load outside it is caught.
    const std::vector<uint8_t> data(in.Rest(), in.Rest() + in.RestSize());
    CALToolsBS bs{};
    bs.pBuffer = data.data();
    bs.uLength = static_cast<uint32_t>(data.size());
    for (int i = 0; i < 4; ++i)
        _LoadBS(&bs);
    for (uint8_t op : ops) {
        const uint32_t n = op >> 3;
        switch (op & 7) {
        case 0: {
            const uint32_t peek = _ReadBitsMSB(&bs);
            const uint32_t v = _ReadNShiftBits(&bs, n);
            Check(n == 0 ? v == 0 : v == peek >> (32 - n));
            break;
        }
        case 1: {
            const CALToolsBS before = bs;
            const bool bAllZero = _ReadBitsMSB(&bs) == 0;
            const uint32_t v = _GetUE_V(&bs);
            Check(!bAllZero || (v == 0xFFFFFFFFu && bs.uNextByte == before.uNextByte && bs.uBitPos == before.uBitPos));
            break;
        }
        case 2:
            _ShiftBits(&bs, n);
            break;
        case 3:
            _AlignBits(&bs);
            Check(bs.uBitPos == 0);
            break;
        case 4:
            Check(_ShiftBytes(&bs, static_cast<int32_t>(n) - 4) == 0 || bs.uNextByte >= bs.uLength);
            break;
        default: {
            const int32_t iEnd = _LoadBS(&bs);
            Check(iEnd == (bs.uNextByte >= bs.uLength ? 1 : 0));
            break;
        }
        }
        Check(bs.uBitPos < 8);
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const uint8_t mode = in.Byte();
    if (mode & 1) {
        RunReader(in);
        return 0;
    }
    const std::vector<uint8_t> data(in.Rest(), in.Rest() + in.RestSize());
    CALSPSInfo info{};
    const uint32_t r = vorCALTools_AVC_GetSPSInfo(data.data(), static_cast<int32_t>(data.size()), &info);
    Check(r <= 3);
    if (mode & 2) // a negative length is "too short"
        Check(vorCALTools_AVC_GetSPSInfo(data.data(), -static_cast<int32_t>(data.size()) - 1, &info) == 1);
    return 0;
}
