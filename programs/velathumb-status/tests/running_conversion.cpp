#include "running_conversion.h"

#include <gtest/gtest.h>

#include "support/build_paths.h"
#include "support/files.h"
#include "support/images.h"
#include "support/profile_file.h"

namespace vela_test {

namespace {

constexpr const char* kProfiles = "/tmp/conversion/profiles.conf";
constexpr const char* kPhoto = "/tmp/conversion/photos/a.jpg";
constexpr const char* kPausedFile = "/tmp/conversion/converter.waits";
constexpr const char* kGoFile = "/tmp/conversion/converter.goes.on";

}  // namespace

RunningConversion::RunningConversion() : converter_(kConverterPath) {
  MakeDirectories("/tmp/conversion/photos");
  WriteProfileFile(kProfiles, {{"thumb_s", 120, 70, std::nullopt, "VELAPHOTO_THUMB_S.jpg", 0}});
  MakeJpeg(kPhoto);
  SetFileTimeFromNow(kPhoto, -60);
  converter_.Plan(StubPlan().CreateFile(kPausedFile).WaitForFile(kGoFile).WriteOutputs());
  program_ = std::make_unique<Program>(
      StartProgram(VelathumbPath(), {kProfiles, "/tmp/conversion/photos"}));
  EXPECT_TRUE(WaitUntilExists(kPausedFile));
}

void RunningConversion::Finish() {
  WriteFile(kGoFile, "");
  const auto result = program_->Wait();
  EXPECT_TRUE(result && result->exitCode == 0);
  // It has queued the directory for its later phases.
  RemoveTree("/var/spool/thumb_create.queue");
}

}  // namespace vela_test
