// Everything the tool tells as one JSON object, written as it becomes known.
#pragma once

#include <json/value.h>

#include <iosfwd>
#include <string>

#include "status_report.h"

namespace vela {

/// Stores the byte string under `key`; one that is no valid UTF-8 with replacement characters, and
/// exactly under the key with "_base64" behind it.
void PutBytes(Json::Value& object, const std::string& key, const std::string& bytes);

/// Returns the value as compact JSON without a newline.
std::string ToJsonLine(const Json::Value& value);

/// Writes one object, member by member.
class JsonReport {
 public:
  explicit JsonReport(std::ostream& out) : out_(out) {}

  /// Writes a whole member.
  void Member(const char* key, const Json::Value& value);

  /// Writes a member that is a list: between the two calls its elements.
  void BeginList(const char* key);
  void Element(const Json::Value& value);
  void EndList();

  /// Writes an element of that list, an object whose last member `key` is a list itself: between
  /// the two calls its elements.
  void BeginElement(const Json::Value& object, const char* key);
  void InnerElement(const Json::Value& value);
  void EndElement();

  /// Writes the end of the object.
  void End();

 private:
  void Separate();

  std::ostream& out_;
  bool hasMembers_ = false;
  bool hasElements_ = false;
  bool hasInnerElements_ = false;
};

/// Writes "directories" and "totals".
class JsonStatus : public StatusSink {
 public:
  JsonStatus(JsonReport& report, bool listPhotos);

  void TakePhoto(const PhotoReport& photo) override;
  void EndDirectory(const DirectoryReport& directory) override;
  void TakeTotals(const StatusTotals& totals) override;

 private:
  JsonReport& report_;
  const bool listPhotos_;
  Json::Value photoList_;
};

}  // namespace vela
