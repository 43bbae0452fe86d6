#include "prox/ProxCalibrator.h"

#include <array>
#include <cstring>

#include "framework/CommandOptions.h"
#include "framework/RegistryItems.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"
#include "ssc/Ticks.h"

namespace {

constexpr const char* kUsage = "Usage: vantle prox [-h] [-s SAMPLES] [near | far]\n";
// "Five (5)" is an old slip that stays, the default being ten: scripts compare this text.
constexpr const char* kOptions = R"(Options:
  -h           Print this help and exit.
  -s SAMPLES   Specify the number of samples to collect. Five (5) samples are
                 collected by default.
Arguments:
  near         Perform calibration for the near threshold. If no argument is
                 given, this is the default mode.
  far          Perform calibration for the far threshold.

)";

/// What one mode calls its threshold.
struct ThresholdNames {
  const char* printed;
  const char* item;  ///< a float item: raw counts
};
constexpr ThresholdNames kNear{"NEAR", "near_threshold"};
constexpr ThresholdNames kFar{"FAR", "far_threshold"};

constexpr const ThresholdNames& namesOf(ProximityMode mode) {
  return mode == ProximityMode::kNear ? kNear : kFar;
}
constexpr const ThresholdNames& otherNamesOf(ProximityMode mode) {
  return mode == ProximityMode::kNear ? kFar : kNear;
}

// What a reset stores.
constexpr float kDefaultNearThreshold = 140.0F;
constexpr float kDefaultFarThreshold = 100.0F;

constexpr std::int32_t kDefaultSamples = 10;

}  // namespace

ProxCalibrator::ProxCalibrator(ssc::Connection* hubConnection)
    : ProximityCommand(hubConnection, kUsage, kOptions,
                       {.dataType = "proximity",
                        .displayName = "Proximity",
                        .lookupFailure = "Unable to lookup streaming proximity sensor",
                        .rateHz = 50}) {}

int ProxCalibrator::Run(const Arguments& arguments) {
  if (arguments.reset) return Reset();
  int result = ParseArgs(arguments);
  if (result == kHelpPrinted) return ssc::kOk;
  if (result == ssc::kOk) result = LookupSuid();
  return result == ssc::kOk ? Calibrate() : result;
}

int ProxCalibrator::ParseArgs(const Arguments& arguments) {
  SetDefaults(arguments, kDefaultSamples);
  mode_ = ProximityMode::kNear;

  CommandOptions options(arguments, "hs:");
  for (int option; (option = options.Next()) != CommandOptions::kEnd;) {
    const int result = HandleOption(arguments, option, options.argument());
    if (result != ssc::kOk) return result;
  }

  const auto& words = options.words();
  if (words.empty()) return ssc::kOk;
  if (std::strcmp(words[0], "far") == 0) {
    mode_ = ProximityMode::kFar;
  } else if (std::strcmp(words[0], "near") != 0) {
    return UsageError("Invalid argument '%s'", words[0]);
  }
  IgnoreExtraArguments(words, 1);
  return ssc::kOk;
}

void ProxCalibrator::OnEvent(const sns_client_event_msg& message) {
  constexpr const char* kFunction = "virtual void ProxCalibrator::OnEvent(const sns_client_event_msg &)";
  ssc::logFunc(kFunction, "-->");
  const std::lock_guard<std::mutex> guard(mutex);
  if (takeEvents(message)) condition.notify_all();
  ssc::logFunc(kFunction, "<--");
}

bool ProxCalibrator::takeEvents(const sns_client_event_msg& message) {
  if (!IsFromSensor(message) || hasEnoughSamples()) return false;
  float distance = 0;  // what a near target counts as, until a far event of the same message
  for (const auto& event : message.events()) {
    LogErrorEvent(ssc::SensorUid(message.suid()), event);
    if (event.msg_id() != kProximityEvent) continue;
    const sns_proximity_event* const reading = ParseReading(event.payload());
    // One that does not parse fails the collection, but does not end it before its time or count.
    if (reading == nullptr) continue;
    if (reading->proximity_event_type() == SNS_PROXIMITY_EVENT_TYPE_FAR) distance = rangeHigh_;
    if (!IsAccurate(*reading)) continue;
    const std::array<float, 3> values{static_cast<float>(reading->raw_adc()), distance,
                                      reading->data_size() > 0 ? reading->data(0) : 0.0F};
    samples[suid_].emplace_back(ssc::ticksToSeconds(event.timestamp()), values.begin(), values.end());
    if (hasEnoughSamples()) return true;
  }
  return false;
}

bool ProxCalibrator::hasEnoughSamples() const {
  const auto collected = samples.find(suid_);
  return collected != samples.end() &&
         collected->second.size() >= static_cast<std::size_t>(samplesToCollect_);
}

int ProxCalibrator::Calibrate() {
  ssc::say("Proximity calibration begins.\n");
  return Conclude("Proximity sensor calibration", measureAndStore());
}

int ProxCalibrator::measureAndStore() {
  int result = CollectReadings(Printing::kSamples);
  if (result == ssc::kOk) result = RequireSamples(suid_);
  if (result != ssc::kOk) return result;
  const float threshold = proximityThreshold(samples[suid_]);
  ssc::say("%s_THRESHOLD: %.0f\n", namesOf(mode_).printed, static_cast<double>(threshold));
  return SkipsWrite() ? ssc::kOk : store(threshold);
}

int ProxCalibrator::store(float threshold) {
  sns_registry_data data;
  int result = ssc::RegistryUtil(connection).Read(GroupName(), &data);
  if (result == ssc::kOk) result = keepApart(threshold, &data);
  if (result != ssc::kOk) return result;

  // Looked for only now: a group without this mode's own threshold has the other one moved all the same.
  const char* const own = namesOf(mode_).item;
  result = requireItem(own, data);
  if (result != ssc::kOk) return result;
  setFloatItem(own, threshold, &data);
  result = WriteRegistry(GroupName(), data);
  if (result != ssc::kOk) return result;

  ssc::log(ssc::kLogDebug, "Notifying proximity sensor of completed calibration");
  // Unlike in most commands this failure is the command's, although the threshold is stored: the line has to
  // reboot the handset before it goes on.
  result = RequestReread();
  if (result != ssc::kOk) {
    ssc::log(ssc::kLogWarn, "Notification failed; device may require reboot for calibration to take effect");
  }
  return result;
}

int ProxCalibrator::keepApart(float threshold, sns_registry_data* data) {
  const char* const other = otherNamesOf(mode_).item;
  const int result = requireItem(other, *data);
  if (result != ssc::kOk) return result;
  const std::optional<float> displaced = displacedThreshold(mode_, threshold, floatItem(other, *data));
  if (!displaced) return ssc::kOk;
  ssc::say("Set default threshold with MIN_DIFF\n");
  setFloatItem(other, *displaced, data);
  ssc::RegistryUtil registry(connection);
  return StoreGroup(registry, GroupName(), *data);
}

int ProxCalibrator::Reset() {
  int result = LookupSuid();
  if (result != ssc::kOk) return result;
  ssc::RegistryUtil registry(connection);
  sns_registry_data data;
  result = registry.Read(GroupName(), &data);
  if (result != ssc::kOk) return result;
  ssc::say("Resetting proximity sensor calibration...\n");
  for (const ThresholdNames& names : {kNear, kFar}) {
    result = requireItem(names.item, data);
    if (result != ssc::kOk) return result;
  }
  setFloatItem(kNear.item, kDefaultNearThreshold, &data);
  setFloatItem(kFar.item, kDefaultFarThreshold, &data);
  return StoreDefaults(registry, data);
}
