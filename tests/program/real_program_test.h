// Fixture for tests of the whole program with the real converter on real images.
#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/types.h>

#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "program/program_paths.h"
#include "support/build_paths.h"
#include "support/daemon_peer.h"
#include "support/files.h"
#include "support/image_checks.h"
#include "support/images.h"
#include "support/profile_file.h"
#include "support/program.h"
#include "support/raw_photos.h"
#include "support/sandbox.h"
#include "support/stub_tool.h"
#include "support/system_log.h"

namespace vela_test::real {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

using Strings = std::vector<std::string>;

/// One thumbnail that a profile file asks for.
struct Kind {
  const char* name;  ///< "XL", "M", ...
  int box;           ///< pixels
  bool fills;        ///< the shorter side fills the box; else the whole photo fits inside
  int phase;
};

/// All six kinds in small boxes, two in each phase, XL the largest of phase 0.
std::vector<Kind> SmallKinds();

/// All six kinds as the sample profile has them.
std::vector<Kind> FullKinds();

/// Those of `kinds` that are of this phase.
std::vector<Kind> OfPhase(const std::vector<Kind>& kinds, int phase);

std::string WriteKinds(const std::string& path, const std::vector<Kind>& kinds);

/// Thumbnail and failure marker of a photo.
std::string ThumbOf(const std::string& photo, const Kind& kind);
std::string MarkerOf(const std::string& photo, const Kind& kind);

/// The properties of a photo that must not change.
struct PhotoState {
  std::string content;
  FileTime modified;
};
bool operator==(const PhotoState& a, const PhotoState& b);
void PrintTo(const PhotoState& state, std::ostream* out);

/// All files below `directory` outside of metadata directories, by their relative paths.
std::map<std::string, PhotoState> PhotosBelow(const std::string& directory);

/// The properties that differ when a thumbnail is made again.
struct ThumbState {
  ino_t inode = 0;
  FileTime modified;
};
bool operator==(const ThumbState& a, const ThumbState& b);
void PrintTo(const ThumbState& state, std::ostream* out);

/// Every thumbnail (under a final name) below `directory`, by its relative path.
std::map<std::string, ThumbState> ThumbsBelow(const std::string& directory);

/// Whether every thumbnail under a final name below `directory` is a complete JPEG.
::testing::AssertionResult OnlyWholeThumbsBelow(const std::string& directory);

/// Whether each kind's thumbnail of the photo is a complete JPEG without a failure marker.
::testing::AssertionResult HasThumbs(const std::string& photo, const std::vector<Kind>& kinds);

/// Whether each kind has an empty failure marker and no thumbnail.
::testing::AssertionResult IsMarkedFailed(const std::string& photo, const std::vector<Kind>& kinds);

/// Processes of the sandbox by their command name.
std::vector<pid_t> ProcessesNamed(const std::string& name);

/// Waits until there is no such process, at most `milliseconds`; returns whether there is none.
bool WaitUntilNoProcessNamed(const std::string& name, int milliseconds);

/// The existing pid files of the program.
std::vector<std::string> PidFiles();

/// Runs ImageMagick with these arguments; a failure fails the test.
void Draw(const std::vector<std::string>& arguments);

/// Colours that can be distinguished after any conversion; `index` below 125.
Rgb PaletteColour(int index);

/// Makes a photo of one palette colour under any name with the extension of a format.
void MakePlainPhoto(const std::string& path, int paletteIndex, int width = 160, int height = 120);

/// A JPEG of this size.
JpegRecipe RecipeOf(int width, int height, int orientation = 0);

/// A raw photo of 240 x 160 pixels, without preview or with one of this size.
RawRecipe RawRecipeOf(int previewWidth = 0, int previewHeight = 0);

/// Index of the palette colour that the whole thumbnail shows, -1 when it shows several or is not a
/// complete JPEG.
int PaletteIndexOf(const std::string& thumb);

/// Every test starts with the real converter in place, the small kinds in kProfiles and an empty
/// directory kPhotos.
class RealProgramTest : public SandboxTest {
 protected:
  void SetUp() override;

  /// Runs the program over the directory arguments. It must end with 0 and leave every photo below
  /// kPhotos as it was, content and modification time.
  void Make(const std::vector<std::string>& directories = {kPhotos},
            const ProgramOptions& options = ProgramOptions());

  /// Runs the program over everything below kPhotos; expects each thumbnail unchanged.
  void ExpectNothingLeftToMake(const std::vector<std::string>& directories = {kPhotos});

  std::vector<Kind> kinds_;
};

}  // namespace vela_test::real
