// Whether the converted videos have the orientation of their source.

#include <algorithm>
#include <iterator>

#include "platform/velaindex.h"
#include "posix/cut_text.h"
#include "posix/log.h"
#include "storage/film_names.h"
#include "storage/log_source.h"
#include "storage/velamk_util.h"

using namespace vela;

int IsVideoRotated(const char* path) {
  _VIDEO_METADATA_ metadata = {};
  if (VELAIDX_GetVideoMetadata(path, &metadata) < 0) {
    LogError(kMetadataLogSource, 213,
             "Failed to get media metadata from file [" + LogText(path) + "].");
    return 0;
  }
  const int32_t rotation = metadata.rotation;
  return rotation == 90 || rotation == 180 || rotation == 270 ? 1 : 0;
}

int HasConvertedFilm(const char* path) {
  return std::any_of(std::begin(kOrientedFilms), std::end(kOrientedFilms),
                     [path](const FilmName& film) {
                       return IsEAFileExist2(path, film.name, film.oldName) > 0;
                     })
             ? 1
             : 0;
}

int IsEAFileOrientationMatched(const char* path, const char* name, const char* oldName) {
  if (path == nullptr) {
    LogError(kMetadataLogSource, 166, "Bad parameters.");
    return -1;
  }
  char film[kPathBufferSize] = "";
  if (GetEAFilePath(path, name, oldName, film, sizeof film) != 0) {
    return -1;
  }
  return IsMediaPortraitInDB(path) == IsFilePortrait(film) ? 1 : 0;
}

int HasMatchedConvertedFilm(const char* path) {
  return std::any_of(std::begin(kOrientedFilms), std::end(kOrientedFilms),
                     [path](const FilmName& film) {
                       return IsEAFileOrientationMatched(path, film.name, film.oldName) == 1;
                     })
             ? 1
             : 0;
}
