// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/tiffmask.h"

#include <cstdlib>
#include <filesystem>
#include <mutex>
#include <set>
#include <utility>
#include <vector>

#include <tiff.h>

#include "host/drivers/common/positionedfile.h"
#include "host/drivers/tiff/gdalmetadata.h"
#include "host/drivers/tiff/pixelreader.h"
#include "host/drivers/tiff/tiffmagic.h"
#include "host/services/exception.h"
#include "host/services/text.h"
#include "host/services/warning.h"

namespace orin::drivers {
namespace {

using datasources::IValidityReader;

class TiffMaskReader final : public IValidityReader {
 public:
  TiffMaskReader(const std::string& path, uint64_t directoryOffset)
      : pixels_(path, directoryOffset, {1}) {}

  const PixelFormat& Format() const { return pixels_.Format(); }

  uint32_t Width() const override { return Format().width; }
  uint32_t Height() const override { return Format().height; }
  void Read(uint32_t x, uint32_t y, uint32_t width, uint32_t height, uint8_t* bytes) override {
    // the reader delivers bits as bytes
    gobs::Raster block({width, height, 1, gobs::eDT_8U}, {0, 0, x, y}, bytes);
    pixels_.Read(block);
  }

 private:
  PixelReader pixels_;
};

bool IsMaskFormat(const PixelFormat& format) {
  return format.samplesPerPixel == 1 && format.SampleBytes() == 1;
}

/// What keeps the file from being a mask of the image, empty when nothing does. A file that cannot
/// be read is another matter: nobody knows then which pixels hold data.
std::string ReasonAgainst(const std::string& path, unsigned width, unsigned height) {
  const PositionedFile file(path, PositionedFile::Mode::kRead);
  TiffMagic magic{};
  if (file.Size() >= magic.size()) file.Read(0, magic.data(), magic.size());
  if (!IsTiff(magic)) return _("it is no TIFF");
  const TiffHandle tiff = TiffHandle::OpenAt(path, 0);
  const PixelFormat format = FormatOf(tiff);
  if (format.width != width || format.height != height)
    return FormatString(_("it has %u x %u pixels"), format.width, format.height);
  constexpr unsigned kPerDataset = 2;
  std::string flags;
  for (const MetadataItem& item : ParseMetadata(tiff.TextOf(TIFFTAG_GDAL_METADATA)))
    if (item.name == "INTERNAL_MASK_FLAGS_1") flags = item.text;
  if (flags.empty()) return _("it does not say how it applies (INTERNAL_MASK_FLAGS_1)");
  if ((std::strtoul(flags.c_str(), nullptr, 10) & kPerDataset) == 0 || !IsMaskFormat(format))
    return _("only one mask for all channels, of one byte or bit a pixel, is supported");
  return "";
}

/// The name of the mask file, empty when there is none.
std::string MaskFileOf(const std::string& imageFile) {
  const std::string path = imageFile + ".msk";
  std::error_code ignored;
  return std::filesystem::is_regular_file(path, ignored) ? path : "";
}

bool IsNews(const std::string& text) {
  static std::mutex mutex;
  static std::set<std::string> said;
  const std::lock_guard lock(mutex);
  return said.insert(text).second;
}

/// An image is opened several times by one build. No lock is held while the sink runs: it may ask
/// about the same image.
void WarnOnce(const std::string& text) {
  if (IsNews(text)) tarn::Warning::Warn(text, "host/drivers/tiff/tiffmask", 0);
}

}  // namespace

std::unique_ptr<IValidityReader> OpenTiffMask(const std::string& path, uint64_t directoryOffset) {
  auto reader = std::make_unique<TiffMaskReader>(path, directoryOffset);
  if (!IsMaskFormat(reader->Format()))
    throw Exception(FormatString(_("%s: cannot be read: its mask has not one byte or bit a pixel."),
                                 path.c_str()),
                    "host/drivers/tiff/tiffmask", "OpenTiffMask(const std::string&, uint64_t)", 0);
  return reader;
}

std::unique_ptr<IValidityReader> OpenMaskBeside(const std::string& imageFile, unsigned width,
                                                unsigned height) {
  const std::string path = MaskFileOf(imageFile);
  if (path.empty()) return nullptr;
  const std::string reason = ReasonAgainst(path, width, height);
  if (reason.empty()) return OpenTiffMask(path, 0);
  WarnOnce(FormatString(_("%s: is not used as the mask of its image: %s."), path.c_str(),
                        reason.c_str()));
  return nullptr;
}

}  // namespace orin::drivers
