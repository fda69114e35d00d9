// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/sidecar.h"

#include <algorithm>
#include <utility>
#include <vector>

#include "host/drivers/tiff/levelmask.h"
#include "host/drivers/tiff/tifflevelstore.h"
#include "host/drivers/tiff/tiffmask.h"
#include "host/drivers/tiff/tiffsource.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

using datasources::IRasterSource;

/// The type of all levels: that of the first channel that is more than a mask.
gobs::DataType LevelTypeOf(const IRasterSource& image) {
  for (unsigned channel = 1; channel <= image.ChannelCount(); ++channel)
    if (image.TypeOf(channel).bits > 1) return image.TypeOf(channel);
  return image.ChannelCount() == 0 ? gobs::eDT_8U : image.TypeOf(1);
}

/// Makes samples as narrow as the image's, where the type that blocks hold stays the same. What is
/// beyond them is clamped when it is stored.
void KeepBits(const IRasterSource& image, LevelCoding& coding) {
  const gobs::DataType& type = coding.format.type;
  unsigned bits = 0;
  for (unsigned channel = 1; channel <= image.ChannelCount(); ++channel)
    bits = std::max(bits, image.StoredBitsOf(channel));
  const unsigned nextNarrower = type.bits == 8 ? 1 : type.bits / 2;
  if (type.isFloat || type.isComplex || type.bits == 64 || bits >= type.bits ||
      bits <= nextNarrower)
    return;
  coding.format.bitsPerSample = bits;
  coding.predictor = PREDICTOR_NONE;
}

/// Has the levels say which of their samples is opacity.
/// \param channel  1-based; 0 for none, and the first is none: it is what the image shows
void MarkAlpha(unsigned channel, LevelCoding& coding) {
  const uint32_t samples = coding.format.samplesPerPixel;
  if (channel < 2 || channel > samples) return;
  std::vector<uint64_t> meanings(samples - 1, EXTRASAMPLE_UNSPECIFIED);
  meanings[channel - 2] = EXTRASAMPLE_UNASSALPHA;
  std::erase_if(coding.inherited,
                [](const NewEntry& entry) { return entry.tag == TIFFTAG_EXTRASAMPLES; });
  coding.inherited.push_back(NumbersEntry(TIFFTAG_EXTRASAMPLES, TIFF_SHORT, meanings));
}

LevelCoding CodingOfImage(const IRasterSource& image) {
  LevelCoding coding;
  if (const auto* tiff = dynamic_cast<const TiffSource*>(&image)) {
    const PositionedFile file(tiff->File(), PositionedFile::Mode::kRead);
    const TiffStructure structure = ParseStructure(file);
    coding = CodingOf(file, structure, structure.directories[0], tiff->Format());
    // What libtiff 4.5 reads there may be a NaN with digits, which LERC would drop.
    if (coding.format.compression == COMPRESSION_LERC && structure.byteOrder.IsSwapped())
      FallBackToDeflate(coding);
  } else {
    const datasources::AuxiliaryData metadata = image.MetadataOf({1});
    const std::optional<model::NoData>& noData = metadata.Facts().First();
    coding = PlainCoding(image.Width(), image.Height(), image.ChannelCount(), LevelTypeOf(image),
                         noData ? noData->Text() : "");
    KeepBits(image, coding);
    MarkAlpha(image.AlphaChannel(), coding);
  }
  coding.byteOrder = ByteOrder();
  return InPlanes(std::move(coding));
}

std::unique_ptr<LevelFile> OpenLevels(const std::string& imageFile, const std::string& path) {
  try {
    return LevelFile::Beside(imageFile, path);
  } catch (const Exception& reason) {
    throw Exception(FormatString(_("%s Delete the side-car, or move it away, and run again."),
                                 reason.GetMessage().c_str()),
                    "host/drivers/tiff/sidecar",
                    "OpenLevels(const std::string&, const std::string&)", 0);
  }
}

/// The validity of an image whose driver leaves the mask file beside it to others.
ImageValidity ValidityBeside(const std::string& imageFile, IRasterSource& image) {
  ImageValidity validity = ValidityOf(image);
  const auto openMask = [imageFile, width = image.Width(), height = image.Height()] {
    return OpenMaskBeside(imageFile, width, height);
  };
  if (validity.hasMask || !openMask()) return validity;
  validity.hasMask = true;
  validity.open = [openMask, openRest = validity.open] {
    datasources::ValidityReaders readers;
    readers.push_back(openMask());
    if (openRest) readers.push_back(openRest());
    return datasources::AllOf(std::move(readers));
  };
  return validity;
}

}  // namespace

std::unique_ptr<datasources::IValidityReader> TiffSideCar::OpenMaskBeside(
    const std::string& imageFile, unsigned width, unsigned height) {
  return drivers::OpenMaskBeside(imageFile, width, height);
}

std::unique_ptr<datasources::ILevelStore> TiffSideCar::Open(const std::string& imageFile,
                                                            IRasterSource& image) {
  const std::string path = imageFile + ".ovr";
  TiffLevelStore::Settings settings;
  settings.coding = CodingOfImage(image);
  settings.image = {image.Width(), image.Height(), image.ChannelCount(),
                    settings.coding.format.type, false};
  settings.place = datasources::LevelPlace::kSideCar;
  settings.usualSource = 1;
  settings.watch = image.Watch();
  if (!settings.watch) settings.watch = std::make_shared<datasources::ImageWatch>(imageFile);
  settings.inputs = image.Inputs();
  settings.validity =
      image.DeliversValidity() ? ValidityOf(image) : ValidityBeside(imageFile, image);
  if (settings.validity.hasMask && settings.inputs.mask.empty()) settings.inputs.mask = "beside";
  auto file = OpenLevels(imageFile, path);
  settings.coding.byteOrder = file->Structure().byteOrder;
  return std::make_unique<TiffLevelStore>(std::move(file), std::move(settings));
}

}  // namespace orin::drivers
