// Ending the program by a signal at any moment of a run.
#include <algorithm>
#include <chrono>
#include <csignal>
#include <functional>
#include <optional>
#include <random>
#include <thread>

#include "program/real_program_test.h"

namespace vela_test::real {

namespace {

using std::chrono::microseconds;
using std::chrono::milliseconds;
using std::chrono::steady_clock;

constexpr const char* kTree = "R:/tmp/photos";
constexpr const char* kConverterName = "convert-thumb";

/// The trials of a signal in one test.
constexpr int kTrials = 50;

/// Time limit for the end of the program after SIGTERM.
constexpr milliseconds kPromptEnd(1000);

class Interruption : public RealProgramTest {
 protected:
  /// Copies of a photo in four directories, so that a signal may also come between two directories.
  void MakePhotos(int perDirectory, const std::string& original = MakeJpeg("/tmp/small.jpg")) {
    for (int i = 0; i < 4 * perDirectory; ++i) {
      const std::string name = "d" + std::to_string(i % 4) + "/" + std::to_string(i) + ".jpg";
      MakeDirectories(InPhotos(name.substr(0, 2)));
      CopyFile(original, InPhotos(name));
      photos_.push_back(InPhotos(name));
    }
    before_ = PhotosBelow(kPhotos);
  }

  /// A photo with much detail, whose thumbnails take long to write.
  static std::string MakeDetailedPhoto() {
    Draw({"-size", "640x480", "-seed", "7", "plasma:red-blue", "-quality", "92",
          "/tmp/detailed.jpg"});
    return "/tmp/detailed.jpg";
  }

  /// Restores the state before the first run.
  static void ForgetRuns() {
    for (int i = 0; i < 4; ++i) {
      RemoveTree(InPhotos("d" + std::to_string(i) + "/@eaDir"));
    }
    RemoveTree(kQueue);
    RemoveTree(kPhotoProgress);
  }

  static bool HasEnded(Program& program) { return program.Wait(milliseconds(0)).has_value(); }

  /// A run over the whole tree that has created its pid file or has already ended.
  static Program StartRun() {
    Program program = StartProgram(VelathumbPath(), {kProfiles, kTree});
    const std::string pidFile = PidFileOf(program);
    const auto end = steady_clock::now() + std::chrono::seconds(10);
    while (!Exists(pidFile) && !HasEnded(program) && steady_clock::now() < end) {
      std::this_thread::sleep_for(microseconds(50));
    }
    EXPECT_TRUE(Exists(pidFile) || HasEnded(program));
    return program;
  }

  static std::string PidFileOf(const Program& program) {
    return "/var/run/velathumb." + std::to_string(program.Pid()) + ".pid";
  }

  /// Sends SIGTERM, after which the program must end promptly and leave no process running.
  static void Terminate(Program& program) {
    const auto sent = steady_clock::now();
    program.Kill(SIGTERM);
    const std::optional<ProgramResult> result = program.Wait(kPromptEnd);
    ASSERT_TRUE(result) << "still there a second after the signal";
    EXPECT_EQ(result->exitCode, 1);
    EXPECT_EQ(result->signal, 0);
    EXPECT_THAT(PidFiles(), IsEmpty());
    const auto left = sent + kPromptEnd - steady_clock::now();
    EXPECT_TRUE(WaitUntilNoProcessNamed(
        kConverterName, static_cast<int>(std::chrono::duration_cast<milliseconds>(left).count())));
  }

  void ExpectNoHarm() const {
    EXPECT_TRUE(OnlyWholeThumbsBelow(kPhotos));
    EXPECT_TRUE(PhotosBelow(kPhotos) == before_) << "the run touched a photo";
  }

  /// Runs trials at random moments until one fails. Half of the moments are close to the start,
  /// when processes and files are created, half anywhere in the run.
  void Repeat(int trials, milliseconds longest,
              const std::function<void(microseconds moment)>& trial) {
    const unsigned seed = std::random_device()();
    std::mt19937 random(seed);
    for (int i = 0; i < trials && !HasFailure(); ++i) {
      const milliseconds limit = i % 2 == 0 ? milliseconds(25) : longest;
      std::uniform_int_distribution<int> moments(0, static_cast<int>(microseconds(limit).count()));
      const microseconds moment(moments(random));
      SCOPED_TRACE("seed " + std::to_string(seed) + ", trial " + std::to_string(i) + ", after " +
                   std::to_string(moment.count()) + " us");
      trial(moment);
    }
  }

  /// Terminates a run after `moment`; tries again with an earlier moment when the run ended first.
  static void TerminateOneRun(microseconds moment) {
    for (;;) {
      ForgetRuns();
      Program program = StartRun();
      std::this_thread::sleep_for(moment);
      if (!HasEnded(program)) {
        Terminate(program);
        return;
      }
      moment /= 2;
    }
  }

  /// SIGTERM at random moments of runs that start without thumbnails.
  void TerminateRuns() {
    kinds_ = FullKinds();
    WriteKinds(kProfiles, kinds_);
    MakePhotos(8, MakeDetailedPhoto());
    Repeat(kTrials, milliseconds(400), [this](microseconds moment) {
      TerminateOneRun(moment);
      ExpectNoHarm();
    });
  }

  /// SIGKILL at random moments; the runs after it clean up and finish the work.
  void KillRuns() {
    MakePhotos(1);
    Repeat(kTrials, milliseconds(120), [this](microseconds moment) {
      ForgetRuns();
      const std::string stale = KillOneRun(moment);
      ExpectNoHarm();
      AwaitChildrenOfKilledRun();
      ExpectNoHarm();
      EXPECT_TRUE(Exists(stale));
      Make({kTree});
      EXPECT_THAT(PidFiles(), IsEmpty());
      ExpectThumbs(0);
      ExpectThumbs(1);
      Make({kTree});
      ExpectThumbs(2);
      ExpectNoHarm();
    });
  }

  /// Kills a run after `moment`; tries again with an earlier moment when the run ended first.
  /// Returns its pid file.
  static std::string KillOneRun(microseconds moment) {
    for (;;) {
      Program program = StartRun();
      const std::string pidFile = PidFileOf(program);
      std::this_thread::sleep_for(moment);
      program.Kill(SIGKILL);
      program.Wait();
      // A run removes its pid file when it is done.
      if (Exists(pidFile)) {
        return pidFile;
      }
      ForgetRuns();
      moment /= 2;
    }
  }

  /// A child of the killed program may hold its lock until it becomes the converter, which then
  /// ends by itself.
  static void AwaitChildrenOfKilledRun() {
    EXPECT_TRUE(WaitUntilNoProcessNamed("velathumb", 10000));
    EXPECT_TRUE(WaitUntilNoProcessNamed(kConverterName, 10000));
  }

  void ExpectThumbs(int phase) const {
    for (const std::string& photo : photos_) {
      EXPECT_TRUE(HasThumbs(photo, OfPhase(kinds_, phase)));
    }
  }

  Strings photos_;
  std::map<std::string, PhotoState> before_;
};

}  // namespace

/// A quarter of the trials of a signal.
class InterruptionAtRandomMoments : public Interruption,
                                    public ::testing::WithParamInterface<int> {};

TEST_P(InterruptionAtRandomMoments, Sigterm) {
  TerminateRuns();
}

TEST_P(InterruptionAtRandomMoments, Sigkill) {
  KillRuns();
}

INSTANTIATE_TEST_SUITE_P(Quarters, InterruptionAtRandomMoments, ::testing::Range(1, 5));

// The real converter is too fast to be caught while it starts, except by chance.
TEST_F(Interruption, SigtermAroundTheStartOfAHangingConverter) {
  MakePhotos(1);
  const StubTool converter(kConverterPath);
  converter.Plan(StubPlan().Sleep(60000));
  Repeat(60, milliseconds(10), [](microseconds moment) {
    ForgetRuns();
    Program program = StartRun();
    std::this_thread::sleep_for(moment);
    Terminate(program);
  });
}

TEST_F(Interruption, SigtermDuringAHangingConverter) {
  MakePhotos(1);
  const StubTool converter(kConverterPath);
  converter.Plan(StubPlan().WriteOutputs(1).CreateFile("/tmp/hangs").Sleep(60000));
  Program program = StartRun();
  ASSERT_TRUE(WaitUntilExists("/tmp/hangs"));
  Terminate(program);
  ExpectNoHarm();
  EXPECT_EQ(ThumbsBelow(kPhotos).size(), 0U);
  // The directory is free for the next run.
  InstallRealConverter();
  Make({kTree});
  Make({kTree});
  for (int phase = 0; phase <= 2; ++phase) {
    ExpectThumbs(phase);
  }
}

TEST_F(Interruption, SigtermEndsTheConvertersOfOtherInstances) {
  MakePhotos(1);
  const StubTool converter(kConverterPath);
  converter.PlanCall(1, StubPlan().CreateFile("/tmp/hangs1").Sleep(60000));
  converter.PlanCall(2, StubPlan().CreateFile("/tmp/hangs2").Sleep(60000));
  converter.Plan(StubPlan().PassThrough(RealConverterPath()));
  Program other = StartProgram(VelathumbPath(), {kProfiles, InPhotos("d0")});
  ASSERT_TRUE(WaitUntilExists("/tmp/hangs1"));
  Program program = StartProgram(VelathumbPath(), {kProfiles, InPhotos("d1")});
  ASSERT_TRUE(WaitUntilExists("/tmp/hangs2"));
  program.Kill(SIGTERM);
  const auto result = program.Wait(kPromptEnd);
  ASSERT_TRUE(result);
  EXPECT_EQ(result->exitCode, 1);
  // The other instance treats the end of its converter as a failure and continues.
  const auto otherResult = other.Wait(milliseconds(10000));
  ASSERT_TRUE(otherResult);
  EXPECT_EQ(otherResult->exitCode, 0);
  EXPECT_TRUE(IsMarkedFailed(photos_[0], kinds_));
  EXPECT_THAT(PidFiles(), IsEmpty());
}

TEST_F(Interruption, SigtermWhileTheDaemonIsSilent) {
  MakePhotos(1);
  for (const char* command : {"GET_INDEX_VERSION", "POST_PHOTO_CONVERT"}) {
    SCOPED_TRACE(command);
    ForgetRuns();
    DaemonPeer daemon;
    daemon.Answer(command, DaemonReply::Silence());
    Program program = StartRun();
    const auto end = steady_clock::now() + std::chrono::seconds(10);
    const auto isAsked = [&] {
      const Strings commands = daemon.Commands();
      return std::count(commands.begin(), commands.end(), command) > 0;
    };
    while (!isAsked() && steady_clock::now() < end) {
      std::this_thread::sleep_for(milliseconds(1));
    }
    ASSERT_TRUE(isAsked());
    Terminate(program);
    ExpectNoHarm();
  }
}

TEST_F(Interruption, SigtermBetweenTheBytesOfAnAnswer) {
  MakePhotos(1);
  DaemonPeer daemon;
  daemon.Answer("GET_INDEX_VERSION", DaemonReply::BytesThenSilence("{\"version\""));
  Program program = StartRun();
  ASSERT_TRUE(daemon.WaitForRequests(1));
  std::this_thread::sleep_for(milliseconds(20));
  Terminate(program);
  ExpectNoHarm();
}

}  // namespace vela_test::real
