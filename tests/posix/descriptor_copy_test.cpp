// Copying from one descriptor to another.
#include "posix/descriptor_copy.h"

#include <fcntl.h>

#include <cerrno>
#include <limits>
#include <string>

#include "posix/file_descriptor.h"
#include "support/files.h"
#include "support/quiet_test.h"

using namespace vela;

namespace vela_test {
namespace {

class DescriptorCopy : public QuietTest {
 protected:
  /// Copies a file of `size` bytes to /tmp/copy.
  static CopyResult Copy(size_t size, int64_t limit) {
    WriteFile("/tmp/original", std::string(size, 'x'));
    const FileDescriptor from(open("/tmp/original", O_RDONLY | O_CLOEXEC));
    const FileDescriptor to(open("/tmp/copy", O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600));
    return CopyDescriptor(from.Get(), to.Get(), limit);
  }
};

TEST_F(DescriptorCopy, IsComplete) {
  for (const int64_t limit : {int64_t{10000}, std::numeric_limits<int64_t>::max()}) {
    const CopyResult result = Copy(10000, limit);
    EXPECT_EQ(result.end, CopyEnd::kComplete);
    EXPECT_EQ(result.total, 10000);
    EXPECT_EQ(ReadFile("/tmp/copy"), std::string(10000, 'x'));
  }
}

TEST_F(DescriptorCopy, EndsAtItsLimit) {
  const CopyResult result = Copy(10000, 9999);
  EXPECT_EQ(result.end, CopyEnd::kWriteFailed);
  EXPECT_EQ(result.error, EFBIG);
  EXPECT_LE(FileSize("/tmp/copy"), 9999);
}

}  // namespace
}  // namespace vela_test
