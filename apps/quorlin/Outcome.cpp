// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/Outcome.h"

#include "quorlin/Files.h"
#include "quorlin/Terminal.h"
#include "quorlin/TokenOutput.h"

#include <iostream>
#include <optional>

namespace Cli {

namespace {

int ShowFailure(const Failure& failure, bool json) {
  if (json) {
    std::cout << ToText(DescribeFailure(failure)) << std::endl;
  } else {
    PrintFailure(failure);
  }
  return failure.exitCode;
}

void ShowOrThrow(const OutputOptions& options, const std::string& heading, const TokenSource& source) {
  std::optional<OutputFile> file;
  if (!options.file.empty()) {
    file.emplace(options.file, Readers::OWNER);
  }
  const boost::shared_ptr<const Quorlin::SamlToken> token = source();
  if (token == nullptr) {
    throw Quorlin::SsoException("the service returned no token");
  }
  if (file) {
    file->Commit(token->ToXml());
  }
  Print(options.json ? ToText(DescribeToken(*token)) + "\n"
                     : heading + "\n" + SummarizeToken(*token, Pelmar::System::GetUtcDateTime()));
}

}  // namespace

void Print(const std::string& text) {
  std::cout << text << std::flush;
  if (!std::cout) {
    throw UsageException("cannot write to standard output");
  }
}

void PrintFailure(const Failure& failure) {
  std::cerr << "quorlin: " << MakePrintable(failure.message) << " (" << failure.type << ")\n";
  if (!failure.advice.empty()) {
    std::cerr << failure.advice << "\n";
  }
}

int ShowToken(const OutputOptions& options, const std::string& heading, ExitCode otherwise,
              const TokenSource& source) {
  try {
    ShowOrThrow(options, heading, source);
    return EXIT_DONE;
  } catch (...) {
    Failure failure = DescribeCurrentException(otherwise);
    if (failure.type == "InvalidCredentialsException" && !options.credentialsAdvice.empty()) {
      failure.advice = options.credentialsAdvice;
    }
    return ShowFailure(failure, options.json);
  }
}

int ShowFailure(bool json, ExitCode otherwise) {
  return ShowFailure(DescribeCurrentException(otherwise), json);
}

int RunReporting(const std::function<void()>& command) {
  try {
    command();
    return EXIT_DONE;
  } catch (...) {
    const Failure failure = DescribeCurrentException(EXIT_FAILED);
    PrintFailure(failure);
    return failure.exitCode;
  }
}

}  // namespace Cli
