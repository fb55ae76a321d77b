#include "configuration/key_value_text.h"

#include "configuration/white_space.h"

namespace vela {

namespace {

constexpr char kCommentMark = '#';

bool IsEscaped(char c) {
  return c == '"' || c == '\\';
}

std::string MakeLine(std::string_view key, std::string_view value) {
  std::string line(key);
  line += "=\"";
  for (const char c : value) {
    if (IsEscaped(c)) {
      line += '\\';
    }
    line += c;
  }
  line += "\"\n";
  return line;
}

/// The position of one line in its text.
struct Line {
  size_t begin;
  size_t length;  // without the newline
  size_t next;    // start of the following line
};

Line LineAt(std::string_view text, size_t begin) {
  const size_t newline = text.find('\n', begin);
  if (newline == std::string_view::npos) {
    return {begin, text.size() - begin, text.size()};
  }
  return {begin, newline - begin, newline + 1};
}

struct FoundPair {
  Line line;
  std::string_view value;
};

std::optional<FoundPair> FindPair(std::string_view text, std::string_view key) {
  for (size_t begin = 0; begin < text.size();) {
    const Line line = LineAt(text, begin);
    const KeyValueLine parsed = ParseKeyValueLine(text.substr(line.begin, line.length));
    if (parsed.kind == KeyValueLine::Kind::kPair && parsed.key == key) {
      return FoundPair{line, parsed.written};
    }
    begin = line.next;
  }
  return std::nullopt;
}

}  // namespace

KeyValueLine ParseKeyValueLine(std::string_view line) {
  const std::string_view text = Trimmed(line);
  if (text.empty() || text.front() == kCommentMark) {
    return {};
  }
  const size_t equals = text.find('=');
  if (equals == std::string_view::npos) {
    return {KeyValueLine::Kind::kInvalid};
  }
  return {KeyValueLine::Kind::kPair, Trimmed(text.substr(0, equals)),
          Trimmed(text.substr(equals + 1))};
}

DecodedValue DecodeValue(std::string_view written) {
  if (written.empty() || written.front() != '"') {
    return {std::string(written)};
  }
  DecodedValue value;
  for (size_t i = 1; i < written.size(); ++i) {
    if (written[i] == '"') {
      value.rest = Trimmed(written.substr(i + 1));
      return value;
    }
    const bool isEscape = written[i] == '\\' && i + 1 < written.size() && IsEscaped(written[i + 1]);
    if (isEscape) {
      ++i;
    }
    value.text += written[i];
  }
  return {std::string(written), true};
}

std::optional<std::string> FindValue(std::string_view text, std::string_view key) {
  const auto found = FindPair(text, key);
  if (!found) {
    return std::nullopt;
  }
  return DecodeValue(found->value).text;
}

std::string WithValue(std::string_view text, std::string_view key, std::string_view value) {
  std::string result;
  if (const auto found = FindPair(text, key)) {
    result.append(text.substr(0, found->line.begin));
    result.append(MakeLine(key, value));
    result.append(text.substr(found->line.next));
    return result;
  }
  result.append(text);
  if (!result.empty() && result.back() != '\n') {
    result += '\n';
  }
  result.append(MakeLine(key, value));
  return result;
}

bool IsStorable(std::string_view key, std::string_view value) {
  if (key.empty() || key.front() == kCommentMark || Trimmed(key) != key) {
    return false;
  }
  if (key.find_first_of("=\n") != std::string_view::npos) {
    return false;
  }
  return value.find('\n') == std::string_view::npos;
}

}  // namespace vela
