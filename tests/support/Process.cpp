#include "support/Process.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>

#include <fcntl.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

namespace support {
namespace {

using std::chrono::steady_clock;

constexpr int kExecFailed = 127;
constexpr int kAskEveryMs = 5;

void closeDescriptor(int* descriptor) {
  if (*descriptor >= 0) ::close(*descriptor);
  *descriptor = -1;
}

/// The two ends of a pipe, closed on exec.
struct Pipe {
  int readEnd = -1;
  int writeEnd = -1;

  Pipe() {
    std::array<int, 2> ends{};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0) return;
    readEnd = ends[0];
    writeEnd = ends[1];
  }
  Pipe(const Pipe&) = delete;
  Pipe& operator=(const Pipe&) = delete;
  ~Pipe() {
    closeDescriptor(&readEnd);
    closeDescriptor(&writeEnd);
  }
  [[nodiscard]] bool valid() const { return readEnd >= 0; }
};

/// A null-terminated array of pointers into `texts`, as execve() takes it.
std::vector<char*> pointers(std::vector<std::string>* texts) {
  std::vector<char*> result;
  for (std::string& text : *texts) result.push_back(text.data());
  result.push_back(nullptr);
  return result;
}

/// All that the child needs, made before fork(): between fork() and execve() nothing may allocate.
struct Prepared {
  explicit Prepared(const Command& command) : program(command.program), folder(command.folder) {
    words.push_back(command.name.empty() ? command.program : command.name);
    words.insert(words.end(), command.arguments.begin(), command.arguments.end());
    for (const auto& [name, value] : command.environment) settings.push_back(name + "=" + value);
    argv = pointers(&words);
    envp = pointers(&settings);
  }

  std::string program;
  std::string folder;
  std::vector<std::string> words;
  std::vector<std::string> settings;
  std::vector<char*> argv;
  std::vector<char*> envp;
};

/// The child's side. Reports the error through `failure`, which a successful execve() closes.
[[noreturn]] void runChild(const Prepared& prepared, int input, int output, int errors, int failure) {
  ::setpgid(0, 0);
  ::prctl(PR_SET_PDEATHSIG, SIGKILL);
  ::signal(SIGPIPE, SIG_DFL);
  sigset_t none;
  sigemptyset(&none);
  ::sigprocmask(SIG_SETMASK, &none, nullptr);
  const bool ready = ::dup2(input, STDIN_FILENO) >= 0 && ::dup2(output, STDOUT_FILENO) >= 0 &&
                     ::dup2(errors, STDERR_FILENO) >= 0 &&
                     (prepared.folder.empty() || ::chdir(prepared.folder.c_str()) == 0);
  if (ready) ::execve(prepared.program.c_str(), prepared.argv.data(), prepared.envp.data());
  const int error = errno;
  (void)!::write(failure, &error, sizeof(error));
  ::_exit(kExecFailed);
}

void setNonBlocking(int descriptor) {
  ::fcntl(descriptor, F_SETFL, ::fcntl(descriptor, F_GETFL) | O_NONBLOCK);
}

int millisecondsUntil(steady_clock::time_point until) {
  const auto left = std::chrono::ceil<std::chrono::milliseconds>(until - steady_clock::now()).count();
  return static_cast<int>(std::clamp<decltype(left)>(left, 0, 60'000));
}

}  // namespace

std::string Outcome::describe() const {
  switch (end) {
    case End::kExited:
      return "exit status " + std::to_string(status);
    case End::kSignalled:
      return "signal " + std::to_string(status);
    case End::kTimedOut:
      return "timed out";
    case End::kNotStarted:
      break;
  }
  return std::string("not started: ") + std::strerror(status);
}

std::vector<std::pair<std::string, std::string>> inherited(const std::vector<std::string>& names) {
  std::vector<std::pair<std::string, std::string>> result;
  for (const std::string& name : names) {
    if (const char* value = std::getenv(name.c_str())) result.emplace_back(name, value);
  }
  return result;
}

std::vector<std::pair<std::string, std::string>> sanitizerEnvironment() {
  return inherited({"ASAN_OPTIONS", "LSAN_OPTIONS", "UBSAN_OPTIONS", "TSAN_OPTIONS"});
}

Process::~Process() {
  if (running()) {
    ::kill(-pid_, SIGKILL);
    reap(true);
  }
  closePipes();
}

bool Process::start(const Command& command) {
  outcome_ = Outcome{};
  pendingInput_ = command.input;
  begin_ = steady_clock::now();
  Prepared prepared(command);
  Pipe input;
  Pipe output;
  Pipe errors;
  Pipe failure;
  if (!input.valid() || !output.valid() || !errors.valid() || !failure.valid()) {
    outcome_.status = errno;
    return false;
  }
  const pid_t child = ::fork();
  if (child < 0) {
    outcome_.status = errno;
    return false;
  }
  if (child == 0) runChild(prepared, input.readEnd, output.writeEnd, errors.writeEnd, failure.writeEnd);

  closeDescriptor(&failure.writeEnd);
  int error = 0;
  if (::read(failure.readEnd, &error, sizeof(error)) == static_cast<ssize_t>(sizeof(error))) {
    ::waitpid(child, nullptr, 0);
    outcome_.status = error;
    return false;
  }
  pid_ = child;
  processDescriptor_ = static_cast<int>(::syscall(SYS_pidfd_open, child, 0));
  input_ = std::exchange(input.writeEnd, -1);
  output_ = std::exchange(output.readEnd, -1);
  errors_ = std::exchange(errors.readEnd, -1);
  for (const int descriptor : {input_, output_, errors_}) setNonBlocking(descriptor);
  if (pendingInput_.empty()) closeDescriptor(&input_);
  return true;
}

bool Process::signal(int number) { return running() && ::kill(pid_, number) == 0; }

bool Process::waitForText(const std::string& text, std::chrono::milliseconds deadline) {
  const auto until = steady_clock::now() + deadline;
  for (;;) {
    if ((outcome_.output + outcome_.errors).find(text) != std::string::npos) return true;
    if (!running() || steady_clock::now() >= until) return false;
    exchange(until);
  }
}

const Outcome& Process::wait(std::chrono::milliseconds deadline) {
  const auto until = steady_clock::now() + deadline;
  while (running() && steady_clock::now() < until) exchange(until);
  if (running()) {
    ::kill(-pid_, SIGKILL);
    reap(true);
    outcome_.end = Outcome::End::kTimedOut;
    outcome_.status = 0;
  }
  return outcome_;
}

void Process::exchange(Instant until) {
  std::array<pollfd, 4> polled{
      {{processDescriptor_, POLLIN, 0}, {output_, POLLIN, 0}, {errors_, POLLIN, 0}, {input_, POLLOUT, 0}}};
  // Without a process descriptor (old kernels, emulators) the end of the program has to be asked for.
  const bool asking = processDescriptor_ < 0;
  const int timeoutMs = asking ? std::min(kAskEveryMs, millisecondsUntil(until)) : millisecondsUntil(until);
  if (::poll(polled.data(), polled.size(), timeoutMs) < 0) return;
  if (polled[1].revents != 0) takeOutput(&output_, &outcome_.output);
  if (polled[2].revents != 0) takeOutput(&errors_, &outcome_.errors);
  if (polled[3].revents != 0 && !feedInput()) closeDescriptor(&input_);
  if (asking || polled[0].revents != 0) reap(false);
}

bool Process::feedInput() {
  // A program may end without reading its input; the write then fails instead of killing the test.
  struct sigaction ignore {};
  struct sigaction previous {};
  ignore.sa_handler = SIG_IGN;
  ::sigaction(SIGPIPE, &ignore, &previous);
  const ssize_t count = ::write(input_, pendingInput_.data(), pendingInput_.size());
  const int error = errno;
  ::sigaction(SIGPIPE, &previous, nullptr);
  if (count > 0) pendingInput_.erase(0, static_cast<std::size_t>(count));
  return !pendingInput_.empty() && (count >= 0 || error == EAGAIN || error == EINTR);
}

void Process::takeOutput(int* descriptor, std::string* text) {
  std::array<char, 65536> block;
  for (;;) {
    const ssize_t count = ::read(*descriptor, block.data(), block.size());
    if (count > 0) {
      text->append(block.data(), static_cast<std::size_t>(count));
      continue;
    }
    if (count < 0 && errno == EINTR) continue;
    if (count == 0 || errno != EAGAIN) closeDescriptor(descriptor);
    return;
  }
}

void Process::reap(bool hang) {
  int status = 0;
  rusage usage{};
  if (::wait4(pid_, &status, hang ? 0 : WNOHANG, &usage) != pid_) return;
  outcome_.wall = std::chrono::duration_cast<std::chrono::microseconds>(steady_clock::now() - begin_);
  outcome_.peakMemoryKiB = usage.ru_maxrss;
  outcome_.end = WIFEXITED(status) ? Outcome::End::kExited : Outcome::End::kSignalled;
  outcome_.status = WIFEXITED(status) ? WEXITSTATUS(status) : WTERMSIG(status);
  pid_ = -1;
  // What it wrote last is still in the pipes. A child that it left behind may hold them open: no waiting for
  // that.
  if (output_ >= 0) takeOutput(&output_, &outcome_.output);
  if (errors_ >= 0) takeOutput(&errors_, &outcome_.errors);
  closePipes();
}

void Process::closePipes() {
  for (int* descriptor : {&processDescriptor_, &input_, &output_, &errors_}) closeDescriptor(descriptor);
}

Outcome run(const Command& command, std::chrono::milliseconds deadline) {
  Process process;
  if (!process.start(command)) return process.wait(std::chrono::milliseconds(0));
  return process.wait(deadline);
}

}  // namespace support
