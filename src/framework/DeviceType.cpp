#include "framework/DeviceType.h"

#include <algorithm>
#include <array>
#include <string>
#include <string_view>
#include <unordered_set>

#include "framework/Calibrator.h"
#include "framework/LowerCase.h"

namespace {

using Codenames = std::unordered_set<std::string_view>;

struct Family {
  Codenames codenames;
  DeviceType type;
};

}  // namespace

DeviceType Calibrator::Arguments::DeviceNameToDeviceType(const std::string& name) {
  const std::array<Family, 7> families{{
      {{"o1v1", "o1", "v1", "ostvin", "ostrel", "vintrey"}, DeviceType::o1v1},
      {{"p2m2", "p2", "m2", "pyrmar", "pyrle", "marlo"}, DeviceType::p2m2},
      {{"e4d4", "e4", "d4", "sabrel", "dunlet"}, DeviceType::e4d4},
      // One handset of its own name, which is calibrated as the p2m2 family is.
      {{"k3", "quillon"}, DeviceType::p2m2},
      {{"t5h5", "t5", "h5", "thornet", "helian"}, DeviceType::t5h5},
      {{"g3", "rufael"}, DeviceType::rufael},
      {{"w9", "whiskel"}, DeviceType::whiskel},
  }};
  const std::string lowered = toLowerAscii(name);
  const auto family = std::find_if(families.begin(), families.end(),
                                   [&](const Family& each) { return each.codenames.contains(lowered); });
  return family == families.end() ? DeviceType::invalid : family->type;
}
