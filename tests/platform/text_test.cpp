// Directory part and extension of paths; escaping percent signs, trimming white space.
#include "platform/platform_fixture.h"
#include "platform/velautils.h"

namespace vela_test {
namespace {

TEST(PathDirName, IsThePathWithoutItsLastComponent) {
  const struct {
    const char* path;
    const char* directory;
  } cases[] = {
      {"/photo/@eaDir/a.jpg/thumb.jpg", "/photo/@eaDir/a.jpg"},
      {"a/b", "a"},
      {"/a", "/"},
      {"./a", "."},
      // no trailing slash
      {"/a//b", "/a"},
      {"a/", "a"},
      {"//a", "/"},
      // without directory
      {"a.jpg", "."},
      {"", "."},
      // any byte
      {"/\xff\n %s/x", "/\xff\n %s"},
  };
  for (const auto& [path, directory] : cases) {
    EXPECT_EQ(VELAUtils::GetPathDirName(path), directory) << path;
  }
}

TEST(PathExtension, FollowsTheLastDotOfTheLastComponent) {
  const struct {
    const char* path;
    const char* extension;
  } cases[] = {
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
  for (const auto& [path, extension] : cases) {
    EXPECT_EQ(VELAUtils::GetPathExt(path), extension) << path;
    EXPECT_STREQ(VELAIndexExtGet(path), extension) << path;
  }
}

TEST(PathExtension, PointsIntoThePath) {
  const char* path = "/p/photo.Jpg";
  EXPECT_EQ(VELAIndexExtGet(path), path + 9);
}

TEST(PathExtension, IsEmptyForNull) {
  EXPECT_STREQ(VELAIndexExtGet(nullptr), "");
}

std::string Escaped(const char* in, size_t outSize) {
  std::vector<char> out(outSize + 1, '!');
  EscapePercentSign(in, out.data(), outSize);
  EXPECT_EQ(out[outSize], '!') << "written beyond the buffer";
  return out.data();
}

TEST(EscapePercentSignTest, DoublesEveryPercentSignAndCutsWhatDoesNotFit) {
  const struct {
    const char* in;
    size_t outSize;
    const char* out;
  } cases[] = {
      {"/100%/%d", 64, "/100%%/%%d"},
      {"%%", 64, "%%%%"},
      {"", 64, ""},
      {"plain \xff\n", 64, "plain \xff\n"},
      {"abc", 4, "abc"},
      {"abc", 3, "ab"},
      {"abc", 1, ""},
      // never between the two signs of a pair
      {"a%b", 5, "a%%b"},
      {"a%b", 4, "a%%"},
      {"a%b", 3, "a"},
      {"%", 2, ""},
  };
  for (const auto& [in, outSize, out] : cases) EXPECT_EQ(Escaped(in, outSize), out) << in;
}

TEST(EscapePercentSignTest, WritesNothingToAnEmptyBuffer) {
  char out = 'x';
  EscapePercentSign("abc", &out, 0);
  EXPECT_EQ(out, 'x');
  EscapePercentSign("abc", nullptr, 4);
  EXPECT_EQ(Escaped(nullptr, 4), "");
}

std::string TrimmedCopy(std::string text) {
  StringTrim(text.data());
  return text.c_str();
}

TEST(StringTrimTest, RemovesWhiteSpaceAtBothEnds) {
  EXPECT_EQ(TrimmedCopy(" \t\r\n\v\fa b\t \n"), "a b");
  for (const char* text : {"a", "  a", "a  "}) EXPECT_EQ(TrimmedCopy(text), "a");
  for (const char* text : {" \n", ""}) EXPECT_EQ(TrimmedCopy(text), "");
}

TEST(StringTrimTest, KeepsOtherBytes) {
  EXPECT_EQ(TrimmedCopy(" \xa0\x85\x01 "), "\xa0\x85\x01");
  StringTrim(nullptr);
}

}  // namespace
}  // namespace vela_test
