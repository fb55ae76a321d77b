// The sections of a profile file, with the numbers of their lines.
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <string_view>
#include <vector>

#include "checks/finding.h"

namespace vela {

/// A value and its line. Of a key given twice the last one holds.
struct ProfileValue {
  std::string text;
  int64_t line = 0;
};

/// A section that defines a thumbnail.
struct ProfileSection {
  std::string name;
  int64_t line = 0;
  std::map<std::string, ProfileValue, std::less<>> values;  ///< of known keys only

  /// Returns the value of the key, null when there is none.
  const ProfileValue* Find(std::string_view key) const;
};

/// The sections of a profile file that define thumbnails.
struct ProfileText {
  std::vector<ProfileSection> sections;  ///< in the order of the file
  bool isLoadable = true;                ///< false: a line makes velathumb reject the file
};

/// Reads the text of a profile file. Adds a finding for everything in it that is ignored or
/// invalid, whatever the values are.
ProfileText ReadProfileText(std::string_view text, FindingList& findings);

}  // namespace vela
