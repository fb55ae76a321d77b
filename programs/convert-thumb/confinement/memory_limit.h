// How much memory a conversion may take.
#pragma once

#include <cstddef>

namespace vela {

/// `convert_memory_limit` of the system settings, in bytes: a number, which K, M or G behind it
/// multiplies by 1024, its square or its cube. When it is absent or empty, what was chosen when the
/// program was built (VELA_CONVERT_MEMORY_LIMIT); the same, after one line on standard error, when
/// it is anything else.
size_t ConversionMemoryLimit();

}  // namespace vela
