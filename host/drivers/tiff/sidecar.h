/// The side-car `NAME.EXT.ovr`: a TIFF file of levels beside an image of any format.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>

#include "host/datasources/formats.h"

namespace orin::drivers {

class TiffSideCar final : public datasources::ISideCarFormat {
 public:
  std::unique_ptr<datasources::ILevelStore> Open(const std::string& imageFile,
                                                 datasources::IRasterSource& image) override;
  std::unique_ptr<datasources::IValidityReader> OpenMaskBeside(const std::string& imageFile,
                                                               unsigned width,
                                                               unsigned height) override;
};

}  // namespace orin::drivers
