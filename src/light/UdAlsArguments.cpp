#include "light/UdAlsArguments.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <optional>
#include <span>
#include <string_view>
#include <variant>

#include "framework/ParseNumber.h"
#include "ssc/Results.h"

namespace {

// A number that stands at a place of its own.

constexpr double kAboveZero = std::numeric_limits<float>::denorm_min();
constexpr double kFinite = std::numeric_limits<double>::max();

struct FloatWord {
  float UdAlsArguments::*field;
  double least;
  double most;
  const char* message;
};

struct IntWord {
  std::int32_t UdAlsArguments::*field;
  std::int32_t least;
  std::int32_t most;
  const char* message;
};

using NumberWord = std::variant<FloatWord, IntWord>;
using Arguments = UdAlsArguments;

constexpr FloatWord kLux{&Arguments::referenceLux, 0, kFinite, "Reference lux must be a non-negative number"};
// "cct" in small letters: scripts compare the line.
constexpr FloatWord kCct{&Arguments::referenceCct, 0, kFinite, "Reference cct must be a non-negative number"};
constexpr FloatWord kBrightness{&Arguments::brightness, 0, 255, "Brightness must be in the range [0, 255]"};
constexpr FloatWord kDelay{&Arguments::alsDelay, 0, 16.7, "Delay must be in the range [0, 16.7] (ms)"};

// A calibration needs a shortest integration of 2.78 µs; a setting may also be 0.
constexpr FloatWord kCalibrationItime{&Arguments::integrationTime, 2.78, 182000,
                                      "Integration time must be in the range [2.78, 182000] (us)"};
constexpr FloatWord kItime{&Arguments::integrationTime, 0, 182000,
                           "Integration time must be in the range [0, 182000] (us)"};
// The calibrations' "Gain" and the setting's "GAIN" differ on purpose.
constexpr IntWord kCalibrationGain{&Arguments::gain, -1, 11, "Gain must be in the range [-1, 11]"};
constexpr IntWord kGain{&Arguments::gain, -1, 11, "GAIN must be in the range [-1, 11]"};

// A start of 0 is accepted, whatever the message says.
constexpr FloatWord kDelayStart{&Arguments::delayStart, 0, kFinite,
                                "Delay start time must be greater than 0"};
constexpr FloatWord kDelayEnd{&Arguments::delayEnd, kAboveZero, kFinite,
                              "Delay end time must be greater than 0"};
constexpr FloatWord kDelayStep{&Arguments::delayStep, kAboveZero, kFinite,
                               "Delay step must be greater than 0"};
constexpr FloatWord kTe2DelayStart{&Arguments::te2DelayStart, 2, 4095,
                                   "Delay start time must be in the range [2, 4095] (h)"};
constexpr FloatWord kTe2DelayEnd{&Arguments::te2DelayEnd, 2, 4095,
                                 "Delay end time must be in the range [2, 4095] (h)"};
constexpr FloatWord kTe2DelayStep{&Arguments::te2DelayStep, kAboveZero, kFinite,
                                  "Delay step must be greater than 0"};
constexpr IntWord kRisingEdge{&Arguments::risingEdgeDelay, 0, 4095,
                              "Rising edge delay must be in the range [0, 4095] (h)"};
constexpr IntWord kFallingEdge{&Arguments::fallingEdgeDelay, 0, 4095,
                               "Falling edge delay must be in the range [0, 4095] (h)"};

/// The limits are compared with the number as it was typed, in double precision: 16.7 as a float lies above
/// 16.7, and 2.78 as a float below 2.78.
bool read(const FloatWord& rule, const char* word, Arguments* arguments) {
  float value = 0;
  double typed = 0;
  if (parseFloat(word, &value) != ssc::kOk || parseDouble(word, &typed) != ssc::kOk) return false;
  if (!(typed >= rule.least && typed <= rule.most)) return false;
  arguments->*rule.field = value;
  return true;
}

bool read(const IntWord& rule, const char* word, Arguments* arguments) {
  std::int32_t value = 0;
  if (parseInt(word, &value) != ssc::kOk || value < rule.least || value > rule.most) return false;
  arguments->*rule.field = value;
  return true;
}

/// The rule's message when the word breaks it.
std::string take(const NumberWord& rule, const char* word, Arguments* arguments) {
  return std::visit(
      [&](const auto& number) {
        return read(number, word, arguments) ? std::string() : std::string(number.message);
      },
      rule);
}

std::string invalid(const char* word) { return std::string("Invalid argument '") + word + "'"; }

// The sub-commands whose numbers stand in a fixed order.

enum class Rest { kIgnored, kReplacesLast };

struct NumberList {
  UdAlsMode mode;
  std::span<const NumberWord> numbers;
  Rest rest;  ///< what becomes of the words behind the last number
};

constexpr NumberWord kDelayOnly[] = {kDelay};
constexpr NumberWord kBrightnessOnly[] = {kBrightness};
constexpr NumberWord kDelayScan[] = {kCalibrationItime, kCalibrationGain, kDelayStart, kDelayEnd, kDelayStep};
constexpr NumberWord kTe2DelayScan[] = {kCalibrationItime, kCalibrationGain, kDelay,
                                        kTe2DelayStart,    kTe2DelayEnd,     kTe2DelayStep};
constexpr NumberWord kItimeAndGain[] = {kCalibrationItime, kCalibrationGain};
constexpr NumberWord kPwm[] = {kCalibrationItime, kCalibrationGain, kBrightness};
constexpr NumberWord kEdges[] = {kRisingEdge, kFallingEdge};

constexpr NumberList kNumberLists[] = {
    {UdAlsMode::kTriggerEnable, kDelayOnly, Rest::kReplacesLast},
    {UdAlsMode::kDelay, kDelayOnly, Rest::kReplacesLast},
    {UdAlsMode::kDelayCalibration, kDelayScan, Rest::kIgnored},
    {UdAlsMode::kTe2DelayCalibration, kTe2DelayScan, Rest::kIgnored},
    {UdAlsMode::kGainCalibration, kItimeAndGain, Rest::kIgnored},
    {UdAlsMode::kIrGainCalibration, kItimeAndGain, Rest::kIgnored},
    {UdAlsMode::kPwm, kPwm, Rest::kReplacesLast},
    {UdAlsMode::kPattern, kBrightnessOnly, Rest::kReplacesLast},
    {UdAlsMode::kSetTe2, kEdges, Rest::kIgnored},
};

const NumberList* numberListOf(UdAlsMode mode) {
  const auto* const found = std::find_if(std::begin(kNumberLists), std::end(kNumberLists),
                                         [mode](const NumberList& list) { return list.mode == mode; });
  return found == std::end(kNumberLists) ? nullptr : found;
}

// The first word.

struct SubCommand {
  std::string_view word;
  UdAlsMode mode;
};

constexpr SubCommand kSubCommands[] = {
    {"sample", UdAlsMode::kSample},
    {"trigger", UdAlsMode::kTrigger},
    {"autogain", UdAlsMode::kAutoGain},
    {"caldelay", UdAlsMode::kDelayCalibration},
    {"caldelay_te2", UdAlsMode::kTe2DelayCalibration},
    {"calgain", UdAlsMode::kGainCalibration},
    {"gain", UdAlsMode::kGain},
    {"itime", UdAlsMode::kItime},
    {"delay", UdAlsMode::kDelay},
    {"set_te2", UdAlsMode::kSetTe2},
    {"pwm", UdAlsMode::kPwm},
    {"white", UdAlsMode::kPattern},
    {"red", UdAlsMode::kPattern},
    {"green", UdAlsMode::kPattern},
    {"blue", UdAlsMode::kPattern},
};

std::optional<UdAlsMode> subCommandOf(std::string_view word) {
  const auto* const found = std::find_if(std::begin(kSubCommands), std::end(kSubCommands),
                                         [word](const SubCommand& row) { return row.word == word; });
  if (found == std::end(kSubCommands)) return std::nullopt;
  return found->mode;
}

/// Reads the words one by one; what a word means depends on the mode that those before it have led to.
class WordMachine {
 public:
  WordMachine(const std::vector<const char*>& words, Arguments* arguments)
      : words_(words), arguments_(*arguments) {}

  /// The error's text, or nothing.
  [[nodiscard]] std::string TakeAll() {
    while (next_ < words_.size() && !isFull()) {
      std::string error = takeWord();
      if (!error.empty()) return error;
    }
    return {};
  }
  [[nodiscard]] std::size_t next() const { return next_; }

 private:
  /// Whether no further word has a meaning.
  [[nodiscard]] bool isFull() const {
    switch (arguments_.mode) {
      case UdAlsMode::kTriggerDisable:
      case UdAlsMode::kAutoGainDisable:
      case UdAlsMode::kAutoGainEnable:
      case UdAlsMode::kSample:
        return true;
      default:
        return false;
    }
  }

  std::string takeWord() {
    const std::size_t place = next_;
    const char* const word = words_[next_++];
    switch (arguments_.mode) {
      case UdAlsMode::kLux:
        return place == 0 ? takeFirst(word) : takeReference(place, word);
      case UdAlsMode::kTrigger:
        return takeSwitch(word, UdAlsMode::kTriggerDisable, UdAlsMode::kTriggerEnable);
      case UdAlsMode::kAutoGain:
        return takeSwitch(word, UdAlsMode::kAutoGainDisable, UdAlsMode::kAutoGainEnable);
      case UdAlsMode::kGain:
      case UdAlsMode::kItimeThenGain:
        return takeOrTurn(word, "itime", UdAlsMode::kGainThenItime, kGain);
      case UdAlsMode::kItime:
      case UdAlsMode::kGainThenItime:
        return takeOrTurn(word, "gain", UdAlsMode::kItimeThenGain, kItime);
      default:
        return takeListed(word);
    }
  }

  std::string takeFirst(const char* word) {
    const std::optional<UdAlsMode> mode = subCommandOf(word);
    if (!mode) return takeReference(0, word);
    arguments_.mode = *mode;
    if (*mode == UdAlsMode::kPattern) arguments_.patternColor = word;
    const bool isIr = *mode == UdAlsMode::kGainCalibration && next_ < words_.size() &&
                      std::string_view(words_[next_]) == "ir";
    if (isIr) {
      arguments_.mode = UdAlsMode::kIrGainCalibration;
      ++next_;
    }
    return {};
  }

  /// LUX, CCT, the display's colour and its brightness. An empty colour is none: the next word is asked
  /// again.
  std::string takeReference(std::size_t place, const char* word) {
    if (place == 0) return take(kLux, word, &arguments_);
    if (place == 1) return take(kCct, word, &arguments_);
    if (arguments_.displayColor.empty()) {
      arguments_.displayColor = word;
      return {};
    }
    if (arguments_.brightness < 0) return take(kBrightness, word, &arguments_);
    return invalid(word);
  }

  std::string takeSwitch(const char* word, UdAlsMode disable, UdAlsMode enable) {
    const bool enables = std::string_view(word) == "enable";
    if (!enables && std::string_view(word) != "disable") return invalid(word);
    arguments_.mode = enables ? enable : disable;
    return {};
  }

  /// The word that turns to the other setting, or this setting's number, which replaces one before it.
  std::string takeOrTurn(const char* word, std::string_view turn, UdAlsMode other, const NumberWord& number) {
    if (word != turn) return take(number, word, &arguments_);
    arguments_.mode = other;
    return {};
  }

  std::string takeListed(const char* word) {
    const NumberList* const list = numberListOf(arguments_.mode);
    if (list == nullptr) return invalid(word);
    const std::size_t place = listed_++;
    if (place < list->numbers.size()) return take(list->numbers[place], word, &arguments_);
    return list->rest == Rest::kIgnored ? std::string() : take(list->numbers.back(), word, &arguments_);
  }

  const std::vector<const char*>& words_;
  Arguments& arguments_;
  std::size_t next_ = 0;
  std::size_t listed_ = 0;  ///< how many words of the sub-command's list have been read
};

// What must not be missing. A gain of -1 is in its range, yet counts as missing here.

bool hasItimeAndGain(const Arguments& arguments) {
  return arguments.gain >= 0 && arguments.integrationTime >= 0;
}

/// The error's text when a word is missing, else nothing. "calgain ir" may lack its numbers and then sends
/// what stands for "not given"; so may the settings of the sensor.
std::string missingWord(const Arguments& a) {
  constexpr const char* kNoScan = "No gain or integration time or start end step of delay specified";
  const auto require = [](bool isThere, const char* message) { return isThere ? "" : message; };
  switch (a.mode) {
    case UdAlsMode::kLux:
      return require(a.referenceLux >= 0, "No reference lux was specified");
    case UdAlsMode::kDelayCalibration:
      return require(hasItimeAndGain(a) && a.delayStart >= 0 && a.delayEnd >= 0 && a.delayStep >= 0, kNoScan);
    case UdAlsMode::kTe2DelayCalibration:
      return require(hasItimeAndGain(a) && a.alsDelay >= 0 && a.te2DelayStart >= 0 && a.te2DelayEnd >= 0 &&
                         a.te2DelayStep >= 0,
                     kNoScan);
    case UdAlsMode::kGainCalibration:
      return require(hasItimeAndGain(a), "No gain or integration time specified");
    case UdAlsMode::kPwm:
      return require(hasItimeAndGain(a) && a.brightness >= 0,
                     "No gain or integration time or brightness level specified");
    case UdAlsMode::kPattern:
      return require(a.brightness >= 0, "No brightness level specified");
    case UdAlsMode::kDelay:
      return require(a.alsDelay >= 0, "No ALS delay specified");
    case UdAlsMode::kSetTe2:
      return require(a.risingEdgeDelay >= 0 && a.fallingEdgeDelay >= 0,
                     "No rising or falling edge delay specified");
    default:
      return {};
  }
}

/// A scan whose steps are lost in rounding would go on for ever.
std::string endlessScan(const Arguments& a) {
  constexpr const char* kTooSmall = "Delay step is too small to get from start to end";
  if (a.mode == UdAlsMode::kDelayCalibration && !scanAdvances(a.delayStart, a.delayEnd, a.delayStep)) {
    return kTooSmall;
  }
  if (a.mode == UdAlsMode::kTe2DelayCalibration &&
      !scanAdvances(a.te2DelayStart, a.te2DelayEnd, a.te2DelayStep)) {
    return kTooSmall;
  }
  return {};
}

}  // namespace

std::string parseUdAlsWords(const std::vector<const char*>& words, UdAlsArguments* arguments,
                            std::size_t* firstIgnored) {
  WordMachine machine(words, arguments);
  std::string error = machine.TakeAll();
  *firstIgnored = machine.next();
  if (error.empty()) error = missingWord(*arguments);
  if (error.empty()) error = endlessScan(*arguments);
  return error;
}

bool scanAdvances(float start, float end, float step) {
  if (!(start <= end)) return true;
  // Neighbouring floats lie farthest apart at the end. More than half their distance rounds to the next one;
  // half of it may round back.
  constexpr int kFractionBits = std::numeric_limits<float>::digits - 1;
  constexpr int kLeastExponent = std::numeric_limits<float>::min_exponent - 1;
  const int exponent = std::max(end > 0 ? std::ilogb(end) : kLeastExponent, kLeastExponent);
  return static_cast<double>(step) > std::ldexp(0.5, exponent - kFractionBits);
}
