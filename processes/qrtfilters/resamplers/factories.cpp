// SPDX-License-Identifier: MIT
#include "processes/qrtfilters/resamplers/factories.h"

#include <array>
#include <utility>

#include "processes/qrtfilters/resamplers/detail/createkernel.h"

namespace orin::resamplers {
namespace {

using model::kMethods;

/// One entry for each row of the table of methods: a row without a kernel does not link.
template <size_t... kRows>
constexpr auto FactoriesOf(std::index_sequence<kRows...>) {
  static_assert(((static_cast<size_t>(kMethods[kRows].type) == kRows) && ...),
                "the rows stand in the order of the enumerators");
  return std::array{&detail::NewFactory<kMethods[kRows].type>...};
}

constexpr auto kFactories = FactoriesOf(std::make_index_sequence<kMethods.size()>());

}  // namespace

std::unique_ptr<IResamplerFactory> MakeResamplerFactory(QRTOverviewResampleType type) {
  if (!model::FindMethod(type)) return nullptr;
  return kFactories[static_cast<size_t>(type)]();
}

}  // namespace orin::resamplers
