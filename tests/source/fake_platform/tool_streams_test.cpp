// How the tools are started and what happens when their stream cannot be read, with a fake of the
// platform's piped child.
#include <fcntl.h>

#include <cstdarg>

#include "platform/vlibc.h"
#include "source/orientation.h"
#include "source/raw_image.h"
#include "source/rotation_check.h"
#include "source/source_fixture.h"

namespace {

struct FakeChild {
  std::vector<std::string> started;  ///< each call as one line
  int closed = 0;
  std::string path;  ///< path that the stream reads, no stream when empty
};

FakeChild g_child;

}  // namespace

FILE* VLIBCPopen(const char* program, const char* mode, ...) {
  std::string line = std::string(mode) + " " + program;
  va_list arguments;
  va_start(arguments, mode);
  while (const char* argument = va_arg(arguments, const char*)) {
    line += std::string(" ") + argument;
  }
  va_end(arguments);
  g_child.started.push_back(line);
  return g_child.path.empty() ? nullptr : fopen(g_child.path.c_str(), "re");
}

int VLIBCPclose(FILE* stream) {
  ++g_child.closed;
  return fclose(stream);
}

namespace vela_test {
namespace {

class ToolStreams : public SourceTest {
 protected:
  void SetUp() override {
    SourceTest::SetUp();
    g_child = FakeChild();
  }

  static void Give(const std::string& text) {
    WriteFile("/tmp/output", text);
    g_child.path = "/tmp/output";
  }

  static int Size() {
    uint32_t width = 7;
    uint32_t height = 8;
    const int result = GetRawImageSize(kRaw, width, height);
    EXPECT_EQ(width + height, result == 1 ? 34U : 15U);
    return result;
  }
};

TEST_F(ToolStreams, OfTheSizeAreBinary) {
  Give("Output size: 4 x 30\nmore\n");
  EXPECT_EQ(Size(), 1);
  EXPECT_THAT(g_child.started, ElementsAre("rB /usr/bin/dcraw -i -v /tmp/photos/a.dng"));
  EXPECT_EQ(g_child.closed, 1);
}

TEST_F(ToolStreams, OfPicturesAreOutputOnly) {
  Give("picture");
  EXPECT_TRUE(DcrawToFile(kRaw, "/tmp/out", "-e"));
  EXPECT_TRUE(DcrawToFile(kRaw, "/tmp/out", "-w"));
  EXPECT_THAT(g_child.started, ElementsAre("r /usr/bin/dcraw -e -c /tmp/photos/a.dng",
                                           "r /usr/bin/dcraw -w -c /tmp/photos/a.dng"));
  EXPECT_EQ(g_child.closed, 2);
}

TEST_F(ToolStreams, OfTagsAreOutputOnly) {
  JpegRecipe upright;
  upright.orientation = 1;
  MakeJpeg("/tmp/preview.jpg", upright);
  Give("Rotation: 90\n");
  EXPECT_EQ(GetRawPreviewRotation(kRaw, "/tmp/preview.jpg"), 90);
  EXPECT_THAT(g_child.started,
              ElementsAre("r /usr/vela/bin/exiftool -S -Rotation /tmp/photos/a.dng"));
  EXPECT_EQ(g_child.closed, 1);
}

TEST_F(ToolStreams, OfDistancesHoldTheErrorOutput) {
  Give("5 (0.1)\n");
  EXPECT_EQ(CompareImagesMAE("/tmp/a.jpg", "/tmp/b.jpg"), 5);
  EXPECT_THAT(g_child.started,
              ElementsAre("rE /usr/bin/compare -metric MAE /tmp/a.jpg /tmp/b.jpg null:"));
  EXPECT_EQ(g_child.closed, 1);
}

TEST_F(ToolStreams, ThatAreMissingAreNotClosed) {
  EXPECT_EQ(Size(), 0);
  EXPECT_FALSE(DcrawToFile(kRaw, "/tmp/out", "-w"));
  EXPECT_EQ(CompareImagesMAE("/tmp/a.jpg", "/tmp/b.jpg"), 65535);
  EXPECT_EQ(g_child.closed, 0);
  EXPECT_EQ(ErrorLines().size(), 3U);
}

TEST_F(ToolStreams, AreClosedWhenTheOutputCannotBeStored) {
  Give("picture");
  EXPECT_FALSE(DcrawToFile(kRaw, "/tmp/nowhere/out", "-w"));
  EXPECT_EQ(g_child.closed, 1);
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:574 fopen failed, path=/tmp/nowhere/out, errno=2"));
}

TEST_F(ToolStreams, ThatCannotBeReadGiveNoPicture) {
  g_child.path = "/tmp";  // reading a directory is an error
  EXPECT_FALSE(DcrawToFile(kRaw, "/tmp/out", "-w"));
  EXPECT_EQ(g_child.closed, 1);
  EXPECT_EQ(FileSize("/tmp/out"), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:583 read failed, path=/tmp/photos/a.dng"));
}

TEST_F(ToolStreams, ThatCannotBeReadGiveNoSizeAndNoDistance) {
  g_child.path = "/tmp";
  EXPECT_EQ(Size(), 0);
  EXPECT_EQ(CompareImagesMAE("/tmp/a.jpg", "/tmp/b.jpg"), 65535);
  EXPECT_EQ(g_child.closed, 2);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
