// What the client passes to the platform, and how it interprets the packet that the platform
// returns. The exchange is faked.

#include "ipc/client_operations.h"

namespace {

/// One call of the exchange.
struct ExchangeCall {
  std::string socketPath;
  int unused;
  Json::Value packet;
  int timeoutSeconds;
};

/// The behaviour of the fake and the calls it received.
struct FakeExchange {
  bool leavePacket = false;  ///< the exchange leaves the request in place
  Json::Value reply;
  int exchangeResult = 0;
  int convertResult = 0;
  std::vector<ExchangeCall> calls;
  std::vector<Json::Value> media;
};

FakeExchange g_exchange;

}  // namespace

int AutoSendRecvPacket(const char* socketPath, int unused, Json::Value& packet,
                       int timeoutSeconds) {
  g_exchange.calls.push_back({socketPath, unused, packet, timeoutSeconds});
  if (!g_exchange.leavePacket) {
    packet = g_exchange.reply;
  }
  return g_exchange.exchangeResult;
}

int MediaInfoJson2Object(Json::Value& media, VELA_MEDIA_INFO& out) {
  g_exchange.media.push_back(media);
  out.width = 77;
  return g_exchange.convertResult;
}

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

class Exchange : public ClientTest {
 protected:
  void SetUp() override {
    ClientTest::SetUp();
    g_exchange = FakeExchange();
  }
};

TEST_F(Exchange, EveryOperationHandsOverTheSameArguments) {
  for (const ClientOperation& operation : ClientOperations()) {
    SCOPED_TRACE(operation.command);
    g_exchange.calls.clear();
    ExpectFailure(operation);  // the fake leaves no reply
    ASSERT_THAT(g_exchange.calls, SizeIs(1));
    const ExchangeCall& call = g_exchange.calls.front();
    EXPECT_EQ(call.socketPath, "/tmp/velaindexplugind_sock");
    EXPECT_EQ(call.unused, -1);
    EXPECT_EQ(call.timeoutSeconds, 1800);
    Json::Value expected(Json::objectValue);
    expected["command"] = operation.command;
    if (operation.sendsPath) {
      expected["path"] = kPath;
    }
    if (operation.command == "GET_MEDIA_FROM_PLUGIN_DB") {
      expected["type"] = 1;
    }
    EXPECT_EQ(call.packet, expected);
  }
}

TEST_F(Exchange, OnlyThePacketDecidesOnSuccess) {
  g_exchange.exchangeResult = -1;
  g_exchange.reply = Parsed(R"({"success":true,"version":3,"result":true})");
  EXPECT_EQ(GetIndexVersion(kPath), 3);
  EXPECT_TRUE(IsDisableConvertPhoto());
}

TEST_F(Exchange, ARequestLeftInThePacketIsAFailure) {
  g_exchange.leavePacket = true;
  for (const ClientOperation& operation : ClientOperations()) {
    ExpectFailure(operation);
  }
}

TEST_F(Exchange, AnythingButAnObjectIsAFailure) {
  Json::Value array(Json::arrayValue);
  array.append(true);
  for (const Json::Value& reply :
       {Json::Value(), Json::Value(true), Json::Value(1), Json::Value("success"), array}) {
    g_exchange.reply = reply;
    for (const ClientOperation& operation : ClientOperations()) {
      SCOPED_TRACE(reply.toStyledString());
      ExpectFailure(operation);
    }
  }
}

TEST_F(Exchange, TheMediaObjectIsHandedOverForConversion) {
  g_exchange.reply = Parsed(R"({"success":true,"media":{"width":3,"other":[1]}})");
  VELA_MEDIA_INFO media = {};
  EXPECT_EQ(GetMediaFromPluginDB(1, kPath, media), 0);
  EXPECT_THAT(g_exchange.media, ElementsAre(Parsed(R"({"width":3,"other":[1]})")));
  EXPECT_EQ(media.width, 77U);
}

TEST_F(Exchange, AMissingMediaObjectIsHandedOverAsAnEmptyOne) {
  g_exchange.reply = Parsed(R"({"success":true})");
  VELA_MEDIA_INFO media = {};
  EXPECT_EQ(GetMediaFromPluginDB(1, kPath, media), 0);
  EXPECT_THAT(g_exchange.media, ElementsAre(Json::Value(Json::objectValue)));
}

TEST_F(Exchange, AFailedConversionOfTheMediaObjectIsNoFailure) {
  g_exchange.convertResult = -1;
  g_exchange.reply = Parsed(R"({"success":true,"media":{}})");
  VELA_MEDIA_INFO media = {};
  EXPECT_EQ(GetMediaFromPluginDB(1, kPath, media), 0);
}

TEST_F(Exchange, NothingIsConvertedWithoutSuccess) {
  g_exchange.reply = Parsed(R"({"success":false,"media":{"width":3}})");
  VELA_MEDIA_INFO media = {};
  media.width = 5;
  EXPECT_EQ(GetMediaFromPluginDB(1, kPath, media), -1);
  EXPECT_THAT(TakeErrorLines(), ElementsAre("velamk_ipc:30 fail"));
  EXPECT_THAT(g_exchange.media, IsEmpty());
  EXPECT_EQ(media.width, 5U);
}

}  // namespace
}  // namespace vela_test
