// Registering conversions in the index database.
#include <json/value.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <functional>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "platform/forked_call.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "support/files.h"
#include "support/sandbox.h"

namespace {

using vela_test::ModeOf;

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
std::vector<std::string> Query(const std::string& sql) {
  sqlite3* database = nullptr;
  EXPECT_EQ(sqlite3_open_v2(kDatabase, &database, SQLITE_OPEN_READWRITE, nullptr), SQLITE_OK);
  sqlite3_busy_timeout(database, 10000);
  sqlite3_stmt* statement = nullptr;
  EXPECT_EQ(sqlite3_prepare_v2(database, sql.c_str(), -1, &statement, nullptr), SQLITE_OK)
      << sqlite3_errmsg(database);
  std::vector<std::string> rows;
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

const char* const kAllButTime =
    "SELECT photo_path, photo_width, photo_height, thumbnail_path, thumbnail_width, "
    "thumbnail_height FROM conversion ORDER BY photo_path";

class IndexRegister : public vela_test::SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    ASSERT_TRUE(vela_test::IsDirectory("/var/lib"));
  }

  /// Makes the calls in a process of its own: one that has registered something cannot go on doing
  /// so in the copies of itself that other tests make.
  static void InOwnProcess(const std::function<void()>& calls) {
    const int result = platform_test::RunForked([&calls] {
      calls();
      fflush(stdout);
      return HasFailure() ? 1 : 0;
    });
    EXPECT_EQ(result, 0);
  }
};

TEST_F(IndexRegister, KeepsBothPathsAndResolutions) {
  InOwnProcess([] {
    EXPECT_EQ(
        Add(Media("/photo/a.jpg", 4000, 3000), Media("/photo/@eaDir/a.jpg/XL.jpg", 1280, 960)), 0);
    EXPECT_EQ(
        Query(kAllButTime),
        std::vector<std::string>{"/photo/a.jpg|4000|3000|/photo/@eaDir/a.jpg/XL.jpg|1280|960"});
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
    EXPECT_EQ(Query(kAllButTime),
              (std::vector<std::string>{"/photo/a.jpg|7|8|/other|9|10",
                                        "/photo/b.jpg|200|50|/photo/b.jpg.thumb|10|5"}));
  });
}

TEST_F(IndexRegister, MakesDirectoryAndFile) {
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

TEST_F(IndexRegister, LeavesTheModesOfWhatIsThere) {
  InOwnProcess([] {
    vela_test::WriteFile(kDatabase, "");
    EXPECT_EQ(chmod(kDirectory, 0711), 0);
    EXPECT_EQ(chmod(kDatabase, 0604), 0);
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
    EXPECT_EQ(ModeOf(kDirectory), 0711);
    EXPECT_EQ(ModeOf(kDatabase), 0604);
  });
}

TEST_F(IndexRegister, MakesBothWithTheirModesWhateverTheMask) {
  InOwnProcess([] {
    vela_test::RemoveTree(kDirectory);
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
    EXPECT_EQ(Query("PRAGMA journal_mode"), std::vector<std::string>{"wal"});
    EXPECT_EQ(Query("PRAGMA user_version"), std::vector<std::string>{"1"});
  });
}

TEST_F(IndexRegister, KeepsEveryByteOfAPath) {
  InOwnProcess([] {
    std::string path = "/photo/";
    for (int byte = 1; byte < 256; ++byte) path += static_cast<char>(byte);
    EXPECT_EQ(AddPath(path), 0);
    EXPECT_EQ(Query("SELECT photo_path FROM conversion"), std::vector<std::string>{path});
    EXPECT_EQ(Query("SELECT typeof(photo_path), typeof(thumbnail_path) FROM conversion"),
              std::vector<std::string>{"blob|blob"});
  });
}

TEST_F(IndexRegister, TakesTheLongestPathAndTheLargestSizes) {
  InOwnProcess([] {
    const std::string path(4096, 'p');  // no room for a terminator
    EXPECT_EQ(Add(Media(path, 4294967295U, 4294967295U), Media("/t", 1, 1)), 0);
    EXPECT_EQ(Query("SELECT length(photo_path), photo_width, photo_height FROM conversion"),
              std::vector<std::string>{"4096|4294967295|4294967295"});
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
    EXPECT_EQ(Query("SELECT photo_path FROM conversion"), std::vector<std::string>{"/photo/a.jpg"});
    EXPECT_EQ(Query("PRAGMA user_version"), std::vector<std::string>{"2"});
    Query("PRAGMA user_version = 1");
    EXPECT_EQ(AddPath("/photo/b.jpg"), 0);
  });
}

TEST_F(IndexRegister, KeepsWhatEarlierProgramsRegistered) {
  EXPECT_EQ(platform_test::RunForked([] { return AddPath("/photo/a.jpg") == 0 ? 0 : 1; }), 0);
  EXPECT_EQ(platform_test::RunForked([] { return AddPath("/photo/b.jpg") == 0 ? 0 : 1; }), 0);
  EXPECT_EQ(Query("SELECT photo_path FROM conversion ORDER BY 1"),
            (std::vector<std::string>{"/photo/a.jpg", "/photo/b.jpg"}));
}

TEST_F(IndexRegister, KeepsWhatAKilledProgramRegistered) {
  for (int round = 0; round < 10; ++round) {
    vela_test::RemoveTree("/tmp/first");
    const pid_t pid = platform_test::Fork([round] {
      for (int i = 0;; ++i) {
        AddPath("/photo/" + std::to_string(round) + "/" + std::to_string(i));
        if (i == 0) vela_test::WriteFile("/tmp/first", "");
      }
      return 0;
    });
    EXPECT_TRUE(vela_test::WaitUntilExists("/tmp/first"));
    usleep(static_cast<useconds_t>(round * 1000));
    kill(pid, SIGKILL);
    platform_test::Join(pid);
    ASSERT_EQ(Query("SELECT count(*) FROM conversion WHERE photo_path = CAST('/photo/" +
                    std::to_string(round) + "/0' AS BLOB)"),
              std::vector<std::string>{"1"});
  }
  EXPECT_EQ(Query("PRAGMA integrity_check"), std::vector<std::string>{"ok"});
}

TEST_F(IndexRegister, NoticesARemovedDatabase) {
  InOwnProcess([] {
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
    for (const char* suffix : {"", "-wal", "-shm"}) {
      vela_test::RemoveTree(std::string(kDatabase) + suffix);
    }
    EXPECT_EQ(AddPath("/photo/b.jpg"), 0);
    EXPECT_EQ(Query("SELECT photo_path FROM conversion"), std::vector<std::string>{"/photo/b.jpg"});
  });
}

TEST_F(IndexRegister, NoticesARemovedDirectory) {
  InOwnProcess([] {
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
    vela_test::RemoveTree(kDirectory);
    EXPECT_EQ(AddPath("/photo/b.jpg"), 0);
    EXPECT_EQ(Query("SELECT photo_path FROM conversion"), std::vector<std::string>{"/photo/b.jpg"});
  });
}

TEST_F(IndexRegister, NoticesAReplacedDatabase) {
  InOwnProcess([] {
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
    ASSERT_EQ(rename(kDirectory, "/var/lib/velaindex.old"), 0);
    // The new one is made and filled by another program before the next call here.
    EXPECT_EQ(platform_test::RunForked([] {
                sqlite3* database = nullptr;
                if (mkdir(kDirectory, 0755) != 0) return 1;
                if (sqlite3_open(kDatabase, &database) != SQLITE_OK) return 2;
                return sqlite3_exec(database, "PRAGMA journal_mode = WAL; CREATE TABLE other(x);",
                                    nullptr, nullptr, nullptr);
              }),
              0);
    EXPECT_EQ(AddPath("/photo/b.jpg"), 0);
    EXPECT_EQ(Query("SELECT photo_path FROM conversion"), std::vector<std::string>{"/photo/b.jpg"});
    EXPECT_EQ(Query("SELECT count(*) FROM other"), std::vector<std::string>{"0"});
    vela_test::RemoveTree("/var/lib/velaindex.old");
  });
}

TEST_F(IndexRegister, FailsWhereNoDatabaseCanBe) {
  InOwnProcess([] {
    vela_test::RemoveTree(kDirectory);
    vela_test::WriteFile(kDirectory, "a file");
    EXPECT_EQ(AddPath("/photo/a.jpg"), -1);
    vela_test::RemoveTree(kDirectory);
    vela_test::MakeDirectories(kDatabase);
    EXPECT_EQ(AddPath("/photo/a.jpg"), -1);
    vela_test::RemoveTree(kDirectory);
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0) << "the failures before count no more";
  });
}

TEST_F(IndexRegister, FailsForAFileThatIsNoDatabase) {
  InOwnProcess([] {
    vela_test::WriteFile(kDatabase, std::string(8192, 'x'));
    EXPECT_EQ(AddPath("/photo/a.jpg"), -1);
    EXPECT_EQ(vela_test::ReadFile(kDatabase), std::string(8192, 'x'));
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
    const auto start = std::chrono::steady_clock::now();
    EXPECT_EQ(AddPath("/photo/b.jpg"), -1);
    EXPECT_EQ(VLIBCErrGet(), EBUSY);
    const std::chrono::duration<double> seconds = std::chrono::steady_clock::now() - start;
    EXPECT_GE(seconds.count(), 1.5);
    EXPECT_LT(seconds.count(), 6.0);
  });
}

TEST_F(IndexRegister, CanBeUsedByManyProgramsFromTheFirstMomentOn) {
  for (int round = 0; round < 5; ++round) {
    vela_test::RemoveTree(kDirectory);
    std::vector<pid_t> programs;
    for (int program = 0; program < 6; ++program) {
      programs.push_back(platform_test::Fork([program] {
        for (int i = 0; i < 20; ++i) {
          const std::string path = "/p/" + std::to_string(program) + "/" + std::to_string(i);
          if (AddPath(path) != 0) return VLIBCErrGet();
        }
        return 0;
      }));
    }
    for (const pid_t program : programs) ASSERT_EQ(platform_test::Join(program), 0);
    ASSERT_EQ(Query("SELECT count(*) FROM conversion"), std::vector<std::string>{"120"});
  }
}

TEST_F(IndexRegister, CanBeUsedByThreadsAtOnce) {
  InOwnProcess([] {
    std::vector<std::thread> threads;
    for (int thread = 0; thread < 4; ++thread) {
      threads.emplace_back([thread] {
        for (int i = 0; i < 25; ++i) {
          EXPECT_EQ(AddPath("/t/" + std::to_string(thread) + "/" + std::to_string(i)), 0);
        }
      });
    }
    for (std::thread& thread : threads) thread.join();
    EXPECT_EQ(Query("SELECT count(*) FROM conversion"), std::vector<std::string>{"100"});
  });
}

TEST_F(IndexRegister, RefusesToBeCarriedAcrossAFork) {
  InOwnProcess([] {
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
    EXPECT_EQ(platform_test::RunForked([] { return AddPath("/photo/b.jpg") == -1 ? 0 : 1; }), 0);
    EXPECT_EQ(AddPath("/photo/c.jpg"), 0);
  });
}

TEST_F(IndexRegister, KeepsItsDescriptorsFromOtherPrograms) {
  InOwnProcess([] {
    EXPECT_EQ(AddPath("/photo/a.jpg"), 0);
    int open = 0;
    for (const std::string& number : vela_test::ListDirectory("/proc/self/fd")) {
      char target[4096] = "";
      const std::string path = "/proc/self/fd/" + number;
      if (readlink(path.c_str(), target, sizeof(target) - 1) < 0) continue;
      if (std::string(target).find(kDirectory) != 0) continue;
      ++open;
      const std::string info = vela_test::ReadFile("/proc/self/fdinfo/" + number);
      const size_t flags = info.find("flags:\t");
      ASSERT_NE(flags, std::string::npos);
      EXPECT_NE(std::stoul(info.substr(flags + 7), nullptr, 8) & 02000000U, 0U) << target;
    }
    EXPECT_GE(open, 2);
  });
}

}  // namespace
