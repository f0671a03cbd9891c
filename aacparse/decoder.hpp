// Internal helpers of the parse-only AAC decoder shared by its modules.
#pragma once

#include <cstdint>

#include <vorcal/aacparse.h>

#include "aacparse/syntax.hpp"

namespace vorcal::aacparse {

// The samp_rate_infoOnlyParsing row of an index; anything past 15 gets an empty row.
inline const VrSampRateInfo_OnlyParsing &RateRow(uint32_t uIndex) noexcept
{
    return samp_rate_infoOnlyParsing[uIndex < 16 ? uIndex : 15];
}

inline uint32_t Bits(VrAACDecoder_OnlyParsing &dec, uint32_t n) noexcept
{
    return VrGetBits_OnlyParsing(&dec.Bits, n);
}

// The defaults of a decoder state record after clearing it (detect.cpp).
void ResetDecoder(VrAACDecoder_OnlyParsing &dec);

// Stream headers (stream_header.cpp).
int32_t AdtsHeader(VrAACDecoder_OnlyParsing &dec);
int32_t ProgramConfig(VrAACDecoder_OnlyParsing &dec);

// Channel map operations (channel_map.cpp).
int32_t EnterMCInfo(VrAACDecoder_OnlyParsing &dec, VrMCInfo_OnlyParsing &map,
                    const VrProgramConfig_OnlyParsing &pce);
int32_t CheckMCInfo(VrAACDecoder_OnlyParsing &dec, VrMCInfo_OnlyParsing &map, uint32_t uCopy);
void ResetMCInfo(VrAACDecoder_OnlyParsing &dec, VrMCInfo_OnlyParsing &map);
int32_t ChannelConfig(VrAACDecoder_OnlyParsing &dec, uint32_t uId, uint32_t uTag,
                      uint32_t uCommonWindow, VrMCInfo_OnlyParsing &map);

// Window information (window_info.cpp). The short band widths go to uWidths, by default the
// shared sfbwidth128OnlyParsing; a parser on its own state passes its own.
void InfoInit(VrAACDecoder_OnlyParsing &dec, const VrSampRateInfo_OnlyParsing &row,
              uint16_t (&uWidths)[16] = sfbwidth128OnlyParsing);

// Perceptual noise substitution (noise.cpp).
void RandVector(int16_t *piVector, int16_t &iExponent, int32_t iLength, int32_t &iSeed);

// Raw data block syntax (ics.cpp, raw_block.cpp): the exported operations without the shims.
// With bValues false the channel parsers walk the same bits but leave the values they would
// store (spectral lines, noise, pulses) alone: for callers whose state nobody reads.
// id_syn_ele values (ISO/IEC 14496-3 Table 4.85).
enum ElementId : uint32_t {
    kIdSCE = 0, kIdCPE = 1, kIdCCE = 2, kIdLFE = 3, kIdDSE = 4, kIdPCE = 5, kIdFIL = 6, kIdEND = 7
};
uint32_t IcsInfo(VrAACDecoder_OnlyParsing &dec, VrICS_OnlyParsing &ics);
void SectionData(VrAACDecoder_OnlyParsing &dec, VrICS_OnlyParsing &ics,
                 const VrICS_OnlyParsing &wics);
uint32_t ScaleFactorData(VrAACDecoder_OnlyParsing &dec, VrICS_OnlyParsing &ics,
                         const VrICS_OnlyParsing &wics, uint32_t uChannel, uint32_t uGlobalGain);
uint32_t SpectralData(VrAACDecoder_OnlyParsing &dec, VrICS_OnlyParsing &ics,
                      const VrICS_OnlyParsing &wics, uint32_t uChannel, uint32_t uFirstChannel,
                      bool bValues = true);
uint32_t MsMask(VrAACDecoder_OnlyParsing &dec, const VrICS_OnlyParsing &ics);
uint32_t PulseData(VrAACDecoder_OnlyParsing &dec, VrPulseInfo_OnlyParsing &pulse);
void ApplyPulses(VrAACDecoder_OnlyParsing &dec, uint32_t uChannel,
                 const VrPulseInfo_OnlyParsing &pulse);
void TnsData(VrAACDecoder_OnlyParsing &dec, const VrICS_OnlyParsing &ics,
             VrTNSInfo_OnlyParsing &tns);
void ClearTns(VrTNSInfo_OnlyParsing &tns);
int32_t Escape(VrAACDecoder_OnlyParsing &dec, int32_t iValue);
uint32_t Ics(VrAACDecoder_OnlyParsing &dec, VrICS_OnlyParsing &ics, uint32_t uCommonWindow,
             uint32_t uChannel, uint32_t uFirstChannel, uint32_t uWindowInfoChannel,
             bool bValues = true);
uint32_t SingleChannelElement(VrAACDecoder_OnlyParsing &dec, VrMCInfo_OnlyParsing &map,
                              bool bValues = true);
uint32_t ChannelPairElement(VrAACDecoder_OnlyParsing &dec, VrMCInfo_OnlyParsing &map,
                            bool bValues = true);
uint32_t LfeChannelElement(VrAACDecoder_OnlyParsing &dec, VrMCInfo_OnlyParsing &map,
                           bool bValues = true);
// Called before each extension_payload() of a fill element, with the reader at its
// extension_type and the payload's byte count.
using PayloadHook = void (*)(void *pContext, VrAACDecoder_OnlyParsing &dec, uint32_t uCount);
uint32_t FillElement(VrAACDecoder_OnlyParsing &dec, uint8_t *pBuffer, PayloadHook hook = nullptr,
                     void *pContext = nullptr);
uint32_t ExtensionPayload(VrAACDecoder_OnlyParsing &dec, uint32_t uCount, uint8_t *pBuffer);
uint32_t DataStreamElement(VrAACDecoder_OnlyParsing &dec, uint32_t &uTag, uint32_t &uCount,
                           uint8_t *pBuffer);

} // namespace vorcal::aacparse
