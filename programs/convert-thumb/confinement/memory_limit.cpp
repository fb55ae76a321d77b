#include "confinement/memory_limit.h"

#include <charconv>
#include <cstring>

#include "platform/vlibc.h"

namespace {

constexpr char kSystemSettings[] = "/etc/velainfo.conf";
constexpr char kKey[] = "convert_memory_limit";
constexpr size_t kDefaultLimit = CONVERT_THUMB_MEMORY_LIMIT;

}  // namespace

size_t ConversionMemoryLimit() {
  char text[64] = "";
  if (VLIBCFileGetKeyValue(kSystemSettings, kKey, text, sizeof text, 0) <= 0) {
    return kDefaultLimit;
  }
  size_t limit = 0;
  const char* const last = text + std::strlen(text);
  const auto [end, error] = std::from_chars(text, last, limit);
  return error == std::errc() && end == last && limit > 0 ? limit : kDefaultLimit;
}
