// The ways to call each command that collect or write something: the columns of the fault matrix. A new
// command, or a new mode of one, is a row of commandModes().
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace fault {

/// What a command does that decides how a fault shows.
enum class Ending {
  kNoSamples,    ///< it collects nothing
  kTime,         ///< a collection lasts its time; what came until then counts
  kSampleCount,  ///< a collection ends with the last sample wanted; too few in time is a failure
};
enum class Notice {
  kNone,
  kWarning,  ///< calibration changed, 610: a failure is a warning
  kFailure,  ///< factory test, 515: a request that cannot be sent fails the command
};

struct CommandMode {
  std::string family;  ///< the command's word: modes of one stand in one table
  std::string name;    ///< what distinguishes it there
  std::string device;
  std::vector<std::string> words;
  std::vector<std::string> world;  ///< overrides that always hold

  std::string lookedUp;  ///< key of the sensor whose look-up begins the command
  std::string streamed;  ///< key of the sensor that is measured; empty: none
  std::string group;     ///< registry group that it has to find; empty: none
  std::string item;      ///< item that it has to find in there; empty: none
  Ending ending = Ending::kNoSamples;
  Notice notice = Notice::kNone;
  bool storesInRegistry = false;
  bool dropsRecords = false;     ///< removes that file when it begins
  bool keepsRecords = false;     ///< adds to a file between its steps
  std::uint32_t ownRequest = 0;  ///< message id of a request that only this kind of sensor takes; 0: none

  std::string begins;  ///< printed when the closing line is due from then on; empty: there is none
  std::string closes;  ///< the closing line without its verdict

  struct Step {
    std::vector<std::string> words;
    std::vector<std::string> world;
  };
  std::vector<Step> before;  ///< commands that have run, on a good hub, when this one starts

  [[nodiscard]] std::string title() const { return family + " " + name; }
  /// What it says only when it succeeds. A request that goes well on the way has a line of its own.
  [[nodiscard]] std::string successLine() const {
    return closes.empty() ? "succeeded" : closes + " succeeded";
  }
  [[nodiscard]] bool Is(std::string_view wanted) const { return title() == wanted; }
};

[[nodiscard]] const std::vector<CommandMode>& commandModes();

/// The title as the name of a test: "imu-multipoint last phase" is "ImuMultipointLastPhase".
[[nodiscard]] std::string testNameOf(const std::string& title);

}  // namespace fault
