// The order of entries, and the directories they cover.
#include "entry_plan.h"

#include <gmock/gmock.h>
#include <unistd.h>

#include <chrono>
#include <optional>
#include <string>

#include "support/files.h"
#include "support/sandbox.h"

using namespace vela;

namespace vela_test {
namespace {

using std::chrono::seconds;
using namespace ::testing;

class EntryTargetTest : public SandboxTest {};

TEST_F(EntryTargetTest, IsADirectoryOrATree) {
  const struct {
    const char* entry;
    const char* directory;
    bool isTree;
  } cases[] = {
      {"/tmp", "/tmp", false},
      {"R:/tmp", "/tmp", true},
      {"/no:where", "/no:where", false},
      {"R:/no:where", "/no", true},
      {"R::/no:where", "/no", true},
      {"R:", "", true},
      {"r:/no", "r:/no", false},
      {"/no/where//", "/no/where", false},
      {"/", "/", false},
  };
  for (const auto& [entry, directory, isTree] : cases) {
    const EntryTarget target = TargetOf(entry);
    EXPECT_EQ(target.directory, directory) << entry;
    EXPECT_EQ(target.isTree, isTree) << entry;
  }
}

TEST_F(EntryTargetTest, IsTheSameForEveryName) {
  MakeDirectories("/tmp/photos/here");
  ASSERT_EQ(symlink("photos", "/tmp/alias"), 0);
  for (const char* entry : {"/tmp/photos/here", "/tmp/alias/here", "/tmp//photos/./here/",
                            "R:/tmp/alias/here", "/tmp/photos/here/../here"}) {
    EXPECT_EQ(TargetOf(entry).directory, "/tmp/photos/here") << entry;
  }
}

TEST(Overlap, IsHavingADirectoryInCommon) {
  const struct {
    EntryTarget a;
    EntryTarget b;
    bool doOverlap;
  } cases[] = {
      {{"/a", false}, {"/a", false}, true},    {{"/a", false}, {"/b", false}, false},
      {{"/a", false}, {"/a/b", false}, false}, {{"/a", true}, {"/a/b", false}, true},
      {{"/a", true}, {"/a", false}, true},     {{"/a", true}, {"/a/b", true}, true},
      {{"/a", true}, {"/ab", false}, false},   {{"/a", true}, {"/ab", true}, false},
      {{"/a/b", true}, {"/a", false}, false},  {{"/", true}, {"/a/b", false}, true},
      {{"/", false}, {"/a", true}, false},     {{"/a", true}, {"/b", true}, false},
  };
  for (const auto& [a, b, doOverlap] : cases) {
    EXPECT_EQ(DoOverlap(a, b), doOverlap) << a.directory << ' ' << b.directory;
    EXPECT_EQ(DoOverlap(b, a), doOverlap) << b.directory << ' ' << a.directory;
  }
}

class EntryPlanTest : public SandboxTest {
 protected:
  const EntryPlan::Clock::time_point now_ = EntryPlan::Clock::now();
};

TEST_F(EntryPlanTest, WithoutEntriesIsFinished) {
  EntryPlan plan({});
  EXPECT_TRUE(plan.IsFinished());
  EXPECT_EQ(plan.Start(now_), std::nullopt);
  EXPECT_EQ(plan.NextStart(), std::nullopt);
}

TEST_F(EntryPlanTest, HandsEntriesOutInTheirOrder) {
  EntryPlan plan({"/b", "/a", "/c"});
  for (const size_t number : {0U, 1U, 2U}) {
    EXPECT_THAT(plan.Start(now_), Optional(number));
  }
  EXPECT_EQ(plan.Start(now_), std::nullopt);
  EXPECT_EQ(plan.Entry(1), "/a");
  plan.Finish(1);
  plan.Finish(0);
  EXPECT_FALSE(plan.IsFinished());
  plan.Finish(2);
  EXPECT_TRUE(plan.IsFinished());
}

TEST_F(EntryPlanTest, SkipsEntriesThatOverlapWithOnesInProgress) {
  EntryPlan plan({"R:/a", "/a/b", "/b", "R:/a/b/c"});
  EXPECT_THAT(plan.Start(now_), Optional(0U));
  EXPECT_THAT(plan.Start(now_), Optional(2U));
  EXPECT_EQ(plan.Start(now_), std::nullopt);
  plan.Finish(0);
  EXPECT_THAT(plan.Start(now_), Optional(1U));
  EXPECT_THAT(plan.Start(now_), Optional(3U));
}

TEST_F(EntryPlanTest, APostponedEntryWaitsForItsTimeAndDelaysNoOther) {
  EntryPlan plan({"/a", "R:/a"});
  EXPECT_THAT(plan.Start(now_), Optional(0U));
  plan.Postpone(0, now_ + seconds(5));
  EXPECT_THAT(plan.Start(now_), Optional(1U));
  EXPECT_THAT(plan.NextStart(), Optional(now_ + seconds(5)));
  plan.Finish(1);
  EXPECT_EQ(plan.Start(now_ + seconds(4)), std::nullopt);
  EXPECT_THAT(plan.Start(now_ + seconds(5)), Optional(0U));
  EXPECT_EQ(plan.NextStart(), std::nullopt);
  EXPECT_FALSE(plan.IsFinished());
}

TEST_F(EntryPlanTest, ManyEntriesThatOverlapAreAllHandedOut) {
  constexpr size_t kCount = 5000;
  EntryPlan plan(std::vector<std::string>(kCount, "/same"));
  for (size_t i = 0; i < kCount; ++i) {
    ASSERT_THAT(plan.Start(now_), Optional(i));
    ASSERT_EQ(plan.Start(now_), std::nullopt);
    plan.Finish(i);
  }
  EXPECT_TRUE(plan.IsFinished());
}

TEST_F(EntryPlanTest, PostponedEntriesHideNoOther) {
  constexpr size_t kCount = 3000;
  std::vector<std::string> entries;
  for (size_t i = 0; i <= kCount; ++i) {
    entries.push_back('/' + std::to_string(i));
  }
  EntryPlan plan(entries);
  for (size_t i = 0; i < kCount; ++i) {
    ASSERT_THAT(plan.Start(now_), Optional(i));
    plan.Postpone(i, now_ + seconds(60));
  }
  EXPECT_THAT(plan.Start(now_), Optional(kCount));
}

TEST_F(EntryPlanTest, EntriesThatOverlapHideNoOther) {
  std::vector<std::string> entries(3000, "/same");
  entries.emplace_back("/other");
  EntryPlan plan(entries);
  EXPECT_THAT(plan.Start(now_), Optional(0U));
  EXPECT_THAT(plan.Start(now_), Optional(3000U));
}

TEST_F(EntryPlanTest, ARepeatedEntryComesAfterThoseNotStartedYet) {
  EntryPlan plan({"/a", "/b", "/c"});
  EXPECT_THAT(plan.Start(now_), Optional(0U));
  plan.Postpone(0, now_);
  for (const size_t number : {1U, 2U, 0U}) {
    EXPECT_THAT(plan.Start(now_), Optional(number));
    plan.Finish(number);
  }
  EXPECT_TRUE(plan.IsFinished());
}

TEST_F(EntryPlanTest, ReportsThePostponedEntriesWhenNoOthersAreLeft) {
  EntryPlan plan({"/a", "/b", "/c"});
  plan.Postpone(2, now_ + seconds(1));
  plan.Postpone(0, now_ + seconds(2));
  EXPECT_THAT(plan.OnlyPostponed(now_), IsEmpty());
  EXPECT_THAT(plan.Start(now_), Optional(1U));
  EXPECT_THAT(plan.OnlyPostponed(now_), IsEmpty());
  plan.Finish(1);
  EXPECT_THAT(plan.OnlyPostponed(now_), ElementsAre(0U, 2U));
  EXPECT_THAT(plan.OnlyPostponed(now_ + seconds(1)), IsEmpty());
}

}  // namespace
}  // namespace vela_test
