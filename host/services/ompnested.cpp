// SPDX-License-Identifier: MIT
#include "host/services/ompnested.h"

#include <omp.h>

OMPNested::OMPNested(bool enable) : previousLevels_(omp_get_max_active_levels()) {
  omp_set_max_active_levels(enable ? omp_get_supported_active_levels() : 1);
}

OMPNested::~OMPNested() { omp_set_max_active_levels(previousLevels_); }
