// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/infooptions.h"

#include "host/services/text.h"

namespace orin::app {

CLI::App* AddInfoCommand(CLI::App& app, InfoOptions& options) {
  CLI::App* command = app.add_subcommand("info", _("List the overview levels of a file."));
  command->add_option("FILE", options.file, _("Raster file"))->required()->type_name("");
  command->add_flag("--json", options.json, _("Print JSON"));
  command->add_flag("--update", options.update,
                    _("Keep with the levels what had to be read for the answer"));
  return command;
}

}  // namespace orin::app
