#pragma once

#include <memory>
#include <string>

#include "framework/Calibrator.h"

/// The calibrator of a command word on a device type; null when there is no such command.
[[nodiscard]] std::unique_ptr<Calibrator> makeCalibrator(const std::string& command, DeviceType deviceType,
                                                         ssc::Connection* connection);
