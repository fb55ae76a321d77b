#include "index_writer.h"

#include <algorithm>
#include <ctime>
#include <iterator>

#include "index_answer.h"
#include "index_path.h"
#include "platform/velaindex.h"

namespace vela {

namespace {

IndexResult StoreOne(IndexConnection& connection, const Request& request) {
  if (request.command == Command::kSetIndexVersion) {
    return connection.StoreVersion(PlainPath(request.path), request.version);
  }
  const bool isPhoto = request.command == Command::kPostPhotoConvert;
  const int kind = isPhoto ? THUMB_TYPE_PHOTO : THUMB_TYPE_VIDEO;
  return connection.StorePosted(request.path, kind, std::time(nullptr));
}

/// A version cannot be had again from anywhere when the power fails, unlike all else in the index.
bool NeedsDisk(const Job& job) {
  return job.request.command == Command::kSetIndexVersion;
}

Answer OverdueAnswer() {
  return IndexAnswer({SQLITE_BUSY, "other writers kept it for too long"});
}

}  // namespace

IndexResult IndexWriter::Store(Position first, Position end) const {
  return index_.Change(first->arrival + patience_, std::any_of(first, end, NeedsDisk),
                       [first, end](IndexConnection& connection) {
                         IndexResult result;
                         for (auto job = first; result.IsOk() && job != end; ++job) {
                           result = StoreOne(connection, job->request);
                         }
                         return result;
                       });
}

/// Returns the first job that has time left.
IndexWriter::Position IndexWriter::FailOverdue(Position first, Position end) const {
  const Clock::time_point now = Clock::now();
  while (first != end && now - first->arrival >= patience_) {
    first->answer = OverdueAnswer();
    ++first;
  }
  return first;
}

void IndexWriter::CarryOutFrom(Position first, std::list<Job>& jobs) const {
  first = FailOverdue(first, jobs.end());
  while (first != jobs.end()) {
    const IndexResult result = Store(first, jobs.end());
    if (!result.IsBusy()) {
      const Answer answer = IndexAnswer(result);
      std::for_each(first, jobs.end(), [&answer](Job& job) { job.answer = answer; });
      return;
    }
    // Its time is over, to the millisecond perhaps.
    first->answer = OverdueAnswer();
    first = FailOverdue(std::next(first), jobs.end());
  }
}

void IndexWriter::CarryOut(std::list<Job>& jobs) const {
  try {
    CarryOutFrom(jobs.begin(), jobs);
  } catch (...) {
    // Empty lines, as the jobs have them from the beginning, stand for the want of memory.
    return;
  }
}

}  // namespace vela
