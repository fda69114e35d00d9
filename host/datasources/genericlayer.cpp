// SPDX-License-Identifier: MIT
#include "host/datasources/genericlayer.h"

#include <algorithm>
#include <utility>

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
  BothPlaces(ILevelStore* internal, std::unique_ptr<ILevelStore> sideCar)
      : internal_(internal), sideCar_(std::move(sideCar)) {}

  std::vector<LevelDescription> List() const override {
    std::vector<LevelDescription> levels = sideCar_->List();
    if (internal_)
      for (LevelDescription& entry : internal_->List())
        if (!Holds(levels, entry.level)) levels.push_back(std::move(entry));
    std::sort(
        levels.begin(), levels.end(),
        [](const LevelDescription& a, const LevelDescription& b) { return a.level < b.level; });
    return levels;
  }
  void Create(unsigned level, const std::vector<unsigned>& channels,
              const std::string& method) override {
    sideCar_->Create(level, channels, method);
  }
  std::unique_ptr<IRasterWriter> OpenWriter(unsigned level,
                                            const std::vector<unsigned>& channels) override {
    const bool inside = internal_ && !Holds(sideCar_->List(), level);
    return (inside ? *internal_ : *sideCar_).OpenWriter(level, channels);
  }
  void SetValid(unsigned level, const std::vector<unsigned>& channels, bool valid) override {
    sideCar_->SetValid(level, channels, valid);
  }

 private:
  ILevelStore* internal_;
  std::unique_ptr<ILevelStore> sideCar_;
};

class GenericSource final : public IRasterSource {
 public:
  GenericSource(std::unique_ptr<IRasterSource> image, ISideCarFormat& format,
                const std::string& file)
      : image_(std::move(image)), levels_(image_->Levels(), format.Open(file, *image_)) {}

  unsigned Width() const override { return image_->Width(); }
  unsigned Height() const override { return image_->Height(); }
  unsigned ChannelCount() const override { return image_->ChannelCount(); }
  gobs::DataType TypeOf(unsigned channel) const override { return image_->TypeOf(channel); }
  AuxiliaryData MetadataOf(const std::vector<unsigned>& channels) const override {
    return image_->MetadataOf(channels);
  }
  unsigned StoredBitsOf(unsigned channel) const override { return image_->StoredBitsOf(channel); }
  bool HoldsClasses() const override { return image_->HoldsClasses(); }
  std::unique_ptr<IRasterReader> OpenReader(const std::vector<unsigned>& channels) override {
    return image_->OpenReader(channels);
  }
  ILevelStore* Levels() override { return &levels_; }

 private:
  std::unique_ptr<IRasterSource> image_;
  BothPlaces levels_;
};

}  // namespace

std::unique_ptr<IRasterSource> OpenGeneric(IFormatDriver& driver, const std::string& file) {
  ISideCarFormat* format = FormatRegistry::Instance().SideCarFormat();
  if (!format)
    throw Exception(FormatString(_("%s: no side-car format is registered."), file.c_str()),
                    "host/datasources/genericlayer", "OpenGeneric", 0);
  return std::make_unique<GenericSource>(driver.Open(file, kReadOnly), *format, file);
}

}  // namespace orin::datasources
