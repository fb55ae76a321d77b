#include "program/real_program_test.h"

#include <sys/stat.h>

#include <algorithm>
#include <cctype>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <ostream>
#include <thread>

namespace vela_test::real {

namespace {

constexpr int kPaletteLevels[] = {0, 64, 128, 191, 255};

/// Half the distance between two palette colours in a channel.
constexpr int kColourTolerance = 31;

bool IsMetadata(const std::string& relativePath) {
  return ("/" + relativePath).find("/@eaDir/") != std::string::npos;
}

std::string BaseName(const std::string& path) {
  return path.substr(path.rfind('/') + 1);
}

bool IsThumbName(const std::string& name) {
  return name.compare(0, 16, "VELAPHOTO_THUMB_") == 0 && name.size() > 4 &&
         name.compare(name.size() - 4, 4, ".jpg") == 0;
}

bool IsNear(const Rgb& a, const Rgb& b) {
  return std::abs(a.red - b.red) <= kColourTolerance &&
         std::abs(a.green - b.green) <= kColourTolerance &&
         std::abs(a.blue - b.blue) <= kColourTolerance;
}

std::string HexColour(const Rgb& colour) {
  char text[8];
  std::snprintf(text, sizeof text, "#%02x%02x%02x", static_cast<unsigned>(colour.red) & 0xff,
                static_cast<unsigned>(colour.green) & 0xff,
                static_cast<unsigned>(colour.blue) & 0xff);
  return text;
}

int NearestPaletteIndex(const Rgb& colour) {
  for (int i = 0; i < 125; ++i) {
    if (IsNear(colour, PaletteColour(i))) {
      return i;
    }
  }
  return -1;
}

bool HasOnlyDigits(const std::string& text) {
  return !text.empty() && std::all_of(text.begin(), text.end(),
                                      [](unsigned char c) { return std::isdigit(c) != 0; });
}

/// The command name of a process, empty when it has ended.
std::string CommandName(const std::string& pid) {
  std::FILE* file = std::fopen(("/proc/" + pid + "/stat").c_str(), "re");
  if (file == nullptr) {
    return "";
  }
  char line[512] = "";
  const size_t length = std::fread(line, 1, sizeof line - 1, file);
  std::fclose(file);
  const std::string text(line, length);
  const size_t open = text.find('(');
  const size_t close = text.rfind(')');
  if (open == std::string::npos || close == std::string::npos ||
      text.compare(close, 3, ") Z") == 0) {
    return "";
  }
  return text.substr(open + 1, close - open - 1);
}

}  // namespace

std::vector<Kind> SmallKinds() {
  return {{"M", 64, true, 0},  {"XL", 120, true, 0}, {"SM", 48, true, 1},
          {"L", 100, true, 1}, {"S", 40, false, 2},  {"B", 80, false, 2}};
}

std::vector<Kind> FullKinds() {
  return {{"M", 320, true, 0}, {"XL", 1280, true, 0}, {"SM", 240, true, 1},
          {"L", 800, true, 1}, {"S", 120, false, 2},  {"B", 640, false, 2}};
}

std::vector<Kind> OfPhase(const std::vector<Kind>& kinds, int phase) {
  std::vector<Kind> found;
  for (const Kind& kind : kinds) {
    if (kind.phase == phase) {
      found.push_back(kind);
    }
  }
  return found;
}

std::string WriteKinds(const std::string& path, const std::vector<Kind>& kinds) {
  std::vector<ProfileSection> sections;
  for (const Kind& kind : kinds) {
    ProfileSection section;
    section.section = std::string("thumb_") + kind.name;
    section.filename = std::string("VELAPHOTO_THUMB_") + kind.name + ".jpg";
    section.size = kind.box;
    section.quality = 90;
    section.phase = kind.phase;
    sections.push_back(section);
  }
  return WriteProfileFile(path, sections);
}

std::string ThumbOf(const std::string& photo, const Kind& kind) {
  return Thumb(photo, kind.name);
}

std::string MarkerOf(const std::string& photo, const Kind& kind) {
  return Marker(photo, kind.name);
}

bool operator==(const PhotoState& a, const PhotoState& b) {
  return a.content == b.content && a.modified == b.modified;
}

void PrintTo(const PhotoState& state, std::ostream* out) {
  *out << state.content.size() << " bytes, modified ";
  PrintTo(state.modified, out);
}

std::map<std::string, PhotoState> PhotosBelow(const std::string& directory) {
  std::map<std::string, PhotoState> photos;
  for (const std::string& path : ListTree(directory)) {
    if (path.back() != '/' && !IsMetadata(path)) {
      const std::string file = directory + "/" + path;
      photos[path] = {ReadFile(file), ModificationTime(file)};
    }
  }
  return photos;
}

bool operator==(const ThumbState& a, const ThumbState& b) {
  return a.inode == b.inode && a.modified == b.modified;
}

void PrintTo(const ThumbState& state, std::ostream* out) {
  *out << "inode " << state.inode << ", modified ";
  PrintTo(state.modified, out);
}

std::map<std::string, ThumbState> ThumbsBelow(const std::string& directory) {
  std::map<std::string, ThumbState> thumbs;
  for (const std::string& path : ListTree(directory)) {
    if (IsMetadata(path) && IsThumbName(BaseName(path))) {
      const std::string file = directory + "/" + path;
      struct stat status {};
      stat(file.c_str(), &status);
      thumbs[path] = {status.st_ino, ModificationTime(file)};
    }
  }
  return thumbs;
}

::testing::AssertionResult OnlyWholeThumbsBelow(const std::string& directory) {
  for (const auto& [path, state] : ThumbsBelow(directory)) {
    std::string why;
    if (!DecodeJpeg(directory + "/" + path, &why)) {
      return ::testing::AssertionFailure() << path << " is not a whole JPEG: " << why;
    }
  }
  return ::testing::AssertionSuccess();
}

::testing::AssertionResult HasThumbs(const std::string& photo, const std::vector<Kind>& kinds) {
  for (const Kind& kind : kinds) {
    std::string why;
    if (!DecodeJpeg(ThumbOf(photo, kind), &why)) {
      return ::testing::AssertionFailure()
             << ::testing::PrintToString(photo) << " has no good " << kind.name << ": " << why;
    }
    if (Exists(MarkerOf(photo, kind))) {
      return ::testing::AssertionFailure()
             << ::testing::PrintToString(photo) << " has a failure marker for " << kind.name;
    }
  }
  return ::testing::AssertionSuccess();
}

::testing::AssertionResult IsMarkedFailed(const std::string& photo,
                                          const std::vector<Kind>& kinds) {
  for (const Kind& kind : kinds) {
    if (FileSize(MarkerOf(photo, kind)) != 0) {
      return ::testing::AssertionFailure() << ::testing::PrintToString(photo)
                                           << " has no (empty) failure marker for " << kind.name;
    }
    if (Exists(ThumbOf(photo, kind))) {
      return ::testing::AssertionFailure()
             << ::testing::PrintToString(photo) << " has a thumbnail " << kind.name;
    }
  }
  return ::testing::AssertionSuccess();
}

std::vector<pid_t> ProcessesNamed(const std::string& name) {
  std::vector<pid_t> found;
  for (const std::string& entry : ListDirectory("/proc")) {
    if (HasOnlyDigits(entry) && CommandName(entry) == name) {
      found.push_back(std::atoi(entry.c_str()));
    }
  }
  return found;
}

bool WaitUntilNoProcessNamed(const std::string& name, int milliseconds) {
  const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(milliseconds);
  while (!ProcessesNamed(name).empty()) {
    if (std::chrono::steady_clock::now() >= end) {
      return false;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
  return true;
}

Strings PidFiles() {
  Strings found;
  for (const std::string& name : ListDirectory("/var/run")) {
    if (name.compare(0, 10, "velathumb.") == 0) {
      found.push_back(name);
    }
  }
  return found;
}

void Draw(const Strings& arguments) {
  const ProgramResult result = RunProgram(kImageMagickPath, arguments);
  EXPECT_EQ(result.exitCode, 0) << result.err;
}

Rgb PaletteColour(int index) {
  return {kPaletteLevels[index / 25], kPaletteLevels[index / 5 % 5], kPaletteLevels[index % 5]};
}

void MakePlainPhoto(const std::string& path, int paletteIndex, int width, int height) {
  const std::string plainName = "/tmp/plain" + path.substr(path.rfind('.'));
  Draw({"-size", std::to_string(width) + "x" + std::to_string(height),
        "xc:" + HexColour(PaletteColour(paletteIndex)), "-colorspace", "sRGB", plainName});
  CopyFile(plainName, path);
  RemoveTree(plainName);
}

JpegRecipe RecipeOf(int width, int height, int orientation) {
  JpegRecipe recipe;
  recipe.width = width;
  recipe.height = height;
  recipe.orientation = orientation;
  return recipe;
}

RawRecipe RawRecipeOf(int previewWidth, int previewHeight) {
  RawRecipe recipe;
  recipe.width = 240;
  recipe.height = 160;
  if (previewWidth > 0) {
    recipe.preview = RecipeOf(previewWidth, previewHeight);
  }
  return recipe;
}

int PaletteIndexOf(const std::string& thumb) {
  constexpr int kPoints = 8;
  const auto image = DecodeJpeg(thumb);
  if (!image) {
    return -1;
  }
  const int index = NearestPaletteIndex(image->At(0.5, 0.5));
  for (int point = 0; point < kPoints * kPoints; ++point) {
    const double x = (point % kPoints + 0.5) / kPoints;
    const double y = (point / kPoints + 0.5) / kPoints;
    if (NearestPaletteIndex(image->At(x, y)) != index) {
      return -1;
    }
  }
  return index;
}

void RealProgramTest::SetUp() {
  SandboxTest::SetUp();
  InstallRealConverter();
  kinds_ = SmallKinds();
  WriteKinds(kProfiles, kinds_);
  MakeDirectories(kPhotos);
}

void RealProgramTest::Make(const Strings& directories, const ProgramOptions& options) {
  const auto before = PhotosBelow(kPhotos);
  const ProgramResult result = RunProgram(VelathumbPath(), ArgumentsFor(directories), options);
  EXPECT_EQ(result.exitCode, 0) << result.err;
  EXPECT_EQ(result.err, "");
  EXPECT_TRUE(PhotosBelow(kPhotos) == before) << "the run touched a photo";
}

void RealProgramTest::ExpectNothingLeftToMake(const Strings& directories) {
  const auto before = ThumbsBelow(kPhotos);
  Make(directories);
  EXPECT_EQ(ThumbsBelow(kPhotos), before);
}

}  // namespace vela_test::real
