/// Sources, level stores, readers and writers that record every call and pass it on.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "host/datasources/levelstore.h"
#include "tests/testing/recorder.h"

namespace orin::testing {

using RecorderPtr = std::shared_ptr<Recorder>;

/// "{1,2,3}"
std::string ListText(const std::vector<unsigned>& numbers);

std::unique_ptr<datasources::IRasterReader> Recorded(
    RecorderPtr recorder, std::unique_ptr<datasources::IRasterReader> reader);
std::unique_ptr<datasources::IRasterWriter> Recorded(
    RecorderPtr recorder, std::unique_ptr<datasources::IRasterWriter> writer);
/// \param name  of the store in the log: "store" or "sidecar"
std::unique_ptr<datasources::ILevelStore> Recorded(RecorderPtr recorder,
                                                   std::unique_ptr<datasources::ILevelStore> store,
                                                   const std::string& name);
/// \param holdsLevels  false: `Levels()` is null
std::unique_ptr<datasources::IRasterSource> Recorded(
    RecorderPtr recorder, std::unique_ptr<datasources::IRasterSource> source, bool holdsLevels);

}  // namespace orin::testing
