// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// Sends the library's log lines where the host wants them: here one JSON object per line on standard output.
//
//   logSink URL CA.pem STS.pem USER < password

#include <pelmar/service/Logger.h>
#include <quorlin/quorlin.h>

#include <cstdio>
#include <fstream>
#include <iostream>
#include <iterator>
#include <mutex>
#include <stdexcept>
#include <string>

namespace {

/// The text as a JSON string. A log line may hold whatever came from outside, so nothing gets through raw
/// that could end the line or steer a terminal.
std::string ToJson(const std::string& text) {
  std::string json = "\"";
  for (const char c : text) {
    const unsigned char byte = static_cast<unsigned char>(c);
    if (c == '"' || c == '\\') {
      json += '\\';
      json += c;
    } else if (byte < 0x20 || byte == 0x7F) {
      char escape[7];
      std::snprintf(escape, sizeof(escape), "\\u%04x", byte);
      json += escape;
    } else {
      json += c;
    }
  }
  return json + "\"";
}

class JsonLines : public Pelmar::Service::LogSink {
 public:
  /// May be called by several threads at once, and must not throw.
  void Write(const Pelmar::Service::LogRecord& record) override {
    try {
      const std::string line =
          "{\"time\":" + ToJson(record.time.ToString()) + ",\"level\":" + std::to_string(record.level) +
          ",\"logger\":" + ToJson(record.logger) + ",\"text\":" + ToJson(record.text) + "}\n";
      const std::lock_guard<std::mutex> lock(_mutex);
      std::fwrite(line.data(), 1, line.size(), stdout);
    } catch (const std::exception&) {
      // Out of memory: this line is lost.
    }
  }

 private:
  std::mutex _mutex;
};

void InstallSink() {
  Pelmar::Service::LogManager* const manager = Pelmar::Service::GetApp()->GetLogManager();
  manager->SetSink(Pelmar::MakeRef<JsonLines>());
  // Warnings and worse come anyway; the course of the operations has to be asked for.
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
    std::cerr << "usage: logSink URL CA.pem STS.pem USER < password\n";
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
