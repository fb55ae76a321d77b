#include <syslog.h>

#include <cstdarg>

#include "platform/velaindex.h"

void AppLogError(int priority, const char* format, ...) {
  va_list arguments;
  va_start(arguments, format);
  vsyslog(priority, format, arguments);
  va_end(arguments);
}
