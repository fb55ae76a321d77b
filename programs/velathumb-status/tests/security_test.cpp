// How the tools are confined.
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>

#include <linux/landlock.h>

#include "status_fixture.h"
#include "support/seccomp_fail.h"

namespace vela_test {
namespace {

using namespace ::testing;

constexpr char kUnconfinedTools[] = "/usr/vela/etc/unconfined-tools";

using SecurityReport = StatusTest;

ProgramOptions Without(const std::vector<RefusedCall>& calls) {
  ProgramOptions options;
  options.beforeExec = {SeccompFail(calls)};
  return options;
}

/// Everything that the report can miss.
std::vector<RefusedCall> AllCalls() {
  constexpr int kOpenat2 = 437;
  return {{SYS_seccomp, ENOSYS},
          {SYS_landlock_create_ruleset, EOPNOTSUPP},
          {kOpenat2, ENOSYS},
          {SYS_prctl, EINVAL, 0, UINT32_MAX, PR_GET_NO_NEW_PRIVS}};
}

TEST_F(SecurityReport, NamesEveryMechanismOfTheKernel) {
  const long version =
      syscall(SYS_landlock_create_ruleset, nullptr, 0, LANDLOCK_CREATE_RULESET_VERSION);
  const ProgramResult result = RunStatus({"--security"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.err, "");
  EXPECT_THAT(result.out, HasSubstr("    no new privileges: active\n"));
  EXPECT_THAT(result.out, HasSubstr("    system call filter: active\n"));
  EXPECT_THAT(result.out, HasSubstr("    limits: active, 2 GiB of memory, 4 GiB for each file, "
                                    "processor time, no core dumps\n"));
  EXPECT_THAT(result.out, HasSubstr("    unconfined tools: none\n"));
  if (version >= 6) {
    EXPECT_THAT(result.out,
                HasSubstr("    file access: active, Landlock version " + std::to_string(version) +
                          ": reading, writing, running programs, truncating, TCP, "
                          "device control, signals, abstract sockets\n"));
  }
}

TEST_F(SecurityReport, SaysWhatTheKernelDoesNotSupport) {
  const ProgramResult result = RunStatus({"--security"}, Without(AllCalls()));
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_THAT(result.out, HasSubstr("    no new privileges: not supported by this kernel\n"
                                    "    system call filter: not supported by this kernel\n"
                                    "    file access: not supported by this kernel\n"
                                    "    link checks in one system call: not supported by this "
                                    "kernel\n"));
}

TEST_F(SecurityReport, IsTheSameInJson) {
  const Json::Value answer = QueryJson({"--security"});
  ExpectMembers(answer["security"],
                R"({"no_new_privileges": true, "system_call_filter": true,
                    "memory_limit": 2147483648, "file_size_limit": 4294967296,
                    "unconfined_tools": []})");
  const Json::Value none = ReadJson(RunStatus({"--security", "--json"}, Without(AllCalls())).out);
  ExpectMembers(none["security"],
                R"({"no_new_privileges": false, "system_call_filter": false,
                    "landlock_version": 0, "landlock_covers": [], "openat2": false})");
  const Json::Value noLandlock = ReadJson(
      RunStatus({"--security", "--json"}, Without({{SYS_landlock_create_ruleset, ENOSYS}})).out);
  ExpectMembers(noLandlock["security"],
                R"({"no_new_privileges": true, "system_call_filter": true,
                    "landlock_version": 0})");
}

TEST_F(SecurityReport, ListsTheToolsThatAreNotConfined) {
  WriteFile(kUnconfinedTools, "# a comment\n/usr/bin/dcraw\n\nno path\n/opt/a\tb\n");
  ASSERT_EQ(chmod(kUnconfinedTools, 0644), 0);
  EXPECT_THAT(RunStatus({"--security"}).out,
              EndsWith("    unconfined tools:\n        /usr/bin/dcraw\n        /opt/a\\x09b\n"));
  EXPECT_THAT(Texts(QueryJson({"--security"})["security"]["unconfined_tools"]),
              ElementsAre("/usr/bin/dcraw", "/opt/a\tb"));
  ASSERT_EQ(chmod(kUnconfinedTools, 0666), 0);
  EXPECT_THAT(RunStatus({"--security"}).out, EndsWith("    unconfined tools: none\n"));
}

}  // namespace
}  // namespace vela_test
