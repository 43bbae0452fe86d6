// vantle-hub as its users run it: as a process.
#include <array>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <utility>
#include <vector>

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <spawn.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

extern char** environ;

namespace {

using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

constexpr std::chrono::seconds kPatience{120};

/// A running vantle-hub; killed with the object.
class Process {
 public:
  explicit Process(const std::vector<std::string>& arguments) {
    std::array<int, 2> outPipe{};
    std::array<int, 2> errPipe{};
    EXPECT_EQ(::pipe2(outPipe.data(), O_CLOEXEC), 0);
    EXPECT_EQ(::pipe2(errPipe.data(), O_CLOEXEC), 0);
    posix_spawn_file_actions_t actions;
    ::posix_spawn_file_actions_init(&actions);
    ::posix_spawn_file_actions_adddup2(&actions, outPipe[1], STDOUT_FILENO);
    ::posix_spawn_file_actions_adddup2(&actions, errPipe[1], STDERR_FILENO);
    std::vector<std::string> words{VANTLE_HUB_PROGRAM};
    words.insert(words.end(), arguments.begin(), arguments.end());
    std::vector<char*> argv;
    for (std::string& word : words) argv.push_back(word.data());
    argv.push_back(nullptr);
    EXPECT_EQ(::posix_spawn(&pid_, VANTLE_HUB_PROGRAM, &actions, nullptr, argv.data(), environ), 0);
    ::posix_spawn_file_actions_destroy(&actions);
    ::close(outPipe[1]);
    ::close(errPipe[1]);
    streams_ = {outPipe[0], errPipe[0]};
  }
  Process(const Process&) = delete;
  Process& operator=(const Process&) = delete;
  ~Process() {
    if (pid_ > 0) {
      ::kill(pid_, SIGKILL);
      ::waitpid(pid_, nullptr, 0);
    }
    for (const int stream : streams_) {
      if (stream >= 0) ::close(stream);
    }
  }

  /// Whoever reads what it says goes away.
  void CloseStreams() {
    for (int& stream : streams_) ::close(std::exchange(stream, -1));
    ended_.fill(true);
  }
  void Signal(int number) const { EXPECT_EQ(::kill(pid_, number), 0); }

  /// Reads until standard error holds `text`.
  [[nodiscard]] bool SaysOnError(const std::string& text) {
    return readUntil([&] { return err.find(text) != std::string::npos; });
  }
  /// Reads to the end of both streams; the exit status.
  int Wait() {
    EXPECT_TRUE(readUntil([&] { return ended_[0] && ended_[1]; }));
    int status = -1;
    EXPECT_EQ(::waitpid(pid_, &status, 0), pid_);
    pid_ = -1;
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  }

  std::string out;
  std::string err;

 private:
  template <class Done>
  bool readUntil(Done done) {
    const auto deadline = std::chrono::steady_clock::now() + kPatience;
    while (!done()) {
      const auto left =
          std::chrono::duration_cast<std::chrono::milliseconds>(deadline - std::chrono::steady_clock::now());
      if (left.count() <= 0) return false;
      std::array<pollfd, 2> polled{
          {{ended_[0] ? -1 : streams_[0], POLLIN, 0}, {ended_[1] ? -1 : streams_[1], POLLIN, 0}}};
      (void)::poll(polled.data(), polled.size(), static_cast<int>(left.count()));
      for (std::size_t i = 0; i < polled.size(); ++i) {
        if (polled[i].revents == 0) continue;
        std::array<char, 4096> buffer{};
        const ssize_t size = ::read(streams_[i], buffer.data(), buffer.size());
        if (size > 0) (i == 0 ? out : err).append(buffer.data(), static_cast<std::size_t>(size));
        if (size <= 0) ended_[i] = true;
      }
    }
    return true;
  }

  pid_t pid_ = -1;
  std::array<int, 2> streams_{};
  std::array<bool, 2> ended_{};
};

/// A client's end of the hub's socket.
class Client {
 public:
  explicit Client(const std::string& path) : fd_(::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0)) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    path.copy(address.sun_path, sizeof address.sun_path - 1);
    EXPECT_EQ(::connect(fd_, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
  }
  Client(const Client&) = delete;
  Client& operator=(const Client&) = delete;
  ~Client() { ::close(fd_); }

  [[nodiscard]] bool Send(const std::vector<std::uint8_t>& packet) const {
    return ::send(fd_, packet.data(), packet.size(), MSG_NOSIGNAL) == static_cast<ssize_t>(packet.size());
  }
  /// Whether a packet comes rather than the end.
  [[nodiscard]] bool Answered() const {
    pollfd polled{fd_, POLLIN, 0};
    (void)::poll(&polled, 1, static_cast<int>(std::chrono::milliseconds(kPatience).count()));
    std::array<char, 4096> buffer{};
    return ::recv(fd_, buffer.data(), buffer.size(), MSG_DONTWAIT) > 0;
  }

 private:
  int fd_;
};

class VantleHub : public testing::Test {
 protected:
  VantleHub() {
    std::string pattern = (std::filesystem::temp_directory_path() / "vantle-hub-XXXXXX").string();
    folder = ::mkdtemp(pattern.data());
    ::setenv("VANTLE_ROOT", (folder / "root").c_str(), 1);
    socket = (folder / "s").string();
  }
  ~VantleHub() override {
    ::unsetenv("VANTLE_ROOT");
    std::error_code ignored;
    std::filesystem::remove_all(folder, ignored);
  }
  std::filesystem::path folder;
  std::string socket;
};

TEST_F(VantleHub, OutlivesWhoeverReadsItsStandardError) {
  Process hub({"--socket", socket});
  ASSERT_TRUE(hub.SaysOnError("listening on"));
  hub.CloseStreams();
  // A line of the hub's for each; the answer shows that it has come past them.
  const Client client(socket);
  EXPECT_TRUE(client.Send({1, 2, 3}));
  EXPECT_TRUE(client.Send({1, 2, 3}));
  // A whole datagram, but what it carries is no request.
  EXPECT_TRUE(client.Send({0, 1, 0, 0x20, 0, 6, 0, 0x01, 3, 0, 1, 0, 0xff}));
  EXPECT_TRUE(client.Answered());
  hub.Signal(SIGTERM);
  EXPECT_EQ(hub.Wait(), 0);
}

TEST_F(VantleHub, HelpGoesToStandardOutput) {
  Process hub({"--help"});
  EXPECT_EQ(hub.Wait(), 0);
  EXPECT_THAT(hub.out, StartsWith("Usage: vantle-hub {--socket PATH | --qrtr}"));
  EXPECT_THAT(hub.out, HasSubstr("e4d4, o1v1, p2m2, rufael, t5h5, whiskel."));
  EXPECT_THAT(hub.err, IsEmpty());
}

TEST_F(VantleHub, MistakesInArgumentsShowTheUsageAndEndWithTwo) {
  const std::vector<std::pair<std::vector<std::string>, std::string>> mistakes = {
      {{}, "--socket PATH or --qrtr is missing"},
      {{"--qrtr", "--socket", socket}, "--socket and --qrtr exclude each other"},
      {{"--socket"}, "unknown option or missing value: --socket"},
      {{"--sokcet", socket}, "unknown option or missing value: --sokcet"},
      {{"--socket", socket, "extra"}, "unexpected argument: extra"},
      {{"--socket", socket, "--speed", "0"}, "--speed has to be a number above 0, up to 1000000"},
      {{"--socket", socket, "--speed", "nan"}, "--speed has to be"},
      {{"--socket", socket, "--speed", "2x"}, "--speed has to be"},
  };
  for (const auto& [arguments, message] : mistakes) {
    Process hub(arguments);
    EXPECT_EQ(hub.Wait(), 2) << message;
    EXPECT_THAT(hub.err, StartsWith("vantle-hub: " + message));
    EXPECT_THAT(hub.err, HasSubstr("\nUsage: vantle-hub"));
    EXPECT_THAT(hub.out, IsEmpty());
  }
}

TEST_F(VantleHub, WhatCannotBeSimulatedEndsWithOne) {
  Process unknown({"--socket", socket, "--scenario", "o1v2"});
  EXPECT_EQ(unknown.Wait(), 1);
  EXPECT_THAT(unknown.err, HasSubstr("scenario \"o1v2\""));
  Process mistaken({"--socket", socket, "--set", "hub.sed=1"});
  EXPECT_EQ(mistaken.Wait(), 1);
  EXPECT_THAT(mistaken.err, HasSubstr("hub.sed: unknown key"));
  Process tooLong({"--socket", std::string(200, 'a')});
  EXPECT_EQ(tooLong.Wait(), 1);
  EXPECT_THAT(tooLong.err, HasSubstr("longer than 107 bytes"));
}

TEST_F(VantleHub, MachineWithoutQrtrIsSaid) {
  if (const int qrtr = ::socket(AF_QIPCRTR, SOCK_DGRAM | SOCK_CLOEXEC, 0); qrtr >= 0) {
    ::close(qrtr);
    GTEST_SKIP() << "this machine has QRTR";
  }
  Process hub({"--qrtr"});
  EXPECT_EQ(hub.Wait(), 1);
  EXPECT_THAT(hub.err, StartsWith("vantle-hub: QRTR cannot be used on this machine: "));
}

TEST_F(VantleHub, ListensUntilItIsAskedToStop) {
  for (const int signal : {SIGTERM, SIGINT}) {
    Process hub({"--socket", socket, "--scenario", "e4d4", "--speed", "10"});
    ASSERT_TRUE(hub.SaysOnError("vantle-hub: listening on " + socket + " (scenario e4d4)\n")) << hub.err;
    EXPECT_TRUE(std::filesystem::is_socket(socket));
    hub.Signal(signal);
    EXPECT_EQ(hub.Wait(), 0);
    EXPECT_FALSE(std::filesystem::exists(socket));
  }
}

TEST_F(VantleHub, SocketThatAKilledHubHasLeftIsReplaced) {
  {
    Process killed({"--socket", socket});
    ASSERT_TRUE(killed.SaysOnError("listening"));
    killed.Signal(SIGKILL);
    EXPECT_EQ(killed.Wait(), -1);
  }
  ASSERT_TRUE(std::filesystem::exists(socket));
  Process hub({"--socket", socket});
  EXPECT_TRUE(hub.SaysOnError("listening")) << hub.err;
}

TEST_F(VantleHub, SocketOfARunningHubIsNotTaken) {
  Process first({"--socket", socket});
  ASSERT_TRUE(first.SaysOnError("listening"));
  Process second({"--socket", socket});
  EXPECT_EQ(second.Wait(), 1);
  EXPECT_THAT(second.err, HasSubstr("another hub listens there"));
  EXPECT_TRUE(std::filesystem::exists(socket));
}

}  // namespace
