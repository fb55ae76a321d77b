// Rows that a second thread decodes.

#include "decoding/rows_ahead.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <new>
#include <vector>

#include "process/worker_threads.h"

using namespace vela;

namespace {

constexpr int kWidth = 7;
constexpr int kHeight = 300;

/// Each row's samples are its number; the row `failing` throws.
class NumberedRows final : public PhotoReader {
 public:
  explicit NumberedRows(int failing = kHeight) : failing_(failing) {}

  bool ReadHeader() override { return true; }
  PictureSize FullSize() const override { return {kWidth, kHeight}; }
  const PhotoTraits& Traits() const override { return traits_; }
  bool Start(PictureSize) override { return true; }
  bool IsReduced() const override { return false; }
  int Width() const override { return kWidth; }
  int Height() const override { return kHeight; }
  int Channels() const override { return 1; }
  size_t SampleSize() const override { return 1; }
  bool ReadRow(uint8_t* row) override {
    if (next_ == failing_) {
      throw std::bad_alloc();
    }
    std::fill_n(row, kWidth, static_cast<uint8_t>(next_++ % 256));
    return true;
  }
  void LeaveThread() override { ++threadsLeft; }
  const char* Error() const override { return ""; }

  std::atomic<int> threadsLeft{0};

 private:
  PhotoTraits traits_;
  int failing_;
  int next_ = 0;
};

/// Number of rows that can be read before a failure.
int CountRows(RowsAhead& rows) {
  std::vector<float> row(kWidth);
  int count = 0;
  try {
    while (count < kHeight && rows.ReadRow(row.data())) {
      EXPECT_EQ(row[0], static_cast<float>(count % 256 * kJpegStep));
      ++count;
    }
  } catch (const std::bad_alloc&) {
    // With one processor, ReadRow throws the exception.
    EXPECT_FALSE(HasSecondProcessor());
  }
  return count;
}

TEST(RowsAheadOfTheScaler, AreAllRowsInOrder) {
  NumberedRows reader;
  RowsAhead rows(reader);
  EXPECT_EQ(CountRows(rows), kHeight);
}

TEST(RowsAheadOfTheScaler, EndWhereDecodingRunsOutOfMemory) {
  NumberedRows reader(150);
  RowsAhead rows(reader);
  EXPECT_LE(CountRows(rows), 150);
}

TEST(RowsAheadOfTheScaler, LetTheReaderLeaveTheirThread) {
  for (const int failing : {0, 150, kHeight}) {
    NumberedRows reader(failing);
    {
      RowsAhead rows(reader);
      CountRows(rows);
    }
    EXPECT_EQ(reader.threadsLeft, HasSecondProcessor() ? 1 : 0);
  }
}

}  // namespace
