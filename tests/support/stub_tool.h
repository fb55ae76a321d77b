// Recording stubs in place of the external tools.
#pragma once

#include <sys/types.h>

#include <cstdint>
#include <string>
#include <vector>

#include "platform/installed_names.h"
#include "support/stub_plan.h"

namespace vela_test {

constexpr const char* kConverterPath = "/usr/vela/bin/convert-thumb";
/// ImageMagick's own program, even where another one is called convert.
constexpr const char* kImageMagickPath = vela::kImageMagickProgram;
constexpr const char* kExiftoolPath = "/usr/vela/bin/exiftool";
constexpr const char* kDcrawPath = "/usr/bin/dcraw";
constexpr const char* kComparePath = "/usr/bin/compare";

/// A descriptor that a stub had when it started.
struct OpenDescriptor {
  int number = -1;
  std::string target;  ///< path, or "pipe:[...]" and the like
};

/// One call of a stub.
struct StubCall {
  std::string tool;                    ///< name, such as "convert-thumb"
  std::string path;                    ///< path it was started by
  int number = 0;                      ///< 1 for the tool's first call in this test
  std::vector<std::string> arguments;  ///< byte exact, argument zero included
  std::vector<OpenDescriptor> descriptors;
  std::string workingDirectory;
  std::vector<int> blockedSignals;
  std::vector<int> ignoredSignals;
  mode_t umask = 0;
  uid_t user = 0;
  gid_t group = 0;
  pid_t pid = 0;
  pid_t parentPid = 0;
  uint64_t startSequence = 0;    ///< place among all events, see NextSequence
  uint64_t endSequence = 0;      ///< 0 when it did not end normally
  int64_t startNanoseconds = 0;  ///< on the steady clock
  int64_t endNanoseconds = 0;    ///< on the steady clock, 0 when it did not end normally

  /// The arguments after argument zero.
  std::vector<std::string> Parameters() const;
};

/// A stub installed at the path of a tool. The record and the plans exist until the sandbox is
/// reset; the object only writes and reads them.
class StubTool {
 public:
  /// Installs the stub at `path`, replacing any file there, with the plan StubPlan::Normal(). The
  /// base name of `path` names the tool; one stub per name.
  explicit StubTool(const std::string& path);

  /// Sets the plan of calls that have no other plan.
  void Plan(const StubPlan& plan) const;
  /// Sets the plan of the call with this number (from 1); takes precedence over PlanWhen.
  void PlanCall(int number, const StubPlan& plan) const;
  /// Sets the plan of calls that have `argument` among their arguments; the latest that matches is
  /// used.
  void PlanWhen(const std::string& argument, const StubPlan& plan);

  /// This stub's calls, in the order of their start.
  std::vector<StubCall> Calls() const;

 private:
  std::string tool_;
  int conditions_ = 0;
};

/// The calls of all stubs, in the order of their start.
std::vector<StubCall> AllStubCalls();

/// Takes the next number from the counter that orders stub starts, stub ends, daemon requests and
/// events of the test itself.
uint64_t NextSequence();

/// Which converter is the real one: the project's own, or ImageMagick when the environment has
/// VELA_TEST_CONVERTER=imagemagick.
bool IsOwnConverterReal();
/// The real converter's program.
std::string RealConverterPath();

/// Installs the policy of ImageMagick where the converter looks for it.
void InstallImageMagickPolicy();

/// Install the real tools where the program looks for them; the converter with the policy.
void InstallRealConverter();
void InstallRealExiftool();
/// Installs both; dcraw and compare exist in a fresh sandbox.
void InstallRealTools();

/// Removes the tool: starting it fails.
void RemoveTool(const std::string& path);

}  // namespace vela_test
