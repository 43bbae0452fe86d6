// What the commands share that store fixed values of the magnetometer, given on the command line, without
// measuring anything. None of them knows a dry run, and none notifies the sensor: its driver reads these
// values when it starts.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "framework/Calibrator.h"

class MagConfiguration : public Calibrator {
 public:
  /// Says that it searches, and finds the magnetometer's package name. 0, or the result of the look-up after
  /// a level-0 message.
  [[nodiscard]] int GetMagName();

 protected:
  using Calibrator::Calibrator;

  /// A registry group G.S that holds the values of the item S of the group G.
  struct Group {
    const char* suffix;  ///< behind the package name: the name of the group
    const char* item;    ///< S
    /// The item that the group is asked for. Where it is found, the group is written as it is; where not, the
    /// values are written as the item S of G besides.
    const char* probe;
  };
  /// Makes the subgroup hold the command's values and nothing else.
  using StoreValues = std::function<void(sns_registry_data* subgroup)>;

  /// Reads the group, which must exist, and writes it with the new values. Registry results; a failed write
  /// is a level-1 message.
  [[nodiscard]] int ReadAndStore(const Group& group, const StoreValues& storeValues);

  enum class AbsentFile { kIsFailure, kIsFine };
  /// Deletes the group's file, so that the built-in default counts from the hub's next start on. 0;
  /// ssc::kNotPermitted when it cannot be deleted; ssc::kInvalid when the package's name cannot be a file's.
  /// A failure is a level-0 message.
  [[nodiscard]] int RemoveGroupFile(const Group& group, AbsentFile absent) const;

  /// The words behind the command's own, for commands without options.
  [[nodiscard]] static std::vector<const char*> WordsOf(const Arguments& arguments);
  /// Whether the first word asks for the help, in commands whose words may all start with a sign.
  [[nodiscard]] static bool AsksForHelp(const std::vector<const char*>& words);
  /// Parses up to `count` words as numbers, and warns of further ones. Fewer are no error here. 0, or the
  /// usage error of a word that is no finite number.
  [[nodiscard]] int ParseValues(const std::vector<const char*>& words, std::size_t count,
                                std::vector<float>* values) const;

 private:
  [[nodiscard]] int writeGroup(const std::string& outer, const sns_registry_data& outerData,
                               const std::string& group, const sns_registry_data& values);

  std::string packageName_;
};
