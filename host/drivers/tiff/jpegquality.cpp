// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/jpegquality.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <limits>

namespace orin::drivers {
namespace {

using Table = std::array<int, 64>;

/// The luminance table of quality 50, in the zigzag order of a stream.
constexpr Table kLuminance = {16,  11, 12, 14,  12,  10,  16,  14,  13, 14,  18,  17,  16,
                              19,  24, 40, 26,  24,  22,  22,  24,  49, 35,  37,  29,  40,
                              58,  51, 61, 60,  57,  51,  56,  55,  64, 72,  92,  78,  64,
                              68,  87, 69, 55,  56,  80,  109, 81,  87, 95,  98,  103, 104,
                              103, 62, 77, 113, 121, 112, 100, 120, 92, 101, 103, 99};

constexpr int kMostStep = 255;  // of tables in bytes; wider ones are compared as if cut off there

/// The quantisation table 0 of the segment's payload, when it holds it.
std::optional<Table> TableZero(const uint8_t* payload, size_t bytes) {
  for (size_t at = 0; at < bytes;) {
    const bool isWide = payload[at] >> 4 != 0;
    const size_t length = 1 + (isWide ? 128 : 64);
    if (bytes - at < length) return std::nullopt;
    if ((payload[at] & 0x0F) == 0) {
      Table table;
      for (size_t i = 0; i < table.size(); ++i) {
        const uint8_t* step = payload + at + 1 + (isWide ? 2 * i : i);
        table[i] = std::min(isWide ? step[0] << 8 | step[1] : int{step[0]}, kMostStep);
      }
      return table;
    }
    at += length;
  }
  return std::nullopt;
}

std::optional<Table> LuminanceTable(const std::vector<uint8_t>& stream) {
  constexpr uint8_t kDefineTables = 0xDB;
  for (size_t at = 2; at + 4 <= stream.size() && stream[at] == 0xFF;) {
    const size_t length = size_t{stream[at + 2]} << 8 | stream[at + 3];
    if (length < 2 || length > stream.size() - at - 2) return std::nullopt;
    if (stream[at + 1] == kDefineTables)
      if (const auto table = TableZero(&stream[at + 4], length - 2)) return table;
    at += 2 + length;
  }
  return std::nullopt;
}

long DistanceAt(int quality, const Table& table) {
  const int scale = quality < 50 ? 5000 / quality : 200 - 2 * quality;
  long distance = 0;
  for (size_t i = 0; i < table.size(); ++i)
    distance += std::abs(table[i] - std::clamp((kLuminance[i] * scale + 50) / 100, 1, kMostStep));
  return distance;
}

}  // namespace

std::optional<int> JpegQualityOf(const std::vector<uint8_t>& stream) {
  const auto table = LuminanceTable(stream);
  if (!table) return std::nullopt;
  int best = 1;
  for (int quality = 2; quality <= 100; ++quality)
    if (DistanceAt(quality, *table) < DistanceAt(best, *table)) best = quality;
  return best;
}

}  // namespace orin::drivers
