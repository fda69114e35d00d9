/// Compiles a kernel for the ten pixel types, and its factory.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <type_traits>

#include "basic/core/typedispatch/pixeltypes.h"
#include "processes/qrtfilters/resamplers/detail/createkernel.h"

// A macro because an explicit instantiation cannot walk a type list; the check below keeps it the
// same.
#define ORIN_INSTANTIATE_KERNEL(Kernel)  \
  template class Kernel<signed char>;    \
  template class Kernel<unsigned char>;  \
  template class Kernel<short>;          \
  template class Kernel<unsigned short>; \
  template class Kernel<int>;            \
  template class Kernel<unsigned int>;   \
  template class Kernel<float>;          \
  template class Kernel<double>;         \
  template class Kernel<int64_t>;        \
  template class Kernel<uint64_t>;       \
  template class KernelFactory<Kernel>

static_assert(std::is_same_v<orin::typedispatch::PixelTypes,
                             orin::typedispatch::TypeList<signed char, unsigned char, short,
                                                          unsigned short, int, unsigned int, float,
                                                          double, int64_t, uint64_t>>,
              "a pixel type was added or removed: change the list of ORIN_INSTANTIATE_KERNEL too");
