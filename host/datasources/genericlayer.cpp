// SPDX-License-Identifier: MIT
#include "host/datasources/genericlayer.h"

#include <algorithm>
#include <utility>

#include "host/datasources/levelsources.h"
#include "host/datasources/validityreader.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::datasources {
namespace {

bool Holds(const std::vector<LevelDescription>& levels, unsigned level) {
  return std::any_of(levels.begin(), levels.end(),
                     [level](const LevelDescription& entry) { return entry.level == level; });
}

/// Reads from both places, writes to the side-car.
class BothPlaces final : public ILevelStore {
 public:
  /// \param internal  may be null
  BothPlaces(ILevelStore* internal, std::shared_ptr<ILevelStore> sideCar)
      : internal_(internal), sideCar_(std::move(sideCar)) {}

  std::vector<LevelDescription> List() const override { return ListBoth().shown; }
  std::vector<LevelDescription> ListHidden() const override {
    std::vector<LevelDescription> hidden = sideCar_->ListHidden();
    for (LevelDescription& entry : ListBoth().hidden) hidden.push_back(std::move(entry));
    if (internal_)
      for (LevelDescription& entry : internal_->ListHidden()) hidden.push_back(std::move(entry));
    return hidden;
  }
  void Create(unsigned level, const std::vector<unsigned>& channels,
              const std::string& method) override {
    sideCar_->Create(level, channels, method);
  }
  std::unique_ptr<IRasterWriter> OpenWriter(unsigned level,
                                            const std::vector<unsigned>& channels) override {
    for (const LevelDescription& entry : ListBoth().shown) {
      if (entry.level != level || entry.place != LevelPlace::kInternal) continue;
      sideCar_->SetSource(entry);
      return internal_->OpenWriter(level, channels);
    }
    return sideCar_->OpenWriter(level, channels);
  }
  void SetValid(unsigned level, const std::vector<unsigned>& channels, bool valid) override {
    sideCar_->SetValid(level, channels, valid);
  }
  void KeepAnswers() override {
    sideCar_->KeepAnswers();
    if (internal_) internal_->KeepAnswers();
  }
  void SetOptions(const LevelOptions& options) override { sideCar_->SetOptions(options); }
  bool HasReclaimableSpace() const override { return sideCar_ && sideCar_->HasReclaimableSpace(); }
  LevelRoom RoomFor(const std::vector<unsigned>& levels,
                    const std::vector<unsigned>& channels) const override {
    return sideCar_->RoomFor(levels, channels);
  }
  void Remove(const std::vector<unsigned>& levels) override { sideCar_->Remove(levels); }

 private:
  struct Levels {
    std::vector<LevelDescription> shown;   ///< one entry a factor, ascending
    std::vector<LevelDescription> hidden;  ///< inside, of a factor that stands beside it, too
  };

  Levels ListBoth() const {
    const std::vector<LevelDescription> beside = sideCar_->List();
    std::vector<LevelDescription> all = internal_ ? internal_->List() : beside;
    if (internal_) all.insert(all.end(), beside.begin(), beside.end());
    CheckSources(all);
    std::stable_sort(
        all.begin(), all.end(),
        [](const LevelDescription& a, const LevelDescription& b) { return a.level < b.level; });
    Levels levels;
    for (LevelDescription& entry : all) {
      const bool isHidden = entry.place == LevelPlace::kInternal && Holds(beside, entry.level);
      (isHidden ? levels.hidden : levels.shown).push_back(std::move(entry));
    }
    return levels;
  }

  ILevelStore* internal_;
  std::shared_ptr<ILevelStore> sideCar_;
};

/// The side-car of what is no file by itself: there is none, and none can be made.
class NoSideCar final : public ILevelStore {
 public:
  explicit NoSideCar(std::string image) : image_(std::move(image)) {}

  std::vector<LevelDescription> List() const override { return {}; }
  void Create(unsigned, const std::vector<unsigned>&, const std::string&) override { Refuse(); }
  std::unique_ptr<IRasterWriter> OpenWriter(unsigned, const std::vector<unsigned>&) override {
    Refuse();
  }
  void SetValid(unsigned, const std::vector<unsigned>&, bool) override { Refuse(); }
  void Remove(const std::vector<unsigned>&) override {}

 private:
  [[noreturn]] void Refuse() const {
    throw Exception(
        FormatString(
            _("%s: is no file by itself: its side-car would be %s.ovr, where nothing can be "
              "written and no program would look. Copy the raster into a file, or make a "
              "VRT file that refers to it, and build the levels of that."),
            image_.c_str(), image_.c_str()),
        "host/datasources/genericlayer", "NoSideCar::Refuse() const", 0);
  }

  std::string image_;
};

class GenericSource final : public IRasterSource {
 public:
  /// \param levels  of `image`, to which they may refer
  /// \param format  null when `file` can have nothing beside it
  GenericSource(std::shared_ptr<IRasterSource> image, std::shared_ptr<ILevelStore> levels,
                ISideCarFormat* format, const std::string& file)
      : image_(std::move(image)), levels_(std::move(levels)), format_(format), file_(file) {
    hasMaskBeside_ = format && !image_->DeliversValidity() && OpenMaskBeside();
  }

  unsigned Width() const override { return image_->Width(); }
  unsigned Height() const override { return image_->Height(); }
  unsigned ChannelCount() const override { return image_->ChannelCount(); }
  gobs::DataType TypeOf(unsigned channel) const override { return image_->TypeOf(channel); }
  AuxiliaryData MetadataOf(const std::vector<unsigned>& channels) const override {
    return image_->MetadataOf(channels);
  }
  unsigned StoredBitsOf(unsigned channel) const override { return image_->StoredBitsOf(channel); }
  bool HoldsClasses() const override { return image_->HoldsClasses(); }
  bool IsCloudOptimized() const override { return image_->IsCloudOptimized(); }
  std::unique_ptr<IRasterReader> OpenReader(const std::vector<unsigned>& channels) override {
    auto reader = image_->OpenReader(channels);
    if (image_->DeliversValidity()) return reader;
    return WithValidity(std::move(reader), {OpenMask(), AlphaChannel(), [this] {
                                              return image_->OpenReader({AlphaChannel()});
                                            }});
  }
  unsigned AlphaChannel() const override { return image_->AlphaChannel(); }
  bool HasMask() const override { return hasMaskBeside_ || image_->HasMask(); }
  std::unique_ptr<IValidityReader> OpenMask() override {
    ValidityReaders masks;
    masks.push_back(image_->OpenMask());
    if (hasMaskBeside_) masks.push_back(OpenMaskBeside());
    return AllOf(std::move(masks));
  }
  bool DeliversValidity() const override { return true; }
  ILevelStore* Levels() override { return levels_.get(); }
  model::LevelInputs Inputs() const override { return image_->Inputs(); }
  std::shared_ptr<ImageWatch> Watch() override { return image_->Watch(); }

 private:
  std::unique_ptr<IValidityReader> OpenMaskBeside() {
    return format_->OpenMaskBeside(file_, image_->Width(), image_->Height());
  }

  std::shared_ptr<IRasterSource> image_;
  std::shared_ptr<ILevelStore> levels_;
  ISideCarFormat* format_;
  std::string file_;
  bool hasMaskBeside_ = false;
};

ISideCarFormat& RequireFormat(const std::string& file) {
  if (ISideCarFormat* format = FormatRegistry::Instance().SideCarFormat()) return *format;
  throw Exception(FormatString(_("%s: no side-car format is registered."), file.c_str()),
                  "host/datasources/genericlayer", "RequireFormat(const std::string&)", 0);
}

/// Null when nothing can stand beside the file.
ISideCarFormat* FormatBeside(bool isPath) {
  return isPath ? FormatRegistry::Instance().SideCarFormat() : nullptr;
}

}  // namespace

std::unique_ptr<IRasterSource> OpenGeneric(IFormatDriver& driver, const std::string& file) {
  RequireFormat(file);
  std::shared_ptr<IRasterSource> image = driver.Open(file, kReadOnly);
  auto beside = OpenBeside(driver, file, *image);
  return WithLevelsBeside(std::move(image), std::move(beside), file, driver.IsPath(file));
}

std::shared_ptr<ILevelStore> OpenBeside(IFormatDriver& driver, const std::string& file,
                                        IRasterSource& image) {
  if (!driver.IsPath(file)) return std::make_shared<NoSideCar>(file);
  return RequireFormat(file).Open(file, image);
}

std::unique_ptr<IRasterSource> WithLevelsBeside(std::shared_ptr<IRasterSource> image,
                                                std::shared_ptr<ILevelStore> beside,
                                                const std::string& file, bool isPath) {
  auto levels = std::make_shared<BothPlaces>(image->Levels(), std::move(beside));
  return std::make_unique<GenericSource>(std::move(image), std::move(levels), FormatBeside(isPath),
                                         file);
}

std::unique_ptr<IRasterSource> WithLevelsInside(std::shared_ptr<IRasterSource> image,
                                                const std::string& file, bool isPath) {
  const std::shared_ptr<ILevelStore> levels(image, image->Levels());
  return std::make_unique<GenericSource>(std::move(image), levels, FormatBeside(isPath), file);
}

}  // namespace orin::datasources
