// Rows of parameterised tests with a name, which gtest shows in place of their bytes.
#pragma once

#include <gtest/gtest.h>

#include <ostream>
#include <string>

namespace vela_test {

/// Base of a row. The name has letters and digits only.
struct NamedRow {
  const char* name;
};

inline std::ostream& operator<<(std::ostream& out, const NamedRow& row) {
  return out << row.name;
}

/// The name of a test instance, for INSTANTIATE_TEST_SUITE_P.
template <typename Row>
std::string RowName(const ::testing::TestParamInfo<Row>& row) {
  return row.param.name;
}

}  // namespace vela_test
