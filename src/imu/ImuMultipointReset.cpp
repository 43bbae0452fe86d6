#include "framework/RegistryItems.h"
#include "imu/ImuMultipointCalibrator.h"
#include "imu/ImuMultipointRegistry.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

int ImuMultipointCalibrator::Reset() {
  int result = LookupSuids();
  if (result == ssc::kOk) result = resetAccel();
  if (result == ssc::kOk) result = resetGyro();
  if (result == ssc::kOk) ssc::say("Reboot device for default calibration to take effect.\n");
  return result;
}

int ImuMultipointCalibrator::resetAccel() {
  const std::string group = packageName_ + kAccelGroupSuffix;
  ssc::RegistryUtil registry(connection);
  sns_registry_data data;
  int result = registry.Read(group, &data);
  if (result != ssc::kOk) return result;
  ssc::say("Resetting IMU multi-point calibration...\n");
  // Of whatever kind: a reset is how a broken item is repaired.
  result = requireItem(kCorrectionMatrix, data, "accel");
  if (result == ssc::kOk) result = requireItem(kBias, data, "accel");
  if (result != ssc::kOk) return result;
  setMatrixItem(kCorrectionMatrix, {1.0F, 1.0F, 1.0F}, &data);
  setVectorItem(kBias, {0.0F, 0.0F, 0.0F}, &data);
  setFloatItem(kMeanTemp, 0.0F, &data);
  return StoreGroup(registry, group, data);
}

/// Leaves the correction matrix alone, which only some handsets have.
int ImuMultipointCalibrator::resetGyro() {
  const std::string group = packageName_ + kGyroGroupSuffix;
  ssc::RegistryUtil registry(connection);
  sns_registry_data data;
  int result = registry.Read(group, &data);
  if (result == ssc::kOk) result = requireItem(kBias, data, "gyro");
  if (result != ssc::kOk) return result;
  setVectorItem(kBias, {0.0F, 0.0F, 0.0F}, &data);
  setFloatItem(kMeanTemp, 0.0F, &data);
  return StoreGroup(registry, group, data);
}
