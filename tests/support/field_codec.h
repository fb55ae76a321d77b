// Lists of byte strings encoded as one byte string: the format of plans and call records in files.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

namespace vela_test {

/// Each field as its length, ':' and its bytes.
std::string EncodeFields(const std::vector<std::string>& fields);

/// Reads the next field of `text` at `position` and moves it after the field; false at the end and
/// at an incomplete field.
bool NextField(const std::string& text, size_t* position, std::string* field);

/// All fields up to the first incomplete one.
std::vector<std::string> DecodeFields(const std::string& text);

}  // namespace vela_test
