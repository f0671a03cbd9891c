// SBR frequency band tables (ISO/IEC 14496-3 4.6.18.3.2) in fixed point: the master table,
// the high- and low-resolution tables derived from it, and the noise floor bands.
#include <cstdint>

#include <vorcal/aacparse.h>
#include <vorcal/fixmath.h>

#include "aacparse/sbr_internal.hpp"

namespace vorcal::aacparse::sbr {
namespace {

constexpr int32_t kMaxBands = VR_SBR_MAX_BANDS;
constexpr int32_t kTwoRegionRatioQ15 = 73561; // k2 / k0 >= 2.2449 splits at k1 = 2 k0
constexpr int32_t kWarpQ14[2] = {16384, 21299}; // 1.0 and 1.3 for bs_alter_scale 0, 1

// Band widths of a logarithmic region kLo..kHi in n bands:
// round(kLo (kHi/kLo)^((k+1)/n)) - round(kLo (kHi/kLo)^(k/n)).
void LogWidths(int32_t kLo, int32_t kHi, int32_t n, int32_t *width)
{
    int32_t previous = Pow_mn(kHi, kLo, 0, n);
    for (int32_t k = 0; k < n; ++k) {
        const int32_t next = Pow_mn(kHi, kLo, k + 1, n);
        width[k] = next - previous;
        previous = next;
    }
}

// 2 round(bands log2(ratio) / (2 warp)) with the ratio and the logarithm in Q15, at most 64.
int32_t RegionBands(int32_t bands, int32_t kLo, int32_t kHi, int32_t warpQ14)
{
    const int32_t log2Q15 = VorLog2(Div_s(kHi, kLo));
    // Div_l(x, warp in Q14) is 2 x / warp in Q15; the half of a quarter of it rounds.
    const int32_t half = (Div_l(bands * log2Q15, warpQ14) + 65536) >> 17;
    const int32_t n = 2 * half;
    return n < 0 ? 0 : (n > kMaxBands ? kMaxBands : n);
}

// The master table into master[0..return]; -1 when it cannot be built within 64 bands.
int32_t MasterTable(int32_t k0, int32_t k2, uint32_t uFreqScale, uint32_t uAlterScale,
                    int32_t *master)
{
    int32_t width[2 * kMaxBands];
    int32_t numBands = 0;
    if (uFreqScale == 0) {
        // Linear spacing (4.6.18.3.2.1, bs_freq_scale 0).
        const int32_t dk = uAlterScale ? 2 : 1;
        numBands = uAlterScale ? 2 * ((k2 - k0 + 2) >> 2) : 2 * ((k2 - k0) >> 1);
        if (numBands < 1 || numBands > kMaxBands)
            return -1;
        for (int32_t k = 0; k < numBands; ++k)
            width[k] = dk;
        int32_t k2Diff = k2 - (k0 + numBands * dk);
        const int32_t incr = k2Diff > 0 ? -1 : 1;
        for (int32_t k = k2Diff > 0 ? numBands - 1 : 0; k2Diff != 0 && k >= 0 && k < numBands;
             k += incr) {
            width[k] -= incr;
            k2Diff += incr;
        }
    } else {
        const int32_t bands = uFreqScale == 1 ? 12 : uFreqScale == 2 ? 10 : 8;
        const bool twoRegions = Div_s(k2, k0) >= kTwoRegionRatioQ15;
        const int32_t k1 = twoRegions ? 2 * k0 : k2;
        const int32_t numBands0 = RegionBands(bands, k0, k1, kWarpQ14[0]);
        LogWidths(k0, k1, numBands0, width);
        SortAscending(width, numBands0);
        numBands = numBands0;
        if (twoRegions) {
            const int32_t numBands1 = RegionBands(bands, k1, k2, kWarpQ14[uAlterScale ? 1 : 0]);
            int32_t *width1 = width + numBands0;
            LogWidths(k1, k2, numBands1, width1);
            if (numBands0 > 0 && numBands1 > 0) {
                SortAscending(width1, numBands1);
                // The second region's narrowest band is widened to the first region's widest.
                const int32_t change = width[numBands0 - 1] - width1[0];
                if (change > 0) {
                    width1[0] += change;
                    width1[numBands1 - 1] -= change;
                }
            }
            SortAscending(width1, numBands1);
            numBands += numBands1;
        }
        if (numBands < 1 || numBands > kMaxBands)
            return -1;
    }
    master[0] = k0;
    for (int32_t k = 1; k <= numBands; ++k) {
        master[k] = master[k - 1] + width[k - 1];
        if (master[k] < 0 || master[k] > kMaxBands)
            return -1;
    }
    return numBands;
}

} // namespace

bool BuildBandTables(VrSBRState_OnlyParsing *pSbr, int32_t k0, int32_t k2)
{
    if (k0 < 1 || k2 > kMaxBands || k0 >= k2)
        return false;
    int32_t master[kMaxBands + 1];
    const int32_t numMaster = MasterTable(k0, k2, pSbr->uFreqScale, pSbr->uAlterScale, master);
    if (numMaster < 0 || pSbr->uXoverBand >= numMaster)
        return false;

    // High and low resolution tables (4.6.18.3.2.2).
    const int32_t numHigh = numMaster - pSbr->uXoverBand;
    const int32_t numLow = numHigh - (numHigh >> 1);
    const int32_t kx = master[pSbr->uXoverBand];
    // Noise floor bands (4.6.18.3.2.3): max(1, round(bs_noise_bands log2(k2 / kx))).
    int32_t numNoise = 1;
    if (pSbr->uNoiseBands != 0) {
        numNoise = (pSbr->uNoiseBands * VorLog2(Div_s(k2, kx)) + 16384) >> 15;
        if (numNoise < 1)
            numNoise = 1;
    }
    if (numNoise > VR_SBR_MAX_NOISE_BANDS)
        return false;

    pSbr->uNumMaster = static_cast<uint8_t>(numMaster);
    for (int32_t k = 0; k <= numMaster; ++k)
        pSbr->uMaster[k] = static_cast<uint8_t>(master[k]);
    pSbr->uNumHigh = static_cast<uint8_t>(numHigh);
    for (int32_t k = 0; k <= numHigh; ++k)
        pSbr->uHigh[k] = static_cast<uint8_t>(master[k + pSbr->uXoverBand]);
    pSbr->uNumLow = static_cast<uint8_t>(numLow);
    for (int32_t k = 0; k <= numLow; ++k)
        pSbr->uLow[k] = pSbr->uHigh[k == 0 ? 0 : 2 * k - (numHigh & 1)];
    pSbr->uNumNoiseBands = static_cast<uint8_t>(numNoise);
    int32_t i = 0;
    pSbr->uNoiseTable[0] = pSbr->uLow[0];
    for (int32_t k = 1; k <= numNoise; ++k) {
        i += (numLow - i) / (numNoise + 1 - k);
        pSbr->uNoiseTable[k] = pSbr->uLow[i];
    }
    return true;
}

} // namespace vorcal::aacparse::sbr
