// The lines about directories and their totals.
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "status_program.h"
#include "status_text.h"
#include "storage/photo_tree.h"
#include "support/files.h"
#include "support/sandbox.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::EndsWith;
using ::testing::MatchesRegex;

constexpr const char* kTop = "/tmp/photos";
constexpr const char* kQueueFile = "/var/spool/thumb_create.queue";
constexpr int kAllSizes = 63;

std::string In(const std::string& name) {
  return std::string(kTop) + "/" + name;
}

void MakeCompletePhoto(const std::string& dir, const std::string& name) {
  MakePhoto(dir + "/" + name);
  MakeThumbs(dir, name, kAllSizes);
}

class DirectoryLines : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories(kTop);
  }

  /// The answer for one directory: its numbers, which the totals repeat.
  static StatusNumbers Numbers(const std::string& dir = kTop) {
    const StatusText answer = ReadStatusText(RunStatus({dir}).out);
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
  MakeCompletePhoto(kTop, "a.jpg");
  MakeCompletePhoto(kTop, "b.nef");
  EXPECT_EQ(Numbers(), (StatusNumbers{2, 0, 12, 0, 0}));
  EXPECT_EQ(RunStatus({kTop}).exitCode, 0);
}

TEST_F(DirectoryLines, OneMissingThumbIsWork) {
  MakePhoto(In("a.jpg"));
  MakeThumbs(kTop, "a.jpg", kAllSizes - kBitSM);
  EXPECT_EQ(Numbers(), (StatusNumbers{1, 1, 5, 1, 0}));
  EXPECT_EQ(RunStatus({kTop}).exitCode, 1);
}

TEST_F(DirectoryLines, MissingOutdatedAndEmptyThumbsAreCountedAsMissing) {
  MakeCompletePhoto(kTop, "a.jpg");
  RemoveTree(In("@eaDir/a.jpg/VELAPHOTO_THUMB_S.jpg"));
  SetFileTime(In("@eaDir/a.jpg/VELAPHOTO_THUMB_M.jpg"), kMediaTime - 1);
  WriteFile(In("@eaDir/a.jpg/VELAPHOTO_THUMB_XL.jpg"), "");
  MakePhoto(In("b.jpg"));
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
    WriteFile(In("@eaDir/a.jpg/") + name, "thumb");
  }
  EXPECT_EQ(Numbers(), (StatusNumbers{1, 0, 6, 0, 0}));
}

TEST_F(DirectoryLines, FailureMarkersAreCountedUnderBothNames) {
  MakePhoto(In("a.jpg"));
  WriteFile(In("@eaDir/a.jpg/VELAPHOTO_THUMB_S.fail"), "");
  WriteFile(In("@eaDir/a.jpg/VELAPHOTO:THUMB_M.fail"), "");
  MakePhoto(In("b.jpg"));
  WriteFile(In("@eaDir/b.jpg/VELAPHOTO_THUMB_B.fail"), "");
  WriteFile(In("@eaDir/b.jpg/VELAPHOTO:THUMB_B.fail"), "");
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

TEST_F(DirectoryLines, TheSizeMapSaysWhichThumbsAreWanted) {
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"23\"\n");
  MakePhoto(In("a.jpg"));
  MakeThumbs(kTop, "a.jpg", kBitS | kBitSM);
  EXPECT_EQ(Numbers(), (StatusNumbers{1, 1, 1, 3, 0}));
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"0\"\n");
  EXPECT_EQ(Numbers(), (StatusNumbers{1, 0, 0, 0, 0}));
}

TEST_F(DirectoryLines, TotalsAreTheSums) {
  MakeCompletePhoto("/tmp/one", "a.jpg");
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
  MakeCompletePhoto(kTop, "a.jpg");
  MakePhoto(In("b.jpg"));
  MakeThumbs(kTop, "b.jpg", kBitS | kBitXL);
  MakePhoto(In("c.jpg"));
  const PhotoWork work = WorkInDirectory(kTop);
  const StatusNumbers numbers = Numbers();
  EXPECT_EQ(numbers.toDo, work.photos);
  EXPECT_EQ(numbers.missing, work.thumbs);
  EXPECT_EQ(work, (PhotoWork{2, 10}));
}

TEST_F(DirectoryLines, TellWhichDirectoriesWait) {
  MakePhoto("/tmp/free/a.jpg");
  MakePhoto("/tmp/waiting/a.jpg");
  MakePhoto("/tmp/taken/a.jpg");
  MakePhoto("/tmp/tree/a.jpg");
  WriteFile(kQueueFile, "/tmp/waiting\nR:/tmp/tree\n");
  WriteFile(std::string(kQueueFile) + ".tmp", "/tmp/taken\n");
  const StatusText answer =
      ReadStatusText(RunStatus({"/tmp/free", "/tmp/waiting", "/tmp/taken", "/tmp/tree"}).out);
  std::vector<std::string> queued;
  for (const StatusLine& line : answer.directories) {
    queued.push_back(line.queued);
  }
  EXPECT_THAT(queued, ElementsAre("no", "yes", "yes", "no"));
  EXPECT_EQ(answer.totals.queued, "2");
  EXPECT_EQ(answer.totals.numbers, (StatusNumbers{4, 4, 0, 24, 0}));
}

TEST_F(DirectoryLines, ShowADashForVideosThatWereNotAskedFor) {
  WriteFile(In("film.mp4"), "film");
  const StatusText answer = ReadStatusText(RunStatus({kTop}).out);
  EXPECT_EQ(answer.directories.at(0).videos, "-");
  EXPECT_EQ(answer.totals.videos, "-");
}

TEST_F(DirectoryLines, OddNamesStayOnOneLine) {
  const std::string odd = "/tmp/new\nline\ttab\\back\x7f\xff";
  MakeDirectories(odd);
  EXPECT_THAT(ReadStatusText(RunStatus({odd}).out).Names(),
              ElementsAre("/tmp/new\\nline\\x09tab\\\\back\\x7f\xff"));
}

TEST_F(DirectoryLines, ADirectoryIsCountedOnceHoweverItIsCalled) {
  MakePhoto(In("a.jpg"));
  ASSERT_EQ(symlink(kTop, "/tmp/link"), 0);
  const StatusText answer = ReadStatusText(RunStatus({kTop, "/tmp/photos/", "/tmp/link"}).out);
  EXPECT_THAT(answer.Names(), ElementsAre(kTop));
  EXPECT_EQ(answer.totals.numbers.photos, 1);
}

TEST_F(DirectoryLines, NamesAreAbsoluteAndPlain) {
  MakeDirectories(In("below"));
  WriteFile(kQueueFile, std::string(kTop) + "\n");
  ProgramOptions options;
  options.workingDirectory = kTop;
  const StatusText answer = ReadStatusText(RunStatus({".", "below/"}, options).out);
  EXPECT_THAT(answer.Names(), ElementsAre(kTop, In("below")));
  EXPECT_EQ(answer.directories.at(0).queued, "yes");
  for (const char* name : {"/tmp/photos///", "/tmp//photos", "/tmp/photos/.", "/tmp/./photos/",
                           "/tmp/photos/below/.."}) {
    const StatusText same = ReadStatusText(RunStatus({name}).out);
    EXPECT_THAT(same.Names(), ElementsAre(kTop)) << name;
    EXPECT_EQ(same.totals.queued, "1") << name;
  }
}

TEST_F(DirectoryLines, ALinkKeepsItsOwnName) {
  MakePhoto(In("a.jpg"));
  ASSERT_EQ(symlink(kTop, "/tmp/link"), 0);
  const StatusText answer = ReadStatusText(RunStatus({"/tmp/link/"}).out);
  EXPECT_THAT(answer.Names(), ElementsAre("/tmp/link"));
  EXPECT_EQ(answer.totals.numbers.photos, 1);
}

TEST_F(DirectoryLines, TheRootDirectoryCanBeAskedFor) {
  EXPECT_THAT(ReadStatusText(RunStatus({"/"}).out).Names(), ElementsAre("/"));
}

TEST_F(DirectoryLines, AMissingDirectoryIsAnErrorAndTheRestIsAnswered) {
  MakePhoto(In("a.jpg"));
  const ProgramResult result = RunStatus({"/tmp/none", kTop});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.err, "velathumb-status: /tmp/none: No such file or directory\n");
  const StatusText answer = ReadStatusText(result.out);
  EXPECT_THAT(answer.Names(), ElementsAre(kTop));
  EXPECT_EQ(answer.totals.numbers.photos, 1);
}

TEST_F(DirectoryLines, AFileIsAnError) {
  MakePhoto(In("a.jpg"));
  const ProgramResult result = RunStatus({In("a.jpg")});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.err, "velathumb-status: /tmp/photos/a.jpg: Not a directory\n");
  EXPECT_EQ(ReadStatusText(result.out).totals.name, "in 0 directories");
}

TEST_F(DirectoryLines, AnEmptyNameIsAnError) {
  const ProgramResult result = RunStatus({"", kTop});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_THAT(result.err, EndsWith(": No such file or directory\n"));
  EXPECT_THAT(ReadStatusText(result.out).Names(), ElementsAre(kTop));
}

TEST_F(DirectoryLines, AnUnreadableDirectoryIsAnErrorAndTheRestIsAnswered) {
  MakePhoto("/tmp/closed/a.jpg");
  MakePhoto(In("a.jpg"));
  ASSERT_EQ(chmod("/tmp/closed", 0), 0);
  const ProgramResult result = RunStatusAsOrdinaryUser({"/tmp/closed", kTop});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.err, "velathumb-status: /tmp/closed: cannot be opened\n");
  EXPECT_EQ(ReadStatusText(result.out).totals.numbers, (StatusNumbers{1, 1, 0, 6, 0}));
}

TEST_F(DirectoryLines, ADirectoryWhoseEntriesCannotBeLookedAtIsAnError) {
  MakePhoto("/tmp/closed/a.jpg");
  ASSERT_EQ(chmod("/tmp/closed", 0444), 0);
  const ProgramResult result = RunStatusAsOrdinaryUser({"/tmp/closed"});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.err, "velathumb-status: /tmp/closed: Permission denied\n");
}

TEST_F(DirectoryLines, ALinkToNothingIsNoPhoto) {
  ASSERT_EQ(symlink("/tmp/none.jpg", In("a.jpg").c_str()), 0);
  const ProgramResult result = RunStatus({kTop});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(ReadStatusText(result.out).totals.numbers.photos, 0);
}

}  // namespace
}  // namespace vela_test
