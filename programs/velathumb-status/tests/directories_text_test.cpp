// The lines about directories and their totals.
#include <sys/stat.h>
#include <unistd.h>

#include "status_fixture.h"

namespace vela_test {
namespace {

using namespace ::testing;

class DirectoryLines : public StatusTest {
 protected:
  /// The numbers of the report about kTop, which the totals repeat.
  static StatusNumbers Numbers() {
    const StatusText answer = QueryText({kTop});
    EXPECT_EQ(answer.directories.size(), 1U);
    if (answer.directories.empty()) {
      return {};
    }
    EXPECT_EQ(answer.directories[0].numbers, answer.totals.numbers);
    return answer.directories[0].numbers;
  }
};

TEST_F(DirectoryLines, HaveAHeadingWithTheirColumnsInOrder) {
  const std::string out = RunStatus({kTop}).out;
  EXPECT_THAT(out.substr(0, out.find('\n')),
              MatchesRegex(" +photos +to do +present +missing +failed +videos +queued +directory"));
}

TEST_F(DirectoryLines, AnEmptyDirectoryHasNothingToDo) {
  const ProgramResult result = RunStatus({kTop});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.err, "");
  const StatusText answer = ReadStatusText(result.out);
  EXPECT_THAT(answer.Names(), ElementsAre(kTop));
  EXPECT_EQ(answer.totals.numbers, (StatusNumbers{0, 0, 0, 0, 0}));
  EXPECT_EQ(answer.totals.name, "in 1 directory");
}

TEST_F(DirectoryLines, CompletePhotosLeaveNothingToDo) {
  MakePhotoWith("a.jpg", kAllSizes);
  MakePhotoWith("b.nef", kAllSizes);
  EXPECT_EQ(Numbers(), (StatusNumbers{2, 0, 12, 0, 0}));
  EXPECT_EQ(RunStatus({kTop}).exitCode, 0);
}

TEST_F(DirectoryLines, OneMissingThumbIsWork) {
  MakePhotoWith("a.jpg", kAllSizes - kBitSM);
  EXPECT_EQ(Numbers(), (StatusNumbers{1, 1, 5, 1, 0}));
  EXPECT_EQ(RunStatus({kTop}).exitCode, 1);
}

TEST_F(DirectoryLines, MissingOutdatedAndEmptyThumbsAreCountedAsMissing) {
  MakePhotoWith("a.jpg", kAllSizes);
  RemoveTree(Derived("a.jpg", "VELAPHOTO_THUMB_S.jpg"));
  SetFileTime(Derived("a.jpg", "VELAPHOTO_THUMB_M.jpg"), kMediaTime - 1);
  WriteFile(Derived("a.jpg", "VELAPHOTO_THUMB_XL.jpg"), "");
  MakePhotoWith("b.jpg", 0);
  EXPECT_EQ(Numbers(), (StatusNumbers{2, 2, 3, 9, 0}));
}

TEST_F(DirectoryLines, AThumbOfThePhotosOwnSecondIsPresent) {
  MakePhoto(In("a.jpg"));
  MakeThumbs(kTop, "a.jpg", kAllSizes, 0);
  EXPECT_EQ(Numbers(), (StatusNumbers{1, 0, 6, 0, 0}));
}

TEST_F(DirectoryLines, OlderNamesCountAsPresent) {
  MakePhoto(In("a.jpg"));
  for (const char* name : kOldThumbNames) {
    WriteFile(Derived("a.jpg", name), "thumb");
  }
  EXPECT_EQ(Numbers(), (StatusNumbers{1, 0, 6, 0, 0}));
}

TEST_F(DirectoryLines, FailureMarkersAreCountedUnderBothNames) {
  MakePhoto(In("a.jpg"));
  MakePhoto(In("b.jpg"));
  WriteFile(Derived("a.jpg", "VELAPHOTO_THUMB_S.fail"), "");
  WriteFile(Derived("a.jpg", "VELAPHOTO:THUMB_M.fail"), "");
  WriteFile(Derived("b.jpg", "VELAPHOTO_THUMB_B.fail"), "");
  WriteFile(Derived("b.jpg", "VELAPHOTO:THUMB_B.fail"), "");
  EXPECT_EQ(Numbers(), (StatusNumbers{2, 2, 0, 12, 3}));
}

TEST_F(DirectoryLines, OnlyPhotosOfTheDirectoryItselfAreCounted) {
  MakePhoto(In("a.jpg"));
  MakePhoto(In("below/b.jpg"));
  for (const char* name : {"film.mp4", "text.txt", ".hidden.jpg", "@a.jpg", "#b.jpg"}) {
    WriteFile(In(name), "other");
  }
  EXPECT_EQ(Numbers(), (StatusNumbers{1, 1, 0, 6, 0}));
}

TEST_F(DirectoryLines, TheSizeMapSelectsTheThumbsThatCount) {
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"23\"\n");
  MakePhotoWith("a.jpg", kBitS | kBitSM);
  EXPECT_EQ(Numbers(), (StatusNumbers{1, 1, 1, 3, 0}));
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"0\"\n");
  EXPECT_EQ(Numbers(), (StatusNumbers{1, 0, 0, 0, 0}));
}

TEST_F(DirectoryLines, TotalsAreTheSums) {
  MakePhoto("/tmp/one/a.jpg");
  MakeThumbs("/tmp/one", "a.jpg", kAllSizes);
  MakePhoto("/tmp/two/a.jpg");
  MakePhoto("/tmp/two/b.jpg");
  MakeThumbs("/tmp/two", "b.jpg", kBitS);
  WriteFile("/tmp/two/@eaDir/a.jpg/VELAPHOTO_THUMB_S.fail", "");
  const ProgramResult result = RunStatus({"/tmp/one", "/tmp/two"});
  EXPECT_EQ(result.exitCode, 1);
  const StatusText answer = ReadStatusText(result.out);
  ASSERT_THAT(answer.Names(), ElementsAre("/tmp/one", "/tmp/two"));
  EXPECT_EQ(answer.directories[0].numbers, (StatusNumbers{1, 0, 6, 0, 0}));
  EXPECT_EQ(answer.directories[1].numbers, (StatusNumbers{2, 2, 1, 11, 1}));
  EXPECT_EQ(answer.totals.numbers, (StatusNumbers{3, 2, 7, 11, 1}));
  EXPECT_EQ(answer.totals.name, "in 2 directories");
}

TEST_F(DirectoryLines, AgreeWithTheLibrary) {
  MakePhotoWith("a.jpg", kAllSizes);
  MakePhotoWith("b.jpg", kBitS | kBitXL);
  MakePhotoWith("c.jpg", 0);
  const PhotoWork work = WorkInDirectory(kTop);
  EXPECT_EQ(work, (PhotoWork{2, 10}));
  EXPECT_EQ(Numbers(), (StatusNumbers{3, work.photos, 8, work.thumbs, 0}));
}

TEST_F(DirectoryLines, ShowWhichDirectoriesAreQueued) {
  for (const char* dir : {"/tmp/free", "/tmp/waiting", "/tmp/taken", "/tmp/tree"}) {
    MakePhoto(std::string(dir) + "/a.jpg");
  }
  WriteFile(kPhotoQueue, "/tmp/waiting\nR:/tmp/tree\n");
  WriteFile(kPhotosInProgress, "/tmp/taken\n");
  const StatusText answer = QueryText({"/tmp/free", "/tmp/waiting", "/tmp/taken", "/tmp/tree"});
  EXPECT_THAT(answer.directories,
              ElementsAre(Field(&StatusLine::queued, "no"), Field(&StatusLine::queued, "yes"),
                          Field(&StatusLine::queued, "yes"), Field(&StatusLine::queued, "no")));
  EXPECT_EQ(answer.totals.queued, "2");
  EXPECT_EQ(answer.totals.numbers, (StatusNumbers{4, 4, 0, 24, 0}));
}

TEST_F(DirectoryLines, ShowADashForUncheckedVideos) {
  WriteFile(In("film.mp4"), "film");
  const StatusText answer = QueryText({kTop});
  EXPECT_EQ(answer.directories.at(0).videos, "-");
  EXPECT_EQ(answer.totals.videos, "-");
}

TEST_F(DirectoryLines, OddNamesStayOnOneLine) {
  const std::string odd = "/tmp/new\nline\ttab\\back\x7f\xff";
  MakeDirectories(odd);
  EXPECT_THAT(QueryText({odd}).Names(), ElementsAre("/tmp/new\\nline\\x09tab\\\\back\\x7f\xff"));
}

TEST_F(DirectoryLines, ADirectoryIsCountedOnceWhateverItsName) {
  MakePhoto(In("a.jpg"));
  ASSERT_EQ(symlink(kTop, "/tmp/link"), 0);
  const StatusText answer = QueryText({kTop, "/tmp/photos/", "/tmp/link"});
  EXPECT_THAT(answer.Names(), ElementsAre(kTop));
  EXPECT_EQ(answer.totals.numbers.photos, 1);
}

TEST_F(DirectoryLines, NamesAreAbsoluteAndNormalized) {
  MakeDirectories(In("below"));
  WriteFile(kPhotoQueue, std::string(kTop) + "\n");
  ProgramOptions options;
  options.workingDirectory = kTop;
  const StatusText answer = QueryText({".", "below/"}, options);
  EXPECT_THAT(answer.Names(), ElementsAre(kTop, In("below")));
  EXPECT_EQ(answer.directories.at(0).queued, "yes");
  for (const char* name : {"/tmp/photos///", "/tmp//photos", "/tmp/photos/.", "/tmp/./photos/",
                           "/tmp/photos/below/.."}) {
    const StatusText same = QueryText({name});
    EXPECT_THAT(same.Names(), ElementsAre(kTop)) << name;
    EXPECT_EQ(same.totals.queued, "1") << name;
  }
}

TEST_F(DirectoryLines, ALinkKeepsItsOwnName) {
  MakePhoto(In("a.jpg"));
  ASSERT_EQ(symlink(kTop, "/tmp/link"), 0);
  const StatusText answer = QueryText({"/tmp/link/"});
  EXPECT_THAT(answer.Names(), ElementsAre("/tmp/link"));
  EXPECT_EQ(answer.totals.numbers.photos, 1);
}

TEST_F(DirectoryLines, TheRootDirectoryCanBeChecked) {
  EXPECT_THAT(QueryText({"/"}).Names(), ElementsAre("/"));
}

TEST_F(DirectoryLines, AMissingDirectoryIsAnErrorAndTheRestIsReported) {
  MakePhoto(In("a.jpg"));
  const ProgramResult result = RunStatus({"/tmp/none", kTop});
  ExpectError(result, "/tmp/none: No such file or directory");
  const StatusText answer = ReadStatusText(result.out);
  EXPECT_THAT(answer.Names(), ElementsAre(kTop));
  EXPECT_EQ(answer.totals.numbers.photos, 1);
}

TEST_F(DirectoryLines, AFileIsAnError) {
  MakePhoto(In("a.jpg"));
  const ProgramResult result = RunStatus({In("a.jpg")});
  ExpectError(result, "/tmp/photos/a.jpg: Not a directory");
  EXPECT_EQ(ReadStatusText(result.out).totals.name, "in 0 directories");
}

TEST_F(DirectoryLines, AnEmptyNameIsAnError) {
  const ProgramResult result = RunStatus({"", kTop});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_THAT(result.err, EndsWith(": No such file or directory\n"));
  EXPECT_THAT(ReadStatusText(result.out).Names(), ElementsAre(kTop));
}

TEST_F(DirectoryLines, AnUnreadableDirectoryIsAnErrorAndTheRestIsReported) {
  MakePhoto("/tmp/closed/a.jpg");
  MakePhoto(In("a.jpg"));
  ASSERT_EQ(chmod("/tmp/closed", 0), 0);
  const ProgramResult result = RunStatusAsOrdinaryUser({"/tmp/closed", kTop});
  ExpectError(result, "/tmp/closed: cannot be opened");
  EXPECT_EQ(ReadStatusText(result.out).totals.numbers, (StatusNumbers{1, 1, 0, 6, 0}));
}

TEST_F(DirectoryLines, ADirectoryWhoseEntriesCannotBeExaminedIsAnError) {
  MakePhoto("/tmp/closed/a.jpg");
  ASSERT_EQ(chmod("/tmp/closed", 0444), 0);
  ExpectError(RunStatusAsOrdinaryUser({"/tmp/closed"}), "/tmp/closed: Permission denied");
}

TEST_F(DirectoryLines, ADanglingLinkIsNotAPhoto) {
  ASSERT_EQ(symlink("/tmp/none.jpg", In("a.jpg").c_str()), 0);
  const ProgramResult result = RunStatus({kTop});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(ReadStatusText(result.out).totals.numbers.photos, 0);
}

}  // namespace
}  // namespace vela_test
