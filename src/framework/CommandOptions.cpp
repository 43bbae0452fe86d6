#include "framework/CommandOptions.h"

namespace {

// How getopt returns a word when its option string starts with '-'.
constexpr int kWord = 1;

/// Words come back in turn instead of being moved behind the options, so that the driver's vector stays as it
/// is and POSIXLY_CORRECT in the environment changes nothing.
std::string withOrderMark(CommandOptions::Order order, const char* shortOptions) {
  return (order == CommandOptions::Order::kAnywhere ? "-" : "+") + std::string(shortOptions);
}

}  // namespace

CommandOptions::CommandOptions(const Calibrator::Arguments& arguments, const char* shortOptions,
                               const option* longOptions, Order order)
    : argc_(arguments.argc),
      argv_(arguments.argv),
      shortOptions_(withOrderMark(order, shortOptions)),
      longOptions_(longOptions) {
  // 0, not 1: glibc would go on with the order that the driver's own parsing asked for.
  optind = 0;
  opterr = 0;
}

int CommandOptions::Next() {
  for (;;) {
    const int found = longOptions_ == nullptr
                          ? getopt(argc_, argv_, shortOptions_.c_str())
                          : getopt_long(argc_, argv_, shortOptions_.c_str(), longOptions_, nullptr);
    if (found != kWord) {
      if (found == kEnd) words_.insert(words_.end(), argv_ + optind, argv_ + argc_);
      return found;
    }
    words_.push_back(optarg);
  }
}
