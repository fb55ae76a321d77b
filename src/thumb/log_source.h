// The name under which the program's own decisions log.
#pragma once

inline constexpr char kLogSource[] = "velathumb";
