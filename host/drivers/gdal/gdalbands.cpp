// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/gdalbands.h"

#include <cpl_conv.h>
#include <cpl_string.h>

#include <charconv>
#include <cmath>

namespace orin::drivers {
namespace {

std::string StructureItem(GDALRasterBandH band, const char* key) {
  const char* text = GDALGetMetadataItem(band, key, "IMAGE_STRUCTURE");
  return text ? text : "";
}

std::optional<gobs::DataType> ByteType(GDALRasterBandH band) {
  if (StructureItem(band, "PIXELTYPE") == "SIGNEDBYTE") return gobs::DataTypeOf<int8_t>();
  return StructureItem(band, "NBITS") == "1" ? gobs::eDT_BIT : gobs::eDT_8U;
}

std::string TextOf(double value) {
  if (std::isnan(value)) return "nan";
  if (std::isinf(value)) return value < 0 ? "-inf" : "inf";
  char digits[32];
  const auto [end, error] = std::to_chars(std::begin(digits), std::end(digits), value);
  return error == std::errc() ? std::string(digits, end) : "";
}

}  // namespace

std::optional<gobs::DataType> TypeOfBand(GDALRasterBandH band) {
  switch (GDALGetRasterDataType(band)) {
    case GDT_Byte:
      return ByteType(band);
#if GDAL_VERSION_NUM >= 3070000
    case GDT_Int8:
      return gobs::DataTypeOf<int8_t>();
#endif
    case GDT_UInt16:
      return gobs::DataTypeOf<uint16_t>();
    case GDT_Int16:
      return gobs::DataTypeOf<int16_t>();
    case GDT_UInt32:
      return gobs::DataTypeOf<uint32_t>();
    case GDT_Int32:
      return gobs::DataTypeOf<int32_t>();
    case GDT_UInt64:
      return gobs::DataTypeOf<uint64_t>();
    case GDT_Int64:
      return gobs::DataTypeOf<int64_t>();
    case GDT_Float32:
      return gobs::DataTypeOf<float>();
    case GDT_Float64:
      return gobs::DataTypeOf<double>();
    case GDT_CInt16:
      return gobs::DataTypeOf<int16_t>(true);
    case GDT_CInt32:
      return gobs::DataTypeOf<int32_t>(true);
    case GDT_CFloat32:
      return gobs::DataTypeOf<float>(true);
    case GDT_CFloat64:
      return gobs::DataTypeOf<double>(true);
    default:
      return std::nullopt;
  }
}

unsigned StoredBitsOfBand(GDALRasterBandH band, const gobs::DataType& type) {
  const std::string text = StructureItem(band, "NBITS");
  unsigned bits = 0;
  std::from_chars(text.data(), text.data() + text.size(), bits);
  return bits >= 1 && bits < type.bits && !type.isFloat && !type.isComplex ? bits : type.bits;
}

bool HoldsClassNumbers(GDALRasterBandH band) {
  if (GDALGetRasterColorInterpretation(band) == GCI_PaletteIndex) return true;
  if (GDALGetRasterColorTable(band) || GDALGetRasterCategoryNames(band)) return true;
  const char* layer = GDALGetMetadataItem(band, "LAYER_TYPE", nullptr);
  return layer && EQUAL(layer, "thematic");
}

std::string NoDataTextOf(GDALRasterBandH band) {
  int isDeclared = 0;
  switch (GDALGetRasterDataType(band)) {
    case GDT_Int64: {
      const int64_t value = GDALGetRasterNoDataValueAsInt64(band, &isDeclared);
      return isDeclared ? std::to_string(value) : "";
    }
    case GDT_UInt64: {
      const uint64_t value = GDALGetRasterNoDataValueAsUInt64(band, &isDeclared);
      return isDeclared ? std::to_string(value) : "";
    }
    default: {
      const double value = GDALGetRasterNoDataValue(band, &isDeclared);
      return isDeclared ? TextOf(value) : "";
    }
  }
}

datasources::AuxiliaryData::Items ItemsOf(GDALMajorObjectH object) {
  datasources::AuxiliaryData::Items items;
  for (CSLConstList entry = GDALGetMetadata(object, nullptr); entry && *entry; ++entry) {
    char* key = nullptr;
    const char* value = CPLParseNameValue(*entry, &key);
    if (key && value) items.emplace(key, value);
    CPLFree(key);
  }
  return items;
}

}  // namespace orin::drivers
