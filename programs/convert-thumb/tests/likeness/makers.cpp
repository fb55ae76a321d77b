#include "likeness/makers.h"

#include <algorithm>
#include <utility>

#include "converter_fixture.h"
#include "png_chunks.h"
#include "support/environment_failure.h"
#include "support/files.h"
#include "support/program.h"

namespace vela_test {
namespace {

void RunImageMagick(const std::vector<std::string>& words, const std::string& input) {
  ProgramOptions options;
  options.input = input;
  const ProgramResult result = RunProgram(kImageMagick, words, options);
  if (result.exitCode != 0) {
    EnvironmentFailure("cannot make " + words.back() + ": " + result.err);
  }
}

/// Has ImageMagick write the picture.
void Write(const Samples& picture, std::vector<std::string> words, const std::string& path) {
  words.insert(words.begin(), "pam:-");
  words.push_back(path);
  RunImageMagick(words, PamOf(picture));
}

FileMaker WrittenWithChannels(std::vector<std::string> options, PhotoSize size, int channels) {
  return [options = std::move(options), size, channels](const std::string& path) {
    Write(MakePhotoSamples(size.width, size.height, channels), options, path);
  };
}

}  // namespace

FileMaker Written(std::vector<std::string> options, PhotoSize size) {
  return WrittenWithChannels(std::move(options), size, 3);
}

FileMaker WrittenWithAlpha(std::vector<std::string> options, PhotoSize size) {
  return WrittenWithChannels(std::move(options), size, 4);
}

FileMaker WrittenWithProfile(std::vector<std::string> options, std::string (*profileOf)()) {
  return [options = std::move(options), profileOf](const std::string& path) {
    const std::string profile = path + ".icc";
    WriteFile(profile, profileOf());
    std::vector<std::string> words = options;
    words.insert(words.end(), {"-profile", profile});
    const PhotoSize size;
    Write(MakePhotoSamples(size.width, size.height), words, path);
  };
}

FileMaker WithGamma(uint32_t exponent) {
  return [exponent](const std::string& path) {
    Written({"-depth", "8", "-define", "png:exclude-chunk=all"})(path);
    AddToPng(path, PngGamma(exponent));
  };
}

FileMaker Raw(PhotoSize size) {
  return [size](const std::string& path) {
    std::string file =
        "P6\n" + std::to_string(size.width) + " " + std::to_string(size.height) + "\n255\n";
    for (const uint16_t sample : MakePhotoSamples(size.width, size.height).values) {
      file += static_cast<char>(sample >> 8);
    }
    WriteFile(path, file);
  };
}

FileMaker Encoded(const JpegKind& kind, PhotoSize size) {
  return [kind, size](const std::string& path) {
    WriteFile(path, EncodeKind(MakePhotoSamples(size.width, size.height), kind));
  };
}

FileMaker WithOrientation(int orientation, std::vector<std::string> options) {
  return [orientation, options = std::move(options)](const std::string& path) {
    JpegKind kind;
    kind.orientation = orientation;
    const std::string photo = path + ".jpg";
    Encoded(kind)(photo);
    std::vector<std::string> words = {photo};
    words.insert(words.end(), options.begin(), options.end());
    words.push_back(path);
    RunImageMagick(words, "");
  };
}

FileMaker Truncated(FileMaker make, int tenths) {
  return [make = std::move(make), tenths](const std::string& path) {
    make(path);
    const std::string bytes = ReadFile(path);
    WriteFile(path, bytes.substr(0, bytes.size() * static_cast<size_t>(tenths) / 10));
  };
}

FileMaker WithoutEnd(FileMaker make, size_t bytes) {
  return [make = std::move(make), bytes](const std::string& path) {
    make(path);
    const std::string whole = ReadFile(path);
    WriteFile(path, whole.substr(0, whole.size() - bytes));
  };
}

FileMaker Damaged(FileMaker make) {
  constexpr size_t kChangedBytes = 40;
  return [make = std::move(make)](const std::string& path) {
    make(path);
    std::string bytes = ReadFile(path);
    const size_t middle = bytes.size() / 2;
    for (size_t i = middle; i < std::min(middle + kChangedBytes, bytes.size()); ++i) {
      bytes[i] = static_cast<char>(bytes[i] ^ 0x5a);
    }
    WriteFile(path, bytes);
  };
}

FileMaker Copied(const std::string& from) {
  return [from](const std::string& path) { CopyFile(from, path); };
}

}  // namespace vela_test
