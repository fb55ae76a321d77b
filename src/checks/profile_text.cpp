#include "checks/profile_text.h"

#include <algorithm>
#include <unordered_map>

#include "checks/similar_name.h"
#include "configuration/profile_values.h"
#include "configuration/section_text.h"
#include "configuration/text_lines.h"
#include "configuration/white_space.h"

namespace vela {

namespace {

const std::vector<std::string_view> kKeys = {kFilenameKey, kSizeKey, kQualityKey, kUnsharpKey,
                                             kPhaseKey};

/// Returns what a message about the unknown key ends with.
std::string KeySuggestion(std::string_view key) {
  const std::string suggestion = SuggestName(key, kKeys);
  return suggestion.empty() ? "; the keys are " + NameList(kKeys) : suggestion;
}

std::string DescribeInvalidLine(std::string_view line) {
  if (line.find('\0') != std::string_view::npos) {
    return "the line contains a zero byte";
  }
  const std::string_view text = Trimmed(line);
  if (text.front() == '[') {
    return "a section is a name in brackets, alone in its line: " + Quoted(text);
  }
  return "neither [section] nor key = value nor a comment: " + Quoted(text);
}

class ProfileReader {
 public:
  explicit ProfileReader(FindingList& findings) : findings_(findings) {}

  void ReadLine(std::string_view line, int64_t number);

  ProfileText Take() { return std::move(profile_); }

 private:
  /// The kind of the section that a line belongs to.
  enum class Place { kNoSection, kOtherSection, kThumbSection };

  void BeginSection(std::string_view name, int64_t number);
  void ReadPair(const SectionLine& line, int64_t number);

  FindingList& findings_;
  ProfileText profile_;
  Place place_ = Place::kNoSection;
  size_t current_ = 0;                                    // of the sections
  std::unordered_map<std::string_view, size_t> numbers_;  // of the sections by name, in the text
};

void ProfileReader::ReadLine(std::string_view line, int64_t number) {
  const SectionLine parsed = ParseSectionLine(line, number == 1);
  switch (parsed.kind) {
    case SectionLine::Kind::kBlank:
      break;
    case SectionLine::Kind::kSection:
      BeginSection(parsed.name, number);
      break;
    case SectionLine::Kind::kPair:
      ReadPair(parsed, number);
      break;
    case SectionLine::Kind::kInvalid:
      profile_.isLoadable = false;
      findings_.Add(number, Severity::kError,
                    DescribeInvalidLine(line) + "; the whole file is rejected");
      break;
  }
}

void ProfileReader::BeginSection(std::string_view name, int64_t number) {
  if (!IsThumbSection(name)) {
    place_ = Place::kOtherSection;
    findings_.Warn(number, "the section " + Quoted(name) +
                               " is ignored: the name of a thumbnail's section begins with " +
                               Quoted(kThumbSectionPrefix));
    return;
  }
  place_ = Place::kThumbSection;
  auto& sections = profile_.sections;
  const auto [known, isNew] = numbers_.emplace(name, sections.size());
  current_ = known->second;
  if (isNew) {
    sections.push_back({std::string(name), number, {}});
    return;
  }
  findings_.Warn(number, "the section " + Quoted(name) + " is already in line " +
                             std::to_string(sections[current_].line) +
                             "; both define one thumbnail");
}

void ProfileReader::ReadPair(const SectionLine& line, int64_t number) {
  if (place_ == Place::kNoSection) {
    findings_.Warn(number, "the line is ignored: it is before the first section");
    return;
  }
  if (place_ == Place::kOtherSection) {
    return;
  }
  if (std::find(kKeys.begin(), kKeys.end(), line.name) == kKeys.end()) {
    findings_.Warn(number, "there is no key " + Quoted(line.name) + KeySuggestion(line.name));
    return;
  }
  auto& values = profile_.sections[current_].values;
  const auto [known, isFirst] = values.emplace(line.name, ProfileValue());
  if (!isFirst) {
    findings_.Warn(known->second.line, "the line is ignored: " + std::string(line.name) +
                                           " is given again in line " + std::to_string(number));
  }
  known->second = {std::string(line.value), number};
}

}  // namespace

const ProfileValue* ProfileSection::Find(std::string_view key) const {
  const auto found = values.find(key);
  return found == values.end() ? nullptr : &found->second;
}

ProfileText ReadProfileText(std::string_view text, FindingList& findings) {
  ProfileReader reader(findings);
  for (TextLines lines(text); lines.Next();) {
    reader.ReadLine(lines.Line(), lines.Number());
  }
  return reader.Take();
}

}  // namespace vela
