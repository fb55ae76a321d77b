// Conversion progress: counters in the spool directory, and the time until which conversion is
// paused.
#pragma once

#include <sys/time.h>

/// Returns the integer value of `key` ("total", "completed", "total_thumb", "completed_thumb") in
/// the progress file of `kind` (a THUMB_TYPE); 0 for another kind and for a value that is missing
/// or not a number.
int GetConvProgress(int kind, const char* key);

/// Adds `delta` to `key` in the progress file of `kind`; does nothing for another kind or a null
/// key. A failed write is logged. Two processes that add at once can lose one addition.
void AddConvProgress(int kind, const char* key, int delta);

/// Writes the progress summary of photos, thumbnails and videos to the system log.
void LogConvProgress();

/// Returns the time (seconds since the epoch) until which conversion is paused, 0 when none is
/// set; a failed read is logged and gives 0.
long GetThumbConvResumeTime();

/// Returns 1 when conversion may run again, 0 while the resume time is in the future or negative.
int IsThumbConvResumeTimeReached();

/// Fills `out` with the time left until the resume time, never below zero. Returns 0.
int GetThumbConvResumeWait(timeval* out);
