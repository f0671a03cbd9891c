// The HEVC parameter-set parsers the tools share: the SPS into CALHEVCSPS, and what the hvcC
// record needs of the VPS and PPS. Each takes one NAL unit, its two-byte header first, and
// returns CAL_HEVC_OK or a CAL_HEVC_ERR_* result.
#pragma once

#include <cstddef>
#include <cstdint>

#include <vorcal/video_tools.h>

namespace vorcal::tools::hevc {

// seq_parameter_set_rbsp() up to the extension flags (7.3.2.2.1).
int32_t ParseSpsUnit(const uint8_t *pUnit, size_t uLen, CALHEVCSPS &sps) noexcept;

// The start of video_parameter_set_rbsp() (7.3.2.1): sub-layers, nesting and the general tier
// and level of its profile_tier_level().
struct VpsSummary {
    uint32_t uMaxSubLayers = 0;
    uint32_t uTemporalIdNesting = 0;
    uint32_t uTierFlag = 0;
    uint32_t uLevelIdc = 0;
};
int32_t ParseVpsUnit(const uint8_t *pUnit, size_t uLen, VpsSummary &vps) noexcept;

// pic_parameter_set_rbsp() (7.3.2.3.1) up to tiles_enabled_flag and
// entropy_coding_sync_enabled_flag.
struct PpsParallelism {
    bool bTiles = false;
    bool bWavefront = false;
};
int32_t ParsePpsUnit(const uint8_t *pUnit, size_t uLen, PpsParallelism &pps) noexcept;

} // namespace vorcal::tools::hevc
