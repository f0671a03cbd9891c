// HEVC framing: the format test, the unit walks over frames (start codes or length fields) and
// over the arrays of an hvcC record, the nal_unit_type names, the IRAP test and the run of
// parameter sets in front of the first slice.
#include <cstddef>
#include <cstdint>

#include <vorcal/video_tools.h>

#include "tools/hevc_nal.hpp"

namespace vorcal::tools::hevc {
namespace {

void Describe(CALHEVCNAL &u, const uint8_t *p, size_t uStart, size_t uBody, size_t uUnit) noexcept
{
    u.pUnit = p + uBody;
    u.iLen = static_cast<int32_t>(uUnit);
    u.iStart = static_cast<int32_t>(uStart);
    u.uType = NalType(p[uBody]);
    u.uLayerId = LayerId(p[uBody], p[uBody + 1]);
    u.uTemporalIdPlus1 = p[uBody + 1] & 7u;
}

// Start-code data may begin with zero bytes (leading_zero_8bits): the first code begins at the
// last three of them, or the last four for 00 00 00 01.
size_t SkipLeadingZeros(const uint8_t *p, size_t uLen) noexcept
{
    size_t uPos = 0;
    while (uPos + 3 < uLen && p[uPos] == 0 && p[uPos + 1] == 0 && p[uPos + 2] == 0 && p[uPos + 3] == 0)
        ++uPos;
    return uPos;
}

// A unit runs from the byte after its start code to the next start code FindCode finds (a zero
// in front of 00 00 01 belongs to that code), less the zero bytes before it; units left empty
// are passed over. This is the split the frame conversion makes.
int32_t StepStartCodes(const uint8_t *p, size_t uLen, CALHEVCNAL &u) noexcept
{
    size_t uPos = u.iNext == 0 ? SkipLeadingZeros(p, uLen) : static_cast<size_t>(u.iNext);
    for (;;) {
        if (uPos >= uLen)
            return 0;
        const int32_t iCode = nal::StartCodeLengthAt(p, static_cast<int64_t>(uLen), static_cast<int64_t>(uPos));
        if (iCode == 0)
            return CAL_HEVC_ERR_MALFORMED;
        const size_t uBody = uPos + static_cast<size_t>(iCode);
        const size_t uNext = nal::ResolveCode(p, uBody, uLen - 3, nal::FindPrefix(p, uBody, uLen));
        const size_t uCodeStart = uNext == nal::kNotFound ? uLen : uNext;
        size_t uEnd = uCodeStart;
        while (uEnd > uBody && p[uEnd - 1] == 0)
            --uEnd;
        if (uEnd != uBody && uEnd - uBody < kHeaderBytes)
            return CAL_HEVC_ERR_MALFORMED;
        const size_t uStart = uPos;
        uPos = uCodeStart;
        u.iNext = static_cast<int32_t>(uPos);
        if (uEnd != uBody) {
            Describe(u, p, uStart, uBody, uEnd - uBody);
            return 1;
        }
    }
}

int32_t StepLengthFields(const uint8_t *p, size_t uLen, int32_t iSize, CALHEVCNAL &u) noexcept
{
    const size_t uPos = static_cast<size_t>(u.iNext);
    if (uPos >= uLen)
        return 0;
    const size_t uBody = uPos + static_cast<size_t>(iSize);
    if (uBody > uLen)
        return CAL_HEVC_ERR_TRUNCATED;
    const uint32_t uUnit = nal::ReadBE(p, static_cast<int64_t>(uLen), static_cast<int64_t>(uPos), iSize);
    if (uUnit > uLen - uBody)
        return CAL_HEVC_ERR_TRUNCATED;
    if (uUnit < kHeaderBytes)
        return CAL_HEVC_ERR_MALFORMED;
    Describe(u, p, uPos, uBody, uUnit);
    u.iNext = static_cast<int32_t>(uBody + uUnit);
    return 1;
}

int32_t CheckFormat(const uint8_t *p, int32_t iLen) noexcept
{
    if (p == nullptr || iLen < 4)
        return CAL_AVC_FORMAT_UNDETERMINED;
    const size_t uLen = static_cast<size_t>(iLen);
    const size_t uPos = SkipLeadingZeros(p, uLen);
    const size_t uCode = static_cast<size_t>(nal::StartCodeLengthAt(p, iLen, static_cast<int64_t>(uPos)));
    const size_t uHeader = uPos + uCode;
    const bool bAnnexB = uCode != 0 && uHeader + kHeaderBytes <= uLen && ValidHeader(p[uHeader], p[uHeader + 1]);
    return bAnnexB ? CAL_AVC_FORMAT_ANNEXB : CAL_AVC_FORMAT_NAL;
}

// The walk state a caller hands in must point inside the data.
bool ValidState(int32_t iLen, const CALHEVCNAL *pUnit) noexcept
{
    return pUnit != nullptr && pUnit->iNext >= 0 && pUnit->iNext <= iLen;
}

int32_t IsIrapFrame(const uint8_t *p, int32_t iLen, int32_t iSize) noexcept
{
    if (p == nullptr || iLen <= 0 || (iSize != 0 && !nal::ValidLengthSize(iSize)))
        return 0;
    CALHEVCNAL u{};
    while (StepUnits(p, static_cast<size_t>(iLen), iSize, u) == 1) {
        if (IsIrap(u.uType) && ValidHeader(u.pUnit[0], u.pUnit[1]))
            return 1;
    }
    return 0;
}

const uint8_t *ConfigStream(const uint8_t *p, int32_t iLen, int32_t iSize, int32_t *piConfigLen) noexcept
{
    if (piConfigLen != nullptr)
        *piConfigLen = 0;
    if (p == nullptr || iLen <= 0 || (iSize != 0 && !nal::ValidLengthSize(iSize)))
        return nullptr;
    auto Run = [&](int32_t iStart, int32_t iEnd) {
        if (piConfigLen != nullptr)
            *piConfigLen = iEnd - iStart;
        return p + iStart;
    };
    CALHEVCNAL u{};
    int32_t iRun = -1;
    for (;;) {
        const int32_t r = StepUnits(p, static_cast<size_t>(iLen), iSize, u);
        if (r < 0)
            return nullptr;
        if (r == 0)
            return iRun < 0 ? nullptr : Run(iRun, iLen);
        if (!ValidHeader(u.pUnit[0], u.pUnit[1]))
            continue; // a unit no decoder takes changes nothing
        if (IsVcl(u.uType))
            return iRun < 0 ? nullptr : Run(iRun, u.iStart);
        if (IsConfigRunUnit(u.uType) && iRun < 0)
            iRun = u.iStart;
    }
}

} // namespace

int32_t StepUnits(const uint8_t *p, size_t uLen, int32_t iSize, CALHEVCNAL &u) noexcept
{
    return iSize == 0 ? StepStartCodes(p, uLen, u) : StepLengthFields(p, uLen, iSize, u);
}

int32_t StepRecord(const uint8_t *p, size_t uLen, CALHEVCNAL &u) noexcept
{
    size_t uPos = static_cast<size_t>(u.iNext);
    if (uPos == 0) {
        if (uLen < kRecordFixedBytes)
            return CAL_HEVC_ERR_TRUNCATED;
        u.uArraysLeft = p[kRecordFixedBytes - 1]; // numOfArrays
        u.uUnitsLeft = 0;
        uPos = kRecordFixedBytes;
        u.iNext = static_cast<int32_t>(uPos);
    }
    while (u.uUnitsLeft == 0) {
        if (u.uArraysLeft == 0)
            return 0;
        if (uLen - uPos < kArrayHeaderBytes)
            return CAL_HEVC_ERR_TRUNCATED;
        u.uArrayComplete = p[uPos] >> 7;
        u.uUnitsLeft = nal::ReadBE(p, static_cast<int64_t>(uLen), static_cast<int64_t>(uPos) + 1, 2); // numNalus
        --u.uArraysLeft;
        uPos += kArrayHeaderBytes;
        u.iNext = static_cast<int32_t>(uPos);
    }
    if (uLen - uPos < 2)
        return CAL_HEVC_ERR_TRUNCATED;
    const uint32_t uUnit = nal::ReadBE(p, static_cast<int64_t>(uLen), static_cast<int64_t>(uPos), 2); // nalUnitLength
    if (uUnit > uLen - uPos - 2)
        return CAL_HEVC_ERR_TRUNCATED;
    if (uUnit < kHeaderBytes)
        return CAL_HEVC_ERR_MALFORMED;
    Describe(u, p, uPos, uPos + 2, uUnit);
    --u.uUnitsLeft;
    u.iNext = static_cast<int32_t>(uPos + 2 + uUnit);
    return 1;
}

} // namespace vorcal::tools::hevc

namespace hevc = vorcal::tools::hevc;

extern "C" int32_t vorCALTools_HEVC_CheckFormat(const uint8_t *pData, int32_t iLen)
{
    return hevc::CheckFormat(pData, iLen);
}

extern "C" int32_t vorCALTools_HEVC_NextNAL(const uint8_t *pData, int32_t iLen, int32_t iNALLengthSize,
                                            CALHEVCNAL *pUnit)
{
    if (pData == nullptr || iLen < 0 || !hevc::ValidState(iLen, pUnit) ||
        (iNALLengthSize != 0 && !vorcal::tools::nal::ValidLengthSize(iNALLengthSize)))
        return CAL_HEVC_ERR_ARGUMENT;
    pUnit->uArrayComplete = 0;
    return hevc::StepUnits(pData, static_cast<size_t>(iLen), iNALLengthSize, *pUnit);
}

extern "C" int32_t vorCALTools_HEVC_NextHvcCNAL(const uint8_t *pRecord, int32_t iLen, CALHEVCNAL *pUnit)
{
    if (pRecord == nullptr || iLen < 0 || !hevc::ValidState(iLen, pUnit))
        return CAL_HEVC_ERR_ARGUMENT;
    return hevc::StepRecord(pRecord, static_cast<size_t>(iLen), *pUnit);
}

extern "C" const char *vorCALTools_HEVC_NALTypeName(uint32_t uType)
{
    return uType < hevc::kNalTypeNames.size() ? hevc::kNalTypeNames[uType] : nullptr;
}

extern "C" int32_t vorCALTools_HEVC_IsIRAP(const uint8_t *pFrame, int32_t iLen, int32_t iNALLengthSize)
{
    return hevc::IsIrapFrame(pFrame, iLen, iNALLengthSize);
}

extern "C" const uint8_t *vorCALTools_HEVC_GetConfigStream(const uint8_t *pData, int32_t iLen, int32_t iNALLengthSize,
                                                           int32_t *piConfigLen)
{
    return hevc::ConfigStream(pData, iLen, iNALLengthSize, piConfigLen);
}
