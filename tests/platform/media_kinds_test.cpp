// Which names are photos, videos, or not to be indexed at all.
#include <algorithm>
#include <sstream>

#include "platform/platform_fixture.h"

namespace vela_test {
namespace {

std::vector<std::string> Words(const char* text) {
  std::istringstream stream(text);
  std::vector<std::string> words;
  for (std::string word; stream >> word;) words.push_back(word);
  return words;
}

std::string Upper(std::string text) {
  for (char& c : text) c = static_cast<char>(c >= 'a' && c <= 'z' ? c - 'a' + 'A' : c);
  return text;
}

std::string Capitalised(std::string text) {
  text.back() = Upper(text).back();
  return text;
}

const std::vector<std::string> kRaw = Words(
    "3fr arw cr2 crw dcr dng erf k25 kdc mef mos mrw nef orf pef ptx raf raw rw2 sr2 srf srw x3f");
const std::vector<std::string> kPictures =
    Words("jpg jpeg jpe png gif bmp tif tiff webp heic heif psd");
const std::vector<std::string> kSeveralPages = Words("tif tiff gif psd heic heif webp");
const std::vector<std::string> kVideos = Words(
    "3g2 3gp asf avi dat divx f4v flv m2t m2ts m2v m4v mkv mov mp4 mpe mpeg mpg mts ogv qt rm rmvb "
    "ts vob webm wmv xvid");
const std::vector<std::string> kOthers = Words(
    "txt jp jpgg jpegs cr3 pdf mp3 svg thm 7 n\xc3\xa9"
    "f \xff");

struct Kinds {
  bool raw, photo, severalPages, video;
};

void ExpectKinds(const std::vector<std::string>& extensions, const Kinds& expected) {
  for (const std::string& lower : extensions) {
    for (const std::string& extension : {lower, Upper(lower), Capitalised(lower)}) {
      const std::string name = "name." + extension;
      const std::string path = "/dir.jpg/some.thing/" + name;
      EXPECT_EQ(BlVELAIndexIsRawImage(extension.c_str()), expected.raw) << extension;
      for (const std::string& one : {name, path}) {
        EXPECT_EQ(BlVELAIndexIsPhotoOnWebFile(one.c_str()), expected.photo) << one;
        EXPECT_EQ(BlVELAIndexIsPhotoOnWebConvertFile(one.c_str()), expected.photo) << one;
        EXPECT_EQ(BlVELAIndexIsMultiplePagePhotoFile(one.c_str()), expected.severalPages) << one;
        EXPECT_EQ(BlVELAIndexIsVideoOnWebFile(one.c_str()), expected.video) << one;
      }
    }
  }
}

TEST(MediaKinds, RawPhotos) {
  ExpectKinds(kRaw, {true, true, false, false});
}

TEST(MediaKinds, Pictures) {
  for (const std::string& extension : kPictures) {
    const bool severalPages =
        std::find(kSeveralPages.begin(), kSeveralPages.end(), extension) != kSeveralPages.end();
    ExpectKinds({extension}, {false, true, severalPages, false});
  }
}

TEST(MediaKinds, Videos) {
  ExpectKinds(kVideos, {false, false, false, true});
}

TEST(MediaKinds, OtherFiles) {
  ExpectKinds(kOthers, {false, false, false, false});
}

TEST(MediaKinds, NamesWithoutExtension) {
  for (const char* name : {"", ".", "jpg", "/photo.jpg/jpg", "/photo.jpg/", "photo.", "/mp4/mp4"}) {
    EXPECT_FALSE(BlVELAIndexIsPhotoOnWebFile(name)) << name;
    EXPECT_FALSE(BlVELAIndexIsPhotoOnWebConvertFile(name)) << name;
    EXPECT_FALSE(BlVELAIndexIsMultiplePagePhotoFile(name)) << name;
    EXPECT_FALSE(BlVELAIndexIsVideoOnWebFile(name)) << name;
  }
  EXPECT_FALSE(BlVELAIndexIsRawImage(""));
}

TEST(MediaKinds, NullHasNoKind) {
  EXPECT_FALSE(BlVELAIndexIsRawImage(nullptr));
  EXPECT_FALSE(BlVELAIndexIsPhotoOnWebFile(nullptr));
  EXPECT_FALSE(BlVELAIndexIsPhotoOnWebConvertFile(nullptr));
  EXPECT_FALSE(BlVELAIndexIsMultiplePagePhotoFile(nullptr));
  EXPECT_FALSE(BlVELAIndexIsVideoOnWebFile(nullptr));
}

TEST(EntryName, RefusesHiddenAndInternalNames) {
  for (const char* name :
       {"", ".", "..", ".hidden", "@eaDir", "@", "#recycle", "#", "lost+found"}) {
    EXPECT_EQ(EntryNameShouldIndex(name), 0) << name;
  }
  EXPECT_EQ(EntryNameShouldIndex(nullptr), 0);
}

TEST(EntryName, AcceptsTheRest) {
  for (const char* name : {"photo", "a.b", "a@b", "a#b", "lost+found2", "Lost+Found", "lost", " ",
                           "~", "-", "\xff", "\n"}) {
    EXPECT_EQ(EntryNameShouldIndex(name), 1) << name;
  }
}

}  // namespace
}  // namespace vela_test
