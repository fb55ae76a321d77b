// The main function of the comparison, which stores its results in the build directory.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <system_error>

#include "likeness/result.h"
#include "support/sandbox.h"

namespace {

/// The build lists the tests, which needs no sandbox.
bool OnlyListsTests(int argc, char** argv) {
  for (int i = 1; i < argc; ++i) {
    if (std::string(argv[i]).compare(0, 18, "--gtest_list_tests") == 0) {
      return true;
    }
  }
  return false;
}

/// Creates the directory of the results; empty when that fails.
std::string MakeResultsDirectory() {
  std::error_code error;
  std::filesystem::create_directories(vela_test::ResultsDirectory(), error);
  return error ? "" : vela_test::ResultsDirectory();
}

}  // namespace

int main(int argc, char** argv) {
  if (!OnlyListsTests(argc, argv)) {
    vela_test::EnterSandbox(MakeResultsDirectory());
  }
  ::testing::InitGoogleMock(&argc, argv);
  return RUN_ALL_TESTS();
}
