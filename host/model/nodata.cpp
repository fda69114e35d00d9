// SPDX-License-Identifier: MIT
#include "host/model/nodata.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdint>
#include <limits>
#include <locale>
#include <sstream>
#include <string_view>
#include <utility>

namespace orin::model {
namespace {

template <class Number>
std::errc ParseWhole(std::string_view text, Number& number) {
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  return text.empty() || end != text.data() + text.size() ? std::errc::invalid_argument : error;
}

/// Without blanks around it and without a plus sign, which number parsing does not take.
std::string Trimmed(const std::string& text) {
  constexpr std::string_view kBlanks(" \t\r\n\v\f\0", 7);
  const size_t first = text.find_first_not_of(kBlanks);
  if (first == std::string::npos) return "";
  const bool hasPlus = text[first] == '+' && text.compare(first + 1, 1, "-") != 0;
  const size_t start = hasPlus ? first + 1 : first;
  return text.substr(start, text.find_last_not_of(kBlanks) + 1 - start);
}

/// Trimmed, and a lone comma as the decimal point that it was meant to be.
std::string WithPoint(const std::string& text) {
  std::string plain = Trimmed(text);
  const bool oneComma = std::count(plain.begin(), plain.end(), ',') == 1;
  if (oneComma && plain.find('.') == std::string::npos) plain[plain.find(',')] = '.';
  return plain;
}

/// What some C libraries print for numbers that are none, such as "-1.#IND00".
std::optional<double> ParseHashNumber(std::string_view text) {
  constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
  constexpr double kInfinity = std::numeric_limits<double>::infinity();
  const bool negative = text.substr(0, 1) == "-";
  if (negative) text.remove_prefix(1);
  std::string name(text.substr(0, text.find_last_not_of('0') + 1));
  std::transform(name.begin(), name.end(), name.begin(),
                 [](char c) { return c >= 'a' && c <= 'z' ? char(c - 'a' + 'A') : c; });
  if (name == "1.#INF") return negative ? -kInfinity : kInfinity;
  constexpr std::array<std::string_view, 3> kNames = {"1.#QNAN", "1.#SNAN", "1.#IND"};
  if (std::find(kNames.begin(), kNames.end(), name) != kNames.end()) return kNaN;
  return std::nullopt;
}

/// A decimal number that no double holds: infinite, or too small to differ from 0.
double OutOfRange(const std::string& text) {
  std::istringstream stream(text);
  stream.imbue(std::locale::classic());
  double value = 0;
  stream >> value;  // the largest finite number for what is larger
  constexpr double kLargest = std::numeric_limits<double>::max();
  return std::abs(value) == kLargest ? std::copysign(std::numeric_limits<double>::infinity(), value)
                                     : value;
}

/// Empty when the text spells no finite number.
std::string DecimalOf(const std::string& plain) {
  double value = 0;
  const std::errc error = ParseWhole(plain, value);
  const bool isNumber =
      error == std::errc::result_out_of_range || (error == std::errc() && std::isfinite(value));
  return isNumber ? plain : "";
}

std::optional<double> NumberOf(const std::string& plain) {
  double value = 0;
  const std::errc error = ParseWhole(plain, value);
  if (error == std::errc()) return value;
  if (error == std::errc::result_out_of_range) return OutOfRange(plain);
  return ParseHashNumber(plain);
}

template <class Integer>
std::optional<Integer> WholeOf(const std::string& text) {
  Integer value{};
  return ParseWhole(text, value) == std::errc() ? std::optional(value) : std::nullopt;
}

bool HasDigitsOnly(const std::string& decimal) {
  return !decimal.empty() && decimal.find_first_not_of("-0123456789") == std::string::npos;
}

/// The value of a text such as "7.0" or "1e3".
template <class T>
std::optional<NoDataValue<T>> RoundedInteger(double number) {
  // 2 to the power of the type's digits is exact in double; the maximum of a 64-bit type is not.
  const double limit = std::ldexp(1.0, std::numeric_limits<T>::digits);
  const bool inRange = number < limit && number >= double(std::numeric_limits<T>::min());
  if (!inRange || number != std::trunc(number)) return std::nullopt;
  const T value = static_cast<T>(number);
  return NoDataValue<T>{value, value};
}

template <class T>
NoDataValue<T> FloatOf(double number, bool isDecimal) {
  const auto value = static_cast<T>(number);
  const bool isBeyond = std::isinf(value) && isDecimal;
  return {value, isBeyond ? std::copysign(std::numeric_limits<T>::max(), value) : value};
}

}  // namespace

const char* NameOf(NoDataOrigin origin) {
  constexpr std::array<const char*, 5> kNames = {"item", "tag", "aux.xml", "channel", ""};
  return kNames.at(static_cast<size_t>(origin));
}

std::optional<NoData> NoData::Parse(const std::string& text, NoDataOrigin origin) {
  const std::string plain = WithPoint(text);
  const std::optional<double> number = NumberOf(plain);
  if (!number) return std::nullopt;
  NoData parsed;
  parsed.text_ = text;
  parsed.decimal_ = DecimalOf(plain);
  parsed.origin_ = origin;
  parsed.number_ = *number;
  parsed.whole_ = WholeOf<int64_t>(plain);
  parsed.wholeUnsigned_ = WholeOf<uint64_t>(plain);
  return parsed;
}

template <class T>
std::optional<NoDataValue<T>> NoData::As() const {
  if constexpr (std::is_integral_v<T>) {
    const auto exact = [](const auto& whole) { return whole && std::in_range<T>(*whole); };
    if (exact(whole_)) return NoDataValue<T>{static_cast<T>(*whole_), static_cast<T>(*whole_)};
    if (exact(wholeUnsigned_))
      return NoDataValue<T>{static_cast<T>(*wholeUnsigned_), static_cast<T>(*wholeUnsigned_)};
    if (HasDigitsOnly(decimal_)) return std::nullopt;  // beyond the type, however it rounds
    return RoundedInteger<T>(number_);
  } else if (std::isnan(number_)) {
    constexpr T kNaN = std::numeric_limits<T>::quiet_NaN();  // whatever sign the text gives it
    return NoDataValue<T>{kNaN, kNaN};
  } else {
    return FloatOf<T>(number_, !decimal_.empty());
  }
}

template std::optional<NoDataValue<signed char>> NoData::As() const;
template std::optional<NoDataValue<unsigned char>> NoData::As() const;
template std::optional<NoDataValue<short>> NoData::As() const;
template std::optional<NoDataValue<unsigned short>> NoData::As() const;
template std::optional<NoDataValue<int>> NoData::As() const;
template std::optional<NoDataValue<unsigned int>> NoData::As() const;
template std::optional<NoDataValue<float>> NoData::As() const;
template std::optional<NoDataValue<double>> NoData::As() const;
template std::optional<NoDataValue<int64_t>> NoData::As() const;
template std::optional<NoDataValue<uint64_t>> NoData::As() const;

}  // namespace orin::model
