// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/gdalerrors.h"

#include <cpl_error.h>
#include <cpl_string.h>

#include <string_view>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

/// A file that ends too early is decoded to the end with grey, and only a warning tells.
bool TellsOfMissingData(std::string_view message) {
  return message.find("remature end") != message.npos;
}

/// Without bytes that would disturb a terminal: a damaged file's own text may be in the message.
std::string Printable(std::string text) {
  const bool isUtf8 = CPLIsUTF8(text.c_str(), -1) != 0;
  for (char& c : text) {
    const auto byte = static_cast<unsigned char>(c);
    if (byte < ' ' || byte == 0x7F || (byte > 0x7F && !isUtf8)) c = '?';
  }
  return text;
}

void CPL_STDCALL Collect(CPLErr kind, CPLErrorNum, const char* message) {
  const std::string_view text = message ? message : "";
  const bool isFailure = kind == CE_Failure || kind == CE_Fatal || TellsOfMissingData(text);
  static_cast<GdalErrors*>(CPLGetErrorHandlerUserData())->Add(isFailure, message);
}

}  // namespace

GdalErrors::GdalErrors() {
  CPLPushErrorHandlerEx(Collect, this);
  CPLErrorReset();
}

GdalErrors::~GdalErrors() { CPLPopErrorHandler(); }

void GdalErrors::Add(bool isFailure, const char* message) {
  if (!isFailure || any_) return;  // later failures are the consequences of the first
  any_ = true;
  first_ = message ? message : "";
}

std::string GdalErrors::Reason() const {
  std::string reason = Printable(first_.substr(0, first_.find('\n')));
  reason.erase(reason.find_last_not_of(".! ") + 1);
  return reason.empty() ? _("the file is damaged") : reason;
}

void GdalErrors::Require(bool succeeded, const char* format, const std::string& file) const {
  if (succeeded && !any_) return;
  std::string reason = Reason();
  if (reason.starts_with(file + ": ")) reason.erase(0, file.size() + 2);
  throw Exception(FormatString(format, file.c_str(), reason.c_str()),
                  "host/drivers/gdal/gdalerrors", "orin::drivers::GdalErrors::Require", 0);
}

void SilenceGdal() { CPLSetErrorHandler(CPLQuietErrorHandler); }

}  // namespace orin::drivers
