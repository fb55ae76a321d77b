// The daemon's database, read directly.
#pragma once

#include <string>
#include <vector>

namespace vela_test {

/// The first column of the query's result, as bytes; fails the test when the query fails.
std::vector<std::string> QueryIndexDatabase(const std::string& query);

}  // namespace vela_test
