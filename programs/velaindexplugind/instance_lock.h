// Keeps a second daemon away from the index.
#pragma once

#include <string>

#include "thumb/descriptor.h"

/// Takes the lock beside the index database `database`, for as long as `lock` lives. Makes the
/// database's directory when missing. Returns what went wrong, empty when nothing did.
std::string LockInstance(const std::string& database, Descriptor& lock);
