// Command lines that the converter leaves to ImageMagick.

#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <memory>

#include "converter_fixture.h"
#include "support/stub_files.h"
#include "support/stub_tool.h"

namespace vela_test {
namespace {

using namespace ::testing;

constexpr char kLinkedImageMagick[] = "/usr/vela/lib/convert-thumb";

class HandOver : public ConverterTest {
 protected:
  void LinkImageMagick() const {
    MakeDirectories("/usr/vela/lib");
    ASSERT_EQ(symlink(kImageMagick, kLinkedImageMagick), 0);
  }

  void InstallStub() {
    MakeDirectories("/usr/vela/lib");
    stub_ = std::make_unique<StubTool>(kLinkedImageMagick);
  }

  /// Options under which stubs can record their calls.
  static ProgramOptions Recorded() {
    ProgramOptions options;
    options.addedEnvironment = {std::string("TMPDIR=") + kStubDirectory};
    return options;
  }

  /// The parameters that ImageMagick got in the only call.
  std::vector<std::string> HandedParameters() const {
    const std::vector<StubCall> calls = stub_->Calls();
    EXPECT_THAT(calls, SizeIs(1));
    return calls.empty() ? std::vector<std::string>() : calls.front().Parameters();
  }

  void ExpectHandedUnchanged(const std::vector<std::string>& arguments) const {
    RunConverter(arguments, Recorded());
    EXPECT_EQ(HandedParameters(), arguments);
  }

  /// Expects that the stub got these arguments, except that "*" after a colon stands for the
  /// name of a descriptor.
  void ExpectHanded(const std::vector<std::string>& arguments) const {
    const std::vector<std::string> handed = HandedParameters();
    ASSERT_EQ(handed.size(), arguments.size());
    for (size_t i = 0; i < handed.size(); ++i) {
      const size_t star = arguments[i].find(":*");
      if (star == std::string::npos) {
        EXPECT_EQ(handed[i], arguments[i]) << i;
      } else {
        EXPECT_THAT(handed[i], StartsWith(arguments[i].substr(0, star) + ":/proc/self/fd/")) << i;
        EXPECT_THAT(handed[i], EndsWith(arguments[i].substr(star + 2))) << i;
      }
    }
  }

  /// The files behind the descriptors above 2 that ImageMagick got.
  std::vector<std::string> HandedFiles() const {
    std::vector<std::string> files;
    for (const StubCall& call : stub_->Calls()) {
      for (const OpenDescriptor& descriptor : call.descriptors) {
        if (descriptor.number > 2) {
          files.push_back(descriptor.target);
        }
      }
    }
    return files;
  }

  std::unique_ptr<StubTool> stub_;
};

TEST_F(HandOver, PassesUnknownArgumentsUnchanged) {
  InstallStub();
  ExpectHandedUnchanged({"/a.jpg", "-blur", "0x1", "/b%d.png"});
}

TEST_F(HandOver, StaysTheSameProcessUnderTheSameNameWithoutOutputs) {
  InstallStub();
  Program program = StartProgram(ConvertThumbPath(), {"-version"}, Recorded());
  const pid_t pid = program.Pid();
  program.Wait();
  const std::vector<StubCall> calls = stub_->Calls();
  ASSERT_THAT(calls, SizeIs(1));
  EXPECT_EQ(calls.front().pid, pid);
  EXPECT_EQ(calls.front().tool, "convert-thumb");
  EXPECT_EQ(calls.front().arguments.front(), "convert-thumb");
}

TEST_F(HandOver, LeavesImageMagickItsSignals) {
  InstallStub();
  for (const auto& action : {SIG_DFL, SIG_IGN}) {
    ProgramOptions options = Recorded();
    options.beforeExec = {SetSignals({SIGPIPE, SIGXFSZ}, action)};
    RunConverter({"/a.jpg", "-blur", "0x1", "/b.png"}, options);
    const std::vector<int> ignored = stub_->Calls().back().ignoredSignals;
    EXPECT_EQ(Value(ignored, Contains(SIGPIPE)), action == SIG_IGN);
    EXPECT_EQ(Value(ignored, Contains(SIGXFSZ)), action == SIG_IGN);
  }
}

TEST_F(HandOver, PassesSourcesThatAreNotFilesUnchanged) {
  InstallStub();
  ExpectHandedUnchanged({"-size", "10x10", "gradient:red-blue", directory_ + "/b.png"});
}

TEST_F(HandOver, RefusesAMissingPhotoWithAnOddName) {
  InstallStub();
  const ProgramResult result = RunConverter({"/tmp/*.png", "/tmp/o.png"});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err, StartsWith("convert-thumb: /tmp/*.png: "));
  EXPECT_THAT(stub_->Calls(), SizeIs(0));
}

TEST_F(HandOver, PassesOtherFormats) {
  InstallStub();
  const std::string image = MakeImage(directory_ + "/a.bmp");
  const CommandLine line{image + "[0]", kStubDirectory, {{{}, directory_ + "/o.jpg"}}};
  RunConverter(line.Arguments());
  const CommandLine handed{"BMP:*[0]", kStubDirectory, {{{}, "jpg:*"}}};
  ExpectHanded(handed.Arguments());
}

TEST_F(HandOver, PassesCmykPhotosThatAreNotConverted) {
  InstallStub();
  JpegRecipe recipe;
  recipe.colour = JpegColour::kCmyk;
  const std::string photo = MakeJpeg(directory_ + "/a.jpg", recipe);
  ThumbOptions options;
  options.convertToSrgb = false;
  const CommandLine line{photo, kStubDirectory, {{options, directory_ + "/o.jpg"}}};
  RunConverter(line.Arguments());
  const CommandLine handed{"JPEG:*", kStubDirectory, {{options, "jpg:*"}}};
  ExpectHanded(handed.Arguments());
}

TEST_F(HandOver, PassesAllOutputs) {
  InstallStub();
  const std::string image = MakeImage(directory_ + "/a.bmp");
  CommandLine line{image, kStubDirectory, {}};
  CommandLine handed{"BMP:*", kStubDirectory, {}};
  for (const char* extension : {"jpg", "jpeg", "JPG"}) {
    line.outputs.push_back({{}, directory_ + "/o." + extension});
    handed.outputs.push_back({{}, std::string(extension) + ":*"});
  }
  RunConverter(line.Arguments());
  ExpectHanded(handed.Arguments());
  EXPECT_THAT(HandedFiles(), UnorderedElementsAre(image, directory_ + "/o.jpg",
                                                  directory_ + "/o.jpeg", directory_ + "/o.JPG"));
}

TEST_F(HandOver, PassesADescriptorWhateverTheSourcesName) {
  InstallStub();
  const std::string source = directory_ + "/a[*]%d:.bmp";
  CopyFile(MakeImage(directory_ + "/a.bmp"), source);
  const CommandLine line{source + "[0]", kStubDirectory, {{{}, directory_ + "/o.jpg"}}};
  RunConverter(line.Arguments());
  const CommandLine handed{"BMP:*[0]", kStubDirectory, {{{}, "jpg:*"}}};
  ExpectHanded(handed.Arguments());
  EXPECT_THAT(HandedFiles(), Contains(source));
}

TEST_F(HandOver, PassesNoOtherDescriptor) {
  InstallStub();
  const std::string image = MakeImage(directory_ + "/a.bmp");
  const CommandLine line{image, kStubDirectory, {{{}, directory_ + "/o.jpg"}}};
  RunConverter(line.Arguments());
  ASSERT_THAT(stub_->Calls(), SizeIs(1));
  EXPECT_THAT(HandedFiles(), UnorderedElementsAre(image, directory_ + "/o.jpg"));
}

TEST_F(HandOver, FailsWithoutImageMagick) {
  RemoveTool(kImageMagick);
  const ProgramResult result = RunConverter({"-version"});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err, StartsWith("convert-thumb: "));
}

TEST_F(HandOver, ImageMagickReadsSourcesWithOddNames) {
  LinkImageMagick();
  for (const char* name : {"a[1].png", "*.png", "{a}.png", "a:b.png", "%d.png", "@a.png"}) {
    const std::string source = directory_ + "/" + name;
    CopyFile(MakeImage(directory_ + "/plain.png", 300, 200), source);
    const CommandLine line{source + "[0]", directory_, {{{}, directory_ + "/o.jpg"}}};
    const ProgramResult result = RunConverter(line.Arguments());
    EXPECT_EQ(result.exitCode, 0) << name << result.err;
    EXPECT_EQ(QuadrantLetters(directory_ + "/o.jpg"), "RGBY") << name;
    RemoveTree(directory_ + "/o.jpg");
  }
}

TEST_F(HandOver, ImageMagickIsFoundWithoutItsLink) {
  const std::string image = MakeImage(directory_ + "/a.png", 300, 200);
  const CommandLine line{image, "", {{{}, directory_ + "/o.jpg"}}};
  EXPECT_EQ(RunConverter(line.Arguments()).exitCode, 0);
  EXPECT_EQ(QuadrantLetters(directory_ + "/o.jpg"), "RGBY");
}

TEST_F(HandOver, TurnsAPhotoInPlace) {
  LinkImageMagick();
  for (const char* name : {"plain.jpg", "odd[1]*.jpg"}) {
    const std::string photo = directory_ + "/" + name;
    MakeJpeg(photo);
    const ProgramResult result = RunConverter({"-rotate", "90", photo, photo});
    EXPECT_EQ(result.exitCode, 0) << name << result.err;
    EXPECT_EQ(QuadrantLetters(photo), LettersAfterTurn(90)) << name;
  }
}

}  // namespace
}  // namespace vela_test
