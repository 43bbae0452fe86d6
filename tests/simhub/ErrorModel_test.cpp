#include "simhub/ErrorModel.h"

#include <array>
#include <cmath>

#include <gtest/gtest.h>

namespace {

using simhub::ErrorModel;
using simhub::NoiseGenerator;

constexpr double kReference = 25;

template <std::size_t N>
std::array<double, N> readingOf(const ErrorModel& model, std::array<double, N> values,
                                double temperature = kReference) {
  NoiseGenerator generator(1);
  model.Apply(values, temperature, generator);
  return values;
}

TEST(ErrorModel, NeutralModelChangesNothing) {
  EXPECT_EQ(readingOf(ErrorModel{}, std::array{1.5, -2.0, 3.25}), (std::array{1.5, -2.0, 3.25}));
}

TEST(ErrorModel, BiasIsAddedToEachChannel) {
  ErrorModel model;
  model.bias = {1, 2, 3, 4, 5, 6, 7, 8};
  EXPECT_EQ(readingOf(model, std::array{0.0, 0.0, 0.0, 0.0, 0.0, 0.0, 0.0, 0.0}),
            (std::array{1.0, 2.0, 3.0, 4.0, 5.0, 6.0, 7.0, 8.0}));
}

TEST(ErrorModel, MatrixActsInRowOrder) {
  ErrorModel model;
  model.scale = {1, 2, 3, 4, 5, 6, 7, 8, 9};
  EXPECT_EQ(readingOf(model, std::array{1.0, 10.0, 100.0}), (std::array{321.0, 654.0, 987.0}));
}

TEST(ErrorModel, SoftIronActsBeforeTheScale) {
  ErrorModel model;
  model.softIron = {0, 1, 0, 1, 0, 0, 0, 0, 1};  // swaps x and y
  model.scale = {2, 0, 0, 0, 3, 0, 0, 0, 1};
  EXPECT_EQ(readingOf(model, std::array{1.0, 10.0, 0.0}), (std::array{20.0, 3.0, 0.0}));
}

TEST(ErrorModel, FewerThanThreeValuesUseTheDiagonal) {
  ErrorModel model;
  model.scale = {2, 9, 9, 9, 3, 9, 9, 9, 9};
  EXPECT_EQ(readingOf(model, std::array{1.0}), (std::array{2.0}));
  EXPECT_EQ(readingOf(model, std::array{1.0, 1.0}), (std::array{2.0, 3.0}));
}

TEST(ErrorModel, ValuesPastTheThirdAreNotScaled) {
  ErrorModel model;
  model.scale = {2, 0, 0, 0, 2, 0, 0, 0, 2};
  EXPECT_EQ(readingOf(model, std::array{1.0, 1.0, 1.0, 1.0}), (std::array{2.0, 2.0, 2.0, 1.0}));
}

TEST(ErrorModel, TemperatureSlopeCountsFromTheReference) {
  ErrorModel model;
  model.temperatureSlope = {0.5};
  model.referenceTemperature = 20;
  EXPECT_EQ(readingOf(model, std::array{1.0}, 20), (std::array{1.0}));
  EXPECT_EQ(readingOf(model, std::array{1.0}, 30), (std::array{6.0}));
}

TEST(ErrorModel, QuantisesLast) {
  ErrorModel model;
  model.bias = {0.3};
  model.quantisation = 0.25;
  EXPECT_EQ(readingOf(model, std::array{1.0}), (std::array{1.25}));
  EXPECT_EQ(readingOf(model, std::array{1.1}), (std::array{1.5}));
}

TEST(ErrorModel, NoiseOfOneChannelLeavesTheOthersAlone) {
  ErrorModel quiet;
  quiet.noise = {0, 1, 0};
  ErrorModel loud;
  loud.noise = {5, 1, 0};
  const auto a = readingOf(quiet, std::array{0.0, 0.0, 0.0});
  const auto b = readingOf(loud, std::array{0.0, 0.0, 0.0});
  EXPECT_NE(a[0], b[0]);
  EXPECT_EQ(a[1], b[1]);
  EXPECT_EQ(b[2], 0);
}

TEST(NoiseGenerator, IsWhiteAndGaussian) {
  // Bounds of five standard errors for 100,000 numbers.
  constexpr int kCount = 100'000;
  NoiseGenerator generator(42);
  double sum = 0;
  double squares = 0;
  double fourth = 0;
  double lagged = 0;
  double previous = 0;
  for (int i = 0; i < kCount; ++i) {
    const double value = generator.Next();
    sum += value;
    squares += value * value;
    fourth += value * value * value * value;
    lagged += value * previous;
    previous = value;
  }
  const double root = std::sqrt(static_cast<double>(kCount));
  EXPECT_NEAR(sum / kCount, 0, 5 / root);
  EXPECT_NEAR(squares / kCount, 1, 5 * std::sqrt(2.0) / root);
  EXPECT_NEAR(fourth / kCount, 3, 5 * std::sqrt(96.0) / root);
  EXPECT_NEAR(lagged / kCount, 0, 5 / root);
}

TEST(NoiseGenerator, SameSeedSameNumbers) {
  NoiseGenerator a(7);
  NoiseGenerator b(7);
  NoiseGenerator c(8);
  for (int i = 0; i < 10; ++i) {
    const double value = a.Next();
    EXPECT_EQ(value, b.Next());
    EXPECT_NE(value, c.Next());
  }
}

}  // namespace
