#pragma once

#include <string>
#include <vector>

#include "framework/Calibrator.h"
#include "ssc/Connection.h"

namespace fuzz {

/// Runs a command with the words, its own name first, quietly. `arguments` says the rest.
template <class Command>
int runCommand(Calibrator::Arguments arguments, std::vector<std::string> words, ssc::Connection* connection) {
  std::vector<char*> argv;
  for (std::string& word : words) argv.push_back(word.data());
  argv.push_back(nullptr);
  arguments.quiet = true;
  arguments.command = words.front();
  arguments.argc = static_cast<std::int32_t>(words.size());
  arguments.argv = argv.data();
  return Command(connection).Run(arguments);
}

}  // namespace fuzz
