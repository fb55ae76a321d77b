// Indexing library of the platform: media kinds, metadata files, size maps, media records, queues
// and the exchange with the index daemon. All paths are NUL-terminated byte strings.
#pragma once

#include <json/forwards.h>

#include <cstddef>
#include <cstdint>

/// Media kinds, as the size-map queries, the progress files and the index daemon number them.
enum THUMB_TYPE { THUMB_TYPE_PHOTO = 1, THUMB_TYPE_VIDEO = 2 };

/// The index library's record of one media file.
struct VELA_MEDIA_INFO {
  char path[4096];
  int32_t type;      ///< a THUMB_TYPE
  uint32_t width;    ///< pixels
  uint32_t height;   ///< pixels
  int32_t rotation;  ///< degrees clockwise
  int32_t duration;  ///< seconds
  uint32_t bitrate;  ///< bits per second
  int64_t size;      ///< bytes
  int64_t mtime;     ///< seconds since the epoch
};

/// Pixel size of a media file.
struct VELA_RESOLUTION {
  int32_t width;
  int32_t height;
};

/// Metadata of a video, from its container.
struct _VIDEO_METADATA_ {  // NOLINT(bugprone-reserved-identifier)
  int32_t rotation;        ///< degrees clockwise: 0, 90, 180 or 270
  int32_t duration;        ///< seconds, rounded
  int32_t bitrate;         ///< bits per second
};

/// Returns the extension after the last dot of the last component of `path`, as written and without
/// the dot; "" when there is none. The result points into `path`.
const char* VELAIndexExtGet(const char* path);

/// Returns true for the extension (any case) of a camera raw format.
bool BlVELAIndexIsRawImage(const char* extension);

/// Returns true when the index treats a file of this name or path as a photo.
bool BlVELAIndexIsPhotoOnWebFile(const char* path);

/// Returns true when the file name or path is that of a photo that gets thumbnails.
bool BlVELAIndexIsPhotoOnWebConvertFile(const char* path);

/// Returns true when the file name or path is that of a photo format with several pages or frames.
bool BlVELAIndexIsMultiplePagePhotoFile(const char* path);

/// Returns true when the index treats a file of this name or path as a video.
bool BlVELAIndexIsVideoOnWebFile(const char* path);

/// Returns 1 when directory entries called `name` (one path component) are to be indexed, else 0.
int EntryNameShouldIndex(const char* name);

/// Returns 1 when metadata may be written for the directory `dir`, else 0.
int IndexIsPathSupportEAWrite(const char* dir);

/// Writes the metadata directory of the media file `path` into `out` (at most `outSize` bytes).
/// `flags` is 0. Returns 0, or -1 (see VLIBCErrGet) for a path that has none or does not fit.
int VELAEADirPath(int flags, const char* path, char* out, size_t outSize);

/// Looks in the metadata directory `eaDir` for a regular file called `name`, then `oldName`.
/// Returns the name found (one of the two pointers) or null; `sizeOut`, unless null, receives the
/// size in bytes of the file found.
const char* IsEAFileExist(const char* eaDir, int64_t* sizeOut, const char* name,
                          const char* oldName);

/// A file in a metadata directory.
struct EAFileStatus {
  int64_t size;      ///< bytes
  int64_t modified;  ///< seconds since the epoch
};

/// Looks up a file as IsEAFileExist does, and its status in the same step. Returns the name found
/// (one of the two pointers) and fills `status`, or null.
const char* FindEAFile(const char* eaDir, const char* name, const char* oldName,
                       EAFileStatus* status);

/// The same for the media file `path` itself. Returns 1 when either name exists, else 0.
int IsEAFileExist2(const char* path, const char* name, const char* oldName);

/// Writes the path of the existing derived file (either name) of the media file `path` into `out`.
/// Returns 0, or -1 when there is none or it does not fit.
int GetEAFilePath(const char* path, const char* name, const char* oldName, char* out,
                  size_t outSize);

/// Removes the derived file under both names from the metadata directory `eaDir`. Returns 0, or -1
/// when an existing one cannot be removed.
int RemoveEAFile(const char* eaDir, const char* name, const char* oldName);

/// The same for the media file `path` itself.
int RemoveEAFile2(const char* path, const char* name, const char* oldName);

/// Reads the pixel size of the image file `path` from its header, as stored. Returns 0, or -1 when
/// it cannot be read, is zero, or does not fit 32 bits.
int VELAIndexImgResGet(const char* path, uint32_t* width, uint32_t* height);

/// Reads the pixel size of the media file `path`, photo or video. Returns 0, or -1 (record
/// untouched).
int VELAIDX_GetMediaResolution(const char* path, VELA_RESOLUTION* resolution);

/// Reads rotation, duration and bit rate of the video `path` from its container; values that the
/// container lacks are 0. Returns 0, or -1 (record untouched) when the file is not a readable
/// video.
int VELAIDX_GetVideoMetadata(const char* path, _VIDEO_METADATA_* metadata);

/// Returns whether browsers need a converted version of the video `path`: 0 when they play it
/// directly (H.264 with AAC or no sound in MP4; VP8, VP9 or AV1 in WebM), 1 for any other video, -1
/// when it cannot be read.
int VELAIDX_IsVideoNeedConvert(const char* path);

/// Stores the size classes that the file `path` needs, as a bit mask. Returns 0, or -1 for an
/// unknown kind (mask untouched).
int VELAIDX_GetThumbSizeMap(const char* path, int kind, int32_t* sizeMap);

/// Stores the size classes that the files of the directory `dir` need. Returns the same as
/// VELAIDX_GetThumbSizeMap.
int VELAIDX_GetDirThumbSizeMap(const char* dir, int kind, int32_t* sizeMap);

/// Registers a new thumbnail of a photo with the index. `extra` is an empty object. Returns 0, or
/// -1.
int VELAIDX_IndexConvertAdd(const VELA_MEDIA_INFO& photo, const VELA_MEDIA_INFO& thumbnail,
                            const Json::Value& extra);

/// Appends `path` as one line to the queue file `queueFile`, which is created when missing. Returns
/// 0, or -1 (unwritable file, path with a newline).
int WriteIndexQueue(const char* path, const char* queueFile);

/// Sends `packet` to the Unix-domain socket at `socketPath` and replaces it with the reply object,
/// or with an empty object on any failure. The second argument is unused; `timeoutSeconds` limits
/// the whole exchange. Returns 0, or -1.
int AutoSendRecvPacket(const char* socketPath, int unused, Json::Value& packet, int timeoutSeconds);

/// Fills `out` from the daemon's media object; members that are missing, of another type or out of
/// range become 0 or empty. Returns 0, or -1 when `media` is not an object (`out` is then cleared).
int MediaInfoJson2Object(Json::Value& media, VELA_MEDIA_INFO& out);

/// Returns 1 when a regular file (with `regularOnly` 0: anything) is at `path`, links followed.
int IsFileExist(const char* path, int regularOnly = 1);

/// Returns 1 when a directory is at `path`, links followed.
int IsDirExist(const char* path);

/// Copies `in` to `out` (at most `outSize` bytes, always terminated) with every `%` doubled,
/// truncated if necessary, but never within a pair.
void EscapePercentSign(const char* in, char* out, size_t outSize);

/// Removes white space at both ends of `text`, in place.
void StringTrim(char* text);

/// Writes a formatted line to the system log with the given priority.
void AppLogError(int priority, const char* format, ...) __attribute__((format(printf, 2, 3)));
