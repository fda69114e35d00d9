/// The sample that stands in tiles which a file does not store.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "basic/gobs/datatype.h"

namespace orin::drivers {

/// The bytes of one sample, imaginary part 0.
/// \param noData  decimal text, "nan" and "inf" included; what the type cannot hold counts as 0
std::vector<uint8_t> SparseSample(const std::string& noData, const gobs::DataType& type);

}  // namespace orin::drivers
