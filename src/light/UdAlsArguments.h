// The words of "als" on handsets whose light sensor looks through the display. Nothing here knows a hub.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

/// What a run is to do. The first word decides it; later words may move it on.
enum class UdAlsMode : std::uint32_t {
  kTrigger = 0,              ///< "trigger" alone: disables
  kTriggerDisable = 1,       ///< "trigger disable"
  kTriggerEnable = 2,        ///< "trigger enable DELAY"
  kAutoGain = 3,             ///< "autogain" alone: disables
  kAutoGainDisable = 4,      ///< "autogain disable"
  kAutoGainEnable = 5,       ///< "autogain enable"
  kDelayCalibration = 6,     ///< "caldelay …"
  kTe2DelayCalibration = 7,  ///< "caldelay_te2 …"
  kLux = 8,                  ///< no sub-command: "LUX [CCT [COLOUR [BRIGHTNESS]]]"
  kGainCalibration = 9,      ///< "calgain …"
  kIrGainCalibration = 10,   ///< "calgain ir …"
  kPwm = 11,                 ///< "pwm …"
  kSample = 12,              ///< "sample"
  kPattern = 13,             ///< "white", "red", "green" or "blue" BRIGHTNESS
  kDelay = 14,               ///< "delay DELAY"
  kGain = 15,                ///< "gain GAIN"
  kGainThenItime = 16,       ///< "gain GAIN itime ITIME"
  kItime = 17,               ///< "itime ITIME"
  kItimeThenGain = 18,       ///< "itime ITIME gain GAIN"
  kSetTe2 = 19,              ///< "set_te2 RISING FALLING"
};

/// What was asked for. Numbers are -1 where nothing was.
struct UdAlsArguments {
  static constexpr float kNotGiven = -1.0F;

  // Options.
  bool clearData = false;          ///< -r: start the files of this step afresh
  bool clearOnly = false;          ///< -R: delete the working file, and nothing else
  bool writeAfterCollect = false;  ///< -w, -W: compute and store
  bool writeOnly = false;          ///< -W: without a step of its own before

  // Words.
  UdAlsMode mode = UdAlsMode::kLux;
  float referenceLux = kNotGiven;
  float referenceCct = kNotGiven;      ///< K
  std::string displayColor;            ///< a label for the log; empty: none
  float brightness = kNotGiven;        ///< of the display, 0 to 255
  std::string patternColor;            ///< "white", "red", "green" or "blue"; kept, not written down
  std::int32_t gain = -1;              ///< setting 0 to 11; each is twice the one before
  float integrationTime = kNotGiven;   ///< µs
  float alsDelay = kNotGiven;          ///< ms from the display's refresh to the integration
  float delayStart = kNotGiven;        ///< ms
  float delayEnd = kNotGiven;          ///< ms
  float delayStep = kNotGiven;         ///< ms
  float te2DelayStart = kNotGiven;     ///< lines of the display
  float te2DelayEnd = kNotGiven;       ///< lines
  float te2DelayStep = kNotGiven;      ///< lines
  std::int32_t risingEdgeDelay = -1;   ///< lines
  std::int32_t fallingEdgeDelay = -1;  ///< lines
};

/// Reads the words behind the options. The error's text, or nothing when the words are sound and complete;
/// `firstIgnored` is then the index from which on words have no meaning and are worth a warning each.
[[nodiscard]] std::string parseUdAlsWords(const std::vector<const char*>& words, UdAlsArguments* arguments,
                                          std::size_t* firstIgnored);

/// Whether `value` += `step` gets from `start` beyond `end`: a step too small for single precision would stay
/// where it is. True also when there is nothing to scan.
[[nodiscard]] bool scanAdvances(float start, float end, float step);
