// The names of incomplete photos.
#include <algorithm>

#include "status_fixture.h"

namespace vela_test {
namespace {

using namespace ::testing;

class PhotoNames : public StatusTest {
 protected:
  static std::vector<std::string> Named() {
    const StatusText answer = QueryText({"--photos", kTop});
    EXPECT_EQ(answer.directories.size(), 1U);
    return answer.directories.empty() ? std::vector<std::string>() : answer.directories[0].photos;
  }

  static void RequestSizeSOnly() {
    WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"1\"\n");
  }
};

TEST_F(PhotoNames, AreThoseOfIncompletePhotosOnly) {
  MakePhotoWith("complete.jpg", kAllSizes);
  MakePhotoWith("lacking.jpg", kAllSizes - kBitL);
  MakePhotoWith("bare.jpg", 0);
  EXPECT_THAT(Named(), UnorderedElementsAre("lacking.jpg: missing L",
                                            "bare.jpg: missing S, SM, M, B, L, XL"));
}

TEST_F(PhotoNames, AreOmittedUnlessRequested) {
  MakePhotoWith("bare.jpg", 0);
  EXPECT_THAT(QueryText({kTop}).directories.at(0).photos, IsEmpty());
}

TEST_F(PhotoNames, ComeWithWhatIsOutdated) {
  MakePhotoWith("a.jpg", kAllSizes);
  SetFileTime(Derived("a.jpg", "VELAPHOTO_THUMB_S.jpg"), kMediaTime - 1);
  WriteFile(Derived("a.jpg", "VELAPHOTO_THUMB_SM.jpg"), "");
  RemoveTree(Derived("a.jpg", "VELAPHOTO_THUMB_XL.jpg"));
  EXPECT_THAT(Named(), ElementsAre("a.jpg: missing XL; outdated S, SM"));
}

TEST_F(PhotoNames, ComeWithWhatFailedUnderBothNames) {
  MakePhotoWith("a.jpg", kAllSizes - kBitS - kBitM - kBitB);
  WriteFile(Derived("a.jpg", "VELAPHOTO_THUMB_B.fail"), "");
  WriteFile(Derived("a.jpg", "VELAPHOTO:THUMB_S.fail"), "");
  EXPECT_THAT(Named(), ElementsAre("a.jpg: missing S, M, B; failed S, B"));
}

TEST_F(PhotoNames, MarkersOfCompletePhotosAreIgnored) {
  MakePhotoWith("a.jpg", kAllSizes);
  WriteFile(Derived("a.jpg", "VELAPHOTO_THUMB_B.fail"), "");
  const ProgramResult result = RunStatus({"--photos", kTop});
  EXPECT_EQ(result.exitCode, 0);
  const StatusText answer = ReadStatusText(result.out);
  EXPECT_THAT(answer.directories.at(0).photos, IsEmpty());
  EXPECT_EQ(answer.totals.numbers.failed, 0);
}

TEST_F(PhotoNames, MarkersOfPresentThumbsAreNotFailures) {
  MakePhotoWith("a.jpg", kAllSizes - kBitM - kBitL);
  SetFileTime(Derived("a.jpg", "VELAPHOTO_THUMB_XL.jpg"), kMediaTime - 1);
  for (const char* marker : {"VELAPHOTO_THUMB_B.fail", "VELAPHOTO:THUMB_S.fail",
                             "VELAPHOTO_THUMB_M.fail", "VELAPHOTO_THUMB_XL.fail"}) {
    WriteFile(Derived("a.jpg", marker), "");
  }
  EXPECT_THAT(Named(), ElementsAre("a.jpg: missing M, L; outdated XL; failed M, XL"));
  EXPECT_EQ(QueryText({kTop}).totals.numbers, (StatusNumbers{1, 1, 3, 3, 2}));
  const Json::Value answer = QueryJson({"--photos", kTop});
  EXPECT_EQ(answer["totals"]["failure_markers"], Json::Value(2));
  EXPECT_THAT(Texts(answer["directories"][0]["photo_list"][0]["failed"]), ElementsAre("M", "XL"));
}

TEST_F(PhotoNames, MarkersOfSizesThatAreNotWantedAreNotFailures) {
  RequestSizeSOnly();
  MakePhotoWith("a.jpg", 0);
  WriteFile(Derived("a.jpg", "VELAPHOTO_THUMB_B.fail"), "");
  EXPECT_THAT(Named(), ElementsAre("a.jpg: missing S"));
}

TEST_F(PhotoNames, AreSorted) {
  RequestSizeSOnly();
  std::vector<std::string> expected;
  for (const char* name : {"B", "a", "\xc3\xa4", "c 10", "c 9", "Z", "0"}) {
    MakePhotoWith(std::string(name) + ".jpg", 0);
    expected.push_back(std::string(name) + ".jpg: missing S");
  }
  std::sort(expected.begin(), expected.end());
  EXPECT_EQ(Named(), expected);
}

TEST_F(PhotoNames, ComeWithOutdatedThumbsUnderOlderNames) {
  MakePhotoWith("a.jpg", kAllSizes - kBitM);
  const std::string old = Derived("a.jpg", "VELAPHOTO:THUMB_M.jpg");
  WriteFile(old, "thumb");
  EXPECT_THAT(Named(), IsEmpty());
  SetFileTime(old, kMediaTime - 1);
  EXPECT_THAT(Named(), ElementsAre("a.jpg: outdated M"));
}

TEST_F(PhotoNames, FollowTheirDirectory) {
  MakePhoto("/tmp/one/a.jpg");
  MakePhoto("/tmp/two/b.jpg");
  const StatusText answer = QueryText({"-p", "/tmp/one", "/tmp/two"});
  ASSERT_EQ(answer.directories.size(), 2U);
  EXPECT_THAT(answer.directories[0].photos, ElementsAre("a.jpg: missing S, SM, M, B, L, XL"));
  EXPECT_THAT(answer.directories[1].photos, ElementsAre("b.jpg: missing S, SM, M, B, L, XL"));
}

TEST_F(PhotoNames, OddNamesStayOnOneLine) {
  RequestSizeSOnly();
  MakePhotoWith("new\nline\x01\\\xfe.jpg", 0);
  EXPECT_THAT(Named(), ElementsAre("new\\nline\\x01\\\\\xfe.jpg: missing S"));
}

}  // namespace
}  // namespace vela_test
