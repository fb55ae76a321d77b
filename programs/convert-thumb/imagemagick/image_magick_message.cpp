#include "imagemagick/image_magick_message.h"

#include <algorithm>
#include <iterator>

namespace vela {

namespace {

/// Between a message and its kind, which the place in the sources follows.
constexpr std::string_view kSource = " @ ";
constexpr std::string_view kErrorSource = " @ error/";
constexpr std::string_view kDescriptor = "/proc/self/fd/";

/// Sources whose errors are consequences of what a decoder has reported before or after them.
constexpr std::string_view kGeneralSources[] = {"cache.c",     "convert.c",    "deprecate.c",
                                                "image.c",     "magick-cli.c", "mogrify.c",
                                                "operation.c", "resize.c"};

std::string_view TakeLine(std::string_view& text) {
  const std::string_view line = text.substr(0, text.find('\n'));
  text.remove_prefix(std::min(text.size(), line.size() + 1));
  return line;
}

/// How much a line says about the photo.
enum class Weight { kNone, kOther, kGeneralError, kDecoderError };

Weight WeightOf(std::string_view line) {
  const size_t place = line.rfind(kErrorSource);
  if (place == std::string_view::npos) {
    return line.empty() ? Weight::kNone : Weight::kOther;
  }
  const std::string_view source = line.substr(place + kErrorSource.size());
  const bool isGeneral = std::any_of(
      std::begin(kGeneralSources), std::end(kGeneralSources),
      [&](std::string_view general) { return source.substr(0, general.size()) == general; });
  return isGeneral ? Weight::kGeneralError : Weight::kDecoderError;
}

/// Returns the first of the lines with the greatest weight.
std::string_view ChooseLine(std::string_view messages) {
  std::string_view best;
  while (!messages.empty()) {
    const std::string_view line = TakeLine(messages);
    best = WeightOf(line) > WeightOf(best) ? line : best;
  }
  return best;
}

/// Removes the name that the photo or an output had for ImageMagick, and the space before it.
/// Version 7 quotes it with two apostrophes.
void RemoveDescriptor(std::string& message) {
  const size_t descriptor = message.find(kDescriptor);
  if (descriptor == std::string::npos) {
    return;
  }
  const size_t quote = message.find_last_of("`'", descriptor);
  const size_t end = message.find('\'', descriptor);
  if (quote != std::string::npos && end != std::string::npos) {
    const size_t begin = quote > 0 && message[quote - 1] == ' ' ? quote - 1 : quote;
    message.erase(begin, end + 1 - begin);
  }
}

/// The program's name is that of its link or of its file.
std::string_view WithoutProgramName(std::string_view line) {
  constexpr std::string_view kSeparator = ": ";
  const size_t end = line.find(kSeparator);
  const bool isNamed = line.substr(0, 7) == "convert" && end != std::string_view::npos &&
                       line.substr(0, end).find(' ') == std::string_view::npos;
  return isNamed ? line.substr(end + kSeparator.size()) : line;
}

}  // namespace

std::string MainMessage(std::string_view messages) {
  std::string_view line = WithoutProgramName(ChooseLine(messages));
  line = line.substr(0, line.rfind(kSource));
  std::string message(line);
  RemoveDescriptor(message);
  return message;
}

}  // namespace vela
