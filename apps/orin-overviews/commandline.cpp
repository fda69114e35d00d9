// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/commandline.h"

#include <fmt/core.h>
#include <CLI/Config.hpp>
#include <CLI/Formatter.hpp>

#include "apps/orin-overviews/exitcode.h"
#include "apps/orin-overviews/nearestword.h"
#include "apps/orin-overviews/terminaltext.h"
#include "host/services/text.h"

namespace orin::app {
namespace {

constexpr char kProgram[] = "orin-overviews";

/// The program's texts around the options, in the user's language.
void Dress(CLI::App& app) {
  app.get_formatter()->label("Usage", _("Usage"));
  app.get_formatter()->label("OPTIONS", _("OPTIONS"));
  app.get_formatter()->label("SUBCOMMAND", _("SUB-COMMAND"));
  app.get_formatter()->label("Positionals", _("Arguments"));
  app.get_formatter()->label("REQUIRED", "");
  app.option_defaults()->group(_("Options"));
  app.set_help_flag("-h,--help", _("Print this help"));
  app.set_version_flag("--version", "Orin Overviews " ORIN_VERSION, _("Print the version"));
}

std::string NamesOf(const std::vector<std::string>& arguments) {
  std::string names;
  for (const std::string& argument : arguments) names += (names.empty() ? "" : " ") + argument;
  return names;
}

/// The long names of the options that the command line may hold.
std::vector<std::string> OptionsOf(const CLI::App& app) {
  std::vector<std::string> names;
  const auto add = [&](const CLI::App& part) {
    for (const CLI::Option* option : part.get_options())
      for (const std::string& name : option->get_lnames()) names.push_back("--" + name);
  };
  add(app);
  for (const CLI::App* command : app.get_subcommands()) add(*command);
  return names;
}

std::string MissingText(const CLI::App& app) {
  if (!app.get_subcommands().empty()) return _("a FILE is needed");
  const std::vector<std::string> words = app.remaining();
  if (words.empty()) return _("a sub-command is needed: build, info or clean");
  return FormatString(_("unknown sub-command: %s; there are build, info and clean."),
                      words.front().c_str()) +
         SuggestionFor(words.front(), {"build", "info", "clean"});
}

/// What is wrong with the command line, in the user's language.
std::string ProblemOf(const CLI::ParseError& error, const CLI::App& app) {
  const std::string text = error.what();
  if (dynamic_cast<const CLI::ExtrasError*>(&error)) {
    const std::vector<std::string> words = app.remaining(true);
    return FormatString(_("unknown argument: %s"), NamesOf(words).c_str()) +
           (words.empty() ? "" : SuggestionFor(words.front(), OptionsOf(app)));
  }
  if (dynamic_cast<const CLI::RequiredError*>(&error)) return MissingText(app);
  if (dynamic_cast<const CLI::ArgumentMismatch*>(&error))
    return FormatString(_("%s: takes exactly one value"), text.substr(0, text.find(':')).c_str());
  return text;
}

int Refuse(const CLI::ParseError& error, const CLI::App& app) {
  const std::string problem = ProblemOf(error, app);
  const auto used = app.get_subcommands();
  const std::string help =
      std::string(kProgram) + (used.empty() ? "" : " " + used.front()->get_name()) + " --help";
  fmt::print(stderr, "{}: {}\n", kProgram, Printable(problem));
  fmt::print(stderr, "{}\n", FormatString(_("Try: %s"), help.c_str()));
  return kWrongUsage;
}

}  // namespace

std::optional<int> ParseCommandLine(int argc, const char* const* argv, Invocation& invocation) {
  CLI::App app(_("Builds overview levels, reduced copies, of geospatial raster files."), kProgram);
  Dress(app);
  app.require_subcommand(1);
  app.fallthrough();  // the program's own options may follow the sub-command's name
  app.add_flag("--verbose", invocation.verbose, _("Report events too"));
  app.add_option("--log-file", invocation.logFile,
                 _("Append every message, with its time, to a file"))
      ->type_name(_("FILE"));
  CLI::App* build = AddBuildCommand(app, invocation.build);
  CLI::App* info = AddInfoCommand(app, invocation.info);
  CLI::App* clean = AddCleanCommand(app, invocation.clean);
  build->group(_("Sub-commands"));
  info->group(_("Sub-commands"));
  clean->group(_("Sub-commands"));
  try {
    app.parse(argc, argv);
  } catch (const CLI::Success& answer) {  // help or version
    return app.exit(answer);
  } catch (const CLI::ParseError& error) {
    return Refuse(error, app);
  }
  invocation.command = app.got_subcommand(info)    ? Command::kInfo
                       : app.got_subcommand(clean) ? Command::kClean
                                                   : Command::kBuild;
  return std::nullopt;
}

}  // namespace orin::app
