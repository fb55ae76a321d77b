#include "start_problem.h"

#include <cerrno>
#include <cstring>

namespace vela {

namespace {

bool IsPermanent(int error) {
  switch (error) {
    case EACCES:
    case EISDIR:
    case ELOOP:
    case ENAMETOOLONG:
    case ENOENT:
    case ENOTDIR:
    case EPERM:
    case EROFS:
      return true;
    default:
      return false;
  }
}

}  // namespace

StartProblem ProblemAt(const std::string& what, int error) {
  return {what + ": " + std::strerror(error), IsPermanent(error)};
}

}  // namespace vela
