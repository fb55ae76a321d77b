// Decodes a photo in a separate thread, a few rows ahead of the thread that scales it.
#pragma once

#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <mutex>
#include <thread>
#include <vector>

#include "decoding/photo_reader.h"
#include "picture/rows.h"

namespace vela {

class RowsAhead final : public RowSource {
 public:
  /// `reader`: has been started. Until this object is destroyed, other code may only query its
  /// sizes.
  explicit RowsAhead(PhotoReader& reader);
  ~RowsAhead() override;
  RowsAhead(const RowsAhead&) = delete;
  RowsAhead& operator=(const RowsAhead&) = delete;

  int Width() const override { return reader_.Width(); }
  int Height() const override { return reader_.Height(); }
  int Channels() const override { return reader_.Channels(); }
  bool ReadRow(float* row) override;

  /// Returns the memory in bytes of the buffered rows for a reader that has been started.
  static size_t Memory(const PhotoReader& reader);

 private:
  void StartThread();
  void Work() noexcept;
  void DecodeBatches();
  bool WaitForRoom(int batch);
  bool DecodeBatch(int batch);
  bool DecodeRows(int batch);
  bool WaitForBatch(int batch);
  uint8_t* Row(int y);

  PhotoReader& reader_;
  size_t rowSize_;   ///< samples
  size_t rowBytes_;  ///< as decoded
  std::vector<uint8_t> rows_;
  int next_ = 0;  ///< row to be read

  std::mutex mutex_;  ///< guards everything below except the thread itself
  std::condition_variable changed_;
  int decoded_ = 0;   ///< number of batches that can be read
  int released_ = 0;  ///< number of batches that have been read
  bool failed_ = false;
  bool stopped_ = false;
  std::thread thread_;
};

}  // namespace vela
