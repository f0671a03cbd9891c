// HEVC conversions: frames between start codes and length fields on the conversion core the
// H.264 tools use, the units of an hvcC record (ISO/IEC 14496-15 8.3.3.1) to start codes, the
// record's fields, and a record built from the parameter sets of start-code framed data.
#include <cstring>

#include <vorcal/video_tools.h>

#include "tools/hevc_nal.hpp"
#include "tools/hevc_ps.hpp"
#include "tools/nal_convert.hpp"

namespace vorcal::tools::hevc {
namespace {

constexpr int64_t kMaxResult = INT32_MAX;

int32_t ResultOf(const nal::Converted &r) noexcept
{
    switch (r.eError) {
    case nal::ConvertError::kNone:
        return r.iBytes > kMaxResult ? CAL_HEVC_ERR_TOO_LONG : static_cast<int32_t>(r.iBytes);
    case nal::ConvertError::kLengthBeyondData:
    case nal::ConvertError::kTrailingBytes:
        return CAL_HEVC_ERR_TRUNCATED;
    case nal::ConvertError::kUnitTooLong:
        return CAL_HEVC_ERR_TOO_LONG;
    case nal::ConvertError::kNoRoom:
        return CAL_HEVC_ERR_NO_ROOM;
    default:
        return CAL_HEVC_ERR_MALFORMED;
    }
}

// Every unit holds its two-byte header; every byte of length-prefixed data belongs to a unit.
template <bool kMeasure>
int32_t ConvertUnits(uint8_t *pDst, int64_t iRoom, const uint8_t *pSrc, int32_t iSrcLen, int32_t iFormat,
                     int32_t iSize) noexcept
{
    if (iFormat == CAL_AVC_FORMAT_NAL)
        return ResultOf(nal::LengthToStartCodes<kMeasure>(pDst, iRoom, pSrc, iSrcLen, {iSize, true, kHeaderBytes}));
    if (iSrcLen == 0)
        return 0;
    return ResultOf(nal::StartCodesToLength<kMeasure>(pDst, iRoom, pSrc, iSrcLen, {iSize, true, true, kHeaderBytes, nullptr}));
}

int32_t ConvertFormat(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc, int32_t iSrcLen, int32_t iSourceFormat,
                      int32_t iSize) noexcept
{
    if (pSrc == nullptr || iSrcLen < 0 || !nal::ValidLengthSize(iSize) || iSourceFormat < 0 ||
        iSourceFormat > CAL_AVC_FORMAT_ANNEXB)
        return CAL_HEVC_ERR_ARGUMENT;
    const int32_t iFormat =
        iSourceFormat == CAL_AVC_FORMAT_UNDETERMINED ? vorCALTools_HEVC_CheckFormat(pSrc, iSrcLen) : iSourceFormat;
    if (pDst == nullptr)
        return ConvertUnits<true>(nullptr, 0, pSrc, iSrcLen, iFormat, iSize);
    return ConvertUnits<false>(pDst, iDstSize > 0 ? iDstSize : 0, pSrc, iSrcLen, iFormat, iSize);
}

int32_t HvcCToAnnexB(uint8_t *pDst, int32_t iDstSize, const uint8_t *pRecord, int32_t iLen) noexcept
{
    if (pRecord == nullptr || iLen < 0)
        return CAL_HEVC_ERR_ARGUMENT;
    const int64_t iRoom = iDstSize > 0 ? iDstSize : 0;
    int64_t iWritten = 0;
    CALHEVCNAL u{};
    int32_t r;
    while ((r = StepRecord(pRecord, static_cast<size_t>(iLen), u)) == 1) {
        if (pDst != nullptr) {
            if (iWritten + 4 + u.iLen > iRoom)
                return CAL_HEVC_ERR_NO_ROOM;
            memcpy(pDst + iWritten, nal::kStartCode, 4);
            memcpy(pDst + iWritten + 4, u.pUnit, static_cast<size_t>(u.iLen));
        }
        iWritten += 4 + int64_t{u.iLen};
    }
    if (r < 0)
        return r;
    return iWritten > kMaxResult ? CAL_HEVC_ERR_TOO_LONG : static_cast<int32_t>(iWritten);
}

int32_t ParseHvcC(const uint8_t *p, int32_t iLen, CALHEVCConfig *pConfig) noexcept
{
    if (pConfig == nullptr)
        return CAL_HEVC_ERR_ARGUMENT;
    *pConfig = CALHEVCConfig{};
    if (p == nullptr || iLen < 0)
        return CAL_HEVC_ERR_ARGUMENT;
    CALHEVCConfig c{};
    CALHEVCNAL u{};
    int32_t r;
    while ((r = StepRecord(p, static_cast<size_t>(iLen), u)) == 1)
        ++c.uNumOfNalus;
    if (r < 0)
        return r;
    auto BE = [p, iLen](int64_t i, int32_t n) { return nal::ReadBE(p, iLen, i, n); };
    c.uConfigurationVersion = p[0];
    c.uProfileSpace = p[1] >> 6;
    c.uTierFlag = (p[1] >> 5) & 1;
    c.uProfileIdc = p[1] & 0x1F;
    c.uProfileCompatibilityFlags = BE(2, 4);
    c.uConstraintFlagsHigh = BE(6, 2);
    c.uConstraintFlagsLow = BE(8, 4);
    c.uLevelIdc = p[12];
    c.uMinSpatialSegmentationIdc = BE(13, 2) & 0x0FFF;
    c.uParallelismType = p[15] & 3;
    c.uChromaFormatIdc = p[16] & 3;
    c.uBitDepthLuma = (p[17] & 7) + 8;
    c.uBitDepthChroma = (p[18] & 7) + 8;
    c.uAvgFrameRate = BE(19, 2);
    c.uConstantFrameRate = p[21] >> 6;
    c.uNumTemporalLayers = (p[21] >> 3) & 7;
    c.uTemporalIdNested = (p[21] >> 2) & 1;
    c.uNALLengthSize = (p[21] & 3) + 1;
    c.uNumOfArrays = p[22];
    *pConfig = c;
    return CAL_HEVC_OK;
}

// The parameter sets of a record: units in front of the first slice, in the order of the data
// within each array, duplicates dropped. The fixed room is more than the distinct ids HEVC
// allows (16 VPS, 16 SPS, 64 PPS) plus some SEI.
struct UnitRef {
    const uint8_t *p;
    uint32_t uLen;
    uint32_t uType;
};
constexpr size_t kMaxRecordUnits = 128;

struct Collected {
    UnitRef units[kMaxRecordUnits];
    size_t uCount = 0;

    bool Has(const CALHEVCNAL &u) const noexcept
    {
        for (size_t i = 0; i < uCount; ++i) {
            const UnitRef &k = units[i];
            if (k.uType == u.uType && k.uLen == static_cast<uint32_t>(u.iLen) && memcmp(k.p, u.pUnit, k.uLen) == 0)
                return true;
        }
        return false;
    }
};

// The record's fields from the parameter sets (14496-15 8.3.3.1.2).
struct RecordFields {
    CALHEVCSPS sps{};
    uint32_t uTier = 0, uLevel = 0, uTemporalLayers = 1, uTemporalIdNested = 1, uParallelism = 0;
};

int32_t FieldsOf(const Collected &c, RecordFields &f) noexcept
{
    bool bHaveSps = false, bTiles = false, bWavefront = false, bSlices = false, bMixed = false;
    for (size_t i = 0; i < c.uCount; ++i) {
        const UnitRef &k = c.units[i];
        if (k.uType == kNalSps) {
            if (LayerId(k.p[0], k.p[1]) != 0)
                continue; // the record describes the base layer, as vorCALTools_HEVC_ParseSPS does
            CALHEVCSPS sps;
            const int32_t r = ParseSpsUnit(k.p, k.uLen, sps);
            if (!bHaveSps && r != CAL_HEVC_OK)
                return r;
            if (r != CAL_HEVC_OK)
                continue;
            if (!bHaveSps)
                f.sps = sps;
            bHaveSps = true;
            f.uTier = f.uTier > sps.uTierFlag ? f.uTier : sps.uTierFlag;
            f.uLevel = f.uLevel > sps.uLevelIdc ? f.uLevel : sps.uLevelIdc;
            f.uTemporalLayers = f.uTemporalLayers > sps.uMaxSubLayers ? f.uTemporalLayers : sps.uMaxSubLayers;
            f.uTemporalIdNested &= sps.uTemporalIdNesting;
        } else if (k.uType == kNalVps) {
            VpsSummary vps;
            if (ParseVpsUnit(k.p, k.uLen, vps) == CAL_HEVC_OK) {
                f.uTier = f.uTier > vps.uTierFlag ? f.uTier : vps.uTierFlag;
                f.uLevel = f.uLevel > vps.uLevelIdc ? f.uLevel : vps.uLevelIdc;
            }
        } else if (k.uType == kNalPps) {
            PpsParallelism pps;
            if (ParsePpsUnit(k.p, k.uLen, pps) == CAL_HEVC_OK) {
                bTiles |= pps.bTiles && !pps.bWavefront;
                bWavefront |= pps.bWavefront && !pps.bTiles;
                bSlices |= !pps.bTiles && !pps.bWavefront;
                bMixed |= pps.bTiles && pps.bWavefront;
            }
        }
    }
    if (!bHaveSps)
        return CAL_HEVC_ERR_NOT_FOUND;
    constexpr uint32_t kMaxRecordBitDepth = 15; // bitDepthLumaMinus8 and bitDepthChromaMinus8 have 3 bits
    if (f.sps.uBitDepthLuma > kMaxRecordBitDepth || f.sps.uBitDepthChroma > kMaxRecordBitDepth)
        return CAL_HEVC_ERR_MALFORMED;
    // parallelismType: 0 mixed or unknown (always when no spatial segmentation is promised),
    // 1 slices, 2 tiles, 3 wavefront.
    constexpr uint32_t kSlices = 1, kTiles = 2, kWavefront = 3;
    const int iKinds = int{bTiles} + int{bWavefront} + int{bSlices} + int{bMixed};
    if (f.sps.uMinSpatialSegmentationIdc != 0 && iKinds == 1 && !bMixed)
        f.uParallelism = bTiles ? kTiles : bWavefront ? kWavefront : kSlices;
    return CAL_HEVC_OK;
}

int64_t RecordSize(const Collected &c, bool bWithSei) noexcept
{
    int64_t iSize = kRecordFixedBytes;
    for (uint32_t uType : {kNalVps, kNalSps, kNalPps, kNalPrefixSei}) {
        bool bAny = false;
        for (size_t i = 0; i < c.uCount; ++i) {
            if (c.units[i].uType == uType && (uType != kNalPrefixSei || bWithSei)) {
                iSize += 2 + int64_t{c.units[i].uLen};
                bAny = true;
            }
        }
        iSize += bAny ? kArrayHeaderBytes : 0;
    }
    return iSize;
}

void WriteRecord(uint8_t *pDst, const Collected &c, const RecordFields &f, int32_t iSize, uint32_t uFlags) noexcept
{
    const CALHEVCSPS &s = f.sps;
    pDst[0] = kConfigurationVersion;
    pDst[1] = static_cast<uint8_t>((s.uProfileSpace << 6) | (f.uTier << 5) | s.uProfileIdc);
    nal::WriteBE(pDst + 2, s.uProfileCompatibilityFlags, 4);
    nal::WriteBE(pDst + 6, s.uConstraintFlagsHigh, 2);
    nal::WriteBE(pDst + 8, s.uConstraintFlagsLow, 4);
    pDst[12] = static_cast<uint8_t>(f.uLevel);
    nal::WriteBE(pDst + 13, 0xF000u | s.uMinSpatialSegmentationIdc, 2); // reserved '1111'b
    pDst[15] = static_cast<uint8_t>(0xFC | f.uParallelism);
    pDst[16] = static_cast<uint8_t>(0xFC | s.uChromaFormatIdc);
    pDst[17] = static_cast<uint8_t>(0xF8 | (s.uBitDepthLuma - 8));
    pDst[18] = static_cast<uint8_t>(0xF8 | (s.uBitDepthChroma - 8));
    nal::WriteBE(pDst + 19, 0, 2); // avgFrameRate: unspecified
    // constantFrameRate 0, numTemporalLayers, temporalIdNested, lengthSizeMinusOne
    pDst[21] = static_cast<uint8_t>((f.uTemporalLayers << 3) | (f.uTemporalIdNested << 2) | static_cast<uint32_t>(iSize - 1));
    const bool bWithSei = (uFlags & CAL_HEVC_HVCC_WITH_SEI) != 0;
    const uint8_t uComplete = (uFlags & CAL_HEVC_HVCC_COMPLETE) ? 0x80 : 0;
    uint8_t uArrays = 0;
    size_t uPos = kRecordFixedBytes;
    for (uint32_t uType : {kNalVps, kNalSps, kNalPps, kNalPrefixSei}) {
        if (uType == kNalPrefixSei && !bWithSei)
            continue;
        const size_t uHeader = uPos;
        uint32_t uUnits = 0;
        uPos += kArrayHeaderBytes;
        for (size_t i = 0; i < c.uCount; ++i) {
            const UnitRef &k = c.units[i];
            if (k.uType != uType)
                continue;
            nal::WriteBE(pDst + uPos, k.uLen, 2);
            memcpy(pDst + uPos + 2, k.p, k.uLen);
            uPos += 2 + size_t{k.uLen};
            ++uUnits;
        }
        if (uUnits == 0) {
            uPos = uHeader;
            continue;
        }
        pDst[uHeader] = static_cast<uint8_t>(uComplete | uType);
        nal::WriteBE(pDst + uHeader + 1, uUnits, 2);
        ++uArrays;
    }
    pDst[kRecordFixedBytes - 1] = uArrays;
}

int32_t MakeHvcC(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc, int32_t iSrcLen, int32_t iSize,
                 uint32_t uFlags) noexcept
{
    if (pSrc == nullptr || iSrcLen < 0 || !nal::ValidLengthSize(iSize))
        return CAL_HEVC_ERR_ARGUMENT;
    Collected c;
    CALHEVCNAL u{};
    for (int32_t r; (r = StepUnits(pSrc, static_cast<size_t>(iSrcLen), 0, u)) != 0;) {
        if (r < 0)
            return r;
        if (!ValidHeader(u.pUnit[0], u.pUnit[1]))
            continue;
        if (IsVcl(u.uType))
            break;
        const bool bWanted = u.uType == kNalVps || u.uType == kNalSps || u.uType == kNalPps || u.uType == kNalPrefixSei;
        if (!bWanted || c.Has(u))
            continue;
        // numNalus and nalUnitLength are 16-bit fields.
        if (c.uCount == kMaxRecordUnits || u.iLen > 0xFFFF)
            return CAL_HEVC_ERR_TOO_LONG;
        c.units[c.uCount++] = {u.pUnit, static_cast<uint32_t>(u.iLen), u.uType};
    }
    RecordFields f;
    if (const int32_t r = FieldsOf(c, f); r != CAL_HEVC_OK)
        return r;
    const int64_t iBytes = RecordSize(c, (uFlags & CAL_HEVC_HVCC_WITH_SEI) != 0);
    if (iBytes > kMaxResult)
        return CAL_HEVC_ERR_TOO_LONG;
    if (pDst == nullptr)
        return static_cast<int32_t>(iBytes);
    if (iBytes > iDstSize)
        return CAL_HEVC_ERR_NO_ROOM;
    WriteRecord(pDst, c, f, iSize, uFlags);
    return static_cast<int32_t>(iBytes);
}

} // namespace
} // namespace vorcal::tools::hevc

namespace hevc = vorcal::tools::hevc;

extern "C" int32_t vorCALTools_HEVC_ConvertFormat(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc, int32_t iSrcLen,
                                                  int32_t iSourceFormat, int32_t iNALLengthSize)
{
    return hevc::ConvertFormat(pDst, iDstSize, pSrc, iSrcLen, iSourceFormat, iNALLengthSize);
}

extern "C" int32_t vorCALTools_HEVC_ParseHvcC(const uint8_t *pRecord, int32_t iLen, CALHEVCConfig *pConfig)
{
    return hevc::ParseHvcC(pRecord, iLen, pConfig);
}

extern "C" int32_t vorCALTools_HEVC_HvcCToAnnexB(uint8_t *pDst, int32_t iDstSize, const uint8_t *pRecord,
                                                 int32_t iRecordLen)
{
    return hevc::HvcCToAnnexB(pDst, iDstSize, pRecord, iRecordLen);
}

extern "C" int32_t vorCALTools_HEVC_MakeHvcC(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc, int32_t iSrcLen,
                                             int32_t iNALLengthSize, uint32_t uFlags)
{
    return hevc::MakeHvcC(pDst, iDstSize, pSrc, iSrcLen, iNALLengthSize, uFlags);
}
