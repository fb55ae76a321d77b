// Whether the films of a video stand as the video does.
#include <syslog.h>

#include <algorithm>
#include <iterator>

#include "platform/velaindex.h"
#include "posix/cut_text.h"
#include "storage/film_names.h"
#include "storage/log_source.h"
#include "storage/velamk_util.h"

using vela::FilmName;
using vela::kMetadataLogSource;
using vela::kOrientedFilms;
using vela::kPathBufferSize;

int IsVideoRotated(const char* path) {
  _VIDEO_METADATA_ metadata = {};
  if (VELAIDX_GetVideoMetadata(path, &metadata) < 0) {
    syslog(LOG_ERR, "%s:%d Failed to get media metadata from file [%s].", kMetadataLogSource, 213,
           path);
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
    syslog(LOG_ERR, "%s:%d Bad parameters.", kMetadataLogSource, 166);
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
