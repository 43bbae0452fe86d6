#include "prox/UdProxCalibrator.h"

#include <cmath>

#include "framework/CommandOptions.h"
#include "framework/ParseNumber.h"
#include "framework/RegistryItems.h"
#include "proto/sns_oem_proximity.pb.h"
#include "prox/EmitterSetting.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace {

constexpr const char* kUsage = R"(Usage:

vantle prox [-h] [-s SAMPLES]
             [sample | ppulse PDATA_TARGET |
              pldrive PDATA_TARGET |
              poffset [disable | enable] |
              ore [disable | enable] PULSE_NUMBER PULSE_LEN]
)";
// "Five (5)" is an old slip that stays, the default being ten. "-w" and "pldrive" are the production line's
// own and not shown to others. Scripts compare this text.
constexpr const char* kOptions = R"(Options:
  -h           Print this help and exit.
  -s SAMPLES   Specify the number of samples to collect. Five (5) samples are
                 collected by default.
Arguments:
  ore          Enables/disables offset range extension. Disables by default.
  ppulse       Triggers a prox pulse number calibration.
  poffset ...  Triggers a POFFSET calibration and disables or enables auto-
                 matic POFFSET calibrations. Disables by default.
  sample       Samples the proximity sensor.

)";

constexpr std::int32_t kDefaultSamples = 10;
constexpr float kNotGiven = -1;
constexpr float kBeyondPulseValues = 4294967296.0F;  // 2^32: what the request has room for

constexpr std::uint32_t kOreRequest = 772;
constexpr std::uint32_t kOreAnswer = 773;

// Items of the registry group, and what a reset stores.
constexpr const char* kVersion = "version";  // an integer
constexpr const char* kPpulse = "ppulse";    // a float: pulses less one
constexpr const char* kPldrive = "pldrive";  // an integer: steps of the driver
constexpr const char* kOre = "ore";          // an integer
constexpr const char* kPoffset = "poffset";  // an integer
constexpr std::int64_t kDefaultVersion = 1;
constexpr float kDefaultPpulse = 31;
constexpr std::int64_t kDefaultPldrive = 18;

/// The other types set the pulse number instead.
bool setsCurrent(DeviceType type) { return type == DeviceType::rufael; }

}  // namespace

UdProxCalibrator::UdProxCalibrator(ssc::Connection* hubConnection)
    : ProximityOffsetCommand(hubConnection, kUsage, kOptions,
                             {.dataType = "proximity_raw",
                              .displayName = "Proximity Raw",
                              .lookupFailure = "Unable to lookup raw proximity sensor",
                              .rateHz = 8}) {}

int UdProxCalibrator::Run(const Arguments& arguments) {
  if (arguments.reset) return Reset(arguments);
  int result = ParseArgs(arguments);
  if (result == kHelpPrinted) return ssc::kOk;
  if (result == ssc::kOk) result = LookupSuid();
  if (result != ssc::kOk) return result;
  switch (task_) {
    case OffsetTask::kPoffsetDisable:
    case OffsetTask::kPoffsetEnable:
      return poffset();
    case OffsetTask::kPulseNumber:
      ssc::say("Enabling pulse number calibration...\n");
      return PulseCalibrate();
    case OffsetTask::kPulseCurrent:
      ssc::say("Enabling pulse current calibration...\n");
      return PldriveCalibrate();
    case OffsetTask::kOreDisable:
    case OffsetTask::kOreEnable:
      return ore();
    default:
      return sample();
  }
}

// ---- Arguments ----

int UdProxCalibrator::ParseArgs(const Arguments& arguments) {
  SetDefaults(arguments, kDefaultSamples);
  task_ = OffsetTask::kNone;
  pulseNumber_ = pulseLength_ = pdataTarget_ = kNotGiven;
  storesOffset_ = false;
  sums_ = {};

  CommandOptions options(arguments, "hs:w");
  for (int option; (option = options.Next()) != CommandOptions::kEnd;) {
    if (option == 'w') {
      storesOffset_ = true;
      continue;
    }
    const int result = HandleOption(arguments, option, options.argument());
    if (result != ssc::kOk) return result;
  }
  return parseTask(options.words());
}

int UdProxCalibrator::parseTask(const std::vector<const char*>& words) {
  std::size_t used = 0;
  for (; used < words.size() && !isChosen(task_); ++used) {
    auto next = taskAfter(kOffsetWords, task_, words[used]);
    if (!next) next = taskAfter(kUnderDisplayWords, task_, words[used]);
    if (!next) return UsageError("Invalid argument '%s'", words[used]);
    task_ = *next;
  }
  task_ = taskWithoutMoreWords(task_);
  return parseValues(words, used);
}

int UdProxCalibrator::parseValues(const std::vector<const char*>& words, std::size_t first) {
  std::size_t used = first;
  const auto more = [&] { return used < words.size(); };
  int result = ssc::kOk;
  switch (task_) {
    case OffsetTask::kPulseNumber:
    case OffsetTask::kPulseCurrent:
      if (!more()) return UsageError("No pdata target specified");
      result = parseTarget(words[used++]);
      break;
    case OffsetTask::kOreDisable:
    case OffsetTask::kOreEnable:
      if (more()) result = parsePulse(words[used++], "Pulse number", &pulseNumber_);
      if (result == ssc::kOk && more()) result = parsePulse(words[used++], "Pulse length", &pulseLength_);
      if (result == ssc::kOk && (pulseNumber_ < 0 || pulseLength_ < 0)) {
        return UsageError("No pulse number or length specified");
      }
      break;
    default:
      break;
  }
  if (result == ssc::kOk) IgnoreExtraArguments(words, used);
  return result;
}

int UdProxCalibrator::parseTarget(const char* word) {
  if (parseFloat(word, &pdataTarget_) == ssc::kOk && pdataTarget_ > 0 && std::isfinite(pdataTarget_)) {
    return ssc::kOk;
  }
  return UsageError("PDATA target must be greater than 0");
}

int UdProxCalibrator::parsePulse(const char* word, const char* what, float* value) {
  // 0 is taken, whatever the message says: it always was.
  if (parseFloat(word, value) != ssc::kOk || !(*value >= 0)) {
    return UsageError("%s must be greater than 0", what);
  }
  return *value < kBeyondPulseValues ? ssc::kOk : UsageError("%s must be less than 4294967296", what);
}

// ---- Tasks that store nothing ----

int UdProxCalibrator::collect(Printing printing) {
  const int result = CollectReadings(printing);
  return result == ssc::kOk ? RequireReadings() : result;
}

int UdProxCalibrator::sample() {
  const int result = collect(Printing::kSamples);
  if (result == ssc::kOk) PrintRawAverage();
  return result;
}

int UdProxCalibrator::poffset() {
  int result = RequestPoffset(task_);
  if (result == ssc::kOk) result = collect(Printing::kNone);
  if (result != ssc::kOk) return result;
  PrintRawAverage();
  ssc::say("ADC_ORE: %14.6f\n", static_cast<double>(sums_.MeanOre()));
  ssc::say("ADC_POFFSET: %14.6f\n\n", static_cast<double>(sums_.MeanPoffset()));
  // While the hub goes on calibrating by itself there is nothing to keep.
  return task_ == OffsetTask::kPoffsetDisable && storesOffset_ ? UpdateRegistry() : ssc::kOk;
}

int UdProxCalibrator::ore() {
  const bool enables = task_ == OffsetTask::kOreEnable;
  ssc::say("%s ORE...\n", enables ? "Enabling" : "Disabling");
  sns_oem_ore_req request;
  request.set_enable(enables ? SNS_OEM_PROXIMITY_MODE_ENABLE : SNS_OEM_PROXIMITY_MODE_DISABLE);
  request.set_pulse_number(static_cast<std::uint32_t>(pulseNumber_));
  request.set_pulse_length(static_cast<std::uint32_t>(pulseLength_));
  return RequestSwitch(kOreRequest, request.SerializeAsString(), "ORE request failed");
}

// ---- Calibrations ----

int UdProxCalibrator::readGroup(const char* item, sns_registry_data* data) {
  const int result = ssc::RegistryUtil(connection).Read(GroupName(), data);
  return result == ssc::kOk ? requireItem(item, *data) : result;
}

int UdProxCalibrator::writeAndNotify(const sns_registry_data& data) {
  const int result = WriteRegistry(GroupName(), data);
  if (result == ssc::kOk) NotifyOrWarn({suid_});
  return result;
}

int UdProxCalibrator::requireLight(float average) const {
  if (average > 0) return ssc::kOk;
  ssc::log(ssc::kLogError, "The average raw reading is 0: there is nothing to scale");
  return ssc::kInvalid;
}

int UdProxCalibrator::PulseCalibrate() {
  sns_registry_data data;
  const int result = readGroup(kPpulse, &data);
  if (result != ssc::kOk) return result;
  ssc::say("Proximity pulse number calibration begins.\n");
  return Conclude("Proximity pulse number calibration", calibratePulses(&data));
}

int UdProxCalibrator::calibratePulses(sns_registry_data* data) {
  // A collection that fails otherwise than by its time leaves the pulse number at 0 and is not the command's
  // failure, unless nothing is written: production lines have come to rely on it.
  float pulseNumber = 0;
  const int collected = CollectReadings(Printing::kNone);
  if (collected == ssc::kTimedOut) return collected;
  if (collected == ssc::kOk) {
    const int result = measurePulses(floatItem(kPpulse, *data), &pulseNumber);
    if (result != ssc::kOk) return result;
  }
  if (SkipsWrite()) return collected;
  setFloatItem(kPpulse, pulseNumber, data);
  return writeAndNotify(*data);
}

int UdProxCalibrator::measurePulses(float stored, float* pulseNumber) {
  int result = RequireReadings();
  if (result != ssc::kOk) return result;
  PrintRawAverage();
  result = requireLight(sums_.MeanRaw());
  if (result != ssc::kOk) return result;
  const float pulses = pulsesForTarget(pdataTarget_, stored + 1, sums_.count, sums_.raw);
  result = RequireFinite("The number of pulses", {pulses});
  if (result != ssc::kOk) return result;
  *pulseNumber = storedPulseNumber(pulses);
  ssc::say("PPULSE:   %14.6f\n", static_cast<double>(*pulseNumber));
  return ssc::kOk;
}

int UdProxCalibrator::PldriveCalibrate() {
  sns_registry_data data;
  const int result = readGroup(kPldrive, &data);
  if (result != ssc::kOk) return result;
  ssc::say("Proximity pulse current calibration begins.\n");
  return Conclude("Proximity pulse current calibration", calibrateCurrent(&data));
}

int UdProxCalibrator::calibrateCurrent(sns_registry_data* data) {
  // As with the pulse number; here a failed collection leaves the stored current, as it is, to be written.
  std::int64_t current = intItem(kPldrive, *data);
  const int collected = CollectReadings(Printing::kNone);
  if (collected == ssc::kTimedOut) return collected;
  if (collected == ssc::kOk) {
    const int result = measureCurrent(current, &current);
    if (result != ssc::kOk) return result;
  }
  ssc::say("NEW PLDRIVE:   %14.6f\n", static_cast<double>(current));
  if (SkipsWrite()) return collected;
  setIntItem(kPldrive, current, data);
  return writeAndNotify(*data);
}

int UdProxCalibrator::measureCurrent(std::int64_t stored, std::int64_t* current) {
  int result = RequireReadings();
  if (result != ssc::kOk) return result;
  PrintRawAverage();
  const auto wholeAverage = static_cast<std::int64_t>(sums_.MeanRaw());
  result = requireLight(static_cast<float>(wholeAverage));
  if (result != ssc::kOk) return result;
  const float wanted = currentForTarget(pdataTarget_, wholeAverage, stored);
  result = RequireFinite("The pulse current", {wanted});
  if (result == ssc::kOk) *current = limitedPulseCurrent(wanted);
  return result;
}

int UdProxCalibrator::UpdateRegistry() {
  sns_registry_data data;
  const int result = ssc::RegistryUtil(connection).Read(GroupName(), &data);
  if (result != ssc::kOk) return result;
  ssc::say("NEW ORE:       %14.6f\n", static_cast<double>(sums_.MeanOre()));
  ssc::say("NEW POFFSET:   %14.6f\n", static_cast<double>(sums_.MeanPoffset()));
  return Conclude("Proximity poffset calibration", storeOffset(&data));
}

int UdProxCalibrator::storeOffset(sns_registry_data* data) {
  struct Value {
    const char* item;
    float mean;
  };
  for (const Value& value : {Value{kOre, sums_.MeanOre()}, Value{kPoffset, sums_.MeanPoffset()}}) {
    const int result = requireItem(value.item, *data);
    if (result != ssc::kOk) return result;
    const auto whole = wholeNumber(value.mean);
    if (!whole) {
      ssc::log(ssc::kLogError, "The average cannot be stored in \"%s\": %f", value.item,
               static_cast<double>(value.mean));
      return ssc::kInvalid;
    }
    setIntItem(value.item, *whole, data);
  }
  if (SkipsWrite()) return ssc::kOk;
  ssc::say("\n");
  return writeAndNotify(*data);
}

int UdProxCalibrator::Reset(const Arguments& arguments) {
  int result = LookupSuid();
  if (result != ssc::kOk) return result;
  ssc::RegistryUtil registry(connection);
  sns_registry_data data;
  result = registry.Read(GroupName(), &data);
  if (result != ssc::kOk) return result;
  ssc::say("Resetting Prox calibration...\n");
  const bool hasCurrent = setsCurrent(arguments.deviceType);
  for (const char* const item : {kVersion, hasCurrent ? kPldrive : kPpulse}) {
    result = requireItem(item, data);
    if (result != ssc::kOk) return result;
  }
  setIntItem(kVersion, kDefaultVersion, &data);
  if (hasCurrent) {
    setIntItem(kPldrive, kDefaultPldrive, &data);
  } else {
    setFloatItem(kPpulse, kDefaultPpulse, &data);
  }
  return StoreDefaults(registry, data);
}

// ---- Events ----

void UdProxCalibrator::OnEvent(const sns_client_event_msg& message) {
  HandleEvents("virtual void UdProxCalibrator::OnEvent(const sns_client_event_msg &)", message);
}

bool UdProxCalibrator::OnAnswer(std::uint32_t messageId, const std::string& payload) {
  if (messageId != kOreAnswer) return ProximityOffsetCommand::OnAnswer(messageId, payload);
  TakeAnswer<sns_oem_ore_resp>(payload, {.message = "ore", .shown = "ORE"});
  return true;
}

bool UdProxCalibrator::OnProxEvent(const sns_proximity_event& reading, std::uint64_t timestamp) {
  if (!IsAccurate(reading)) return false;
  if (!isArmed_) {
    isArmed_ = true;
    return false;
  }
  if (reading.data_size() < ProximitySums::kValues && !reportedMissing_) {
    reportedMissing_ = true;
    ssc::log(
        ssc::kLogWarn,
        "Proximity events without both POFFSET and ORE: what is missing counts as 0 (this is said once)");
  }
  const bool isEnough = TakeReading(reading, timestamp);
  isArmed_ = !isEnough;
  return isEnough;
}
