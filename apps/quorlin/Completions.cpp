// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Completions for the shells. Each finds out which command stands on the line, then offers what that command
// takes.

#include "quorlin/CommandTree.h"

#include <sstream>

namespace Cli {

namespace {

/// For single quotes of a POSIX shell and of zsh.
std::string Quote(const std::string& text) {
  std::string quoted = "'";
  for (const char c : text) {
    quoted += c == '\'' ? std::string("'\\''") : std::string(1, c);
  }
  return quoted + "'";
}

/// For single quotes of fish, which knows backslashes inside them.
std::string QuoteForFish(const std::string& text) {
  std::string quoted = "'";
  for (const char c : text) {
    if (c == '\'' || c == '\\') {
      quoted += '\\';
    }
    quoted += c;
  }
  return quoted + "'";
}

/// In a zsh description list a colon divides the word from what is said about it.
std::string QuoteForZsh(const std::string& word, const std::string& description) {
  std::string escaped;
  for (const char c : description) {
    if (c == ':' || c == '\\') {
      escaped += '\\';
    }
    escaped += c;
  }
  return Quote(word + ":" + escaped);
}

std::string ListSubcommandPaths(const CommandHelp& root) {
  std::string patterns;
  for (const CommandHelp* const command : ListCommands(root)) {
    if (command != &root) {
      patterns += (patterns.empty() ? "" : " | ") + Quote(command->path);
    }
  }
  return patterns;
}

/// "'command --flag' | ..." for the flags that take a value, only those that take a file or only the others.
std::string ListValueFlags(const CommandHelp& root, bool files) {
  std::string patterns;
  for (const CommandHelp* const command : ListCommands(root)) {
    for (const OptionHelp& option : command->options) {
      for (const std::string& name : option.names) {
        if (!option.value.empty() && option.TakesFile() == files) {
          patterns += (patterns.empty() ? "" : " | ") + Quote(command->path + " " + name);
        }
      }
    }
  }
  return patterns;
}

std::string ListWords(const CommandHelp& command) {
  std::string words;
  for (const CommandHelp& subcommand : command.subcommands) {
    words += (words.empty() ? "" : " ") + subcommand.name;
  }
  for (const OptionHelp& option : command.options) {
    for (const std::string& name : option.names) {
      words += (words.empty() ? "" : " ") + name;
    }
  }
  return words;
}

bool TakesFileArgument(const CommandHelp& command) {
  for (const OptionHelp& option : command.options) {
    if (option.names.empty() && option.TakesFile()) {
      return true;
    }
  }
  return false;
}

void WriteZshWords(const CommandHelp& command, std::ostream& script) {
  script << "    (" << Quote(command.path) << ")\n      words_here=(\n";
  for (const CommandHelp& subcommand : command.subcommands) {
    script << "        " << QuoteForZsh(subcommand.name, subcommand.description) << "\n";
  }
  for (const OptionHelp& option : command.options) {
    for (const std::string& name : option.names) {
      script << "        " << QuoteForZsh(name, option.description) << "\n";
    }
  }
  script << "      )\n";
  if (TakesFileArgument(command)) {
    script << "      takes_file=yes\n";
  }
  script << "      ;;\n";
}

void WriteFishCommand(const CommandHelp& command, std::ostream& script) {
  const std::string here =
      "complete -c quorlin -n " + QuoteForFish("test (__quorlin_command) = " + QuoteForFish(command.path));
  for (const CommandHelp& subcommand : command.subcommands) {
    script << here << " -a " << QuoteForFish(subcommand.name) << " -d "
           << QuoteForFish(subcommand.description) << "\n";
  }
  for (const OptionHelp& option : command.options) {
    if (option.names.empty()) {
      script << here << (option.TakesFile() ? " -F" : "") << "\n";
      continue;
    }
    script << here;
    for (const std::string& name : option.names) {
      const bool isLong = name.compare(0, 2, "--") == 0;
      script << (isLong ? " -l " : " -s ") << name.substr(isLong ? 2 : 1);
    }
    script << (option.value.empty() ? ""
               : option.TakesFile() ? " -r -F"
                                    : " -x")
           << " -d " << QuoteForFish(option.description) << "\n";
  }
}

}  // namespace

std::string MakeBashCompletion(const CommandHelp& root) {
  std::ostringstream script;
  script << "# bash completion for quorlin, made by the program itself\n\n"
         << "_quorlin() {\n"
         << "  local current=${COMP_WORDS[COMP_CWORD]} command=quorlin takes_file= words= index\n"
         << "  COMPREPLY=()\n"
         << "  for ((index = 1; index < COMP_CWORD; ++index)); do\n"
         << "    case \"$command ${COMP_WORDS[index]}\" in\n"
         << "      " << ListSubcommandPaths(root) << ") command+=\" ${COMP_WORDS[index]}\" ;;\n"
         << "    esac\n"
         << "  done\n"
         << "  case \"$command ${COMP_WORDS[COMP_CWORD - 1]}\" in\n"
         << "    " << ListValueFlags(root, true) << ")\n"
         << "      mapfile -t COMPREPLY < <(compgen -f -- \"$current\")\n"
         << "      compopt -o filenames 2>/dev/null\n"
         << "      return\n"
         << "      ;;\n"
         << "    " << ListValueFlags(root, false) << ") return ;;\n"
         << "  esac\n"
         << "  case $command in\n";
  for (const CommandHelp* const command : ListCommands(root)) {
    script << "    " << Quote(command->path) << ") words=" << Quote(ListWords(*command))
           << (TakesFileArgument(*command) ? " takes_file=yes" : "") << " ;;\n";
  }
  script << "  esac\n"
         << "  mapfile -t COMPREPLY < <(compgen -W \"$words\" -- \"$current\")\n"
         << "  if [[ $takes_file == yes && $current != -* ]]; then\n"
         << "    mapfile -t COMPREPLY < <(compgen -f -- \"$current\")\n"
         << "    compopt -o filenames 2>/dev/null\n"
         << "  fi\n"
         << "}\n\n"
         << "complete -F _quorlin quorlin\n";
  return script.str();
}

std::string MakeZshCompletion(const CommandHelp& root) {
  std::ostringstream script;
  script << "#compdef quorlin\n"
         << "# zsh completion for quorlin, made by the program itself\n\n"
         << "_quorlin() {\n"
         << "  local command=quorlin takes_file= word\n"
         << "  local -a words_here\n"
         << "  for word in \"${(@)words[2,CURRENT-1]}\"; do\n"
         << "    case \"$command $word\" in\n"
         << "      (" << ListSubcommandPaths(root) << ") command+=\" $word\" ;;\n"
         << "    esac\n"
         << "  done\n"
         << "  case \"$command ${words[CURRENT-1]}\" in\n"
         << "    (" << ListValueFlags(root, true) << ") _files; return ;;\n"
         << "    (" << ListValueFlags(root, false) << ") _message value; return ;;\n"
         << "  esac\n"
         << "  case $command in\n";
  for (const CommandHelp* const command : ListCommands(root)) {
    WriteZshWords(*command, script);
  }
  script << "  esac\n"
         << "  if [[ $takes_file == yes && ${words[CURRENT]} != -* ]]; then\n"
         << "    _files\n"
         << "  else\n"
         << "    _describe quorlin words_here\n"
         << "  fi\n"
         << "}\n\n"
         << "_quorlin \"$@\"\n";
  return script.str();
}

std::string MakeFishCompletion(const CommandHelp& root) {
  std::ostringstream script;
  script << "# fish completion for quorlin, made by the program itself\n\n"
         << "function __quorlin_command\n"
         << "  set -l command quorlin\n"
         << "  for word in (commandline -opc)[2..-1]\n"
         << "    switch \"$command $word\"\n"
         << "      case";
  for (const CommandHelp* const command : ListCommands(root)) {
    if (command != &root) {
      script << " " << QuoteForFish(command->path);
    }
  }
  script << "\n"
         << "        set command \"$command $word\"\n"
         << "    end\n"
         << "  end\n"
         << "  echo $command\n"
         << "end\n\n"
         << "complete -c quorlin -f\n";
  for (const CommandHelp* const command : ListCommands(root)) {
    WriteFishCommand(*command, script);
  }
  return script.str();
}

}  // namespace Cli
