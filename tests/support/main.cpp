// The main function of every test program.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <system_error>
#include <vector>

#include "support/sandbox.h"

namespace {

constexpr const char* kOutputOption = "--gtest_output=";

bool StartsWith(const std::string& text, const std::string& beginning) {
  return text.compare(0, beginning.size(), beginning) == 0;
}

/// The build lists the tests, which needs no sandbox.
bool OnlyPrintsInformation(const std::vector<std::string>& arguments) {
  for (const std::string& argument : arguments) {
    if (StartsWith(argument, "--gtest_list_tests") || argument == "--help") {
      return true;
    }
  }
  return false;
}

/// Changes the path of a result file on the command line (xml:path or json:path) to its directory
/// in the sandbox; returns the original directory, empty when no result file is requested.
std::string RedirectResultFile(std::vector<std::string>* arguments) {
  for (std::string& argument : *arguments) {
    const size_t colon = argument.find(':');
    if (!StartsWith(argument, kOutputOption) || colon == std::string::npos) {
      continue;
    }
    const std::filesystem::path path = "." / std::filesystem::path(argument.substr(colon + 1));
    std::error_code error;  // a failure is detected when the directory is mounted
    std::filesystem::create_directories(path.parent_path(), error);
    argument =
        argument.substr(0, colon + 1) + vela_test::kWritablePlace + "/" + path.filename().string();
    return path.parent_path();
  }
  return "";
}

}  // namespace

int main(int argc, char** argv) {
  std::vector<std::string> arguments(argv, argv + argc);
  if (!OnlyPrintsInformation(arguments)) {
    vela_test::EnterSandbox(RedirectResultFile(&arguments));
  }
  std::vector<char*> pointers;
  pointers.reserve(arguments.size() + 1);
  for (std::string& argument : arguments) {
    pointers.push_back(argument.data());
  }
  pointers.push_back(nullptr);
  int count = argc;
  ::testing::InitGoogleMock(&count, pointers.data());
  return RUN_ALL_TESTS();
}
