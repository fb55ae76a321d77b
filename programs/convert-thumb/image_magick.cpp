#include "image_magick.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <optional>

#include "plan_parser.h"

namespace {

/// The first is a link to the second. A process is found by the name of the program it was started
/// from, which has to be the converter's.
constexpr const char* kPrograms[] = {"/usr/vela/lib/convert-thumb", "/usr/bin/convert-im6.q16"};
constexpr char kArgumentZero[] = "convert-thumb";

/// Bytes that mean nothing but themselves to ImageMagick, wherever they stand in a name.
bool IsPlainByte(unsigned char byte) {
  return byte >= 0x80 || (byte >= '0' && byte <= '9') || (byte >= 'A' && byte <= 'Z') ||
         (byte >= 'a' && byte <= 'z') || std::strchr("/._-+,= ", byte) != nullptr;
}

bool IsPlainName(const std::string& name) {
  if (name.empty() || name.front() == '-') {
    return false;
  }
  for (const char character : name) {
    if (character == '\0' || !IsPlainByte(static_cast<unsigned char>(character))) {
      return false;
    }
  }
  return true;
}

/// The file under a name that means nothing but itself. Its descriptor stays open in the program
/// that takes over.
std::optional<std::string> OpenUnderPlainName(const std::string& file) {
  const int descriptor = open(file.c_str(), O_RDONLY | O_NOCTTY);  // NOLINT
  if (descriptor < 0) {
    std::fprintf(stderr, "convert-thumb: %s: %s\n", file.c_str(), std::strerror(errno));
    return std::nullopt;
  }
  return "/proc/self/fd/" + std::to_string(descriptor);
}

/// Without its name, an output does not tell its format.
std::string FormatPrefix(const std::string& path) {
  const size_t dot = path.find_last_of("./");
  if (dot == std::string::npos || path[dot] != '.' || !IsPlainName(path.substr(dot + 1))) {
    return "";
  }
  return path.substr(dot + 1) + ":";
}

/// False when the source has to be opened and cannot be.
bool MakeSourceSafe(std::vector<std::string>& arguments) {
  const size_t place = FindSourceArgument(arguments);
  if (place == arguments.size()) {
    return true;
  }
  const std::string source = arguments[place];
  const std::string file = SourceFile(source);
  if (IsPlainName(file)) {
    return true;
  }
  const std::optional<std::string> plain = OpenUnderPlainName(file);
  if (!plain) {
    return false;
  }
  arguments[place] = *plain + source.substr(file.size());
  if (place + 1 < arguments.size() && arguments.back() == file) {
    // A photo that is turned in place: opened by that name again, and cut, when it is written.
    arguments.back() = FormatPrefix(file) + *plain;
  }
  return true;
}

std::vector<char*> ArgumentVector(std::string& argumentZero, std::vector<std::string>& arguments) {
  std::vector<char*> vector = {argumentZero.data()};
  for (std::string& argument : arguments) {
    vector.push_back(argument.data());
  }
  vector.push_back(nullptr);
  return vector;
}

}  // namespace

void HandOver(const std::vector<std::string>& arguments) {
  std::vector<std::string> handed = arguments;
  if (!MakeSourceSafe(handed)) {
    return;
  }
  std::string argumentZero = kArgumentZero;
  std::vector<char*> vector = ArgumentVector(argumentZero, handed);
  for (const char* const program : kPrograms) {
    execv(program, vector.data());
  }
  std::fprintf(stderr, "convert-thumb: %s: %s\n", kPrograms[0], std::strerror(errno));
}
