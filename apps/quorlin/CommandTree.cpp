// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/CommandTree.h"

namespace Cli {

namespace {

CommandHelp ReadCommand(const CLI::App& app, const std::string& parentPath);

OptionHelp ReadOption(const CLI::Option& option) {
  OptionHelp help;
  for (const std::string& name : option.get_snames()) {
    help.names.push_back("-" + name);
  }
  for (const std::string& name : option.get_lnames()) {
    help.names.push_back("--" + name);
  }
  if (option.get_items_expected_max() > 0) {
    help.value = option.get_type_name().empty() ? "VALUE" : option.get_type_name();
  }
  if (help.names.empty() && help.value == "TEXT") {
    help.value = option.get_name();
  }
  help.description = option.get_description();
  help.required = option.get_required();
  return help;
}

bool IsShown(const CLI::Option* option) {
  return !option->get_group().empty();
}

bool IsShown(const CLI::App* app) {
  return !app->get_group().empty() && !app->get_name().empty();
}

CommandHelp ReadCommand(const CLI::App& app, const std::string& parentPath) {
  CommandHelp help;
  help.name = app.get_name();
  help.path = parentPath.empty() ? help.name : parentPath + " " + help.name;
  help.description = app.get_description();
  help.footer = app.get_footer();
  for (const CLI::Option* const option :
       app.get_options([](const CLI::Option* candidate) { return IsShown(candidate); })) {
    help.options.push_back(ReadOption(*option));
  }
  for (const CLI::App* const subcommand :
       app.get_subcommands([](const CLI::App* candidate) { return IsShown(candidate); })) {
    help.subcommands.push_back(ReadCommand(*subcommand, help.path));
  }
  return help;
}

void AppendCommands(const CommandHelp& command, std::vector<const CommandHelp*>& list) {
  list.push_back(&command);
  for (const CommandHelp& subcommand : command.subcommands) {
    AppendCommands(subcommand, list);
  }
}

}  // namespace

bool OptionHelp::TakesFile() const {
  return value == "PEM" || value == "DIR" || value.find("FILE") != std::string::npos;
}

CommandHelp ReadCommandTree(const CLI::App& app) {
  return ReadCommand(app, "");
}

std::vector<const CommandHelp*> ListCommands(const CommandHelp& root) {
  std::vector<const CommandHelp*> list;
  AppendCommands(root, list);
  return list;
}

}  // namespace Cli
