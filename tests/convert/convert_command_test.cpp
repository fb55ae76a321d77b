// The converter's arguments, part by part.
#include <gmock/gmock.h>

#include <functional>
#include <string>
#include <vector>

#include "convert/convert_command.h"
#include "platform/velautils.h"
#include "support/sandbox.h"
#include "support/stub_tool.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

using Words = std::vector<std::string>;

class ConvertCommand : public SandboxTest {
 protected:
  using AddArguments = std::function<void(VELAUtils::ProcessRunner& runner)>;

  /// What reaches the converter when these arguments are all it gets.
  static Words Arguments(const AddArguments& add) {
    const StubTool converter(kConverterPath);
    converter.Plan(StubPlan());
    VELAUtils::ProcessRunner runner(kConverterPath, kConverterPath);
    add(runner);
    EXPECT_EQ(runner.run(true, false), 0);
    const std::vector<StubCall> calls = converter.Calls();
    return calls.empty() ? Words() : calls.back().Parameters();
  }

  static Words Options(const PhotoThumbSetting& setting) {
    return Arguments([&](VELAUtils::ProcessRunner& r) { AddThumbOptions(r, setting); });
  }

  static Words TempPathDefine(const PhotoConvertJob& job) {
    return Arguments([&](VELAUtils::ProcessRunner& r) { AddTempPathDefine(job, r); });
  }

  static Words LastOutput(const std::string& tempPath) {
    PhotoThumbSetting setting = Plain();
    setting.tempPath = tempPath;
    return Arguments([&](VELAUtils::ProcessRunner& r) { AddLastOutput(r, setting); });
  }

  /// A setting with every option off.
  static PhotoThumbSetting Plain() {
    PhotoThumbSetting setting;
    setting.tempPath = "/tmp/t.jpg";
    setting.stripProfiles = false;
    setting.flatten = false;
    setting.colorspace = "";
    return setting;
  }
};

const Words kPlainOptions = {"-define",  "jpeg:size=320x320", "-thumbnail",
                             "320x320>", "-quality",          "90"};

/// `words`, one list behind the other.
Words Joined(const std::vector<Words>& lists) {
  Words joined;
  for (const Words& list : lists) {
    joined.insert(joined.end(), list.begin(), list.end());
  }
  return joined;
}

TEST_F(ConvertCommand, OptionsOfANewSetting) {
  EXPECT_EQ(Options(PhotoThumbSetting()),
            Joined({kPlainOptions, {"+profile", "!icc,*", "-flatten", "-colorspace", "sRGB"}}));
}

TEST_F(ConvertCommand, EveryOptionOff) {
  EXPECT_EQ(Options(Plain()), kPlainOptions);
}

TEST_F(ConvertCommand, EveryOptionOn) {
  PhotoThumbSetting setting;
  setting.fillArea = true;
  setting.width = 1280;
  setting.height = 960;
  setting.quality = 75;
  setting.autoOrient = true;
  setting.rotate = 270;
  setting.unsharp = "0.5x0.5+1.25+0.0";
  setting.colorspace = "Gray";
  EXPECT_THAT(Options(setting),
              ElementsAre("-define", "jpeg:size=1280x960", "-thumbnail", "1280x960>^", "-quality",
                          "75", "+profile", "!icc,*", "-flatten", "-auto-orient", "-rotate", "270",
                          "-unsharp", "0.5x0.5+1.25+0.0", "-colorspace", "Gray"));
}

TEST_F(ConvertCommand, EveryOptionAlone) {
  PhotoThumbSetting setting = Plain();
  setting.stripProfiles = true;
  EXPECT_EQ(Options(setting), Joined({kPlainOptions, {"+profile", "!icc,*"}}));
  setting = Plain();
  setting.flatten = true;
  EXPECT_EQ(Options(setting), Joined({kPlainOptions, {"-flatten"}}));
  PhotoThumbSetting upright(Plain());
  upright.autoOrient = true;
  EXPECT_EQ(Options(upright), Joined({kPlainOptions, {"-auto-orient"}}));
  PhotoThumbSetting sharp(Plain());
  sharp.unsharp = "  as it is %d";
  EXPECT_EQ(Options(sharp), Joined({kPlainOptions, {"-unsharp", "  as it is %d"}}));
  PhotoThumbSetting coloured(Plain());
  coloured.colorspace = "CMYK";
  EXPECT_EQ(Options(coloured), Joined({kPlainOptions, {"-colorspace", "CMYK"}}));
}

TEST_F(ConvertCommand, OnlyPositiveRotationsArePassed) {
  PhotoThumbSetting setting = Plain();
  for (const int rotate : {0, -1, -90}) {
    setting.rotate = rotate;
    EXPECT_EQ(Options(setting), kPlainOptions) << rotate;
  }
  for (const int rotate : {1, 90, 180, 270, 360}) {
    setting.rotate = rotate;
    EXPECT_EQ(Options(setting), Joined({kPlainOptions, {"-rotate", std::to_string(rotate)}}));
  }
}

TEST_F(ConvertCommand, NumbersArePassedAsTheyAre) {
  PhotoThumbSetting setting = Plain();
  setting.width = 0;
  setting.height = -7;
  setting.quality = -2147483647;
  EXPECT_THAT(Options(setting), ElementsAre("-define", "jpeg:size=0x-7", "-thumbnail", "0x-7>",
                                            "-quality", "-2147483647"));
}

TEST_F(ConvertCommand, FirstOutputIsACopyOfThePhotoWhichThenGoes) {
  PhotoThumbSetting setting = Plain();
  setting.tempPath = "/tmp/100%.jpg";
  EXPECT_EQ(Arguments([&](VELAUtils::ProcessRunner& r) { AddFirstOutput(r, setting); }),
            Joined({{"(", "-clone", "0"},
                    kPlainOptions,
                    {"-write", "/tmp/100%%.jpg", ")", "-delete", "0"}}));
}

TEST_F(ConvertCommand, MiddleOutputIsACopyOfTheLargestThumb) {
  PhotoThumbSetting setting = Plain();
  setting.tempPath = "/tmp/100%.jpg";
  EXPECT_EQ(Arguments([&](VELAUtils::ProcessRunner& r) { AddMiddleOutput(r, setting); }),
            Joined({{"(", "+clone"}, kPlainOptions, {"-write", "/tmp/100%%.jpg", "+delete", ")"}}));
}

TEST_F(ConvertCommand, LastOutputEndsTheCommand) {
  EXPECT_EQ(LastOutput("/tmp/t.jpg"), Joined({kPlainOptions, {"/tmp/t.jpg"}}));
}

TEST_F(ConvertCommand, PercentSignsOfOutputsAreEscaped) {
  EXPECT_EQ(LastOutput("%/50%%d %s%").back(), "%%/50%%%%d %%s%%");
}

TEST_F(ConvertCommand, OutputsAreCutAtTheirBuffer) {
  const std::string fits(8191, 'p');
  EXPECT_EQ(LastOutput(fits).back(), fits);
  EXPECT_EQ(LastOutput(fits + "q").back(), fits);
  EXPECT_EQ(LastOutput(std::string(20000, 'p')).back(), fits);
}

TEST_F(ConvertCommand, OutputsAreCutAfterEscapingAndNeverInsideAnEscape) {
  EXPECT_EQ(LastOutput(std::string(5000, '%')).back(), std::string(8190, '%'));
  EXPECT_EQ(LastOutput("p" + std::string(5000, '%')).back(), "p" + std::string(8190, '%'));
}

TEST_F(ConvertCommand, LongArgumentsArePassedWhole) {
  PhotoThumbSetting setting = Plain();
  setting.unsharp = std::string(5000, '1');
  setting.colorspace = std::string(5000, 'c');
  const Words options = Options(setting);
  ASSERT_EQ(options.size(), 10U);
  EXPECT_EQ(options[7], setting.unsharp);
  EXPECT_EQ(options[9], setting.colorspace);
}

TEST_F(ConvertCommand, ScratchFilesGoIntoTheOutputDirectoryOfTheFirstSetting) {
  PhotoConvertJob job;
  job.settings.resize(2);
  job.settings[0].outDir = "/tmp/first 100%";
  job.settings[1].outDir = "/tmp/second";
  EXPECT_THAT(TempPathDefine(job),
              ElementsAre("-define", "registry:temporary-path=/tmp/first 100%"));
}

TEST_F(ConvertCommand, ScratchFilesGoWhereTheConverterLikesWithoutOutputDirectory) {
  PhotoConvertJob job;
  EXPECT_THAT(TempPathDefine(job), IsEmpty());
  job.settings.resize(2);
  job.settings[1].outDir = "/tmp/second";
  EXPECT_THAT(TempPathDefine(job), IsEmpty());
}

TEST_F(ConvertCommand, TheScratchOptionIsCutAtItsBuffer) {
  const std::string option = "registry:temporary-path=";
  PhotoConvertJob job;
  job.settings.resize(1);
  job.settings[0].outDir = std::string(4095 - option.size(), 'd');
  EXPECT_EQ(TempPathDefine(job).back(), option + job.settings[0].outDir);
  job.settings[0].outDir += "e";
  EXPECT_EQ(TempPathDefine(job).back(), option + std::string(4095 - option.size(), 'd'));
}

}  // namespace
}  // namespace vela_test
