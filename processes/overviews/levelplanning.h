/// The decimation factor that the user prefers.
// SPDX-License-Identifier: MIT
#pragma once

/// The factor between the levels of a pyramid, 2 or 3; 2 when the user has no preference.
unsigned int GetDefaultDecimationLevels();
