// Makes small real films. Every frame shows the quadrants.
#pragma once

#include <cstddef>
#include <string>

namespace vela_test {

/// A film to make. Codecs are named as ffmpeg names its encoders.
struct FilmRecipe {
  int width = 64;                      ///< pixels as coded, even
  int height = 48;                     ///< pixels as coded, even
  int rotation = 0;                    ///< degrees clockwise that a player turns the picture by:
                                       ///< 0, 90, 180 or 270; other than 0 in MP4 and MOV only
  std::string videoCodec = "libx264";  ///< also mpeg4, libvpx, libvpx-vp9, libaom-av1, ...;
                                       ///< empty: no picture
  std::string audioCodec;    ///< aac, libmp3lame, libopus, libvorbis, ...; empty: no sound
  double seconds = 1;        ///< length; 25 frames a second
  std::string format;        ///< container as ffmpeg names it (mp4, matroska, webm, ...);
                             ///< empty: by the extension of the path
  bool headerFirst = false;  ///< the header before the pictures; MP4 and MOV only, which
                             ///< have it at the end otherwise
};

/// Makes the film; `path` may be any byte string, an existing file is overwritten, the directory
/// must be there. Returns `path`. A recipe that ffmpeg cannot make ends the test program.
std::string MakeFilm(const std::string& path, const FilmRecipe& recipe = FilmRecipe());

/// Makes the film and keeps its first `bytes` bytes only (all of it when it is no longer). Returns
/// `path`.
std::string MakeCutFilm(const std::string& path, size_t bytes,
                        const FilmRecipe& recipe = FilmRecipe());

/// Replaces the matrix of the film's first track, MP4 or MOV, by that of a clockwise turn by
/// `degrees`, scaled by `scale`.
void SetFilmMatrix(const std::string& path, double degrees, double scale = 1);

}  // namespace vela_test
