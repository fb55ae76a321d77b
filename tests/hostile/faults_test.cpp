// A run in which one system call fails, of the program or of a tool, or in which the program or a
// tool is killed at that call. Whatever happens, the photos stay as they are, no thumbnail is half
// written, and the next runs leave the same files as if nothing had happened.
//
// Each test tries a sample of all calls and errors, the same in every run unless set by
// --gtest_random_seed=N; all of them when the environment has VELA_TEST_ROUNDS=full.
#include <sys/stat.h>

#include <algorithm>
#include <cstring>
#include <iostream>
#include <random>

#include "hostile/hostile_test.h"
#include "support/call_faults.h"
#include "support/named_case.h"

namespace vela_test::hostile {

namespace {

constexpr unsigned kSeed = 20261122;

/// What a test varies.
struct Trials : NamedCase {
  CallScope scope;
  bool firstPhasesDone;  ///< whether an undisturbed run comes before
  bool kill;             ///< instead of errors
  size_t sample;
};

std::string DescriptionOf(const MadeCall& made, const CallFault& fault) {
  std::string end = fault.kill                      ? "killed"
                    : fault.error == kShortTransfer ? "half done"
                                                    : std::strerror(fault.error);
  return "call " + std::to_string(fault.at) + ", " + made.call->name + " '" + made.object +
         "': " + end;
}

bool SetsModes(const MadeCall& made) {
  return std::strstr(made.call->name, "chmod") != nullptr;
}

}  // namespace

class Faults : public HostileTest, public ::testing::WithParamInterface<Trials> {
 protected:
  void SetUp() override {
    HostileTest::SetUp();
    MakeJpeg(InPhotos("a.jpg"), RecipeOf(160, 120));
    MakeRawPhoto(InPhotos("b.dng"), RawRecipeOf());
    photos_ = PhotosBelow(kPhotos);
    Make();
    Make();
    undisturbed_ = RecordTree(kPhotos, RecordDetail::kContent);
  }

  /// All faults that the test may try.
  std::vector<CallFault> AllFaults() {
    std::vector<CallFault> faults;
    for (size_t at = 0; at < calls_.size(); ++at) {
      if (GetParam().kill) {
        faults.push_back({at, 0, true});
        continue;
      }
      for (const int error : calls_[at].call->errors) {
        faults.push_back({at, error, false});
      }
    }
    return faults;
  }

  std::vector<CallFault> FaultsToTry() {
    std::vector<CallFault> faults = AllFaults();
    if (!IsLongRun()) {
      std::mt19937 random(kSeed + static_cast<unsigned>(GTEST_FLAG_GET(random_seed)));
      std::shuffle(faults.begin(), faults.end(), random);
      faults.resize(std::min(faults.size(), GetParam().sample));
    }
    return faults;
  }

  /// Restores the state before the run that is to be disturbed.
  void Begin() {
    RemoveTree(InPhotos("@eaDir"));
    for (const char* file : {kQueue, kPhotoProgress}) {
      RemoveTree(file);
    }
    if (GetParam().firstPhasesDone) {
      Make();
    }
  }

  void CountCalls() {
    Begin();
    CallFaults counter(GetParam().scope, std::nullopt);
    ProgramOptions options;
    options.beforeExec = {counter.Step()};
    Make({kPhotos}, options);
    ASSERT_TRUE(counter.WaitForEnd(20000));
    calls_ = counter.Calls();
  }

  void RunWith(const CallFault& fault) {
    CallFaults faults(GetParam().scope, fault);
    ProgramOptions options;
    options.beforeExec = {faults.Step()};
    options.timeLimit = kSoon;
    const ProgramResult result = RunProgram(VelathumbPath(), ArgumentsFor({kPhotos}), options);
    EXPECT_FALSE(result.timedOut) << "still running after " << kSoon.count() << " s";
    const bool isKilled =
        fault.kill && faults.HasStruck() && GetParam().scope == CallScope::kProgram;
    EXPECT_EQ(result.signal, isKilled ? SIGKILL : 0);
    EXPECT_TRUE(faults.WaitForEnd(20000)) << "a tool is still running";
    struck_ += faults.HasStruck() ? 1 : 0;
  }

  /// The thumbnails that exist must be complete in every respect.
  void ExpectOnlyFinishedThumbs(bool withModes) {
    EXPECT_TRUE(OnlyWholeThumbsBelow(kPhotos));
    for (const auto& [path, state] : ThumbsBelow(kPhotos)) {
      EXPECT_TRUE(!withModes || ModeOf(InPhotos(path)) == 0777) << path;
    }
  }

  void ExpectSameTreeAfterNextRuns(bool withModes) {
    Make();
    Make();
    if (withModes) {
      EXPECT_THAT(Differences(undisturbed_, RecordTree(kPhotos, RecordDetail::kContent)),
                  IsEmpty());
    }
    EXPECT_TRUE(HasThumbs(InPhotos("a.jpg"), kinds_));
    EXPECT_TRUE(HasThumbs(InPhotos("b.dng"), kinds_));
    EXPECT_THAT(PidFiles(), IsEmpty());
  }

  void Try(const CallFault& fault) {
    const MadeCall& made = calls_.at(fault.at);
    SCOPED_TRACE(DescriptionOf(made, fault));
    Begin();
    RunWith(fault);
    // A thumbnail whose mode cannot be set is used as it is.
    const bool withModes = fault.kill || !SetsModes(made);
    ExpectOnlyFinishedThumbs(withModes);
    EXPECT_TRUE(PhotosBelow(kPhotos) == photos_) << "the run touched a photo";
    ExpectSameTreeAfterNextRuns(withModes);
  }

  std::vector<MadeCall> calls_;
  std::map<std::string, PhotoState> photos_;
  TreeRecord undisturbed_;
  size_t struck_ = 0;
};

TEST_P(Faults, LeaveNothingBehind) {
  CountCalls();
  const std::vector<CallFault> faults = FaultsToTry();
  size_t failed = 0;
  constexpr size_t kEnough = 10;
  for (const CallFault& fault : faults) {
    const int before =
        ::testing::UnitTest::GetInstance()->current_test_info()->result()->total_part_count();
    Try(fault);
    const int after =
        ::testing::UnitTest::GetInstance()->current_test_info()->result()->total_part_count();
    failed += after > before ? 1 : 0;
    if (failed == kEnough && !IsLongRun()) {
      break;
    }
  }
  std::cout << calls_.size() << " calls, " << AllFaults().size() << " faults, " << faults.size()
            << " tried, " << struck_ << " occurred, " << failed << " with consequences"
            << std::endl;
  EXPECT_GT(struck_, faults.size() / 2) << "most faults did not occur";
}

INSTANTIATE_TEST_SUITE_P(
    All, Faults,
    ::testing::Values(Trials{{"ErrorsOfTheProgram"}, CallScope::kProgram, false, false, 100},
                      Trials{{"ErrorsOfTheProgramInPhase2"}, CallScope::kProgram, true, false, 30},
                      Trials{{"ErrorsOfTools"}, CallScope::kTools, false, false, 60},
                      Trials{{"ErrorsOfToolsInPhase2"}, CallScope::kTools, true, false, 20},
                      Trials{{"KillsOfTheProgram"}, CallScope::kProgram, false, true, 60},
                      Trials{{"KillsOfTheProgramInPhase2"}, CallScope::kProgram, true, true, 20},
                      Trials{{"KillsOfTools"}, CallScope::kTools, false, true, 40}),
    CaseName());

}  // namespace vela_test::hostile
