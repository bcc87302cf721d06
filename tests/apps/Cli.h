// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The command-line tool as a person or a script meets it.

#ifndef QUORLIN_TESTS_APPS_CLI_H
#define QUORLIN_TESTS_APPS_CLI_H

#include "support/Process.h"
#include "support/TemporaryDirectory.h"

#include "devsts/Service.h"

#include <string>
#include <vector>

namespace StsTests {

/// The whole command: the tool's path and then the arguments.
std::vector<std::string> MakeCommand(const std::vector<std::string>& arguments);

TestSupport::ProcessResult RunCli(const std::vector<std::string>& arguments,
                                  const std::string& standardInput = "");

/// A running service, and the files that a user of it has.
class ServiceWithFiles final {
 public:
  explicit ServiceWithFiles(const DevSts::ServiceConfig& config = DevSts::ServiceConfig());

  /// The one that tests share which do not change it.
  static const ServiceWithFiles& Shared();

  /// "acquire password" with URL, certificates, user alice and password on standard input, and then these
  /// arguments.
  std::vector<std::string> MakeAcquire(const std::vector<std::string>& more = {}) const;

  const DevSts::Service& Get() const { return _service; }
  const TestSupport::TemporaryDirectory& GetFiles() const { return _files; }

 private:
  DevSts::Service _service;
  TestSupport::TemporaryDirectory _files;
};

}  // namespace StsTests

#endif  // QUORLIN_TESTS_APPS_CLI_H
