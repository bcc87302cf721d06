// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// usage: secrets_probe SCENARIO ARGUMENT... -- MASKED-SECRET...
//
// Uses the first secret as the scenario says, wipes the string that it was handed over in, as a careful host
// does, and prints what came of it; then what is left of any of the secrets in the memory of this process. A
// process of its own, because the test that knows the secrets is full of them.

#include "secrets/MemoryScan.h"

#include "quorlin/Password.h"

#include "support/CompletionProbe.h"
#include "support/ServiceAnswers.h"
#include "support/Verdict.h"

#include <pelmar/SecretText.h>
#include <pelmar/crypto/CryptoException.h>
#include <quorlin/quorlin.h>

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <functional>
#include <iostream>
#include <map>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

using Arguments = std::vector<std::string>;
using TokenPointer = boost::shared_ptr<const Quorlin::SamlToken>;

// A thread of the library may still be about to drop the last copy when the call returns. Each scan takes
// longer than that by far.
constexpr int kMaxScans = 20;

struct Task {
  Arguments arguments;
  std::vector<Secrets::MaskedSecret> secrets;
};

/// Hands the secret over and wipes it again.
class Revealed final {
 public:
  explicit Revealed(const Secrets::MaskedSecret& secret) { secret.Reveal(_text); }
  Revealed(const Revealed&) = delete;
  Revealed& operator=(const Revealed&) = delete;
  ~Revealed() { Pelmar::Wipe(_text); }
  const std::string& Get() const { return _text; }

 private:
  std::string _text;
};

/// A file in a single block of memory, wiped in the end.
class FileContent final {
 public:
  explicit FileContent(const std::string& path) {
    const int file = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    _text.resize(65536);
    const ssize_t count = file < 0 ? -1 : read(file, &_text[0], _text.size());
    close(file);
    if (count < 0) {
      throw std::runtime_error("cannot read " + path);
    }
    _text.resize(static_cast<std::size_t>(count));
  }
  FileContent(const FileContent&) = delete;
  FileContent& operator=(const FileContent&) = delete;
  ~FileContent() { Pelmar::Wipe(_text); }
  const std::string& Get() const { return _text; }

 private:
  std::string _text;
};

// --- What is to be found: the scan itself is on trial ---

std::string LeaveOnHeap(const Task& task) {
  constexpr int kCopies = 1000;
  const Revealed secret(task.secrets.front());
  std::string copies;
  for (int i = 0; i < kCopies; ++i) {
    copies += secret.Get();
  }
  return copies.empty() ? "" : "left";
}

std::string LeaveRestOfShortText(const Task& task) {
  static std::string moved;
  static std::string from;
  task.secrets.front().Reveal(from);
  moved = std::move(from);
  Pelmar::Wipe(moved);
  return "left";
}

std::string LeaveNothing(const Task& task) {
  const Revealed secret(task.secrets.front());
  return "done";
}

// --- The library ---

Quorlin::TokenSpec MakeSpec() {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 300;
  return spec;
}

/// Arguments: URL, CA file (empty: none), key file and certificate file (empty: none).
boost::shared_ptr<Quorlin::SecurityTokenService> MakeService(const Arguments& arguments) {
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = arguments.at(0);
  config.trustedStsCertificates = TestSupport::TrustedSigner();
  if (!arguments.at(1).empty()) {
    Pelmar::Ssl::SSLContextOptions options;
    options.caFile = arguments.at(1);
    config.sslContext = Pelmar::Ssl::CreateSSLContext(options);
  }
  if (!arguments.at(2).empty()) {
    Quorlin::HolderOfKeyConfig identity;
    identity.privateKey = Pelmar::Crypto::CreatePrivateKeyFromPem(FileContent(arguments[2]).Get());
    identity.certificate = Pelmar::Crypto::CreateCertificateFromPem(FileContent(arguments.at(3)).Get());
    config.holderOfKeyConfig = identity;
  }
  return Quorlin::CreateSecurityTokenService(config);
}

std::string Acquire(const Task& task) {
  const Revealed password(task.secrets.front());
  return TestSupport::VerdictOf(
      [&] { MakeService(task.arguments)->AcquireToken("alice", password.Get(), MakeSpec()); });
}

std::string AcquireAsync(const Task& task) {
  TestSupport::CompletionProbe<TokenPointer> probe;
  {
    const Revealed password(task.secrets.front());
    MakeService(task.arguments)->AcquireTokenAsync("alice", password.Get(), MakeSpec(), probe.GetFunction());
  }
  return probe.Wait().at(0).Message();
}

/// Gives one leg, and keeps it: it is the host's.
class OneLeg final : public Quorlin::NegotiationHandler {
 public:
  explicit OneLeg(const Secrets::MaskedSecret& secret) {
    const Revealed text(secret);
    _leg.reset(new Quorlin::Leg(text.Get().begin(), text.Get().end()));
  }
  ~OneLeg() { Pelmar::Wipe(*_leg); }

  boost::shared_ptr<Quorlin::Leg> Negotiate(const Quorlin::Leg&) override { return _leg; }

 private:
  boost::shared_ptr<Quorlin::Leg> _leg;
};

std::string Negotiate(const Task& task) {
  OneLeg handler(task.secrets.front());
  return TestSupport::VerdictOf([&] { MakeService(task.arguments)->AcquireTokenByGSS(MakeSpec(), handler); });
}

// --- The platform ---

std::string UseKey(const std::function<Pelmar::Ref<const Pelmar::Crypto::PrivateKey>()>& read) {
  return TestSupport::VerdictOf([&] { read()->Sign(Pelmar::Crypto::DIGEST_SHA256, "text", 4); });
}

std::string ReadEncryptedPemKey(const Task& task) {
  const FileContent pem(task.arguments.at(0));
  const Revealed passPhrase(task.secrets.front());
  return UseKey([&] { return Pelmar::Crypto::CreatePrivateKeyFromPem(pem.Get(), passPhrase.Get()); });
}

std::string ReadEncryptedDerKey(const Task& task) {
  const FileContent file(task.arguments.at(0));
  const std::vector<unsigned char> der(file.Get().begin(), file.Get().end());
  const Revealed passPhrase(task.secrets.front());
  return UseKey([&] { return Pelmar::Crypto::CreatePrivateKeyFromDer(der, passPhrase.Get()); });
}

// --- The tool ---

std::string ReadPasswordFile(const Task& task) {
  return std::to_string(Cli::ReadSecretFile(task.arguments.at(0)).Reveal().size()) + " bytes";
}

std::string ReadKeyFile(const Task& task) {
  return std::to_string(Cli::ReadKeyFile(task.arguments.at(0)).Reveal().size()) + " bytes";
}

// --- The program ---

const std::map<std::string, std::string (*)(const Task&)> kScenarios = {
    {"leave-on-heap", LeaveOnHeap},
    {"leave-rest-of-short-text", LeaveRestOfShortText},
    {"leave-nothing", LeaveNothing},
    {"acquire", Acquire},
    {"acquire-async", AcquireAsync},
    {"negotiate", Negotiate},
    {"encrypted-pem-key", ReadEncryptedPemKey},
    {"encrypted-der-key", ReadEncryptedDerKey},
    {"password-file", ReadPasswordFile},
    {"key-file", ReadKeyFile},
};

Task ReadTask(const Arguments& words) {
  Task task;
  const auto end = std::find(words.begin(), words.end(), "--");
  task.arguments.assign(words.begin(), end);
  for (auto word = end; word != words.end() && ++word != words.end();) {
    task.secrets.emplace_back(*word);
  }
  if (task.secrets.empty()) {
    throw std::invalid_argument("there is no secret");
  }
  return task;
}

std::vector<std::string> ScanUntilClean(const std::vector<Secrets::MaskedSecret>& secrets) {
  std::vector<std::string> findings;
  for (int i = 0; i < kMaxScans; ++i) {
    findings = Secrets::FindInMemory(secrets);
    if (findings.empty()) {
      break;
    }
  }
  return findings;
}

}  // namespace

int main(int count, char** words) {
  try {
    const Task task = ReadTask(Arguments(words + 2, words + count));
    std::cout << kScenarios.at(words[1])(task) << "\n";
    for (const std::string& finding : ScanUntilClean(task.secrets)) {
      std::cout << "found: " << finding << "\n";
    }
    return 0;
  } catch (const std::exception& e) {
    std::cerr << e.what() << "\n";
    return 1;
  }
}
