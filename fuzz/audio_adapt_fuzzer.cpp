// The audio decoder adaptation through a handle: a codec whose property answers come from the
// input, a fuzzed configuration, first frame and frames, silence-frame requests and allocation
// failures. The codec reads every byte it is handed; nothing may leak.
#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <vector>

#include <vorcal/audio_tools.h>
#include <vorcal/core.h>
#include <vorcal/wrapper.h>

#include "fuzz_sal.hpp"

namespace {

constexpr uint32_t kProperties[3] = {CAL_PROP_AMR_FRAME_TYPE_LOCK, CAL_PROP_STREAM_PARAMETERS,
                                     CAL_PROP_AAC_SILENCE_FRAMES};
constexpr uint32_t kOTIs[8] = {CAL_OTI_AAC,       CAL_OTI_AAC_SBR, CAL_OTI_MPEG2_AAC, CAL_OTI_AMR_NB,
                               CAL_OTI_NB_SPEECH, CAL_OTI_AMR_WB,  CAL_OTI_DRA,       CAL_OTI_H264};
uint32_t g_answers[3];
uint8_t g_answered; // bit per property: answered at all
volatile uint32_t g_sink;

int32_t Touch(const uint8_t *p, int64_t n)
{
    for (int64_t i = 0; p && i < n; ++i)
        g_sink = g_sink + p[i];
    return 0;
}

int32_t GetProperty(uint32_t uProperty, uint32_t *puValue)
{
    const size_t i = std::find(kProperties, kProperties + 3, uProperty) - kProperties;
    if (i == 3 || !((g_answered >> i) & 1))
        return -1;
    *puValue = g_answers[i];
    return 0;
}

int32_t Init(CALParam, const uint8_t *pConfig, int32_t iConfigLen, const uint8_t *pFrame, uint32_t uFrameLen,
             uint32_t *, uint32_t *, uint32_t *, uint32_t *, CALParam *ppUserData)
{
    *ppUserData = 0x1234;
    return Touch(pConfig, iConfigLen) + Touch(pFrame, uFrameLen);
}

int32_t Decode(const uint8_t *pData, int32_t iLen, CALParam, CALParam, CALParam, CALParam, CALParam)
{
    return Touch(pData, iLen);
}

int32_t UserDataSlot(CALParam) { return 0; }

// A buffer of exactly the fuzzed length (null when empty), so that over-reads are caught.
struct Bytes : std::vector<uint8_t> {
    explicit Bytes(vorcal::fuzz::Input &in) : std::vector<uint8_t>(in.Byte() % 72)
    {
        std::generate(begin(), end(), [&in] { return in.Byte(); });
    }
    const uint8_t *Data() const { return empty() ? nullptr : data(); }
};

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const size_t uLiveBefore = vorcal::fuzz::LiveBlocks();
    const uint8_t uOptions = in.Byte();
    g_answered = in.Byte();
    for (uint32_t &uAnswer : g_answers)
        uAnswer = in.Byte() % 4; // small, so that the meaningful answers 0 and 1 come up often
    vorcal::fuzz::FailAllocation(in.Byte() % 8);

    CALHandle *hCAL = vorCAL_GetHandle(0, 1, 1);
    const CALAudioDecoderFunctions table = {GetProperty, Init, UserDataSlot, Decode, UserDataSlot, nullptr};
    vorCAL_RegisterCodec(hCAL, 2, 0, kOTIs[uOptions & 7], &table, sizeof table);
    CALCodec *hCodec = vorCAL_GetCodec(hCAL, 2, 0, kOTIs[uOptions & 7]);
    uint32_t out[4] = {};
    for (int iInit = 0; iInit < 1 + (uOptions >> 6); ++iInit) {
        const Bytes config(in), first(in);
        vorCAL_AudioDecoderInit(hCodec, 0, config.Data(), int32_t(config.size()), first.Data(), uint32_t(first.size()),
                                &out[0], &out[1], &out[2], &out[3], 0);
    }
    while (in.RestSize() > 0) {
        const uint8_t uOp = in.Byte();
        if (uOp < 0x20) {
            vorcal::fuzz::FailAllocation(uOp % 3);
            const uint8_t *pFrame = nullptr;
            uint32_t uLen = 0;
            if (vorCALTools_GetSilenceFrame(hCodec, in.U32() % 100000, in.Byte() % 4, 0, in.Byte() & 1, &pFrame,
                                            &uLen) == 0)
                Touch(pFrame, uLen);
        } else {
            const Bytes frame(in);
            vorCAL_AudioDecoderDecode(hCodec, frame.Data(), int32_t(frame.size()), 0, 0, 0, 0);
        }
    }
    vorCAL_AudioDecoderDeinit(hCodec);
    vorCAL_ReleaseCodec(hCodec);
    vorCAL_ReleaseHandle(hCAL);
    vorcal::fuzz::FailAllocation(0);
    if (vorcal::fuzz::LiveBlocks() != uLiveBefore)
        std::abort();
    return 0;
}
