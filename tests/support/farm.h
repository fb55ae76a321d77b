// A symlink farm: a directory of the sandbox with symbolic links to the entries of the machine's
// directory of the same path, so that single entries can be added, removed and replaced.
#pragma once

#include <map>
#include <set>
#include <string>

namespace vela_test {

class Farm {
 public:
  /// Creates the farm at `path` (absolute; created when missing) from HostPath(path), empty when
  /// the machine has no such directory. The names in `own` are not linked and never touched by
  /// Restore; names that begin with `hidden` are not linked either.
  Farm(std::string path, std::set<std::string> own, const std::string& hidden = std::string());

  /// Restores the directory to its first state, except for the names in `own`.
  void Restore() const;

  const std::string& Path() const { return path_; }

 private:
  std::string LinkTarget(int directory, const std::string& name, unsigned char type) const;
  void RemoveOthers() const;
  void LinkMissing() const;
  void MarkUntouched() const;
  bool IsUntouched() const;

  std::string path_;
  std::set<std::string> own_;
  std::map<std::string, std::string> links_;  // name to target
};

}  // namespace vela_test
