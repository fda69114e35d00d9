// SPDX-License-Identifier: MIT
#include "host/drivers/memory/memorydriver.h"
