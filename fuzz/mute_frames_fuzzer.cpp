// The silence-frame generators with arguments from the input, allocation failure included.
// Every frame returned is checked and freed; nothing may leak.
#include <cstdint>
#include <cstdlib>

#include <vorcal/audio_tools.h>
#include <vorcal/vorsal.h>

#include "fuzz_sal.hpp"

namespace {

constexpr int32_t kRates[16] = {96000, 88200, 64000, 48000, 44100, 32000, 24000, 22050,
                                16000, 12000, 11025, 8000,  7350,  50000, 96001, 7999};

// Mostly a rate worth testing, sometimes any 32-bit value.
uint32_t Rate(vorcal::fuzz::Input &in)
{
    const uint8_t uPick = in.Byte();
    return uPick < 240 ? static_cast<uint32_t>(kRates[uPick % 16]) : in.U32();
}

void Check(bool bOk)
{
    if (!bOk)
        std::abort();
}

// A successful call hands out one buffer of the stated length; a failed one touches nothing.
void Consume(int32_t iResult, uint8_t *pFrame, uint32_t uLen, uint8_t *pSentinel)
{
    Check(iResult == 0 || iResult == -1);
    if (iResult != 0) {
        Check(pFrame == pSentinel);
        return;
    }
    Check(pFrame && uLen > 0);
    volatile uint32_t uSum = 0;
    for (uint32_t i = 0; i < uLen; ++i)
        uSum = uSum + pFrame[i];
    g_vorSALMemoryTable->Free(pFrame);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const size_t uLiveBefore = vorcal::fuzz::LiveBlocks();
    for (int iCall = 0; iCall < 8 && in.RestSize() > 0; ++iCall) {
        vorcal::fuzz::FailAllocation(in.Byte() % 3); // 0: none, 1: the next one, 2: the one after
        uint8_t sentinel = 0;
        uint8_t *pFrame = &sentinel;
        uint32_t uLen = 0;
        const uint8_t uOp = in.Byte();
        switch (uOp % 6) {
        case 0:
        case 1: {
            const bool bWide = (uOp % 6) == 1;
            const uint32_t uFT = in.Byte() < 200 ? in.Byte() % 10 : in.U32();
            const int32_t iResult = (bWide ? AMRWB_MuteFrame : AMRNB_MuteFrame)(&pFrame, &uLen, uFT);
            Check(iResult != 0 || uFT < (bWide ? 9u : 8u));
            Consume(iResult, pFrame, uLen, &sentinel);
            break;
        }
        case 2: {
            const uint32_t uRate = Rate(in);
            const uint32_t uChannels = in.Byte() % 4;
            const int32_t iResult = DRA_MuteFrame(&pFrame, &uLen, uRate, uChannels);
            Consume(iResult, pFrame, uLen, &sentinel);
            break;
        }
        case 3: {
            const uint32_t uRate = Rate(in);
            const uint32_t uChannels = in.Byte() % 9;
            const uint32_t bADTS = in.Byte() & 1;
            const int32_t iMode = static_cast<int8_t>(in.Byte()) % 7;
            const int32_t iResult = AAC_MuteFrame(&pFrame, &uLen, in.U32(), uRate, uChannels, bADTS, iMode);
            // A frame behind a header is exactly one ADTS frame.
            if (iResult == 0 && bADTS)
                Check(vorCALTools_AAC_isADTSAAC(static_cast<int32_t>(uLen), pFrame) == 7);
            Consume(iResult, pFrame, uLen, &sentinel);
            break;
        }
        case 4: {
            uint8_t header[7] = {};
            const int32_t iRate = static_cast<int32_t>(Rate(in));
            const uint32_t uChannels = in.Byte();
            const int32_t iMode = static_cast<int32_t>(in.U32());
            const uint32_t uRawLen = in.U32();
            if (AAC_MakeADTS(header, iRate, uChannels, iMode, uRawLen) == 0)
                Check(_GetAACFrameLength(header) == ((uRawLen + 7) & 0x1FFF));
            break;
        }
        default:
            Check(mute_get_samplerate_idx(static_cast<int32_t>(in.U32())) < 12);
            break;
        }
    }
    vorcal::fuzz::FailAllocation(0);
    Check(vorcal::fuzz::LiveBlocks() == uLiveBefore);
    return 0;
}
