// Any bytes in the place of the file between the steps of a multi-point calibration, taken for either of its
// formats, and what the last step would make of them.
#include <cmath>
#include <string>
#include <vector>

#include "fuzz/FuzzCheck.h"
#include "imu/ImuMultipointFile.h"
#include "imu/ImuMultipointFit.h"
#include "imu/ImuMultipointSolution.h"

namespace {

using fuzz::check;

const Matrix3by3<double> kReference({9.8, 0, 0, 0, 9.8, 0, 0, 0, 9.8});
const ImuTrace kNoTrace = [](const std::string&) {};

void takeForLines(const std::string& content) {
  const std::vector<ImuCalibrationInfo> records = parseCalibrationInfos(content);
  for (const ImuCalibrationInfo& record : records) {
    check(record.IsFinite(), "what a line says is finite");
    check(record.status == 0, "what was read counts as valid");
    if (record.phase.empty()) continue;
    const ImuCalibrationInfo again(record.ToString());
    check(again.phase == record.phase, "a record keeps its phase");
    for (std::size_t axis = 0; axis < 3; ++axis) {
      const double scale = std::fabs(record.accel_mean[axis]);
      // Near the largest double the last of sixteen digits may round up, out of range.
      if (scale > 1e300) break;
      check(std::fabs(again.accel_mean[axis] - record.accel_mean[axis]) <= 1e-14 * scale + 1e-300,
            "a record keeps its numbers");
    }
  }
  const AccelCalibrationInput accel = makeAccelInput(records, kReference);
  check(!accel.valid || records.size() >= 6, "six poses make an accelerometer's input");
  if (accel.valid) check(solveAccel(accel, kNoTrace).valid, "an accelerometer is always solved");
  const GyroCalibrationInput gyro = makeGyroInput(records, kReference);
  check(!gyro.valid || (accel.valid && gyro.fault.empty()), "a valid input has no fault");
  if (gyro.valid) (void)solveGyro(gyro, kNoTrace);
  check(!accel.ToString().empty() && !gyro.ToString().empty(), "inputs can be shown");
}

void takeForPositions(const std::string& content) {
  constexpr std::size_t kRecord = 28;
  std::vector<ImuPosition> positions;
  const FileResult result = parsePositions(content, &positions);
  check(positions.size() == content.size() / kRecord, "every whole record is a position");
  check((result == FileResult::kOk) == (content.size() % kRecord == 0), "a torn record is noticed");
  std::vector<SampleData> means;
  for (const ImuPosition& position : positions) {
    check(position.accel.size() == 3 && position.gyro.size() == 3 && position.temp.size() == 1,
          "a position has three, three and one values");
    means.push_back(position.accel);
  }
  if (means.size() >= kMinPositions) (void)fitAccel(means, 9.80665F);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string content(data, data + size);
  takeForLines(content);
  takeForPositions(content);
  return 0;
}
