// Going through the directories of a tree with a visitor that gives up.
#include "storage/directory_tree.h"

#include <gmock/gmock.h>
#include <unistd.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "support/files.h"
#include "support/sandbox.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::UnorderedElementsAre;

constexpr const char* kTop = "/tmp/tree";

class DirectoryTree : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories("/tmp/tree/a/b/c/d");
  }

  /// The directories that a visitor is shown which throws at the one of this path.
  static std::vector<std::string> VisitedUntil(const std::string& last) {
    std::vector<std::string> visited;
    const auto visit = [&](const char* path, bool /*isReadable*/) {
      visited.emplace_back(path);
      if (path == last) {
        throw std::runtime_error("enough at " + last);
      }
    };
    try {
      EXPECT_EQ(ForEachIndexedDirectory(kTop, visit), 0);
      EXPECT_NE(visited.back(), last) << "the exception was lost";
    } catch (const std::runtime_error& error) {
      EXPECT_EQ(error.what(), "enough at " + last);
    }
    return visited;
  }
};

TEST_F(DirectoryTree, AVisitorThatThrowsEndsTheWalkWithItsException) {
  EXPECT_THAT(VisitedUntil("/tmp/tree/a/b"), ElementsAre(kTop, "/tmp/tree/a", "/tmp/tree/a/b"));
  const auto visit = [](const char* /*path*/, bool /*isReadable*/) { throw 42; };
  EXPECT_THROW(ForEachIndexedDirectory(kTop, visit), int);
}

TEST_F(DirectoryTree, AVisitorThatThrowsLeavesNoDescriptorOpen) {
  const std::vector<std::string> before = ListDirectory("/proc/self/fd");
  for (const char* last : {"/tmp/tree", "/tmp/tree/a/b", "/tmp/tree/a/b/c/d"}) {
    VisitedUntil(last);
    EXPECT_EQ(ListDirectory("/proc/self/fd"), before) << last;
  }
}

TEST_F(DirectoryTree, TheNextWalkIsWhole) {
  VisitedUntil("/tmp/tree/a/b");
  EXPECT_THAT(VisitedUntil(""), UnorderedElementsAre(kTop, "/tmp/tree/a", "/tmp/tree/a/b",
                                                     "/tmp/tree/a/b/c", "/tmp/tree/a/b/c/d"));
}

}  // namespace
}  // namespace vela_test
