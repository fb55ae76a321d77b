// Photos and directories whose names mean something to shells, to the C library or to the
// converter. Every photo has a colour of its own, which identifies its thumbnails.
#include <algorithm>

#include "program/real_program_test.h"

namespace vela_test::real {

namespace {

/// Names without extension that the converter can open: it gets each name as one argument, in an
/// absolute path.
Strings OpenableNames() {
  const Strings groups[] = {
      {"two words", " leading space", "trailing space ", "'single'", "\"double\"", "it's"},
      {"%", "%%", "100%", "%d", "%04d", "%s%n", "%f.%e"},
      {"a:b", "jpg:x", "png:jpg:x", "http:x", "msl:x", ":"},
      {"new\nline", "\n", "tab\there", "return\r", "\x01\x7f"},
      {"-dash", "-", "--version", "-write", "+append"},
      {"\xff\xfe\x80", "\xe9t\xe9", "\xf0\x9f\x93\xb7"},
      {"~", "~root", "$HOME", "$(id)", "`id`", ";", "a;b", "a&b", "a|b", "|id", "<in>out"},
      {"back\\slash", "\\", "@file", "@", ".hidden", "..", "...", "#1", "!", "(", ")"},
      {"a=b", "a,b", "10x10", "^"},
  };
  Strings names;
  for (const Strings& group : groups) {
    names.insert(names.end(), group.begin(), group.end());
  }
  return names;
}

/// Names that ImageMagick takes for lists of file names because of a wildcard: it reads the photo
/// as text and looks for files named in it. The wrapper script rejects them.
Strings WildcardNames() {
  return {"[1]", "a[1]", "x[0]",  "[a-z]", "a[2x2]", "a[",      "a]",      "*",    "a*",
          "?",   "a?c",  "{a,b}", "{",     "}",      "%[fx:1]", "${HOME}", "x[0]y"};
}

/// Both except "..", which cannot be the name of a new directory.
Strings DirectoryNames() {
  Strings names = OpenableNames();
  const Strings wildcards = WildcardNames();
  names.insert(names.end(), wildcards.begin(), wildcards.end());
  names.erase(std::find(names.begin(), names.end(), ".."));
  return names;
}

std::string Longest(const std::string& extension) {
  return std::string(255 - extension.size(), 'n') + extension;
}

class OddNames : public RealProgramTest {
 protected:
  /// Makes a photo in the next free colour.
  std::string AddPhoto(const std::string& path) {
    const int colour = static_cast<int>(colours_.size());
    MakePlainPhoto(path, colour);
    colours_[path] = colour;
    return path;
  }

  void AddPhotos(const Strings& names, const Strings& extensions) {
    for (const std::string& name : names) {
      for (const std::string& extension : extensions) {
        AddPhoto(InPhotos(name + extension));
      }
    }
  }

  /// Makes a photo whose name ImageMagick would misinterpret; with ImageMagick it has to fail.
  void AddMisreadPhoto(const std::string& path) {
    AddPhoto(path);
    if (!IsOwnConverterReal()) {
      failing_.push_back(path);
    }
  }

  void ExpectOwnPicture(const std::string& photo, const std::vector<Kind>& kinds) const {
    EXPECT_TRUE(HasThumbs(photo, kinds));
    for (const Kind& kind : kinds) {
      EXPECT_EQ(PaletteIndexOf(ThumbOf(photo, kind)), colours_.at(photo))
          << ::testing::PrintToString(photo) << " " << kind.name;
    }
  }

  void ExpectOwnPictures(const std::vector<Kind>& kinds) const {
    for (const auto& [photo, colour] : colours_) {
      ExpectOwnPicture(photo, kinds);
    }
  }

  /// Expects its own picture for each photo whose name the converter can open, markers for the
  /// others.
  void ExpectOwnPicturesOrMarkers() const {
    for (const auto& [photo, colour] : colours_) {
      if (std::count(failing_.begin(), failing_.end(), photo) == 0) {
        ExpectOwnPicture(photo, kinds_);
      } else {
        EXPECT_TRUE(IsMarkedFailed(photo, kinds_));
      }
    }
  }

  std::map<std::string, int> colours_;  // path to palette index
  Strings failing_;
};

}  // namespace

TEST_F(OddNames, JpegsOfAnyOpenableName) {
  AddPhotos(OpenableNames(), {".jpg"});
  AddPhoto(InPhotos(Longest(".jpg")));
  const DaemonPeer daemon;
  Make();
  ExpectOwnPictures(OfPhase(kinds_, 0));
  ExpectOwnPictures(OfPhase(kinds_, 1));
  Make();
  ExpectOwnPictures(kinds_);
  EXPECT_EQ(Progress("completed"), static_cast<int>(colours_.size()));
  EXPECT_EQ(Progress("completed_thumb"), 6 * static_cast<int>(colours_.size()));
  EXPECT_THAT(ErrorLines(), IsEmpty());
  ExpectNothingLeftToMake();
}

TEST_F(OddNames, PngsOfAnyOpenableName) {
  AddPhotos(OpenableNames(), {".png"});
  AddPhoto(InPhotos(Longest(".png")));
  Make();
  ExpectOwnPictures(OfPhase(kinds_, 0));
  ExpectOwnPictures(OfPhase(kinds_, 1));
}

// Files that the index does not treat as photos get no thumbnails.
TEST_F(OddNames, NamesThatAreNoPhotos) {
  MakeJpeg("/tmp/photo.jpg");
  for (const char* name : {"x.jpg ", "x.jpg\n", "._x.jpg", "jpg", "x", ".jpg."}) {
    CopyFile("/tmp/photo.jpg", InPhotos(name));
  }
  Make();
  EXPECT_FALSE(Exists(InPhotos("@eaDir")));
}

// The photos that a wildcard would match are in the same directory, before and after it in the
// order.
TEST_F(OddNames, WildcardsStopNothing) {
  for (const std::string& name : WildcardNames()) {
    AddMisreadPhoto(InPhotos(name + ".jpg"));
    AddMisreadPhoto(InPhotos(name + ".png"));
  }
  AddPhotos({"1", "a", "b", "a1", "abc", "x", "x0", "a2x2", "z", "!"}, {".jpg", ".png"});
  Make();
  Make();
  ExpectOwnPicturesOrMarkers();
  const int failures = static_cast<int>(failing_.size());
  const int good = static_cast<int>(colours_.size()) - failures;
  EXPECT_EQ(Progress("completed"), 2 * failures + good);
  EXPECT_EQ(Progress("completed_thumb"), 6 * (2 * failures + good));
}

// Removing the markers of a photo spares those of another that its name would match as a pattern.
TEST_F(OddNames, MarkersOfWildcardNamesAreTheirOwn) {
  const Strings broken = {InPhotos("a[1].jpg"), InPhotos("a1.jpg"), InPhotos("*.jpg"),
                          InPhotos("back\\slash.jpg")};
  for (const std::string& photo : broken) {
    WriteFile(photo, "no photo");
  }
  Make();
  for (const std::string& photo : broken) {
    EXPECT_TRUE(IsMarkedFailed(photo, kinds_));
  }
  const std::string repaired = AddPhoto(broken.back());
  Make();
  Make();
  ExpectOwnPicture(repaired, kinds_);
  for (size_t i = 0; i + 1 < broken.size(); ++i) {
    EXPECT_TRUE(IsMarkedFailed(broken[i], kinds_));
  }
}

// Formats with several pages are opened by their name followed by a page number. No such file
// exists, so ImageMagick expands special characters in the name.
TEST_F(OddNames, PagedFormatsOfNamesWithoutMeaning) {
  for (const std::string& name : OpenableNames()) {
    if (name.find('%') == std::string::npos) {
      AddPhoto(InPhotos(name + ".tif"));
    }
  }
  AddPhoto(InPhotos(Longest(".tif")));
  AddPhotos({"100%", "a%", "two words", "a:b", "jpg:x", "-dash", "@file", "|id"},
            {".gif", ".webp"});
  Make();
  Make();
  ExpectOwnPictures(kinds_);
}

TEST_F(OddNames, PagedFormatsThatCouldBeMisread) {
  for (const char* name :
       {"%d", "%04d", "%%", "%x", "%[fx:1]", "[1]", "a[1]", "*", "a*", "?", "{a,b}"}) {
    AddMisreadPhoto(InPhotos(std::string(name) + ".gif"));
    AddMisreadPhoto(InPhotos(std::string(name) + ".tif"));
  }
  AddPhoto(InPhotos("a.gif"));
  AddPhoto(InPhotos("z.tif"));
  Make();
  Make();
  ExpectOwnPicturesOrMarkers();
}

TEST_F(OddNames, DirectoriesOfAnyName) {
  Strings directories;
  Strings names = DirectoryNames();
  names.push_back(Longest(""));
  for (const std::string& name : names) {
    directories.push_back(InPhotos(name));
    MakeDirectories(directories.back());
    AddPhoto(directories.back() + "/p.jpg");
  }
  const DaemonPeer daemon;
  Make(directories);
  ExpectOwnPictures(OfPhase(kinds_, 0));
  ExpectOwnPictures(OfPhase(kinds_, 1));
  // Each is queued for its last phase, except those that do not fit on one line.
  Strings queued;
  Strings unqueued;
  for (const std::string& directory : directories) {
    if (directory.find('\n') == std::string::npos) {
      queued.push_back(directory);
    } else {
      unqueued.push_back("velathumb:1112 Failed to write [" + directory + "] to thumb queue");
    }
  }
  EXPECT_EQ(ReadLines(kQueue), queued);
  EXPECT_EQ(ErrorLines(), unqueued);
  Make(directories);
  ExpectOwnPictures(kinds_);
}

TEST_F(OddNames, TreeOfOddDirectories) {
  Strings refused;
  for (const std::string& name : DirectoryNames()) {
    const std::string directory = InPhotos(name + "/below " + name);
    MakeDirectories(directory);
    if (std::string(".@#").find(name[0]) == std::string::npos) {
      AddPhoto(directory + "/p.jpg");
    } else {
      refused.push_back(MakeJpeg(directory + "/p.jpg"));
    }
  }
  Make({"R:" + std::string(kPhotos)});
  Make({"R:" + std::string(kPhotos)});
  ExpectOwnPictures(kinds_);
  for (const std::string& photo : refused) {
    EXPECT_FALSE(Exists(MetadataDirOf(photo))) << photo;
  }
}

// A relative directory comes first in the converter's arguments, where some prefixes mean an
// option, a list or a format.
TEST_F(OddNames, RelativeDirectories) {
  Strings directories;
  for (const char* name : {"plain", "./dot", "two words", "~", "~root", ":x", "%d", "[1]", "*",
                           "--", "$HOME", "|id", ";", "a\\b", "(", "../photos/up"}) {
    directories.emplace_back(name);
    MakeDirectories(InPhotos(name));
    AddPhoto(InPhotos(std::string(name) + "/p.jpg"));
  }
  for (const char* name : {"-d", "-write", "+d", "@d", "jpg:plain", "png:plain", "http:plain"}) {
    directories.emplace_back(name);
    MakeDirectories(InPhotos(name));
    AddMisreadPhoto(InPhotos(std::string(name) + "/p.jpg"));
  }
  ProgramOptions options;
  options.workingDirectory = kPhotos;
  Make(directories, options);
  Make(directories, options);
  ExpectOwnPicturesOrMarkers();
}

}  // namespace vela_test::real
