// SPDX-License-Identifier: MIT
#include "host/datasources/levelsite.h"

#include <filesystem>
#include <system_error>
#include <utility>

#include "host/datasources/genericlayer.h"
#include "host/datasources/sourcedataset.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::datasources {

LevelSite::LevelSite(IFormatDriver& driver, int formatCode, std::string file, AccessMode access)
    : driver_(driver),
      formatCode_(formatCode),
      file_(std::move(file)),
      isPath_(driver.IsPath(file_)) {
  if (access == kUpdate) {
    try {
      image_ = driver.Open(file_, kUpdate);
      access_ = kUpdate;
    } catch (const Exception& refusal) {
      if (driver.MayUpdate(file_)) throw;  // levels beside it would hide the failure
      updateRefusal_ = refusal.GetMessage();
    }
  }
  if (!image_) image_ = driver.Open(file_, kReadOnly);
}

const ZMBInfo_s& LevelSite::Format() const {
  const ZMBInfo_s* record = ZMBGetFormatInfo(formatCode_);
  return record ? *record : *ZMBInfo[kFormatUnknown];
}

const std::shared_ptr<ILevelStore>& LevelSite::Beside() {
  if (!beside_) beside_ = OpenBeside(driver_, file_, *image_);
  return beside_;
}

ILevelStore* LevelSite::LevelsIn(LevelPlace place) {
  return place == LevelPlace::kInternal ? image_->Levels() : Beside().get();
}

std::optional<LeftOver> LevelSite::FindLeftOver() {
  const std::string sideCar = file_ + ".ovr";
  std::error_code unknown;
  if (!isPath_ || !std::filesystem::is_regular_file(sideCar, unknown)) return std::nullopt;
  if (!Beside()->List().empty()) return std::nullopt;
  ZMBFormatType code = kFormatUnknown;
  IFormatDriver* driver = FormatRegistry::Instance().DriverOf(sideCar, code);
  if (!driver || code != kFormatTiff) return std::nullopt;
  const auto largest = driver->Open(sideCar, kReadOnly);
  return LeftOver{sideCar, largest->Width(), largest->Height()};
}

void LevelSite::RemoveLeftOver() {
  const auto leftOver = FindLeftOver();
  if (!leftOver) return;
  beside_.reset();  // it knows the file
  std::error_code error;
  if (!std::filesystem::remove(leftOver->file, error) && error)
    throw Exception(FormatString(_("%s: cannot be removed: %s."), leftOver->file.c_str(),
                                 error.message().c_str()),
                    "host/datasources/levelsite", "LevelSite::RemoveLeftOver()", 0);
}

std::unique_ptr<IRasterDataset> LevelSite::DatasetFor(LevelPlace place) {
  const bool isInside = place == LevelPlace::kInternal;
  auto source = isInside ? WithLevelsInside(image_, file_, isPath_)
                         : WithLevelsBeside(image_, Beside(), file_, isPath_);
  return std::make_unique<SourceDataset>(std::move(source), file_, access_,
                                         isInside ? formatCode_ : kFormatGeneric, formatCode_);
}

}  // namespace orin::datasources
