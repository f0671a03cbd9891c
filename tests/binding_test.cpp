// Calls and table reads inside libvorcal.so bind to the library's own definitions: this host
// defines functions and a table under the library's names (exported from the executable, so
// that the dynamic linker would hand them to the library if it asked), and the library's
// results stay its own.
#include <gtest/gtest.h>

#include <vector>

#include <vorcal/aacparse.h>
#include <vorcal/fixmath.h>

#include "adts_header.hpp"

// The host's own functions and table of the same names, deliberately different.
extern "C" int32_t Pow2_s(int32_t, int32_t) { return 0; }
extern "C" const uint32_t VrTBL_SampleRates_OnlyParsing[12] = {1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1};

namespace {

TEST(Binding, LibraryKeepsItsOwnDefinitions)
{
    ASSERT_EQ(Pow2_s(0, 0), 0); // the host's function is the one this program calls
    EXPECT_EQ(Pow_mn(9, 4, 1, 2), 6); // 4 (9/4)^(1/2) through the library's own Pow2_s
    std::vector<uint8_t> adts = vorcal::test::AdtsHeader(1, 4, 2, 64, 0x7FF); // 44100 Hz, stereo
    adts.resize(16);
    uint32_t uRate = 0, uChannels = 0, uSBR = 0, uAligned = 0, uBits = 0;
    ASSERT_EQ(VrAACSBRInfo(adts.data(), uint32_t(adts.size()), &uRate, &uChannels, &uSBR, &uAligned, &uBits), 0u);
    EXPECT_EQ(uRate, 44100u); // from the library's own rate table
}

} // namespace
