// SPDX-License-Identifier: MIT
#include "host/datasources/nodatastandin.h"

#include <algorithm>
#include <bit>
#include <cstdint>
#include <limits>
#include <memory>
#include <vector>

#include "basic/core/typedispatch/pixeltypes.h"
#include "host/datasources/levelstore.h"
#include "host/services/counter.h"
#include "host/services/exception.h"

namespace orin::datasources {
namespace {

constexpr uint64_t kBlockBytes = 16 << 20;
constexpr uint64_t kMostCandidates = 1 << 24;

/// The values that may stand in, numbered from the one that is tried first.
template <class T>
struct Candidates;

/// From the lowest finite value upwards.
template <class T>
requires std::is_floating_point_v<T>
struct Candidates<T> {
  using Bits = std::conditional_t<sizeof(T) == 4, uint32_t, uint64_t>;
  static constexpr Bits kFirst = std::bit_cast<Bits>(std::numeric_limits<T>::lowest());

  static T At(uint64_t number) { return std::bit_cast<T>(static_cast<Bits>(kFirst - number)); }
  /// A huge number for what is no candidate: the difference wraps round.
  static uint64_t NumberOf(T value) {
    return static_cast<Bits>(kFirst - std::bit_cast<Bits>(value));
  }
};

/// From the largest value that double holds, too, downwards.
template <class T>
requires std::is_integral_v<T>
struct Candidates<T> {
  static constexpr uint64_t kStep = uint64_t{1} << (std::numeric_limits<T>::digits - 53);
  static constexpr uint64_t kFirst = uint64_t{std::numeric_limits<T>::max()} - (kStep - 1);

  static T At(uint64_t number) { return static_cast<T>(kFirst - number * kStep); }
  static uint64_t NumberOf(T value) {
    const uint64_t below = kFirst - static_cast<uint64_t>(value);
    return below % kStep == 0 && value >= 0 && static_cast<uint64_t>(value) <= kFirst
               ? below / kStep
               : std::numeric_limits<uint64_t>::max();
  }
};

/// Calls `visit` with each block of the image; blocks that cannot be read are left out.
/// \returns false when the user asked to stop
template <class Visit>
bool ForEachBlock(IRasterReader& reader, Visit&& visit) {
  const gobs::RasterInfo pixel(1, 1, reader.GetChannelCount(), reader.GetDataType());
  const uint64_t pixels = std::max<uint64_t>(1, kBlockBytes / PixelBytes(pixel));
  const uint32_t width = reader.GetWidth();
  const uint32_t height = reader.GetHeight();
  if (width == 0 || height == 0) return true;
  const uint64_t tileHeight = std::clamp<uint64_t>(reader.GetTileHeight(), 1, height);
  const uint64_t tileWidth = std::clamp<uint64_t>(reader.GetTileWidth(), 1, width);
  const uint64_t across = std::max<uint64_t>(1, pixels / tileHeight / tileWidth) * tileWidth;
  const auto blockWidth = static_cast<uint32_t>(std::min<uint64_t>({across, width, pixels}));
  const uint64_t rows = std::max<uint64_t>(1, pixels / blockWidth);
  const auto blockHeight = static_cast<uint32_t>(std::min<uint64_t>(
      blockWidth == width && rows > tileHeight ? rows - rows % tileHeight : rows, height));
  for (uint32_t y = 0; y < height; y += std::min(blockHeight, height - y))
    for (uint32_t x = 0; x < width; x += std::min(blockWidth, width - x)) {
      if (!tarn::Counter::Update(0.0f)) return false;
      gobs::Raster block({std::min(blockWidth, width - x), std::min(blockHeight, height - y),
                          pixel.channelCount, pixel.dataType},
                         {0, 0, x, y});
      try {
        reader.Read(block);
      } catch (const Exception&) {
        continue;  // deliberate: the run reads it again, if it needs it, and reports that
      }
      visit(block);
    }
  return true;
}

/// Which of the candidates from number `first` on occur; `occurs` has one entry for each.
template <class T>
bool MarkOccurring(IRasterReader& reader, uint64_t first, std::vector<bool>& occurs) {
  return ForEachBlock(reader, [&](const gobs::Raster& block) {
    const T* value = reinterpret_cast<const T*>(block.data);
    const T* const end = value + block.byteSize / sizeof(T);
    for (const uint64_t count = occurs.size(); value != end; ++value)
      if (const uint64_t number = Candidates<T>::NumberOf(*value) - first; number < count)
        occurs[number] = true;
  });
}

template <class T>
double Find(IRasterReader& reader, bool& stopped) {
  const uint64_t values = uint64_t{reader.GetWidth()} * reader.GetHeight() *
                          reader.GetChannelCount() * ComponentsPerSample(reader.GetDataType());
  std::vector<bool> occurs(std::min(values + 1, kMostCandidates));
  for (uint64_t first = 0;; first += occurs.size()) {
    std::fill(occurs.begin(), occurs.end(), false);
    stopped = !MarkOccurring<T>(reader, first, occurs);
    const auto free = std::find(occurs.begin(), occurs.end(), false);
    if (free == occurs.end()) continue;
    return double(Candidates<T>::At(first + static_cast<uint64_t>(free - occurs.begin())));
  }
}

std::vector<unsigned> ChannelsOf(const IRasterSource& source, const gobs::DataType& type) {
  std::vector<unsigned> channels;
  for (unsigned channel = 1; channel <= source.ChannelCount(); ++channel)
    if (source.TypeOf(channel) == type) channels.push_back(channel);
  return channels;
}

}  // namespace

double FindNoDataStandIn(IRasterSource& source, const gobs::DataType& type, bool& stopped) {
  const std::unique_ptr<IRasterReader> reader = source.OpenReader(ChannelsOf(source, type));
  double found = 0;
  typedispatch::WithPixelType(type, [&]<class T>(std::type_identity<T>) {
    if constexpr (std::is_floating_point_v<T> || sizeof(T) == 8) found = Find<T>(*reader, stopped);
  });
  return found;
}

}  // namespace orin::datasources
