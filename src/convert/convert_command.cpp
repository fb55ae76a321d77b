#include "convert/convert_command.h"

#include "platform/velaindex.h"
#include "platform/velautils.h"
#include "posix/folder.h"
#include "posix/truncated_text.h"

using namespace vela;

namespace {

std::string BoxSize(const PhotoThumbSetting& setting) {
  return std::to_string(setting.width) + "x" + std::to_string(setting.height);
}

/// The converter expands percent signs in the names of its outputs, but not in that of its input.
std::string EscapedTempPath(const PhotoThumbSetting& setting) {
  char escaped[8192];
  EscapePercentSign(setting.tempPath.c_str(), escaped, sizeof escaped);
  return escaped;
}

}  // namespace

std::string MakeTempOutputPath(const std::string& destPath) {
  const std::string nameTemplate = VELAUtils::GetPathDirName(destPath) + "/VELAPHOTO.tmp.XXXXXX";
  const std::string path = FindUnusedPath(nameTemplate);
  if (path.empty()) {
    return nameTemplate;
  }
  const std::string extension = VELAUtils::GetPathExt(destPath);
  return extension.empty() ? path : path + "." + extension;
}

void AddTempPathDefine(const PhotoConvertJob& job, VELAUtils::ProcessRunner& runner) {
  if (job.settings.empty() || job.settings.front().outDir.empty()) {
    return;
  }
  const std::string define = "registry:temporary-path=" + job.settings.front().outDir;
  runner.addArguments("-define", Truncated(define).c_str());
}

void AddThumbOptions(VELAUtils::ProcessRunner& runner, const PhotoThumbSetting& setting) {
  const std::string box = BoxSize(setting);
  runner.addArguments("-define", ("jpeg:size=" + box).c_str());
  runner.addArguments("-thumbnail", (box + (setting.fillArea ? ">^" : ">")).c_str());
  runner.addArguments("-quality", std::to_string(setting.quality).c_str());
  if (setting.stripProfiles) {
    runner.addArguments("+profile", "!icc,*");
  }
  if (setting.flatten) {
    runner.addArguments("-flatten");
  }
  if (setting.autoOrient) {
    runner.addArguments("-auto-orient");
  }
  if (setting.rotate > 0) {
    runner.addArguments("-rotate", std::to_string(setting.rotate).c_str());
  }
  if (!setting.unsharp.empty()) {
    runner.addArguments("-unsharp", setting.unsharp.c_str());
  }
  if (!setting.colorspace.empty()) {
    runner.addArguments("-colorspace", setting.colorspace.c_str());
  }
}

void AddFirstOutput(VELAUtils::ProcessRunner& runner, const PhotoThumbSetting& setting) {
  runner.addArguments("(", "-clone", "0");
  AddThumbOptions(runner, setting);
  runner.addArguments("-write", EscapedTempPath(setting).c_str(), ")", "-delete", "0");
}

void AddMiddleOutput(VELAUtils::ProcessRunner& runner, const PhotoThumbSetting& setting) {
  runner.addArguments("(", "+clone");
  AddThumbOptions(runner, setting);
  runner.addArguments("-write", EscapedTempPath(setting).c_str(), "+delete", ")");
}

void AddLastOutput(VELAUtils::ProcessRunner& runner, const PhotoThumbSetting& setting) {
  AddThumbOptions(runner, setting);
  runner.addArguments(EscapedTempPath(setting).c_str());
}
