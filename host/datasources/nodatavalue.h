/// What a declared no-data text means: a number, and a value of a channel's own type.
// SPDX-License-Identifier: MIT
#pragma once

#include <cmath>
#include <optional>
#include <string>
#include <type_traits>

namespace orin::datasources {

/// The text as a plain decimal number: without blanks around it and without a plus sign, a decimal
/// comma as a point. Empty when it spells no finite number; numbers beyond a double's range count
/// as finite here.
std::string PlainNoDataText(const std::string& text);

/// The number that `text` spells. NaN and infinities are known in the ways in which programs print
/// them ("nan", "-1.#IND", "inf", "Infinity"); what is beyond a double's range is infinite.
/// Nothing when the whole text is no number.
std::optional<double> ParseNoData(const std::string& text);

/// A declared no-data value as a channel of type T holds it.
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

/// The value of the text in a pixel type; nothing when it is no number, or none that the type can
/// hold: no pixel equals it then. Integers are exact in all of their digits. Floating types round
/// the text as they would store it; beyond their range it is infinite.
template <class T>
std::optional<NoDataValue<T>> NoDataValueOf(const std::string& text);

}  // namespace orin::datasources
