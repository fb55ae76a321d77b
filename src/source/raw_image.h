// Camera raw photos, and the pixel size of any photo.
#pragma once

#include <cstdint>
#include <string>

#include "profiles/directory_job.h"

/// Reads the pixel size of the photo `path`, raw or not. Returns 1, or 0 (sizes untouched).
int GetImageResolution(const std::string& path, uint32_t& width, uint32_t& height);

/// Reads the pixel size that a full decode of the raw photo `path` would have. Returns 1, or 0
/// (sizes untouched); a decoder that cannot be started is logged.
int GetRawImageSize(const std::string& path, uint32_t& width, uint32_t& height);

/// Runs the raw decoder on `rawPath` with one option ("-e" embedded preview, "-w" full decode) and
/// stores its output in `outPath`. Returns false when there is no output or it could not be stored,
/// which is logged unless the output is empty; a partial file may remain.
bool DcrawToFile(const std::string& rawPath, const std::string& outPath, const char* option);

/// Makes an ordinary image of the raw photo `rawPath` in its metadata directory `thumbDir`: the
/// embedded preview when it is large enough for the largest profile, else the full decode. Returns
/// its path, which the caller removes, or an empty string when the photo cannot be decoded.
std::string ConvertRawToJpeg(const DirectoryJob& job, const std::string& rawPath,
                             const std::string& thumbDir);
