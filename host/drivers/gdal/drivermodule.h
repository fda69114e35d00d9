/// A driver in a shared object of its own, which is loaded when it is needed.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>

#include "host/datasources/formats.h"

namespace orin::drivers {

/// What a module shows to the program, under the name `kDriverModuleSymbol`.
struct DriverModule {
  const char* version;  ///< of the project; objects of two versions do not fit together
  std::unique_ptr<datasources::IFormatDriver> (*makeDriver)();
};

inline constexpr char kDriverModuleSymbol[] = "orin_overviews_driver";

/// A driver, or why there is none.
struct LoadedDriver {
  std::unique_ptr<datasources::IFormatDriver> driver;
  std::string problem;  ///< in words, without a full stop; it names the file
};

/// Loads a module and leaves it loaded for the rest of the process. Its classes and its services
/// are the program's, where the program exports them (see CMakeLists.txt).
/// \param fileName  without a folder: the dynamic loader looks where the run path of the program
///                  leads
LoadedDriver LoadDriver(const char* fileName);

}  // namespace orin::drivers
