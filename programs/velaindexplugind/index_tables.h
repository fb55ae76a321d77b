// The daemon's tables in the index database, which it shares with programs that have other tables
// and keep their version in the database's user_version: that is not the daemon's to change.
#pragma once

namespace vela {

/// Version of the tables below. A database where they have a higher one is left alone.
constexpr int kTablesVersion = 1;

/// Paths are byte strings, sizes pixels and bytes, times seconds since the epoch. In `media`,
/// `read_at` is when the record was read; in `posted`, `kind` is 1 for photos and 2 for videos.
constexpr char kMakeTables[] =
    "CREATE TABLE IF NOT EXISTS velaindexplugind_schema ("
    " id INTEGER PRIMARY KEY CHECK (id = 1),"
    " version INTEGER NOT NULL"
    ");"
    "CREATE TABLE IF NOT EXISTS media ("
    " path BLOB NOT NULL PRIMARY KEY,"
    " type INTEGER NOT NULL,"
    " width INTEGER NOT NULL,"
    " height INTEGER NOT NULL,"
    " rotation INTEGER NOT NULL,"
    " duration INTEGER NOT NULL,"
    " bitrate INTEGER NOT NULL,"
    " size INTEGER NOT NULL,"
    " mtime INTEGER NOT NULL,"
    " mtime_nanoseconds INTEGER NOT NULL,"
    " read_at INTEGER NOT NULL"
    ") WITHOUT ROWID;"
    "CREATE TABLE IF NOT EXISTS posted ("
    " path BLOB NOT NULL,"
    " kind INTEGER NOT NULL,"
    " posted_at INTEGER NOT NULL,"
    " PRIMARY KEY (path, kind)"
    ") WITHOUT ROWID;"
    "CREATE TABLE IF NOT EXISTS directory_index_version ("
    " path BLOB NOT NULL PRIMARY KEY,"
    " version INTEGER NOT NULL"
    ") WITHOUT ROWID;"
    "INSERT OR REPLACE INTO velaindexplugind_schema VALUES (1, 1);";

}  // namespace vela
