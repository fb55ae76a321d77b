// A terminal without a screen: what a program writes to it is read by the test.
#pragma once

#include <string>

#include "support/descriptor.h"

namespace vela_test {

class Terminal {
 public:
  explicit Terminal(int columns);

  /// The side that a program uses as its standard output.
  int ProgramSide() const { return programSide_.Get(); }

  /// Waits until `text` has been written, at most `milliseconds`; returns whether it was.
  bool WaitForText(const std::string& text, int milliseconds = 20000);

  /// Everything written so far, newlines as a terminal gets them ("\r\n").
  std::string Written();

 private:
  void Read(int milliseconds);

  Descriptor testSide_;
  Descriptor programSide_;
  std::string written_;
};

}  // namespace vela_test
