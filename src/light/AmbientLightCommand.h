#pragma once

#include <cstdint>
#include <functional>
#include <string>

#include "framework/Calibrator.h"
#include "light/LuxScale.h"

/// What all variants of "als" are made of: one streaming light sensor, found once; so many readings of high
/// accuracy; a comparison with a reference; and the registry group of the sensor's calibration.
class AmbientLightCommand : public Calibrator {
 public:
  /// Finds the sensor, once. 0, or the failure of the look-up after a level-0 message.
  [[nodiscard]] int LookupSuid();

  /// Keeps samples of high accuracy only; true when there are enough of them.
  bool OnSensorEvent(const ssc::SensorUid& eventSuid, std::uint64_t timestamp,
                     const sns_std_sensor_event& event) override;

 protected:
  /// The sensor that a variant reads, and how fast.
  struct Source {
    const char* dataType;
    std::int32_t rateHz;
    std::size_t valuesPerEvent;  ///< an event with fewer is dropped
    std::int32_t defaultSamples;
  };

  /// The texts must outlive the command.
  AmbientLightCommand(ssc::Connection* hubConnection, const char* usage, const char* options,
                      const Source& source);

  // Arguments.

  /// What every ParseArgs begins with.
  void SetDefaults(const Arguments& arguments);
  /// Carries out -c, -h, -s SAMPLES and -v PERCENT; any other option is a usage error. 0, kHelpPrinted or
  /// ssc::kInvalid.
  [[nodiscard]] int HandleOption(const Arguments& arguments, int option, const char* argument);
  [[nodiscard]] bool IsVerifying() const { return verifyPercent > 0; }

  // Measuring.

  [[nodiscard]] bool HasEnoughSamples() const;
  /// What the samples are to be multiplied by: 1 with -c or when the registry has no factor.
  [[nodiscard]] float CorrectionFactorOf(const sns_registry_data& data) const;
  /// For a verification: the factor of the stored group. With -c the registry is not asked. 0 or the
  /// library's result.
  [[nodiscard]] int ReadCorrectionFactor(float* factor);
  /// Prints the mean and, of two samples or more, the deviation. ssc::kInvalid after a level-0 message for a
  /// mean that is not finite: an infinite one would make a harmless looking scale of 0, and one that is not a
  /// number would pass every comparison.
  [[nodiscard]] int ReportMeasurement(const LuxMeasurement& measurement) const;
  /// Prints how far the mean lies from the reference. 0 within the tolerance, else ssc::kInvalid.
  [[nodiscard]] int CompareWithReference(float mean, float referenceLux) const;

  // Storing.

  [[nodiscard]] std::string GroupName() const;
  /// The factory test makes the sensor read its calibration again. Its answer is not waited for.
  [[nodiscard]] int RequestReread();
  /// The whole of a reset: finds the sensor, reads its group, lets `change` put the defaults into it (0, or a
  /// result that ends the reset with nothing written), writes it and makes the sensor read it. Asks for a
  /// reboot when the latter cannot be sent. Knows no dry run.
  [[nodiscard]] int RestoreDefaults(const std::function<int(sns_registry_data*)>& change);

  bool correctedOnly = false;  ///< samples are used as the sensor reports them
  std::int32_t sampleCount = 0;
  float verifyPercent = 0;  ///< 0: no verification
  ssc::SensorUid suid;

 private:
  const Source source_;
  std::string sensorName_;  ///< the sensor's package
};
