#include "facts.hpp"

#include <array>
#include <cstring>
#include <functional>

#include <vorcal/audio_tools.h>
#include <vorcal/wrapper.h>

namespace vorcal::cli {

namespace {

// A forward bit reader that reads zeros past the end; over RBSP bytes (bRbsp) it drops
// emulation-prevention bytes (ITU-T H.264 7.4.1).
class BitReader {
public:
    BitReader(const uint8_t *p, size_t uSize, bool bRbsp = true) : p_(p), uSize_(uSize), bRbsp_(bRbsp) {}
    uint32_t Bit()
    {
        if (uBit_ == 8) {
            ++uPos_;
            uBit_ = 0;
            if (bRbsp_ && uPos_ < uSize_ && uPos_ >= 2 && p_[uPos_] == 3 && p_[uPos_ - 1] == 0 && p_[uPos_ - 2] == 0)
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
    // Bits read so far (emulation-prevention bytes included).
    size_t Position() const { return uPos_ * 8 + uBit_; }

private:
    const uint8_t *p_;
    size_t uSize_;
    bool bRbsp_;
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

// Explicit SBR and PS signalling of an AudioSpecificConfig (ISO/IEC 14496-3 1.6.2.1): object
// type 5 or 29 in front of the core object type, or the sync extensions 0x2B7 (SBR) and 0x548
// (PS) behind the GASpecificConfig of a core object type 1-4.
void ReadExplicitSignalling(const std::vector<uint8_t> &asc, AacFacts &facts)
{
    static constexpr std::array<uint32_t, 13> kRates = {96000, 88200, 64000, 48000, 44100, 32000, 24000,
                                                        22050, 16000, 12000, 11025, 8000,  7350};
    BitReader bits(asc.data(), asc.size(), false);
    const size_t uTotal = asc.size() * 8;
    auto ObjectType = [&] {
        const uint32_t uType = bits.Bits(5);
        return uType == 31 ? 32 + bits.Bits(6) : uType;
    };
    auto Rate = [&] {
        const uint32_t uIndex = bits.Bits(4);
        return uIndex == 15 ? bits.Bits(24) : uIndex < kRates.size() ? kRates[uIndex] : 0;
    };
    facts.uObjectType = ObjectType();
    Rate();
    const uint32_t uChannelConfig = bits.Bits(4);
    if (facts.uObjectType == 5 || facts.uObjectType == 29) {
        facts.sbr = Signal::Explicit;
        facts.ps = facts.uObjectType == 29 ? Signal::Explicit : facts.ps;
        facts.uExtRate = Rate();
        return;
    }
    // A program config element (channel configuration 0) is not walked.
    if (facts.uObjectType < 1 || facts.uObjectType > 4 || uChannelConfig == 0)
        return;
    bits.Bits(1);      // frameLengthFlag
    if (bits.Bits(1))  // dependsOnCoreCoder
        bits.Bits(14); // coreCoderDelay
    bits.Bits(1);      // extensionFlag
    if (bits.Position() + 16 > uTotal || bits.Bits(11) != 0x2B7 || ObjectType() != 5)
        return;
    if (!bits.Bits(1)) { // sbrPresentFlag
        facts.sbr = facts.ps = Signal::None;
        return;
    }
    facts.sbr = Signal::Explicit;
    facts.uExtRate = Rate();
    if (bits.Position() + 12 <= uTotal && bits.Bits(11) == 0x548)
        facts.ps = bits.Bits(1) ? Signal::Explicit : Signal::None;
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
    case Codec::Hevc: return CAL_OTI_HEVC;
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

int32_t ParseFullSps(const std::vector<uint8_t> &nal, FullSps &sps)
{
    if (nal.empty() || nal.size() > INT32_MAX) {
        sps = FullSps{};
        return CAL_AVC_SPS_ERR_ARGUMENT;
    }
    return vorCALTools_AVC_ParseSPS(nal.data(), static_cast<int32_t>(nal.size()), &sps);
}

std::vector<uint8_t> FindAvcSps(const std::vector<uint8_t> &data)
{
    if (data.size() >= 7 && data[0] == 1)
        return FirstSpsOfAvcC(data);
    if (std::vector<uint8_t> nal = FindNalAnnexB(data, 7); !nal.empty())
        return nal;
    // One SPS NAL unit: forbidden_zero_bit clear, nal_unit_type 7.
    if (!data.empty() && (data[0] & 0x9F) == 7)
        return data;
    return {};
}

void ExamineAvcSps(const std::vector<uint8_t> &nal, AvcFacts &facts)
{
    facts.sps = nal;
    if (facts.sps.empty())
        return;
    if (facts.sps.size() >= 4) {
        facts.uProfileIdc = facts.sps[1];
        facts.uConstraintFlags = facts.sps[2];
        facts.uLevelIdc = facts.sps[3];
    }
    // The documented tool reads start-code framed data.
    std::vector<uint8_t> framed = {0, 0, 0, 1};
    framed.insert(framed.end(), facts.sps.begin(), facts.sps.end());
    facts.uSpsToolResult =
        vorCALTools_AVC_GetSPSInfo(framed.data(), static_cast<int32_t>(framed.size()), &facts.spsTool);
    facts.iFullResult = ParseFullSps(facts.sps, facts.full);
    facts.bFullSps = facts.iFullResult == CAL_AVC_SPS_OK;
}

AvcFacts ExamineAvc(const StreamInfo &info)
{
    AvcFacts facts;
    ExamineAvcSps(FindAvcSps(info.config), facts);
    return facts;
}

namespace {

// The pixel format of a picture; bJpegAll: full-range 8-bit YUV of every chroma format has a
// "yuvj" name, else only 4:2:0 has.
std::string PixFmtOf(uint32_t uChromaFormatIdc, uint32_t uBitDepth, bool bFullRange, uint32_t uMatrix, bool bJpegAll)
{
    // 4:4:4 with matrix_coefficients 0 is coded as G, B, R planes (ISO/IEC 23091-2 8.3).
    static constexpr std::array<const char *, 4> kChroma = {"gray", "yuv420p", "yuv422p", "yuv444p"};
    const uint32_t uChroma = uChromaFormatIdc & 3;
    const bool bGbr = uChroma == 3 && uMatrix == 0;
    const std::string base = bGbr ? "gbrp" : kChroma[uChroma];
    if (uBitDepth != 8)
        return Sprintf("%s%ule", base.c_str(), uBitDepth);
    const bool bJpeg = bFullRange && !bGbr && (bJpegAll ? uChroma != 0 : uChroma == 1);
    return bJpeg ? "yuvj" + base.substr(3) : base;
}

} // namespace

std::string PixFmtName(const FullSps &sps)
{
    return PixFmtOf(sps.uChromaFormatIdc, sps.uBitDepthLuma, sps.uVideoFullRange != 0, sps.uMatrixCoefficients, true);
}

std::string ColorRangeName(const FullSps &sps)
{
    // video_full_range_flag reads 0 both when coded so and when video_signal_type is absent; a
    // colour description (which only follows the flag) tells the first apart.
    if (sps.uVideoFullRange)
        return "pc";
    const bool bDescribed =
        sps.uColourPrimaries != 2 || sps.uTransferCharacteristics != 2 || sps.uMatrixCoefficients != 2;
    return bDescribed ? "tv" : std::string();
}

namespace {

template <size_t N> const char *CodeName(const std::array<const char *, N> &names, uint32_t uCode)
{
    return uCode < N && names[uCode] ? names[uCode] : "unknown";
}

} // namespace

const char *ColorPrimariesName(uint32_t uCode)
{
    static constexpr std::array<const char *, 23> kNames = {
        "reserved", "bt709",    "unknown",  "reserved", "bt470m", "bt470bg", "smpte170m", "smpte240m",
        "film",     "bt2020",   "smpte428", "smpte431", "smpte432", nullptr, nullptr,     nullptr,
        nullptr,    nullptr,    nullptr,    nullptr,    nullptr,  nullptr,   "ebu3213"};
    return CodeName(kNames, uCode);
}

const char *ColorTransferName(uint32_t uCode)
{
    static constexpr std::array<const char *, 19> kNames = {
        "reserved", "bt709",  "unknown", "reserved",     "gamma22",      "gamma28",   "smpte170m",
        "smpte240m", "linear", "log100", "log316",       "iec61966-2-4", "bt1361e",   "iec61966-2-1",
        "bt2020-10", "bt2020-12", "smpte2084", "smpte428", "arib-std-b67"};
    return CodeName(kNames, uCode);
}

const char *ColorSpaceName(uint32_t uCode)
{
    static constexpr std::array<const char *, 15> kNames = {
        "gbr",     "bt709",    "unknown",   "reserved",          "fcc",              "bt470bg", "smpte170m",
        "smpte240m", "ycgco",  "bt2020nc",  "bt2020c",           "smpte2085",        "chroma-derived-nc",
        "chroma-derived-c", "ictcp"};
    return CodeName(kNames, uCode);
}

const char *FullSpsResultName(int32_t iResult)
{
    switch (iResult) {
    case CAL_AVC_SPS_OK: return "ok";
    case CAL_AVC_SPS_ERR_ARGUMENT: return "bad argument";
    case CAL_AVC_SPS_ERR_NOT_FOUND: return "no SPS";
    case CAL_AVC_SPS_ERR_MALFORMED: return "malformed";
    case CAL_AVC_SPS_ERR_TRUNCATED: return "truncated";
    default: return "unknown result";
    }
}

const char *SpsToolResultName(uint32_t uResult)
{
    static constexpr std::array<const char *, 4> kNames = {"parsed", "too short", "forbidden_zero_bit set",
                                                           "no SPS, or pic_order_cnt_type above 2"};
    return uResult < kNames.size() ? kNames[uResult] : "unknown result";
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

bool NalUnitTypes(Codec codec, const uint8_t *p, size_t uSize, Framing framing, uint32_t uNalLengthSize,
                  std::vector<uint32_t> &types)
{
    types.clear();
    return ForEachNal(p, uSize, framing, uNalLengthSize, [&](const uint8_t *pUnit, size_t) {
        types.push_back(codec == Codec::Hevc ? (pUnit[0] >> 1) & 0x3Fu : pUnit[0] & 0x1Fu);
    });
}

// ---- HEVC --------------------------------------------------------------------------------

bool IsHevcSps(const uint8_t *pUnit, size_t uSize)
{
    return uSize >= 2 && (pUnit[0] & 0x81) == 0 && (pUnit[0] >> 1) == CAL_HEVC_NAL_SPS && pUnit[1] >= 1 &&
           pUnit[1] <= 7;
}

std::vector<uint8_t> FindHevcSps(const std::vector<uint8_t> &data)
{
    if (data.size() > INT32_MAX)
        return {};
    const int32_t iLen = static_cast<int32_t>(data.size());
    CALHEVCConfig record;
    const bool bRecord = vorCALTools_HEVC_ParseHvcC(data.data(), iLen, &record) == CAL_HEVC_OK &&
                         record.uConfigurationVersion == 1;
    if (!bRecord && IsHevcSps(data.data(), data.size()))
        return data;
    // A walk that breaks still gives the units before the break.
    CALHEVCNAL u{};
    while ((bRecord ? vorCALTools_HEVC_NextHvcCNAL(data.data(), iLen, &u)
                    : vorCALTools_HEVC_NextNAL(data.data(), iLen, 0, &u)) == 1)
        if (IsHevcSps(u.pUnit, static_cast<size_t>(u.iLen)))
            return {u.pUnit, u.pUnit + u.iLen};
    return {};
}

void ExamineHevcSps(const std::vector<uint8_t> &nal, HevcFacts &facts)
{
    facts.sps = nal;
    if (nal.empty() || nal.size() > INT32_MAX)
        return;
    facts.iResult = vorCALTools_HEVC_ParseSPS(nal.data(), static_cast<int32_t>(nal.size()), &facts.full);
    facts.bOk = facts.iResult == CAL_HEVC_OK;
}

HevcFacts ExamineHevc(const StreamInfo &info)
{
    HevcFacts facts;
    ExamineHevcSps(FindHevcSps(info.config), facts);
    return facts;
}

std::string HevcProfileName(const CALHEVCSPS &sps)
{
    uint32_t uProfile = sps.uProfileIdc;
    for (uint32_t j = 0; uProfile == 0 && j < 32; ++j)
        if (sps.uProfileCompatibilityFlags & (0x80000000u >> j)) {
            uProfile = j;
            break;
        }
    static constexpr std::array<const char *, 5> kNames = {nullptr, "Main", "Main 10", "Main Still Picture", "Rext"};
    return uProfile < kNames.size() && kNames[uProfile] ? kNames[uProfile] : std::string();
}

std::string PixFmtName(const CALHEVCSPS &sps)
{
    return PixFmtOf(sps.uChromaFormatIdc, sps.uBitDepthLuma, sps.uVideoFullRange != 0, sps.uMatrixCoefficients, false);
}

std::string ColorRangeName(const CALHEVCSPS &sps)
{
    return sps.uVideoFullRange ? "pc" : "tv";
}

const char *HevcResultName(int32_t iResult)
{
    switch (iResult) {
    case CAL_HEVC_OK: return "ok";
    case CAL_HEVC_ERR_ARGUMENT: return "bad argument";
    case CAL_HEVC_ERR_NOT_FOUND: return "no SPS";
    case CAL_HEVC_ERR_MALFORMED: return "malformed";
    case CAL_HEVC_ERR_TRUNCATED: return "truncated";
    case CAL_HEVC_ERR_NO_ROOM: return "no room";
    case CAL_HEVC_ERR_TOO_LONG: return "too long";
    default: return "unknown result";
    }
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
    facts.uCoreChannels = ChannelsOfConfig(facts.uChannelConfig);
    // What the configuration does not announce may still show in the frames.
    facts.sbr = facts.ps = Signal::NotExamined;
    ReadExplicitSignalling(info.config, facts);
    return facts;
}

AacFrameExaminer::AacFrameExaminer(const StreamInfo &info)
{
    if (info.codec != Codec::Aac)
        return;
    if (info.bAdtsFrames)
        pParser_ = vorCALTools_AAC_CreateParser(nullptr, 0);
    else if (!info.config.empty() && info.config.size() <= INT32_MAX)
        pParser_ = vorCALTools_AAC_CreateParser(info.config.data(), static_cast<int32_t>(info.config.size()));
}

AacFrameExaminer::~AacFrameExaminer()
{
    vorCALTools_AAC_DestroyParser(pParser_);
}

int32_t AacFrameExaminer::Frame(const Packet &packet, CALAACFrameInfo *pInfo)
{
    CALAACFrameInfo info{};
    int32_t iResult = CAL_AAC_PARSE_BAD_INPUT;
    if (pParser_ && packet.data.size() <= INT32_MAX) {
        iResult = vorCALTools_AAC_ParseFrame(pParser_, packet.data.data(), static_cast<int32_t>(packet.data.size()),
                                             &info);
        // Only frames parsed to their end tell that SBR or PS is absent.
        bExamined_ = bExamined_ || iResult == CAL_AAC_PARSE_OK;
        bSbr_ = bSbr_ || info.uSBR;
        bPs_ = bPs_ || info.uPS;
    }
    if (pInfo)
        *pInfo = info;
    return iResult;
}

void AacFrameExaminer::Finish(AacFacts &facts) const
{
    if (bSbr_ && facts.sbr == Signal::NotExamined)
        facts.sbr = Signal::Implicit;
    if (bPs_ && facts.ps == Signal::NotExamined)
        facts.ps = Signal::Implicit;
    if (bExamined_) {
        if (facts.sbr == Signal::NotExamined)
            facts.sbr = Signal::None;
        if (facts.ps == Signal::NotExamined)
            facts.ps = Signal::None;
    }
    const bool bSbr = facts.sbr == Signal::Explicit || facts.sbr == Signal::Implicit;
    const bool bPs = facts.ps == Signal::Explicit || facts.ps == Signal::Implicit;
    facts.uOutRate = !bSbr ? facts.uCoreRate : facts.uExtRate ? facts.uExtRate : facts.uCoreRate * 2;
    facts.uOutChannels = bPs ? 2 : facts.uCoreChannels;
}

const char *AacParseResultName(int32_t iResult)
{
    static constexpr std::array<const char *, 6> kNames = {"ok",      "bad input", "short",
                                                           "refused", "overrun",   "leftover"};
    return iResult >= 0 && static_cast<size_t>(iResult) < kNames.size() ? kNames[static_cast<size_t>(iResult)]
                                                                        : "unknown result";
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

namespace {

// Visits the units of HEVC data (iSize -1: an hvcC record, 0: start codes, 1-4: length fields);
// returns how the walk ended (0 at the end, a CAL_HEVC_ERR_* result where the data breaks).
int32_t ForEachHevcUnit(const std::vector<uint8_t> &data, int32_t iSize,
                        const std::function<void(const CALHEVCNAL &)> &visit)
{
    if (data.size() > INT32_MAX)
        return CAL_HEVC_ERR_TOO_LONG;
    const int32_t iLen = static_cast<int32_t>(data.size());
    CALHEVCNAL u{};
    int32_t r;
    while ((r = iSize < 0 ? vorCALTools_HEVC_NextHvcCNAL(data.data(), iLen, &u)
                          : vorCALTools_HEVC_NextNAL(data.data(), iLen, iSize, &u)) == 1)
        visit(u);
    return r;
}

// num_extra_slice_header_bits of a PPS (ITU-T H.265 7.3.2.3.1), by pps_pic_parameter_set_id.
using ExtraSliceBits = std::array<uint8_t, 64>;
void ReadPpsExtraBits(const CALHEVCNAL &u, ExtraSliceBits &extra)
{
    BitReader bits(u.pUnit + 2, static_cast<size_t>(u.iLen) - 2);
    const uint32_t uId = bits.UE();
    bits.UE();    // pps_seq_parameter_set_id
    bits.Bits(2); // dependent_slice_segments_enabled_flag, output_flag_present_flag
    if (uId < extra.size())
        extra[uId] = static_cast<uint8_t>(bits.Bits(3));
}

// IRAP test, NAL unit walk and the slice_type of the picture's first slice segment (7.3.6.1).
FrameFacts ClassifyHevcFrame(const StreamInfo &info, const Packet &packet)
{
    FrameFacts facts;
    const int32_t iLen = static_cast<int32_t>(packet.data.size());
    const int32_t iSize = info.framing == Framing::LengthPrefixed ? static_cast<int32_t>(info.uNalLengthSize) : 0;
    facts.iIntra = vorCALTools_HEVC_IsIRAP(packet.data.data(), iLen, iSize);
    facts.iFormat = vorCALTools_HEVC_CheckFormat(packet.data.data(), iLen);
    facts.bFormatAgrees = facts.iFormat == (iSize ? CAL_AVC_FORMAT_NAL : CAL_AVC_FORMAT_ANNEXB);
    ExtraSliceBits extra{};
    const int32_t iConfigLen = static_cast<int32_t>(info.config.size());
    const bool bRecord = vorCALTools_HEVC_CheckFormat(info.config.data(), iConfigLen) != CAL_AVC_FORMAT_ANNEXB;
    ForEachHevcUnit(info.config, bRecord ? -1 : 0, [&](const CALHEVCNAL &u) {
        if (u.uType == CAL_HEVC_NAL_PPS)
            ReadPpsExtraBits(u, extra);
    });
    const int32_t r = ForEachHevcUnit(packet.data, iSize, [&](const CALHEVCNAL &u) {
        facts.nalTypes.push_back(u.uType);
        if (u.uType == CAL_HEVC_NAL_PPS)
            ReadPpsExtraBits(u, extra);
        constexpr uint32_t kLastVcl = 31;
        if (facts.pictType != "?" || u.uType > kLastVcl || u.uLayerId != 0)
            return;
        BitReader bits(u.pUnit + 2, static_cast<size_t>(u.iLen) - 2);
        if (!bits.Bit()) // first_slice_segment_in_pic_flag
            return;
        if (u.uType >= CAL_HEVC_NAL_BLA_W_LP && u.uType <= CAL_HEVC_NAL_RSV_IRAP_VCL23)
            bits.Bit(); // no_output_of_prior_pics_flag
        const uint32_t uPps = bits.UE();
        bits.Bits(uPps < extra.size() ? extra[uPps] : 0); // slice_reserved_flag[i]
        const uint32_t uType = bits.UE();
        facts.pictType = uType < 3 ? std::array{"B", "P", "I"}[uType] : "?";
    });
    facts.iValid = r == 0;
    facts.iB = facts.pictType == "B";
    return facts;
}

} // namespace

FrameFacts ClassifyFrame(const StreamInfo &info, const Packet &packet)
{
    if (info.codec == Codec::Hevc)
        return ClassifyHevcFrame(info, packet);
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
            BitReader bits(pUnit + 1, uUnit - 1);
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
