#include "index_database.h"

#include <gtest/gtest.h>
#include <sqlite3.h>

#include <memory>

namespace vela_test {

namespace {

constexpr const char* kFile = "/var/lib/velaindex/index.db";

struct Closer {
  void operator()(sqlite3* database) const { sqlite3_close(database); }
  void operator()(sqlite3_stmt* statement) const { sqlite3_finalize(statement); }
};

std::string FirstColumn(sqlite3_stmt* statement) {
  const auto* bytes = static_cast<const char*>(sqlite3_column_blob(statement, 0));
  return std::string(bytes == nullptr ? "" : bytes,
                     static_cast<size_t>(sqlite3_column_bytes(statement, 0)));
}

}  // namespace

std::vector<std::string> QueryIndexDatabase(const std::string& query) {
  sqlite3* opened = nullptr;
  const int openResult = sqlite3_open_v2(kFile, &opened, SQLITE_OPEN_READWRITE, nullptr);
  const std::unique_ptr<sqlite3, Closer> database(opened);
  EXPECT_EQ(openResult, SQLITE_OK);
  sqlite3_stmt* prepared = nullptr;
  const int prepareResult = sqlite3_prepare_v2(opened, query.c_str(), -1, &prepared, nullptr);
  const std::unique_ptr<sqlite3_stmt, Closer> statement(prepared);
  EXPECT_EQ(prepareResult, SQLITE_OK) << sqlite3_errmsg(opened);
  std::vector<std::string> rows;
  int step = prepareResult == SQLITE_OK ? sqlite3_step(prepared) : SQLITE_DONE;
  for (; step == SQLITE_ROW; step = sqlite3_step(prepared)) {
    rows.push_back(FirstColumn(prepared));
  }
  EXPECT_EQ(step, SQLITE_DONE) << sqlite3_errmsg(opened);
  return rows;
}

}  // namespace vela_test
