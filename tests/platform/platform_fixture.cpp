#include "platform/platform_fixture.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/time.h>
#include <sys/wait.h>

#include <csignal>
#include <cstdio>
#include <fstream>

#include "support/descriptor.h"

namespace vela_test {

namespace {

/// Reads state and parent from the process's line in the process table.
bool IsZombieOf(const std::string& pid, pid_t parent) {
  std::ifstream file("/proc/" + pid + "/stat");
  std::string line;
  std::getline(file, line);
  const size_t end = line.rfind(')');
  if (end == std::string::npos || end + 4 >= line.size() || line[end + 2] != 'Z') return false;
  return std::stoi(line.substr(end + 4)) == parent;
}

size_t CountDescriptors() {
  return ListDirectory("/proc/self/fd").size();
}

}  // namespace

pid_t Fork(const std::function<int()>& call) {
  const pid_t pid = fork();
  if (pid == 0) _exit(call());
  return pid;
}

int Join(pid_t pid) {
  int status = 0;
  while (waitpid(pid, &status, 0) < 0) {
    if (errno != EINTR) return -1000;
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
}

int RunForked(const std::function<int()>& call) {
  return Join(Fork(call));
}

int RunWithin(int seconds, const std::function<int()>& call) {
  return RunForked([&] {
    alarm(static_cast<unsigned>(seconds));  // its signal ends the process
    return call();
  });
}

int RunInterrupted(const std::function<int()>& call) {
  return RunForked([&] {
    struct sigaction action = {};
    action.sa_handler = [](int) {};
    sigaction(SIGALRM, &action, nullptr);
    const itimerval often = {{0, 2000}, {0, 2000}};
    setitimer(ITIMER_REAL, &often, nullptr);
    return call();
  });
}

void InOwnProcess(const std::function<void()>& calls) {
  const int result = RunForked([&] {
    calls();
    fflush(stdout);
    return testing::Test::HasFailure() ? 1 : 0;
  });
  EXPECT_EQ(result, 0);
}

std::string PrintedBy(const std::function<void()>& calls) {
  InOwnProcess([&] {
    ASSERT_NE(freopen("/tmp/printed", "w", stderr), nullptr);
    calls();
    fflush(stderr);
  });
  return ReadFile("/tmp/printed");
}

int RunAgainstLock(const std::string& file, const std::function<int()>& call,
                   const std::function<void()>& meanwhile) {
  Descriptor holder(open(file.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600));
  EXPECT_EQ(flock(holder.Get(), LOCK_EX), 0);
  const pid_t caller = Fork([&] {
    holder.Close();  // otherwise the forked process would keep the lock
    return call();
  });
  usleep(100000);
  meanwhile();
  holder.Close();
  return Join(caller);
}

void RunInThreads(int count, const std::function<void(int)>& call) {
  std::vector<std::thread> threads;
  threads.reserve(static_cast<size_t>(count));
  for (int thread = 0; thread < count; ++thread) threads.emplace_back(call, thread);
  for (std::thread& thread : threads) thread.join();
}

bool WaitUntil(const std::function<bool()>& condition) {
  for (int i = 0; i < 500 && !condition(); ++i) usleep(10000);
  return condition();
}

bool WaitUntilEnded(pid_t pid) {
  return WaitUntil([pid] { return kill(pid, 0) != 0; });
}

int CountZombies() {
  int count = 0;
  for (const std::string& name : ListDirectory("/proc")) {
    const bool isPid = name.find_first_not_of("0123456789") == std::string::npos;
    if (isPid && IsZombieOf(name, getpid())) ++count;
  }
  return count;
}

void ExpectNoDescriptorLeak(const std::function<void()>& calls) {
  const size_t before = CountDescriptors();
  calls();
  EXPECT_EQ(CountDescriptors(), before);
}

double Stopwatch::Seconds() const {
  return std::chrono::duration<double>(std::chrono::steady_clock::now() - start_).count();
}

void Stopwatch::ExpectBetween(double atLeast, double lessThan) const {
  const double seconds = Seconds();
  EXPECT_GE(seconds, atLeast);
  EXPECT_LT(seconds, lessThan);
}

}  // namespace vela_test
