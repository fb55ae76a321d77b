// How much memory a conversion may take.
#pragma once

#include <cstddef>

/// `convert_memory_limit` of the system settings, in bytes; 512 MiB when it is absent or no number.
size_t ConversionMemoryLimit();
