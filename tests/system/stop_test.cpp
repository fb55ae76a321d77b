// A runner that is stopped while large photos are being converted.
#include <gtest/gtest.h>
#include <signal.h>

#include <chrono>
#include <string>
#include <thread>
#include <vector>

#include "machine.h"
#include "photo_library.h"
#include "support/build_paths.h"
#include "support/files.h"
#include "support/images.h"
#include "support/program.h"
#include "support/sandbox.h"

namespace vela_test {
namespace {

using std::chrono::milliseconds;

constexpr int kPhotos = 4;

/// Ten seconds pass before what does not end by itself is killed.
constexpr std::chrono::seconds kLongestStop(5);

class StopTest : public SandboxTest {
 protected:
  /// Makes photos that take a noticeable time each, in a tree. Returns their paths.
  static std::vector<std::string> MakeLargePhotos() {
    std::vector<std::string> photos;
    JpegRecipe recipe;
    recipe.width = 3000;
    recipe.height = 2250;
    for (int i = 0; i < kPhotos; ++i) {
      const std::string directory = "/tmp/photos/" + std::to_string(i % 3);
      MakeDirectories(directory);
      photos.push_back(MakeJpeg(directory + "/" + std::to_string(i) + ".jpg", recipe));
      SetFileTimeFromNow(photos.back(), -60);
    }
    return photos;
  }

  /// Starts a runner, stops it after `delay`, and fails the test unless it ends soon.
  static void StartAndStop(milliseconds delay) {
    Program runner = Machine::StartRunner({"--jobs", "2"});
    std::this_thread::sleep_for(delay);
    const auto start = std::chrono::steady_clock::now();
    runner.Kill(SIGTERM);
    const auto result = runner.Wait(std::chrono::seconds(30));
    ASSERT_TRUE(result);
    EXPECT_LT(std::chrono::steady_clock::now() - start, kLongestStop) << delay.count();
    // A signal that comes before it is expected ends the program as well.
    EXPECT_TRUE(result->exitCode == 1 || result->exitCode == 0 || result->signal == SIGTERM)
        << result->err;
  }
};

TEST_F(StopTest, EndsSoonAndTheNextRunMakesTheRest) {
  const std::vector<std::string> photos = MakeLargePhotos();
  Machine machine;
  WriteFile("/var/spool/thumb_create.queue", "R:/tmp/photos\n");
  // At various moments: while the work is counted, a photo is read, thumbnails are written.
  StartAndStop(milliseconds(30));
  EXPECT_TRUE(Machine::HasQueue()) << "the work was completed first";
  for (const int delay : {100, 200, 400, 700}) {
    StartAndStop(milliseconds(delay));
  }
  const ProgramResult last = Machine::RunRunner();
  EXPECT_EQ(last.exitCode, 0) << last.err;
  EXPECT_FALSE(Machine::HasQueue());
  for (const std::string& photo : photos) {
    const PhotoState state = StateOf(photo);
    EXPECT_EQ(state.thumbs, kThumbsOfAPhoto) << photo;
    EXPECT_EQ(state.markers, 0) << photo;
    EXPECT_TRUE(state.others.empty()) << photo;
  }
}

}  // namespace
}  // namespace vela_test
