// What most tests of the program share: its reports, and a directory of photos with thumbnails.
#pragma once

#include <gmock/gmock.h>
#include <json/value.h>

#include <string>
#include <vector>

#include "status_program.h"
#include "status_text.h"
#include "storage/photo_tree.h"
#include "support/files.h"
#include "support/sandbox.h"

namespace vela_test {

constexpr const char* kTop = "/tmp/photos";
constexpr const char* kPhotoQueue = "/var/spool/thumb_create.queue";
constexpr const char* kPhotosInProgress = "/var/spool/thumb_create.queue.tmp";
constexpr const char* kDeferredPhotos = "/var/spool/thumb_create.queue.later";
constexpr const char* kVideoQueue = "/var/spool/flv_create.queue";
constexpr const char* kVideosInProgress = "/var/spool/flv_create.queue.tmp";
constexpr int kAllSizes = 63;

/// Every test starts with the empty directory kTop.
class StatusTest : public SandboxTest {
 protected:
  void SetUp() override;
};

/// The path of this name in kTop.
std::string In(const std::string& name);

/// The path of a file derived from a photo or video in kTop.
std::string Derived(const std::string& media, const std::string& name);

/// Makes a photo in kTop with thumbnails of these sizes (bits of the size map).
void MakePhotoWith(const std::string& name, int sizes);

/// The text report for these arguments.
StatusText QueryText(const std::vector<std::string>& arguments,
                     const ProgramOptions& options = ProgramOptions());

/// Fails the test unless the run ended with status 2 and this message only.
void ExpectError(const ProgramResult& result, const std::string& message);

/// Fails the test unless the object has these members with these values; it may have others.
/// `expected` is a JSON object.
void ExpectMembers(const Json::Value& object, const std::string& expected);

/// The texts of a JSON list.
std::vector<std::string> Texts(const Json::Value& list);

}  // namespace vela_test
