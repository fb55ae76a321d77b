// The recording stub: records its call, performs the test's plan, and records its end.
#include <cstdio>

#include "support/stub/call_record.h"
#include "support/stub/command_line.h"
#include "support/stub/performance.h"
#include "support/stub/plan_choice.h"
#include "support/stub_files.h"

int main(int argc, char** argv) {
  using namespace vela_test;
  const std::vector<std::string> surroundings = Surroundings();
  const StubCommandLine line = ReadCommandLine(argc, argv);
  const uint64_t number = IncrementCounter(StubToolDirectory(line.tool) + "/calls");
  const uint64_t sequence = RecordStart(line, number, surroundings);
  const auto plan = PlanFor(line, number);
  if (number == 0 || sequence == 0 || !plan) {
    std::fprintf(stderr, "stub %s: no record or no plan\n", line.tool.c_str());
    return 125;
  }
  const auto recordEnd = [sequence] { RecordEnd(sequence); };
  const int status = Performance(line, recordEnd).Perform(*plan);
  recordEnd();
  return status;
}
