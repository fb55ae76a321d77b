// The real tools under their confinement.
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>

#include "posix/landlock.h"
#include "program/real_program_test.h"
#include "support/named_case.h"
#include "support/seccomp_fail.h"

namespace vela_test::real {

namespace {

constexpr char kPrivatePhoto[] = "/tmp/private/secret.jpg";
/// Palette indexes of very different colours.
constexpr int kRed = 100;
constexpr int kGreen = 20;

class ConfinedTools : public RealProgramTest {
 protected:
  void SetUp() override {
    RealProgramTest::SetUp();
    InstallRealExiftool();
    MakeDirectories("/tmp/private");
  }
};

/// What a kernel refuses.
struct Kernel : NamedCase {
  std::vector<RefusedCall> refused;
};

class ToolsOnEachKernel : public ConfinedTools, public ::testing::WithParamInterface<Kernel> {};

const RefusedCall kNoLandlock = {SYS_landlock_create_ruleset, ENOSYS};
const RefusedCall kNoSeccomp = {SYS_seccomp, ENOSYS};
const RefusedCall kNoPrivilegeControl = {SYS_prctl, EINVAL, 0, UINT32_MAX, PR_SET_NO_NEW_PRIVS};

INSTANTIATE_TEST_SUITE_P(
    Kernels, ToolsOnEachKernel,
    ::testing::Values(Kernel{{"WithEverything"}, {}}, Kernel{{"WithoutLandlock"}, {kNoLandlock}},
                      Kernel{{"WithoutSeccomp"}, {kNoSeccomp}},
                      Kernel{{"WithoutAnything"}, {kNoLandlock, kNoSeccomp, kNoPrivilegeControl}}),
    CaseName());

TEST_P(ToolsOnEachKernel, MakeThumbnailsOfEveryKindOfPhoto) {
  const DaemonPeer daemon;
  Strings photos = {
      MakeRawPhoto(InPhotos("full.dng"), RawRecipeOf()),
      MakeRawPhoto(InPhotos("preview.dng"), RawRecipeOf(120, 80)),
  };
  RawRecipe turned = RawRecipeOf(120, 80);
  turned.preview->orientation = 1;
  turned.rotation = 90;
  photos.push_back(MakeRawPhoto(InPhotos("turned.dng"), turned));
  for (const char* extension : {"heic", "png", "jpg", "tif", "gif", "psd", "bmp"}) {
    // A percent sign in a name has a meaning to ImageMagick, which makes these.
    const std::string made = MakeImage("/tmp/made." + std::string(extension), 240, 160);
    photos.push_back(InPhotos("50% here/a." + std::string(extension)));
    MakeDirectories(InPhotos("50% here"));
    CopyFile(made, photos.back());
  }
  ProgramOptions options;
  if (!GetParam().refused.empty()) {
    options.beforeExec = {SeccompFail(GetParam().refused)};
  }
  const Strings tree = {"R:" + std::string(kPhotos)};
  Make(tree, options);
  Make(tree, options);
  for (const std::string& photo : photos) {
    EXPECT_TRUE(HasThumbs(photo, kinds_)) << photo;
  }
  EXPECT_EQ(QuadrantLetters(ThumbOf(InPhotos("full.dng"), kinds_.front())), "RGBY");
  EXPECT_EQ(QuadrantLetters(ThumbOf(InPhotos("turned.dng"), kinds_.front())), LettersAfterTurn(90));
}

TEST_F(ConfinedTools, DoNotShowAPrivatePhotoThatAnSvgEmbeds) {
  MakePlainPhoto(kPrivatePhoto, kRed);
  const std::string photo = InPhotos("a.jpg");
  WriteFile(photo,
            "<?xml version=\"1.0\"?>\n<svg xmlns=\"http://www.w3.org/2000/svg\" "
            "xmlns:xlink=\"http://www.w3.org/1999/xlink\" width=\"160\" height=\"120\">\n"
            "<image xlink:href=\"" +
                std::string(kPrivatePhoto) + "\" width=\"160\" height=\"120\"/>\n</svg>\n");
  Make();
  for (const Kind& kind : kinds_) {
    EXPECT_NE(PaletteIndexOf(ThumbOf(photo, kind)), kRed) << kind.name;
  }
}

/// Makes a converter that waits until the test has created kGo in the output directory before it
/// starts ImageMagick.
void InstallWaitingConverter() {
  RemoveTree(kConverterPath);
  WriteFile(kConverterPath,
            "#!/bin/sh\n"
            "true >\"${2#registry:temporary-path=}/started\"\n"
            "while ! [ -e \"${2#registry:temporary-path=}/go\" ]; do true; done\n"
            "exec /usr/vela/lib/convert-thumb \"$@\"\n");
  ASSERT_EQ(chmod(kConverterPath, 0755), 0);
}

/// Two photos of one colour each with the same number of bytes and blocks.
void MakePhotosOfOneSize(const std::string& a, const std::string& b) {
  constexpr size_t kSize = 65536;
  for (const auto& [path, colour] : {std::pair{a, kGreen}, std::pair{b, kRed}}) {
    MakePlainPhoto(path, colour);
    std::string content = ReadFile(path);
    content.resize(kSize, '\0');
    WriteFile(path, content);
  }
}

TEST_F(ConfinedTools, DoNotReadAPrivatePhotoBehindALinkThatReplacesThePhotoAfterTheCheck) {
  if (vela::LandlockVersion() < 1) {
    return;
  }
  InstallWaitingConverter();
  const std::string photo = InPhotos("a.jpg");
  MakePhotosOfOneSize(photo, kPrivatePhoto);
  const std::string directory = MetadataDirOf(photo);
  Program program = StartProgram(VelathumbPath(), ArgumentsFor({kPhotos}));
  ASSERT_TRUE(WaitUntilExists(directory + "/started"));
  ASSERT_EQ(unlink(photo.c_str()), 0);
  ASSERT_EQ(symlink(kPrivatePhoto, photo.c_str()), 0);
  lchown(photo.c_str(), 1001, 1001);
  WriteFile(directory + "/go", "");
  EXPECT_EQ(program.Wait()->exitCode, 0);
  for (const Kind& kind : kinds_) {
    EXPECT_NE(PaletteIndexOf(ThumbOf(photo, kind)), kRed) << kind.name;
  }
}

}  // namespace

}  // namespace vela_test::real
