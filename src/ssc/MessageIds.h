// Message ids of requests to the hub and of its events. What a sensor family adds stands with its calibrator.
#pragma once

#include <cstdint>

namespace ssc {

// To and from any sensor.
inline constexpr std::uint32_t kAttributesRequest = 1;
inline constexpr std::uint32_t kDisableRequest = 10;
inline constexpr std::uint32_t kAttributesEvent = 128;
inline constexpr std::uint32_t kErrorEvent = 130;

// The SUID look-up sensor.
inline constexpr std::uint32_t kSuidRequest = 512;
inline constexpr std::uint32_t kSuidEvent = 768;

// The registry sensor.
inline constexpr std::uint32_t kRegistryReadRequest = 512;
inline constexpr std::uint32_t kRegistryWriteRequest = 513;
inline constexpr std::uint32_t kRegistryReadEvent = 768;
inline constexpr std::uint32_t kRegistryWriteEvent = 769;

// Streaming and on-change sensors.
inline constexpr std::uint32_t kStreamConfigRequest = 513;
inline constexpr std::uint32_t kOnChangeConfigRequest = 514;
inline constexpr std::uint32_t kSensorEvent = 1025;

// Physical sensors.
inline constexpr std::uint32_t kTestRequest = 515;
inline constexpr std::uint32_t kTestEvent = 1026;
inline constexpr std::uint32_t kCalibrationChangedRequest = 610;
inline constexpr std::uint32_t kCalibrationChangedReply = 1110;

/// Data type of the sensor that holds the registry.
inline constexpr const char* kRegistryDataType = "registry";

}  // namespace ssc
