#include "index_writer.h"

#include <algorithm>
#include <ctime>
#include <iterator>

#include "answer.h"
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

/// A version that is lost in a power failure cannot be determined again, unlike everything else in
/// the index.
bool MustBeDurable(const Job& job) {
  return job.request.command == Command::kSetIndexVersion;
}

Answer OverdueAnswer() {
  return IndexAnswer({SQLITE_BUSY, "other writers held it for too long"});
}

}  // namespace

IndexResult IndexWriter::Store(Position first, Position end) const {
  return index_.Change(first->arrival + timeout_, std::any_of(first, end, MustBeDurable),
                       [first, end](IndexConnection& connection) {
                         IndexResult result;
                         for (auto job = first; result.IsOk() && job != end; ++job) {
                           result = StoreOne(connection, job->request);
                         }
                         return result;
                       });
}

/// Fails the jobs that have reached the timeout. Returns the first one that has not.
IndexWriter::Position IndexWriter::FailOverdue(Position first, Position end) const {
  const Clock::time_point now = Clock::now();
  while (first != end && now - first->arrival >= timeout_) {
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
    // The first job has reached the timeout, though perhaps not to the millisecond.
    first->answer = OverdueAnswer();
    first = FailOverdue(std::next(first), jobs.end());
  }
}

void IndexWriter::CarryOut(std::list<Job>& jobs) const {
  try {
    CarryOutFrom(jobs.begin(), jobs);
  } catch (...) {
    // The reply lines of the jobs remain empty, which means out of memory.
    return;
  }
}

}  // namespace vela
