#include "ssc/Log.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <mutex>
#include <string_view>
#include <vector>

#include <unistd.h>

#include "ssc/DevicePath.h"
#include "ssc/WorkingFile.h"

namespace ssc {
namespace {

constexpr std::array<const char*, 5> kLevelWords{"ERROR", "WARN", "INFO", "DEBUG", "VERBOSE"};
constexpr const char* kSayWord = "SAY";
constexpr const char* kEraseLine = "\r\x1b[K";  // to the line's start, and clear to its end

/// Whether the last line has no end, as when the disk was full.
bool endsWithinLine(const std::string& path) {
  const Descriptor file = openWorkingFile(path, WorkingFileUse::kRead);
  if (!file.valid()) return false;
  const off_t size = ::lseek(file.get(), 0, SEEK_END);
  char last = '\n';
  return size > 0 && ::pread(file.get(), &last, 1, size - 1) == 1 && last != '\n';
}

/// The log file. Lines come in pieces; each whole line gets its time stamp when its newline arrives, or when
/// text of another level word cuts it short.
class LogFile {
 public:
  int open(const std::string& path) {
    close();
    Descriptor file = openWorkingFile(path, WorkingFileUse::kAppend);
    if (!file.valid()) return -errno;
    file_ = ::fdopen(file.get(), "a");
    if (file_ == nullptr) return -errno;
    (void)file.release();
    std::setvbuf(file_, nullptr, _IOLBF, BUFSIZ);
    if (endsWithinLine(path)) addRaw("\n");
    return 0;
  }

  void close() {
    if (file_ == nullptr) return;
    if (!pending_.empty()) writeLine();
    std::fclose(file_);
    file_ = nullptr;
  }

  void addRaw(std::string_view text) {
    if (file_ != nullptr) std::fwrite(text.data(), 1, text.size(), file_);
  }

  void addLines(const char* word, std::string_view text) {
    if (file_ == nullptr) return;
    if (!pending_.empty() && pendingWord_ != word) writeLine();
    pendingWord_ = word;
    while (!text.empty()) {
      const std::size_t end = text.find('\n');
      pending_.append(text.substr(0, end));
      if (end == std::string_view::npos) return;
      writeLine();
      text.remove_prefix(end + 1);
    }
  }

 private:
  void writeLine() {
    std::timespec now{};
    std::timespec_get(&now, TIME_UTC);
    std::tm utc{};
    gmtime_r(&now.tv_sec, &utc);
    std::array<char, 32> stamp{};
    std::strftime(stamp.data(), stamp.size(), "%Y-%m-%d %H:%M:%S", &utc);
    std::fprintf(file_, "%s.%03ldZ %-7s %s\n", stamp.data(), now.tv_nsec / 1'000'000, pendingWord_,
                 pending_.c_str());
    pending_.clear();
  }

  std::FILE* file_ = nullptr;
  std::string pending_;           ///< of the line that is not finished
  const char* pendingWord_ = "";  ///< one of the constants above
};

struct LogState {
  std::mutex mutex;
  std::atomic<int> level{kLogInfo};
  LogFile file;
  bool statusShown = false;
};

LogState& state() {
  static LogState instance;
  return instance;
}

std::string formatText(const char* format, std::va_list arguments) {
  std::array<char, 512> small;
  std::va_list copy;
  va_copy(copy, arguments);
  const int length = std::vsnprintf(small.data(), small.size(), format, arguments);
  std::string text;
  if (length >= 0 && static_cast<std::size_t>(length) < small.size()) {
    text.assign(small.data(), static_cast<std::size_t>(length));
  } else if (length >= 0) {
    text.resize(static_cast<std::size_t>(length) + 1);
    std::vsnprintf(text.data(), text.size(), format, copy);
    text.pop_back();
  }
  va_end(copy);
  return text;
}

/// The log's mutex is held.
void eraseStatus(LogState& log) {
  if (!log.statusShown) return;
  std::fputs(kEraseLine, stderr);
  std::fflush(stderr);
  log.statusShown = false;
}

/// The log's mutex is held.
void show(LogState& log, std::FILE* stream, const std::string& text) {
  eraseStatus(log);
  std::fwrite(text.data(), 1, text.size(), stream);
  if (text.find('\n') != std::string::npos) std::fflush(stream);
}

void logText(int level, std::string text) {
  LogState& log = state();
  const char* word = kLevelWords[static_cast<std::size_t>(std::clamp(level, kLogError, kLogVerbose))];
  if (text.empty() || text.back() != '\n') text += '\n';
  const std::string line = std::string(word) + ": " + text;
  const std::lock_guard<std::mutex> guard(log.mutex);
  show(log, level <= kLogError ? stderr : stdout, line);
  log.file.addLines(word, text);
}

}  // namespace

int openLogFile(const std::string& path) {
  LogState& log = state();
  const std::string here = devicePath(path);
  const std::lock_guard<std::mutex> guard(log.mutex);
  const int result = log.file.open(here);
  if (result != 0) {
    std::fprintf(stderr, "WARN: Unable to open the log file %s: %s\n", here.c_str(), std::strerror(-result));
  }
  return result;
}

void closeLogFile() {
  LogState& log = state();
  const std::lock_guard<std::mutex> guard(log.mutex);
  log.file.close();
}

void setLogLevel(int level) { state().level = level; }
int logLevel() { return state().level; }

void say(const char* format, ...) {
  std::va_list arguments;
  va_start(arguments, format);
  const std::string text = formatText(format, arguments);
  va_end(arguments);
  LogState& log = state();
  const std::lock_guard<std::mutex> guard(log.mutex);
  show(log, stdout, text);
  log.file.addLines(kSayWord, text);
}

void fsay(const char* format, ...) {
  std::va_list arguments;
  va_start(arguments, format);
  const std::string text = formatText(format, arguments);
  va_end(arguments);
  LogState& log = state();
  const std::lock_guard<std::mutex> guard(log.mutex);
  log.file.addRaw(text);
}

void log(int level, const char* format, ...) {
  if (level > std::max(logLevel(), kLogError)) return;
  std::va_list arguments;
  va_start(arguments, format);
  std::string text = formatText(format, arguments);
  va_end(arguments);
  logText(level, std::move(text));
}

void logFunc(const char* function, const char* marker) {
  if (logLevel() < kLogVerbose) return;
  logText(kLogVerbose, std::string(function) + " " + marker);
}

void showStatus(const std::string& text) {
  LogState& log = state();
  const std::lock_guard<std::mutex> guard(log.mutex);
  eraseStatus(log);
  if (text.empty() || ::isatty(STDERR_FILENO) == 0) return;
  std::fputs(text.c_str(), stderr);
  std::fflush(stderr);
  log.statusShown = true;
}

}  // namespace ssc
