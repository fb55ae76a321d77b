// Outputs of command lines for ImageMagick: they are written to the named file.

#include <sys/stat.h>

#include "converter_fixture.h"

namespace vela_test {
namespace {

using namespace ::testing;

/// Names with a special meaning to ImageMagick.
constexpr const char* kOddNames[] = {"@a.jpg",   "png:a.jpg", "-a.jpg",   "a:b.jpg",  "|a.jpg",
                                     "a[0].jpg", "a[1].jpg",  "a*.jpg",   "a?.jpg",   "{a,b}.jpg",
                                     "a\nb.jpg", "~a.jpg",    "a\\n.jpg", "&lt;.jpg", " a.jpg"};

class HandOverOutputs : public ConverterTest {
 protected:
  /// A source in a format that only ImageMagick reads.
  std::string MakeSource() const { return MakeImage(directory_ + "/source.bmp", 300, 200); }

  /// Files that patterns among the names above would match.
  void MakeNeighbours() const {
    for (const char* name : {"a0.jpg", "a1.jpg", "ab.jpg", "a.jpg", "b.jpg"}) {
      WriteFile(directory_ + "/" + name, name);
    }
  }

  void ExpectNeighboursUntouched() const {
    for (const char* name : {"a0.jpg", "a1.jpg", "ab.jpg", "a.jpg", "b.jpg"}) {
      EXPECT_EQ(ReadFile(directory_ + "/" + name), name);
    }
  }

  /// Runs the line in the directory of the source; expects a picture in the file `name`.
  void ExpectWritten(const CommandLine& line, const std::string& name) const {
    ProgramOptions options;
    options.workingDirectory = directory_;
    const ProgramResult result = RunConverter(line.Arguments(), options);
    EXPECT_EQ(result.exitCode, 0) << name << ": " << result.err;
    const std::string path = directory_ + "/" + name;
    EXPECT_TRUE(Exists(path)) << name;
    if (Exists(path)) {
      EXPECT_EQ(QuadrantLetters(path), "RGBY") << name;
    }
    RemoveTree(path);
  }
};

TEST_F(HandOverOutputs, HaveTheirNamesInTheWorkingDirectory) {
  const std::string source = MakeSource();
  MakeNeighbours();
  for (const std::string name : kOddNames) {
    ExpectWritten({source, directory_, {{{}, name}}}, name);
  }
  ExpectNeighboursUntouched();
}

TEST_F(HandOverOutputs, HaveTheirNamesInOtherDirectories) {
  const std::string source = MakeSource();
  MakeNeighbours();
  for (const std::string name : kOddNames) {
    ExpectWritten({source, directory_, {{{}, directory_ + "/" + name}}}, name);
  }
  ExpectWritten({source, directory_, {{{}, directory_ + "/100%%d%%[fx:w].jpg"}}},
                "100%d%[fx:w].jpg");
  ExpectNeighboursUntouched();
}

TEST_F(HandOverOutputs, HaveTheirNamesWhenThereAreSeveral) {
  const std::string source = MakeSource();
  MakeNeighbours();
  for (const std::string name : kOddNames) {
    ExpectWritten({source, directory_, {{{}, name}, {{}, "other*.jpg"}}}, name);
    EXPECT_EQ(QuadrantLetters(directory_ + "/other*.jpg"), "RGBY");
  }
  ExpectNeighboursUntouched();
}

TEST_F(HandOverOutputs, CanBeInDirectoriesWithOddNames) {
  const std::string source = MakeSource();
  for (const std::string name : kOddNames) {
    MakeDirectories(directory_ + "/" + name);
    ExpectWritten({source, directory_, {{{}, name + "/o.jpg"}}}, name + "/o.jpg");
  }
}

TEST_F(HandOverOutputs, FailWithOneLineWhenTheNameIsTooLong) {
  std::string name = directory_ + "/";
  for (int i = 0; i < 2100; ++i) {
    name += "%%";
  }
  const CommandLine line = {MakeSource(), directory_, {{{}, name + ".jpg"}}};
  const ProgramResult result = RunConverter(line.Arguments());
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err, StartsWith("convert-thumb: cannot write " + directory_ + "/%%%"));
  EXPECT_EQ(result.err.find('\n'), result.err.size() - 1);
  EXPECT_EQ(ListDirectory(directory_), std::vector<std::string>{"source.bmp"});
}

TEST_F(HandOverOutputs, FailWithOneLineWhenTheyArePipes) {
  const std::string pipe = directory_ + "/pipe%.jpg";
  ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
  ProgramOptions options;
  options.timeLimit = std::chrono::seconds(20);
  const CommandLine line = {MakeSource(), directory_, {{{}, directory_ + "/pipe%%.jpg"}}};
  const ProgramResult result = RunConverter(line.Arguments(), options);
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.err, "convert-thumb: " + pipe + ": not a regular file\n");
  EXPECT_TRUE(Exists(pipe));
}

class FailedOutputs : public HandOverOutputs {
 protected:
  /// ImageMagick opens the output of this photo before it notices that there are no pixels.
  std::string MakeDamagedPhoto() const {
    const std::string photo = MakeJpeg(directory_ + "/damaged.jpg");
    const std::string bytes = ReadFile(photo);
    WriteFile(photo, bytes.substr(0, bytes.find("\xff\xda")));
    return photo;
  }

  /// Runs a line that only ImageMagick understands.
  void ExpectFailure(const std::string& output) const {
    EXPECT_NE(RunConverter({MakeDamagedPhoto(), "-resize", "10x10", output}).exitCode, 0);
  }
};

TEST_F(FailedOutputs, AreRemovedWhereNobodyElseCanChangeThem) {
  for (const char* prefix : {"", "jpg:"}) {
    ExpectFailure(prefix + directory_ + "/o.jpg");
    EXPECT_EQ(ListDirectory(directory_), std::vector<std::string>{"damaged.jpg"}) << prefix;
  }
}

TEST_F(FailedOutputs, AreRemovedWhereOthersCanChangeThem) {
  const std::string shared = directory_ + "/shared";
  MakeDirectories(shared);
  ASSERT_EQ(chmod(shared.c_str(), 0777), 0);
  ExpectFailure(shared + "/o.jpg");
  EXPECT_THAT(ListDirectory(shared), IsEmpty());
}

TEST_F(FailedOutputs, RemainWhenTheyWereThereBefore) {
  WriteFile(directory_ + "/o.jpg", "older");
  ExpectFailure(directory_ + "/o.jpg");
  EXPECT_TRUE(Exists(directory_ + "/o.jpg"));
}

TEST_F(HandOverOutputs, KeepTheirMeaningWhereOnlyImageMagickUnderstandsTheLine) {
  const std::string source = MakeSource();
  ProgramOptions options;
  options.workingDirectory = directory_;
  ExpectSuccess(RunConverter({source + "[0]", "-negate", "png:o.jpg"}, options));
  EXPECT_EQ(ReadFile(directory_ + "/o.jpg").substr(1, 3), "PNG");
}

}  // namespace
}  // namespace vela_test
