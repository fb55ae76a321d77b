// How much memory a conversion may take.
#pragma once

#include <cstddef>

/// `convert_memory_limit` of the system settings, in bytes; when it is absent or no number, what
/// was chosen when the program was built (VELA_CONVERT_MEMORY_LIMIT).
size_t ConversionMemoryLimit();
