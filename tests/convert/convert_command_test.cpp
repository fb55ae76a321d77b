// The converter's arguments, part by part.
#include <functional>

#include "convert/convert_command.h"
#include "convert/convert_fixture.h"
#include "platform/velautils.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

class ConvertCommand : public QuietTest {
 protected:
  using AddArguments = std::function<void(VELAUtils::ProcessRunner& runner)>;

  /// The parameters that this call alone passes to the converter.
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

const Words kPlainOptions = WordsOf("-define jpeg:size=320x320 -thumbnail 320x320> -quality 90");

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
  EXPECT_EQ(
      Options(setting),
      WordsOf(
          "-define jpeg:size=1280x960 -thumbnail 1280x960>^ -quality 75 +profile "
          "!icc,* -flatten -auto-orient -rotate 270 -unsharp 0.5x0.5+1.25+0.0 -colorspace Gray"));
}

TEST_F(ConvertCommand, SingleOptions) {
  EXPECT_EQ(Options(PhotoThumbSetting()),
            Joined({kPlainOptions, {"+profile", "!icc,*", "-flatten", "-colorspace", "sRGB"}}));
  const struct {
    void (*change)(PhotoThumbSetting& setting);
    Words words;
  } cases[] = {
      {[](PhotoThumbSetting&) {}, {}},
      {[](PhotoThumbSetting& s) { s.stripProfiles = true; }, {"+profile", "!icc,*"}},
      {[](PhotoThumbSetting& s) { s.flatten = true; }, {"-flatten"}},
      {[](PhotoThumbSetting& s) { s.autoOrient = true; }, {"-auto-orient"}},
      {[](PhotoThumbSetting& s) { s.unsharp = "  as it is %d"; }, {"-unsharp", "  as it is %d"}},
      {[](PhotoThumbSetting& s) { s.colorspace = "CMYK"; }, {"-colorspace", "CMYK"}},
  };
  for (const auto& c : cases) {
    PhotoThumbSetting setting = Plain();
    c.change(setting);
    EXPECT_EQ(Options(setting), Joined({kPlainOptions, c.words}));
  }
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
  EXPECT_EQ(Options(setting),
            WordsOf("-define jpeg:size=0x-7 -thumbnail 0x-7> -quality -2147483647"));
}

TEST_F(ConvertCommand, FirstOutputIsACopyOfThePhotoWhichIsThenDeleted) {
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

TEST_F(ConvertCommand, OutputsAreEscapedAndThenTruncatedBetweenEscapes) {
  const std::string fits(8191, 'p');
  const struct {
    std::string path;
    std::string argument;
  } cases[] = {
      {"%/50%%d %s%", "%%/50%%%%d %%s%%"},
      {fits, fits},
      {fits + "q", fits},
      {std::string(20000, 'p'), fits},
      {std::string(5000, '%'), std::string(8190, '%')},
      {"p" + std::string(5000, '%'), "p" + std::string(8190, '%')},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(LastOutput(c.path).back(), c.argument) << c.path.substr(0, 20);
  }
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

TEST_F(ConvertCommand, ThereIsNoScratchOptionWithoutOutputDirectory) {
  PhotoConvertJob job;
  EXPECT_THAT(TempPathDefine(job), IsEmpty());
  job.settings.resize(2);
  job.settings[1].outDir = "/tmp/second";
  EXPECT_THAT(TempPathDefine(job), IsEmpty());
}

TEST_F(ConvertCommand, TheScratchOptionIsTruncatedAtItsBuffer) {
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
