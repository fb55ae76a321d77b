// The main function of the comparison, which keeps its results in a directory of the build.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <system_error>

#include "likeness/result.h"
#include "support/sandbox.h"

namespace {

/// Listing tests, which the build does, needs no sandbox.
bool OnlyListsTests(int argc, char** argv) {
  for (int i = 1; i < argc; ++i) {
    if (std::string(argv[i]).compare(0, 18, "--gtest_list_tests") == 0) {
      return true;
    }
  }
  return false;
}

/// The directory of the results; empty when there can be none.
std::string MadeResultsDirectory() {
  std::error_code error;
  std::filesystem::create_directories(vela_test::ResultsDirectory(), error);
  return error ? "" : vela_test::ResultsDirectory();
}

}  // namespace

int main(int argc, char** argv) {
  if (!OnlyListsTests(argc, argv)) {
    vela_test::EnterSandbox(MadeResultsDirectory());
  }
  ::testing::InitGoogleMock(&argc, argv);
  return RUN_ALL_TESTS();
}
