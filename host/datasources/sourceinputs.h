/// What a raster tells a run beside its pixels, as the record of a level keeps it.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "host/model/levelinputs.h"
#include "host/model/sourcefacts.h"

namespace orin::datasources {

class IRasterSource;

/// The declared no-data values of all channels. Spellings of one number give one text.
std::string NoDataInputs(const model::SourceFacts& facts);

/// No-data values, mask and alpha channel of any source.
model::LevelInputs InputsOf(const IRasterSource& source);

}  // namespace orin::datasources
