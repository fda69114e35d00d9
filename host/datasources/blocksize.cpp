// SPDX-License-Identifier: MIT
#include "host/datasources/blocksize.h"

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <numeric>

namespace {

using orin::datasources::IRasterReader;

/// One level computed from another.
struct Scale {
  uint64_t source;  ///< level read, 1 for full resolution
  uint64_t target;  ///< level written

  /// Blocks that are multiples of this start on a whole source pixel.
  uint64_t Step() const { return source / std::gcd(source, target); }
  double Ratio() const { return double(source) / double(target); }
};

uint64_t RoundDown(uint64_t value, uint64_t step) { return value - value % step; }
uint64_t RoundUp(uint64_t value, uint64_t step) { return RoundDown(value + step - 1, step); }

/// True when the division by the ratio is exact at every corner and centre of a level this long, so
/// that a position has the same bits whichever block it is computed in.
bool IsExact(const Scale& scale, unsigned length) {
  if (scale.target % scale.source != 0) return false;
  const double ratio = scale.Ratio();
  const double factor = double(scale.target / scale.source);
  for (unsigned i = 0; i <= length; ++i)
    if (i / ratio != i * factor || (i + 0.5) / ratio != (i + 0.5) * factor) return false;
  return true;
}

/// Edge of the blocks of a scale without exact arithmetic: the largest power of two whose source edge
/// stays within 1024 pixels, in whole steps. Deliberate: no other block size gives the same pixels.
uint64_t FixedEdge(const Scale& scale) {
  uint64_t edge = 256;
  while (edge > 1 && double(edge) / scale.Ratio() > 1024) edge /= 2;
  return RoundUp(edge, scale.Step());
}

/// Output pixels of a block whose input and output together hold `budget` pixels.
uint64_t OutputPixels(const Scale& scale, const IRasterReader& reader, unsigned budget) {
  const double area = scale.Ratio() * scale.Ratio();
  // The budget counts components; a complex sample holds two.
  const double pixels = double(budget) / ComponentsPerSample(reader.GetDataType());
  return std::max<uint64_t>(1, uint64_t(pixels * area / (area + 1)));
}

/// The largest size of at most `limit`, in tiles when it reaches one, else in steps; never 0.
uint64_t Fit(uint64_t limit, uint64_t tile, uint64_t step) {
  const uint64_t unit = std::lcm(tile, step);
  return limit >= unit ? RoundDown(limit, unit) : std::max(RoundDown(limit, step), step);
}

struct Size {
  uint64_t width;
  uint64_t height;
};

Size FitBlock(const IRasterReader& reader, const IRasterReader& writer, const Scale& scale,
              uint64_t pixels) {
  const uint64_t step = scale.Step();
  const uint64_t wholeWidth = RoundUp(writer.GetWidth(), step);
  const uint64_t wholeHeight = RoundUp(writer.GetHeight(), step);
  const uint64_t tileWidth = std::max(writer.GetTileWidth(), 1u);
  const uint64_t tileHeight = std::max(writer.GetTileHeight(), 1u);
  const bool strips = reader.GetTileWidth() >= reader.GetWidth();
  const bool rowOfTilesFits = wholeWidth * std::min(tileHeight, wholeHeight) <= pixels;
  const bool rowFits = wholeWidth * step <= pixels;
  if (rowOfTilesFits || (strips && rowFits))
    return {wholeWidth, std::min(wholeHeight, Fit(pixels / wholeWidth, tileHeight, step))};
  const uint64_t height =
      std::min(wholeHeight, Fit(std::min(tileHeight, uint64_t(std::sqrt(double(pixels)))), tileHeight, step));
  return {std::min(wholeWidth, Fit(pixels / height, tileWidth, step)), height};
}

}  // namespace

void FindOptimalRasterSize(orin::datasources::IRasterReader* reader,
                           orin::datasources::IRasterWriter* writer, unsigned int pixelBudget,
                           unsigned int& width, unsigned int& height,
                           const orin::parallelio::ProcessWindow& /*window*/) {
  const Scale scale{std::max(reader->GetLevel(), 1u), std::max(writer->GetLevel(), 1u)};
  const bool exact = IsExact(scale, std::max(writer->GetWidth(), writer->GetHeight()));
  const Size block = exact ? FitBlock(*reader, *writer, scale, OutputPixels(scale, *reader, pixelBudget))
                           : Size{FixedEdge(scale), FixedEdge(scale)};
  width = static_cast<unsigned>(std::max<uint64_t>(1, block.width));
  height = static_cast<unsigned>(std::max<uint64_t>(1, block.height));
}
