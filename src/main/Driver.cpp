#include "main/Driver.h"

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <optional>
#include <string>

#include <getopt.h>

#include "framework/Calibrator.h"
#include "framework/ParseNumber.h"
#include "main/Commands.h"
#include "main/Usage.h"
#include "ssc/Connection.h"
#include "ssc/Log.h"

namespace {

constexpr const char* kLogFile = "/data/app-ephemeral/vantle.log";

// "+": options end at the command's word, so that the command's own are never taken for global ones. "y"
// takes a value and is refused all the same: old factory scripts pass it and must hear about it.
constexpr const char* kShortOptions = "+d:hnqrv:y:";
constexpr int kVersionOption = 256;
constexpr option kLongOptions[] = {
    {"device", required_argument, nullptr, 'd'},
    {"help", no_argument, nullptr, 'h'},
    {"dry-run", no_argument, nullptr, 'n'},
    {"quiet", no_argument, nullptr, 'q'},
    {"reset", no_argument, nullptr, 'r'},
    {"verbose", required_argument, nullptr, 'v'},
    {"version", no_argument, nullptr, kVersionOption},
    {nullptr, 0, nullptr, 0},
};

/// What the options in front of the command asked for.
struct GlobalOptions {
  Calibrator::Arguments arguments;
  int pendingError = ssc::kOk;  ///< of a verbosity that is no number: ends the run before it connects
};

void echoCommandLine(int argc, char** argv) {
  ssc::fsay("$ ");
  for (int i = 0; i < argc; ++i) ssc::fsay("%s ", argv[i]);
  ssc::fsay("\n");
}

/// A level outside 1 to 4 is a warning and the run goes on; what is no number at all warns alike but is
/// returned. A later valid level makes good an earlier one.
int setVerbosity(const char* text) {
  int level = 0;
  const int result = parseInt(text, &level);
  if (result == ssc::kOk && level >= ssc::kLogWarn && level <= ssc::kLogVerbose) {
    ssc::setLogLevel(level);
  } else {
    ssc::log(ssc::kLogWarn, "Invalid verbosity '%s'; using default", text);
  }
  return result;
}

[[noreturn]] void exitAfterHelp() {
  printUsage(stdout);
  std::exit(EXIT_SUCCESS);
}

[[noreturn]] void exitAfterVersion() {
  printVersion();
  std::exit(EXIT_SUCCESS);
}

/// Takes one option. Nothing, or the result that ends the run.
std::optional<int> takeOption(int found, GlobalOptions* options) {
  switch (found) {
    case 'd':
      options->arguments.deviceType = Calibrator::Arguments::DeviceNameToDeviceType(optarg);
      if (options->arguments.deviceType != DeviceType::invalid) return std::nullopt;
      ssc::log(ssc::kLogError, "Invalid device type specified: '%s'", optarg);
      return ssc::kInvalid;
    case 'h':
      exitAfterHelp();
    case 'n':
      options->arguments.dryRun = true;
      return std::nullopt;
    case 'q':
      options->arguments.quiet = true;
      return std::nullopt;
    case 'r':
      options->arguments.reset = true;
      return std::nullopt;
    case 'v':
      options->pendingError = setVerbosity(optarg);
      return std::nullopt;
    case kVersionOption:
      exitAfterVersion();
    default:
      ssc::log(ssc::kLogError, "Invalid option '%c'", found);
      printUsage(stderr);
      return ssc::kInvalid;
  }
}

/// Parses everything up to and including the command's word. 0, or the result that ends the run.
int parseCommandLine(int argc, char** argv, Calibrator::Arguments* arguments) {
  GlobalOptions options;
  optind = 0;  // from the start, whoever parsed before
  opterr = 0;
  for (int found; (found = getopt_long(argc, argv, kShortOptions, kLongOptions, nullptr)) != -1;) {
    if (const std::optional<int> result = takeOption(found, &options)) return *result;
  }
  if (optind >= argc) {
    ssc::log(ssc::kLogError, "Missing command");
    printShortUsage(stderr);
    return ssc::kInvalid;
  }
  *arguments = options.arguments;
  arguments->command = argv[optind];
  arguments->argc = argc - optind;
  arguments->argv = argv + optind;
  return options.pendingError;
}

int runCommand(const Calibrator::Arguments& arguments, ssc::Connection* connection) {
  const std::unique_ptr<Calibrator> calibrator =
      makeCalibrator(arguments.command, arguments.deviceType, connection);
  if (calibrator != nullptr) return calibrator->Run(arguments);
  ssc::log(ssc::kLogError, "Unknown command '%s'", arguments.command.c_str());
  printUsage(stderr);
  return ssc::kInvalid;
}

int connectAndRun(const Calibrator::Arguments& arguments, const ssc::EmbeddedHubFactory& embeddedHub,
                  std::unique_ptr<ssc::Connection>* connection) {
  ssc::Connection* created = nullptr;
  const int result = ssc::Connection::Create(&created, embeddedHub);
  if (result != ssc::kOk) return result;
  connection->reset(created);
  return runCommand(arguments, created);
}

}  // namespace

int runVantle(int argc, char** argv, const ssc::EmbeddedHubFactory& embeddedHub) {
  // A reader of standard output that goes away must not end the run between two registry writes.
  std::signal(SIGPIPE, SIG_IGN);
  ssc::openLogFile(kLogFile);
  ssc::setLogLevel(ssc::kLogInfo);
  echoCommandLine(argc, argv);

  Calibrator::Arguments arguments;
  std::unique_ptr<ssc::Connection> connection;
  int result = parseCommandLine(argc, argv, &arguments);
  if (result == ssc::kOk) result = connectAndRun(arguments, embeddedHub, &connection);
  ssc::closeLogFile();
  return result;  // the connection goes after the log is closed
}
