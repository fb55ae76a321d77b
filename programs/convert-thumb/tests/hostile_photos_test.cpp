// Files under the names of photos that are meant to show other files, or not photos at all.

#include <sys/stat.h>
#include <unistd.h>

#include <chrono>

#include "converter_fixture.h"

namespace vela_test {
namespace {

using namespace ::testing;

constexpr char kPrivate[] = "/tmp/private/photo.jpg";

class HostilePhotos : public ConverterTest {
 protected:
  const std::string outputs_ = directory_ + "/outputs";

  void SetUp() override {
    ConverterTest::SetUp();
    MakeDirectories(outputs_);
    MakeDirectories("/tmp/private");
    CopyFile(MakePhoto("private.jpg", 300, 200), kPrivate);
    ASSERT_EQ(chmod(kPrivate, 0600), 0);
  }

  ProgramResult ConvertPhoto(const std::string& photo) const {
    ProgramOptions options;
    options.timeLimit = std::chrono::seconds(20);
    const CommandLine line{photo, outputs_, {{{}, outputs_ + "/o.jpg"}}};
    return RunConverter(line.Arguments(), options);
  }

  void ExpectRefused(const std::string& photo, const std::string& reason) const {
    for (const char* page : {"", "[0]"}) {
      const ProgramResult result = ConvertPhoto(photo + page);
      EXPECT_EQ(result.exitCode, 1) << photo << page;
      EXPECT_THAT(result.err,
                  AllOf(StartsWith("convert-thumb: "), HasSubstr(photo), HasSubstr(reason)))
          << photo << page;
      EXPECT_THAT(ListDirectory(outputs_), IsEmpty()) << photo << page;
    }
  }
};

struct Document {
  const char* kind;
  const char* text;
};

/// Each shows the private photo or another file when ImageMagick reads it.
constexpr Document kDocuments[] = {
    {"svg",
     "<svg xmlns='http://www.w3.org/2000/svg' xmlns:xlink='http://www.w3.org/1999/xlink' "
     "width='300' height='200'><image xlink:href='/tmp/private/photo.jpg' width='300' "
     "height='200'/></svg>"},
    {"xml svg", "<?xml version=\"1.0\"?><svg width='60000' height='60000'><text>a</text></svg>"},
    {"mvg",
     "push graphic-context\nviewbox 0 0 300 200\nimage over 0,0 300,200 "
     "'/tmp/private/photo.jpg'\npop graphic-context\n"},
    {"msl", "<?xml version=\"1.0\"?><image><read filename=\"/tmp/private/photo.jpg\"/></image>"},
    {"mpc",
     "id=MagickCache  quantum-depth=16\nclass=DirectClass colors=0 matte=False\n"
     "columns=30 rows=20 depth=8\n\f\n:\x1A"},
    {"miff", "id=ImageMagick\nclass=DirectClass columns=1 rows=1 depth=8\n\f\n:\x1A"},
    {"postscript", "%!PS-Adobe-3.0 EPSF-3.0\n%%BoundingBox: 0 0 30 20\nshowpage\n"},
    {"pdf", "%PDF-1.4\n1 0 obj\n<<>>\nendobj\n"},
    {"xpm", "/* XPM */\nstatic char *a[] = {\"1 1 1 1\", \"a c red\", \"a\"};\n"},
    {"text", "a line of text\n"},
    {"list", "@/etc/passwd\n"},
    {"url", "https://localhost/a.jpg\n"},
    {"empty", ""},
};

TEST_F(HostilePhotos, AreRefusedUnlessTheyContainAPhoto) {
  for (const Document& document : kDocuments) {
    for (const char* name : {"a.jpg", "a.svg", "a.psd", "a.tif", "a", "a.mvg", "a.txt"}) {
      SCOPED_TRACE(document.kind);
      const std::string photo = directory_ + "/" + name;
      WriteFile(photo, document.text);
      ExpectRefused(photo, "not a photo in a known format");
    }
  }
}

TEST_F(HostilePhotos, AreRefusedInLinesThatOnlyImageMagickSupports) {
  for (const Document& document : kDocuments) {
    const std::string photo = directory_ + "/a.jpg";
    WriteFile(photo, document.text);
    const ProgramResult result = RunConverter({photo, "-negate", outputs_ + "/o.png"});
    EXPECT_EQ(result.exitCode, 1) << document.kind;
    EXPECT_THAT(ListDirectory(outputs_), IsEmpty()) << document.kind;
  }
}

TEST_F(HostilePhotos, AreReadByTheirContentWhateverTheirNames) {
  const std::string bmp = ReadFile(MakeImage(directory_ + "/a.bmp", 300, 200));
  // Prefixes and extensions by which ImageMagick would choose something else.
  for (const char* name : {"a.svg", "a.mvg", "a.txt", "a.msl", "a.jpg", "a.nef", "a", "svg:a.bmp",
                           "a.pdf", "a.epdf", "a.html"}) {
    const std::string photo = directory_ + "/" + name;
    WriteFile(photo, bmp);
    ExpectSuccess(ConvertPhoto(photo));
    EXPECT_EQ(QuadrantLetters(outputs_ + "/o.jpg"), "RGBY") << name;
  }
}

TEST_F(HostilePhotos, OnlyTgaIsReadByItsName) {
  ExpectSuccess(ConvertPhoto(MakePicture("a.tga", 30, 20)));
  RemoveTree(outputs_ + "/o.jpg");
  for (const Document& document : kDocuments) {
    const std::string photo = directory_ + "/a.tga";
    WriteFile(photo, document.text);
    EXPECT_EQ(ConvertPhoto(photo).exitCode, 1) << document.kind;
    EXPECT_THAT(ListDirectory(outputs_), IsEmpty()) << document.kind;
  }
}

TEST_F(HostilePhotos, LinksOfOthersToPrivatePhotosAreRefused) {
  const std::string photo = directory_ + "/a.jpg";
  ASSERT_EQ(symlink(kPrivate, photo.c_str()), 0);
  ExpectSuccess(ConvertPhoto(photo));
  RemoveTree(outputs_ + "/o.jpg");
  if (lchown(photo.c_str(), 1, 1) != 0) {
    return;  // an ordinary user's sandbox has no other users
  }
  for (const char* page : {"", "[0]"}) {
    const ProgramResult result = ConvertPhoto(photo + page);
    EXPECT_EQ(result.exitCode, 1);
    EXPECT_THAT(result.err, StartsWith("convert-thumb: cannot open " + photo + ": "));
    EXPECT_THAT(ListDirectory(outputs_), IsEmpty());
  }
  // Also for what only ImageMagick can do.
  EXPECT_EQ(RunConverter({photo, "-negate", outputs_ + "/o.png"}).exitCode, 1);
  EXPECT_THAT(ListDirectory(outputs_), IsEmpty());
}

TEST_F(HostilePhotos, LinksOfTheOwnerOfTheirTargetAreFollowed) {
  const std::string photo = directory_ + "/a.jpg";
  ASSERT_EQ(symlink(kPrivate, photo.c_str()), 0);
  if (lchown(photo.c_str(), 1, 1) != 0 || chown(kPrivate, 1, 1) != 0) {
    return;
  }
  ExpectSuccess(ConvertPhoto(photo));
}

TEST_F(HostilePhotos, ChainsOfLinksAreCheckedLinkByLink) {
  const std::string photo = directory_ + "/a.jpg";
  const std::string second = directory_ + "/second.jpg";
  ASSERT_EQ(symlink(kPrivate, second.c_str()), 0);
  ASSERT_EQ(symlink("second.jpg", photo.c_str()), 0);
  ExpectSuccess(ConvertPhoto(photo));
  RemoveTree(outputs_ + "/o.jpg");
  if (lchown(second.c_str(), 1, 1) != 0) {
    return;
  }
  EXPECT_EQ(ConvertPhoto(photo).exitCode, 1);
  EXPECT_THAT(ListDirectory(outputs_), IsEmpty());
}

TEST_F(HostilePhotos, LinksOfOthersAmongTheirDirectoriesAreRefused) {
  const std::string link = directory_ + "/link";
  ASSERT_EQ(symlink("/tmp/private", link.c_str()), 0);
  ExpectSuccess(ConvertPhoto(link + "/photo.jpg"));
  RemoveTree(outputs_ + "/o.jpg");
  if (lchown(link.c_str(), 1, 1) != 0) {
    return;
  }
  EXPECT_EQ(ConvertPhoto(link + "/photo.jpg").exitCode, 1);
  EXPECT_THAT(ListDirectory(outputs_), IsEmpty());
}

TEST_F(HostilePhotos, CirclesOfLinksEndAtOnce) {
  const std::string photo = directory_ + "/a.jpg";
  ASSERT_EQ(symlink("a.jpg", photo.c_str()), 0);
  EXPECT_EQ(ConvertPhoto(photo).exitCode, 1);
  EXPECT_THAT(ListDirectory(outputs_), IsEmpty());
}

}  // namespace
}  // namespace vela_test
