// The converted videos: their file names in the metadata directory of their source.
#pragma once

namespace vela {

/// The file names of a converted video.
struct FilmName {
  const char* name;     ///< the one that is written
  const char* oldName;  ///< its older form, with a colon, which counts as well
};

inline constexpr FilmName kHighFilm = {"VELAPHOTO_FILM_H.mp4", "VELAPHOTO:FILM_H.mp4"};
inline constexpr FilmName kMediumFilm = {"VELAPHOTO_FILM_M.mp4", "VELAPHOTO:FILM_M.mp4"};
inline constexpr FilmName kLowFilm = {"VELAPHOTO_FILM_L.mp4", "VELAPHOTO:FILM_L.mp4"};
inline constexpr FilmName kMobileFilm = {"VELAPHOTO_FILM_MOBILE.mp4", "VELAPHOTO:FILM_MOBILE.mp4"};
inline constexpr FilmName kConvertedMpeg4Film = {"VELAPHOTO_FILM_CONVERT_MPEG4.mp4",
                                                 "VELAPHOTO:FILM_CONVERT_MPEG4.mp4"};
inline constexpr FilmName kH264Film = {"VELAPHOTO_FILM_H264.mp4", "VELAPHOTO:FILM_H264.mp4"};
/// Without an extension in both forms.
inline constexpr FilmName kIphoneFilm = {"VELAPHOTO_FILM_MOBILE_IPHONE",
                                         "VELAPHOTO:FILM_MOBILE_IPHONE"};
inline constexpr FilmName kMpeg4Film = {"VELAPHOTO_FILM_MPEG4.mp4", "VELAPHOTO:FILM_MPEG4.mp4"};
inline constexpr FilmName kFlashFilm = {"VELAPHOTO_FILM.flv", "VELAPHOTO:FILM.flv"};

/// The converted videos that have the orientation of their source, in lookup order.
inline constexpr FilmName kOrientedFilms[] = {kHighFilm, kMediumFilm, kLowFilm, kMobileFilm};

}  // namespace vela
