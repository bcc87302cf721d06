// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The man page and the completions that the program writes: read by the programs that they are for.

#include "apps/Cli.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <sstream>

namespace {

using StsTests::RunCli;
using TestSupport::ProcessResult;
using TestSupport::RunProcess;
using TestSupport::TemporaryDirectory;

std::string Generate(const std::string& what) {
  const ProcessResult result = RunCli({"generate", what});
  EXPECT_EQ(0, result.exitCode) << result.standardError;
  EXPECT_EQ("", result.standardError);
  return result.standardOutput;
}

std::string WriteTo(const TemporaryDirectory& directory, const std::string& name, const std::string& text) {
  const std::string path = directory.GetPath() + "/" + name;
  std::ofstream(path) << text;
  return path;
}

std::vector<std::string> SplitLines(const std::string& text) {
  std::vector<std::string> lines;
  std::istringstream stream(text);
  for (std::string line; std::getline(stream, line);) {
    lines.push_back(line);
  }
  return lines;
}

/// The words that bash offers for the last of `words`.
std::vector<std::string> CompleteInBash(const std::vector<std::string>& words) {
  const TemporaryDirectory directory;
  const std::string script = WriteTo(directory, "quorlin.bash", Generate("bash"));
  std::vector<std::string> command = {
      "bash", "-c",
      "source \"$1\"; shift; COMP_WORDS=(\"$@\"); COMP_CWORD=$(($# - 1)); _quorlin; printf '%s\\n' "
      "\"${COMPREPLY[@]}\"",
      "bash", script};
  command.insert(command.end(), words.begin(), words.end());
  const ProcessResult result = RunProcess(command);
  EXPECT_EQ("", result.standardError);
  return SplitLines(result.standardOutput);
}

/// The words that fish offers at the end of `line`, without their descriptions.
std::vector<std::string> CompleteInFish(const std::string& line) {
  const TemporaryDirectory directory;
  const std::string script = WriteTo(directory, "quorlin.fish", Generate("fish"));
  const ProcessResult result = RunProcess({"env", "HOME=" + directory.GetPath(), "fish", "--no-config", "-c",
                                           "source '" + script + "'; complete -C '" + line + "'"});
  EXPECT_EQ("", result.standardError);
  std::vector<std::string> words = SplitLines(result.standardOutput);
  for (std::string& word : words) {
    word = word.substr(0, word.find('\t'));
  }
  return words;
}

bool Contains(const std::vector<std::string>& words, const std::string& word) {
  return std::find(words.begin(), words.end(), word) != words.end();
}

TEST(CliGenerate, ManPageIsFreeOfGroffWarnings) {
  const TemporaryDirectory directory;
  const std::string page = WriteTo(directory, "quorlin.1", Generate("man"));
  const ProcessResult result = RunProcess({"groff", "-man", "-ww", "-Tutf8", "-z", page});
  EXPECT_EQ(0, result.exitCode);
  EXPECT_EQ("", result.standardError);
}

TEST(CliGenerate, ManPageTellsWhatTheHelpTells) {
  const TemporaryDirectory directory;
  const std::string page = WriteTo(directory, "quorlin.1", Generate("man"));
  // Plain characters and one long line per paragraph, so that texts can be looked for.
  const ProcessResult shown =
      RunProcess({"groff", "-man", "-Tascii", "-P-cbou", "-rLL=2000n", "-rHY=0", page});
  ASSERT_EQ(0, shown.exitCode) << shown.standardError;
  for (const std::string& line : SplitLines(RunCli({"verify", "--help"}).standardOutput)) {
    if (line.compare(0, 4, "  --") != 0) {
      continue;
    }
    const std::string flag = line.substr(2, line.find_first_of(" ,", 2) - 2);
    EXPECT_NE(std::string::npos, shown.standardOutput.find(flag)) << flag;
  }
  EXPECT_NE(std::string::npos, shown.standardOutput.find("quorlin acquire password"));
  EXPECT_EQ(std::string::npos, shown.standardOutput.find("generate")) << "it is not for users";
}

TEST(CliGenerate, BashOffersCommandsFlagsAndFiles) {
  EXPECT_TRUE(Contains(CompleteInBash({"quorlin", ""}), "acquire"));
  EXPECT_FALSE(Contains(CompleteInBash({"quorlin", ""}), "generate"));
  EXPECT_TRUE(Contains(CompleteInBash({"quorlin", "acquire", "pass"}), "password"));
  EXPECT_EQ(std::vector<std::string>({"--user", "--url"}),
            CompleteInBash({"quorlin", "acquire", "password", "--u"}));
  EXPECT_EQ(std::vector<std::string>({"--trust"}), CompleteInBash({"quorlin", "verify", "--tr"}));

  const TemporaryDirectory directory;
  const std::string file = WriteTo(directory, "only.pem", "");
  EXPECT_EQ(std::vector<std::string>({file}),
            CompleteInBash({"quorlin", "verify", "--trust", directory.GetPath() + "/"}));
  EXPECT_EQ(std::vector<std::string>({file}),
            CompleteInBash({"quorlin", "verify", directory.GetPath() + "/on"}));
}

TEST(CliGenerate, FishOffersCommandsFlagsAndFiles) {
  EXPECT_TRUE(Contains(CompleteInFish("quorlin "), "acquire"));
  EXPECT_FALSE(Contains(CompleteInFish("quorlin "), "generate"));
  EXPECT_EQ(std::vector<std::string>({"password"}), CompleteInFish("quorlin acquire passw"));
  EXPECT_TRUE(Contains(CompleteInFish("quorlin acquire password --u"), "--user"));
  EXPECT_FALSE(Contains(CompleteInFish("quorlin verify --u"), "--user"));
}

TEST(CliGenerate, ZshReadsTheCompletion) {
  const TemporaryDirectory directory;
  const std::string script = WriteTo(directory, "_quorlin", Generate("zsh"));
  const ProcessResult result = RunProcess({"zsh", "-f", "-n", script});
  EXPECT_EQ(0, result.exitCode);
  EXPECT_EQ("", result.standardError);
  // With the functions that zsh's completion provides replaced by ones that print.
  const ProcessResult offered = RunProcess(
      {"zsh", "-f", "-c",
       "_describe() { print -l -- \"${(@P)2}\" }; _files() { print files }; _message() { print value }\n"
       "words=(quorlin acquire password --u); CURRENT=4; source " +
           script + "\nwords=(quorlin verify --trust x); CURRENT=4; _quorlin"});
  EXPECT_EQ("", offered.standardError);
  EXPECT_TRUE(Contains(SplitLines(offered.standardOutput), "--user:The user, as name@domain"))
      << offered.standardOutput;
  EXPECT_EQ("files", SplitLines(offered.standardOutput).back());
}

TEST(CliGenerate, RefusesWhatItDoesNotKnow) {
  const ProcessResult result = RunCli({"generate", "tcsh"});
  EXPECT_EQ(2, result.exitCode);
  EXPECT_EQ("", result.standardOutput);
}

}  // namespace
