// The report as one JSON object, written as the results become known.
#pragma once

#include <json/value.h>

#include <iosfwd>
#include <string>

#include "status_report.h"

namespace vela {

/// Stores the byte string under `key`. One that is not valid UTF-8 is stored there with replacement
/// characters, and exactly under `key` followed by "_base64".
void PutBytes(Json::Value& object, const std::string& key, const std::string& bytes);

/// Writes one object, member by member.
class JsonReport {
 public:
  explicit JsonReport(std::ostream& out) : out_(out) {}

  /// Writes a whole member.
  void Member(const char* key, const Json::Value& value);

  /// Begin and end a member that is a list; its elements are written in between.
  void BeginList(const char* key);
  void Element(const Json::Value& value);
  void EndList();

  /// Begin and end an element of that list, an object whose last member `key` is a list itself; the
  /// elements of that are written in between.
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
