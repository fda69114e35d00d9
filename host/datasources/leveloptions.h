/// How the user wants new levels to be stored; what is not said is chosen to suit the image.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "host/services/exception.h"

namespace orin::datasources {

/// An option does not fit a raster; the text names the file, the option and the reason.
class OptionException : public Exception {
 public:
  using Exception::Exception;
};

enum class LevelCompression { kNone, kDeflate, kLzw, kZstd, kPackBits, kLzma, kLerc, kJpeg, kWebp };

enum class LevelPredictor { kNone, kHorizontal, kFloatingPoint };

/// Whether a side-car that is made is a BigTIFF, which has no limit of 4 GiB.
enum class BigTiff {
  kIfNeeded,  ///< when its levels could pass 4 GiB
  kIfSafer,   ///< when they could pass 2 GiB
  kYes,
  kNo
};

struct LevelOptions {
  std::optional<LevelCompression> compression;
  std::optional<LevelPredictor> predictor;
  std::optional<uint32_t> tileWidth;   ///< pixels, a multiple of 16
  std::optional<uint32_t> tileHeight;  ///< pixels, a multiple of 16
  std::optional<int> effort;           ///< DEFLATE 1 to 12, ZSTD 1 to 22
  std::optional<int> quality;          ///< 1 to 100, of JPEG and lossy WebP
  BigTiff bigTiff = BigTiff::kIfNeeded;
  bool saysBigTiff = false;  ///< the user named it
  /// A level that is built again is stored as these options say, all its channels anew; otherwise
  /// it stays in the form that it has.
  bool restores = false;

  /// True when something is said about the pixels.
  bool SayCoding() const {
    return compression || predictor || tileWidth || tileHeight || effort || quality;
  }
};

/// Reads one `KEY=VALUE` into `options`, upper or lower case; a later one replaces an earlier one.
/// \returns what is wrong with it, naming what is allowed; empty: nothing
std::string ReadLevelOption(const std::string& text, LevelOptions& options);

/// What contradicts itself in `options`, whatever the image; empty: nothing.
std::string ContradictionIn(const LevelOptions& options);

/// "COMPRESS=JPEG", as a user writes it.
std::string TextOf(LevelCompression compression);

}  // namespace orin::datasources
