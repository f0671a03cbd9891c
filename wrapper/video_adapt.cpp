// Video decoder adaptation: the layer's own work for H.264, HEVC, MPEG-4 Visual and H.263
// streams. H.264 and HEVC share the frame adaptation (parameter-set removal, framing conversion
// into the intermediate buffer) through the operations of each codec.
//
// Input the layer cannot read is never handed to a tool: a configuration or frame with a null
// pointer or a negative length is passed to the codec as the engine gave it (for Init the
// size, profile and level tests then see an empty configuration). The caller's out-arguments
// (picture size, result word) are written only when they are not null.
#include "wrapper/video_adapt.hpp"

#include <cstdint>

#include <vorcal/video_tools.h>

#include "core/sal.hpp"
#include "tools/avc_convert.hpp"
#include "tools/avc_nal.hpp"
#include "wrapper/codec_slots.hpp"

namespace vorcal::wrapper {

namespace {

// The intermediate buffer is allocated 100 bytes larger than its payload capacity, and the
// converter is told the input length plus the same headroom.
inline constexpr int32_t kIntermediateHeadroom = 100;
inline constexpr int32_t kMaxIntermediatePayload = INT32_MAX - kIntermediateHeadroom;

inline constexpr uint32_t kProfileMain = 77;          // profile_idc of Main profile
inline constexpr uint32_t kMPEG4Level3 = 3;
inline constexpr uint32_t kMPEG4Unrecognised = 255;   // profile and level not in the table
inline constexpr uint32_t kH263ExtendedPType = 7;     // source format of PLUSPTYPE pictures

inline bool Readable(const uint8_t *pData, int32_t iLen) noexcept
{
    return pData && iLen > 0;
}

inline bool IsAVCFormat(uint32_t uFormat) noexcept
{
    return uFormat == CAL_AVC_FORMAT_NAL || uFormat == CAL_AVC_FORMAT_ANNEXB;
}

inline void Store(uint32_t *puOut, uint32_t uValue) noexcept
{
    if (puOut)
        *puOut = uValue;
}

inline void StoreSize(const VideoInitArgs &args, uint32_t uWidth, uint32_t uHeight) noexcept
{
    Store(args.puWidth, uWidth);
    Store(args.puHeight, uHeight);
    Store(args.puPitch, uWidth); // the pitch is the width
}

// Makes the intermediate buffer hold at least iLen payload bytes. It only grows: a longer input
// frees the old buffer (when both pointer and capacity are set) before the new one is made, so
// a failed allocation leaves no buffer (pointer null, capacity 0). False when no buffer of that
// size is available.
bool ReserveIntermediate(CALCodec *hCodec, int32_t iLen) noexcept
{
    if (iLen > hCodec->m_iIntermediateFrameSize) {
        if (iLen > kMaxIntermediatePayload)
            return false;
        if (hCodec->m_pIntermediateFrame && hCodec->m_iIntermediateFrameSize != 0)
            sal::Free(hCodec->m_pIntermediateFrame);
        hCodec->m_pIntermediateFrame =
            static_cast<uint8_t *>(sal::Alloc(static_cast<uint32_t>(iLen + kIntermediateHeadroom)));
        hCodec->m_iIntermediateFrameSize = hCodec->m_pIntermediateFrame ? iLen : 0;
    }
    // An empty input grows nothing; with no buffer made yet there is nothing to convert into.
    return hCodec->m_pIntermediateFrame != nullptr;
}

// The stream-aware mode (CAL_PROP_TRUST_CONFIGURATION answered 1) takes the frame framing from
// the configuration. An H.264 or HEVC instance never has an AMR frame type (the lock runs for AMR
// OTIs only), so the mode keeps the framing in m_uAMRFrameType and the instance record stays as
// documented. 0 leaves the framing to the format test of each frame.
struct ConfigFraming {
    int32_t iFormat = 0;
    uint32_t uNALSize = 0;
};

ConfigFraming FramingOfConfiguration(const VideoInitArgs &args) noexcept
{
    constexpr int32_t kMinConfigLen = 4; // what the format test needs
    if (!Readable(args.pConfig, args.iConfigLen) || args.iConfigLen < kMinConfigLen)
        return {};
    if (vorCALTools_AVC_CheckFormat(args.pConfig, args.iConfigLen) == CAL_AVC_FORMAT_ANNEXB)
        return {CAL_AVC_FORMAT_ANNEXB, args.uNALLengthSize};
    // A configuration record tells its own length size; a parameter-set list does not.
    const int32_t iRecordSize = tools::avc::ConfigRecordNalLengthSize(args.pConfig, args.iConfigLen);
    return {CAL_AVC_FORMAT_NAL, iRecordSize ? static_cast<uint32_t>(iRecordSize) : args.uNALLengthSize};
}

// The same for HEVC: start-code framing, or an hvcC record with its lengthSizeMinusOne + 1.
ConfigFraming FramingOfHevcConfiguration(const VideoInitArgs &args) noexcept
{
    constexpr int32_t kMinConfigLen = 4;
    if (!Readable(args.pConfig, args.iConfigLen) || args.iConfigLen < kMinConfigLen)
        return {};
    if (vorCALTools_HEVC_CheckFormat(args.pConfig, args.iConfigLen) == CAL_AVC_FORMAT_ANNEXB)
        return {CAL_AVC_FORMAT_ANNEXB, args.uNALLengthSize};
    CALHEVCConfig record;
    const bool bRecord = vorCALTools_HEVC_ParseHvcC(args.pConfig, args.iConfigLen, &record) == CAL_HEVC_OK;
    return {CAL_AVC_FORMAT_NAL, bRecord ? record.uNALLengthSize : args.uNALLengthSize};
}

// The stream-aware mode for an instance that Decode adapts as iOTI: the framing of the frames
// from the configuration, kept in m_uAMRFrameType; a record's length size in m_uH264NALSize.
ConfigFraming TrustConfiguration(CALCodec *hCodec, const VideoInitArgs &args, uint32_t uOTI, bool bTrusted) noexcept
{
    ConfigFraming framing;
    if (hCodec->m_uCodecObjectTypeIndication != uOTI)
        return framing;
    if (bTrusted)
        framing = uOTI == CAL_OTI_HEVC ? FramingOfHevcConfiguration(args) : FramingOfConfiguration(args);
    hCodec->m_uAMRFrameType = static_cast<uint32_t>(framing.iFormat);
    if (framing.iFormat == CAL_AVC_FORMAT_NAL)
        hCodec->m_uH264NALSize = framing.uNALSize;
    return framing;
}

inline int32_t TrustedFraming(const CALCodec *hCodec) noexcept
{
    const uint32_t uFormat = hCodec->m_uAMRFrameType;
    return IsAVCFormat(uFormat) ? static_cast<int32_t>(uFormat) : 0;
}

// The answer the layer gives itself instead of calling the codec.
inline VideoInitPlan Answer(int32_t iResult) noexcept
{
    VideoInitPlan plan;
    plan.bAnswered = true;
    plan.iResult = iResult;
    return plan;
}

// No memory for a conversion: Init fails with -1 before the codec is called and, like an Init
// the codec failed, leaves neither buffer behind.
VideoInitPlan FailInit(CALCodec *hCodec, uint8_t *pTemporaryConfig) noexcept
{
    if (pTemporaryConfig)
        sal::Free(pTemporaryConfig);
    if (hCodec->m_pIntermediateFrame && hCodec->m_iIntermediateFrameSize != 0) {
        sal::Free(hCodec->m_pIntermediateFrame);
        hCodec->m_pIntermediateFrame = nullptr;
        hCodec->m_iIntermediateFrameSize = 0;
    }
    return Answer(-1);
}

// What the H.264 and HEVC adaptations differ in: the tools they call and the names in traces.
struct NalCodecOps {
    bool bHevc;
    int32_t (*CheckFormat)(const uint8_t *pData, int32_t iLen) noexcept;
    // The parameter-set run in front of the first slice, for the framing given, or null.
    const uint8_t *(*ConfigRun)(const uint8_t *pData, int32_t iLen, bool bAnnexB, int32_t iNALSize,
                                int32_t *piRunLen) noexcept;
    // A frame of framing iFormat converted into pDst: the bytes written, or -1.
    int32_t (*Convert)(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc, int32_t iLen, int32_t iNALSize,
                       int32_t iFormat) noexcept;
    // The bytes Convert writes given room enough, or -1 when it fails for another reason.
    int64_t (*ConvertedSize)(const uint8_t *pSrc, int32_t iLen, int32_t iNALSize, int32_t iFormat) noexcept;
};

int32_t AvcCheckFormat(const uint8_t *pData, int32_t iLen) noexcept
{
    return vorCALTools_AVC_CheckFormat(pData, iLen);
}

const uint8_t *AvcConfigRun(const uint8_t *pData, int32_t iLen, bool bAnnexB, int32_t iNALSize, int32_t *piRunLen) noexcept
{
    return bAnnexB ? vorCALTools_AVC_ANNEXB_GetConfigStream(pData, iLen, piRunLen)
                   : vorCALTools_AVC_NAL_GetConfigStream(pData, iLen, iNALSize, piRunLen);
}

constexpr NalCodecOps kAvc = {false, AvcCheckFormat, AvcConfigRun, tools::avc::ConvertFrame, tools::avc::ConvertedSize};

int32_t HevcCheckFormat(const uint8_t *pData, int32_t iLen) noexcept
{
    return vorCALTools_HEVC_CheckFormat(pData, iLen);
}

const uint8_t *HevcConfigRun(const uint8_t *pData, int32_t iLen, bool bAnnexB, int32_t iNALSize, int32_t *piRunLen) noexcept
{
    return vorCALTools_HEVC_GetConfigStream(pData, iLen, bAnnexB ? 0 : iNALSize, piRunLen);
}

// As for H.264, length-prefixed output has 4-byte length fields whatever size the input used.
constexpr int32_t kOutputLengthSize = 4;

int32_t HevcConvert(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc, int32_t iLen, int32_t iNALSize,
                    int32_t iFormat) noexcept
{
    const int32_t iSize = iFormat == CAL_AVC_FORMAT_NAL ? iNALSize : kOutputLengthSize;
    const int32_t r = vorCALTools_HEVC_ConvertFormat(pDst, iDstSize, pSrc, iLen,
                                                     iFormat == CAL_AVC_FORMAT_NAL ? CAL_AVC_FORMAT_NAL : CAL_AVC_FORMAT_ANNEXB, iSize);
    return r < 0 ? -1 : r;
}

int64_t HevcConvertedSize(const uint8_t *pSrc, int32_t iLen, int32_t iNALSize, int32_t iFormat) noexcept
{
    return HevcConvert(nullptr, 0, pSrc, iLen, iNALSize, iFormat);
}

constexpr NalCodecOps kHevc = {true, HevcCheckFormat, HevcConfigRun, HevcConvert, HevcConvertedSize};

// The enhancement configuration of Init, when its framing is not the wanted one, converted like a
// frame into the intermediate buffer; a failed conversion leaves the codec a null enhancement
// configuration with the length as the caller gave it. False when the buffer cannot be had.
bool ConvertEnhancement(CALCodec *hCodec, VideoInitArgs &args, int32_t iWanted, const NalCodecOps &ops) noexcept
{
    if (!Readable(args.pConfigEnhance, args.iEnhLen))
        return true;
    const int32_t iFormat = ops.CheckFormat(args.pConfigEnhance, args.iEnhLen);
    if (iFormat == iWanted)
        return true;
    if (!ReserveIntermediate(hCodec, args.iEnhLen))
        return false;
    const int32_t iNewLen = ops.Convert(hCodec->m_pIntermediateFrame, args.iEnhLen + kIntermediateHeadroom,
                                        args.pConfigEnhance, args.iEnhLen, static_cast<int32_t>(args.uNALLengthSize), iFormat);
    if (iNewLen == -1) {
        // The H.264 message names the format test, although the conversion failed.
        if (ops.bHevc)
            VORCAL_TRACE(kTraceError, 0, "[CAL_Wrapper %d] vorCALTools_HEVC_ConvertFormat failed\n", __LINE__);
        else
            VORCAL_TRACE(kTraceError, 0, "[CAL_Wrapper %d] vorCALTools_AVC_CheckFormat failed\n", __LINE__);
        args.pConfigEnhance = nullptr;
        return true;
    }
    args.pConfigEnhance = hCodec->m_pIntermediateFrame;
    args.iEnhLen = iNewLen;
    if (ops.bHevc)
        return true;
    VORCAL_TRACE(kTraceH264Adapt, 0, "[CAL_Wrapper %d] vorCALTools_AVC_CheckFormat iEnhLen = %d, iNewDataLen = %d\n",
                 __LINE__, iNewLen, iNewLen);
    VORCAL_TRACE(kTraceH264Adapt, 0,
                 "[CAL_Wrapper %d] vorCALTools_AVC_CheckFormat pConfigEnhance = 0x%x, "
                 "m_pIntermediateFrame = 0x%x, m_uH264NALSize = %d\n",
                 __LINE__, sal::Hex32(args.pConfigEnhance), sal::Hex32(hCodec->m_pIntermediateFrame),
                 static_cast<int>(hCodec->m_uH264NALSize));
    return true;
}

VideoInitPlan PrepareH264Init(CALCodec *hCodec, VideoInitArgs &args) noexcept
{
    // The configuration as the caller passed it, parsed at most once for size and profile.
    CALSPSInfo sps{};
    bool bParsed = false;
    bool bParsedOK = false;
    auto ParseSPS = [&]() noexcept {
        if (!bParsed) {
            bParsed = true;
            bParsedOK = Readable(args.pConfig, args.iConfigLen) &&
                        vorCALTools_AVC_GetSPSInfo(args.pConfig, args.iConfigLen, &sps) == 0;
        }
        return bParsedOK;
    };

    const bool bTrusted = VideoPropertyIs(hCodec, CAL_PROP_TRUST_CONFIGURATION, 1);
    const ConfigFraming framing = TrustConfiguration(hCodec, args, CAL_OTI_H264, bTrusted);

    if (VideoPropertyIs(hCodec, CAL_PROP_STREAM_PARAMETERS, 1)) {
        CALAVCSPS full;
        if (!bTrusted && ParseSPS())
            StoreSize(args, sps.uWidth, sps.uHeight);
        else if (bTrusted && Readable(args.pConfig, args.iConfigLen) &&
                 vorCALTools_AVC_ParseSPS(args.pConfig, args.iConfigLen, &full) == CAL_AVC_SPS_OK)
            StoreSize(args, full.uWidth, full.uHeight); // the display size, from any configuration
    }

    if (VideoPropertyIs(hCodec, CAL_PROP_H264_NO_MAIN_PROFILE, 1) && ParseSPS() && sps.uProfile == kProfileMain) {
        VORCAL_TRACE(kTraceError, 0,
                     "[CAL_Wrapper %d] H.264 Error(Profile[%u], Level[%u])!!! H.264 codec can't support "
                     "profile[Main Profile]\n",
                     __LINE__, sps.uProfile, sps.uLevel);
        return Answer(CAL_RESULT_REFUSED);
    }

    uint32_t uWanted = 0;
    if (!VideoPropertyAnswered(hCodec, CAL_PROP_H264_CONFIG_FORMAT, &uWanted))
        return {};
    if (framing.iFormat != CAL_AVC_FORMAT_NAL) // a record's own length size stays
        hCodec->m_uH264NALSize = args.uNALLengthSize;
    if (!IsAVCFormat(uWanted))
        return {};

    VideoInitPlan plan;
    const int32_t iWanted = static_cast<int32_t>(uWanted);

    // Parameter sets: a temporary buffer of 3/2 of the input, freed after the codec's Init.
    if (Readable(args.pConfig, args.iConfigLen) &&
        vorCALTools_AVC_CheckFormat(args.pConfig, args.iConfigLen) != iWanted) {
        const int64_t iSize = (static_cast<int64_t>(args.iConfigLen) * 3) / 2;
        if (iSize > INT32_MAX)
            return FailInit(hCodec, nullptr);
        plan.pTemporaryConfig = static_cast<uint8_t *>(sal::Alloc(static_cast<uint32_t>(iSize)));
        if (!plan.pTemporaryConfig)
            return FailInit(hCodec, nullptr);
        args.iConfigLen = vorCALTools_AVC_ConvertFormatPSs(plan.pTemporaryConfig, static_cast<int32_t>(iSize),
                                                           args.pConfig, args.iConfigLen);
        args.pConfig = plan.pTemporaryConfig;
    }

    // Enhancement configuration: converted into the intermediate buffer.
    if (!ConvertEnhancement(hCodec, args, iWanted, kAvc))
        return FailInit(hCodec, plan.pTemporaryConfig);
    return plan;
}

// HEVC: the picture size from the SPS (the display size, from any configuration), the framing
// of the configuration and of the enhancement configuration; nothing is refused.
VideoInitPlan PrepareHEVCInit(CALCodec *hCodec, VideoInitArgs &args) noexcept
{
    const bool bTrusted = VideoPropertyIs(hCodec, CAL_PROP_TRUST_CONFIGURATION, 1);
    const ConfigFraming framing = TrustConfiguration(hCodec, args, CAL_OTI_HEVC, bTrusted);

    CALHEVCSPS sps;
    if (VideoPropertyIs(hCodec, CAL_PROP_STREAM_PARAMETERS, 1) && Readable(args.pConfig, args.iConfigLen) &&
        vorCALTools_HEVC_ParseSPS(args.pConfig, args.iConfigLen, &sps) == CAL_HEVC_OK)
        StoreSize(args, sps.uWidth, sps.uHeight);

    uint32_t uWanted = 0;
    if (!VideoPropertyAnswered(hCodec, CAL_PROP_H264_CONFIG_FORMAT, &uWanted))
        return {};
    if (framing.iFormat != CAL_AVC_FORMAT_NAL) // a record's own length size stays
        hCodec->m_uH264NALSize = args.uNALLengthSize;
    if (!IsAVCFormat(uWanted))
        return {};

    VideoInitPlan plan;
    const int32_t iWanted = static_cast<int32_t>(uWanted);
    // Parameter sets: an hvcC record to start codes, or start codes to a record (4-byte lengths,
    // as frames converted by the layer have), in a temporary buffer of the size it takes. A
    // configuration that does not convert reaches the codec as given.
    if (Readable(args.pConfig, args.iConfigLen) && vorCALTools_HEVC_CheckFormat(args.pConfig, args.iConfigLen) != iWanted) {
        auto ConvertConfig = [&](uint8_t *pDst, int32_t iDstSize) {
            return iWanted == CAL_AVC_FORMAT_ANNEXB
                       ? vorCALTools_HEVC_HvcCToAnnexB(pDst, iDstSize, args.pConfig, args.iConfigLen)
                       : vorCALTools_HEVC_MakeHvcC(pDst, iDstSize, args.pConfig, args.iConfigLen, kOutputLengthSize, 0);
        };
        const int32_t iSize = ConvertConfig(nullptr, 0);
        if (iSize <= 0) {
            VORCAL_TRACE(kTraceError, 0, "[CAL_Wrapper %d] HEVC configuration not converted (%d)\n", __LINE__,
                         static_cast<int>(iSize));
        } else {
            plan.pTemporaryConfig = static_cast<uint8_t *>(sal::Alloc(static_cast<uint32_t>(iSize)));
            if (!plan.pTemporaryConfig)
                return FailInit(hCodec, nullptr);
            args.iConfigLen = ConvertConfig(plan.pTemporaryConfig, iSize);
            args.pConfig = plan.pTemporaryConfig;
        }
    }
    if (!ConvertEnhancement(hCodec, args, iWanted, kHevc))
        return FailInit(hCodec, plan.pTemporaryConfig);
    return plan;
}

VideoInitPlan PrepareMPEG4Init(CALCodec *hCodec, const VideoInitArgs &args) noexcept
{
    // Cleared first: fields of headers the DSI does not carry read as 0.
    CALMPEG4DSIInfo dsi{};
    const uint32_t uDSILen = Readable(args.pConfig, args.iConfigLen) ? static_cast<uint32_t>(args.iConfigLen) : 0;
    const bool bParsedOK = vorCALTools_MPEG4V_GetDSIInfo(args.pConfig, uDSILen, &dsi) == 0;

    if (VideoPropertyIs(hCodec, CAL_PROP_STREAM_PARAMETERS, 1) && bParsedOK)
        StoreSize(args, dsi.uWidth, dsi.uHeight);

    if (args.uOTI == CAL_OTI_MPEG4_VISUAL) {
        // Both refusals read the record whether or not the walk succeeded; an unrecognised
        // profile is reported with the level-3 message as well.
        const bool bRefused =
            (VideoPropertyIs(hCodec, CAL_PROP_MPEG4_NO_LEVEL3, 1) && dsi.uLevel == kMPEG4Level3) ||
            (VideoPropertyIs(hCodec, CAL_PROP_MPEG4_NO_UNKNOWN_PROFILE, 1) && dsi.uProfile == kMPEG4Unrecognised &&
             dsi.uLevel == kMPEG4Unrecognised);
        if (bRefused) {
            VORCAL_TRACE(kTraceError, 0,
                         "[CAL_Wrapper %d] MPEG4 Error(Profile[%u], Level[%u])!!! MPEG4 codec can't support "
                         "Level 3.\n",
                         __LINE__, dsi.uProfile, dsi.uLevel);
            return Answer(CAL_RESULT_REFUSED);
        }
    } else if (bParsedOK && dsi.uSourceFormat == kH263ExtendedPType &&
               VideoPropertyIs(hCodec, CAL_PROP_H263_NO_EXTENDED_PTYPE, 1)) {
        VORCAL_TRACE(kTraceError, 0,
                     "[CAL_Wrapper %d] H.263 Error(Type[%d])!!! H.263 codec can't support H.263 Extended P Type\n",
                     __LINE__, static_cast<int>(dsi.uSourceFormat));
        return Answer(CAL_RESULT_REFUSED);
    }
    return {};
}

// The layer drops the frame itself: result 1 and, when the caller gave one, result word 4.
inline bool Drop(uint32_t *puDecodeResult, int32_t *piResult) noexcept
{
    Store(puDecodeResult, CAL_DECODE_RESULT_DROPPED);
    *piResult = CAL_RESULT_DROPPED;
    return false;
}

// Converts the frame into the intermediate buffer, which holds at least frame.iLen bytes; the
// converter is told the documented size, the frame length plus the headroom. Where that cannot
// hold the converted frame (more than 100 units behind 3-byte start codes, or many units behind
// short length fields), the buffer grows to the converted size plus the headroom and the frame
// is converted again: no valid frame is dropped for want of room. kNoRoom when that memory is
// not to be had.
constexpr int32_t kNoRoom = -2;

int32_t ConvertIntoIntermediate(CALCodec *hCodec, const VideoFrame &frame, int32_t iNALSize, int32_t iFormat,
                                const NalCodecOps &ops) noexcept
{
    const int32_t iNewLen = ops.Convert(hCodec->m_pIntermediateFrame, frame.iLen + kIntermediateHeadroom, frame.pData,
                                        frame.iLen, iNALSize, iFormat);
    if (iNewLen != -1)
        return iNewLen;
    const int64_t iNeeded = ops.ConvertedSize(frame.pData, frame.iLen, iNALSize, iFormat);
    if (iNeeded <= int64_t{frame.iLen} + kIntermediateHeadroom || iNeeded > kMaxIntermediatePayload)
        return -1; // not a matter of room: the frame itself is broken
    if (!ReserveIntermediate(hCodec, static_cast<int32_t>(iNeeded)))
        return kNoRoom;
    return ops.Convert(hCodec->m_pIntermediateFrame, hCodec->m_iIntermediateFrameSize + kIntermediateHeadroom,
                       frame.pData, frame.iLen, iNALSize, iFormat);
}

// H.264 and HEVC frames: parameter-set removal (property 83) and framing conversion (81).
bool AdaptNalFrame(CALCodec *hCodec, VideoFrame &frame, CALParam uParam3, uint32_t *puDecodeResult, int32_t *piResult,
                   const NalCodecOps &ops) noexcept
{
    const int32_t iNALSize = static_cast<int32_t>(hCodec->m_uH264NALSize);
    // The framing of the frame: from the configuration in the stream-aware mode, else from its
    // first bytes. The format test takes a 4-byte length of 0x100 to 0x1FF (00 00 01 xx) for a
    // start code, so such a length-prefixed frame is searched, and later converted, as start-code
    // framed unless the configuration said otherwise.
    const int32_t iTrusted = TrustedFraming(hCodec);
    auto FramingOf = [iTrusted, &ops](const VideoFrame &f) noexcept {
        return iTrusted ? iTrusted : ops.CheckFormat(f.pData, f.iLen);
    };

    // In-band parameter sets: cut the SEI/SPS/PPS run and everything in front of it.
    uint32_t uValue = 0;
    if (VideoPropertyAnswered(hCodec, CAL_PROP_H264_INBAND_PARAM_SETS, &uValue) && uValue == 0) {
        const bool bAnnexB = FramingOf(frame) == CAL_AVC_FORMAT_ANNEXB;
        int32_t iRunLen = 0;
        const uint8_t *pRun = ops.ConfigRun(frame.pData, frame.iLen, bAnnexB, iNALSize, &iRunLen);
        if (pRun) {
            const int32_t iNewLen = frame.iLen - iRunLen - static_cast<int32_t>(pRun - frame.pData);
            VORCAL_TRACE(kTraceH264Adapt, 4, "[CAL_Wrapper %d] %s bitstream has SPSPPS. => => Discard SPSPPS\n",
                         __LINE__, bAnnexB ? "ANNEX-B" : "NAL");
            if (iNewLen <= 3) {
                VORCAL_TRACE(kTraceH264Adapt, 0, "[CAL_Wrapper %d] InValid Frame Len (%d)\n", __LINE__, iNewLen);
                return Drop(puDecodeResult, piResult);
            }
            frame.pData = pRun + iRunLen;
            frame.iLen = iNewLen;
        }
    }

    // Framing: rewrite into the intermediate buffer when the codec wants the other one.
    uint32_t uWanted = 0;
    if (VideoPropertyAnswered(hCodec, CAL_PROP_H264_FRAME_FORMAT, &uWanted) && IsAVCFormat(uWanted)) {
        const int32_t iFormat = FramingOf(frame);
        if (iFormat == static_cast<int32_t>(uWanted))
            return true;
        if (!ReserveIntermediate(hCodec, frame.iLen))
            return Drop(puDecodeResult, piResult);
        const int32_t iNewLen = ConvertIntoIntermediate(hCodec, frame, iNALSize, iFormat, ops);
        if (iNewLen == -1 && ops.bHevc)
            VORCAL_TRACE(kTraceError, 0, "[CAL_Wrapper %d] vorCALTools_HEVC_ConvertFormat failed[%d],iLen[%d]\n",
                         __LINE__, static_cast<int>(uParam3), frame.iLen);
        else if (iNewLen == -1)
            VORCAL_TRACE(kTraceError, 0, "[CAL_Wrapper %d] vorCALTools_AVC_ConvertFormat failed[%d],iLen[%d]\n",
                         __LINE__, static_cast<int>(uParam3), frame.iLen);
        if (iNewLen < 0)
            return Drop(puDecodeResult, piResult);
        frame.pData = hCodec->m_pIntermediateFrame;
        frame.iLen = iNewLen;
    }
    return true;
}

void AdaptMPEG4Frame(CALCodec *hCodec, VideoFrame &frame) noexcept
{
    if (!VideoPropertyIs(hCodec, CAL_PROP_MPEG4_VOP_START, 1))
        return;
    int32_t iRemaining = 0;
    if (const uint8_t *pVOP = _PTOOL_FindVOP(frame.pData, frame.iLen, &iRemaining)) {
        frame.pData = pVOP;
        frame.iLen = iRemaining;
    }
}

} // namespace

VideoInitPlan PrepareVideoInit(CALCodec *hCodec, VideoInitArgs &args) noexcept
{
    switch (args.uOTI) {
    case CAL_OTI_H264:
        return PrepareH264Init(hCodec, args);
    case CAL_OTI_HEVC:
        return PrepareHEVCInit(hCodec, args);
    case CAL_OTI_MPEG4_VISUAL:
    case CAL_OTI_H263:
        return PrepareMPEG4Init(hCodec, args);
    default:
        return {};
    }
}

bool AdaptVideoFrame(CALCodec *hCodec, VideoFrame &frame, CALParam uParam3, uint32_t *puDecodeResult,
                     int32_t *piResult) noexcept
{
    // A frame the layer cannot read goes to the codec as the engine passed it.
    if (!frame.pData || frame.iLen < 0)
        return true;
    switch (hCodec->m_uCodecObjectTypeIndication) {
    case CAL_OTI_H264:
        return AdaptNalFrame(hCodec, frame, uParam3, puDecodeResult, piResult, kAvc);
    case CAL_OTI_HEVC:
        return AdaptNalFrame(hCodec, frame, uParam3, puDecodeResult, piResult, kHevc);
    case CAL_OTI_MPEG4_VISUAL:
        AdaptMPEG4Frame(hCodec, frame);
        return true;
    default:
        return true;
    }
}

} // namespace vorcal::wrapper
