// Compares what a run left behind with what its case expects, and says where they differ.
#pragma once

#include <string>

#include "cli/GoldenCase.h"

namespace golden {

/// The lines in which `expected` and `actual` differ, '-' in front of what was expected and '+' in front of
/// what came, with a few lines around them. Blanks at a line's end and a missing newline at the end show.
/// Empty when equal.
[[nodiscard]] std::string differenceOf(const std::string& expected, const std::string& actual);

/// Whether two statuses mean the same: exit statuses are compared as a shell sees them, modulo 256.
[[nodiscard]] bool sameStatus(const std::string& expected, const std::string& actual);

/// Everything in which a run differs from what its case states, each section under its name; empty when
/// nothing does.
[[nodiscard]] std::string compareRun(const Run& run, const Result& actual);

/// Puts what a run left behind in place of what its case expected: the three sections that every run has, and
/// of the others those that the case states.
void updateRun(const Result& actual, Run* run);

}  // namespace golden
