/// Opens datasets through the registered drivers.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>

#include "host/datasources/dataset.h"
#include "host/datasources/levelsite.h"

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

  /// Opens a raster with its levels in both places in view.
  /// \param mode  kUpdate: for update where that is possible, else for reading
  /// \throws orin::Exception  it cannot be opened at all; the text says why
  std::unique_ptr<LevelSite> OpenSite(const std::string& file, AccessMode mode);

 private:
  DatasetManager() = default;
};

}  // namespace orin::datasources
