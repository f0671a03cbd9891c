#include "test_data.hpp"

#include <cstdlib>

namespace {

std::string FromEnvironment(const char *pName, const char *pDefault)
{
    const char *pDir = std::getenv(pName);
    return pDir && *pDir ? pDir : pDefault;
}

} // namespace

std::string vorcal::test::DataDir()
{
    return FromEnvironment("VORCAL_TEST_DATA_DIR", VORCAL_TEST_DATA_DEFAULT);
}

std::string vorcal::test::AacTableDir()
{
    return FromEnvironment("VORCAL_AAC_TABLE_DIR", VORCAL_AAC_TABLE_DEFAULT);
}
