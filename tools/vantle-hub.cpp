// The simulated hub as a process of its own, on a Unix-domain socket or in the place of a handset's hub.
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <getopt.h>
#include <signal.h>
#include <sys/signalfd.h>
#include <unistd.h>

#include "main/StandardStreams.h"
#include "simhub/QrtrServer.h"
#include "simhub/Scenario.h"
#include "simhub/SimulatedRoot.h"
#include "simhub/SocketServer.h"

namespace {

constexpr int kUsageError = 2;
constexpr double kMaxSpeed = 1e6;

constexpr const char* kUsage =
    "Usage: vantle-hub {--socket PATH | --qrtr} [--scenario NAME|FILE] [--set KEY=VALUE]... [--speed X]\n"
    "                  [--help]\n";
constexpr const char* kHelp =
    "\n"
    "Runs a simulated sensor hub until SIGTERM or SIGINT. Programs on this machine reach\n"
    "it with VANTLE_HUB=unix:PATH, or over QRTR like a handset's own hub.\n"
    "\n"
    "  --socket PATH         Listen at the Unix-domain socket PATH. A socket that nobody\n"
    "                          listens at is replaced.\n"
    "  --qrtr                Register the hub's service with the name service of QRTR.\n"
    "  --scenario NAME|FILE  What is simulated: a built-in scenario or a TOML file.\n"
    "                          Default is o1v1.\n"
    "  --set KEY=VALUE       Change the scenario; KEY is dotted, as in world.pressure=990.\n"
    "  --speed X             Run X times as fast as real time. Default is 1.\n"
    "  --help                Print this help and exit.\n"
    "\n"
    "Built-in scenarios: ";
constexpr const char* kEnvironment =
    "The environment variable VANTLE_ROOT names the folder in front of the registry's\n"
    "folder; without it, vantle-sim under XDG_STATE_HOME or ~/.local/state.\n";

constexpr option kOptions[] = {
    {"socket", required_argument, nullptr, 's'},
    {"qrtr", no_argument, nullptr, 'q'},
    {"scenario", required_argument, nullptr, 'c'},
    {"set", required_argument, nullptr, 'o'},
    {"speed", required_argument, nullptr, 'x'},
    {"help", no_argument, nullptr, 'h'},
    {nullptr, 0, nullptr, 0},
};

struct Arguments {
  std::string socket;  ///< empty: QRTR
  bool qrtr = false;
  std::string scenario;
  std::vector<std::string> overrides;
  double speed = 1;
};

int usageError(const std::string& what) {
  (void)std::fprintf(stderr, "vantle-hub: %s\n%s", what.c_str(), kUsage);
  return kUsageError;
}

int fail(const std::string& what) {
  (void)std::fprintf(stderr, "vantle-hub: %s\n", what.c_str());
  return EXIT_FAILURE;
}

void printHelp() {
  (void)std::printf("%s%s", kUsage, kHelp);
  const char* separator = "";
  for (const std::string& name : simhub::builtInScenarios()) {
    (void)std::printf("%s%s", separator, name.c_str());
    separator = ", ";
  }
  (void)std::printf(".\n%s", kEnvironment);
}

bool parseSpeed(const char* text, double* speed) {
  char* end = nullptr;
  *speed = std::strtod(text, &end);
  return end != text && *end == '\0' && *speed > 0 && *speed <= kMaxSpeed;
}

/// 0, or the exit status plus one that ends the program here: help is asked for or the arguments are wrong.
int parseArguments(int argc, char** argv, Arguments* arguments) {
  opterr = 0;
  for (int found; (found = getopt_long(argc, argv, "", kOptions, nullptr)) != -1;) {
    switch (found) {
      case 's':
        arguments->socket = optarg;
        break;
      case 'q':
        arguments->qrtr = true;
        break;
      case 'c':
        arguments->scenario = optarg;
        break;
      case 'o':
        arguments->overrides.emplace_back(optarg);
        break;
      case 'x':
        if (!parseSpeed(optarg, &arguments->speed)) {
          return 1 + usageError("--speed has to be a number above 0, up to 1000000");
        }
        break;
      case 'h':
        printHelp();
        return 1;
      default:
        return 1 + usageError(std::string("unknown option or missing value: ") + argv[optind - 1]);
    }
  }
  if (optind < argc) return 1 + usageError(std::string("unexpected argument: ") + argv[optind]);
  if (arguments->socket.empty() && !arguments->qrtr) {
    return 1 + usageError("--socket PATH or --qrtr is missing");
  }
  if (!arguments->socket.empty() && arguments->qrtr) {
    return 1 + usageError("--socket and --qrtr exclude each other");
  }
  return 0;
}

/// A descriptor that can be read once the process is asked to stop; the signals themselves do nothing then.
int openStopSignals() {
  sigset_t signals;
  sigemptyset(&signals);
  sigaddset(&signals, SIGTERM);
  sigaddset(&signals, SIGINT);
  if (::sigprocmask(SIG_BLOCK, &signals, nullptr) != 0) return -1;
  return ::signalfd(-1, &signals, SFD_CLOEXEC | SFD_NONBLOCK);
}

void diagnose(const std::string& text) { (void)std::fprintf(stderr, "vantle-hub: %s\n", text.c_str()); }

std::unique_ptr<simhub::HubServer> makeServer(const Arguments& arguments, const std::string& root,
                                              simhub::Scenario scenario, std::string* error) {
  simhub::SocketServerOptions options;
  options.path = arguments.socket;
  options.speed = arguments.speed;
  options.files = simhub::hubFiles(root);
  if (!arguments.qrtr) return simhub::SocketServer::Create(options, std::move(scenario), diagnose, error);
  return simhub::QrtrServer::Create(options, simhub::QrtrPort::OfThisMachine(), std::move(scenario), diagnose,
                                    error);
}

int serve(const Arguments& arguments, simhub::Scenario scenario) {
  std::string error;
  const std::string root = simhub::simulatedRoot(&error);
  if (root.empty() || !simhub::prepareSimulatedRoot(root, &error)) return fail(error);

  // A reader of standard error that goes away must not take the hub with it at the next line.
  (void)::signal(SIGPIPE, SIG_IGN);
  const int stop = openStopSignals();
  if (stop < 0) return fail(std::string("signals: ") + std::strerror(errno));
  const std::string name = scenario.name;
  const auto server = makeServer(arguments, root, std::move(scenario), &error);
  if (server == nullptr) return fail(error);
  const std::string where = arguments.qrtr ? "QRTR" : arguments.socket;
  diagnose("listening on " + where + " (scenario " + name + ")");
  const int failure = server->Run(stop);
  (void)::close(stop);
  return failure == 0 ? EXIT_SUCCESS : fail(std::strerror(failure));
}

}  // namespace

int main(int argc, char** argv) {
  openMissingStandardStreams();
  Arguments arguments;
  if (const int end = parseArguments(argc, argv, &arguments); end != 0) return end - 1;
  simhub::Scenario scenario;
  std::string error;
  if (!simhub::loadScenario(arguments.scenario, arguments.overrides, &scenario, &error)) return fail(error);
  return serve(arguments, std::move(scenario));
}
