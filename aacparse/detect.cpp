// The detection entry of the parse-only decoder: resets the one static decoder state and
// parses the ADTS header of a frame. CONTRACT: the raw data block is not read, so SBR is never
// reported.
#include <cstring>

#include "aacparse/decoder.hpp"

// C linkage from their declarations in aacparse.h. Plain data without a lock: callers serialise
// VrAACSBRInfo.
VrAACDecoder_OnlyParsing hhDecoder;
VrAACDecoder_OnlyParsing *hDecoder;

namespace vorcal::aacparse {
namespace {

constexpr uint32_t kNoSync = 9;
constexpr uint32_t kProfileLC = 1;    // ADTS profile 1: AAC LC
constexpr uint32_t kIndex44100 = static_cast<uint32_t>(aac::IndexOfRate(44100));

} // namespace

void ResetDecoder(VrAACDecoder_OnlyParsing &dec)
{
    std::memset(&dec, 0, sizeof dec);
    dec.uResetOne[0] = 1;
    dec.uResetOne[1] = 1;
    dec.iSelectedTag = -1;
    dec.MCInfo.uSampleRateIdx = kIndex44100;
    dec.uResetZero[0] = 0;
    dec.uResetZero[1] = 0;
    dec.uFixedHeaderKnown = 0;
    dec.uMPEG4 = 1;
    dec.uImplicitConfig = 1;
    dec.MCInfo.uProfile = kProfileLC;
    dec.uImplicitCPE = 0;
}

namespace {

void Reset()
{
    hDecoder = &hhDecoder;
    ResetDecoder(hhDecoder);
}

uint32_t SbrInfo(const uint8_t *pBuf, uint32_t *pSampleRate, uint32_t *pChannels, uint32_t *pSBR,
                 uint32_t *pBitsAligned, uint32_t *pHeaderBits)
{
    Reset();
    if (!pBuf || !aac::IsAdtsSync(pBuf))
        return kNoSync;
    // Null outputs go to locals instead of being written through.
    uint32_t uSink[5] = {};
    uint32_t uFrameSamples = 0; // channel_configuration x 1024, not reported
    return static_cast<uint32_t>(VrAACDecInitOnlyParsing(
        hDecoder, pBuf, pSampleRate ? pSampleRate : &uSink[0], pChannels ? pChannels : &uSink[1],
        &uFrameSamples, pSBR ? pSBR : &uSink[2], pBitsAligned ? pBitsAligned : &uSink[3],
        pHeaderBits ? pHeaderBits : &uSink[4]));
}

} // namespace
} // namespace vorcal::aacparse

extern "C" uint32_t VrAACSBRInfo(const uint8_t *buf, uint32_t /*len*/, uint32_t *pSampleRate,
                                 uint32_t *pChannels, uint32_t *pSBR, uint32_t *pBitsAligned,
                                 uint32_t *pHeaderBits)
{
    return vorcal::aacparse::SbrInfo(buf, pSampleRate, pChannels, pSBR, pBitsAligned, pHeaderBits);
}
