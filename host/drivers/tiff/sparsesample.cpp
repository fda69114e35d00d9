// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/sparsesample.h"

#include <charconv>
#include <cmath>
#include <cstring>
#include <limits>
#include <string_view>

#include "basic/core/typedispatch/pixeltypes.h"

namespace orin::drivers {
namespace {

/// True when all of `text` spells one number.
template <class Number>
bool ParseWhole(std::string_view text, Number& number) {
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  return error == std::errc() && end == text.data() + text.size();
}

template <class T>
T ValueOf(std::string_view text) {
  T value{};
  double number = 0;
  if constexpr (std::is_integral_v<T>)  // digit by digit: a double cannot hold every 64-bit value
    if (ParseWhole(text, value)) return value;
  if (!ParseWhole(text, number)) return T{0};
  if constexpr (std::is_floating_point_v<T>) {
    value = static_cast<T>(number);
    return std::isinf(value) && std::isfinite(number) ? T{0} : value;
  } else {
    const double limit = std::ldexp(1.0, std::numeric_limits<T>::digits);  // one above the largest
    const bool fits = number < limit && number >= double(std::numeric_limits<T>::min()) &&
                      number == std::trunc(number);
    return fits ? static_cast<T>(number) : T{0};
  }
}

}  // namespace

std::vector<uint8_t> SparseSample(const std::string& noData, const gobs::DataType& type) {
  std::vector<uint8_t> sample(BytesPerComponent(type) * ComponentsPerSample(type));
  std::string_view text = noData;
  if (text.starts_with('+') && !text.starts_with("+-")) text.remove_prefix(1);
  if (type == gobs::eDT_BIT) sample[0] = ValueOf<uint8_t>(text) == 1;
  typedispatch::WithPixelType(type, [&]<class T>(std::type_identity<T>) {
    const T value = ValueOf<T>(text);
    std::memcpy(sample.data(), &value, sizeof value);
  });
  return sample;
}

}  // namespace orin::drivers
