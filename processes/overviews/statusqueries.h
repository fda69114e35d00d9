/// Questions about the overviews that a file has or could have.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

#include "host/datasources/dataset.h"

/// True when every channel of the file has at least as many levels as a pyramid needs. Only the
/// number of levels is compared; the smallest valid level stands for the factor.
/// \param factor  2 or 3; any other value: the user's preference
/// \throws orin::Exception  the file cannot be opened
bool HasEnoughOverviews(std::string file, int factor);
/// The same for the listed channels (1-based).
bool HasEnoughOverviews(std::string file, const std::vector<unsigned int>& channels, int factor);
/// The same for every file, stopping at the first that has not enough; true for no files.
bool HasEnoughOverviews(std::vector<std::string> files, int factor);

/// True when the file's format itself keeps overviews. False for an unrecognised file.
bool HasNativeOverviews(std::string file);

/// True when the dataset's file can hold overviews inside itself. Null: false.
bool SupportsInternalOverviews(orin::datasources::IDataset* dataset);
