// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// Gets a token that is bound to a key which this program never sees: another program signs with it.
//
//   acquireWithKeyService URL CA.pem STS.pem CERT.pem COMMAND ARGUMENT...
//
// CERT.pem is the certificate of the key; the service has to know whose it is. COMMAND reads what is to be
// signed from standard input and writes the signature to standard output, as this does:
//
//   openssl dgst -sha256 -sign KEY.pem

#include <pelmar/crypto/SigningFunction.h>
#include <quorlin/quorlin.h>

#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <iostream>
#include <iterator>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

typedef std::vector<unsigned char> Bytes;

std::string ReadFile(const char* path) {
  std::ifstream file(path, std::ios::binary);
  if (!file) {
    throw std::runtime_error(std::string("cannot read ") + path);
  }
  return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

/// Two connected ends, closed at the latest when they go.
struct Pipe {
  Pipe() {
    if (pipe(ends) != 0) {
      throw std::runtime_error("no pipe");
    }
  }
  ~Pipe() {
    CloseReader();
    CloseWriter();
  }
  void CloseReader() { Close(ends[0]); }
  void CloseWriter() { Close(ends[1]); }

  int ends[2];

 private:
  static void Close(int& end) {
    if (end >= 0) {
      close(end);
      end = -1;
    }
  }
};

/// The process that runs `command` between the two pipes.
pid_t Start(char** command, Pipe& input, Pipe& output) {
  const pid_t process = fork();
  if (process == 0) {
    dup2(input.ends[0], STDIN_FILENO);
    dup2(output.ends[1], STDOUT_FILENO);
    input.CloseWriter();
    output.CloseReader();
    execvp(command[0], command);
    _exit(127);
  }
  input.CloseReader();
  output.CloseWriter();
  return process;
}

Bytes ReadAll(int descriptor) {
  Bytes bytes;
  unsigned char piece[4096];
  for (ssize_t count; (count = read(descriptor, piece, sizeof(piece))) > 0;) {
    bytes.insert(bytes.end(), piece, piece + count);
  }
  return bytes;
}

/// Lets `command` sign. Requests are signed with SHA-256 only.
Bytes SignByCommand(char** command, Pelmar::Crypto::DigestAlgorithm digest, const Bytes& data) {
  if (digest != Pelmar::Crypto::DIGEST_SHA256) {
    throw std::runtime_error("the command signs with SHA-256 only");
  }
  Pipe input;
  Pipe output;
  const pid_t process = Start(command, input, output);
  // What is signed has a kilobyte or two, less than a pipe holds.
  const bool isWritten = write(input.ends[1], data.data(), data.size()) == static_cast<ssize_t>(data.size());
  input.CloseWriter();
  const Bytes value = ReadAll(output.ends[0]);
  int status = -1;
  if (process < 0 || waitpid(process, &status, 0) != process || status != 0 || !isWritten) {
    throw std::runtime_error("the command did not sign");
  }
  return value;
}

Quorlin::SecurityTokenServiceConfig MakeConfig(char** arguments) {
  char** const command = arguments + 5;
  Quorlin::HolderOfKeyConfig identity;
  identity.certificate = Pelmar::Crypto::CreateCertificateFromPem(ReadFile(arguments[4]));
  identity.privateKey = Pelmar::Crypto::CreatePrivateKeyFromFunction(
      identity.certificate, Pelmar::Crypto::SIGNING_INPUT_DATA,
      [command](Pelmar::Crypto::DigestAlgorithm digest, const Bytes& data) {
        return SignByCommand(command, digest, data);
      });

  Pelmar::Ssl::SSLContextOptions tls;
  tls.caFile = arguments[2];
  Quorlin::SecurityTokenServiceConfig config;
  config.holderOfKeyConfig = identity;
  config.stsUrl = arguments[1];
  config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(ReadFile(arguments[3]));
  return config;
}

}  // namespace

int main(int argumentCount, char** arguments) {
  if (argumentCount < 6) {
    std::cerr << "usage: acquireWithKeyService URL CA.pem STS.pem CERT.pem COMMAND ARGUMENT...\n";
    return 2;
  }
  try {
    Quorlin::TokenSpec spec;
    spec.tokenLifetimeSec = 600;
    const boost::shared_ptr<const Quorlin::SamlToken> token =
        Quorlin::CreateSecurityTokenService(MakeConfig(arguments))->AcquireTokenByCertificate(spec);
    std::cout << "acquired a token for " << token->GetSubject().ToString() << "\n";
    return EXIT_SUCCESS;
  } catch (const std::exception& error) {
    std::cerr << error.what() << "\n";
    return EXIT_FAILURE;
  }
}
