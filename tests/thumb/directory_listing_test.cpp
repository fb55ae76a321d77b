// Which entries of a directory are photos, and their order.
#include "thumb/directory_pass.h"
#include "thumb/thumb_test.h"

namespace vela_test {
namespace {

class ListPhotos : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories("/tmp/d");
  }

  static void Touch(const std::vector<std::string>& names) {
    for (const std::string& name : names) {
      WriteFile("/tmp/d/" + name, "");
    }
  }

  static std::vector<std::string> List() { return ListDirectoryPhotos("/tmp/d"); }
};

TEST_F(ListPhotos, SortsByBytes) {
  Touch({"b.jpg", "a.jpg", "B.jpg", "10.jpg", "9.jpg", "_.jpg", "a b.jpg", "a.JPG", "\xc3\xa9.jpg",
         "\xff.jpg", "z.jpg", "a.jpeg"});
  EXPECT_THAT(List(), ElementsAre("10.jpg", "9.jpg", "B.jpg", "_.jpg", "a b.jpg", "a.JPG", "a.jpeg",
                                  "a.jpg", "b.jpg", "z.jpg", "\xc3\xa9.jpg", "\xff.jpg"));
}

TEST_F(ListPhotos, ReturnsBareNamesAndClosesTheDirectory) {
  Touch({"a.jpg"});
  EXPECT_THAT(ListDirectoryPhotos("/tmp/d/"), ElementsAre("a.jpg"));
  EXPECT_THAT(DescriptorsOf("/tmp/d"), IsEmpty());
}

TEST_F(ListPhotos, TakesPhotosOnly) {
  Touch({"a.jpg", "b.png", "c.nef", "d.txt", "e.mp4", "jpg", "f.jpg.bak", "g"});
  EXPECT_THAT(List(), ElementsAre("a.jpg", "b.png", "c.nef"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ListPhotos, SkipsAttributeFilesOfOtherSystems) {
  Touch({"._a.jpg", "._.jpg", "._a.nef", "a._b.jpg", "_.a.jpg"});
  EXPECT_THAT(List(), ElementsAre("_.a.jpg", "a._b.jpg"));
}

TEST_F(ListPhotos, TakesOtherNamesWithALeadingDot) {
  Touch({".a.jpg", "..a.jpg", "...jpg", ".-_.jpg"});
  EXPECT_THAT(List(), ElementsAre(".-_.jpg", "...jpg", "..a.jpg", ".a.jpg"));
}

TEST_F(ListPhotos, SkipsOtherThanRegularFiles) {
  MakeDirectories("/tmp/d/a.jpg");
  ASSERT_EQ(mkfifo("/tmp/d/b.jpg", 0666), 0);
  ASSERT_EQ(symlink("a.jpg", "/tmp/d/c.jpg"), 0);
  EXPECT_THAT(List(), IsEmpty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ListPhotos, FollowsLinksToPhotos) {
  WriteFile("/tmp/elsewhere", "");
  ASSERT_EQ(symlink("/tmp/elsewhere", "/tmp/d/a.jpg"), 0);
  EXPECT_THAT(List(), ElementsAre("a.jpg"));
}

TEST_F(ListPhotos, LogsPhotosThatCannotBeExaminedAndGoesOn) {
  Touch({"a.jpg"});
  ASSERT_EQ(symlink("nowhere", "/tmp/d/b.jpg"), 0);
  ASSERT_EQ(symlink("c.jpg", "/tmp/d/c.jpg"), 0);
  Touch({"d.jpg"});
  EXPECT_THAT(List(), ElementsAre("a.jpg", "d.jpg"));
  EXPECT_THAT(ErrorLines(), UnorderedElementsAre("velathumb:416 [Error] stat: /tmp/d/b.jpg",
                                                 "velathumb:416 [Error] stat: /tmp/d/c.jpg"));
}

TEST_F(ListPhotos, ExaminesNothingButPhotos) {
  ASSERT_EQ(symlink("nowhere", "/tmp/d/a.txt"), 0);
  ASSERT_EQ(symlink("nowhere", "/tmp/d/._a.jpg"), 0);
  EXPECT_THAT(List(), IsEmpty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ListPhotos, LogsTheFullPathAsItIs) {
  MakeDirectories("/tmp/%s d");
  ASSERT_EQ(symlink("nowhere", "/tmp/%s d/%n.jpg"), 0);
  EXPECT_THAT(ListDirectoryPhotos("/tmp/%s d"), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:416 [Error] stat: /tmp/%s d/%n.jpg"));
}

TEST_F(ListPhotos, DoesNotEnterSubdirectories) {
  EXPECT_THAT(List(), IsEmpty());
  Touch({"sub/a.jpg"});
  EXPECT_THAT(List(), IsEmpty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ListPhotos, LogsADirectoryThatCannotBeOpened) {
  EXPECT_THAT(ListDirectoryPhotos("/tmp/missing"), IsEmpty());
  Touch({"file"});
  EXPECT_THAT(ListDirectoryPhotos("/tmp/d/file"), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:404 [Error] opendir: /tmp/missing",
                                        "velathumb:404 [Error] opendir: /tmp/d/file"));
}

TEST_F(ListPhotos, LogsADirectoryThatMayNotBeRead) {
  Touch({"a.jpg"});
  ASSERT_EQ(chmod("/tmp/d", 0333), 0);
  const WithoutCapabilities ordinary;
  EXPECT_THAT(List(), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:404 [Error] opendir: /tmp/d"));
}

}  // namespace
}  // namespace vela_test
