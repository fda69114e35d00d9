/// The entry of the shared object that holds the driver.
// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/drivermodule.h"
#include "host/drivers/gdal/readingdriver.h"

extern "C" const orin::drivers::DriverModule orin_overviews_driver;

const orin::drivers::DriverModule orin_overviews_driver = {ORIN_VERSION,
                                                           &orin::drivers::MakeReadingDriver};
