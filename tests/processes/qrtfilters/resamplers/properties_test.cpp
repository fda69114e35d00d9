/// What holds for every image, whatever its pixels.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>
#include <omp.h>
#include <rapidcheck.h>
#include <rapidcheck/gtest.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <numeric>
#include <utility>
#include <vector>

#include "processes/qrtfilters/resamplers/factories.h"
#include "tests/processes/qrtfilters/resamplers/wholeimage.h"

namespace orin::testing {
namespace {

/// The same cases in every run; the environment may ask for others.
const int kSeeded = setenv("RC_PARAMS", "seed=20 max_success=300", 0);

resamplers::NearestNeighbourResamplerFactory nearest;
resamplers::AverageResamplerFactory average;
resamplers::ModeResamplerFactory mode;
resamplers::BilinearResamplerFactory bilinear;
resamplers::BicubicResamplerFactory bicubic;
constexpr std::array<resamplers::IResamplerFactory*, 5> kFactories = {&nearest, &average, &mode,
                                                                      &bilinear, &bicubic};

resamplers::IResamplerFactory& AnyMethod() {
  const auto index = *rc::gen::inRange<size_t>(0, kFactories.size()).as("method");
  return *kFactories[index];
}

uint32_t AnyOf(std::vector<uint32_t> choices, const char* what) {
  return *rc::gen::elementOf(std::move(choices)).as(what);
}

/// Reductions whose source level divides the target, so that no mapped position is rounded.
const std::vector<Step> kWholeSteps = {{1, 2}, {1, 3}, {1, 4}, {1, 5},
                                       {1, 7}, {2, 4}, {2, 6}, {3, 6}};
/// Others, among them positions such as 1 / 0.75.
const std::vector<Step> kFractionalSteps = {{2, 3}, {2, 5}, {3, 4}, {4, 6}};

Step AnyOf(const std::vector<Step>& steps) {
  return steps[*rc::gen::inRange<size_t>(0, steps.size()).as("step")];
}

Step AnyStep() {
  return AnyOf(*rc::gen::arbitrary<bool>().as("fractional") ? kFractionalSteps : kWholeSteps);
}

uint32_t AnySize(const char* what) {
  return static_cast<uint32_t>(*rc::gen::inRange(8, 70).as(what));
}

template <class T>
Image<T> AnyImage(Values kind) {
  const uint32_t width = AnySize("width");
  const uint32_t height = AnySize("height");
  const uint32_t channels = AnyOf({1, 2, 3}, "channels");
  return RandomImage<T>(width, height, channels, kind,
                        static_cast<uint64_t>(*rc::gen::inRange(0, 1000000).as("seed")));
}

template <class T>
std::vector<T> MakeAtOnce(resamplers::IResamplerFactory& factory, const Image<T>& image,
                          bool masked, const Step& step) {
  return MakeLevel(factory, image, masked, step, 1000, 1000);
}

template <class T>
bool SameBytes(const std::vector<T>& a, const std::vector<T>& b) {
  return a.size() == b.size() && std::memcmp(a.data(), b.data(), a.size() * sizeof(T)) == 0;
}

template <class T>
void ConstantStaysConstant() {
  const auto value = static_cast<T>(*rc::gen::inRange(0, 128).as("value"));
  Image<T> image = AnyImage<T>(Values::kFew);
  std::fill(image.values.begin(), image.values.end(), value);
  for (const T result : MakeAtOnce(AnyMethod(), image, false, AnyStep()))
    RC_ASSERT(result == value);
}
RC_GTEST_PROP(EveryMethod, KeepsAConstantUint8Image, ()) { ConstantStaysConstant<uint8_t>(); }
RC_GTEST_PROP(EveryMethod, KeepsAConstantInt16Image, ()) { ConstantStaysConstant<int16_t>(); }
RC_GTEST_PROP(EveryMethod, KeepsAConstantFloatImage, ()) { ConstantStaysConstant<float>(); }

/// Weights whose sum falls short of one by its last bit, and 64-bit integers are not rounded.
RC_GTEST_PROP(EveryMethod, KeepsAConstantUint64ImageOrFallsOneShort, ()) {
  const auto value = static_cast<uint64_t>(*rc::gen::inRange(1, 128).as("value"));
  Image<uint64_t> image = AnyImage<uint64_t>(Values::kFew);
  std::fill(image.values.begin(), image.values.end(), value);
  for (const uint64_t result : MakeAtOnce(AnyMethod(), image, false, AnyStep()))
    RC_ASSERT(result == value || result == value - 1);
}

template <class T>
void ModeInventsNothing(Values kind) {
  const Image<T> image = AnyImage<T>(kind);
  for (const T& result : MakeAtOnce<T>(mode, image, false, AnyStep())) {
    const auto isResult = [&](const T& v) { return std::memcmp(&v, &result, sizeof v) == 0; };
    RC_ASSERT(std::any_of(image.values.begin(), image.values.end(), isResult));
  }
}
RC_GTEST_PROP(Mode, WritesOnlyValuesThatItReadAsInt8, ()) {
  ModeInventsNothing<int8_t>(Values::kAnyBits);
}
RC_GTEST_PROP(Mode, WritesOnlyValuesThatItReadAsInt64, ()) {
  ModeInventsNothing<int64_t>(Values::kLimits);
}
RC_GTEST_PROP(Mode, WritesOnlyValuesThatItReadAsDouble, ()) {
  ModeInventsNothing<double>(Values::kLimits);
}

template <class T>
void StaysBetween(resamplers::IResamplerFactory& factory, Values kind) {
  const Image<T> image = AnyImage<T>(kind);
  const auto [low, high] = std::minmax_element(image.values.begin(), image.values.end());
  for (const T result : MakeAtOnce(factory, image, false, AnyStep()))
    RC_ASSERT(result >= *low && result <= *high);
}
RC_GTEST_PROP(Average, StaysBetweenMinimumAndMaximumOfUint16, ()) {
  StaysBetween<uint16_t>(average, Values::kAnyBits);
}
RC_GTEST_PROP(Average, StaysBetweenMinimumAndMaximumOfInt8, ()) {
  StaysBetween<int8_t>(average, Values::kFew);
}
RC_GTEST_PROP(Average, StaysBetweenMinimumAndMaximumOfFloat, ()) {
  StaysBetween<float>(average, Values::kSmall);
}
RC_GTEST_PROP(Bilinear, StaysBetweenMinimumAndMaximumOfUint16, ()) {
  StaysBetween<uint16_t>(bilinear, Values::kAnyBits);
}
RC_GTEST_PROP(Bilinear, StaysBetweenMinimumAndMaximumOfInt8, ()) {
  StaysBetween<int8_t>(bilinear, Values::kFew);
}
RC_GTEST_PROP(Bilinear, StaysBetweenMinimumAndMaximumOfFloat, ()) {
  StaysBetween<float>(bilinear, Values::kSmall);
}

template <class T>
void ThreadsChangeNothing() {
  const Image<T> image = AnyImage<T>(Values::kLimits);
  resamplers::IResamplerFactory& factory = AnyMethod();
  const Step step = AnyStep();
  const bool masked = *rc::gen::arbitrary<bool>().as("masked");
  omp_set_num_threads(1);
  const std::vector<T> alone = MakeAtOnce(factory, image, masked, step);
  omp_set_num_threads(static_cast<int>(AnyOf({2, 3, 8}, "threads")));
  RC_ASSERT(SameBytes(alone, MakeAtOnce(factory, image, masked, step)));
}
RC_GTEST_PROP(EveryMethod, GivesTheSameUint8PixelsInAnyNumberOfThreads, ()) {
  ThreadsChangeNothing<uint8_t>();
}
RC_GTEST_PROP(EveryMethod, GivesTheSameDoublePixelsInAnyNumberOfThreads, ()) {
  ThreadsChangeNothing<double>();
}

/// The level once at a stretch and once in blocks that start on whole source pixels: at multiples
/// of source / gcd(source, target).
template <class T>
std::pair<std::vector<T>, std::vector<T>> BothWays(resamplers::IResamplerFactory& factory,
                                                   const Step& step, bool masked) {
  const Image<T> image = AnyImage<T>(Values::kSmall);
  const uint32_t unit = step.source / std::gcd(step.source, step.target);
  const uint32_t width = unit * AnyOf({1, 2, 3, 5, 8, 16}, "block width");
  const uint32_t height = unit * AnyOf({1, 2, 3, 5, 8, 16}, "block height");
  return {MakeAtOnce(factory, image, masked, step),
          MakeLevel(factory, image, masked, step, width, height)};
}

template <class T>
void BlocksChangeNothing(resamplers::IResamplerFactory& factory, const Step& step) {
  const bool masked = *rc::gen::arbitrary<bool>().as("masked");
  const auto [atOnce, inBlocks] = BothWays<T>(factory, step, masked);
  RC_ASSERT(SameBytes(atOnce, inBlocks));
}
RC_GTEST_PROP(EveryMethod, GivesTheSameUint8PixelsInBlocksWhenLevelsDivide, ()) {
  BlocksChangeNothing<uint8_t>(AnyMethod(), AnyOf(kWholeSteps));
}
RC_GTEST_PROP(EveryMethod, GivesTheSameUint16PixelsInBlocksWhenLevelsDivide, ()) {
  BlocksChangeNothing<uint16_t>(AnyMethod(), AnyOf(kWholeSteps));
}
RC_GTEST_PROP(EveryMethod, GivesTheSameFloatPixelsInBlocksWhenLevelsDivide, ()) {
  BlocksChangeNothing<float>(AnyMethod(), AnyOf(kWholeSteps));
}
RC_GTEST_PROP(NearestNeighbour, GivesTheSamePixelsInBlocksOfAFractionalStep, ()) {
  BlocksChangeNothing<uint8_t>(nearest, AnyOf(kFractionalSteps));
}
RC_GTEST_PROP(Average, GivesTheSamePixelsInBlocksOfAFractionalStep, ()) {
  BlocksChangeNothing<uint8_t>(average, AnyOf(kFractionalSteps));
}
RC_GTEST_PROP(Mode, GivesTheSamePixelsInBlocksOfAFractionalStep, ()) {
  BlocksChangeNothing<uint8_t>(mode, AnyOf(kFractionalSteps));
}

/// A position such as 1 / 0.75 is rounded differently in another block, and so is a tie.
RC_GTEST_PROP(Interpolation, DiffersByOneAtMostInBlocksOfAFractionalStep, ()) {
  resamplers::IResamplerFactory& factory = *kFactories[AnyOf({3, 4}, "method")];
  const auto [atOnce, inBlocks] = BothWays<uint8_t>(factory, AnyOf(kFractionalSteps), false);
  RC_ASSERT(atOnce.size() == inBlocks.size());
  for (size_t i = 0; i < atOnce.size(); ++i) RC_ASSERT(std::abs(atOnce[i] - inBlocks[i]) <= 1);
}

}  // namespace
}  // namespace orin::testing
