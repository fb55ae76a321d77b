// The registration of new thumbnails with the index.
#include <sqlite3.h>

#include "program/stub_program_test.h"

namespace vela_test {
namespace {

constexpr const char* kDatabase = "/var/lib/velaindex/index.db";

/// "<photo> <width>x<height> <thumbnail> <width>x<height>" of each registration.
std::vector<std::string> RegisteredConversions() {
  std::vector<std::string> found;
  sqlite3* database = nullptr;
  const auto add = [](void* lines, int, char** values, char**) {
    static_cast<std::vector<std::string>*>(lines)->push_back(values[0]);
    return 0;
  };
  EXPECT_EQ(sqlite3_open(kDatabase, &database), SQLITE_OK);
  EXPECT_EQ(sqlite3_exec(database,
                         "SELECT photo_path || ' ' || photo_width || 'x' || photo_height"
                         " || ' ' || thumbnail_path || ' ' || thumbnail_width || 'x' ||"
                         " thumbnail_height FROM conversion",
                         add, &found, nullptr),
            SQLITE_OK);
  sqlite3_close(database);
  return found;
}

class IndexRegistration : public StubProgramTest {
 protected:
  /// Runs the program, which continues with phase 1 even if the registration fails.
  static void RunThrough() {
    const DaemonPeer daemon;
    EXPECT_SUCCESS(Run());
    EXPECT_THAT(RequestsOf(daemon), ElementsAre("GET_INDEX_VERSION /tmp/photos/a.jpg",
                                                "POST_PHOTO_CONVERT /tmp/photos/a.jpg"));
    EXPECT_EQ(Progress("completed_thumb"), 3);
    EXPECT_TRUE(Exists(Thumb(kPhoto, "B")));
  }
};

TEST_F(IndexRegistration, RecordsThePhotoAndItsLargestThumbnail) {
  MakePhoto(kPhoto);
  RunThrough();
  EXPECT_THAT(RegisteredConversions(),
              ElementsAre("/tmp/photos/a.jpg 64x48 " + Thumb(kPhoto, "XL") + " 1280x1280"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(IndexRegistration, RecordsEachPhoto) {
  MakePhoto(kPhoto);
  MakePhoto("/tmp/photos/b.jpg");
  EXPECT_SUCCESS(Run());
  EXPECT_THAT(RegisteredConversions(), SizeIs(2));
}

TEST_F(IndexRegistration, IsOfPhase0Only) {
  MakePhoto(kPhoto);
  PutThumbs(kPhoto, {"XL", "M"});
  EXPECT_SUCCESS(Run());
  EXPECT_SUCCESS(Run());
  EXPECT_THAT(Converter().Calls(), SizeIs(2));
  EXPECT_FALSE(Exists(kDatabase));
}

TEST_F(IndexRegistration, IsSkippedWhenPhase0Fails) {
  MakePhoto(kPhoto);
  Converter().Plan(StubPlan().Exit(1));
  EXPECT_SUCCESS(Run());
  EXPECT_FALSE(Exists(kDatabase));
}

TEST_F(IndexRegistration, PhotoWithoutSizeIsLogged) {
  WriteFile(kPhoto, "no picture");
  SetFileTimeFromNow(kPhoto, -60);
  RunThrough();
  EXPECT_FALSE(Exists(kDatabase));
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:469 [Error] GetImageResolution: /tmp/photos/a.jpg"));
}

TEST_F(IndexRegistration, ThumbnailWithoutSizeIsLogged) {
  MakePhoto(kPhoto);
  Converter().PlanCall(1, StubPlan().WriteOutput("no picture").WriteOutputs());
  RunThrough();
  EXPECT_FALSE(Exists(kDatabase));
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:474 [Error] GetImageResolution: " + Thumb(kPhoto, "XL")));
}

TEST_F(IndexRegistration, PhotoIsExaminedFirst) {
  WriteFile(kPhoto, "no picture");
  SetFileTimeFromNow(kPhoto, -60);
  Converter().PlanCall(1, StubPlan().WriteOutput("no picture").WriteOutputs());
  RunThrough();
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:469 [Error] GetImageResolution: /tmp/photos/a.jpg"));
}

TEST_F(IndexRegistration, IndexThatCannotBeWrittenStopsNothing) {
  MakePhoto(kPhoto);
  MakeDirectories(kDatabase);
  RunThrough();
}

}  // namespace
}  // namespace vela_test
