// The name under which the program's own decisions log.
#pragma once

namespace vela {

inline constexpr char kLogSource[] = "velathumb";

}  // namespace vela
