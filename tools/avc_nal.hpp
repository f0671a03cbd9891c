// The H.264 NAL unit header and the types the tools tell apart (ITU-T H.264 7.3.1, 7.4.1), and
// the NAL length size of an AVC decoder configuration record. The framing itself is the
// codec-neutral one of tools/nal_framing.hpp.
#pragma once

#include <cstdint>

#include "tools/nal_framing.hpp"

namespace vorcal::tools::avc {

// ITU-T H.264 Table 7-1 nal_unit_type values the tools tell apart.
inline constexpr uint32_t kNalSliceNonIdr = 1;
inline constexpr uint32_t kNalPartitionA = 2;
inline constexpr uint32_t kNalSliceIdr = 5;
inline constexpr uint32_t kNalSei = 6;
inline constexpr uint32_t kNalSps = 7;
inline constexpr uint32_t kNalPps = 8;
inline constexpr uint32_t kNalFiller = 12;
inline constexpr uint32_t kNalAuxSlice = 19;

// The one-byte NAL unit header: forbidden_zero_bit, nal_ref_idc, nal_unit_type.
inline constexpr uint8_t kForbiddenBit = 0x80;
inline constexpr uint8_t kTypeMask = 0x1F;

inline uint32_t NalType(uint8_t uHeader) noexcept
{
    return uHeader & kTypeMask;
}

inline bool IsSlice(uint32_t uType) noexcept
{
    return uType == kNalSliceNonIdr || uType == kNalSliceIdr;
}
inline bool IsConfigUnit(uint32_t uType) noexcept
{
    return uType == kNalSei || uType == kNalSps || uType == kNalPps;
}

// lengthSizeMinusOne + 1 of an AVC decoder configuration record (ISO/IEC 14496-15 5.3.3.1:
// configurationVersion 1, lengthSizeMinusOne in the low two bits of byte 4), or 0 when the data
// is not one. A parameter-set list (count, 16-bit length, SPS) may begin with 1 as well; its
// byte 3 is then the SPS header, which no level_idc equals.
inline int32_t ConfigRecordNalLengthSize(const uint8_t *p, int32_t iLen) noexcept
{
    constexpr int32_t kFixedPart = 7; // up to the first SPS length
    if (p == nullptr || iLen < kFixedPart || p[0] != 1 || (p[3] & (kForbiddenBit | kTypeMask)) == kNalSps)
        return 0;
    return (p[4] & 3) + 1;
}

} // namespace vorcal::tools::avc
