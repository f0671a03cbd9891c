// Helpers shared by the silence-frame and audio adaptation tests.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include <vorcal/core.h>
#include <vorcal/vorsal.h>
#include <vorcal/wrapper.h>

#include "recording_codec.hpp"
#include "recording_sal.hpp"

namespace vorcal::test {

// True when exactly one level-0 trace of the category reads text ('#' for a line number), its
// format being the text with every number (and '#') written as %d.
inline bool HasNumberedTrace(int32_t iCategory, const std::string &text)
{
    std::string format;
    bool bInNumber = false;
    for (char c : text) {
        const bool bDigit = c == '#' || (c >= '0' && c <= '9');
        if (!bDigit || !bInNumber)
            format += bDigit ? std::string("%d") : std::string(1, c);
        bInNumber = bDigit;
    }
    return HasTrace(iCategory, 0, format, text);
}

// Copies a generated frame and returns it to the memory table.
inline std::vector<uint8_t> TakeFrame(uint8_t *pFrame, uint32_t uLen)
{
    std::vector<uint8_t> bytes(pFrame, pFrame + uLen);
    g_vorSALMemoryTable->Free(pFrame);
    return bytes;
}

// An audio decoder instance of the recording codec under one OTI, released at scope end.
struct AudioInstance {
    explicit AudioInstance(uint32_t uOTI)
    {
        RecordingCodec::Get().Reset();
        hCAL = vorCAL_GetHandle(0, 1, 1);
        const CALAudioDecoderFunctions table = RecordingCodec::AudioDecoder();
        vorCAL_RegisterCodec(hCAL, 2, 0, uOTI, &table, sizeof table);
        hCodec = vorCAL_GetCodec(hCAL, 2, 0, uOTI);
    }
    ~AudioInstance()
    {
        vorCAL_ReleaseCodec(hCodec);
        vorCAL_ReleaseHandle(hCAL);
    }
    CALCodec *get() const { return hCodec; }
    CALCodec *operator->() const { return hCodec; }

    CALHandle *hCAL = nullptr;
    CALCodec *hCodec = nullptr;
};

} // namespace vorcal::test
