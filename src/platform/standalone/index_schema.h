// The embedded index database, for all programs that use it.
#pragma once

namespace vela {

constexpr const char* kIndexDirectory = "/var/lib/velaindex";
constexpr const char* kIndexDatabase = "/var/lib/velaindex/index.db";

/// Version of the tables below, kept as the database's user_version; 0 is a database without any.
/// A program leaves a database with a higher version alone.
constexpr int kIndexSchemaVersion = 1;

/// How long a program waits for another one's transaction, milliseconds.
constexpr int kIndexBusyTimeout = 2000;

/// One row for each photo whose thumbnails were made; paths are byte strings, sizes pixels, the
/// time is in seconds since the epoch.
constexpr const char* kIndexSchema =
    "CREATE TABLE IF NOT EXISTS conversion ("
    " photo_path BLOB NOT NULL PRIMARY KEY,"
    " photo_width INTEGER NOT NULL,"
    " photo_height INTEGER NOT NULL,"
    " thumbnail_path BLOB NOT NULL,"
    " thumbnail_width INTEGER NOT NULL,"
    " thumbnail_height INTEGER NOT NULL,"
    " registered_at INTEGER NOT NULL"
    ") WITHOUT ROWID;"
    "PRAGMA user_version = 1;";

constexpr const char* kReplaceConversion =
    "INSERT OR REPLACE INTO conversion VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7)";

}  // namespace vela
