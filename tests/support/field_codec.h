// Lists of byte strings as one byte string: how plans and call records are kept in files.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

namespace vela_test {

/// Each field as its length, ':' and its bytes.
std::string EncodeFields(const std::vector<std::string>& fields);

/// Takes the next field off `text` from `position`, which moves behind it; false at the end and at
/// anything that is no whole field.
bool NextField(const std::string& text, size_t* position, std::string* field);

/// All fields; what is no whole field ends the list.
std::vector<std::string> DecodeFields(const std::string& text);

}  // namespace vela_test
