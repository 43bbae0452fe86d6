#include "support/Process.h"

#include <cerrno>
#include <csignal>

#include <gtest/gtest.h>

#include "support/TemporaryFolder.h"

namespace {

using std::chrono::milliseconds;
using support::Command;
using support::Outcome;
using support::Process;

constexpr milliseconds kPlenty{30'000};

Command shell(const std::string& script) { return Command{"/bin/sh", "", {"-c", script}, {}, "", ""}; }

TEST(Process, KeepsOutputErrorsAndStatusApart) {
  const Outcome outcome = support::run(shell("printf out; printf err >&2; exit 234"), kPlenty);
  EXPECT_EQ(outcome.output, "out");
  EXPECT_EQ(outcome.errors, "err");
  EXPECT_TRUE(outcome.exitedWith(234));
  EXPECT_TRUE(outcome.exitedWith(-22));
  EXPECT_FALSE(outcome.exitedWith(0));
  EXPECT_EQ(outcome.describe(), "exit status 234");
  EXPECT_GT(outcome.peakMemoryKiB, 0);
}

TEST(Process, PassesArgumentsNameAndExactlyTheGivenEnvironment) {
  Command command = shell("printf '%s|' \"$0\" \"$@\"; env");
  command.arguments.insert(command.arguments.end(), {"name", "two words", "", "$HOME"});
  command.environment = {{"ONLY", "this one"}};
  const Outcome outcome = support::run(command, kPlenty);
  EXPECT_EQ(outcome.output.substr(0, outcome.output.rfind('|')), "name|two words||$HOME");
  EXPECT_NE(outcome.output.find("ONLY=this one\n"), std::string::npos);
  EXPECT_EQ(outcome.output.find("HOME="), std::string::npos);
}

TEST(Process, FeedsInputLargerThanAPipeWhileTakingOutput) {
  Command command = shell("cat");
  command.input.assign(1 << 20, 'x');
  EXPECT_EQ(support::run(command, kPlenty).output, command.input);
}

TEST(Process, SurvivesAProgramThatDoesNotReadItsInput) {
  Command command = shell("exit 0");
  command.input.assign(1 << 20, 'x');
  EXPECT_TRUE(support::run(command, kPlenty).exitedWith(0));
}

TEST(Process, NamesTheSignalThatEndedAProgram) {
  const Outcome outcome = support::run(shell("kill -SEGV $$"), kPlenty);
  EXPECT_EQ(outcome.end, Outcome::End::kSignalled);
  EXPECT_EQ(outcome.status, SIGSEGV);
  EXPECT_EQ(outcome.describe(), "signal 11");
}

TEST(Process, KillsAtTheDeadlineAndKeepsWhatWasWritten) {
  const Outcome outcome = support::run(shell("echo begun; sleep 100 & sleep 100"), milliseconds(300));
  EXPECT_EQ(outcome.end, Outcome::End::kTimedOut);
  EXPECT_EQ(outcome.output, "begun\n");
}

TEST(Process, DoesNotWaitForAChildThatKeepsThePipesOpen) {
  const Outcome outcome = support::run(shell("sleep 100 & echo done"), kPlenty);
  EXPECT_TRUE(outcome.exitedWith(0));
  EXPECT_EQ(outcome.output, "done\n");
}

TEST(Process, SaysWhyAProgramDidNotStart) {
  const Outcome missing = support::run(Command{"/no/such/program", "", {}, {}, "", ""}, kPlenty);
  EXPECT_EQ(missing.end, Outcome::End::kNotStarted);
  EXPECT_EQ(missing.status, ENOENT);
  Command badFolder = shell("exit 0");
  badFolder.folder = "/no/such/folder";
  EXPECT_EQ(support::run(badFolder, kPlenty).end, Outcome::End::kNotStarted);
}

TEST(Process, ABackgroundProgramCanBeWaitedForAndSignalled) {
  Process process;
  ASSERT_TRUE(
      process.start(shell("trap 'echo stopped; exit 7' TERM; echo ready; while :; do sleep 0.01; done")));
  ASSERT_TRUE(process.waitForText("ready", kPlenty));
  EXPECT_FALSE(process.waitForText("never written", milliseconds(1)));
  EXPECT_TRUE(process.signal(SIGTERM));
  EXPECT_TRUE(process.wait(kPlenty).exitedWith(7));
  EXPECT_EQ(process.wait(kPlenty).output, "ready\nstopped\n");
  EXPECT_FALSE(process.signal(SIGTERM));
}

TEST(Process, WaitingForTextEndsWithTheProgram) {
  Process process;
  ASSERT_TRUE(process.start(shell("echo something else")));
  EXPECT_FALSE(process.waitForText("ready", kPlenty));
}

TEST(Process, IsKilledWithItsObject) {
  pid_t pid = -1;
  {
    Process process;
    ASSERT_TRUE(process.start(shell("sleep 100")));
    pid = process.pid();
    ASSERT_EQ(::kill(pid, 0), 0);
  }
  EXPECT_EQ(::kill(pid, 0), -1);
  EXPECT_EQ(errno, ESRCH);
}

TEST(TemporaryFolder, IsEmptyAtFirstAndGoneAtTheEnd) {
  std::filesystem::path path;
  {
    const support::TemporaryFolder folder;
    path = folder.path();
    EXPECT_TRUE(std::filesystem::is_empty(path));
    ASSERT_TRUE(support::writeFile(path / "a/b", std::string("x\0y", 3)));
    EXPECT_EQ(support::readFile(path / "a/b"), std::string("x\0y", 3));
    EXPECT_EQ(support::readFile(path / "a"), std::nullopt);
    EXPECT_EQ(support::readFile(path / "missing"), std::nullopt);
    EXPECT_FALSE(support::writeFile(path / "a", "a folder is no file"));
  }
  EXPECT_FALSE(std::filesystem::exists(path));
}

TEST(TemporaryFolder, HoldsTheFoldersOfAHandset) {
  const support::TemporaryFolder folder;
  support::makeDeviceFolders(folder.path());
  EXPECT_TRUE(std::filesystem::is_directory(folder.path() / "mnt/vendor/persist/sensors/registry/registry"));
  EXPECT_TRUE(std::filesystem::is_directory(folder.path() / "data/app-ephemeral"));
}

}  // namespace
