#include "decoding/rows_ahead.h"

#include <algorithm>
#include <exception>
#include <system_error>

#include "picture/sample_loops.h"
#include "process/worker_threads.h"

namespace vela {

namespace {

/// The threads synchronise once per batch.
constexpr int kBatchRows = 32;
constexpr int kBatches = 3;

}  // namespace

RowsAhead::RowsAhead(PhotoReader& reader)
    : reader_(reader),
      rowSize_(static_cast<size_t>(reader.Width()) * static_cast<size_t>(reader.Channels())),
      rowBytes_(rowSize_ * reader.SampleSize()),
      rows_(Memory(reader)) {
  if (HasSecondProcessor()) {
    StartThread();
  }
}

RowsAhead::~RowsAhead() {
  if (!thread_.joinable()) {
    return;
  }
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    stopped_ = true;
  }
  changed_.notify_all();
  thread_.join();
}

void RowsAhead::StartThread() {
  try {
    thread_ = std::thread([this] { Work(); });
  } catch (const std::system_error&) {
    // ReadRow then decodes the rows itself.
  }
}

bool RowsAhead::ReadRow(float* row) {
  if (thread_.joinable() ? next_ % kBatchRows == 0 && !WaitForBatch(next_ / kBatchRows)
                         : !reader_.ReadRow(Row(next_))) {
    return false;
  }
  if (reader_.SampleSize() == sizeof(uint8_t)) {
    WidenRow(Row(next_), row, rowSize_);
  } else {
    WidenRow(reinterpret_cast<const uint16_t*>(Row(next_)), row, rowSize_);
  }
  ++next_;
  return true;
}

uint8_t* RowsAhead::Row(int y) {
  return rows_.data() + static_cast<size_t>(y % (kBatchRows * kBatches)) * rowBytes_;
}

size_t RowsAhead::Memory(const PhotoReader& reader) {
  return static_cast<size_t>(reader.Width()) * static_cast<size_t>(reader.Channels()) *
         reader.SampleSize() * kBatchRows * kBatches;
}

void RowsAhead::Work() noexcept {
  DecodeBatches();
  reader_.LeaveThread();
}

void RowsAhead::DecodeBatches() {
  const int batches = (Height() + kBatchRows - 1) / kBatchRows;
  for (int batch = 0; batch < batches && WaitForRoom(batch); ++batch) {
    const bool decoded = DecodeBatch(batch);
    {
      const std::lock_guard<std::mutex> lock(mutex_);
      decoded_ += decoded ? 1 : 0;
      failed_ = !decoded;
    }
    changed_.notify_all();
    if (!decoded) {
      return;
    }
  }
}

bool RowsAhead::WaitForRoom(int batch) {
  std::unique_lock<std::mutex> lock(mutex_);
  changed_.wait(lock, [&] { return stopped_ || batch < released_ + kBatches; });
  return !stopped_;
}

bool RowsAhead::DecodeBatch(int batch) {
  try {
    return DecodeRows(batch);
  } catch (const std::exception&) {
    return false;
  }
}

bool RowsAhead::DecodeRows(int batch) {
  const int end = std::min((batch + 1) * kBatchRows, Height());
  for (int y = batch * kBatchRows; y < end; ++y) {
    if (!reader_.ReadRow(Row(y))) {
      return false;
    }
  }
  return true;
}

bool RowsAhead::WaitForBatch(int batch) {
  std::unique_lock<std::mutex> lock(mutex_);
  released_ = batch;
  changed_.notify_all();
  changed_.wait(lock, [&] { return failed_ || decoded_ > batch; });
  return decoded_ > batch;
}

}  // namespace vela
