/// One raster, opened once, and the two places where its levels can stand.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <optional>
#include <string>

#include "host/datasources/formats.h"
#include "host/datasources/levelstore.h"

namespace orin::datasources {

/// A side-car that holds levels of an image of another size, and none of this one.
struct LeftOver {
  std::string file;
  unsigned width;   ///< pixels of its largest level
  unsigned height;  ///< pixels
};

/// Shows the levels of both places before anybody decides where new ones go.
class LevelSite {
 public:
  /// \param access  kUpdate: for update where that is possible, else for reading
  /// \throws orin::Exception  the image cannot be opened, or not for update although it may be
  ///                          written; the text names the file and the reason
  LevelSite(IFormatDriver& driver, int formatCode, std::string file, AccessMode access);

  const std::string& File() const { return file_; }
  IRasterSource& Image() { return *image_; }
  /// The record of the file's format.
  const ZMBInfo_s& Format() const;
  /// Why the file is open for reading only; empty when it is open for update, or was to be read.
  const std::string& UpdateRefusal() const { return updateRefusal_; }
  /// Other programs look for levels beside it.
  bool IsPath() const { return isPath_; }

  /// The levels in that place; null when the format holds none inside. Owned by the site.
  /// \throws orin::Exception  a side-car is there and cannot be read
  ILevelStore* LevelsIn(LevelPlace place);
  /// What an image of another size left under the name of this one. Other programs read it.
  std::optional<LeftOver> FindLeftOver();
  /// Takes it away. \pre no dataset of the site is alive
  /// \throws orin::Exception  it cannot be removed
  void RemoveLeftOver();

  /// The raster as a dataset whose new levels go to `place`. It shares what the site has open.
  /// \throws orin::Exception  as `LevelsIn`
  std::unique_ptr<IRasterDataset> DatasetFor(LevelPlace place);

 private:
  const std::shared_ptr<ILevelStore>& Beside();

  IFormatDriver& driver_;
  int formatCode_;
  std::string file_;
  bool isPath_;
  AccessMode access_ = kReadOnly;
  std::string updateRefusal_;
  std::shared_ptr<IRasterSource> image_;
  std::shared_ptr<ILevelStore> beside_;  ///< null until asked for; refers to the image
};

}  // namespace orin::datasources
