// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The commands and flags of the program as plain data: what its man page and its completions are made of.

#ifndef QUORLIN_CLI_COMMANDTREE_H
#define QUORLIN_CLI_COMMANDTREE_H

#include <CLI/CLI.hpp>

#include <string>
#include <vector>

namespace Cli {

struct OptionHelp {
  std::vector<std::string> names;  ///< With their dashes; empty for an argument without flag.
  std::string value;               ///< What the value is called, in capitals; empty: takes none.
  std::string description;
  bool required = false;

  /// Whether the value names a file or a folder.
  bool TakesFile() const;
};

struct CommandHelp {
  std::string path;  ///< All words of the command: "quorlin acquire password".
  std::string name;  ///< The last of them.
  std::string description;
  std::string footer;
  std::vector<OptionHelp> options;
  std::vector<CommandHelp> subcommands;
};

/// Reads what the command line was told about itself. Hidden commands are left out.
CommandHelp ReadCommandTree(const CLI::App& app);

/// The command with all below it, each before its own.
std::vector<const CommandHelp*> ListCommands(const CommandHelp& root);

/// The man page, as input for groff with the macros man(7).
std::string MakeManPage(const CommandHelp& root, const std::string& version);

std::string MakeBashCompletion(const CommandHelp& root);
std::string MakeZshCompletion(const CommandHelp& root);
std::string MakeFishCompletion(const CommandHelp& root);

}  // namespace Cli

#endif  // QUORLIN_CLI_COMMANDTREE_H
