// The progress counters.
#include <gmock/gmock.h>

#include <climits>
#include <string>

#include "progress/velamk_progress.h"
#include "support/files.h"
#include "support/mounts.h"
#include "support/sandbox.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kPhotoFile = "/var/spool/conv_progress_photo";
constexpr const char* kVideoFile = "/var/spool/conv_progress_video";

class Counters : public SandboxTest {};

TEST_F(Counters, EachKindHasItsOwnFile) {
  WriteFile(kPhotoFile,
            "total=\"11\"\ncompleted=\"12\"\ntotal_thumb=\"13\"\ncompleted_thumb=\"14\"\n");
  WriteFile(kVideoFile,
            "total=\"21\"\ncompleted=\"22\"\ntotal_thumb=\"23\"\ncompleted_thumb=\"24\"\n");
  EXPECT_EQ(GetConvProgress(1, "total"), 11);
  EXPECT_EQ(GetConvProgress(1, "completed"), 12);
  EXPECT_EQ(GetConvProgress(1, "total_thumb"), 13);
  EXPECT_EQ(GetConvProgress(1, "completed_thumb"), 14);
  EXPECT_EQ(GetConvProgress(2, "total"), 21);
  EXPECT_EQ(GetConvProgress(2, "completed"), 22);
  EXPECT_EQ(GetConvProgress(2, "total_thumb"), 23);
  EXPECT_EQ(GetConvProgress(2, "completed_thumb"), 24);
}

TEST_F(Counters, AnotherKindAndANullKeyReadAsZero) {
  WriteFile(kPhotoFile, "total=\"11\"\n");
  WriteFile(kVideoFile, "total=\"21\"\n");
  for (const int kind : {0, 3, -1, INT_MAX}) {
    EXPECT_EQ(GetConvProgress(kind, "total"), 0) << kind;
  }
  EXPECT_EQ(GetConvProgress(1, nullptr), 0);
}

TEST_F(Counters, WhatIsNoNumberReadsAsZero) {
  WriteFile(kPhotoFile,
            "empty=\"\"\nword=\"abc\"\nletter_first=\"x12\"\nnumber_first=\"12x7\"\n"
            "negative=\"-8\"\nsigned=\"+8\"\nspaced=\"  9\"\noctal=\"010\"\nhex=\"0x10\"\n"
            "fraction=\"3.9\"\n");
  EXPECT_EQ(GetConvProgress(1, "missing"), 0);
  EXPECT_EQ(GetConvProgress(1, "empty"), 0);
  EXPECT_EQ(GetConvProgress(1, "word"), 0);
  EXPECT_EQ(GetConvProgress(1, "letter_first"), 0);
  EXPECT_EQ(GetConvProgress(1, "number_first"), 12);
  EXPECT_EQ(GetConvProgress(1, "negative"), -8);
  EXPECT_EQ(GetConvProgress(1, "signed"), 8);
  EXPECT_EQ(GetConvProgress(1, "spaced"), 9);
  EXPECT_EQ(GetConvProgress(1, "octal"), 10);
  EXPECT_EQ(GetConvProgress(1, "hex"), 0);
  EXPECT_EQ(GetConvProgress(1, "fraction"), 3);
}

TEST_F(Counters, ReadingWithoutAFileIsSilent) {
  EXPECT_EQ(GetConvProgress(1, "total"), 0);
  MakeDirectories(kVideoFile);
  EXPECT_EQ(GetConvProgress(2, "total"), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
  EXPECT_FALSE(Exists(kPhotoFile));
}

TEST_F(Counters, ValuesAreReadUpToFourThousandCharacters) {
  WriteFile(kPhotoFile,
            "fits=\"" + std::string(4094, '0') + "5\"\ncut=\"" + std::string(4095, '0') + "5\"\n");
  EXPECT_EQ(GetConvProgress(1, "fits"), 5);
  EXPECT_EQ(GetConvProgress(1, "cut"), 0);
}

TEST_F(Counters, AddingToAMissingFileMakesIt) {
  AddConvProgress(1, "completed", 1);
  EXPECT_EQ(ReadFile(kPhotoFile), "completed=\"1\"\n");
  EXPECT_FALSE(Exists(kVideoFile));
  AddConvProgress(2, "completed_thumb", 7);
  EXPECT_EQ(ReadFile(kVideoFile), "completed_thumb=\"7\"\n");
  EXPECT_EQ(ReadFile(kPhotoFile), "completed=\"1\"\n");
}

TEST_F(Counters, AddingToAMissingKeyAppendsIt) {
  WriteFile(kPhotoFile, "total=\"9\"\n");
  AddConvProgress(1, "completed", 1);
  EXPECT_EQ(ReadFile(kPhotoFile), "total=\"9\"\ncompleted=\"1\"\n");
}

TEST_F(Counters, AddingKeepsEverythingElse) {
  WriteFile(kPhotoFile, "# set by the index\ntotal = 9\n\ncompleted=\"41\"\ncompleted_thumb=5\n");
  AddConvProgress(1, "completed", 1);
  EXPECT_EQ(ReadFile(kPhotoFile),
            "# set by the index\ntotal = 9\n\ncompleted=\"42\"\ncompleted_thumb=5\n");
}

TEST_F(Counters, DeltasAreSigned) {
  WriteFile(kPhotoFile, "completed=\"3\"\n");
  AddConvProgress(1, "completed", -5);
  EXPECT_EQ(GetConvProgress(1, "completed"), -2);
  AddConvProgress(1, "completed", 0);
  EXPECT_EQ(GetConvProgress(1, "completed"), -2);
  AddConvProgress(1, "completed", 100);
  EXPECT_EQ(ReadFile(kPhotoFile), "completed=\"98\"\n");
}

TEST_F(Counters, AddingToWhatIsNoNumberWritesTheDelta) {
  WriteFile(kPhotoFile, "completed=\"abc\"\ncompleted_thumb=\"\"\n");
  AddConvProgress(1, "completed", 4);
  AddConvProgress(1, "completed_thumb", -4);
  EXPECT_EQ(ReadFile(kPhotoFile), "completed=\"4\"\ncompleted_thumb=\"-4\"\n");
}

TEST_F(Counters, AddingKeepsTheLeadingNumberOnly) {
  WriteFile(kPhotoFile, "completed=\"12 of 20\"\n");
  AddConvProgress(1, "completed", 1);
  EXPECT_EQ(ReadFile(kPhotoFile), "completed=\"13\"\n");
}

TEST_F(Counters, CountersStayWithinTheRangeOfAnInt) {
  WriteFile(kPhotoFile,
            "high=\"2147483647\"\nlow=\"-2147483648\"\nbeyond=\"99999999999999999999\"\n");
  AddConvProgress(1, "high", 1);
  AddConvProgress(1, "low", -1);
  EXPECT_EQ(GetConvProgress(1, "high"), INT_MAX);
  EXPECT_EQ(GetConvProgress(1, "low"), INT_MIN);
  EXPECT_EQ(GetConvProgress(1, "beyond"), INT_MAX);
}

TEST_F(Counters, AnotherKindAndANullKeyChangeNothing) {
  for (const int kind : {0, 3, -1}) {
    AddConvProgress(kind, "completed", 1);
  }
  AddConvProgress(1, nullptr, 1);
  AddConvProgress(2, nullptr, 1);
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Counters, AFailedWriteIsLoggedAndDropped) {
  WriteFile(kPhotoFile, "completed=\"3\"\n");
  {
    const ReadOnlyMount spool("/var/spool");
    AddConvProgress(1, "completed", 1);
    AddConvProgress(2, "completed", 1);
  }
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_progress:115 VLIBCFileSetKeyValue fail: "
                                        "/var/spool/conv_progress_photo",
                                        "velamk_progress:115 VLIBCFileSetKeyValue fail: "
                                        "/var/spool/conv_progress_video"));
  EXPECT_EQ(ReadFile(kPhotoFile), "completed=\"3\"\n");
  EXPECT_FALSE(Exists(kVideoFile));
}

TEST_F(Counters, ADirectoryInPlaceOfTheFileIsAFailedWrite) {
  MakeDirectories(kVideoFile);
  AddConvProgress(2, "completed", 1);
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_progress:115 VLIBCFileSetKeyValue fail: "
                                        "/var/spool/conv_progress_video"));
}

TEST_F(Counters, ASuccessfulWriteIsSilent) {
  AddConvProgress(1, "completed", 1);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
