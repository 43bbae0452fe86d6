// A golden case: one text file that says how whole commands are run, one after the other on the same handset
// folder, and what each must leave behind. CONTRIBUTING.md describes the file for those who write cases.
#pragma once

#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace golden {

/// Files by their path below the root.
using Files = std::map<std::string, std::string>;

/// What a run left behind, or is expected to.
struct Result {
  std::string
      status;  ///< one line: an exit status as a number, "signal N", "timed out" or "not started: ..."
  std::string output;
  std::string errors;
  std::string requests;                                     ///< the simulated hub's request log
  std::map<std::string, std::optional<std::string>> files;  ///< content below the root; nothing: no such file
  std::string changes;                                      ///< a line for each file made, changed or deleted
};

/// One run of the program.
struct Run {
  std::optional<std::string> hub;      ///< VANTLE_HUB; unset when there is none
  std::vector<std::string> arguments;  ///< the program's words
  std::vector<std::pair<std::string, std::optional<std::string>>> environment;  ///< no value: unset
  std::vector<std::string> without;                                             ///< removed before the run
  std::vector<std::pair<std::string, std::string>> given;                       ///< written before the run

  /// Which results the case states; only these are compared. Status, output and errors always must be.
  bool hasStatus = false;
  bool hasOutput = false;
  bool hasErrors = false;
  bool hasRequests = false;
  bool hasChanges = false;
  Result expected;

  std::string settings;  ///< the lines of its "--- run" section as they stand, comments too
  int line = 0;          ///< where the run stands in the file, from 1
};

struct Case {
  std::string heading;  ///< the lines before the first section: what the case is about
  std::vector<Run> runs;
};

/// Reads a case. Nothing, with `error` saying the line and what is wrong, when it is not well-formed.
[[nodiscard]] std::optional<Case> parseCase(const std::string& text, std::string* error);

/// The file for a case: parseCase() of it gives the same case, byte for byte in every content.
[[nodiscard]] std::string formatCase(const Case& golden);

/// Whether every run states its status, output and errors; else `error` names what is missing.
[[nodiscard]] bool isComplete(const Case& golden, std::string* error);

/// Splits a line into words as a shell does, with '...', "..." and \x; nothing when a quote does not end.
[[nodiscard]] std::optional<std::vector<std::string>> splitWords(const std::string& line);

/// Any bytes as lines of a case, and back. A line that starts with "---" or '\' gets a '\' in front; one that
/// ends in a blank, a carriage return or '\' gets a '\' behind; content without a newline at its end is
/// followed by a line that says so.
[[nodiscard]] std::string encodeText(const std::string& content);
[[nodiscard]] std::string decodeText(const std::string& lines);

/// The same for content that is no text: sixteen bytes a line, as hexadecimal numbers behind their offset.
[[nodiscard]] std::string encodeHex(const std::string& content);
[[nodiscard]] std::optional<std::string> decodeHex(const std::string& lines);

/// Whether content has bytes that do not belong into a text file.
[[nodiscard]] bool isBinary(const std::string& content);

}  // namespace golden
