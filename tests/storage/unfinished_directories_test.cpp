// The notes about directories that velathumb has left unfinished.
#include "storage/unfinished_directories.h"

#include <gmock/gmock.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <set>
#include <string>
#include <vector>

#include "support/files.h"
#include "support/sandbox.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;

constexpr const char* kTarget = "/run/target";
constexpr const char* kNotes = "/run/velathumb.unfinished";

/// Takes all notes; each as its reason and its path.
std::vector<std::string> TakeAll() {
  std::vector<std::string> notes;
  for (const auto& note : TakeUnfinishedDirectories([](const auto&) { return true; })) {
    notes.push_back(static_cast<char>(note.reason) + note.path);
  }
  return notes;
}

using UnfinishedDirectoriesTest = SandboxTest;

TEST_F(UnfinishedDirectoriesTest, WithoutARunnerNothingIsNotedOrTaken) {
  NoteUnfinishedDirectory("/a", UnfinishedReason::kLocked);
  EXPECT_THAT(TakeAll(), IsEmpty());
  EXPECT_FALSE(Exists(kNotes));
}

TEST_F(UnfinishedDirectoriesTest, NotesOutliveTheRunner) {
  ExpectUnfinishedDirectories();
  NoteUnfinishedDirectory("/a", UnfinishedReason::kLocked);
  ExpectUnfinishedDirectories();
  EXPECT_THAT(TakeAll(), ElementsAre("L/a"));
}

TEST_F(UnfinishedDirectoriesTest, EachIsTakenOnce) {
  ExpectUnfinishedDirectories();
  NoteUnfinishedDirectory("/b", UnfinishedReason::kLocked);
  NoteUnfinishedDirectory("/a\nb \xff", UnfinishedReason::kNotQueued);
  EXPECT_THAT(TakeAll(), ElementsAre("L/b", "Q/a\nb \xff"));
  EXPECT_THAT(TakeAll(), IsEmpty());
  NoteUnfinishedDirectory("/c", UnfinishedReason::kLocked);
  EXPECT_THAT(TakeAll(), ElementsAre("L/c"));
}

TEST_F(UnfinishedDirectoriesTest, OnlyThoseThatAreWantedAreTaken) {
  ExpectUnfinishedDirectories();
  for (const char* path : {"/a", "/b", "/c"}) {
    NoteUnfinishedDirectory(path, UnfinishedReason::kLocked);
  }
  EXPECT_THAT(TakeUnfinishedDirectories([](const auto& note) { return note.path == "/b"; }),
              SizeIs(1));
  EXPECT_THAT(TakeAll(), ElementsAre("L/a", "L/c"));
}

TEST_F(UnfinishedDirectoriesTest, NobodyElseCanOpenTheirFile) {
  umask(0);
  ExpectUnfinishedDirectories();
  EXPECT_EQ(ModeOf(kNotes), 0600);
}

TEST_F(UnfinishedDirectoriesTest, ARepeatedNoteAddsNothing) {
  ExpectUnfinishedDirectories();
  for (int i = 0; i < 100; ++i) {
    NoteUnfinishedDirectory("/a", UnfinishedReason::kLocked);
  }
  EXPECT_EQ(FileSize(kNotes), 4);
}

TEST_F(UnfinishedDirectoriesTest, TheirSizeIsLimitedAndThatIsNoted) {
  ExpectUnfinishedDirectories();
  const std::string directory = '/' + std::string(4000, 'x');
  for (int i = 0; i < 300; ++i) {
    NoteUnfinishedDirectory(directory + std::to_string(i), UnfinishedReason::kLocked);
  }
  EXPECT_LE(FileSize(kNotes), (1 << 20) + 2);
  const std::vector<std::string> notes = TakeAll();
  EXPECT_EQ(notes.size(), 262U);
  EXPECT_EQ(notes.back(), "?");
}

TEST_F(UnfinishedDirectoriesTest, ANoteThatWasCutOffIsIgnored) {
  WriteFile(kNotes, std::string("L/a\0L/cut", 9));
  ASSERT_EQ(chmod(kNotes, 0600), 0);
  EXPECT_THAT(TakeAll(), ElementsAre("L/a"));
}

TEST_F(UnfinishedDirectoriesTest, AFileThatOthersMayHaveMadeIsNotUsed) {
  const std::string note("L/a\0", 4);
  WriteFile(kTarget, note);
  ASSERT_EQ(chmod(kTarget, 0600), 0);
  const struct {
    const char* name;
    int (*make)();
  } cases[] = {
      {"symbolic link", [] { return symlink(kTarget, kNotes); }},
      {"second name", [] { return link(kTarget, kNotes); }},
      {"pipe", [] { return mkfifo(kNotes, 0600); }},
      {"directory", [] { return mkdir(kNotes, 0700); }},
  };
  for (const auto& [name, make] : cases) {
    SCOPED_TRACE(name);
    ASSERT_EQ(make(), 0);
    NoteUnfinishedDirectory("/b", UnfinishedReason::kLocked);
    EXPECT_THAT(TakeAll(), IsEmpty());
    EXPECT_EQ(ReadFile(kTarget), note);
    RemoveTree(kNotes);
  }
}

TEST_F(UnfinishedDirectoriesTest, AFileThatOthersCanOpenIsNotUsed) {
  WriteFile(kNotes, std::string("L/a\0", 4));
  ASSERT_EQ(chmod(kNotes, 0644), 0);
  EXPECT_THAT(TakeAll(), IsEmpty());
  NoteUnfinishedDirectory("/b", UnfinishedReason::kLocked);
  EXPECT_EQ(FileSize(kNotes), 4);
}

TEST_F(UnfinishedDirectoriesTest, ManyProcessesLoseNoNote) {
  ExpectUnfinishedDirectories();
  constexpr int kProcesses = 8;
  constexpr int kEach = 50;
  for (int i = 0; i < kProcesses; ++i) {
    if (fork() == 0) {
      for (int j = 0; j < kEach; ++j) {
        const std::string path = '/' + std::to_string(i) + '/' + std::to_string(j);
        NoteUnfinishedDirectory(path, UnfinishedReason::kLocked);
      }
      _exit(0);
    }
  }
  std::set<std::string> notes;
  for (int ended = 0; ended < kProcesses;) {
    ended += waitpid(-1, nullptr, WNOHANG) > 0 ? 1 : 0;
    for (std::string& note : TakeAll()) {
      notes.insert(std::move(note));
    }
  }
  EXPECT_EQ(notes.size(), static_cast<size_t>(kProcesses * kEach));
}

}  // namespace
}  // namespace vela_test
