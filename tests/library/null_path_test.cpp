// A null path makes every operation of the library return its failure value.
#include <ftw.h>
#include <gmock/gmock.h>
#include <json/value.h>
#include <sys/stat.h>

#include <functional>
#include <string>

#include "ipc/velamk_ipc.h"
#include "platform/velaindex.h"
#include "platform/velautils.h"
#include "platform/vlibc.h"
#include "progress/velamk_progress.h"
#include "source/raw_image.h"
#include "storage/velamk_thumb_status.h"
#include "storage/velamk_util.h"
#include "support/daemon_peer.h"
#include "support/files.h"
#include "support/named_case.h"
#include "support/sandbox.h"
#include "thumb/directory_walk.h"

namespace vela_test {
namespace {

using ::testing::IsEmpty;

constexpr const char* kNull = nullptr;
constexpr const char* kPhoto = "/tmp/photos/a.jpg";
constexpr const char* kFile = "/tmp/settings";
constexpr const char* kName = "VELAPHOTO_THUMB_M.jpg";

struct NullCase : NamedCase {
  std::function<int64_t()> call;
  int64_t failure;
};

/// Calls an operation that stores two counts; returns them as one number, 0 when both are 0.
int64_t Counts(const std::function<void(int*, int*)>& operation) {
  int first = 5;
  int second = 5;
  operation(&first, &second);
  return first * 1000 + second;
}

class NullPath : public testing::TestWithParam<NullCase> {
 protected:
  void SetUp() override {
    ResetSandbox();
    MakeDirectories("/tmp/photos");
    WriteFile(kPhoto, "photo");
    WriteFile(kFile, "key=\"value\"\n");
  }
};

TEST_P(NullPath, IsAFailure) {
  // It would answer any request, also one with an empty path, with success.
  const DaemonPeer daemon;
  EXPECT_EQ(GetParam().call(), GetParam().failure);
  EXPECT_THAT(daemon.Commands(), IsEmpty());
  EXPECT_EQ(ReadFile(kPhoto), "photo");
  EXPECT_EQ(ReadFile(kFile), "key=\"value\"\n");
}

INSTANTIATE_TEST_SUITE_P(Client, NullPath,
                         testing::Values(NullCase{"Media",
                                                  [] {
                                                    VELA_MEDIA_INFO media = {};
                                                    return GetMediaFromPluginDB(1, kNull, media);
                                                  },
                                                  -1},
                                         NullCase{"IndexVersion",
                                                  [] { return GetIndexVersion(kNull); }, -1},
                                         NullCase{"PhotoReport",
                                                  [] {
                                                    PostPhotoConvert(kNull);
                                                    return 0;
                                                  },
                                                  0},
                                         NullCase{"VideoReport",
                                                  [] {
                                                    PostVideoConvert(kNull);
                                                    return 0;
                                                  },
                                                  0}),
                         CaseName());

INSTANTIATE_TEST_SUITE_P(
    Progress, NullPath,
    testing::Values(NullCase{"Counter", [] { return GetConvProgress(1, kNull); }, 0},
                    NullCase{"Addition",
                             [] {
                               AddConvProgress(1, kNull, 1);
                               return int64_t{Exists("/var/spool/conv_progress_photo")};
                             },
                             0}),
    CaseName());

INSTANTIATE_TEST_SUITE_P(
    Names, NullPath,
    testing::Values(
        NullCase{"SizeOfName", [] { return IsThumbInSizeMap(kNull, 63); }, 0},
        NullCase{"OutdatedOf", [] { return IsEAThumbOutdated(kNull, kName); }, 0},
        NullCase{"OutdatedName", [] { return IsEAThumbOutdated(kPhoto, kNull); }, 0},
        NullCase{"Outdated", [] { return IsEAThumbOutdated(kNull, kNull); }, 0},
        NullCase{"PortraitInDB", [] { return IsMediaPortraitInDB(kNull); }, 0},
        NullCase{"Portrait", [] { return IsFilePortrait(kNull); }, 0},
        NullCase{"Check", [] { return CheckEAThumbs(kNull, 63); }, 0},
        NullCase{"Rotated", [] { return IsVideoRotated(kNull); }, 0},
        NullCase{"Film", [] { return HasConvertedFilm(kNull); }, 0},
        NullCase{"MatchedFilm", [] { return HasMatchedConvertedFilm(kNull); }, 0},
        NullCase{"MatchOf", [] { return IsEAFileOrientationMatched(kNull, kName, kName); }, -1},
        NullCase{"MatchNames", [] { return IsEAFileOrientationMatched(kPhoto, kNull, kNull); }, -1},
        NullCase{"Web", [] { return IsWebVideoConverted(kNull); }, -1},
        NullCase{"Mobile", [] { return IsMobileVideoConverted(kNull); }, -1},
        NullCase{"Video", [] { return IsVideoConverted(kNull); }, -1}),
    CaseName());

INSTANTIATE_TEST_SUITE_P(
    Status, NullPath,
    testing::Values(
        NullCase{"Photo",
                 [] { return Counts([](int* a, int* b) { GetThumbStatus(kNull, a, b, -1); }); }, 0},
        NullCase{"Directory",
                 [] { return Counts([](int* a, int* b) { GetDirThumbStatus(kNull, a, b); }); }, 0},
        NullCase{
            "TreeCounts",
            [] { return Counts([](int* a, int* b) { GetDirThumbStatusRecursive(kNull, a, b); }); },
            0},
        NullCase{"Tree",
                 [] {
                   int photos = 0;
                   int thumbs = 0;
                   return GetDirThumbStatusRecursive(kNull, &photos, &thumbs);
                 },
                 -1},
        NullCase{"TreeStep",
                 [] {
                   struct stat status = {};
                   struct FTW walk = {};
                   return GetDirThumbStatusRecursive_Callback(kNull, &status, FTW_D, &walk);
                 },
                 FTW_SKIP_SUBTREE},
        NullCase{"VideoWork", [] { return IsVideoWorkNeeded(kNull); }, 0},
        NullCase{"VideoTree", [] { return CountVideoWork(kNull); }, 0},
        NullCase{"VideoQueue", [] { return CountVideoQueueWork(kNull); }, 0},
        NullCase{"Entries", [] { return CountDirEntries(kNull); }, 0}),
    CaseName());

INSTANTIATE_TEST_SUITE_P(
    Program, NullPath,
    testing::Values(NullCase{"WalkStep",
                             [] {
                               struct stat status = {};
                               struct FTW walk = {};
                               return RecursiveDirCallback(kNull, &status, FTW_D, &walk);
                             },
                             FTW_SKIP_SUBTREE},
                    NullCase{"DecoderOption", [] { return DcrawToFile(kPhoto, "/tmp/out", kNull); },
                             false}),
    CaseName());

INSTANTIATE_TEST_SUITE_P(
    CoreLibrary, NullPath,
    testing::Values(
        NullCase{"Value",
                 [] {
                   char out[8];
                   return VLIBCFileGetKeyValue(kNull, "key", out, sizeof out, 0);
                 },
                 -1},
        NullCase{"KeyOfValue",
                 [] {
                   char out[8];
                   return VLIBCFileGetKeyValue(kFile, kNull, out, sizeof out, 0);
                 },
                 -1},
        NullCase{"NewValueFile", [] { return VLIBCFileSetKeyValue(kNull, "key", "v", 0); }, -1},
        NullCase{"NewValueKey", [] { return VLIBCFileSetKeyValue(kFile, kNull, "v", 0); }, -1},
        NullCase{"NewValue", [] { return VLIBCFileSetKeyValue(kFile, "key", kNull, 0); }, -1},
        NullCase{"CheckFile", [] { return VLIBCFileCheckKeyValue(kNull, "key", "value", 0); }, 0},
        NullCase{"CheckKey", [] { return VLIBCFileCheckKeyValue(kFile, kNull, "value", 0); }, 0},
        NullCase{"CheckValue", [] { return VLIBCFileCheckKeyValue(kFile, "key", kNull, 0); }, 0},
        NullCase{"LineFile",
                 [] {
                   char out[8];
                   return VLIBCFileGetLine(kNull, "a", out, sizeof out, 0);
                 },
                 -1},
        NullCase{"LineText",
                 [] {
                   char out[8];
                   return VLIBCFileGetLine(kFile, kNull, out, sizeof out, 0);
                 },
                 -1},
        NullCase{"FileStatus",
                 [] {
                   VLIBCFileStatus status = {};
                   return VLIBCFileStat(kNull, 9, &status);
                 },
                 -1},
        NullCase{"FileTimes",
                 [] {
                   const VLIBCFileTimes times = {};
                   return VLIBCFileUTime(kNull, 3, &times);
                 },
                 -1},
        NullCase{"Program", [] { return VLIBCPopen(kNull, "r", nullptr) != nullptr; }, 0},
        NullCase{"Mode", [] { return VLIBCPopen("/bin/true", kNull, nullptr) != nullptr; }, 0},
        NullCase{"Kill", [] { return VLIBCKill(kNull, 0); }, -1},
        NullCase{"Space", [] { return static_cast<int64_t>(VLIBGetFsAvailSize(kNull)); }, 0},
        NullCase{
            "Runner",
            [] { return int64_t{VELAUtils::ProcessRunner(kNull, kNull).run(true, false) != 0}; },
            1}),
    CaseName());

INSTANTIATE_TEST_SUITE_P(
    IndexLibrary, NullPath,
    testing::Values(
        NullCase{"Extension", [] { return *VELAIndexExtGet(kNull); }, 0},
        NullCase{"Raw", [] { return BlVELAIndexIsRawImage(kNull); }, 0},
        NullCase{"PhotoOnWeb", [] { return BlVELAIndexIsPhotoOnWebFile(kNull); }, 0},
        NullCase{"Photo", [] { return BlVELAIndexIsPhotoOnWebConvertFile(kNull); }, 0},
        NullCase{"Pages", [] { return BlVELAIndexIsMultiplePagePhotoFile(kNull); }, 0},
        NullCase{"Video", [] { return BlVELAIndexIsVideoOnWebFile(kNull); }, 0},
        NullCase{"EntryName", [] { return EntryNameShouldIndex(kNull); }, 0},
        NullCase{"Writable", [] { return IndexIsPathSupportEAWrite(kNull); }, 0},
        NullCase{"MetadataDir",
                 [] {
                   char out[64];
                   return VELAEADirPath(0, kNull, out, sizeof out);
                 },
                 -1},
        NullCase{"DerivedIn", [] { return IsEAFileExist(kNull, nullptr, kName, kName) != nullptr; },
                 0},
        NullCase{"DerivedName",
                 [] { return IsEAFileExist("/tmp", nullptr, kNull, kNull) != nullptr; }, 0},
        NullCase{"FoundIn",
                 [] {
                   EAFileStatus status = {};
                   return FindEAFile(kNull, kName, kName, &status) != nullptr;
                 },
                 0},
        NullCase{"DerivedOf", [] { return IsEAFileExist2(kNull, kName, kName); }, 0},
        NullCase{"DerivedPath",
                 [] {
                   char out[64];
                   return GetEAFilePath(kNull, kName, kName, out, sizeof out);
                 },
                 -1},
        NullCase{"RemovedIn", [] { return RemoveEAFile(kNull, kName, kName); }, -1},
        NullCase{"RemovedOf", [] { return RemoveEAFile2(kNull, kName, kName); }, -1},
        NullCase{"Size",
                 [] {
                   uint32_t width = 0;
                   uint32_t height = 0;
                   return VELAIndexImgResGet(kNull, &width, &height);
                 },
                 -1},
        NullCase{"Resolution",
                 [] {
                   VELA_RESOLUTION resolution = {};
                   return VELAIDX_GetMediaResolution(kNull, &resolution);
                 },
                 -1},
        NullCase{"VideoMetadata",
                 [] {
                   _VIDEO_METADATA_ metadata = {};
                   return VELAIDX_GetVideoMetadata(kNull, &metadata);
                 },
                 -1},
        NullCase{"Conversion", [] { return VELAIDX_IsVideoNeedConvert(kNull); }, -1},
        NullCase{"Queue", [] { return WriteIndexQueue(kPhoto, kNull); }, -1},
        NullCase{"QueueEntry", [] { return WriteIndexQueue(kNull, "/var/spool/queue"); }, -1},
        NullCase{"Socket",
                 [] {
                   Json::Value packet(Json::objectValue);
                   return AutoSendRecvPacket(kNull, -1, packet, 1);
                 },
                 -1},
        NullCase{"File", [] { return IsFileExist(kNull); }, 0},
        NullCase{"AnyFile", [] { return IsFileExist(kNull, 0); }, 0},
        NullCase{"Directory", [] { return IsDirExist(kNull); }, 0}),
    CaseName());

}  // namespace
}  // namespace vela_test
