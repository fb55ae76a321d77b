// What ImageMagick may do when a command line is left to it.

#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <set>
#include <sstream>

#include "converter_fixture.h"
#include "support/build_paths.h"
#include "support/stub_tool.h"

namespace vela_test {
namespace {

using namespace ::testing;

constexpr char kPolicies[] = "/usr/vela/share/imagemagick";
constexpr const char* kConfiguration = vela::kImageMagickConfiguration;
constexpr char kAllowEverything[] =
    "<policymap>\n<policy domain=\"coder\" rights=\"read|write\" pattern=\"*\"/>\n"
    "<policy domain=\"delegate\" rights=\"read|write|execute\" pattern=\"*\"/>\n"
    "<policy domain=\"path\" rights=\"read|write\" pattern=\"*\"/>\n"
    "<policy domain=\"resource\" name=\"width\" value=\"1MP\"/>\n</policymap>\n";

class ImageMagickPolicy : public ConverterTest {
 protected:
  const std::string output_ = directory_ + "/o.png";

  /// ImageMagick's verdict on a command line that only it supports.
  bool IsAllowed(const std::vector<std::string>& source,
                 const std::vector<std::string>& environment = {}) const {
    std::vector<std::string> arguments = {"-size", "20x10"};
    arguments.insert(arguments.end(), source.begin(), source.end());
    arguments.push_back(output_);
    ProgramOptions options;
    options.addedEnvironment = environment;
    const ProgramResult result = RunConverter(arguments, options);
    EXPECT_EQ(result.exitCode == 0, Exists(output_)) << source.front() << result.err;
    const bool isAllowed = Exists(output_);
    RemoveTree(output_);
    return isAllowed;
  }

  void ExpectOnlyPhotos(const std::vector<std::string>& environment = {}) const {
    const std::string photo = MakeImage(directory_ + "/a.bmp", 30, 20);
    const std::string text = directory_ + "/a.txt";
    WriteFile(text, "a line\n");
    EXPECT_TRUE(IsAllowed({photo}, environment));
    for (const std::string source : {"gradient:red-blue", "label:text", "xc:red"}) {
      EXPECT_FALSE(IsAllowed({source}, environment)) << source;
    }
    EXPECT_FALSE(IsAllowed({"text:" + text}, environment));
    EXPECT_FALSE(IsAllowed({"@" + text}, environment));
    WriteFile(directory_ + "/a.svg", "<svg width='20' height='10'/>");
    EXPECT_FALSE(IsAllowed({"svg:" + directory_ + "/a.svg"}, environment));
  }
};

TEST_F(ImageMagickPolicy, AllowsOnlyPhotos) {
  ExpectOnlyPhotos();
}

TEST_F(ImageMagickPolicy, IsNotLoosenedByThatOfTheSystem) {
  RemoveTree(kConfiguration);
  MakeDirectories(kConfiguration);
  WriteFile(std::string(kConfiguration) + "/policy.xml", kAllowEverything);
  ExpectOnlyPhotos();
}

TEST_F(ImageMagickPolicy, IsNotLoosenedByTheEnvironment) {
  for (const std::string place : {"", "/.config/ImageMagick", "/ImageMagick", "/.magick"}) {
    MakeDirectories(directory_ + "/home" + place);
    WriteFile(directory_ + "/home" + place + "/policy.xml", kAllowEverything);
  }
  const std::string home = directory_ + "/home";
  ExpectOnlyPhotos({"HOME=" + home, "XDG_CONFIG_HOME=" + home, "MAGICK_CONFIGURE_PATH=" + home,
                    "MAGICK_HOME=" + home});
}

/// The names in the braces of a policy.
std::set<std::string> NamesIn(const std::string& policy) {
  std::set<std::string> names;
  for (size_t start = policy.find('{'); start != std::string::npos;
       start = policy.find('{', start + 1)) {
    std::istringstream list(policy.substr(start + 1, policy.find('}', start) - start - 1));
    for (std::string name; std::getline(list, name, ',');) {
      names.insert(name);
    }
  }
  return names;
}

char ToUpper(char letter) {
  return static_cast<char>(std::toupper(static_cast<unsigned char>(letter)));
}

/// The formats that the installed version knows, in capitals: names before the module, with or
/// without an asterisk, in a table with a line of dashes above it.
std::vector<std::string> KnownFormats() {
  std::istringstream table(RunProgram(kImageMagick, {"-list", "format"}).out);
  std::vector<std::string> formats;
  bool isInTable = false;
  for (std::string line; std::getline(table, line);) {
    std::istringstream fields(line);
    std::string name;
    std::string module;
    std::string mode;
    fields >> name >> module >> mode;
    isInTable = isInTable || name.compare(0, 3, "---") == 0;
    if (isInTable && mode.size() == 3 && mode.find_first_not_of("rw-+") == std::string::npos) {
      std::transform(name.begin(), name.end(), name.begin(), ToUpper);
      formats.push_back(name.substr(0, name.find('*')));
    }
  }
  return formats;
}

TEST_F(ImageMagickPolicy, NamesEveryFormatOfTheInstalledVersion) {
  const std::set<std::string> photos = NamesIn(ReadFile(std::string(kPolicies) + "/policy.xml"));
  const std::set<std::string> others =
      NamesIn(ReadFile(std::string(kPolicies) + "/last/ImageMagick/policy.xml"));
  const std::vector<std::string> formats = KnownFormats();
  EXPECT_THAT(formats, AllOf(Contains("JPEG"), Contains("MSL"), Contains("YUV")));
  for (const std::string& format : formats) {
    EXPECT_EQ(photos.count(format) + others.count(format), 1) << format;
  }
}

TEST_F(ImageMagickPolicy, MayBeTightenedByThatOfTheSystem) {
  const std::string photo = MakeImage(directory_ + "/a.bmp", 30, 20);
  RemoveTree(kConfiguration);
  MakeDirectories(kConfiguration);
  WriteFile(std::string(kConfiguration) + "/policy.xml",
            "<policymap>\n<policy domain=\"coder\" rights=\"none\" pattern=\"BMP\"/>\n"
            "</policymap>\n");
  EXPECT_FALSE(IsAllowed({photo}));
}

TEST_F(ImageMagickPolicy, IsRequired) {
  const std::string photo = MakeImage(directory_ + "/a.bmp", 30, 20);
  unlink(kPolicies);
  const ProgramResult result = RunConverter({photo, "-negate", output_});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.err, std::string("convert-thumb: ") + kPolicies +
                            "/policy.xml: No such file or directory, so ImageMagick is not used\n");
  EXPECT_FALSE(Exists(output_));
}

/// The alternative converter, a script that only calls ImageMagick.
class WrapperScript : public ConverterTest {
 protected:
  void SetUp() override {
    ConverterTest::SetUp();
    MakeDirectories("/usr/vela/lib");
    ASSERT_EQ(symlink(kImageMagick, "/usr/vela/lib/convert-thumb"), 0);
  }

  static ProgramResult RunScript(const std::vector<std::string>& arguments) {
    return RunProgram(SourceDirectory() + "/programs/convert-thumb/convert-thumb.sh", arguments);
  }
};

TEST_F(WrapperScript, ConvertsPhotosOfEveryFormat) {
  for (const char* name : {"a.jpg", "a.png", "a.gif", "a.bmp", "a.tif", "a.psd", "a.webp", "a.heic",
                           "a.avif", "a.jp2", "a.ppm", "pgm:a.pgm"}) {
    const CommandLine line{MakePicture(name, 60, 40) + "[0]",
                           directory_,
                           {{{}, directory_ + "/one.jpg"}, {{}, directory_ + "/two.jpg"}}};
    const ProgramResult result = RunScript(line.Arguments());
    EXPECT_EQ(result.exitCode, 0) << name << result.err;
    EXPECT_TRUE(IsWholeJpeg(directory_ + "/two.jpg")) << name;
    RemoveTree(directory_ + "/one.jpg");
    RemoveTree(directory_ + "/two.jpg");
  }
}

TEST_F(WrapperScript, RefusesEverythingElse) {
  const std::string photo = directory_ + "/a.jpg";
  for (const char* content : {"<svg width='20' height='10'/>", "viewbox 0 0 9 9\n", "a line\n", "",
                              "id=MagickCache\n", "%!PS\n"}) {
    WriteFile(photo, content);
    const CommandLine line{photo + "[0]", directory_, {{{}, directory_ + "/o.jpg"}}};
    const ProgramResult result = RunScript(line.Arguments());
    EXPECT_EQ(result.exitCode, 1) << content;
    EXPECT_EQ(result.err, "convert-thumb: not a photo in a known format: " + photo + "\n");
    EXPECT_FALSE(Exists(directory_ + "/o.jpg")) << content;
  }
}

TEST_F(WrapperScript, UsesThePolicy) {
  EXPECT_NE(RunScript({"label:text", directory_ + "/o.png"}).exitCode, 0);
  EXPECT_FALSE(Exists(directory_ + "/o.png"));
}

}  // namespace
}  // namespace vela_test
