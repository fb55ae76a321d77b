// Photos with thumbnails, and pages of them.
#pragma once

#include <cstdint>
#include <ctime>
#include <optional>
#include <string>
#include <vector>

#include "status_report.h"

namespace vela_test {

/// Where the page of these tests stands.
constexpr const char* kPageDirectory = "/tmp/page";
constexpr const char* kPage = "/tmp/page/status.html";

/// A photo in /tmp/photos all of whose thumbnails are present.
vela::PhotoReport CompletePhoto(const std::string& name);

/// The same with the given sizes in another state.
vela::PhotoReport PhotoInState(const std::string& name, vela::ThumbState state,
                               const std::vector<EA_THUMB_SIZE>& sizes);

/// Marks sizes of the photo as failed at that time.
void MarkFailed(vela::PhotoReport& photo, const std::vector<EA_THUMB_SIZE>& sizes, time_t time);

/// Every size there is.
std::vector<EA_THUMB_SIZE> AllSizes();

/// The path of the photo's thumbnail, under its current name.
std::string ThumbOf(const vela::PhotoReport& photo, EA_THUMB_SIZE size);

/// The same under its older name.
std::string OldThumbOf(const vela::PhotoReport& photo, EA_THUMB_SIZE size);

/// What a thumbnail may hold: the beginning of every JPEG and the text behind it.
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
