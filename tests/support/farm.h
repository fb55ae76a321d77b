// A farm: a directory of the sandbox that shows the entries of the machine's directory of the same
// path as symbolic links, so that single entries can be added, removed and replaced.
#pragma once

#include <map>
#include <set>
#include <string>

namespace vela_test {

class Farm {
 public:
  /// Plants the farm at `path` (absolute; made when missing) from HostPath(path). The names in
  /// `own` are not planted and never touched by Restore; the names for which `hidden` is a
  /// beginning are not planted either.
  Farm(std::string path, std::set<std::string> own, const std::string& hidden = std::string());

  /// Brings the directory back to its first state, but for the entries of its own.
  void Restore() const;

  const std::string& Path() const { return path_; }

 private:
  std::string LinkTarget(int directory, const std::string& name, unsigned char type) const;
  void RemoveStrangers() const;
  void ReplantMissing() const;
  void MarkUntouched() const;
  bool IsUntouched() const;

  std::string path_;
  std::set<std::string> own_;
  std::map<std::string, std::string> links_;  // name to target
};

}  // namespace vela_test
