// Videos and other files for tests of the functions that examine videos.
#pragma once

#include "platform/platform_fixture.h"
#include "support/films.h"
#include "support/images.h"
#include "support/program.h"

namespace vela_test {

inline void Ffmpeg(const Strings& arguments) {
  const auto result = RunProgram("/usr/bin/ffmpeg", arguments);
  ASSERT_EQ(result.exitCode, 0) << result.err;
}

/// Makes files of various kinds other than videos. Returns their paths, a directory and an empty
/// path.
inline Strings MakeFilesThatAreNoVideos() {
  WriteFile("/tmp/empty.mp4", "");
  WriteFile("/tmp/text.mp4", "no film\n");
  WriteFile("/tmp/list.mp4", "#EXTM3U\n#EXTINF:1,\n/tmp/a.mp4\n");
  MakeFilm("/tmp/a.mp4");  // referenced by the playlist
  EXPECT_EQ(mkfifo("/tmp/pipe.mp4", 0600), 0);
  return {"/tmp/empty.mp4",
          "/tmp/text.mp4",
          "/tmp/list.mp4",
          MakeImage("/tmp/photo.png", 64, 48),
          "/tmp/pipe.mp4",
          "/tmp",
          ""};
}

/// File names that a video library might misinterpret as patterns, protocols, options or several
/// lines.
inline const Strings kOddNames = {
    "two  words .mp4", "100%03d%s.mp4", "http:a.mp4",     "pipe:0.mp4",
    "-i.mp4",          "\xff\xfe.mp4",  "two\nlines.mp4", "it's \"q\" $HOME `x`;.mp4"};

}  // namespace vela_test
