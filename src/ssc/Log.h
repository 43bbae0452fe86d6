// What the program shows and keeps: say() for the user on standard output, log() for diagnostics, and the log
// file, which gets everything that was shown, each line with the wall-clock time (UTC) and a level word.
// Any thread may call any of these; lines of different threads are never mixed.
#pragma once

#include <string>

namespace ssc {

inline constexpr int kLogError = 0;  ///< always shown, on standard error
inline constexpr int kLogWarn = 1;   ///< this and the following on standard output
inline constexpr int kLogInfo = 2;   ///< the default level
inline constexpr int kLogDebug = 3;
inline constexpr int kLogVerbose = 4;

/// Opens the log file for appending; `path` is a device path. A file that cannot be opened is one
/// warning on standard error, and the run goes on without: 0 or the negated errno.
int openLogFile(const std::string& path);
void closeLogFile();

void setLogLevel(int level);
[[nodiscard]] int logLevel();

/// Text for the user, on standard output, exactly as it is; flushed at each line's end.
void say(const char* format, ...) __attribute__((format(printf, 1, 2)));
/// Text for the log file only, exactly as it is.
void fsay(const char* format, ...) __attribute__((format(printf, 1, 2)));
/// One diagnostic line, with the level's word in front. A newline is added when the text has none.
void log(int level, const char* format, ...) __attribute__((format(printf, 2, 3)));
/// Trace (level 4) of a handler's entry ("-->") and exit ("<--").
void logFunc(const char* function, const char* marker);

/// Shows one line of passing interest at the bottom of the terminal, in place of the one shown before; the
/// empty text takes it away. Whatever is said or logged takes it away too. Standard error only, and only
/// where that is a terminal: elsewhere nothing is written. Never in the log file.
void showStatus(const std::string& text);

}  // namespace ssc
