// What the layer's tools (and a few header reads of the tool's own) find in a stream's
// configuration and frames: H.264 and HEVC parameter sets, AAC signalling, MPEG-4 Visual, H.263 and
// MPEG-1/2 headers, and the per-frame classification.
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include <vorcal/aacparse.h>
#include <vorcal/video_tools.h>

#include "media.hpp"

namespace vorcal::cli {

// The object type indication the layer knows the codec by.
uint32_t OtiOf(Codec codec);

// ---- H.264 -------------------------------------------------------------------------------

// The layer's full sequence parameter set record (display size, SAR, bit depth, chroma
// format, colour description, ...).
using FullSps = CALAVCSPS;

struct AvcFacts {
    std::vector<uint8_t> sps;       // the first SPS NAL unit, header byte first; empty when none
    uint32_t uProfileIdc = 0, uConstraintFlags = 0, uLevelIdc = 0;
    uint32_t uSpsToolResult = 3;    // vorCALTools_AVC_GetSPSInfo on the SPS behind a start code
    CALSPSInfo spsTool{};
    int32_t iFullResult = CAL_AVC_SPS_ERR_NOT_FOUND; // vorCALTools_AVC_ParseSPS
    bool bFullSps = false;          // a full parse succeeded
    FullSps full{};
};

AvcFacts ExamineAvc(const StreamInfo &info);
// Both SPS parses of one SPS NAL unit (header byte first) into facts.
void ExamineAvcSps(const std::vector<uint8_t> &nal, AvcFacts &facts);
// The first SPS NAL unit (header byte first) of an AVC decoder configuration record, of
// start-code framed data, or the data itself when it is one SPS NAL unit; empty when none.
std::vector<uint8_t> FindAvcSps(const std::vector<uint8_t> &data);
// ffprobe's name of an H.264 profile ("Constrained Baseline", "High", "High 4:2:2 Intra", ...).
std::string AvcProfileName(uint32_t uProfileIdc, uint32_t uConstraintFlags);
// vorCALTools_AVC_ParseSPS on one SPS NAL unit; its CAL_AVC_SPS_* result.
int32_t ParseFullSps(const std::vector<uint8_t> &nal, FullSps &sps);
// Names of a full parse's facts as ffprobe writes them: the pixel format ("yuv420p",
// "yuvj420p", "yuv422p10le", "gray", "gbrp", ...), and the colour code points of ISO/IEC
// 23091-2 ("bt709", "smpte170m", "unknown", ...). An empty color range is not known.
std::string PixFmtName(const FullSps &sps);
std::string ColorRangeName(const FullSps &sps);
const char *ColorPrimariesName(uint32_t uCode);
const char *ColorTransferName(uint32_t uCode);
const char *ColorSpaceName(uint32_t uCode);
// Names of the CAL_AVC_SPS_* results and of the documented tool's results.
const char *FullSpsResultName(int32_t iResult);
const char *SpsToolResultName(uint32_t uResult);

// ---- HEVC --------------------------------------------------------------------------------

struct HevcFacts {
    std::vector<uint8_t> sps; // the first base-layer SPS NAL unit, header first; empty when none
    int32_t iResult = CAL_HEVC_ERR_NOT_FOUND; // vorCALTools_HEVC_ParseSPS
    bool bOk = false;
    CALHEVCSPS full{};
};

HevcFacts ExamineHevc(const StreamInfo &info);
// vorCALTools_HEVC_ParseSPS of one SPS NAL unit (header first) into facts.
void ExamineHevcSps(const std::vector<uint8_t> &nal, HevcFacts &facts);
// A base-layer SPS NAL unit header (nal_unit_type 33, nuh_layer_id 0, nuh_temporal_id_plus1 set).
bool IsHevcSps(const uint8_t *pUnit, size_t uSize);
// The first base-layer SPS NAL unit of an hvcC record, of start-code framed data, or the data
// itself when it is one SPS NAL unit; empty when none.
std::vector<uint8_t> FindHevcSps(const std::vector<uint8_t> &data);
// ffprobe's name of an HEVC profile ("Main", "Main 10", "Main Still Picture", "Rext"): of
// general_profile_idc, or when that is 0 of the first compatibility flag set; empty for others.
std::string HevcProfileName(const CALHEVCSPS &sps);
// ffprobe's pixel format and colour range of an HEVC SPS (full range makes only 8-bit 4:2:0 a
// "yuvj" format; the range is "tv" unless video_full_range_flag says "pc").
std::string PixFmtName(const CALHEVCSPS &sps);
std::string ColorRangeName(const CALHEVCSPS &sps);
// Name of a CAL_HEVC_* result.
const char *HevcResultName(int32_t iResult);

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
    uint32_t uExtRate = 0;           // the SBR rate an explicit configuration gives, else 0
};

// The AudioSpecificConfig (or the one built from the first ADTS header).
AacFacts ExamineAacConfig(const StreamInfo &info);
// The layer's whole-frame AAC parser over a stream's frames: finds SBR and parametric stereo
// data that the configuration does not announce.
class AacFrameExaminer {
public:
    // A parser for AAC streams only: created from the AudioSpecificConfig, or for ADTS frames
    // without one.
    explicit AacFrameExaminer(const StreamInfo &info);
    ~AacFrameExaminer();
    AacFrameExaminer(const AacFrameExaminer &) = delete;
    AacFrameExaminer &operator=(const AacFrameExaminer &) = delete;
    bool Ok() const { return pParser_ != nullptr; }
    // Parses one frame; its CAL_AAC_PARSE_* result (CAL_AAC_PARSE_BAD_INPUT without a parser),
    // with what the parser found in *pInfo when given.
    int32_t Frame(const Packet &packet, CALAACFrameInfo *pInfo = nullptr);
    // Settles the implicit signalling and the output rate and channels.
    void Finish(AacFacts &facts) const;

private:
    CALAACParser *pParser_ = nullptr;
    bool bExamined_ = false;
    bool bSbr_ = false, bPs_ = false;
};
// Name of a CAL_AAC_PARSE_* result ("ok", "overrun", ...).
const char *AacParseResultName(int32_t iResult);
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
    std::vector<uint32_t> nalTypes; // H.264 or HEVC NAL unit types in order
    int iIntra = 0;                 // vorCALTools_IsIDRFrame (HEVC: vorCALTools_HEVC_IsIRAP)
    int iB = 0;                     // vorCALTools_IsBFrame (HEVC: a B slice first)
    int iValid = 1;                 // vorCALTools_IsValidVideo (HEVC: the unit walk reaches the end)
    int iFormat = -1;               // vorCALTools_AVC_CheckFormat or vorCALTools_HEVC_CheckFormat
    bool bFormatAgrees = true;      // the format test names the stream's real framing
    int iAmrFrameType = -1;
};

FrameFacts ClassifyFrame(const StreamInfo &info, const Packet &packet);

// Visits the NAL units of an H.264 frame in its real framing (header byte first); false when the
// framing does not hold to the end of the frame.
bool ForEachNal(const uint8_t *p, size_t uSize, Framing framing, uint32_t uNalLengthSize,
                const std::function<void(const uint8_t *, size_t)> &visit);
// The NAL unit types of an H.264 or HEVC frame, walked in its real framing; false when the
// framing does not hold to the end of the frame.
bool NalUnitTypes(Codec codec, const uint8_t *p, size_t uSize, Framing framing, uint32_t uNalLengthSize,
                  std::vector<uint32_t> &types);

} // namespace vorcal::cli
