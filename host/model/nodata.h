/// A declared no-data value: a number, parsed once, and a value of whatever type a channel has.
// SPDX-License-Identifier: MIT
#pragma once

#include <cmath>
#include <cstdint>
#include <optional>
#include <string>
#include <type_traits>

namespace orin::model {

/// Where a no-data value was declared.
enum class NoDataOrigin {
  kItem,     ///< the metadata item of that name, of the file or of a channel
  kTag,      ///< the file format's own field
  kAuxFile,  ///< the file beside the image in which raster programs keep what a format cannot
  kChannel,  ///< whichever of these the library that reads the format found
  kNowhere   ///< nothing is declared: it only fills pixels that a mask calls no data
};

/// "item", "tag", "aux.xml", "channel"; empty for kNowhere.
const char* NameOf(NoDataOrigin origin);

/// A no-data value as a channel of type T holds it.
template <class T>
struct NoDataValue {
  T stored{};  ///< what a pixel without data holds; may be NaN or infinite
  T other{};   ///< of floating types, counts as well: the last finite value when the text lies
               ///< beyond it, else `stored`

  bool Matches(T value) const {
    if (value == stored) return true;
    if constexpr (std::is_floating_point_v<T>)
      return value == other || (std::isnan(value) && std::isnan(stored));
    return false;
  }
};

class NoData {
 public:
  /// Nothing when the whole text is no number. NaN and infinities are known in the ways in which
  /// programs print them ("nan", "-1.#IND", "inf", "Infinity"); what is beyond a double's range is
  /// infinite; a lone comma is a decimal point.
  static std::optional<NoData> Parse(const std::string& text, NoDataOrigin origin);

  /// As it was declared.
  const std::string& Text() const { return text_; }
  NoDataOrigin Origin() const { return origin_; }
  /// NaN and infinities included.
  double Number() const { return number_; }
  /// As a plain decimal number, without blanks around it or a plus sign; empty when it is no finite
  /// number. Numbers beyond a double's range count as finite here.
  const std::string& Decimal() const { return decimal_; }

  /// Nothing when the type cannot hold it: no pixel equals it then. Integers are exact in all of
  /// their digits. Floating types round the text as they would store it; beyond their range it is
  /// infinite.
  template <class T>
  std::optional<NoDataValue<T>> As() const;

 private:
  NoData() = default;

  std::string text_;
  std::string decimal_;
  NoDataOrigin origin_ = NoDataOrigin::kItem;
  double number_ = 0;
  std::optional<int64_t> whole_;           ///< exact, where the text has integer digits only
  std::optional<uint64_t> wholeUnsigned_;  ///< the same, 2^64 - 1 included
};

}  // namespace orin::model
