#include "daemon_bench.h"

#include <json/value.h>
#include <sched.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <fstream>
#include <functional>
#include <iterator>
#include <string>
#include <thread>
#include <vector>

#include "answering_daemon.h"
#include "ipc/velamk_ipc.h"
#include "photo_tree.h"
#include "platform/velaindex.h"
#include "support/build_paths.h"
#include "support/files.h"
#include "support/profile_file.h"
#include "support/program.h"
#include "support/sandbox.h"
#include "timed_run.h"

namespace vela_bench {

namespace {

using vela_test::BuiltPath;

const std::string kScratch = vela_test::kWritablePlace;

/// The daemon runs on this processor, the clients on the others if there are any.
constexpr int kDaemonProcessor = 0;

constexpr int kClients = 8;

/// An index daemon that runs on one processor, with its database on the scratch disk.
class PinnedDaemon {
 public:
  PinnedDaemon()
      : program_(vela_test::StartProgram(
            "/usr/bin/taskset", {"-c", std::to_string(kDaemonProcessor), BuiltPath(VELAINDEXPLUGIND),
                                 "--database", kScratch + "/index/index.db"})) {
    Json::Value packet;
    for (int tries = 0; tries < 1000; ++tries) {
      packet = Json::Value(Json::objectValue);
      packet["command"] = "IS_DISABLE_CONVERT_PHOTO";
      if (AutoSendRecvPacket(PluginDaemonSocketPath, -1, packet, 10) == 0) return;
      usleep(10000);
    }
    Fail("the index daemon did not start: " + program_.Error());
  }

  ~PinnedDaemon() {
    program_.Kill(SIGTERM);
    program_.Wait();
    vela_test::RemoveTree(kScratch + "/index");
  }
  PinnedDaemon(const PinnedDaemon&) = delete;
  PinnedDaemon& operator=(const PinnedDaemon&) = delete;

  /// Processor time used so far.
  double Seconds() const {
    std::ifstream file("/proc/" + std::to_string(program_.Pid()) + "/stat");
    std::string text((std::istreambuf_iterator<char>(file)), std::istreambuf_iterator<char>());
    text.erase(0, text.rfind(')') + 2);
    unsigned long user = 0;
    unsigned long system = 0;
    if (std::sscanf(text.c_str(), "%*c %*d %*d %*d %*d %*d %*u %*u %*u %*u %*u %lu %lu", &user,
                    &system) != 2) {
      Fail("cannot read the daemon's processor time");
    }
    return static_cast<double>(user + system) / static_cast<double>(sysconf(_SC_CLK_TCK));
  }

 private:
  vela_test::Program program_;
};

/// Keeps the calling thread off the daemon's processor if there is another one.
void LeaveDaemonProcessor() {
  cpu_set_t processors;
  if (sched_getaffinity(0, sizeof processors, &processors) != 0) return;
  CPU_CLR(kDaemonProcessor, &processors);
  if (CPU_COUNT(&processors) > 0) sched_setaffinity(0, sizeof processors, &processors);
}

/// Calls `request` with every number from 0 to `count` - 1, from several concurrent clients.
void RequestFromClients(int count, const std::function<void(int)>& request) {
  std::vector<std::thread> clients;
  for (int client = 0; client < kClients; ++client) {
    clients.emplace_back([=, &request] {
      LeaveDaemonProcessor();
      for (int i = client; i < count; i += kClients) request(i);
    });
  }
  for (std::thread& client : clients) client.join();
}

void ReportRequests(const char* what, const PinnedDaemon& daemon, int count,
                    const std::function<void(int)>& request) {
  const double before = daemon.Seconds();
  const auto begin = std::chrono::steady_clock::now();
  RequestFromClients(count, request);
  const std::chrono::duration<double> wall = std::chrono::steady_clock::now() - begin;
  const double used = daemon.Seconds() - before;
  std::printf("%-34s %9.0f per second, %6.1f us of processor time each\n", what,
              count / wall.count(), used * 1e6 / count);
}

std::string PhotoPath(const std::string& directory, int number) {
  return directory + "/" + std::to_string(number) + ".jpg";
}

void MeasureRequests() {
  constexpr int kRequests = 50000;
  constexpr int kPhotos = 3000;
  const std::string directory = kScratch + "/requested";
  MakeRealPhotos(directory, kPhotos, 64, 48);
  const std::vector<std::string> names = vela_test::ListDirectory(directory);
  const auto requestMedia = [&](int i) {
    const std::string path = directory + "/" + names[static_cast<size_t>(i) % names.size()];
    VELA_MEDIA_INFO media = {};
    if (GetMediaFromPluginDB(THUMB_TYPE_PHOTO, path.c_str(), media) != 0) {
      Fail("the index daemon returned no record of " + path);
    }
  };
  // The daemon does not keep records of files that have just been changed.
  for (const std::string& name : names) {
    vela_test::SetFileTimeFromNow(directory + "/" + name, -3600);
  }
  const PinnedDaemon daemon;
  ReportRequests("requests: is conversion disabled", daemon, kRequests,
                 [](int) { IsDisableConvertPhoto(); });
  ReportRequests("requests: index version", daemon, kRequests, [&](int i) {
    if (GetIndexVersion(PhotoPath(directory, i).c_str()) != 0) Fail("wrong index version");
  });
  ReportRequests("requests: photo is done", daemon, kRequests,
                 [&](int i) { PostPhotoConvert(PhotoPath(directory, i).c_str()); });
  ReportRequests("requests: media record, new", daemon, static_cast<int>(names.size()),
                 requestMedia);
  ReportRequests("requests: media record, known", daemon, kRequests, requestMedia);
  vela_test::RemoveTree(directory);
}

/// Measures photos that are up to date without a daemon, with one of almost no cost, and with the
/// index daemon.
void MeasureUpToDate() {
  constexpr int kPhotos = 5000;
  constexpr int kRounds = 3;
  const std::string directory = kScratch + "/uptodate";
  MakePhotoFiles(directory, kPhotos);
  MakeThumbFiles(directory, kPhotos);
  const std::string profiles = vela_test::WriteProfileFile(
      "/tmp/one.conf", {{"thumb_xl", 1280, 90, "", "VELAPHOTO_THUMB_XL.jpg", 0}});
  const std::vector<std::string> command = {vela_test::VelathumbPath(), profiles, directory};
  const auto fastest = [&command] {
    double best = TimedRun(command).wallSeconds;
    for (int i = 1; i < kRounds; ++i) best = std::min(best, TimedRun(command).wallSeconds);
    return best * 1e3 / kPhotos;
  };
  const double alone = fastest();
  double answered = 0;
  {
    const AnsweringDaemon daemon;
    answered = fastest();
  }
  double indexed = 0;
  {
    const PinnedDaemon daemon;
    indexed = fastest();
  }
  std::printf(
      "%-34s %9.3f ms without a daemon, %.3f ms with one that answers immediately, %.3f ms"
      " with the index daemon\n",
      "nothing to do, a photo", alone, answered, indexed);
  vela_test::RemoveTree(directory);
}

}  // namespace

void MeasureDaemon() {
  MeasureRequests();
  MeasureUpToDate();
}

}  // namespace vela_bench
