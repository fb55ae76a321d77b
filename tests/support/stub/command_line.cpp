#include "support/stub/command_line.h"

#include <sys/auxv.h>

#include <cstdio>
#include <set>

namespace vela_test {

namespace {

constexpr const char* kConverter = "convert-thumb";
constexpr const char* kFirstPage = "[0]";

/// The path given to exec, which argument zero need not be.
std::string StartedPath(const std::string& argumentZero) {
  const unsigned long address = getauxval(AT_EXECFN);
  // The kernel hands the address over as a number.
  const auto* path = reinterpret_cast<const char*>(address);  // NOLINT(performance-no-int-to-ptr)
  return path == nullptr ? argumentZero : path;
}

std::string WithoutEscapes(const std::string& text) {
  std::string plain;
  for (size_t i = 0; i < text.size(); ++i) {
    plain += text[i];
    if (text[i] == '%' && i + 1 < text.size() && text[i + 1] == '%') {
      ++i;
    }
  }
  return plain;
}

std::string WithoutPage(const std::string& input) {
  const size_t length = std::string(kFirstPage).size();
  const bool hasPage =
      input.size() > length && input.compare(input.size() - length, length, kFirstPage) == 0;
  return hasPage ? input.substr(0, input.size() - length) : input;
}

/// The first argument that is neither an option nor an option's operand.
std::string ConverterInput(const std::vector<std::string>& arguments) {
  static const std::set<std::string> kWithOperand = {"-define", "-rotate"};
  for (size_t i = 1; i < arguments.size(); ++i) {
    if (kWithOperand.count(arguments[i]) != 0) {
      ++i;
    } else if (arguments[i].empty() || arguments[i][0] != '-') {
      return WithoutPage(arguments[i]);
    }
  }
  return "";
}

std::vector<StubOutput> ConverterOutputs(const std::vector<std::string>& arguments) {
  std::vector<StubOutput> outputs;
  StubOutput next;
  for (size_t i = 1; i < arguments.size(); ++i) {
    const bool hasOperand = i + 1 < arguments.size();
    if (hasOperand && arguments[i] == "-thumbnail") {
      std::sscanf(arguments[i + 1].c_str(), "%dx%d", &next.width, &next.height);
    }
    const bool isWritten = hasOperand && arguments[i] == "-write";
    const bool isLast = i + 1 == arguments.size();
    if (isWritten || isLast) {
      next.path = WithoutEscapes(arguments[isWritten ? i + 1 : i]);
      outputs.push_back(next);
      i += isWritten ? 1 : 0;
    }
  }
  return outputs;
}

}  // namespace

StubCommandLine ReadCommandLine(int argc, char** argv) {
  StubCommandLine line;
  line.arguments.assign(argv, argv + argc);
  line.path = StartedPath(argc > 0 ? argv[0] : "");
  line.tool = line.path.substr(line.path.rfind('/') + 1);
  if (line.tool == kConverter) {
    line.source = ConverterInput(line.arguments);
    line.outputs = ConverterOutputs(line.arguments);
  } else if (argc > 1) {
    line.source = line.arguments.back();
  }
  return line;
}

}  // namespace vela_test
