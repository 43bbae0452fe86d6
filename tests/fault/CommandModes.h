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
  kShown,        ///< a collection lasts its time; what came until then is shown, and nothing depends on it
};
enum class Notice {
  kNone,
  kWarning,  ///< calibration changed, 610: a failure is a warning
  kFailure,  ///< factory test, 515: a request that cannot be sent fails the command
};

struct CommandMode {
  std::string family;  ///< the command's word: modes of one stand in one table
  std::string name;    ///< what distinguishes it there
  std::string struck;  ///< the sensor that faults strike where it is another than the command's own
  std::string device;
  std::vector<std::string> words;
  std::vector<std::string> world;  ///< overrides that always hold

  std::string lookedUp;  ///< key of the sensor whose look-up begins the command; empty: it asks no hub
  std::string streamed;  ///< key of the sensor that is measured; empty: none
  std::string group;     ///< registry group that it has to find; empty: none
  std::string item;      ///< item that it has to find in there; empty: none
  Ending ending = Ending::kNoSamples;
  Notice notice = Notice::kNone;
  bool storesInRegistry = false;
  bool dropsRecords = false;    ///< removes the file of earlier steps, or begins it anew
  bool keepsRecords = false;    ///< adds to a file between its steps
  bool storesOnTheWay = false;  ///< has stored something by the time that it comes to what is struck
  bool asksAfterwards =
      false;                 ///< asks the hub for something after the measurement, even if it stores nothing
  bool setsDisplay = false;  ///< writes the display's table
  bool bearsUndeleted = false;   ///< warns of a file that it cannot delete, and goes on
  bool deletesOnce = false;      ///< where there is nothing to delete any more, it fails
  std::uint32_t ownRequest = 0;  ///< message id of a request that only this kind of sensor takes; 0: none

  std::string begins;    ///< printed when the closing line is due from then on; empty: there is none
  std::string closes;    ///< the closing line without its verdict
  std::string succeeds;  ///< the last line of success where that is no closing line

  struct Step {
    std::vector<std::string> words;
    std::vector<std::string> world;
  };
  std::vector<Step> before;  ///< commands that have run, on a good hub, when this one starts

  [[nodiscard]] std::string title() const {
    return family + " " + name + (struck.empty() ? "" : ": " + struck);
  }
  /// Whether it says something only when it succeeds. A request that goes well on the way has a line of its
  /// own.
  [[nodiscard]] bool hasSuccessLine() const { return !closes.empty() || !succeeds.empty(); }
  [[nodiscard]] std::string successLine() const {
    if (!succeeds.empty()) return succeeds;
    return closes.empty() ? "succeeded" : closes + " succeeded";
  }
  /// Whatever sensor is struck.
  [[nodiscard]] bool Is(std::string_view wanted) const { return family + " " + name == wanted; }
  [[nodiscard]] bool changesFiles() const {
    return storesInRegistry || keepsRecords || dropsRecords || setsDisplay;
  }
};

[[nodiscard]] const std::vector<CommandMode>& commandModes();

/// The title as the name of a test: "imu-multipoint last phase" is "ImuMultipointLastPhase".
[[nodiscard]] std::string testNameOf(const std::string& title);

}  // namespace fault
