// The states of one connection.
#include "connection.h"

#include <gtest/gtest.h>
#include <sys/socket.h>

#include <memory>

#include "request.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;
using Clock = Connection::Clock;
using Received = Connection::Received;
using Sent = Connection::Sent;
using std::chrono::seconds;

class ConnectionTest : public ::testing::Test {
 protected:
  ConnectionTest() {
    int ends[2];
    EXPECT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
    client_ = vela::FileDescriptor(ends[0]);
    const int size = 4096;
    EXPECT_EQ(setsockopt(ends[1], SOL_SOCKET, SO_SNDBUF, &size, sizeof size), 0);
    connection_ = std::make_unique<Connection>(vela::FileDescriptor(ends[1]), begin_);
  }

  void ClientSends(const std::string& bytes) {
    ASSERT_EQ(send(client_.Get(), bytes.data(), bytes.size(), MSG_NOSIGNAL),
              static_cast<ssize_t>(bytes.size()));
  }

  std::string ClientReceives(size_t bytes) {
    std::string taken(bytes, '\0');
    const ssize_t got = recv(client_.Get(), taken.data(), bytes, MSG_DONTWAIT);
    taken.resize(got < 0 ? 0 : static_cast<size_t>(got));
    return taken;
  }

  const Clock::time_point begin_ = Clock::now();
  vela::FileDescriptor client_;
  std::unique_ptr<Connection> connection_;
};

TEST_F(ConnectionTest, LineMayComeInPieces) {
  EXPECT_EQ(connection_->Receive(begin_), Received::kMore);
  ClientSends("ab");
  EXPECT_EQ(connection_->Receive(begin_), Received::kMore);
  ClientSends("c\nrest");
  EXPECT_EQ(connection_->Receive(begin_), Received::kLine);
  EXPECT_EQ(connection_->Line(), "abc");
}

TEST_F(ConnectionTest, EndWithoutALineIsTheEnd) {
  client_.Close();
  EXPECT_EQ(connection_->Receive(begin_), Received::kEnd);
}

TEST_F(ConnectionTest, LineHasItsLimitWithOrWithoutANewline) {
  ClientSends(std::string(kRequestMax, 'x'));
  EXPECT_EQ(connection_->Receive(begin_), Received::kMore);
  ClientSends("x\n");
  EXPECT_EQ(connection_->Receive(begin_), Received::kTooLong);
}

TEST_F(ConnectionTest, ReplyWaitsForASlowClient) {
  const std::string reply(1000000, 'r');
  connection_->BeginReply(reply, false, begin_);
  ASSERT_EQ(connection_->Send(begin_), Sent::kMore);
  EXPECT_FALSE(connection_->IsOverdue(begin_ + seconds(29), seconds(30)));
  EXPECT_TRUE(connection_->IsOverdue(begin_ + seconds(30), seconds(30)));
  std::string received;
  Sent sent = Sent::kMore;
  for (std::string piece = ClientReceives(65536); !piece.empty(); piece = ClientReceives(65536)) {
    received += piece;
    if (sent == Sent::kMore) sent = connection_->Send(begin_);
  }
  EXPECT_EQ(sent, Sent::kAll);
  EXPECT_EQ(received, reply);
}

TEST_F(ConnectionTest, DisconnectedClientEndsTheReply) {
  client_.Close();
  connection_->BeginReply("reply\n", false, begin_);
  EXPECT_EQ(connection_->Send(begin_), Sent::kEnd);
}

TEST_F(ConnectionTest, BytesExtendTheTimeoutUpToALimit) {
  for (int second = 0; second < 120; second += 20) {
    ClientSends("x");
    ASSERT_EQ(connection_->Receive(begin_ + seconds(second)), Received::kMore);
    EXPECT_FALSE(connection_->IsOverdue(begin_ + seconds(second + 10), seconds(30)));
  }
  ClientSends("x");
  ASSERT_EQ(connection_->Receive(begin_ + seconds(119)), Received::kMore);
  EXPECT_TRUE(connection_->IsOverdue(begin_ + seconds(120), seconds(30)));
}

TEST_F(ConnectionTest, IsNeverOverdueDuringItsRequest) {
  connection_->BeginWork();
  EXPECT_FALSE(connection_->IsOverdue(begin_ + seconds(1000), seconds(30)));
}

TEST_F(ConnectionTest, DrainsFurtherBytesUpToALimit) {
  connection_->BeginReply("reply\n", true, begin_);
  ASSERT_EQ(connection_->Send(begin_), Sent::kMore);
  ASSERT_EQ(connection_->GetState(), Connection::State::kDraining);
  EXPECT_EQ(ClientReceives(100), "reply\n");
  const std::string chunk(65536, 'x');
  bool isOn = true;
  int chunks = 0;
  while (isOn && chunks < 1000) {
    ClientSends(chunk);
    ++chunks;
    isOn = connection_->Drain();
  }
  EXPECT_FALSE(isOn);
  EXPECT_GT(chunks, 100);
}

TEST_F(ConnectionTest, DrainingEndsWithTheClient) {
  connection_->BeginReply("reply\n", true, begin_);
  ASSERT_EQ(connection_->Send(begin_), Sent::kMore);
  client_.Close();
  EXPECT_FALSE(connection_->Drain());
}

TEST_F(ConnectionTest, DrainingHasATimeout) {
  connection_->BeginReply("reply\n", true, begin_);
  ASSERT_EQ(connection_->Send(begin_ + seconds(5)), Sent::kMore);
  EXPECT_FALSE(connection_->IsOverdue(begin_ + seconds(34), seconds(30)));
  EXPECT_TRUE(connection_->IsOverdue(begin_ + seconds(35), seconds(30)));
}

}  // namespace
}  // namespace vela_test
