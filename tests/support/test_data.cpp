#include "test_data.hpp"

#include <cstdlib>

std::string vorcal::test::DataDir()
{
    const char *pDir = std::getenv("VORCAL_TEST_DATA_DIR");
    return pDir && *pDir ? pDir : VORCAL_TEST_DATA_DEFAULT;
}
