/// Tells why a job has nothing to build, for a program whose `Generate` answered false in silence.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

class CreateFileOverviews;

namespace orin::overviews {

enum class Obstacle {
  kNone,  ///< there are levels to build: a warning told what failed, or the program stopped
  kCannotBeOpened,  ///< it does not exist, may not be read, or is of no registered format
  kNoRaster,        ///< it holds no pixels
  kNoLevelNeeded    ///< it is so small that a pyramid has no levels
};

struct Diagnosis {
  Obstacle obstacle;
  std::string text;  ///< for users, with the name of the file; empty without an obstacle
};

/// Opens the job's file as a run does, and changes nothing. Reports nothing.
Diagnosis Diagnose(const CreateFileOverviews& job);

}  // namespace orin::overviews
