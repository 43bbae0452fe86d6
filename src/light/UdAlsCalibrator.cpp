#include "light/UdAlsCalibrator.h"

#include <cerrno>
#include <cstring>

#include <unistd.h>

#include "framework/CommandOptions.h"
#include "framework/Notifier.h"
#include "framework/RegistryItems.h"
#include "framework/Statistics.h"
#include "light/UdAlsFiles.h"
#include "light/UdAlsLux.h"
#include "ssc/DevicePath.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace {

constexpr const char* kUsage =
    R"(Usage:

vantle als [[[-chRrWw] [-s SAMPLES] [-v PERCENT] LUX [CCT]] |
             [autogain [disable | enable] |
              caldelay ITIME GAIN DELAY_START DELAY_END DELAY_STEP |
              caldelay_te2 ITIME GAIN DELAY DELAY_START DELAY_END DELAY_STEP |
              calgain [ir] ITIME GAIN |
              gain GAIN | itime ITIME | delay DELAY |
              pwm ITIME GAIN BRIGHTNESS |
              white | red | green | blue BRIGHTNESS |
              sample | set_te2 RISING_EDGE_DELAY FALLING_EDGE_DELAY |
              trigger [disable | enable DELAY]]

)";

// "Five", although ten samples are collected, and "millisecond" for an integration time in µs: scripts
// compare the text.
constexpr const char* kOptions =
    R"(Options:

  -c           Print corrected lux samples.

  -h           Print this help and exit.

  -r           Clear previously collected data. This option should be
               specified on the first step of the calibration procedure.

  -R           Clear previously collected data *without* collecting samples.

  -s SAMPLES   Specify the number of samples to collect. Five (5) samples are
               collected by default.

  -v PERCENT   Verify calibration at the reference lux under the given
               tolerance. Performs no calibration.

  -w           Compute and write calibration parameters after collecting
               samples for the given reference values.

  -W           Compute and write calibration parameters based on previously
               collected data *without* collecting samples.

Arguments:

  LUX          Reference lux.

  CCT          Reference correlated color temperature.

  autogain     Enables or disables autogain. Enables by default.

  caldelay     Enable ALS delay Calibration.

  caldelay_te2 Enable ALS delay Calibration by scanning the TE2 signal.

  calgain      Enable ALS gain Calibration.

  gain         Disable auto gain and set a fixed gain value.

  itime        Set integration time (millisecond).

  delay        Set ALS delay time (millisecond).

  pwm          Enable display PWM scaling.

  set_te2      Set TE2 rising and falling edge delays

  trigger      Enables or disables trigger mode. Disables by default.

)";

constexpr const char* kScale = "scale";

constexpr std::int32_t kRateHz = 5;
constexpr std::int32_t kDefaultSamples = 10;

bool isServed(DeviceType type) {
  return type == DeviceType::o1v1 || type == DeviceType::t5h5 || type == DeviceType::rufael ||
         type == DeviceType::whiskel;
}

/// Whether the group says that the sensor's lux is what it measures. Absent, it is not known.
bool isScaleNeutral(const sns_registry_data& data) {
  const sns_registry_data_item* const item = ssc::RegistryUtil::FindDataItem(kScale, data);
  if (item == nullptr) return false;
  // A reset leaves an integer.
  return (item->has_flt() && item->flt() == kNeutralUdAlsScale) || (item->has_sint() && item->sint() == 1);
}

}  // namespace

UdAlsCalibrator::UdAlsCalibrator(ssc::Connection* hubConnection)
    : AmbientLightCommand(hubConnection, kUsage, kOptions,
                          {.dataType = "ambient_light_raw",
                           .rateHz = kRateHz,
                           .valuesPerEvent = kUdAlsSampleValues,
                           .defaultSamples = kDefaultSamples}) {}

int UdAlsCalibrator::Run(const Arguments& arguments) {
  if (arguments.reset) return Reset(arguments);
  int result = ParseArgs(arguments);
  if (result == kHelpPrinted) return ssc::kOk;
  if (result != ssc::kOk) return result;
  if (words_.clearOnly) {
    ssc::say("Removing data file...\n");
    // Where there is none, that is a failure too.
    if (::unlink(ssc::devicePath(kUdAlsDataFile).c_str()) == 0) return ssc::kOk;
    ssc::log(ssc::kLogError, "Unable to remove als calibration data file: %s", std::strerror(errno));
    return ssc::kNotPermitted;
  }
  result = LookupSuid();
  return result == ssc::kOk ? dispatch() : result;
}

int UdAlsCalibrator::ParseArgs(const Arguments& arguments) {
  SetDefaults(arguments);
  words_ = UdAlsArguments();
  te2Delay_ = UdAlsArguments::kNotGiven;
  if (!isServed(deviceType)) return UnsupportedDevice(arguments);

  // Options end at the first word: a gain of -1 is a word.
  CommandOptions options(arguments, ":chRrs:v:Ww", nullptr, CommandOptions::Order::kBeforeWords);
  for (int option; (option = options.Next()) != CommandOptions::kEnd;) {
    int result = ssc::kOk;
    switch (option) {
      case 'R':
        words_.clearOnly = true;
        break;
      case 'r':
        words_.clearData = true;
        break;
      case 'W':
        words_.writeOnly = true;
        words_.writeAfterCollect = true;
        break;
      case 'w':
        words_.writeAfterCollect = true;
        break;
      default:
        result = HandleOption(arguments, option, options.argument());
    }
    if (result != ssc::kOk) return result;
  }

  std::size_t firstIgnored = 0;
  const std::string error = parseUdAlsWords(options.words(), &words_, &firstIgnored);
  if (!error.empty()) return UsageError("%s", error.c_str());
  IgnoreExtraArguments(options.words(), firstIgnored);
  return ssc::kOk;
}

int UdAlsCalibrator::dispatch() {
  int result = ssc::kOk;
  switch (words_.mode) {
    case UdAlsMode::kLux:
      return IsVerifying() ? Verify() : runLux();
    case UdAlsMode::kGainCalibration:
      result = configure();
      return result == ssc::kOk ? runStep(kUdAlsGainLog, &UdAlsCalibrator::GainCalibrate) : result;
    case UdAlsMode::kIrGainCalibration:
      result = configure();
      return result == ssc::kOk ? runStep(kUdAlsGainLog, &UdAlsCalibrator::IRGainCalibrate) : result;
    case UdAlsMode::kPwm:
      result = configure();
      return result == ssc::kOk ? runStep(kUdAlsPwmLog, &UdAlsCalibrator::PwmCalibrate) : result;
    case UdAlsMode::kPattern:
      ssc::say("Display pattern noise calibration...\n");
      return runStep(kUdAlsPatternLog, &UdAlsCalibrator::ScreenPatternCalibrate);
    case UdAlsMode::kSample:
      return sampleOnly();
    case UdAlsMode::kDelayCalibration:
    case UdAlsMode::kTe2DelayCalibration:
      return runDelayScan();
    case UdAlsMode::kSetTe2:
      // The line says whether it succeeded; the exit status has never said it.
      (void)SetTe2(words_.risingEdgeDelay, words_.fallingEdgeDelay);
      return ssc::kOk;
    default:
      return configure();
  }
}

// Requests.

int UdAlsCalibrator::configure() {
  const std::optional<UdAlsRequest> request = udAlsRequestOf(words_);
  if (!request) return ssc::kInvalid;
  ssc::say("%s", request->announcement);
  return sendRequest(*request);
}

int UdAlsCalibrator::sendRequest(const UdAlsRequest& request) {
  sns_client_request_msg message = MakeRequest(suid);
  message.set_msg_id(request.messageId);
  message.mutable_request()->set_payload(request.payload);
  const int result = AskSensor(message);
  if (result != ssc::kOk) ssc::log(ssc::kLogError, "%s", request.failure);
  return result;
}

// Events.

void UdAlsCalibrator::OnEvent(const sns_client_event_msg& message) {
  HandleEvents("virtual void UdAlsCalibrator::OnEvent(const sns_client_event_msg &)", message);
}

bool UdAlsCalibrator::OnOtherEvent(const Event& event) {
  const std::optional<UdAlsResponse> response = readUdAlsResponse(event.msg_id(), event.payload());
  if (!response) return false;
  ssc::log(ssc::kLogDebug, "Got a response");
  if (response->kind == UdAlsResponse::Kind::kSucceeded) {
    ssc::say("%s", response->text.c_str());
  } else {
    ssc::log(ssc::kLogError, "%s", response->text.c_str());
  }
  // A request that the sensor refuses is no failure of the command: the log has it.
  if (response->kind == UdAlsResponse::Kind::kMalformed) status = ssc::kMalformed;
  return true;
}

void UdAlsCalibrator::OnReconnect() {
  {
    // The request is lost with the hub that had it, and no stream was running that could be started again:
    // its samples would pass for the answer.
    const std::lock_guard<std::mutex> guard(mutex);
    if (awaitsAnswer) return;
  }
  Calibrator::OnReconnect();
}

bool UdAlsCalibrator::OnSensorEvent(const ssc::SensorUid& eventSuid, std::uint64_t timestamp,
                                    const sns_std_sensor_event& event) {
  const auto count = [this] {
    const auto collected = samples.find(suid);
    return collected == samples.end() ? 0 : collected->second.size();
  };
  const std::size_t before = count();
  const bool isEnough = AmbientLightCommand::OnSensorEvent(eventSuid, timestamp, event);
  if (count() == before) return isEnough;
  Sample& sample = samples[suid].back();
  sample.values.resize(kUdAlsSampleValues);
  if (!quiet && ssc::logLevel() >= ssc::kLogVerbose) {
    ssc::say("%.*lf%s\n", 6, sample.time, sample.values.format(14, 6).c_str());
  }
  return isEnough;
}

// Modes.

int UdAlsCalibrator::runStep(const char* csvPath, int (UdAlsCalibrator::*calibrate)()) {
  if (!words_.writeOnly) {
    const int result = CollectData(csvPath);
    if (result != ssc::kOk) return result;
  }
  return words_.writeAfterCollect ? (this->*calibrate)() : ssc::kOk;
}

int UdAlsCalibrator::runLux() {
  int result = ssc::kOk;
  if (!words_.writeOnly) {
    startLog(kUdAlsLuxLog, kUdAlsLogHeader);
    result = CollectData(kUdAlsLuxLog);
  }
  if (result != ssc::kOk || !words_.writeAfterCollect) return result;
  result = makeScaleNeutral();
  if (result != ssc::kOk) return result;
  // The records so far were scaled by what the registry held: only those of the neutral scale count.
  result = removeDataFile();
  if (result != ssc::kOk) return Conclude("Calibration", result);
  startLog(kUdAlsLuxLog, kUdAlsLogHeader);
  result = CollectData(kUdAlsLuxLog);
  return result == ssc::kOk ? CalibrateLux() : result;
}

int UdAlsCalibrator::makeScaleNeutral() {
  ssc::RegistryUtil registry(connection);
  sns_registry_data data;
  int result = registry.Read(GroupName(), &data);
  if (result != ssc::kOk || isScaleNeutral(data)) return result;
  if (dryRun) {
    ssc::log(ssc::kLogWarn, "The samples still carry the stored scale due to dry run");
    return ssc::kOk;
  }
  setFloatItem(kScale, kNeutralUdAlsScale, &data);
  result = registry.Write(GroupName(), data);
  if (result == ssc::kOk) result = Notifier(connection).NotifyCalibrationCompleted(suid);
  if (result != ssc::kOk) {
    ssc::log(ssc::kLogError, "Unable to make the sensor measure without its scale. Error = %d", result);
  }
  return result;
}

int UdAlsCalibrator::sampleOnly() {
  const int result = collect(stepPeriod(), true);
  if (result == ssc::kOk) printMeans(sampleDataMean(samples[suid]));
  return result;
}
