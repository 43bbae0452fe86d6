// Least-squares fits of (x, y) pairs. Coefficients are given lowest power first.
//
// The two differ on purpose, in precision and in what they do with degenerate points; callers rely on both.
#pragma once

#include <utility>
#include <vector>

#include "framework/SampleData.h"

/// Straight line y = q0 + q1·x about the means: q1 = Σ(x − x̄)(y − ȳ) / Σ(x − x̄)², q0 = ȳ − x̄·q1, all in
/// 32-bit float. False, with `coefficients` left alone, for no points or when all x are equal. `coefficients`
/// may be null.
bool linearFit(const std::vector<std::pair<float, float>>& points, SampleData* coefficients);

/// Parabola y = q0 + q1·x + q2·x² by the normal equations, summed and solved in double, rounded to float at
/// the end. False, with `coefficients` left alone, for fewer than three points. Otherwise true, also for a
/// singular system (all x equal), whose coefficients are (0, 0, 0) after a message on standard output.
/// `coefficients` may be null.
bool quadraticFit(const std::vector<std::pair<float, float>>& points, SampleData* coefficients);
