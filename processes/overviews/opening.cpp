// SPDX-License-Identifier: MIT
#include "processes/overviews/opening.h"

#include "host/datasources/datasetmanager.h"
#include "host/services/exception.h"
#include "processes/overviews/statusqueries.h"

namespace orin::overviews {
namespace {

using datasources::AccessMode;
using datasources::DatasetManager;
using datasources::IDataset;

std::unique_ptr<IDataset> OpenAs(const std::string& file, AccessMode mode) {
  return std::unique_ptr<IDataset>(DatasetManager::GetInstance()->Open(file, mode));
}

/// Null when the host refuses.
std::unique_ptr<IDataset> TryForUpdate(const std::string& file) {
  try {
    return OpenAs(file, datasources::kUpdate);
  } catch (const Exception&) {
    return nullptr;
  }
}

}  // namespace

std::unique_ptr<IDataset> OpenForOverviews(const std::string& file, std::optional<bool> external,
                                           bool& readOnly) {
  std::unique_ptr<IDataset> dataset = TryForUpdate(file);
  readOnly = !dataset;
  if (readOnly) dataset = OpenAs(file, datasources::kReadOnly);
  if (!dataset) return nullptr;
  const bool alreadyGeneric = datasources::FormatNameOf(*dataset).find("ZMB") != std::string::npos;
  const bool outside = external.value_or(readOnly || !SupportsInternalOverviews(dataset.get()));
  if (alreadyGeneric || !outside) return dataset;
  dataset.reset();
  const AccessMode mode = readOnly ? datasources::kReadOnly : datasources::kUpdate;
  return std::unique_ptr<IDataset>(DatasetManager::GetInstance()->OpenFormat("ZMBALL", file, mode));
}

}  // namespace orin::overviews
