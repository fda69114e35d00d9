/// What decides the pixels of a level beside the stored data of its image.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

namespace orin::model {

/// Facts that a driver learns when it opens the image, without reading a pixel. Texts compare
/// equal exactly when they mean the same.
struct LevelInputs {
  /// Declared no-data values: "" for none, "60" for all channels, "1=0,3=255" for some.
  std::string noData;
  /// Where the file's value was declared ("tag", "item", "aux.xml" ...). Told, never compared.
  std::string noDataOrigin;
  /// "" without a mask, else where it stands: "inside", "beside" or "inside,beside".
  std::string mask;
  unsigned alphaChannel = 0;  ///< 1-based; 0 for none
  std::string palette;        ///< digest of its colours; empty without one
  /// Digest of what turns stored bytes into pixels (codec, sample format, byte order ...); empty
  /// where the fingerprint of the image covers it.
  std::string coding;
  /// Channels whose samples were compared with their no-data values together. Never compared: they
  /// are the request's, not the file's.
  std::vector<unsigned> channels;

  friend bool operator==(const LevelInputs&, const LevelInputs&) = default;
};

/// Why a level is out of date.
enum class StaleReason {
  kNone,          ///< it is not
  kImageData,     ///< the image's stored data was changed
  kCoding,        ///< tags that decide what its stored data means were changed
  kNoData,        ///< its declared no-data value was changed
  kMask,          ///< it got or lost a mask
  kAlpha,         ///< another channel, or none, is opacity
  kPalette,       ///< its palette was changed
  kSourceRebuilt  ///< the level that this one was computed from was built again
};

/// The first difference that makes levels stale; kNone when they are current in this respect.
StaleReason DifferenceOf(const LevelInputs& recorded, const LevelInputs& now);

/// "nodata=60;origin=tag;mask=;alpha=0;palette=;coding=HEX;channels=1,2,3". What is no plain ASCII
/// text is written as %XX.
std::string TextOf(const LevelInputs& inputs);
/// Reads it back; unknown keys are passed over.
LevelInputs ParseLevelInputs(const std::string& text);

/// "no-data value changed" ...; empty for kNone. Translated.
std::string TextOf(StaleReason reason);

}  // namespace orin::model
