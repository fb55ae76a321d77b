// The check of the configuration files.
#include <sys/stat.h>

#include "status_fixture.h"
#include "support/build_paths.h"

namespace vela_test {
namespace {

using namespace ::testing;

constexpr const char* kSettings = "/etc/velainfo.conf";
constexpr const char* kProfile = "/tmp/p\nq.conf";
constexpr const char* kRight =
    "[thumb_xl]\nfilename=VELAPHOTO_THUMB_XL.jpg\nsize=1280\nquality=90\n";

class CheckConfig : public SandboxTest {};

TEST_F(CheckConfig, EndsWithStatus0WhenNothingIsFound) {
  WriteFile(kSettings, "tool_timeout=\"60\"\n");
  WriteFile(kProfile, kRight);
  const ProgramResult result = RunStatus({"--check-config", kProfile});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.out, "");
  EXPECT_EQ(result.err, "");
}

TEST_F(CheckConfig, PrintsALineForEachFinding) {
  WriteFile(kSettings, "\ntool_timeout=\"\x1b[2J\"\n");
  WriteFile(kProfile, std::string(kRight) + "qualty=\xff\nunsharp=foo\n");
  const ProgramResult result = RunStatus({"--check-config", kProfile});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.err, "");
  EXPECT_EQ(result.out,
            "/etc/velainfo.conf:2: warning: tool_timeout is not a number of seconds, or 0 for no "
            "limit: \"\\x1b[2J\"; 600 is used\n"
            "/tmp/p\\nq.conf:5: warning: there is no key \"qualty\"; did you mean quality?\n"
            "/tmp/p\\nq.conf:6: error: unsharp is not RADIUSxSIGMA+AMOUNT+THRESHOLD, such as "
            "0x0.8+0.5+0.01: \"foo\"; every photo fails\n");
}

TEST_F(CheckConfig, JsonHasTheDocumentedMembers) {
  WriteFile(kSettings, "nothing\n");
  const std::string profile = "/tmp/\xff.conf";
  const Json::Value answer = QueryJson({"--check-config", profile});
  EXPECT_THAT(answer.getMemberNames(), UnorderedElementsAre("format", "configuration", "errors"));
  const Json::Value configuration = answer["configuration"];
  EXPECT_EQ(configuration, ReadJson(R"({
    "settings": "/etc/velainfo.conf",
    "profile": "/tmp/\ufffd.conf", "profile_base64": "L3RtcC//LmNvbmY=",
    "findings": [
      {"file": "/etc/velainfo.conf", "line": 1, "severity": "warning",
       "message": "the line is ignored: it is neither key=\"value\" nor a comment"},
      {"file": "/tmp/\ufffd.conf", "file_base64": "L3RtcC//LmNvbmY=", "line": null,
       "severity": "error",
       "message": "cannot be read: No such file or directory; nothing is made"}]})"));
  EXPECT_EQ(RunStatus({"--json", "--check-config", profile}).exitCode, 1);
}

TEST_F(CheckConfig, WhatCannotBeReadIsAnErrorAndTheRestIsChecked) {
  WriteFile(kSettings, "nothing\n");
  WriteFile(kProfile, kRight);
  ASSERT_EQ(chmod(kProfile, 0), 0);
  const ProgramResult result = RunStatusAsOrdinaryUser({"--check-config", kProfile});
  ExpectError(result, "/tmp/p\\nq.conf: Permission denied");
  EXPECT_THAT(result.out, StartsWith("/etc/velainfo.conf:1: warning: "));
}

TEST_F(CheckConfig, WithoutANameTheProfileOfTheServicesIsChecked) {
  const Json::Value installed = QueryJson({"--check-config"})["configuration"];
  EXPECT_THAT(installed["profile"].asString(), EndsWith("/share/velathumb/thumb-profiles.conf"));
}

TEST_F(CheckConfig, ANameMayBeginWithABracket) {
  ProgramOptions options;
  options.workingDirectory = "/tmp";
  WriteFile("/tmp/[a,b]", kRight);
  EXPECT_EQ(RunStatus({"--check-config", "[a,b]"}, options).exitCode, 0);
}

}  // namespace
}  // namespace vela_test
