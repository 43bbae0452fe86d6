#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "mag/MagConfigurationFixture.h"
#include "mag/MagCurrentSensitivity.h"
#include "mag/MagOrientation.h"
#include "mag/MagSoftIron.h"

namespace {

namespace fs = std::filesystem;
using testing::EndsWith;
using testing::HasSubstr;

constexpr int kInvalid = -22;
constexpr int kNotPermitted = -1;

/// Resets delete files: here below a folder of the test's own.
class MagConfigurationReset : public MagConfigurationTest {
 protected:
  MagConfigurationReset() {
    std::string pattern = testing::TempDir() + "mag-reset-XXXXXX";
    root = ::mkdtemp(pattern.data());
    ::setenv("VANTLE_ROOT", root.c_str(), 1);
    fs::create_directories(folder());
  }
  ~MagConfigurationReset() override {
    ::unsetenv("VANTLE_ROOT");
    fs::remove_all(root);
  }

  [[nodiscard]] fs::path folder() const { return root.string() + ssc::RegistryUtil::RegistryPath(); }
  void makeFiles(std::initializer_list<const char*> groups) const {
    for (const char* group : groups) std::ofstream(folder() / group) << "{}";
  }
  [[nodiscard]] bool exists(const char* group) const { return fs::exists(folder() / group); }

  template <class Command>
  Captured reset(const char* command) {
    return runCommand<Command>(script, {command, "no", "word", "counts"}, {.dryRun = true, .reset = true});
  }

  fs::path root;
};

TEST_F(MagConfigurationReset, OfSoftIronDeletesTheMatrixEvenInADryRun) {
  makeFiles({kMagMatrixGroup, kMagGroup});
  const Captured captured = reset<MagSoftIron>("mag-softiron");
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out,
            "Searching for magnetometer...\nResetting soft-iron correction matrix to default...\n"
            "Magnetometer soft-iron configuration succeeded.\n");
  EXPECT_FALSE(exists(kMagMatrixGroup));
  EXPECT_TRUE(exists(kMagGroup));
}

TEST_F(MagConfigurationReset, OfSoftIronFailsWhereNoMatrixIsStored) {
  const Captured captured = reset<MagSoftIron>("mag-softiron");
  EXPECT_EQ(captured.result, kNotPermitted);
  EXPECT_EQ(captured.err,
            "ERROR: Unable to delete the registry file magchip_0_platform.mag.fac_cal.corr_mat: "
            "No such file or directory\n");
  EXPECT_THAT(captured.out, EndsWith("Magnetometer soft-iron configuration failed.\n"));
}

TEST_F(MagConfigurationReset, OfOrientationDeletesTheMapping) {
  makeFiles({kOrientGroup});
  const Captured captured = reset<MagOrientation>("mag-orient");
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out,
            "Searching for magnetometer...\nResetting orientation to default...\n"
            "Magnetometer orientation configuration succeeded.\n");
  EXPECT_FALSE(exists(kOrientGroup));
  EXPECT_EQ(reset<MagOrientation>("mag-orient").result, kNotPermitted);
}

TEST_F(MagConfigurationReset, OfSensitivityDeletesBothSpeeds) {
  makeFiles({kNormalGroup, kFastGroup});
  const Captured captured = reset<MagCurrentSensitivity>("mag-sensitivity");
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out,
            "Searching for magnetometer...\nMagnetometer current sensitivity configuration succeeded\n");
  EXPECT_FALSE(exists(kNormalGroup));
  EXPECT_FALSE(exists(kFastGroup));
}

TEST_F(MagConfigurationReset, OfSensitivityMissesNothing) {
  EXPECT_EQ(reset<MagCurrentSensitivity>("mag-sensitivity").result, 0);
}

TEST_F(MagConfigurationReset, OfSensitivityReportsWhatCannotBeDeletedAndDeletesTheRest) {
  fs::create_directories(folder() / kNormalGroup / "occupied");
  makeFiles({kFastGroup});
  const Captured captured = reset<MagCurrentSensitivity>("mag-sensitivity");
  EXPECT_EQ(captured.result, kNotPermitted);
  EXPECT_THAT(captured.err, HasSubstr("Unable to delete the registry file magchip_0_platform.sensitivity: "));
  EXPECT_FALSE(exists(kFastGroup));
}

TEST_F(MagConfigurationReset, ClearingASpeedDeletesOnlyThat) {
  makeFiles({kNormalGroup, kFastGroup});
  const Captured captured =
      runCommand<MagCurrentSensitivity>(script, {"mag-sensitivity", "-c", "fast", "words"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out,
            "Searching for magnetometer...\nMagnetometer current sensitivity configuration succeeded\n");
  EXPECT_TRUE(exists(kNormalGroup));
  EXPECT_FALSE(exists(kFastGroup));
  EXPECT_EQ(runCommand<MagCurrentSensitivity>(script, {"mag-sensitivity", "-c", "normal"}).result, 0);
  EXPECT_FALSE(exists(kNormalGroup));
}

TEST_F(MagConfigurationReset, NeverLeavesTheRegistryFolder) {
  std::ofstream(root / "outside_0_platform.orient") << "{}";
  for (const char* name : {"../../../../../../outside_0", "..", "dir/file_0", ".hidden_0"}) {
    script->sensors[0].name = name;
    EXPECT_EQ(reset<MagOrientation>("mag-orient").result, kInvalid) << name;
    EXPECT_EQ(reset<MagSoftIron>("mag-softiron").result, kInvalid) << name;
    EXPECT_EQ(reset<MagCurrentSensitivity>("mag-sensitivity").result, kInvalid) << name;
  }
  EXPECT_TRUE(fs::exists(root / "outside_0_platform.orient"));
}

}  // namespace
