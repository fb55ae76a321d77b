// A photo, the directory of its thumbnails and a recording converter.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "convert/velamk_photo_thumb.h"
#include "support/files.h"
#include "support/quiet_test.h"
#include "support/stub_tool.h"
#include "support/words.h"

namespace vela_test {

constexpr const char* kPhoto = "/tmp/photo/a.jpg";
constexpr const char* kOutDir = "/tmp/photo/@eaDir/a.jpg";

/// The path of a file in the directory of the thumbnails.
inline std::string InOutDir(const std::string& name) {
  return std::string(kOutDir) + "/" + name;
}

/// Thumbnail and temporary output of a width.
inline std::string ThumbPath(int width) {
  return InOutDir(std::to_string(width) + ".jpg");
}
inline std::string TempPath(int width) {
  return InOutDir("temp_" + std::to_string(width) + ".jpg");
}

inline PhotoThumbSetting MakeSetting(int width, bool fillArea = false) {
  PhotoThumbSetting setting;
  setting.srcPath = kPhoto;
  setting.destPath = ThumbPath(width);
  setting.outDir = kOutDir;
  setting.tempPath = TempPath(width);
  setting.fillArea = fillArea;
  setting.width = width;
  setting.height = width;
  return setting;
}

inline PhotoConvertJob MakeJob(const std::vector<int>& widths) {
  PhotoConvertJob job;
  for (const int width : widths) {
    job.settings.push_back(MakeSetting(width));
  }
  return job;
}

class ConvertTest : public QuietTest {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
    converter_.emplace(kConverterPath);
    WriteFileOfSize(kPhoto, 20000);
    MakeDirectories(kOutDir);
  }

  StubTool& Converter() { return *converter_; }

  /// The parameters of the converter's only call.
  std::vector<std::string> OnlyCall() const {
    const std::vector<StubCall> calls = converter_->Calls();
    EXPECT_EQ(calls.size(), 1U);
    return calls.empty() ? std::vector<std::string>() : calls.front().Parameters();
  }

  static std::vector<std::string> OutFiles() { return ListDirectory(kOutDir); }

 private:
  std::optional<StubTool> converter_;  // not before the sandbox is reset
};

}  // namespace vela_test
