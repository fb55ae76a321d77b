// Which entries of a directory are taken for photos, and in which order.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "support/files.h"
#include "support/privileges.h"
#include "support/sandbox.h"
#include "support/system_log.h"
#include "thumb/directory_pass.h"
#include "thumb/open_files.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

class ListPhotos : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories("/tmp/d");
  }

  static void Touch(const std::string& name) { WriteFile("/tmp/d/" + name, ""); }

  static std::vector<std::string> List() { return ListDirectoryPhotos("/tmp/d"); }
};

TEST_F(ListPhotos, SortsByBytes) {
  for (const char* name : {"b.jpg", "a.jpg", "B.jpg", "10.jpg", "9.jpg", "_.jpg", "a b.jpg",
                           "a.JPG", "\xc3\xa9.jpg", "\xff.jpg", "z.jpg", "a.jpeg"}) {
    Touch(name);
  }
  EXPECT_THAT(List(), ElementsAre("10.jpg", "9.jpg", "B.jpg", "_.jpg", "a b.jpg", "a.JPG", "a.jpeg",
                                  "a.jpg", "b.jpg", "z.jpg", "\xc3\xa9.jpg", "\xff.jpg"));
}

TEST_F(ListPhotos, GivesBareNames) {
  Touch("a.jpg");
  EXPECT_THAT(ListDirectoryPhotos("/tmp/d/"), ElementsAre("a.jpg"));
}

TEST_F(ListPhotos, TakesPhotosOnly) {
  for (const char* name : {"a.jpg", "b.png", "c.nef", "d.txt", "e.mp4", "jpg", "f.jpg.bak", "g"}) {
    Touch(name);
  }
  EXPECT_THAT(List(), ElementsAre("a.jpg", "b.png", "c.nef"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ListPhotos, LeavesOutTheFilesThatOtherSystemsPutBesideEachFile) {
  for (const char* name : {"._a.jpg", "._.jpg", "._a.nef", "a._b.jpg", "_.a.jpg"}) {
    Touch(name);
  }
  EXPECT_THAT(List(), ElementsAre("_.a.jpg", "a._b.jpg"));
}

TEST_F(ListPhotos, TakesOtherNamesWithALeadingDot) {
  for (const char* name : {".a.jpg", "..a.jpg", "...jpg", ".-_.jpg"}) {
    Touch(name);
  }
  EXPECT_THAT(List(), ElementsAre(".-_.jpg", "...jpg", "..a.jpg", ".a.jpg"));
}

TEST_F(ListPhotos, PassesOverWhatIsNoRegularFile) {
  MakeDirectories("/tmp/d/a.jpg");
  ASSERT_EQ(0, mkfifo("/tmp/d/b.jpg", 0666));
  ASSERT_EQ(0, symlink("a.jpg", "/tmp/d/c.jpg"));
  EXPECT_THAT(List(), IsEmpty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ListPhotos, FollowsLinksToPhotos) {
  WriteFile("/tmp/elsewhere", "");
  ASSERT_EQ(0, symlink("/tmp/elsewhere", "/tmp/d/a.jpg"));
  EXPECT_THAT(List(), ElementsAre("a.jpg"));
}

TEST_F(ListPhotos, LogsPhotosThatCannotBeExaminedAndGoesOn) {
  Touch("a.jpg");
  ASSERT_EQ(0, symlink("nowhere", "/tmp/d/b.jpg"));
  ASSERT_EQ(0, symlink("c.jpg", "/tmp/d/c.jpg"));
  Touch("d.jpg");
  EXPECT_THAT(List(), ElementsAre("a.jpg", "d.jpg"));
  EXPECT_THAT(ErrorLines(), UnorderedElementsAre("velathumb:416 [Error] stat: /tmp/d/b.jpg",
                                                 "velathumb:416 [Error] stat: /tmp/d/c.jpg"));
}

TEST_F(ListPhotos, ExaminesNothingButPhotos) {
  ASSERT_EQ(0, symlink("nowhere", "/tmp/d/a.txt"));
  ASSERT_EQ(0, symlink("nowhere", "/tmp/d/._a.jpg"));
  EXPECT_THAT(List(), IsEmpty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ListPhotos, LogsTheFullPathAsItIs) {
  MakeDirectories("/tmp/%s d");
  ASSERT_EQ(0, symlink("nowhere", "/tmp/%s d/%n.jpg"));
  EXPECT_THAT(ListDirectoryPhotos("/tmp/%s d"), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:416 [Error] stat: /tmp/%s d/%n.jpg"));
}

TEST_F(ListPhotos, DoesNotEnterSubdirectories) {
  Touch("sub/a.jpg");
  EXPECT_THAT(List(), IsEmpty());
}

TEST_F(ListPhotos, EmptyDirectoryHasNone) {
  EXPECT_THAT(List(), IsEmpty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ListPhotos, LogsADirectoryThatCannotBeOpened) {
  EXPECT_THAT(ListDirectoryPhotos("/tmp/missing"), IsEmpty());
  Touch("file");
  EXPECT_THAT(ListDirectoryPhotos("/tmp/d/file"), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:404 [Error] opendir: /tmp/missing",
                                        "velathumb:404 [Error] opendir: /tmp/d/file"));
}

TEST_F(ListPhotos, LogsADirectoryThatMayNotBeRead) {
  Touch("a.jpg");
  ASSERT_EQ(0, chmod("/tmp/d", 0333));
  const WithoutCapabilities ordinary;
  EXPECT_THAT(List(), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:404 [Error] opendir: /tmp/d"));
}

TEST_F(ListPhotos, ClosesTheDirectory) {
  Touch("a.jpg");
  List();
  EXPECT_THAT(DescriptorsOf("/tmp/d"), IsEmpty());
}

}  // namespace
}  // namespace vela_test
