// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The man page, in the macros of man(7).

#include "quorlin/CommandTree.h"

#include <algorithm>
#include <sstream>

namespace Cli {

namespace {

/// Text for groff: a backslash, a dash that is a dash, and a dot or an apostrophe that opens a line mean
/// something else to it otherwise.
std::string Escape(const std::string& text) {
  std::string escaped;
  bool atLineStart = true;
  for (const char c : text) {
    if (atLineStart && (c == '.' || c == '\'')) {
      escaped += "\\&";
    }
    switch (c) {
      case '\\':
        escaped += "\\e";
        break;
      case '-':
        escaped += "\\-";
        break;
      case '~':
        escaped += "\\(ti";
        break;
      case '^':
        escaped += "\\(ha";
        break;
      default:
        escaped += c;
    }
    atLineStart = c == '\n';
  }
  return escaped;
}

std::string DescribeNames(const OptionHelp& option) {
  std::string text;
  for (const std::string& name : option.names) {
    text += (text.empty() ? "" : ", ") + ("\\fB" + Escape(name) + "\\fR");
  }
  if (!option.value.empty()) {
    text += (text.empty() ? "" : " ") + ("\\fI" + Escape(option.value) + "\\fR");
  }
  return text;
}

void WriteOptions(const CommandHelp& command, std::ostream& page) {
  for (const OptionHelp& option : command.options) {
    if (std::find(option.names.begin(), option.names.end(), "--help") != option.names.end()) {
      continue;  // Every command has it.
    }
    page << ".TP\n"
         << DescribeNames(option) << "\n"
         << Escape(option.description) << (option.required ? " (required)" : "") << "\n";
  }
}

/// Footers are laid out by hand: their lines stay as they are.
void WriteFooter(const CommandHelp& command, std::ostream& page) {
  if (!command.footer.empty()) {
    page << ".PP\n.nf\n" << Escape(command.footer) << "\n.fi\n";
  }
}

void WriteCommand(const CommandHelp& command, std::ostream& page) {
  page << ".SS " << Escape(command.path) << "\n" << Escape(command.description) << "\n";
  WriteOptions(command, page);
  WriteFooter(command, page);
}

}  // namespace

std::string MakeManPage(const CommandHelp& root, const std::string& version) {
  std::ostringstream page;
  page << ".TH QUORLIN 1 \"\" \"quorlin " << version << "\" \"User Commands\"\n"
       << ".SH NAME\nquorlin \\- ask WS\\-Trust token services for SAML 2.0 tokens, and check tokens\n"
       << ".SH SYNOPSIS\n\\fBquorlin\\fR \\fICOMMAND\\fR [\\fIOPTION\\fR]...\n"
       << ".SH DESCRIPTION\n"
       << Escape(root.description) << "\n";
  WriteFooter(root, page);
  page << ".SH OPTIONS\n";
  page
      << ".TP\n\\fB\\-h\\fR, \\fB\\-\\-help\\fR\nTell about the program, or about the command it stands behind\n";
  WriteOptions(root, page);
  page << ".SH COMMANDS\n";
  for (const CommandHelp* const command : ListCommands(root)) {
    if (command != &root) {
      WriteCommand(*command, page);
    }
  }
  return page.str();
}

}  // namespace Cli
