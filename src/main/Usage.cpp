#include "main/Usage.h"

#include "ssc/Log.h"

// The first line, which is also printed alone.
#define VANTLE_SHORT_USAGE "Usage: vantle [OPTIONS] COMMAND [ARGS...]\n"

namespace {

constexpr const char* kVersion = "vantle version 20.14";

// "sar" is not listed: it is for the factory alone.
constexpr const char* kUsage = VANTLE_SHORT_USAGE R"(
  Runs the sensor calibration command specified by <command>.

Commands:

  als              Calibrate the ambient light sensor.

  baro             Calibrate the barometer.

  color            Calibrate the color sensor.

  imu-multipoint   Calibrate the inertial measurement unit using a 6-point
                   procedure.

  imu-thermal      Calibrate the inertial measurement unit thermal response.

  mag              Calibrate the magnetometer.

  mag-orient       Adjust the magnetometer orientation.

  mag-softiron     Adjust the magnetometer Soft-Iron correct matrix.

  mag-sensitivity  Adjust the magnetometer Current Sensitivity.

  prox             Calibrate the proximity sensor.

Options:

  --device TYPE    Specify the device type codename to select the appropriate
  -d TYPE          calibration algorithm. Example: ostrel

  --help, -h       Display usage info and exit.

  --dry-run, -n    Perform a dry run of the command. This typically skips any
                   write operations, but the interpretation may vary by
                   command.

  --quiet, -q      Do not print sample data.

  --reset, -r      Reset calibration to default values.

  --verbose LEVEL  Set trace message verbosity to LEVEL. All trace messages up
  -v LEVEL         to the specified verbosity level will be output to stdout.
                     1 = WARN
                     2 = INFO    (default)
                     3 = DEBUG
                     4 = VERBOSE

  --version        Display version info and exit.

)";

}  // namespace

void printUsage(std::FILE* stream) { std::fputs(kUsage, stream); }

void printShortUsage(std::FILE* stream) { std::fputs(VANTLE_SHORT_USAGE, stream); }

void printVersion() { ssc::say("%s\n", kVersion); }
