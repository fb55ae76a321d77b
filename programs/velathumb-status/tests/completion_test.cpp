// Command-line completion in bash.
#include <sstream>

#include "status_fixture.h"
#include "support/build_paths.h"

namespace vela_test {
namespace {

using namespace ::testing;

/// Calls the registered completion function as bash does, with the words after the program's name
/// as $2 and so on; each proposal is printed with a trailing zero byte.
constexpr const char* kScript = R"(
  source "$1" && shift
  registered=$(complete -p velathumb-status) || exit 9
  function_name=$(set -- $registered; echo "$3")
  COMP_WORDS=(velathumb-status "$@")
  COMP_CWORD=$#
  "$function_name" velathumb-status "${COMP_WORDS[COMP_CWORD]}" "${COMP_WORDS[COMP_CWORD - 1]}"
  for proposal in "${COMPREPLY[@]}"; do printf '%s\0' "$proposal"; done
)";

class Completion : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories("/tmp/here/photos");
    MakeDirectories("/tmp/here/with space");
    WriteFile("/tmp/here/page.html", "page");
  }

  /// The proposals for the last of the words, in a directory with two directories and a file.
  static std::vector<std::string> Complete(const std::vector<std::string>& words) {
    std::vector<std::string> arguments = {
        "-c", kScript, "bash",
        SourceDirectory() + "/programs/velathumb-status/velathumb-status.bash"};
    arguments.insert(arguments.end(), words.begin(), words.end());
    ProgramOptions options;
    options.workingDirectory = "/tmp/here";
    const ProgramResult result = RunProgram("/bin/bash", arguments, options);
    EXPECT_EQ(result.exitCode, 0);
    EXPECT_EQ(result.err, "");
    std::vector<std::string> proposals;
    std::istringstream in(result.out);
    for (std::string proposal; std::getline(in, proposal, '\0');) {
      proposals.push_back(proposal);
    }
    return proposals;
  }
};

TEST_F(Completion, ProposesOptionsWithThePrefix) {
  EXPECT_THAT(Complete({"--pr"}), ElementsAre("--progress"));
  EXPECT_THAT(Complete({"--re"}), UnorderedElementsAre("--recursive", "--resume-time"));
  EXPECT_THAT(Complete({"/tmp", "--ch"}), UnorderedElementsAre("--check-videos", "--check-config"));
  EXPECT_THAT(Complete({"--nothing"}), IsEmpty());
}

/// The options of the help, in both their forms.
std::vector<std::string> OptionsOfTheHelp() {
  std::vector<std::string> options;
  std::istringstream help(RunStatus({"--help"}).out);
  for (std::string line; std::getline(help, line);) {
    if (line.compare(0, 3, "  -") != 0) {
      continue;
    }
    std::istringstream forms(line.substr(2, line.find(' ', 2) - 2));
    for (std::string form; std::getline(forms, form, ',');) {
      options.push_back(form);
    }
  }
  return options;
}

TEST_F(Completion, ProposesAllOptionsOfTheHelp) {
  const std::vector<std::string> options = OptionsOfTheHelp();
  EXPECT_EQ(options.size(), 22U);
  EXPECT_THAT(options, IsSupersetOf({"-p", "--photos", "--html", "-w"}));
  EXPECT_THAT(Complete({"-"}), UnorderedElementsAreArray(options));
}

TEST_F(Completion, ProposesDirectoriesOtherwise) {
  EXPECT_THAT(Complete({""}), UnorderedElementsAre("photos", "with space"));
  EXPECT_THAT(Complete({"--recursive", "ph"}), ElementsAre("photos"));
  EXPECT_THAT(Complete({"page"}), IsEmpty());
  EXPECT_THAT(Complete({"/tmp/here/w"}), ElementsAre("/tmp/here/with space"));
}

TEST_F(Completion, ProposesFilesForTheProfile) {
  EXPECT_THAT(Complete({"--check-config", "pa"}), ElementsAre("page.html"));
  EXPECT_THAT(Complete({"--check-config", "=", "pa"}), ElementsAre("page.html"));
}

TEST_F(Completion, ProposesFilesForThePage) {
  EXPECT_THAT(Complete({"--html", "pa"}), ElementsAre("page.html"));
  EXPECT_THAT(Complete({"--html", ""}), UnorderedElementsAre("page.html", "photos", "with space"));
}

}  // namespace
}  // namespace vela_test
