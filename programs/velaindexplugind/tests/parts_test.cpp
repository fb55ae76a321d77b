// Small units of the daemon.
#include <gtest/gtest.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <optional>
#include <string>

#include "configuration/whole_number.h"
#include "index_store.h"
#include "request.h"
#include "request_handler.h"
#include "request_log.h"
#include "start_problem.h"

using namespace vela;

namespace vela_test {
namespace {

TEST(PlainPathTest, HasOneFormForAllSpellings) {
  EXPECT_EQ(PlainPath("/"), "/");
  EXPECT_EQ(PlainPath("//"), "/");
  EXPECT_EQ(PlainPath("///a"), "/a");
  EXPECT_EQ(PlainPath("//a"), "/a");
  EXPECT_EQ(PlainPath("/a/"), "/a");
  EXPECT_EQ(PlainPath("/a//b/./c/."), "/a/b/c");
  EXPECT_EQ(PlainPath("/a/../b"), "/b");
  EXPECT_EQ(PlainPath("/.."), "/");
  EXPECT_EQ(PlainPath("/a/b/.."), "/a");
  EXPECT_EQ(PlainPath("/a \xff\n"), "/a \xff\n");
  EXPECT_EQ(PlainPath("/...a"), "/...a");
}

TEST(ParentOfTest, GoesUpToTheRootAndEnds) {
  EXPECT_EQ(ParentOf("/a/bc/d"), "/a/bc");
  EXPECT_EQ(ParentOf("/a"), "/");
  EXPECT_EQ(ParentOf("/"), "");
}

TEST(StartProblemTest, OnlyWhatMayPassIsTriedAgain) {
  for (const int error : {ENOSPC, EDQUOT, EIO, ENOMEM, EMFILE, ENFILE, EAGAIN, EADDRINUSE}) {
    EXPECT_FALSE(ProblemAt("/a", error).isPermanent) << error;
  }
  for (const int error : {EACCES, EPERM, ENOENT, ENOTDIR, EISDIR, ELOOP, EROFS, ENAMETOOLONG}) {
    EXPECT_TRUE(ProblemAt("/a", error).isPermanent) << error;
  }
  EXPECT_EQ(ProblemAt("/a", ENOSPC).text, "/a: No space left on device");
  EXPECT_TRUE(StartProblem().IsNone());
}

TEST(IndexResultTest, ADatabaseThatIsInUseOrFullMayBecomeUsable) {
  for (const int code :
       {SQLITE_BUSY, SQLITE_FULL, SQLITE_IOERR_READ, SQLITE_CANTOPEN, SQLITE_NOMEM, SQLITE_OK}) {
    EXPECT_FALSE((IndexResult{code, ""}.IsUnusable())) << code;
  }
  for (const int code : {SQLITE_NOTADB, SQLITE_CORRUPT_INDEX, SQLITE_READONLY_DIRECTORY,
                         SQLITE_PERM, kNewerTables}) {
    EXPECT_TRUE((IndexResult{code, ""}.IsUnusable())) << code;
  }
}

TEST(ParseWholeNumberTest, AcceptsDigitsOnly) {
  EXPECT_EQ(ParseWholeNumber("0"), 0);
  EXPECT_EQ(ParseWholeNumber("2147483647"), 2147483647);
  EXPECT_EQ(ParseWholeNumber("007"), 7);
  for (const char* wrong : {"", " 1", "1 ", "+1", "-1", "-0", "1.0", "0x1", "2147483648", "1e3"}) {
    EXPECT_EQ(ParseWholeNumber(wrong), std::nullopt) << wrong;
  }
}

TEST(ObjectionToTest, DeniesOtherUsersToSetVersions) {
  const uid_t own = geteuid();
  EXPECT_EQ(ObjectionTo(Command::kSetIndexVersion, ucred{1, 0, 5}), "");
  EXPECT_EQ(ObjectionTo(Command::kSetIndexVersion, ucred{1, own, 5}), "");
  EXPECT_NE(ObjectionTo(Command::kSetIndexVersion, ucred{1, own + 1, getegid()}), "");
  EXPECT_NE(ObjectionTo(Command::kSetIndexVersion, std::nullopt), "");
}

TEST(ObjectionToTest, AllowsEverythingElse) {
  for (const Command command :
       {Command::kGetMedia, Command::kGetIndexVersion, Command::kIsPhotoConvertDisabled,
        Command::kIsVideoConvertDisabled, Command::kPostPhotoConvert, Command::kPostVideoConvert}) {
    EXPECT_EQ(ObjectionTo(command, ucred{1, geteuid() + 1, 5}), "") << CommandName(command);
  }
}

TEST(RateLimitTest, LetsABurstPassInEachPeriod) {
  const RateLimit::Clock::time_point begin = RateLimit::Clock::now();
  RateLimit limit(2, std::chrono::seconds(10));
  int heldBack = 0;
  EXPECT_TRUE(limit.Pass(begin, heldBack));
  EXPECT_TRUE(limit.Pass(begin, heldBack));
  EXPECT_FALSE(limit.Pass(begin, heldBack));
  EXPECT_FALSE(limit.Pass(begin + std::chrono::seconds(9), heldBack));
  EXPECT_EQ(heldBack, 0);
  EXPECT_TRUE(limit.Pass(begin + std::chrono::seconds(10), heldBack));
  EXPECT_EQ(heldBack, 2);
  EXPECT_TRUE(limit.Pass(begin + std::chrono::seconds(11), heldBack));
  EXPECT_EQ(heldBack, 0);
}

}  // namespace
}  // namespace vela_test
