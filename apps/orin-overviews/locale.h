/// The user's language.
// SPDX-License-Identifier: MIT
#pragma once

namespace orin::app {

/// Chooses the language of messages. Numbers keep the decimal point whatever the language.
/// Translations come from `$ORIN_LOCALE_DIR`, else from the build tree or the installation that the
/// program runs from, else from where it was configured to be installed.
void ChooseLanguage();

}  // namespace orin::app
