// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/formattable.h"

namespace orin::drivers {
namespace {

// No name may hold "TIFF", nor "ZMB"
// but for the one format that keeps levels inside.
constexpr GdalFormat kFormats[] = {
#ifdef ORIN_HAS_HFA_LEVELS
    {"HFA", "GDALRegister_HFA", kFormatErdas, "ZMBERDAS", "ERDAS Imagine", 1, Decoding::kBlocks},
#else  // deliberate: another code and name, which say that levels go beside the file
    {"HFA", "GDALRegister_HFA", 318, "ERDAS", "ERDAS Imagine", 0, Decoding::kBlocks},
#endif
    {"VRT", "GDALRegister_VRT", 300, "VRT", "virtual raster (VRT)", 0,
     Decoding::kRowsOfAllChannels},
    {"GTiff", "GDALRegister_GTiff", kFormatArchivedTiff, "GTIF-REMOTE",
     "GeoTIFF in an archive or on a server", 0, Decoding::kBlocks},
    {"GTiff", "GDALRegister_GTiff", kFormatTiffPage, "GTIF-PAGE", "page of a GeoTIFF", 0,
     Decoding::kBlocks},
    {"COG", "GDALRegister_COG", 0, "", "", 0, Decoding::kBlocks},
    {"NITF", "GDALRegister_NITF", 302, "NITF", "NITF", 0, Decoding::kBlocks},
    {"AAIGrid", "GDALRegister_AAIGrid", 303, "AAIGRID", "Arc/Info ASCII grid", 0, Decoding::kRows},
    {"PNG", "GDALRegister_PNG", 304, "PNG", "PNG", 0, Decoding::kRowsOfAllChannels},
    {"JPEG", "GDALRegister_JPEG", 305, "JPEG", "JPEG", 0, Decoding::kRowsOfAllChannels},
    {"MEM", "GDALRegister_MEM", 0, "", "", 0, Decoding::kBlocks},
    {"GIF", "GDALRegister_GIF", 306, "GIF", "GIF", 0, Decoding::kRows},
    {"BMP", "GDALRegister_BMP", 307, "BMP", "BMP", 0, Decoding::kRows},
    {"WEBP", "GDALRegister_WEBP", 308, "WEBP", "WebP", 0, Decoding::kRowsOfAllChannels},
    {"JP2OpenJPEG", "GDALRegister_JP2OpenJPEG", 309, "JP2", "JPEG 2000", 0,
     Decoding::kRowsOfAllChannels},
    {"netCDF", "GDALRegister_netCDF", 310, "NETCDF", "netCDF", 0, Decoding::kRows},
    {"HDF5", "GDALRegister_HDF5", 311, "HDF5", "HDF5", 0, Decoding::kRows},
    {"HDF5Image", "GDALRegister_HDF5Image", 311, "HDF5", "HDF5", 0, Decoding::kRows},
    {"GRIB", "GDALRegister_GRIB", 312, "GRIB", "GRIB", 0, Decoding::kRows},
    {"ENVI", "GDALRegister_ENVI", 313, "ENVI", "ENVI", 0, Decoding::kRows},
    {"EHdr", "GDALRegister_EHdr", 314, "EHDR", "ESRI .hdr labelled", 0, Decoding::kRows},
    {"RRASTER", "GDALRegister_RRASTER", 315, "RRASTER", "R raster", 0, Decoding::kRows},
    {"MRF", "GDALRegister_mrf", 316, "MRF", "meta raster format (MRF)", 0, Decoding::kBlocks},
};

}  // namespace

std::span<const GdalFormat> GdalFormats() { return kFormats; }

std::vector<ZMBInfo_s> GdalFormatRecords() {
  std::vector<ZMBInfo_s> records;
  for (const GdalFormat& format : kFormats)
    if (format.code != 0)
      records.push_back({format.name, format.description, format.code, format.nativeOverviews});
  return records;
}

}  // namespace orin::drivers
