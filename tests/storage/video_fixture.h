// A video with its metadata directory and an index daemon that has its record.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "storage/media_fixture.h"
#include "support/daemon_peer.h"
#include "support/films.h"

namespace vela_test {

/// Both file names of a converted video.
struct ConvertedVideo {
  const char* name;
  const char* oldName;
};

constexpr ConvertedVideo kHigh = {"VELAPHOTO_FILM_H.mp4", "VELAPHOTO:FILM_H.mp4"};
constexpr ConvertedVideo kMedium = {"VELAPHOTO_FILM_M.mp4", "VELAPHOTO:FILM_M.mp4"};
constexpr ConvertedVideo kLow = {"VELAPHOTO_FILM_L.mp4", "VELAPHOTO:FILM_L.mp4"};
constexpr ConvertedVideo kMobile = {"VELAPHOTO_FILM_MOBILE.mp4", "VELAPHOTO:FILM_MOBILE.mp4"};
constexpr ConvertedVideo kConversion = {"VELAPHOTO_FILM_CONVERT_MPEG4.mp4",
                                        "VELAPHOTO:FILM_CONVERT_MPEG4.mp4"};
constexpr ConvertedVideo kH264 = {"VELAPHOTO_FILM_H264.mp4", "VELAPHOTO:FILM_H264.mp4"};
constexpr ConvertedVideo kIphone = {"VELAPHOTO_FILM_MOBILE_IPHONE", "VELAPHOTO:FILM_MOBILE_IPHONE"};
constexpr ConvertedVideo kMpeg4 = {"VELAPHOTO_FILM_MPEG4.mp4", "VELAPHOTO:FILM_MPEG4.mp4"};
constexpr ConvertedVideo kFlash = {"VELAPHOTO_FILM.flv", "VELAPHOTO:FILM.flv"};

/// The converted videos that are made in the orientation of their video.
const std::vector<ConvertedVideo> kOriented = {kHigh, kMedium, kLow, kMobile};

/// Both file names of each of the videos.
inline std::vector<const char*> NamesOf(const std::vector<ConvertedVideo>& videos) {
  std::vector<const char*> names;
  for (const ConvertedVideo& video : videos) {
    names.push_back(video.name);
    names.push_back(video.oldName);
  }
  return names;
}

constexpr const char* kLandscapeRecord = R"({"success":true,"media":{"width":640,"height":480}})";
constexpr const char* kPortraitRecord = R"({"success":true,"media":{"width":480,"height":640}})";
constexpr const char* kNoRecord = R"({"success":false})";

constexpr const char* kMediaRequest =
    "{\"command\":\"GET_MEDIA_FROM_PLUGIN_DB\",\"path\":\"/tmp/media/film.mp4\",\"type\":1}\n";

constexpr const char* kDaemonFailed = "velamk_ipc:30 fail";
constexpr const char* kUnknownOrientation =
    "velamk_util:128 fail to get media from plugin db: /tmp/media/film.mp4";
constexpr const char* kUnreadableVideo =
    "velamk_util:213 Failed to get media metadata from file [/tmp/media/film.mp4].";

/// Starts with an unreadable video whose record is landscape.
class VideoTest : public MediaTest {
 protected:
  VideoTest() : MediaTest("film.mp4") {}

  void SetUp() override {
    MediaTest::SetUp();
    daemon_.emplace();
    SetRecord(kLandscapeRecord);
  }

  DaemonPeer& Daemon() { return *daemon_; }
  void StopDaemon() { daemon_.reset(); }
  void SetRecord(const std::string& reply) {
    daemon_->Answer("GET_MEDIA_FROM_PLUGIN_DB", DaemonReply::Line(reply));
  }
  /// The next request gets this answer.
  void SetNextRecord(const std::string& reply) { daemon_->AnswerNext(DaemonReply::Line(reply)); }
  /// The requests to the daemon, none when it has been stopped.
  std::vector<std::string> Requests() const {
    std::vector<std::string> requests;
    if (daemon_) {
      for (const DaemonRequest& request : daemon_->Requests()) {
        requests.push_back(request.bytes);
      }
    }
    return requests;
  }
  size_t RequestCount() const { return Requests().size(); }

  /// Makes the video itself.
  void MakeVideo(int rotation) const {
    FilmRecipe recipe;
    recipe.rotation = rotation;
    recipe.seconds = 0.2;
    MakeFilm(Media(), recipe);
  }

  /// Makes a readable converted video.
  void MakeSized(const std::string& name, int width, int height) const {
    FilmRecipe recipe;
    recipe.width = width;
    recipe.height = height;
    recipe.seconds = 0.2;
    recipe.format = name.find(".flv") == std::string::npos ? "mp4" : "flv";
    const std::string made =
        "/tmp/made/" + std::to_string(width) + "x" + std::to_string(height) + "." + recipe.format;
    if (!Exists(made)) {
      MakeDirectories("/tmp/made");
      MakeFilm(made, recipe);
    }
    CopyFile(made, Derived(name));
  }
  void MakeLandscape(const std::string& name) const { MakeSized(name, 64, 48); }
  void MakePortrait(const std::string& name) const { MakeSized(name, 48, 64); }

 private:
  std::optional<DaemonPeer> daemon_;  // not before the sandbox is reset
};

/// Paths without a metadata directory: one inside another, one of a directory, one too long.
inline std::vector<std::string> PathsWithoutDirectory() {
  return {"/tmp/media/@eaDir/film.mp4/inside.mp4", "/tmp/media/film.mp4/",
          PathOfLength(4089, "long.mp4")};
}

}  // namespace vela_test
