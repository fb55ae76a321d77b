// velaindexplugind [OPTION]...
//
// The index daemon: answers requests about photos and videos on a local socket.

#include "cli/command_line.h"
#include "options.h"
#include "service.h"
#include "version_request.h"

namespace vela {

namespace {

constexpr int kFailed = 1;

int Run(const Options& options) {
  return options.versionDirectory.empty() ? RunService(options) : RequestVersion(options);
}

}  // namespace

}  // namespace vela

int main(int argc, char** argv) {
  return vela::RunProgram(argc, argv, vela::ParseOptions, vela::Run, vela::kFailed);
}
