// Client of the index daemon: one JSON request and one JSON reply per call, no state
// between calls. Safe to call from any thread.
#pragma once

struct VELA_MEDIA_INFO;

/// The index daemon's socket.
inline constexpr char PluginDaemonSocketPath[] = "/tmp/velaindexplugind_sock";

/// Asks for the media record of `path` (`type` is a THUMB_TYPE). Returns 0 and fills `out`, or -1
/// and leaves `out` untouched; a failure is logged.
int GetMediaFromPluginDB(int type, const char* path, VELA_MEDIA_INFO& out);

/// Asks for the index version that applies to `path`. Returns it (0 when the reply contains none),
/// or -1 when the daemon did not answer with success; a failure is logged.
int GetIndexVersion(const char* path);

/// Asks whether video conversion is switched off. Returns false also on failure, which is logged.
bool IsDisableConvertVideo();

/// Asks whether photo conversion is switched off. Returns false also on failure, which is logged.
bool IsDisableConvertPhoto();

/// Reports to the daemon that the conversion of the photo `path` has ended; a failure is logged.
void PostPhotoConvert(const char* path);

/// Reports to the daemon that the conversion of the video `path` has ended; a failure is logged.
void PostVideoConvert(const char* path);
