// The six operations of the index daemon's client, for tests that loop over all of them.
#pragma once

#include <json/json.h>

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "ipc/velamk_ipc.h"
#include "platform/velaindex.h"
#include "support/quiet_test.h"

namespace vela_test {

/// One operation and its expected effects.
struct ClientOperation {
  std::string command;   ///< the command word it sends
  bool sendsPath;        ///< whether its request names a path
  int failure;           ///< result of `call` when the daemon fails
  std::string failLine;  ///< the line that it then logs
  /// Calls it for a path; returns its result, a bool as 0 or 1, 0 for none.
  std::function<int(const char* path)> call;
};

inline int AskMedia(const char* path) {
  VELA_MEDIA_INFO media = {};
  return GetMediaFromPluginDB(THUMB_TYPE_PHOTO, path, media);
}

inline std::vector<ClientOperation> ClientOperations() {
  return {
      {"GET_MEDIA_FROM_PLUGIN_DB", true, -1, "velamk_ipc:30 fail", AskMedia},
      {"GET_INDEX_VERSION", true, -1, "velamk_ipc:57 fail", GetIndexVersion},
      {"IS_DISABLE_CONVERT_VIDEO", false, 0, "velamk_ipc:83 fail",
       [](const char*) { return IsDisableConvertVideo() ? 1 : 0; }},
      {"IS_DISABLE_CONVERT_PHOTO", false, 0, "velamk_ipc:110 fail",
       [](const char*) { return IsDisableConvertPhoto() ? 1 : 0; }},
      {"POST_PHOTO_CONVERT", true, 0, "velamk_ipc:137 fail",
       [](const char* path) {
         PostPhotoConvert(path);
         return 0;
       }},
      {"POST_VIDEO_CONVERT", true, 0, "velamk_ipc:157 fail",
       [](const char* path) {
         PostVideoConvert(path);
         return 0;
       }},
  };
}

/// Tests of the client's operations.
class ClientTest : public QuietTest {
 protected:
  static constexpr const char* kPath = "/volume1/photo/a.jpg";

  /// Calls the operation and expects its failure value and log line.
  static void ExpectFailure(const ClientOperation& operation) {
    EXPECT_EQ(operation.call(kPath), operation.failure) << operation.command;
    EXPECT_THAT(TakeErrorLines(), ::testing::ElementsAre(operation.failLine));
  }
};

/// The JSON value of the text; fails the test when there is none.
inline Json::Value Parsed(const std::string& text) {
  Json::Value value;
  std::string errors;
  const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
  EXPECT_TRUE(reader->parse(text.data(), text.data() + text.size(), &value, &errors)) << errors;
  return value;
}

}  // namespace vela_test
