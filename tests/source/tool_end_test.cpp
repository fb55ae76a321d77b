// Tools that print more than is read or do not end: the program waits for each.

#include <chrono>
#include <functional>

#include "source/orientation.h"
#include "source/raw_image.h"
#include "source/rotation_check.h"
#include "source/source_fixture.h"

namespace vela_test {
namespace {

constexpr const char* kPicture = "/tmp/photos/preview.jpg";
constexpr const char* kOut = "/tmp/photos/out";
constexpr size_t kManyTimes = 4000;

const std::string kKilobyte = std::string(1023, 'x') + "\n";

/// One place where a tool's output is read.
struct Reader {
  const char* tool;
  const char* printed;  ///< output to be read
  std::function<int()> read;
  int expected;
};

int ReadSize() {
  uint32_t width = 0;
  uint32_t height = 0;
  return GetRawImageSize(kRaw, width, height) == 1 ? static_cast<int>(width) : -1;
}

std::vector<Reader> Readers() {
  return {
      {kDcrawPath, "Output size: 12 x 34\n", ReadSize, 12},
      {kExiftoolPath, "Rotation: 90\n", [] { return GetRawPreviewRotation(kRaw, kPicture); }, 90},
      {kComparePath, "56 (0.1)\n", [] { return CompareImagesMAE(kRaw, kPicture); }, 56},
      {kDcrawPath, "picture", [] { return DcrawToFile(kRaw, kOut, "-w") ? 1 : 0; }, 1}};
}

class ToolEnd : public SourceTest {
 protected:
  void SetUp() override {
    SourceTest::SetUp();
    JpegRecipe upright;
    upright.orientation = 1;
    MakeJpeg(kPicture, upright);
    WriteFile(kRaw, "raw");
  }

  /// Expects each reader to get its answer from a tool with this plan, and the tool to have ended
  /// when the reader returns.
  static void ExpectAnswered(const std::function<StubPlan(const std::string&)>& plan) {
    for (const Reader& reader : Readers()) {
      SCOPED_TRACE(reader.tool + std::string(": ") + reader.printed);
      const StubTool tool(reader.tool);
      tool.Plan(plan(reader.printed));
      const auto begin = std::chrono::steady_clock::now();
      EXPECT_EQ(reader.read(), reader.expected);
      EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(20));
      const StubCall call = tool.Calls().back();
      EXPECT_NE(kill(call.pid, 0), 0) << "the tool is still there, or only its status";
    }
  }
};

TEST_F(ToolEnd, OfOneThatPrintsMuchMore) {
  ExpectAnswered([](const auto& printed) {
    return StubPlan().Print(printed).PrintRepeated(kKilobyte, kManyTimes);
  });
}

TEST_F(ToolEnd, OfOneThatPrintsMuchMoreAndFails) {
  ExpectAnswered([](const auto& printed) {
    return StubPlan().Print(printed).PrintRepeated(kKilobyte, kManyTimes).Exit(3);
  });
}

TEST_F(ToolEnd, OfOneThatPrintsManyErrors) {
  ExpectAnswered([](const auto& printed) {
    return StubPlan()
        .Print(printed)
        .PrintErrorRepeated(kKilobyte, kManyTimes)
        .PrintRepeated(kKilobyte, 2);
  });
}

TEST_F(ToolEnd, OfOneThatIgnoresSigpipe) {
  ExpectAnswered([](const auto& printed) {
    return StubPlan()
        .IgnoreSignal(SIGPIPE)
        .Print(printed)
        .PrintRepeated(kKilobyte, kManyTimes)
        .PrintErrorRepeated(kKilobyte, kManyTimes)
        .Sleep(20)
        .Exit(0);
  });
}

TEST_F(ToolEnd, IsWaitedForWhenItsOutputEndsBefore) {
  ExpectAnswered(
      [](const auto& printed) { return StubPlan().Print(printed).CloseOutput().Sleep(20); });
}

TEST_F(ToolEnd, OfOneWhoseOutputCannotBeStored) {
  const StubTool tool(kDcrawPath);
  tool.Plan(StubPlan().IgnoreSignal(SIGPIPE).PrintRepeated(kKilobyte, kManyTimes).Exit(0));
  EXPECT_FALSE(DcrawToFile(kRaw, "/tmp/nowhere/out", "-w"));
  EXPECT_NE(kill(tool.Calls().back().pid, 0), 0);
}

TEST_F(ToolEnd, OfOneThatIsKilledAtItsTimeLimit) {
  WriteFile("/etc/velainfo.conf", "tool_timeout=\"1\"\n");
  const StubTool tool(kDcrawPath);
  tool.Plan(StubPlan().IgnoreSignal(SIGPIPE).Print("Output size: 12 x 34\n").Sleep(30000));
  const auto begin = std::chrono::steady_clock::now();
  EXPECT_EQ(ReadSize(), 12);
  EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(20));
  EXPECT_NE(kill(tool.Calls().back().pid, 0), 0);
}

}  // namespace
}  // namespace vela_test
