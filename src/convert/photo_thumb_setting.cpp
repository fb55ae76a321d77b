#include "convert/photo_thumb_setting.h"

PhotoThumbSetting& PhotoThumbSetting::operator=(const PhotoThumbSetting& other) {
  srcPath = other.srcPath;
  destPath = other.destPath;
  outDir = other.outDir;
  tempPath = other.tempPath;
  width = other.width;
  height = other.height;
  quality = other.quality;
  stripProfiles = other.stripProfiles;
  flatten = other.flatten;
  autoOrient = other.autoOrient;
  rotate = other.rotate;
  unsharp = other.unsharp;
  colorspace = other.colorspace;
  return *this;
}
