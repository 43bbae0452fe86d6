// What the light sensor under the display is asked, and what it answers, beside its stream.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "light/UdAlsArguments.h"

// A request has an even message id; the event that answers it has the next one.
inline constexpr std::uint32_t kUdAlsTriggerRequest = 7800;
inline constexpr std::uint32_t kUdAlsAutoGainRequest = 7802;
inline constexpr std::uint32_t kUdAlsDelayCalibrationRequest = 7804;
inline constexpr std::uint32_t kUdAlsGainCalibrationRequest = 7806;
inline constexpr std::uint32_t kUdAlsPwmRequest = 7808;
inline constexpr std::uint32_t kUdAlsSetGainRequest = 7810;
inline constexpr std::uint32_t kUdAlsSetItimeRequest = 7812;
inline constexpr std::uint32_t kUdAlsSetGainItimeRequest = 7814;

struct UdAlsRequest {
  std::uint32_t messageId = 0;
  std::string payload;  ///< an encoded sns_oem_* message
  /// Said before it is sent; empty: nothing, the command says more of its own.
  const char* announcement = "";
  /// Level-0 message when it cannot be sent or is not answered.
  const char* failure = "";
};

/// The request of the arguments' mode; none for modes that only read the stream.
[[nodiscard]] std::optional<UdAlsRequest> udAlsRequestOf(const UdAlsArguments& arguments);

struct UdAlsResponse {
  enum class Kind { kSucceeded, kFailed, kMalformed };
  Kind kind = Kind::kSucceeded;
  /// Of a success a line for the user, newline included, or nothing; else the level-0 message.
  std::string text;
};

/// What an event says as the answer to a request; nothing when it is none.
[[nodiscard]] std::optional<UdAlsResponse> readUdAlsResponse(std::uint32_t messageId,
                                                             const std::string& payload);
