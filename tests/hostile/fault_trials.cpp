#include "hostile/fault_trials.h"

#include <signal.h>

#include <algorithm>
#include <cstring>
#include <iostream>
#include <optional>
#include <random>

namespace vela_test::hostile {

namespace {

constexpr unsigned kSeed = 20261122;

/// A short test stops after so many faults with consequences.
constexpr size_t kEnough = 10;

std::string EndOf(const CallFault& fault) {
  if (fault.kill) {
    return "killed";
  }
  if (fault.action) {
    return "incident";
  }
  return fault.error == kShortTransfer ? "half done" : std::strerror(fault.error);
}

int ResultsSoFar() {
  return ::testing::UnitTest::GetInstance()->current_test_info()->result()->total_part_count();
}

}  // namespace

std::string DescriptionOf(const CallFault& fault) {
  return std::string(fault.made.call->name) + " '" + fault.made.object + "', number " +
         std::to_string(fault.made.occurrence) + ": " + EndOf(fault);
}

bool FaultTrials::IsOfInterest(const MadeCall& /*made*/, int /*error*/) const {
  return true;
}

void FaultTrials::CountCalls() {
  Begin();
  CallFaults counter(range_.scope, std::nullopt);
  ProgramOptions options;
  options.beforeExec = {counter.Step()};
  const ProgramResult result = RunProgram(Path(), Arguments(), options);
  EXPECT_EQ(result.exitCode, 0) << result.err;
  ASSERT_TRUE(counter.WaitForEnd(20000));
  calls_ = counter.Calls();
  ASSERT_FALSE(calls_.empty());
}

void FaultTrials::AddErrors(const MadeCall& made, std::vector<CallFault>* faults) const {
  for (const int error : made.call->errors) {
    if (IsOfInterest(made, error)) {
      CallFault fault;
      fault.made = made;
      fault.error = error;
      faults->push_back(fault);
    }
  }
}

std::vector<CallFault> FaultTrials::AllFaults() {
  std::vector<CallFault> faults;
  for (const MadeCall& made : calls_) {
    if (range_.kind == FaultKind::kErrors) {
      AddErrors(made, &faults);
    } else if (IsOfInterest(made, 0)) {
      CallFault fault;
      fault.made = made;
      fault.kill = range_.kind == FaultKind::kKills;
      if (!fault.kill) {
        fault.action = [this] { Incident(); };
      }
      faults.push_back(fault);
    }
  }
  return faults;
}

std::vector<CallFault> FaultTrials::Sample(std::vector<CallFault> faults) const {
  if (!IsLongRun()) {
    std::mt19937 random(kSeed + static_cast<unsigned>(GTEST_FLAG_GET(random_seed)));
    std::shuffle(faults.begin(), faults.end(), random);
    faults.resize(std::min(faults.size(), range_.sample));
  }
  return faults;
}

void FaultTrials::RunWith(const CallFault& fault) {
  CallFaults faults(range_.scope, fault);
  ProgramOptions options;
  options.beforeExec = {faults.Step()};
  options.timeLimit = kSoon;
  const ProgramResult result = RunProgram(Path(), Arguments(), options);
  EXPECT_FALSE(result.timedOut) << "still running after " << kSoon.count() << " s";
  const bool isKilled = fault.kill && faults.HasStruck() && range_.scope == CallScope::kProgram;
  EXPECT_EQ(result.signal, isKilled || result.timedOut ? SIGKILL : 0);
  EXPECT_TRUE(faults.WaitForEnd(20000)) << "something that it has started is still running";
  occurred_ += faults.HasStruck() ? 1 : 0;
}

void FaultTrials::TryFaults(const FaultRange& range) {
  range_ = range;
  ASSERT_NO_FATAL_FAILURE(CountCalls());
  const std::vector<CallFault> faults = Sample(AllFaults());
  size_t failed = 0;
  for (const CallFault& fault : faults) {
    SCOPED_TRACE(DescriptionOf(fault));
    const int results = ResultsSoFar();
    Begin();
    RunWith(fault);
    Check(fault);
    failed += ResultsSoFar() > results ? 1 : 0;
    if (failed == kEnough && !IsLongRun()) {
      break;
    }
  }
  std::cout << calls_.size() << " calls, " << AllFaults().size() << " faults, " << faults.size()
            << " tried, " << occurred_ << " occurred, " << failed << " with consequences"
            << std::endl;
  EXPECT_TRUE(occurred_ > faults.size() / 2 || failed > 0) << "most faults did not occur";
}

}  // namespace vela_test::hostile
