// Whole color commands against a hub that the input makes odd: look-up, attributes, registry, readings,
// notification, responses. Whatever the hub does, the command must end with a result, keep its working file
// whole and store only finite numbers.
#include <chrono>
#include <cstdlib>
#include <string>
#include <vector>

#include "framework/DataFile.h"
#include "fuzz/FuzzCheck.h"
#include "fuzz/FuzzedCommand.h"
#include "fuzz/FuzzedHub.h"
#include "light/ColorCalibrator.h"
#include "light/ColorFiles.h"
#include "light/ColorRecord.h"
#include "ssc/Connection.h"
#include "ssc/DevicePath.h"
#include "support/TemporaryFolder.h"

namespace {

using fuzz::check;

/// Far beyond all the waits of one run together.
constexpr std::chrono::minutes kLongestRun{10};

/// The first byte of the input: how the command is called.
constexpr std::uint8_t kDryRun = 1;
constexpr std::uint8_t kReset = 2;
constexpr int kTaskShift = 2;
const std::vector<std::vector<std::string>> kTasks{{"color", "-s", "2", "500", "4000"},
                                                   {"color", "-s", "2", "-w", "500", "4000"},
                                                   {"color", "-W"},
                                                   {"color", "-s", "2", "-v", "100", "500", "4000"}};

/// A handset's folder for all the runs of this process.
struct Handset {
  Handset() {
    (void)::setenv("VANTLE_ROOT", folder.path().c_str(), 1);
    support::makeDeviceFolders(folder.path());
  }
  /// An infrared lamp and two light sources.
  static void prepareRecords() {
    std::string records;
    appendFloats({0, 0, 0, 6000, 12000, 3800, 4300, 51000, 9}, &records);
    appendFloats({500, 2800, 410, 3000, 48000, 23000, 10000, 2, 8}, &records);
    appendFloats({1000, 6500, 820, 7000, 40000, 11000, 16000, 2, 7}, &records);
    check(appendToFile(ssc::devicePath(kColorDataFile), records, FileStart::kTruncate) == FileResult::kOk,
          "the records can be prepared");
  }
  support::TemporaryFolder folder;
};

/// How a sensor reports: every other reading has a green instead of an infrared.
class Encoder {
 public:
  std::string operator()(std::vector<float> values) {
    hasGreen_ = !hasGreen_;
    if (hasGreen_ && values.size() > color_reading::kIr) values[color_reading::kIr] = -1;
    sns_std_sensor_event event;
    for (const float value : values) event.add_data(value);
    event.set_status(SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH);
    return event.SerializeAsString();
  }

 private:
  bool hasGreen_ = false;
};

fuzz::HubWorld sensors() {
  fuzz::HubWorld world;
  for (const char* const dataType : {"color_raw", "ambient_light_raw"}) {
    world.sensors.push_back({dataType, "chip_0", {500, 1000, 300, 400, 200, 50, 4}});
    world.sensors.back().encode = Encoder();
  }
  for (const char* const group : {"chip_platform.als.fac_cal", "chip_platform.color.fac_cal"}) {
    auto* const item = world.registry[group].add_items();
    item->set_name("version");
    item->set_sint(4);
    for (const char* const name : {"scale", "ratio_coef0", "ratio_coef1"}) {
      auto* const number = world.registry[group].add_items();
      number->set_name(name);
      number->set_flt(1000);
    }
  }
  return world;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const Handset handset;
  Handset::prepareRecords();
  fuzz::FuzzInput input(data, size);
  const std::uint8_t mode = input.byte();
  const bool wellBehaved = input.empty();
  const std::size_t task = (mode >> kTaskShift) % kTasks.size();
  const bool verifies = task == 3;
  Calibrator::Arguments arguments;
  arguments.deviceType = DeviceType::p2m2;
  arguments.dryRun = (mode & kDryRun) != 0;
  arguments.reset = (mode & kReset) != 0;
  fuzz::HubWorld world = sensors();
  int result = 0;
  {
    const auto connection =
        ssc::Connection::Over(ssc::makeEmbeddedLink(std::make_unique<fuzz::FuzzedHub>(&world, &input)));
    const auto begin = connection->clock().now();
    result = fuzz::runCommand<ColorCalibrator>(arguments, kTasks[task], connection.get());
    check(connection->clock().now() - begin < kLongestRun, "a run ends within its own deadlines");
  }
  check(result <= 0, "a result is 0 or negative");
  check(result == 0 || !wellBehaved || verifies, "a command with a well-behaved hub succeeds");
  check(world.wroteFinite, "only finite numbers are stored");
  const bool stores = arguments.reset || (!arguments.dryRun && (task == 1 || task == 2));
  check(world.writes <= (stores ? 2 : 0), "each group is written at most once, and only by the last step");

  std::string content;
  std::vector<SampleData> records;
  check(readWholeFile(ssc::devicePath(kColorDataFile), kMaxColorDataBytes, &content) == FileResult::kOk,
        "the working file stays");
  check(splitFloatRecords(content, color_record::kCount, &records) == FileResult::kOk &&
            records.size() >= 3 && records.size() <= 4,
        "a step adds one whole record or none");
  return 0;
}
