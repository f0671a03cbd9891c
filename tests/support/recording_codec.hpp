// A recording codec for tests: one set of slot functions per codec kind that record every call
// (slot, arguments, user data, the bytes received) and answer chosen properties and results.
#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <utility>
#include <vector>

#include <vorcal/wrapper.h>

namespace vorcal::test {

struct CodecCall {
    int iSlot = -1;
    std::vector<CALParam> args;  // every argument as passed, in order
    CALParam userDataAtCall = 0; // *ppUserData on entry (Init-like slots)
    std::vector<uint8_t> data;   // bytes of the frame or configuration received
    std::vector<uint8_t> data2;  // bytes of the enhancement configuration (video Init)
};

class RecordingCodec {
public:
    static RecordingCodec &Get();
    void Reset();

    // GetProperty answers uValue with result iResult for uProperty; other properties return -1
    // and leave the value word alone.
    void Answer(uint32_t uProperty, uint32_t uValue, int32_t iResult = 0)
    {
        properties[uProperty] = {iResult, uValue};
    }

    std::map<uint32_t, std::pair<int32_t, uint32_t>> properties;
    std::vector<uint32_t> propertyQueries;
    int32_t results[CAL_CODEC_FUNCTION_SLOTS] = {0, 0, 0, 0, 0, 0};
    // Init-like slots write this through ppUserData when set.
    bool writeUserData = false;
    CALParam userDataToWrite = 0;
    // Values the video Init writes to width/height/pitch and the audio Init to its four outputs.
    bool writeOutputs = false;
    uint32_t outputs[4] = {0, 0, 0, 0};
    std::vector<CodecCall> calls;

    size_t Count(int iSlot) const;
    const CodecCall *Last(int iSlot) const;

    static CALVideoDecoderFunctions VideoDecoder();
    static CALAudioDecoderFunctions AudioDecoder();
    static CALImageDecoderFunctions ImageDecoder();
    static CALTextDecoderFunctions TextDecoder();
    static CALVideoEncoderFunctions VideoEncoder();
};

// Turns any pointer into the CALParam recorded for it.
template <typename T>
inline CALParam P(T *p)
{
    return reinterpret_cast<CALParam>(p);
}

} // namespace vorcal::test
