// The phase that is due for a photo, depending on its existing thumbnails.
#include "program/stub_program_test.h"
#include "support/images.h"

namespace vela_test {
namespace {

/// The system asks for more size classes than the profiles make, unless a test says otherwise: the
/// status of a photo is never "nothing needed" then, and the choice of the phase decides.
class PhaseChoice : public OnePhotoTest {
 protected:
  static Strings RunAndGetRequests() {
    const Strings requests = RunWithDaemon();
    EXPECT_THAT(ErrorLines(), IsEmpty());
    return requests;
  }

  /// Sizes of the thumbnails that the converter made, with the source of each call:
  /// "photo: 1280 320".
  Strings Made() const {
    Strings made;
    for (const StubCall& call : Converter().Calls()) {
      const std::string source = SourceOf(call);
      std::string line = source == kPhoto                ? "photo:"
                         : source == Thumb(kPhoto, "XL") ? "XL:"
                                                         : source + ":";
      for (const std::string& argument : call.arguments) {
        if (argument.compare(0, 10, "jpeg:size=") == 0) {
          line += " " + argument.substr(10, argument.find('x') - 10);
        }
      }
      made.push_back(line);
    }
    return made;
  }

  static void PutOldThumbs(const Strings& sizeClasses) {
    MakeDirectories(MetadataDirOf(kPhoto));
    for (const std::string& sizeClass : sizeClasses) {
      MakeJpeg(OldThumb(kPhoto, sizeClass));
    }
  }

  /// Makes a thumbnail one second older than the photo.
  static void MakeOutdated(const std::string& sizeClass) {
    SetFileTime(Thumb(kPhoto, sizeClass), ModificationTime(kPhoto).seconds - 1);
  }
};

const Strings kAllClasses = {"XL", "M", "B", "S"};

/// A complete photo: only a report and no other effect.
struct CompletePhoto : NamedCase {
  const char* settings;      ///< content of the settings file, none when null
  Strings thumbs;            ///< size classes that are there
  const char* oneByteThumb;  ///< one of them that is truncated to a byte, none when null
  bool hasOlderNames = false;
};

class NothingToMake : public PhaseChoice, public ::testing::WithParamInterface<CompletePhoto> {};

TEST_P(NothingToMake, IsReportedOnly) {
  const CompletePhoto& photo = GetParam();
  if (photo.settings != nullptr) {
    WriteFile(kSettings, photo.settings);
  }
  if (photo.hasOlderNames) {
    PutOldThumbs(photo.thumbs);
  } else {
    PutThumbs(kPhoto, photo.thumbs);
  }
  if (photo.oneByteThumb != nullptr) {
    WriteFileOfSize(Thumb(kPhoto, photo.oneByteThumb), 1);
  }
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kReport));
  EXPECT_THAT(Made(), IsEmpty());
  EXPECT_THAT(MetadataOf(kPhoto), SizeIs(photo.thumbs.size()));
  EXPECT_TRUE(IsDirectory(MetadataDirOf(kPhoto)));
  EXPECT_FALSE(Exists(kPhotoProgress));
  EXPECT_FALSE(Exists(kQueue));
}

// Size classes outside the system's size map are not made, whatever the profiles contain: the
// status of the photo is checked first, and a file of one byte is enough for it.
INSTANTIATE_TEST_SUITE_P(
    Photos, NothingToMake,
    ::testing::Values(
        CompletePhoto{"ByItsStatus", kThreePhasesSizeMap, kAllClasses, nullptr},
        CompletePhoto{"ByItsStatusBeforeItsPhases", kThreePhasesSizeMap, kAllClasses, "XL"},
        CompletePhoto{"BecauseNoSizeIsWanted", "photo_thumb_size_map=\"0\"\n", {}, nullptr},
        CompletePhoto{"ByItsPhases", nullptr, kAllClasses, nullptr},
        CompletePhoto{"ByItsStatusWithOlderNames", kThreePhasesSizeMap, kAllClasses, nullptr,
                      true}),
    CaseName());

/// The phase that is due, by the thumbnails that are missing, outdated or too small.
struct DuePhase : NamedCase {
  Strings thumbs;    ///< size classes that are there
  Strings outdated;  ///< of these, dated before the photo
  Strings empty;     ///< of these, without content
  Strings made;
  int completed;
  int completedThumb;
  bool queued;
};

class IncompletePhoto : public PhaseChoice, public ::testing::WithParamInterface<DuePhase> {};

TEST_P(IncompletePhoto, GetsTheThumbnailsOfItsFirstDuePhase) {
  PutThumbs(kPhoto, GetParam().thumbs);
  for (const std::string& sizeClass : GetParam().outdated) {
    MakeOutdated(sizeClass);
  }
  for (const std::string& sizeClass : GetParam().empty) {
    WriteFileOfSize(Thumb(kPhoto, sizeClass), 0);
  }
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kVersionRequest, kReport));
  EXPECT_EQ(Made(), GetParam().made);
  ExpectProgress(GetParam().completed, GetParam().completedThumb);
  EXPECT_EQ(Exists(kQueue) ? ReadFile(kQueue) : "", GetParam().queued ? "/tmp/photos\n" : "");
  for (const std::string& sizeClass : GetParam().empty) {
    EXPECT_GT(FileSize(Thumb(kPhoto, sizeClass)), 1);
  }
}

// Phase 1 follows phase 0 even though it may have nothing left to make.
INSTANTIATE_TEST_SUITE_P(
    Phases, IncompletePhoto,
    ::testing::Values(
        DuePhase{"Phase0Missing", {"XL", "B", "S"}, {}, {}, {"photo: 320"}, 0, 3, true},
        DuePhase{"Phase1Missing", {"XL", "M", "S"}, {}, {}, {"XL: 640"}, 0, 1, true},
        DuePhase{"Phase2Missing", {"XL", "M", "B"}, {}, {}, {"XL: 120"}, 1, 1, false},
        DuePhase{"Phase0Empty", kAllClasses, {}, {"M"}, {"photo: 320"}, 0, 3, true},
        DuePhase{"Phase2Empty", kAllClasses, {}, {"S"}, {"XL: 120"}, 1, 1, false},
        DuePhase{"Phase0Outdated", kAllClasses, {"M"}, {}, {"photo: 320"}, 0, 3, true},
        DuePhase{"Phase1Outdated", kAllClasses, {"B"}, {}, {"XL: 640"}, 0, 1, true},
        DuePhase{"Phase2Outdated", kAllClasses, {"S"}, {}, {"XL: 120"}, 1, 1, false},
        DuePhase{"EarliestFirst", {"XL", "M"}, {"XL"}, {}, {"photo: 1280", "XL: 640"}, 0, 3, true}),
    CaseName());

TEST_F(PhaseChoice, ThumbnailOfOneByteMakesItsPhaseDue) {
  // A file of one byte is not made again, but its phase is not complete either.
  PutThumbs(kPhoto, kAllClasses);
  WriteFileOfSize(Thumb(kPhoto, "M"), 1);
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kVersionRequest, kReport));
  EXPECT_EQ(Progress("completed_thumb"), 3);
  EXPECT_EQ(ReadFile(kQueue), "/tmp/photos\n");
}

TEST_F(PhaseChoice, ThumbnailOfTwoBytesIsComplete) {
  PutThumbs(kPhoto, kAllClasses);
  WriteFileOfSize(Thumb(kPhoto, "M"), 2);
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kReport));
}

TEST_F(PhaseChoice, OutdatedPhotoIsMadeAgainInTwoRuns) {
  PutThumbs(kPhoto, kAllClasses);
  for (const std::string& sizeClass : kAllClasses) {
    MakeOutdated(sizeClass);
  }
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kVersionRequest, kReport));
  EXPECT_THAT(Made(), ElementsAre("photo: 1280 320", "XL: 640"));
  EXPECT_EQ(Progress("completed_thumb"), 3);
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kVersionRequest, kReport));
  EXPECT_THAT(Made(), ElementsAre("photo: 1280 320", "XL: 640", "XL: 120"));
  ExpectProgress(1, 4);
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kReport));
}

TEST_F(PhaseChoice, ThumbnailOfThePhotosOwnSecondIsUpToDate) {
  PutThumbs(kPhoto, kAllClasses);
  const int64_t second = ModificationTime(kPhoto).seconds;
  SetFileTime(kPhoto, second, 999999999);
  for (const std::string& sizeClass : kAllClasses) {
    SetFileTime(Thumb(kPhoto, sizeClass), second, 0);
  }
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kReport));
}

class OlderNames : public PhaseChoice {
 protected:
  void SetUp() override {
    PhaseChoice::SetUp();
    WriteProfileFile(kProfiles, {{"thumb_xl", 1280, 90, std::nullopt, "VELAPHOTO:THUMB_XL.jpg", 0},
                                 {"thumb_b", 640, 90, std::nullopt, "VELAPHOTO:THUMB_B.jpg", 1},
                                 {"thumb_s", 120, 90, std::nullopt, "VELAPHOTO:THUMB_S.jpg", 2}});
  }
};

TEST_F(OlderNames, AreAccepted) {
  PutOldThumbs({"XL", "B", "S"});
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kReport));
  EXPECT_THAT(Made(), IsEmpty());
}

TEST_F(OlderNames, AreAcceptedForTheReference) {
  PutOldThumbs({"XL"});
  RunAndGetRequests();
  EXPECT_THAT(ConvertedSources(), ElementsAre(OldThumb(kPhoto, "XL")));
  EXPECT_TRUE(Exists(Thumb(kPhoto, "B")));
  EXPECT_FALSE(Exists(OldThumb(kPhoto, "B")));
}

TEST_F(OlderNames, AreUsedForTheReferenceAfterTheCurrentName) {
  PutThumbs(kPhoto, {"XL"});
  PutOldThumbs({"XL"});
  RunAndGetRequests();
  EXPECT_THAT(ConvertedSources(), ElementsAre(Thumb(kPhoto, "XL")));
}

TEST_F(PhaseChoice, EachPhotoHasItsOwnPhase) {
  MakePhotos({"b.jpg", "c.jpg", "d.jpg"});
  PutThumbs("/tmp/photos/b.jpg", {"XL", "M"});
  PutThumbs("/tmp/photos/c.jpg", {"XL", "M", "B"});
  PutThumbs("/tmp/photos/d.jpg", kAllClasses);
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kVersionRequest, kReport,                //
                                               "GET_INDEX_VERSION /tmp/photos/b.jpg",   //
                                               "POST_PHOTO_CONVERT /tmp/photos/b.jpg",  //
                                               "GET_INDEX_VERSION /tmp/photos/c.jpg",   //
                                               "POST_PHOTO_CONVERT /tmp/photos/c.jpg",  //
                                               "POST_PHOTO_CONVERT /tmp/photos/d.jpg"));
  EXPECT_THAT(ConvertedSources(),
              ElementsAre(kPhoto, Thumb(kPhoto, "XL"), Thumb("/tmp/photos/b.jpg", "XL"),
                          Thumb("/tmp/photos/c.jpg", "XL")));
  ExpectProgress(1, 5);
}

TEST_F(PhaseChoice, PhotoFromTheFutureTakesTwoRunsToo) {
  SetFileTimeFromNow(kPhoto, 3600);
  const FileTime second = {ModificationTime(kPhoto).seconds, 0};
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kVersionRequest, kReport));
  EXPECT_EQ(ModificationTime(Thumb(kPhoto, "XL")), second);
  EXPECT_EQ(ModificationTime(Thumb(kPhoto, "B")), second);
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kVersionRequest, kReport));
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kReport));
  EXPECT_THAT(Made(), ElementsAre("photo: 1280 320", "XL: 640", "XL: 120"));
}

}  // namespace
}  // namespace vela_test
