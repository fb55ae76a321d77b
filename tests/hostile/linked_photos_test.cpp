// Symbolic links in place of photos, and thumbnails that are links: a thumbnail can be read by
// everyone and must not show what its owner could not have read.
#include <sys/stat.h>
#include <unistd.h>

#include "hostile/hostile_test.h"

namespace vela_test::hostile {

namespace {

constexpr int kOwnColour = 90;

class LinkedPhotos : public HostileTest {
 protected:
  static bool HasAnyThumb(const std::string& photo) {
    for (const std::string& name : ListDirectory(MetadataDirOf(photo))) {
      if (name.compare(0, 15, "VELAPHOTO_THUMB") == 0 && name.find(".jpg") != std::string::npos) {
        return true;
      }
    }
    return false;
  }

  void ExpectFollowed(uid_t linkOwner, uid_t photoOwner) {
    MakePlainPhoto("/tmp/elsewhere.jpg", kOwnColour);
    chmod("/tmp/elsewhere.jpg", 0600);
    GiveTo(photoOwner, "/tmp/elsewhere.jpg");
    MakeDirectoryOf(kOwner, InPhotos("d"));
    EXPECT_TRUE(Link("/tmp/elsewhere.jpg", InPhotos("d/x.jpg")));
    GiveTo(linkOwner, InPhotos("d/x.jpg").c_str());
    RunInTime({InPhotos("d")});
    EXPECT_TRUE(HasThumbs(InPhotos("d/x.jpg"), FirstKinds(kinds_)));
    EXPECT_EQ(PaletteIndexOf(ThumbOf(InPhotos("d/x.jpg"), kinds_[0])), kOwnColour);
  }
};

}  // namespace

TEST_F(LinkedPhotos, ToPrivatePhotosOfOthersGetNoThumbnails) {
  if (!CanDistinguishOwners()) {
    return;
  }
  MakeDirectoryOf(kAttacker, InPhotos("d"));
  ActAs(kAttacker, [] {
    return Link(kPrivatePhoto, InPhotos("d/x.jpg")) && Link("x.jpg", InPhotos("d/y.jpg"));
  });
  for (int run = 0; run < 2; ++run) {
    RunInTime({InPhotos("d")});
  }
  EXPECT_FALSE(HasAnyThumb(InPhotos("d/x.jpg")));
  EXPECT_FALSE(HasAnyThumb(InPhotos("d/y.jpg")));
  ExpectNothingRevealed();
}

TEST_F(LinkedPhotos, OfUser0AreFollowed) {
  ExpectFollowed(0, kOwner);
}

TEST_F(LinkedPhotos, ToTheOwnersPhotosAreFollowed) {
  ExpectFollowed(kOwner, kOwner);
}

// Phases 1 and 2 are made from the largest thumbnail of phase 0.
TEST_F(LinkedPhotos, AsThumbnailAreNotTheSourceOfOthers) {
  if (!CanDistinguishOwners()) {
    return;
  }
  const std::string photo = InPhotos("a.jpg");
  MakePlainPhoto(photo, kOwnColour);
  SetFileTime(photo, 900000000);  // older than the private photo: its thumbnails look up to date
  for (const bool keepsIndexRotation : {false, true}) {
    SCOPED_TRACE(keepsIndexRotation ? "compared for rotation" : "not compared");
    DaemonPeer daemon;
    daemon.SetIndexVersion(keepsIndexRotation ? 1 : 0);
    RemoveTree(InPhotos("@eaDir"));
    MakeMetadataDir(photo);
    ActAs(kAttacker, [&] {
      bool done = true;
      for (const Kind& kind : OfPhase(SmallKinds(), 0)) {
        done = done && Link(kPrivatePhoto, ThumbOf(photo, kind));
      }
      return done;
    });
    for (int run = 0; run < 2; ++run) {
      RunInTime();
      ExpectNothingRevealed();
    }
  }
}

}  // namespace vela_test::hostile
