// Passes rows on in a thread of its own.
#pragma once

#include <condition_variable>
#include <cstddef>
#include <mutex>
#include <thread>
#include <vector>

#include "picture/row_sink.h"

namespace vela {

class RowQueue final : public RowSink {
 public:
  /// `rowSize`: samples a row. `next` has to outlive this and is used by nobody else until Finish.
  /// With one processor only, rows are passed on by Put.
  RowQueue(size_t rowSize, RowSink& next);
  ~RowQueue() override;
  RowQueue(const RowQueue&) = delete;
  RowQueue& operator=(const RowQueue&) = delete;

  bool Put(const float* row) override;

  /// Waits until the last row has been passed on. False when a row was refused.
  bool Finish();

 private:
  void StartThread();
  void EndThread(bool finish);
  bool WaitForRoom();
  void PassRowsOn() noexcept;
  size_t WaitForRows(size_t next);
  bool PassOn(size_t begin, size_t end);
  float* Row(size_t number);

  size_t rowSize_;
  std::vector<float> rows_;
  RowSink& next_;
  size_t filled_ = 0;  ///< rows written

  std::mutex mutex_;  ///< of all below but the thread itself
  std::condition_variable changed_;
  size_t given_ = 0;  ///< rows that can be passed on
  size_t passed_ = 0;
  bool finished_ = false;
  bool stopped_ = false;
  bool failed_ = false;
  std::thread thread_;
};

}  // namespace vela
