// Arguments, exit status and output on standard error.
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>

#include "program/stub_program_test.h"
#include "support/build_paths.h"
#include "support/mounts.h"

namespace vela_test {
namespace {

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
  static bool IsDone(const std::string& dir) { return Exists(Thumb(dir + "/a.jpg", "XL")); }

  /// The program with these arguments, the profile file among them.
  static ProgramResult RunWith(const Strings& arguments,
                               const ProgramOptions& options = ProgramOptions()) {
    return RunProgram(VelathumbPath(), arguments, options);
  }
};

TEST_F(CommandLine, TooFewArgumentsExitWithOneAndDoNothing) {
  WriteFile("/var/run/velathumb.4000000.pid", "");
  for (const Strings& arguments : {Strings{}, Strings{kProfiles}, Strings{kPhotos}}) {
    const ProgramResult result = RunWith(arguments);
    EXPECT_EQ(result.exitCode, 1);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err, "");
  }
  EXPECT_THAT(ListDirectory("/run"), ElementsAre("velathumb.4000000.pid"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CommandLine, TakesAFirstArgumentOnlyAsProfileFile) {
  // A tree prefix there is part of the file's name.
  MakePhotosIn({kPhotos});
  WriteProfileFile("/tmp/R:/profiles.conf", ThreePhases());
  EXPECT_SUCCESS(RunWith({"R:/profiles.conf", kPhotos}, InDirectory("/tmp")));
  EXPECT_TRUE(IsDone(kPhotos));
}

TEST_F(CommandLine, TakesDirectoriesInTheirOrder) {
  MakePhotosIn({"/tmp/1", "/tmp/2", "/tmp/3"});
  EXPECT_THAT(ReportedPhotos(RunWithDaemon({"/tmp/3", "R:/tmp/1", "/tmp/2"})),
              ElementsAre("/tmp/3/a.jpg", "/tmp/1/a.jpg", "/tmp/2/a.jpg"));
}

TEST_F(CommandLine, TakesADirectoryAsOftenAsItIsNamed) {
  MakePhotosIn({kPhotos});
  EXPECT_THAT(
      RunWithDaemon({kPhotos, kPhotos, kPhotos}),
      ElementsAre("GET_INDEX_VERSION /tmp/photos/a.jpg", "POST_PHOTO_CONVERT /tmp/photos/a.jpg",
                  "GET_INDEX_VERSION /tmp/photos/a.jpg", "POST_PHOTO_CONVERT /tmp/photos/a.jpg",
                  "POST_PHOTO_CONVERT /tmp/photos/a.jpg"));
}

struct DirectoryArguments : NamedCase {
  Strings photos;     ///< directories with a photo
  Strings arguments;  ///< directory arguments of a run in /tmp/cwd
  Strings done;       ///< directories that get thumbnails
};

class DirectoryArgument : public CommandLine,
                          public ::testing::WithParamInterface<DirectoryArguments> {};

TEST_P(DirectoryArgument, NamesDirectories) {
  MakeDirectories("/tmp/cwd");
  MakePhotosIn(GetParam().photos);
  EXPECT_SUCCESS(Run(GetParam().arguments, InDirectory("/tmp/cwd")));
  const Strings& done = GetParam().done;
  for (const std::string& directory : GetParam().photos) {
    EXPECT_EQ(IsDone(directory), std::count(done.begin(), done.end(), directory) == 1) << directory;
  }
  EXPECT_THAT(Converter().Calls(), SizeIs(2 * done.size()));
}

const Strings kOddNames = {"/tmp/.hidden", "/tmp/@tmp", "/tmp/#recycle", "/tmp/lost+found",
                           "/tmp/a:b",     "/tmp/ R:c", "/tmp/-d"};

INSTANTIATE_TEST_SUITE_P(
    Arguments, DirectoryArgument,
    ::testing::Values(
        DirectoryArguments{"PlainIsItselfOnly", {kPhotos, "/tmp/photos/sub"}, {kPhotos}, {kPhotos}},
        DirectoryArguments{"PlainWithAnyName", kOddNames, kOddNames, kOddNames},
        DirectoryArguments{"TreePrefixIsACapitalLetter",
                           {"/tmp/cwd/r:photos", "/tmp/cwd/r:photos/sub"},
                           {"r:photos"},
                           {"/tmp/cwd/r:photos"}},
        DirectoryArguments{
            "TreeEndsAtTheNextColon", {"/tmp/a", "/tmp/a:b"}, {"R:/tmp/a:b"}, {"/tmp/a"}},
        DirectoryArguments{"ColonsInARowAreOne",
                           {"/tmp/a", "/tmp/b"},
                           {"R::/tmp/a", "R:::/tmp/b::/tmp/c"},
                           {"/tmp/a", "/tmp/b"}},
        DirectoryArguments{"TreePrefixAloneNamesNothing",
                           {"/tmp/a", "/tmp/cwd"},
                           {"R:", "R::", "R:::", "/tmp/a"},
                           {"/tmp/a"}},
        DirectoryArguments{"EmptyNamesNothing", {"/tmp/a"}, {"", "/tmp/a", ""}, {"/tmp/a"}}),
    CaseName());

TEST_F(CommandLine, EmptyProfileFileNamesNothing) {
  MakePhotosIn({"/tmp/a"});
  EXPECT_SUCCESS(RunWith({"", "/tmp/a"}));
}

TEST_F(CommandLine, RelativeDirectoriesStayRelative) {
  const DaemonPeer daemon;
  MakePhotosIn({"/tmp/one", "/tmp/two/sub", "/tmp"});
  EXPECT_SUCCESS(RunWith({"profiles.conf", "one", "R:two", "."}, InDirectory("/tmp")));
  EXPECT_THAT(ReportedPhotos(RequestsOf(daemon)),
              ElementsAre("one/a.jpg", "two/sub/a.jpg", "./a.jpg"));
  EXPECT_THAT(ReadLines(kQueue), ElementsAre("one", "two/sub", "."));
  EXPECT_TRUE(IsDone("/tmp/one"));
  EXPECT_TRUE(IsDone("/tmp/two/sub"));
  EXPECT_TRUE(IsDone("/tmp"));
}

TEST_F(CommandLine, DirectoryIsUsedAsItIsWritten) {
  MakePhotosIn({kPhotos});
  EXPECT_THAT(ReportedPhotos(RunWithDaemon({"/tmp/../tmp//photos/"})),
              ElementsAre("/tmp/../tmp//photos//a.jpg"));
  EXPECT_THAT(ReadLines(kQueue), ElementsAre("/tmp/../tmp//photos/"));
  EXPECT_TRUE(IsDone(kPhotos));
}

TEST_F(CommandLine, MissingDirectoriesAreSilentlySkipped) {
  MakePhotosIn({"/tmp/a", "/tmp/b"});
  WriteFile("/tmp/file", "");
  ASSERT_EQ(symlink("nowhere", "/tmp/link"), 0);
  RunWithDaemon({"/tmp/missing", "/tmp/a", "R:/tmp/missing", "/tmp/file", "R:/tmp/file",
                 "/tmp/link", "R:/tmp/link", "/tmp/file/below", "R:/tmp/b"});
  EXPECT_TRUE(IsDone("/tmp/a"));
  EXPECT_TRUE(IsDone("/tmp/b"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CommandLine, MissingProfileFileIsSilentlySkipped) {
  MakePhotosIn({kPhotos});
  ASSERT_EQ(unlink(kProfiles), 0);
  EXPECT_SUCCESS(Run({kPhotos, "R:/tmp/photos"}));
  EXPECT_FALSE(Exists("/tmp/photos/@eaDir"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CommandLine, ProfileFileThatCannotBeParsedIsReportedForEachDirectory) {
  MakePhotosIn({kPhotos});
  MakeDirectories("/tmp/photos/one/two");
  MakeDirectories("/tmp/photos/@refused");
  WriteFile(kProfiles, "neither section nor key\n");
  const ProgramResult result = Run({kPhotos, "/tmp/missing", "R:/tmp/photos", "R:/tmp/missing"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.out, "");
  EXPECT_EQ(result.err,
            "Failed to parse /tmp/profiles.conf"
            "Failed to parse /tmp/profiles.conf"
            "Failed to parse /tmp/profiles.conf"
            "Failed to parse /tmp/profiles.conf");
  EXPECT_FALSE(Exists("/tmp/photos/@eaDir"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CommandLine, ItsMessageIsLostWithoutStandardError) {
  // The connection to the system log, which an unremovable pid file opens first, would otherwise
  // have descriptor 2.
  MakePhotosIn({kPhotos});
  MakeDirectories("/var/run/velathumb.4000000.pid");
  WriteFile(kProfiles, "neither section nor key\n");
  ProgramOptions options;
  options.closeError = true;
  EXPECT_SUCCESS(Run({kPhotos}, options));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb: KillThumbProcesses(1161) - unlink(/var/run/"
                                        "velathumb.4000000.pid), Is a directory\n"));
}

TEST_F(CommandLine, DirectoryInPlaceOfTheProfileFileCannotBeParsed) {
  MakePhotosIn({kPhotos});
  const ProgramResult result = RunWith({"/tmp", kPhotos});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.err, "Failed to parse /tmp");
}

TEST_F(CommandLine, PermissionIsCheckedBeforeTheProfilesAreParsed) {
  MakePhotosIn({kPhotos});
  WriteFile(kProfiles, "neither section nor key\n");
  const ReadOnlyMount mount(kPhotos);
  EXPECT_SUCCESS(Run({kPhotos}));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CommandLine, DirectoriesThatMayHaveNoMetadataAreSilentlySkipped) {
  const std::string inside = "/tmp/photos/@eaDir/x.jpg";
  MakePhotosIn({inside, "/tmp/readonly", "/tmp/a"});
  const ReadOnlyMount mount("/tmp/readonly");
  EXPECT_SUCCESS(Run({inside, "/tmp/readonly", "/tmp/a"}));
  EXPECT_FALSE(Exists(inside + "/@eaDir"));
  EXPECT_FALSE(Exists("/tmp/readonly/@eaDir"));
  EXPECT_TRUE(IsDone("/tmp/a"));
}

TEST_F(CommandLine, ProfilesAreParsedAnewForEachDirectory) {
  MakePhotosIn({kPhotos, "/tmp/photos/sub", "/tmp/second"});
  const std::string onlyS = ProfileText({Profile("S", 120, 0)});
  const std::string onlyL = ProfileText({Profile("L", 800, 0)});
  Converter().PlanCall(1, StubPlan().WriteOutputs().WriteFile(kProfiles, onlyS));
  Converter().PlanCall(3, StubPlan().WriteOutputs().WriteFile(kProfiles, onlyL));
  EXPECT_SUCCESS(Run({"R:/tmp/photos", "/tmp/second"}));
  EXPECT_EQ(MetadataOf("/tmp/photos/a.jpg"), kThumbsOfFirstRun);
  EXPECT_THAT(MetadataOf("/tmp/photos/sub/a.jpg"), ElementsAre("VELAPHOTO_THUMB_S.jpg"));
  EXPECT_THAT(MetadataOf("/tmp/second/a.jpg"), ElementsAre("VELAPHOTO_THUMB_L.jpg"));
}

TEST_F(CommandLine, ProfileFileMayDisappearDuringTheRun) {
  MakePhotosIn({"/tmp/a", "/tmp/b"});
  Converter().PlanCall(1, StubPlan().WriteOutputs().Remove(kProfiles));
  EXPECT_SUCCESS(Run({"/tmp/a", "/tmp/b"}));
  EXPECT_TRUE(Exists(Thumb("/tmp/a/a.jpg", "B")));
  EXPECT_FALSE(Exists("/tmp/b/@eaDir"));
}

TEST_F(CommandLine, ProfilesWithoutAnyThumbnailReportEachPhoto) {
  MakePhotosIn({kPhotos});
  WriteProfileFile(kProfiles, {});
  EXPECT_THAT(RunWithDaemon({kPhotos}), ElementsAre("POST_PHOTO_CONVERT /tmp/photos/a.jpg"));
  EXPECT_FALSE(Exists(kPhotoProgress));
  EXPECT_FALSE(Exists(kQueue));
}

TEST_F(CommandLine, ProfileFileOfTheLongestPathWorks) {
  MakePhotosIn({kPhotos});
  EXPECT_SUCCESS(RunWith({PathOfLength(kProfiles, kLongestPath), kPhotos}));
  EXPECT_TRUE(IsDone(kPhotos));
}

TEST_F(CommandLine, LongerProfileFileIsCut) {
  MakePhotosIn({kPhotos, "/tmp/tree"});
  const std::string path = PathOfLength(kProfiles, kLongestPath);
  EXPECT_SUCCESS(RunWith({path + ".and/more", kPhotos, "R:/tmp/tree"}));
  EXPECT_TRUE(IsDone(kPhotos));
  EXPECT_TRUE(IsDone("/tmp/tree"));
  WriteFile(kProfiles, "neither section nor key\n");
  const ProgramResult result = RunWith({path + ".and/more", kPhotos});
  EXPECT_EQ(result.err, "Failed to parse " + path);
}

TEST_F(CommandLine, LongDirectoriesAreCut) {
  // Such a path leaves no room for a photo's name; the error line shows the path.
  MakePhotosIn({kPhotos});
  const std::string path = PathOfLength(kPhotos, kLongestPath);
  EXPECT_SUCCESS(Run({path, path + "/and/more", "R:" + path, "R:" + path + "/and/more"}));
  const std::string line = "velathumb:416 [Error] stat: " + path + "/a.jpg";
  EXPECT_THAT(ErrorLines(), ElementsAre(line, line, line, line));
}

TEST_F(CommandLine, UmaskOfTheCallerHasNoEffect) {
  MakePhotosIn({kPhotos, "/tmp/failing"});
  Converter().PlanWhen("/tmp/failing/a.jpg", StubPlan().Exit(1));
  EXPECT_SUCCESS(Run({kPhotos, "/tmp/failing"}, WithUmask(0777)));
  EXPECT_EQ(ModeOf("/tmp/photos/@eaDir"), 0777);
  EXPECT_EQ(ModeOf("/tmp/photos/@eaDir/a.jpg"), 0777);
  EXPECT_EQ(ModeOf(Thumb("/tmp/photos/a.jpg", "XL")), 0777);
  EXPECT_EQ(ModeOf(Marker("/tmp/failing/a.jpg", "XL")), 0777);
  EXPECT_EQ(ModeOf(Marker("/tmp/failing/a.jpg", "S")), 0777);
  EXPECT_EQ(ModeOf(kQueue), 0644);
  EXPECT_EQ(ModeOf(kPhotoProgress), 0644);
}

TEST_F(CommandLine, ArgumentZeroHasNoEffect) {
  MakePhotosIn({kPhotos});
  ProgramOptions options;
  options.argumentZero = "";
  EXPECT_SUCCESS(Run({kPhotos}, options));
  EXPECT_TRUE(IsDone(kPhotos));
}

}  // namespace
}  // namespace vela_test
