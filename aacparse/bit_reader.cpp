// The parse-only bit reader (ISO/IEC 14496-3 bit order: most significant bit first). It keeps
// no end bound by design: the callers of the parse-only decoder pass buffers with slack.
#include <array>

#include <vorcal/aacparse.h>

namespace {

// Entry k is 2^k - 1.
constexpr std::array<uint32_t, 33> kMask = [] {
    std::array<uint32_t, 33> mask{};
    for (uint32_t k = 0; k < 32; ++k)
        mask[k] = (1u << k) - 1u;
    mask[32] = 0xFFFFFFFFu;
    return mask;
}();
static_assert(kMask[0] == 0 && kMask[1] == 1 && kMask[25] == 0x1FFFFFF && kMask[32] == 0xFFFFFFFF);

void Advance(VrBitReader_OnlyParsing *pBits, uint32_t n)
{
    const uint32_t uTotal = pBits->uBitPos + n;
    pBits->pCurrent += uTotal >> 3;
    pBits->uBitPos = uTotal & 7;
    pBits->uProcessedBits += n;
}

uint32_t Wide(const VrBitReader_OnlyParsing *pBits, uint32_t n)
{
    const uint8_t *p = pBits->pCurrent;
    const uint32_t uWord = (uint32_t{p[0]} << 24) | (uint32_t{p[1]} << 16) | (uint32_t{p[2]} << 8) | p[3];
    const uint32_t uKept = uWord & kMask[32 - pBits->uBitPos];
    // Shift count 32 - p - n outside 0..31 gives 0 (n = 0 at position 0, or n beyond the word).
    const int64_t iShift = int64_t{32} - pBits->uBitPos - n;
    return (iShift < 0 || iShift > 31) ? 0u : uKept >> iShift;
}

} // namespace

extern "C" void VrInitBits_OnlyParsing(VrBitReader_OnlyParsing *pBits, const uint8_t *pBuffer)
{
    pBits->pCurrent = pBuffer;
    pBits->uBitPos = 0;
    pBits->uProcessedBits = 0;
    pBits->uBookmarkSet = 0;
}

extern "C" uint32_t VrShowBits_OnlyParsing(VrBitReader_OnlyParsing *pBits, uint32_t n)
{
    return Wide(pBits, n);
}

extern "C" uint32_t VrGetBits_OnlyParsing(VrBitReader_OnlyParsing *pBits, uint32_t n)
{
    const uint32_t uValue = Wide(pBits, n);
    Advance(pBits, n);
    return uValue;
}

extern "C" void VrFlushBits_OnlyParsing(VrBitReader_OnlyParsing *pBits, uint32_t n)
{
    Advance(pBits, n);
}

extern "C" uint32_t VrGetBitsFast_OnlyParsing(VrBitReader_OnlyParsing *pBits, uint32_t n)
{
    const uint32_t p = pBits->uBitPos;
    const uint32_t uEight = ((uint32_t{pBits->pCurrent[0]} << p) & 0xFF) | ((uint32_t{pBits->pCurrent[1]} << p) >> 8);
    const uint32_t uValue = n < 32 ? (uEight << n) >> 8 : 0u;
    Advance(pBits, n);
    return uValue;
}

extern "C" uint32_t VrGet1Bit_OnlyParsing(VrBitReader_OnlyParsing *pBits)
{
    const uint32_t uBit = ((uint32_t{pBits->pCurrent[0]} << pBits->uBitPos) & 0xFF) >> 7;
    Advance(pBits, 1);
    return uBit;
}

extern "C" void VrBookMark_OnlyParsing(VrBitReader_OnlyParsing *pBits, uint32_t uSet)
{
    if (uSet) {
        pBits->pSavedCurrent = pBits->pCurrent;
        pBits->uSavedBitPos = pBits->uBitPos;
        pBits->uSavedProcessedBits = pBits->uProcessedBits;
        pBits->uBookmarkSet = 1;
    } else {
        pBits->pCurrent = pBits->pSavedCurrent;
        pBits->uBitPos = pBits->uSavedBitPos;
        pBits->uProcessedBits = pBits->uSavedProcessedBits;
        pBits->uBookmarkSet = 0;
    }
}

extern "C" uint32_t VrGetProcessedBits_OnlyParsing(VrBitReader_OnlyParsing *pBits)
{
    return pBits->uProcessedBits;
}

extern "C" int32_t VrByteAlign_OnlyParsing(VrBitReader_OnlyParsing *pBits)
{
    int32_t iSkipped = 0;
    while (pBits->uBitPos != 0) {
        VrGet1Bit_OnlyParsing(pBits);
        ++iSkipped;
    }
    return iSkipped;
}

extern "C" uint32_t get_samplerate_idxOnlyParsing(uint32_t uSampleRate)
{
    switch (uSampleRate) {
    case 96000: return 0;
    case 88200: return 1;
    case 64000: return 2;
    case 48000: return 3;
    case 32000: return 5;
    case 24000: return 6;
    case 22050: return 7;
    case 16000: return 8;
    case 12000: return 9;
    case 11025: return 10;
    case 8000: return 11;
    default: return 4; // 44100 and every unknown rate
    }
}
