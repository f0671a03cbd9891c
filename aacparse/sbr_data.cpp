// sbr_extension_data() and the SBR data of a single channel element (ISO/IEC 14496-3 4.4.2.8,
// 4.5.2.8): sbr_header, sbr_grid, sbr_dtdf, sbr_invf, sbr_envelope, sbr_noise, the harmonics and
// the extended data id.
#include <cstdint>
#include <cstring>

#include <vorcal/aacparse.h>
#include <vorcal/fixmath.h>

#include "aacparse/sbr_internal.hpp"

namespace vorcal::aacparse::sbr {
namespace {

enum FrameClass : uint8_t { kFixFix = 0, kFixVar = 1, kVarFix = 2, kVarVar = 3 };
constexpr int32_t kNumTimeSlots = 16; // SBR time slots of a 1024-sample frame
constexpr uint32_t kExtensionSbrCrc = 14;
constexpr uint32_t kExtensionIdPs = 2;

uint32_t Bits(VrBitReader_OnlyParsing *pBits, uint32_t n)
{
    return VrGetBits_OnlyParsing(pBits, n);
}
uint8_t Byte(VrBitReader_OnlyParsing *pBits, uint32_t n)
{
    return static_cast<uint8_t>(VrGetBits_OnlyParsing(pBits, n));
}

// Walks a decoding tree one bit at a time; the trees are complete, so every path ends in a leaf.
int32_t Huffman(VrBitReader_OnlyParsing *pBits, const int32_t (*tree)[2])
{
    int32_t entry = 0;
    do
        entry = tree[entry][VrGet1Bit_OnlyParsing(pBits)];
    while (entry >= 0);
    return entry + 64;
}

void ParseHeader(VrBitReader_OnlyParsing *pBits, VrSBRState_OnlyParsing *pSbr)
{
    pSbr->uAmpRes = Byte(pBits, 1);
    pSbr->uStartFreq = Byte(pBits, 4);
    pSbr->uStopFreq = Byte(pBits, 4);
    pSbr->uXoverBand = Byte(pBits, 3);
    VrFlushBits_OnlyParsing(pBits, 2); // bs_reserved
    const uint32_t uExtra1 = Bits(pBits, 1);
    const uint32_t uExtra2 = Bits(pBits, 1);
    // An absent extra part keeps the values of the previous header.
    if (uExtra1) {
        pSbr->uFreqScale = Byte(pBits, 2);
        pSbr->uAlterScale = Byte(pBits, 1);
        pSbr->uNoiseBands = Byte(pBits, 2);
    }
    if (uExtra2) {
        pSbr->uLimiterBands = Byte(pBits, 2);
        pSbr->uLimiterGains = Byte(pBits, 2);
        pSbr->uInterpolFreq = Byte(pBits, 1);
        pSbr->uSmoothingMode = Byte(pBits, 1);
    }
    ++pSbr->uHeaderCount;
}

// sbr_grid() and the time borders of 4.6.18.3.3, borders scaled by the border unit.
void ParseGrid(VrBitReader_OnlyParsing *pBits, VrSBRState_OnlyParsing *pSbr, uint32_t uUnit)
{
    const uint8_t uClass = Byte(pBits, 2);
    int32_t absLead = 0, absTrail = kNumTimeSlots, numRelLead = 0, numRelTrail = 0, numEnv = 1;
    int32_t relLead[4] = {}, relTrail[4] = {};
    auto relBorders = [pBits](int32_t count, int32_t *rel) {
        for (int32_t i = 0; i < count; ++i)
            rel[i] = 2 * static_cast<int32_t>(Bits(pBits, 2)) + 2;
    };
    auto limited = [](int32_t n) { return n > VR_SBR_MAX_ENVELOPES ? VR_SBR_MAX_ENVELOPES : n; };
    auto pointer = [pBits](int32_t n) {
        return Byte(pBits, static_cast<uint32_t>(Log2_ceil(n + 1)));
    };

    switch (uClass) {
    case kFixFix:
        // CONTRACT: a code of 3 gives 5 envelopes, not 8.
        numEnv = limited(1 << Bits(pBits, 2));
        pSbr->uPointer = 0;
        pSbr->uFreqRes[0] = Byte(pBits, 1);
        for (int32_t e = 1; e < numEnv; ++e)
            pSbr->uFreqRes[e] = pSbr->uFreqRes[0];
        numRelLead = numEnv - 1;
        for (int32_t i = 0; i < numRelLead; ++i) // NINT(numTimeSlots / numEnv)
            relLead[i] = (2 * kNumTimeSlots + numEnv) / (2 * numEnv);
        break;
    case kFixVar:
        absTrail += static_cast<int32_t>(Bits(pBits, 2));
        numRelTrail = static_cast<int32_t>(Bits(pBits, 2));
        numEnv = numRelTrail + 1;
        relBorders(numRelTrail, relTrail);
        pSbr->uPointer = pointer(numEnv);
        for (int32_t e = 0; e < numEnv; ++e)
            pSbr->uFreqRes[numEnv - 1 - e] = Byte(pBits, 1);
        break;
    case kVarFix:
        absLead = static_cast<int32_t>(Bits(pBits, 2));
        numRelLead = static_cast<int32_t>(Bits(pBits, 2));
        numEnv = numRelLead + 1;
        relBorders(numRelLead, relLead);
        pSbr->uPointer = pointer(numEnv);
        for (int32_t e = 0; e < numEnv; ++e)
            pSbr->uFreqRes[e] = Byte(pBits, 1);
        break;
    default: // kVarVar
        absLead = static_cast<int32_t>(Bits(pBits, 2));
        absTrail += static_cast<int32_t>(Bits(pBits, 2));
        numRelLead = static_cast<int32_t>(Bits(pBits, 2));
        numRelTrail = static_cast<int32_t>(Bits(pBits, 2));
        numEnv = limited(numRelLead + numRelTrail + 1);
        relBorders(numRelLead, relLead);
        relBorders(numRelTrail, relTrail);
        pSbr->uPointer = pointer(numEnv);
        for (int32_t e = 0; e < numEnv; ++e)
            pSbr->uFreqRes[e] = Byte(pBits, 1);
        break;
    }
    pSbr->uFrameClass = uClass;
    pSbr->uNumEnv = static_cast<uint8_t>(numEnv);
    pSbr->uNumNoise = static_cast<uint8_t>(numEnv > 1 ? 2 : 1);

    // Envelope borders: leading ones count forward from the lead border, trailing ones back
    // from the trail border.
    int32_t border[VR_SBR_MAX_ENVELOPES + 1];
    border[0] = absLead;
    border[numEnv] = absTrail;
    for (int32_t l = 1; l < numEnv; ++l) {
        int32_t t = 0;
        if (l <= numRelLead) {
            t = absLead;
            for (int32_t i = 0; i < l; ++i)
                t += relLead[i];
        } else {
            t = absTrail;
            for (int32_t i = 0; i < numEnv - l && i < 4; ++i)
                t -= relTrail[i];
        }
        border[l] = t;
    }
    for (int32_t l = 0; l <= numEnv; ++l)
        pSbr->uBorders[l] = static_cast<uint8_t>(border[l] * static_cast<int32_t>(uUnit));

    // Noise floor borders: the middle one is the envelope border the pointer selects.
    int32_t middle = numEnv / 2;
    const int32_t ptr = pSbr->uPointer;
    if (uClass == kVarFix)
        middle = ptr == 0 ? 1 : ptr == 1 ? numEnv - 1 : ptr - 1;
    else if (uClass != kFixFix)
        middle = ptr > 1 ? numEnv + 1 - ptr : numEnv - 1;
    middle = middle < 0 ? 0 : (middle > numEnv ? numEnv : middle);
    pSbr->uNoiseBorders[0] = pSbr->uBorders[0];
    pSbr->uNoiseBorders[1] = pSbr->uBorders[numEnv > 1 ? middle : numEnv];
    pSbr->uNoiseBorders[2] = pSbr->uBorders[numEnv];
}

// The band of the previous envelope a time delta builds on when the frequency resolutions of
// the two envelopes differ (4.6.18.3.4).
int32_t PreviousBand(const VrSBRState_OnlyParsing &sbr, int32_t k, uint32_t uRes, uint32_t uPrevRes)
{
    if (uRes == uPrevRes)
        return k;
    if (uRes == 0) // low from high: the high band that starts where the low band starts
        return k == 0 ? 0 : 2 * k - (sbr.uNumHigh & 1);
    int32_t i = 0; // high from low: the low band that contains the high band's start
    while (i + 1 < sbr.uNumLow && sbr.uLow[i + 1] <= sbr.uHigh[k])
        ++i;
    return i;
}

void ParseEnvelopes(VrBitReader_OnlyParsing *pBits, VrSBRState_OnlyParsing *pSbr)
{
    // FIXFIX frames with one envelope always use 1.5 dB steps.
    const bool fine = (pSbr->uFrameClass == kFixFix && pSbr->uNumEnv == 1) || pSbr->uAmpRes == 0;
    const int32_t (*timeTree)[2] =
        fine ? t_huffman_env_1_5dB_OnlyParsing : t_huffman_env_3_0dB_OnlyParsing;
    const int32_t (*freqTree)[2] =
        fine ? f_huffman_env_1_5dB_OnlyParsing : f_huffman_env_3_0dB_OnlyParsing;
    const uint32_t uStartBits = fine ? 7 : 6;
    for (int32_t env = 0; env < pSbr->uNumEnv; ++env) {
        const uint32_t uRes = pSbr->uFreqRes[env];
        const int32_t numBands = uRes ? pSbr->uNumHigh : pSbr->uNumLow;
        int16_t *cur = pSbr->iEnvelope[env];
        if (pSbr->uDfEnv[env] == 0) {
            int32_t value = static_cast<int32_t>(Bits(pBits, uStartBits));
            cur[0] = static_cast<int16_t>(value);
            for (int32_t k = 1; k < numBands; ++k) {
                value += Huffman(pBits, freqTree);
                cur[k] = static_cast<int16_t>(value);
            }
        } else {
            const int16_t *prev = env == 0 ? pSbr->iPrevEnvelope : pSbr->iEnvelope[env - 1];
            const uint32_t uPrevRes = env == 0 ? pSbr->uPrevFreqRes : pSbr->uFreqRes[env - 1];
            for (int32_t k = 0; k < numBands; ++k)
                cur[k] = static_cast<int16_t>(prev[PreviousBand(*pSbr, k, uRes, uPrevRes)] +
                                              Huffman(pBits, timeTree));
        }
    }
    memcpy(pSbr->iPrevEnvelope, pSbr->iEnvelope[pSbr->uNumEnv - 1], sizeof pSbr->iPrevEnvelope);
    pSbr->uPrevFreqRes = pSbr->uFreqRes[pSbr->uNumEnv - 1];
}

void ParseNoise(VrBitReader_OnlyParsing *pBits, VrSBRState_OnlyParsing *pSbr)
{
    for (int32_t n = 0; n < pSbr->uNumNoise; ++n) {
        int16_t *cur = pSbr->iNoise[n];
        if (pSbr->uDfNoise[n] == 0) {
            int32_t value = static_cast<int32_t>(Bits(pBits, 5));
            cur[0] = static_cast<int16_t>(value);
            for (int32_t k = 1; k < pSbr->uNumNoiseBands; ++k) {
                value += Huffman(pBits, f_huffman_env_3_0dB_OnlyParsing);
                cur[k] = static_cast<int16_t>(value);
            }
        } else {
            const int16_t *prev = n == 0 ? pSbr->iPrevNoise : pSbr->iNoise[n - 1];
            for (int32_t k = 0; k < pSbr->uNumNoiseBands; ++k)
                cur[k] = static_cast<int16_t>(prev[k] +
                                              Huffman(pBits, t_huffman_noise_3_0dB_OnlyParsing));
        }
    }
    memcpy(pSbr->iPrevNoise, pSbr->iNoise[pSbr->uNumNoise - 1], sizeof pSbr->iPrevNoise);
}

} // namespace

int32_t ParseSingleChannel(VrBitReader_OnlyParsing *pBits, VrSBRState_OnlyParsing *pSbr,
                           uint32_t uBorderUnit)
{
    if (Bits(pBits, 1)) // bs_data_extra
        VrFlushBits_OnlyParsing(pBits, 4);
    ParseGrid(pBits, pSbr, uBorderUnit);
    for (int32_t e = 0; e < pSbr->uNumEnv; ++e)
        pSbr->uDfEnv[e] = Byte(pBits, 1);
    for (int32_t n = 0; n < pSbr->uNumNoise; ++n)
        pSbr->uDfNoise[n] = Byte(pBits, 1);
    for (int32_t n = 0; n < pSbr->uNumNoiseBands; ++n)
        pSbr->uInvfMode[n] = Byte(pBits, 2);
    ParseEnvelopes(pBits, pSbr);
    ParseNoise(pBits, pSbr);

    pSbr->uAddHarmonicFlag = Byte(pBits, 1);
    memset(pSbr->uAddHarmonic, 0, sizeof pSbr->uAddHarmonic);
    if (pSbr->uAddHarmonicFlag)
        for (int32_t k = 0; k < pSbr->uNumHigh; ++k)
            pSbr->uAddHarmonic[k] = Byte(pBits, 1);

    if (Bits(pBits, 1) == 0) // bs_extended_data
        return 1;
    uint32_t uSize = Bits(pBits, 4);
    if (uSize == 15)
        uSize += Bits(pBits, 8); // bs_esc_count
    if (uSize == 0)
        return 1;
    // CONTRACT: only the first extension id is read; the rest of the extended data is left
    // unread.
    pSbr->uExtensionId = Byte(pBits, 2);
    return pSbr->uExtensionId == kExtensionIdPs ? 2 : 1;
}

} // namespace vorcal::aacparse::sbr

using namespace vorcal::aacparse::sbr;

extern "C" void sbrDecodeInitOnlyParsing(void *, VrSBRState_OnlyParsing *pSbr, uint32_t uSampleRate)
{
    pSbr->uSampleRate = uSampleRate;
    pSbr->uHeaderCount = 0;
    pSbr->iReset[0] = -1;
    pSbr->iReset[1] = -1;
    // sbr_header defaults (ISO/IEC 14496-3 4.5.2.8)
    pSbr->uAmpRes = 1;
    pSbr->uStartFreq = 5;
    pSbr->uFreqScale = 2;
    pSbr->uAlterScale = 1;
    pSbr->uNoiseBands = 2;
    pSbr->uLimiterBands = 2;
    pSbr->uLimiterGains = 2;
    pSbr->uInterpolFreq = 1;
    pSbr->uSmoothingMode = 1;
    pSbr->uTimeRate = 1;
}

int32_t vorcal::aacparse::sbr::ExtensionData(VrBitReader_OnlyParsing *pBits,
                                             VrSBRState_OnlyParsing *pSbr, uint32_t uElementId,
                                             bool &bTables)
{
    bTables = false;
    if (Bits(pBits, 4) == kExtensionSbrCrc)
        VrFlushBits_OnlyParsing(pBits, 10); // bs_sbr_crc_bits
    const uint32_t uHeaderFlag = Bits(pBits, 1);
    if (uHeaderFlag)
        ParseHeader(pBits, pSbr);
    pSbr->uSbrSeen = 1;

    const int32_t k0 = StartBand(*pSbr);
    const int32_t k2 = StopBand(*pSbr, k0);
    if (!WithinBandLimit(pSbr->uSampleRate, k0, k2) || !BuildBandTables(pSbr, k0, k2))
        return 1;
    bTables = true;

    if (uElementId == 0) // single channel element
        return ParseSingleChannel(pBits, pSbr, pSbr->uTimeRate ? 2 : 1);
    // CONTRACT: channel pair SBR data is not parsed.
    return uElementId == 1 ? 1 : 0;
}

extern "C" int32_t sbr_extension_dataOnlyParsing(VrBitReader_OnlyParsing *pBits,
                                                 VrSBRState_OnlyParsing *pSbr, uint32_t uElementId)
{
    bool bTables = false;
    return ExtensionData(pBits, pSbr, uElementId, bTables);
}
