#pragma once

#include <functional>

#include "framework/Calibrator.h"

/// A calibrator without a procedure: opens the base's steps to tests.
class PlainCalibrator : public Calibrator {
 public:
  explicit PlainCalibrator(ssc::Connection* hubConnection)
      : Calibrator(hubConnection, "Usage: vantle plain [-h]\n", "Options:\n  -h\n\n") {}

  int Run(const Arguments& arguments) override {
    CopyGlobalOptions(arguments);
    return 0;
  }

  bool OnSensorEvent(const ssc::SensorUid& suid, std::uint64_t timestamp,
                     const sns_std_sensor_event& event) override {
    Calibrator::OnSensorEvent(suid, timestamp, event);
    return endsAfter && endsAfter(samples[suid].size());
  }

  bool OnOtherEvent(const Event& event) override { return onOtherEvent && onOtherEvent(event.msg_id()); }

  std::function<bool(std::size_t count)> endsAfter;
  std::function<bool(std::uint32_t messageId)> onOtherEvent;

  using Calibrator::AskSensor;
  using Calibrator::awaitsAnswer;
  using Calibrator::CollectSamples;
  using Calibrator::Conclude;
  using Calibrator::CopyGlobalOptions;
  using Calibrator::DeviceHasMagTemp;
  using Calibrator::deviceType;
  using Calibrator::DisableAllSensors;
  using Calibrator::dryRun;
  using Calibrator::GetAllConfigRequests;
  using Calibrator::IgnoreExtraArguments;
  using Calibrator::InvalidOption;
  using Calibrator::IsCollected;
  using Calibrator::keepsSamples;
  using Calibrator::LookupCompanion;
  using Calibrator::LookupSuidsByName;
  using Calibrator::NotifyOrWarn;
  using Calibrator::PrintSamples;
  using Calibrator::PrintUsage;
  using Calibrator::quiet;
  using Calibrator::RequireCollected;
  using Calibrator::RequireFinite;
  using Calibrator::RequireSamples;
  using Calibrator::samples;
  using Calibrator::sensorInfo;
  using Calibrator::SetSensorInfo;
  using Calibrator::SkipsWrite;
  using Calibrator::StoreGroup;
  using Calibrator::UnsupportedDevice;
  using Calibrator::UsageError;
  using Calibrator::WriteFailure;
  using Calibrator::WriteRegistry;
  using Calibrator::WriteRegistryGroups;
};
