// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/drivermodule.h"

#include <dlfcn.h>

#include <cstring>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {

LoadedDriver LoadDriver(const char* fileName) {
  void* object = dlopen(fileName, RTLD_NOW | RTLD_LOCAL);
  if (!object) return {nullptr, dlerror()};  // begins with the name of the file
  const auto* module = static_cast<const DriverModule*>(dlsym(object, kDriverModuleSymbol));
  if (!module) return {nullptr, FormatString(_("%s: holds no driver"), fileName)};
  if (std::strcmp(module->version, ORIN_VERSION) != 0)
    return {nullptr, FormatString(_("%s: is of version %s, and this program is of version %s"),
                                  fileName, module->version, ORIN_VERSION)};
  return {module->makeDriver(), ""};
}

}  // namespace orin::drivers
