#include "likeness/exceptions.h"

#include <algorithm>
#include <array>

#include "platform/installed_names.h"

namespace vela_test {
namespace {

struct Entry {
  const char* format;
  const char* description;
  const char* vector;  ///< "": all
  LikenessException kind;
  const char* why;
  int version = 0;           ///< of ImageMagick; 0: all
  double leastDecibels = 0;  ///< of kOtherPicture
};

constexpr char kPanorama[] =
    "wider or higher than ImageMagick's policy allows; there is no reason to refuse it";

constexpr char kWholePicture[] = "the picture is whole; ImageMagick makes no thumbnails of it";

constexpr char kIgnoredOrientation[] =
    "ImageMagick does not look for the orientation in a WebP; with it the thumbnails are upright";

constexpr char kObservedOrientation[] =
    "ImageMagick 7 observes the orientation in a PNG; version 6 and the converter do not";

constexpr char kHolesAtEdges[] =
    "where a GIF is transparent, ImageMagick 7 leaves a pattern of holes at the edges";

/// The holes are a quarter of the pixels along the edges, and most of the smallest thumbnails are
/// edges: 23.4 to 31.7 decibels.
constexpr double kLeastWithHoles = 22;

constexpr char kLostProfile[] =
    "ImageMagick loses this photo's colour profile, without which its colours look faded";

constexpr std::array kEntries = {
    Entry{"JPEG", "30000 x 10", "", LikenessException::kSucceeds, kPanorama, 6},
    Entry{"JPEG", "10 x 30000", "", LikenessException::kSucceeds, kPanorama, 6},
    Entry{"Netpbm", "PPM, 20000 x 12", "", LikenessException::kSucceeds, kPanorama, 6},
    Entry{"WebP", "orientation 6", "", LikenessException::kUpright, kIgnoredOrientation, 6},
    Entry{"PNG", "orientation 6", "", LikenessException::kUpright, kObservedOrientation, 7},
    Entry{"GIF", "transparent parts", "", LikenessException::kOtherPicture, kHolesAtEdges, 7,
          kLeastWithHoles},
    Entry{"Damaged", "PNG without its end chunk", "", LikenessException::kSucceeds, kWholePicture},
    Entry{"Camera", "phone_12mp.heic", "", LikenessException::kSurroundings, kLostProfile, 6},
};

bool IsAbout(const Entry& entry, const std::string& format, const std::string& description,
             const std::string& vector) {
  return format == entry.format && description == entry.description &&
         (*entry.vector == '\0' || vector == entry.vector) &&
         (entry.version == 0 || entry.version == vela::kImageMagickVersion);
}

}  // namespace

KnownDifference KnownDifferenceOf(const std::string& format, const std::string& description,
                                  const std::string& vector) {
  const auto* const found = std::find_if(kEntries.begin(), kEntries.end(), [&](const Entry& entry) {
    return IsAbout(entry, format, description, vector);
  });
  return found == kEntries.end() ? KnownDifference()
                                 : KnownDifference{found->kind, found->why, found->leastDecibels};
}

}  // namespace vela_test
