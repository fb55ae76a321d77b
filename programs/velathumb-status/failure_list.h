// The failed photos, one after the other.
#pragma once

#include <json/value.h>

#include <iosfwd>

#include "status_report.h"

namespace vela {

/// Writes a line for each failed photo: its path, the reason, the sizes and the time.
class FailureLines : public StatusSink {
 public:
  explicit FailureLines(std::ostream& out) : out_(out) {}

  void TakePhoto(const PhotoReport& photo) override;

 private:
  std::ostream& out_;
};

/// Writes the path of each failed photo, unchanged and followed by a null byte.
class FailurePaths : public StatusSink {
 public:
  explicit FailurePaths(std::ostream& out) : out_(out) {}

  void TakePhoto(const PhotoReport& photo) override;

 private:
  std::ostream& out_;
};

/// Collects the failed photos as a JSON list.
class FailureValues : public StatusSink {
 public:
  void TakePhoto(const PhotoReport& photo) override;

  const Json::Value& List() const { return list_; }

 private:
  Json::Value list_{Json::arrayValue};
};

}  // namespace vela
