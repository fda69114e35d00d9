/// Random resampling cases that cover every mapping, mask and channel count, from fixed seeds.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdint>
#include <ostream>
#include <vector>

#include "tests/reference/pixels.h"
#include "tests/testing/randomvalues.h"
#include "tests/testing/rasterbuilder.h"

namespace orin::testing {

enum class MaskKind { kNone, kRandom, kAllClear, kAllSet };
enum class MappingKind { kRatioGiven, kFromSizes, kGround };

/// How large the destination is beside the source, and by which of the three ways it is said.
struct MappingPlan {
  MappingKind kind;
  double ratioX, ratioY;  ///< destination size / source size
};

inline constexpr std::array<MappingPlan, 21> kMappings = {{
    {MappingKind::kRatioGiven, 0.5, 0.5},   {MappingKind::kRatioGiven, 1.0 / 3, 1.0 / 3},
    {MappingKind::kRatioGiven, 0.25, 0.25}, {MappingKind::kRatioGiven, 2.0 / 3, 2.0 / 3},
    {MappingKind::kRatioGiven, 0.2, 0.2},   {MappingKind::kRatioGiven, 0.4, 0.4},
    {MappingKind::kRatioGiven, 1, 1},       {MappingKind::kRatioGiven, 1.5, 1.25},
    {MappingKind::kRatioGiven, 3, 2},       {MappingKind::kRatioGiven, 0.5, 1.0 / 3},
    {MappingKind::kFromSizes, 0.5, 0.5},    {MappingKind::kFromSizes, 1.0 / 3, 1.0 / 3},
    {MappingKind::kFromSizes, 0.7, 0.15},   {MappingKind::kFromSizes, 1.3, 1},
    {MappingKind::kGround, 0.5, 0.5},       {MappingKind::kGround, 1.0 / 3, 1.0 / 3},
    {MappingKind::kGround, 0.4, 0.65},      {MappingKind::kGround, 1, 1},
    {MappingKind::kGround, 2, 2},           {MappingKind::kGround, 3, 3},
    {MappingKind::kGround, 1.6, 0.5},
}};
inline constexpr std::array<uint32_t, 5> kChannelCounts = {1, 2, 3, 4, 7};
inline constexpr std::array<int, 4> kThreadCounts = {1, 2, 3, 8};

/// What a method can be asked.
struct Abilities {
  uint32_t leastMargin;  ///< of the source, in pixels
  bool complexData = false;
  bool farAway = false;  ///< ground offsets of any size are defined
  bool fewerChannelsOut = false;
};

/// Everything of one call but the pixels.
struct Case {
  uint64_t seed;
  MappingPlan plan;
  MaskKind mask;
  uint32_t srcChannels, dstChannels;
  Geometry src, dst;
  Values values;
  reference::Settings settings;
};

inline std::ostream& operator<<(std::ostream& out, const Geometry& g) {
  return out << g.width << " x " << g.height << " margins " << g.marginX << ", " << g.marginY;
}

inline std::ostream& operator<<(std::ostream& out, const Case& c) {
  const reference::Settings& s = c.settings;
  out.precision(17);
  return out << "seed " << c.seed << ": mapping " << int(c.plan.kind) << ", mask " << int(c.mask)
             << ", channels " << c.srcChannels << " -> " << c.dstChannels << ", source " << c.src
             << ", destination " << c.dst << ", values " << int(c.values) << "\n  complex "
             << s.isComplex << ", no data " << s.noDataValue << ", ratio "
             << (s.ratioGiven ? "given " : "not given ") << s.ratioX << ", " << s.ratioY
             << ", ground " << s.georeferenced << " origins " << s.srcOriginX << ", "
             << s.srcOriginY << " -> " << s.dstOriginX << ", " << s.dstOriginY << " pixels "
             << s.srcPixelSizeX << ", " << s.srcPixelSizeY << " -> " << s.dstPixelSizeX << ", "
             << s.dstPixelSizeY;
}

/// Ground coordinates of one axis. \returns the offset in source pixels
inline double ChooseGround(Random& random, double ratio, const Abilities& can, double* srcOrigin,
                           double* srcPixel, double* dstOrigin, double* dstPixel) {
  static constexpr std::array<double, 6> kOrigins = {0, 12.5, -7.25, 500000.25, -300000.5, -64};
  static constexpr std::array<double, 7> kPixels = {1, 0.5, 2, 0.3, 30, -1, -30};
  static constexpr std::array<double, 9> kNear = {0, 0.5, -0.5, 1, 2.25, -1, -1.75, -3, 5};
  static constexpr std::array<double, 6> kFar = {-70, -4294967300.0, 4294967298.0, 1e6, -1.5, 1e12};
  double offset = random.OneIn(2) ? 0 : random.From(kNear);
  if (can.farAway && random.OneIn(3)) offset = random.From(kFar);
  *srcOrigin = random.From(kOrigins);
  *srcPixel = random.From(kPixels);
  *dstPixel = *srcPixel / ratio;
  *dstOrigin = *srcOrigin + offset * *srcPixel;
  return can.farAway ? 0 : offset;
}

/// A size from one pixel to just over 64, mostly round a power of two.
inline uint32_t ChooseSize(Random& random) {
  static constexpr std::array<uint32_t, 14> kSizes = {1,  2,  3,  5,  15, 16, 17,
                                                      24, 31, 32, 33, 63, 64, 65};
  return random.From(kSizes);
}

/// About `ratio` times the source that lies beyond `offset`: what fills it, a little more or less,
/// or any part of it.
inline uint32_t ChooseDestination(Random& random, uint32_t srcSize, double offset, double ratio) {
  const double fitting = std::floor((srcSize - offset) * ratio);
  const auto full = static_cast<int64_t>(std::clamp(fitting, 1.0, 80.0));
  const int64_t size = random.OneIn(3) ? random.Between(1, full) : full + random.Between(-1, 1);
  return static_cast<uint32_t>(std::max<int64_t>(size, 1));
}

inline void ChooseMapping(Random& random, const Abilities& can, Case& c) {
  reference::Settings& s = c.settings;
  double offsetX = 0, offsetY = 0;
  if (c.plan.kind == MappingKind::kGround) {
    s.georeferenced = true;
    offsetX = ChooseGround(random, c.plan.ratioX, can, &s.srcOriginX, &s.srcPixelSizeX,
                           &s.dstOriginX, &s.dstPixelSizeX);
    offsetY = ChooseGround(random, c.plan.ratioY, can, &s.srcOriginY, &s.srcPixelSizeY,
                           &s.dstOriginY, &s.dstPixelSizeY);
  }
  c.dst.width = ChooseDestination(random, c.src.width, offsetX, c.plan.ratioX);
  c.dst.height = ChooseDestination(random, c.src.height, offsetY, c.plan.ratioY);
  s.ratioGiven = c.plan.kind == MappingKind::kRatioGiven || (s.georeferenced && random.OneIn(3));
  if (s.ratioGiven) {
    s.ratioX = c.plan.ratioX;
    s.ratioY = c.plan.ratioY;
  }
}

/// The case of a seed. Some are not defined for every method; their twins say so.
inline Case MakeCase(uint64_t seed, const MappingPlan& plan, MaskKind mask, uint32_t channels,
                     bool isComplex, const Abilities& can) {
  Random random(seed);
  Case c{};
  c.seed = seed;
  c.plan = plan;
  c.mask = mask;
  c.srcChannels = channels;
  c.dstChannels = channels;
  if (can.fewerChannelsOut && random.OneIn(6))
    c.dstChannels = static_cast<uint32_t>(random.Between(1, channels));
  const auto margin = [&] { return static_cast<uint32_t>(can.leastMargin + random.Between(0, 2)); };
  c.src = {ChooseSize(random), ChooseSize(random), margin(), margin()};
  if (random.OneIn(6)) c.src.width = 1;
  if (random.OneIn(6)) c.src.height = 1;
  c.dst.marginX = static_cast<uint32_t>(random.Between(0, 3));
  c.dst.marginY = static_cast<uint32_t>(random.Between(0, 3));
  c.values = static_cast<Values>(random.Between(0, 3));
  c.settings.isComplex = isComplex;
  if (!random.OneIn(10)) c.settings.noDataValue = random.From(kNoDataValues);
  ChooseMapping(random, can, c);
  return c;
}

inline std::vector<uint8_t> MaskBytes(Random& random, MaskKind kind, const Geometry& g) {
  std::vector<uint8_t> bytes(TestMask::BytesFor(g), kind == MaskKind::kAllSet ? 0xFF : 0x00);
  if (kind != MaskKind::kRandom) return bytes;
  const int64_t density = random.Between(0, 2);  // three of four clear, half, three of four set
  for (uint8_t& byte : bytes) {
    const uint64_t bits = random.Bits();
    const auto a = static_cast<uint8_t>(bits), b = static_cast<uint8_t>(bits >> 8);
    byte = static_cast<uint8_t>(density == 0 ? a & b : density == 1 ? a : a | b);
  }
  return bytes;
}

}  // namespace orin::testing
