/// The ten pixel types, listed once, and the step from a runtime descriptor to one of them.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <type_traits>
#include <utility>

#include "basic/gobs/datatype.h"

namespace orin::typedispatch {

template <class... Ts>
struct TypeList {};

/// In the order in which a dispatch tries them.
using PixelTypes = TypeList<signed char, unsigned char, short, unsigned short, int, unsigned int,
                            float, double, int64_t, uint64_t>;

/// True when `type` describes T, real or complex.
template <class T>
constexpr bool Describes(const gobs::DataType& type) {
  return type == gobs::DataTypeOf<T>(false) || type == gobs::DataTypeOf<T>(true);
}

namespace detail {

template <class Visitor, class... Ts>
bool Visit(TypeList<Ts...>, const gobs::DataType& type, Visitor&& visitor) {
  return ((Describes<Ts>(type) && (visitor(std::type_identity<Ts>{}), true)) || ...);
}

}  // namespace detail

/// Calls `visitor(std::type_identity<T>{})` for the first pixel type that `type` describes, real or
/// complex. \returns false, without a call, when there is none (the bit type, for instance)
template <class Visitor>
bool WithPixelType(const gobs::DataType& type, Visitor&& visitor) {
  return detail::Visit(PixelTypes{}, type, std::forward<Visitor>(visitor));
}

/// The name of a pixel type in signature texts.
template <class T>
constexpr const char* PixelTypeName() {
  if constexpr (std::is_same_v<T, signed char>) return "char";
  else if constexpr (std::is_same_v<T, unsigned char>) return "unsigned char";
  else if constexpr (std::is_same_v<T, short>) return "short";
  else if constexpr (std::is_same_v<T, unsigned short>) return "unsigned short";
  else if constexpr (std::is_same_v<T, int>) return "int";
  else if constexpr (std::is_same_v<T, unsigned int>) return "unsigned int";
  else if constexpr (std::is_same_v<T, float>) return "float";
  else if constexpr (std::is_same_v<T, double>) return "double";
  else if constexpr (std::is_same_v<T, int64_t>) return "__int64";
  else {
    static_assert(std::is_same_v<T, uint64_t>, "not a pixel type");
    return "unsigned __int64";
  }
}

}  // namespace orin::typedispatch
