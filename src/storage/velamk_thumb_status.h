// Thumbnail status: the outstanding work.
#pragma once

#include <cstdint>

struct FTW;
struct stat;

/// Photos with at least one missing thumbnail, and missing thumbnails, counted by the last
/// GetDirThumbStatusRecursive. One such scan at a time in a process.
extern int g_incomplete_photo_num;
extern int g_incomplete_thumb_num;

/// Counts the thumbnails of the photo `path` that `sizeMap` asks for (-1: ask the index library)
/// into `missingOut` (missing or outdated) and `presentOut`. Both are 0 when the photo does not
/// exist or cannot be looked up; the latter is logged.
void GetThumbStatus(const char* path, int* missingOut, int* presentOut, int32_t sizeMap);

/// Counts the photos of the directory `dir` that lack thumbnails, and the thumbnails they lack;
/// subdirectories are not entered. Both are 0 when there is no such directory or it cannot be
/// opened; the latter is logged.
void GetDirThumbStatus(const char* dir, int* photosOut, int* thumbsOut);

/// Counts the same for the tree `dir`, without other file systems and without directories in the
/// photo queue. Returns 0, or -1 when `dir` does not exist
/// or a part of the tree could not be read.
int GetDirThumbStatusRecursive(const char* dir, int* photosOut, int* thumbsOut);

/// The step of that scan: adds a directory to the two counters above. Returns the walk's action
/// code.
int GetDirThumbStatusRecursive_Callback(const char* path, const struct stat* status, int typeFlag,
                                        struct FTW* walk);

/// Returns 1 when the video `path` lacks thumbnails or a converted video, else 0, also for any
/// other file and, logged, for a path of more than 4066 bytes. Removes outdated thumbnails, and
/// thumbnails and converted videos of the wrong orientation.
int IsVideoWorkNeeded(const char* path);

/// Returns the number of videos in the tree `dir` that need work and are not in the video queue; 0,
/// logged, when the directory does not exist or cannot be opened. The videos listed after a queued
/// one in the same directory are not counted. A link to a parent directory is not followed; a
/// directory that is reached on several paths counts each time. Removes what IsVideoWorkNeeded
/// removes.
int CountVideoWork(const char* dir);

/// Returns the number of videos that need work among the entries of the queue file `queueFile`; of
/// the video queue without those in progress. 0 when the file does not exist or cannot be opened;
/// the latter is logged. Removes what IsVideoWorkNeeded removes.
int CountVideoQueueWork(const char* queueFile);

/// Returns the number of entries of the directory `path`, "." and ".." included; 0 when it is not a
/// directory or cannot be opened.
int CountDirEntries(const char* path);
