// Directory part and extension of paths.
#include <gtest/gtest.h>

#include <string>

#include "platform/velaindex.h"
#include "platform/velautils.h"

namespace {

TEST(PathDirName, IsThePathWithoutItsLastComponent) {
  EXPECT_EQ(VELAUtils::GetPathDirName("/photo/@eaDir/a.jpg/thumb.jpg"), "/photo/@eaDir/a.jpg");
  EXPECT_EQ(VELAUtils::GetPathDirName("a/b"), "a");
  EXPECT_EQ(VELAUtils::GetPathDirName("/a"), "/");
  EXPECT_EQ(VELAUtils::GetPathDirName("./a"), ".");
}

TEST(PathDirName, HasNoTrailingSlash) {
  EXPECT_EQ(VELAUtils::GetPathDirName("/a//b"), "/a");
  EXPECT_EQ(VELAUtils::GetPathDirName("a/"), "a");
  EXPECT_EQ(VELAUtils::GetPathDirName("//a"), "/");
}

TEST(PathDirName, IsADotWithoutDirectory) {
  EXPECT_EQ(VELAUtils::GetPathDirName("a.jpg"), ".");
  EXPECT_EQ(VELAUtils::GetPathDirName(""), ".");
}

TEST(PathDirName, KeepsEveryByte) {
  EXPECT_EQ(VELAUtils::GetPathDirName("/\xff\n %s/x"), "/\xff\n %s");
}

struct ExtensionCase {
  const char* path;
  const char* extension;
};

constexpr ExtensionCase kExtensions[] = {
    {"a.jpg", "jpg"},
    {"/p/a.tar.GZ", "GZ"},
    {"/p.d/a", ""},
    {"/p.d/", ""},
    {"/p/.jpg", "jpg"},
    {"a.", ""},
    {"", ""},
    {".", ""},
    {"/p.d/a.b c", "b c"},
    {"a..x", "x"},
    {"/p/a.\xff", "\xff"},
    {"a/b.c/d.e/f", ""},
};

TEST(PathExtension, IsWhatFollowsTheLastDotOfTheLastComponent) {
  for (const ExtensionCase& one : kExtensions) {
    EXPECT_EQ(VELAUtils::GetPathExt(one.path), one.extension) << one.path;
    EXPECT_STREQ(VELAIndexExtGet(one.path), one.extension) << one.path;
  }
}

TEST(PathExtension, PointsIntoThePath) {
  const char* path = "/p/photo.Jpg";
  EXPECT_EQ(VELAIndexExtGet(path), path + 9);
}

TEST(PathExtension, IsEmptyForNull) {
  EXPECT_STREQ(VELAIndexExtGet(nullptr), "");
}

}  // namespace
