#include "decoding/jpeg_source.h"

#include "process/source_file.h"

#include <jerror.h>

namespace vela {

namespace {

JpegSource& SourceOf(j_decompress_ptr info) {
  return *reinterpret_cast<JpegSource*>(info->src);
}

void Start(j_decompress_ptr info) {
  SourceOf(info).started = false;
}

boolean Fill(j_decompress_ptr info) {
  JpegSource& source = SourceOf(info);
  int64_t count = ReadSome(source.descriptor, source.buffer, kJpegSourceBuffer);
  if (count < 0 || (count == 0 && !source.started)) {
    ERREXIT(info, JERR_INPUT_EMPTY);
  }
  if (count == 0) {
    WARNMS(info, JWRN_JPEG_EOF);
    source.buffer[0] = 0xFF;
    source.buffer[1] = JPEG_EOI;
    count = 2;
  }
  source.started = true;
  source.manager.next_input_byte = source.buffer;
  source.manager.bytes_in_buffer = static_cast<size_t>(count);
  return TRUE;
}

void Skip(j_decompress_ptr info, long count) {
  jpeg_source_mgr& manager = SourceOf(info).manager;
  size_t left = count > 0 ? static_cast<size_t>(count) : 0;
  while (left > manager.bytes_in_buffer) {
    left -= manager.bytes_in_buffer;
    Fill(info);
  }
  manager.next_input_byte += left;
  manager.bytes_in_buffer -= left;
}

void End(j_decompress_ptr) {}

}  // namespace

void ReadJpegFrom(JpegSource& source, int descriptor, jpeg_decompress_struct& info) {
  source.descriptor = descriptor;
  source.started = false;
  source.manager = {};
  source.manager.init_source = Start;
  source.manager.fill_input_buffer = Fill;
  source.manager.skip_input_data = Skip;
  source.manager.resync_to_restart = jpeg_resync_to_restart;
  source.manager.term_source = End;
  info.src = &source.manager;
}

}  // namespace vela
