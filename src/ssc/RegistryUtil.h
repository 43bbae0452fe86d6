// The hub's registry: named groups of named, versioned items. Docs of the groups themselves stand with the
// commands that own them.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "proto/sns_registry.pb.h"
#include "ssc/Exchange.h"
#include "ssc/SensorUid.h"

namespace ssc {

class RegistryUtil {
 public:
  explicit RegistryUtil(Connection* connection) : connection_(connection), exchange_(connection) {}

  /// The folder of the registry's files on the handset, with the closing slash. A file is named as its group.
  [[nodiscard]] static std::string RegistryPath();

  /// Whether a group that does not exist is worth a level-0 message.
  enum class Absence { kReported, kExpected };

  /// Fills `out` with the group's items, its subgroups filled in. 0; kNotFound when there is no such group;
  /// kTimedOut; kMalformed; or what sending returned. A failure is a level-0 message.
  int Read(const std::string& group, sns_registry_data* out, Absence absence = Absence::kReported);

  /// Writes the items; the hub keeps those that are not named. With `group2` and `data2` a second group is
  /// written after the first. 0; kIoError when the hub could not write; kTimedOut; kMalformed; or what
  /// sending returned.
  int Write(const std::string& group, const sns_registry_data& data, const std::string* group2 = nullptr,
            const sns_registry_data* data2 = nullptr);

  /// The item of that name, or null. A dotted name ("bias.x") descends into subgroups.
  [[nodiscard]] static sns_registry_data_item* FindDataItem(const std::string& name, sns_registry_data* data);
  [[nodiscard]] static const sns_registry_data_item* FindDataItem(const std::string& name,
                                                                  const sns_registry_data& data);

  /// The item of that name for writing: appended when missing (with the subgroups that a dotted name asks
  /// for), its version one more than it was, or 1 when it had none.
  static sns_registry_data_item* GetIncrementedDataItem(const std::string& name, sns_registry_data* data);

  /// Makes `subgroup` hold exactly the float items "x", "y", "z", as many as there are values (one to three;
  /// more are ignored). An item that was there keeps its place in the version count: each version is one more
  /// than it was.
  static void CreateRegistryVector(const std::vector<float>& values, sns_registry_data* subgroup);
  /// The floats of the subgroup in its order; an item of another kind counts as 0.
  [[nodiscard]] static std::vector<float> GetRegistryVector(const sns_registry_data& subgroup);

  /// Makes `subgroup` hold exactly the float items "0_0" … "2_2" of a 3×3 matrix: from nine values in row
  /// order, or from three for the diagonal (zeros elsewhere). Another number of values leaves it alone.
  /// Versions as for a vector.
  static void CreateRegistryMatrix(const std::vector<float>& values, sns_registry_data* subgroup);
  /// The diagonal's three values, or all nine in row order, looked up by name; empty when one is missing or
  /// is no float.
  [[nodiscard]] static std::vector<float> GetRegistryMatrix(const sns_registry_data& subgroup, bool diagonal);

 private:
  /// Finds the registry sensor once.
  int lookup();
  int writeGroup(const std::string& group, const sns_registry_data& data);

  Connection* connection_;
  Exchange exchange_;
  std::optional<SensorUid> registry_;
};

}  // namespace ssc
