#include "simhub/Scenario.h"

#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "simhub/SensorModels.h"
#include "simhub/TemporaryFolder.h"

namespace {

using simhub::Scenario;
using simhub::SensorConfig;
using simhub::WorldSignal;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

Scenario parse(const std::string& text, const std::vector<std::string>& overrides = {}) {
  Scenario scenario;
  std::string error;
  EXPECT_TRUE(simhub::parseScenario(text, "test.toml", overrides, &scenario, &error)) << error;
  return scenario;
}

std::string errorOf(const std::string& text, const std::vector<std::string>& overrides = {}) {
  Scenario scenario;
  std::string error;
  EXPECT_FALSE(simhub::parseScenario(text, "test.toml", overrides, &scenario, &error)) << text;
  return error;
}

const SensorConfig& sensor(const Scenario& scenario, const std::string& key) {
  for (const SensorConfig& config : scenario.sensors) {
    if (config.key == key) return config;
  }
  ADD_FAILURE() << "no sensor " << key;
  static const SensorConfig kNone;
  return kNone;
}

constexpr const char* kBarometer = "[sensor.pressure]\nmodel = \"barometer\"\nname = \"chip_0\"\n";

TEST(Scenario, EveryBuiltInOneLoads) {
  EXPECT_THAT(simhub::builtInScenarios(), ElementsAre("e4d4", "o1v1", "p2m2", "rufael", "t5h5", "whiskel"));
  for (const std::string& name : simhub::builtInScenarios()) {
    Scenario scenario;
    std::string error;
    EXPECT_TRUE(simhub::loadScenario(name, {}, &scenario, &error)) << error;
    EXPECT_EQ(scenario.name, name);
    EXPECT_THAT(scenario.sensors, Not(IsEmpty()));
    EXPECT_THAT(scenario.registry, Not(IsEmpty()));
    EXPECT_THAT(scenario.faults, IsEmpty());
  }
}

TEST(Scenario, NoNameIsTheDefaultOne) {
  Scenario scenario;
  std::string error;
  ASSERT_TRUE(simhub::loadScenario("", {}, &scenario, &error)) << error;
  EXPECT_EQ(scenario.name, "o1v1");
}

TEST(Scenario, UnknownNameSaysWhichThereAre) {
  Scenario scenario;
  std::string error;
  EXPECT_FALSE(simhub::loadScenario("o1v2", {}, &scenario, &error));
  EXPECT_THAT(error, HasSubstr("o1v2"));
  EXPECT_THAT(error, HasSubstr("e4d4, o1v1, p2m2"));
}

TEST(Scenario, ReadsEverySection) {
  const Scenario scenario = parse(
      "[hub]\nseed = 7\nstart_ticks = 5\nresponse_latency_ms = 1.5\nbatch = 3\nrequest_log = \"log\"\n"
      "[world]\npressure = 990\nmagnetic_field = [1, 2, 3]\n" +
      std::string(kBarometer) +
      "rates = [1, 2.5]\nbias = 2\nnoise = [0.1, 0.2]\nscale = [1, 2, 3]\nhardware_id = 4\nstream = "
      "\"on_change\"\n"
      "[registry.\"g.h\"]\nx = 1.5\nn = 2\ns = \"a\\u0000\"\nsub.y = 3.0\n"
      "[fault.late]\nkind = \"late_response\"\nsensor = \"pressure\"\ndelay = 0.25\nfrom = 1\nuntil = "
      "2\nafter = 3\n");
  EXPECT_EQ(scenario.hub.seed, 7U);
  EXPECT_EQ(scenario.hub.startTicks, 5U);
  EXPECT_EQ(scenario.hub.responseLatency, simhub::Time{1'500'000});
  EXPECT_EQ(scenario.hub.batch, 3U);
  EXPECT_EQ(scenario.hub.requestLog, "log");
  EXPECT_EQ(scenario.world.ScalarAt(WorldSignal::kPressure, simhub::Time{0}), 990);
  EXPECT_EQ(scenario.world.At(WorldSignal::kMagneticField, simhub::Time{0})[2], 3);
  const SensorConfig& pressure = sensor(scenario, "pressure");
  EXPECT_EQ(pressure.dataType, "pressure");
  EXPECT_THAT(pressure.rates, ElementsAre(1, 2.5));
  EXPECT_EQ(pressure.error.bias[7], 2) << "one number is for every channel";
  EXPECT_EQ(pressure.error.noise[1], 0.2);
  EXPECT_EQ(pressure.error.noise[2], 0);
  EXPECT_THAT(pressure.error.scale, ElementsAre(1, 0, 0, 0, 2, 0, 0, 0, 3));
  EXPECT_EQ(pressure.hardwareId, 4);
  EXPECT_EQ(pressure.streamType, SNS_STD_SENSOR_STREAM_TYPE_ON_CHANGE);
  const sns_registry_data& group = scenario.registry.at("g.h");
  ASSERT_EQ(group.items_size(), 4);
  EXPECT_EQ(group.items(0).sint(), 2);
  EXPECT_EQ(group.items(1).str(), std::string("a\0", 2));
  EXPECT_EQ(group.items(2).subgrp().items(0).flt(), 3);
  EXPECT_FALSE(group.items(3).has_version());
  ASSERT_EQ(scenario.faults.size(), 1U);
  EXPECT_EQ(scenario.faults[0].name, "late");
  EXPECT_EQ(scenario.faults[0].delay, simhub::fromSeconds(0.25));
  EXPECT_EQ(scenario.faults[0].after, 3U);
}

TEST(Scenario, RegistryItemsCanHaveAVersion) {
  const Scenario scenario = parse("[registry.g]\n\"@version\" = 4\nx = 1.0\nsub.y = 2.0\n");
  const sns_registry_data& group = scenario.registry.at("g");
  ASSERT_EQ(group.items_size(), 2);
  EXPECT_EQ(group.items(1).version(), 4);
  EXPECT_FALSE(group.items(0).subgrp().items(0).has_version()) << "a table's version is its own items'";
}

TEST(Scenario, WorldMovesOverTime) {
  const Scenario scenario = parse(
      "[world]\ntemperature = [{at = 0, value = 20}, {at = 10, value = 40, ramp = 20}, {at = 60, value = 0, "
      "approach = 5}]\n");
  const auto at = [&](double seconds) {
    return scenario.world.ScalarAt(WorldSignal::kTemperature, simhub::fromSeconds(seconds));
  };
  EXPECT_EQ(at(5), 20);
  EXPECT_EQ(at(20), 30);
  EXPECT_EQ(at(40), 40);
  EXPECT_NEAR(at(65), 40 * std::exp(-1), 1e-9);
}

TEST(Scenario, SensorLikeAnotherTakesWhatItDoesNotSay) {
  const Scenario scenario = parse(std::string(kBarometer) +
                                  "data_type = \"p\"\nbias = 2\nnoise = 1\n"
                                  "[sensor.raw]\nlike = \"pressure\"\nnoise = 3\n"
                                  "[sensor.third]\nlike = \"raw\"\ndata_type = \"t\"\n");
  EXPECT_EQ(sensor(scenario, "raw").name, "chip_0");
  EXPECT_EQ(sensor(scenario, "raw").dataType, "raw");
  EXPECT_EQ(sensor(scenario, "raw").error.bias[0], 2);
  EXPECT_EQ(sensor(scenario, "raw").error.noise[0], 3);
  EXPECT_EQ(sensor(scenario, "third").error.noise[0], 3);
  EXPECT_EQ(sensor(scenario, "third").dataType, "t");
}

TEST(Scenario, SensorThatIsNotPresentIsLeftOut) {
  EXPECT_THAT(parse(std::string(kBarometer) + "present = false\n").sensors, IsEmpty());
}

TEST(Scenario, FilesExtendBuiltInScenariosAndFilesBesideThem) {
  TemporaryFolder folder;
  folder.WriteFile("sub/base.toml", "extends = \"o1v1\"\n[world]\npressure = 900\ntemperature = 10\n");
  folder.WriteFile("sub/own.toml", "extends = \"base.toml\"\n[world]\npressure = 950\n");
  Scenario scenario;
  std::string error;
  ASSERT_TRUE(simhub::loadScenario(folder.Path("sub/own.toml"), {}, &scenario, &error)) << error;
  EXPECT_EQ(scenario.world.ScalarAt(WorldSignal::kPressure, simhub::Time{0}), 950);
  EXPECT_EQ(scenario.world.ScalarAt(WorldSignal::kTemperature, simhub::Time{0}), 10);
  EXPECT_EQ(sensor(scenario, "pressure").name, "barochip_0");
}

TEST(Scenario, ProblemInABaseNamesTheBase) {
  TemporaryFolder folder;
  folder.WriteFile("base.toml", "[world]\npressure = true\n");
  folder.WriteFile("own.toml", "extends = \"base.toml\"\n");
  Scenario scenario;
  std::string error;
  EXPECT_FALSE(simhub::loadScenario(folder.Path("own.toml"), {}, &scenario, &error));
  EXPECT_THAT(error, HasSubstr("base.toml:2: world.pressure"));
}

TEST(Scenario, CircleOfExtendsIsReported) {
  TemporaryFolder folder;
  folder.WriteFile("a.toml", "extends = \"b.toml\"\n");
  folder.WriteFile("b.toml", "extends = \"a.toml\"\n");
  Scenario scenario;
  std::string error;
  EXPECT_FALSE(simhub::loadScenario(folder.Path("a.toml"), {}, &scenario, &error));
  EXPECT_THAT(error, HasSubstr("extend each other"));
}

// ---- What is wrong, where ----

TEST(ScenarioModel, MissingOrUnknownIsReportedWithTheKnownOnes) {
  std::string known;
  for (const simhub::SensorModel& model : simhub::sensorModels()) {
    known += (known.empty() ? "" : ", ") + std::string(model.name);
  }
  EXPECT_THAT(known, HasSubstr("barometer"));
  EXPECT_EQ(errorOf("[sensor.s]\nname = \"s\"\n"), "test.toml:1: sensor.s: needs a model out of: " + known);
  EXPECT_EQ(errorOf("[sensor.s]\nmodel = \"barmeter\"\n"),
            "test.toml:2: sensor.s.model: needs a model out of: " + known);
}

struct Mistake {
  const char* text;
  const char* error;
};

class ScenarioMistake : public testing::TestWithParam<Mistake> {};

TEST_P(ScenarioMistake, IsReportedWithFileLineAndKey) {
  EXPECT_EQ(errorOf(GetParam().text), GetParam().error);
}

INSTANTIATE_TEST_SUITE_P(
    All, ScenarioMistake,
    testing::Values(
        Mistake{"[hub]\nsed = 1\n", "test.toml:2: hub.sed: unknown key"},
        Mistake{"[hbu]\nseed = 1\n", "test.toml:1: hbu: unknown key"},
        Mistake{"[hub]\nseed = 1.5\n", "test.toml:2: hub.seed: has to be an integer, is a number"},
        Mistake{"[hub]\nseed = -1\n",
                "test.toml:2: hub.seed: -1 is not in the range 0 to 9223372036854775807"},
        Mistake{"[hub]\nrequest_log = 5\n", "test.toml:2: hub.request_log: has to be text, is an integer"},
        Mistake{"hub = 3\n", "test.toml:1: hub: has to be a table, is an integer"},
        Mistake{"[world]\n\npressure = \"high\"\n",
                "test.toml:3: world.pressure: has to be a number, is text"},
        Mistake{"[world]\npressure = -1\n", "test.toml:2: world.pressure: -1 is not in the range 0 to 2000"},
        Mistake{"[world]\npressure = nan\n",
                "test.toml:2: world.pressure: nan is not in the range 0 to 2000"},
        Mistake{"[world]\nmagnetic_field = [1, 2]\n",
                "test.toml:2: world.magnetic_field: 2 numbers where 3 belong"},
        Mistake{"[world]\npressure = []\n", "test.toml:2: world.pressure: 0 numbers where 1 belong"},
        Mistake{"[world]\npressure = [{at = 0, value = 1, rmap = 3}]\n",
                "test.toml:2: world.pressure.rmap: unknown key"},
        Mistake{"[world]\npressure = [{at = 0}]\n", "test.toml:2: world.pressure: has no \"value\""},
        Mistake{"[world]\npressure = [{at = 1, value = 1}, {at = 1, value = 2}]\n",
                "test.toml:2: world.pressure: the moves have to stand in the order of their times"},
        Mistake{"[world]\npressure = [{at = 0, value = 1, ramp = 1, approach = 1}]\n",
                "test.toml:2: world.pressure.approach: is either a ramp or an approach"},
        Mistake{"[sensor.s]\nmodel = \"barometer\"\n", "test.toml:1: sensor.s: needs a name"},
        Mistake{"[sensor.s]\nmodel = \"barometer\"\nname = \"s\"\nnois = 1\n",
                "test.toml:4: sensor.s.nois: unknown key"},
        Mistake{"[sensor.s]\nmodel = \"barometer\"\nname = \"s\"\nnoise = -1\n",
                "test.toml:4: sensor.s.noise: -1 is not in the range 0 to 1e+09"},
        Mistake{"[sensor.s]\nmodel = \"barometer\"\nname = \"s\"\nrates = [2, 1]\n",
                "test.toml:4: sensor.s.rates: have to ascend"},
        Mistake{"[sensor.s]\nmodel = \"barometer\"\nname = \"s\"\nrates = []\n",
                "test.toml:4: sensor.s.rates: 0 numbers where 1 to 32 belong"},
        Mistake{"[sensor.s]\nmodel = \"barometer\"\nname = \"s\"\nscale = [1, 2]\n",
                "test.toml:4: sensor.s.scale: a matrix is nine numbers in row order, three for its diagonal, "
                "or one "
                "for all of that"},
        Mistake{"[sensor.s]\nmodel = \"barometer\"\nname = \"s\"\nranges = [[1, 0]]\n",
                "test.toml:4: sensor.s.ranges: a range is [low, high]"},
        Mistake{"[sensor.s]\nmodel = \"barometer\"\nname = \"s\"\nstream = \"steaming\"\n",
                "test.toml:4: sensor.s.stream: \"steaming\" is not streaming, on_change or single_output"},
        Mistake{"[sensor.s]\nlike = \"t\"\n", "test.toml:2: sensor.s.like: there is no [sensor.t]"},
        Mistake{"[registry.\"g.h\"]\nx = [1]\n",
                "test.toml:2: registry.\"g.h\".x: an item is text, an integer, a number with a point, or a "
                "table"},
        Mistake{"[registry.g]\nx = 1e39\n",
                "test.toml:2: registry.g.x: 1e+39 does not fit a single-precision float"},
        Mistake{"[sensor.registry]\nname = \"r\"\n",
                "test.toml:1: sensor.registry: is a sensor of the hub's own"},
        Mistake{"[fault.f]\nkind = \"silent\"\nsensor = \"s\"\n",
                "test.toml:3: fault.f.sensor: there is no sensor \"s\""},
        Mistake{"[fault.f]\nkind = \"silent\"\ndelay = 3\n", "test.toml:3: fault.f.delay: unknown key"},
        Mistake{"[fault.f]\nkind = \"item_missing\"\n", "test.toml:1: fault.f: needs an item"},
        Mistake{"[fault.f]\nkind = \"hub_away\"\ntimes = 2\n",
                "test.toml:3: fault.f.times: more than once needs \"after\": so many readings after it is "
                "back"}));

TEST(Scenario, UnknownKindOfFaultListsTheKinds) {
  EXPECT_THAT(errorOf("[fault.f]\nkind = \"slient\"\n"),
              HasSubstr("test.toml:2: fault.f.kind: needs a kind out of: "
                        "absent, silent"));
}

TEST(Scenario, TextThatIsNoTomlNamesTheLine) {
  EXPECT_THAT(errorOf("[hub]\nseed = = 3\n"), HasSubstr("test.toml:2: "));
  EXPECT_THAT(errorOf(std::string(100'000, '[')), HasSubstr("test.toml:1: "));
  EXPECT_THAT(errorOf("a = " + std::string(100'000, '[')), HasSubstr("test.toml:1: "));
}

TEST(Scenario, LettersWhereNoneBelongAreAMistake) {
  // One of each group of characters among which blanks are looked for.
  for (const char* const letter : {"\u00c9", "\u0409", "\u1681", "\u2020", "\u2061", "\u3001", "\ufefe"}) {
    EXPECT_THAT(errorOf(std::string("[hub]\nseed = 3") + letter + "\n"), HasSubstr("test.toml:2: "));
    EXPECT_THAT(errorOf(std::string("[hub]\n") + letter + "seed = 3\n"), HasSubstr("test.toml:2: "));
  }
}

TEST(Scenario, CircleOfLikesIsReported) {
  EXPECT_THAT(errorOf("[sensor.a]\nlike = \"b\"\n[sensor.b]\nlike = \"a\"\n"), HasSubstr("in a circle"));
}

TEST(Scenario, SeveralMistakesAreReportedAtOnce) {
  EXPECT_EQ(errorOf("[hub]\na = 1\nb = 2\n"),
            "test.toml:2: hub.a: unknown key\n"
            "test.toml:3: hub.b: unknown key");
}

// ---- Overrides ----

TEST(Scenario, OverridesReplaceNumbersTextAndLists) {
  const Scenario scenario = parse(kBarometer, {"sensor.pressure.noise=0.3", "sensor.pressure.name=some chip",
                                               "sensor.pressure.rates=[1, 2]", "hub.request_log=/tmp/a#b.log",
                                               "world.pressure=[{at=0, value=5}]"});
  EXPECT_EQ(sensor(scenario, "pressure").error.noise[0], 0.3);
  EXPECT_EQ(sensor(scenario, "pressure").name, "some chip");
  EXPECT_THAT(sensor(scenario, "pressure").rates, ElementsAre(1, 2));
  EXPECT_EQ(scenario.hub.requestLog, "/tmp/a#b.log");
  EXPECT_EQ(scenario.world.ScalarAt(WorldSignal::kPressure, simhub::Time{0}), 5);
}

TEST(Scenario, OverridesMakeFaultsAndRegistryItems) {
  const Scenario scenario =
      parse(kBarometer, {"fault.a.kind=nan", "fault.a.sensor=pressure", "registry.\"g.h\".x=nan"});
  ASSERT_EQ(scenario.faults.size(), 1U);
  EXPECT_EQ(scenario.faults[0].kind, simhub::FaultKind::kNan);
  EXPECT_TRUE(std::isnan(scenario.registry.at("g.h").items(0).flt()));
}

TEST(Scenario, OverrideOfASensorReachesThoseLikeIt) {
  const Scenario scenario =
      parse(std::string(kBarometer) + "[sensor.raw]\nlike = \"pressure\"\n", {"sensor.pressure.bias=9"});
  EXPECT_EQ(sensor(scenario, "raw").error.bias[0], 9);
}

TEST(Scenario, LaterOverrideWins) { EXPECT_EQ(parse("", {"hub.seed=2", "hub.seed=3"}).hub.seed, 3U); }

TEST(Scenario, MistakesInOverridesNameTheOverride) {
  EXPECT_EQ(errorOf("", {"hub.sed=1"}), "override \"hub.sed=1\": hub.sed: unknown key");
  EXPECT_EQ(errorOf("", {"hub.seed=abc"}),
            "override \"hub.seed=abc\": hub.seed: has to be an integer, is text");
  EXPECT_EQ(errorOf("", {"world.pressure=1e9"}),
            "override \"world.pressure=1e9\": world.pressure: 1e+09 is not in the range 0 to 2000");
  EXPECT_EQ(errorOf("", {"hub.seed"}), "override \"hub.seed\": has to be KEY=VALUE");
  EXPECT_EQ(errorOf("", {"=3"}), "override \"=3\": has to be KEY=VALUE");
  EXPECT_THAT(errorOf("", {"hub..seed=3"}), HasSubstr("override \"hub..seed=3\": "));
  EXPECT_THAT(errorOf("", {"hub.seed=1\nworld.pressure=1"}), HasSubstr("has to be KEY=VALUE"));
  EXPECT_THAT(errorOf("", {"hub=3"}), HasSubstr("hub: has to be a table"));
}

/// "a.a. … .a" of that many parts.
std::string keyOf(std::size_t parts) {
  std::string key = "a";
  for (std::size_t i = 1; i < parts; ++i) key += ".a";
  return key;
}

constexpr const char* kTooManyParts = ": a key of more than 40 parts";

TEST(Scenario, KeyOfTooManyPartsIsRefusedBeforeItBecomesATreeThatIsTooDeep) {
  const std::string deep = keyOf(1'000'000);
  EXPECT_EQ(errorOf("\n" + deep + " = 1\n"), std::string("test.toml:2") + kTooManyParts);
  EXPECT_EQ(errorOf("[" + deep + "]\n"), std::string("test.toml:1") + kTooManyParts);
  EXPECT_EQ(errorOf("[[" + deep + "]]\n"), std::string("test.toml:1") + kTooManyParts);
  EXPECT_EQ(errorOf("[registry." + deep + "]\n"), std::string("test.toml:1") + kTooManyParts);
  EXPECT_EQ(errorOf("a = \"b.c\" # ...\nd = { " + deep + " = 1 }\n"),
            std::string("test.toml:2") + kTooManyParts);
  EXPECT_EQ(errorOf("", {keyOf(41) + "=1"}), "override \"" + keyOf(41) + "=1\"" + kTooManyParts);
  EXPECT_THAT(errorOf(keyOf(41) + " = 1"), HasSubstr(kTooManyParts));
  EXPECT_THAT(errorOf(keyOf(40) + " = 1"), HasSubstr("a: unknown key"));
}

TEST(Scenario, KeyOfTooManyPartsHidesBehindNoStringAndNoBlank) {
  const std::string deep = keyOf(1'000'000);
  for (const char* const before :
       {R"("x")", R"('x\')", R"("x\"")", "\"\"\"x\n\"\"\"\"\"", "'''x\n''''", R"("")", "''"}) {
    EXPECT_THAT(errorOf(std::string("v = { s = ") + before + ", " + deep + " = 1 }"),
                HasSubstr(kTooManyParts))
        << before;
  }
  std::string spaced = "a";
  for (int i = 0; i < 1'000'000; ++i) spaced += " .\t'a'";
  EXPECT_THAT(errorOf(spaced + " = 1"), HasSubstr(kTooManyParts));
}

TEST(Scenario, DotsThatAreInNoKeyAreNotCounted) {
  const std::string dots = std::string(100, '.') + keyOf(50);
  const Scenario scenario =
      parse("# " + dots + "\n" + kBarometer + "vendor = \"" + dots + "\"\nnoise = [0.1, 0.2, 0.3, 0.4]\n");
  EXPECT_EQ(sensor(scenario, "pressure").vendor, dots);
  EXPECT_EQ(sensor(parse(kBarometer, {"sensor.pressure.vendor=" + dots}), "pressure").vendor, dots);
}

// ---- Sensors' names ----

TEST(PackageName, IsCutAtTheFirstBlankElseAtTheFirstUnderscore) {
  EXPECT_EQ(simhub::packageName("chipa_0"), "chipa");
  EXPECT_EQ(simhub::packageName("chipa some text_x"), "chipa");
  EXPECT_EQ(simhub::packageName("chipa_0 Barometer"), "chipa_0");
  EXPECT_EQ(simhub::packageName("ChipA Barometer"), "chipa");
  EXPECT_EQ(simhub::packageName("chipa"), "chipa");
  EXPECT_EQ(simhub::packageName(""), "");
}

TEST(SensorModels, CalibrationGroupIsThePackagesUnlessTheScenarioNamesOne) {
  const Scenario scenario = parse(
      "[sensor.pressure]\nmodel = \"barometer\"\nname = \"ChipA Barometer\"\n"
      "[sensor.other]\nlike = \"pressure\"\nregistry_group = \"mine\"\n");
  const simhub::SensorSurroundings surroundings{scenario.world, 1};
  EXPECT_EQ(simhub::makeSensor(sensor(scenario, "pressure"), surroundings)->CalibrationGroup(),
            "chipa_0_platform.pressure.fac_cal");
  EXPECT_EQ(simhub::makeSensor(sensor(scenario, "other"), surroundings)->CalibrationGroup(), "mine");
}

}  // namespace
