// Rows that a second thread passes on.

#include "picture/row_queue.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <new>
#include <numeric>
#include <vector>

#include "process/worker_threads.h"

using namespace vela;

namespace {

/// Keeps the first sample of every row, up to a row that it rejects.
class FirstSamples final : public RowSink {
 public:
  explicit FirstSamples(size_t refused = 1000) : refused_(refused) {}

  bool Put(const float* row) override {
    if (samples.size() == refused_) {
      return false;
    }
    samples.push_back(static_cast<int>(row[0]));
    return true;
  }

  std::vector<int> samples;

 private:
  size_t refused_;
};

bool PutRows(RowQueue& queue, int rows) {
  for (int y = 0; y < rows; ++y) {
    const std::vector<float> row(5, static_cast<float>(y));
    if (!queue.Put(row.data())) {
      return false;
    }
  }
  return true;
}

TEST(RowQueues, PassEveryRowOnInOrder) {
  for (const int rows : {1, 8, 100}) {
    FirstSamples sink;
    RowQueue queue(5, sink);
    EXPECT_TRUE(PutRows(queue, rows));
    EXPECT_TRUE(queue.Finish());
    std::vector<int> expected(static_cast<size_t>(rows));
    std::iota(expected.begin(), expected.end(), 0);
    EXPECT_EQ(sink.samples, expected);
  }
}

TEST(RowQueues, ReportARefusedRow) {
  FirstSamples sink(20);
  RowQueue queue(5, sink);
  EXPECT_FALSE(PutRows(queue, 500) && queue.Finish());
  EXPECT_EQ(sink.samples.size(), 20U);
}

TEST(RowQueues, ReportARefusedLastRow) {
  FirstSamples sink(20);
  RowQueue queue(5, sink);
  EXPECT_FALSE(PutRows(queue, 21) && queue.Finish());
}

class NoMemory final : public RowSink {
 public:
  bool Put(const float*) override { throw std::bad_alloc(); }
};

TEST(RowQueues, ReportExceptions) {
  NoMemory sink;
  RowQueue queue(5, sink);
  // With one processor, Put throws the exception.
  try {
    EXPECT_FALSE(PutRows(queue, 100) && queue.Finish());
  } catch (const std::bad_alloc&) {
    EXPECT_FALSE(HasSecondProcessor());
  }
}

TEST(RowQueues, EndBeforeTheirLastRow) {
  FirstSamples sink;
  {
    RowQueue queue(5, sink);
    EXPECT_TRUE(PutRows(queue, 12));
  }
  EXPECT_LE(sink.samples.size(), 12U);
}

}  // namespace
