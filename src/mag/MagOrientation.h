#pragma once

#include <array>
#include <string>

#include "mag/MagConfiguration.h"

/// "mag-orient": stores which of the sensor's axes are the handset's.
class MagOrientation final : public MagConfiguration {
 public:
  explicit MagOrientation(ssc::Connection* hubConnection);

  [[nodiscard]] int Run(const Arguments& arguments) override;
  [[nodiscard]] int ParseArgs(const Arguments& arguments);
  [[nodiscard]] int Store();
  /// Deletes the stored mapping.
  [[nodiscard]] int Reset();

 private:
  static constexpr Group kGroup{"_0_platform.orient", "orient", "x"};

  /// For the handset's x, y and z: a sign and the sensor's axis ("-y"). No check that it is a permutation.
  std::array<std::string, 3> mapping_;
};
