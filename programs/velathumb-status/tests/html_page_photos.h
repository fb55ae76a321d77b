// Photos with thumbnails, and pages of them.
#pragma once

#include <cstdint>
#include <ctime>
#include <optional>
#include <string>
#include <vector>

#include "status_report.h"

namespace vela_test {

/// The page of these tests.
constexpr const char* kPageDirectory = "/tmp/page";
constexpr const char* kPage = "/tmp/page/status.html";

using Sizes = std::vector<EA_THUMB_SIZE>;
constexpr EA_THUMB_SIZE kS = EA_THUMB_SIZE_S;
constexpr EA_THUMB_SIZE kSM = EA_THUMB_SIZE_SM;
constexpr EA_THUMB_SIZE kM = EA_THUMB_SIZE_M;
constexpr EA_THUMB_SIZE kB = EA_THUMB_SIZE_B;
constexpr EA_THUMB_SIZE kL = EA_THUMB_SIZE_L;
constexpr EA_THUMB_SIZE kXL = EA_THUMB_SIZE_XL;

/// A photo in /tmp/photos all of whose thumbnails are present.
vela::PhotoReport CompletePhoto(const std::string& name);

/// The photo with the given sizes in another state.
vela::PhotoReport WithState(vela::PhotoReport photo, vela::ThumbState state, const Sizes& sizes);

/// A photo that is complete but for the given sizes.
vela::PhotoReport Missing(const Sizes& sizes, const std::string& name = "a.jpg");
vela::PhotoReport Outdated(const Sizes& sizes, const std::string& name = "a.jpg");

/// The photo with failures of the given sizes at that time.
vela::PhotoReport WithFailures(vela::PhotoReport photo, const Sizes& sizes, time_t time);

/// All sizes.
Sizes AllSizes();

/// The path of the photo's thumbnail, under its current name.
std::string ThumbOf(const vela::PhotoReport& photo, EA_THUMB_SIZE size);

/// The same under its older name.
std::string OldThumbOf(const vela::PhotoReport& photo, EA_THUMB_SIZE size);

/// A thumbnail's content: the first bytes of every JPEG, followed by the text.
std::string ThumbBytes(const std::string& text);

/// One directory and its photos.
struct PageDirectory {
  std::string path = "/tmp/photos";
  bool isQueued = false;
  std::vector<vela::PhotoReport> photos;
  std::optional<int64_t> videos = std::nullopt;
};

/// Hands the directories and their totals to the sink, as a scan does.
void Report(vela::StatusSink& sink, const std::vector<PageDirectory>& directories);

/// Writes the page of these directories to kPage; fails the test when it cannot be written.
void WritePage(const std::vector<PageDirectory>& directories);

/// The text of the page of these directories.
std::string PageOf(const std::vector<PageDirectory>& directories);

/// The text of the page of these photos in one directory.
std::string PageOfPhotos(const std::vector<vela::PhotoReport>& photos);

}  // namespace vela_test
