// Version information.
#include <array>

#include <vorcal/core.h>

namespace {

constexpr std::array<int32_t, 3> kVersionNumbers = {1, 1, 2}; // major, minor, patch

} // namespace

extern "C" const char *vorCAL_GetVersion(void)
{
    return "0x00000001.0x00000001.0x00000002.";
}

extern "C" const char *vorCAL_GetVersionInfo(void)
{
    return "Tessalinova Codec Adaptation Layer Library Version Prx "
           "0x00000001.0x00000001.0x00000002. Build Date Jan  2 2012";
}

extern "C" int32_t vorCAL_GetVersionNum(uint32_t uIndex)
{
    return uIndex < kVersionNumbers.size() ? kVersionNumbers[uIndex] : 0;
}
