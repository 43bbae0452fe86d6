// The records of a color calibration: saved by each step, loaded by the last, and what they come to.
#include <algorithm>

#include "framework/Fits.h"
#include "framework/RegistryItems.h"
#include "framework/Statistics.h"
#include "light/ColorCalibrator.h"
#include "light/ColorFiles.h"
#include "light/ColorRecord.h"
#include "ssc/DevicePath.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace {

constexpr std::size_t kMinRecords = 2;      // besides the infrared lamp's
constexpr std::int64_t kLayoutVersion = 4;  // of the two groups, known to the driver

}  // namespace

int ColorCalibrator::SaveData(const SampleData& means) {
  if (means.size() < color_means::kCount) {
    ssc::log(ssc::kLogError, "Insufficient data (only %zu item%s)", means.size(),
             means.size() == 1 ? "" : "s");
    return ssc::kNoData;
  }
  ssc::say("Saving data to file...\n");
  appendToLog(means);
  std::string record;
  appendFloats(colorRecord(referenceLux, referenceCct, means), &record);
  switch (appendToFile(ssc::devicePath(kColorDataFile), record, fileStart())) {
    case FileResult::kOk:
      return ssc::kOk;
    case FileResult::kCannotOpen:
      ssc::log(ssc::kLogError, "Failed to open color calibration data file");
      return ssc::kNotPermitted;
    default:
      ssc::log(ssc::kLogError, "Failed to write data to file");
      return ssc::kShortFile;
  }
}

/// A handset without a folder for the log is calibrated all the same.
void ColorCalibrator::appendToLog(const SampleData& means) const {
  const std::string line = colorLogLine(referenceLux, referenceCct, means);
  const FileResult result = appendLinesToFile(ssc::devicePath(kColorLogFile),
                                              (clearData ? kColorLogHeader : "") + line, fileStart());
  if (result == FileResult::kFailed) ssc::log(ssc::kLogWarn, "Failed to write to %s", kColorLogFile);
}

int ColorCalibrator::LoadData(std::vector<SampleData>* records) {
  if (records == nullptr) {
    ssc::log(ssc::kLogError, "Cannot load data into null vector");
    return ssc::kInvalid;
  }
  ssc::say("Reading data file...\n");
  std::string content;
  const FileResult result = readWholeFile(ssc::devicePath(kColorDataFile), kMaxColorDataBytes, &content);
  if (result == FileResult::kCannotOpen) {
    ssc::log(ssc::kLogError, "Failed to open color calibration data file");
    return ssc::kNotPermitted;
  }
  records->clear();
  if (result == FileResult::kTooLarge) {
    ssc::log(ssc::kLogError, "Color calibration data file is larger than %zu bytes", kMaxColorDataBytes);
    return ssc::kInvalid;
  }
  const FileResult split = splitFloatRecords(content, color_record::kCount, records);
  if (result == FileResult::kFailed) {
    ssc::log(ssc::kLogError, "Failed to read data from file");
    return ssc::kShortFile;
  }
  if (split == FileResult::kIncomplete) {
    ssc::log(ssc::kLogError, "Data file is incomplete");
    return ssc::kNoData;
  }
  ssc::log(ssc::kLogInfo, "Got %zu records", records->size());
  return ssc::kOk;
}

int ColorCalibrator::Calibrate() { return Conclude("Calibration", computeAndStore()); }

int ColorCalibrator::computeAndStore() {
  std::vector<SampleData> records;
  int result = LoadData(&records);
  Parameters parameters;
  if (result == ssc::kOk) result = compute(std::move(records), &parameters);
  if (result != ssc::kOk || SkipsWrite()) return result;
  ssc::say("Reading registry...\n");
  sns_registry_data als;
  sns_registry_data color;
  result = readGroups(&als, &color);
  if (result == ssc::kOk) result = writeGroups(parameters, std::move(als), std::move(color));
  if (result == ssc::kOk) NotifyOrWarn({alsSuid, colorSuid});
  return result;
}

int ColorCalibrator::compute(std::vector<SampleData> records, Parameters* parameters) {
  SampleData irOnly;
  int result = takeIrOnly(&records, &irOnly);
  if (result != ssc::kOk) return result;
  parameters->crosstalk = irCrosstalk(irOnly);
  ssc::say("\nCROSSTALK: %14.6f\n", static_cast<double>(parameters->crosstalk));
  if (records.size() < kMinRecords) {
    ssc::log(ssc::kLogError, "Insufficient data to compute lux scale");
    return ssc::kNoData;
  }
  parameters->irRatio = irRatio(irOnly, records.front());
  if (parameters->irRatio) {
    ssc::say("\nIR_RATIO:  %14.6f\n", static_cast<double>(*parameters->irRatio));
  }
  parameters->luxScale = meanLuxScale(records);
  ssc::say("LUX_SCALE: %14.6f\n", static_cast<double>(parameters->luxScale));
  parameters->bmScale = meanBmScale(records);
  ssc::say("BM_SCALE:  %14.6f\n\n", static_cast<double>(*parameters->bmScale));
  result = fitLines(records, parameters);
  return result == ssc::kOk ? checkFinite(*parameters) : result;
}

int ColorCalibrator::takeIrOnly(std::vector<SampleData>* records, SampleData* irOnly) {
  // Only the first: further ones count as light sources like the others.
  const auto found = std::find_if(records->begin(), records->end(), [](const SampleData& record) {
    return record[color_record::kReferenceLux] <= 0;
  });
  if (found == records->end()) {
    ssc::log(ssc::kLogError, "Missing IR-only data (reference lux = 0)");
    return ssc::kNoData;
  }
  *irOnly = *found;
  records->erase(found);
  if ((*irOnly)[color_record::kIr] > 0) return ssc::kOk;
  ssc::log(ssc::kLogError, "Invalid IR-only data");
  return ssc::kInvalid;
}

int ColorCalibrator::fitLines(const std::vector<SampleData>& records, Parameters* parameters) {
  const struct {
    const char* name;
    const char* line;
    ColorPoints points;
    SampleData* fit;
  } fits[] = {{"B/R", "BR_FIT:   %s\n", blueRedPoints(records), &parameters->brFit},
              {"Bm/Rm", "BMRM_FIT: %s\n", minusBlueRedPoints(records), &parameters->bmrmFit},
              {"B/C", "BOC_FIT:  %s\n\n", blueClearPoints(records), &parameters->bocFit}};
  for (const auto& [name, line, points, fit] : fits) {
    if (!linearFit(points, fit)) {
      ssc::log(ssc::kLogError, "Insufficient data to compute linear %s fit", name);
      return ssc::kNoData;
    }
    for (float& coefficient : *fit) coefficient = withPlainNan(coefficient);
    ssc::say(line, fit->format(14, 6).c_str());
  }
  return ssc::kOk;
}

int ColorCalibrator::checkFinite(const Parameters& parameters) {
  const std::pair<const char*, SampleData> values[] = {
      {"CROSSTALK", {parameters.crosstalk}}, {"IR_RATIO", {parameters.irRatio.value_or(0)}},
      {"LUX_SCALE", {parameters.luxScale}},  {"BM_SCALE", {parameters.bmScale.value_or(0)}},
      {"BR_FIT", parameters.brFit},          {"BMRM_FIT", parameters.bmrmFit},
      {"BOC_FIT", parameters.bocFit}};
  for (const auto& [name, numbers] : values) {
    const int result = RequireFinite(name, numbers.toVector());
    if (result != ssc::kOk) return result;
  }
  return ssc::kOk;
}

int ColorCalibrator::readGroups(sns_registry_data* als, sns_registry_data* color) {
  ssc::RegistryUtil registry(connection);
  const int result = registry.Read(alsGroup(), als);
  return result == ssc::kOk ? registry.Read(colorGroup(), color) : result;
}

int ColorCalibrator::writeGroups(const Parameters& parameters, sns_registry_data als,
                                 sns_registry_data color) {
  setIntItem("version", kLayoutVersion, &als);
  setFloatItem("scale", parameters.luxScale, &als);
  if (parameters.bmScale) setFloatItem("bm_scale", *parameters.bmScale, &als);
  setIntItem("version", kLayoutVersion, &color);
  setFloatItem("xtalk", parameters.crosstalk, &color);
  setFloatItem("ratio_coef0", parameters.brFit[0], &color);
  setFloatItem("ratio_coef1", parameters.brFit[1], &color);
  setFloatItem("bmrm_coef0", parameters.bmrmFit[0], &color);
  setFloatItem("bmrm_coef1", parameters.bmrmFit[1], &color);
  setFloatItem("boc_low_coef0", parameters.bocFit[0], &color);
  setFloatItem("boc_low_coef1", parameters.bocFit[1], &color);
  setFloatItem("boc_low_coef2", 0.0F, &color);  // the driver's line may be a parabola
  if (parameters.irRatio > 0.0F) setFloatItem("irc_ratio", *parameters.irRatio, &color);
  return WriteRegistry({{alsGroup(), &als}, {colorGroup(), &color}});
}

int ColorCalibrator::Reset() {
  int result = FindSensors();
  if (result != ssc::kOk) return result;
  ssc::say("Resetting calibration...\n");
  sns_registry_data als;
  sns_registry_data color;
  result = readGroups(&als, &color);
  // "bm_scale" and "irc_ratio" keep their values.
  if (result == ssc::kOk) result = writeGroups(Parameters(), std::move(als), std::move(color));
  if (result != ssc::kOk) return result;
  NotifyOrWarn({alsSuid, colorSuid}, "Unable to notify sensor that calibration was reset",
               "A reboot may be required");
  return ssc::kOk;
}
