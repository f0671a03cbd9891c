// AAC type detection: wraps one raw data block in an ADTS header and asks the parse-only
// decoder whether it carries SBR.
#include <cstring>

#include <vorcal/aacparse.h>
#include <vorcal/audio_tools.h>

#include "aacparse/syntax.hpp"
#include "core/sal.hpp"
#include "tools/aac_type.hpp"

namespace vorcal::tools::aac {
namespace {

using vorcal::aac::kAdtsHeaderSize;

// VrAACSBRInfo reads 10 bytes of a header without CRC: frames under 2 bytes get extra zeros.
constexpr uint32_t kMinDetectBytes = 10;

} // namespace

bool DetectSbr(int32_t iSamplingRate, uint32_t uChannels, const uint8_t *pFrame, uint32_t uFrameLen,
               uint32_t &uSBR) noexcept
{
    if (uFrameLen > UINT32_MAX - (kAdtsHeaderSize + 1))
        return false; // no buffer of that size can exist
    // CONTRACT: one byte more than header and frame, zeroed, as the allocation size shows.
    uint32_t uSize = uFrameLen + kAdtsHeaderSize + 1;
    if (uSize < kMinDetectBytes)
        uSize = kMinDetectBytes;
    auto *pBuf = static_cast<uint8_t *>(sal::Alloc(uSize));
    if (!pBuf)
        return false;
    std::memset(pBuf, 0, uSize);
    const auto iMode = static_cast<int32_t>(uChannels - 1);
    if (AAC_MakeADTS(pBuf, iSamplingRate, uChannels, iMode, uFrameLen) != 0) {
        sal::Free(pBuf);
        return false;
    }
    std::memcpy(pBuf + kAdtsHeaderSize, pFrame, uFrameLen);
    uint32_t uRate = 0, uChannelConfig = 0, uBitsAligned = 0, uHeaderBits = 0;
    uSBR = 0;
    VrAACSBRInfo(pBuf, uSize, &uRate, &uChannelConfig, &uSBR, &uBitsAligned, &uHeaderBits);
    sal::Free(pBuf);
    // CONTRACT: the source line in the trace is the fixed number 562.
    VORCAL_TRACE(kTraceAudio, 1, "[CAL_Tools %d] vorCALTools_GetAACType() : %u, %u, %u, %u, %u\n",
                 562, uRate, uChannelConfig, uSBR, uBitsAligned, uHeaderBits);
    return true;
}

} // namespace vorcal::tools::aac
