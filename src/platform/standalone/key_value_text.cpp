#include "platform/standalone/key_value_text.h"

#include "platform/standalone/white_space.h"

namespace vela {

namespace {

constexpr char kCommentMark = '#';

/// A pair as written in a line; both parts without surrounding white space.
struct WrittenPair {
  std::string_view key;
  std::string_view value;  // quotes and escapes included
};

std::optional<WrittenPair> ReadPair(std::string_view line) {
  const std::string_view text = Trimmed(line);
  if (text.empty() || text.front() == kCommentMark) {
    return std::nullopt;
  }
  const size_t equals = text.find('=');
  if (equals == std::string_view::npos) {
    return std::nullopt;
  }
  return WrittenPair{Trimmed(text.substr(0, equals)), Trimmed(text.substr(equals + 1))};
}

bool IsEscaped(char c) {
  return c == '"' || c == '\\';
}

/// Returns the text between the quotes; nothing when the closing quote is missing.
std::optional<std::string> Unquoted(std::string_view written) {
  if (written.empty() || written.front() != '"') {
    return std::nullopt;
  }
  std::string value;
  for (size_t i = 1; i < written.size(); ++i) {
    const char c = written[i];
    if (c == '"') {
      return value;
    }
    const bool isEscape = c == '\\' && i + 1 < written.size() && IsEscaped(written[i + 1]);
    if (isEscape) {
      ++i;
    }
    value += written[i];
  }
  return std::nullopt;
}

std::string Decoded(std::string_view written) {
  if (auto value = Unquoted(written)) {
    return *value;
  }
  return std::string(written);
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
    const auto pair = ReadPair(text.substr(line.begin, line.length));
    if (pair && pair->key == key) {
      return FoundPair{line, pair->value};
    }
    begin = line.next;
  }
  return std::nullopt;
}

}  // namespace

std::optional<std::string> FindValue(std::string_view text, std::string_view key) {
  const auto found = FindPair(text, key);
  if (!found) {
    return std::nullopt;
  }
  return Decoded(found->value);
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
