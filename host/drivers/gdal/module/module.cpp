/// The entry of the shared object that holds the driver.
// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/drivermodule.h"
#include "host/drivers/gdal/readingdriver.h"
#ifdef ORIN_HAS_HFA_LEVELS
#include "host/drivers/hfa/hfalevelstore.h"
#endif

extern "C" const orin::drivers::DriverModule orin_overviews_driver;

namespace {

std::unique_ptr<orin::datasources::IFormatDriver> MakeDriver() {
#ifdef ORIN_HAS_HFA_LEVELS
  return orin::drivers::MakeReadingDriver(&orin::drivers::OpenHfaLevels);
#else
  return orin::drivers::MakeReadingDriver(nullptr);
#endif
}

}  // namespace

const orin::drivers::DriverModule orin_overviews_driver = {ORIN_VERSION, &MakeDriver};
