#include "progress/velamk_progress.h"

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <limits>
#include <string>

#include "configuration/settings.h"
#include "platform/system_rules.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "posix/identity.h"
#include "posix/log.h"
#include "progress/progress_summary.h"

using namespace vela;

namespace {

constexpr char kLogSource[] = "velamk_progress";

int ClampToInt(int64_t value) {
  constexpr int64_t kLowest = std::numeric_limits<int>::min();
  constexpr int64_t kHighest = std::numeric_limits<int>::max();
  return static_cast<int>(std::clamp(value, kLowest, kHighest));
}

/// Reads a counter; one that is missing or not a number counts as 0.
int ReadCounter(const char* file, const char* key) {
  char text[4096] = "";
  if (VLIBCFileGetKeyValue(file, key, text, sizeof text, 0) <= 0) {
    return 0;
  }
  return ClampToInt(std::strtol(text, nullptr, 10));
}

}  // namespace

int GetConvProgress(int kind, const char* key) {
  const char* file = ConvProgressFile(kind);
  return file == nullptr || key == nullptr ? 0 : ReadCounter(file, key);
}

void AddConvProgress(int kind, const char* key, int delta) {
  const char* file = ConvProgressFile(kind);
  if (file == nullptr || key == nullptr) {
    return;
  }
  const OwnIdentity own;
  const int64_t sum = int64_t{ReadCounter(file, key)} + delta;
  const std::string text = std::to_string(ClampToInt(sum));
  if (VLIBCFileSetKeyValue(file, key, text.c_str(), 0) < 0) {
    LogError(kLogSource, 115, "VLIBCFileSetKeyValue fail: " + std::string(file));
  }
}

void LogConvProgress() {
  int line = 144;
  for (const std::string& text : FormatProgressSummary(ReadProgressSummary())) {
    LogError(kLogSource, line, text);
    ++line;
  }
}

long GetThumbConvResumeTime() {
  char text[1024] = "";
  if (VLIBCFileGetKeyValue(kSettingsFile, kResumeTimeKey, text, sizeof text, 0) < 0) {
    LogError(kLogSource, 176,
             "VLIBCFileGetKeyValue(" + std::string(kResumeTimeKey) +
                 ") failed, velaerr=" + LogCode(VLIBCErrGet()));
  }
  return std::strtol(text, nullptr, 10);
}

int IsThumbConvResumeTimeReached() {
  const long resume = GetThumbConvResumeTime();
  return resume >= 0 && std::time(nullptr) >= resume ? 1 : 0;
}

int GetThumbConvResumeWait(timeval* out) {
  const long resume = GetThumbConvResumeTime();
  const long now = std::time(nullptr);
  out->tv_sec = resume > now ? resume - now : 0;
  out->tv_usec = 0;
  return 0;
}
