// Batches of requests that write to the index.
#include "index_writer.h"

#include <list>

#include "index_daemon.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;
using Clock = IndexWriter::Clock;

constexpr std::chrono::milliseconds kTimeout(300);

class IndexWriterTest : public IndexDaemonTest {
 protected:
  IndexStore index_ = IndexStore({kIndexDatabase, std::nullopt});
  IndexWriter writer_ = IndexWriter(index_, kTimeout);
};

void AddJob(std::list<Job>& jobs, Command command, const std::string& path, Clock::duration age) {
  jobs.emplace_back();
  jobs.back().request.command = command;
  jobs.back().request.path = path;
  jobs.back().request.version = 4;
  jobs.back().arrival = Clock::now() - age;
}

TEST_F(IndexWriterTest, StoresEachRequest) {
  std::list<Job> jobs;
  AddJob(jobs, Command::kPostPhotoConvert, "/a.jpg", {});
  AddJob(jobs, Command::kSetIndexVersion, "/photos/", {});
  AddJob(jobs, Command::kPostVideoConvert, "/b.mp4", {});
  IndexWriter(index_, std::chrono::minutes(1)).CarryOut(jobs);
  for (const Job& job : jobs) EXPECT_EQ(job.answer.outcome, Outcome::kDone) << job.answer.line;
  EXPECT_EQ(Query("SELECT CAST(path AS TEXT), kind FROM posted ORDER BY 1"),
            (Rows{"/a.jpg|1", "/b.mp4|2"}));
  EXPECT_EQ(Query("SELECT CAST(path AS TEXT), version FROM directory_index_version"),
            Rows{"/photos|4"});
}

TEST_F(IndexWriterTest, FailsOnlyThoseThatHaveWaitedTooLong) {
  std::list<Job> jobs;
  AddJob(jobs, Command::kPostPhotoConvert, "/late.jpg", std::chrono::minutes(2));
  AddJob(jobs, Command::kPostPhotoConvert, "/a.jpg", {});
  IndexWriter(index_, std::chrono::minutes(1)).CarryOut(jobs);
  EXPECT_EQ(jobs.front().answer.outcome, Outcome::kFault);
  EXPECT_THAT(jobs.front().answer.line, HasSubstr("other writers held it for too long"));
  EXPECT_EQ(jobs.back().answer.outcome, Outcome::kDone);
  EXPECT_EQ(Query("SELECT CAST(path AS TEXT) FROM posted"), Rows{"/a.jpg"});
}

TEST_F(IndexWriterTest, WaitsForAllRequestsTogether) {
  ASSERT_TRUE(index_.Open().IsOk());
  IndexHolder holder;
  std::list<Job> jobs;
  for (int i = 0; i < 100; ++i) AddJob(jobs, Command::kPostPhotoConvert, "/a.jpg", {});
  const auto begin = Clock::now();
  writer_.CarryOut(jobs);
  EXPECT_GE(Clock::now() - begin, kTimeout / 2);
  EXPECT_LT(Clock::now() - begin, kTimeout * 40);
  for (const Job& job : jobs) EXPECT_EQ(job.answer.outcome, Outcome::kFault);
  holder.Release();
  EXPECT_EQ(Query("SELECT count(*) FROM posted"), Rows{"0"});
}

TEST_F(IndexWriterTest, StoresNothingOfATransactionThatFails) {
  ASSERT_TRUE(index_.Open().IsOk());
  Query(
      "CREATE TRIGGER fail BEFORE INSERT ON posted WHEN NEW.kind = 2 "
      "BEGIN SELECT RAISE(ABORT, 'no room'); END");
  std::list<Job> jobs;
  AddJob(jobs, Command::kPostPhotoConvert, "/a.jpg", {});
  AddJob(jobs, Command::kPostVideoConvert, "/b.mp4", {});
  IndexWriter(index_, std::chrono::minutes(1)).CarryOut(jobs);
  for (const Job& job : jobs) EXPECT_THAT(job.answer.line, HasSubstr("no room"));
  EXPECT_EQ(Query("SELECT count(*) FROM posted"), Rows{"0"});
}

}  // namespace
}  // namespace vela_test
