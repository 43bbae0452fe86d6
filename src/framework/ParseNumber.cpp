#include "framework/ParseNumber.h"

#include <cerrno>
#include <cstdlib>

#include "ssc/Results.h"

namespace {

/// `convert(text, &end)` is one of the C library's conversions, which report through errno and `end`.
template <class Value, class Convert>
int parse(const char* text, Value* out, Convert convert) {
  if (text == nullptr) return ssc::kInvalid;
  char* end = nullptr;
  errno = 0;
  const auto value = convert(text, &end);
  if (errno != 0) return ssc::kInvalid;
  if (*end != '\0') return ssc::kMalformed;
  if (out != nullptr) *out = static_cast<Value>(value);
  return ssc::kOk;
}

}  // namespace

int parseInt(const char* text, int* out) {
  return parse(text, out, [](const char* from, char** end) { return std::strtol(from, end, 0); });
}

int parseFloat(const char* text, float* out) {
  return parse(text, out, [](const char* from, char** end) { return std::strtof(from, end); });
}

int parseDouble(const char* text, double* out) {
  return parse(text, out, [](const char* from, char** end) { return std::strtod(from, end); });
}
