// Lines of a tool's output and their tags.
#include "source/tool_output.h"

#include "platform/vlibc.h"
#include "source/source_fixture.h"

using namespace vela;

namespace vela_test {
namespace {

class ToolLines : public SourceTest {
 protected:
  /// The lines that are read from a tool that prints this.
  static std::vector<std::string> LinesOf(const std::string& printed) {
    const StubTool tool(kDcrawPath);
    tool.Plan(StubPlan().Print(printed));
    ToolOutput output(VLIBCPopen(kDcrawPath, "r", nullptr));
    std::vector<std::string> lines;
    while (const auto line = output.ReadLine()) {
      lines.push_back(*line);
    }
    return lines;
  }

  static std::string Split(const std::string& line) {
    const auto tag = SplitTagLine(line);
    return tag ? "[" + tag->name + "][" + tag->value + "]" : "nothing";
  }
};

TEST_F(ToolLines, EndAtTheirNewlines) {
  EXPECT_THAT(LinesOf(""), IsEmpty());
  EXPECT_THAT(LinesOf("\n"), ElementsAre(""));
  EXPECT_THAT(LinesOf("one\n\nthree\n"), ElementsAre("one", "", "three"));
  EXPECT_THAT(LinesOf("one\nlast"), ElementsAre("one", "last"));
  EXPECT_THAT(LinesOf("\r\n"), ElementsAre("\r"));
}

TEST_F(ToolLines, ComeInPiecesOf255Bytes) {
  const std::string piece(255, 'x');
  EXPECT_THAT(LinesOf(std::string(254, 'x') + "\nnext\n"),
              ElementsAre(std::string(254, 'x'), "next"));
  EXPECT_THAT(LinesOf(piece + "\nnext\n"), ElementsAre(piece, "", "next"));
  EXPECT_THAT(LinesOf(piece + piece + "y"), ElementsAre(piece, piece, "y"));
}

TEST_F(ToolLines, AreSplitAtTheirFirstColon) {
  EXPECT_EQ(Split("Rotation: 90"), "[Rotation][90]");
  EXPECT_EQ(Split("Rotation:90"), "[Rotation][90]");
  EXPECT_EQ(Split("Time: 10:20:30"), "[Time][10:20:30]");
  EXPECT_EQ(Split(":value"), "[][value]");
}

TEST_F(ToolLines, LoseWhiteSpaceAroundTheValueOnly) {
  EXPECT_EQ(Split(" Output size :\t 3 x 4 \r"), "[ Output size ][3 x 4]");
  EXPECT_EQ(Split("Rotation: \t "), "[Rotation][]");
}

TEST_F(ToolLines, WithoutAValueAreIgnored) {
  EXPECT_EQ(Split(""), "nothing");
  EXPECT_EQ(Split("Rotation 90"), "nothing");
  EXPECT_EQ(Split("Rotation:"), "nothing");
}

}  // namespace
}  // namespace vela_test
