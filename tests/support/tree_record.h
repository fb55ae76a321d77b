// The state of a whole directory tree, to compare it with a later one.
#pragma once

#include <map>
#include <string>
#include <vector>

namespace vela_test {

/// What a comparison of two records covers besides names, kinds and permission bits.
enum class RecordDetail {
  kContent,  ///< the content of files and links
  kAll       ///< that, the owners and the modification times, of directories too
};

/// Relative path ("" for the directory itself) to description.
using TreeRecord = std::map<std::string, std::string>;

/// Describes `directory` and everything below it. Links are not followed; nothing but
/// regular files is opened.
TreeRecord RecordTree(const std::string& directory, RecordDetail detail = RecordDetail::kAll);

/// One line for each path whose description differs; empty when the records are equal.
std::vector<std::string> Differences(const TreeRecord& before, const TreeRecord& after);

}  // namespace vela_test
