#include "photo_library.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <iterator>

#include "storage/velamk_util.h"
#include "support/files.h"
#include "support/films.h"
#include "support/image_checks.h"
#include "support/images.h"
#include "support/raw_photos.h"

using namespace vela;

namespace vela_test {

namespace {

constexpr const char* kTop = "/tmp/library";
constexpr const char* kPatterns = "/tmp/patterns";
constexpr const char* kKinds[] = {"jpg", "png", "gif", "tif", "webp", "bmp"};
constexpr int kAge = -3600;

std::string Pattern(const std::string& kind) {
  return std::string(kPatterns) + "/pattern." + kind;
}

/// Makes one photo of each kind; all others are copies.
void MakeTemplates() {
  MakeDirectories(kPatterns);
  for (const char* kind : kKinds) {
    MakeImage(Pattern(kind), 96, 72);
  }
  RawRecipe recipe;
  recipe.preview = JpegRecipe();
  MakeRawPhoto(Pattern("dng"), recipe);
}

std::string ParentOf(const std::string& path) {
  return path.substr(0, path.rfind('/'));
}

}  // namespace

PhotoLibrary::PhotoLibrary(int count) {
  MakeTemplates();
  const std::string top = kTop;
  MakePhotos({top + "/2019", top + "/2020", top + "/summer 50%", top + "/tree", top + "/tree/a",
              top + "/tree/a/deep", top + "/tree/\xc3\xa4 \"b\""},
             count - 1);
  damaged_ = top + "/damaged/cut.jpg";
  WriteFile(damaged_, ReadFile(Pattern("jpg")).substr(0, 100));
  SetFileTimeFromNow(damaged_, kAge);
  photos_.insert(damaged_);
  entries_ = {top + "/2019", top + "/2020", top + "/summer 50%", "R:" + top + "/tree",
              top + "/damaged"};
  videos_ = {MakeFilm(top + "/2019/film.mp4"), MakeFilm(top + "/tree/a/film.mkv")};
}

bool PhotoLibrary::IsLone(const std::string& photo) const {
  return ParentOf(photo) == loneEntry_;
}

void PhotoLibrary::AddLoneDirectory(int count) {
  loneEntry_ = std::string(kTop) + "/lone";
  MakePhotos({loneEntry_}, count);
}

void PhotoLibrary::AddDirectory(int count) {
  const std::string directory = std::string(kTop) + "/late";
  MakePhotos({directory}, count);
  entries_.push_back(directory);
}

void PhotoLibrary::MakePhotos(const std::vector<std::string>& directories, int count) {
  for (int i = 0; i < count; ++i) {
    const auto number = static_cast<size_t>(i);
    const std::string kind = i == count - 1 ? "dng" : kKinds[number % std::size(kKinds)];
    const std::string path =
        directories[number % directories.size()] + "/photo " + std::to_string(i) + '.' + kind;
    MakeDirectories(ParentOf(path));
    CopyFile(Pattern(kind), path);
    SetFileTimeFromNow(path, kAge);
    photos_.insert(path);
  }
}

void PhotoLibrary::Touch(int step) {
  int number = 0;
  for (const std::string& photo : photos_) {
    if (++number % step == 0 && photo != damaged_ && !IsLone(photo)) {
      SetFileTimeFromNow(photo, 0);
    }
  }
}

PhotoState StateOf(const std::string& photo) {
  const std::string metadata = ParentOf(photo) + "/@eaDir/" + photo.substr(photo.rfind('/') + 1);
  PhotoState state;
  state.others = ListDirectory(metadata);
  const EAThumbInfo* table = nullptr;
  const int classes = GetEAThumbInfoTable(&table);
  for (int i = 0; i < classes; ++i) {
    const std::string name = table[i].name;
    const std::string marker = name.substr(0, name.rfind('.')) + ".fail";
    for (const std::string& known : {name, marker}) {
      const auto place = std::find(state.others.begin(), state.others.end(), known);
      if (place == state.others.end()) {
        continue;
      }
      state.others.erase(place);
      ++(known == marker ? state.markers : state.thumbs);
      std::string why;
      EXPECT_TRUE(known == marker || DecodeJpeg(metadata + '/' + known, &why))
          << metadata << '/' << known << ": " << why;
    }
  }
  return state;
}

}  // namespace vela_test
