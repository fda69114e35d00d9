// SPDX-License-Identifier: MIT
#include "processes/overviews/overviewmethod.h"

#include "host/model/methods.h"
#include "processes/qrtfilters/resamplers/factories.h"

namespace orin::overviews {

OverviewMethod MethodOf(QRTOverviewResampleType type) {
  return {resamplers::MakeResamplerFactory(type), StoredNameOf(type)};
}

std::string StoredNameOf(QRTOverviewResampleType type) {
  const model::Method* const method = model::FindMethod(type);
  return std::string(method ? method->name : "");
}

QRTOverviewResampleType TypeOfStoredName(const std::string& name) {
  const model::Method* const method = model::FindMethod(std::string_view(name));
  return method ? method->type : ResampleInvalid;
}

bool Blends(QRTOverviewResampleType type) {
  const model::Method* const method = model::FindMethod(type);
  return method && method->blends;
}

}  // namespace orin::overviews
