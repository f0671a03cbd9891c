// The forwarding wrappers: each calls one slot of the instance's table with the caller's
// arguments and returns the codec's result; -1 for a null instance.
#include <vorcal/wrapper.h>

#include "core/sal.hpp"
#include "wrapper/codec_slots.hpp"
#include "wrapper/intermediate.hpp"

using namespace vorcal;
using namespace vorcal::wrapper;

extern "C" int32_t vorCAL_VideoDecoderGetProperty(CALCodec *hCodec, uint32_t uProperty,
                                                  uint32_t *puValue)
{
    if (!hCodec)
        return -1;
    return CallSlot<CALGetPropertyFunc>(hCodec, kSlot0, uProperty, puValue);
}

extern "C" int32_t vorCAL_VideoDecoderGetOutput(CALCodec *hCodec, CALParam uParam1,
                                                CALParam uParam2, CALParam uParam3,
                                                CALParam uParam4)
{
    if (!hCodec)
        return -1;
    return CallSlot<CALVideoDecoderGetOutputFunc>(hCodec, kSlot4, uParam1, uParam2, uParam3,
                                                  uParam4, hCodec->m_uUserData);
}

extern "C" int32_t vorCAL_VideoDecoderReset(CALCodec *hCodec)
{
    if (!hCodec)
        return -1;
    return CallSlot<CALUserDataFunc>(hCodec, kSlot5, hCodec->m_uUserData);
}

extern "C" int32_t vorCAL_VideoDecoderDeinit(CALCodec *hCodec)
{
    if (!hCodec)
        return -1;
    ReleaseIntermediate(hCodec);
    return CallSlot<CALUserDataFunc>(hCodec, kSlot2, hCodec->m_uUserData);
}

extern "C" int32_t vorCAL_AudioDecoderGetProperty(CALCodec *hCodec, uint32_t uProperty,
                                                  uint32_t *puValue)
{
    if (!hCodec)
        return -1;
    return CallSlot<CALGetPropertyFunc>(hCodec, kSlot0, uProperty, puValue);
}

extern "C" int32_t vorCAL_AudioDecoderReset(CALCodec *hCodec)
{
    if (!hCodec)
        return -1;
    return CallSlot<CALUserDataFunc>(hCodec, kSlot4, hCodec->m_uUserData);
}

extern "C" int32_t vorCAL_AudioDecoderDeinit(CALCodec *hCodec)
{
    if (!hCodec)
        return -1;
    return CallSlot<CALUserDataFunc>(hCodec, kSlot2, hCodec->m_uUserData);
}

extern "C" int32_t vorCAL_ImageDecoderGetProperty(CALCodec *hCodec, uint32_t uProperty,
                                                  uint32_t *puValue)
{
    if (!hCodec)
        return -1;
    return CallSlot<CALGetPropertyFunc>(hCodec, kSlot0, uProperty, puValue);
}

extern "C" int32_t vorCAL_ImageDecoderGetHeader(CALCodec *hCodec, CALParam uParam1,
                                                CALParam uParam2, CALParam uParam3,
                                                CALParam uParam4, CALParam uParam5,
                                                CALParam uParam6, CALParam uParam7,
                                                CALParam uUserData)
{
    if (!hCodec)
        return -1;
    hCodec->m_uUserData = uUserData;
    return CallSlot<CALImageDecoderGetHeaderFunc>(hCodec, kSlot1, uParam1, uParam2, uParam3,
                                                  uParam4, uParam5, uParam6, uParam7,
                                                  &hCodec->m_uUserData);
}

extern "C" int32_t vorCAL_ImageDecoderDecode(CALCodec *hCodec, CALParam uParam1, CALParam uParam2,
                                             CALParam uParam3, CALParam uParam4, CALParam uParam5,
                                             CALParam uParam6, CALParam uParam7, CALParam uParam8,
                                             CALParam uParam9, CALParam uParam10)
{
    if (!hCodec)
        return -1;
    return CallSlot<CALImageDecoderDecodeFunc>(hCodec, kSlot2, uParam1, uParam2, uParam3, uParam4,
                                               uParam5, uParam6, uParam7, uParam8, uParam9,
                                               uParam10, hCodec->m_uUserData);
}

extern "C" int32_t vorCAL_TextDecoderInit(CALCodec *hCodec, CALParam uParam1, CALParam uParam2,
                                          CALParam uParam3, CALParam uUserData)
{
    if (!hCodec)
        return -1;
    hCodec->m_uUserData = uUserData;
    const int32_t iResult = CallSlot<CALTextDecoderInitFunc>(hCodec, kSlot1, uParam1, uParam2,
                                                             uParam3, &hCodec->m_uUserData);
    // CONTRACT: traced after the call, in the documented unbalanced form.
    VORCAL_TRACE(kTraceText, 0, "vorCAL_TextDecoderInit %d]", __LINE__);
    return iResult;
}

extern "C" int32_t vorCAL_TextDecoderDecode(CALCodec *hCodec, const uint8_t *pData, int32_t iLen,
                                            CALParam uParam3, CALParam uParam4, CALParam uParam5)
{
    if (!hCodec)
        return -1;
    VORCAL_TRACE(kTraceText, 4, "(vorCAL_TextDecoderDecode %d) pData=0x%X, iLen=%d\n", __LINE__,
                 sal::Hex32(pData), iLen);
    return CallSlot<CALTextDecoderDecodeFunc>(hCodec, kSlot3, pData, iLen, uParam3, uParam4,
                                              uParam5, hCodec->m_uUserData);
}

extern "C" int32_t vorCAL_TextDecoderGetOutput(CALCodec *hCodec, CALParam uParam1)
{
    if (!hCodec) {
        VORCAL_TRACE(kTraceText, 0, "vorCAL_TextDecoderGetOutput %d]", __LINE__);
        return -1;
    }
    return CallSlot<CALTextDecoderGetOutputFunc>(hCodec, kSlot4, uParam1, hCodec->m_uUserData);
}

extern "C" int32_t vorCAL_TextDecoderDeinit(CALCodec *hCodec)
{
    if (!hCodec)
        return -1;
    return CallSlot<CALUserDataFunc>(hCodec, kSlot2, hCodec->m_uUserData);
}

extern "C" int32_t vorCAL_VideoEncoderGetProperty(CALCodec *hCodec, uint32_t uProperty,
                                                  uint32_t *puValue)
{
    if (!hCodec)
        return -1;
    return CallSlot<CALGetPropertyFunc>(hCodec, kSlot0, uProperty, puValue);
}

extern "C" int32_t vorCAL_VideoEncoderInit(CALCodec *hCodec, CALParam uParam1, CALParam uParam2,
                                           CALParam uParam3, CALParam uParam4, CALParam uParam5,
                                           CALParam uParam6, CALParam uParam7, CALParam uParam8,
                                           CALParam uParam9, CALParam uUserData)
{
    if (!hCodec)
        return -1;
    hCodec->m_uUserData = uUserData;
    return CallSlot<CALVideoEncoderInitFunc>(hCodec, kSlot1, uParam1, uParam2, uParam3, uParam4,
                                             uParam5, uParam6, uParam7, uParam8, uParam9,
                                             &hCodec->m_uUserData);
}

extern "C" int32_t vorCAL_VideoEncoderEncode(CALCodec *hCodec, CALParam uParam1, CALParam uParam2,
                                             CALParam uParam3, CALParam uParam4, CALParam uParam5,
                                             CALParam uParam6)
{
    if (!hCodec)
        return -1;
    return CallSlot<CALVideoEncoderEncodeFunc>(hCodec, kSlot3, uParam1, uParam2, uParam3, uParam4,
                                               uParam5, uParam6, hCodec->m_uUserData);
}

extern "C" int32_t vorCAL_VideoEncoderSkip(CALCodec *hCodec, CALParam uParam1, CALParam uParam2)
{
    if (!hCodec)
        return -1;
    return CallSlot<CALVideoEncoderSkipFunc>(hCodec, kSlot4, uParam1, uParam2, hCodec->m_uUserData);
}

extern "C" int32_t vorCAL_VideoEncoderDeinit(CALCodec *hCodec)
{
    if (!hCodec)
        return -1;
    return CallSlot<CALUserDataFunc>(hCodec, kSlot2, hCodec->m_uUserData);
}
