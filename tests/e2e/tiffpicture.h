/// Pictures in TIFF files: written and read back through libtiff alone.
// SPDX-License-Identifier: MIT
#pragma once

#include <gtest/gtest.h>
#include <tiffio.h>

#include <algorithm>
#include <cstdint>
#include <memory>
#include <string>
#include <type_traits>
#include <vector>

namespace orin::testing {

/// Pixels, channel by channel within a pixel, row by row.
template <class T>
struct Picture {
  uint32_t width = 0, height = 0, channels = 1;
  uint32_t components = 1;  ///< of a sample: 2 when complex
  std::vector<T> values = {};

  Picture(uint32_t w, uint32_t h, uint32_t channelCount, uint32_t componentCount = 1)
      : width(w), height(h), channels(channelCount), components(componentCount) {
    values.resize(size_t{w} * h * PerPixel());
  }
  uint32_t PerPixel() const { return channels * components; }
  T* At(int64_t x, int64_t y, uint32_t channel = 0) {
    return &values[static_cast<size_t>(y * width + x) * PerPixel() + channel * components];
  }
  const T* At(int64_t x, int64_t y, uint32_t channel = 0) const {
    return const_cast<Picture*>(this)->At(x, y, channel);
  }
};

/// How a file stores its picture.
struct Storage {
  uint16_t photometric = PHOTOMETRIC_MINISBLACK;
  uint32_t tile = 0;  ///< edge of the tiles in pixels; 0: strips, channels interleaved
  bool planar = false;
  uint16_t compression = COMPRESSION_NONE;
  std::string noData = "";  ///< text of the no-data tag; empty: no tag
};

using TiffHandle = std::unique_ptr<TIFF, void (*)(TIFF*)>;

/// Entry `i` of the colour map's channel `c`, of 256.
inline uint16_t ColourOf(unsigned c, unsigned i) {
  return static_cast<uint16_t>((i * (37 + 62 * c) % 256) * 257);
}

template <class T>
uint16_t SampleFormatOf(const Picture<T>& picture) {
  if (picture.components == 2)
    return std::is_integral_v<T> ? SAMPLEFORMAT_COMPLEXINT : SAMPLEFORMAT_COMPLEXIEEEFP;
  if (std::is_floating_point_v<T>) return SAMPLEFORMAT_IEEEFP;
  return std::is_signed_v<T> ? SAMPLEFORMAT_INT : SAMPLEFORMAT_UINT;
}

inline void SetColourMap(TIFF* tiff) {
  std::vector<uint16_t> map;
  for (unsigned c = 0; c < 3; ++c)
    for (unsigned i = 0; i < 256; ++i) map.push_back(ColourOf(c, i));
  TIFFSetField(tiff, TIFFTAG_COLORMAP, &map[0], &map[256], &map[512]);
}

inline void SetNoData(TIFF* tiff, const std::string& text) {
  static char name[] = "no data";
  static const TIFFFieldInfo kField{42113, -1, -1, TIFF_ASCII, FIELD_CUSTOM, 1, 0, name};
  TIFFMergeFieldInfo(tiff, &kField, 1);
  TIFFSetField(tiff, kField.field_tag, text.c_str());
}

template <class T>
void SetTags(TIFF* tiff, const Picture<T>& picture, const Storage& storage) {
  TIFFSetField(tiff, TIFFTAG_IMAGEWIDTH, picture.width);
  TIFFSetField(tiff, TIFFTAG_IMAGELENGTH, picture.height);
  TIFFSetField(tiff, TIFFTAG_SAMPLESPERPIXEL, picture.channels);
  TIFFSetField(tiff, TIFFTAG_BITSPERSAMPLE, sizeof(T) * 8 * picture.components);
  TIFFSetField(tiff, TIFFTAG_SAMPLEFORMAT, SampleFormatOf(picture));
  TIFFSetField(tiff, TIFFTAG_PLANARCONFIG,
               storage.planar ? PLANARCONFIG_SEPARATE : PLANARCONFIG_CONTIG);
  TIFFSetField(tiff, TIFFTAG_PHOTOMETRIC, storage.photometric);
  TIFFSetField(tiff, TIFFTAG_COMPRESSION, storage.compression);
  if (storage.tile) {
    TIFFSetField(tiff, TIFFTAG_TILEWIDTH, storage.tile);
    TIFFSetField(tiff, TIFFTAG_TILELENGTH, storage.tile);
  } else {
    TIFFSetField(tiff, TIFFTAG_ROWSPERSTRIP, 7);
  }
  if (storage.photometric == PHOTOMETRIC_PALETTE) SetColourMap(tiff);
  if (!storage.noData.empty()) SetNoData(tiff, storage.noData);
}

/// A tile of a file, and the part of the picture that it covers.
struct Tile {
  uint32_t index;
  uint32_t x, y, edgeX, edgeY;  ///< pixels of the picture
  uint32_t channel, channels;   ///< the first that it holds, and how many
};

/// Calls `use` for each tile of the current directory.
template <class Use>
void ForEachTile(TIFF* tiff, uint32_t width, uint32_t height, uint32_t channels, Use&& use) {
  uint16_t planar = 0;
  Tile tile{};
  TIFFGetField(tiff, TIFFTAG_TILEWIDTH, &tile.edgeX);
  TIFFGetField(tiff, TIFFTAG_TILELENGTH, &tile.edgeY);
  TIFFGetField(tiff, TIFFTAG_PLANARCONFIG, &planar);
  tile.channels = planar == PLANARCONFIG_SEPARATE ? 1 : channels;
  for (tile.channel = 0; tile.channel < channels; tile.channel += tile.channels)
    for (tile.y = 0; tile.y < height; tile.y += tile.edgeY)
      for (tile.x = 0; tile.x < width; tile.x += tile.edgeX, ++tile.index) use(tile);
}

/// Copies what a tile and the picture share, into the tile or out of it.
template <class T, class Copy>
void ForEachSharedPixel(Picture<T>& picture, const Tile& tile, std::vector<T>& samples,
                        Copy&& copy) {
  const size_t perPixel = size_t{tile.channels} * picture.components;
  for (uint32_t y = 0; y < std::min(tile.edgeY, picture.height - tile.y); ++y)
    for (uint32_t x = 0; x < std::min(tile.edgeX, picture.width - tile.x); ++x)
      copy(picture.At(tile.x + x, tile.y + y, tile.channel),
           &samples[(size_t{y} * tile.edgeX + x) * perPixel], perPixel);
}

template <class T>
void WriteTiles(TIFF* tiff, Picture<T> picture) {
  ForEachTile(tiff, picture.width, picture.height, picture.channels, [&](const Tile& tile) {
    std::vector<T> samples(size_t{tile.edgeX} * tile.edgeY * tile.channels * picture.components);
    ForEachSharedPixel(picture, tile, samples,
                       [](const T* from, T* to, size_t n) { std::copy_n(from, n, to); });
    const auto bytes = static_cast<tmsize_t>(samples.size() * sizeof(T));
    ASSERT_EQ(bytes, TIFFWriteEncodedTile(tiff, tile.index, samples.data(), bytes));
  });
}

template <class T>
void WritePicture(const std::string& file, const Picture<T>& picture, const Storage& storage) {
  const TiffHandle tiff(TIFFOpen(file.c_str(), "w"), &TIFFClose);
  ASSERT_NE(nullptr, tiff) << file;
  SetTags(tiff.get(), picture, storage);
  if (storage.tile) {
    WriteTiles(tiff.get(), picture);
    return;
  }
  for (uint32_t y = 0; y < picture.height; ++y)
    ASSERT_EQ(1, TIFFWriteScanline(tiff.get(), const_cast<T*>(picture.At(0, y)), y, 0));
}

/// Makes the reduced image of that size current. \returns false when the file has none
inline bool FindLevel(TIFF* tiff, uint32_t width, uint32_t height) {
  do {
    uint32_t w = 0, h = 0, kind = 0;
    TIFFGetField(tiff, TIFFTAG_IMAGEWIDTH, &w);
    TIFFGetField(tiff, TIFFTAG_IMAGELENGTH, &h);
    TIFFGetField(tiff, TIFFTAG_SUBFILETYPE, &kind);
    if (w == width && h == height && (kind & FILETYPE_REDUCEDIMAGE)) return true;
  } while (TIFFReadDirectory(tiff));
  return false;
}

/// Fails unless the current directory has the colour map of `SetColourMap`.
inline void ExpectColourMap(TIFF* tiff) {
  uint16_t* map[3] = {};
  ASSERT_EQ(1, TIFFGetField(tiff, TIFFTAG_COLORMAP, &map[0], &map[1], &map[2]));
  for (unsigned c = 0; c < 3; ++c)
    for (unsigned i = 0; i < 256; ++i) ASSERT_EQ(ColourOf(c, i), map[c][i]) << c << ", " << i;
}

/// Reads the level that has the size of `level` into it; checks its type and its colours.
template <class T>
void ReadLevel(const std::string& file, const Storage& image, Picture<T>& level) {
  const TiffHandle tiff(TIFFOpen(file.c_str(), "r"), &TIFFClose);
  ASSERT_NE(nullptr, tiff) << file;
  ASSERT_TRUE(FindLevel(tiff.get(), level.width, level.height)) << file;
  uint16_t bits = 0, format = 0, samples = 0;
  TIFFGetField(tiff.get(), TIFFTAG_BITSPERSAMPLE, &bits);
  TIFFGetFieldDefaulted(tiff.get(), TIFFTAG_SAMPLEFORMAT, &format);
  TIFFGetField(tiff.get(), TIFFTAG_SAMPLESPERPIXEL, &samples);
  ASSERT_EQ(sizeof(T) * 8 * level.components, bits);
  ASSERT_EQ(SampleFormatOf(level), format);
  ASSERT_EQ(level.channels, samples);
  ASSERT_TRUE(TIFFIsTiled(tiff.get()));
  if (image.photometric == PHOTOMETRIC_PALETTE) ExpectColourMap(tiff.get());
  ForEachTile(tiff.get(), level.width, level.height, level.channels, [&](const Tile& tile) {
    std::vector<T> pixels(size_t{tile.edgeX} * tile.edgeY * tile.channels * level.components);
    const auto bytes = static_cast<tmsize_t>(pixels.size() * sizeof(T));
    ASSERT_EQ(bytes, TIFFReadEncodedTile(tiff.get(), tile.index, pixels.data(), bytes));
    ForEachSharedPixel(level, tile, pixels,
                       [](T* to, const T* from, size_t n) { std::copy_n(from, n, to); });
  });
}

}  // namespace orin::testing
