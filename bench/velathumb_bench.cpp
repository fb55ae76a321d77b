// velathumb_bench SCRATCH-DIRECTORY
//
// Measures velathumb and the least work that could give the same result in the same run, and prints
// the ratios. Runs in a sandbox; its files are in the scratch directory, which should be on a disk.

#include <algorithm>
#include <cstdio>
#include <fstream>
#include <string>
#include <vector>

#include "answering_daemon.h"
#include "daemon_bench.h"
#include "photo_tree.h"
#include "support/build_paths.h"
#include "support/files.h"
#include "support/profile_file.h"
#include "support/sandbox.h"
#include "support/stub_tool.h"
#include "timed_run.h"

namespace vela_bench {

namespace {

using vela_test::BuiltPath;

const std::string kScratch = vela_test::kWritablePlace;

/// Writes a profile file with all six size classes, spread over the three phases.
std::string WriteSixSizes() {
  return vela_test::WriteProfileFile(
      "/tmp/six.conf", {{"thumb_xl", 1280, 90, "0.5x0.5+1+0", "VELAPHOTO_THUMB_XL.jpg", 0},
                        {"thumb_m", 320, 80, "0.5x0.5+1+0", "VELAPHOTO_THUMB_M.jpg", 0},
                        {"thumb_l", 800, 80, "", "VELAPHOTO_THUMB_L.jpg", 1},
                        {"thumb_sm", 240, 80, "", "VELAPHOTO_THUMB_SM.jpg", 1},
                        {"thumb_b", 640, 80, "", "VELAPHOTO_THUMB_B.jpg", 2},
                        {"thumb_s", 120, 80, "", "VELAPHOTO_THUMB_S.jpg", 2}});
}

void Report(const char* what, const Cost& subject, const Cost& floor, int photos,
            const char* target) {
  std::printf("%-34s %9.3f ms %9.3f ms  ratio %6.3f  %s\n", what,
              subject.wallSeconds * 1e3 / photos, floor.wallSeconds * 1e3 / photos,
              subject.wallSeconds / floor.wallSeconds, target);
}

void WriteCommands(const std::string& path) {
  std::ofstream file(path, std::ios::binary);
  for (const vela_test::StubCall& call : vela_test::AllStubCalls()) {
    for (const std::string& argument : call.arguments) {
      file << argument << '\0';
    }
    file << '\0';
  }
}

/// Compares the wall time for 50 photos with that of the same converter commands alone.
void MeasureConversion() {
  constexpr int kPhotos = 50;
  const std::string directory = kScratch + "/real";
  const std::string profiles = WriteSixSizes();
  MakeRealPhotos(directory, kPhotos, 2048, 1536);
  const std::vector<std::string> subject = {vela_test::VelathumbPath(), profiles, directory};
  {
    const vela_test::StubTool recorder(vela_test::kConverterPath);
    recorder.Plan(vela_test::StubPlan().PassThrough(vela_test::RealConverterPath()));
    TimedRun(subject);
    WriteCommands("/tmp/commands");
  }
  vela_test::InstallRealConverter();
  const CostPair cost = FastestOf(
      2,
      [&] {
        RemoveMetadata(directory);
        return TimedRun(subject);
      },
      [&] {
        return TimedRun({BuiltPath(FLOOR_COMMANDS), "/tmp/commands"});
      });
  Report("conversion, a photo", cost.subject, cost.floor, kPhotos, "(target 1.02)");
  vela_test::RemoveTree(directory);
}

/// Compares the time for photos that are up to date with listing them and calling stat for their
/// files.
void MeasureNothingToDo() {
  constexpr int kPhotos = 20000;
  const std::string directory = kScratch + "/done";
  MakePhotoFiles(directory, kPhotos);
  MakeThumbFiles(directory, kPhotos);
  const std::vector<std::string> subject = {vela_test::VelathumbPath(), WriteSixSizes(), directory};
  const auto runSubject = [&] { return TimedRun(subject); };
  const auto runFloor = [&] { return TimedRun({BuiltPath(FLOOR_STATUS), directory}); };
  const CostPair alone = FastestOf(5, runSubject, runFloor);
  Report("nothing to do, no daemon, a photo", alone.subject, alone.floor, kPhotos, "(target 2.00)");
  {
    const AnsweringDaemon daemon;
    const CostPair answered = FastestOf(3, runSubject, runFloor);
    Report("nothing to do, daemon, a photo", answered.subject, answered.floor, kPhotos, "");
  }
  vela_test::RemoveTree(directory);
}

/// Compares a run on an empty directory with a program that does nothing.
void MeasureStart() {
  constexpr int kRuns = 100;
  const std::string directory = kScratch + "/empty";
  vela_test::MakeDirectories(directory);
  const std::vector<std::string> subject = {vela_test::VelathumbPath(), WriteSixSizes(), directory};
  const CostPair cost = FastestOf(
      kRuns, [&] { return TimedRun(subject); }, [] { return TimedRun({"/bin/true"}); });
  std::printf("%-34s %9.3f ms %9.3f ms  %.3f ms more (target 5)\n", "start to end, empty directory",
              cost.subject.wallSeconds * 1e3, cost.floor.wallSeconds * 1e3,
              (cost.subject.wallSeconds - cost.floor.wallSeconds) * 1e3);
}

/// Resident memory of a running process in MiB.
struct Memory {
  double now = 0;
  double peak = 0;
};

Memory MemoryOf(int pid) {
  std::ifstream status("/proc/" + std::to_string(pid) + "/status");
  Memory memory;
  for (std::string line; std::getline(status, line);) {
    long kibibytes = 0;
    if (std::sscanf(line.c_str(), "VmRSS: %ld", &kibibytes) == 1) {
      memory.now = static_cast<double>(kibibytes) / 1024;
    } else if (std::sscanf(line.c_str(), "VmHWM: %ld", &kibibytes) == 1) {
      memory.peak = static_cast<double>(kibibytes) / 1024;
    }
  }
  return memory;
}

/// Measures the peak memory for a large directory and whether memory grows with the photos
/// processed.
void MeasureMemory() {
  constexpr int kPhotos = 100000;
  const std::string directory = kScratch + "/many";
  MakePhotoFiles(directory, kPhotos);
  // Without a profile nothing is converted, so every photo is processed quickly.
  const std::string profiles = vela_test::WriteProfileFile("/tmp/none.conf", {});
  std::vector<Memory> samples;
  TimedRun({vela_test::VelathumbPath(), profiles, directory}, [&](int pid) {
    const Memory memory = MemoryOf(pid);
    if (memory.peak > 0) {
      samples.push_back(memory);
    }
  });
  if (samples.size() < 10) {
    Fail("too few memory samples");
  }
  std::printf("%-34s %9.1f MiB  (target below 40)\n", "peak memory, 100,000 photos",
              samples.back().peak);
  std::printf("%-34s %9.1f MiB %9.1f MiB at the end\n", "resident after 30 % of the run",
              samples[samples.size() * 3 / 10].now, samples.back().now);
  vela_test::RemoveTree(directory);
}

/// Creates a tree of directories whose photos are all up to date.
void MakeTree(const std::string& root, int directories, int photos) {
  for (int i = 0; i < directories; ++i) {
    const std::string directory = root + "/" + std::to_string(i);
    MakePhotoFiles(directory, photos);
    MakeThumbFiles(directory, photos);
  }
}

/// Writes a queue of many directories outside the scanned tree.
void WriteLongQueue(int lines) {
  std::ofstream queue("/var/spool/thumb_create.queue");
  for (int i = 0; i < lines; ++i) {
    queue << "/volume1/photo/somewhere else/" << i << '\n';
  }
}

/// Runs the status scan of a tree; `peak` receives its peak memory in MiB.
Cost RunScan(const std::string& root, double& peak) {
  return TimedRun({BuiltPath(VELATHUMB_STATUS), "--recursive", root},
                  [&peak](int pid) { peak = std::max(peak, MemoryOf(pid).peak); });
}

void ReportScanMemory(const char* what, double peak) {
  std::printf("%-34s %9.1f MiB\n", what, peak);
}

/// Compares the status of a large tree with a listing of the same files, and measures whether its
/// memory grows with the number of photos.
void MeasureScan() {
  constexpr int kDirectories = 1000;
  constexpr int kPhotos = 100;
  constexpr int kAll = kDirectories * kPhotos;
  const std::string small = kScratch + "/small";
  MakeTree(small, kDirectories / 10, kPhotos);
  double peak = 0;
  RunScan(small, peak);
  ReportScanMemory("status scan, peak, 10,000 photos", peak);
  vela_test::RemoveTree(small);

  const std::string root = kScratch + "/tree";
  MakeTree(root, kDirectories, kPhotos);
  const auto runFloor = [&] { return TimedRun({"/usr/bin/find", root, "-type", "f"}); };
  peak = 0;
  const auto runSubject = [&] { return RunScan(root, peak); };
  const CostPair alone = FastestOf(3, runSubject, runFloor);
  ReportScanMemory("status scan, peak, 100,000 photos", peak);
  Report("status scan, a photo", alone.subject, alone.floor, kAll, "");
  WriteLongQueue(1000000);
  const CostPair queued = FastestOf(3, runSubject, runFloor);
  Report("with 1,000,000 lines in the queue", queued.subject, queued.floor, kAll, "");
  ReportScanMemory("peak memory with that queue", peak);
  vela_test::RemoveTree("/var/spool/thumb_create.queue");
  vela_test::RemoveTree(root);
}

}  // namespace

}  // namespace vela_bench

int main(int argc, char** argv) {
  if (argc != 2) {
    std::fprintf(stderr, "usage: velathumb_bench SCRATCH-DIRECTORY\n");
    return 2;
  }
  vela_test::EnterSandbox(argv[1]);
  std::setvbuf(stdout, nullptr, _IOLBF, 0);
  std::printf("%-34s %12s %12s\n", "", "velathumb", "floor");
  vela_bench::MeasureStart();
  vela_bench::MeasureNothingToDo();
  vela_bench::MeasureDaemon();
  vela_bench::MeasureMemory();
  vela_bench::MeasureScan();
  vela_bench::MeasureConversion();
  return 0;
}
