/// Compares the pixels of a block with declared no-data values, many at a time.
// SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <bit>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <type_traits>
#include <vector>

#include "host/model/nodata.h"

namespace orin::datasources {

using model::NoDataValue;

/// A channel's value in its type.
template <class T>
struct ChannelValue {
  NoDataValue<T> value;
  bool counts = true;  ///< false for alpha
};

/// Pixels that are compared together.
inline constexpr uint64_t kChunk = 64;

/// One byte a pixel: 1 where it equals what it was compared with, else 0.
using Hits = std::array<uint8_t, kChunk>;

inline bool HasHits(const Hits& hits) {
  static constexpr Hits kNone{};
  return std::memcmp(hits.data(), kNone.data(), kChunk) != 0;
}

/// The hits of eight pixels as the bits of a byte, the first one the most significant.
inline uint8_t PackHits(const uint8_t* hits) {
  // Each factor bit moves one byte's lowest bit to its place in the top byte; none of them meet.
  constexpr uint64_t kGather =
      std::endian::native == std::endian::little ? 0x8040201008040201u : 0x0102040810204080u;
  uint64_t bytes;
  std::memcpy(&bytes, hits, 8);
  return static_cast<uint8_t>(bytes * kGather >> 56);
}

/// Leaves the hits of those pixels whose sample equals `value`, too. Without a branch for each.
/// \param samples  of the first pixel; a pixel's is `step` behind that of the pixel before
template <class T>
void KeepEqual(const NoDataValue<T>& value, const T* samples, uint64_t step, uint64_t pixels,
               Hits& hits) {
  const auto keep = [&](uint64_t i, uint64_t at) {
    const T sample = samples[at];
    unsigned equal = sample == value.stored;
    if constexpr (std::is_floating_point_v<T>)
      equal |= unsigned{sample == value.other} |
               (unsigned{sample != sample} & unsigned{std::isnan(value.stored)});
    hits[i] &= static_cast<uint8_t>(equal);
  };
  if (step == 1 && pixels == kChunk)  // what a compiler turns into vector operations
    for (uint64_t i = 0; i < kChunk; ++i) keep(i, i);
  else
    for (uint64_t i = 0; i < pixels; ++i) keep(i, i * step);
}

/// The same of complex samples: (value, 0), and with NaN in either part it is no number.
template <class T>
void KeepEqualPairs(const NoDataValue<T>& value, const T* samples, uint64_t step, uint64_t pixels,
                    Hits& hits) {
  for (uint64_t i = 0; i < pixels; ++i) {
    const T* const pair = samples + i * step;
    bool equal = value.Matches(pair[0]) && pair[1] == T{0};
    if constexpr (std::is_floating_point_v<T>)
      if (std::isnan(value.stored)) equal = std::isnan(pair[0]) || std::isnan(pair[1]);
    hits[i] &= static_cast<uint8_t>(equal);
  }
}

/// Compares the first `pixels` pixels at `samples`: they hit when every channel that counts equals
/// its value. \param components  1, or 2 of complex samples
template <class T>
Hits CompareChunk(const std::vector<ChannelValue<T>>& channels, uint64_t components,
                  const T* samples, uint64_t pixels) {
  Hits hits{};
  std::memset(hits.data(), 1, pixels);
  const uint64_t step = channels.size() * components;
  for (const auto& [value, counts] : channels) {
    if (counts) {
      if (components == 1) KeepEqual(value, samples, step, pixels, hits);
      else KeepEqualPairs(value, samples, step, pixels, hits);
      if (!HasHits(hits)) break;
    }
    samples += components;
  }
  return hits;
}

}  // namespace orin::datasources
