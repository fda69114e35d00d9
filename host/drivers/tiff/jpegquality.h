/// The quality at which a JPEG stream was made, from its quantisation table.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <vector>

namespace orin::drivers {

/// The quality of the usual scale (1 to 100) whose luminance table comes nearest to table 0 of the
/// stream; none when it has no such table.
/// \param stream  a JPEG stream of tables, as the JPEGTables tag holds it
std::optional<int> JpegQualityOf(const std::vector<uint8_t>& stream);

}  // namespace orin::drivers
