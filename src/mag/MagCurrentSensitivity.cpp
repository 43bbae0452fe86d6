#include "mag/MagCurrentSensitivity.h"

#include <string_view>

#include "framework/CommandOptions.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace {

// The usage line has no "-c|-s" and ends in a blank: it is compared by scripts as it stands.
constexpr const char* kUsage = "Usage: vantle mag-sensitivity [-h] [-cs normal|fast] [X_SS Y_SS Z_SS] \n";
constexpr const char* kOptions = R"(Options:
  -h              Print this help and exit.
  -c normal|fast  Clear the current sensitivity for the selected charging
                  speed. This is equivalent to a partial `--reset`.
  -s normal|fast  Set the current sensitivity for the selected charging
                  speed. Defaults to 'normal'.
Arguments:
  X_SS   Current sensitivity of X axis.
  Y_SS   Current sensitivity of Y axis.
  Z_SS   Current sensitivity of Z axis.

)";

constexpr std::size_t kAxes = 3;
constexpr std::string_view kNormalWord = "normal";
constexpr std::string_view kFastWord = "fast";

}  // namespace

MagCurrentSensitivity::MagCurrentSensitivity(ssc::Connection* hubConnection)
    : MagConfiguration(hubConnection, kUsage, kOptions) {}

int MagCurrentSensitivity::Run(const Arguments& arguments) {
  if (arguments.reset) return Reset(ChargeSpeed::kBoth);
  const int result = ParseArgs(arguments);
  if (result == kHelpPrinted) return ssc::kOk;
  if (result != ssc::kOk) return result;
  return clear_ ? Reset(speed_) : Store();
}

int MagCurrentSensitivity::ParseArgs(const Arguments& arguments) {
  CopyGlobalOptions(arguments);
  // Sensitivities may be negative: options end at the first of them.
  CommandOptions options(arguments, "hc:s:", nullptr, CommandOptions::Order::kBeforeWords);
  for (int option; (option = options.Next()) != CommandOptions::kEnd;) {
    switch (option) {
      case 'h':
        PrintUsage(false);
        return kHelpPrinted;
      case 'c':
        // Nothing behind it is looked at: there are no values to clear something with.
        clear_ = true;
        return parseSpeed(options.argument());
      case 's':
        if (const int result = parseSpeed(options.argument()); result != ssc::kOk) return result;
        break;
      default:
        return InvalidOption(arguments, option);
    }
  }
  const int result = ParseValues(options.words(), kAxes, &sensitivity_);
  if (result != ssc::kOk) return result;
  return sensitivity_.size() < kAxes ? UsageError("Three sensitivities data are required") : ssc::kOk;
}

/// By prefix: scripts that say "fastest" are accepted.
int MagCurrentSensitivity::parseSpeed(const char* word) {
  const std::string_view text(word);
  if (text.starts_with(kNormalWord)) {
    speed_ = ChargeSpeed::kNormal;
  } else if (text.starts_with(kFastWord)) {
    speed_ = ChargeSpeed::kFast;
  } else {
    return UsageError("Invalid charging speed '%s'", word);
  }
  return ssc::kOk;
}

int MagCurrentSensitivity::Store() {
  int result = GetMagName();
  if (result != ssc::kOk) return result;
  ssc::say("Reading current sensitivity ...\n");
  return conclude(ReadAndStore(speed_ == ChargeSpeed::kFast ? kFastGroup : kNormalGroup,
                               [this](sns_registry_data* subgroup) {
                                 ssc::RegistryUtil::CreateRegistryVector(sensitivity_, subgroup);
                               }));
}

int MagCurrentSensitivity::Reset(ChargeSpeed speed) {
  int result = GetMagName();
  if (result != ssc::kOk) return result;
  if (speed != ChargeSpeed::kFast) result = RemoveGroupFile(kNormalGroup, AbsentFile::kIsFine);
  if (speed != ChargeSpeed::kNormal) {
    const int fastResult = RemoveGroupFile(kFastGroup, AbsentFile::kIsFine);
    if (result == ssc::kOk) result = fastResult;
  }
  return conclude(result);
}

/// This command's closing line has no full stop, and scripts rely on it.
int MagCurrentSensitivity::conclude(int result) {
  ssc::say("Magnetometer current sensitivity configuration %s\n", Outcome(result));
  return result;
}
