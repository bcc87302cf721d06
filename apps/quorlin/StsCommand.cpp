// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin sts: runs the development token service.

#include "quorlin/Commands.h"
#include "quorlin/Files.h"
#include "quorlin/Kerberos.h"
#include "quorlin/Outcome.h"
#include "quorlin/Password.h"
#include "quorlin/Signals.h"
#include "quorlin/StsFiles.h"
#include "quorlin/TemporaryDirectory.h"
#include "quorlin/TokenOutput.h"

#include "devsts/Service.h"
#include "devsts/ToyNegotiation.h"

#include <chrono>
#include <filesystem>
#include <iostream>
#include <memory>
#include <mutex>
#include <optional>
#include <system_error>

namespace Cli {

namespace {

/// Longer than any client waits.
constexpr long long kMaxDelayMs = 10LL * 60 * 1000;

struct StsArguments {
  DevSts::ServiceConfig config;
  bool plainHttp = false;
  std::string directoryFile;
  std::string certificateDirectory;
  std::string signingKeyFile;
  std::string signingCertificateFile;
  unsigned toyLegs = 0;
  std::string keytabFile;
  std::string kerberosService;
  long long delayMs = 0;
};

void AddKerberosOptions(CLI::App& command, StsArguments& arguments) {
  CLI::Option* const keytab =
      command
          .add_option(
              "--keytab", arguments.keytabFile,
              "Let clients negotiate (SPNEGO) by Kerberos tickets for the services whose keys are in here")
          ->type_name("FILE")
          ->excludes("--toy-negotiation");
  command
      .add_option("--gss-service", arguments.kerberosService,
                  "Take tickets for this service of --keytab alone")
      ->type_name("SERVICE@HOST")
      ->needs(keytab);
}

/// One write per line, so that lines of several requests do not mix.
DevSts::LogSink MakeStandardErrorLog() {
  const auto mutex = std::make_shared<std::mutex>();
  return [mutex](const std::string& line) {
    const std::lock_guard<std::mutex> lock(*mutex);
    std::cerr << line + "\n" << std::flush;
  };
}

DevSts::Directory ReadDirectory(const std::string& file) {
  try {
    return DevSts::Directory::FromJson(ReadFile(file));
  } catch (const DevSts::DirectoryException& e) {
    throw UsageException("cannot use " + file + ": " + e.what());
  }
}

DevSts::Identity ReadSigner(const StsArguments& arguments) {
  try {
    const Secret key = ReadKeyFile(arguments.signingKeyFile);
    return DevSts::ReadIdentity(key.Reveal(), ReadFile(arguments.signingCertificateFile));
  } catch (const std::invalid_argument& e) {
    throw UsageException(e.what());
  } catch (const Pelmar::Exception& e) {
    throw UsageException("cannot use " + arguments.signingCertificateFile + ": " + e.what());
  }
}

DevSts::ServiceConfig MakeConfig(const StsArguments& arguments) {
  DevSts::ServiceConfig config = arguments.config;
  config.tls = !arguments.plainHttp;
  config.delay = std::chrono::milliseconds(arguments.delayMs);
  config.log = MakeStandardErrorLog();
  if (!arguments.directoryFile.empty()) {
    config.directory = ReadDirectory(arguments.directoryFile);
  }
  if (!arguments.signingKeyFile.empty()) {
    config.signer = ReadSigner(arguments);
  }
  if (arguments.toyLegs != 0) {
    DevSts::ToyOptions options;
    options.legs = arguments.toyLegs;
    config.handler.negotiation = std::make_shared<DevSts::ToyMechanism>(
        options, config.directory, DevSts::MakeSystemClock(config.clockOffsetSec));
  }
  if (!arguments.keytabFile.empty()) {
    config.handler.negotiation = MakeKerberosMechanism(arguments.keytabFile, arguments.kerberosService);
  }
  return config;
}

void MakeDirectories(const std::string& path) {
  std::error_code error;
  std::filesystem::create_directories(path, error);
  if (error) {
    throw UsageException("cannot make the directory " + path + ": " + error.message());
  }
}

std::unique_ptr<DevSts::Service> Start(const StsArguments& arguments) {
  const DevSts::ServiceConfig config = MakeConfig(arguments);
  try {
    return std::make_unique<DevSts::Service>(config);
  } catch (const std::exception& e) {
    throw UsageException(e.what());
  }
}

void RunSts(const StsArguments& arguments) {
  const StopSignals signals;
  const std::unique_ptr<DevSts::Service> service = Start(arguments);
  std::optional<TemporaryDirectory> temporary;
  std::string directory = arguments.certificateDirectory;
  if (directory.empty()) {
    directory = temporary.emplace().GetPath();
  } else {
    MakeDirectories(directory);
  }
  const StsFiles files = WriteCertificates(*service, directory);
  Json ready;
  ready["url"] = service->GetUrl();
  ready["ca"] = files.ca.empty() ? Json() : Json(files.ca);
  ready["stsCert"] = files.stsCertificate;
  std::cout << ToText(ready) << std::endl;
  signals.Wait();
  service->Stop();
}

/// Switches that make the service a difficult one.
void AddTroubleOptions(CLI::App& command, StsArguments& arguments) {
  DevSts::HandlerOptions& handler = arguments.config.handler;
  command.add_option("--delay-ms", arguments.delayMs, "Hold every answer back for so long")
      ->type_name("N")
      ->check(CLI::Range(0LL, kMaxDelayMs));
  command
      .add_option("--fail", handler.trouble.failRate,
                  "Answer this share of the requests, from 0 to 1, by a SOAP fault soapenv:Server")
      ->type_name("RATE")
      ->check(CLI::Range(0.0, 1.0));
  command
      .add_option("--drop", handler.trouble.dropRate,
                  "Close the connection on this share of the requests, from 0 to 1, without an answer")
      ->type_name("RATE")
      ->check(CLI::Range(0.0, 1.0));
  command.add_option("--seed", handler.trouble.seed, "Let --fail and --drop hit the same requests each time")
      ->type_name("N");
  command.add_flag("--cookie", handler.cookie,
                   "Give a cookie to whoever begins a negotiation, and want it back with each further leg");
}

}  // namespace

Command AddStsCommand(CLI::App& app) {
  const auto arguments = std::make_shared<StsArguments>();
  DevSts::ServiceConfig& config = arguments->config;
  CLI::App* const command = app.add_subcommand("sts", "Run a token service for development and tests");
  command->add_option("--port", config.port, "Listen on this port; 0 is any free one")
      ->type_name("N")
      ->capture_default_str();
  command
      ->add_option("--address", config.address,
                   "Listen on this IP address; others than loopback open it to the network")
      ->type_name("A")
      ->capture_default_str();
  command->add_flag("--http", arguments->plainHttp, "Serve plain HTTP instead of HTTPS");
  command
      ->add_option("--directory", arguments->directoryFile,
                   "Take the users from this JSON file instead of the sample")
      ->type_name("FILE");
  command
      ->add_option(
          "--write-certs", arguments->certificateDirectory,
          "Write ca.pem, server.pem and sts.pem here; without it, to a directory that goes away at the end")
      ->type_name("DIR");
  CLI::Option* const key = command
                               ->add_option("--signing-key", arguments->signingKeyFile,
                                            "Sign tokens with this key instead of a new one")
                               ->type_name("PEM");
  CLI::Option* const certificate =
      command
          ->add_option("--signing-cert", arguments->signingCertificateFile,
                       "The certificate of --signing-key, followed by those of its issuers")
          ->type_name("PEM");
  key->needs(certificate);
  certificate->needs(key);
  command
      ->add_option("--max-lifetime", config.handler.lifetime.maxSec,
                   "Cut longer token lifetimes down to this")
      ->type_name("SEC")
      ->check(CLI::Range(1LL, 100LL * 365 * 24 * 60 * 60).description(""))
      ->capture_default_str();
  command
      ->add_option("--clock-offset", config.clockOffsetSec,
                   "Let the service's clock be ahead (negative: behind)")
      ->type_name("SEC")
      ->check(CLI::Range(-100LL * 365 * 24 * 60 * 60, 100LL * 365 * 24 * 60 * 60).description(""));
  command
      ->add_option(
          "--toy-negotiation", arguments->toyLegs,
          "Let clients negotiate (SPNEGO) by a toy mechanism of so many legs; safe for nothing but tests")
      ->type_name("LEGS")
      ->check(CLI::Range(1U, DevSts::kMaxToyLegs));
  AddKerberosOptions(*command, *arguments);
  AddTroubleOptions(*command, *arguments);
  command->footer(
      "Prints one JSON line when it is ready: {\"url\":...,\"ca\":...,\"stsCert\":...}. Writes one JSON line for each\n"
      "request to standard error. Ends on Ctrl-C.\n\n"
      "The sample users are alice@example.com (password: secret), bob@example.com (builder) and the service account\n"
      "backup-service@example.com (tape). A directory file looks like this:\n"
      "  {\"users\": [{\"name\": \"alice\", \"domain\": \"example.com\", \"password\": \"secret\",\n"
      "              \"givenName\": \"Alice\", \"surname\": \"Example\", \"solution\": false,\n"
      "              \"groups\": [{\"name\": \"Staff\", \"domain\": \"example.com\", \"form\": \"slash\"}],\n"
      "              \"certificates\": [\"<SHA-256 of a DER certificate, in hex>\"]}]}\n\n"
      "Example:\n"
      "  quorlin sts --port 8443 --write-certs certs\n"
      "  quorlin acquire password --url https://127.0.0.1:8443/sts --ca certs/ca.pem --sts-cert certs/sts.pem \\\n"
      "      --user alice@example.com");
  return {command, [arguments] {
            return RunReporting([&] { RunSts(*arguments); });
          }};
}

}  // namespace Cli
