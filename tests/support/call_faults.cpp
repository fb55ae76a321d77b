#include "support/call_faults.h"

#include <fcntl.h>
#include <limits.h>
#include <linux/seccomp.h>
#include <poll.h>
#include <signal.h>
#include <sys/eventfd.h>
#include <sys/ioctl.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <map>
#include <thread>
#include <utility>

#include "support/descriptor.h"
#include "support/environment_failure.h"
#include "support/filter_instruction.h"
#include "support/quiet_thread.h"

namespace vela_test {

namespace {

/// Announces the watched calls to the supervisor and lets all others pass.
Filter AnnouncingFilter() {
  constexpr int kIsEqual = BPF_JMP | BPF_JEQ | BPF_K;
  Filter filter = {
      Instruction(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, arch)),
      Instruction(kIsEqual, kArchitecture, 1, 0),
      Instruction(BPF_RET | BPF_K, SECCOMP_RET_ALLOW),
      Instruction(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
  };
  for (const WatchedCall& call : WatchedCalls()) {
    filter.push_back(Instruction(kIsEqual, static_cast<uint32_t>(call.number), 0, 1));
    filter.push_back(Instruction(BPF_RET | BPF_K, SECCOMP_RET_USER_NOTIF));
  }
  filter.push_back(Instruction(BPF_RET | BPF_K, SECCOMP_RET_ALLOW));
  return filter;
}

/// Sends a descriptor; async-signal-safe.
bool SendDescriptor(int socket, int descriptor) {
  char byte = 0;
  iovec data = {&byte, 1};
  alignas(cmsghdr) char control[CMSG_SPACE(sizeof descriptor)] = {};
  msghdr message = {};
  message.msg_iov = &data;
  message.msg_iovlen = 1;
  message.msg_control = control;
  message.msg_controllen = sizeof control;
  cmsghdr* const header = CMSG_FIRSTHDR(&message);
  header->cmsg_level = SOL_SOCKET;
  header->cmsg_type = SCM_RIGHTS;
  header->cmsg_len = CMSG_LEN(sizeof descriptor);
  std::memcpy(CMSG_DATA(header), &descriptor, sizeof descriptor);
  return sendmsg(socket, &message, 0) == 1;
}

/// Receives a descriptor; not open when the other side has closed the socket.
Descriptor ReceiveDescriptor(int socket) {
  char byte = 0;
  iovec data = {&byte, 1};
  int descriptor = -1;
  alignas(cmsghdr) char control[CMSG_SPACE(sizeof descriptor)] = {};
  msghdr message = {};
  message.msg_iov = &data;
  message.msg_iovlen = 1;
  message.msg_control = control;
  message.msg_controllen = sizeof control;
  if (recvmsg(socket, &message, MSG_CMSG_CLOEXEC) == 1 && CMSG_FIRSTHDR(&message) != nullptr) {
    std::memcpy(&descriptor, CMSG_DATA(CMSG_FIRSTHDR(&message)), sizeof descriptor);
  }
  return Descriptor(descriptor);
}

/// Installs the filter in the child and hands its listener to the supervisor.
int InstallFilter(Filter* filter, int socket) {
  const sock_fprog program = {static_cast<unsigned short>(filter->size()), filter->data()};
  if (prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0) {
    return errno;
  }
  const auto listener = static_cast<int>(
      syscall(SYS_seccomp, SECCOMP_SET_MODE_FILTER, SECCOMP_FILTER_FLAG_NEW_LISTENER, &program));
  if (listener < 0) {
    return errno;
  }
  return SendDescriptor(socket, listener) ? 0 : errno;
}

std::string ProcPath(pid_t task, const std::string& name) {
  return "/proc/" + std::to_string(task) + "/" + name;
}

/// The process of a task (a process or one of its threads).
pid_t ProcessOf(pid_t task) {
  const Descriptor file(open(ProcPath(task, "status").c_str(), O_RDONLY | O_CLOEXEC));
  char text[1024] = "";
  const ssize_t length = read(file.Get(), text, sizeof text - 1);
  const char* const line = length > 0 ? std::strstr(text, "\nTgid:") : nullptr;
  return line != nullptr ? std::atoi(line + 6) : task;
}

std::string TextAt(const Descriptor& memory, uint64_t address) {
  char text[PATH_MAX] = "";
  // A read stops at the end of the mapped pages.
  const ssize_t count = pread(memory.Get(), text, sizeof text - 1, static_cast<off_t>(address));
  return count > 0 ? std::string(text) : std::string();
}

/// What a descriptor of the task refers to.
std::string TargetOf(pid_t task, uint64_t descriptor) {
  char target[PATH_MAX];
  const std::string link = ProcPath(task, "fd/" + std::to_string(static_cast<int>(descriptor)));
  const ssize_t length = readlink(link.c_str(), target, sizeof target);
  return length > 0 ? std::string(target, static_cast<size_t>(length)) : std::string();
}

bool BeginsWith(const std::string& text, const char* beginning) {
  return text.compare(0, std::strlen(beginning), beginning) == 0;
}

/// Libraries, programs and the like, whose absence is no fault of the disk with the photos.
bool BelongsToTheSystem(const std::string& object) {
  for (const char* place : {"/usr/", "/lib", "/bin", "/etc/ld.so", "/proc/", "/sys/", "/dev/",
                            "/.host/", "/.build/", "/.source/", "/memfd:", "/etc/localtime"}) {
    if (BeginsWith(object, place)) {
      return true;
    }
  }
  return false;
}

/// Replaces the letters of temporary names, and the numbers of processes and pipes.
std::string WithoutRandomParts(std::string object) {
  constexpr size_t kRandomLetters = 6;
  const std::string temporary = "VELAPHOTO.tmp.";
  const size_t begin = object.find(temporary);
  if (begin != std::string::npos) {
    object.replace(begin + temporary.size(), kRandomLetters, "*");
  }
  const size_t name = object.rfind('/') + 1;
  std::string result = object.substr(0, name);
  bool inNumber = false;
  for (const char letter : object.substr(name)) {
    const bool isDigit = letter >= '0' && letter <= '9';
    if (!isDigit || !inNumber) {
      result += isDigit ? '#' : letter;
    }
    inNumber = isDigit;
  }
  return result;
}

bool IsSame(const MadeCall& a, const MadeCall& b) {
  return a.call == b.call && a.object == b.object && a.occurrence == b.occurrence;
}

const WatchedCall* FindCall(int number) {
  for (const WatchedCall& call : WatchedCalls()) {
    if (call.number == number) {
      return &call;
    }
  }
  return nullptr;
}

bool IsReady(int descriptor, short events) {
  pollfd state = {descriptor, events, 0};
  return poll(&state, 1, 0) == 1;
}

}  // namespace

class CallFaults::Supervisor {
 public:
  Supervisor(CallScope scope, const std::optional<CallFault>& fault)
      : filter_(std::make_shared<Filter>(AnnouncingFilter())),
        stop_(eventfd(0, EFD_CLOEXEC)),
        scope_(scope),
        fault_(fault) {
    int ends[2];
    if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) != 0) {
      EnvironmentFailureWithErrno("cannot make the sockets of a supervisor");
    }
    socket_ = Descriptor(ends[0]);
    childSocket_ = Descriptor(ends[1]);
    thread_ = StartQuietThread([this] { Supervise(); });
  }

  ~Supervisor() {
    WaitForEnd(60000);
    const uint64_t one = 1;
    if (write(stop_.Get(), &one, sizeof one) != sizeof one) {
      EnvironmentFailureWithErrno("cannot end a supervisor");
    }
    childSocket_.Close();
    thread_.join();
  }
  Supervisor(const Supervisor&) = delete;
  Supervisor& operator=(const Supervisor&) = delete;

  BeforeExec Step() const {
    const std::shared_ptr<Filter> filter = filter_;
    const int socket = childSocket_.Get();
    return [filter, socket] { return InstallFilter(filter.get(), socket); };
  }

  bool WaitForEnd(int milliseconds) const {
    for (int i = 0; i < milliseconds && !ended_; ++i) {
      usleep(1000);
    }
    return ended_;
  }

  const std::vector<MadeCall>& Calls() const { return calls_; }
  bool HasStruck() const { return struck_; }

 private:
  void Supervise() {
    const Descriptor listener = ReceiveDescriptor(socket_.Get());
    while (listener.IsOpen()) {
      pollfd waiting[] = {{listener.Get(), POLLIN, 0}, {stop_.Get(), POLLIN, 0}};
      if (poll(waiting, 2, -1) < 0 && errno != EINTR) {
        break;
      }
      if (waiting[1].revents != 0 || (waiting[0].revents & (POLLHUP | POLLERR)) != 0) {
        break;
      }
      if ((waiting[0].revents & POLLIN) != 0) {
        AnswerNext(listener);
      }
    }
    ended_ = true;
  }

  void AnswerNext(const Descriptor& listener) {
    seccomp_notif notification = {};
    if (ioctl(listener.Get(), SECCOMP_IOCTL_NOTIF_RECV, &notification) != 0) {
      return;  // the process has been killed meanwhile
    }
    seccomp_notif_resp response = {};
    response.id = notification.id;
    response.flags = SECCOMP_USER_NOTIF_FLAG_CONTINUE;
    Decide(notification, &response);
    if (!killed_) {
      // Fails when the process has ended meanwhile.
      ioctl(listener.Get(), SECCOMP_IOCTL_NOTIF_SEND, &response);
    }
    killed_ = false;
  }

  void Decide(const seccomp_notif& notification, seccomp_notif_resp* response) {
    const auto task = static_cast<pid_t>(notification.pid);
    const WatchedCall* const call = FindCall(notification.data.nr);
    // The exec of the program itself is the first call of all.
    program_ = program_ == 0 ? task : program_;
    const bool isProgram = task == program_ || ProcessOf(task) == program_;
    if (call == nullptr || isProgram != (scope_ == CallScope::kProgram)) {
      return;
    }
    const std::string object = WithoutRandomParts(ObjectOf(*call, task, notification.data));
    if (BelongsToTheSystem(object)) {
      return;
    }
    const MadeCall made = {call, object, occurrences_[{call, object}]++};
    calls_.push_back(made);
    if (fault_ && IsSame(made, fault_->made)) {
      Strike(*call, task, notification.data, response);
    }
  }

  static std::string ObjectOf(const WatchedCall& call, pid_t task, const seccomp_data& data) {
    std::string object;
    if (call.path >= 0 && data.args[call.path] != 0) {
      const Descriptor memory(open(ProcPath(task, "mem").c_str(), O_RDONLY | O_CLOEXEC));
      object = TextAt(memory, data.args[call.path]);
    }
    if (object.empty() && call.descriptor >= 0) {
      object = TargetOf(task, data.args[call.descriptor]);
    }
    return object;
  }

  void Strike(const WatchedCall& call, pid_t task, const seccomp_data& data,
              seccomp_notif_resp* response) {
    struck_ = true;
    if (fault_->action) {
      fault_->action();
      return;
    }
    if (fault_->kill) {
      // Without an answer the call is never made.
      killed_ = kill(ProcessOf(task), SIGKILL) == 0;
      return;
    }
    if (fault_->error == kShortTransfer) {
      struck_ = TransferHalf(call, task, data, response);
      return;
    }
    response->flags = 0;
    response->error = -fault_->error;
  }

  /// Makes the call for the process with half of its length. Returns false, with the response
  /// unchanged, when there is nothing to halve.
  static bool TransferHalf(const WatchedCall& call, pid_t task, const seccomp_data& data,
                           seccomp_notif_resp* response) {
    constexpr uint64_t kNeverBlocks = 4096;
    const uint64_t half = std::min<uint64_t>(data.args[2] / 2, kNeverBlocks);
    const bool isWrite = call.number == SYS_write || call.number == SYS_pwrite64;
    const Descriptor process(static_cast<int>(syscall(SYS_pidfd_open, ProcessOf(task), 0)));
    const Descriptor file(static_cast<int>(
        syscall(SYS_pidfd_getfd, process.Get(), static_cast<int>(data.args[0]), 0)));
    const Descriptor memory(open(ProcPath(task, "mem").c_str(), O_RDWR | O_CLOEXEC));
    if (half == 0 || !file.IsOpen() || !memory.IsOpen() ||
        !IsReady(file.Get(), isWrite ? POLLOUT : POLLIN)) {
      return false;
    }
    std::vector<char> buffer(half);
    const auto address = static_cast<off_t>(data.args[1]);
    const auto place = static_cast<off_t>(data.args[3]);
    const ssize_t length = static_cast<ssize_t>(half);
    ssize_t count = -1;
    if (isWrite) {
      if (pread(memory.Get(), buffer.data(), half, address) != length) {
        return false;
      }
      count = call.number == SYS_write ? write(file.Get(), buffer.data(), half)
                                       : pwrite(file.Get(), buffer.data(), half, place);
    } else {
      count = call.number == SYS_read ? read(file.Get(), buffer.data(), half)
                                      : pread(file.Get(), buffer.data(), half, place);
      if (count > 0 &&
          pwrite(memory.Get(), buffer.data(), static_cast<size_t>(count), address) != count) {
        EnvironmentFailureWithErrno("cannot write into a watched process");
      }
    }
    if (count < 0) {
      return false;
    }
    response->flags = 0;
    response->val = count;
    return true;
  }

  std::shared_ptr<Filter> filter_;
  Descriptor socket_;
  Descriptor childSocket_;
  Descriptor stop_;
  CallScope scope_;
  std::optional<CallFault> fault_;
  pid_t program_ = 0;
  bool killed_ = false;  // the process of the call in hand
  std::vector<MadeCall> calls_;
  std::map<std::pair<const WatchedCall*, std::string>, size_t> occurrences_;
  std::atomic<bool> struck_{false};
  std::atomic<bool> ended_{false};
  std::thread thread_;
};

CallFaults::CallFaults(CallScope scope, const std::optional<CallFault>& fault)
    : supervisor_(std::make_unique<Supervisor>(scope, fault)) {}

CallFaults::~CallFaults() = default;

BeforeExec CallFaults::Step() const {
  return supervisor_->Step();
}

bool CallFaults::WaitForEnd(int milliseconds) {
  return supervisor_->WaitForEnd(milliseconds);
}

const std::vector<MadeCall>& CallFaults::Calls() const {
  return supervisor_->Calls();
}

bool CallFaults::HasStruck() const {
  return supervisor_->HasStruck();
}

}  // namespace vela_test
