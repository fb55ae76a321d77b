// The whole command of a job, and how the converter is started.
#include <algorithm>
#include <iterator>

#include "convert/convert_fixture.h"
#include "support/named_case.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::AnyOf;
using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Not;

/// The options of a setting from MakeSetting.
Words Options(const std::string& box) {
  return WordsOf("-define jpeg:size=" + box + " -thumbnail " + box +
                 "> -quality 90 +profile !icc,* -flatten -colorspace sRGB");
}

class RunCommand : public ConvertTest {
 protected:
  /// Runs the job, which must succeed; returns the converter's parameters.
  Words Run(PhotoConvertJob job) {
    EXPECT_EQ(RunPhotoConvertJob(job), 0);
    return OnlyCall();
  }

  /// The input argument for a photo of this path.
  std::string InputFor(const std::string& path) {
    WriteFileOfSize(path, 20000);
    PhotoConvertJob job = MakeJob({320});
    job.settings[0].srcPath = path;
    EXPECT_EQ(RunPhotoConvertJob(job), 0) << path;
    return Converter().Calls().back().Parameters().at(2);
  }
};

const Words kBeginning = {"-define", "registry:temporary-path=/tmp/photo/@eaDir/a.jpg", kPhoto};

Words First(const std::string& size) {
  return Joined({{"(", "-clone", "0"},
                 Options(size + "x" + size),
                 {"-write", InOutDir("temp_" + size + ".jpg"), ")", "-delete", "0"}});
}

Words Middle(const std::string& size) {
  return Joined({{"(", "+clone"},
                 Options(size + "x" + size),
                 {"-write", InOutDir("temp_" + size + ".jpg"), "+delete", ")"}});
}

Words Last(const std::string& size) {
  return Joined({Options(size + "x" + size), {InOutDir("temp_" + size + ".jpg")}});
}

struct WidthsCase : NamedCase {
  std::vector<int> widths;
  Words command;
};

class CommandOfWidths : public RunCommand, public ::testing::WithParamInterface<WidthsCase> {};

TEST_P(CommandOfWidths, IsComplete) {
  EXPECT_EQ(Run(MakeJob(GetParam().widths)), GetParam().command);
}

const WidthsCase kWidths[] = {
    {"OneThumb", {320}, Joined({kBeginning, Last("320")})},
    {"TwoThumbs", {320, 1280}, Joined({kBeginning, First("1280"), Last("320")})},
    {"ThreeThumbs",
     {320, 1280, 120},
     Joined({kBeginning, First("1280"), Middle("320"), Last("120")})},
    {"SixThumbs",
     {120, 240, 320, 640, 800, 1280},
     Joined({kBeginning, First("1280"), Middle("800"), Middle("640"), Middle("320"), Middle("240"),
             Last("120")})},
};
INSTANTIATE_TEST_SUITE_P(Thumbs, CommandOfWidths, ::testing::ValuesIn(kWidths), CaseName());

TEST_F(RunCommand, ThePathOfTheToolIsArgumentZero) {
  for (const char* path : {"/usr/vela/bin/convert-thumb", "/usr/vela/convert-thumb"}) {
    SCOPED_TRACE(path);
    RemoveTool(kConverterPath);
    const StubTool tool(path);
    PhotoConvertJob job = MakeJob({320});
    job.toolPath = path;
    EXPECT_EQ(RunPhotoConvertJob(job), 0);
    ASSERT_THAT(tool.Calls(), Not(IsEmpty()));
    EXPECT_EQ(tool.Calls().back().path, path);
    EXPECT_EQ(tool.Calls().back().arguments.at(0), path);
  }
}

TEST_F(RunCommand, EverySettingHasItsOwnOptions) {
  PhotoThumbSetting large = MakeSetting(1280);
  large.height = 720;
  large.quality = 70;
  large.autoOrient = true;
  large.rotate = 90;
  PhotoThumbSetting small = MakeSetting(120);
  small.stripProfiles = false;
  small.flatten = false;
  small.unsharp = "1x1";
  small.colorspace = "";
  PhotoConvertJob job;
  job.settings = {large, small};
  const Words largeOptions = WordsOf(
      "-define jpeg:size=1280x720 -thumbnail 1280x720> -quality 70 +profile !icc,* -flatten "
      "-auto-orient -rotate 90 -colorspace sRGB");
  const Words smallOptions =
      WordsOf("-define jpeg:size=120x120 -thumbnail 120x120> -quality 90 -unsharp 1x1");
  EXPECT_EQ(Run(job), Joined({kBeginning,
                              {"(", "-clone", "0"},
                              largeOptions,
                              {"-write", TempPath(1280), ")", "-delete", "0"},
                              smallOptions,
                              {TempPath(120)}}));
}

TEST_F(RunCommand, FillModesStayAtTheirPositions) {
  PhotoConvertJob job;
  job.settings = {MakeSetting(120, false), MakeSetting(320, true), MakeSetting(640, false),
                  MakeSetting(1280, true)};
  const Words parameters = Run(job);
  Words boxes;
  std::copy_if(parameters.begin(), parameters.end(), std::back_inserter(boxes),
               [](const std::string& word) { return word.find('>') != std::string::npos; });
  EXPECT_THAT(boxes, ElementsAre("1280x1280>", "640x640>^", "320x320>", "120x120>^"));
}

TEST_F(RunCommand, ScratchFilesAreMadeBesideTheLargestThumb) {
  PhotoConvertJob job = MakeJob({120, 1280});
  MakeDirectories("/tmp/small");
  job.settings[0].outDir = "/tmp/small";
  EXPECT_THAT(Run(job), Contains("registry:temporary-path=/tmp/photo/@eaDir/a.jpg"));
}

TEST_F(RunCommand, WithoutOutputDirectoryThereIsNoScratchOption) {
  PhotoConvertJob job = MakeJob({320});
  job.settings[0].outDir = "";
  EXPECT_EQ(Run(job), Joined({{kPhoto}, Last("320")}));
}

TEST_F(RunCommand, OnlyTheFirstPageOfMultiPageFormatsIsRead) {
  for (const std::string name : {"b.tif", "b.tiff", "b.gif", "b.psd", "b.heic", "b.heif", "b.webp",
                                 "b.TIF", "b.Gif", "50%.gif"}) {
    EXPECT_EQ(InputFor("/tmp/photo/" + name), "/tmp/photo/" + name + "[0]");
  }
}

TEST_F(RunCommand, OtherInputsArePassedUnchanged) {
  for (const std::string name : {"b.jpg", "b.png", "b.bmp", "b.ppm", "b.arw", "b.gif.jpg", "b",
                                 "tif", "100%.jpg", "%d%s%%.jpg", "a b'c\"d\\e;$(f)`g`.jpg",
                                 "\xC3\xBC\xFF\n\t.jpg", "-flatten.jpg", "x[1-2].jpg"}) {
    EXPECT_EQ(InputFor("/tmp/photo/" + name), "/tmp/photo/" + name);
  }
}

TEST_F(RunCommand, TheInputIsTruncatedAtItsBuffer) {
  // The path is as long as possible; only one character of the page suffix fits after it.
  std::string path = "/tmp/photo";
  while (path.size() + 201 < 4094 - 6) {
    path += "/" + std::string(200, 'd');
  }
  path += "/" + std::string(4094 - path.size() - 5, 'f') + ".gif";
  ASSERT_EQ(path.size(), 4094U);
  EXPECT_EQ(InputFor(path), path + "[");
}

TEST_F(RunCommand, PercentSignsAreEscapedInOutputsOnly) {
  const std::string directory = "/tmp/photo/@eaDir/100%.jpg";
  MakeDirectories(directory);
  WriteFile("/tmp/photo/100%.jpg", "photo");
  PhotoConvertJob job = MakeJob({320});
  PhotoThumbSetting& setting = job.settings.front();
  setting.srcPath = "/tmp/photo/100%.jpg";
  setting.outDir = directory;
  setting.tempPath = directory + "/t.jpg";
  setting.destPath = directory + "/d.jpg";
  EXPECT_EQ(Run(job),
            Joined({{"-define", "registry:temporary-path=" + directory, "/tmp/photo/100%.jpg"},
                    Options("320x320"),
                    {"/tmp/photo/@eaDir/100%%.jpg/t.jpg"}}));
  EXPECT_THAT(ListDirectory(directory), ElementsAre("d.jpg"));
}

TEST_F(RunCommand, TheConverterGetsItsStandardDescriptorsOnly) {
  Run(MakeJob({320}));
  const StubCall call = Converter().Calls().at(0);
  bool hasOutput = false;
  for (const OpenDescriptor& descriptor : call.descriptors) {
    EXPECT_THAT(descriptor.number, AnyOf(0, 1, 2)) << descriptor.target;
    if (descriptor.number == 1) {
      hasOutput = true;
      EXPECT_EQ(descriptor.target, "/dev/null") << "the converter's output is not discarded";
    }
  }
  EXPECT_TRUE(hasOutput);
}

TEST_F(RunCommand, TheConverterIsWaitedFor) {
  Converter().Plan(StubPlan().WriteOutputs().Sleep(200));
  PhotoConvertJob job = MakeJob({320});
  EXPECT_EQ(RunPhotoConvertJob(job), 0);
  const StubCall call = Converter().Calls().at(0);
  EXPECT_GT(call.endSequence, 0U);
  EXPECT_LT(call.endSequence, NextSequence());
}

TEST_F(RunCommand, AJobWithoutSettingsRunsNothing) {
  PhotoConvertJob job;
  EXPECT_EQ(RunPhotoConvertJob(job), 0);
  EXPECT_THAT(Converter().Calls(), IsEmpty());
}

TEST_F(RunCommand, ThePhotoIsThatOfTheFirstSettingBeforeSorting) {
  WriteFile("/tmp/photo/other.jpg", "another photo");
  PhotoConvertJob job = MakeJob({120, 1280});
  job.settings[1].srcPath = "/tmp/photo/other.jpg";
  const Words parameters = Run(job);
  EXPECT_THAT(parameters, Contains(kPhoto));
  EXPECT_THAT(parameters, Not(Contains("/tmp/photo/other.jpg")));
}

}  // namespace
}  // namespace vela_test
