#include "configuration/section_text.h"

#include <charconv>
#include <climits>
#include <system_error>

#include "configuration/white_space.h"

namespace vela {

namespace {

using Kind = SectionLine::Kind;

constexpr std::string_view kByteOrderMark = "\xEF\xBB\xBF";

constexpr SectionLine kInvalidLine = {Kind::kInvalid};

SectionLine ParseSection(std::string_view line) {
  if (line.find(']') != line.size() - 1) {
    return kInvalidLine;
  }
  const std::string_view name = Trimmed(line.substr(1, line.size() - 2));
  return name.empty() ? kInvalidLine : SectionLine{Kind::kSection, name};
}

SectionLine ParsePair(std::string_view line) {
  const size_t equals = line.find('=');
  if (equals == std::string_view::npos) {
    return kInvalidLine;
  }
  const std::string_view key = Trimmed(line.substr(0, equals));
  return key.empty() ? kInvalidLine
                     : SectionLine{Kind::kPair, key, Trimmed(line.substr(equals + 1))};
}

}  // namespace

SectionLine ParseSectionLine(std::string_view line, bool isFirstLine) {
  if (isFirstLine && line.substr(0, kByteOrderMark.size()) == kByteOrderMark) {
    line.remove_prefix(kByteOrderMark.size());
  }
  line = Trimmed(line);
  if (line.find('\0') != std::string_view::npos) {
    return kInvalidLine;
  }
  if (line.empty() || line.front() == ';' || line.front() == '#') {
    return {};
  }
  return line.front() == '[' ? ParseSection(line) : ParsePair(line);
}

std::optional<LeadingInteger> ParseLeadingInteger(std::string_view text) {
  if (!text.empty() && text.front() == '+') {
    text.remove_prefix(1);
    if (!text.empty() && text.front() == '-') {
      return std::nullopt;
    }
  }
  LeadingInteger result;
  const char* const end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, result.number);
  if (error == std::errc::invalid_argument) {
    return std::nullopt;
  }
  if (error == std::errc::result_out_of_range) {
    result.number = text.front() == '-' ? INT_MIN : INT_MAX;
  }
  result.rest = std::string_view(stop, static_cast<size_t>(end - stop));
  return result;
}

}  // namespace vela
