#include "tests/crash/stepper.h"

#include <fcntl.h>
#include <sys/ptrace.h>
#include <sys/syscall.h>
#include <sys/user.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <csignal>
#include <cstddef>
#include <cstring>
#include <stdexcept>

namespace test {
namespace {

#if defined(__x86_64__)
constexpr bool kKnowsRegisters = true;
constexpr std::size_t kNumberRegister = offsetof(user_regs_struct, orig_rax);
constexpr std::size_t kResultRegister = offsetof(user_regs_struct, rax);
constexpr std::array<std::size_t, 6> kArgumentRegisters = {
    offsetof(user_regs_struct, rdi), offsetof(user_regs_struct, rsi),
    offsetof(user_regs_struct, rdx), offsetof(user_regs_struct, r10),
    offsetof(user_regs_struct, r8),  offsetof(user_regs_struct, r9)};
#else
constexpr bool kKnowsRegisters = false;
constexpr std::size_t kNumberRegister = 0;
constexpr std::size_t kResultRegister = 0;
constexpr std::array<std::size_t, 6> kArgumentRegisters = {};
#endif

constexpr std::uint64_t kNoCall = ~std::uint64_t{0};  // the number of a call that is not made

void SetRegister(pid_t thread, std::size_t offset, std::uint64_t value) {
  ptrace(PTRACE_POKEUSER, thread, offset, value);
}

std::uint64_t FailureResult(int error) {
  return static_cast<std::uint64_t>(-static_cast<std::int64_t>(error));
}

// Where a call names its file. Calls that are not here name it by a descriptor, their first
// argument.
bool NamesFileFirst(long number) {
  switch (number) {
    case SYS_chdir:
    case SYS_chroot:
#if defined(__x86_64__)
    case SYS_open:
    case SYS_stat:
    case SYS_lstat:
    case SYS_access:
    case SYS_unlink:
    case SYS_rename:
    case SYS_mkdir:
    case SYS_rmdir:
    case SYS_chmod:
    case SYS_readlink:
#endif
      return true;
    default:
      return false;
  }
}

bool NamesFileSecond(long number) {
  switch (number) {
    case SYS_openat:
    case SYS_newfstatat:
    case SYS_unlinkat:
    case SYS_mkdirat:
    case SYS_faccessat:
    case SYS_faccessat2:
    case SYS_readlinkat:
    case SYS_fchmodat:
    case SYS_renameat:
    case SYS_renameat2:
    case SYS_statx:
      return true;
    default:
      return false;
  }
}

// Whether the first argument is no descriptor and the call concerns no file.
bool NamesNoFile(long number) {
  switch (number) {
    case SYS_read:
    case SYS_write:
    case SYS_pread64:
    case SYS_pwrite64:
    case SYS_writev:
    case SYS_fsync:
    case SYS_fdatasync:
    case SYS_close:
    case SYS_getdents64:
    case SYS_fchmod:
    case SYS_ftruncate:
    case SYS_flock:
    case SYS_fcntl:
    case SYS_lseek:
    case SYS_fstat:
      return false;
    default:
      return true;
  }
}

}  // namespace

std::string Stepper::Refusal() {
  if (!kKnowsRegisters) return "needs x86-64: the registers of other processors are not known here";
  const pid_t child = fork();
  if (child == 0) _exit(ptrace(PTRACE_TRACEME, 0, nullptr, nullptr) == 0 ? 0 : 1);
  int status = 0;
  waitpid(child, &status, 0);
  return status == 0 ? "" : "needs ptrace, which this system does not allow";
}

void Stepper::Mark() { syscall(SYS_kill, getpid(), SIGSTOP); }

End Stepper::Run(const std::function<void()>& run, const Decide& decide) {
  decide_ = &decide;
  marks_ = 0;
  looks_ = false;
  killed_ = false;
  threads_.clear();
  process_ = fork();
  if (process_ < 0) throw std::runtime_error("cannot fork");
  if (process_ == 0) {
    if (ptrace(PTRACE_TRACEME, 0, nullptr, nullptr) != 0) _exit(127);
    Mark();
    run();
    _exit(0);
  }
  Attach();
  for (;;) {
    int status = 0;
    // Its threads too, but none of the processes that other threads of this one wait for.
    const pid_t thread = waitpid(-1, &status, __WALL | __WNOTHREAD);
    if (thread < 0 && errno == EINTR) continue;
    if (thread < 0) throw std::runtime_error("the traced process is gone");
    if (WIFSTOPPED(status)) {
      OnStop(thread, status);
    } else if (thread == process_) {
      return {killed_, status};
    }
  }
}

// The first stop is at the mark before `run`.
void Stepper::Attach() {
  int status = 0;
  if (waitpid(process_, &status, __WALL) != process_ || !WIFSTOPPED(status)) {
    throw std::runtime_error("the process cannot be traced");
  }
  ptrace(PTRACE_SETOPTIONS, process_, nullptr,
         PTRACE_O_TRACESYSGOOD | PTRACE_O_EXITKILL | PTRACE_O_TRACECLONE | PTRACE_O_TRACEEXEC);
  Resume(process_, 0);
}

void Stepper::OnStop(pid_t thread, int status) {
  const int signal = WSTOPSIG(status);
  if (signal == (SIGTRAP | 0x80)) {
    OnCall(thread);
    return;
  }
  const bool event = status >> 16 != 0;
  // A new thread begins with a stop; the first one stops at a mark.
  const bool own = signal == SIGSTOP;
  if (own && thread == process_) looks_ = ++marks_ == 1;
  Resume(thread, event || own ? 0 : signal);
}

void Stepper::OnCall(pid_t thread) {
  __ptrace_syscall_info info{};
  if (ptrace(PTRACE_GET_SYSCALL_INFO, thread, sizeof(info), &info) <= 0) return;  // it is dying
  if (info.op == PTRACE_SYSCALL_INFO_EXIT) {
    Leave(thread);
  } else if (looks_ && info.op == PTRACE_SYSCALL_INFO_ENTRY && info.entry.nr != SYS_kill) {
    SystemCall call;
    call.number = static_cast<long>(info.entry.nr);
    std::copy_n(info.entry.args, call.arguments.size(), call.arguments.begin());
    call.thread = thread;
    Enter(call);
  }
  if (!killed_) Resume(thread, 0);
}

void Stepper::Enter(const SystemCall& call) {
  const Step step = (*decide_)(call);
  if (step.last) looks_ = false;
  switch (step.kind) {
    case Step::kGoOn:
      return;
    case Step::kKill:
      killed_ = true;
      kill(process_, SIGKILL);
      return;
    case Step::kFail:
      SetRegister(call.thread, kNumberRegister, kNoCall);
      break;
    case Step::kFailAfterwards:
      break;
    case Step::kReplaceArgument:
      SetRegister(call.thread, kArgumentRegisters[step.argument], step.value);
      return;
  }
  threads_[call.thread] = {step, true};
}

void Stepper::Leave(pid_t thread) {
  Thread& state = threads_[thread];
  if (!state.awaits_return) return;
  state.awaits_return = false;
  SetRegister(thread, kResultRegister, FailureResult(state.at_return.error));
}

// Until the first mark and after the last step the process need not stop at every call.
void Stepper::Resume(pid_t thread, int signal) {
  const bool stop_at_calls = looks_ || threads_[thread].awaits_return;
  ptrace(stop_at_calls ? PTRACE_SYSCALL : PTRACE_CONT, thread, nullptr, signal);
}

std::string Stepper::PathOf(const SystemCall& call) const {
  if (NamesFileFirst(call.number)) return TextAt(call.thread, call.arguments[0]);
  if (!NamesFileSecond(call.number)) {
    return NamesNoFile(call.number) ? "" : FileOf(call.arguments[0]);
  }
  const std::string name = TextAt(call.thread, call.arguments[1]);
  if (!name.empty() && name[0] == '/') return name;
  if (static_cast<int>(call.arguments[0]) == AT_FDCWD) return name;
  const std::string directory = FileOf(call.arguments[0]);
  return name.empty() ? directory : directory + "/" + name;
}

// Only a thread that is stopped shows the memory of its process.
std::string Stepper::TextAt(pid_t thread, std::uint64_t address) {
  std::string text;
  for (; text.size() < PATH_MAX; address += sizeof(long)) {
    errno = 0;
    const long word = ptrace(PTRACE_PEEKDATA, thread, address, nullptr);
    if (errno != 0) break;
    std::array<char, sizeof(long)> bytes{};
    std::memcpy(bytes.data(), &word, sizeof(long));
    const std::size_t size = strnlen(bytes.data(), bytes.size());
    text.append(bytes.data(), size);
    if (size < bytes.size()) break;
  }
  return text;
}

std::string Stepper::FileOf(std::uint64_t descriptor) const {
  const std::string link =
      "proc/" + std::to_string(process_) + "/fd/" + std::to_string(static_cast<int>(descriptor));
  std::array<char, PATH_MAX> path{};
  const ssize_t size = readlinkat(outside_root_, link.c_str(), path.data(), path.size());
  return size < 0 ? "" : std::string(path.data(), static_cast<std::size_t>(size));
}

}  // namespace test
