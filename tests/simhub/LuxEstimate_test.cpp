#include "simhub/sensors/LuxEstimate.h"

#include <gtest/gtest.h>

#include "simhub/HubHarness.h"

namespace {

using simhub::DisplayPicture;
using simhub::LuxCalibration;

constexpr std::array<double, 4> kCounts{100, 40, 45, 25};
constexpr double kLux = 100 - 0.711 * 40 + 1.729 * 45 - 1.999 * 25;

TEST(LuxEstimate, WeighsTheChannelsByTheirCoefficients) {
  EXPECT_NEAR(simhub::estimateLux(kCounts, {}, {}), kLux, 1e-9);
  LuxCalibration calibration;
  calibration.coefficients = {0.5, 1, 2, 4};
  calibration.scale = 3;
  EXPECT_NEAR(simhub::estimateLux(kCounts, {}, calibration), 3 * (50 + 40 + 90 + 100), 1e-9);
}

TEST(LuxEstimate, WhatAllChannelsSeeAlikeCountsNextToNothing) {
  EXPECT_NEAR(simhub::estimateLux({100, 100, 100, 100}, {}, {}), 1.9, 1e-9);
}

TEST(LuxEstimate, IsNeverNegative) { EXPECT_EQ(simhub::estimateLux({0, 100, 0, 0}, {}, {}), 0); }

TEST(LuxEstimate, TakesThePulsesOffBelowTheBoundary) {
  LuxCalibration calibration;
  calibration.coefficients = {1, 0, 0, 0};
  calibration.pwmBoundary = 80;
  DisplayPicture display;
  display.pulses = 40;
  display.brightness = 20;
  EXPECT_NEAR(simhub::estimateLux(kCounts, display, calibration), 100 - 30, 1e-9);
  display.brightness = 80;
  EXPECT_NEAR(simhub::estimateLux(kCounts, display, calibration), 100, 1e-9);
}

TEST(LuxEstimate, TakesThePicturesShareOfThePatternLinesOff) {
  LuxCalibration calibration;
  calibration.coefficients = {1, 1, 0, 0};
  calibration.pattern[0] = simhub::BrightnessLine{5, 0.5};
  DisplayPicture display;
  display.brightness = 50;
  display.share = {0.4, 1, 1, 1};
  EXPECT_NEAR(simhub::estimateLux(kCounts, display, calibration), 140 - 0.4 * 30, 1e-9) << "red has no line";
}

TEST(LuxEstimate, TakesNothingOffWhileTheDisplayIsOff) {
  LuxCalibration calibration;
  calibration.coefficients = {1, 0, 0, 0};
  calibration.pwmBoundary = 80;
  calibration.pattern[0] = simhub::BrightnessLine{5, 0.5};
  DisplayPicture display;
  display.pulses = 40;
  EXPECT_NEAR(simhub::estimateLux(kCounts, display, calibration), 100, 1e-9);
}

TEST(GainRatio, IsTheStoredOneForSettings8To10AndAPowerOfTwoElse) {
  const simhub::GainRatios ratios{8.5, 4.25, 2.125};
  EXPECT_EQ(simhub::gainRatio(ratios, 11), 1);
  EXPECT_EQ(simhub::gainRatio(ratios, 10), 2.125);
  EXPECT_EQ(simhub::gainRatio(ratios, 9), 4.25);
  EXPECT_EQ(simhub::gainRatio(ratios, 8), 8.5);
  EXPECT_EQ(simhub::gainRatio(ratios, 7), 16);
  EXPECT_EQ(simhub::gainRatio(ratios, 0), 2048);
}

TEST(ReadLuxCalibration, EmptyGroupIsThatOfANewHandset) {
  const LuxCalibration calibration = simhub::readLuxCalibration({});
  EXPECT_EQ(calibration.scale, 1);
  EXPECT_EQ(calibration.delayMs, 0);
  EXPECT_EQ(calibration.coefficients, simhub::kDesignCoefficients);
  EXPECT_EQ(calibration.gainRatios[3], simhub::kDesignGainRatios);
  EXPECT_FALSE(calibration.pattern[0].has_value());
}

TEST(ReadLuxCalibration, ReadsEveryItem) {
  sns_registry_data group;
  addFloat(&group, "scale", 1.5F);
  addFloat(&group, "delay", 6.25F);
  addFloat(&group, "g_gain_ratio_9", 4.5F);
  addFloat(&group, "b_coeff", -2.5F);
  addFloat(&group, "pattern_w_r_coef0", 3);
  addFloat(&group, "pattern_w_r_coef1", 0.75F);
  addFloat(&group, "pattern_w_b_coef0", 3);  // half of a line
  const LuxCalibration calibration = simhub::readLuxCalibration(group);
  EXPECT_EQ(calibration.scale, 1.5);
  EXPECT_EQ(calibration.delayMs, 6.25);
  EXPECT_EQ(calibration.gainRatios[2], (simhub::GainRatios{8, 4.5, 2}));
  EXPECT_EQ(calibration.coefficients[3], -2.5);
  ASSERT_TRUE(calibration.pattern[1].has_value());
  EXPECT_EQ(calibration.pattern[1]->atZero, 3);
  EXPECT_EQ(calibration.pattern[1]->slope, 0.75);
  EXPECT_FALSE(calibration.pattern[3].has_value());
}

TEST(ReadLuxCalibration, TakesIntegersForNumbers) {
  sns_registry_data group;
  for (const char* const name : {"scale", "pwm_boundary"}) {
    sns_registry_data_item* const item = group.add_items();
    item->set_name(name);
    item->set_sint(72);
  }
  EXPECT_EQ(simhub::readLuxCalibration(group).scale, 72);
  EXPECT_EQ(simhub::readLuxCalibration(group).pwmBoundary, 72);
}

}  // namespace
