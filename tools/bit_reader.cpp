// Exported header bit reader and big-endian field functions.
#include <vorcal/video_tools.h>

#include "tools/bit_reader.hpp"

namespace bs = vorcal::tools::bs;

extern "C" int32_t _LoadBS(CALToolsBS *pBS)
{
    return bs::Load(*pBS) ? 1 : 0;
}

extern "C" uint32_t _ReadBitsMSB(CALToolsBS *pBS)
{
    return bs::Peek(*pBS);
}

extern "C" uint32_t _CountLeadingZeros32(uint32_t x)
{
    return static_cast<uint32_t>(std::countl_zero(x));
}

extern "C" uint32_t _ReadNShiftBits(CALToolsBS *pBS, uint32_t n)
{
    return bs::Read(*pBS, n);
}

extern "C" uint32_t _GetUE_V(CALToolsBS *pBS)
{
    return bs::ReadUE(*pBS);
}

extern "C" int32_t _ShiftBits(CALToolsBS *pBS, uint32_t n)
{
    return bs::Skip(*pBS, n) ? 1 : 0;
}

extern "C" int32_t _AlignBits(CALToolsBS *pBS)
{
    return bs::Align(*pBS) ? 1 : 0;
}

extern "C" int32_t _ShiftBytes(CALToolsBS *pBS, int32_t n)
{
    return bs::SkipBytes(*pBS, n) ? 1 : 0;
}

extern "C" uint32_t vorCALTools_ReadBigEndianValue16(const uint8_t *p)
{
    return (uint32_t{p[0]} << 8) | p[1];
}

extern "C" uint32_t vorCALTools_ReadBigEndianValue24(const uint8_t *p)
{
    return (uint32_t{p[0]} << 16) | (uint32_t{p[1]} << 8) | p[2];
}

extern "C" uint32_t vorCALTools_ReadBigEndianValue32(const uint8_t *p)
{
    return (uint32_t{p[0]} << 24) | (uint32_t{p[1]} << 16) | (uint32_t{p[2]} << 8) | p[3];
}

extern "C" uint16_t vorCALTools_WriteBigEndianValue16(uint16_t v)
{
    return static_cast<uint16_t>((v << 8) | (v >> 8));
}
