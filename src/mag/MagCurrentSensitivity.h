#pragma once

#include <cstdint>
#include <vector>

#include "mag/MagConfiguration.h"

/// "mag-sensitivity": stores how much the charging current disturbs each axis, for normal and for fast
/// charging.
class MagCurrentSensitivity final : public MagConfiguration {
 public:
  enum class ChargeSpeed : std::int32_t { kNormal = 0, kFast = 1, kBoth = 2 };

  explicit MagCurrentSensitivity(ssc::Connection* hubConnection);

  [[nodiscard]] int Run(const Arguments& arguments) override;
  [[nodiscard]] int ParseArgs(const Arguments& arguments);
  [[nodiscard]] int Store();
  /// Deletes what is stored for the speed; what is not stored is deleted already.
  [[nodiscard]] int Reset(ChargeSpeed speed);

 private:
  [[nodiscard]] int parseSpeed(const char* word);
  [[nodiscard]] static int conclude(int result);

  static constexpr Group kNormalGroup{"_0_platform.sensitivity", "sensitivity", "x"};
  static constexpr Group kFastGroup{"_0_platform.sensitivity_fast", "sensitivity_fast", "x"};

  ChargeSpeed speed_ = ChargeSpeed::kNormal;  ///< never kBoth
  bool clear_ = false;
  std::vector<float> sensitivity_;  ///< x, y, z
};
