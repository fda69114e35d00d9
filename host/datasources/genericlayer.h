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

/// The levels of `image` beside its file; what is no file by itself has none, and none can be made.
/// \throws orin::Exception  an existing side-car cannot be read
std::shared_ptr<ILevelStore> OpenBeside(IFormatDriver& driver, const std::string& file,
                                        IRasterSource& image);
/// `image` as `OpenGeneric` shows it.
std::unique_ptr<IRasterSource> WithLevelsBeside(std::shared_ptr<IRasterSource> image,
                                                std::shared_ptr<ILevelStore> beside,
                                                const std::string& file, bool isPath);
/// `image` with the levels inside it alone.
std::unique_ptr<IRasterSource> WithLevelsInside(std::shared_ptr<IRasterSource> image,
                                                const std::string& file, bool isPath);

}  // namespace orin::datasources
