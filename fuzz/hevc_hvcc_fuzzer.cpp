// hvcC records: parse, walk and units to start codes on exact-size data, and records built from
// the same bytes read as start-code framed parameter sets. Byte 0 picks the NAL length size and
// the flags of the built record; the rest is the data.
#include <cstdint>
#include <cstring>
#include <vector>

#include <vorcal/video_tools.h>

#include "fuzz_sal.hpp"

#define CHECK(x) ((x) ? void() : __builtin_trap())

namespace {

using Bytes = std::vector<uint8_t>;

std::vector<Bytes> RecordUnits(const Bytes &d, int32_t &iEnd)
{
    std::vector<Bytes> units;
    CALHEVCNAL u{};
    while ((iEnd = vorCALTools_HEVC_NextHvcCNAL(d.data(), int32_t(d.size()), &u)) == 1) {
        CHECK(u.iLen >= 2 && u.pUnit >= d.data() && u.pUnit + u.iLen <= d.data() + d.size() && u.uArrayComplete <= 1);
        units.emplace_back(u.pUnit, u.pUnit + u.iLen);
    }
    return units;
}

std::vector<Bytes> StartCodeUnits(const Bytes &d)
{
    std::vector<Bytes> units;
    CALHEVCNAL u{};
    while (vorCALTools_HEVC_NextNAL(d.data(), int32_t(d.size()), 0, &u) == 1)
        units.emplace_back(u.pUnit, u.pUnit + u.iLen);
    return units;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const uint8_t uSel = in.Byte();
    const Bytes d(in.Rest(), in.Rest() + in.RestSize());
    const int32_t iLen = int32_t(d.size());

    CALHEVCConfig c;
    std::memset(&c, 0x5A, sizeof c);
    const int32_t iParsed = vorCALTools_HEVC_ParseHvcC(d.data(), iLen, &c);
    int32_t iEnd = 0;
    const std::vector<Bytes> units = RecordUnits(d, iEnd);
    CHECK((iParsed == CAL_HEVC_OK) == (iEnd == 0));
    if (iParsed == CAL_HEVC_OK)
        CHECK(c.uNumOfNalus == units.size() && c.uNALLengthSize >= 1 && c.uNALLengthSize <= 4 && c.uBitDepthLuma >= 8);
    else
        CHECK(c.uNumOfNalus == 0 && c.uConfigurationVersion == 0);
    const int32_t iNeeded = vorCALTools_HEVC_HvcCToAnnexB(nullptr, 0, d.data(), iLen);
    CHECK((iNeeded >= 0) == (iParsed == CAL_HEVC_OK));
    if (iNeeded > 0) {
        Bytes out(static_cast<size_t>(iNeeded));
        CHECK(vorCALTools_HEVC_HvcCToAnnexB(out.data(), iNeeded - 1, d.data(), iLen) == CAL_HEVC_ERR_NO_ROOM);
        CHECK(vorCALTools_HEVC_HvcCToAnnexB(out.data(), iNeeded, d.data(), iLen) == iNeeded);
        // Units without a zero pair and without a zero at their end come back as they were.
        bool bClean = true;
        for (const Bytes &u : units) {
            bClean = bClean && u.back() != 0;
            for (size_t i = 1; i < u.size(); ++i)
                bClean = bClean && (u[i] != 0 || u[i - 1] != 0);
        }
        CHECK(!bClean || StartCodeUnits(out) == units);
    }

    // The same bytes as start-code framed parameter sets.
    const int32_t iSize = uSel % 4 + 1;
    const uint32_t uFlags = uSel >> 6;
    const int32_t iRecord = vorCALTools_HEVC_MakeHvcC(nullptr, 0, d.data(), iLen, iSize, uFlags);
    if (iRecord > 0) {
        Bytes record(static_cast<size_t>(iRecord));
        CHECK(vorCALTools_HEVC_MakeHvcC(record.data(), iRecord, d.data(), iLen, iSize, uFlags) == iRecord);
        CHECK(vorCALTools_HEVC_ParseHvcC(record.data(), iRecord, &c) == CAL_HEVC_OK && c.uNALLengthSize == uint32_t(iSize));
        CALHEVCSPS sps;
        CHECK(vorCALTools_HEVC_ParseSPS(record.data(), iRecord, &sps) == CAL_HEVC_OK && sps.uBitDepthLuma == c.uBitDepthLuma);
    }
    return 0;
}
