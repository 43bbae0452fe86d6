#include "framework/ProgressLine.h"

#include <algorithm>
#include <array>
#include <cstdio>

#include "ssc/Log.h"

void ProgressLine::Start(ssc::Clock::TimePoint now, std::chrono::seconds total) {
  active_ = true;
  start_ = now;
  total_ = total;
  drawn_ = std::chrono::seconds(-1);
}

void ProgressLine::Update(ssc::Clock::TimePoint now, std::optional<float> temperature) {
  if (!active_) return;
  const auto elapsed = std::chrono::duration_cast<std::chrono::seconds>(now - start_);
  if (elapsed == drawn_) return;
  drawn_ = elapsed;
  ssc::showStatus(Text(elapsed, total_, temperature));
}

void ProgressLine::End() {
  if (active_) ssc::showStatus("");
  active_ = false;
}

std::string ProgressLine::Text(std::chrono::seconds elapsed, std::chrono::seconds total,
                               std::optional<float> temperature) {
  const std::chrono::seconds counted = std::clamp(elapsed, std::chrono::seconds(0), total);
  std::string text = "  " + std::to_string(counted.count()) + " s elapsed, " +
                     std::to_string((total - counted).count()) + " s remaining";
  if (!temperature) return text;
  std::array<char, 64> reading;
  std::snprintf(reading.data(), reading.size(), ", %.2f C", static_cast<double>(*temperature));
  return text + reading.data();
}
