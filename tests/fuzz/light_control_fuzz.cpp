// Any requests to the light sensor under the display: each a byte for its message id, a byte for the length
// of its payload, and the payload.
#include <algorithm>
#include <cmath>
#include <string>
#include <vector>

#include "fuzz/FuzzCheck.h"
#include "proto/sns_oem_als.pb.h"
#include "simhub/sensors/LightControl.h"

namespace {

bool isSame(const simhub::LightControl& one, const simhub::LightControl& other) {
  return one.integrationUs == other.integrationUs && one.autoGain == other.autoGain &&
         one.gain == other.gain && one.triggered == other.triggered && one.delayMs == other.delayMs;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using fuzz::check;
  simhub::LightControl control;
  control.ownIntegrationUs = control.integrationUs = 1000;
  std::size_t at = 0;
  while (at + 2 <= size) {
    const std::uint32_t id = simhub::kAlsTriggerRequest + data[at] % 16U;
    const std::size_t length = std::min<std::size_t>(data[at + 1], size - at - 2);
    const std::string payload(data + at + 2, data + at + 2 + length);
    at += 2 + length;
    const simhub::LightControl before = control;
    std::vector<simhub::SensorAnswer> answers;
    const bool known = simhub::controlLight({simhub::Time{0}, id, payload, false}, &control, &answers);
    check(known == (id % 2 == 0), "every even message id is a request");
    check(answers.size() == (known ? 1U : 0U), "a request has one answer");
    // Success is the first field of every answer.
    sns_oem_set_gain_resp answer;
    check(!known || (answers[0].messageId == id + 1 && answer.ParseFromString(answers[0].payload)),
          "an answer can be decoded");
    check(answer.success() || isSame(before, control), "what is refused changes nothing");
    check(control.gain >= 0 && control.gain <= simhub::kHighestGain, "gain stays in range");
    check(control.integrationUs > 2.7 && control.integrationUs <= 182000, "integration time stays in range");
    check(std::isfinite(control.delayMs), "delay stays a number");
  }
  return 0;
}
