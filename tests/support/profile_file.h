// Thumbnail profile files for tests.
#pragma once

#include <optional>
#include <string>
#include <vector>

namespace vela_test {

/// One section of a profile file; unset fields are omitted.
struct ProfileSection {
  std::string section;
  std::optional<int> size;
  std::optional<int> quality;
  std::optional<std::string> unsharp;
  std::optional<std::string> filename;
  std::optional<int> phase;
};

/// The file's text: the sections in the given order, one `key=value` per line.
std::string ProfileText(const std::vector<ProfileSection>& sections);

/// Writes it to `path` and returns `path`.
std::string WriteProfileFile(const std::string& path, const std::vector<ProfileSection>& sections);

/// A usual set: XL (1280) and M (320) in phase 0, B (640) in phase 1, S (120) in phase 2.
std::vector<ProfileSection> UsualProfiles();

}  // namespace vela_test
