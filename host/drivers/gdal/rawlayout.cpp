// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/rawlayout.h"

#include <gdal_priv.h>

#include "host/datasources/fingerprint.h"
#include "host/drivers/gdal/gdalerrors.h"
#include "host/drivers/gdal/pixelfiles.h"

namespace orin::drivers {
namespace {

using datasources::Fingerprinter;

void AddItem(Fingerprinter& digest, GDALMajorObjectH object, const char* key, const char* domain) {
  const char* text = GDALGetMetadataItem(object, key, domain);
  digest.AddText(text ? text : "");
}

void AddPalette(Fingerprinter& digest, GDALColorTableH palette) {
  const int colours = palette ? GDALGetColorEntryCount(palette) : 0;
  digest.AddNumber(uint64_t(colours));
  for (int i = 0; i < colours; ++i) {
    const GDALColorEntry& colour = *GDALGetColorEntry(palette, i);
    for (const short part : {colour.c1, colour.c2, colour.c3, colour.c4})
      digest.AddNumber(uint64_t(part));
  }
}

void AddBand(Fingerprinter& digest, GDALRasterBandH band) {
  digest.AddNumber(uint64_t(GDALGetRasterDataType(band)));
  AddItem(digest, band, "PIXELTYPE", "IMAGE_STRUCTURE");
  AddItem(digest, band, "NBITS", "IMAGE_STRUCTURE");
  AddPalette(digest, GDALGetRasterColorTable(band));
}

/// Where the samples are; false where the library does not tell.
bool AddPlaces(Fingerprinter& digest, const GdalHandle& handle) {
  GDALDataset::RawBinaryLayout layout;
  if (!GDALDataset::FromHandle(handle.Get())->GetRawBinaryLayout(layout)) return false;
  digest.AddNumber(uint64_t(layout.eDataType));
  digest.AddNumber(layout.bLittleEndianOrder);
  digest.AddNumber(layout.nImageOffset);
  for (const GIntBig step : {layout.nPixelOffset, layout.nLineOffset, layout.nBandOffset})
    digest.AddNumber(uint64_t(step));
  return true;
}

}  // namespace

std::string RawLayoutOf(const GdalHandle& handle, const GdalFormat& format) {
  const GdalErrors quiet;
  Fingerprinter digest;
  digest.AddNumber(uint64_t(GDALGetRasterXSize(handle.Get())));
  digest.AddNumber(uint64_t(GDALGetRasterYSize(handle.Get())));
  for (int band = 1; band <= GDALGetRasterCount(handle.Get()); ++band)
    AddBand(digest, handle.Band(unsigned(band)));
  if (!AddPlaces(digest, handle))
    for (const std::string& header : HeadersBeside(handle.Name(), format.driver))
      digest.AddText(datasources::FingerprintOfFile(header, {}));
  return digest.Text();
}

}  // namespace orin::drivers
