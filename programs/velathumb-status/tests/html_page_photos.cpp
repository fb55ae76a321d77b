#include "html_page_photos.h"

#include <gtest/gtest.h>
#include <limits.h>

#include "html_page.h"
#include "platform/velaindex.h"
#include "support/files.h"

using namespace vela;

namespace vela_test {

namespace {

std::string MetadataDirectoryOf(const PhotoReport& photo) {
  char directory[PATH_MAX] = "";
  EXPECT_EQ(VELAEADirPath(0, photo.path.c_str(), directory, sizeof directory), 0);
  return directory;
}

DirectoryReport DirectoryReportOf(const PageDirectory& directory) {
  DirectoryReport report;
  report.path = directory.path;
  report.isQueued = directory.isQueued;
  for (const PhotoReport& photo : directory.photos) {
    report.counts.Add(photo);
  }
  report.counts.videos = directory.videos;
  return report;
}

}  // namespace

PhotoReport CompletePhoto(const std::string& name) {
  PhotoReport photo;
  photo.path = "/tmp/photos/" + name;
  photo.thumbs.lookup = PhotoLookup::kDone;
  photo.thumbs.states.fill(ThumbState::kPresent);
  return photo;
}

PhotoReport WithState(PhotoReport photo, ThumbState state, const Sizes& sizes) {
  for (const EA_THUMB_SIZE size : sizes) {
    photo.thumbs.states[static_cast<size_t>(size)] = state;
  }
  return photo;
}

PhotoReport Missing(const Sizes& sizes, const std::string& name) {
  return WithState(CompletePhoto(name), ThumbState::kMissing, sizes);
}

PhotoReport Outdated(const Sizes& sizes, const std::string& name) {
  return WithState(CompletePhoto(name), ThumbState::kOutdated, sizes);
}

PhotoReport WithFailures(PhotoReport photo, const Sizes& sizes, time_t time) {
  for (const EA_THUMB_SIZE size : sizes) {
    photo.failures[static_cast<size_t>(size)] = time;
  }
  return photo;
}

Sizes AllSizes() {
  return {kS, kSM, kM, kB, kL, kXL};
}

std::string ThumbOf(const PhotoReport& photo, EA_THUMB_SIZE size) {
  return MetadataDirectoryOf(photo) + '/' + rgEAThumbInfo[size].name;
}

std::string OldThumbOf(const PhotoReport& photo, EA_THUMB_SIZE size) {
  return MetadataDirectoryOf(photo) + '/' + rgEAThumbInfo[size].oldName;
}

std::string ThumbBytes(const std::string& text) {
  return "\xff\xd8\xff" + text;
}

void Report(StatusSink& sink, const std::vector<PageDirectory>& directories) {
  StatusTotals totals;
  for (const PageDirectory& directory : directories) {
    sink.BeginDirectory();
    for (const PhotoReport& photo : directory.photos) {
      sink.TakePhoto(photo);
    }
    const DirectoryReport report = DirectoryReportOf(directory);
    totals.Add(report);
    sink.EndDirectory(report);
  }
  sink.TakeTotals(totals);
}

void WritePage(const std::vector<PageDirectory>& directories) {
  MakeDirectories(kPageDirectory);
  HtmlPage page(kPage);
  Report(page, directories);
  ASSERT_EQ(page.Finish(), 0);
}

std::string PageOf(const std::vector<PageDirectory>& directories) {
  WritePage(directories);
  return ReadFile(kPage);
}

std::string PageOfPhotos(const std::vector<PhotoReport>& photos) {
  PageDirectory directory;
  directory.photos = photos;
  return PageOf({directory});
}

}  // namespace vela_test
