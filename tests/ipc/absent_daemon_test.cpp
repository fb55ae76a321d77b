// Requests of a program that was told that there is no daemon.
#include "ipc/absent_daemon.h"

#include <cstdlib>

#include "ipc/client_operations.h"
#include "support/daemon_peer.h"
#include "support/files.h"

namespace vela_test {
namespace {

using ::testing::IsEmpty;

class AbsentDaemon : public ClientTest {
 protected:
  void SetUp() override {
    ClientTest::SetUp();
    setenv(vela::kAbsentDaemonVariable, "1", 1);
  }
  void TearDown() override {
    unsetenv(vela::kAbsentDaemonVariable);
    ClientTest::TearDown();
  }

  static void ExpectQuietFailures() {
    for (const ClientOperation& operation : ClientOperations()) {
      EXPECT_EQ(operation.call(kPath), operation.failure) << operation.command;
      EXPECT_THAT(TakeErrorLines(), IsEmpty()) << operation.command;
    }
  }
};

TEST_F(AbsentDaemon, IsNotLoggedForEachRequest) {
  ExpectQuietFailures();
}

TEST_F(AbsentDaemon, ThatHasLeftItsSocketIsNotLoggedForEachRequest) {
  WriteFile(kDaemonSocket, "");
  ExpectQuietFailures();
}

TEST_F(AbsentDaemon, ThatHasComeSinceGetsTheRequests) {
  const DaemonPeer daemon;
  for (const ClientOperation& operation : ClientOperations()) {
    EXPECT_EQ(operation.call(kPath), 0) << operation.command;
  }
  EXPECT_EQ(daemon.Requests().size(), ClientOperations().size());
}

TEST_F(AbsentDaemon, ThatHasComeSinceAndFailsIsLogged) {
  for (const DaemonReply& reply :
       {DaemonReply::Line(R"({"success":false})"), DaemonReply::CloseAfterRequest()}) {
    DaemonPeer daemon;
    for (const ClientOperation& operation : ClientOperations()) {
      daemon.AnswerNext(reply);
      ExpectFailure(operation);
    }
  }
}

}  // namespace
}  // namespace vela_test
