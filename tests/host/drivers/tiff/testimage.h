/// Images whose every sample is known, written to TIFF files through libtiff.
// SPDX-License-Identifier: MIT
#pragma once

#include <gtest/gtest.h>
#include <tiffio.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <filesystem>
#include <string>
#include <vector>

namespace orin::tests {

/// A directory of the test's own, gone with it.
class ScratchFolder {
 public:
  ScratchFolder() {
    std::string name = (std::filesystem::temp_directory_path() / "orin-tiff-XXXXXX").string();
    if (!mkdtemp(name.data())) ADD_FAILURE() << "no scratch folder";
    path_ = name;
  }
  ~ScratchFolder() { std::filesystem::remove_all(path_); }
  ScratchFolder(const ScratchFolder&) = delete;
  ScratchFolder& operator=(const ScratchFolder&) = delete;
  std::string File(const std::string& name) const { return (path_ / name).string(); }

 private:
  std::filesystem::path path_;
};

/// How an image is stored.
struct Layout {
  uint32_t width = 37, height = 29;
  uint16_t samples = 1;
  uint16_t bits = 8;  ///< of a sample; both parts of a complex one
  uint16_t sampleFormat = SAMPLEFORMAT_UINT;
  bool planar = false;
  uint32_t tile = 0;  ///< edge of the tiles; 0: strips
  uint32_t rowsPerStrip = 5;
  uint16_t compression = COMPRESSION_NONE;
  uint16_t predictor = 1;
  uint16_t photometric = PHOTOMETRIC_MINISBLACK;
  const char* mode = "w";  ///< "wb": big-endian, "w8": BigTIFF
  const char* noData = nullptr;
  uint16_t alpha = 0;  ///< what the last sample means, EXTRASAMPLE_UNASSALPHA for one; 0: a colour

  uint32_t TileWidth() const { return tile ? tile : width; }
  uint32_t TileHeight() const { return tile ? tile : rowsPerStrip; }
  uint32_t TileSamples() const { return planar ? 1 : samples; }
  bool IsComplex() const {
    return sampleFormat == SAMPLEFORMAT_COMPLEXINT || sampleFormat == SAMPLEFORMAT_COMPLEXIEEEFP;
  }
  /// Of a delivered sample.
  uint32_t SampleBytes() const {
    if (bits <= 8) return 1;
    if (bits <= 16) return 2;
    return bits <= 32 ? 4 : bits / 8;
  }
};

/// Number of the sample (x, y, channel): neighbours differ, and rows differ.
inline int64_t PatternValue(uint32_t x, uint32_t y, uint32_t channel) {
  return int64_t{x} * 7 + int64_t{y} * 131 + int64_t{channel} * 53 + int64_t{x} * y % 11;
}

template <class T>
void AppendAs(double value, std::vector<uint8_t>& bytes) {
  const T number = static_cast<T>(value);
  const auto* first = reinterpret_cast<const uint8_t*>(&number);
  bytes.insert(bytes.end(), first, first + sizeof number);
}

/// One part of a sample, `bytes` wide, as a delivered block holds it.
inline void AppendPart(const Layout& layout, int64_t value, uint32_t bytes,
                       std::vector<uint8_t>& out) {
  const bool isFloat = layout.sampleFormat == SAMPLEFORMAT_IEEEFP ||
                       layout.sampleFormat == SAMPLEFORMAT_COMPLEXIEEEFP;
  if (isFloat) {
    bytes == 4 ? AppendAs<float>(double(value) / 4 - 100, out)
               : AppendAs<double>(double(value) / 4 - 100, out);
    return;
  }
  const uint32_t bits = layout.IsComplex() ? layout.bits / 2u : layout.bits;
  uint64_t number = static_cast<uint64_t>(value) * (bits > 32 ? 0x9E3779B97F4A7C15u : 1u);
  if (bits < 64) number &= (uint64_t{1} << bits) - 1;
  const bool isSigned = layout.sampleFormat != SAMPLEFORMAT_UINT;
  if (isSigned && bits < 64 && (number >> (bits - 1) & 1)) number |= ~uint64_t{0} << bits;
  const auto* first = reinterpret_cast<const uint8_t*>(&number);  // little-endian machines only
  out.insert(out.end(), first, first + bytes);
}

/// The bytes of the sample (x, y, channel) as a block shall hold them.
inline std::vector<uint8_t> SampleAt(const Layout& layout, uint32_t x, uint32_t y,
                                     uint32_t channel) {
  std::vector<uint8_t> bytes;
  const uint32_t parts = layout.IsComplex() ? 2 : 1;
  for (uint32_t part = 0; part < parts; ++part)
    AppendPart(layout, PatternValue(x, y, channel) + 31 * part, layout.SampleBytes() / parts,
               bytes);
  return bytes;
}

/// Sets `bits` bits of a packed row, sample `index`, the slow way: bit by bit.
inline void PutBits(std::vector<uint8_t>& row, uint64_t index, uint32_t bits, uint32_t value) {
  for (uint32_t i = 0; i < bits; ++i)
    if (value >> (bits - 1 - i) & 1) {
      const uint64_t at = index * bits + i;
      row[at / 8] = static_cast<uint8_t>(row[at / 8] | 0x80 >> at % 8);
    }
}

/// A tile's bytes as they are handed to libtiff for encoding.
inline std::vector<uint8_t> TileBytes(const Layout& layout, uint32_t left, uint32_t top,
                                      uint32_t rows, uint32_t plane) {
  std::vector<uint8_t> tile;
  const uint32_t width = layout.TileWidth();
  for (uint32_t y = 0; y < rows; ++y) {
    std::vector<uint8_t> row((uint64_t{width} * layout.TileSamples() * layout.bits + 7) / 8);
    uint64_t index = 0;
    for (uint32_t x = 0; x < width; ++x)
      for (uint32_t s = 0; s < layout.TileSamples(); ++s, ++index) {
        const uint32_t column = std::min(left + x, layout.width - 1);
        const uint32_t line = std::min(top + y, layout.height - 1);
        const auto sample = SampleAt(layout, column, line, layout.planar ? plane : s);
        if (layout.bits == sample.size() * 8)
          std::memcpy(row.data() + index * sample.size(), sample.data(), sample.size());
        else if (layout.bits == 24) std::memcpy(row.data() + index * 3, sample.data(), 3);
        else {
          uint32_t value = 0;
          std::memcpy(&value, sample.data(), sample.size());
          PutBits(row, index, layout.bits, value & ((uint64_t{1} << layout.bits) - 1));
        }
      }
    tile.insert(tile.end(), row.begin(), row.end());
  }
  return tile;
}

inline void SetTags(TIFF* tiff, const Layout& layout) {
  TIFFSetField(tiff, TIFFTAG_IMAGEWIDTH, layout.width);
  TIFFSetField(tiff, TIFFTAG_IMAGELENGTH, layout.height);
  TIFFSetField(tiff, TIFFTAG_SAMPLESPERPIXEL, layout.samples);
  TIFFSetField(tiff, TIFFTAG_BITSPERSAMPLE, layout.bits);
  TIFFSetField(tiff, TIFFTAG_SAMPLEFORMAT, layout.sampleFormat);
  TIFFSetField(tiff, TIFFTAG_PLANARCONFIG,
               layout.planar ? PLANARCONFIG_SEPARATE : PLANARCONFIG_CONTIG);
  TIFFSetField(tiff, TIFFTAG_PHOTOMETRIC, layout.photometric);
  TIFFSetField(tiff, TIFFTAG_COMPRESSION, layout.compression);
  if (layout.predictor != 1) TIFFSetField(tiff, TIFFTAG_PREDICTOR, layout.predictor);
  if (layout.compression == COMPRESSION_WEBP) TIFFSetField(tiff, TIFFTAG_WEBP_LOSSLESS, 1);
  if (layout.compression == COMPRESSION_JPEG) {
    TIFFSetField(tiff, TIFFTAG_JPEGQUALITY, 100);
    if (layout.photometric == PHOTOMETRIC_YCBCR)
      TIFFSetField(tiff, TIFFTAG_JPEGCOLORMODE, JPEGCOLORMODE_RGB);
  }
  if (layout.tile) {
    TIFFSetField(tiff, TIFFTAG_TILEWIDTH, layout.tile);
    TIFFSetField(tiff, TIFFTAG_TILELENGTH, layout.tile);
  } else {
    TIFFSetField(tiff, TIFFTAG_ROWSPERSTRIP, layout.rowsPerStrip);
  }
  if (layout.alpha) TIFFSetField(tiff, TIFFTAG_EXTRASAMPLES, 1, &layout.alpha);
  if (layout.noData) {
    static const TIFFFieldInfo kNoData{42113,        -1, -1, TIFF_ASCII,
                                       FIELD_CUSTOM, 1,  0,  const_cast<char*>("no data")};
    TIFFMergeFieldInfo(tiff, &kNoData, 1);
    TIFFSetField(tiff, 42113, layout.noData);
  }
}

/// Writes the pattern in this layout. \param skip  tiles that are not stored
inline void WriteImage(const std::string& file, const Layout& layout,
                       const std::vector<uint32_t>& skip = {}) {
  TIFFSetWarningHandler(nullptr);
  TIFF* tiff = TIFFOpen(file.c_str(), layout.mode);
  ASSERT_NE(nullptr, tiff) << file;
  SetTags(tiff, layout);
  TIFFWriteCheck(tiff, layout.tile != 0, "");  // makes the tables, also when nothing is stored
  uint32_t index = 0;
  for (uint32_t plane = 0; plane < (layout.planar ? layout.samples : 1u); ++plane)
    for (uint32_t top = 0; top < layout.height; top += layout.TileHeight())
      for (uint32_t left = 0; left < layout.width; left += layout.TileWidth(), ++index) {
        if (std::count(skip.begin(), skip.end(), index)) continue;
        const uint32_t rows =
            layout.tile ? layout.tile : std::min(layout.TileHeight(), layout.height - top);
        auto bytes = TileBytes(layout, left, top, rows, plane);
        const auto size = static_cast<tmsize_t>(bytes.size());
        ASSERT_EQ(size, layout.tile ? TIFFWriteEncodedTile(tiff, index, bytes.data(), size)
                                    : TIFFWriteEncodedStrip(tiff, index, bytes.data(), size));
      }
  ASSERT_EQ(1, TIFFWriteDirectory(tiff));
  TIFFClose(tiff);
}

}  // namespace orin::tests
