// Several instances of the program over the same photos at once.
#include <set>

#include "program/real_program_test.h"

namespace vela_test::real {

namespace {

constexpr const char* kTree = "R:/tmp/photos";

/// The purpose of a converter call: its source, and the first box, which identifies the phase.
struct Work {
  std::string source;
  std::string box;
};

bool operator<(const Work& a, const Work& b) {
  return std::tie(a.source, a.box) < std::tie(b.source, b.box);
}

void PrintTo(const Work& work, std::ostream* out) {
  *out << work.source << " at " << work.box;
}

Work WorkOf(const StubCall& call) {
  const Strings parameters = call.Parameters();
  Work work;
  work.source = parameters.size() > 2 ? parameters[2] : "";
  for (size_t i = 0; i + 1 < parameters.size() && work.box.empty(); ++i) {
    if (parameters[i] == "-thumbnail") {
      work.box = parameters[i + 1];
    }
  }
  return work;
}

class Instances : public RealProgramTest {
 protected:
  void SetUp() override {
    RealProgramTest::SetUp();
    converter_.emplace(kConverterPath);
    converter_->Plan(StubPlan().PassThrough(RealConverterPath()));
  }

  void MakePhotos(int directories, int perDirectory) {
    for (int d = 0; d < directories; ++d) {
      const std::string directory = InPhotos("d" + std::to_string(d));
      MakeDirectories(directory);
      for (int i = 0; i < perDirectory; ++i) {
        photos_.push_back(MakeJpeg(directory + "/" + std::to_string(i) + ".jpg"));
      }
    }
  }

  /// Starts this number of instances at once and waits for all.
  void RunTogether(int instances, const Strings& directories) const {
    const auto before = PhotosBelow(kPhotos);
    Strings arguments = {kProfiles};
    arguments.insert(arguments.end(), directories.begin(), directories.end());
    std::vector<Program> programs;
    for (int i = 0; i < instances; ++i) {
      programs.push_back(StartProgram(VelathumbPath(), arguments));
    }
    for (Program& program : programs) {
      const auto result = program.Wait();
      ASSERT_TRUE(result);
      EXPECT_EQ(result->exitCode, 0) << result->err;
    }
    EXPECT_TRUE(PhotosBelow(kPhotos) == before) << "a run touched a photo";
    EXPECT_THAT(PidFiles(), IsEmpty());
  }

  /// How often each piece of work was done.
  std::map<Work, int> Done() const {
    std::map<Work, int> done;
    for (const StubCall& call : converter_->Calls()) {
      ++done[WorkOf(call)];
    }
    return done;
  }

  void ExpectNothingDoneTwice() const {
    for (const auto& [work, times] : Done()) {
      EXPECT_EQ(times, 1) << ::testing::PrintToString(work);
    }
  }

  /// The instances that made phases 0 and 1 in each directory: phase 2 belongs to a later run.
  std::map<std::string, std::set<pid_t>> Makers() const {
    std::map<std::string, std::set<pid_t>> makers;
    for (const StubCall& call : converter_->Calls()) {
      const Work work = WorkOf(call);
      if (work.box != LargestBoxOfPhase2()) {
        const size_t end = work.source.find('/', InPhotos("d").size());
        makers[work.source.substr(0, end)].insert(call.parentPid);
      }
    }
    return makers;
  }

  static std::string LargestBoxOfPhase2() { return "80x80>"; }

  void ExpectEachDirectoryDoneByOne() const {
    for (const auto& [directory, makers] : Makers()) {
      EXPECT_EQ(makers.size(), 1U) << directory;
    }
  }

  /// A last run completes the remaining work.
  void ExpectAllDoneAfterALastRun() {
    Make({kTree});
    Make({kTree});
    for (const std::string& photo : photos_) {
      EXPECT_TRUE(HasThumbs(photo, kinds_));
    }
    EXPECT_EQ(Done().size(), 3 * photos_.size());
    ExpectNothingDoneTwice();
    ExpectEachDirectoryDoneByOne();
    ExpectNothingLeftToMake({kTree});
  }

  void ExpectSharedTree(int instances) {
    MakePhotos(8, 4);
    RunTogether(instances, {kTree});
    // All photos have been through phases 0 and 1 by now, whichever instance took them.
    for (const std::string& photo : photos_) {
      EXPECT_TRUE(HasThumbs(photo, OfPhase(kinds_, 0)));
      EXPECT_TRUE(HasThumbs(photo, OfPhase(kinds_, 1)));
    }
    ExpectNothingDoneTwice();
    ExpectEachDirectoryDoneByOne();
    std::set<pid_t> all;
    for (const auto& [directory, makers] : Makers()) {
      all.insert(makers.begin(), makers.end());
    }
    EXPECT_GT(all.size(), 1U) << "the instances did not run at the same time";
    ExpectAllDoneAfterALastRun();
  }

  std::optional<StubTool> converter_;
  Strings photos_;
};

}  // namespace

TEST_F(Instances, TwoProcessATree) {
  ExpectSharedTree(2);
}

TEST_F(Instances, FourProcessATree) {
  ExpectSharedTree(4);
}

// One instance locks the directory for all of its photos; the others skip it at once.
TEST_F(Instances, FourOverOneDirectory) {
  MakePhotos(1, 12);
  RunTogether(4, {InPhotos("d0")});
  ExpectNothingDoneTwice();
  ExpectEachDirectoryDoneByOne();
  for (const std::string& photo : photos_) {
    EXPECT_TRUE(HasThumbs(photo, OfPhase(kinds_, 0)));
    EXPECT_TRUE(HasThumbs(photo, OfPhase(kinds_, 1)));
  }
  ExpectAllDoneAfterALastRun();
}

TEST_F(Instances, OppositeOrdersOfTheSameDirectories) {
  MakePhotos(4, 3);
  Strings up = {kProfiles};
  for (int d = 0; d < 4; ++d) {
    up.push_back(InPhotos("d" + std::to_string(d)));
  }
  Strings down(up.rbegin(), up.rend() - 1);
  down.insert(down.begin(), kProfiles);
  Program first = StartProgram(VelathumbPath(), up);
  Program second = StartProgram(VelathumbPath(), down);
  EXPECT_EQ(first.Wait()->exitCode, 0);
  EXPECT_EQ(second.Wait()->exitCode, 0);
  ExpectNothingDoneTwice();
  ExpectEachDirectoryDoneByOne();
  ExpectAllDoneAfterALastRun();
}

}  // namespace vela_test::real
