// Where the test data lives: the environment variable VORCAL_TEST_DATA_DIR when it is set (so
// that the suite runs on a device with the data copied elsewhere), else tests/data of the source
// tree. Every test program includes this header through the compiler (-include).
#pragma once

namespace vorcal::test {
const char *DataDir();
} // namespace vorcal::test

#define VORCAL_TEST_DATA_DIR ::vorcal::test::DataDir()
