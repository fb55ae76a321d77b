// The content of the status page, and how its file is written.
#include "html_page.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <signal.h>
#include <stdlib.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <time.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <ostream>
#include <set>

#include "html_counts.h"
#include "html_page_photos.h"
#include "smallest_thumb.h"
#include "support/descriptor.h"
#include "support/files.h"
#include "support/mounts.h"
#include "support/privileges.h"
#include "support/program.h"
#include "support/sandbox.h"
#include "support/seccomp_fail.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;

using HtmlPageTest = SandboxTest;

size_t CountOf(const std::string& part, const std::string& text) {
  size_t count = 0;
  for (size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) {
    ++count;
  }
  return count;
}

/// The text from the first `begin` up to the next `end`.
std::string Between(const std::string& text, const std::string& begin, const std::string& end) {
  const size_t from = text.find(begin);
  EXPECT_NE(from, std::string::npos) << begin;
  const size_t to = text.find(end, from);
  EXPECT_NE(to, std::string::npos) << end;
  return text.substr(from, to - from);
}

/// The only tile of a page with one photo.
std::string TileOf(const PhotoReport& photo) {
  const std::string page = PageOfPhotos({photo});
  EXPECT_EQ(CountOf("<li class=\"tile", page), 1u);
  return Between(page, "<li class=\"tile", "</li>");
}

/// The attribute with which a page embeds this content, encoded by an independent tool.
std::string EmbeddedForm(const std::string& content) {
  WriteFile("/tmp/content", content);
  const ProgramResult result = RunProgram("/usr/bin/base64", {"-w0", "/tmp/content"});
  EXPECT_EQ(result.exitCode, 0);
  return "src=\"data:image/jpeg;base64," + result.out + '"';
}

/// Sets the time zone to five hours east of Greenwich.
class TimeZone {
 public:
  TimeZone() {
    setenv("TZ", "TEST-5", 1);
    tzset();
  }
  ~TimeZone() {
    unsetenv("TZ");
    tzset();
  }
  TimeZone(const TimeZone&) = delete;
  TimeZone& operator=(const TimeZone&) = delete;
};

constexpr time_t kTime = 1700000000;  // 2023-11-14 22:13:20 in Greenwich
constexpr const char* kTimeText =
    "<time datetime=\"2023-11-15T03:13:20+0500\">2023-11-15 03:13</time>";

// The document

TEST_F(HtmlPageTest, IsACompleteDocumentThatRunsAndLoadsNothing) {
  const PhotoReport photo = CompletePhoto("a.jpg");
  WriteFile(ThumbOf(photo, kS), ThumbBytes("thumb"));
  const std::string page = PageOfPhotos({photo, CompletePhoto("b.jpg")});
  EXPECT_THAT(page, StartsWith("<!DOCTYPE html>\n<html lang=\"en\">\n<head>\n<meta "
                               "charset=\"utf-8\">\n<meta http-equiv=\"Content-Security-Policy\" "
                               "content=\"default-src 'none'; img-src data:; style-src "
                               "'unsafe-inline'; base-uri 'none'; form-action 'none'\">\n"));
  EXPECT_THAT(page, EndsWith("</body>\n</html>\n"));
  EXPECT_THAT(page, HasSubstr("<meta name=\"viewport\" content=\"width=device-width, "
                              "initial-scale=1\">"));
  EXPECT_THAT(page, HasSubstr("<title>Thumbnail status</title>"));
  for (const char* part : {"http:", "https:", "<script", "javascript", "<link", "@import", "url(",
                           "href", "srcset", "<iframe", "<object"}) {
    EXPECT_THAT(page, Not(HasSubstr(part)));
  }
  EXPECT_EQ(CountOf("src=", page), 1u);
  EXPECT_EQ(CountOf("src=\"data:image/jpeg;base64,", page), 1u);
}

TEST_F(HtmlPageTest, ElementsAreClosedInTheirOrder) {
  const PhotoReport failed = WithFailures(Missing(AllSizes(), "b.jpg"), AllSizes(), kTime);
  WritePage(
      {{"/tmp/photos", true, {CompletePhoto("a.jpg"), failed}, 2}, {"/tmp/empty", false, {}}});
  const std::string page = ReadFile(kPage);
  const std::set<std::string> withoutEnd = {"meta", "img", "input", "!DOCTYPE"};
  std::vector<std::string> open;
  for (size_t at = page.find('<'); at != std::string::npos; at = page.find('<', at + 1)) {
    const bool isEnd = page[at + 1] == '/';
    const size_t from = at + (isEnd ? 2 : 1);
    const std::string name = page.substr(from, page.find_first_of(" >", from) - from);
    if (isEnd) {
      ASSERT_FALSE(open.empty()) << name;
      ASSERT_EQ(open.back(), name);
      open.pop_back();
    } else if (withoutEnd.count(name) == 0) {
      open.push_back(name);
    }
  }
  EXPECT_THAT(open, IsEmpty());
}

TEST_F(HtmlPageTest, TheSummaryShowsTheTotals) {
  const PhotoReport missing = WithFailures(Missing({kM, kL, kXL}, "b.jpg"), {kXL}, kTime);
  const std::string page = PageOf({{"/tmp/photos", true, {CompletePhoto("a.jpg"), missing}, 3},
                                   {"/tmp/more", false, {Outdated({kS, kB}, "c.jpg")}, 4}});
  const std::string header = Between(page, "<header>", "</header>");
  for (const char* part :
       {"<p class=\"lead\">2 directories, <time ", "<b>72%</b> of 18 thumbnails present",
        "</i>Present 13 (72%)", "</i>Missing or outdated 4 (22%)", "</i>Failed 1 (6%)",
        "<dt>Photos</dt><dd>3</dd>", "<dt>Photos that need work</dt><dd>2</dd>",
        "<dt>Directories</dt><dd>2</dd>", "<dt>Queued directories</dt><dd>1</dd>",
        "<dt>Videos that need work</dt><dd>7</dd>"}) {
    EXPECT_THAT(header, HasSubstr(part));
  }
}

TEST_F(HtmlPageTest, TheBarHasAPartForEachShareAndALabel) {
  const std::string page = PageOfPhotos({WithFailures(Missing({kS, kM, kL}), {kM}, kTime)});
  const std::string parts =
      " role=\"img\" aria-label=\"Thumbnails: 3 present, 2 missing, 1 failed\">"
      "<span class=\"present\" style=\"flex-grow:3\"></span>"
      "<span class=\"missing\" style=\"flex-grow:2\"></span>"
      "<span class=\"failed\" style=\"flex-grow:1\"></span></div>";
  EXPECT_THAT(page, HasSubstr("<div class=\"bar\"" + parts));
  EXPECT_THAT(page, HasSubstr("<div class=\"bar thin\"" + parts));
}

TEST_F(HtmlPageTest, AnEmptyShareHasNoPart) {
  const std::string page = PageOfPhotos({CompletePhoto("a.jpg")});
  EXPECT_THAT(page, HasSubstr("aria-label=\"Thumbnails: 6 present, 0 missing, 0 failed\">"
                              "<span class=\"present\" style=\"flex-grow:6\"></span></div>"));
}

TEST_F(HtmlPageTest, UncheckedVideosAreNotShown) {
  EXPECT_THAT(PageOfPhotos({CompletePhoto("a.jpg")}), Not(HasSubstr("ideos")));
}

TEST_F(HtmlPageTest, EveryDirectoryHasASectionInTheOrderOfTheScan) {
  const PhotoReport photo = WithFailures(Missing({kS, kM}, "c.jpg"), {kM}, kTime);
  const std::string page =
      PageOf({{"/photos/b", true, {CompletePhoto("a.jpg"), CompletePhoto("b.jpg"), photo}, 1},
              {"/photos/a", false, {CompletePhoto("d.jpg")}, 0}});
  const size_t second = page.find("<section aria-labelledby=\"d2\">");
  ASSERT_NE(second, std::string::npos);
  const std::string first = Between(page.substr(0, second), "<section", "</section>");
  EXPECT_THAT(first, StartsWith("<section aria-labelledby=\"d1\">\n<h2><bdi id=\"d1\">/photos/b"
                                "</bdi><span class=\"queued\">Queued</span></h2>\n"));
  EXPECT_THAT(first, HasSubstr("<p class=\"counts\"><span>3 photos</span><span>1 needs work</span>"
                               "<span>16 thumbnails present</span><span>1 missing</span>"
                               "<span>1 failed</span><span>1 video needs work</span></p>"));
  EXPECT_EQ(CountOf("<li class=\"tile", first), 3u);
  const std::string last = Between(page.substr(second), "<section", "</section>");
  EXPECT_THAT(last, HasSubstr("<bdi id=\"d2\">/photos/a</bdi></h2>"));
  EXPECT_THAT(last, HasSubstr("<p class=\"counts\"><span>1 photo</span>"
                              "<span>6 thumbnails present</span></p>"));
  EXPECT_EQ(CountOf("<li class=\"tile", last), 1u);
}

TEST_F(HtmlPageTest, PhotosKeepTheirOrder) {
  const std::string page =
      PageOfPhotos({CompletePhoto("b"), CompletePhoto("a"), CompletePhoto("c")});
  EXPECT_LT(page.find("<bdi>b</bdi>"), page.find("<bdi>a</bdi>"));
  EXPECT_LT(page.find("<bdi>a</bdi>"), page.find("<bdi>c</bdi>"));
}

TEST_F(HtmlPageTest, ADirectoryWithoutPhotosIsLabelledAsEmpty) {
  const std::string page = PageOf({{"/photos/a", false, {}}});
  EXPECT_THAT(page, HasSubstr("There are no thumbnails to make."));
  const std::string section = Between(page, "<section", "</section>");
  EXPECT_THAT(section, HasSubstr("<span>0 photos</span>"));
  EXPECT_THAT(section, HasSubstr("<p class=\"empty\">No photos</p>"));
  EXPECT_THAT(page, Not(HasSubstr("class=\"bar")));
}

TEST_F(HtmlPageTest, APageCanBeEmpty) {
  const std::string page = PageOf({});
  EXPECT_THAT(page, HasSubstr("0 directories"));
  EXPECT_THAT(page, Not(HasSubstr("<section")));
}

// Tiles

TEST_F(HtmlPageTest, ACompletePhotoHasNoMark) {
  const PhotoReport photo = CompletePhoto("a.jpg");
  WriteFile(ThumbOf(photo, kS), ThumbBytes("thumb"));
  EXPECT_EQ(TileOf(photo),
            "<li class=\"tile done\">\n<div class=\"pic\"><img " +
                EmbeddedForm(ThumbBytes("thumb")) +
                " alt=\"Thumbnail of a.jpg\" width=\"160\" height=\"120\" loading=\"lazy\" "
                "decoding=\"async\"></div>\n<p class=\"name\" title=\"a.jpg\"><bdi>a.jpg</bdi>"
                "</p>\n");
}

std::string Mark(const std::string& text) {
  return "<strong class=\"mark\">" + text + "</strong>";
}

std::string Note(const std::string& text) {
  return "<p class=\"note\">" + text + "</p>";
}

/// Fails the test unless the photo's tile is of the class, has all the parts and none of `absent`.
void ExpectTile(const PhotoReport& photo, const std::string& tileClass,
                const std::vector<std::string>& parts, const std::vector<std::string>& absent) {
  const TimeZone zone;
  const std::string tile = TileOf(photo);
  EXPECT_THAT(tile, StartsWith("<li class=\"tile " + tileClass + "\">"));
  for (const std::string& part : parts) {
    EXPECT_THAT(tile, HasSubstr(part));
  }
  for (const std::string& part : absent) {
    EXPECT_THAT(tile, Not(HasSubstr(part)));
  }
}

TEST_F(HtmlPageTest, SizesThatAreNotWantedAreNotMissing) {
  ExpectTile(WithState(CompletePhoto("a.jpg"), ThumbState::kNotWanted, AllSizes()), "done", {},
             {"note"});
}

TEST_F(HtmlPageTest, AMissingThumbIsNamedWithItsSize) {
  ExpectTile(
      Missing({kM, kSM, kXL}), "missing",
      {Mark("Missing"), Note("Missing: SM\u00a0(240×240), M\u00a0(320×320), XL\u00a0(1280×1280)")},
      {"Outdated"});
}

TEST_F(HtmlPageTest, AnOutdatedThumbIsNamedWithItsSize) {
  ExpectTile(Outdated({kL, kS}), "missing",
             {Mark("Outdated"), Note("Outdated: S\u00a0(120×120), L\u00a0(800×800)")}, {"Missing"});
}

TEST_F(HtmlPageTest, AFailedSizeMakesAFailedTile) {
  ExpectTile(WithFailures(WithState(Missing({kXL, kB}), ThumbState::kOutdated, {kS}), {kXL}, kTime),
             "failed",
             {Mark("Failed"),
              Note("Could not be made: XL\u00a0(1280×1280), since " + std::string(kTimeText)),
              Note("Missing: B\u00a0(640×640)"), Note("Outdated: S\u00a0(120×120)")},
             {});
}

TEST_F(HtmlPageTest, SizesThatFailedAtTheSameTimeAreGrouped) {
  const PhotoReport photo =
      WithFailures(WithFailures(Missing({kXL, kL, kB, kM}), {kXL, kM}, kTime), {kL}, kTime - 60);
  ExpectTile(
      photo, "failed",
      {"Could not be made: M\u00a0(320×320), XL\u00a0(1280×1280), since " + std::string(kTimeText),
       "Could not be made: L\u00a0(800×800), since <time "
       "datetime=\"2023-11-15T03:12:20+0500\">2023-11-15 03:12</time>"},
      {});
  EXPECT_EQ(CountOf("Could not be made", TileOf(photo)), 2u);
}

TEST_F(HtmlPageTest, APhotoWhoseSizesAllFailedCouldNotBeConverted) {
  PhotoReport photo = WithState(Missing(AllSizes()), ThumbState::kNotWanted, {kSM});
  photo = WithFailures(WithFailures(photo, AllSizes(), kTime + 100), {kB}, kTime);
  photo.failures[kSM].reset();
  ExpectTile(photo, "failed",
             {"<span class=\"none\">No thumbnail</span>",
              Note("The photo could not be converted, since " + std::string(kTimeText))},
             {});
  EXPECT_EQ(CountOf("class=\"note\"", TileOf(photo)), 1u);
}

TEST_F(HtmlPageTest, APhotoWithAnyThumbCouldBeConverted) {
  const PhotoReport photo =
      WithFailures(WithState(Missing(AllSizes()), ThumbState::kNotWanted, {kS}), AllSizes(), kTime);
  WriteFile(ThumbOf(photo, kS), ThumbBytes("thumb"));
  ExpectTile(photo, "failed", {"Could not be made: SM"}, {"could not be converted"});
}

TEST_F(HtmlPageTest, APhotoWithASizeThatWasNotTriedMayStillBeConverted) {
  PhotoReport photo = WithFailures(Missing(AllSizes()), AllSizes(), kTime);
  photo.failures[kL].reset();
  ExpectTile(photo, "failed", {}, {"could not be converted"});
}

TEST_F(HtmlPageTest, AMarkerOfAPresentSizeIsNotAFailure) {
  ExpectTile(WithFailures(Missing({kL}), {kS}, kTime), "missing", {}, {"Could not be made"});
  EXPECT_THAT(ReadFile(kPage), HasSubstr("5 present, 1 missing, 0 failed"));
}

TEST_F(HtmlPageTest, AFailedLookupIsShown) {
  PhotoReport photo = WithState(CompletePhoto("a.jpg"), ThumbState::kNotWanted, AllSizes());
  photo.thumbs.lookup = PhotoLookup::kFailed;
  ExpectTile(photo, "unknown", {Mark("Unknown"), "The photo could not be looked up"}, {});
}

// Names

struct NameCase {
  const char* title;
  const char* name;
  const char* html;
};

/// Replaces the addresses of its members in the name of the test.
void PrintTo(const NameCase& names, std::ostream* out) {
  *out << names.title;
}

class HtmlPageName : public SandboxTest, public WithParamInterface<NameCase> {};

TEST_P(HtmlPageName, IsEscapedInTextAndAttributes) {
  const std::string html = GetParam().html;
  PhotoReport photo = CompletePhoto(GetParam().name);
  const std::string withoutThumb = TileOf(photo);
  EXPECT_THAT(withoutThumb,
              HasSubstr("<p class=\"name\" title=\"" + html + "\"><bdi>" + html + "</bdi></p>"));
  WriteFile(ThumbOf(photo, kS), ThumbBytes("thumb"));
  EXPECT_THAT(TileOf(photo), HasSubstr("\" alt=\"Thumbnail of " + html + "\" width=\"160\""));
}

TEST_P(HtmlPageName, IsEscapedAsADirectory) {
  EXPECT_THAT(PageOf({{std::string("/photos/") + GetParam().name, false, {}}}),
              HasSubstr("<bdi id=\"d1\">/photos/" + std::string(GetParam().html) + "</bdi>"));
}

constexpr NameCase kNames[] = {
    {"Plain", "plain name.jpg", "plain name.jpg"},
    {"OtherAlphabets", "ÄÖ 日本.jpg", "ÄÖ 日本.jpg"},
    {"Element", "<script>alert(1)", "&lt;script&gt;alert(1)"},
    {"EndOfAttribute", "\"><img src=x onerror=alert(1)>",
     "&quot;&gt;&lt;img src=x onerror=alert(1)&gt;"},
    {"Apostrophe", "' onload='x", "&apos; onload=&apos;x"},
    {"Reference", "a&lt;b&amp;", "a&amp;lt;b&amp;amp;"},
    {"TwoLines", "two\nlines", "two\nlines"},
    {"EndOfComment", "--><b>", "--&gt;&lt;b&gt;"},
    {"BadBytes", "bad\xff\xfe.jpg", "bad\uFFFD\uFFFD.jpg"},
    {"CutCharacter", "cut\xe6\x97", "cut\uFFFD\uFFFD"},
    {"Control", "bell\a", "bell&#x7;"},
};

INSTANTIATE_TEST_SUITE_P(Hostile, HtmlPageName, ValuesIn(kNames),
                         [](const auto& test) { return std::string(test.param.title); });

TEST_F(HtmlPageTest, OnlyTheLastComponentNamesAPhoto) {
  PhotoReport photo = CompletePhoto("a.jpg");
  photo.path = "/photos/2024/b.jpg";
  EXPECT_THAT(TileOf(photo), HasSubstr("<bdi>b.jpg</bdi>"));
}

// Thumbnails

TEST_F(HtmlPageTest, TheSmallestThumbThatExistsIsShown) {
  const PhotoReport photo = CompletePhoto("a.jpg");
  for (const EA_THUMB_SIZE size : AllSizes()) {
    WriteFile(ThumbOf(photo, size), ThumbBytes(rgEAThumbInfo[size].sizeString));
  }
  const std::pair<EA_THUMB_SIZE, const char*> sizes[] = {{kS, "120x120"}, {kSM, "240x240"},
                                                         {kM, "320x320"}, {kB, "640x640"},
                                                         {kL, "800x800"}, {kXL, "1280x1280"}};
  for (const auto& [size, text] : sizes) {
    EXPECT_THAT(TileOf(photo), HasSubstr(EmbeddedForm(ThumbBytes(text)))) << text;
    RemoveTree(ThumbOf(photo, size));
  }
  EXPECT_THAT(TileOf(photo), HasSubstr("No thumbnail"));
}

TEST_F(HtmlPageTest, AThumbUnderItsOlderNameIsShown) {
  const PhotoReport photo = CompletePhoto("a.jpg");
  WriteFile(OldThumbOf(photo, kM), ThumbBytes("older"));
  WriteFile(ThumbOf(photo, kL), ThumbBytes("large"));
  EXPECT_THAT(TileOf(photo), HasSubstr(EmbeddedForm(ThumbBytes("older"))));
}

TEST_F(HtmlPageTest, AFileThatDoesNotStartAsAJpegIsSkipped) {
  const PhotoReport photo = CompletePhoto("a.jpg");
  const std::string others[] = {"",
                                "\xff",
                                "\xff\xd8",
                                "root:x:0:0",
                                "\x89PNG\r\n",
                                "\xff\xd8 \xff",
                                " \xff\xd8\xff",
                                std::string("\0\xff\xd8\xff", 4)};
  for (const std::string& other : others) {
    WriteFile(ThumbOf(photo, kS), other);
    EXPECT_THAT(TileOf(photo), HasSubstr("No thumbnail")) << other;
  }
  for (const char* text : {"", "large"}) {
    WriteFile(ThumbOf(photo, kXL), ThumbBytes(text));
    EXPECT_THAT(TileOf(photo), HasSubstr(EmbeddedForm(ThumbBytes(text))));
  }
}

TEST_F(HtmlPageTest, ALinkIsSkipped) {
  const PhotoReport photo = CompletePhoto("a.jpg");
  WriteFile("/tmp/secret.jpg", ThumbBytes("secret"));
  WriteFile(ThumbOf(photo, kL), ThumbBytes("open"));
  ASSERT_EQ(symlink("/tmp/secret.jpg", ThumbOf(photo, kS).c_str()), 0);
  ASSERT_EQ(symlink("/tmp/secret.jpg", OldThumbOf(photo, kM).c_str()), 0);
  EXPECT_THAT(TileOf(photo), HasSubstr(EmbeddedForm(ThumbBytes("open"))));
}

TEST_F(HtmlPageTest, ADirectoryOrFifoIsSkipped) {
  const PhotoReport photo = CompletePhoto("a.jpg");
  MakeDirectories(ThumbOf(photo, kS));
  ASSERT_EQ(mkfifo(ThumbOf(photo, kSM).c_str(), 0666), 0);
  EXPECT_THAT(TileOf(photo), HasSubstr("No thumbnail"));
}

TEST_F(HtmlPageTest, AnUnreadableThumbIsSkipped) {
  const PhotoReport photo = CompletePhoto("a.jpg");
  WriteFile(ThumbOf(photo, kS), ThumbBytes("secret"));
  WriteFile(ThumbOf(photo, kL), ThumbBytes("open"));
  ASSERT_EQ(chmod(ThumbOf(photo, kS).c_str(), 0), 0);
  std::string tile;
  {
    const WithoutCapabilities unprivileged;
    tile = TileOf(photo);
  }
  EXPECT_THAT(tile, HasSubstr(EmbeddedForm(ThumbBytes("open"))));
}

TEST_F(HtmlPageTest, AThumbOfTheLargestSizeIsShownAndALargerOneIsNot) {
  const PhotoReport photo = CompletePhoto("a.jpg");
  const std::string largest = ThumbBytes(std::string(4 * 1024 * 1024 - 3, 'x'));
  WriteFile(ThumbOf(photo, kS), largest + 'x');
  EXPECT_THAT(TileOf(photo), HasSubstr("<span class=\"none\">No thumbnail</span>"));
  WriteFile(ThumbOf(photo, kS), largest);
  EXPECT_TRUE(TileOf(photo).find(EmbeddedForm(largest)) != std::string::npos);
}

TEST_F(HtmlPageTest, ALargePageIsComplete) {
  std::vector<PhotoReport> photos;
  for (int i = 0; i < 40; ++i) {
    photos.push_back(CompletePhoto(std::to_string(i)));
    WriteFile(ThumbOf(photos.back(), kS), ThumbBytes(std::string(static_cast<size_t>(i) * 3000,
                                                                 static_cast<char>('a' + i % 26))));
  }
  const std::string page = PageOf({{"/a", false, photos}, {"/b", false, photos}});
  for (const PhotoReport& photo : photos) {
    const std::string form = EmbeddedForm(ReadFile(ThumbOf(photo, kS)));
    EXPECT_EQ(CountOf(form, page), 2u) << photo.path;
  }
  EXPECT_THAT(page, EndsWith("</html>\n"));
}

// The file

void ExpectOldPageStays() {
  EXPECT_EQ(ReadFile(kPage), "old");
  EXPECT_THAT(ListDirectory(kPageDirectory), ElementsAre("status.html"));
}

TEST_F(HtmlPageTest, NoFileAppearsBeforeThePageIsFinished) {
  MakeDirectories(kPageDirectory);
  HtmlPage page(kPage);
  Report(page, {{"/a", false, {CompletePhoto("a.jpg")}}});
  EXPECT_THAT(ListDirectory(kPageDirectory), IsEmpty());
  EXPECT_EQ(page.Finish(), 0);
  EXPECT_THAT(ListDirectory(kPageDirectory), ElementsAre("status.html"));
}

TEST_F(HtmlPageTest, AnUnfinishedPageLeavesNothingBehind) {
  WriteFile(kPage, "old");
  {
    HtmlPage page(kPage);
    Report(page, {{"/a", false, {CompletePhoto("a.jpg")}}});
  }
  ExpectOldPageStays();
}

TEST_F(HtmlPageTest, AProgramThatIsKilledLeavesNothingBehind) {
  MakeDirectories(kPageDirectory);
  const pid_t child = fork();
  if (child == 0) {
    HtmlPage page(kPage);
    Report(page, {{"/a", false, {CompletePhoto("a.jpg")}}});
    kill(getpid(), SIGKILL);
  }
  int status = 0;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  ASSERT_TRUE(WIFSIGNALED(status));
  EXPECT_THAT(ListDirectory(kPageDirectory), IsEmpty());
}

TEST_F(HtmlPageTest, TheFileIsReplacedAtomically) {
  WriteFile(kPage, "old");
  ASSERT_EQ(link(kPage, "/tmp/page/kept"), 0);
  PageOfPhotos({CompletePhoto("a.jpg")});
  EXPECT_EQ(ReadFile("/tmp/page/kept"), "old");
  EXPECT_THAT(ReadFile(kPage), StartsWith("<!DOCTYPE html>"));
}

TEST_F(HtmlPageTest, TheFileHasThePermissionsOfANewFile) {
  const mode_t mask = umask(027);
  PageOfPhotos({CompletePhoto("a.jpg")});
  umask(0);
  EXPECT_EQ(ModeOf(kPage), 0640);
  PageOfPhotos({CompletePhoto("a.jpg")});
  umask(mask);
  EXPECT_EQ(ModeOf(kPage), 0666);
}

bool IsLink(const std::string& path) {
  struct stat status = {};
  EXPECT_EQ(lstat(path.c_str(), &status), 0) << path;
  return S_ISLNK(status.st_mode);
}

TEST_F(HtmlPageTest, ALinkIsKeptAndItsTargetIsReplaced) {
  WriteFile("/tmp/elsewhere/page.html", "old");
  MakeDirectories(kPageDirectory);
  ASSERT_EQ(symlink("/tmp/page/second", kPage), 0);
  ASSERT_EQ(symlink("../elsewhere/page.html", "/tmp/page/second"), 0);
  PageOfPhotos({CompletePhoto("a.jpg")});
  EXPECT_TRUE(IsLink(kPage));
  EXPECT_TRUE(IsLink("/tmp/page/second"));
  EXPECT_FALSE(IsLink("/tmp/elsewhere/page.html"));
  EXPECT_THAT(ReadFile("/tmp/elsewhere/page.html"), StartsWith("<!DOCTYPE html>"));
  EXPECT_THAT(ListDirectory("/tmp/elsewhere"), ElementsAre("page.html"));
  EXPECT_THAT(ListDirectory(kPageDirectory), ElementsAre("second", "status.html"));
}

/// A directory of user 1, in which root writes the page. Tests of links that root must not follow
/// end early in a sandbox with one user.
class HtmlPageOfAnotherUser : public HtmlPageTest {
 protected:
  static constexpr const char* kPrecious = "/tmp/root/precious";

  void SetUp() override {
    HtmlPageTest::SetUp();
    WriteFile(kPrecious, "precious");
    MakeDirectories(kPageDirectory);
    GiveAway(kPageDirectory);
  }

  /// A sandbox with one user has nobody to give it to; there, links are all its own.
  static void GiveAway(const char* path) {
    if (HasOtherUsers()) {
      ASSERT_EQ(lchown(path, 1, 1), 0);
    }
  }

  static void PutLink(const char* target, const char* path) {
    ASSERT_EQ(symlink(target, path), 0);
    GiveAway(path);
  }

  static void ExpectRootsFilesUntouched() {
    EXPECT_EQ(ReadFile(kPrecious), "precious");
    EXPECT_THAT(ListDirectory("/tmp/root"), ElementsAre("precious"));
  }
};

TEST_F(HtmlPageOfAnotherUser, ALinkToAFileOfRootIsReplacedInsteadOfTheFile) {
  if (!HasOtherUsers()) {
    return;
  }
  PutLink(kPrecious, kPage);
  EXPECT_THAT(PageOfPhotos({CompletePhoto("a.jpg")}), StartsWith("<!DOCTYPE html>"));
  EXPECT_FALSE(IsLink(kPage));
  ExpectRootsFilesUntouched();
}

TEST_F(HtmlPageOfAnotherUser, ALinkToANewFileOfRootIsReplaced) {
  PutLink("/tmp/root/new", kPage);
  PageOfPhotos({CompletePhoto("a.jpg")});
  EXPECT_FALSE(IsLink(kPage));
  ExpectRootsFilesUntouched();
}

TEST_F(HtmlPageOfAnotherUser, ALinkThroughALinkOfRootIsReplaced) {
  if (!HasOtherUsers()) {
    return;
  }
  ASSERT_EQ(symlink(kPrecious, "/tmp/second"), 0);
  PutLink("/tmp/second", kPage);
  PageOfPhotos({CompletePhoto("a.jpg")});
  EXPECT_FALSE(IsLink(kPage));
  EXPECT_TRUE(IsLink("/tmp/second"));
  ExpectRootsFilesUntouched();
}

TEST_F(HtmlPageOfAnotherUser, ALinkToADirectoryOfRootIsNotFollowed) {
  if (!HasOtherUsers()) {
    return;
  }
  PutLink("/tmp/root", "/tmp/page/sub");
  for (const char* path : {"/tmp/page/sub/precious", "/tmp/page/sub/new"}) {
    HtmlPage page(path);
    Report(page, {{"/a", false, {CompletePhoto("a.jpg")}}});
    EXPECT_EQ(page.Finish(), EACCES);
  }
  ExpectRootsFilesUntouched();
}

TEST_F(HtmlPageOfAnotherUser, ADirectoryThatIsReplacedByALinkMeanwhileLeadsNowhere) {
  MakeDirectories("/tmp/page/sub");
  GiveAway("/tmp/page/sub");
  HtmlPage page("/tmp/page/sub/precious");
  Report(page, {{"/a", false, {CompletePhoto("a.jpg")}}});
  ASSERT_EQ(rename("/tmp/page/sub", "/tmp/page/moved"), 0);
  PutLink("/tmp/root", "/tmp/page/sub");
  EXPECT_EQ(page.Finish(), 0);
  EXPECT_THAT(ReadFile("/tmp/page/moved/precious"), StartsWith("<!DOCTYPE html>"));
  ExpectRootsFilesUntouched();
}

TEST_F(HtmlPageOfAnotherUser, TheirLinkToTheirOwnFileIsKeptAndTheFileReplaced) {
  WriteFile("/tmp/theirs/page.html", "old");
  GiveAway("/tmp/theirs/page.html");
  PutLink("/tmp/theirs/page.html", kPage);
  PageOfPhotos({CompletePhoto("a.jpg")});
  EXPECT_TRUE(IsLink(kPage));
  EXPECT_THAT(ReadFile("/tmp/theirs/page.html"), StartsWith("<!DOCTYPE html>"));
}

TEST_F(HtmlPageTest, ADanglingLinkIsReplaced) {
  MakeDirectories(kPageDirectory);
  ASSERT_EQ(symlink("/tmp/nowhere", kPage), 0);
  EXPECT_THAT(PageOfPhotos({CompletePhoto("a.jpg")}), StartsWith("<!DOCTYPE html>"));
  EXPECT_FALSE(Exists("/tmp/nowhere"));
}

TEST_F(HtmlPageTest, ALinkToItselfIsReplaced) {
  MakeDirectories(kPageDirectory);
  ASSERT_EQ(symlink(kPage, kPage), 0);
  EXPECT_THAT(PageOfPhotos({CompletePhoto("a.jpg")}), StartsWith("<!DOCTYPE html>"));
  EXPECT_FALSE(IsLink(kPage));
}

TEST_F(HtmlPageTest, ALinkToADirectoryOnTheWayIsFollowed) {
  MakeDirectories("/tmp/page/real/sub");
  ASSERT_EQ(symlink("real/../real", "/tmp/page/link"), 0);
  HtmlPage page("/tmp/page/./link//sub/../status.html");
  Report(page, {});
  EXPECT_EQ(page.Finish(), 0);
  EXPECT_THAT(ListDirectory("/tmp/page/real"), ElementsAre("status.html", "sub"));
}

TEST_F(HtmlPageTest, APipeAtTheEndOfALinkIsKept) {
  int ends[2];
  ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
  const Descriptor reader(ends[0]);
  const Descriptor writer(ends[1]);
  MakeDirectories(kPageDirectory);
  ASSERT_EQ(symlink(("/proc/self/fd/" + std::to_string(ends[1])).c_str(), kPage), 0);
  HtmlPage page(kPage);
  Report(page, {});
  EXPECT_EQ(page.Finish(), EEXIST);
  EXPECT_TRUE(IsLink(kPage));
}

TEST_F(HtmlPageTest, ARelativePathRefersToTheWorkingDirectory) {
  MakeDirectories("/tmp/here");
  ASSERT_EQ(chdir("/tmp/here"), 0);
  HtmlPage page("status.html");
  Report(page, {});
  EXPECT_EQ(page.Finish(), 0);
  EXPECT_THAT(ListDirectory("/tmp/here"), ElementsAre("status.html"));
}

TEST_F(HtmlPageTest, TheNameMayHaveTheMaximumLength) {
  const std::string name(255, 'n');
  MakeDirectories(kPageDirectory);
  HtmlPage page(std::string(kPageDirectory) + '/' + name);
  Report(page, {});
  EXPECT_EQ(page.Finish(), 0);
  EXPECT_THAT(ListDirectory(kPageDirectory), ElementsAre(name));
}

TEST_F(HtmlPageTest, DescriptorsAreClosedOnExec) {
  MakeDirectories(kPageDirectory);
  const std::vector<std::string> before = ListDirectory("/proc/self/fd");
  HtmlPage page(kPage);
  int opened = 0;
  for (const std::string& number : ListDirectory("/proc/self/fd")) {
    const int flags = fcntl(std::stoi(number), F_GETFD);
    if (std::count(before.begin(), before.end(), number) == 0 && flags >= 0) {
      ++opened;
      EXPECT_NE(flags & FD_CLOEXEC, 0) << number;
    }
  }
  EXPECT_GT(opened, 0);
}

// Failures

/// The result of Finish for a page at `path` after a scan.
int FinishPageAt(const std::string& path) {
  HtmlPage page(path);
  Report(page, {{"/a", false, {CompletePhoto("a.jpg")}}});
  return page.Finish();
}

TEST_F(HtmlPageTest, AMissingDirectoryIsAnError) {
  EXPECT_EQ(FinishPageAt("/tmp/missing/status.html"), ENOENT);
  EXPECT_FALSE(Exists("/tmp/missing"));
}

TEST_F(HtmlPageTest, AnEmptyPathIsAnError) {
  MakeDirectories("/tmp/here");
  ASSERT_EQ(chdir("/tmp/here"), 0);
  EXPECT_EQ(FinishPageAt(""), ENOENT);
  EXPECT_THAT(ListDirectory("/tmp/here"), IsEmpty());
}

TEST_F(HtmlPageTest, ADirectoryThatCannotBeWrittenIsAnError) {
  WriteFile(kPage, "old");
  ASSERT_EQ(chmod(kPageDirectory, 0555), 0);
  {
    const WithoutCapabilities unprivileged;
    EXPECT_EQ(FinishPageAt(kPage), EACCES);
  }
  EXPECT_EQ(ReadFile(kPage), "old");
}

TEST_F(HtmlPageTest, AReadOnlyVolumeIsAnError) {
  WriteFile(kPage, "old");
  const ReadOnlyMount readOnly(kPageDirectory);
  EXPECT_EQ(FinishPageAt(kPage), EROFS);
  EXPECT_EQ(ReadFile(kPage), "old");
}

TEST_F(HtmlPageTest, ADirectoryIsNotReplaced) {
  MakeDirectories(kPage);
  EXPECT_EQ(FinishPageAt(kPage), EISDIR);
  EXPECT_TRUE(IsDirectory(kPage));
  EXPECT_THAT(ListDirectory(kPageDirectory), ElementsAre("status.html"));
}

TEST_F(HtmlPageTest, OnlyARegularFileIsReplaced) {
  MakeDirectories(kPageDirectory);
  ASSERT_EQ(mkfifo(kPage, 0666), 0);
  ASSERT_EQ(symlink("/dev/null", "/tmp/page/link"), 0);
  EXPECT_EQ(FinishPageAt(kPage), EEXIST);
  EXPECT_EQ(FinishPageAt("/tmp/page/link"), EEXIST);
  struct stat status = {};
  ASSERT_EQ(lstat(kPage, &status), 0);
  EXPECT_TRUE(S_ISFIFO(status.st_mode));
  ASSERT_EQ(lstat("/tmp/page/link", &status), 0);
  EXPECT_TRUE(S_ISLNK(status.st_mode));
  EXPECT_THAT(ListDirectory(kPageDirectory), ElementsAre("link", "status.html"));
}

TEST_F(HtmlPageTest, AVolumeThatBecomesFullIsAnErrorAndTheOldFileStays) {
  for (const bool isFullDuringScan : {true, false}) {
    SCOPED_TRACE(isFullDuringScan ? "during the scan" : "at the end");
    SmallVolume volume(kPageDirectory, (isFullDuringScan ? 1 : 4) * 1024 * 1024);
    WriteFile(kPage, "old");
    const PhotoReport photo = CompletePhoto("a.jpg");
    WriteFile(ThumbOf(photo, kS), ThumbBytes(std::string(200 * 1024, 'x')));
    HtmlPage page(kPage);
    if (isFullDuringScan) {
      volume.SetAvailable(0);
      Report(page, {{"/a", false, {photo, photo}}});
      // Space that becomes available later does not complete the page.
      volume.SetAvailable(512 * SmallVolume::PageSize());
    } else {
      Report(page, {{"/a", false, {photo, photo}}});
      volume.SetAvailable(0);
    }
    EXPECT_EQ(page.Finish(), ENOSPC);
    ExpectOldPageStays();
  }
}

/// The result of Finish for a page at kPage in a process in which system calls fail.
int FinishWithRefusedCalls(const BeforeExec& refuse) {
  const pid_t child = fork();
  if (child == 0) {
    _exit(refuse() == 0 ? FinishPageAt(kPage) : 255);
  }
  int status = 0;
  EXPECT_EQ(waitpid(child, &status, 0), child);
  EXPECT_TRUE(WIFEXITED(status));
  return WEXITSTATUS(status);
}

TEST_F(HtmlPageTest, AFileSystemWithoutUnnamedFilesIsSupported) {
  WriteFile(kPage, "old");
  const BeforeExec refuse = [] {
    const int error = SeccompFail(OpensWithFlags(O_TMPFILE, EOPNOTSUPP))();
    const bool isRefused = open(kPageDirectory, O_TMPFILE | O_RDWR | O_CLOEXEC, 0600) < 0;
    return isRefused ? error : EEXIST;
  };
  EXPECT_EQ(FinishWithRefusedCalls(refuse), 0);
  EXPECT_THAT(ReadFile(kPage), AllOf(StartsWith("<!DOCTYPE html>"), EndsWith("</html>\n")));
  EXPECT_THAT(ListDirectory(kPageDirectory), ElementsAre("status.html"));
}

TEST_F(HtmlPageTest, AFileThatCannotBeSyncedOrRenamedIsAnErrorAndTheOldFileStays) {
  WriteFile(kPage, "old");
  EXPECT_EQ(FinishWithRefusedCalls(SeccompFail({SYS_fsync}, EIO)), EIO);
  ExpectOldPageStays();
  EXPECT_EQ(FinishWithRefusedCalls(SeccompFail(RenameCalls(), EPERM)), EPERM);
  ExpectOldPageStays();
}

// Numbers

TEST(HtmlCounts, DigitsAreGroupedByThree) {
  EXPECT_EQ(GroupDigits(0), "0");
  EXPECT_EQ(GroupDigits(999), "999");
  EXPECT_EQ(GroupDigits(1000), "1,000");
  EXPECT_EQ(GroupDigits(100000), "100,000");
  EXPECT_EQ(GroupDigits(1234567), "1,234,567");
}

TEST(HtmlCounts, OneHasItsOwnForm) {
  EXPECT_EQ(CountText(0, "photo", "photos"), "0 photos");
  EXPECT_EQ(CountText(1, "photo", "photos"), "1 photo");
  EXPECT_EQ(CountText(2000, "photo", "photos"), "2,000 photos");
}

TEST(HtmlCounts, OnlyAllIsAHundredPercentAndOnlyNoneIsZero) {
  EXPECT_EQ(PercentText(0, 7), "0%");
  EXPECT_EQ(PercentText(7, 7), "100%");
  EXPECT_EQ(PercentText(1, 100000), "1%");
  EXPECT_EQ(PercentText(99999, 100000), "99%");
  EXPECT_EQ(PercentText(2, 3), "67%");
}

}  // namespace
}  // namespace vela_test
