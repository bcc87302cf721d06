// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin generate: what is installed beside the program, made of the program's own help. Only the build
// calls it, so it does not show in the help.

#include "quorlin/CommandTree.h"
#include "quorlin/Commands.h"
#include "quorlin/ExitCode.h"

#include <iostream>
#include <memory>
#include <string>

namespace Cli {

namespace {

std::string Generate(const std::string& what, const CommandHelp& root) {
  if (what == "man") {
    return MakeManPage(root, QUORLIN_VERSION);
  }
  if (what == "bash") {
    return MakeBashCompletion(root);
  }
  if (what == "zsh") {
    return MakeZshCompletion(root);
  }
  return MakeFishCompletion(root);
}

}  // namespace

Command AddGenerateCommand(CLI::App& app) {
  const std::shared_ptr<std::string> what = std::make_shared<std::string>();
  CLI::App* const command = app.add_subcommand("generate", "Print the man page or a shell's completion");
  command->group("");
  command->add_option("WHAT", *what, "man, bash, zsh or fish")
      ->required()
      ->check(CLI::IsMember({"man", "bash", "zsh", "fish"}));
  return {command, [&app, what] {
            std::cout << Generate(*what, ReadCommandTree(app)) << std::flush;
            return std::cout ? EXIT_DONE : EXIT_FAILED;
          }};
}

}  // namespace Cli
