// The whole command of a job, and how the converter is started.
#include <gmock/gmock.h>

#include <algorithm>
#include <iterator>
#include <string>
#include <vector>

#include "convert/convert_fixture.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::AnyOf;
using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::SizeIs;

using Words = std::vector<std::string>;

/// The options of a setting of MakeSetting.
Words Options(const std::string& box, bool fillArea = false) {
  return {"-define",    "jpeg:size=" + box,
          "-thumbnail", box + (fillArea ? ">^" : ">"),
          "-quality",   "90",
          "+profile",   "!icc,*",
          "-flatten",   "-colorspace",
          "sRGB"};
}

class RunCommand : public ConvertTest {
 protected:
  /// Runs the job, whose outputs all come, and gives the converter's parameters.
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

/// The lists one behind the other.
Words Joined(const std::vector<Words>& lists) {
  Words joined;
  for (const Words& list : lists) {
    joined.insert(joined.end(), list.begin(), list.end());
  }
  return joined;
}

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

TEST_F(RunCommand, OneThumb) {
  EXPECT_EQ(Run(MakeJob({320})), Joined({kBeginning, Last("320")}));
}

TEST_F(RunCommand, TwoThumbs) {
  EXPECT_EQ(Run(MakeJob({320, 1280})), Joined({kBeginning, First("1280"), Last("320")}));
}

TEST_F(RunCommand, ThreeThumbs) {
  EXPECT_EQ(Run(MakeJob({320, 1280, 120})),
            Joined({kBeginning, First("1280"), Middle("320"), Last("120")}));
}

TEST_F(RunCommand, SixThumbs) {
  EXPECT_EQ(Run(MakeJob({120, 240, 320, 640, 800, 1280})),
            Joined({kBeginning, First("1280"), Middle("800"), Middle("640"), Middle("320"),
                    Middle("240"), Last("120")}));
}

TEST_F(RunCommand, ThePathOfTheToolIsArgumentZero) {
  Run(MakeJob({320}));
  const StubCall call = Converter().Calls().at(0);
  EXPECT_EQ(call.path, "/usr/vela/bin/convert-thumb");
  EXPECT_EQ(call.arguments.at(0), "/usr/vela/bin/convert-thumb");
}

TEST_F(RunCommand, TheToolIsTheJobs) {
  RemoveTool(kConverterPath);
  const StubTool other("/usr/vela/convert-thumb");
  PhotoConvertJob job = MakeJob({320});
  job.toolPath = "/usr/vela/convert-thumb";
  EXPECT_EQ(RunPhotoConvertJob(job), 0);
  ASSERT_THAT(other.Calls(), SizeIs(1));
  EXPECT_EQ(other.Calls().front().path, "/usr/vela/convert-thumb");
  EXPECT_EQ(other.Calls().front().arguments.at(0), "/usr/vela/convert-thumb");
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
  EXPECT_EQ(Run(job), Joined({kBeginning,
                              {"(",
                               "-clone",
                               "0",
                               "-define",
                               "jpeg:size=1280x720",
                               "-thumbnail",
                               "1280x720>",
                               "-quality",
                               "70",
                               "+profile",
                               "!icc,*",
                               "-flatten",
                               "-auto-orient",
                               "-rotate",
                               "90",
                               "-colorspace",
                               "sRGB",
                               "-write",
                               TempPath(1280),
                               ")",
                               "-delete",
                               "0"},
                              {"-define", "jpeg:size=120x120", "-thumbnail", "120x120>", "-quality",
                               "90", "-unsharp", "1x1", TempPath(120)}}));
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

TEST_F(RunCommand, ScratchFilesGoWhereTheLargestThumbGoes) {
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
  for (const char* extension :
       {"tif", "tiff", "gif", "psd", "heic", "heif", "webp", "TIF", "Gif"}) {
    const std::string path = std::string("/tmp/photo/b.") + extension;
    EXPECT_EQ(InputFor(path), path + "[0]");
  }
}

TEST_F(RunCommand, OtherFormatsAreReadAsTheyAre) {
  for (const char* name : {"b.jpg", "b.png", "b.bmp", "b.ppm", "b.arw", "b.gif.jpg", "b", "tif"}) {
    const std::string path = std::string("/tmp/photo/") + name;
    EXPECT_EQ(InputFor(path), path);
  }
}

TEST_F(RunCommand, TheBytesOfTheInputReachTheConverter) {
  for (const std::string name : {"100%.jpg", "%d%s%%.jpg", "a b'c\"d\\e;$(f)`g`.jpg",
                                 "\xC3\xBC\xFF\n\t.jpg", "-flatten.jpg", "x[1-2].jpg", "50%.gif"}) {
    const std::string path = "/tmp/photo/" + name;
    EXPECT_EQ(InputFor(path), name == "50%.gif" ? path + "[0]" : path);
  }
}

TEST_F(RunCommand, TheInputIsCutAtItsBuffer) {
  // The name is as long as a path may be; of the page's mark only one character fits behind it.
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

TEST_F(RunCommand, TheConverterGetsNothingButItsStandardDescriptors) {
  Run(MakeJob({320}));
  const StubCall call = Converter().Calls().at(0);
  for (const OpenDescriptor& descriptor : call.descriptors) {
    EXPECT_THAT(descriptor.number, AnyOf(0, 1, 2)) << descriptor.target;
  }
}

TEST_F(RunCommand, TheConvertersOutputIsDropped) {
  Run(MakeJob({320}));
  const StubCall call = Converter().Calls().at(0);
  const auto output =
      std::find_if(call.descriptors.begin(), call.descriptors.end(),
                   [](const OpenDescriptor& descriptor) { return descriptor.number == 1; });
  ASSERT_NE(output, call.descriptors.end());
  EXPECT_EQ(output->target, "/dev/null");
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
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RunCommand, ThePhotoIsThatOfTheFirstSettingAsGiven) {
  WriteFile("/tmp/photo/other.jpg", "another photo");
  PhotoConvertJob job = MakeJob({120, 1280});
  job.settings[1].srcPath = "/tmp/photo/other.jpg";
  const Words parameters = Run(job);
  EXPECT_THAT(parameters, Contains(kPhoto));
  EXPECT_THAT(parameters, Not(Contains("/tmp/photo/other.jpg")));
}

}  // namespace
}  // namespace vela_test
