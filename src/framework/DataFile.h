// The files that carry a calibration from one step to the next, and the logs beside them.
//
// A record is written in one piece and synced, so that a step that reported success is kept whatever happens,
// and a step that dies loses its own record at most. What does not fit on the disk is taken back. Paths are
// of this machine: put device paths through ssc::devicePath first.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

#include "framework/SampleData.h"

enum class FileResult {
  kOk,
  kCannotOpen,
  kFailed,      ///< a short write, or a read error
  kIncomplete,  ///< ends within a record
  kTooLarge,    ///< more than any calibration writes
};

enum class FileStart { kKeep, kTruncate };

/// Makes the file where there is none.
[[nodiscard]] FileResult appendToFile(const std::string& path, std::string_view bytes, FileStart start);
/// The same for text whose lines must not be mixed up: drops an unfinished last line first, which a crash may
/// have left (`*dropped`, may be null, tells). `text` ends with a newline.
[[nodiscard]] FileResult appendLinesToFile(const std::string& path, std::string_view text, FileStart start,
                                           bool* dropped = nullptr);
/// Appends a log's line, without waiting for the disk: a log may lose its end.
[[nodiscard]] FileResult appendToLogFile(const std::string& path, std::string_view line, FileStart start);
/// The whole content, if that is not more than `maxBytes`.
[[nodiscard]] FileResult readWholeFile(const std::string& path, std::size_t maxBytes, std::string* content);

// Records of floats in the machine's byte order, without anything between them.

void appendFloats(const SampleData& values, std::string* record);
/// kOk, or kIncomplete when bytes are left behind the last record that is whole.
[[nodiscard]] FileResult splitFloatRecords(const std::string& content, std::size_t floatsPerRecord,
                                           std::vector<SampleData>* records);
