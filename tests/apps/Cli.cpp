// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "apps/Cli.h"

namespace StsTests {

std::vector<std::string> MakeCommand(const std::vector<std::string>& arguments) {
  std::vector<std::string> command = {QUORLIN_CLI_PATH};
  command.insert(command.end(), arguments.begin(), arguments.end());
  return command;
}

TestSupport::ProcessResult RunCli(const std::vector<std::string>& arguments,
                                  const std::string& standardInput) {
  return TestSupport::RunProcess(MakeCommand(arguments), standardInput);
}

ServiceWithFiles::ServiceWithFiles(const DevSts::ServiceConfig& config) : _service(config) {
  _files.WriteFile("ca.pem", _service.GetCaCertificate());
  _files.WriteFile("sts.pem", _service.GetSigningCertificate());
}

const ServiceWithFiles& ServiceWithFiles::Shared() {
  static const ServiceWithFiles service;
  return service;
}

std::vector<std::string> ServiceWithFiles::MakeAcquire(const std::vector<std::string>& more) const {
  std::vector<std::string> arguments = {"acquire",
                                        "password",
                                        "--url",
                                        _service.GetUrl(),
                                        "--ca",
                                        _files.GetPath("ca.pem"),
                                        "--sts-cert",
                                        _files.GetPath("sts.pem"),
                                        "--user",
                                        "alice@example.com",
                                        "--password-stdin"};
  arguments.insert(arguments.end(), more.begin(), more.end());
  return arguments;
}

}  // namespace StsTests
