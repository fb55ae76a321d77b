// Replaces the platform's piped child processes: every tool prints the same output.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

/// Sets the output of every tool started from now on; the data must stay valid.
void SetToolOutput(const uint8_t* data, size_t size);

/// The same for a text.
void SetToolOutput(std::string_view text);
