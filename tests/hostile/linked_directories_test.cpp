// Symbolic links in place of a metadata directory or of a photo's folder in it.
#include <sys/stat.h>
#include <unistd.h>

#include "hostile/hostile_test.h"

namespace vela_test::hostile {

namespace {

/// The place that the program works in by a link.
struct Place {
  const char* description;
  std::string link;     ///< the path of the link
  std::string target;   ///< a directory of the victim that looks alike
  std::string message;  ///< the log line about the link
};

std::vector<Place> PlacesOf(const std::string& directory) {
  const std::string root = directory + "/@eaDir";
  const std::string folder = root + "/a.jpg";
  return {{"metadata directory", root, kVictimMetadata, "velathumb:844 Failed to open " + root},
          {"folder of a photo", folder, std::string(kVictimMetadata) + "/a.jpg",
           "not following a link of another user: " + folder}};
}

class LinkedDirectories : public HostileTest {
 protected:
  /// A photo directory of the user with a photo; the directory that will hold the link exists.
  static void MakePhotosOf(uid_t user, const std::string& directory, const std::string& link) {
    MakeDirectoryOf(user, directory);
    MakeJpeg(directory + "/a.jpg");
    GiveTo(user, (directory + "/a.jpg").c_str());
    const std::string parent = link.substr(0, link.rfind('/'));
    if (parent != directory) {
      MakeDirectories(parent);
    }
  }

  /// A run that comes to the photo by an honest link works in the link's target.
  void ExpectFollowed(uid_t linkOwner, uid_t targetOwner) {
    for (const Place& place : PlacesOf(InPhotos("honest"))) {
      SCOPED_TRACE(place.description);
      RemoveTree(InPhotos("honest"));
      RemoveTree("/tmp/elsewhere");
      MakePhotosOf(kOwner, InPhotos("honest"), place.link);
      MakeDirectories("/tmp/elsewhere");
      GiveTo(targetOwner, "/tmp/elsewhere");
      EXPECT_TRUE(Link("/tmp/elsewhere", place.link));
      GiveTo(linkOwner, place.link.c_str());
      RunInTime({InPhotos("honest")});
      EXPECT_TRUE(HasThumbs(InPhotos("honest/a.jpg"), FirstKinds(kinds_)));
      EXPECT_THAT(ListTree("/tmp/elsewhere"), ::testing::Not(IsEmpty()));
    }
  }
};

}  // namespace

TEST_F(LinkedDirectories, ToDirectoriesOfOthersAreNotFollowed) {
  if (!CanDistinguishOwners()) {
    return;
  }
  for (const Place& place : PlacesOf(InPhotos("d"))) {
    SCOPED_TRACE(place.description);
    RemoveTree(InPhotos("d"));
    MakePhotosOf(kAttacker, InPhotos("d"), place.link);
    ActAs(kAttacker, [&] { return Link(place.target, place.link); });
    RunInTime({InPhotos("d")});
    EXPECT_THAT(TakeErrorLines(), ::testing::Contains(place.message));
    ExpectVictimUnchanged();
  }
}

TEST_F(LinkedDirectories, ToOpenDirectoriesOfOthersAreNotFollowed) {
  if (!CanDistinguishOwners()) {
    return;
  }
  // Everyone may write there, as in a shared folder, so permissions alone do not protect it.
  const std::string shared = "/tmp/shared";
  for (const Place& place : PlacesOf(InPhotos("d"))) {
    SCOPED_TRACE(place.description);
    RemoveTree(InPhotos("d"));
    RemoveTree(shared);
    MakePhotosOf(kAttacker, InPhotos("d"), place.link);
    MakeDirectories(shared + "/a.jpg");
    WriteFile(shared + "/VELAPHOTO_THUMB_XL.fail", "");
    WriteFile(shared + "/a.jpg/VELAPHOTO_THUMB_XL.fail", "");
    GiveTo(kOwner, shared.c_str());
    GiveTo(kOwner, (shared + "/a.jpg").c_str());
    ActAs(kAttacker, [&] { return Link(shared, place.link); });
    RunInTime({InPhotos("d")});
    EXPECT_THAT(ListTree(shared),
                ElementsAre("VELAPHOTO_THUMB_XL.fail", "a.jpg/", "a.jpg/VELAPHOTO_THUMB_XL.fail"));
  }
}

TEST_F(LinkedDirectories, ThatDangleMakeNothing) {
  if (!CanDistinguishOwners()) {
    return;
  }
  for (const Place& place : PlacesOf(InPhotos("d"))) {
    SCOPED_TRACE(place.description);
    RemoveTree(InPhotos("d"));
    MakePhotosOf(kAttacker, InPhotos("d"), place.link);
    ActAs(kAttacker, [&] { return Link(std::string(kVictim) + "/new", place.link); });
    RunInTime({InPhotos("d")});
  }
}

/// The directory of another photo, whose thumbnails would show the wrong picture.
TEST_F(LinkedDirectories, OfATreeAreNotFollowedEither) {
  if (!CanDistinguishOwners()) {
    return;
  }
  MakePhotosOf(kAttacker, InPhotos("d"), InPhotos("d/@eaDir"));
  MakePhotosOf(kAttacker, InPhotos("d/below"), InPhotos("d/below/@eaDir"));
  ActAs(kAttacker, [&] {
    return Link(kVictimMetadata, InPhotos("d/@eaDir")) &&
           Link(kVictimMetadata, InPhotos("d/below/@eaDir"));
  });
  RunInTime({"R:" + InPhotos("d")});
}

TEST_F(LinkedDirectories, OfUser0AreFollowed) {
  ExpectFollowed(0, kOwner);
}

TEST_F(LinkedDirectories, ToTheOwnersDirectoriesAreFollowed) {
  ExpectFollowed(kOwner, kOwner);
}

}  // namespace vela_test::hostile
