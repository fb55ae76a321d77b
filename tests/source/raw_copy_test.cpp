// The decoder's output as a file.

#include <thread>

#include "source/raw_image.h"
#include "source/source_fixture.h"
#include "support/quiet_thread.h"

using namespace vela;

namespace vela_test {
namespace {

constexpr const char* kOut = "/tmp/volume/out";

class RawCopy : public SourceTest {
 protected:
  void SetUp() override {
    SourceTest::SetUp();
    MakeDirectories("/tmp/volume");
    WriteFile(kRaw, "raw");
  }

  static bool CopyAfter(const StubPlan& plan) {
    const StubTool decoder(kDcrawPath);
    decoder.Plan(plan);
    return DcrawToFile(kRaw, kOut, "-e");
  }
};

TEST_F(RawCopy, ContainsTheDecodersOutput) {
  const StubTool decoder(kDcrawPath);
  const std::string printed("first\n\0\xff second", 15);
  decoder.Plan(StubPlan().Print(printed));
  EXPECT_TRUE(DcrawToFile(kRaw, kOut, "-w"));
  EXPECT_EQ(ReadFile(kOut), printed);
  ASSERT_EQ(ParametersOf(decoder.Calls()), (ArgumentLists{{"-w", "-c", kRaw}}));
  EXPECT_EQ(decoder.Calls().front().arguments.front(), kDcrawPath);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RawCopy, PassesItsOptionOn) {
  const StubTool decoder(kDcrawPath);
  decoder.Plan(StubPlan().Print("x"));
  EXPECT_TRUE(DcrawToFile(kRaw, kOut, "-e"));
  EXPECT_EQ(ParametersOf(decoder.Calls()), (ArgumentLists{{"-e", "-c", kRaw}}));
}

TEST_F(RawCopy, OfAnyLength) {
  for (const size_t length : {1U, 4095U, 4096U, 4097U, 3000001U}) {
    SCOPED_TRACE(length);
    EXPECT_TRUE(CopyAfter(StubPlan()
                              .PrintRepeated("x", length % 1000)
                              .PrintRepeated(std::string(1000, 'y'), length / 1000)));
    EXPECT_EQ(ReadFile(kOut),
              std::string(length % 1000, 'x') + std::string(length / 1000 * 1000, 'y'));
  }
}

TEST_F(RawCopy, ReplacesAnExistingFile) {
  WriteFile(kOut, "something longer");
  EXPECT_TRUE(CopyAfter(StubPlan().Print("short")));
  EXPECT_EQ(ReadFile(kOut), "short");
}

TEST_F(RawCopy, LeavesOutTheErrorOutput) {
  EXPECT_TRUE(CopyAfter(StubPlan().PrintError("warning\n").Print("picture").PrintError("more")));
  EXPECT_EQ(ReadFile(kOut), "picture");
}

TEST_F(RawCopy, OfNothingIsAFailure) {
  EXPECT_FALSE(CopyAfter(StubPlan()));
  EXPECT_EQ(FileSize(kOut), 0);
  EXPECT_FALSE(CopyAfter(StubPlan().PrintError("no thumbnail\n").Exit(1)));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RawCopy, DependsOnTheOutputNotOnTheStatus) {
  EXPECT_TRUE(CopyAfter(StubPlan().Print("half a picture").Exit(1)));
  EXPECT_TRUE(CopyAfter(StubPlan().Print("half a picture").DieBySignal(SIGSEGV)));
  EXPECT_EQ(ReadFile(kOut), "half a picture");
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RawCopy, NeedsTheDecoder) {
  RemoveTool(kDcrawPath);
  EXPECT_FALSE(DcrawToFile(kRaw, kOut, "-w"));
  EXPECT_FALSE(Exists(kOut));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:569 VLIBCPopen [/usr/bin/dcraw -w -c] failed"));
}

TEST_F(RawCopy, NeedsAPlaceThatCanBeWritten) {
  const std::string failed = "velathumb:574 fopen failed, path=/tmp/volume/out, errno=";
  const StubPlan plan = StubPlan().Print("picture");
  {
    const ReadOnlyMount readOnly("/tmp/volume");
    EXPECT_FALSE(CopyAfter(plan));
  }
  MakeDirectories(kOut);
  EXPECT_FALSE(CopyAfter(plan));
  RemoveTree("/tmp/volume");
  EXPECT_FALSE(CopyAfter(plan));
  EXPECT_THAT(ErrorLines(), ElementsAre(failed + "30", failed + "21", failed + "2"));
}

constexpr const char* kNoRoom =
    "velathumb:590 write failed, path=/tmp/volume/out, No space left on device";

/// A small volume in the directory of the copy.
class RawCopyOnASmallVolume : public RawCopy {
 protected:
  void SetUp() override {
    RawCopy::SetUp();
    volume_.emplace("/tmp/volume", 1U << 20U);
    WriteFile("/tmp/volume/other", "x");
  }

  void TearDown() override {
    volume_.reset();
    RawCopy::TearDown();
  }

  std::optional<SmallVolume> volume_;
};

TEST_F(RawCopyOnASmallVolume, NeedsRoom) {
  volume_->SetAvailable(0);
  EXPECT_FALSE(CopyAfter(StubPlan().Print("picture")));
  EXPECT_THAT(ErrorLines(), ElementsAre(kNoRoom));
}

TEST_F(RawCopyOnASmallVolume, NeedsRoomToItsEnd) {
  volume_->SetAvailable(4 * SmallVolume::PageSize());
  // Each chunk fills one page of the volume, so that none is written in part.
  EXPECT_FALSE(CopyAfter(StubPlan().PrintRepeated(std::string(4096, 'x'), 64)));
  EXPECT_EQ(FileSize(kOut), static_cast<int64_t>(4 * SmallVolume::PageSize()));
  EXPECT_THAT(ErrorLines(), ElementsAre(kNoRoom));
}

TEST_F(RawCopyOnASmallVolume, IsNotContinuedAfterAShortWrite) {
  volume_->SetAvailable(4096);
  std::thread prompter = StartQuietThread([] {
    while (FileSize(kOut) < 100) {
      std::this_thread::yield();
    }
    WriteFile("/tmp/go", "");
  });
  EXPECT_FALSE(CopyAfter(StubPlan()
                             .Print(std::string(100, 'x'))
                             .WaitForFile("/tmp/go")
                             .Print(std::string(4096, 'y'))));
  prompter.join();
  EXPECT_EQ(FileSize(kOut), 4096);
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:594 write size wrong, read_count=4096, write_count=3996"));
}

TEST_F(RawCopy, OfRealRawPhotos) {
  RawRecipe recipe;
  recipe.preview.emplace();
  recipe.preview->width = 32;
  recipe.preview->height = 24;
  MakeRawPhoto(kRaw, recipe);
  EXPECT_TRUE(DcrawToFile(kRaw, kOut, "-e"));
  EXPECT_EQ(Identify(kOut).format, "JPEG");
  EXPECT_EQ(Identify(kOut).width, 32);
  EXPECT_EQ(QuadrantLetters(kOut), "RGBY");
  EXPECT_TRUE(DcrawToFile(kRaw, kOut, "-w"));
  EXPECT_EQ(Identify(kOut).format, "PPM");
  EXPECT_EQ(Identify(kOut).width, 64);
  EXPECT_EQ(Identify(kOut).height, 48);
}

}  // namespace
}  // namespace vela_test
