// A video with its metadata directory and the plugin daemon that knows it.
#pragma once

#include <cstddef>
#include <cstdio>
#include <optional>
#include <string>
#include <vector>

#include "platform/vlibc.h"
#include "storage/media_fixture.h"
#include "support/daemon_peer.h"
#include "support/files.h"
#include "support/films.h"

namespace vela_test {

/// Both file names of a film.
struct Film {
  const char* name;
  const char* oldName;
};

constexpr Film kHigh = {"VELAPHOTO_FILM_H.mp4", "VELAPHOTO:FILM_H.mp4"};
constexpr Film kMedium = {"VELAPHOTO_FILM_M.mp4", "VELAPHOTO:FILM_M.mp4"};
constexpr Film kLow = {"VELAPHOTO_FILM_L.mp4", "VELAPHOTO:FILM_L.mp4"};
constexpr Film kMobile = {"VELAPHOTO_FILM_MOBILE.mp4", "VELAPHOTO:FILM_MOBILE.mp4"};
constexpr Film kConversion = {"VELAPHOTO_FILM_CONVERT_MPEG4.mp4",
                              "VELAPHOTO:FILM_CONVERT_MPEG4.mp4"};
constexpr Film kH264 = {"VELAPHOTO_FILM_H264.mp4", "VELAPHOTO:FILM_H264.mp4"};
constexpr Film kIphone = {"VELAPHOTO_FILM_MOBILE_IPHONE", "VELAPHOTO:FILM_MOBILE_IPHONE"};
constexpr Film kMpeg4 = {"VELAPHOTO_FILM_MPEG4.mp4", "VELAPHOTO:FILM_MPEG4.mp4"};
constexpr Film kFlash = {"VELAPHOTO_FILM.flv", "VELAPHOTO:FILM.flv"};

/// The films that are made in the orientation of their video.
constexpr Film kTurnedFilms[] = {kHigh, kMedium, kLow, kMobile};

constexpr const char* kLandscapeRecord = R"({"success":true,"media":{"width":640,"height":480}})";
constexpr const char* kPortraitRecord = R"({"success":true,"media":{"width":480,"height":640}})";
constexpr const char* kNoRecord = R"({"success":false})";
constexpr const char* kGoodRecord = R"({"success":true,"media":{"bitrate":4499999}})";
constexpr const char* kPoorRecord = R"({"success":true,"media":{"bitrate":4500000}})";

constexpr const char* kDaemonFailed = "velamk_ipc:30 fail";
constexpr const char* kUnknownOrientation =
    "velamk_util:128 fail to get media from plugin db: /tmp/media/film.mp4";
constexpr const char* kUnreadableVideo =
    "velamk_util:213 Failed to get media metadata from file [/tmp/media/film.mp4].";

/// Starts with an unreadable video, whose record is that of a landscape one.
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
  void SetBitrate(const std::string& number) {
    SetRecord(R"({"success":true,"media":{"bitrate":)" + number + "}}");
  }
  /// The next request gets this answer.
  void SetNextRecord(const std::string& reply) { daemon_->AnswerNext(DaemonReply::Line(reply)); }
  size_t RequestCount() const { return daemon_->Requests().size(); }

  /// Makes the video itself.
  void MakeVideo(int rotation) const {
    FilmRecipe recipe;
    recipe.rotation = rotation;
    recipe.seconds = 0.2;
    MakeFilm(Media(), recipe);
  }

  /// Makes a readable derived film.
  void MakeSizedFilm(const std::string& name, int width, int height) const {
    FilmRecipe recipe;
    recipe.width = width;
    recipe.height = height;
    recipe.seconds = 0.2;
    recipe.format = name.find(".flv") == std::string::npos ? "mp4" : "flv";
    MakeFilm(Derived(name), recipe);
  }
  void MakeLandscape(const std::string& name) const { MakeSizedFilm(name, 64, 48); }
  void MakePortrait(const std::string& name) const { MakeSizedFilm(name, 48, 64); }

  void Remove(const std::string& name) const { RemoveTree(Derived(name)); }
  std::vector<std::string> Left() const { return ListDirectory(EaDir()); }

  /// The log line about a metadata directory that is not to be had; to be asked for at once after
  /// the call that has failed.
  static std::string NoDirectoryLine(int line, const std::string& path) {
    char place[512];
    std::snprintf(place, sizeof place, "velamk_util:%d VELAEADirPath error [0x%04X %s:%d] on ",
                  line, static_cast<unsigned>(VLIBCErrGet()), VLIBCErrorGetFile(),
                  VLIBCErrorGetLine());
    return place + path;
  }

 private:
  std::optional<DaemonPeer> daemon_;  // not before the sandbox is reset
};

/// Paths without a metadata directory: one inside another, one of a directory, one too long.
inline std::vector<std::string> PathsWithoutDirectory() {
  return {"/tmp/media/@eaDir/film.mp4/inside.mp4", "/tmp/media/film.mp4/",
          PathOfLength(4089, "long.mp4")};
}

}  // namespace vela_test
