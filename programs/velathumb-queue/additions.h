// The entries that are added to the queue from the command line.
#pragma once

#include <string>
#include <vector>

namespace vela {

/// Makes the paths of the entries absolute. Returns false when one cannot be added, which is
/// logged.
bool CheckAdditions(std::vector<std::string>& entries);

/// Appends the entries to the queue. Returns true when all of them are on the disk; otherwise the
/// reason is logged.
bool AppendEntries(const std::vector<std::string>& entries);

/// Returns what is said about entries that were appended, such as "queued R:/srv/photos".
std::string DescribeAdditions(const std::vector<std::string>& entries);

/// Returns the text for the errno value `error` of an attempt to do `what`, such as "add to the
/// queue": when only another user may do that, who may and what else can be done.
std::string DescribeRefusal(const std::string& what, int error);

}  // namespace vela
