// The unit of work of a directory pass.
#pragma once

#include <string>

struct ThumbnailProfileList;

/// One directory and the profiles that apply to it; the profiles outlive the job.
struct DirectoryJob {
  std::string path;  ///< as given on the command line or by the walk
  const ThumbnailProfileList& profiles;
};
