// Answers that tell how an operation on the index ended.
#pragma once

#include "answer.h"
#include "index_connection.h"

namespace vela {

/// Returns the plain success, or the index's fault. Throws only std::bad_alloc.
Answer IndexAnswer(const IndexResult& result);

}  // namespace vela
