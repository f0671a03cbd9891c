// H.264 framing: format test, start-code search, length-prefixed walk and the end of the
// first picture of a start-code framed buffer.
#include <vorcal/video_tools.h>

#include "tools/avc_nal.hpp"
#include "tools/bit_reader.hpp"

namespace vorcal::tools::avc {
namespace {

int32_t CheckFormat(const uint8_t *pData, int32_t iLen) noexcept
{
    if (iLen < 4 || pData == nullptr)
        return CAL_AVC_FORMAT_UNDETERMINED;
    return nal::StartCodeLengthAt(pData, iLen, 0) != 0 ? CAL_AVC_FORMAT_ANNEXB : CAL_AVC_FORMAT_NAL;
}

int32_t FindStartCode(const uint8_t *pData, int32_t iLen) noexcept
{
    if (iLen < 4 || pData == nullptr)
        return -1;
    const size_t uLen = static_cast<size_t>(iLen);
    const size_t uCode = nal::FindCode(pData, 0, uLen - 3, uLen);
    return uCode == nal::kNotFound ? -1 : static_cast<int32_t>(uCode);
}

// _NEXT_NAL_: the documented -1 for every way out of the walk.
int32_t NextNal(const uint8_t *pBuf, int32_t iLen, int32_t iPos, int32_t iSize) noexcept
{
    if (pBuf == nullptr || !nal::ValidLengthSize(iSize) || iPos < 0 || iPos >= iLen)
        return -1;
    const size_t uNext = nal::NextLengthField(pBuf, static_cast<size_t>(iLen), static_cast<size_t>(iPos), iSize);
    return uNext == nal::kNotFound ? -1 : static_cast<int32_t>(uNext);
}

// The code in the position of frame_num (fourth ue(v) after the NAL header), read from the
// four bytes after the header: what tells two pictures apart here.
uint32_t SliceKey(const uint8_t *pData, int32_t iLen, int32_t iAt) noexcept
{
    const int32_t iAvail = iLen - iAt;
    CALToolsBS reader;
    bs::Init(reader, pData + iAt, static_cast<uint32_t>(iAvail < 4 ? (iAvail > 0 ? iAvail : 0) : 4));
    uint32_t uKey = 0;
    for (int i = 0; i < 4; ++i)
        uKey = bs::ReadUE(reader);
    return uKey;
}

int32_t GetOneFrame(const uint8_t *pData, int32_t iLen) noexcept
{
    if (iLen <= 5 || pData == nullptr || nal::StartCodeLengthAt(pData, iLen, 0) == 0)
        return iLen;
    const size_t uLen = static_cast<size_t>(iLen);
    const size_t uLimit = uLen - 5; // a code begins below length - 5
    uint32_t uPrevious = 0xFFFFFFFFu;
    bool bHavePrevious = false;
    size_t p = 0;
    for (;;) {
        p = nal::FindCode(pData, p, uLimit, uLen);
        if (p == nal::kNotFound)
            return iLen;
        const int32_t s = nal::StartCodeLengthAt(pData, iLen, static_cast<int64_t>(p));
        const uint32_t t = NalType(pData[p + s]);
        if (t == kNalSliceNonIdr || t == kNalPartitionA || t == kNalSliceIdr || t == kNalAuxSlice) {
            const uint32_t uKey = SliceKey(pData, iLen, static_cast<int32_t>(p + s + 1));
            if ((bHavePrevious && uKey != uPrevious) || uKey == 0xFFFFFFFFu)
                return static_cast<int32_t>(p);
            uPrevious = uKey;
            bHavePrevious = true;
        }
        p += s;
    }
}

} // namespace
} // namespace vorcal::tools::avc

namespace avc = vorcal::tools::avc;

extern "C" int32_t vorCALTools_AVC_CheckFormat(const uint8_t *pData, int32_t iLen)
{
    return avc::CheckFormat(pData, iLen);
}

extern "C" int32_t vorCALTools_AVC_FindStartCode(const uint8_t *pData, int32_t iLen)
{
    return avc::FindStartCode(pData, iLen);
}

extern "C" int32_t _NEXT_NAL_(const uint8_t *pBuf, int32_t iLen, int32_t iPos, int32_t iNALLengthSize)
{
    return avc::NextNal(pBuf, iLen, iPos, iNALLengthSize);
}

extern "C" int32_t vorCALTools_AVC_GetOneFrame(const uint8_t *pData, int32_t iLen)
{
    return avc::GetOneFrame(pData, iLen);
}
