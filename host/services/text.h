/// Formatting and translation of the texts that users see.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

/// printf-style formatting into a string. \throws orin::Exception when the format cannot be applied
[[gnu::format(printf, 1, 2)]] std::string FormatString(const char* format, ...);

/// The same operation under the text layer's name.
[[gnu::format(printf, 1, 2)]] std::string MkString(const char* format, ...);

/// Translation of a fixed English text in the process's message locale, or the text itself.
/// The result belongs to the catalogue: never change or free it.
[[gnu::format_arg(1)]] char* _(const char* text);

namespace orin {

/// Names the directory that holds `<language>/LC_MESSAGES/orin-overviews.mo`.
void BindTranslations(const std::string& localeDirectory);

}  // namespace orin
