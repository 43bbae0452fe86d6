#include "imu/ImuMultipointFile.h"

#include <algorithm>
#include <cmath>
#include <sstream>

namespace {

constexpr std::size_t kPositionFloats = 7;
constexpr int kDigits = 16;

}  // namespace

ImuCalibrationInfo::ImuCalibrationInfo(const std::string& line) {
  std::istringstream stream(line);
  stream >> phase;
  const auto parse = [&stream](double& value) {
    // A number out of range would otherwise become the largest one.
    if (!(stream >> value)) value = 0;
  };
  std::for_each(accel_mean.begin(), accel_mean.end(), parse);
  std::for_each(gyro_mean.begin(), gyro_mean.end(), parse);
  parse(temp_mean);
  parse(rotation_integration_time);
  std::for_each(rotation_integration.begin(), rotation_integration.end(), parse);
}

std::string ImuCalibrationInfo::ToString() const {
  std::ostringstream text;
  text.precision(kDigits);
  text << phase;
  const auto write = [&text](double value) { text << ' ' << value; };
  std::for_each(accel_mean.begin(), accel_mean.end(), write);
  std::for_each(gyro_mean.begin(), gyro_mean.end(), write);
  write(temp_mean);
  write(rotation_integration_time);
  std::for_each(rotation_integration.begin(), rotation_integration.end(), write);
  return text.str();
}

bool ImuCalibrationInfo::IsFinite() const {
  const auto isFinite = [](double value) { return std::isfinite(value); };
  return std::all_of(accel_mean.begin(), accel_mean.end(), isFinite) &&
         std::all_of(gyro_mean.begin(), gyro_mean.end(), isFinite) && isFinite(temp_mean) &&
         isFinite(rotation_integration_time) &&
         std::all_of(rotation_integration.begin(), rotation_integration.end(), isFinite);
}

FileResult appendCalibrationInfo(const ImuCalibrationInfo& info, const std::string& path, bool* dropped) {
  return appendLinesToFile(path, info.ToString() + '\n', FileStart::kKeep, dropped);
}

std::vector<ImuCalibrationInfo> parseCalibrationInfos(const std::string& content) {
  std::vector<ImuCalibrationInfo> infos;
  std::istringstream stream(content);
  for (std::string line; std::getline(stream, line);) infos.emplace_back(line);
  return infos;
}

FileResult readCalibrationInfos(const std::string& path, std::vector<ImuCalibrationInfo>* infos) {
  infos->clear();
  std::string content;
  const FileResult result = readWholeFile(path, kMaxImuFileBytes, &content);
  if (result == FileResult::kOk) *infos = parseCalibrationInfos(content);
  return result;
}

FileResult appendPosition(const ImuPosition& position, const std::string& path, FileStart start) {
  std::string record;
  for (const SampleData* block : {&position.accel, &position.gyro, &position.temp}) {
    appendFloats(*block, &record);
  }
  return appendToFile(path, record, start);
}

FileResult parsePositions(const std::string& content, std::vector<ImuPosition>* positions) {
  std::vector<SampleData> records;
  const FileResult result = splitFloatRecords(content, kPositionFloats, &records);
  positions->clear();
  for (const SampleData& record : records) {
    const float* const values = record.begin();
    positions->push_back({{values, values + 3}, {values + 3, values + 6}, {values + 6, values + 7}});
  }
  return result;
}

FileResult readPositions(const std::string& path, std::vector<ImuPosition>* positions) {
  positions->clear();
  std::string content;
  const FileResult result = readWholeFile(path, kMaxImuFileBytes, &content);
  return result == FileResult::kOk ? parsePositions(content, positions) : result;
}
