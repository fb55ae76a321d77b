// Passes rows to the next step in a separate thread.
#pragma once

#include <condition_variable>
#include <cstddef>
#include <mutex>
#include <thread>
#include <vector>

#include "picture/rows.h"

namespace vela {

class RowQueue final : public RowSink {
 public:
  /// `rowSize`: samples in a row. `next` must outlive this object and not be used by other code
  /// until Finish. With a single processor, Put calls `next` directly.
  RowQueue(size_t rowSize, RowSink& next);
  ~RowQueue() override;
  RowQueue(const RowQueue&) = delete;
  RowQueue& operator=(const RowQueue&) = delete;

  bool Put(const float* row) override;

  /// Waits until the last row has been processed. Returns false when a row was rejected.
  bool Finish();

 private:
  void StartThread();
  void StopThread(bool finish);
  bool WaitForRoom();
  void ProcessRows() noexcept;
  size_t WaitForRows(size_t next);
  bool ProcessBatch(size_t begin, size_t end);
  float* Row(size_t number);

  size_t rowSize_;
  std::vector<float> rows_;
  RowSink& next_;
  size_t filled_ = 0;  ///< rows written

  std::mutex mutex_;  ///< guards everything below except the thread itself
  std::condition_variable changed_;
  size_t ready_ = 0;  ///< rows that can be processed
  size_t processed_ = 0;
  bool finished_ = false;
  bool stopped_ = false;
  bool failed_ = false;
  std::thread thread_;
};

}  // namespace vela
