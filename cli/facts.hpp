// What the layer's tools (and a few header reads of the tool's own) find in a stream's
// configuration and frames: H.264 parameter sets, AAC signalling, MPEG-4 Visual, H.263 and
// MPEG-1/2 headers, and the per-frame classification.
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include <vorcal/video_tools.h>

#include "media.hpp"

namespace vorcal::cli {

// The object type indication the layer knows the codec by.
uint32_t OtiOf(Codec codec);

// ---- H.264 -------------------------------------------------------------------------------

// The facts of a full sequence parameter set parse (display size, SAR, bit depth, chroma
// format); the field names follow the layer's full SPS record.
struct FullSps {
    uint32_t uChromaFormatIdc = 0, uBitDepthLuma = 0, uBitDepthChroma = 0;
    uint32_t uCodedWidth = 0, uCodedHeight = 0;
    uint32_t uWidth = 0, uHeight = 0;
    uint32_t uSarNum = 0, uSarDen = 0;
};

struct AvcFacts {
    std::vector<uint8_t> sps;       // the first SPS NAL unit, header byte first; empty when none
    uint32_t uProfileIdc = 0, uConstraintFlags = 0, uLevelIdc = 0;
    uint32_t uSpsToolResult = 3;    // vorCALTools_AVC_GetSPSInfo on the SPS behind a start code
    CALSPSInfo spsTool{};
    bool bFullSps = false;          // a full parse succeeded
    FullSps full;
};

AvcFacts ExamineAvc(const StreamInfo &info);
// ffprobe's name of an H.264 profile ("Constrained Baseline", "High", "High 4:2:2 Intra", ...).
std::string AvcProfileName(uint32_t uProfileIdc, uint32_t uConstraintFlags);
// Fills sps from one SPS NAL unit; false when the layer offers no full parse or it fails.
bool ParseFullSps(const std::vector<uint8_t> &nal, FullSps &sps);

// ---- AAC ---------------------------------------------------------------------------------

// How SBR or parametric stereo is signalled: in the AudioSpecificConfig, only in the frames,
// not at all, or not known because the frames were not examined.
enum class Signal : uint8_t { None, Explicit, Implicit, NotExamined };
const char *SignalName(Signal signal);

struct AacFacts {
    uint32_t uObjectType = 0;        // audioObjectType (ADTS: profile + 1)
    uint32_t uChannelConfig = 0;
    uint32_t uCoreRate = 0, uCoreChannels = 0;
    uint32_t uOutRate = 0, uOutChannels = 0; // SBR and PS applied, as a decoder outputs them
    Signal sbr = Signal::None, ps = Signal::None;
    bool bDsiSbr = false;            // vorCALTools_AAC_ParseDSI's SBR flag
};

// The AudioSpecificConfig (or the one built from the first ADTS header).
AacFacts ExamineAacConfig(const StreamInfo &info);
// Watches the frames for SBR and PS data that the configuration does not announce.
class AacFrameExaminer {
public:
    explicit AacFrameExaminer(const StreamInfo &info);
    void Frame(const Packet &packet);
    // Settles the implicit signalling and the output rate and channels.
    void Finish(AacFacts &facts) const;

private:
    bool bExamined_ = false;
};
// ffprobe's AAC profile name for the facts.
std::string AacProfileName(const AacFacts &facts);
uint32_t ChannelsOfConfig(uint32_t uChannelConfig);

// ---- MPEG-4 Visual, H.263, MPEG-1/2 --------------------------------------------------------

struct VisualFacts {
    uint32_t uDsiResult = 1;   // vorCALTools_MPEG4V_GetDSIInfo
    CALMPEG4DSIInfo dsi{};
    int iProfileAndLevel = -1; // MPEG-4 profile_and_level_indication, MPEG-2 profile_and_level
    std::string profile;       // ffprobe's name
    int iLevel = -1;
    uint32_t uWidth = 0, uHeight = 0;
};

// For MPEG-4 Visual the configuration headers, for H.263 the first picture, for MPEG-1/2 the
// sequence header and its extension.
VisualFacts ExamineVisual(const StreamInfo &info, const std::vector<uint8_t> &firstFrame);

// ---- Frames -------------------------------------------------------------------------------

struct FrameFacts {
    std::string pictType = "?";    // I, P, B, S (MPEG-4 sprite), or ? when not told
    std::vector<uint32_t> nalTypes; // H.264 NAL unit types in order
    int iIntra = 0;                 // vorCALTools_IsIDRFrame
    int iB = 0;                     // vorCALTools_IsBFrame
    int iValid = 1;                 // vorCALTools_IsValidVideo
    int iFormat = -1;               // vorCALTools_AVC_CheckFormat (H.264 only)
    bool bFormatAgrees = true;      // the format test names the stream's real framing
    int iAmrFrameType = -1;
};

FrameFacts ClassifyFrame(const StreamInfo &info, const Packet &packet);

// Visits the NAL units of an H.264 frame in its real framing (header byte first); false when the
// framing does not hold to the end of the frame.
bool ForEachNal(const uint8_t *p, size_t uSize, Framing framing, uint32_t uNalLengthSize,
                const std::function<void(const uint8_t *, size_t)> &visit);
// The NAL unit types of an H.264 frame, walked in its real framing; false when the framing
// does not hold to the end of the frame.
bool NalUnitTypes(const uint8_t *p, size_t uSize, Framing framing, uint32_t uNalLengthSize,
                  std::vector<uint32_t> &types);

} // namespace vorcal::cli
