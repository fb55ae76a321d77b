// The six operations of the plugin daemon's client, so that a test can go through them all.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "ipc/velamk_ipc.h"
#include "platform/velaindex.h"

namespace vela_test {

/// One operation, seen from outside.
struct ClientOperation {
  std::string command;   ///< the command word it sends
  bool sendsPath;        ///< whether its request names a path
  int failure;           ///< what `call` gives when the daemon did not carry it out
  std::string failLine;  ///< what it then writes to the system log
  /// Calls it for a path; gives its result, false as 0 and true as 1, 0 where it has none.
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

}  // namespace vela_test
