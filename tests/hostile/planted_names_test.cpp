// Links, named pipes and hard links under the names that the program gives its own files. Metadata
// directories are open to everyone, so any user can plant them, also next to another one's photos.
#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>
#include <functional>

#include "hostile/hostile_test.h"
#include "support/descriptor.h"
#include "support/named_case.h"

namespace vela_test::hostile {

namespace {

const std::string kDecoded = "RAW_TEMP.ppm";
const std::string kPreview = "VELAPHOTO_THUMB_RAW.jpg";

/// A planted name; the attacker gets its path.
struct Planted : NamedCase {
  std::string file;
  std::function<bool(const std::string& path)> plant;
};

bool Socket(const std::string& path) {
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  path.copy(address.sun_path, sizeof address.sun_path - 1);
  const Descriptor listener(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  return bind(listener.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0;
}

bool Directory(const std::string& path) {
  return mkdir(path.c_str(), 0777) == 0;
}

bool LinkToPrivateText(const std::string& path) {
  return Link(kPrivateText, path);
}

bool LinkToNewFile(const std::string& path) {
  return Link(std::string(kVictim) + "/new", path);
}

bool LinkToSharedText(const std::string& path) {
  return HardLink(kSharedText, path);
}

std::vector<Planted> DecodedRawPhotos() {
  return {{"DecodedLink", kDecoded, LinkToPrivateText},
          {"DecodedDanglingLink", kDecoded, LinkToNewFile},
          {"DecodedHardLink", kDecoded, LinkToSharedText},
          {"DecodedFifo", kDecoded, Fifo},
          {"DecodedSocket", kDecoded, Socket},
          {"DecodedDirectory", kDecoded, Directory},
          {"PreviewLink", kPreview, LinkToPrivateText},
          {"PreviewDanglingLink", kPreview, LinkToNewFile},
          {"PreviewHardLink", kPreview, LinkToSharedText},
          {"PreviewFifo", kPreview, Fifo},
          {"PreviewSocket", kPreview, Socket},
          {"PreviewDirectory", kPreview, Directory}};
}

/// A photo with a preview that is large enough when `name` is the preview's, else without one.
std::string MakeRaw(const std::string& path, const std::string& name) {
  return MakeRawPhoto(path, name == kPreview ? RawRecipeOf(160, 120) : RawRecipeOf());
}

}  // namespace

class PlantedForRawPhoto : public HostileTest, public ::testing::WithParamInterface<Planted> {};

TEST_P(PlantedForRawPhoto, IsNotWrittenThrough) {
  const std::string photo = MakeRaw(InPhotos("a.dng"), GetParam().file);
  MakeMetadataDir(photo);
  const std::string planted = MetadataDirOf(photo) + "/" + GetParam().file;
  ActAs(kAttacker, [&] { return GetParam().plant(planted); });
  RunInTime();
  ExpectThumbsOrMarkers(photo);
}

INSTANTIATE_TEST_SUITE_P(All, PlantedForRawPhoto, ::testing::ValuesIn(DecodedRawPhotos()),
                         CaseName());

namespace {

using PlantedNames = HostileTest;

std::vector<Planted> MarkersAndThumbs() {
  std::vector<Planted> rows;
  for (const char* name : {"VELAPHOTO_THUMB_XL.fail", "VELAPHOTO_THUMB_S.fail",
                           "VELAPHOTO_THUMB_XL.jpg", "VELAPHOTO_THUMB_L.jpg"}) {
    rows.push_back({"", name, LinkToPrivateText});
    rows.push_back({"", name, LinkToNewFile});
    rows.push_back({"", name, LinkToSharedText});
    rows.push_back({"", name, Fifo});
    rows.push_back({"", name, Socket});
  }
  return rows;
}

}  // namespace

/// A pipe that the attacker keeps open: opening it does not fail, and nothing ever leaves it.
TEST_F(PlantedNames, OpenPipesAreNotWaitedFor) {
  for (const std::string& name : {kDecoded, kPreview}) {
    SCOPED_TRACE(name);
    RemoveTree(InPhotos("@eaDir"));
    const std::string photo = MakeRaw(InPhotos("a.dng"), name);
    MakeMetadataDir(photo);
    const std::string pipe = MetadataDirOf(photo) + "/" + name;
    ActAs(kAttacker, [&] { return Fifo(pipe); });
    const Descriptor bothEnds(open(pipe.c_str(), O_RDWR | O_CLOEXEC));
    ASSERT_TRUE(bothEnds.IsOpen());
    RunInTime();
    ExpectThumbsOrMarkers(photo);
  }
}

TEST_F(PlantedNames, ThumbnailsAndMarkersAreNotWrittenThrough) {
  int number = 0;
  for (const Planted& row : MarkersAndThumbs()) {
    // One photo that can be converted, one that cannot and gets markers.
    const std::string good = MakeJpeg(InPhotos(std::to_string(number) + ".jpg"));
    const std::string bad = MakeTruncatedJpeg(InPhotos(std::to_string(number) + "bad.jpg"));
    for (const std::string& photo : {good, bad}) {
      MakeMetadataDir(photo);
      ActAs(kAttacker, [&] { return row.plant(MetadataDirOf(photo) + "/" + row.file); });
    }
    ++number;
  }
  RunInTime();
  RunInTime();
}

}  // namespace vela_test::hostile
