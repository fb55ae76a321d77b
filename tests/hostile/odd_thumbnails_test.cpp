// Existing thumbnails that are no files. With an index that keeps rotations the program reads the
// largest existing one.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <functional>

#include "hostile/hostile_test.h"
#include "support/named_case.h"

namespace vela_test::hostile {

namespace {

struct OddThumb : NamedCase {
  std::function<bool(const std::string& path)> make;
};

std::vector<OddThumb> OddThumbs() {
  return {
      {"Fifo", Fifo},
      {"Directory", [](const std::string& path) { return mkdir(path.c_str(), 0777) == 0; }},
      {"LinkToFifo",
       [](const std::string& path) { return Fifo(path + ".pipe") && Link(path + ".pipe", path); }},
      {"LinkToEndlessDevice", [](const std::string& path) { return Link("/dev/zero", path); }},
      {"LinkToItself", [](const std::string& path) { return Link(path, path); }},
      {"LinkToPrivatePhoto", [](const std::string& path) { return Link(kPrivatePhoto, path); }}};
}

}  // namespace

class OddThumbnails : public HostileTest, public ::testing::WithParamInterface<OddThumb> {};

TEST_P(OddThumbnails, DoNotStopTheRun) {
  const std::string photo = MakeJpeg(InPhotos("a.jpg"), RecipeOf(160, 120));
  const std::string raw = MakeRawPhoto(InPhotos("b.dng"), RawRecipeOf(160, 120));
  for (const std::string& path : {photo, raw}) {
    MakeMetadataDir(path);
    const std::string thumb = Thumb(path, "XL");
    ActAs(kAttacker, [&] { return GetParam().make(thumb); });
  }
  DaemonPeer daemon;
  daemon.SetIndexVersion(1);
  RunInTime();
  RunInTime();
  ExpectNothingRevealed();
}

INSTANTIATE_TEST_SUITE_P(All, OddThumbnails, ::testing::ValuesIn(OddThumbs()), CaseName());

}  // namespace vela_test::hostile
