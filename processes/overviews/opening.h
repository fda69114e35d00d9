/// The rule by which a file is opened for overviews.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <optional>
#include <string>

#include "host/datasources/dataset.h"

namespace orin::overviews {

/// Opens for update, or for reading where that is refused; then through the generic layer, which
/// keeps levels beside the file, where they belong there.
/// \param external  where levels belong; none: inside if the file can be written and holds them
/// \param readOnly  receives whether update was refused, also when this function throws
/// \throws orin::Exception  the file cannot be opened
std::unique_ptr<datasources::IDataset> OpenForOverviews(const std::string& file,
                                                        std::optional<bool> external,
                                                        bool& readOnly);

}  // namespace orin::overviews
