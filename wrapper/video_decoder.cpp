// vorCAL_VideoDecoderInit and vorCAL_VideoDecoderDecode: dump record, adaptation, codec call.
#include <vorcal/wrapper.h>

#include "core/dump.hpp"
#include "core/sal.hpp"
#include "wrapper/codec_slots.hpp"
#include "wrapper/video_adapt.hpp"

using namespace vorcal;
using namespace vorcal::wrapper;

extern "C" int32_t vorCAL_VideoDecoderInit(CALCodec *hCodec, uint32_t uCodecObjectTypeIndication,
                                           const uint8_t *pConfig, int32_t iConfigLen,
                                           const uint8_t *pConfigEnhance, int32_t iEnhLen,
                                           uint32_t uNALLengthSize, uint32_t *puWidth, uint32_t *puHeight,
                                           uint32_t *puPitch, CALParam uUserData)
{
    if (!hCodec)
        return -1;

    if (core::IsDumpOpen(hCodec->m_hCAL, core::kVideoDumpSlot)) {
        if (pConfig && iConfigLen != 0)
            core::WriteDumpRecord(hCodec->m_hCAL, core::kVideoDumpSlot, pConfig, iConfigLen);
        else
            VORCAL_TRACE(kTraceError, 0, "[CAL_Wrapper %d] pConfig is NULL\n", __LINE__);
    }

    VideoInitArgs args{uCodecObjectTypeIndication, pConfig, iConfigLen, pConfigEnhance, iEnhLen,
                       uNALLengthSize, puWidth, puHeight, puPitch};
    const VideoInitPlan plan = PrepareVideoInit(hCodec, args);
    if (plan.bAnswered)
        return plan.iResult;

    hCodec->m_uUserData = uUserData;
    const int32_t iResult = CallSlot<CALVideoDecoderInitFunc>(
        hCodec, kSlot1, args.uOTI, args.pConfig, args.iConfigLen, args.pConfigEnhance, args.iEnhLen,
        args.uNALLengthSize, args.puWidth, args.puHeight, args.puPitch, &hCodec->m_uUserData);
    if (plan.pTemporaryConfig)
        sal::Free(plan.pTemporaryConfig);

    // A failed Init leaves no intermediate buffer behind.
    if (iResult != 0 && hCodec->m_pIntermediateFrame && hCodec->m_iIntermediateFrameSize != 0) {
        sal::Free(hCodec->m_pIntermediateFrame);
        hCodec->m_pIntermediateFrame = nullptr;
        hCodec->m_iIntermediateFrameSize = 0;
    }
    return iResult;
}

extern "C" int32_t vorCAL_VideoDecoderDecode(CALCodec *hCodec, const uint8_t *pData, int32_t iLen,
                                             CALParam uParam3, CALParam uParam4, uint32_t *puDecodeResult)
{
    if (!hCodec)
        return -1;

    // The record holds the frame exactly as the engine passed it, before any adaptation.
    core::WriteDumpRecord(hCodec->m_hCAL, core::kVideoDumpSlot, pData, iLen);

    VideoFrame frame{pData, iLen};
    int32_t iResult = 0;
    if (!AdaptVideoFrame(hCodec, frame, uParam3, puDecodeResult, &iResult))
        return iResult;

    return CallSlot<CALVideoDecoderDecodeFunc>(hCodec, kSlot3, frame.pData, frame.iLen, uParam3, uParam4,
                                               puDecodeResult, hCodec->m_uUserData);
}
