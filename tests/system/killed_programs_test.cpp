// The whole system, with each of its programs killed repeatedly.
#include <gmock/gmock.h>

#include <algorithm>
#include <chrono>
#include <iostream>
#include <memory>
#include <random>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "index_database.h"
#include "ipc/velamk_ipc.h"
#include "machine.h"
#include "photo_library.h"
#include "platform/velaindex.h"
#include "progress/velamk_progress.h"
#include "storage/velamk_thumb_status.h"
#include "support/files.h"
#include "support/sandbox.h"

namespace vela_test {
namespace {

using std::chrono::milliseconds;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr int kPhotos = 300;
constexpr int kLonePhotos = 30;  // of these, in a directory that is requested once
constexpr int kLatePhotos = 10;  // of these, added after the last kill
constexpr int kKills = 100;
constexpr unsigned kSeed = 20261121;
constexpr const char* kPhotoQueueFile = "/var/spool/thumb_create.queue";
constexpr const char* kVideoQueueFile = "/var/spool/flv_create.queue";

enum class Victim { kDaemon, kRunner, kVelathumb };

/// The same in every run, unless set by --gtest_random_seed=N.
unsigned Seed() {
  return kSeed + static_cast<unsigned>(GTEST_FLAG_GET(random_seed));
}

/// The order of the kills: each program about as often, the runner last.
std::vector<Victim> MakePlan(std::mt19937* random) {
  std::vector<Victim> plan;
  for (int i = 0; i < kKills - 1; ++i) {
    plan.push_back(static_cast<Victim>(i % 3));
  }
  std::shuffle(plan.begin(), plan.end(), *random);
  plan.push_back(Victim::kRunner);
  return plan;
}

void Enqueue(const std::vector<std::string>& entries, const char* queue = kPhotoQueueFile) {
  for (const std::string& entry : entries) {
    EXPECT_EQ(WriteIndexQueue(entry.c_str(), queue), 0);
  }
}

int Photo(const char* key) {
  return GetConvProgress(THUMB_TYPE_PHOTO, key);
}

std::set<std::string> PostedPhotos() {
  const std::vector<std::string> rows =
      QueryIndexDatabase("SELECT path FROM posted WHERE kind = 1");
  return {rows.begin(), rows.end()};
}

class KilledProgramsTest : public SandboxTest {
 protected:
  KilledProgramsTest() {
    ResetSandbox();
    library_ = std::make_unique<PhotoLibrary>(kPhotos - kLonePhotos - kLatePhotos);
    library_->AddLoneDirectory(kLonePhotos);
    machine_ = std::make_unique<Machine>();
  }
  void SetUp() override {}

  void KillAgainAndAgain();
  void Kill(Victim victim);
  void KillVelathumb();
  void TopUp();
  void ExpectThumbsOrMarkers() const;
  void ExpectNothingMissing() const;
  void ExpectPosted() const;
  int MissingThumbs(int* photos) const;
  void ExpectAllDone() const;

  std::unique_ptr<PhotoLibrary> library_;
  std::unique_ptr<Machine> machine_;
  std::mt19937 random_{Seed()};
  int topUps_ = 0;
};

/// Makes sure that there is work left to interrupt.
void KilledProgramsTest::TopUp() {
  if (Machine::HasQueue()) {
    return;
  }
  ++topUps_;
  library_->Touch(3);
  Enqueue(library_->Entries());
}

void KilledProgramsTest::KillVelathumb() {
  const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(20);
  while (!Machine::KillVelathumb()) {
    ASSERT_LT(std::chrono::steady_clock::now(), end) << "no velathumb is started any more";
    TopUp();
    std::this_thread::sleep_for(milliseconds(2));
  }
}

void KilledProgramsTest::Kill(Victim victim) {
  switch (victim) {
    case Victim::kDaemon:
      machine_->KillAndRestartDaemon();
      break;
    case Victim::kRunner:
      machine_->KillRunner();
      machine_->StartFollowingRunner();
      break;
    case Victim::kVelathumb:
      KillVelathumb();
      break;
  }
}

void KilledProgramsTest::KillAgainAndAgain() {
  std::uniform_int_distribution<int> pause(1, 400);
  for (const Victim victim : MakePlan(&random_)) {
    TopUp();
    std::this_thread::sleep_for(milliseconds(pause(random_)));
    ASSERT_NO_FATAL_FAILURE(Kill(victim));
  }
}

void KilledProgramsTest::ExpectThumbsOrMarkers() const {
  for (const std::string& photo : library_->Photos()) {
    const PhotoState state = StateOf(photo);
    EXPECT_EQ(state.thumbs + state.markers, kThumbsOfAPhoto) << photo;
  }
}

/// The status of each photo that can be read, which also means that no thumbnail is older than it.
void KilledProgramsTest::ExpectNothingMissing() const {
  constexpr int32_t kAskForClasses = -1;
  for (const std::string& photo : library_->Photos()) {
    if (photo == library_->Damaged()) {
      continue;
    }
    int missing = -1;
    int present = -1;
    GetThumbStatus(photo.c_str(), &missing, &present, kAskForClasses);
    EXPECT_EQ(missing, 0) << photo;
    EXPECT_EQ(present, kThumbsOfAPhoto) << photo;
  }
}

/// A photo that was processed only once may have been posted to a dead daemon.
void KilledProgramsTest::ExpectPosted() const {
  const std::set<std::string> posted = PostedPhotos();
  for (const std::string& photo : library_->Photos()) {
    EXPECT_TRUE(posted.count(photo) != 0 || library_->IsLone(photo)) << photo;
  }
  for (const std::string& photo : posted) {
    EXPECT_EQ(library_->Photos().count(photo), 1U) << photo;
  }
}

/// The number of missing thumbnails, and in `photos` the number of their photos.
int KilledProgramsTest::MissingThumbs(int* photos) const {
  int missing = 0;
  *photos = 0;
  for (const std::string& photo : library_->Photos()) {
    const int thumbs = StateOf(photo).thumbs;
    missing += kThumbsOfAPhoto - thumbs;
    *photos += thumbs < kThumbsOfAPhoto ? 1 : 0;
  }
  return missing;
}

void KilledProgramsTest::ExpectAllDone() const {
  for (const std::string& photo : library_->Photos()) {
    const PhotoState state = StateOf(photo);
    const bool isDamaged = photo == library_->Damaged();
    EXPECT_EQ(state.thumbs, isDamaged ? 0 : kThumbsOfAPhoto) << photo;
    EXPECT_EQ(state.markers, isDamaged ? kThumbsOfAPhoto : 0) << photo;
    // A killed program leaves the file it was writing; an undisturbed one leaves nothing.
    if (photo.find("/late/") != std::string::npos) {
      EXPECT_THAT(state.others, IsEmpty()) << photo;
    }
  }
}

TEST_F(KilledProgramsTest, EverythingIsDoneAndNothingIsLost) {
  std::cout << "seed " << Seed() << std::endl;
  const auto began = std::chrono::steady_clock::now();
  const auto log = [&](const char* what) {
    const auto passed = std::chrono::steady_clock::now() - began;
    std::cout << std::chrono::duration_cast<milliseconds>(passed).count() << " ms: " << what
              << std::endl;
  };
  machine_->StartDaemon();
  // The only request for this directory in this test, whatever is killed.
  Enqueue({library_->LoneEntry()});
  Enqueue(library_->Entries());
  machine_->StartFollowingRunner();
  KillAgainAndAgain();
  if (HasFatalFailure()) {
    return;
  }
  log("killed a hundred times");

  // A runner processes what the killed programs have left, one velathumb at a time: two that add to
  // a counter at once can lose an addition.
  machine_->KillRunner();
  ASSERT_EQ(Machine::RunRunner().exitCode, 0);
  log("queue processed");
  EXPECT_FALSE(Machine::HasQueue());
  ExpectThumbsOrMarkers();
  ExpectNothingMissing();
  // However wrong the kills have made the counters: with each take of the queue the total becomes
  // the completed work plus that outstanding on disk, and after the last take each outstanding
  // photo, even one that got phases 0 and 1 before and added nothing then, has added 1.
  EXPECT_EQ(Photo("completed"), Photo("total"));
  // A velathumb killed while it put the thumbnails of a phase in place leaves some of them; the
  // next one counts the whole phase. At most three in a phase, and two velathumbs at once.
  EXPECT_GE(Photo("completed_thumb"), Photo("total_thumb"));
  EXPECT_LE(Photo("completed_thumb"), Photo("total_thumb") + 2 * 2);

  // Once more, undisturbed, so that what was posted to a dead daemon is posted; with new photos, so
  // that there is something to count.
  library_->AddDirectory(kLatePhotos);
  ASSERT_EQ(library_->Photos().size(), static_cast<size_t>(kPhotos));
  int incomplete = 0;
  const int missing = MissingThumbs(&incomplete);
  Enqueue(library_->Entries());
  Enqueue(library_->Videos(), kVideoQueueFile);
  const ProgramResult last = Machine::RunRunner({"--check-videos"});
  EXPECT_EQ(last.exitCode, 0) << last.err;
  log("undisturbed run");
  EXPECT_FALSE(Machine::HasQueue());
  ExpectAllDone();
  // The damaged photo is alone in its directory, so that this does not occur again.
  EXPECT_EQ(Photo("completed"), incomplete);
  EXPECT_EQ(Photo("total"), incomplete);
  EXPECT_EQ(Photo("completed_thumb"), missing);
  EXPECT_EQ(Photo("total_thumb"), missing);
  EXPECT_EQ(GetConvProgress(THUMB_TYPE_VIDEO, "total"), 2);
  for (const std::string& name : ListDirectory("/run")) {
    EXPECT_EQ(name.find(".pid"), std::string::npos) << name;
  }

  VELA_MEDIA_INFO video = {};
  EXPECT_EQ(GetMediaFromPluginDB(THUMB_TYPE_VIDEO, library_->Videos().front().c_str(), video), 0);
  EXPECT_EQ(video.width, 64);
  EXPECT_EQ(video.height, 48);
  const auto daemon = machine_->StopDaemon();
  ASSERT_TRUE(daemon);
  EXPECT_EQ(daemon->exitCode, 0) << daemon->err;
  ExpectPosted();
  EXPECT_THAT(QueryIndexDatabase("PRAGMA integrity_check"), ElementsAre("ok"));
  log("checked");
  std::cout << topUps_ << " times more work, " << incomplete << " photos to do in the end, "
            << missing << " thumbnails" << std::endl;
}

}  // namespace
}  // namespace vela_test
