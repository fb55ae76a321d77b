#include "answer.h"

#include "image_size.h"
#include "input_stream.h"
#include "orientation.h"

namespace vela {

HeaderAnswer Answer(const HeaderQuestion& question, const FileDescriptor& file) {
  HeaderAnswer answer;
  const InputStream stream(file.Get());
  if (!stream.IsOpen()) {
    return answer;
  }
  switch (question.topic) {
    case HeaderTopic::kImageSize:
      answer.isRead = ReadImageSize(stream.Get(), answer.width, answer.height) ? 1 : 0;
      break;
    case HeaderTopic::kExifOrientation:
      answer.isRead = ReadOrientation(stream.Get(), answer.orientation) ? 1 : 0;
      break;
  }
  return answer;
}

}  // namespace vela
