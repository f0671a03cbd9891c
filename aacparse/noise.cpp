// Perceptual noise substitution (ISO/IEC 14496-3 4.6.13): a band of random samples normalised
// to unit energy, with the block exponent of the result.
#include <vorcal/fixmath.h>

#include "aacparse/decoder.hpp"

namespace vorcal::aacparse {
namespace {

constexpr int16_t kNoExponent = -100;

// -15 minus the left shifts that bring the magnitude (the complement of a negative sample) to
// at least 16384. CONTRACT: a zero sample counts -15 and a sample of -1 (complement 0) -30.
int32_t SampleExponent(int16_t iSample)
{
    if (iSample == 0)
        return -15;
    const uint32_t m = static_cast<uint16_t>(iSample < 0 ? ~iSample : iSample);
    if (m == 0)
        return -30;
    // A magnitude of bit length L (1-15) needs 15 - L shifts; 16 bits (a complement) need none.
    const int32_t iShifts = m >= 16384 ? 0 : __builtin_clz(m) - 17;
    return -15 - iShifts;
}

} // namespace

void RandVector(int16_t *piVector, int16_t &iExponent, int32_t iLength, int32_t &iSeed)
{
    if (iLength < 1) {
        iExponent = kNoExponent;
        return;
    }
    // Band widths are multiples of 4 up to 96; anything else uses the nearest row.
    int32_t iRow = iLength / 4 - 1;
    iRow = iRow < 0 ? 0 : (iRow > 23 ? 23 : iRow);
    const int64_t iScale = norm_tblOnlyParsing[iRow];
    uint32_t uSeed = static_cast<uint32_t>(iSeed);
    int64_t iEnergy = 0;
    for (int32_t i = 0; i < iLength; ++i) {
        uSeed = 1664525u * uSeed + 1013904223u;
        const int64_t iRandom = static_cast<int32_t>(uSeed) >> 16;
        const auto iSample = static_cast<int16_t>((iScale * iRandom * 2) >> 16);
        piVector[i] = iSample;
        iEnergy += (int32_t{iSample} * iSample) >> 2;
    }
    iSeed = static_cast<int32_t>(uSeed);
    // Only lengths beyond the table can exceed 31 bits.
    const int32_t iEnergy32 = iEnergy > INT32_MAX ? INT32_MAX : static_cast<int32_t>(iEnergy);
    const int64_t iNorm = Inv_sqrt(iEnergy32) >> 1;
    int32_t iMax = kNoExponent;
    for (int32_t i = 0; i < iLength; ++i) {
        const auto iSample = static_cast<int16_t>((piVector[i] * iNorm) >> 21);
        piVector[i] = iSample;
        const int32_t e = SampleExponent(iSample);
        iMax = e > iMax ? e : iMax;
    }
    iExponent = static_cast<int16_t>(iMax);
}

} // namespace vorcal::aacparse

extern "C" void gen_rand_vectorOnlyParsing(int16_t *piVector, int16_t *piExponent, int32_t iLength,
                                           int32_t *piSeed)
{
    vorcal::aacparse::RandVector(piVector, *piExponent, iLength, *piSeed);
}
