// Faults on the volume of the queue while the queue is processed. Whatever happens, the next
// undisturbed runner completes everything that was requested.
#include <cerrno>
#include <optional>

#include "hostile/fault_trials.h"
#include "platform/velaindex.h"
#include "support/mounts.h"
#include "support/named_case.h"

namespace vela_test::hostile {

namespace {

struct Row : NamedCase {
  FaultRange range;
};

const Row kRows[] = {
    {{"ErrorsOfTheRunner"}, {CallScope::kProgram, FaultKind::kErrors, 12}},
    {{"ErrorsOfVelathumb"}, {CallScope::kTools, FaultKind::kErrors, 8}},
    {{"KillsOfTheRunner"}, {CallScope::kProgram, FaultKind::kKills, 12}},
    {{"KillsOfVelathumb"}, {CallScope::kTools, FaultKind::kKills, 5}},
    {{"FullAtACallOfTheRunner"}, {CallScope::kProgram, FaultKind::kIncidents, 8}},
    {{"FullAtACallOfVelathumb"}, {CallScope::kTools, FaultKind::kIncidents, 6}},
};

}  // namespace

class QueueFaults : public FaultTrials, public ::testing::WithParamInterface<Row> {
 protected:
  static constexpr const char* kSpool = "/var/spool";
  static constexpr uint64_t kRoom = 16U << 20U;

  void SetUp() override {
    HostileTest::SetUp();
    spool_.emplace(kSpool, kRoom);
    for (const char* directory : {"a", "b"}) {
      MakeDirectories(InPhotos(directory));
      photos_.push_back(MakeJpeg(InPhotos(directory) + "/photo.jpg"));
    }
  }

  std::string Path() const override { return BuiltPath(VELATHUMB_QUEUE_FILE); }
  Strings Arguments() const override {
    return {"--velathumb", VelathumbPath(), "--profile", kProfiles};
  }

  void Begin() override {
    ClearLog();
    spool_->SetAvailable(kRoom);
    for (const std::string& name : ListDirectory(kSpool)) {
      RemoveTree(std::string(kSpool) + "/" + name);
    }
    for (const char* directory : {"a", "b"}) {
      RemoveTree(InPhotos(directory) + "/@eaDir");
      EXPECT_EQ(WriteIndexQueue(InPhotos(directory).c_str(), kQueue), 0);
    }
  }

  /// The faults of a volume that is full or damaged.
  bool IsOfInterest(const MadeCall& made, int error) const override {
    const bool isOnSpool = made.object.compare(0, 10, "/var/spool") == 0;
    return isOnSpool && (error == 0 || error == ENOSPC || error == EIO || error == EDQUOT ||
                         error == kShortTransfer);
  }

  void Incident() override { spool_->SetAvailable(0); }

  void Check(const CallFault& /*fault*/) override {
    spool_->SetAvailable(kRoom);
    ProgramOptions options;
    options.timeLimit = std::chrono::seconds(60);
    const ProgramResult next = RunProgram(Path(), Arguments(), options);
    EXPECT_FALSE(next.timedOut);
    EXPECT_EQ(next.exitCode, 0) << next.err;
    for (const std::string& photo : photos_) {
      EXPECT_TRUE(HasThumbs(photo, kinds_)) << ::testing::PrintToString(ErrorLines());
    }
    EXPECT_LE(FileSize(kQueue), 0) << "entries are left";
  }

 private:
  std::optional<SmallVolume> spool_;
  Strings photos_;
};

TEST_P(QueueFaults, LoseNoRequest) {
  TryFaults(GetParam().range);
}

INSTANTIATE_TEST_SUITE_P(All, QueueFaults, ::testing::ValuesIn(kRows), CaseName());

}  // namespace vela_test::hostile
