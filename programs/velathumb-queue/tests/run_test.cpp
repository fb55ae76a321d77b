// What velathumb is started for, and in which order.
#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "queue_fixture.h"
#include "support/files.h"
#include "support/profile_file.h"
#include "support/stub_tool.h"

namespace vela_test {
namespace {

using ::testing::AllOf;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Lt;
using ::testing::Not;
using ::testing::SizeIs;

class QueueRunTest : public QueueTest {};

TEST_F(QueueRunTest, WithoutAQueueDoesNothing) {
  const RecordingVelathumb velathumb;
  const ProgramResult result = velathumb.Run();
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.out + result.err, "");
  EXPECT_THAT(velathumb.Entries(), IsEmpty());
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(QueueRunTest, TakesEachEntryOnceInTheOrderOfFirstAppearance) {
  const RecordingVelathumb velathumb;
  Enqueue({"/tmp/c", "/tmp/a", "/tmp/c", "R:/tmp/a", "/tmp/b", "/tmp/a"});
  EXPECT_EQ(velathumb.Run().exitCode, 0);
  EXPECT_THAT(velathumb.Entries(), ElementsAre("/tmp/c", "/tmp/a", "R:/tmp/a", "/tmp/b"));
  ExpectNothingWaits();
}

TEST_F(QueueRunTest, PassesOverLinesThatAreTooLong) {
  const RecordingVelathumb velathumb;
  MakeEntryDirectories({"/tmp/a"});
  WriteFile(kQueueFile, '/' + std::string(4095, 'x') + "\n/tmp/a\n");
  EXPECT_EQ(velathumb.Run().exitCode, 0);
  EXPECT_THAT(velathumb.Entries(), ElementsAre("/tmp/a"));
}

TEST_F(QueueRunTest, HandsNamesOverByteForByte) {
  const RecordingVelathumb velathumb;
  const std::vector<std::string> entries = {
      "/tmp/a b ",         "/tmp/100% %s %n", "/tmp/\"x\" 'y' `z` $HOME",
      "/tmp/\xff\xfe\x80", "/tmp/-x/--all",   "/tmp/c:d",
      "R:/tmp/ e\t",       "/tmp/\\n\r",      "/tmp/*?[a]"};
  Enqueue(entries);
  EXPECT_EQ(velathumb.Run().exitCode, 0);
  EXPECT_THAT(velathumb.Entries(), ElementsAreArray(entries));
}

TEST_F(QueueRunTest, VelathumbStartsWithNothingOfTheRunners) {
  RecordingVelathumb velathumb;
  Enqueue({"/tmp/a"});
  EXPECT_EQ(velathumb.Run().exitCode, 0);
  const std::vector<StubCall> calls = velathumb.Stub().Calls();
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
  EXPECT_EQ(RunRunner().exitCode, 0);
  for (const std::string& photo : wanted) {
    EXPECT_TRUE(HasThumb(photo)) << photo;
  }
  EXPECT_FALSE(HasThumb(other));
  ExpectNothingWaits();
}

TEST_F(QueueRunTest, WhatIsQueuedMeanwhileIsDoneInTheSameRun) {
  RecordingVelathumb velathumb;
  velathumb.Stub().PlanCall(1, StubPlan().WaitForFile("/tmp/go"));
  Enqueue({"/tmp/a", "/tmp/b"});
  Program runner = velathumb.Start();
  ASSERT_TRUE(velathumb.WaitForStarts(1));
  Enqueue({"/tmp/c", "/tmp/a"});
  WriteFile("/tmp/go", "");
  const auto result = runner.Wait();
  ASSERT_TRUE(result);
  EXPECT_EQ(result->exitCode, 0);
  EXPECT_THAT(velathumb.Entries(), ElementsAre("/tmp/a", "/tmp/b", "/tmp/c", "/tmp/a"));
  ExpectNothingWaits();
}

TEST_F(QueueRunTest, AllPhasesAreMadeInOneRun) {
  const StubTool converter(kConverterPath);
  WriteProfileFile(kProfiles, UsualProfiles());
  WriteFile("/etc/velainfo.conf", "");
  const std::string photo = MakePhoto("/tmp/p/a.jpg");
  Enqueue({"/tmp/p"});
  EXPECT_EQ(RunRunner().exitCode, 0);
  EXPECT_THAT(ListDirectory("/tmp/p/@eaDir/a.jpg"),
              ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg", "VELAPHOTO_THUMB_S.jpg",
                          "VELAPHOTO_THUMB_XL.jpg"));
  ExpectNothingWaits();
}

TEST_F(QueueRunTest, NewEntriesDoNotPassForOnesThatComeBack) {
  RecordingVelathumb velathumb;
  std::vector<std::string> entries;
  for (int i = 0; i < 30; ++i) {
    entries.push_back("/tmp/" + std::to_string(i));
    const std::string next = "/tmp/" + std::to_string(i + 1) + '\n';
    velathumb.Stub().PlanWhen(entries.back(), StubPlan().WriteFile(kQueueFile, next));
  }
  entries.push_back("/tmp/30");
  MakeEntryDirectories(entries);
  Enqueue({"/tmp/0"});
  const ProgramResult result = velathumb.Run();
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_THAT(velathumb.Entries(), ElementsAreArray(entries));
  EXPECT_THAT(result.err, Not(HasSubstr("again and again")));
  ExpectNothingWaits();
}

TEST_F(QueueRunTest, EntriesThatComeBackWithoutEndAreKeptForALaterRun) {
  RecordingVelathumb velathumb;
  velathumb.Stub().Plan(StubPlan().WriteFile(kQueueFile, "/tmp/a\n"));
  Enqueue({"/tmp/a"});
  const ProgramResult result = velathumb.Run();
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err, HasSubstr("again and again"));
  EXPECT_THAT(velathumb.Entries(), AllOf(SizeIs(Lt(30)), Each("/tmp/a")));
  EXPECT_EQ(ReadFile(kLaterFile), "/tmp/a\n");
  EXPECT_FALSE(Exists(kQueueFile));
  EXPECT_FALSE(Exists(kTakenFile));
  velathumb.Stub().Plan(StubPlan());
  EXPECT_EQ(velathumb.Run().exitCode, 0);
  ExpectNothingWaits();
}

}  // namespace
}  // namespace vela_test
