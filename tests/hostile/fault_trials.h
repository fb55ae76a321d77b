// Fixture for runs in which one system call fails, of the program or of one that it starts, or in
// which something else happens at it.
#pragma once

#include <string>
#include <vector>

#include "hostile/hostile_test.h"
#include "support/call_faults.h"

namespace vela_test::hostile {

/// What happens at a call.
enum class FaultKind {
  kErrors,     ///< it fails, in each way that it can
  kKills,      ///< the process that makes it is killed
  kIncidents,  ///< Incident() happens before it
};

/// What a test varies.
struct FaultRange {
  CallScope scope = CallScope::kProgram;
  FaultKind kind = FaultKind::kErrors;
  size_t sample = 100;  ///< faults to try, unless all of them are
};

/// A fault in words, for messages.
std::string DescriptionOf(const CallFault& fault);

/// Tries a sample of all calls and errors, the same in every run unless set by
/// --gtest_random_seed=N; all of them when the environment has VELA_TEST_ROUNDS=full.
class FaultTrials : public HostileTest {
 protected:
  /// The command to disturb.
  virtual std::string Path() const = 0;
  virtual Strings Arguments() const = 0;
  /// Restores the state before the run.
  virtual void Begin() = 0;
  virtual void Incident() {}
  /// Checks the state after a run with this fault.
  virtual void Check(const CallFault& fault) = 0;
  /// Whether the fault is one of those that the test is about.
  virtual bool IsOfInterest(const MadeCall& made, int error) const;

  /// Counts the calls of an undisturbed run, then repeats the run with one fault each time.
  void TryFaults(const FaultRange& range);

 private:
  void CountCalls();
  void AddErrors(const MadeCall& made, std::vector<CallFault>* faults) const;
  std::vector<CallFault> AllFaults();
  std::vector<CallFault> Sample(std::vector<CallFault> faults) const;
  void RunWith(const CallFault& fault);

  FaultRange range_;
  std::vector<MadeCall> calls_;
  size_t occurred_ = 0;
};

}  // namespace vela_test::hostile
