// The line that shows the operator that a long collection lives: on a terminal's standard error, redrawn in
// place about once a second, gone at the end. See ssc::showStatus.
#pragma once

#include <chrono>
#include <optional>
#include <string>

#include "ssc/Clock.h"

class ProgressLine {
 public:
  /// Nothing is drawn before Start and after End.
  void Start(ssc::Clock::TimePoint now, std::chrono::seconds total);
  /// Draws when the whole seconds since the start have changed. `temperature` in °C, when one is known.
  void Update(ssc::Clock::TimePoint now, std::optional<float> temperature);
  void End();

  /// "  12 s elapsed, 48 s remaining, 31.25 C". No more than `total` counts as elapsed.
  [[nodiscard]] static std::string Text(std::chrono::seconds elapsed, std::chrono::seconds total,
                                        std::optional<float> temperature);

 private:
  bool active_ = false;
  ssc::Clock::TimePoint start_;
  std::chrono::seconds total_{0};
  std::chrono::seconds drawn_{-1};  ///< elapsed seconds of the line that is shown
};
