#include <gtest/gtest.h>

#include <vorcal/core.h>

#include "recording_sal.hpp"

TEST(Version, Strings)
{
    EXPECT_STREQ(vorCAL_GetVersion(), "0x00000001.0x00000001.0x00000002.");
}
