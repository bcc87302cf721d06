// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin doctor: finds the broken link between this machine and a token service.

#include "quorlin/Commands.h"
#include "quorlin/Files.h"
#include "quorlin/Kerberos.h"
#include "quorlin/Options.h"
#include "quorlin/Outcome.h"
#include "quorlin/doctor/Report.h"
#include "quorlin/doctor/Steps.h"

#include <chrono>
#include <csignal>
#include <memory>

namespace Cli {

namespace {

using Doctor::Findings;
using Doctor::Patient;

struct DoctorArguments {
  ServiceOptions service;
  std::vector<std::string> pins;
  HolderOfKeyOptions holderOfKey;
  std::string kerberosService;
  bool isKerberosWanted = false;
  int timeoutSec = Doctor::kDefaultTimeoutSec;
  bool json = false;
};

struct Step {
  const char* name;
  Doctor::Outcome (*check)(const Patient&, Findings&);
};

constexpr Step kSteps[] = {
    {"name", Doctor::CheckName},
    {"tcp", Doctor::CheckTcp},
    {"tls", Doctor::CheckTls},
    {"http", Doctor::CheckHttp},
    {"soap", Doctor::CheckSoap},
    {"clock", Doctor::CheckClock},
    {"certificate", Doctor::CheckCertificate},
    {"kerberos", Doctor::CheckKerberos},
};

// --- Arguments ---

std::string Join(const std::vector<std::string>& pins) {
  std::string all;
  for (const std::string& pin : pins) {
    all += (all.empty() ? "" : ";") + pin;
  }
  return all;
}

/// As the library itself would.
Pelmar::Ref<Pelmar::Http::ConnectionSpec> MakeConnection(const Patient& patient,
                                                         const Pelmar::Ref<Pelmar::Ssl::SSLContext>& tls) {
  const Pelmar::Ref<Pelmar::Http::ConnectionSpec> tcp =
      Pelmar::Http::CreateTCPConnectionSpec(patient.parts.host, patient.parts.port);
  return patient.parts.isHttps
             ? Pelmar::Http::CreateSSLConnectionSpec(tcp, tls, patient.parts.host, Join(patient.pins))
             : tcp;
}

std::string GetKerberosService(const DoctorArguments& arguments, const std::string& host) {
  const std::string& given = arguments.kerberosService;
  const std::size_t at = given.find('@');
  if (!given.empty() && (at == std::string::npos || at == 0 || at + 1 == given.size())) {
    throw UsageException("--gss must be SERVICE@HOST");
  }
  return given.empty() ? "HTTP@" + host : given;
}

/// Throws for everything that is wrong with the arguments.
Patient MakePatient(const DoctorArguments& arguments) {
  Patient patient;
  patient.url = arguments.service.url;
  patient.parts = Pelmar::Http::ParseHttpURL(patient.url);
  patient.timeout = std::chrono::seconds(arguments.timeoutSec);
  patient.authorities = ReadCertificates(arguments.service.caFiles);
  patient.pins = arguments.pins;
  if (!patient.parts.isHttps && !patient.pins.empty()) {
    throw UsageException("--pin needs an https: URL");
  }
  const Quorlin::SecurityTokenServiceConfig config =
      MakeServiceConfig(arguments.service, arguments.holderOfKey);
  patient.connection = MakeConnection(patient, config.sslContext);
  patient.holderOfKey = config.holderOfKeyConfig;
  if (arguments.isKerberosWanted) {
    RequireKerberos();
    patient.kerberosService = GetKerberosService(arguments, patient.parts.host);
  }
  return patient;
}

// --- Course ---

Doctor::Result Take(const Step& step, const Patient& patient, Findings& findings) {
  const auto start = std::chrono::steady_clock::now();
  Doctor::Result result;
  result.name = step.name;
  result.outcome = step.check(patient, findings);
  result.seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
  return result;
}

Doctor::Result LeaveOut(const Step& step) {
  Doctor::Result result = {step.name, Doctor::Outcome(), 0};
  result.outcome.status = Doctor::Status::NOT_REACHED;
  return result;
}

/// Goes through the steps up to the first that fails. For people each is shown as soon as it is over.
std::vector<Doctor::Result> Examine(const Patient& patient, bool isShown) {
  Findings findings;
  std::vector<Doctor::Result> results;
  for (const Step& step : kSteps) {
    const bool isReached = Doctor::GetExitCode(results) == EXIT_DONE;
    results.push_back(isReached ? Take(step, patient, findings) : LeaveOut(step));
    if (isShown) {
      Print(Doctor::PrintResult(results.back()));
    }
  }
  return results;
}

int Run(const DoctorArguments& arguments) {
  // A server that closes the connection in the middle of TLS is something to report, not to die of.
  std::signal(SIGPIPE, SIG_IGN);
  try {
    const Patient patient = MakePatient(arguments);
    if (!arguments.json) {
      Print(patient.url + "\n");
    }
    const std::vector<Doctor::Result> results = Examine(patient, !arguments.json);
    Print(arguments.json ? ToAsciiText(Doctor::DescribeResults(patient.url, results)) + "\n"
                         : "\n" + Doctor::PrintConclusion(results));
    return Doctor::GetExitCode(results);
  } catch (...) {
    return ShowFailure(arguments.json, EXIT_FAILED);
  }
}

void AddOptions(CLI::App& command, DoctorArguments& arguments) {
  command.add_option("--url", arguments.service.url, "The token service, http: or https:")
      ->required()
      ->type_name("URL");
  AddRepeatable(
      command, "--ca", arguments.service.caFiles,
      "Trust the TLS servers of these authorities; without it, those the system trusts. May be repeated")
      ->type_name("PEM");
  AddPinOption(command, arguments.pins);
  AddHolderOfKeyOptions(command, arguments.holderOfKey, false);
  command
      .add_option(
          "--gss", arguments.kerberosService,
          "Also get a Kerberos ticket for this service; without a value, for HTTP@ and the URL's host")
      ->type_name("SERVICE@HOST")
      ->expected(0, 1);
  command.add_option("--timeout", arguments.timeoutSec, "How long each step over the network may take")
      ->type_name("SEC")
      ->check(CLI::Range(1, Doctor::kMaxTimeoutSec))
      ->capture_default_str();
  command.add_flag("--json", arguments.json, "Print one JSON object instead of lines");
  AddLogOption(command);
}

}  // namespace

Command AddDoctorCommand(CLI::App& app) {
  const auto arguments = std::make_shared<DoctorArguments>();
  CLI::App* const command =
      app.add_subcommand("doctor", "Find out why a token service cannot be reached or does not answer");
  AddOptions(*command, *arguments);
  command->footer(
      "Looks at name, TCP, TLS, HTTP, SOAP, clock, your certificate and your Kerberos ticket, stops at the first that\n"
      "fails, and says what to do. Nothing is sent but a request without credentials.\n\n"
      "Exit code 0: all passed; 3: the service cannot be reached (name, TCP, TLS, HTTP); 1: what it answers, a clock, the\n"
      "certificate or the ticket is not in order; 2: wrong usage.\n\n"
      "Examples:\n"
      "  quorlin doctor --url https://sts.example.com/sts\n"
      "  quorlin doctor --url https://localhost:8443/sts --ca ca.pem --cert me.pem --key me.key --timeout 5\n"
      "  quorlin doctor --url https://sts.example.com/sts --gss --json");
  return {command, [arguments, command] {
            arguments->isKerberosWanted = command->count("--gss") > 0;
            return Run(*arguments);
          }};
}

}  // namespace Cli
