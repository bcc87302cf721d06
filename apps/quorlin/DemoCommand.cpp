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
#include "quorlin/ToyNegotiationHandler.h"

#include "devsts/Identity.h"
#include "devsts/Service.h"
#include "devsts/ToyNegotiation.h"

#include <pelmar/crypto/Certificate.h>
#include <pelmar/crypto/Digest.h>
#include <quorlin/SecurityTokenService.h>

#include <chrono>
#include <future>
#include <iostream>
#include <memory>
#include <set>
#include <stdexcept>
#include <string>
#include <vector>

namespace Cli {

namespace {

constexpr const char* kUser = "alice@example.com";
constexpr const char* kPassword = "secret";
constexpr const char* kWrongPassword = "guess";
constexpr const char* kDelegate = "bob@example.com";
constexpr const char* kAudience = "https://files.example.com";
constexpr long long kLifetimeSec = 600;
constexpr long long kRenewedSec = 300;
constexpr unsigned kToyLegs = 3;
constexpr int kAtOnce = 20;

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

using ServicePointer = boost::shared_ptr<Quorlin::SecurityTokenService>;
using TokenPointer = boost::shared_ptr<const Quorlin::SamlToken>;

DevSts::ToyOptions MakeToyOptions() {
  DevSts::ToyOptions options;
  options.legs = kToyLegs;
  return options;
}

/// Alice's own key, with a certificate that the service is told to know her by.
class Key final {
 public:
  Key()
      : _identity(DevSts::CertificateAuthority().IssueClient("Alice Example")),
        _certificate(Pelmar::Crypto::CreateCertificateFromPem(_identity.certificate)) {}

  std::string GetFingerprint() const { return Pelmar::Crypto::ToHex(_certificate->GetSha256()); }
  Quorlin::HolderOfKeyConfig GetConfig() const {
    Quorlin::HolderOfKeyConfig config;
    config.privateKey = _identity.GetSigningKey();
    config.certificate = _certificate;
    return config;
  }

 private:
  DevSts::Identity _identity;
  Pelmar::Ref<const Pelmar::Crypto::Certificate> _certificate;
};

DevSts::ServiceConfig MakeServiceConfig(const Key& key) {
  std::vector<DevSts::User> users = DevSts::Directory::MakeSampleUsers();
  for (DevSts::User& user : users) {
    if (user.GetUpn() == kUser) {
      user.certificates.push_back(key.GetFingerprint());
    }
  }
  DevSts::ServiceConfig config;
  config.directory = DevSts::Directory(users);
  config.handler.negotiation =
      std::make_shared<DevSts::ToyMechanism>(MakeToyOptions(), config.directory, DevSts::MakeSystemClock(0));
  return config;
}

Quorlin::SecurityTokenServiceConfig MakeClientConfig(const DevSts::Service& service, const StsFiles& files) {
  ServiceOptions options;
  options.url = service.GetUrl();
  options.caFiles = {files.ca};
  options.stsCertificateFiles = {files.stsCertificate};
  return Cli::MakeServiceConfig(options);
}

Quorlin::TokenSpec MakeSpec() {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = kLifetimeSec;
  spec.renewable = true;
  spec.delegable = true;
  return spec;
}

std::string DescribeConfirmation(const Quorlin::SamlToken& token) {
  return token.GetConfirmationMethod() == Quorlin::SamlToken::CONFIRM_BEARER
             ? "got a token that whoever holds it may use"
             : "got a token that only her key makes good";
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

/// Throws what the first call that failed failed with.
std::string AcquireAllAtOnce(const Quorlin::SecurityTokenService& service) {
  std::vector<std::future<TokenPointer>> outcomes;
  for (int i = 0; i < kAtOnce; ++i) {
    const auto promise = std::make_shared<std::promise<TokenPointer>>();
    outcomes.push_back(promise->get_future());
    service.AcquireTokenAsync(
        kUser, kPassword, MakeSpec(), [promise](const TokenPointer& token, const Pelmar::Exception* error) {
          if (error != nullptr) {
            promise->set_exception(std::make_exception_ptr(std::runtime_error(error->what())));
          } else {
            promise->set_value(token);
          }
        });
  }
  std::set<std::string> ids;
  for (std::future<TokenPointer>& outcome : outcomes) {
    ids.insert(outcome.get()->GetId());
  }
  return "got " + std::to_string(ids.size()) + " different tokens";
}

std::string DescribeVerdict(bool isValid) {
  return isValid ? "yes" : "no";
}

/// Alice, with and without her key, and the tokens she gets.
class Alice final {
 public:
  Alice(const Quorlin::SecurityTokenServiceConfig& config, const Key& key) : _plain(Connect(config)) {
    Quorlin::SecurityTokenServiceConfig keyed = config;
    keyed.holderOfKeyConfig = key.GetConfig();
    _keyed = Connect(keyed);
  }

  void Acquire(Story& story) {
    story.Tell(std::string("Asking it over HTTPS for a token for ") + kUser + ", by password",
               [&] { return DescribeConfirmation(*_plain->AcquireToken(kUser, kPassword, MakeSpec())); });
    story.Tell("The same with a wrong password", [&] { return AcquireWithWrongPassword(*_plain); });
    story.Tell("The same with her password, signed with her key",
               [&] { return DescribeConfirmation(*_keyed->AcquireToken(kUser, kPassword, MakeSpec())); });
    story.Tell("Without the password, by her certificate and key", [&] {
      _token = _keyed->AcquireTokenByCertificate(MakeSpec());
      return DescribeConfirmation(*_token);
    });
    story.Tell("Negotiating in " + std::to_string(kToyLegs) + " legs (SPNEGO, by a toy mechanism)", [&] {
      ToyNegotiationHandler handler(MakeToyOptions(), kUser, kPassword);
      return DescribeConfirmation(*_plain->AcquireTokenByGSS(MakeSpec(), handler));
    });
    story.Tell("Asking for " + std::to_string(kAtOnce) + " tokens at once, asynchronously",
               [&] { return AcquireAllAtOnce(*_plain); });
  }

  void Work(Story& story) {
    story.Tell(std::string("Exchanging her token for one with which ") + kDelegate + " may act for her", [&] {
      Quorlin::TokenSpec spec = MakeSpec();
      spec.delegateTo = std::string(kDelegate);
      std::vector<Quorlin::Delegate> chain;
      _keyed->AcquireTokenByToken(*_token, spec)->GetDelegationChain(chain);
      return "got one, delegated to " + MakePrintable(chain.at(0).principal.name);
    });
    story.Tell(std::string("Exchanging it for one that only ") + kAudience + " accepts", [&] {
      Quorlin::TokenSpec spec = MakeSpec();
      spec.audienceRestriction = {kAudience};
      _token = _keyed->AcquireTokenByToken(*_token, spec);
      return "got one";
    });
    story.Tell("Renewing that for " + std::to_string(kRenewedSec / 60) + " minutes", [&] {
      _token = _keyed->RenewToken(*_token, kRenewedSec);
      return "got one";
    });
    story.Tell("Asking whether its subject is still valid",
               [&] { return DescribeVerdict(_plain->ValidateSubject(*_token)); });
  }

  void IsForgotten(Story& story, DevSts::Service& service) {
    story.Tell("The service forgets her; asking again", [&] {
      service.SetDirectory(DevSts::Directory({}));
      return DescribeVerdict(_plain->ValidateSubject(*_token));
    });
  }

  const Quorlin::SamlToken& GetToken() const { return *_token; }

 private:
  static ServicePointer Connect(const Quorlin::SecurityTokenServiceConfig& config) {
    return Quorlin::CreateSecurityTokenService(config);
  }

  ServicePointer _plain;
  ServicePointer _keyed;
  TokenPointer _token;
};

void TellStory(const TemporaryDirectory& directory) {
  Story story;
  const Key key;
  std::unique_ptr<DevSts::Service> service;
  story.Tell("Starting a token service with new keys and certificates", [&] {
    service = std::make_unique<DevSts::Service>(MakeServiceConfig(key));
    return service->GetUrl();
  });
  const StsFiles files = WriteCertificates(*service, directory.GetPath());
  Alice alice(MakeClientConfig(*service, files), key);
  alice.Acquire(story);
  alice.Work(story);
  alice.IsForgotten(story, *service);
  story.Tell("Stopping the service and removing its files", [&] {
    service->Stop();
    directory.Remove();
    return std::string("done");
  });
  std::cout << "\nThe last token:\n" << SummarizeToken(alice.GetToken(), Pelmar::System::GetUtcDateTime());
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
