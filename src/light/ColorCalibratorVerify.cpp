// Whether a color sensor with its stored calibration shows what its light source is known for.
#include "framework/RegistryItems.h"
#include "framework/Statistics.h"
#include "light/ColorCalibrator.h"
#include "light/LuxScale.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace {

/// A group that no calibration has written yet has no version, or 0.
int requireCalibration(const sns_registry_data& data) {
  if (intItem("version", data) >= 1) return ssc::kOk;
  ssc::log(ssc::kLogError, "Cannot verify with old calibration");
  return ssc::kInvalid;
}

/// Says nothing: the driver does not write groups of that version without the item.
int readFloat(const char* name, const sns_registry_data& data, float* value) {
  const sns_registry_data_item* const item = ssc::RegistryUtil::FindDataItem(name, data);
  if (item == nullptr || !item->has_flt()) return ssc::kInvalid;
  *value = item->flt();
  return ssc::kOk;
}

}  // namespace

int ColorCalibrator::Verify() { return Conclude("Verification", measureAndCompare()); }

int ColorCalibrator::measureAndCompare() {
  // The record counts like any other: it is kept too.
  int result = CollectData();
  if (result == ssc::kOk) result = UnbatchAls();
  if (result == ssc::kOk) result = UnbatchColor();
  if (result != ssc::kOk) return result;
  PrintSamples();
  return compare(sampleFloatMean(samples[alsSuid]), sampleFloatMean(samples[colorSuid]));
}

int ColorCalibrator::UnbatchAls() {
  sns_registry_data data;
  int result = ssc::RegistryUtil(connection).Read(alsGroup(), &data);
  if (result == ssc::kOk) result = requireCalibration(data);
  float scale = 0;
  if (result == ssc::kOk) result = readFloat("scale", data, &scale);
  if (result == ssc::kOk) correctLux(scale, &samples[alsSuid]);
  return result;
}

int ColorCalibrator::UnbatchColor() {
  sns_registry_data data;
  int result = ssc::RegistryUtil(connection).Read(colorGroup(), &data);
  if (result == ssc::kOk) result = requireCalibration(data);
  float q0 = 0;
  float q1 = 0;
  if (result == ssc::kOk) result = readFloat("ratio_coef0", data, &q0);
  if (result == ssc::kOk) result = readFloat("ratio_coef1", data, &q1);
  if (result != ssc::kOk) return result;
  if (convertToCct(q0, q1, &samples[colorSuid])) return ssc::kOk;
  ssc::log(ssc::kLogError, "Avoiding division by zero");
  return ssc::kInvalid;
}

int ColorCalibrator::compare(float luxMean, float cctMean) const {
  const float luxDifference = differencePercent(luxMean, referenceLux);
  const float cctDifference = differencePercent(cctMean, referenceCct);
  ssc::say("LUX_MEAN: %14.6f\n", static_cast<double>(luxMean));
  ssc::say("CCT_MEAN: %14.6f\n", static_cast<double>(cctMean));
  ssc::say("LUX_DIFF: %14.6f%%\n", static_cast<double>(luxDifference));
  ssc::say("CCT_DIFF: %14.6f%%\n", static_cast<double>(cctDifference));
  // A mean that is not a number would pass every comparison.
  int result = RequireFinite("The mean of the ambient light", {luxMean});
  if (result == ssc::kOk) result = RequireFinite("The mean of the color temperature", {cctMean});
  if (result != ssc::kOk) return result;
  if (!isWithinTolerance(luxDifference, verifyPercent)) {
    ssc::log(ssc::kLogError, "Lux difference exceeds |%.3f%%| tolerance.\n",
             static_cast<double>(verifyPercent));
    result = ssc::kInvalid;
  }
  if (!isWithinTolerance(cctDifference, verifyPercent)) {
    ssc::log(ssc::kLogError, "CCT difference exceeds |%.3f%%| tolerance.\n",
             static_cast<double>(verifyPercent));
    result = ssc::kInvalid;
  }
  return result;
}
