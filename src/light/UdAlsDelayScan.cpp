// The delay of the light sensor under the display against the display's refresh: scanning it, finding the
// best one, and moving the display's TE2 signal, which starts the sensor, instead.
#include <cerrno>
#include <cmath>
#include <cstdio>
#include <cstring>

#include "framework/RegistryItems.h"
#include "light/TruncateToInt.h"
#include "light/UdAlsCalibrator.h"
#include "light/UdAlsDelay.h"
#include "light/UdAlsFiles.h"
#include "ssc/DevicePath.h"
#include "ssc/Log.h"

namespace {

constexpr const char* kTe2Node = "/sys/devices/platform/soc/soc:qcom,dsi-display-primary/te2_table";
/// What the panel takes to come to rest after its table was written before.
constexpr std::chrono::milliseconds kPanelRest{500};

constexpr const char* kDelay = "delay";         // float, ms
constexpr const char* kTe2Delay = "delay_te2";  // float, lines of the display

/// The TE2 signal's pulse in a scan, in lines.
constexpr float kTe2PulseWidth = 2;

enum class NodeResult { kWritten, kCannotOpen, kCannotClose };

/// Writes the table in one piece. The node is a driver's: it is opened as it stands, neither made nor
/// emptied. Why it could not be written shows in errno, at the latest when it is closed.
NodeResult writeTe2Node(const std::string& table) {
  std::FILE* const node = std::fopen(ssc::devicePath(kTe2Node).c_str(), "r+e");
  if (node == nullptr) return NodeResult::kCannotOpen;
  const bool isWritten = std::fputs(table.c_str(), node) >= 0 && std::fflush(node) == 0;
  const int error = errno;
  const bool isClosed = std::fclose(node) == 0;
  if (isWritten && isClosed) return NodeResult::kWritten;
  if (!isWritten) errno = error;
  return NodeResult::kCannotClose;
}

}  // namespace

int UdAlsCalibrator::SetTe2(int risingEdge, int fallingEdge) {
  connection->clock().sleepFor(kPanelRest);
  const auto rising = static_cast<unsigned>(risingEdge);
  const auto falling = static_cast<unsigned>(fallingEdge);
  ssc::say("Rising  Edge Delay : %04u\n", rising);
  ssc::say("Falling Edge Delay : %04u\n", falling);
  const NodeResult written = writeTe2Node(te2Table(rising, falling));
  if (written == NodeResult::kCannotOpen) {
    ssc::log(ssc::kLogError, "Failed to open panel register file.");
  } else if (written == NodeResult::kCannotClose) {
    ssc::log(ssc::kLogError, "Failed to close panel register file. Error: %s", std::strerror(errno));
  }
  const int result = written == NodeResult::kWritten ? ssc::kOk : ssc::kNotPermitted;
  ssc::say("Set TE2 %s.\n\n", Outcome(result));
  return result;
}

int UdAlsCalibrator::runDelayScan() {
  const bool isTe2 = words_.mode == UdAlsMode::kTe2DelayCalibration;
  ssc::say(isTe2 ? "Delay calibration by scanning TE2...\n" : "Delay calibration...\n");
  ssc::say("Removing data file...\n");
  int result = removeDataFile();
  if (result != ssc::kOk) return Conclude("Calibration", result);
  startLog(isTe2 ? kUdAlsTe2DelayLog : kUdAlsDelayLog, kUdAlsDelayLogHeader);
  result = isTe2 ? scanTe2Delays() : scanDelays();
  return result == ssc::kOk ? DelayCalibrate() : result;
}

// The sums run in single precision: which delays a scan visits depends on it.

int UdAlsCalibrator::scanDelays() {
  for (float delay = words_.delayStart; delay <= words_.delayEnd; delay += words_.delayStep) {
    ssc::say("Delay = %f\n", static_cast<double>(delay));
    const int result = SetAlsDelayAndCollectData(delay, kUdAlsDelayLog);
    if (result != ssc::kOk) return result;
  }
  return ssc::kOk;
}

int UdAlsCalibrator::scanTe2Delays() {
  ssc::say("ALS Delay = %f\n", static_cast<double>(words_.alsDelay));
  for (float delay = words_.te2DelayStart; delay <= words_.te2DelayEnd; delay += words_.te2DelayStep) {
    te2Delay_ = delay;
    int result = SetTe2(truncateToInt(delay - kTe2PulseWidth), truncateToInt(delay));
    if (result != ssc::kOk) return result;
    result = SetAlsDelayAndCollectData(words_.alsDelay, kUdAlsTe2DelayLog);
    if (result != ssc::kOk) return result;
  }
  return ssc::kOk;
}

int UdAlsCalibrator::SetAlsDelayAndCollectData(float delay, const char* csvPath) {
  words_.alsDelay = delay;
  const int result = configure();
  return result == ssc::kOk ? CollectDelayCalData(csvPath) : result;
}

int UdAlsCalibrator::DelayCalibrate() { return Conclude("Calibration", calibrateDelay()); }

int UdAlsCalibrator::calibrateDelay() {
  std::vector<SampleData> records;
  int result = loadRecords(2, "delay", &records);
  if (result != ssc::kOk) return result;
  SampleData fit;
  if (!fitDelay(records, &fit)) {
    ssc::log(ssc::kLogError, "Insufficient data to compute quadratic delay fit");
    return ssc::kNoData;
  }
  ssc::say("DELAY FIT:   %s\n", fit.format(14, 6).c_str());
  const bool isTe2 = words_.mode == UdAlsMode::kTe2DelayCalibration;
  const float vertex = vertexOf(fit);
  const float best = isTe2 ? std::round(vertex) : roundedToThreeDecimals(vertex);
  ssc::say("Delay of minimum clear value: %14.6f\n", static_cast<double>(best));
  result = RequireFinite("The delay of the minimum clear value", {best});
  if (result != ssc::kOk || SkipsWrite()) return result;
  return store([this, best, isTe2](sns_registry_data* data) {
    if (!isTe2 && words_.mode != UdAlsMode::kDelayCalibration) {
      ssc::log(ssc::kLogError, "Invalid mode");
      return ssc::kInvalid;
    }
    setFloatItem(isTe2 ? kTe2Delay : kDelay, best, data);
    if (isTe2) programTe2(best);
    return ssc::kOk;
  });
}

/// A panel that cannot be programmed keeps the delay from being used, not from being stored.
void UdAlsCalibrator::programTe2(float delay) {
  const NodeResult written = writeTe2Node(calibratedTe2Table(delay));
  if (written == NodeResult::kCannotOpen) {
    ssc::log(ssc::kLogError, "Failed to open TE2 table node.");
    return;
  }
  ssc::say("Start setting TE2 table...\n");
  if (written == NodeResult::kCannotClose) ssc::log(ssc::kLogError, "Failed to close TE2 table node.");
}
