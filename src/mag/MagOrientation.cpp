#include "mag/MagOrientation.h"

#include <string_view>

#include "framework/RegistryItems.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace {

constexpr const char* kUsage = "Usage: vantle mag-orient [-h] X_AXIS Y_AXIS Z_AXIS\n";
constexpr const char* kOptions = R"(Options:
  -h       Print this help and exit.
Arguments:
  X_AXIS   Sensor axis to map to the Android +x axis.
  Y_AXIS   Sensor axis to map to the Android +y axis.
  Z_AXIS   Sensor axis to map to the Android +z axis.

Note: Each axis argument must contain a sign ('+' or '-') and a name
      ('x', 'y', or 'z').

)";

constexpr const char* kConfiguration = "Magnetometer orientation configuration";
constexpr std::array<const char*, 3> kAxes{"x", "y", "z"};

bool isMapping(std::string_view word) {
  constexpr std::string_view kSigns = "+-";
  constexpr std::string_view kNames = "xyz";
  return word.size() == 2 && kSigns.find(word[0]) != std::string_view::npos &&
         kNames.find(word[1]) != std::string_view::npos;
}

/// The driver takes the texts as C strings out of the registry: the terminating zero byte is stored with
/// each.
std::string_view withTerminator(const std::string& text) { return {text.c_str(), text.size() + 1}; }

void storeMapping(const std::array<std::string, 3>& mapping, sns_registry_data* subgroup) {
  sns_registry_data ordered;
  for (const char* axis : kAxes) {
    sns_registry_data_item* const item = ordered.add_items();
    item->set_name(axis);
    sns_registry_data_item* const stored = ssc::RegistryUtil::FindDataItem(axis, subgroup);
    if (stored != nullptr) item->Swap(stored);  // so that its version counts on
  }
  subgroup->Swap(&ordered);
  for (std::size_t axis = 0; axis < kAxes.size(); ++axis) {
    setStringItem(kAxes[axis], withTerminator(mapping[axis]), subgroup);
  }
}

}  // namespace

MagOrientation::MagOrientation(ssc::Connection* hubConnection)
    : MagConfiguration(hubConnection, kUsage, kOptions) {}

int MagOrientation::Run(const Arguments& arguments) {
  if (arguments.reset) return Reset();
  const int result = ParseArgs(arguments);
  if (result == kHelpPrinted) return ssc::kOk;
  return result == ssc::kOk ? Store() : result;
}

int MagOrientation::ParseArgs(const Arguments& arguments) {
  CopyGlobalOptions(arguments);
  const std::vector<const char*> words = WordsOf(arguments);
  if (AsksForHelp(words)) {
    PrintUsage(false);
    return kHelpPrinted;
  }
  for (std::size_t axis = 0; axis < kAxes.size(); ++axis) {
    if (axis == words.size()) return UsageError("Three axis mappings are required");
    if (!isMapping(words[axis])) {
      return UsageError("Invalid %c-axis mapping '%s'", *kAxes[axis], words[axis]);
    }
    mapping_[axis] = words[axis];
  }
  IgnoreExtraArguments(words, kAxes.size());
  return ssc::kOk;
}

int MagOrientation::Store() {
  const int result = GetMagName();
  if (result != ssc::kOk) return result;
  ssc::say("Reading current orientation...\n");
  return Conclude(kConfiguration, ReadAndStore(kGroup, [this](sns_registry_data* subgroup) {
                    storeMapping(mapping_, subgroup);
                  }));
}

int MagOrientation::Reset() {
  const int result = GetMagName();
  if (result != ssc::kOk) return result;
  ssc::say("Resetting orientation to default...\n");
  return Conclude(kConfiguration, RemoveGroupFile(kGroup, AbsentFile::kIsFailure));
}
