// velaindexplugind [OPTION]...
//
// The index daemon: answers questions about photos and videos on a local socket.

#include <exception>
#include <iostream>

#include "options.h"
#include "service.h"
#include "version_request.h"

namespace vela {

namespace {

constexpr int kFailed = 1;
constexpr int kWrongUse = 2;

int Run(const Options& options) {
  try {
    return options.versionDirectory.empty() ? RunService(options) : RequestVersion(options);
  } catch (const std::exception& error) {
    std::cerr << "velaindexplugind: " << error.what() << '\n';
    return kFailed;
  }
}

int RunMain(int argc, char** argv) {
  Options options;
  switch (ParseOptions(argc, argv, options)) {
    case ParseOutcome::kDone:
      return 0;
    case ParseOutcome::kWrong:
      return kWrongUse;
    case ParseOutcome::kRun:
      break;
  }
  return Run(options);
}

}  // namespace

}  // namespace vela

int main(int argc, char** argv) {
  return vela::RunMain(argc, argv);
}
