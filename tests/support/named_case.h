// Rows of tables for parameterised tests.
#pragma once

#include <gtest/gtest.h>

#include <ostream>
#include <string>

namespace vela_test {

/// Base of a row: its name becomes part of the test's name and identifies the row in messages.
struct NamedCase {
  const char* name;
};

inline std::ostream& operator<<(std::ostream& out, const NamedCase& row) {
  return out << row.name;
}

/// Last argument of INSTANTIATE_TEST_SUITE_P for such rows.
struct CaseName {
  template <typename Case>
  std::string operator()(const testing::TestParamInfo<Case>& test) const {
    return test.param.name;
  }
};

}  // namespace vela_test
