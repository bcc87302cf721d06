// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin demo: the whole story on one screen.

#include "quorlin/Commands.h"
#include "quorlin/Options.h"
#include "quorlin/Outcome.h"
#include "quorlin/Signals.h"
#include "quorlin/StsFiles.h"
#include "quorlin/TemporaryDirectory.h"
#include "quorlin/Terminal.h"
#include "quorlin/TokenOutput.h"

#include "devsts/Service.h"

#include <quorlin/SecurityTokenService.h>

#include <chrono>
#include <iostream>
#include <memory>
#include <string>

namespace Cli {

namespace {

constexpr const char* kUser = "alice@example.com";
constexpr const char* kPassword = "secret";
constexpr const char* kWrongPassword = "guess";
constexpr long long kLifetimeSec = 600;

/// Numbers the steps, and times each.
class Story final {
 public:
  /// Says what comes, then does it, then says what came of it: the text that `step` returns.
  template <typename Step>
  void Tell(const std::string& what, const Step& step) {
    std::cout << ++_count << ". " << what << " ... " << std::flush;
    const auto start = std::chrono::steady_clock::now();
    const std::string outcome = step();
    const std::chrono::duration<double> elapsed = std::chrono::steady_clock::now() - start;
    std::cout << outcome << " (" << DescribeElapsed(elapsed.count()) << ")\n" << std::flush;
  }

 private:
  int _count = 0;
};

boost::shared_ptr<Quorlin::SecurityTokenService> Connect(const DevSts::Service& service,
                                                         const StsFiles& files) {
  ServiceOptions options;
  options.url = service.GetUrl();
  options.caFiles = {files.ca};
  options.stsCertificateFiles = {files.stsCertificate};
  return Quorlin::CreateSecurityTokenService(MakeServiceConfig(options));
}

Quorlin::TokenSpec MakeSpec() {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = kLifetimeSec;
  spec.renewable = true;
  return spec;
}

/// The refusal that belongs to the story. Anything else ends it.
std::string AcquireWithWrongPassword(const Quorlin::SecurityTokenService& service) {
  try {
    service.AcquireToken(kUser, kWrongPassword, MakeSpec());
  } catch (const Quorlin::InvalidCredentialsException& e) {
    return std::string("refused, as it should be: ") + MakePrintable(e.what());
  }
  throw std::runtime_error("the service accepted a wrong password");
}

void TellStory(const TemporaryDirectory& directory) {
  Story story;
  std::unique_ptr<DevSts::Service> service;
  story.Tell("Starting a token service with new keys and certificates", [&] {
    service = std::make_unique<DevSts::Service>(DevSts::ServiceConfig());
    return service->GetUrl();
  });
  const StsFiles files = WriteCertificates(*service, directory.GetPath());
  const boost::shared_ptr<Quorlin::SecurityTokenService> client = Connect(*service, files);
  boost::shared_ptr<const Quorlin::SamlToken> token;
  story.Tell(std::string("Asking it over HTTPS for a token for ") + kUser + ", by password", [&] {
    token = client->AcquireToken(kUser, kPassword, MakeSpec());
    return "got one, its signature and dates are good";
  });
  std::cout << "\n" << SummarizeToken(*token, Pelmar::System::GetUtcDateTime()) << "\n";
  story.Tell("Asking again with a wrong password", [&] { return AcquireWithWrongPassword(*client); });
  story.Tell("Stopping the service and removing its files", [&] {
    service->Stop();
    directory.Remove();
    return "done";
  });
}

void RunDemo() {
  const StopSignals signals;
  const TemporaryDirectory directory;
  const StopWatch watch(signals, [&] { directory.Remove(); });
  TellStory(directory);
  std::cout
      << "\nTo try it by hand, run a service in one terminal and ask it in another:\n"
         "  quorlin sts --port 8443 --write-certs certs\n"
         "  quorlin acquire password --url https://127.0.0.1:8443/sts --ca certs/ca.pem --sts-cert certs/sts.pem \\\n"
         "      --user alice@example.com          (the password is: secret)\n"
      << std::flush;
}

}  // namespace

Command AddDemoCommand(CLI::App& app) {
  CLI::App* const command =
      app.add_subcommand("demo", "See a token being asked for and checked, with nothing to set up");
  command->footer(
      "Starts the development token service on a free port of this machine, asks it for tokens over HTTPS, shows what\n"
      "comes back, and cleans up.");
  return {command, [] {
            return RunReporting(RunDemo);
          }};
}

}  // namespace Cli
