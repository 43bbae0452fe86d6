#pragma once

#include <string>
#include <utility>

#include <gtest/gtest.h>

/// What a piece of the program printed, and its result.
struct Captured {
  std::string out;
  std::string err;
  int result = 0;
};

/// Runs `body`, which returns an int or nothing, with standard output and error caught.
template <class Body>
Captured capture(Body body) {
  Captured captured;
  testing::internal::CaptureStdout();
  testing::internal::CaptureStderr();
  if constexpr (std::is_void_v<decltype(body())>) {
    body();
  } else {
    captured.result = body();
  }
  captured.out = testing::internal::GetCapturedStdout();
  captured.err = testing::internal::GetCapturedStderr();
  return captured;
}
