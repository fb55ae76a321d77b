#include "likeness/source.h"

#include <cctype>

namespace vela_test {

void PrintTo(const LikenessSource& source, std::ostream* out) {
  *out << source.format << ", " << source.description;
}

std::string TestNameOf(const LikenessSource& source) {
  std::string name;
  for (const char letter : source.format + "_" + source.description) {
    const bool isPlain = std::isalnum(static_cast<unsigned char>(letter)) != 0;
    if (isPlain || (!name.empty() && name.back() != '_')) {
      name += isPlain ? letter : '_';
    }
  }
  return name;
}

}  // namespace vela_test
