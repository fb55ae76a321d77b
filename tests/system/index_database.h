// The daemon's database, read from outside.
#pragma once

#include <string>
#include <vector>

namespace vela_test {

/// The first column of what the query gives, as bytes; a failure of the test when it cannot be
/// asked.
std::vector<std::string> AskIndexDatabase(const std::string& query);

}  // namespace vela_test
