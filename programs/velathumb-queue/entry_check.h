// Whether velathumb would do anything with an entry.
#pragma once

#include <string>

namespace vela {

/// Turns an entry that was given on the command line into one that means the same to everybody: its
/// path absolute. Returns what is wrong with it, empty when nothing is.
std::string CheckAddition(std::string& entry);

/// Returns why the entry cannot be worked on now, empty when it can: velathumb says nothing about a
/// directory that is not there and gives up, with status 0, where the volume is nearly full.
std::string FindHindrance(const std::string& entry);

}  // namespace vela
