// Arguments, exit status and what is told on standard error.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "program/stub_program_test.h"
#include "support/build_paths.h"
#include "support/files.h"
#include "support/mounts.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

constexpr size_t kLongestPath = 4095;

/// A path to `target` (absolute) of exactly `length` bytes, with steps of "/." in front.
std::string PathOfLength(const std::string& target, size_t length) {
  std::string path = "/tmp";
  const std::string rest = target.substr(path.size());
  if ((length - path.size() - rest.size()) % 2 == 1) {
    path += "/";
  }
  while (path.size() + rest.size() < length) {
    path += "/.";
  }
  return path + rest;
}

class CommandLine : public StubProgramTest {
 protected:
  /// A directory with one photo.
  static std::string MakeDirectoryWithPhoto(const std::string& dir) {
    MakePhoto(dir + "/a.jpg");
    return dir;
  }

  static bool IsDone(const std::string& dir) { return Exists(Thumb(dir + "/a.jpg", "XL")); }

  /// The program with these arguments, the profile file among them.
  static ProgramResult RunWith(const std::vector<std::string>& arguments,
                               const ProgramOptions& options = ProgramOptions()) {
    return RunProgram(VelathumbPath(), arguments, options);
  }
};

class TooFewArguments : public CommandLine,
                        public ::testing::WithParamInterface<std::vector<std::string>> {};

TEST_P(TooFewArguments, ExitsWithOneAndDoesNothing) {
  WriteFile("/var/run/velathumb.4000000.pid", "");
  const ProgramResult result = RunWith(GetParam());
  EXPECT_EQ(1, result.exitCode);
  EXPECT_EQ("", result.out);
  EXPECT_EQ("", result.err);
  EXPECT_THAT(ListDirectory("/run"), ElementsAre("velathumb.4000000.pid"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

INSTANTIATE_TEST_SUITE_P(Arguments, TooFewArguments,
                         ::testing::Values(std::vector<std::string>{},
                                           std::vector<std::string>{kProfiles},
                                           std::vector<std::string>{kPhotos}));

TEST_F(CommandLine, TakesAFirstArgumentOnlyAsProfileFile) {
  // A tree prefix there is part of the file's name.
  MakeDirectoryWithPhoto(kPhotos);
  WriteProfileFile("/tmp/R:/profiles.conf", ThreePhases());
  ProgramOptions options;
  options.workingDirectory = "/tmp";
  EXPECT_GOOD_END(RunWith({"R:/profiles.conf", kPhotos}, options));
  EXPECT_TRUE(IsDone(kPhotos));
}

TEST_F(CommandLine, TakesDirectoriesInTheirOrder) {
  const DaemonPeer daemon;
  for (const char* dir : {"/tmp/1", "/tmp/2", "/tmp/3"}) {
    MakeDirectoryWithPhoto(dir);
  }
  EXPECT_GOOD_END(Run({"/tmp/3", "R:/tmp/1", "/tmp/2"}));
  EXPECT_THAT(ReportedPhotos(daemon), ElementsAre("/tmp/3/a.jpg", "/tmp/1/a.jpg", "/tmp/2/a.jpg"));
}

TEST_F(CommandLine, TakesADirectoryAsOftenAsItIsNamed) {
  const DaemonPeer daemon;
  MakeDirectoryWithPhoto(kPhotos);
  EXPECT_GOOD_END(Run({kPhotos, kPhotos, kPhotos}));
  EXPECT_THAT(
      RequestsOf(daemon),
      ElementsAre("GET_INDEX_VERSION /tmp/photos/a.jpg", "POST_PHOTO_CONVERT /tmp/photos/a.jpg",
                  "GET_INDEX_VERSION /tmp/photos/a.jpg", "POST_PHOTO_CONVERT /tmp/photos/a.jpg",
                  "POST_PHOTO_CONVERT /tmp/photos/a.jpg"));
}

TEST_F(CommandLine, PlainDirectoryIsItselfOnly) {
  MakeDirectoryWithPhoto(kPhotos);
  MakeDirectoryWithPhoto(std::string(kPhotos) + "/sub");
  EXPECT_GOOD_END(Run({kPhotos}));
  EXPECT_TRUE(IsDone(kPhotos));
  EXPECT_FALSE(IsDone(std::string(kPhotos) + "/sub"));
}

TEST_F(CommandLine, PlainDirectoryMayHaveAnyName) {
  for (const char* dir : {"/tmp/.hidden", "/tmp/@tmp", "/tmp/#recycle", "/tmp/lost+found",
                          "/tmp/a:b", "/tmp/ R:c", "/tmp/-d"}) {
    MakeDirectoryWithPhoto(dir);
    EXPECT_GOOD_END(Run({dir}));
    EXPECT_TRUE(IsDone(dir)) << dir;
  }
}

TEST_F(CommandLine, TreePrefixIsACapitalLetter) {
  MakeDirectoryWithPhoto("/tmp/r:photos");
  MakeDirectoryWithPhoto("/tmp/r:photos/sub");
  ProgramOptions options;
  options.workingDirectory = "/tmp";
  EXPECT_GOOD_END(Run({"r:photos"}, options));
  EXPECT_TRUE(IsDone("/tmp/r:photos"));
  EXPECT_FALSE(IsDone("/tmp/r:photos/sub"));
}

TEST_F(CommandLine, TreeDirectoryEndsAtTheNextColon) {
  MakeDirectoryWithPhoto("/tmp/a");
  MakeDirectoryWithPhoto("/tmp/a:b");
  EXPECT_GOOD_END(Run({"R:/tmp/a:b"}));
  EXPECT_TRUE(IsDone("/tmp/a"));
  EXPECT_FALSE(IsDone("/tmp/a:b"));
}

TEST_F(CommandLine, ColonsInARowAreOne) {
  MakeDirectoryWithPhoto("/tmp/a");
  MakeDirectoryWithPhoto("/tmp/b");
  EXPECT_GOOD_END(Run({"R::/tmp/a", "R:::/tmp/b::/tmp/c"}));
  EXPECT_TRUE(IsDone("/tmp/a"));
  EXPECT_TRUE(IsDone("/tmp/b"));
}

TEST_F(CommandLine, TreePrefixAloneNamesNothing) {
  MakeDirectoryWithPhoto("/tmp/a");
  MakeDirectoryWithPhoto("/tmp/here");
  ProgramOptions options;
  options.workingDirectory = "/tmp/here";
  EXPECT_GOOD_END(Run({"R:", "R::", "R:::", "/tmp/a"}, options));
  EXPECT_TRUE(IsDone("/tmp/a"));
  EXPECT_FALSE(IsDone("/tmp/here"));
  EXPECT_EQ(2U, Converter().Calls().size());
}

TEST_F(CommandLine, EmptyArgumentsNameNothing) {
  MakeDirectoryWithPhoto("/tmp/a");
  EXPECT_GOOD_END(Run({"", "/tmp/a", ""}));
  EXPECT_TRUE(IsDone("/tmp/a"));
  EXPECT_GOOD_END(RunWith({"", "/tmp/a"}));
}

TEST_F(CommandLine, RelativeDirectoriesStayRelative) {
  const DaemonPeer daemon;
  MakeDirectoryWithPhoto("/tmp/one");
  MakeDirectoryWithPhoto("/tmp/two/sub");
  MakeDirectoryWithPhoto("/tmp");
  ProgramOptions options;
  options.workingDirectory = "/tmp";
  EXPECT_GOOD_END(RunWith({"profiles.conf", "one", "R:two", "."}, options));
  EXPECT_THAT(ReportedPhotos(daemon), ElementsAre("one/a.jpg", "two/sub/a.jpg", "./a.jpg"));
  EXPECT_THAT(ReadLines(kQueue), ElementsAre("one", "two/sub", "."));
  EXPECT_TRUE(IsDone("/tmp/one"));
  EXPECT_TRUE(IsDone("/tmp/two/sub"));
  EXPECT_TRUE(IsDone("/tmp"));
}

TEST_F(CommandLine, DirectoryIsUsedAsItIsWritten) {
  const DaemonPeer daemon;
  MakeDirectoryWithPhoto(kPhotos);
  EXPECT_GOOD_END(Run({"/tmp/../tmp//photos/"}));
  EXPECT_THAT(ReportedPhotos(daemon), ElementsAre("/tmp/../tmp//photos//a.jpg"));
  EXPECT_THAT(ReadLines(kQueue), ElementsAre("/tmp/../tmp//photos/"));
  EXPECT_TRUE(IsDone(kPhotos));
}

TEST_F(CommandLine, MissingDirectoriesArePassedOverInSilence) {
  MakeDirectoryWithPhoto("/tmp/a");
  MakeDirectoryWithPhoto("/tmp/b");
  WriteFile("/tmp/file", "");
  ASSERT_EQ(0, symlink("nowhere", "/tmp/link"));
  const DaemonPeer daemon;
  EXPECT_GOOD_END(Run({"/tmp/missing", "/tmp/a", "R:/tmp/missing", "/tmp/file", "R:/tmp/file",
                       "/tmp/link", "R:/tmp/link", "/tmp/file/below", "R:/tmp/b"}));
  EXPECT_TRUE(IsDone("/tmp/a"));
  EXPECT_TRUE(IsDone("/tmp/b"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CommandLine, MissingProfileFileIsPassedOverInSilence) {
  MakeDirectoryWithPhoto(kPhotos);
  ASSERT_EQ(0, unlink(kProfiles));
  EXPECT_GOOD_END(Run({kPhotos, std::string("R:") + kPhotos}));
  EXPECT_FALSE(Exists(std::string(kPhotos) + "/@eaDir"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CommandLine, ProfileFileThatCannotBeParsedIsToldForEachDirectory) {
  MakeDirectoryWithPhoto(kPhotos);
  MakeDirectories(std::string(kPhotos) + "/one/two");
  MakeDirectories(std::string(kPhotos) + "/@refused");
  WriteFile(kProfiles, "neither section nor key\n");
  const ProgramResult result =
      Run({kPhotos, "/tmp/missing", std::string("R:") + kPhotos, "R:/tmp/missing"});
  EXPECT_EQ(0, result.exitCode);
  EXPECT_EQ("", result.out);
  EXPECT_EQ(
      "Failed to parse /tmp/profiles.conf"
      "Failed to parse /tmp/profiles.conf"
      "Failed to parse /tmp/profiles.conf"
      "Failed to parse /tmp/profiles.conf",
      result.err);
  EXPECT_FALSE(Exists(std::string(kPhotos) + "/@eaDir"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CommandLine, ItsMessageGoesNowhereWithoutStandardError) {
  // The connection to the system log, which an unremovable pid file opens first, would otherwise
  // have descriptor 2.
  MakeDirectoryWithPhoto(kPhotos);
  MakeDirectories("/var/run/velathumb.4000000.pid");
  WriteFile(kProfiles, "neither section nor key\n");
  ProgramOptions options;
  options.closeError = true;
  EXPECT_GOOD_END(Run({kPhotos}, options));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb: KillThumbProcesses(1161) - unlink(/var/run/"
                                        "velathumb.4000000.pid), Is a directory\n"));
}

TEST_F(CommandLine, DirectoryInPlaceOfTheProfileFileCannotBeParsed) {
  MakeDirectoryWithPhoto(kPhotos);
  const ProgramResult result = RunWith({"/tmp", kPhotos});
  EXPECT_EQ(0, result.exitCode);
  EXPECT_EQ("Failed to parse /tmp", result.err);
}

TEST_F(CommandLine, PermissionIsAskedForBeforeTheProfilesAreParsed) {
  MakeDirectoryWithPhoto(kPhotos);
  WriteFile(kProfiles, "neither section nor key\n");
  const ReadOnlyMount mount(kPhotos);
  EXPECT_GOOD_END(Run({kPhotos}));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CommandLine, DirectoriesThatMayHaveNoMetadataArePassedOverInSilence) {
  const std::string inside = "/tmp/photos/@eaDir/x.jpg";
  MakeDirectoryWithPhoto(inside);
  MakeDirectoryWithPhoto("/tmp/readonly");
  MakeDirectoryWithPhoto("/tmp/a");
  const ReadOnlyMount mount("/tmp/readonly");
  EXPECT_GOOD_END(Run({inside, "/tmp/readonly", "/tmp/a"}));
  EXPECT_FALSE(Exists(inside + "/@eaDir"));
  EXPECT_FALSE(Exists("/tmp/readonly/@eaDir"));
  EXPECT_TRUE(IsDone("/tmp/a"));
}

TEST_F(CommandLine, ProfilesAreParsedAnewForEachDirectory) {
  MakeDirectoryWithPhoto(kPhotos);
  MakeDirectoryWithPhoto(std::string(kPhotos) + "/sub");
  MakeDirectoryWithPhoto("/tmp/second");
  const std::string onlyS = ProfileText({{"thumb", 120, 80, std::nullopt,  //
                                          "VELAPHOTO_THUMB_S.jpg", 0}});
  const std::string onlyL = ProfileText({{"thumb", 800, 80, std::nullopt,  //
                                          "VELAPHOTO_THUMB_L.jpg", 0}});
  Converter().PlanCall(1, StubPlan().WriteOutputs().WriteFile(kProfiles, onlyS));
  Converter().PlanCall(3, StubPlan().WriteOutputs().WriteFile(kProfiles, onlyL));
  EXPECT_GOOD_END(Run({std::string("R:") + kPhotos, "/tmp/second"}));
  EXPECT_THAT(
      MetadataOf("/tmp/photos/a.jpg"),
      ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg", "VELAPHOTO_THUMB_XL.jpg"));
  EXPECT_THAT(MetadataOf("/tmp/photos/sub/a.jpg"), ElementsAre("VELAPHOTO_THUMB_S.jpg"));
  EXPECT_THAT(MetadataOf("/tmp/second/a.jpg"), ElementsAre("VELAPHOTO_THUMB_L.jpg"));
}

TEST_F(CommandLine, ProfileFileMayDisappearOnTheWay) {
  MakeDirectoryWithPhoto("/tmp/a");
  MakeDirectoryWithPhoto("/tmp/b");
  Converter().PlanCall(1, StubPlan().WriteOutputs().Remove(kProfiles));
  EXPECT_GOOD_END(Run({"/tmp/a", "/tmp/b"}));
  EXPECT_TRUE(Exists(Thumb("/tmp/a/a.jpg", "B")));
  EXPECT_FALSE(Exists("/tmp/b/@eaDir"));
}

TEST_F(CommandLine, ProfilesWithoutAnyThumbnailReportEachPhoto) {
  const DaemonPeer daemon;
  MakeDirectoryWithPhoto(kPhotos);
  WriteProfileFile(kProfiles, {});
  EXPECT_GOOD_END(Run({kPhotos}));
  EXPECT_THAT(RequestsOf(daemon), ElementsAre("POST_PHOTO_CONVERT /tmp/photos/a.jpg"));
  EXPECT_FALSE(Exists(kPhotoProgress));
  EXPECT_FALSE(Exists(kQueue));
}

TEST_F(CommandLine, ProfileFileOfTheLongestPathWorks) {
  MakeDirectoryWithPhoto(kPhotos);
  EXPECT_GOOD_END(RunWith({PathOfLength(kProfiles, kLongestPath), kPhotos}));
  EXPECT_TRUE(IsDone(kPhotos));
}

TEST_F(CommandLine, LongerProfileFileIsCut) {
  MakeDirectoryWithPhoto(kPhotos);
  MakeDirectoryWithPhoto("/tmp/tree");
  const std::string path = PathOfLength(kProfiles, kLongestPath);
  EXPECT_GOOD_END(RunWith({path + ".and/more", kPhotos, "R:/tmp/tree"}));
  EXPECT_TRUE(IsDone(kPhotos));
  EXPECT_TRUE(IsDone("/tmp/tree"));
  WriteFile(kProfiles, "neither section nor key\n");
  const ProgramResult result = RunWith({path + ".and/more", kPhotos});
  EXPECT_EQ("Failed to parse " + path, result.err);
}

TEST_F(CommandLine, LongDirectoriesAreCut) {
  // There is no room for a photo's name behind such a path; the attempt shows the path.
  MakeDirectoryWithPhoto(kPhotos);
  const std::string path = PathOfLength(kPhotos, kLongestPath);
  EXPECT_GOOD_END(Run({path, path + "/and/more", "R:" + path, "R:" + path + "/and/more"}));
  const std::string line = "velathumb:416 [Error] stat: " + path + "/a.jpg";
  EXPECT_THAT(ErrorLines(), ElementsAre(line, line, line, line));
}

TEST_F(CommandLine, MaskOfTheCallerIsWithoutEffect) {
  MakeDirectoryWithPhoto(kPhotos);
  MakeDirectoryWithPhoto("/tmp/failing");
  Converter().PlanWhen("/tmp/failing/a.jpg", StubPlan().Exit(1));
  ProgramOptions options;
  options.umask = 0777;
  EXPECT_GOOD_END(Run({kPhotos, "/tmp/failing"}, options));
  EXPECT_EQ(0777, ModeOf("/tmp/photos/@eaDir"));
  EXPECT_EQ(0777, ModeOf("/tmp/photos/@eaDir/a.jpg"));
  EXPECT_EQ(0777, ModeOf(Thumb("/tmp/photos/a.jpg", "XL")));
  EXPECT_EQ(0777, ModeOf(Marker("/tmp/failing/a.jpg", "XL")));
  EXPECT_EQ(0777, ModeOf(Marker("/tmp/failing/a.jpg", "S")));
  EXPECT_EQ(0644, ModeOf(kQueue));
  EXPECT_EQ(0644, ModeOf(kPhotoProgress));
}

TEST_F(CommandLine, NameUnderWhichItIsStartedIsWithoutEffect) {
  MakeDirectoryWithPhoto(kPhotos);
  ProgramOptions options;
  options.argumentZero = "";
  EXPECT_GOOD_END(Run({kPhotos}, options));
  EXPECT_TRUE(IsDone(kPhotos));
}

}  // namespace
}  // namespace vela_test
