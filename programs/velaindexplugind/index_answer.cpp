#include "index_answer.h"

#include <string>

#include "reply.h"

namespace vela {

Answer IndexAnswer(const IndexResult& result) {
  if (result.IsOk()) return {SuccessReply(), Outcome::kDone, {}};
  const std::string error = "index database: " + result.message;
  return {FailureReply(error), Outcome::kFault, error};
}

}  // namespace vela
