/// Opens datasets through the registered drivers.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "host/datasources/dataset.h"

namespace orin::datasources {

class DatasetManager {
 public:
  /// The one manager; never released.
  static DatasetManager* GetInstance();

  /// Opens with the file's own format driver. \returns a new dataset, owned by the caller
  /// \throws orin::Exception  the file cannot be opened in that mode; the text says why
  IDataset* Open(const std::string& file, AccessMode mode);

  /// Opens through a named format: "ZMBALL" is the generic layer, which keeps levels in a side-car;
  /// any other name must be that of the file's own format.
  /// \returns a new dataset, owned by the caller
  /// \throws orin::Exception  as `Open`
  IDataset* OpenFormat(const std::string& format, const std::string& file, AccessMode mode);

  /// While it is on, `Open` refuses to open for update, so that every image counts as read-only and
  /// new levels go beside it. For the application, before work starts.
  void RefuseUpdates(bool on) { refusesUpdates_ = on; }

 private:
  DatasetManager() = default;

  bool refusesUpdates_ = false;
};

}  // namespace orin::datasources
