#include "failure_list.h"

#include <ctime>
#include <ostream>
#include <string>
#include <vector>

#include "json_report.h"
#include "size_class_text.h"
#include "text_encoding.h"

namespace vela {

namespace {

std::string LocalTime(time_t time) {
  struct tm local = {};
  char text[64] = "";
  const bool isKnown = localtime_r(&time, &local) != nullptr &&
                       std::strftime(text, sizeof text, "%Y-%m-%d %H:%M", &local) > 0;
  return isKnown ? text : std::to_string(time);
}

std::string Joined(const std::vector<std::string>& names) {
  std::string text;
  for (const std::string& name : names) {
    text += (text.empty() ? "" : ", ") + name;
  }
  return text;
}

}  // namespace

void FailureLines::TakePhoto(const PhotoReport& photo) {
  if (const std::optional<time_t> since = photo.FirstFailure()) {
    out_ << ToPlainLine(photo.path) << ": " << ToPlainLine(photo.reason) << " ("
         << Joined(FailedSizeClasses(photo)) << " since " << LocalTime(*since) << ")\n";
  }
}

void FailurePaths::TakePhoto(const PhotoReport& photo) {
  if (photo.FailureCount() > 0) {
    out_ << photo.path << '\0';
  }
}

void FailureValues::TakePhoto(const PhotoReport& photo) {
  const std::optional<time_t> since = photo.FirstFailure();
  if (!since) {
    return;
  }
  Json::Value object;
  PutBytes(object, "path", photo.path);
  object["kinds"] = Json::Value(Json::arrayValue);
  for (const std::string& name : FailedSizeClasses(photo)) {
    object["kinds"].append(name);
  }
  object["since"] = Json::Value(static_cast<Json::Int64>(*since));
  PutBytes(object, "reason", photo.reason);
  list_.append(object);
}

}  // namespace vela
