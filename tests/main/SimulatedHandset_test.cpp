#include "main/SimulatedHandset.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/Capture.h"

namespace {

using testing::HasSubstr;

constexpr int kInvalid = -22;
constexpr int kNotConnected = -107;
using TimePoint = ssc::Clock::TimePoint;

/// Sets an environment variable (null: unsets it) and puts it back.
class Environment {
 public:
  Environment(const char* name, const char* value) : name_(name) {
    if (const char* const old = std::getenv(name)) old_ = old;
    set(value);
  }
  Environment(const Environment&) = delete;
  Environment& operator=(const Environment&) = delete;
  ~Environment() { set(old_ ? old_->c_str() : nullptr); }

 private:
  void set(const char* value) const {
    if (value != nullptr) {
      ::setenv(name_, value, 1);
    } else {
      ::unsetenv(name_);
    }
  }
  const char* name_;
  std::optional<std::string> old_;
};

class SimulatedHandsetTest : public testing::Test {
 protected:
  SimulatedHandsetTest() {
    std::string pattern = (std::filesystem::temp_directory_path() / "vantle-handset-XXXXXX").string();
    folder = ::mkdtemp(pattern.data());
  }
  ~SimulatedHandsetTest() override {
    std::error_code ignored;
    std::filesystem::remove_all(folder, ignored);
  }
  static Captured prepare() {
    return capture([] { return prepareSimulatedHandset(stderr) ? 1 : 0; });
  }
  std::unique_ptr<ssc::EmbeddedHub> make(const std::string& description, int expected = 0) {
    std::unique_ptr<ssc::EmbeddedHub> hub;
    EXPECT_EQ(makeEmbeddedHub(description, &hub, &error), expected) << error;
    EXPECT_EQ(hub != nullptr, expected == 0);
    return hub;
  }
  std::filesystem::path folder;
  std::string error;
};

TEST_F(SimulatedHandsetTest, RealHubsAreLeftAlone) {
  const Environment root("VANTLE_ROOT", nullptr);
  for (const char* const hub : {static_cast<const char*>(nullptr), "", "qrtr", "unix:/tmp/x", "simulator"}) {
    const Environment variable("VANTLE_HUB", hub);
    const Captured result = prepare();
    EXPECT_EQ(result.result, 1);
    EXPECT_EQ(result.err, "");
    EXPECT_EQ(std::getenv("VANTLE_ROOT"), nullptr);
  }
}

TEST_F(SimulatedHandsetTest, SaysThatTheHubIsSimulatedAndMakesTheRoot) {
  const Environment hub("VANTLE_HUB", "sim:e4d4?hub.seed=2");
  const Environment root("VANTLE_ROOT", (folder / "root").c_str());
  const Captured result = prepare();
  EXPECT_EQ(result.result, 1);
  EXPECT_EQ(result.err, "This is a simulated hub (scenario e4d4): no handset is calibrated.\n");
  EXPECT_TRUE(std::filesystem::is_directory(folder / "root/data/app-ephemeral"));
  EXPECT_TRUE(std::filesystem::is_directory(folder / "root/persist/sensors"));
  EXPECT_TRUE(std::filesystem::is_directory(folder / "root/mnt/vendor/persist/sensors/registry/registry"));
  EXPECT_TRUE(std::filesystem::is_regular_file(
      folder / "root/sys/devices/platform/soc/soc:qcom,dsi-display-primary/te2_table"));
}

TEST_F(SimulatedHandsetTest, PreparingAgainKeepsWhatIsThere) {
  const Environment hub("VANTLE_HUB", "sim");
  const Environment root("VANTLE_ROOT", folder.c_str());
  ASSERT_EQ(prepare().result, 1);
  const auto node = folder / "sys/devices/platform/soc/soc:qcom,dsi-display-primary/te2_table";
  std::ofstream(node) << "1 2";
  ASSERT_EQ(prepare().result, 1);
  EXPECT_EQ(std::filesystem::file_size(node), 3U);
}

TEST_F(SimulatedHandsetTest, RootLiesWithTheUsersStateUnlessSet) {
  const Environment hub("VANTLE_HUB", "sim");
  const Environment root("VANTLE_ROOT", nullptr);
  const Environment state("XDG_STATE_HOME", folder.c_str());
  EXPECT_EQ(prepare().result, 1);
  EXPECT_EQ(std::getenv("VANTLE_ROOT"), (folder / "vantle-sim").string());
}

TEST_F(SimulatedHandsetTest, RootLiesInTheHomeWhereThereIsNoStateFolder) {
  const Environment hub("VANTLE_HUB", "sim");
  const Environment root("VANTLE_ROOT", "");
  const Environment state("XDG_STATE_HOME", "relative/does/not/count");
  const Environment home("HOME", folder.c_str());
  EXPECT_EQ(prepare().result, 1);
  EXPECT_EQ(std::getenv("VANTLE_ROOT"), (folder / ".local/state/vantle-sim").string());
}

TEST_F(SimulatedHandsetTest, RootThatCannotBeMadeEndsTheRunWithAReason) {
  std::ofstream(folder / "file") << "x";
  const Environment hub("VANTLE_HUB", "sim");
  const Environment root("VANTLE_ROOT", (folder / "file/root").c_str());
  const Captured result = prepare();
  EXPECT_EQ(result.result, 0);
  EXPECT_THAT(result.err, HasSubstr("file/root: Not a directory"));
}

TEST_F(SimulatedHandsetTest, DescriptionsThatMakeNoSenseSayWhatIsWrong) {
  const Environment root("VANTLE_ROOT", folder.c_str());
  (void)make(":o1v2", kInvalid);
  EXPECT_THAT(error, HasSubstr("o1v2"));
  (void)make("?hub.seed=abc", kInvalid);
  EXPECT_THAT(error, HasSubstr("hub.seed"));
  (void)make("?hub.seed", kInvalid);
  EXPECT_THAT(error, HasSubstr("hub.seed"));
  for (const char* const escape : {"?hub.request_log=%", "?hub.request_log=%4", "?hub.request_log=%zz"}) {
    (void)make(escape, kInvalid);
    EXPECT_THAT(error, HasSubstr("%")) << escape;
  }
  (void)make("?hub.request_log=/nonexistent/log", kInvalid);
  EXPECT_THAT(error, HasSubstr("/nonexistent/log"));
}

TEST_F(SimulatedHandsetTest, OverridesAreDecoded) {
  const Environment root("VANTLE_ROOT", folder.c_str());
  const std::string log = (folder / "a&b").string();
  ASSERT_NE(make("?hub.seed=3&&hub.request_log=" + (folder / "a%26b").string()), nullptr);
  EXPECT_TRUE(std::filesystem::exists(log));
}

TEST_F(SimulatedHandsetTest, ScenarioFilesAreTaken) {
  const Environment root("VANTLE_ROOT", folder.c_str());
  std::ofstream(folder / "own.toml") << "extends = \"o1v1\"\n";
  EXPECT_NE(make(":" + (folder / "own.toml").string() + "?world.pressure=900"), nullptr);
}

TEST_F(SimulatedHandsetTest, TimeStandsStillWithoutEvents) {
  const Environment root("VANTLE_ROOT", folder.c_str());
  const auto hub = make("");
  ssc::Incoming incoming;
  EXPECT_EQ(hub->Now(), TimePoint{});
  EXPECT_FALSE(hub->RunUntil(TimePoint::max(), &incoming));
  EXPECT_EQ(hub->Now(), TimePoint{});
  EXPECT_FALSE(hub->RunUntil(TimePoint{std::chrono::seconds(5)}, &incoming));
  EXPECT_EQ(hub->Now(), TimePoint{std::chrono::seconds(5)});
}

TEST_F(SimulatedHandsetTest, HubGoesDownAndUpInOrder) {
  const Environment root("VANTLE_ROOT", folder.c_str());
  const auto hub = make("?fault.f.kind=hub_away&fault.f.from=1&fault.f.down_for=2");
  ssc::Incoming incoming;
  ASSERT_TRUE(hub->RunUntil(TimePoint::max(), &incoming));
  EXPECT_EQ(incoming.kind, ssc::Incoming::Kind::kDown);
  EXPECT_EQ(hub->Now(), TimePoint{std::chrono::seconds(1)});
  const std::vector<std::uint8_t> datagram{1};
  EXPECT_EQ(hub->Submit(datagram), kNotConnected);
  ASSERT_TRUE(hub->RunUntil(TimePoint::max(), &incoming));
  EXPECT_EQ(incoming.kind, ssc::Incoming::Kind::kUp);
  EXPECT_EQ(hub->Now(), TimePoint{std::chrono::seconds(3)});
  EXPECT_EQ(hub->Submit(datagram), 0);
}

}  // namespace
