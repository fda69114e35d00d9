// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/cleanoptions.h"

#include "apps/orin-overviews/numberlist.h"
#include "host/services/text.h"

namespace orin::app {

CLI::App* AddCleanCommand(CLI::App& app, CleanOptions& options) {
  CLI::App* command = app.add_subcommand("clean", _("Remove overview levels of files."));
  command->add_option("FILE", options.files, _("Raster files"))->required()->type_name("");
  command
      ->add_option_function<std::string>(
          "--levels",
          [&](const std::string& text) {
            NumberList list = ParseLevels(text);
            if (!list.problem.empty()) throw CLI::ValidationError("--levels", list.problem);
            options.levels = std::move(list.numbers);
          },
          _("Levels to remove, such as 2,4,8; otherwise all"))
      ->type_name(_("LIST"));
  const auto* internal = command->add_flag_callback(
      "--internal", [&] { options.placement = Placement::kInternal; },
      _("Remove levels inside the file only"));
  const auto* external = command->add_flag_callback(
      "--external", [&] { options.placement = Placement::kExternal; },
      _("Remove levels in the file beside it only"));
  command->add_flag("--quiet", options.quiet, _("Print warnings and errors only"));
  command->final_callback([=, &options] {
    RefuseLevelsAmongFiles(options.files);
    if (internal->count() && external->count())
      throw CLI::ValidationError(
          internal->get_name(),
          FormatString(_("cannot be used together with %s"), external->get_name().c_str()));
  });
  return command;
}

}  // namespace orin::app
