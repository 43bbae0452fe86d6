#include "prox/ProxPoffset.h"

#include "framework/CommandOptions.h"
#include "ssc/Log.h"

namespace {

constexpr const char* kUsage = "Usage: vantle prox [-h] [-s SAMPLES] [sample | poffset [disable | enable]]\n";
constexpr const char* kOptions = R"(Options:
  -h           Print this help and exit.
  -s SAMPLES   Specify the number of samples to collect. Five (5) samples are
                 collected by default.
Arguments:
  poffset ...  Triggers a POFFSET calibration and disables or enables auto-
                 matic POFFSET calibrations. Disables by default.
  sample       Samples the proximity sensor.

)";

constexpr std::int32_t kDefaultSamples = 5;

}  // namespace

ProxPoffset::ProxPoffset(ssc::Connection* hubConnection)
    : ProximityOffsetCommand(hubConnection, kUsage, kOptions,
                             {.dataType = "proximity",
                              .displayName = "Proximity",
                              .lookupFailure = "Unable to lookup streaming proximity sensor",
                              .rateHz = 8}) {}

int ProxPoffset::Run(const Arguments& arguments) {
  int result = ParseArgs(arguments);
  if (result == kHelpPrinted) return ssc::kOk;
  if (result == ssc::kOk) result = LookupSuid();
  if (result == ssc::kOk && task_ != OffsetTask::kSample) result = RequestPoffset(task_);
  return result == ssc::kOk ? sample() : result;
}

int ProxPoffset::ParseArgs(const Arguments& arguments) {
  SetDefaults(arguments, kDefaultSamples);
  task_ = OffsetTask::kNone;
  sums_ = {};

  CommandOptions options(arguments, "hs:");
  for (int option; (option = options.Next()) != CommandOptions::kEnd;) {
    const int result = HandleOption(arguments, option, options.argument());
    if (result != ssc::kOk) return result;
  }

  const auto& words = options.words();
  std::size_t used = 0;
  for (; used < words.size() && !isChosen(task_); ++used) {
    const auto next = taskAfter(kOffsetWords, task_, words[used]);
    if (!next) return UsageError("Invalid argument '%s'", words[used]);
    task_ = *next;
  }
  task_ = taskWithoutMoreWords(task_);
  IgnoreExtraArguments(words, used);
  return ssc::kOk;
}

int ProxPoffset::sample() {
  int result = CollectReadings(Printing::kNone);
  if (result == ssc::kOk) result = RequireReadings();
  if (result == ssc::kOk) PrintRawAverage();
  return result;
}

void ProxPoffset::OnEvent(const sns_client_event_msg& message) {
  HandleEvents("virtual void ProxPoffset::OnEvent(const sns_client_event_msg &)", message);
}

bool ProxPoffset::OnProxEvent(const sns_proximity_event& reading, std::uint64_t timestamp) {
  return IsAccurate(reading) && TakeReading(reading, timestamp);
}
