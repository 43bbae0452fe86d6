// A simulated handset in this process, for tests that know the truth.
#pragma once

#include <filesystem>
#include <memory>
#include <string>

#include "framework/Calibrator.h"
#include "ssc/Connection.h"
#include "support/Capture.h"
#include "support/TemporaryFolder.h"

namespace truth {

/// A hub with an empty registry folder, and a connection to it. As long as the object lives, VANTLE_ROOT
/// names its folder; one at a time.
class EmbeddedHandset {
 public:
  /// `description` as behind "sim" in VANTLE_HUB: ":e4d4?hub.seed=3".
  explicit EmbeddedHandset(const std::string& description);
  EmbeddedHandset(const EmbeddedHandset&) = delete;
  EmbeddedHandset& operator=(const EmbeddedHandset&) = delete;
  ~EmbeddedHandset();

  /// Null when the hub could not be made, after a test failure that says why.
  [[nodiscard]] ssc::Connection* connection() const { return connection_.get(); }

  /// Runs "baro" with a reference and `seconds`, quietly, on the running hub.
  [[nodiscard]] Captured runBaro(double referenceHpa, int seconds);

  /// The one number that the item (dotted: "bias.x") of a registry group holds, read over the connection; not
  /// a number when there is none.
  [[nodiscard]] double stored(const std::string& group, const std::string& item);

 private:
  support::TemporaryFolder folder_;
  std::unique_ptr<ssc::Connection> connection_;
};

}  // namespace truth
