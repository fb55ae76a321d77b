#include "json_report.h"

#include <json/value.h>

#include <ostream>
#include <vector>

#include "index/strict_json.h"
#include "size_class_text.h"
#include "text_encoding.h"

namespace vela {

namespace {

/// Raised when a key changes its meaning or is removed; new keys do not change it.
constexpr int kFormat = 1;

Json::Value ToList(const std::vector<std::string>& texts) {
  Json::Value list(Json::arrayValue);
  for (const std::string& text : texts) {
    list.append(text);
  }
  return list;
}

Json::Value ToValue(int64_t number) {
  return Json::Value(static_cast<Json::Int64>(number));
}

void PutCounts(Json::Value& object, const StatusCounts& counts) {
  object["photos"] = ToValue(counts.photos);
  object["incomplete_photos"] = ToValue(counts.incompletePhotos);
  object["present_thumbs"] = ToValue(counts.presentThumbs);
  object["missing_thumbs"] = ToValue(counts.missingThumbs);
  object["failure_markers"] = ToValue(counts.failureMarkers);
  object["videos_needing_work"] = counts.videos ? ToValue(*counts.videos) : Json::Value();
}

Json::Value DescribePhoto(const PhotoReport& photo) {
  Json::Value object;
  PutBytes(object, "name", photo.Name());
  object["present"] = ToList(SizeClassesInState(photo, ThumbState::kPresent));
  object["missing"] = ToList(SizeClassesInState(photo, ThumbState::kMissing));
  object["outdated"] = ToList(SizeClassesInState(photo, ThumbState::kOutdated));
  object["failed"] = ToList(FailedSizeClasses(photo));
  return object;
}

}  // namespace

void PutBytes(Json::Value& object, const std::string& key, const std::string& bytes) {
  object[key] = ToUtf8(bytes);
  if (!IsUtf8(bytes)) {
    object[key + "_base64"] = ToBase64(bytes);
  }
}

void JsonReport::Separate() {
  if (!hasMembers_) {
    out_ << "{\"format\":" << kFormat;
    hasMembers_ = true;
  }
  out_ << ",\n";
}

void JsonReport::Member(const char* key, const Json::Value& value) {
  Separate();
  out_ << '"' << key << "\":" << ToJsonText(value);
}

void JsonReport::BeginList(const char* key) {
  Separate();
  out_ << '"' << key << "\":[";
  hasElements_ = false;
}

void JsonReport::Element(const Json::Value& value) {
  out_ << (hasElements_ ? ",\n" : "\n") << ToJsonText(value);
  hasElements_ = true;
}

void JsonReport::BeginElement(const Json::Value& object, const char* key) {
  std::string text = ToJsonText(object);
  text.pop_back();
  out_ << (hasElements_ ? ",\n" : "\n") << text << ",\"" << key << "\":[";
  hasElements_ = true;
  hasInnerElements_ = false;
}

void JsonReport::InnerElement(const Json::Value& value) {
  out_ << (hasInnerElements_ ? ",\n" : "\n") << ToJsonText(value);
  hasInnerElements_ = true;
}

void JsonReport::EndElement() {
  out_ << "]}";
}

void JsonReport::EndList() {
  out_ << "]";
}

void JsonReport::End() {
  out_ << "}\n";
}

JsonStatus::JsonStatus(JsonReport& report, bool listPhotos)
    : report_(report), listPhotos_(listPhotos), photoList_(Json::arrayValue) {
  report_.BeginList("directories");
}

void JsonStatus::TakePhoto(const PhotoReport& photo) {
  if (listPhotos_ && photo.thumbs.Missing() > 0) {
    photoList_.append(DescribePhoto(photo));
  }
}

void JsonStatus::EndDirectory(const DirectoryReport& directory) {
  Json::Value object;
  PutBytes(object, "path", directory.path);
  object["queued"] = directory.isQueued;
  PutCounts(object, directory.counts);
  if (listPhotos_) {
    object["photo_list"] = photoList_;
    photoList_ = Json::Value(Json::arrayValue);
  }
  report_.Element(object);
}

void JsonStatus::TakeTotals(const StatusTotals& totals) {
  report_.EndList();
  Json::Value object;
  object["directories"] = ToValue(totals.directories);
  object["queued_directories"] = ToValue(totals.queuedDirectories);
  PutCounts(object, totals.all);
  PutCounts(object["queued"], totals.queued);
  report_.Member("totals", object);
}

}  // namespace vela
