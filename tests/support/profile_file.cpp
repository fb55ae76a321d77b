#include "support/profile_file.h"

#include "support/files.h"

namespace vela_test {

namespace {

void AddLine(const std::string& key, const std::optional<std::string>& value, std::string* text) {
  if (value) {
    *text += key + "=" + *value + "\n";
  }
}

void AddLine(const std::string& key, const std::optional<int>& value, std::string* text) {
  if (value) {
    *text += key + "=" + std::to_string(*value) + "\n";
  }
}

}  // namespace

std::string ProfileText(const std::vector<ProfileSection>& sections) {
  std::string text;
  for (const ProfileSection& section : sections) {
    text += "[" + section.section + "]\n";
    AddLine("size", section.size, &text);
    AddLine("quality", section.quality, &text);
    AddLine("unsharp", section.unsharp, &text);
    AddLine("filename", section.filename, &text);
    AddLine("phase", section.phase, &text);
  }
  return text;
}

std::string WriteProfileFile(const std::string& path, const std::vector<ProfileSection>& sections) {
  WriteFile(path, ProfileText(sections));
  return path;
}

std::vector<ProfileSection> UsualProfiles() {
  return {{"thumb_xl", 1280, 90, "0.5x0.5+1.25+0.0", "VELAPHOTO_THUMB_XL.jpg", 0},
          {"thumb_m", 320, 80, "0.5x0.5+1.25+0.0", "VELAPHOTO_THUMB_M.jpg", 0},
          {"thumb_b", 640, 80, "0.5x0.5+1.25+0.0", "VELAPHOTO_THUMB_B.jpg", 1},
          {"thumb_s", 120, 80, std::nullopt, "VELAPHOTO_THUMB_S.jpg", 2}};
}

}  // namespace vela_test
