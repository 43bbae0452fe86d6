#include "truth/EmbeddedHandset.h"

#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <utility>

#include <gtest/gtest.h>

#include "mag/BaroCalibrator.h"
#include "main/SimulatedHandset.h"
#include "ssc/RegistryUtil.h"
#include "support/ArgumentWords.h"

namespace truth {
EmbeddedHandset::EmbeddedHandset(const std::string& description) {
  support::makeDeviceFolders(folder_.path());
  ::setenv("VANTLE_ROOT", folder_.path().c_str(), 1);
  std::unique_ptr<ssc::EmbeddedHub> hub;
  std::string error;
  const int result = makeEmbeddedHub(description, &hub, &error);
  EXPECT_EQ(result, 0) << error;
  if (result == 0) connection_ = ssc::Connection::Over(ssc::makeEmbeddedLink(std::move(hub)));
}

EmbeddedHandset::~EmbeddedHandset() {
  connection_.reset();
  ::unsetenv("VANTLE_ROOT");
}

Captured EmbeddedHandset::runBaro(double referenceHpa, int seconds) {
  char reference[32];
  (void)std::snprintf(reference, sizeof reference, "%.9g", referenceHpa);
  const std::string time = std::to_string(seconds);
  ArgumentWords words{"baro", "-t", time.c_str(), reference};
  Calibrator::Arguments arguments;
  arguments.quiet = true;
  arguments.command = "baro";
  arguments.argc = words.argc();
  arguments.argv = words.argv();
  BaroCalibrator calibrator(connection());
  return capture([&] { return calibrator.Run(arguments); });
}

double EmbeddedHandset::stored(const std::string& group, const std::string& item) {
  sns_registry_data data;
  if (ssc::RegistryUtil(connection()).Read(group, &data) != 0) return std::nan("");
  const sns_registry_data_item* const found = ssc::RegistryUtil::FindDataItem(item, &data);
  return found != nullptr && found->has_flt() ? static_cast<double>(found->flt()) : std::nan("");
}

}  // namespace truth
