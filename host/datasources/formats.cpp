// SPDX-License-Identifier: MIT
#include "host/datasources/formats.h"

#include <map>
#include <utility>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace {

/// Owns the records that the table points to.
std::map<int, ZMBInfo_s>& Records() {
  static std::map<int, ZMBInfo_s> records;
  return records;
}

void AddRecord(const ZMBInfo_s& record) {
  if (record.code < 0 || record.code >= kFormatTableSize)
    throw orin::Exception(FormatString(_("The format %s has the code %d, outside the table of %d."),
                                       record.name.c_str(), record.code, kFormatTableSize),
                          "host/datasources/formats", "AddRecord(const ZMBInfo_s&)", 0);
  Records()[record.code] = record;
  ZMBInfo[record.code] = &Records()[record.code];
}

void ResetTable() {
  for (ZMBInfo_s*& entry : ZMBInfo) entry = nullptr;
  Records().clear();
  AddRecord({"UNKNOWN", "unrecognised", kFormatUnknown, 0});
  AddRecord({"ZMBALL", "any raster with levels in a side-car", kFormatGeneric, 0});
}

}  // namespace

ZMBInfo_s* ZMBInfo[kFormatTableSize] = {};

ZMBFormatType ZMBTestOpen(const char* fileName) {
  ZMBFormatType code = kFormatUnknown;
  if (fileName) orin::datasources::FormatRegistry::Instance().DriverOf(fileName, code);
  return code;
}

ZMBInfo_s* ZMBGetFormatInfo(int formatCode) {
  orin::datasources::FormatRegistry::Instance();  // fills the table's fixed records
  return formatCode < 0 || formatCode >= kFormatTableSize ? nullptr : ZMBInfo[formatCode];
}

namespace orin::datasources {

FormatRegistry& FormatRegistry::Instance() {
  static FormatRegistry registry = [] {
    ResetTable();
    return FormatRegistry();
  }();
  return registry;
}

void FormatRegistry::Register(std::shared_ptr<IFormatDriver> driver) {
  for (const ZMBInfo_s& record : driver->Formats()) AddRecord(record);
  drivers_.push_back(std::move(driver));
}

void FormatRegistry::SetSideCarFormat(std::shared_ptr<ISideCarFormat> format) {
  sideCar_ = std::move(format);
}

void FormatRegistry::Clear() {
  drivers_.clear();
  sideCar_.reset();
  ResetTable();
}

IFormatDriver* FormatRegistry::DriverOf(const std::string& file, ZMBFormatType& code) const {
  for (const auto& driver : drivers_)
    if ((code = driver->Identify(file)) != kFormatUnknown) return driver.get();
  code = kFormatUnknown;
  return nullptr;
}

std::string FormatRegistry::WhyUnrecognised(const std::string& file) const {
  for (const auto& driver : drivers_)
    if (std::string why = driver->WhyUnrecognised(file); !why.empty()) return why;
  return {};
}

}  // namespace orin::datasources
