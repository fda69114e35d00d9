// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/tiffdriver.h"
