// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/buildoptions.h"

#include <filesystem>
#include <system_error>

#include "apps/orin-overviews/nearestword.h"
#include "apps/orin-overviews/numberlist.h"
#include "host/services/environment.h"
#include "host/services/text.h"

namespace orin::app {
namespace {

/// An option whose text `read` turns into a value, or answers why it cannot.
template <class Read>
CLI::Option* AddText(CLI::App& command, const std::string& name, const char* kind,
                     const std::string& description, Read read) {
  return command
      .add_option_function<std::string>(
          name,
          [name, read](const std::string& text) {
            const std::string problem = read(text);
            if (!problem.empty()) throw CLI::ValidationError(name, problem);
          },
          description)
      ->type_name(kind);
}

std::string ReadList(NumberList list, std::vector<unsigned>& numbers) {
  numbers = std::move(list.numbers);
  return list.problem;
}

std::string ReadFactor(const std::string& text, unsigned& factor) {
  if (text != "2" && text != "3")
    return FormatString(_("the factor is 2 or 3, not \"%s\""), text.c_str());
  factor = text == "2" ? 2 : 3;
  return "";
}

std::string ReadMethod(const std::string& text, QRTOverviewResampleType& method) {
  method = GetPyramidType(text);
  if (method != ResampleInvalid) return "";
  return FormatString(_("unknown method \"%s\"; the methods are %s."), text.c_str(),
                      PyramidTypeNames().c_str()) +
         SuggestionFor(text, {"nearest", "average", "mode", "bilinear", "bicubic"});
}

/// What counts where neither the command line nor the file's levels name a method.
void ReadEnvironment(BuildOptions& options) {
  const std::string name = core::QRTGetEnvironmentVariable("ORIN_OVERVIEW_METHOD");
  if (name.empty()) return;
  const std::string problem = ReadMethod(name, options.usualMethod);
  if (!problem.empty()) throw CLI::ValidationError("ORIN_OVERVIEW_METHOD", problem);
}

/// Reads every KEY=VALUE.
void AddStoring(CLI::App& command, datasources::LevelOptions& storing) {
  command
      .add_option_function<std::vector<std::string>>(
          "--co",
          [&storing](const std::vector<std::string>& texts) {
            std::string problem;
            for (const std::string& text : texts)
              if (problem.empty()) problem = datasources::ReadLevelOption(text, storing);
            if (problem.empty()) problem = datasources::ContradictionIn(storing);
            if (!problem.empty()) throw CLI::ValidationError("--co", problem);
          },
          _("How new levels are stored, such as COMPRESS=ZSTD; may be given again. Keys: COMPRESS, "
            "PREDICTOR, TILE, LEVEL, QUALITY, BIGTIFF"))
      ->allow_extra_args(false)
      ->type_name(_("KEY=VALUE"));
}

/// Levels take the form asked for, which is one for all channels of a level.
void FinishStoring(BuildOptions& options) {
  options.storing.restores = options.storing.SayCoding();
  if (options.force && options.storing.SayCoding() && !options.channels.empty())
    throw CLI::ValidationError(
        "--co", _("cannot be used together with --force and --channels: all channels of a level "
                  "are stored alike"));
}

void RefuseTogether(const CLI::Option& one, const CLI::Option& other) {
  if (one.count() && other.count())
    throw CLI::ValidationError(one.get_name(), FormatString(_("cannot be used together with %s"),
                                                            other.get_name().c_str()));
}

}  // namespace

void RefuseLevelsAmongFiles(const std::vector<std::string>& files) {
  std::string words;
  std::string list;
  for (const std::string& file : files) {
    std::error_code unknown;
    if (!ParseLevels(file).problem.empty() || std::filesystem::exists(file, unknown)) continue;
    words += (words.empty() ? "" : " ") + file;
    list += (list.empty() ? "" : ",") + file;
  }
  if (!words.empty())
    throw CLI::ValidationError(words,
                               FormatString(_("levels are given as --levels %s"), list.c_str()));
}

CLI::App* AddBuildCommand(CLI::App& app, BuildOptions& options) {
  CLI::App* command = app.add_subcommand("build", _("Build the missing overview levels of files."));
  command->add_option("FILE", options.files, _("Raster files"))->required()->type_name("");
  const auto* levels =
      AddText(*command, "--levels", _("LIST"), _("Levels to build, such as 2,4,8"),
              [&](const std::string& text) { return ReadList(ParseLevels(text), options.levels); });
  const auto* factor = AddText(
      *command, "--factor", "2|3", _("Build the whole pyramid, each level this much smaller"),
      [&](const std::string& text) { return ReadFactor(text, options.factor); });
  AddText(*command, "--method", _("METHOD"), PyramidTypeNames(),
          [&](const std::string& text) { return ReadMethod(text, options.method); });
  AddText(*command, "--channels", _("LIST"), _("Channels to treat, such as 1,3-5"),
          [&](const std::string& text) { return ReadList(ParseChannels(text), options.channels); });
  const auto* internal = command->add_flag_callback(
      "--internal", [&] { options.placement = Placement::kInternal; },
      _("Keep the levels inside the file"));
  const auto* external = command->add_flag_callback(
      "--external", [&] { options.placement = Placement::kExternal; },
      _("Keep the levels in a file beside it"));
  AddStoring(*command, options.storing);
  command->add_flag("--force", options.force, _("Build levels again that are up to date"));
  command->add_flag("--quiet", options.quiet, _("Print warnings and errors only"));
  command->final_callback([=, &options] {
    ReadEnvironment(options);
    RefuseLevelsAmongFiles(options.files);
    RefuseTogether(*levels, *factor);
    RefuseTogether(*internal, *external);
    FinishStoring(options);
  });
  return command;
}

}  // namespace orin::app
