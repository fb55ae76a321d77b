#include <ini.h>

#include <algorithm>
#include <charconv>
#include <climits>
#include <cstring>
#include <exception>
#include <map>
#include <mutex>
#include <string_view>

#include "configuration/section_text.h"
#include "configuration/text_lines.h"
#include "platform/standalone/last_error.h"
#include "platform/velautils.h"
#include "posix/file_content.h"

namespace VELAUtils {

namespace {

struct Section {
  std::string name;
  std::map<std::string, std::string> values;
};

/// By default inih also accepts values that continue in the next line and comments after values,
/// and limits the length of lines.
void SetDialect() {
  static std::once_flag isSet;
  std::call_once(isSet, [] {
    ini_allow_multiline = false;
    ini_allow_inline_comments = false;
    ini_allow_no_value = false;
    ini_allow_bom = true;
    ini_use_stack = false;
    ini_allow_realloc = true;
    ini_max_line = INT_MAX / 4;
  });
}

/// Feeds inih line by line. Because inih ignores empty sections, truncates section names and treats
/// a colon as an equals sign, sections and keys are stored here, and inih gets lines with short
/// placeholders.
class LineFeed {
 public:
  LineFeed(std::string_view text, std::vector<Section>& sections)
      : lines_(text), sections_(sections) {}

  /// The reader for inih, which works like fgets.
  static char* Read(char* buffer, int size, void* feed);

  /// The handler for inih.
  static int Store(void* feed, const char* section, const char* name, const char* value);

  /// Returns whether all lines so far were valid.
  bool IsValid() const { return isValid_; }

 private:
  bool PrepareLine();
  void PrepareSection(std::string_view name);
  char* Copy(char* buffer, size_t size);

  vela::TextLines lines_;
  std::vector<Section>& sections_;
  bool isValid_ = true;
  std::string line_;    // prepared, with its newline
  size_t given_ = 0;    // how much of it inih has read
  size_t section_ = 0;  // number from 1, 0 before the first
  std::string key_;
};

char* LineFeed::Read(char* buffer, int size, void* feed) {
  auto* self = static_cast<LineFeed*>(feed);
  if (size < 2) {
    return nullptr;
  }
  const bool isLineGiven = self->given_ == self->line_.size();
  if (isLineGiven && !self->PrepareLine()) {
    return nullptr;
  }
  return self->Copy(buffer, static_cast<size_t>(size));
}

char* LineFeed::Copy(char* buffer, size_t size) {
  const size_t length = std::min(size - 1, line_.size() - given_);
  memcpy(buffer, line_.data() + given_, length);
  buffer[length] = '\0';
  given_ += length;
  return buffer;
}

/// Returns false at the end, and for an invalid line.
bool LineFeed::PrepareLine() {
  if (!isValid_ || !lines_.Next()) {
    return false;
  }
  given_ = 0;
  line_ = "\n";
  const vela::SectionLine line = vela::ParseSectionLine(lines_.Line(), lines_.Number() == 1);
  switch (line.kind) {
    case vela::SectionLine::Kind::kBlank:
      break;
    case vela::SectionLine::Kind::kSection:
      PrepareSection(line.name);
      break;
    case vela::SectionLine::Kind::kPair:
      key_ = line.name;
      line_ = "key=";
      line_.append(line.value);
      line_ += '\n';
      break;
    case vela::SectionLine::Kind::kInvalid:
      isValid_ = false;
      break;
  }
  return isValid_;
}

void LineFeed::PrepareSection(std::string_view name) {
  const auto known = std::find_if(sections_.begin(), sections_.end(),
                                  [&](const Section& section) { return section.name == name; });
  section_ = static_cast<size_t>(known - sections_.begin()) + 1;
  if (known == sections_.end()) {
    sections_.push_back({std::string(name), {}});
  }
  line_ = "[" + std::to_string(section_) + "]\n";
}

int LineFeed::Store(void* feed, const char* section, const char* /*name*/, const char* value) {
  auto* self = static_cast<LineFeed*>(feed);
  size_t number = 0;
  std::from_chars(section, section + strlen(section), number);
  if (number != 0) {
    self->sections_[number - 1].values[self->key_] = value;
  }
  return 1;
}

/// Returns false when the text contains an invalid line.
bool Parse(std::string_view text, std::vector<Section>& sections) {
  SetDialect();
  LineFeed feed(text, sections);
  return ini_parse_stream(LineFeed::Read, &feed, LineFeed::Store, &feed) == 0 && feed.IsValid();
}

}  // namespace

struct ConfParser::Content {
  std::vector<Section> sections;

  /// Returns the key's value, null when it is absent.
  const std::string* Find(const std::string& section, const std::string& key) const;
};

const std::string* ConfParser::Content::Find(const std::string& section,
                                             const std::string& key) const {
  const auto named = std::find_if(sections.begin(), sections.end(),
                                  [&](const Section& one) { return one.name == section; });
  if (named == sections.end()) {
    return nullptr;
  }
  const auto value = named->values.find(key);
  return value == named->values.end() ? nullptr : &value->second;
}

ConfParser::ConfParser() : content_(std::make_unique<Content>()) {}

ConfParser::~ConfParser() = default;

bool ConfParser::loadFromFile(const std::string& path) {
  content_->sections.clear();
  std::string text;
  const int error = vela::ReadFile(path.c_str(), text);
  if (error != 0) {
    vela::SetLastError(error);
    return false;
  }
  std::vector<Section> sections;
  if (text.size() > vela::kLargestSectionText || !Parse(text, sections)) {
    vela::SetLastError(EINVAL);
    return false;
  }
  content_->sections = std::move(sections);
  return true;
}

std::vector<std::string> ConfParser::enumSections() const {
  std::vector<std::string> names;
  names.reserve(content_->sections.size());
  for (const Section& section : content_->sections) {
    names.push_back(section.name);
  }
  return names;
}

int ConfParser::getInt(const std::string& section, const std::string& key, int defaultValue) const {
  const std::string* value = content_->Find(section, key);
  if (value == nullptr) {
    return defaultValue;
  }
  const auto integer = vela::ParseLeadingInteger(*value);
  return integer ? integer->number : defaultValue;
}

std::string ConfParser::getString(const std::string& section, const std::string& key,
                                  const std::string& defaultValue) const {
  const std::string* value = content_->Find(section, key);
  return value == nullptr ? defaultValue : *value;
}

}  // namespace VELAUtils
