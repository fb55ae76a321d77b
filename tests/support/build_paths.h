// Paths of the build and the source tree inside the sandbox.
#pragma once

#include <string>

namespace vela_test {

/// The program under test, `velathumb`.
std::string VelathumbPath();

/// The recording stub that replaces the external tools.
std::string StubToolPath();

/// The project's own converter, `convert-thumb`.
std::string OwnConverterPath();

/// The top folder of the source tree.
std::string SourceDirectory();

/// The folder with real camera files; empty when this machine has none.
std::string SharedMediaDirectory();

}  // namespace vela_test
