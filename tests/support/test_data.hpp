// Where the test data lives: the environment variable VORCAL_TEST_DATA_DIR when it is set (so
// that the suite runs on a device with the data copied elsewhere), else tests/data of the source
// tree; the AAC reference tables likewise VORCAL_AAC_TABLE_DIR, else aacparse/data. Every test
// program includes this header through the compiler (-include).
#pragma once

#include <string>

namespace vorcal::test {
std::string DataDir();
std::string AacTableDir();
} // namespace vorcal::test

// A std::string that still joins a string literal written after it: VORCAL_TEST_DATA_DIR "/x.tsv"
// and std::string(VORCAL_TEST_DATA_DIR) + "/x" both work.
#define VORCAL_TEST_DATA_DIR ::vorcal::test::DataDir() + ""
#define VORCAL_AAC_TABLE_DIR ::vorcal::test::AacTableDir() + ""
