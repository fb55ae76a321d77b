// A media file with its metadata directory.
#pragma once

#include <cstdint>
#include <cstdio>
#include <string>
#include <vector>

#include "platform/vlibc.h"
#include "support/files.h"
#include "support/quiet_test.h"

namespace vela_test {

/// The file names of the six size classes in the order of their values, current and older form.
constexpr const char* kThumbNames[] = {"VELAPHOTO_THUMB_S.jpg",  "VELAPHOTO_THUMB_M.jpg",
                                       "VELAPHOTO_THUMB_B.jpg",  "VELAPHOTO_THUMB_L.jpg",
                                       "VELAPHOTO_THUMB_XL.jpg", "VELAPHOTO_THUMB_SM.jpg"};
constexpr const char* kOldThumbNames[] = {"VELAPHOTO:THUMB_S.jpg",  "VELAPHOTO:THUMB_M.jpg",
                                          "VELAPHOTO:THUMB_B.jpg",  "VELAPHOTO:THUMB_L.jpg",
                                          "VELAPHOTO:THUMB_XL.jpg", "VELAPHOTO:THUMB_SM.jpg"};

/// Bits of the size map.
constexpr int kBitS = 1;
constexpr int kBitM = 2;
constexpr int kBitB = 4;
constexpr int kBitL = 8;
constexpr int kBitXL = 16;
constexpr int kBitSM = 32;

constexpr const char* kSettings = "/etc/velainfo.conf";
constexpr int64_t kMediaTime = 1600000000;

/// A media file dated kMediaTime and its metadata directory, which the tests fill.
class MediaTest : public QuietTest {
 protected:
  explicit MediaTest(const std::string& name) : media_("/tmp/media/" + name), name_(name) {}

  void SetUp() override {
    QuietTest::SetUp();
    WriteFile(media_, "media");
    SetFileTime(media_, kMediaTime);
    MakeDirectories(EaDir());
  }

  const std::string& Media() const { return media_; }
  std::string EaDir() const { return "/tmp/media/@eaDir/" + name_; }
  std::string Derived(const std::string& file) const { return EaDir() + "/" + file; }

  /// Makes a derived file of `bytes` bytes, dated `seconds` after the media file.
  std::string MakeDerived(const std::string& file, size_t bytes = 10, int64_t seconds = 1) const {
    WriteFileOfSize(Derived(file), bytes);
    SetFileTime(Derived(file), kMediaTime + seconds);
    return Derived(file);
  }

  void Remove(const std::string& file) const { RemoveTree(Derived(file)); }

  /// The names of the derived files.
  std::vector<std::string> Left() const { return ListDirectory(EaDir()); }

  /// The log line about a missing metadata directory; call it right after the call that failed.
  static std::string NoDirectoryLine(int line, const std::string& path) {
    char place[512];
    std::snprintf(place, sizeof place, "velamk_util:%d VELAEADirPath error [0x%04X %s:%d] on ",
                  line, static_cast<unsigned>(VLIBCErrGet()), VLIBCErrorGetFile(),
                  VLIBCErrorGetLine());
    return place + path;
  }

 private:
  const std::string media_;
  const std::string name_;
};

/// A path of exactly `length` bytes below /tmp whose directories exist; it ends in `ending`.
inline std::string PathOfLength(size_t length, const std::string& ending) {
  constexpr size_t kComponent = 200;
  std::string directory = "/tmp";
  while (directory.size() + 2 * kComponent + ending.size() < length) {
    directory += "/" + std::string(kComponent, 'd');
  }
  // One more directory fills the remaining length, so that the last component is short.
  const size_t rest = length - directory.size() - ending.size() - 2;
  const size_t half = rest > kComponent ? kComponent : 0;
  if (half > 0) {
    directory += "/" + std::string(half - 1, 'h');
  }
  directory += "/" + std::string(rest - half, 'r');
  MakeDirectories(directory);
  return directory + "/" + ending;
}

/// The directory part of a path.
inline std::string DirectoryOf(const std::string& path) {
  return path.substr(0, path.rfind('/'));
}

}  // namespace vela_test
