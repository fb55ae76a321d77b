// Registering conversions in the index database.
#include <json/value.h>
#include <sqlite3.h>

#include <algorithm>
#include <csignal>
#include <cstdio>
#include <cstring>
#include <ctime>

#include "platform/platform_fixture.h"

namespace vela_test {
namespace {

constexpr const char* kDirectory = "/var/lib/velaindex";
constexpr const char* kDatabase = "/var/lib/velaindex/index.db";

VELA_MEDIA_INFO Media(const std::string& path, uint32_t width, uint32_t height) {
  VELA_MEDIA_INFO info;
  memset(&info, 0, sizeof(info));
  memcpy(info.path, path.data(), std::min(path.size(), sizeof(info.path)));
  info.width = width;
  info.height = height;
  return info;
}

int Add(const VELA_MEDIA_INFO& photo, const VELA_MEDIA_INFO& thumbnail) {
  return VELAIDX_IndexConvertAdd(photo, thumbnail, Json::Value(Json::objectValue));
}

int AddPath(const std::string& path, uint32_t width = 100) {
  return Add(Media(path, width, 50), Media(path + ".thumb", 10, 5));
}

/// The rows of a query, each with its columns joined by '|'.
Strings Query(const std::string& sql) {
  sqlite3* database = nullptr;
  EXPECT_EQ(sqlite3_open_v2(kDatabase, &database, SQLITE_OPEN_READWRITE, nullptr), SQLITE_OK);
  sqlite3_busy_timeout(database, 10000);
  sqlite3_stmt* statement = nullptr;
  EXPECT_EQ(sqlite3_prepare_v2(database, sql.c_str(), -1, &statement, nullptr), SQLITE_OK)
      << sqlite3_errmsg(database);
  Strings rows;
  while (sqlite3_step(statement) == SQLITE_ROW) {
    std::string row;
    for (int column = 0; column < sqlite3_column_count(statement); ++column) {
      const void* bytes = sqlite3_column_blob(statement, column);
      const auto size = static_cast<size_t>(sqlite3_column_bytes(statement, column));
      if (column > 0) row += '|';
      if (bytes != nullptr) row.append(static_cast<const char*>(bytes), size);
    }
    rows.push_back(row);
  }
  sqlite3_finalize(statement);
  sqlite3_close(database);
  return rows;
}

/// The paths of all registered photos, sorted.
Strings Photos() {
  return Query("SELECT photo_path FROM conversion ORDER BY 1");
}

const char* const kAllButTime =
    "SELECT photo_path, photo_width, photo_height, thumbnail_path, thumbnail_width, "
    "thumbnail_height FROM conversion ORDER BY photo_path";

// Most tests make their calls in a separate process: a process that has registered something can no
// longer do so in processes that other tests fork from it.
class IndexRegister : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    ASSERT_TRUE(IsDirectory("/var/lib"));
  }
};

TEST_F(IndexRegister, KeepsBothPathsAndResolutions) {
  InOwnProcess([] {
    EXPECT_EQ(
        Add(Media("/photo/a.jpg", 4000, 3000), Media("/photo/@eaDir/a.jpg/XL.jpg", 1280, 960)), 0);
    EXPECT_EQ(Query(kAllButTime),
              Strings{"/photo/a.jpg|4000|3000|/photo/@eaDir/a.jpg/XL.jpg|1280|960"});
  });
}

TEST_F(IndexRegister, KeepsTheTime) {
  InOwnProcess([] {
    const time_t before = time(nullptr);
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
    const auto rows = Query("SELECT registered_at FROM conversion");
    ASSERT_EQ(rows.size(), 1U);
    EXPECT_GE(std::stoll(rows[0]), before);
    EXPECT_LE(std::stoll(rows[0]), time(nullptr));
  });
}

TEST_F(IndexRegister, ReplacesAnEarlierRegistration) {
  InOwnProcess([] {
    EXPECT_EQ(AddPath("/photo/a.jpg", 100), 0);
    EXPECT_EQ(AddPath("/photo/b.jpg", 200), 0);
    EXPECT_EQ(Add(Media("/photo/a.jpg", 7, 8), Media("/other", 9, 10)), 0);
    EXPECT_EQ(Query(kAllButTime), (Strings{"/photo/a.jpg|7|8|/other|9|10",
                                           "/photo/b.jpg|200|50|/photo/b.jpg.thumb|10|5"}));
  });
}

TEST_F(IndexRegister, CreatesDirectoryAndFile) {
  InOwnProcess([] {
    const mode_t mask = umask(0);
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
    umask(mask);
    EXPECT_EQ(ModeOf(kDirectory), 0750);
    for (const char* suffix : {"", "-wal", "-shm"}) {
      EXPECT_EQ(ModeOf(std::string(kDatabase) + suffix), 0640) << suffix;
    }
  });
}

TEST_F(IndexRegister, KeepsExistingModes) {
  InOwnProcess([] {
    WriteFile(kDatabase, "");
    EXPECT_EQ(chmod(kDirectory, 0711), 0);
    EXPECT_EQ(chmod(kDatabase, 0604), 0);
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
    EXPECT_EQ(ModeOf(kDirectory), 0711);
    EXPECT_EQ(ModeOf(kDatabase), 0604);
  });
}

TEST_F(IndexRegister, CreatesBothWithTheirModesRegardlessOfTheMask) {
  InOwnProcess([] {
    RemoveTree(kDirectory);
    const mode_t mask = umask(077);
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
    umask(mask);
    EXPECT_EQ(ModeOf(kDirectory), 0750);
    EXPECT_EQ(ModeOf(kDatabase), 0640);
  });
}

TEST_F(IndexRegister, UsesAWriteAheadLogAndMarksItsTables) {
  InOwnProcess([] {
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
    EXPECT_EQ(Query("PRAGMA journal_mode"), Strings{"wal"});
    EXPECT_EQ(Query("PRAGMA user_version"), Strings{"1"});
  });
}

TEST_F(IndexRegister, KeepsEveryByteOfAPath) {
  InOwnProcess([] {
    std::string path = "/photo/";
    for (int byte = 1; byte < 256; ++byte) path += static_cast<char>(byte);
    EXPECT_EQ(AddPath(path), 0);
    EXPECT_EQ(Photos(), Strings{path});
    EXPECT_EQ(Query("SELECT typeof(photo_path), typeof(thumbnail_path) FROM conversion"),
              Strings{"blob|blob"});
  });
}

TEST_F(IndexRegister, TakesTheLongestPathAndTheLargestSizes) {
  InOwnProcess([] {
    const std::string path(4096, 'p');  // no room for a terminator
    EXPECT_EQ(Add(Media(path, 4294967295U, 4294967295U), Media("/t", 1, 1)), 0);
    EXPECT_EQ(Query("SELECT length(photo_path), photo_width, photo_height FROM conversion"),
              Strings{"4096|4294967295|4294967295"});
  });
}

TEST_F(IndexRegister, RefusesEmptyPaths) {
  InOwnProcess([] {
    EXPECT_EQ(Add(Media("", 1, 1), Media("/t", 1, 1)), -1);
    EXPECT_EQ(VLIBCErrGet(), EINVAL);
    EXPECT_EQ(Add(Media("/p", 1, 1), Media("", 1, 1)), -1);
  });
}

TEST_F(IndexRegister, RefusesADatabaseOfANewerProgram) {
  InOwnProcess([] {
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
    Query("PRAGMA user_version = 2");
    EXPECT_EQ(AddPath("/photo/b.jpg"), -1);
    EXPECT_EQ(AddPath("/photo/c.jpg"), -1);
    EXPECT_EQ(Photos(), Strings{"/photo/a.jpg"});
    EXPECT_EQ(Query("PRAGMA user_version"), Strings{"2"});
    Query("PRAGMA user_version = 1");
    EXPECT_EQ(AddPath("/photo/b.jpg"), 0);
  });
}

TEST_F(IndexRegister, KeepsRegistrationsOfEarlierPrograms) {
  for (const char* path : {"/photo/a.jpg", "/photo/b.jpg"}) {
    EXPECT_EQ(RunForked([path] { return AddPath(path); }), 0);
  }
  EXPECT_EQ(Photos(), (Strings{"/photo/a.jpg", "/photo/b.jpg"}));
}

TEST_F(IndexRegister, KeepsRegistrationsOfAKilledProgram) {
  for (int round = 0; round < 10; ++round) {
    RemoveTree("/tmp/first");
    const std::string directory = "/photo/" + std::to_string(round) + "/";
    const pid_t pid = Fork([&directory] {
      for (int i = 0;; ++i) {
        AddPath(directory + std::to_string(i));
        if (i == 0) WriteFile("/tmp/first", "");
      }
      return 0;
    });
    EXPECT_TRUE(WaitUntilExists("/tmp/first"));
    usleep(static_cast<useconds_t>(round * 1000));
    kill(pid, SIGKILL);
    Join(pid);
    ASSERT_EQ(Query("SELECT count(*) FROM conversion WHERE photo_path = CAST('" + directory +
                    "0' AS BLOB)"),
              Strings{"1"});
  }
  EXPECT_EQ(Query("PRAGMA integrity_check"), Strings{"ok"});
}

TEST_F(IndexRegister, NoticesARemovedDatabaseOrDirectory) {
  const std::string database = kDatabase;
  for (const Strings& removed :
       {Strings{database, database + "-wal", database + "-shm"}, Strings{kDirectory}}) {
    InOwnProcess([&removed] {
      EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
      for (const std::string& path : removed) RemoveTree(path);
      EXPECT_EQ(AddPath("/photo/b.jpg"), 0);
      EXPECT_EQ(Photos(), Strings{"/photo/b.jpg"});
    });
    RemoveTree(kDirectory);
  }
}

TEST_F(IndexRegister, NoticesAReplacedDatabase) {
  InOwnProcess([] {
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
    ASSERT_EQ(rename(kDirectory, "/var/lib/velaindex.old"), 0);
    // Another program creates and fills the new one before the next call here.
    EXPECT_EQ(RunForked([] {
                sqlite3* database = nullptr;
                if (mkdir(kDirectory, 0755) != 0) return 1;
                if (sqlite3_open(kDatabase, &database) != SQLITE_OK) return 2;
                return sqlite3_exec(database, "PRAGMA journal_mode = WAL; CREATE TABLE other(x);",
                                    nullptr, nullptr, nullptr);
              }),
              0);
    EXPECT_EQ(AddPath("/photo/b.jpg"), 0);
    EXPECT_EQ(Photos(), Strings{"/photo/b.jpg"});
    EXPECT_EQ(Query("SELECT count(*) FROM other"), Strings{"0"});
    RemoveTree("/var/lib/velaindex.old");
  });
}

TEST_F(IndexRegister, FailsWhereNoDatabaseCanBe) {
  InOwnProcess([] {
    RemoveTree(kDirectory);
    WriteFile(kDirectory, "a file");
    EXPECT_EQ(AddPath("/photo/a.jpg"), -1);
    RemoveTree(kDirectory);
    MakeDirectories(kDatabase);
    EXPECT_EQ(AddPath("/photo/a.jpg"), -1);
    RemoveTree(kDirectory);
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0) << "remembers the failures before";
  });
}

TEST_F(IndexRegister, FailsForAFileThatIsNoDatabase) {
  InOwnProcess([] {
    WriteFile(kDatabase, std::string(8192, 'x'));
    EXPECT_EQ(AddPath("/photo/a.jpg"), -1);
    EXPECT_EQ(ReadFile(kDatabase), std::string(8192, 'x'));
  });
}

/// Another program's transaction.
class Writer {
 public:
  Writer() {
    EXPECT_EQ(sqlite3_open(kDatabase, &database_), SQLITE_OK);
    EXPECT_EQ(Run("BEGIN IMMEDIATE"), SQLITE_OK);
  }
  ~Writer() { sqlite3_close(database_); }
  Writer(const Writer&) = delete;
  Writer& operator=(const Writer&) = delete;
  int Run(const char* sql) { return sqlite3_exec(database_, sql, nullptr, nullptr, nullptr); }

 private:
  sqlite3* database_ = nullptr;
};

TEST_F(IndexRegister, WaitsForTheTransactionOfAnother) {
  InOwnProcess([] {
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
    Writer writer;
    std::thread ending([&writer] {
      usleep(300000);
      EXPECT_EQ(writer.Run("COMMIT"), SQLITE_OK);
    });
    EXPECT_EQ(AddPath("/photo/b.jpg"), 0);
    ending.join();
  });
}

TEST_F(IndexRegister, WaitsTwoSecondsAtMost) {
  InOwnProcess([] {
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
    Writer writer;
    const Stopwatch watch;
    EXPECT_EQ(AddPath("/photo/b.jpg"), -1);
    EXPECT_EQ(VLIBCErrGet(), EBUSY);
    watch.ExpectBetween(1.5, 6.0);
  });
}

TEST_F(IndexRegister, CanBeUsedByManyProgramsFromTheFirstMomentOn) {
  for (int round = 0; round < 5; ++round) {
    RemoveTree(kDirectory);
    std::vector<pid_t> programs;
    for (int program = 0; program < 6; ++program) {
      programs.push_back(Fork([program] {
        for (int i = 0; i < 20; ++i) {
          const std::string path = "/p/" + std::to_string(program) + "/" + std::to_string(i);
          if (AddPath(path) != 0) return VLIBCErrGet();
        }
        return 0;
      }));
    }
    for (const pid_t program : programs) ASSERT_EQ(Join(program), 0);
    ASSERT_EQ(Query("SELECT count(*) FROM conversion"), Strings{"120"});
  }
}

TEST_F(IndexRegister, CanBeUsedByThreadsAtOnce) {
  InOwnProcess([] {
    RunInThreads(4, [](int thread) {
      for (int i = 0; i < 25; ++i) {
        EXPECT_EQ(AddPath("/t/" + std::to_string(thread) + "/" + std::to_string(i)), 0);
      }
    });
    EXPECT_EQ(Query("SELECT count(*) FROM conversion"), Strings{"100"});
  });
}

TEST_F(IndexRegister, RefusesUseAcrossAFork) {
  InOwnProcess([] {
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
    EXPECT_EQ(RunForked([] { return AddPath("/photo/b.jpg") == -1 ? 0 : 1; }), 0);
    EXPECT_EQ(AddPath("/photo/c.jpg"), 0);
  });
}

TEST_F(IndexRegister, KeepsItsDescriptorsFromOtherPrograms) {
  InOwnProcess([] {
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
    int open = 0;
    for (const std::string& number : ListDirectory("/proc/self/fd")) {
      char target[4096] = "";
      const std::string path = "/proc/self/fd/" + number;
      if (readlink(path.c_str(), target, sizeof(target) - 1) < 0) continue;
      if (std::string(target).find(kDirectory) != 0) continue;
      ++open;
      const std::string info = ReadFile("/proc/self/fdinfo/" + number);
      const size_t flags = info.find("flags:\t");
      ASSERT_NE(flags, std::string::npos);
      EXPECT_NE(std::stoul(info.substr(flags + 7), nullptr, 8) & 02000000U, 0U) << target;
    }
    EXPECT_GE(open, 2);
  });
}

}  // namespace
}  // namespace vela_test
