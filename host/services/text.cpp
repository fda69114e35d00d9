// SPDX-License-Identifier: MIT
#include "host/services/text.h"

#include <libintl.h>

#include <cstdarg>
#include <cstdio>
#include <optional>

#include "host/services/exception.h"

namespace {

constexpr char kDomain[] = "orin-overviews";

/// Nothing when the format cannot be applied.
std::optional<std::string> Format(const char* format, va_list arguments) {
  va_list again;
  va_copy(again, arguments);
  const int length = std::vsnprintf(nullptr, 0, format, again);
  va_end(again);
  if (length < 0) return std::nullopt;
  std::string text(static_cast<size_t>(length), '\0');
  std::vsnprintf(text.data(), text.size() + 1, format, arguments);
  return text;
}

std::string TextOrThrow(const std::optional<std::string>& text, const char* format) {
  if (text) return *text;
  throw orin::Exception(std::string("The text cannot be formatted: ") + format,
                        "host/services/text", "std::string FormatString(const char*, ...)", 0);
}

}  // namespace

std::string FormatString(const char* format, ...) {
  va_list arguments;
  va_start(arguments, format);
  const std::optional<std::string> text = Format(format, arguments);
  va_end(arguments);
  return TextOrThrow(text, format);
}

std::string MkString(const char* format, ...) {
  va_list arguments;
  va_start(arguments, format);
  const std::optional<std::string> text = Format(format, arguments);
  va_end(arguments);
  return TextOrThrow(text, format);
}

char* _(const char* text) {
  if (*text == '\0')
    return const_cast<char*>(text);  // gettext answers "" with the catalogue's header
  return dgettext(kDomain, text);
}

void orin::BindTranslations(const std::string& localeDirectory) {
  bindtextdomain(kDomain, localeDirectory.c_str());
  bind_textdomain_codeset(kDomain, "UTF-8");
}
