/// The generic layer: any registered driver's image, its new levels in a side-car.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>

#include "host/datasources/formats.h"
#include "host/datasources/levelstore.h"

namespace orin::datasources {

/// Opens the image read-only and lists its levels inside the file and in the side-car together;
/// what stands in both is taken from the side-car. New levels and all changes go to the side-car
/// alone: the image is never opened for writing.
/// \throws orin::Exception  the image or an existing side-car cannot be read
std::unique_ptr<IRasterSource> OpenGeneric(IFormatDriver& driver, const std::string& file);

}  // namespace orin::datasources
