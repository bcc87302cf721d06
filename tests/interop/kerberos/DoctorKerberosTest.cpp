// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin doctor --gss, with tickets of MIT's key distribution center.

#include "apps/Cli.h"
#include "interop/kerberos/KerberosRealm.h"

#include <nlohmann/json.hpp>

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using namespace KerberosTests;
using namespace StsTests;
using TestSupport::ProcessResult;
using Json = nlohmann::json;

std::vector<std::string> MakeDoctor(const std::vector<std::string>& more) {
  const ServiceWithFiles& service = ServiceWithFiles::Shared();
  std::vector<std::string> arguments = {"doctor", "--url", service.Get().GetUrl(), "--ca",
                                        service.GetFiles().GetPath("ca.pem")};
  arguments.insert(arguments.end(), more.begin(), more.end());
  return arguments;
}

/// The step "kerberos" with "--gss" and its value.
Json ExamineKerberos(const std::vector<std::string>& gss, int exitCode) {
  std::vector<std::string> arguments = MakeDoctor(gss);
  arguments.emplace_back("--json");
  const ProcessResult result = RunCli(arguments);
  EXPECT_EQ(result.exitCode, exitCode);
  EXPECT_EQ(result.standardError, "");
  return Json::parse(result.standardOutput).at("steps").at(7);
}

TEST(DoctorKerberos, FindsATicketForTheServiceOfTheUrl) {
  KerberosRealm::Shared();
  const Json step = ExamineKerberos({"--gss"}, 0);
  EXPECT_EQ(step.at("status"), "passed");
  EXPECT_EQ(step.at("found"), "there is a ticket for HTTP@127.0.0.1");
}

TEST(DoctorKerberos, FindsATicketForTheNamedService) {
  KerberosRealm::Shared();
  const Json step = ExamineKerberos({"--gss", "HTTP@localhost"}, 0);
  EXPECT_EQ(step.at("status"), "passed");
  EXPECT_EQ(step.at("found"), "there is a ticket for HTTP@localhost");
}

TEST(DoctorKerberos, SaysThatThereIsNoTicket) {
  const EnvironmentVariable cache("KRB5CCNAME", KerberosRealm::Shared().MakeCacheName("none"));
  const Json step = ExamineKerberos({"--gss"}, 1);
  EXPECT_EQ(step.at("status"), "failed");
  EXPECT_EQ(step.at("advice"), "Look at your Kerberos tickets with klist, and get a new one with kinit.");
}

TEST(DoctorKerberos, SaysThatKerberosDoesNotKnowTheService) {
  KerberosRealm::Shared();
  const Json step = ExamineKerberos({"--gss", "nonsense@localhost"}, 1);
  EXPECT_EQ(step.at("status"), "failed");
  EXPECT_EQ(
      step.at("advice"),
      "See whether Kerberos knows nonsense@localhost and its key distribution center can be reached: kvno asks for "
      "the same ticket. Another service is named with --gss SERVICE@HOST.");
}

TEST(DoctorKerberos, IsRefusedByAProgramWithoutKerberos) {
  std::vector<std::string> command = {QUORLIN_CLI_WITHOUT_KERBEROS_PATH};
  const std::vector<std::string> arguments = MakeDoctor({"--gss"});
  command.insert(command.end(), arguments.begin(), arguments.end());
  const ProcessResult result = TestSupport::RunProcess(command);
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.standardError, "quorlin: this quorlin was built without Kerberos (UsageException)\n");
}

}  // namespace
