#include "decoding/webp_frame.h"

#include <algorithm>
#include <cstdint>
#include <vector>

#include "decoding/file_input.h"
#include "process/source_file.h"

namespace vela {

namespace {

std::vector<uint8_t> ReadStart(int descriptor) {
  std::vector<uint8_t> bytes(
      static_cast<size_t>(std::clamp(SizeOf(descriptor), int64_t{0}, FileInput::kMaxBytes)));
  FileInput input(descriptor);
  bytes.resize(static_cast<size_t>(input.Read(bytes.data(), static_cast<int>(bytes.size()))));
  return bytes;
}

WebpFrame KindOf(const VipsLibrary& vips, const WebPDemuxer* file, const WebPIterator& frame) {
  const uint32_t width = vips.getWebpNumber(file, WEBP_FF_CANVAS_WIDTH);
  const uint32_t height = vips.getWebpNumber(file, WEBP_FF_CANVAS_HEIGHT);
  if (frame.complete == 0 || static_cast<uint32_t>(frame.width) != width ||
      static_cast<uint32_t>(frame.height) != height) {
    return WebpFrame::kUnsupported;
  }
  return frame.has_alpha != 0 ? WebpFrame::kTransparent : WebpFrame::kOpaque;
}

}  // namespace

WebpFrame ReadFirstWebpFrame(const VipsLibrary& vips, int descriptor) {
  const std::vector<uint8_t> bytes = ReadStart(descriptor);
  const WebPData data = {bytes.data(), bytes.size()};
  constexpr int kPartial = 1;
  WebPDemuxState state = WEBP_DEMUX_PARSE_ERROR;
  WebPDemuxer* const file = vips.openWebp(&data, kPartial, &state, WEBP_DEMUX_ABI_VERSION);
  if (file == nullptr) {
    return WebpFrame::kUnsupported;
  }
  WebpFrame kind = WebpFrame::kUnsupported;
  WebPIterator frame = {};
  if (vips.getWebpFrame(file, 1, &frame) != 0) {
    kind = KindOf(vips, file, frame);
    vips.releaseWebpFrame(&frame);
  }
  vips.closeWebp(file);
  return kind;
}

}  // namespace vela
