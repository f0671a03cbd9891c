#include "facts.hpp"

#include <array>
#include <cstring>
#include <functional>

#include <vorcal/audio_tools.h>
#include <vorcal/wrapper.h>

namespace vorcal::cli {

namespace {

// A forward bit reader over RBSP bytes that drops emulation-prevention bytes (ITU-T H.264
// 7.4.1) and reads zeros past the end.
class RbspReader {
public:
    RbspReader(const uint8_t *p, size_t uSize) : p_(p), uSize_(uSize) {}
    uint32_t Bit()
    {
        if (uBit_ == 8) {
            ++uPos_;
            uBit_ = 0;
            if (uPos_ < uSize_ && uPos_ >= 2 && p_[uPos_] == 3 && p_[uPos_ - 1] == 0 && p_[uPos_ - 2] == 0)
                ++uPos_;
        }
        const uint32_t v = uPos_ < uSize_ ? (p_[uPos_] >> (7 - uBit_)) & 1u : 0u;
        ++uBit_;
        return v;
    }
    uint32_t Bits(unsigned n)
    {
        uint32_t v = 0;
        while (n--)
            v = v << 1 | Bit();
        return v;
    }
    // ue(v), 9.1; codes longer than 31 bits read as 0xFFFFFFFF.
    uint32_t UE()
    {
        unsigned uZeros = 0;
        while (Bit() == 0)
            if (++uZeros > 31)
                return 0xFFFFFFFFu;
        return (1u << uZeros) - 1 + Bits(uZeros);
    }

private:
    const uint8_t *p_;
    size_t uSize_;
    size_t uPos_ = 0;
    unsigned uBit_ = 0;
};

uint32_t Be(const uint8_t *p, uint32_t uBytes)
{
    uint32_t v = 0;
    for (uint32_t i = 0; i < uBytes; ++i)
        v = v << 8 | p[i];
    return v;
}

// The first NAL unit of type uType in start-code framed data, header byte first.
std::vector<uint8_t> FindNalAnnexB(const std::vector<uint8_t> &data, uint32_t uType)
{
    const size_t n = data.size();
    for (size_t i = 0; i + 3 < n; ++i) {
        if (data[i] != 0 || data[i + 1] != 0 || data[i + 2] != 1)
            continue;
        const size_t uStart = i + 3;
        if ((data[uStart] & 0x1F) != uType) {
            i += 2;
            continue;
        }
        size_t uEnd = uStart + 1;
        while (uEnd + 2 < n && !(data[uEnd] == 0 && data[uEnd + 1] == 0 && data[uEnd + 2] <= 1))
            ++uEnd;
        if (uEnd + 2 >= n)
            uEnd = n;
        return {data.begin() + static_cast<ptrdiff_t>(uStart), data.begin() + static_cast<ptrdiff_t>(uEnd)};
    }
    return {};
}

// The first SPS of an avcC record (ISO/IEC 14496-15 5.3.3.1.2).
std::vector<uint8_t> FirstSpsOfAvcC(const std::vector<uint8_t> &c)
{
    if (c.size() < 8 || (c[5] & 0x1F) == 0)
        return {};
    const size_t uLen = Be(c.data() + 6, 2);
    if (uLen == 0 || uLen > c.size() - 8)
        return {};
    return {c.begin() + 8, c.begin() + 8 + static_cast<ptrdiff_t>(uLen)};
}

bool IsVcl(uint32_t uType)
{
    return uType == 1 || uType == 2 || uType == 5;
}

} // namespace

uint32_t OtiOf(Codec codec)
{
    switch (codec) {
    case Codec::H264: return CAL_OTI_H264;
    case Codec::Mpeg4Visual: return CAL_OTI_MPEG4_VISUAL;
    case Codec::H263: return CAL_OTI_H263;
    case Codec::Mpeg1Video:
    case Codec::Mpeg2Video: return CAL_OTI_MPEG12_VIDEO;
    case Codec::Aac: return CAL_OTI_AAC;
    case Codec::AmrNb: return CAL_OTI_AMR_NB;
    case Codec::AmrWb: return CAL_OTI_AMR_WB;
    default: return 0;
    }
}

// ---- H.264 -------------------------------------------------------------------------------

bool ParseFullSps(const std::vector<uint8_t> &nal, FullSps &sps)
{
    // The layer's full sequence parameter set parse belongs here; until it exists the display
    // size, SAR, bit depth and chroma format come only from what the container and profile say.
    (void)nal;
    (void)sps;
    return false;
}

AvcFacts ExamineAvc(const StreamInfo &info)
{
    AvcFacts facts;
    const bool bRecord = info.config.size() >= 7 && info.config[0] == 1;
    facts.sps = bRecord ? FirstSpsOfAvcC(info.config) : FindNalAnnexB(info.config, 7);
    if (facts.sps.size() < 4)
        return facts;
    facts.uProfileIdc = facts.sps[1];
    facts.uConstraintFlags = facts.sps[2];
    facts.uLevelIdc = facts.sps[3];
    // The documented tool reads start-code framed data.
    std::vector<uint8_t> framed = {0, 0, 0, 1};
    framed.insert(framed.end(), facts.sps.begin(), facts.sps.end());
    facts.uSpsToolResult =
        vorCALTools_AVC_GetSPSInfo(framed.data(), static_cast<int32_t>(framed.size()), &facts.spsTool);
    facts.bFullSps = ParseFullSps(facts.sps, facts.full);
    return facts;
}

std::string AvcProfileName(uint32_t uProfileIdc, uint32_t uConstraintFlags)
{
    const bool bSet1 = uConstraintFlags & 0x40, bSet3 = uConstraintFlags & 0x10;
    switch (uProfileIdc) {
    case 66: return bSet1 ? "Constrained Baseline" : "Baseline";
    case 77: return "Main";
    case 88: return "Extended";
    case 100: return "High";
    case 110: return bSet3 ? "High 10 Intra" : "High 10";
    case 122: return bSet3 ? "High 4:2:2 Intra" : "High 4:2:2";
    case 244: return bSet3 ? "High 4:4:4 Intra" : "High 4:4:4 Predictive";
    case 44: return "CAVLC 4:4:4";
    case 118: return "Multiview High";
    case 128: return "Stereo High";
    default: return std::string();
    }
}

bool ForEachNal(const uint8_t *p, size_t uSize, Framing framing, uint32_t uNalLengthSize,
                const std::function<void(const uint8_t *, size_t)> &visit)
{
    if (framing == Framing::AnnexB) {
        size_t uUnit = SIZE_MAX; // start of the unit being walked
        bool bAny = false;
        for (size_t i = 0; i + 3 <= uSize; ++i) {
            if (p[i] != 0 || p[i + 1] != 0 || p[i + 2] != 1)
                continue;
            if (uUnit != SIZE_MAX && i > uUnit)
                visit(p + uUnit, i - uUnit);
            uUnit = i + 3;
            bAny = true;
            i += 2;
        }
        if (uUnit != SIZE_MAX && uUnit < uSize)
            visit(p + uUnit, uSize - uUnit);
        return bAny;
    }
    if (uNalLengthSize < 1 || uNalLengthSize > 4)
        return false;
    size_t uPos = 0;
    while (uPos < uSize) {
        if (uSize - uPos < uNalLengthSize)
            return false;
        const uint32_t uLen = Be(p + uPos, uNalLengthSize);
        uPos += uNalLengthSize;
        if (uLen > uSize - uPos)
            return false;
        if (uLen > 0)
            visit(p + uPos, uLen);
        uPos += uLen;
    }
    return true;
}

bool NalUnitTypes(const uint8_t *p, size_t uSize, Framing framing, uint32_t uNalLengthSize,
                  std::vector<uint32_t> &types)
{
    types.clear();
    return ForEachNal(p, uSize, framing, uNalLengthSize,
                      [&](const uint8_t *pUnit, size_t) { types.push_back(pUnit[0] & 0x1Fu); });
}

// ---- AAC ---------------------------------------------------------------------------------

const char *SignalName(Signal signal)
{
    switch (signal) {
    case Signal::None: return "none";
    case Signal::Explicit: return "explicit";
    case Signal::Implicit: return "implicit";
    default: return "not examined";
    }
}

uint32_t ChannelsOfConfig(uint32_t uChannelConfig)
{
    return uChannelConfig == 7 ? 8 : uChannelConfig <= 6 ? uChannelConfig : 0;
}

AacFacts ExamineAacConfig(const StreamInfo &info)
{
    AacFacts facts;
    if (info.config.size() < 2) {
        facts.sbr = facts.ps = Signal::NotExamined;
        return facts;
    }
    uint32_t uSbr = 0;
    vorCALTools_AAC_ParseDSI(info.config.data(), &facts.uCoreRate, &facts.uChannelConfig, &uSbr);
    facts.bDsiSbr = uSbr != 0;
    // audioObjectType, with its escape (ISO/IEC 14496-3 1.6.2.1).
    RbspReader bits(info.config.data(), info.config.size());
    facts.uObjectType = bits.Bits(5);
    if (facts.uObjectType == 31)
        facts.uObjectType = 32 + bits.Bits(6);
    facts.uCoreChannels = ChannelsOfConfig(facts.uChannelConfig);
    // Object types 5 (SBR) and 29 (PS) signal explicitly; anything else may still carry SBR or
    // PS in its frames.
    facts.sbr = facts.uObjectType == 5 || facts.uObjectType == 29 ? Signal::Explicit : Signal::NotExamined;
    facts.ps = facts.uObjectType == 29 ? Signal::Explicit : Signal::NotExamined;
    return facts;
}

AacFrameExaminer::AacFrameExaminer(const StreamInfo &info)
{
    // The layer's whole-frame AAC parser belongs here: one parser per stream, created from the
    // AudioSpecificConfig (info.config), or without one when info.bAdtsFrames, fed every frame.
    (void)info;
}

void AacFrameExaminer::Frame(const Packet &packet)
{
    (void)packet;
}

void AacFrameExaminer::Finish(AacFacts &facts) const
{
    if (bExamined_) {
        if (facts.sbr == Signal::NotExamined)
            facts.sbr = Signal::None;
        if (facts.ps == Signal::NotExamined)
            facts.ps = Signal::None;
    }
    const bool bSbr = facts.sbr == Signal::Explicit || facts.sbr == Signal::Implicit;
    const bool bPs = facts.ps == Signal::Explicit || facts.ps == Signal::Implicit;
    facts.uOutRate = bSbr ? facts.uCoreRate * 2 : facts.uCoreRate;
    facts.uOutChannels = bPs ? 2 : facts.uCoreChannels;
}

std::string AacProfileName(const AacFacts &facts)
{
    if (facts.ps == Signal::Explicit || facts.ps == Signal::Implicit)
        return "HE-AACv2";
    if (facts.sbr == Signal::Explicit || facts.sbr == Signal::Implicit)
        return "HE-AAC";
    switch (facts.uObjectType) {
    case 1: return "Main";
    case 2: return "LC";
    case 3: return "SSR";
    case 4: return "LTP";
    case 23: return "LD";
    case 39: return "ELD";
    default: return std::string();
    }
}

// ---- MPEG-4 Visual, H.263, MPEG-1/2 --------------------------------------------------------

VisualFacts ExamineVisual(const StreamInfo &info, const std::vector<uint8_t> &firstFrame)
{
    // Profile names by the high nibble of profile_and_level_indication (ISO/IEC 14496-2 G.1).
    static constexpr std::array<const char *, 16> kMpeg4Profiles = {
        "Simple Profile", "Simple Scalable Profile", "Core Profile", "Main Profile", "N-bit Profile",
        "Scalable Texture Profile", "Simple Face Animation Profile", "Basic Animated Texture Profile",
        "Hybrid Profile", "Advanced Real Time Simple Profile", "Core Scalable Profile", "Advanced Coding Profile",
        "Advanced Core Profile", "Advanced Scalable Texture Profile", "Simple Studio Profile",
        "Advanced Simple Profile"};
    VisualFacts facts;
    const std::vector<uint8_t> &c = info.codec == Codec::H263 ? firstFrame : info.config;
    auto Find = [&](uint8_t uCode, size_t uMin) -> const uint8_t * {
        for (size_t i = 0; i + 4 + uMin <= c.size(); ++i)
            if (c[i] == 0 && c[i + 1] == 0 && c[i + 2] == 1 && c[i + 3] == uCode)
                return c.data() + i + 4;
        return nullptr;
    };
    if (info.codec == Codec::Mpeg4Visual || info.codec == Codec::H263) {
        if (!c.empty())
            facts.uDsiResult = vorCALTools_MPEG4V_GetDSIInfo(c.data(), static_cast<uint32_t>(c.size()), &facts.dsi);
        if (facts.uDsiResult == 0) {
            facts.uWidth = facts.dsi.uWidth;
            facts.uHeight = facts.dsi.uHeight;
        }
        if (info.codec == Codec::Mpeg4Visual)
            if (const uint8_t *p = Find(0xB0, 1)) {
                facts.iProfileAndLevel = p[0];
                facts.profile = kMpeg4Profiles[p[0] >> 4];
                facts.iLevel = p[0] & 0x0F;
            }
        return facts;
    }
    // MPEG-1/2 sequence header (ISO/IEC 13818-2 6.2.2.1) and sequence extension (6.2.2.3).
    if (const uint8_t *p = Find(0xB3, 3)) {
        facts.uWidth = uint32_t{p[0]} << 4 | p[1] >> 4;
        facts.uHeight = uint32_t{p[1] & 0x0Fu} << 8 | p[2];
    }
    if (const uint8_t *p = Find(0xB5, 3); p && (p[0] >> 4) == 1) {
        facts.iProfileAndLevel = (p[0] & 0x0F) << 4 | p[1] >> 4;
        facts.uWidth |= ((p[1] & 1u) << 1 | p[2] >> 7) << 12;
        facts.uHeight |= ((p[2] >> 5) & 3u) << 12;
        static constexpr std::array<const char *, 8> kProfiles = {"", "High", "Spatially Scalable", "SNR Scalable",
                                                                  "Main", "Simple", "", ""};
        if (!(facts.iProfileAndLevel & 0x80)) {
            facts.profile = kProfiles[(facts.iProfileAndLevel >> 4) & 7];
            facts.iLevel = facts.iProfileAndLevel & 0x0F;
        }
    }
    return facts;
}

// ---- Frames -------------------------------------------------------------------------------

FrameFacts ClassifyFrame(const StreamInfo &info, const Packet &packet)
{
    FrameFacts facts;
    const uint8_t *p = packet.data.data();
    const size_t n = packet.data.size();
    const int32_t iLen = static_cast<int32_t>(n);
    const uint32_t uOti = OtiOf(info.codec);
    if (KindOf(info.codec) == MediaKind::Audio) {
        facts.iIntra = 1;
        if ((info.codec == Codec::AmrNb || info.codec == Codec::AmrWb) && n > 0)
            facts.iAmrFrameType = (p[0] >> 3) & 0x0F;
        return facts;
    }
    if (uOti == 0)
        return facts;
    const uint32_t uNalSize = info.framing == Framing::LengthPrefixed ? info.uNalLengthSize : 4;
    facts.iIntra = vorCALTools_IsIDRFrame(uOti, p, iLen, uNalSize);
    facts.iB = vorCALTools_IsBFrame(uOti, p, iLen);
    facts.iValid = vorCALTools_IsValidVideo(uOti, p, iLen);
    switch (info.codec) {
    case Codec::H264: {
        facts.iFormat = vorCALTools_AVC_CheckFormat(p, iLen);
        const int iReal = info.framing == Framing::AnnexB ? CAL_AVC_FORMAT_ANNEXB : CAL_AVC_FORMAT_NAL;
        facts.bFormatAgrees = facts.iFormat == iReal;
        // slice_type of the first slice (7.3.3), after first_mb_in_slice.
        ForEachNal(p, n, info.framing, info.uNalLengthSize, [&](const uint8_t *pUnit, size_t uUnit) {
            facts.nalTypes.push_back(pUnit[0] & 0x1Fu);
            if (facts.pictType != "?" || !IsVcl(pUnit[0] & 0x1Fu))
                return;
            static constexpr std::array<const char *, 5> kTypes = {"P", "B", "I", "SP", "SI"};
            RbspReader bits(pUnit + 1, uUnit - 1);
            bits.UE();
            const uint32_t uType = bits.UE();
            facts.pictType = uType < 10 ? kTypes[uType % 5] : "?";
        });
        break;
    }
    case Codec::Mpeg4Visual: {
        int32_t iRest = 0;
        if (const uint8_t *pVop = _PTOOL_FindVOP(p, iLen, &iRest); pVop && iRest > 4)
            facts.pictType = std::array{"I", "P", "B", "S"}[pVop[4] >> 6];
        break;
    }
    case Codec::H263:
        facts.pictType = facts.iIntra ? "I" : "P";
        break;
    default: // MPEG-1/2: picture_coding_type of the picture header (6.2.3)
        for (size_t i = 0; i + 5 < n; ++i)
            if (p[i] == 0 && p[i + 1] == 0 && p[i + 2] == 1 && p[i + 3] == 0) {
                const unsigned uType = (p[i + 5] >> 3) & 7;
                facts.pictType = uType >= 1 && uType <= 3 ? std::array{"I", "P", "B"}[uType - 1] : "?";
                break;
            }
        break;
    }
    return facts;
}

} // namespace vorcal::cli
