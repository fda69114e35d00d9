/* A module of a version that no program is of. SPDX-License-Identifier: MIT */
#include <stddef.h>

const struct {
  const char* version;
  void* makeDriver;
} orin_overviews_driver = {"0.0.0-old", NULL};
