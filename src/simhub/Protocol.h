// The numbers of the hub's protocol: message ids, attribute ids and QMI results. The messages themselves are
// in proto/, the framing in qmi/.
#pragma once

#include <cstdint>

namespace simhub {

// Any sensor.
inline constexpr std::uint32_t kAttributesRequest = 1;
inline constexpr std::uint32_t kDisableRequest = 10;
inline constexpr std::uint32_t kAttributesEvent = 128;
inline constexpr std::uint32_t kErrorEvent = 130;

// The look-up sensor.
inline constexpr std::uint32_t kSuidRequest = 512;
inline constexpr std::uint32_t kSuidEvent = 768;

// The registry sensor.
inline constexpr std::uint32_t kRegistryReadRequest = 512;
inline constexpr std::uint32_t kRegistryWriteRequest = 513;
inline constexpr std::uint32_t kRegistryReadEvent = 768;
inline constexpr std::uint32_t kRegistryWriteEvent = 769;

// Sensors that measure.
inline constexpr std::uint32_t kStreamConfigRequest = 513;
inline constexpr std::uint32_t kOnChangeConfigRequest = 514;
inline constexpr std::uint32_t kTestRequest = 515;
inline constexpr std::uint32_t kCalibrationChangedRequest = 610;
inline constexpr std::uint32_t kSensorEvent = 1025;
inline constexpr std::uint32_t kProximityEvent = 769;  // of a proximity sensor, instead of the sensor event
inline constexpr std::uint32_t kTestEvent = 1026;
inline constexpr std::uint32_t kCalibrationChangedReply = 1110;

// The light sensor under the display. Each of its requests is answered by the event of the next id.
inline constexpr std::uint32_t kAlsTriggerRequest = 7800;
inline constexpr std::uint32_t kAlsAutoGainRequest = 7802;
inline constexpr std::uint32_t kAlsDelayCalibrationRequest = 7804;
inline constexpr std::uint32_t kAlsGainCalibrationRequest = 7806;
inline constexpr std::uint32_t kAlsPwmRequest = 7808;
inline constexpr std::uint32_t kAlsSetGainRequest = 7810;
inline constexpr std::uint32_t kAlsSetIntegrationTimeRequest = 7812;
inline constexpr std::uint32_t kAlsSetGainAndIntegrationTimeRequest = 7814;

// Attributes.
inline constexpr int kAttributeName = 0;
inline constexpr int kAttributeVendor = 1;
inline constexpr int kAttributeDataType = 2;
inline constexpr int kAttributeAvailable = 3;
inline constexpr int kAttributeVersion = 4;
inline constexpr int kAttributeRates = 6;
inline constexpr int kAttributeResolutions = 7;
inline constexpr int kAttributeRanges = 11;
inline constexpr int kAttributeStreamType = 16;
inline constexpr int kAttributeRigidBody = 18;
inline constexpr int kAttributePhysicalSensor = 20;
inline constexpr int kAttributeSelectedResolution = 22;
inline constexpr int kAttributeSelectedRange = 23;
inline constexpr int kAttributeHardwareId = 29;

// QMI results and the error codes that go with a failure.
inline constexpr std::uint16_t kQmiSuccess = 0;
inline constexpr std::uint16_t kQmiFailure = 1;
inline constexpr std::uint16_t kQmiMalformedMessage = 1;
inline constexpr std::uint16_t kQmiInternalError = 3;
inline constexpr std::uint16_t kQmiInvalidId = 41;

inline constexpr const char* kSuidDataType = "suid";
inline constexpr const char* kRegistryDataType = "registry";

}  // namespace simhub
