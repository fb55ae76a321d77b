#include "support/films.h"

#include <cmath>
#include <cstdint>
#include <vector>

#include "support/environment_failure.h"
#include "support/files.h"
#include "support/program.h"
#include "support/quadrants.h"
#include "support/sandbox.h"

namespace vela_test {

namespace {

using Arguments = std::vector<std::string>;

void Append(Arguments& arguments, const Arguments& more) {
  arguments.insert(arguments.end(), more.begin(), more.end());
}

/// Encoding time matters here, picture quality does not.
Arguments SpeedOf(const std::string& videoCodec) {
  if (videoCodec == "libx264" || videoCodec == "libx265") return {"-preset", "ultrafast"};
  if (videoCodec == "libaom-av1") return {"-usage", "realtime", "-cpu-used", "8"};
  if (videoCodec.rfind("libvpx", 0) == 0) return {"-deadline", "realtime", "-cpu-used", "8"};
  return {};
}

Arguments PictureInput(const FilmRecipe& recipe) {
  const std::string size = std::to_string(recipe.width) + "x" + std::to_string(recipe.height);
  return {"-f", "rawvideo", "-pixel_format", "rgb24", "-video_size", size, "-framerate",
          "25", "-i",       "pipe:0"};
}

Arguments PictureOutput(const FilmRecipe& recipe) {
  Arguments arguments = {
      "-filter:v", "loop=loop=-1:size=1", "-codec:v", recipe.videoCodec, "-pix_fmt", "yuv420p"};
  Append(arguments, SpeedOf(recipe.videoCodec));
  return arguments;
}

Arguments FfmpegArguments(const std::string& path, const FilmRecipe& recipe) {
  Arguments arguments = {"-v", "error", "-y"};
  if (!recipe.videoCodec.empty()) Append(arguments, PictureInput(recipe));
  if (!recipe.audioCodec.empty()) Append(arguments, {"-f", "lavfi", "-i", "sine=frequency=440"});
  if (!recipe.videoCodec.empty()) Append(arguments, PictureOutput(recipe));
  if (!recipe.audioCodec.empty()) Append(arguments, {"-codec:a", recipe.audioCodec});
  if (recipe.headerFirst) Append(arguments, {"-movflags", "+faststart"});
  if (!recipe.format.empty()) Append(arguments, {"-f", recipe.format});
  // "file:" prevents a leading dash from being read as an option and a colon as a protocol.
  Append(arguments, {"-threads", "1", "-t", std::to_string(recipe.seconds), "file:" + path});
  return arguments;
}

/// A number with 16 fractional bits, big-endian.
std::string FixedPoint(double value) {
  const auto bits = static_cast<uint32_t>(std::lround(value * 65536));
  std::string bytes;
  for (const int shift : {24, 16, 8, 0}) bytes += static_cast<char>(bits >> shift & 0xff);
  return bytes;
}

}  // namespace

std::string MakeFilm(const std::string& path, const FilmRecipe& recipe) {
  ProgramOptions options;
  if (!recipe.videoCodec.empty()) options.input = QuadrantPixels(recipe.width, recipe.height);
  const ProgramResult result =
      RunProgram(HostPath("/usr/bin/ffmpeg"), FfmpegArguments(path, recipe), options);
  if (result.exitCode != 0) {
    EnvironmentFailure("cannot make the film " + path + ": " + result.err);
  }
  // The way to request a rotation differs between versions of ffmpeg.
  if (recipe.rotation != 0) SetFilmMatrix(path, recipe.rotation);
  return path;
}

std::string MakeCutFilm(const std::string& path, size_t bytes, const FilmRecipe& recipe) {
  MakeFilm(path, recipe);
  WriteFile(path, ReadFile(path).substr(0, bytes));
  return path;
}

void SetFilmMatrix(const std::string& path, double degrees, double scale) {
  constexpr double kPi = 3.14159265358979323846;
  constexpr size_t kNameSize = 4;
  constexpr size_t kMatrixOffset = 40;  // in a header of version 0
  const std::string cosine = FixedPoint(std::cos(degrees * kPi / 180) * scale);
  const double sine = std::sin(degrees * kPi / 180) * scale;
  const std::string matrix =
      cosine + FixedPoint(sine) + FixedPoint(0) + FixedPoint(-sine) + cosine + FixedPoint(0);
  std::string film = ReadFile(path);
  const size_t header = film.find("tkhd");
  const size_t content = header + kNameSize;
  if (header == std::string::npos || content + kMatrixOffset + matrix.size() > film.size() ||
      film[content] != 0) {
    EnvironmentFailure("cannot turn the film " + path);
  }
  film.replace(content + kMatrixOffset, matrix.size(), matrix);
  WriteFile(path, film);
}

}  // namespace vela_test
