/// The table of raster formats, and the drivers behind it.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "host/datasources/dataset.h"
#include "host/datasources/levelstore.h"

/// One format of the table.
struct ZMBInfo_s {
  std::string name;         ///< "TIFF"
  std::string description;  ///< "TIFF / GeoTIFF", for users
  int code = 0;
  int nativeOverviews = 0;  ///< not 0 when the format itself keeps overviews
};

/// Index into the format table; 0 is "not a recognised raster file".
using ZMBFormatType = int;

inline constexpr int kFormatUnknown = 0;
inline constexpr int kFormatMemory = 3;     ///< "TESSRA", the host's own
inline constexpr int kFormatTiff = 58;      ///< "TIFF"
inline constexpr int kFormatErdas = 272;    ///< "ZMBERDAS"
inline constexpr int kFormatGeneric = 511;  ///< "ZMBALL"
inline constexpr int kFormatTableSize = 512;

/// Records by code; null where no format has the code. Entry 0 describes an unrecognised file.
extern ZMBInfo_s* ZMBInfo[kFormatTableSize];

/// Code of the file's format, 0 when no registered driver recognises it.
ZMBFormatType ZMBTestOpen(const char* fileName);

/// The record of a code, or null.
ZMBInfo_s* ZMBGetFormatInfo(int formatCode);

namespace orin::datasources {

/// Opens the rasters of one or more formats.
class IFormatDriver {
 public:
  virtual ~IFormatDriver() = default;
  /// The formats that it serves, for the format table.
  virtual std::vector<ZMBInfo_s> Formats() const = 0;
  /// Code of the file's format, 0 when it is none of this driver's. Reads a few bytes at most.
  virtual ZMBFormatType Identify(const std::string& file) const = 0;
  /// Why `Identify` knows no format of the file, for users; empty where there is no more to say.
  virtual std::string WhyUnrecognised(const std::string& /*file*/) const { return {}; }
  /// \throws orin::Exception  the file cannot be opened in that mode; the text says why
  virtual std::unique_ptr<IRasterSource> Open(const std::string& file, AccessMode access) = 0;
  /// True when nothing but damage or a failure can keep `file`, one of this driver's, from being
  /// opened for update.
  virtual bool MayUpdate(const std::string& /*file*/) const { return false; }
  /// The same as `Open` for kUpdate, but for files too that can lose levels and take none.
  virtual std::unique_ptr<IRasterSource> OpenToRemoveLevels(const std::string& file) {
    return Open(file, kUpdate);
  }
  /// True when `file` is a path, beside which a side-car can stand and programs look for one; false
  /// for a part of a container file, or a file on a server.
  virtual bool IsPath(const std::string& /*file*/) const { return true; }
};

/// Keeps the levels of any image in a file beside it.
class ISideCarFormat {
 public:
  virtual ~ISideCarFormat() = default;
  /// The side-car of `imageFile`; a file that does not exist yet is an empty store, and is made
  /// when the first level is stored.
  /// \param image  the image; outlives the store
  /// \throws orin::Exception  a side-car exists and cannot be read
  virtual std::unique_ptr<ILevelStore> Open(const std::string& imageFile, IRasterSource& image) = 0;
  /// A reader of the mask file beside an image of that size; null when there is none, or none that
  /// can serve, of which the user is warned.
  virtual std::unique_ptr<IValidityReader> OpenMaskBeside(const std::string& /*imageFile*/,
                                                          unsigned /*width*/, unsigned /*height*/) {
    return nullptr;
  }
};

/// The registered drivers. Filled by the application before work starts.
class FormatRegistry {
 public:
  static FormatRegistry& Instance();

  /// Adds a driver and its formats to the table. Drivers are asked in the order of registration.
  /// \throws orin::Exception  a format's code lies outside the table
  void Register(std::shared_ptr<IFormatDriver> driver);
  void SetSideCarFormat(std::shared_ptr<ISideCarFormat> format);
  /// Forgets all drivers; for tests.
  void Clear();

  /// The driver that recognises the file, or null; `code` receives the format's code, else 0.
  IFormatDriver* DriverOf(const std::string& file, ZMBFormatType& code) const;
  /// What the first driver that can say more than "unknown" says of a file that none recognises;
  /// empty when none can.
  std::string WhyUnrecognised(const std::string& file) const;
  /// Null when none is registered.
  ISideCarFormat* SideCarFormat() const { return sideCar_.get(); }

 private:
  std::vector<std::shared_ptr<IFormatDriver>> drivers_;
  std::shared_ptr<ISideCarFormat> sideCar_;
};

}  // namespace orin::datasources
