// What ImageMagick may do when a command line is left to it.

#include <unistd.h>

#include "converter_fixture.h"
#include "support/stub_files.h"
#include "support/stub_tool.h"

namespace vela_test {
namespace {

using namespace ::testing;

constexpr char kPolicies[] = "/usr/vela/share/imagemagick";
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
  RemoveTree("/etc/ImageMagick-6");
  MakeDirectories("/etc/ImageMagick-6");
  WriteFile("/etc/ImageMagick-6/policy.xml", kAllowEverything);
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

TEST_F(ImageMagickPolicy, MayBeTightenedByThatOfTheSystem) {
  const std::string photo = MakeImage(directory_ + "/a.bmp", 30, 20);
  RemoveTree("/etc/ImageMagick-6");
  MakeDirectories("/etc/ImageMagick-6");
  WriteFile("/etc/ImageMagick-6/policy.xml",
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

}  // namespace
}  // namespace vela_test
