// The progress counters while several processes add and others read at the same time.
#include <pthread.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <fstream>
#include <functional>
#include <new>
#include <sstream>

#include "progress/velamk_progress.h"
#include "support/files.h"
#include "support/quiet_test.h"

namespace vela_test {
namespace {

using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::Ge;
using ::testing::Le;

constexpr const char* kPhotoFile = "/var/spool/conv_progress_photo";
constexpr int kAdders = 4;
constexpr int kAdds = 200;
constexpr int kReaders = 2;

/// State that the processes of a test share.
class SharedState {
 public:
  SharedState()
      : block_(new (mmap(nullptr, sizeof(Block), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS,
                         -1, 0)) Block) {
    pthread_barrierattr_t attributes;
    pthread_barrierattr_init(&attributes);
    pthread_barrierattr_setpshared(&attributes, PTHREAD_PROCESS_SHARED);
    pthread_barrier_init(&block_->barrier, &attributes, kAdders);
    pthread_barrierattr_destroy(&attributes);
  }
  ~SharedState() { munmap(block_, sizeof(Block)); }
  SharedState(const SharedState&) = delete;
  SharedState& operator=(const SharedState&) = delete;

  /// Synchronises the adders: no add begins before all earlier ones have ended.
  void WaitForAdders() { pthread_barrier_wait(&block_->barrier); }

  std::atomic<bool>& IsOver() { return block_->isOver; }
  std::atomic<int>& Readings() { return block_->readings; }

 private:
  struct Block {
    pthread_barrier_t barrier;
    std::atomic<bool> isOver{false};
    std::atomic<int> readings{0};
  };
  Block* block_;
};

pid_t Start(const std::function<bool()>& work) {
  const pid_t pid = fork();
  if (pid == 0) {
    _exit(work() ? 0 : 1);
  }
  return pid;
}

bool Join(pid_t pid) {
  int status = -1;
  waitpid(pid, &status, 0);
  return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

/// A whole number as the counters write it, from 0 to `most`.
bool IsCount(const std::string& text, int most) {
  const bool isNumber =
      !text.empty() && text.size() < 9 && text.find_first_not_of("0123456789") == std::string::npos;
  return isNumber && (text.size() == 1 || text[0] != '0') && std::stoi(text) <= most;
}

/// The content of the file as one read.
std::string RawFile() {
  std::ostringstream content;
  content << std::ifstream(kPhotoFile, std::ios::binary).rdbuf();
  return content.str();
}

/// The lines of the file at the start of a test: other lines around one counter for all adders and
/// one for each.
const std::vector<std::string>& CounterKeys() {
  static const std::vector<std::string> keys = {"completed", "own0", "own1", "own2", "own3"};
  return keys;
}
constexpr const char* kBefore = "# set by the index\ntotal=\"900\"\n";
constexpr const char* kLinesAfter = "total_thumb = 5400\nlast=\"here\"\n";

std::string StartContent() {
  std::string content = kBefore;
  for (const std::string& key : CounterKeys()) {
    content += key + "=\"0\"\n";
  }
  return content + kLinesAfter;
}

/// Whether the content is that of the start with other counts.
bool IsWhole(const std::string& content) {
  std::istringstream lines(content);
  std::ostringstream expected;
  expected << kBefore;
  std::string line;
  std::getline(lines, line);
  std::getline(lines, line);
  for (const std::string& key : CounterKeys()) {
    const std::string begin = key + "=\"";
    if (!std::getline(lines, line) || line.compare(0, begin.size(), begin) != 0 ||
        line.back() != '"' ||
        !IsCount(line.substr(begin.size(), line.size() - begin.size() - 1), kAdders * kAdds)) {
      return false;
    }
    expected << line << "\n";
  }
  expected << kLinesAfter;
  return content == expected.str();
}

class ConcurrentAdds : public QuietTest {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
    WriteFile(kPhotoFile, StartContent());
  }

  /// Runs the adders, each of which calls `add` with its number, and at the same time two readers,
  /// each of which calls `isGood` until the adders have ended.
  void Run(const std::function<void(int)>& add, const std::function<bool()>& isGood) {
    std::vector<pid_t> adders;
    adders.reserve(kAdders);
    std::vector<pid_t> readers;
    readers.reserve(kReaders);
    for (int reader = 0; reader < kReaders; ++reader) {
      readers.push_back(Start([this, &isGood] { return ReadUntilOver(isGood); }));
    }
    while (shared_.Readings() == 0) {
      usleep(1000);
    }
    const int earlyReadings = shared_.Readings();
    for (int adder = 0; adder < kAdders; ++adder) {
      adders.push_back(Start([this, &add, adder] {
        for (int i = 0; i < kAdds; ++i) {
          shared_.WaitForAdders();
          add(adder);
        }
        return true;
      }));
    }
    for (const pid_t pid : adders) {
      EXPECT_TRUE(Join(pid));
    }
    shared_.IsOver() = true;
    for (const pid_t pid : readers) {
      EXPECT_TRUE(Join(pid)) << "a reader saw a part of the file";
    }
    EXPECT_GT(shared_.Readings(), earlyReadings) << "there was no reader during the adds";
  }

 private:
  bool ReadUntilOver(const std::function<bool()>& isGood) {
    bool areAllGood = true;
    while (!shared_.IsOver()) {
      areAllGood = isGood() && areAllGood;
      ++shared_.Readings();
    }
    return areAllGood;
  }

  SharedState shared_;
};

void ExpectNothingElseInTheSpool() {
  EXPECT_TRUE(IsWhole(ReadFile(kPhotoFile))) << ReadFile(kPhotoFile);
  EXPECT_THAT(ListDirectory("/var/spool"), ElementsAre("conv_progress_photo"));
}

TEST_F(ConcurrentAdds, ToOneKeyLoseOnlyAddsOfTheSameMoment) {
  Run([](int) { AddConvProgress(1, "completed", 1); }, [] { return IsWhole(RawFile()); });
  // At least one of the adds made at the same moment is kept.
  EXPECT_THAT(GetConvProgress(1, "completed"), AllOf(Ge(kAdds), Le(kAdders * kAdds)));
  ExpectNothingElseInTheSpool();
}

TEST_F(ConcurrentAdds, ToKeysOfTheirOwnLoseNothing) {
  Run([](int adder) { AddConvProgress(1, ("own" + std::to_string(adder)).c_str(), 1); },
      [] { return IsWhole(RawFile()); });
  for (int adder = 0; adder < kAdders; ++adder) {
    EXPECT_EQ(GetConvProgress(1, ("own" + std::to_string(adder)).c_str()), kAdds);
  }
  EXPECT_EQ(GetConvProgress(1, "completed"), 0);
  ExpectNothingElseInTheSpool();
}

TEST_F(ConcurrentAdds, LetReadersFindEveryKey) {
  Run([](int) { AddConvProgress(1, "completed", 1); },
      [] {
        const int completed = GetConvProgress(1, "completed");
        return completed >= 0 && completed <= kAdders * kAdds &&
               GetConvProgress(1, "total") == 900 && GetConvProgress(1, "total_thumb") == 5400;
      });
  ExpectNothingElseInTheSpool();
}

TEST(WholeProgressFile, DiffersFromEveryPartOfIt) {
  const std::string whole = StartContent();
  EXPECT_TRUE(IsWhole(whole));
  for (size_t length = 0; length < whole.size(); ++length) {
    EXPECT_FALSE(IsWhole(whole.substr(0, length))) << length;
  }
  for (const char* count : {"", "x", "1x", "-1", "01", "801", "999999999999"}) {
    std::string content = whole;
    content.replace(content.find("own1=\"0\""), 8, std::string("own1=\"") + count + "\"");
    EXPECT_FALSE(IsWhole(content)) << count;
  }
}

}  // namespace
}  // namespace vela_test
