/// Makes the object that serves a runtime data type, from a class template over the pixel types.
// SPDX-License-Identifier: MIT
#pragma once

#include "basic/core/typedispatch/pixeltypes.h"
#include "basic/gobs/outofmemory.h"
#include "host/services/exception.h"

namespace orin::typedispatch {

/// \tparam List     a TypeList; its first entry that fits decides
/// \tparam Factory  `Factory<T>::Create()` makes the object for T; one return type for all T
template <class List, template <class> class Factory>
struct DispatchType;

template <class First, class... Rest, template <class> class Factory>
struct DispatchType<TypeList<First, Rest...>, Factory> {
  using Product = decltype(Factory<First>::Create());

  /// What the factory of the first listed type that `type` describes (real, then complex) makes.
  /// \throws orin::Exception  no listed type fits
  static Product Dispatch(const gobs::DataType& type) {
    Product product{};
    const bool found =
        detail::Visit(TypeList<First, Rest...>{}, type,
                      [&]<class T>(std::type_identity<T>) { product = Factory<T>::Create(); });
    if (!found)
      throw Exception(
          N_("Invalid type to dispatch."), "basic/core/typedispatch/dispatchtype",
          "static orin::typedispatch::DispatchType::Dispatch(const orin::gobs::DataType&)", 316);
    return product;
  }
};

}  // namespace orin::typedispatch
