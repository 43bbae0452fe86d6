#include "main/Usage.h"

#include <gtest/gtest.h>

#include "support/Capture.h"

namespace {

TEST(Usage, IsPrintedWhole) {
  EXPECT_EQ(capture([] { printUsage(stdout); }).out,
            "Usage: vantle [OPTIONS] COMMAND [ARGS...]\n"
            "\n"
            "  Runs the sensor calibration command specified by <command>.\n"
            "\n"
            "Commands:\n"
            "\n"
            "  als              Calibrate the ambient light sensor.\n"
            "\n"
            "  baro             Calibrate the barometer.\n"
            "\n"
            "  color            Calibrate the color sensor.\n"
            "\n"
            "  imu-multipoint   Calibrate the inertial measurement unit using a 6-point\n"
            "                   procedure.\n"
            "\n"
            "  imu-thermal      Calibrate the inertial measurement unit thermal response.\n"
            "\n"
            "  mag              Calibrate the magnetometer.\n"
            "\n"
            "  mag-orient       Adjust the magnetometer orientation.\n"
            "\n"
            "  mag-softiron     Adjust the magnetometer Soft-Iron correct matrix.\n"
            "\n"
            "  mag-sensitivity  Adjust the magnetometer Current Sensitivity.\n"
            "\n"
            "  prox             Calibrate the proximity sensor.\n"
            "\n"
            "Options:\n"
            "\n"
            "  --device TYPE    Specify the device type codename to select the appropriate\n"
            "  -d TYPE          calibration algorithm. Example: ostrel\n"
            "\n"
            "  --help, -h       Display usage info and exit.\n"
            "\n"
            "  --dry-run, -n    Perform a dry run of the command. This typically skips any\n"
            "                   write operations, but the interpretation may vary by\n"
            "                   command.\n"
            "\n"
            "  --quiet, -q      Do not print sample data.\n"
            "\n"
            "  --reset, -r      Reset calibration to default values.\n"
            "\n"
            "  --verbose LEVEL  Set trace message verbosity to LEVEL. All trace messages up\n"
            "  -v LEVEL         to the specified verbosity level will be output to stdout.\n"
            "                     1 = WARN\n"
            "                     2 = INFO    (default)\n"
            "                     3 = DEBUG\n"
            "                     4 = VERBOSE\n"
            "\n"
            "  --version        Display version info and exit.\n"
            "\n");
}

TEST(Usage, GoesToTheStreamThatIsAskedFor) {
  const Captured captured = capture([] { printUsage(stderr); });
  EXPECT_EQ(captured.out, "");
  EXPECT_EQ(captured.err.rfind("Usage: vantle [OPTIONS] COMMAND [ARGS...]\n\n  Runs", 0), 0U);
}

TEST(Usage, ShortIsTheFirstLine) {
  EXPECT_EQ(capture([] { printShortUsage(stderr); }).err, "Usage: vantle [OPTIONS] COMMAND [ARGS...]\n");
}

TEST(Version, IsOneLine) {
  EXPECT_EQ(capture([] { printVersion(); }).out, "vantle version 20.14\n");
}

}  // namespace
