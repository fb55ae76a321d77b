#include "status_program.h"

#include <gtest/gtest.h>
#include <json/reader.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstdint>
#include <memory>
#include <thread>

#include "support/sandbox.h"

namespace vela_test {

namespace {

/// The number of continuation bytes after the lead byte, -1 when it is not a lead byte.
int ContinuationBytes(unsigned char lead) {
  if (lead < 0x80) return 0;
  if (lead >= 0xc2 && lead < 0xe0) return 1;
  if (lead >= 0xe0 && lead < 0xf0) return 2;
  return lead >= 0xf0 && lead < 0xf5 ? 3 : -1;
}

bool IsEncodingOf(uint32_t character, int continuationBytes) {
  constexpr uint32_t kLowest[] = {0, 0x80, 0x800, 0x10000};
  const bool isSurrogate = character >= 0xd800 && character < 0xe000;
  return character >= kLowest[continuationBytes] && character < 0x110000 && !isSurrogate;
}

/// Judges by the definition, not by what the program uses.
bool IsValidUtf8(const std::string& text) {
  for (size_t i = 0; i < text.size();) {
    const auto lead = static_cast<unsigned char>(text[i++]);
    const int more = ContinuationBytes(lead);
    if (more < 0 || text.size() - i < static_cast<size_t>(more)) {
      return false;
    }
    uint32_t character = more == 0 ? lead : lead & (0x3fU >> more);
    for (int k = 0; k < more; ++k) {
      const auto byte = static_cast<unsigned char>(text[i++]);
      if ((byte & 0xc0) != 0x80) {
        return false;
      }
      character = character << 6 | (byte & 0x3fU);
    }
    if (!IsEncodingOf(character, more)) {
      return false;
    }
  }
  return true;
}

Json::CharReaderBuilder StrictReader() {
  Json::CharReaderBuilder builder;
  Json::CharReaderBuilder::strictMode(&builder.settings_);
  return builder;
}

}  // namespace

std::string StatusProgramPath() {
  return BuiltPath(VELATHUMB_STATUS_FILE);
}

ProgramResult RunStatus(const std::vector<std::string>& arguments, const ProgramOptions& options) {
  return RunProgram(StatusProgramPath(), arguments, options);
}

ProgramResult RunStatusAsOrdinaryUser(const std::vector<std::string>& arguments) {
  ProgramOptions options;
  options.beforeExec = {DropCapabilities()};
  return RunStatus(arguments, options);
}

bool WaitForOutput(const Program& program, const std::string& text) {
  for (int i = 0; i < 2000; ++i) {
    if (program.Output().find(text) != std::string::npos) {
      return true;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
  return false;
}

ProgramOptions WithOutputAt(int descriptor) {
  ProgramOptions options;
  options.beforeExec = {[descriptor] { return dup2(descriptor, STDOUT_FILENO) < 0 ? errno : 0; }};
  return options;
}

Json::Value ReadJson(const std::string& text) {
  EXPECT_TRUE(IsValidUtf8(text)) << text;
  Json::Value answer;
  std::string errors;
  const std::unique_ptr<Json::CharReader> reader(StrictReader().newCharReader());
  const char* begin = text.data();
  EXPECT_TRUE(reader->parse(begin, begin + text.size(), &answer, &errors)) << errors << "\n"
                                                                           << text;
  EXPECT_TRUE(answer.isObject()) << text;
  return answer;
}

Json::Value QueryJson(std::vector<std::string> arguments) {
  arguments.insert(arguments.begin(), "--json");
  return ReadJson(RunStatus(arguments).out);
}

}  // namespace vela_test
