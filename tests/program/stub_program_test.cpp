#include "program/stub_program_test.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <chrono>
#include <cstddef>
#include <cstdlib>
#include <thread>

#include "platform/vlibc.h"
#include "support/build_paths.h"
#include "support/files.h"
#include "support/images.h"

namespace vela_test {

namespace {

constexpr const char* kPausedFile = "/tmp/converter.is.here";
constexpr const char* kGoFile = "/tmp/converter.go";

/// The value of a member of a compact JSON object whose strings hold nothing to be escaped.
std::string StringMember(const std::string& json, const std::string& name) {
  const std::string beginning = "\"" + name + "\":\"";
  const size_t begin = json.find(beginning);
  if (begin == std::string::npos) {
    return "";
  }
  const size_t valueBegin = begin + beginning.size();
  return json.substr(valueBegin, json.find('"', valueBegin) - valueBegin);
}

std::vector<std::string> Arguments(const std::vector<std::string>& directories) {
  std::vector<std::string> arguments = {kProfiles};
  arguments.insert(arguments.end(), directories.begin(), directories.end());
  return arguments;
}

}  // namespace

std::vector<ProfileSection> ThreePhases() {
  return {{"thumb_s", 120, 70, std::nullopt, "VELAPHOTO_THUMB_S.jpg", 2},
          {"thumb_xl", 1280, 90, "0.5x0.5+1.25+0.0", "VELAPHOTO_THUMB_XL.jpg", 0},
          {"thumb_b", 640, 85, "0.6x0.6+1.0+0.0", "VELAPHOTO_THUMB_B.jpg", 1},
          {"thumb_m", 320, 75, std::nullopt, "VELAPHOTO_THUMB_M.jpg", 0}};
}

std::string MetadataDirOf(const std::string& photo) {
  const size_t slash = photo.rfind('/');
  return photo.substr(0, slash) + "/@eaDir" + photo.substr(slash);
}

std::string Thumb(const std::string& photo, const std::string& sizeClass) {
  return MetadataDirOf(photo) + "/VELAPHOTO_THUMB_" + sizeClass + ".jpg";
}

std::string OldThumb(const std::string& photo, const std::string& sizeClass) {
  return MetadataDirOf(photo) + "/VELAPHOTO:THUMB_" + sizeClass + ".jpg";
}

std::string Marker(const std::string& photo, const std::string& sizeClass) {
  return MetadataDirOf(photo) + "/VELAPHOTO_THUMB_" + sizeClass + ".fail";
}

std::string MakePhoto(const std::string& path) {
  MakeJpeg(path);
  SetFileTimeFromNow(path, -60);
  return path;
}

void PutThumbs(const std::string& photo, const std::vector<std::string>& sizeClasses) {
  for (const std::string& sizeClass : sizeClasses) {
    MakeDirectories(MetadataDirOf(photo));
    MakeJpeg(Thumb(photo, sizeClass));
  }
}

std::vector<std::string> MetadataOf(const std::string& photo) {
  return ListDirectory(MetadataDirOf(photo));
}

int Progress(const std::string& key) {
  char value[64] = "";
  VLIBCFileGetKeyValue(kPhotoProgress, key.c_str(), value, sizeof value, 0);
  return std::atoi(value);
}

std::vector<std::string> ProgressKeys() {
  std::vector<std::string> keys;
  for (const std::string& line : ReadLines(kPhotoProgress)) {
    keys.push_back(line.substr(0, line.find_first_of(" =")));
  }
  return keys;
}

std::string SourceOf(const StubCall& call) {
  const std::vector<std::string> parameters = call.Parameters();
  return parameters.size() > 2 && parameters[0] == "-define" ? parameters[2] : "";
}

std::vector<std::string> ConvertedSources() {
  std::vector<std::string> sources;
  for (const StubCall& call : AllStubCalls()) {
    if (call.path == kConverterPath) {
      sources.push_back(SourceOf(call));
    }
  }
  return sources;
}

std::vector<std::string> WithoutRandomNames(std::vector<std::string> arguments) {
  const std::string beginning = "/VELAPHOTO.tmp.";
  const std::string end = ".jpg";
  constexpr size_t kRandomLength = 6;
  for (std::string& argument : arguments) {
    const size_t at = argument.rfind(beginning);
    if (at == std::string::npos ||
        argument.size() != at + beginning.size() + kRandomLength + end.size()) {
      continue;
    }
    const auto random = argument.begin() + static_cast<std::ptrdiff_t>(at + beginning.size());
    if (std::all_of(random, random + kRandomLength,
                    [](unsigned char c) { return std::isalnum(c); })) {
      std::fill(random, random + kRandomLength, '?');
    }
  }
  return arguments;
}

std::vector<std::string> RequestsOf(const DaemonPeer& daemon) {
  std::vector<std::string> requests;
  for (const DaemonRequest& request : daemon.Requests()) {
    requests.push_back(request.command + " " + StringMember(request.bytes, "path"));
  }
  return requests;
}

std::vector<std::string> ReportedPhotos(const DaemonPeer& daemon) {
  std::vector<std::string> photos;
  for (const DaemonRequest& request : daemon.Requests()) {
    if (request.command == "POST_PHOTO_CONVERT") {
      photos.push_back(StringMember(request.bytes, "path"));
    }
  }
  return photos;
}

HeldLock::HeldLock(const std::string& path)
    : descriptor_(open(path.c_str(), O_RDONLY | O_CLOEXEC)),
      held_(descriptor_ >= 0 && flock(descriptor_, LOCK_EX | LOCK_NB) == 0) {}

HeldLock::~HeldLock() {
  if (descriptor_ >= 0) {
    close(descriptor_);
  }
}

bool WaitUntilUnlocked(const std::string& path, int milliseconds) {
  const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(milliseconds);
  while (!HeldLock(path).IsHeld()) {
    if (std::chrono::steady_clock::now() > end) {
      return false;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
  return true;
}

void StubProgramTest::SetUp() {
  SandboxTest::SetUp();
  WriteProfileFile(kProfiles, ThreePhases());
  MakeDirectories(kPhotos);
  converter_ = std::make_unique<StubTool>(kConverterPath);
}

ProgramResult StubProgramTest::Run(const std::vector<std::string>& directories,
                                   const ProgramOptions& options) {
  return RunProgram(VelathumbPath(), Arguments(directories), options);
}

Program StubProgramTest::Start(const std::vector<std::string>& directories,
                               const ProgramOptions& options) {
  return StartProgram(VelathumbPath(), Arguments(directories), options);
}

void StubProgramTest::PauseConverter(int call) const {
  Converter().PlanCall(
      call, StubPlan().WriteOutputs().CreateFile(kPausedFile).WaitForFile(kGoFile).Exit(0));
}

bool StubProgramTest::IsConverterPaused() {
  return WaitUntilExists(kPausedFile);
}

void StubProgramTest::Go() {
  WriteFile(kGoFile, "");
}

}  // namespace vela_test
