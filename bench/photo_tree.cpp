#include "photo_tree.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>

#include "storage/thumb_size_class.h"
#include "support/files.h"
#include "support/images.h"
#include "timed_run.h"

namespace vela_bench {

namespace {

std::string PhotoName(int number) {
  char name[32];
  std::snprintf(name, sizeof name, "IMG_%06d.jpg", number);
  return name;
}

void MakeSmallFile(const std::string& path) {
  const int descriptor = open(path.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0666);
  if (descriptor < 0 || write(descriptor, "JPEG", 4) != 4) {
    Fail("cannot write " + path);
  }
  close(descriptor);
}

}  // namespace

void MakePhotoFiles(const std::string& directory, int count) {
  vela_test::MakeDirectories(directory);
  for (int i = 0; i < count; ++i) {
    MakeSmallFile(directory + "/" + PhotoName(i));
  }
}

void MakeThumbFiles(const std::string& directory, int count) {
  mkdir((directory + "/@eaDir").c_str(), 0777);
  for (int i = 0; i < count; ++i) {
    const std::string metadata = directory + "/@eaDir/" + PhotoName(i);
    mkdir(metadata.c_str(), 0777);
    for (const EAThumbInfo& row : rgEAThumbInfo) {
      MakeSmallFile(metadata + "/" + row.name);
    }
  }
}

void MakeRealPhotos(const std::string& directory, int count, int width, int height) {
  vela_test::MakeDirectories(directory);
  vela_test::JpegRecipe recipe;
  recipe.width = width;
  recipe.height = height;
  const std::string first = vela_test::MakeJpeg(directory + "/" + PhotoName(0), recipe);
  for (int i = 1; i < count; ++i) {
    vela_test::CopyFile(first, directory + "/" + PhotoName(i));
  }
}

void RemoveMetadata(const std::string& directory) {
  vela_test::RemoveTree(directory + "/@eaDir");
}

}  // namespace vela_bench
