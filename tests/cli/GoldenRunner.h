// Carries out the runs of a golden case with the real program.
#pragma once

#include <chrono>
#include <filesystem>
#include <string>

#include "cli/GoldenCase.h"
#include "support/TemporaryFolder.h"

namespace golden {

/// No command takes this long: simulated time passes at once, and a real wait of this length is a hang.
inline constexpr std::chrono::seconds kRunDeadline{60};

/// A handset's folder, kept for all the runs of one case, and the program that is run on it.
class Runner {
 public:
  explicit Runner(std::filesystem::path program);

  /// Prepares the folder as the run says, runs the program and collects what the run's case states. Wherever
  /// the folder's path shows in a text it is replaced by $ROOT; time stamps are taken out of the log file.
  [[nodiscard]] Result run(const Run& run);

 private:
  [[nodiscard]] std::string withRoot(std::string text) const;
  [[nodiscard]] std::string withoutRoot(std::string text) const;
  void prepare(const Run& run) const;
  [[nodiscard]] Files snapshot() const;
  [[nodiscard]] std::string normalised(const std::string& path, const std::string& content) const;

  std::filesystem::path program_;
  support::TemporaryFolder folder_;
  std::filesystem::path root_;        ///< VANTLE_ROOT
  std::filesystem::path requestLog_;  ///< beside the root, so that it is none of the handset's files
};

/// Compares a case with what its runs leave behind: empty when all is as stated, else where and how it
/// differs. With `update`, differences (and sections that every run must have and does not) are written into
/// `golden`.
[[nodiscard]] std::string checkCase(const std::filesystem::path& program, bool update, Case* golden);

}  // namespace golden
