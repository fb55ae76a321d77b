#include "program/stub_program_test.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <chrono>
#include <thread>

#include "support/build_paths.h"
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

std::string RequestText(const DaemonRequest& request) {
  return request.command + " " + StringMember(request.bytes, "path");
}

}  // namespace

std::vector<ProfileSection> ThreePhases() {
  return {{"thumb_s", 120, 70, std::nullopt, "VELAPHOTO_THUMB_S.jpg", 2},
          {"thumb_xl", 1280, 90, "0.5x0.5+1.25+0.0", "VELAPHOTO_THUMB_XL.jpg", 0},
          {"thumb_b", 640, 85, "0.6x0.6+1.0+0.0", "VELAPHOTO_THUMB_B.jpg", 1},
          {"thumb_m", 320, 75, std::nullopt, "VELAPHOTO_THUMB_M.jpg", 0}};
}

ProfileSection Profile(const std::string& sizeClass, int size, int phase) {
  return {
      "thumb_" + sizeClass, size, 80, std::nullopt, "VELAPHOTO_THUMB_" + sizeClass + ".jpg", phase};
}

std::string MakePhoto(const std::string& path) {
  MakeJpeg(path);
  SetFileTimeFromNow(path, -60);
  return path;
}

void MakePhotos(const Strings& names) {
  for (const std::string& name : names) {
    MakePhoto(InPhotos(name));
  }
}

void MakePhotosIn(const Strings& directories) {
  for (const std::string& directory : directories) {
    MakePhoto(directory + "/a.jpg");
  }
}

void PutThumbs(const std::string& photo, const Strings& sizeClasses) {
  for (const std::string& sizeClass : sizeClasses) {
    MakeDirectories(MetadataDirOf(photo));
    MakeJpeg(Thumb(photo, sizeClass));
  }
}

Strings MetadataOf(const std::string& photo) {
  return ListDirectory(MetadataDirOf(photo));
}

Strings ProgressKeys() {
  Strings keys;
  for (const std::string& line : ReadLines(kPhotoProgress)) {
    keys.push_back(line.substr(0, line.find_first_of(" =")));
  }
  return keys;
}

void ExpectProgress(int completed, int completedThumb) {
  EXPECT_EQ(Progress("completed"), completed);
  EXPECT_EQ(Progress("completed_thumb"), completedThumb);
}

std::string SourceOf(const StubCall& call) {
  const Strings parameters = call.Parameters();
  return parameters.size() > 2 && parameters[0] == "-define" ? parameters[2] : "";
}

Strings ConvertedSources() {
  Strings sources;
  for (const StubCall& call : AllStubCalls()) {
    if (call.path == kConverterPath) {
      sources.push_back(SourceOf(call));
    }
  }
  return sources;
}

Strings RequestsOf(const DaemonPeer& daemon) {
  Strings requests;
  for (const DaemonRequest& request : daemon.Requests()) {
    requests.push_back(RequestText(request));
  }
  return requests;
}

Strings ReportedPhotos(const Strings& requests) {
  const std::string command = "POST_PHOTO_CONVERT ";
  Strings photos;
  for (const std::string& request : requests) {
    if (request.compare(0, command.size(), command) == 0) {
      photos.push_back(request.substr(command.size()));
    }
  }
  return photos;
}

ProgramOptions InDirectory(const std::string& workingDirectory) {
  ProgramOptions options;
  options.workingDirectory = workingDirectory;
  return options;
}

ProgramOptions WithUmask(mode_t umask) {
  ProgramOptions options;
  options.umask = umask;
  return options;
}

ProgramOptions WithSteps(const std::vector<BeforeExec>& beforeExec) {
  ProgramOptions options;
  options.beforeExec = beforeExec;
  return options;
}

HeldLock::HeldLock(const std::string& path)
    : descriptor_(open(path.c_str(), O_RDONLY | O_CLOEXEC)),
      held_(descriptor_ >= 0 && flock(descriptor_, LOCK_EX | LOCK_NB) == 0) {}

HeldLock::~HeldLock() {
  if (descriptor_ >= 0) {
    close(descriptor_);
  }
}

bool WaitUntilUnlocked(const std::string& path) {
  const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(10);
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

ProgramResult StubProgramTest::Run(const Strings& directories, const ProgramOptions& options) {
  return RunProgram(VelathumbPath(), ArgumentsFor(directories), options);
}

Program StubProgramTest::Start(const Strings& directories, const ProgramOptions& options) {
  return StartProgram(VelathumbPath(), ArgumentsFor(directories), options);
}

Strings StubProgramTest::RunWithDaemon(const Strings& directories, const ProgramOptions& options) {
  const DaemonPeer daemon;
  EXPECT_SUCCESS(Run(directories, options));
  return RequestsOf(daemon);
}

Strings StubProgramTest::RunAndObserve(const std::function<void(const std::string&)>& observe) {
  DaemonPeer daemon;
  const auto onRequest = [&](const DaemonRequest& request) { observe(RequestText(request)); };
  daemon.Answer("GET_INDEX_VERSION",
                DaemonReply::Line("{\"success\":true,\"version\":0}").Meanwhile(onRequest));
  daemon.Answer("POST_PHOTO_CONVERT", DaemonReply::Line("{\"success\":true}").Meanwhile(onRequest));
  EXPECT_SUCCESS(Run());
  return RequestsOf(daemon);
}

Program StubProgramTest::StartAndPause(int call, const Strings& directories,
                                       const ProgramOptions& options) const {
  Converter().PlanCall(
      call, StubPlan().WriteOutputs().CreateFile(kPausedFile).WaitForFile(kGoFile).Exit(0));
  Program program = Start(directories, options);
  EXPECT_TRUE(WaitUntilExists(kPausedFile));
  return program;
}

void StubProgramTest::Go() {
  WriteFile(kGoFile, "");
}

void StubProgramTest::GoAndFinish(Program& program) {
  Go();
  EXPECT_SUCCESS(*program.Wait());
}

}  // namespace vela_test
