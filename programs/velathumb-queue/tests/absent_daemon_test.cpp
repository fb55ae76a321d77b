// A machine without an index daemon: one line of the runner instead of two for each photo.
#include <chrono>
#include <memory>
#include <set>
#include <thread>

#include "queue_fixture.h"
#include "support/build_paths.h"
#include "support/daemon_peer.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using namespace ::testing;

constexpr char kWarning[] =
    "velathumb-queue: no index daemon listens at /tmp/velaindexplugind_sock: photos are processed, "
    "but not reported to it\n";

class AbsentDaemonTest : public QueueTest {
 protected:
  AbsentDaemonTest() {
    MakePhoto("/tmp/p/a.jpg");
    MakePhoto("/tmp/p/b.jpg");
    MakePhoto("/tmp/q/c.jpg");
  }

  static int Count(const std::string& text, const std::string& part) {
    int count = 0;
    for (size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) {
      ++count;
    }
    return count;
  }

  const StubTool converter_{kConverterPath};
};

TEST_F(AbsentDaemonTest, IsLoggedOnceInARun) {
  Enqueue({"/tmp/p", "/tmp/q"});
  const ProgramResult result = RunRunner();
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(Count(result.err, kWarning), 1) << result.err;
  EXPECT_THAT(ErrorLines(), IsEmpty());
  EXPECT_TRUE(HasThumb("/tmp/p/a.jpg") && HasThumb("/tmp/q/c.jpg"));
}

TEST_F(AbsentDaemonTest, IsLoggedForEachPhotoByAVelathumbThatIsStartedByHand) {
  EXPECT_EQ(RunProgram(VelathumbPath(), {kProfiles, "/tmp/q"}).exitCode, 0);
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_ipc:57 fail", "velamk_ipc:137 fail"));
}

TEST_F(AbsentDaemonTest, GetsReportsAsSoonAsItHasCome) {
  velathumb_.Stub().PlanCall(1, StubPlan().WaitForFile("/tmp/go").PassThrough(VelathumbPath()));
  velathumb_.Stub().Plan(StubPlan().PassThrough(VelathumbPath()));
  Enqueue({"/tmp/p", "/tmp/q"});
  Program runner = velathumb_.Start();
  ASSERT_TRUE(velathumb_.WaitForStarts(1));
  const DaemonPeer daemon;
  // The answer that nobody listens is valid for a second.
  std::this_thread::sleep_for(std::chrono::milliseconds(1500));
  Release();
  ExpectEnd(runner, 0);
  std::set<std::string> reports;
  for (const DaemonRequest& request : daemon.Requests()) {
    if (request.command == "POST_PHOTO_CONVERT") {
      reports.insert(request.bytes);
    }
  }
  EXPECT_THAT(reports, UnorderedElementsAre(HasSubstr("/tmp/p/a.jpg"), HasSubstr("/tmp/p/b.jpg"),
                                            HasSubstr("/tmp/q/c.jpg")));
  EXPECT_THAT(runner.Error(), AllOf(HasSubstr(kWarning),
                                    HasSubstr("velathumb-queue: an index daemon listens again\n")));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(AbsentDaemonTest, ThatLeavesLaterIsLoggedThen) {
  velathumb_.Stub().PlanCall(1, StubPlan().WaitForFile("/tmp/go"));
  Enqueue({"/tmp/p", "/tmp/q"});
  auto daemon = std::make_unique<DaemonPeer>();
  Program runner = velathumb_.Start();
  ASSERT_TRUE(velathumb_.WaitForStarts(1));
  EXPECT_EQ(Count(runner.Error(), kWarning), 0);
  daemon.reset();
  std::this_thread::sleep_for(std::chrono::milliseconds(1500));
  Release();
  ExpectEnd(runner, 0);
  EXPECT_EQ(Count(runner.Error(), kWarning), 1);
}

}  // namespace
}  // namespace vela_test
