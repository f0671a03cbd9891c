// The HEVC NAL unit header and the nal_unit_type table (ITU-T H.265 7.3.1.2, Table 7-1), the
// steps of the unit walks over frames and hvcC records, and the internal entry points the
// HEVC tools share. The framing itself is the codec-neutral one of tools/nal_framing.hpp.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string_view>

#include <vorcal/video_tools.h>

#include "tools/nal_framing.hpp"

namespace vorcal::tools::hevc {

// Table 7-1: the name of every nal_unit_type.
inline constexpr std::array<const char *, 64> kNalTypeNames = {
    "TRAIL_N",        "TRAIL_R",        "TSA_N",          "TSA_R",          "STSA_N",      "STSA_R",
    "RADL_N",         "RADL_R",         "RASL_N",         "RASL_R",         "RSV_VCL_N10", "RSV_VCL_R11",
    "RSV_VCL_N12",    "RSV_VCL_R13",    "RSV_VCL_N14",    "RSV_VCL_R15",    "BLA_W_LP",    "BLA_W_RADL",
    "BLA_N_LP",       "IDR_W_RADL",     "IDR_N_LP",       "CRA_NUT",        "RSV_IRAP_VCL22", "RSV_IRAP_VCL23",
    "RSV_VCL24",      "RSV_VCL25",      "RSV_VCL26",      "RSV_VCL27",      "RSV_VCL28",   "RSV_VCL29",
    "RSV_VCL30",      "RSV_VCL31",      "VPS_NUT",        "SPS_NUT",        "PPS_NUT",     "AUD_NUT",
    "EOS_NUT",        "EOB_NUT",        "FD_NUT",         "PREFIX_SEI_NUT", "SUFFIX_SEI_NUT", "RSV_NVCL41",
    "RSV_NVCL42",     "RSV_NVCL43",     "RSV_NVCL44",     "RSV_NVCL45",     "RSV_NVCL46",  "RSV_NVCL47",
    "UNSPEC48",       "UNSPEC49",       "UNSPEC50",       "UNSPEC51",       "UNSPEC52",    "UNSPEC53",
    "UNSPEC54",       "UNSPEC55",       "UNSPEC56",       "UNSPEC57",       "UNSPEC58",    "UNSPEC59",
    "UNSPEC60",       "UNSPEC61",       "UNSPEC62",       "UNSPEC63"};

inline constexpr uint32_t kNalBlaWLp = CAL_HEVC_NAL_BLA_W_LP;
inline constexpr uint32_t kNalIdrWRadl = 19;
inline constexpr uint32_t kNalIdrNLp = 20;
inline constexpr uint32_t kNalCra = 21;
inline constexpr uint32_t kNalLastIrap = CAL_HEVC_NAL_RSV_IRAP_VCL23;
inline constexpr uint32_t kNalLastVcl = 31;
inline constexpr uint32_t kNalVps = CAL_HEVC_NAL_VPS;
inline constexpr uint32_t kNalSps = CAL_HEVC_NAL_SPS;
inline constexpr uint32_t kNalPps = CAL_HEVC_NAL_PPS;
inline constexpr uint32_t kNalAud = CAL_HEVC_NAL_AUD;
inline constexpr uint32_t kNalPrefixSei = CAL_HEVC_NAL_PREFIX_SEI;
inline constexpr uint32_t kNalSuffixSei = CAL_HEVC_NAL_SUFFIX_SEI;

static_assert(std::string_view(kNalTypeNames[kNalIdrWRadl]) == "IDR_W_RADL" &&
              std::string_view(kNalTypeNames[kNalCra]) == "CRA_NUT" &&
              std::string_view(kNalTypeNames[kNalVps]) == "VPS_NUT" &&
              std::string_view(kNalTypeNames[kNalPrefixSei]) == "PREFIX_SEI_NUT" &&
              std::string_view(kNalTypeNames[kNalSuffixSei]) == "SUFFIX_SEI_NUT");

inline constexpr uint32_t kHeaderBytes = 2;

// nal_unit_header(): forbidden_zero_bit, nal_unit_type (6 bits), nuh_layer_id (6 bits),
// nuh_temporal_id_plus1 (3 bits).
inline uint32_t NalType(uint8_t uByte0) noexcept
{
    return (uByte0 >> 1) & 0x3F;
}
inline uint32_t LayerId(uint8_t uByte0, uint8_t uByte1) noexcept
{
    return (uint32_t{uByte0 & 1u} << 5) | (uByte1 >> 3);
}
inline bool ValidHeader(uint8_t uByte0, uint8_t uByte1) noexcept
{
    return (uByte0 & 0x80) == 0 && (uByte1 & 7) != 0;
}

inline bool IsVcl(uint32_t uType) noexcept
{
    return uType <= kNalLastVcl;
}
inline bool IsIrap(uint32_t uType) noexcept
{
    return uType >= kNalBlaWLp && uType <= kNalLastIrap;
}
// The units that may stand in front of the first slice and are removed with the parameter sets.
inline bool IsConfigRunUnit(uint32_t uType) noexcept
{
    return uType == kNalVps || uType == kNalSps || uType == kNalPps || uType == kNalAud || uType == kNalPrefixSei;
}

// The fixed part of an hvcC record (ISO/IEC 14496-15 8.3.3.1) up to numOfArrays, and the array
// header (array_completeness, NAL_unit_type, numNalus).
inline constexpr size_t kRecordFixedBytes = 23;
inline constexpr size_t kArrayHeaderBytes = 3;
inline constexpr uint32_t kConfigurationVersion = 1;

// One step of a unit walk over a frame (iSize 0: start codes, 1-4: length fields), with its
// place in u.iNext (0 to start): 1 with u describing the unit, 0 after the last, CAL_HEVC_ERR_*
// where the data breaks.
int32_t StepUnits(const uint8_t *p, size_t uLen, int32_t iSize, CALHEVCNAL &u) noexcept;

// One step of a walk over the units in the arrays of an hvcC record, results as above.
int32_t StepRecord(const uint8_t *p, size_t uLen, CALHEVCNAL &u) noexcept;

} // namespace vorcal::tools::hevc
