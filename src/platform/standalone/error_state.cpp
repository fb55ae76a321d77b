#include <cstring>

#include "platform/standalone/last_error.h"
#include "platform/vlibc.h"

namespace {

struct LastError {
  int code = 0;
  const char* file = "";
  int line = 0;
};

// Has no constructor to run, so that a signal handler may set it too.
thread_local LastError g_lastError;

const char* BaseName(const char* path) {
  const char* slash = std::strrchr(path, '/');
  return slash == nullptr ? path : slash + 1;
}

}  // namespace

namespace vela {

void SetLastError(int code, const char* file, int line) {
  g_lastError = {code, BaseName(file), line};
}

int Fail(int code, const char* file, int line) {
  SetLastError(code, file, line);
  return -1;
}

}  // namespace vela

int VLIBCErrGet(void) {
  return g_lastError.code;
}

const char* VLIBCErrorGetFile(void) {
  return g_lastError.file;
}

int VLIBCErrorGetLine(void) {
  return g_lastError.line;
}
