// The entries velathumb is started for, and their order.
#include <algorithm>

#include "queue_fixture.h"
#include "support/profile_file.h"

namespace vela_test {
namespace {

using namespace ::testing;

using QueueRunTest = QueueTest;

TEST_F(QueueRunTest, WithoutAQueueDoesNothing) {
  const ProgramResult result = velathumb_.Run();
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.out + result.err, "");
  EXPECT_THAT(velathumb_.Entries(), IsEmpty());
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(QueueRunTest, EndsOnlyWhenANewEmptyQueueIsFilledOrGone) {
  WriteFile(kQueueFile, "");
  SetFileTimeFromNow(kQueueFile, -8);
  ExpectRun({});
}

TEST_F(QueueRunTest, TakesEachEntryOnceInTheOrderOfFirstAppearance) {
  Enqueue({"/tmp/c", "/tmp/a", "/tmp/c", "R:/tmp/a", "/tmp/b", "/tmp/a"});
  ExpectRun({"/tmp/c", "/tmp/a", "R:/tmp/a", "/tmp/b"});
}

TEST_F(QueueRunTest, SkipsLinesThatAreTooLong) {
  MakeEntryDirectories({"/tmp/a"});
  WriteFile(kQueueFile, '/' + std::string(4095, 'x') + "\n/tmp/a\n");
  ExpectRun({"/tmp/a"});
}

TEST_F(QueueRunTest, PassesNamesByteForByte) {
  const std::vector<std::string> entries = {
      "/tmp/a b ",         "/tmp/100% %s %n", "/tmp/\"x\" 'y' `z` $HOME",
      "/tmp/\xff\xfe\x80", "/tmp/-x/--all",   "/tmp/c:d",
      "R:/tmp/ e\t",       "/tmp/\\n\r",      "/tmp/*?[a]"};
  Enqueue(entries);
  ExpectRun(entries);
}

TEST_F(QueueRunTest, VelathumbInheritsNothingFromTheRunner) {
  Enqueue({"/tmp/a"});
  EXPECT_EQ(velathumb_.Run().exitCode, 0);
  const std::vector<StubCall> calls = velathumb_.Stub().Calls();
  ASSERT_THAT(calls, SizeIs(1));
  EXPECT_THAT(calls[0].blockedSignals, IsEmpty());
  EXPECT_THAT(calls[0].ignoredSignals, IsEmpty());
  for (const OpenDescriptor& descriptor : calls[0].descriptors) {
    EXPECT_LE(descriptor.number, 2) << descriptor.target;
  }
}

TEST_F(QueueRunTest, MakesTheThumbnailsOfDirectoriesAndTrees) {
  const StubTool converter(kConverterPath);
  const std::vector<std::string> wanted = {
      MakePhoto("/tmp/p/one/a.jpg"), MakePhoto("/tmp/p/tree/b.jpg"),
      MakePhoto("/tmp/p/tree/d/e/c.jpg"), MakePhoto("/tmp/p/\xff%s: \"'/d.jpg")};
  const std::string other = MakePhoto("/tmp/p/one/below/e.jpg");
  Enqueue({"/tmp/p/one", "R:/tmp/p/tree", "/tmp/p/\xff%s: \"'"});
  ConvertQueue();
  for (const std::string& photo : wanted) {
    EXPECT_TRUE(HasThumb(photo)) << photo;
  }
  EXPECT_FALSE(HasThumb(other));
}

TEST_F(QueueRunTest, EntriesQueuedMeanwhileAreProcessedInTheSameRun) {
  Program runner = StartAndHold({"/tmp/a", "/tmp/b"});
  Enqueue({"/tmp/c", "/tmp/a"});
  Release();
  ExpectEnd(runner, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/b", "/tmp/c", "/tmp/a"));
  ExpectQueueDone();
}

TEST_F(QueueRunTest, AllPhasesAreMadeInOneRun) {
  const StubTool converter(kConverterPath);
  WriteProfileFile(kProfiles, UsualProfiles());
  WriteFile("/etc/velainfo.conf", "");
  MakePhoto("/tmp/p/a.jpg");
  Enqueue({"/tmp/p"});
  ConvertQueue();
  EXPECT_THAT(ListDirectory("/tmp/p/@eaDir/a.jpg"),
              ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg", "VELAPHOTO_THUMB_S.jpg",
                          "VELAPHOTO_THUMB_XL.jpg"));
}

TEST_F(QueueRunTest, NewEntriesAreNotMistakenForRepeatedOnes) {
  std::vector<std::string> entries;
  for (int i = 0; i < 30; ++i) {
    entries.push_back("/tmp/" + std::to_string(i));
    const std::string next = "/tmp/" + std::to_string(i + 1) + '\n';
    velathumb_.Stub().PlanWhen(entries.back(), StubPlan().WriteFile(kQueueFile, next));
  }
  entries.push_back("/tmp/30");
  MakeEntryDirectories(entries);
  Enqueue({"/tmp/0"});
  EXPECT_THAT(ExpectRun(entries), Not(HasSubstr("again and again")));
}

TEST_F(QueueRunTest, EntriesThatAreQueuedAgainAndAgainAreDeferred) {
  velathumb_.Stub().Plan(StubPlan().WriteFile(kQueueFile, "/tmp/a\n"));
  Enqueue({"/tmp/a"});
  const ProgramResult result = velathumb_.Run();
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err, HasSubstr("again and again"));
  EXPECT_THAT(velathumb_.Entries(), AllOf(SizeIs(Lt(30)), Each("/tmp/a")));
  EXPECT_EQ(ReadFile(kLaterFile), "/tmp/a\n");
  EXPECT_FALSE(Exists(kQueueFile));
  EXPECT_FALSE(Exists(kTakenFile));
  velathumb_.Stub().Plan(StubPlan());
  EXPECT_EQ(velathumb_.Run().exitCode, 0);
  ExpectQueueDone();
}

TEST_F(QueueRunTest, AnEntryThatIsQueuedAgainAndAgainDefersNoOther) {
  velathumb_.Stub().PlanWhen("/tmp/a", StubPlan().WriteFile(kQueueFile, "/tmp/a\n"));
  // The other one comes when the first one would be deferred the next time.
  velathumb_.Stub().PlanCall(18, StubPlan().WriteFile(kQueueFile, "/tmp/a\n/tmp/b\n"));
  Enqueue({"/tmp/a", "/tmp/b"});
  EXPECT_EQ(velathumb_.Run().exitCode, 1);
  const std::vector<std::string> entries = velathumb_.Entries();
  EXPECT_EQ(std::count(entries.begin(), entries.end(), "/tmp/b"), 2);
  EXPECT_EQ(ReadFile(kLaterFile), "/tmp/a\n");
}

}  // namespace
}  // namespace vela_test
