// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/sparsesample.h"

#include <cstring>

#include "basic/core/typedispatch/pixeltypes.h"
#include "host/model/nodata.h"

namespace orin::drivers {
namespace {

template <class T>
T ValueOf(const std::string& text) {
  const auto noData = model::NoData::Parse(text, model::NoDataOrigin::kTag);
  const auto value = noData ? noData->As<T>() : std::nullopt;
  return value ? value->stored : T{};
}

}  // namespace

std::vector<uint8_t> SparseSample(const std::string& noData, const gobs::DataType& type) {
  std::vector<uint8_t> sample(BytesPerComponent(type) * ComponentsPerSample(type));
  if (type == gobs::eDT_BIT) sample[0] = ValueOf<uint8_t>(noData) == 1;
  typedispatch::WithPixelType(type, [&]<class T>(std::type_identity<T>) {
    const T value = ValueOf<T>(noData);
    std::memcpy(sample.data(), &value, sizeof value);
  });
  return sample;
}

}  // namespace orin::drivers
