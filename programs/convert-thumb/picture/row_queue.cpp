#include "picture/row_queue.h"

#include <algorithm>
#include <exception>
#include <system_error>

#include "process/worker_threads.h"

namespace vela {

namespace {

/// The threads synchronise once per batch.
constexpr size_t kBatchRows = 8;
constexpr size_t kRows = 4 * kBatchRows;

}  // namespace

RowQueue::RowQueue(size_t rowSize, RowSink& next) : rowSize_(rowSize), next_(next) {
  if (HasSecondProcessor()) {
    rows_.resize(rowSize * kRows);
    StartThread();
  }
}

RowQueue::~RowQueue() {
  StopThread(false);
}

bool RowQueue::Put(const float* row) {
  if (!thread_.joinable()) {
    return next_.Put(row);
  }
  if (filled_ % kBatchRows == 0 && !WaitForRoom()) {
    return false;
  }
  std::copy_n(row, rowSize_, Row(filled_));
  ++filled_;
  if (filled_ % kBatchRows == 0) {
    {
      const std::lock_guard<std::mutex> lock(mutex_);
      ready_ = filled_;
    }
    changed_.notify_all();
  }
  return true;
}

bool RowQueue::Finish() {
  StopThread(true);
  return !failed_;
}

void RowQueue::StartThread() {
  try {
    thread_ = std::thread([this] { ProcessRows(); });
  } catch (const std::system_error&) {
    // Put then calls the next step directly.
  }
}

void RowQueue::StopThread(bool finish) {
  if (!thread_.joinable()) {
    return;
  }
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    ready_ = filled_;
    finished_ = finish;
    stopped_ = !finish;
  }
  changed_.notify_all();
  thread_.join();
}

bool RowQueue::WaitForRoom() {
  std::unique_lock<std::mutex> lock(mutex_);
  changed_.wait(lock, [this] { return failed_ || filled_ + kBatchRows <= processed_ + kRows; });
  return !failed_;
}

void RowQueue::ProcessRows() noexcept {
  size_t row = 0;
  for (size_t end = WaitForRows(row); end > row; end = WaitForRows(row)) {
    const bool taken = ProcessBatch(row, end);
    row = end;
    {
      const std::lock_guard<std::mutex> lock(mutex_);
      processed_ = row;
      failed_ = !taken;
    }
    changed_.notify_all();
    if (!taken) {
      return;
    }
  }
}

size_t RowQueue::WaitForRows(size_t next) {
  std::unique_lock<std::mutex> lock(mutex_);
  changed_.wait(lock, [&] { return stopped_ || finished_ || ready_ > next; });
  return stopped_ ? next : std::min(ready_, next + kBatchRows);
}

bool RowQueue::ProcessBatch(size_t begin, size_t end) {
  try {
    for (size_t row = begin; row < end; ++row) {
      if (!next_.Put(Row(row))) {
        return false;
      }
    }
    return true;
  } catch (const std::exception&) {
    return false;
  }
}

float* RowQueue::Row(size_t number) {
  return rows_.data() + number % kRows * rowSize_;
}

}  // namespace vela
