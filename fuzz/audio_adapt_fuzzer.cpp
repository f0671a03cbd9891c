// The audio decoder adaptation through a handle: a codec whose property answers come from the
// input, a fuzzed configuration, first frame and frames, silence-frame requests and allocation
// failures. The codec reads every byte it is handed; nothing may leak.
#include <cstdint>
#include <cstdlib>
#include <vector>

#include <vorcal/audio_tools.h>
#include <vorcal/core.h>
#include <vorcal/wrapper.h>

#include "fuzz_sal.hpp"

namespace {

struct Answers {
    uint32_t uLock;     // property 113
    uint32_t uParams;   // property 3
    uint32_t uSilence;  // property 114
    uint8_t uAnswered;  // bit per property: answered at all
} g_answers;

volatile uint32_t g_sink;

void Touch(const uint8_t *p, int64_t n)
{
    for (int64_t i = 0; i < n; ++i)
        g_sink = g_sink + p[i];
}

int32_t GetProperty(uint32_t uProperty, uint32_t *puValue)
{
    switch (uProperty) {
    case CAL_PROP_AMR_FRAME_TYPE_LOCK:
        if (!(g_answers.uAnswered & 1))
            return -1;
        *puValue = g_answers.uLock;
        return 0;
    case CAL_PROP_STREAM_PARAMETERS:
        if (!(g_answers.uAnswered & 2))
            return -1;
        *puValue = g_answers.uParams;
        return 0;
    case CAL_PROP_AAC_SILENCE_FRAMES:
        if (!(g_answers.uAnswered & 4))
            return -1;
        *puValue = g_answers.uSilence;
        return 0;
    default:
        return -1;
    }
}

int32_t Init(CALParam, const uint8_t *pConfig, int32_t iConfigLen, const uint8_t *pFrame, uint32_t uFrameLen,
             uint32_t *puSamplingRate, uint32_t *puNumOfChannels, uint32_t *puBitsPerSample,
             uint32_t *puSamplesPerFrame, CALParam *ppUserData)
{
    if (pConfig)
        Touch(pConfig, iConfigLen);
    if (pFrame)
        Touch(pFrame, uFrameLen);
    *puSamplingRate = *puNumOfChannels = *puBitsPerSample = *puSamplesPerFrame = 0;
    *ppUserData = 0x1234;
    return 0;
}

int32_t Decode(const uint8_t *pData, int32_t iLen, CALParam, CALParam, CALParam, CALParam, CALParam)
{
    if (pData)
        Touch(pData, iLen);
    return 0;
}

int32_t UserDataSlot(CALParam) { return 0; }

constexpr uint32_t kOTIs[8] = {CAL_OTI_AAC, CAL_OTI_AAC_SBR, CAL_OTI_MPEG2_AAC, CAL_OTI_AMR_NB,
                               CAL_OTI_NB_SPEECH, CAL_OTI_AMR_WB, CAL_OTI_DRA, CAL_OTI_H264};

// A buffer of exactly the fuzzed length, so that over-reads are caught.
std::vector<uint8_t> Bytes(vorcal::fuzz::Input &in)
{
    const size_t uLen = in.Byte() % 72;
    std::vector<uint8_t> bytes;
    for (size_t i = 0; i < uLen && in.RestSize() > 0; ++i)
        bytes.push_back(in.Byte());
    return bytes;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const size_t uLiveBefore = vorcal::fuzz::LiveBlocks();
    const uint8_t uOptions = in.Byte();
    const uint32_t uOTI = kOTIs[uOptions & 7];
    g_answers.uAnswered = in.Byte();
    // Small values mostly, so that the meaningful answers (0, 1) come up often.
    g_answers.uLock = in.Byte() % 4;
    g_answers.uParams = in.Byte() % 4;
    g_answers.uSilence = in.Byte() % 4;
    vorcal::fuzz::FailAllocation(in.Byte() % 8);

    CALHandle *hCAL = vorCAL_GetHandle(0, 1, 1);
    CALAudioDecoderFunctions table = {GetProperty, Init, UserDataSlot, Decode, UserDataSlot, nullptr};
    vorCAL_RegisterCodec(hCAL, 2, 0, uOTI, &table, sizeof table);
    CALCodec *hCodec = vorCAL_GetCodec(hCAL, 2, 0, uOTI);

    uint32_t out[4] = {};
    for (int iInit = 0; iInit < 1 + (uOptions >> 6); ++iInit) {
        const std::vector<uint8_t> config = Bytes(in);
        const std::vector<uint8_t> first = Bytes(in);
        vorCAL_AudioDecoderInit(hCodec, 0, config.empty() ? nullptr : config.data(),
                                static_cast<int32_t>(config.size()), first.empty() ? nullptr : first.data(),
                                static_cast<uint32_t>(first.size()), &out[0], &out[1], &out[2], &out[3], 0);
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
            const std::vector<uint8_t> frame = Bytes(in);
            vorCAL_AudioDecoderDecode(hCodec, frame.empty() ? nullptr : frame.data(),
                                      static_cast<int32_t>(frame.size()), 0, 0, 0, 0);
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
