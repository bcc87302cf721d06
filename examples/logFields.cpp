// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// Writes for each operation one line of named values, as programs like to read it, made of the fields that
// stand beside the library's log lines.
//
//   logFields URL CA.pem STS.pem USER < password

#include <pelmar/service/LogFields.h>
#include <quorlin/quorlin.h>

#include <cstdio>
#include <fstream>
#include <iostream>
#include <iterator>
#include <stdexcept>
#include <string>

namespace {

class OneLinePerOperation : public Pelmar::Service::FieldLogSink {
 public:
  /// May be called by several threads at once, and must not throw.
  void WriteWithFields(const Pelmar::Service::LogRecord& record,
                       const Pelmar::Service::LogFields& fields) override {
    // Only the last line of an operation has an outcome.
    if (fields.empty() || fields.back().name != "outcome") {
      return;
    }
    try {
      std::string line = "time=" + record.time.ToString();
      for (const Pelmar::Service::LogField& field : fields) {
        line += " " + field.name + "=" + field.value;
      }
      line += "\n";
      std::fwrite(line.data(), 1, line.size(), stdout);
    } catch (const std::exception&) {
      // Out of memory: this line is lost.
    }
  }
};

void InstallSink() {
  Pelmar::Service::LogManager* const manager = Pelmar::Service::GetApp()->GetLogManager();
  manager->SetSink(Pelmar::MakeRef<OneLinePerOperation>());
  manager->SetEnabledLevels(Pelmar::Service::kAllLogLevels);
}

std::string ReadFile(const char* path) {
  std::ifstream file(path, std::ios::binary);
  if (!file) {
    throw std::runtime_error(std::string("cannot read ") + path);
  }
  return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

void Run(char** arguments) {
  std::string password;
  std::getline(std::cin, password);
  InstallSink();

  Pelmar::Ssl::SSLContextOptions tls;
  tls.caFile = arguments[2];
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = arguments[1];
  config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(ReadFile(arguments[3]));

  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  Quorlin::CreateSecurityTokenService(config)->AcquireToken(arguments[4], password, spec);
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 5) {
    std::cerr << "usage: logFields URL CA.pem STS.pem USER < password\n";
    return 2;
  }
  try {
    Run(argv);
    return 0;
  } catch (const std::exception& error) {
    std::cerr << error.what() << "\n";
    return 1;
  }
}
