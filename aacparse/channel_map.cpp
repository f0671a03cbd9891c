// The channel map: program_config_element layouts (ISO/IEC 13818-7 8.1.2) and the implicit
// configuration, limited to two front channels.
#include "aacparse/decoder.hpp"

namespace vorcal::aacparse {
namespace {

constexpr uint32_t kChannels = VR_AAC_CHANNELS_OnlyParsing;

// Fills the records of one single channel element (one channel) or channel pair element (two)
// from index uFirst on; the caller has checked that they fit.
void TakeChannels(VrMCInfo_OnlyParsing &map, uint32_t uFirst, bool bPair, uint32_t uTag, uint32_t uCommonWindow)
{
    VrChannelInfo_OnlyParsing &c = map.Channel[uFirst];
    c.uPresent = 1;
    c.uTag = uTag;
    c.uPairFlag = bPair ? 1 : 0;
    c.uCommonWindow = uCommonWindow;
    c.iWindowInfoChannel = static_cast<int32_t>(uFirst);
    if (!bPair) {
        c.uLeftFlag = 0;
        return;
    }
    VrChannelInfo_OnlyParsing &r = map.Channel[uFirst + 1];
    c.uLeftFlag = 1;
    c.iPartner = static_cast<int32_t>(uFirst + 1);
    r.uPresent = 1;
    r.uTag = uTag;
    r.uPairFlag = 1;
    r.uCommonWindow = uCommonWindow;
    r.uLeftFlag = 0;
    r.iPartner = static_cast<int32_t>(uFirst);
    // With common_window the right channel shares the left channel's ics_info.
    r.iWindowInfoChannel = static_cast<int32_t>(uCommonWindow ? uFirst : uFirst + 1);
}

} // namespace

int32_t CheckMCInfo(VrAACDecoder_OnlyParsing &dec, VrMCInfo_OnlyParsing &map, uint32_t uCopy)
{
    for (uint32_t i = 0; i < kChannels; ++i) {
        const VrChannelInfo_OnlyParsing &c = map.Channel[i];
        VrSavedChannel_OnlyParsing &s = dec.SavedChannel[i];
        if (uCopy) {
            s = {c.uPresent, c.uPairFlag, c.uLeftFlag, c.iPartner};
            continue;
        }
        if (s.uPresent != c.uPresent)
            return 0;
        if (s.uPresent && (s.uPairFlag != c.uPairFlag || s.uLeftFlag != c.uLeftFlag || s.iPartner != c.iPartner))
            return 0;
    }
    return 1;
}

int32_t EnterMCInfo(VrAACDecoder_OnlyParsing &dec, VrMCInfo_OnlyParsing &map, const VrProgramConfig_OnlyParsing &pce)
{
    map.uChannels = map.uFrontSCE = map.uFront = map.uSide = map.uBack = map.uLFE = map.uCoupling = 0;
    map.uProfile = pce.uProfile;
    // The program config parser has already stored its index as the current one, so this only
    // triggers for an element handed in directly.
    if (pce.uSampleRateIdx != map.uSampleRateIdx) {
        map.uSampleRateIdx = pce.uSampleRateIdx;
        InfoInit(dec, RateRow(pce.uSampleRateIdx));
    }
    const uint32_t uFront = pce.uFront < 16 ? pce.uFront : 16;
    for (uint32_t i = 0; i < uFront; ++i) {
        const bool bPair = pce.uFrontIsCPE[i] != 0;
        const uint32_t uFirst = map.uFront;
        if (uFirst + (bPair ? 2 : 1) > kChannels)
            return -1;
        TakeChannels(map, uFirst, bPair, pce.uFrontTag[i], 0);
        map.uFront += bPair ? 2 : 1;
    }
    if (pce.uSide || pce.uBack || pce.uLFE)
        return -1; // the map has front channels only
    const uint32_t uCoupling = pce.uCoupling < VR_AAC_COUPLING_TAGS_OnlyParsing ? pce.uCoupling : VR_AAC_COUPLING_TAGS_OnlyParsing;
    for (uint32_t i = 0; i < uCoupling; ++i)
        map.iCouplingTags[i] = static_cast<int32_t>(pce.uCouplingTag[i]);
    map.uCoupling = uCoupling;
    if (pce.uMonoMixdown || pce.uStereoMixdown || pce.uMatrixMixdown)
        return -1;
    map.uChannels = map.uFront;
    CheckMCInfo(dec, map, 1);
    return static_cast<int32_t>(map.uChannels + map.uCoupling);
}

void ResetMCInfo(VrAACDecoder_OnlyParsing &dec, VrMCInfo_OnlyParsing &map)
{
    if (!dec.uImplicitConfig)
        return;
    map.uChannels = map.uFront = map.uSide = map.uBack = map.uLFE = map.uCoupling = 0;
    if (!dec.uFixedHeaderKnown)
        map.uFrontSCE = 0;
    for (VrChannelInfo_OnlyParsing &c : map.Channel) {
        c.uPresent = 0;
        c.uPairFlag = 0;
        c.uLeftFlag = 0;
        c.iPartner = 0;
    }
}

int32_t ChannelConfig(VrAACDecoder_OnlyParsing &dec, uint32_t uId, uint32_t uTag, uint32_t uCommonWindow,
                      VrMCInfo_OnlyParsing &map)
{
    const bool bPair = uId == kIdCPE;
    if (!dec.uImplicitConfig) {
        for (uint32_t i = 0; i < kChannels; ++i) {
            VrChannelInfo_OnlyParsing &c = map.Channel[i];
            if (!c.uPresent || c.uPairFlag != (bPair ? 1u : 0u) || c.uTag != uTag)
                continue;
            c.iWindowInfoChannel = static_cast<int32_t>(i);
            if (bPair && c.iPartner >= 0 && static_cast<uint32_t>(c.iPartner) < kChannels) {
                map.Channel[c.iPartner].iWindowInfoChannel =
                    uCommonWindow ? static_cast<int32_t>(i) : c.iPartner;
            }
            return static_cast<int32_t>(i);
        }
        // No element of the program carries this tag.
        map.iCouplingTags[VR_AAC_COUPLING_TAGS_OnlyParsing - 1] = -1;
        map.Channel[0].iWindowInfoChannel = uCommonWindow ? -1 : 0;
        return -1;
    }
    if (uId > kIdCPE)
        return 0; // coupling and other elements take no channel
    if (map.uChannels > 1)
        return -1;
    if (bPair)
        dec.uImplicitCPE = 1;
    else if (!dec.uFixedHeaderKnown && !dec.uImplicitCPE)
        ++map.uFrontSCE;
    const uint32_t uCount = bPair ? 2 : 1;
    const uint32_t uFirst = map.uChannels;
    if (map.uFront + uCount > 2 || uFirst + uCount > kChannels)
        return -1;
    TakeChannels(map, uFirst, bPair, uTag, uCommonWindow);
    map.uFront += uCount;
    map.uChannels += uCount;
    return static_cast<int32_t>(uFirst);
}

} // namespace vorcal::aacparse

using namespace vorcal::aacparse;

extern "C" int32_t VrEnter_MC_Info_OnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrMCInfo_OnlyParsing *pMap,
                                               const VrProgramConfig_OnlyParsing *pPCE)
{
    return EnterMCInfo(*pDec, *pMap, *pPCE);
}

extern "C" int32_t VrCheck_MC_Info_OnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrMCInfo_OnlyParsing *pMap,
                                               uint32_t uCopy)
{
    return CheckMCInfo(*pDec, *pMap, uCopy);
}

extern "C" void reset_mc_infoOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrMCInfo_OnlyParsing *pMap)
{
    ResetMCInfo(*pDec, *pMap);
}

extern "C" int32_t chn_configOnlyParsing(VrAACDecoder_OnlyParsing *pDec, uint32_t uId, uint32_t uTag,
                                         uint32_t uCommonWindow, VrMCInfo_OnlyParsing *pMap)
{
    return ChannelConfig(*pDec, uId, uTag, uCommonWindow, *pMap);
}
