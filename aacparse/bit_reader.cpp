// The parse-only bit reader (ISO/IEC 14496-3 bit order: most significant bit first).
// CONTRACT: it keeps no end bound; the callers of the parse-only decoder pass buffers with
// slack.
#include <vorcal/aacparse.h>

#include "aacparse/reader.hpp"

using namespace vorcal::aacparse;

extern "C" void VrInitBits_OnlyParsing(VrBitReader_OnlyParsing *pBits, const uint8_t *pBuffer)
{
    pBits->pCurrent = pBuffer;
    pBits->uBitPos = 0;
    pBits->uProcessedBits = 0;
    pBits->uBookmarkSet = 0;
}

extern "C" uint32_t VrShowBits_OnlyParsing(VrBitReader_OnlyParsing *pBits, uint32_t n)
{
    return bits::Show(*pBits, n);
}

extern "C" uint32_t VrGetBits_OnlyParsing(VrBitReader_OnlyParsing *pBits, uint32_t n)
{
    return bits::Get(*pBits, n);
}

extern "C" void VrFlushBits_OnlyParsing(VrBitReader_OnlyParsing *pBits, uint32_t n)
{
    bits::Advance(*pBits, n);
}

extern "C" uint32_t VrGetBitsFast_OnlyParsing(VrBitReader_OnlyParsing *pBits, uint32_t n)
{
    return bits::GetFast(*pBits, n);
}

extern "C" uint32_t VrGet1Bit_OnlyParsing(VrBitReader_OnlyParsing *pBits)
{
    return bits::Get1(*pBits);
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
    return bits::ByteAlign(*pBits);
}
