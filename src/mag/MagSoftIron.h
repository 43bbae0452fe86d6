#pragma once

#include <vector>

#include "mag/MagConfiguration.h"

/// "mag-softiron": stores the matrix with which the driver undoes the handset's soft iron, and through which
/// "mag" looks at the field.
class MagSoftIron final : public MagConfiguration {
 public:
  explicit MagSoftIron(ssc::Connection* hubConnection);

  [[nodiscard]] int Run(const Arguments& arguments) override;
  [[nodiscard]] int ParseArgs(const Arguments& arguments);
  [[nodiscard]] int Store();
  /// Deletes the stored matrix.
  [[nodiscard]] int Reset();

 private:
  static constexpr Group kGroup{"_0_platform.mag.fac_cal.corr_mat", "corr_mat", "corr_mat"};

  std::vector<float> matrix_;  ///< row order
};
