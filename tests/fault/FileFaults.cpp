#include "fault/FileFaults.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <climits>
#include <csignal>
#include <cstdint>
#include <string_view>

#include <elf.h>
#include <fcntl.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/uio.h>
#include <sys/user.h>
#include <sys/wait.h>
#include <unistd.h>

#include "support/TemporaryFolder.h"

namespace fault {
namespace {

/// Where a call says which file it is about.
enum class Names { kDescriptor, kPath, kPathAtFolder, kOpenPath, kOpenAtFolder };

struct WatchedCall {
  long number;
  const char* name;
  Names names;
};

constexpr WatchedCall kWatched[] = {
    {SYS_write, "write", Names::kDescriptor},
    {SYS_writev, "writev", Names::kDescriptor},
    {SYS_pwrite64, "pwrite", Names::kDescriptor},
    {SYS_ftruncate, "ftruncate", Names::kDescriptor},
    {SYS_fsync, "fsync", Names::kDescriptor},
    {SYS_fdatasync, "fdatasync", Names::kDescriptor},
    {SYS_openat, "openat", Names::kOpenAtFolder},
    {SYS_mkdirat, "mkdirat", Names::kPathAtFolder},
    {SYS_unlinkat, "unlinkat", Names::kPathAtFolder},
    {SYS_renameat2, "renameat2", Names::kPathAtFolder},
#ifdef SYS_renameat
    {SYS_renameat, "renameat", Names::kPathAtFolder},
#endif
#ifdef SYS_open
    {SYS_open, "open", Names::kOpenPath},
    {SYS_mkdir, "mkdir", Names::kPath},
    {SYS_unlink, "unlink", Names::kPath},
    {SYS_rename, "rename", Names::kPath},
#endif
};

/// In the program that is to be traced, before it starts: only the calls of kWatched stop it.
bool installFilter() {
  std::array<sock_filter, 2 * std::size(kWatched) + 2> code{};
  std::size_t at = 0;
  code[at++] = BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr));
  for (const WatchedCall& call : kWatched) {
    code[at++] = BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, static_cast<std::uint32_t>(call.number), 0, 1);
    code[at++] = BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_TRACE);
  }
  code[at++] = BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW);
  const sock_fprog program{static_cast<unsigned short>(at), code.data()};
  return ::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
         ::prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) == 0;
}

/// The calling thread's registers as far as a call needs them.
class CallRegisters {
 public:
  explicit CallRegisters(pid_t thread) : thread_(thread) {
    iovec area{&registers_, sizeof(registers_)};
    valid_ = ::ptrace(PTRACE_GETREGSET, thread_, NT_PRSTATUS, &area) == 0;
  }
  [[nodiscard]] bool valid() const { return valid_; }
#if defined(__x86_64__)
  [[nodiscard]] long number() const { return static_cast<long>(registers_.orig_rax); }
  [[nodiscard]] std::uint64_t argument(int index) const {
    return index == 0 ? registers_.rdi : index == 1 ? registers_.rsi : registers_.rdx;
  }
  /// The call is not made and returns -`error`.
  [[nodiscard]] bool fail(int error) {
    registers_.orig_rax = static_cast<std::uint64_t>(-1);
    registers_.rax = static_cast<std::uint64_t>(-error);
    return store();
  }
  [[nodiscard]] bool setThirdArgument(std::uint64_t value) {
    registers_.rdx = value;
    return store();
  }
#elif defined(__aarch64__)
  [[nodiscard]] long number() const { return static_cast<long>(registers_.regs[8]); }
  [[nodiscard]] std::uint64_t argument(int index) const { return registers_.regs[index]; }
  [[nodiscard]] bool fail(int error) {
    int none = -1;
    iovec area{&none, sizeof(none)};
    registers_.regs[0] = static_cast<std::uint64_t>(-error);
    return ::ptrace(PTRACE_SETREGSET, thread_, NT_ARM_SYSTEM_CALL, &area) == 0 && store();
  }
  [[nodiscard]] bool setThirdArgument(std::uint64_t value) {
    registers_.regs[2] = value;
    return store();
  }
#else
#error "this machine's system call registers are not known here"
#endif

 private:
  [[nodiscard]] bool store() {
    iovec area{&registers_, sizeof(registers_)};
    return ::ptrace(PTRACE_SETREGSET, thread_, NT_PRSTATUS, &area) == 0;
  }

  pid_t thread_;
  bool valid_ = false;
  user_regs_struct registers_{};
};

std::string textAt(pid_t thread, std::uint64_t address) {
  std::string text;
  char piece[64];
  while (text.size() < PATH_MAX) {
    iovec here{piece, sizeof(piece)};
    iovec there{reinterpret_cast<void*>(address), sizeof(piece)};
    const ssize_t got = ::process_vm_readv(thread, &here, 1, &there, 1, 0);
    if (got <= 0) return text;
    const std::string_view part(piece, static_cast<std::size_t>(got));
    text += part.substr(0, part.find('\0'));
    if (part.find('\0') != std::string_view::npos) return text;
    address += static_cast<std::uint64_t>(got);
  }
  return text;
}

std::string descriptorPath(pid_t thread, std::uint64_t descriptor) {
  char path[PATH_MAX];
  const std::string link = "/proc/" + std::to_string(thread) + "/fd/" + std::to_string(descriptor);
  const ssize_t length = ::readlink(link.c_str(), path, sizeof(path));
  return length < 0 ? std::string() : std::string(path, static_cast<std::size_t>(length));
}

bool canBeShort(const CallRegisters& registers) {
  const bool isWrite = registers.number() == SYS_write || registers.number() == SYS_pwrite64;
  return isWrite && registers.argument(2) > 1;
}

std::uint64_t openFlags(const WatchedCall& call, const CallRegisters& registers) {
  return registers.argument(call.names == Names::kOpenAtFolder ? 2 : 1);
}

std::string pathOf(const WatchedCall& call, pid_t thread, const CallRegisters& registers) {
  switch (call.names) {
    case Names::kDescriptor:
      return descriptorPath(thread, registers.argument(0));
    case Names::kPath:
    case Names::kOpenPath:
      return textAt(thread, registers.argument(0));
    case Names::kPathAtFolder:
    case Names::kOpenAtFolder:
      return textAt(thread, registers.argument(1));
  }
  return {};
}

/// A folder that is there is not made, nor is a file that is there created.
bool changesSomething(const WatchedCall& call, const CallRegisters& registers, const std::string& path) {
  struct stat information {};
  const bool exists = ::lstat(path.c_str(), &information) == 0;
  const std::string_view name(call.name);
  if (name.starts_with("mkdir")) return !exists;
  if (name.starts_with("unlink")) return exists;
  if (!name.starts_with("open")) return true;
  const std::uint64_t flags = openFlags(call, registers);
  return (flags & O_TRUNC) != 0 || ((flags & O_CREAT) != 0 && !exists);
}

/// Follows the traced program to its end.
class Tracer {
 public:
  Tracer(pid_t process, const std::filesystem::path& root, const std::vector<std::string>& ignored,
         const FileFaultOrder& order, FaultedRun* run)
      : process_(process), root_(root.string() + "/"), ignored_(ignored), order_(order), run_(*run) {}

  void Follow() {
    for (;;) {
      int status = 0;
      const pid_t thread = ::waitpid(-1, &status, __WALL);
      if (thread < 0) return;
      if (WIFEXITED(status) || WIFSIGNALED(status)) {
        if (thread == process_ && ended(status)) return;
        continue;
      }
      (void)::ptrace(PTRACE_CONT, thread, nullptr, signalAt(thread, status));
    }
  }

 private:
  /// Handles a stop; the signal that the thread is to get when it goes on.
  long signalAt(pid_t thread, int status) {
    const int event = status >> 16;
    if (event == PTRACE_EVENT_SECCOMP) onCall(thread);
    if (event != 0) return 0;
    const int signal = WSTOPSIG(status);
    // A new thread begins with a stop of its own.
    return signal == SIGSTOP || signal == SIGTRAP ? 0 : signal;
  }

  bool ended(int status) {
    if (WIFEXITED(status)) run_.status = WEXITSTATUS(status);
    if (WIFSIGNALED(status)) {
      run_.status = WTERMSIG(status);
      run_.crashed = !run_.killed;
    }
    return true;
  }

  void onCall(pid_t thread) {
    CallRegisters registers(thread);
    if (!registers.valid()) return;
    const auto* const call =
        std::find_if(std::begin(kWatched), std::end(kWatched),
                     [&](const WatchedCall& each) { return each.number == registers.number(); });
    if (call == std::end(kWatched)) return;
    const std::string path = pathOf(*call, thread, registers);
    if (path.compare(0, root_.size(), root_) != 0) return;
    const std::string name = path.substr(root_.size());
    if (std::find(ignored_.begin(), ignored_.end(), name) != ignored_.end()) return;
    if (!changesSomething(*call, registers, path)) return;
    if (order_.fault == FileFault::kShortWrite && !canBeShort(registers)) return;
    const std::size_t index = run_.calls.size();
    run_.calls.push_back({call->name, name});
    strike(index, &registers);
  }

  void strike(std::size_t index, CallRegisters* registers) {
    if (index < order_.at) return;
    const bool isIt = index == order_.at;
    switch (order_.fault) {
      case FileFault::kNone:
        return;
      case FileFault::kKill:
        run_.killed = run_.killed || (isIt && ::kill(process_, SIGKILL) == 0);
        return;
      case FileFault::kNoSpace: {
        // What frees room still works.
        const std::string& name = run_.calls.back().name;
        if (name == "unlink" || name == "unlinkat" || name == "ftruncate") return;
        (void)registers->fail(ENOSPC);
        return;
      }
      case FileFault::kIoError:
        if (isIt) (void)registers->fail(EIO);
        return;
      case FileFault::kShortWrite:
        if (isIt) (void)registers->setThirdArgument(registers->argument(2) / 2);
        return;
    }
  }

  const pid_t process_;
  const std::string root_;
  const std::vector<std::string>& ignored_;
  const FileFaultOrder order_;
  FaultedRun& run_;
};

/// In the new process. Does not return.
[[noreturn]] void becomeProgram(const std::vector<char*>& argv, const std::vector<char*>& environment,
                                const std::string& output) {
  const int file = ::open(output.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
  if (file < 0 || ::dup2(file, STDOUT_FILENO) < 0 || ::dup2(file, STDERR_FILENO) < 0) ::_exit(126);
  if (::ptrace(PTRACE_TRACEME, 0, nullptr, nullptr) != 0) ::_exit(127);
  (void)::raise(SIGSTOP);
  if (!installFilter()) ::_exit(127);
  ::execve(argv.front(), argv.data(), environment.data());
  ::_exit(126);
}

std::vector<char*> pointersTo(std::vector<std::string>* texts) {
  std::vector<char*> pointers;
  for (std::string& text : *texts) pointers.push_back(text.data());
  pointers.push_back(nullptr);
  return pointers;
}

}  // namespace

std::optional<FaultedRun> runWithFileFault(
    const std::vector<std::string>& arguments,
    const std::vector<std::pair<std::string, std::string>>& environment, const std::filesystem::path& root,
    const std::vector<std::string>& ignored, const FileFaultOrder& order) {
  const support::TemporaryFolder folder;
  const std::string output = folder.path() / "output";
  std::vector<std::string> words = arguments;
  std::vector<std::string> variables;
  for (const auto& [name, value] : environment) variables.push_back(name + "=" + value);
  const std::vector<char*> argv = pointersTo(&words);
  const std::vector<char*> envp = pointersTo(&variables);

  const pid_t process = ::fork();
  if (process < 0) return std::nullopt;
  if (process == 0) becomeProgram(argv, envp, output);
  int status = 0;
  if (::waitpid(process, &status, 0) != process || !WIFSTOPPED(status)) return std::nullopt;
  constexpr long kOptions =
      PTRACE_O_EXITKILL | PTRACE_O_TRACESECCOMP | PTRACE_O_TRACECLONE | PTRACE_O_TRACEEXEC;
  if (::ptrace(PTRACE_SETOPTIONS, process, nullptr, kOptions) != 0) {
    ::kill(process, SIGKILL);
    (void)::waitpid(process, &status, 0);
    return std::nullopt;
  }
  FaultedRun run;
  Tracer tracer(process, root, ignored, order, &run);
  (void)::ptrace(PTRACE_CONT, process, nullptr, 0L);
  tracer.Follow();
  run.output = support::readFile(output).value_or("");
  // The filter cannot be had where a sandbox forbids it.
  if (run.status == 127 && run.calls.empty() && run.output.empty()) return std::nullopt;
  return run;
}

}  // namespace fault
