// The photos that lack something, named.
#include <gmock/gmock.h>
#include <json/value.h>

#include <algorithm>
#include <string>
#include <vector>

#include "status_program.h"
#include "status_text.h"
#include "storage/photo_tree.h"
#include "support/files.h"
#include "support/sandbox.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

constexpr const char* kTop = "/tmp/photos";
constexpr int kAllSizes = 63;

class PhotoNames : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories(kTop);
  }

  static std::string Derived(const std::string& photo, const std::string& name) {
    return std::string(kTop) + "/@eaDir/" + photo + "/" + name;
  }

  static void MakePhotoWith(const std::string& name, int sizes) {
    MakePhoto(std::string(kTop) + "/" + name);
    MakeThumbs(kTop, name, sizes);
  }

  static std::vector<std::string> Named() {
    const StatusText answer = ReadStatusText(RunStatus({"--photos", kTop}).out);
    EXPECT_EQ(answer.directories.size(), 1U);
    return answer.directories.empty() ? std::vector<std::string>() : answer.directories[0].photos;
  }
};

TEST_F(PhotoNames, AreThoseOfIncompletePhotosOnly) {
  MakePhotoWith("complete.jpg", kAllSizes);
  MakePhotoWith("lacking.jpg", kAllSizes - kBitL);
  MakePhotoWith("bare.jpg", 0);
  EXPECT_THAT(Named(), UnorderedElementsAre("lacking.jpg: missing L",
                                            "bare.jpg: missing S, SM, M, B, L, XL"));
}

TEST_F(PhotoNames, AreLeftOutUnlessAskedFor) {
  MakePhotoWith("bare.jpg", 0);
  EXPECT_THAT(ReadStatusText(RunStatus({kTop}).out).directories.at(0).photos, IsEmpty());
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

TEST_F(PhotoNames, MarkersOfCompletePhotosAreNotTold) {
  MakePhotoWith("a.jpg", kAllSizes);
  WriteFile(Derived("a.jpg", "VELAPHOTO_THUMB_B.fail"), "");
  const ProgramResult result = RunStatus({"--photos", kTop});
  EXPECT_EQ(result.exitCode, 0);
  const StatusText answer = ReadStatusText(result.out);
  EXPECT_THAT(answer.directories.at(0).photos, IsEmpty());
  EXPECT_EQ(answer.totals.numbers.failed, 0);
}

TEST_F(PhotoNames, MarkersBesidePresentThumbsAreNoFailures) {
  MakePhotoWith("a.jpg", kAllSizes - kBitM - kBitL);
  SetFileTime(Derived("a.jpg", "VELAPHOTO_THUMB_XL.jpg"), kMediaTime - 1);
  for (const char* marker : {"VELAPHOTO_THUMB_B.fail", "VELAPHOTO:THUMB_S.fail",
                             "VELAPHOTO_THUMB_M.fail", "VELAPHOTO_THUMB_XL.fail"}) {
    WriteFile(Derived("a.jpg", marker), "");
  }
  EXPECT_THAT(Named(), ElementsAre("a.jpg: missing M, L; outdated XL; failed M, XL"));
  EXPECT_EQ(ReadStatusText(RunStatus({kTop}).out).totals.numbers, (StatusNumbers{1, 1, 3, 3, 2}));
  const Json::Value answer = AskForJson({"--photos", kTop});
  EXPECT_EQ(answer["totals"]["failure_markers"], Json::Value(2));
  const Json::Value failed = answer["directories"][0]["photo_list"][0]["failed"];
  ASSERT_EQ(failed.size(), 2U);
  EXPECT_EQ(failed[0], Json::Value("M"));
  EXPECT_EQ(failed[1], Json::Value("XL"));
}

TEST_F(PhotoNames, MarkersOfSizesThatAreNotWantedAreNoFailures) {
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"1\"\n");
  MakePhotoWith("a.jpg", 0);
  WriteFile(Derived("a.jpg", "VELAPHOTO_THUMB_B.fail"), "");
  EXPECT_THAT(Named(), ElementsAre("a.jpg: missing S"));
}

TEST_F(PhotoNames, ComeInTheirOrder) {
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"1\"\n");
  std::vector<std::string> expected;
  for (const char* name : {"B", "a", "\xc3\xa4", "c 10", "c 9", "Z", "0"}) {
    MakePhotoWith(std::string(name) + ".jpg", 0);
    expected.push_back(std::string(name) + ".jpg: missing S");
  }
  std::sort(expected.begin(), expected.end());
  EXPECT_EQ(Named(), expected);
}

TEST_F(PhotoNames, OutdatedThumbsUnderOlderNamesAreTold) {
  MakePhotoWith("a.jpg", kAllSizes - kBitM);
  const std::string old = Derived("a.jpg", "VELAPHOTO:THUMB_M.jpg");
  WriteFile(old, "thumb");
  EXPECT_THAT(Named(), IsEmpty());
  SetFileTime(old, kMediaTime - 1);
  EXPECT_THAT(Named(), ElementsAre("a.jpg: outdated M"));
}

TEST_F(PhotoNames, StandBelowTheirDirectory) {
  MakePhoto("/tmp/one/a.jpg");
  MakePhoto("/tmp/two/b.jpg");
  const StatusText answer = ReadStatusText(RunStatus({"-p", "/tmp/one", "/tmp/two"}).out);
  ASSERT_EQ(answer.directories.size(), 2U);
  EXPECT_THAT(answer.directories[0].photos, ElementsAre("a.jpg: missing S, SM, M, B, L, XL"));
  EXPECT_THAT(answer.directories[1].photos, ElementsAre("b.jpg: missing S, SM, M, B, L, XL"));
}

TEST_F(PhotoNames, OddNamesStayOnOneLine) {
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"1\"\n");
  MakePhotoWith("new\nline\x01\\\xfe.jpg", 0);
  EXPECT_THAT(Named(), ElementsAre("new\\nline\\x01\\\\\xfe.jpg: missing S"));
}

}  // namespace
}  // namespace vela_test
