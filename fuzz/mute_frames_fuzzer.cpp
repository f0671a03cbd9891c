// The silence-frame generators with arguments from the input, allocation failure included. A
// failed call stores nothing; every frame returned is read and freed; nothing may leak.
#include <cstdint>
#include <cstdlib>

#include <vorcal/audio_tools.h>
#include <vorcal/vorsal.h>

#include "fuzz_sal.hpp"

namespace {

constexpr uint32_t kRates[16] = {96000, 88200, 64000, 48000, 44100, 32000, 24000, 22050,
                                 16000, 12000, 11025, 8000,  7350,  50000, 96001, 7999};
volatile uint32_t g_sink;

void Check(bool bOk)
{
    if (!bOk)
        std::abort();
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const size_t uLiveBefore = vorcal::fuzz::LiveBlocks();
    while (in.RestSize() > 0) {
        vorcal::fuzz::FailAllocation(in.Byte() % 3); // 0: none, 1: the next one, 2: the one after
        const uint8_t uOp = in.Byte();
        // Mostly a small value or a rate worth testing, sometimes any 32-bit value.
        const uint32_t uArg = (uOp & 0x80) ? in.U32() : in.Byte(), uChannels = in.Byte() % 9;
        const uint32_t uRate = uArg < 256 ? kRates[uArg % 16] : uArg, uFT = uArg < 256 ? uArg % 10 : uArg;
        const int32_t iMode = static_cast<int8_t>(in.Byte()) % 7;
        uint8_t sentinel = 0, *pFrame = &sentinel, header[7] = {};
        uint32_t uLen = 0;
        int32_t iResult = -1;
        switch (uOp % 6) {
        case 0: iResult = AMRNB_MuteFrame(&pFrame, &uLen, uFT); break;
        case 1: iResult = AMRWB_MuteFrame(&pFrame, &uLen, uFT); break;
        case 2: iResult = DRA_MuteFrame(&pFrame, &uLen, uRate, uChannels % 4); break;
        case 3: iResult = AAC_MuteFrame(&pFrame, &uLen, in.U32(), uRate, uChannels, uChannels & 1, iMode); break;
        case 4: AAC_MakeADTS(header, static_cast<int32_t>(uRate), uChannels, iMode, uArg); break;
        default: Check(mute_get_samplerate_idx(static_cast<int32_t>(uArg)) < 12); break;
        }
        Check(iResult == 0 || pFrame == &sentinel);
        for (uint32_t i = 0; iResult == 0 && i < uLen; ++i)
            g_sink = g_sink + pFrame[i];
        if (iResult == 0)
            g_vorSALMemoryTable->Free(pFrame);
    }
    vorcal::fuzz::FailAllocation(0);
    Check(vorcal::fuzz::LiveBlocks() == uLiveBefore);
    return 0;
}
