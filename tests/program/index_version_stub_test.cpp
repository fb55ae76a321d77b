// What the index version that the daemon tells is used for.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "program/stub_program_test.h"
#include "support/files.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kPhoto = "/tmp/photos/a.jpg";

bool Contains(const StubCall& call, const std::string& argument) {
  return std::find(call.arguments.begin(), call.arguments.end(), argument) != call.arguments.end();
}

/// How often an argument is in a call, for each call.
std::vector<long> CountIn(const std::vector<StubCall>& calls, const std::string& argument) {
  std::vector<long> counts;
  for (const StubCall& call : calls) {
    counts.push_back(std::count(call.arguments.begin(), call.arguments.end(), argument));
  }
  return counts;
}

class IndexVersion : public StubProgramTest {
 protected:
  void SetUp() override {
    StubProgramTest::SetUp();
    MakePhoto(kPhoto);
  }

  static void RunTwice(const DaemonReply& version) {
    DaemonPeer daemon;
    daemon.Answer("GET_INDEX_VERSION", version);
    EXPECT_GOOD_END(Run());
    EXPECT_GOOD_END(Run());
  }
};

/// A reply, and whether it makes the converter turn the photos upright.
struct Reply {
  const char* text;
  bool turns;
};

class EachReply : public IndexVersion, public ::testing::WithParamInterface<Reply> {};

TEST_P(EachReply, DecidesWhoTurnsThePhoto) {
  RunTwice(DaemonReply::Line(GetParam().text));
  // Two thumbnails in phase 0, one in phases 1 and 2 each.
  const auto expected = GetParam().turns ? ElementsAre(2, 1, 1) : ElementsAre(0, 0, 0);
  EXPECT_THAT(CountIn(Converter().Calls(), "-auto-orient"), expected);
  EXPECT_THAT(CountIn(Converter().Calls(), "-rotate"), ElementsAre(0, 0, 0));
}

INSTANTIATE_TEST_SUITE_P(Replies, EachReply,
                         ::testing::Values(Reply{"{\"success\":true,\"version\":-1}", true},
                                           Reply{"{\"success\":true,\"version\":0}", true},
                                           Reply{"{\"success\":true,\"version\":1}", false},
                                           Reply{"{\"success\":true,\"version\":2}", false},
                                           Reply{"{\"success\":true}", true},
                                           Reply{"{\"success\":false,\"version\":2}", true},
                                           Reply{"{\"version\":2}", true}, Reply{"{}", true},
                                           Reply{"nonsense", true}));

TEST_F(IndexVersion, IsNotKnownWithoutDaemon) {
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(CountIn(Converter().Calls(), "-auto-orient"), ElementsAre(2, 1));
}

TEST_F(IndexVersion, IsNotKnownWhenTheAnswerFails) {
  RunTwice(DaemonReply::CloseAfterRequest());
  EXPECT_THAT(CountIn(Converter().Calls(), "-auto-orient"), ElementsAre(2, 1, 1));
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_ipc:57 fail", "velamk_ipc:57 fail"));
}

TEST_F(IndexVersion, IsAskedForEachPhotoAnew) {
  MakePhoto("/tmp/photos/b.jpg");
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line("{\"success\":true,\"version\":1}"));
  EXPECT_GOOD_END(Run());
  const auto calls = Converter().Calls();
  ASSERT_EQ(4U, calls.size());
  EXPECT_FALSE(Contains(calls[0], "-auto-orient"));
  EXPECT_FALSE(Contains(calls[1], "-auto-orient"));
  EXPECT_TRUE(Contains(calls[2], "-auto-orient"));
  EXPECT_TRUE(Contains(calls[3], "-auto-orient"));
}

TEST_F(IndexVersion, IsAskedOnceAPhotoAndRun) {
  const DaemonPeer daemon;
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(daemon.Commands(), ElementsAre("GET_INDEX_VERSION", "POST_PHOTO_CONVERT"));
}

TEST_F(IndexVersion, NoRotationIsLookedForInLaterPhases) {
  // A reference of another shape than the photo would show itself in trial pictures.
  DaemonPeer daemon;
  daemon.SetIndexVersion(2);
  PutThumbs(kPhoto, {"XL", "M"});
  EXPECT_GOOD_END(Run());
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ConvertedSources(), ElementsAre(Thumb(kPhoto, "XL"), Thumb(kPhoto, "XL")));
}

TEST_F(IndexVersion, NoRotationIsLookedForInAnOldIndex) {
  const DaemonPeer daemon;
  const StubTool compare(kComparePath);
  PutThumbs(kPhoto, {"XL", "B", "S"});
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ConvertedSources(), ElementsAre(kPhoto));
  EXPECT_THAT(compare.Calls(), IsEmpty());
}

TEST_F(IndexVersion, ReportThatIsRefusedIsLoggedOnly) {
  DaemonPeer daemon;
  daemon.Answer("POST_PHOTO_CONVERT", DaemonReply::Line("{\"success\":false}"));
  EXPECT_GOOD_END(Run());
  EXPECT_EQ(3, Progress("completed_thumb"));
  EXPECT_EQ("/tmp/photos\n", ReadFile(kQueue));
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_ipc:137 fail"));
}

}  // namespace
}  // namespace vela_test
