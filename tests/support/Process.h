// Runs programs for tests and benchmarks: arguments, environment, standard input; standard output, standard
// error and status back; always within a deadline.
#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include <sys/types.h>

namespace support {

/// What to run. The environment is exactly `environment`: nothing is inherited.
struct Command {
  std::string program;                 ///< path of the executable
  std::string name;                    ///< argv[0]; the program's path when empty
  std::vector<std::string> arguments;  ///< argv[1] and on
  std::vector<std::pair<std::string, std::string>> environment;
  std::string input;   ///< standard input; it ends after these bytes
  std::string folder;  ///< working folder; the caller's when empty
};

/// How a program ended, and what it wrote until then.
struct Outcome {
  enum class End { kExited, kSignalled, kTimedOut, kNotStarted };
  End end = End::kNotStarted;
  int status = 0;  ///< exit status 0..255 when exited, signal number when signalled, errno when not started
  std::string output;
  std::string errors;
  std::chrono::microseconds wall{};  ///< from before the start to the end
  long peakMemoryKiB = 0;            ///< largest resident set; 0 when not known

  [[nodiscard]] bool exitedWith(int wanted) const { return end == End::kExited && status == (wanted & 0xff); }
  /// "exit status 3", "signal 11", "timed out" or "not started: ...".
  [[nodiscard]] std::string describe() const;
};

/// The caller's environment variables of these names, as far as they are set: for Command::environment.
[[nodiscard]] std::vector<std::pair<std::string, std::string>> inherited(
    const std::vector<std::string>& names);

/// What the sanitizers' runtimes read; a test that starts a program built with them passes these on.
[[nodiscard]] std::vector<std::pair<std::string, std::string>> sanitizerEnvironment();

/// A program that runs beside its caller. It gets a process group of its own; the group is killed when the
/// object goes away before the program ended, and the program is killed when the calling thread ends.
class Process {
 public:
  Process() = default;
  Process(const Process&) = delete;
  Process& operator=(const Process&) = delete;
  ~Process();

  /// Starts it. False, with an outcome of kNotStarted, when the program cannot be executed.
  [[nodiscard]] bool start(const Command& command);

  /// Sends a signal to the program (not to its children). False when it has ended.
  bool signal(int number);

  /// Takes in what the program writes until its standard output and error together hold `text`, it ends, or
  /// the time is up. True in the first case.
  [[nodiscard]] bool waitForText(const std::string& text, std::chrono::milliseconds deadline);

  /// Takes in what the program writes until it ends; kills its group when the time is up.
  const Outcome& wait(std::chrono::milliseconds deadline);

  [[nodiscard]] pid_t pid() const { return pid_; }
  [[nodiscard]] bool running() const { return pid_ > 0; }

 private:
  using Instant = std::chrono::steady_clock::time_point;

  /// One round of poll() over the pipes and the program's end, at most until `until`.
  void exchange(Instant until);
  bool feedInput();
  void takeOutput(int* descriptor, std::string* text);
  void reap(bool hang);
  void closePipes();

  pid_t pid_ = -1;
  int processDescriptor_ = -1;  ///< becomes readable when the program has ended
  int input_ = -1;
  int output_ = -1;
  int errors_ = -1;
  std::string pendingInput_;
  Instant begin_{};
  Outcome outcome_;
};

/// Runs a program to its end, or kills it and its children at the deadline.
[[nodiscard]] Outcome run(const Command& command, std::chrono::milliseconds deadline);

}  // namespace support
