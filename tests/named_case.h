// Rows of test tables.
#pragma once

#include <gtest/gtest.h>

#include <ostream>
#include <string>

namespace vela_test {

/// The base of a table's rows: tests and messages show a row by its name.
struct NamedCase {
  const char* name;
};
inline std::ostream& operator<<(std::ostream& out, const NamedCase& row) {
  return out << row.name;
}

/// Names the test of each row, for INSTANTIATE_TEST_SUITE_P.
struct CaseName {
  template <typename Case>
  std::string operator()(const ::testing::TestParamInfo<Case>& row) const {
    return row.param.name;
  }
};

}  // namespace vela_test
