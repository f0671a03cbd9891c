// The video decoder Init and Decode wrappers driven through a CAL handle by fuzzed property
// answers, configurations and frames, with a codec that reads every byte it is given.
//
// Input: OTI selector, NAL length size, allocation to fail, codec Init result, then one
// (answered, value) byte pair per property; then the configuration, the enhancement
// configuration and the frames, each as a 2-byte big-endian length and its bytes.
#include <cstdint>
#include <cstdlib>

#include <vorcal/core.h>
#include <vorcal/wrapper.h>

#include "fuzz_sal.hpp"

namespace {

constexpr uint32_t kProperties[] = {CAL_PROP_STREAM_PARAMETERS,      CAL_PROP_H264_FRAME_FORMAT,
                                    CAL_PROP_H264_CONFIG_FORMAT,     CAL_PROP_H264_INBAND_PARAM_SETS,
                                    CAL_PROP_H264_NO_MAIN_PROFILE,   CAL_PROP_MPEG4_VOP_START,
                                    CAL_PROP_MPEG4_NO_LEVEL3,        CAL_PROP_MPEG4_NO_UNKNOWN_PROFILE,
                                    CAL_PROP_H263_NO_EXTENDED_PTYPE};
constexpr size_t kPropertyCount = sizeof kProperties / sizeof kProperties[0];
constexpr uint32_t kOTIs[] = {CAL_OTI_H264, CAL_OTI_MPEG4_VISUAL, CAL_OTI_H263, CAL_OTI_WVC1};

struct Answer {
    bool bAnswered;
    uint32_t uValue;
};
Answer g_answers[kPropertyCount];
int32_t g_initResult = 0;
volatile uint8_t g_sink = 0;

void Touch(const uint8_t *p, int32_t iLen)
{
    if (!p || iLen <= 0)
        return;
    uint8_t x = 0;
    for (int32_t i = 0; i < iLen; ++i)
        x = static_cast<uint8_t>(x ^ p[i]);
    g_sink = x;
}

int32_t GetProperty(uint32_t uProperty, uint32_t *puValue)
{
    for (size_t i = 0; i < kPropertyCount; ++i) {
        if (kProperties[i] == uProperty && g_answers[i].bAnswered) {
            *puValue = g_answers[i].uValue;
            return 0;
        }
    }
    return -1;
}

int32_t Init(uint32_t, const uint8_t *pConfig, int32_t iConfigLen, const uint8_t *pEnhance, int32_t iEnhLen,
             uint32_t, uint32_t *, uint32_t *, uint32_t *, CALParam *ppUserData)
{
    Touch(pConfig, iConfigLen);
    Touch(pEnhance, iEnhLen);
    *ppUserData = 0x5A;
    return g_initResult;
}

int32_t Deinit(CALParam) { return 0; }

int32_t Decode(const uint8_t *pData, int32_t iLen, CALParam, CALParam, uint32_t *puResult, CALParam)
{
    Touch(pData, iLen);
    if (puResult)
        *puResult = 0;
    return 0;
}

// The next length-prefixed block of the input (2-byte length, clipped to what is left).
const uint8_t *Block(vorcal::fuzz::Input &in, int32_t *piLen)
{
    size_t uLen = static_cast<size_t>(in.Byte()) << 8;
    uLen |= in.Byte();
    if (uLen > in.RestSize())
        uLen = in.RestSize();
    const uint8_t *p = in.Rest();
    for (size_t i = 0; i < uLen; ++i)
        in.Byte();
    *piLen = static_cast<int32_t>(uLen);
    return uLen ? p : nullptr;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const uint32_t uOTI = kOTIs[in.Byte() % 4];
    const uint32_t uNALSize = in.Byte() % 6;
    const uint32_t uFailAt = in.Byte() % 8; // 0: no failure; counts from the Init call
    g_initResult = in.Byte() % 4 == 0 ? 1 : 0;
    for (Answer &answer : g_answers) {
        answer.bAnswered = in.Byte() & 1;
        const uint8_t uValue = in.Byte();
        answer.uValue = uValue < 0xF0 ? uValue % 4 : 0xFFFFFF00u | uValue;
    }
    int32_t iConfigLen = 0, iEnhLen = 0;
    const uint8_t *pConfig = Block(in, &iConfigLen);
    const uint8_t *pEnhance = Block(in, &iEnhLen);

    const size_t uLiveBefore = vorcal::fuzz::LiveBlocks();
    CALHandle *hCAL = vorCAL_GetHandle(0, 1, 1);
    if (!hCAL)
        return 0;
    const CALVideoDecoderFunctions functions = {GetProperty, Init, Deinit, Decode, nullptr, nullptr};
    vorCAL_RegisterCodec(hCAL, 2, 1, uOTI, &functions, sizeof functions);
    CALCodec *hCodec = vorCAL_GetCodec(hCAL, 2, 1, uOTI);
    if (hCodec) {
        vorcal::fuzz::FailAllocation(uFailAt);
        uint32_t uWidth = 0, uHeight = 0, uPitch = 0;
        vorCAL_VideoDecoderInit(hCodec, uOTI, pConfig, iConfigLen, pEnhance, iEnhLen, uNALSize, &uWidth, &uHeight,
                                &uPitch, 0);
        for (int i = 0; i < 16 && in.RestSize() > 0; ++i) {
            int32_t iLen = 0;
            const uint8_t *pFrame = Block(in, &iLen);
            uint32_t uResult = 0;
            vorCAL_VideoDecoderDecode(hCodec, pFrame, iLen, 0, 0, i % 5 == 4 ? nullptr : &uResult);
        }
        vorcal::fuzz::FailAllocation(0);
        vorCAL_VideoDecoderDeinit(hCodec);
        vorCAL_ReleaseCodec(hCodec);
    }
    vorCAL_ReleaseHandle(hCAL);
    if (vorcal::fuzz::LiveBlocks() != uLiveBefore)
        std::abort(); // a leaked block
    return 0;
}
