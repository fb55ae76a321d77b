// How the index version is used.
#include <algorithm>

#include "program/stub_program_test.h"

namespace vela_test {
namespace {

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

class IndexVersion : public OnePhotoTest {
 protected:
  static void RunTwice(const DaemonReply& version) {
    DaemonPeer daemon;
    daemon.Answer("GET_INDEX_VERSION", version);
    EXPECT_SUCCESS(Run());
    EXPECT_SUCCESS(Run());
  }
};

/// A reply, and whether it makes the converter rotate the photos.
struct Reply : NamedCase {
  const char* text;
  bool rotates;
};

class EachReply : public IndexVersion, public ::testing::WithParamInterface<Reply> {};

TEST_P(EachReply, DecidesWhetherTheConverterRotates) {
  RunTwice(DaemonReply::Line(GetParam().text));
  // Two thumbnails in phase 0, one in phases 1 and 2 each.
  const auto expected = GetParam().rotates ? ElementsAre(2, 1, 1) : ElementsAre(0, 0, 0);
  EXPECT_THAT(CountIn(Converter().Calls(), "-auto-orient"), expected);
  EXPECT_THAT(CountIn(Converter().Calls(), "-rotate"), ElementsAre(0, 0, 0));
}

INSTANTIATE_TEST_SUITE_P(
    Replies, EachReply,
    ::testing::Values(Reply{"VersionBelow0", "{\"success\":true,\"version\":-1}", true},
                      Reply{"Version0", "{\"success\":true,\"version\":0}", true},
                      Reply{"Version1", "{\"success\":true,\"version\":1}", false},
                      Reply{"Version2", "{\"success\":true,\"version\":2}", false},
                      Reply{"NoVersion", "{\"success\":true}", true},
                      Reply{"Failure", "{\"success\":false,\"version\":2}", true},
                      Reply{"NoSuccess", "{\"version\":2}", true}, Reply{"Empty", "{}", true},
                      Reply{"NoJson", "nonsense", true}),
    CaseName());

TEST_F(IndexVersion, IsNotKnownWithoutDaemon) {
  EXPECT_SUCCESS(Run());
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
  EXPECT_SUCCESS(Run());
  const auto calls = Converter().Calls();
  ASSERT_EQ(calls.size(), 4U);
  EXPECT_FALSE(Contains(calls[0], "-auto-orient"));
  EXPECT_FALSE(Contains(calls[1], "-auto-orient"));
  EXPECT_TRUE(Contains(calls[2], "-auto-orient"));
  EXPECT_TRUE(Contains(calls[3], "-auto-orient"));
}

TEST_F(IndexVersion, IsAskedOnceAPhotoAndRun) {
  const DaemonPeer daemon;
  EXPECT_SUCCESS(Run());
  EXPECT_THAT(daemon.Commands(), ElementsAre("GET_INDEX_VERSION", "POST_PHOTO_CONVERT"));
}

TEST_F(IndexVersion, RotationIsNotDetectedInLaterPhases) {
  // A reference of another shape than the photo would cause trial images.
  DaemonPeer daemon;
  daemon.SetIndexVersion(2);
  PutThumbs(kPhoto, {"XL", "M"});
  EXPECT_SUCCESS(Run());
  EXPECT_SUCCESS(Run());
  EXPECT_THAT(ConvertedSources(), ElementsAre(Thumb(kPhoto, "XL"), Thumb(kPhoto, "XL")));
}

TEST_F(IndexVersion, RotationIsNotDetectedInAnOldIndex) {
  const StubTool compare(kComparePath);
  PutThumbs(kPhoto, {"XL", "B", "S"});
  RunWithDaemon();
  EXPECT_THAT(ConvertedSources(), ElementsAre(kPhoto));
  EXPECT_THAT(compare.Calls(), IsEmpty());
}

TEST_F(IndexVersion, ReportThatIsRefusedIsLoggedOnly) {
  DaemonPeer daemon;
  daemon.Answer("POST_PHOTO_CONVERT", DaemonReply::Line("{\"success\":false}"));
  EXPECT_SUCCESS(Run());
  EXPECT_EQ(Progress("completed_thumb"), 3);
  EXPECT_EQ(ReadFile(kQueue), "/tmp/photos\n");
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_ipc:137 fail"));
}

}  // namespace
}  // namespace vela_test
