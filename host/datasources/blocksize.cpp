// SPDX-License-Identifier: MIT
#include "host/datasources/blocksize.h"

#include <algorithm>
#include <bit>
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
  const uint64_t whole = scale.target / scale.source;
  if (std::has_single_bit(whole)) return true;  // dividing only moves the exponent
  const auto factor = static_cast<double>(whole);
  for (unsigned i = 0; i <= length; ++i)
    if (i / ratio != i * factor || (i + 0.5) / ratio != (i + 0.5) * factor) return false;
  return true;
}

/// Edge of the blocks of a scale without exact arithmetic: the largest power of two whose source
/// edge stays within 1024 pixels, less where pixels of many channels would make a source block
/// larger than 64 MiB, in whole steps. Deliberate: no other block size gives the same pixels.
uint64_t FixedEdge(const Scale& scale, const IRasterReader& reader) {
  constexpr double kMostBytes = 64 << 20;
  const double pixelBytes = double(reader.GetChannelCount()) *
                            BytesPerComponent(reader.GetDataType()) *
                            ComponentsPerSample(reader.GetDataType());
  const double most = std::min(1024.0, std::sqrt(kMostBytes / std::max(pixelBytes, 1.0)));
  uint64_t edge = 256;
  while (edge > 1 && double(edge) / scale.Ratio() > most) edge /= 2;
  return RoundUp(edge, scale.Step());
}

struct Size {
  uint64_t width;
  uint64_t height;
};

/// The largest size of at most `limit`: whole tiles when it reaches one; never 0.
uint64_t Fit(uint64_t limit, uint64_t tile) {
  return limit >= tile ? RoundDown(limit, tile) : std::max<uint64_t>(limit, 1);
}

/// A block of at most `pixels` output pixels that suits the tiles.
Size FitBlock(const IRasterReader& reader, const IRasterReader& writer, uint64_t pixels) {
  const uint64_t width = std::max(writer.GetWidth(), 1u);
  const uint64_t height = std::max(writer.GetHeight(), 1u);
  const uint64_t tileWidth = std::max(writer.GetTileWidth(), 1u);
  const uint64_t tileHeight = std::max(writer.GetTileHeight(), 1u);
  const bool strips = reader.GetTileWidth() >= reader.GetWidth();
  const bool rowOfTilesFits = width * std::min(tileHeight, height) <= pixels;
  if (rowOfTilesFits || (strips && width <= pixels))
    return {width, std::min(height, Fit(pixels / width, tileHeight))};
  const bool tileFits = std::min(tileWidth, width) * std::min(tileHeight, height) <= pixels;
  const uint64_t edge =
      tileFits ? tileHeight : std::max<uint64_t>(1, uint64_t(std::sqrt(double(pixels))));
  const uint64_t blockHeight = std::min({edge, tileHeight, height});
  return {std::min(width, Fit(pixels / blockHeight, tileWidth)), blockHeight};
}

/// Pixels that one step takes: an output block, and its input block with the margins.
double StepPixels(const IRasterReader& reader, const Scale& scale, const Size& block) {
  const double inputWidth = double(block.width) / scale.Ratio() + 2.0 * reader.GetMarginX();
  const double inputHeight = double(block.height) / scale.Ratio() + 2.0 * reader.GetMarginY();
  return double(block.width) * double(block.height) + inputWidth * inputHeight;
}

/// The block whose step stays within `budget` pixels; a single pixel when nothing does.
Size BlockWithin(unsigned budget, const IRasterReader& reader, const IRasterReader& writer,
                 const Scale& scale) {
  // The budget counts components; a complex sample holds two.
  const double limit = double(budget) / ComponentsPerSample(reader.GetDataType());
  const double area = scale.Ratio() * scale.Ratio();
  auto pixels = std::max<uint64_t>(1, uint64_t(limit * area / (area + 1)));
  Size block = FitBlock(reader, writer, pixels);
  while (pixels > 1 && StepPixels(reader, scale, block) > limit) {
    pixels = std::max<uint64_t>(1, pixels * 7 / 8);
    block = FitBlock(reader, writer, pixels);
  }
  return block;
}

}  // namespace

void FindOptimalRasterSize(orin::datasources::IRasterReader* reader,
                           orin::datasources::IRasterWriter* writer, unsigned int pixelBudget,
                           unsigned int& width, unsigned int& height,
                           const orin::parallelio::ProcessWindow& /*window*/) {
  const Scale scale{std::max(reader->GetLevel(), 1u), std::max(writer->GetLevel(), 1u)};
  const bool exact = IsExact(scale, std::max(writer->GetWidth(), writer->GetHeight()));
  const Size block = exact ? BlockWithin(pixelBudget, *reader, *writer, scale)
                           : Size{FixedEdge(scale, *reader), FixedEdge(scale, *reader)};
  width = static_cast<unsigned>(std::max<uint64_t>(1, block.width));
  height = static_cast<unsigned>(std::max<uint64_t>(1, block.height));
}
