// The ADTS header of silence frames and of AAC type detection (ISO/IEC 13818-7 adts_fixed_header
// and adts_variable_header): profile 2, buffer fullness 0x7CF.
#include <vorcal/audio_tools.h>

#include "core/sal.hpp"
#include "aacparse/syntax.hpp"

namespace {

// CONTRACT: the caller zeroes the header; each field is added into its byte (modulo 256), so
// a header that is not zero gets sums.
void AddTo(uint8_t *pHeader, int i, uint32_t uValue) noexcept
{
    pHeader[i] = static_cast<uint8_t>(pHeader[i] + uValue);
}

} // namespace

extern "C" int32_t mute_get_samplerate_idx(int32_t iSamplingRate)
{
    return iSamplingRate < 0 ? -1 : vorcal::aac::IndexOfRate(static_cast<uint32_t>(iSamplingRate));
}

extern "C" int32_t AAC_MakeADTS(uint8_t *pHeader, int32_t uSamplingRate, uint32_t uChannels,
                                int32_t uMode, uint32_t uRawLen)
{
    // CONTRACT: traced, and the first three bytes written, before any argument is checked.
    VORCAL_TRACE(vorcal::kTraceAudio, 2, "AAC_MakeADTS() : %u, %u, %u, %u\n",
                 static_cast<unsigned>(uSamplingRate), uChannels, static_cast<unsigned>(uMode),
                 uRawLen);
    AddTo(pHeader, 0, 0xFF);
    AddTo(pHeader, 1, 0xF9); // syncword end, ID 1 (MPEG-2), layer 0, protection_absent 1
    AddTo(pHeader, 2, 0x80); // profile 2
    if (uSamplingRate < 8000 || uSamplingRate > 96000)
        return -1;
    int32_t iRate = uSamplingRate;
    if (uMode > 1)
        iRate >>= 1; // SBR modes carry the core rate
    const int32_t iIndex = mute_get_samplerate_idx(iRate);
    if (iIndex == -1)
        return -1;
    AddTo(pHeader, 2, (static_cast<uint32_t>(iIndex) << 2) & 0x3C);
    if ((uMode == 0 || uMode == 2) && uChannels == 2)
        return -1; // single-channel templates
    if (uMode != 4) {
        AddTo(pHeader, 2, (uChannels >> 2) & 1);
        AddTo(pHeader, 3, (uChannels << 6) & 0xFF);
    } else {
        AddTo(pHeader, 3, 0x40); // parametric stereo: channel configuration 1
    }
    const uint32_t uFrameLen = uRawLen + vorcal::aac::kAdtsHeaderSize;
    AddTo(pHeader, 3, (uFrameLen >> 11) & 3);
    AddTo(pHeader, 4, (uFrameLen >> 3) & 0xFF);
    AddTo(pHeader, 5, 0x1F + ((uFrameLen << 5) & 0xFF));
    AddTo(pHeader, 6, 0x3C);
    return 0;
}
