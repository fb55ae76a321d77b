#include "command_line/command_line.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <optional>
#include <utility>
#include <variant>

#include "command_line.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::SizeIs;

template <typename Task>
std::optional<Task> ParseTask(std::vector<std::string> arguments) {
  const vela::CommandLine line = ParseCommandLine(std::move(arguments));
  const Task* const task = std::get_if<Task>(&line.task);
  return task == nullptr ? std::nullopt : std::optional<Task>(*task);
}

const auto ParseConversion = ParseTask<ConversionPlan>;
const auto ParseTurn = ParseTask<TurnPlan>;

size_t FindSourceArgument(std::vector<std::string> arguments) {
  return ParseCommandLine(std::move(arguments)).sourceIndex;
}

TEST(PlanParser, ReadsAnyNumberOfOutputs) {
  for (size_t count = 1; count <= 6; ++count) {
    CommandLine line;
    line.source = "/photos/a.jpg";
    for (size_t i = 0; i < count; ++i) {
      line.outputs.push_back({ThumbOptions(), "/out/" + std::to_string(i) + ".jpg"});
    }
    const auto plan = ParseConversion(line.Arguments());
    ASSERT_TRUE(plan) << count;
    EXPECT_EQ(plan->source, "/photos/a.jpg");
    ASSERT_THAT(plan->outputs, SizeIs(count));
    for (size_t i = 0; i < count; ++i) {
      EXPECT_EQ(plan->outputs[i].path, "/out/" + std::to_string(i) + ".jpg");
    }
  }
}

TEST(PlanParser, KeepsTheOrderOfTheOptions) {
  ThumbOptions options;
  options.width = 320;
  options.height = 240;
  options.quality = 77;
  options.flatten = true;
  options.rotate = 270;
  options.unsharp = "0x0.6+0.7+0.01";
  const auto plan =
      ParseConversion(CommandLine{"/p.jpg", "/scratch", {{options, "/o.jpg"}}}.Arguments());
  ASSERT_TRUE(plan);
  const OutputPlan& output = plan->outputs.front();
  EXPECT_EQ(output.box.width, 320);
  EXPECT_EQ(output.box.height, 240);
  EXPECT_EQ(output.quality, 77);
  ASSERT_THAT(output.steps, SizeIs(5));
  EXPECT_EQ(output.steps[0].kind, Step::Kind::kFlatten);
  EXPECT_EQ(output.steps[1].kind, Step::Kind::kAutoOrient);
  EXPECT_EQ(output.steps[2].kind, Step::Kind::kTurn);
  EXPECT_EQ(output.steps[2].quarterTurns, 3);
  EXPECT_EQ(output.steps[3].kind, Step::Kind::kSharpen);
  EXPECT_DOUBLE_EQ(output.steps[3].unsharp.sigma, 0.6);
  EXPECT_EQ(output.steps[4].kind, Step::Kind::kConvertToSrgb);
}

TEST(PlanParser, RemovesThePageSelectionFromTheSource) {
  const auto plan =
      ParseConversion(CommandLine{"/a/x[1]*?.tif[0]", "", {{{}, "/o.jpg"}}}.Arguments());
  ASSERT_TRUE(plan);
  EXPECT_EQ(plan->source, "/a/x[1]*?.tif");
  EXPECT_EQ(SourceFile("[0]"), "[0]");
  EXPECT_EQ(SourceFile("/a[0]/b"), "/a[0]/b");
}

TEST(PlanParser, RefusesALineWithAnythingMissing) {
  const CommandLine line{"/p.jpg", "/scratch", {{{}, "/1.jpg"}, {{}, "/2.jpg"}, {{}, "/3.jpg"}}};
  const std::vector<std::string> whole = line.Arguments();
  ASSERT_TRUE(ParseConversion(whole));
  for (size_t i = 0; i < whole.size(); ++i) {
    std::vector<std::string> less = whole;
    less.erase(less.begin() + static_cast<std::ptrdiff_t>(i));
    // Only this argument can be omitted alone.
    EXPECT_EQ(ParseConversion(less).has_value(), whole[i] == "-auto-orient")
        << i << " " << whole[i];
  }
}

TEST(PlanParser, RefusesATruncatedLine) {
  const CommandLine line{"/p.jpg", "/scratch", {{{}, "/1.jpg"}, {{}, "/2.jpg"}, {{}, "/3.jpg"}}};
  std::vector<std::string> cut = line.Arguments();
  while (!cut.empty()) {
    cut.pop_back();
    EXPECT_FALSE(ParseConversion(cut)) << cut.size();
  }
}

TEST(PlanParser, RefusesUnknownOptions) {
  const std::vector<std::string> begin = {"/p.jpg", "-thumbnail", "10x10>", "-quality", "80"};
  const std::vector<std::vector<std::string>> unknown = {{"-blur", "0x1"},
                                                         {"-colorspace", "Gray"},
                                                         {"-rotate", "45"},
                                                         {"+profile", "*"},
                                                         {"-define", "png:x=1"},
                                                         {"-thumbnail", "5x5>"},
                                                         {"-unsharp", "nothing"},
                                                         {"-strip"},
                                                         {"+clone"},
                                                         {"-write", "/x.jpg"},
                                                         {"-quality", "0"},
                                                         {"-quality", "101"}};
  for (const auto& options : unknown) {
    std::vector<std::string> line = begin;
    line.insert(line.end(), options.begin(), options.end());
    line.emplace_back("/o.jpg");
    EXPECT_FALSE(ParseConversion(line)) << options.front() << " " << options.back();
    const std::string value = options.size() == 1 ? "/o.jpg" : options.back();
    EXPECT_EQ(ParseCommandLine(line).unsupportedOption, options.front() + " " + value);
  }
  EXPECT_FALSE(ParseConversion({"-rotate", "90", "/a.jpg", "/a.jpg"}));
  EXPECT_FALSE(ParseConversion({}));
}

TEST(PlanParser, RefusesStepsInFrontOfTheScaling) {
  EXPECT_FALSE(ParseConversion(
      {"/p.jpg", "-auto-orient", "-thumbnail", "10x10>", "-quality", "80", "/o.jpg"}));
}

TEST(SourceArgument, IsTheFirstThatIsNotAnOption) {
  EXPECT_EQ(FindSourceArgument({"-define", "registry:temporary-path=/x", "/a.jpg", "/b.jpg"}), 2U);
  EXPECT_EQ(FindSourceArgument({"-rotate", "90", "/a.jpg", "/a.jpg"}), 2U);
  EXPECT_EQ(FindSourceArgument({"/a.jpg"}), 0U);
  EXPECT_EQ(FindSourceArgument({}), 0U);
}

TEST(ParsedCommandLine, NamesOutputsAndScratchDirectoryOfAnUnknownTask) {
  const auto line = ParseCommandLine(
      {"a.gif[0]", "-write", "1.gif", "-define", "registry:temporary-path=/x", "-write", "2.gif"});
  EXPECT_TRUE(std::holds_alternative<UnknownTask>(line.task));
  EXPECT_EQ(line.sourceIndex, 0U);
  EXPECT_EQ(line.sourceFile, "a.gif");
  EXPECT_THAT(line.outputIndices, ElementsAre(2U, 6U));
  EXPECT_EQ(line.scratchDirectory, "/x");
}

TEST(PlanParser, ReadsATurnInPlace) {
  const auto plan = ParseTurn({"-rotate", "270", "/a %d.jpg", "/a %d.jpg"});
  ASSERT_TRUE(plan);
  EXPECT_EQ(plan->path, "/a %d.jpg");
  EXPECT_EQ(plan->quarterTurns, 3);
}

TEST(PlanParser, ReadsNoOtherTurn) {
  EXPECT_FALSE(ParseTurn({}));
  EXPECT_FALSE(ParseTurn({"-rotate", "90", "/a.jpg"}));
  EXPECT_FALSE(ParseTurn({"-rotate", "90", "/a.jpg", "/b.jpg"}));
  EXPECT_FALSE(ParseTurn({"-rotate", "90", "/a.jpg", "/a.jpg", "/a.jpg"}));
  EXPECT_FALSE(ParseTurn({"-flip", "90", "/a.jpg", "/a.jpg"}));
  for (const char* degrees : {"", "0", "360", "45", "-90", "90.0", "90x"}) {
    EXPECT_FALSE(ParseTurn({"-rotate", degrees, "/a.jpg", "/a.jpg"})) << degrees;
  }
}

}  // namespace
}  // namespace vela_test
