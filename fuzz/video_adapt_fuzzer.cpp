// The video decoder Init and Decode wrappers driven through a CAL handle by fuzzed property
// answers, configurations and frames, with a codec that reads every byte it is given.
//
// Input: OTI selector, NAL length size, allocation to fail, codec Init result, then one
// (answered, value) byte pair per property; then the configuration, the enhancement
// configuration and the frames, each as a 2-byte big-endian length and its bytes.
#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <iterator>
#include <utility>

#include <vorcal/core.h>
#include <vorcal/wrapper.h>

#include "fuzz_sal.hpp"

namespace {

// every CAL_PROP_* the layer asks
constexpr uint32_t kProperties[] = {3, 81, 82, 83, 84, 97, 101, 103, 160, CAL_PROP_TRUST_CONFIGURATION};
constexpr uint32_t kOTIs[] = {CAL_OTI_H264, CAL_OTI_MPEG4_VISUAL, CAL_OTI_H263, CAL_OTI_WVC1};
int64_t g_answers[CAL_PROP_TRUST_CONFIGURATION + 1]; // by property number; -1: not answered
int32_t g_initResult = 0;
volatile uint8_t g_sink = 0;

int32_t Touch(const uint8_t *p, int32_t iLen)
{
    for (int32_t i = 0; p && i < iLen; ++i)
        g_sink = static_cast<uint8_t>(g_sink ^ p[i]);
    return 0;
}

int32_t GetProperty(uint32_t uProperty, uint32_t *puValue)
{
    const int64_t iAnswer = uProperty < std::size(g_answers) ? g_answers[uProperty] : -1;
    return iAnswer < 0 ? -1 : (*puValue = static_cast<uint32_t>(iAnswer), 0);
}

int32_t Init(uint32_t, const uint8_t *pConfig, int32_t iConfigLen, const uint8_t *pEnhance, int32_t iEnhLen, uint32_t,
             uint32_t *, uint32_t *, uint32_t *, CALParam *ppUserData)
{
    *ppUserData = static_cast<CALParam>(0x5A + Touch(pConfig, iConfigLen) + Touch(pEnhance, iEnhLen));
    return g_initResult;
}

int32_t Decode(const uint8_t *pData, int32_t iLen, CALParam, CALParam, uint32_t *, CALParam) { return Touch(pData, iLen); }
const CALVideoDecoderFunctions kCodec = {GetProperty, Init, nullptr, Decode, nullptr, nullptr};

// The next block of the input: a 2-byte length, clipped to what is left, then its bytes.
std::pair<const uint8_t *, int32_t> Next(vorcal::fuzz::Input &in)
{
    const size_t uHigh = in.Byte();
    const size_t uLen = std::min((uHigh << 8) | in.Byte(), in.RestSize());
    const uint8_t *p = uLen ? in.Rest() : nullptr;
    for (size_t i = 0; i < uLen; ++i)
        in.Byte();
    return {p, static_cast<int32_t>(uLen)};
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const uint32_t uOTI = kOTIs[in.Byte() % 4], uNALSize = in.Byte() % 6;
    const uint32_t uFailAt = in.Byte() % 8; // 0: no failure; counts from the Init call
    g_initResult = in.Byte() % 4 == 0 ? 1 : 0;
    std::fill(std::begin(g_answers), std::end(g_answers), -1);
    for (uint32_t uProperty : kProperties) {
        const uint8_t uAnswered = in.Byte(), uValue = in.Byte();
        g_answers[uProperty] = !(uAnswered & 1) ? -1 : uValue < 0xF0 ? uValue % 4 : int64_t{0xFFFFFF00u | uValue};
    }
    const auto [pConfig, iConfigLen] = Next(in);
    const auto [pEnhance, iEnhLen] = Next(in);

    const size_t uLiveBefore = vorcal::fuzz::LiveBlocks();
    CALHandle *hCAL = vorCAL_GetHandle(0, 1, 1);
    vorCAL_RegisterCodec(hCAL, 2, 1, uOTI, &kCodec, sizeof kCodec);
    if (CALCodec *hCodec = vorCAL_GetCodec(hCAL, 2, 1, uOTI)) {
        uint32_t uResult = 0; // also the picture size words
        vorcal::fuzz::FailAllocation(uFailAt);
        vorCAL_VideoDecoderInit(hCodec, uOTI, pConfig, iConfigLen, pEnhance, iEnhLen, uNALSize, &uResult, &uResult, &uResult, 0);
        for (int i = 0; i < 16 && in.RestSize() > 0; ++i) {
            const auto [pFrame, iLen] = Next(in);
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
