// The runner, with the shell in the place of the program.
#include "cli/GoldenRunner.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using golden::Case;
using golden::checkCase;
using golden::Result;
using golden::Runner;
using testing::HasSubstr;

golden::Run shellRun(const std::string& script) {
  golden::Run run;
  run.arguments = {"-c", script};
  return run;
}

TEST(GoldenRunner, ReplacesTheRootInTextsAndArguments) {
  Runner runner("/bin/sh");
  golden::Run run = shellRun("echo $VANTLE_ROOT $EXTRA $1; echo $PWD >&2; echo $VANTLE_ROOT > note");
  run.arguments.insert(run.arguments.end(), {"sh", "$ROOT/x"});
  run.environment = {{"EXTRA", "$ROOT/e"}};
  run.expected.files = {{"note", std::nullopt}};
  const Result result = runner.run(run);
  EXPECT_EQ(result.output, "$ROOT $ROOT/e $ROOT/x\n");
  EXPECT_EQ(result.errors, "$ROOT\n");
  EXPECT_EQ(result.files.at("note"), "$ROOT\n");
  EXPECT_EQ(result.status, "0");
}

TEST(GoldenRunner, GivesStatusesTheirSign) {
  Runner runner("/bin/sh");
  EXPECT_EQ(runner.run(shellRun("exit 234")).status, "-22");
  EXPECT_EQ(runner.run(shellRun("exit 1")).status, "1");
  EXPECT_EQ(runner.run(shellRun("kill -ABRT $$")).status, "signal 6");
  EXPECT_THAT(Runner("/no/such/program").run(golden::Run{}).status, HasSubstr("not started"));
}

TEST(GoldenRunner, SetsAndUnsetsVariables) {
  Runner runner("/bin/sh");
  golden::Run run = shellRun("echo ${VANTLE_HUB-unset} ${VANTLE_ROOT-unset}");
  EXPECT_EQ(runner.run(run).output, "unset $ROOT\n");
  run.hub = "unix:$ROOT/socket";
  run.environment = {{"VANTLE_ROOT", std::nullopt}};
  EXPECT_EQ(runner.run(run).output, "unix:$ROOT/socket unset\n");
}

TEST(GoldenRunner, AsksASimulatedHubForItsRequestLog) {
  Runner runner("/bin/sh");
  golden::Run run =
      shellRun("echo request > ${VANTLE_HUB##*hub.request_log=}; echo ${VANTLE_HUB%hub.request_log=*}");
  run.hasRequests = true;
  run.hub = "sim:o1v1";
  EXPECT_EQ(runner.run(run).output, "sim:o1v1?\n");
  run.hub = "sim?a=1";
  const Result result = runner.run(run);
  EXPECT_EQ(result.output, "sim?a=1&\n");
  EXPECT_EQ(result.requests, "request\n");
  run.arguments = {"-c", "exit 0"};
  EXPECT_THAT(runner.run(run).requests, HasSubstr("no request log"));
}

TEST(GoldenRunner, KeepsTheFolderBetweenRunsAndTellsWhatChanged) {
  Runner runner("/bin/sh");
  golden::Run first = shellRun(
      "echo 1 > data/app-ephemeral/a; echo 1 > data/app-ephemeral/b; echo log > "
      "data/app-ephemeral/vantle.log");
  first.given = {{"persist/sensors/in", "x"}};
  EXPECT_EQ(runner.run(first).changes, "new data/app-ephemeral/a\nnew data/app-ephemeral/b\n");
  const golden::Run second =
      shellRun("cat persist/sensors/in; echo 2 > data/app-ephemeral/a; rm data/app-ephemeral/b");
  const Result result = runner.run(second);
  EXPECT_EQ(result.output, "x");
  EXPECT_EQ(result.changes, "changed data/app-ephemeral/a\ngone data/app-ephemeral/b\n");
  golden::Run third = shellRun("ls data");
  third.without = {"data/app-ephemeral"};
  EXPECT_EQ(runner.run(third).output, "");
}

TEST(GoldenRunner, TakesTimeStampsOutOfTheLogFileOnly) {
  Runner runner("/bin/sh");
  const std::string line = "2024-02-30 12:34:56.789Z SAY     MEAN";
  golden::Run run =
      shellRun("printf '$ vantle \\n" + line + "\\n' | tee data/app-ephemeral/vantle.log > data/other");
  run.expected.files = {{"data/app-ephemeral/vantle.log", std::nullopt}, {"data/other", std::nullopt}};
  const Result result = runner.run(run);
  EXPECT_EQ(result.files.at("data/app-ephemeral/vantle.log"), "$ vantle \nSAY     MEAN\n");
  EXPECT_EQ(result.files.at("data/other"), "$ vantle \n" + line + "\n");
}

TEST(GoldenCheck, TellsTheRunAndTheLineThatDiffer) {
  Case golden;
  golden.runs = {shellRun("echo a"), shellRun("echo b; exit 3")};
  golden.runs[1].line = 9;
  for (golden::Run& run : golden.runs) run.hasStatus = run.hasOutput = run.hasErrors = true;
  for (golden::Run& run : golden.runs) run.expected.status = "0";
  golden.runs[0].expected.output = golden.runs[1].expected.output = "a\n";
  EXPECT_EQ(checkCase("/bin/sh", false, &golden),
            "run 2 (line 9) differs\nin status (- expected, + actual):\n  -0\n  +3\n"
            "in stdout (- expected, + actual):\n  -a\n  +b\n");
}

TEST(GoldenCheck, AnUpdatedCasePassesTheNextTime) {
  Case golden;
  golden.runs = {shellRun("echo a; echo b >&2; exit 234")};
  EXPECT_THAT(checkCase("/bin/sh", false, &golden), HasSubstr("no section \"status\""));
  EXPECT_NE(checkCase("/bin/sh", true, &golden), "");
  EXPECT_EQ(golden.runs[0].expected.status, "-22");
  EXPECT_EQ(golden.runs[0].expected.output, "a\n");
  EXPECT_EQ(checkCase("/bin/sh", false, &golden), "");
}

}  // namespace
