#include "tool_output_fake.h"

#include <cstdio>

#include "platform/vlibc.h"

namespace {

std::string_view g_output;

}  // namespace

void SetToolOutput(const uint8_t* data, size_t size) {
  SetToolOutput({reinterpret_cast<const char*>(data), size});
}

void SetToolOutput(std::string_view text) {
  g_output = text;
}

FILE* VLIBCPopen(const char* /*program*/, const char* /*mode*/, ...) {
  // fmemopen may reject an empty buffer.
  if (g_output.empty()) {
    return std::fopen("/dev/null", "re");
  }
  return fmemopen(const_cast<char*>(g_output.data()), g_output.size(), "r");
}

int VLIBCPclose(FILE* stream) {
  return std::fclose(stream);
}
